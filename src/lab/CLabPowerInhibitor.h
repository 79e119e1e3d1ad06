#pragma once
// The lab form of the power seam: always granted, and counted, so a lab run
// leaves the machine's own power management alone.

#include <atomic>

#include "seams/CPowerInhibitor.h"

class CLabPowerInhibitor : public CPowerInhibitor {
 public:
  std::unique_ptr<CPowerAssertion> Create(const std::string& name_I) override;

  int GetHeld() const { return mHeld; }
  int GetGranted() const { return mGranted; }

 private:
  std::atomic<int> mHeld{0};
  std::atomic<int> mGranted{0};
};
