#pragma once
// Records a registry watch's events, which arrive on the watch's thread,
// and lets the test wait for them.

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <vector>

#include "seams/CDeviceRegistry.h"

class CRecordingWatcher : public CRegistryWatcher {
 public:
  struct SEvent {
    bool added;
    DeviceInfo info;
    bool operator==(const SEvent&) const = default;
  };

  void DeviceAdded(const DeviceInfo& info_I) override { Record({true, info_I}); }
  void DeviceRemoved(const DeviceInfo& info_I) override { Record({false, info_I}); }

  // The events so far, once there are `count_I` of them or after 5 s.
  std::vector<SEvent> WaitFor(size_t count_I) {
    std::unique_lock<std::mutex> lock(mLock);
    mChanged.wait_for(lock, std::chrono::seconds(5), [&] { return mEvents.size() >= count_I; });
    return mEvents;
  }

 private:
  void Record(const SEvent& event_I) {
    std::lock_guard<std::mutex> lock(mLock);
    mEvents.push_back(event_I);
    mChanged.notify_all();
  }

  std::mutex mLock;
  std::condition_variable mChanged;
  std::vector<SEvent> mEvents;
};
