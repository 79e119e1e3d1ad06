#include "app/CUpdaterRun.h"

#include <QApplication>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "app/TavVersion.h"
#include "common/CMainThreadLoop.h"
#include "common/LinuxPaths.h"
#include "host/CLanguageManager.h"
#include "ui/qt/OFLImages.h"
#include "ui/qt/OFLWindowController.h"
#include "ui/terminal/CTerminalWindowController.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

namespace {

// The application object and the updater around a window of either form.
class CRun {
 public:
  CRun(SRunSeams seams_I, SRunOptions options_I, CWindowController& window_I)
      : mSeams(std::move(seams_I)), mOptions(std::move(options_I)), mWindow(window_I) {
    mMainLoop.RegisterMainThread();
    // Dispatches to the main thread run inside the window's loop.
    mMainLoop.SetWakeHook([this] { mWindow.PostToMainLoop([this] { mMainLoop.RunPending(); }); });
  }

  FLAppDelegate& MakeApplication(std::function<void(const std::string&)> printResult_I,
                                 std::function<void(const std::string&)> printError_I) {
    SApplicationSetup app;
    app.window = &mWindow;
    app.desktop = mSeams.desktop;
    app.terminal = !mOptions.window;
    app.printResult = std::move(printResult_I);
    app.printError = std::move(printError_I);
    app.runEnded = mOptions.runEnded;
    app.exitProcess = [this](int status_I) {
      mStatus = status_I;
      if (mOptions.beforeExit) mOptions.beforeExit();
      std::fflush(nullptr);
      // The device and update threads may still be inside a wait: the
      // process ends here without unwinding them, as the platform's
      // terminate does.
      std::_Exit(status_I);
    };
    // Made before the updater: the updater asks it how the run was launched.
    mDelegate = std::make_unique<FLAppDelegate>(app);

    SUpdaterSetup setup;
    setup.delegate = mDelegate.get();
    setup.makeDiscovery = mSeams.makeDiscovery;
    setup.registry = mSeams.registry;
    setup.power = mSeams.power;
    setup.processArguments = mOptions.processArguments;
    setup.preferencesFolder = LinuxPaths::GetUserPreferencesFolderPath();
    setup.executableFolder = mSeams.executableFolder;
    setup.installedDataFolder = mSeams.installedDataFolder;
    OFLUpdater::Configure(std::move(setup));
    return *mDelegate;
  }

  int GetStatus() const { return mStatus; }

 private:
  SRunSeams mSeams;
  SRunOptions mOptions;
  CWindowController& mWindow;
  CMainThreadLoop mMainLoop;
  std::unique_ptr<FLAppDelegate> mDelegate;
  int mStatus = 0;
};

int RunInTerminal(SRunSeams seams_I, SRunOptions options_I) {
  CTerminalWindowController window;
  window.SetAssumeYes(options_I.assumeYes);
  CRun run(std::move(seams_I), std::move(options_I), window);
  FLAppDelegate& delegate = run.MakeApplication(
      [&window](const std::string& line_I) { window.PrintLine(stdout, line_I); },
      [&window](const std::string& line_I) {
        window.PrintLine(stderr, std::string(TAV_PROGRAM_NAME) + ": " + line_I);
      });
  delegate.applicationDidFinishLaunching();
  window.RunMainLoop();
  return run.GetStatus();
}

int RunInWindow(SRunSeams seams_I, SRunOptions options_I) {
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
  CRun run(std::move(seams_I), std::move(options_I), window);
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

}  // namespace

int CUpdaterRun::Run(SRunSeams seams_I, SRunOptions options_I) {
  // Made on the main thread before any other starts: it sets the locale.
  CLanguageManager::SharedInstance();
  return options_I.window ? RunInWindow(std::move(seams_I), std::move(options_I))
                          : RunInTerminal(std::move(seams_I), std::move(options_I));
}
