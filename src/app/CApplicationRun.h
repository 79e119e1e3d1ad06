#pragma once
// The application object and the updater around a window of either form:
// what the terminal and the window front-ends share of a run.

#include <functional>
#include <memory>
#include <string>

#include "app/CUpdaterRun.h"
#include "common/CMainThreadLoop.h"
#include "update/CWindowController.h"

class FLAppDelegate;

class CApplicationRun {
 public:
  CApplicationRun(SRunSeams seams_I, SRunOptions options_I, CWindowController& window_I);
  ~CApplicationRun();

  // Makes the application object and configures the updater with the
  // run's seams; the object ends the process through the run's exit step.
  FLAppDelegate& MakeApplication(std::function<void(const std::string&)> printResult_I,
                                 std::function<void(const std::string&)> printError_I);

  int GetStatus() const { return mStatus; }

 private:
  SRunSeams mSeams;
  SRunOptions mOptions;
  CWindowController& mWindow;
  CMainThreadLoop mMainLoop;
  std::unique_ptr<FLAppDelegate> mDelegate;
  int mStatus = 0;
};
