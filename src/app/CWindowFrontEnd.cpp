#include "app/CWindowFrontEnd.h"

#include <QApplication>
#include <cstdio>
#include <filesystem>
#include <string>

#include "app/CApplicationRun.h"
#include "app/TavVersion.h"
#include "common/LinuxPaths.h"
#include "ui/qt/OFLImages.h"
#include "ui/qt/OFLWindowController.h"
#include "update/FLAppDelegate.h"

int CWindowFrontEnd::Run(SRunSeams seams_I, SRunOptions options_I) {
  int argc = 1;
  std::string programName = TAV_PROGRAM_NAME;
  char* argv[] = {programName.data(), nullptr};
  QApplication application(argc, argv);
  QApplication::setApplicationName(QStringLiteral(TAV_PROGRAM_NAME));
  QApplication::setApplicationVersion(QStringLiteral(TAV_PROGRAM_VERSION));
  QApplication::setWindowIcon(OFLImages::ApplicationIcon());
  // Closing the window ends the run through its terminate step, and an
  // alert shown before the window must not end it when it closes.
  QApplication::setQuitOnLastWindowClosed(false);

  OFLWindowController window;
  window.SetAssumeYes(options_I.assumeYes);
  // The images lie where the configuration of the run is found: beside the
  // program in the build tree, else in the installed data folder.
  const std::string dataFolder = std::filesystem::exists(LinuxPaths::AppendPathComponent(
                                     seams_I.executableFolder, "fw_loader.ini"))
                                     ? seams_I.executableFolder
                                     : seams_I.installedDataFolder;
  window.SetDataFolder(dataFolder);
  CApplicationRun run(std::move(seams_I), std::move(options_I), window);
  auto print = [](const std::string& line_I) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, line_I.c_str());
  };
  FLAppDelegate& delegate = run.MakeApplication(print, print);
  window.SetApplication(&delegate);
  // Launched from inside the loop, so that whatever the set-up dispatches
  // or posts finds the loop running.
  window.PostToMainLoop([&delegate] { delegate.applicationDidFinishLaunching(); });
  window.RunMainLoop();
  return run.GetStatus();
}
