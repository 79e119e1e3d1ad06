#include "lab/CLabDeviceRegistry.h"

#include <algorithm>
#include <cstdio>

#include "common/CClock.h"

CLabDeviceRegistry::CLabDeviceRegistry(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}

CLabDeviceRegistry::~CLabDeviceRegistry() {
  if (mListener != 0) mBus->RemoveListener(mListener);
  DropEvents();
}

void CLabDeviceRegistry::DropEvents() {
  std::lock_guard<std::mutex> guard(mLock);
  for (const SEvent& event : mEvents) event.clock->EndWork();
  mEvents.clear();
}

std::string CLabDeviceRegistry::NodePathOf(const DeviceInfo& info_I) {
  char text[64];
  std::snprintf(text, sizeof(text), "lab:%08X:%04X:%04X", info_I.locationId, info_I.usagePage,
                info_I.usage);
  return text;
}

std::vector<SHidEntry> CLabDeviceRegistry::ListHidInterfaces(uint32_t vendorId_I) {
  std::vector<SHidEntry> entries;
  for (const SLabInterface& interface : mBus->ListInterfaces()) {
    if (interface.link != ELabLink::eHid) continue;
    if (vendorId_I != 0 && interface.info.vendorId != vendorId_I) continue;
    SHidEntry entry;
    entry.info = interface.info;
    entry.nodePath = NodePathOf(interface.info);
    entry.version = interface.release;
    entries.push_back(entry);
  }
  std::stable_sort(entries.begin(), entries.end(),
                   [](const SHidEntry& a, const SHidEntry& b) { return a.nodePath < b.nodePath; });
  return entries;
}

std::vector<SUsbEntry> CLabDeviceRegistry::ListUsbDevices(uint32_t vendorId_I) {
  std::vector<SUsbEntry> devices;
  for (const SLabInterface& interface : mBus->ListInterfaces()) {
    if (vendorId_I != 0 && interface.info.vendorId != vendorId_I) continue;
    const bool known = std::any_of(devices.begin(), devices.end(), [&](const SUsbEntry& entry) {
      return entry.locationId == interface.info.locationId;
    });
    if (known) continue;
    SUsbEntry entry;
    entry.vendorId = interface.info.vendorId;
    entry.productId = interface.info.productId;
    entry.locationId = interface.info.locationId;
    entry.version = interface.release;
    devices.push_back(entry);
  }
  return devices;
}

bool CLabDeviceRegistry::OpenWatch() {
  if (mListener != 0) return true;
  mListener = mBus->AddListener([this](const SLabInterface& interface_I, bool attached_I) {
    if (interface_I.link != ELabLink::eHid) return;
    {
      std::lock_guard<std::mutex> guard(mLock);
      // Until the watcher has taken it in, a virtual clock holds still.
      mEvents.push_back({interface_I.info, attached_I, CClock::Get()});
      mEvents.back().clock->BeginWork();
    }
    mWake.notify_all();
  });
  return true;
}

void CLabDeviceRegistry::RunWatch(CRegistryWatcher& watcher_I) {
  std::unique_lock<std::mutex> lock(mLock);
  while (true) {
    mWake.wait(lock, [this] { return mStopRequested || !mEvents.empty(); });
    if (mStopRequested) {
      mStopRequested = false;
      return;
    }
    const SEvent event = mEvents.front();
    mEvents.pop_front();
    // The watcher may take its time; the bus must not wait for it.
    lock.unlock();
    if (event.added) {
      watcher_I.DeviceAdded(event.info);
    } else {
      watcher_I.DeviceRemoved(event.info);
    }
    event.clock->EndWork();
    lock.lock();
  }
}

void CLabDeviceRegistry::StopWatching() {
  {
    std::lock_guard<std::mutex> guard(mLock);
    mStopRequested = true;
  }
  mWake.notify_all();
  // Nobody takes them in any more.
  DropEvents();
}
