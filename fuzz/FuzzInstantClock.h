#pragma once
// Time moves only by sleeps, on the caller's thread: nothing here schedules.
// The virtual clock yields the processor on every sleep, which on a busy
// machine turns a loader's retries into a false time-out of the fuzzer.

#include <cstdlib>
#include <functional>

#include "common/CClock.h"

class CInstantClock : public CClock {
 public:
  void Sleep(double seconds_I) override { mNow += seconds_I; }
  double Now() const override { return mNow; }
  void Schedule(double, std::function<void()>) override { std::abort(); }

 private:
  double mNow = 0;
};
