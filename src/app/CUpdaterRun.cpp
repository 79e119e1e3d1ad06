#include "app/CUpdaterRun.h"

#include <cstdio>
#include <cstdlib>

#include "app/TavVersion.h"
#include "common/CMainThreadLoop.h"
#include "common/LinuxPaths.h"
#include "host/CLanguageManager.h"
#include "ui/terminal/CTerminalWindowController.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

int CUpdaterRun::Run(SRunSeams seams_I, SRunOptions options_I) {
  // Made on the main thread before any other starts: it sets the locale.
  CLanguageManager::SharedInstance();
  int status = 0;
  SApplicationSetup app;

  CMainThreadLoop mainLoop;
  mainLoop.RegisterMainThread();
  CTerminalWindowController window;
  window.SetAssumeYes(options_I.assumeYes);
  // Dispatches to the main thread run inside the window's loop.
  mainLoop.SetWakeHook(
      [&window, &mainLoop] { window.PostToMainLoop([&mainLoop] { mainLoop.RunPending(); }); });

  app.window = &window;
  app.desktop = seams_I.desktop;
  app.terminal = options_I.terminal;
  app.printResult = [&window](const std::string& line_I) { window.PrintLine(stdout, line_I); };
  app.printError = [&window](const std::string& line_I) {
    window.PrintLine(stderr, std::string(TAV_PROGRAM_NAME) + ": " + line_I);
  };
  app.exitProcess = [&options_I, &status](int status_I) {
    status = status_I;
    if (options_I.beforeExit) options_I.beforeExit();
    std::fflush(nullptr);
    // The device and update threads may still be inside a wait: the process
    // ends here without unwinding them, as the platform's terminate does.
    std::_Exit(status_I);
  };
  // Made before the updater: the updater asks it how the run was launched.
  FLAppDelegate delegate(app);

  SUpdaterSetup setup;
  setup.delegate = &delegate;
  setup.makeDiscovery = seams_I.makeDiscovery;
  setup.registry = seams_I.registry;
  setup.power = seams_I.power;
  setup.processArguments = options_I.processArguments;
  setup.preferencesFolder = LinuxPaths::GetUserPreferencesFolderPath();
  setup.executableFolder = seams_I.executableFolder;
  setup.installedDataFolder = seams_I.installedDataFolder;
  OFLUpdater::Configure(std::move(setup));

  delegate.applicationDidFinishLaunching();
  window.RunMainLoop();
  return status;
}
