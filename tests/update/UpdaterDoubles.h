#pragma once
// Doubles of the seams the updater driver works through.

#include <condition_variable>
#include <deque>

#include "seams/CDeviceRegistry.h"
#include "seams/CPowerInhibitor.h"
#include "update/CApplicationDelegate.h"
#include "update/ControllerDoubles.h"

namespace controller_test {

// A registry whose watch delivers the events a test pushes, on the watch
// thread, until it is stopped.
class CFakeRegistry : public CDeviceRegistry {
 public:
  std::vector<SHidEntry> ListHidInterfaces(uint32_t vendorId_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    std::vector<SHidEntry> result;
    for (const SHidEntry& entry : mEntries) {
      if (vendorId_I == 0 || entry.info.vendorId == vendorId_I) result.push_back(entry);
    }
    return result;
  }
  std::vector<SUsbEntry> ListUsbDevices(uint32_t) override { return {}; }
  bool OpenWatch() override { return mCanWatch; }
  void RunWatch(CRegistryWatcher& watcher_I) override {
    std::unique_lock<std::mutex> lock(mLock);
    while (true) {
      mChanged.wait(lock, [this] { return mStopped || !mEvents.empty(); });
      if (mStopped) return;
      auto [added, info] = mEvents.front();
      mEvents.pop_front();
      lock.unlock();
      if (added) {
        watcher_I.DeviceAdded(info);
      } else {
        watcher_I.DeviceRemoved(info);
      }
      lock.lock();
      ++mDelivered;
      mChanged.notify_all();
    }
  }
  void StopWatching() override {
    std::lock_guard<std::mutex> guard(mLock);
    mStopped = true;
    mChanged.notify_all();
  }

  void SetEntries(std::vector<SHidEntry> entries_I) {
    std::lock_guard<std::mutex> guard(mLock);
    mEntries = std::move(entries_I);
  }
  // Queues an event and waits until the watch thread has delivered it.
  void Deliver(bool added_I, const DeviceInfo& info_I) {
    std::unique_lock<std::mutex> lock(mLock);
    mEvents.emplace_back(added_I, info_I);
    const int target = mDelivered + static_cast<int>(mEvents.size());
    mChanged.notify_all();
    mChanged.wait(lock, [&] { return mDelivered >= target || mStopped; });
  }

  bool mCanWatch = true;

 private:
  std::mutex mLock;
  std::condition_variable mChanged;
  std::vector<SHidEntry> mEntries;
  std::deque<std::pair<bool, DeviceInfo>> mEvents;
  int mDelivered = 0;
  bool mStopped = false;
};

class CFakePower : public CPowerInhibitor {
 public:
  struct SLease : CPowerAssertion {
    explicit SLease(std::atomic<int>& held_I) : mHeld(held_I) { ++mHeld; }
    ~SLease() override { --mHeld; }
    std::atomic<int>& mHeld;
  };
  std::unique_ptr<CPowerAssertion> Create(const std::string& name_I) override {
    mLastName = name_I;
    ++mRequests;
    if (mRefuse) return nullptr;
    return std::make_unique<SLease>(mHeld);
  }
  bool mRefuse = false;
  std::atomic<int> mHeld{0};
  std::atomic<int> mRequests{0};
  std::string mLastName;
};

// Records what the driver asks of the application.
class CRecordingDelegate : public CApplicationDelegate {
 public:
  bool userLaunched() const override { return mUserLaunched; }
  void doStateMachine(ECONTROLLER_STATE state_I) override { mJournal.Add("state:" + std::to_string(state_I)); }
  void updateProgressBar(double percent_I) override { mJournal.Add("bar:" + std::to_string(percent_I)); }
  void notifyDialog(const std::string& text_I) override { mJournal.Add("dialog:" + text_I); }
  void terminate(ERunOutcome outcome_I) override {
    mJournal.Add("terminate");
    mOutcome = outcome_I;
  }
  ERunOutcome mOutcome = ERUN_SUCCESS;

  bool mUserLaunched = true;
  CJournal mJournal;
};

}  // namespace controller_test
