#pragma once
// What the updater driver asks of the application object. All of it runs on
// the main thread; the driver dispatches there first.

#include <string>

#include "update/UpdateTypes.h"

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
  virtual void terminate() = 0;
};
