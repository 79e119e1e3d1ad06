#pragma once
// Keeps the machine awake during an update through systemd-logind's
// Inhibit("idle:sleep", ..., "block") on the system bus, and makes a
// shutdown wait for the update with Inhibit("shutdown", ..., "delay"). Each
// lock holds while the file descriptor logind handed out stays open. Only
// the first decides whether the assertion is granted.

#include <string>

#include "seams/CPowerInhibitor.h"

class CLinuxPowerInhibitor : public CPowerInhibitor {
 public:
  // Who and why, as logind shows them to the user.
  static constexpr const char* kWho = "tavik-fwupdater";

  std::unique_ptr<CPowerAssertion> Create(const std::string& name_I) override;
};
