#pragma once
// The lab form of the device registry seam: the lab bus's HID interfaces
// and USB devices, and its attach and detach events as the watch. Each lab
// HID interface has one usage pair, so every entry and event is that pair.
// Node paths read "lab:<location in hex>:<usage page>:<usage>"; the lab's
// HID node opens by DeviceInfo and needs no more. Vendor-class interfaces
// appear as USB devices only, never in the watch, as on Linux. An event is
// announced to the clock as work in flight until the watcher has taken it
// in, so that a virtual clock does not run a wait out before it arrives.

#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>

#include "common/CClock.h"
#include "lab/CLabBus.h"
#include "seams/CDeviceRegistry.h"

class CLabDeviceRegistry : public CDeviceRegistry {
 public:
  explicit CLabDeviceRegistry(std::shared_ptr<CLabBus> bus_I);
  ~CLabDeviceRegistry() override;
  CLabDeviceRegistry(const CLabDeviceRegistry&) = delete;
  CLabDeviceRegistry& operator=(const CLabDeviceRegistry&) = delete;

  std::vector<SHidEntry> ListHidInterfaces(uint32_t vendorId_I) override;
  std::vector<SUsbEntry> ListUsbDevices(uint32_t vendorId_I) override;
  bool OpenWatch() override;
  void RunWatch(CRegistryWatcher& watcher_I) override;
  void StopWatching() override;

  static std::string NodePathOf(const DeviceInfo& info_I);

 private:
  void DropEvents();

  struct SEvent {
    DeviceInfo info;
    bool added;
    std::shared_ptr<CClock> clock;  // holds still until the event is taken in
  };

  std::shared_ptr<CLabBus> mBus;
  int mListener = 0;
  std::mutex mLock;
  std::condition_variable mWake;
  std::deque<SEvent> mEvents;
  bool mStopRequested = false;
};
