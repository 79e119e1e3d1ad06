#include "app/CUpdaterRun.h"

#include <cstdio>
#include <cstdlib>

#include "common/CMainThreadLoop.h"
#include "common/LinuxPaths.h"
#include "host/CLanguageManager.h"
#include "ui/terminal/CTerminalWindowController.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

int CUpdaterRun::Run(SRunSeams seams_I, SRunOptions options_I) {
  // Made on the main thread before any other starts: it sets the locale.
  CLanguageManager::SharedInstance();

  CMainThreadLoop mainLoop;
  mainLoop.RegisterMainThread();
  CTerminalWindowController window;
  window.SetAssumeYes(options_I.assumeYes);
  // Dispatches to the main thread run inside the window's loop.
  mainLoop.SetWakeHook([&window, &mainLoop] {
    window.PostToMainLoop([&mainLoop] { mainLoop.RunPending(); });
  });

  SUpdaterSetup setup;
  setup.makeDiscovery = seams_I.makeDiscovery;
  setup.registry = seams_I.registry;
  setup.power = seams_I.power;
  setup.processArguments = options_I.processArguments;
  setup.preferencesFolder = LinuxPaths::GetUserPreferencesFolderPath();
  setup.executableFolder = seams_I.executableFolder;
  setup.installedDataFolder = seams_I.installedDataFolder;
  OFLUpdater::Configure(std::move(setup));

  int status = 0;
  SApplicationSetup app;
  app.window = &window;
  app.desktop = seams_I.desktop;
  app.headless = options_I.headless;
  app.printResult = [](const std::string& line_I) { std::printf("%s\n", line_I.c_str()); };
  app.exitProcess = [&options_I, &status](int status_I) {
    status = status_I;
    if (options_I.beforeExit) options_I.beforeExit();
    std::fflush(nullptr);
    // The device and update threads may still be inside a wait: the process
    // ends here without unwinding them, as the platform's terminate does.
    std::_Exit(status_I);
  };

  FLAppDelegate delegate(app);
  delegate.applicationDidFinishLaunching();
  window.RunMainLoop();
  return status;
}
