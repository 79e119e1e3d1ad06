#include "common/CSteadyClock.h"

#include <algorithm>
#include <chrono>

namespace {
using Seconds = std::chrono::duration<double>;
}

CSteadyClock::~CSteadyClock() {
  {
    std::lock_guard<std::mutex> guard(mLock);
    mStopping = true;
    mQueue.Clear();
  }
  mWake.notify_all();
  if (mTimer.joinable()) mTimer.join();
}

void CSteadyClock::Sleep(double seconds_I) {
  if (seconds_I <= 0) return;
  {
    // Sleeps start in time order under the lock, so the covered time is a
    // running union: only what reaches past the last end is new.
    std::lock_guard<std::mutex> guard(mWaitLock);
    const double start = Now();
    const double end = start + seconds_I;
    if (end > mCoveredUntil) {
      mWaited += end - std::max(start, mCoveredUntil);
      mCoveredUntil = end;
    }
  }
  std::this_thread::sleep_for(Seconds(seconds_I));
}

double CSteadyClock::GetTimeWaited() const {
  std::lock_guard<std::mutex> guard(mWaitLock);
  // A sleep under way counts only as far as it has come.
  return mWaited - std::max(0.0, mCoveredUntil - Now());
}

double CSteadyClock::Now() const {
  return Seconds(std::chrono::steady_clock::now().time_since_epoch()).count();
}

void CSteadyClock::Schedule(double delay_I, std::function<void()> task_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (mStopping) return;
  mQueue.Push(Now() + delay_I, std::move(task_I));
  if (!mTimer.joinable()) mTimer = std::thread([this] { RunTimer(); });
  mWake.notify_all();
}

void CSteadyClock::RunTimer() {
  std::unique_lock<std::mutex> lock(mLock);
  while (!mStopping) {
    if (mQueue.Empty()) {
      mWake.wait(lock);
      continue;
    }
    const double wait = mQueue.NextDue() - Now();
    if (wait > 0) {
      mWake.wait_for(lock, Seconds(wait));
      continue;
    }
    std::function<void()> task = mQueue.Pop();
    lock.unlock();
    task();
    lock.lock();
  }
}
