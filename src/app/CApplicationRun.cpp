#include "app/CApplicationRun.h"

#include <cstdio>
#include <cstdlib>

#include "common/LinuxPaths.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

CApplicationRun::CApplicationRun(SRunSeams seams_I, SRunOptions options_I,
                                 CWindowController& window_I)
    : mSeams(std::move(seams_I)), mOptions(std::move(options_I)), mWindow(window_I) {
  mMainLoop.RegisterMainThread();
  // Dispatches to the main thread run inside the window's loop.
  mMainLoop.SetWakeHook([this] { mWindow.PostToMainLoop([this] { mMainLoop.RunPending(); }); });
}

CApplicationRun::~CApplicationRun() = default;

FLAppDelegate& CApplicationRun::MakeApplication(
    std::function<void(const std::string&)> printResult_I,
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
