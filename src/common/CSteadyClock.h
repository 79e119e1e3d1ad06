#pragma once
// The real clock: std::chrono's steady clock, with a timer thread for
// Schedule that starts on first use.

#include <condition_variable>
#include <mutex>
#include <thread>

#include "common/CClock.h"
#include "common/CTimerQueue.h"

class CSteadyClock : public CClock {
 public:
  CSteadyClock() = default;
  ~CSteadyClock() override;
  CSteadyClock(const CSteadyClock&) = delete;
  CSteadyClock& operator=(const CSteadyClock&) = delete;

  void Sleep(double seconds_I) override;
  double Now() const override;
  void Schedule(double delay_I, std::function<void()> task_I) override;
  double GetTimeWaited() const override;

 private:
  void RunTimer();

  mutable std::mutex mWaitLock;
  double mWaited = 0.0;
  double mCoveredUntil = 0.0;  // where the sleeps asked for so far end

  std::mutex mLock;
  std::condition_variable mWake;
  CTimerQueue mQueue;
  bool mStopping = false;
  std::thread mTimer;
};
