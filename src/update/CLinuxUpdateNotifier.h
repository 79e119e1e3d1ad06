#pragma once
// Bridges the controller's reports to the updater driver. Every report is
// written to the system log; states and progress go on to the driver.
// Errors reach the user only through the state.

#include "update/CUpdateNotifier.h"

class OFLUpdater;

class CLinuxUpdateNotifier : public CUpdateNotifier {
 public:
  explicit CLinuxUpdateNotifier(OFLUpdater& updater_I) : mUpdater(updater_I) {}

  void UpdateLog(const std::string& text_I) override;
  void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) override;
  void UpdateStatus(ECONTROLLER_STATE state_I) override;
  void UpdateProgress(unsigned int percent_I) override;

 private:
  OFLUpdater& mUpdater;
};
