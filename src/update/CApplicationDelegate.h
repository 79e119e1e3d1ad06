#pragma once
// What the updater driver asks of the application object. All of it runs on
// the main thread; the driver dispatches there first.

#include <string>

#include "update/UpdateTypes.h"

struct SBoardResult;

// Why a run ends. A terminal run exits with this number; a window run
// exits with 0 whatever it was.
enum ERunOutcome : int {
  ERUN_SUCCESS = 0,
  ERUN_FAILED = 1,        // an update failed, or the run could not go on
  ERUN_NO_DEVICE = 2,     // no supported tablet, or it went away
  ERUN_REFUSED_FILE = 3,  // the firmware file was not accepted
  ERUN_DECLINED = 4,      // the user said no
  ERUN_USAGE = 64,        // nothing to update, or an option without its value
};

class CApplicationDelegate {
 public:
  virtual ~CApplicationDelegate() = default;
  // False when another program of the family, or a shell with arguments,
  // started us; only then is the preferences file of arguments read.
  virtual bool userLaunched() const = 0;
  virtual void doStateMachine(ECONTROLLER_STATE state_I) = 0;
  virtual void updateProgressBar(double percent_I) = 0;
  virtual void notifyDialog(const std::string& text_I) = 0;
  // Ends the process through the terminate handler. In the program it does
  // not return; callers still return right after it.
  virtual void terminate(ERunOutcome outcome_I) = 0;
  // The update thread has gone through a non-empty list of updates.
  virtual void updatesFinished() {}
  // A board is about to be updated: which, from which file, at which version.
  virtual void boardStarting(const SBoardResult& /*board_I*/) {}
  // A remark for the user that is no dialog (a path that matched nothing).
  virtual void notice(const std::string& /*text_I*/) {}
};
