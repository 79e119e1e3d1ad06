#pragma once
// Receives log lines, errors, states and progress from the update
// controller. The driver implements it and hands states and progress to
// the main thread.

#include <string>

#include "update/UpdateTypes.h"

class CUpdateNotifier {
 public:
  virtual ~CUpdateNotifier() = default;
  virtual void UpdateLog(const std::string& /*text_I*/) {}
  virtual void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) = 0;
  virtual void UpdateStatus(ECONTROLLER_STATE state_I) = 0;
  virtual void UpdateProgress(unsigned int percent_I) = 0;
};
