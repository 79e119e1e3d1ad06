#include "common/CVirtualClock.h"

#include <algorithm>
#include <chrono>

namespace {
// How long in real time a Sleep waits for announced work to be taken in.
constexpr std::chrono::milliseconds kWorkWait{500};
}  // namespace

CVirtualClock::CVirtualClock(double start_I) : mNow(start_I), mWorker([this] { RunTasks(); }) {}

CVirtualClock::~CVirtualClock() {
  {
    std::lock_guard<std::mutex> guard(mLock);
    mStopping = true;
    mQueue.Clear();
  }
  mWake.notify_all();
  mIdle.notify_all();
  mWorker.join();
}

bool CVirtualClock::HasDueTask() const { return !mQueue.Empty() && mQueue.NextDue() <= mNow; }

void CVirtualClock::Sleep(double seconds_I) {
  std::unique_lock<std::mutex> lock(mLock);
  mTotalSlept += std::max(0.0, seconds_I);
  mNow += std::max(0.0, seconds_I);
  // A task that sleeps only moves time; it must not wait for itself.
  if (std::this_thread::get_id() == mWorker.get_id()) return;
  mWake.notify_all();
  mIdle.wait(lock, [this] { return mStopping || (!mRunning && !HasDueTask()); });
  mIdle.wait_for(lock, kWorkWait, [this] { return mStopping || mWorkInFlight == 0; });
  lock.unlock();
  // Give threads woken by the tasks a chance to run before the next poll.
  std::this_thread::yield();
}

void CVirtualClock::BeginWork() {
  std::lock_guard<std::mutex> guard(mLock);
  ++mWorkInFlight;
}

void CVirtualClock::EndWork() {
  {
    std::lock_guard<std::mutex> guard(mLock);
    if (mWorkInFlight > 0) --mWorkInFlight;
  }
  mIdle.notify_all();
}

double CVirtualClock::Now() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mNow;
}

double CVirtualClock::GetTotalSlept() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mTotalSlept;
}

void CVirtualClock::Schedule(double delay_I, std::function<void()> task_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (mStopping) return;
  mQueue.Push(mNow + std::max(0.0, delay_I), std::move(task_I));
  mWake.notify_all();
}

void CVirtualClock::RunTasks() {
  std::unique_lock<std::mutex> lock(mLock);
  while (true) {
    mWake.wait(lock, [this] { return mStopping || HasDueTask(); });
    if (mStopping) return;
    std::function<void()> task = mQueue.Pop();
    mRunning = true;
    lock.unlock();
    task();
    lock.lock();
    mRunning = false;
    mIdle.notify_all();
  }
}
