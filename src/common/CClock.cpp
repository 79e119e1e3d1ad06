#include "common/CClock.h"

#include <atomic>

#include "common/CSteadyClock.h"

namespace {
std::shared_ptr<CClock>& Installed() {
  static std::shared_ptr<CClock> clock = std::make_shared<CSteadyClock>();
  return clock;
}
}  // namespace

std::shared_ptr<CClock> CClock::Get() { return std::atomic_load(&Installed()); }

void CClock::Set(std::shared_ptr<CClock> clock_I) {
  if (!clock_I) clock_I = std::make_shared<CSteadyClock>();
  std::atomic_store(&Installed(), std::move(clock_I));
}

void TavSleep(double seconds_I) { CClock::Get()->Sleep(seconds_I); }

bool TavPollUntil(double timeout_I, double interval_I, const std::function<bool()>& done_I) {
  const std::shared_ptr<CClock> clock = CClock::Get();
  const double deadline = clock->Now() + timeout_I;
  while (true) {
    if (done_I()) return true;
    if (clock->Now() >= deadline) return false;
    clock->Sleep(interval_I);
  }
}
