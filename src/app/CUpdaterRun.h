#pragma once
// One update run as the program makes it: the window (Qt's, in the window
// program only, or the terminal's) on the main thread's loop, the updater
// driver with the run's seams, and the application object that ends the
// process through its terminate handler.

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "devices/CDiscovery.h"
#include "seams/CDesktop.h"
#include "seams/CDeviceRegistry.h"
#include "seams/CPowerInhibitor.h"

struct SRunSeams {
  std::shared_ptr<CDeviceRegistry> registry;
  std::shared_ptr<CPowerInhibitor> power;
  std::shared_ptr<CDesktop> desktop;
  std::function<std::unique_ptr<CDiscovery>()> makeDiscovery;
  // Where fw_loader.ini is looked for when -f does not name it.
  std::string executableFolder;
  std::string installedDataFolder;
};

struct SRunOptions {
  std::vector<std::string> processArguments;  // program name first
  // The window instead of the terminal. A terminal run reports per board
  // and ends with the outcome as its status; a window run ends with 0.
  bool window = false;
  bool assumeYes = false;
  // Runs just before the process ends (a lab run saves its boards here).
  std::function<void()> beforeExit;
  // A terminal run is over: its status and the last line it showed.
  std::function<void(int status_I, const std::string& lastLine_I)> runEnded;
};

class CUpdaterRun {
 public:
  using TWindowFrontEnd = int (*)(SRunSeams seams_I, SRunOptions options_I);

  // Runs until the application object ends the process; does not return
  // in the program. The result is the exit status for a run whose end was
  // not the process's (tests stop the process-ending step).
  static int Run(SRunSeams seams_I, SRunOptions options_I);

  // The window program sets its Qt front-end at start; a program without
  // one has no window in it and hands a window run to the window program.
  static void SetWindowFrontEnd(TWindowFrontEnd frontEnd_I);
  static bool HasWindowFrontEnd();
};
