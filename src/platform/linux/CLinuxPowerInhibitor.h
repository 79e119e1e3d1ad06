#pragma once
// Keeps the machine awake during an update through systemd-logind's
// Inhibit("idle:sleep", ...) on the system bus. The lock holds while the
// file descriptor logind handed out stays open.

#include <string>

#include "seams/CPowerInhibitor.h"

class CLinuxPowerInhibitor : public CPowerInhibitor {
 public:
  // Who and why, as logind shows them to the user.
  static constexpr const char* kWho = "tavik-fwupdater";

  std::unique_ptr<CPowerAssertion> Create(const std::string& name_I) override;
};
