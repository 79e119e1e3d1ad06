#pragma once
// What both discovery benchmarks share: the device thread's watcher, which
// hands every added interface to DeviceAttach as a run's device thread
// does and tells the benchmark when, and the medians they report.

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <mutex>
#include <vector>

#include "flash/CFLDeviceInterface.h"
#include "seams/CDeviceRegistry.h"
#include "update/CUpdateController.h"

using Clock = std::chrono::steady_clock;

inline double Median(std::vector<double> values_I) {
  std::sort(values_I.begin(), values_I.end());
  return values_I.empty() ? 0.0 : values_I[values_I.size() / 2];
}

inline double Microseconds(Clock::time_point from_I, Clock::time_point to_I) {
  return std::chrono::duration<double, std::micro>(to_I - from_I).count();
}

// The moment DeviceAttach returns, and each removal, for the waiting
// benchmark.
class CAttachWatcher : public CRegistryWatcher {
 public:
  explicit CAttachWatcher(CUpdateController& controller_I) : mController(controller_I) {}
  void DeviceAdded(const DeviceInfo& info_I) override {
    mController.DeviceAttach(CFLDeviceInterface::PathFromInfo(info_I));
    std::lock_guard<std::mutex> guard(mLock);
    if (!mAttached) mAttachedAt = Clock::now();
    mAttached = true;
    mWake.notify_all();
  }
  void DeviceRemoved(const DeviceInfo&) override {
    std::lock_guard<std::mutex> guard(mLock);
    mRemoved = true;
    mWake.notify_all();
  }
  // False when nothing came within 5 s: the event was lost.
  bool WaitForAttach(Clock::time_point& attachedAt_O) {
    std::unique_lock<std::mutex> lock(mLock);
    if (!mWake.wait_for(lock, std::chrono::seconds(5), [this] { return mAttached; })) return false;
    mAttached = false;
    attachedAt_O = mAttachedAt;
    return true;
  }
  bool WaitForRemoval() {
    std::unique_lock<std::mutex> lock(mLock);
    if (!mWake.wait_for(lock, std::chrono::seconds(5), [this] { return mRemoved; })) return false;
    mRemoved = false;
    return true;
  }

 private:
  CUpdateController& mController;
  std::mutex mLock;
  std::condition_variable mWake;
  bool mAttached = false;
  bool mRemoved = false;
  Clock::time_point mAttachedAt;
};
