#pragma once
// The application object: decides how the program was started, checks the
// access to the tablet, stops the tablet driver, brings up the updater and
// the window, asks the user, and turns each controller state into what the
// user sees. Everything here runs on the main thread. Every way out goes
// through terminate(), which gives the driver back.

#include <atomic>
#include <functional>
#include <memory>
#include <string>

#include "host/OUpdaterClient.h"
#include "seams/CDesktop.h"
#include "update/CApplicationDelegate.h"
#include "update/CWindowController.h"

class OFLUpdater;

struct SApplicationSetup {
  CWindowController* window = nullptr;  // borrowed; made on the main thread
  std::shared_ptr<CDesktop> desktop;
  // A run in the terminal says what became of each board, ends with the
  // outcome as its exit status, and refuses to start without a board to
  // update; a window run always exits with 0.
  bool terminal = false;
  // Ends the process. The program's form does not return.
  std::function<void(int status_I)> exitProcess;
  // Where a terminal run's report lines go, and its remarks and errors.
  std::function<void(const std::string& line_I)> printResult;
  std::function<void(const std::string& line_I)> printError;
  // A terminal run is over, just before the process ends: its status and
  // the last line the user was shown (the result, or why it did not start).
  std::function<void(int status_I, const std::string& lastLine_I)> runEnded;
};

class FLAppDelegate : public CApplicationDelegate {
 public:
  explicit FLAppDelegate(SApplicationSetup setup_I);

  void applicationDidFinishLaunching();
  void applicationWillTerminate();
  bool applicationShouldTerminateAfterLastWindowClosed() const { return true; }

  bool userLaunched() const override { return mUserLaunched; }
  void setUserLaunched(bool userLaunched_I) { mUserLaunched = userLaunched_I; }
  ECONTROLLER_STATE state() const { return mState; }
  void setState(ECONTROLLER_STATE state_I) { mState = state_I; }

  void doStateMachine(ECONTROLLER_STATE state_I) override;
  void notifyDialog(const std::string& text_I) override;
  void updateProgressBar(double percent_I) override;
  void terminate(ERunOutcome outcome_I) override;

  bool confirmProgram();
  void presentDialog();
  void updateProgramText();

  static void stopDriver(CDesktop& desktop_I);
  // Launches through ProcessUtils, over the desktop this object installed.
  static void startDriver(CDesktop& desktop_I);

  // A terminal run whose updates all ran without a state that ended the
  // process (a loader that never came back) ends with what each board came
  // to; a window run stays up as it is.
  void updatesFinished() override;
  void boardStarting(const SBoardResult& board_I) override;
  void notice(const std::string& text_I) override;
  bool HasTerminated() const { return mTerminated; }

  // The driver's applications, stopped at the start and started at the end.
  static constexpr const char* kDriverApplications[] = {
      "com.tavik.taviktablet", "com.tavik.TabletDriver", "com.tavik.TavikTouchDriver"};

 private:
  static OUpdaterClient::Request DriverRequest();
  void CheckLaunchSender();
  // A terminal run with nothing to update ends before the driver is
  // touched; false when it did.
  bool CheckTerminalArguments();
  std::string ResultLine(ERunOutcome outcome_I) const;
  void PrintBoardResults();
  // Leaves without the terminate handler: nothing was taken yet.
  void ExitBeforeStart(const std::string& error_I, int status_I);

  SApplicationSetup mSetup;
  CWindowController* mWindowController = nullptr;  // null until presentDialog
  std::atomic<bool> mUserLaunched{true};
  std::atomic<ECONTROLLER_STATE> mState{ESTATE_NONE};
  OFLUpdater* mUpdater = nullptr;
  bool mTerminated = false;

  // The moving dots of the programming text.
  double mLastTextChange = -1.0;
  unsigned int mDotCount = 0;
};
