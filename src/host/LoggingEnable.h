#pragma once
// Hears that another program of the family switched "LOGGING_ENABLED". The
// log does not follow the setting, TavLog never consults it, so there is
// nothing to change here: the setting is kept and passed on, no more.

#include "seams/CDesktop.h"

class LoggingEnable {
 public:
  void enableLogging(const SNotification& /*notification_I*/) {}
};
