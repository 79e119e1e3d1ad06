#pragma once
// A clock whose time moves only when someone sleeps on it, so a 90-second
// wait costs microseconds. Scheduled tasks run on the clock's own thread;
// a Sleep that moves time past a task's due time returns only after that
// task has run, so events from "another thread" arrive deterministically
// between two polls of the sleeper.
//
// Work announced by BeginWork holds a Sleep for up to kWorkWaitSeconds of
// real time; the bound keeps a sleeper that the work itself waits for (a
// state shown on the main thread) from waiting for ever.
//
// Every Sleep moves the clock by its own duration. A task must not block on
// a thread that is sleeping on this clock, or both wait for ever.

#include <condition_variable>
#include <mutex>
#include <thread>

#include "common/CClock.h"
#include "common/CTimerQueue.h"

class CVirtualClock : public CClock {
 public:
  // Time starts at `start_I`: a clock that takes over from another starts
  // where that one stands, so times taken before the swap stay in the past.
  explicit CVirtualClock(double start_I = 0.0);
  ~CVirtualClock() override;
  CVirtualClock(const CVirtualClock&) = delete;
  CVirtualClock& operator=(const CVirtualClock&) = delete;

  void Sleep(double seconds_I) override;
  double Now() const override;
  void Schedule(double delay_I, std::function<void()> task_I) override;
  void BeginWork() override;
  void EndWork() override;

  // Moves time forward as a Sleep from a bystander would.
  void Advance(double seconds_I) { Sleep(seconds_I); }
  // Total of all Sleep requests, for tests that check how long code waited.
  double GetTotalSlept() const;

 private:
  void RunTasks();
  bool HasDueTask() const;

  mutable std::mutex mLock;
  std::condition_variable mWake;
  std::condition_variable mIdle;
  CTimerQueue mQueue;
  double mNow = 0.0;
  double mTotalSlept = 0.0;
  bool mRunning = false;  // a task is being run right now
  int mWorkInFlight = 0;
  bool mStopping = false;
  std::thread mWorker;
};
