#include "update/CLinuxUpdateNotifier.h"

#include <syslog.h>

#include "common/OSUtils.h"
#include "common/TavLog.h"
#include "update/OFLUpdater.h"

// The lines also go through TavLog, so that --verbose shows the run.

void CLinuxUpdateNotifier::UpdateLog(const std::string& text_I) {
  if (OSUtils::HasSystemLog()) syslog(LOG_NOTICE, "%s", text_I.c_str());
  TavLog::Info("%s\n", text_I.c_str());
}

void CLinuxUpdateNotifier::UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) {
  if (OSUtils::HasSystemLog())
    syslog(LOG_ERR, "ERROR: %s (%d)", text_I.c_str(), static_cast<int>(error_I));
  TavLog::Error("ERROR: %s (%d)\n", text_I.c_str(), static_cast<int>(error_I));
  mUpdater.noteError(error_I, text_I);
}

void CLinuxUpdateNotifier::UpdateStatus(ECONTROLLER_STATE state_I) {
  if (OSUtils::HasSystemLog()) syslog(LOG_NOTICE, "STATE: %d", static_cast<int>(state_I));
  TavLog::Info("STATE: %d\n", static_cast<int>(state_I));
  mUpdater.callBackStatus(state_I);
}

void CLinuxUpdateNotifier::UpdateProgress(unsigned int percent_I) {
  if (OSUtils::HasSystemLog()) syslog(LOG_NOTICE, "PROGRESS: %d", static_cast<int>(percent_I));
  TavLog::Info("PROGRESS: %d\n", static_cast<int>(percent_I));
  mUpdater.callBackProgress(percent_I);
}
