#include "lab/CLabPowerInhibitor.h"

namespace {
class CLabAssertion : public CPowerAssertion {
 public:
  explicit CLabAssertion(std::atomic<int>& held_I) : mHeld(held_I) { ++mHeld; }
  ~CLabAssertion() override { --mHeld; }

 private:
  std::atomic<int>& mHeld;
};
}  // namespace

std::unique_ptr<CPowerAssertion> CLabPowerInhibitor::Create(const std::string& /*name_I*/) {
  ++mGranted;
  return std::make_unique<CLabAssertion>(mHeld);
}
