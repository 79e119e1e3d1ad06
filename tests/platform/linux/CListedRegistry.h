#pragma once
// A device registry that lists exactly the entries a test puts in it, and
// has no watch.

#include <vector>

#include "seams/CDeviceRegistry.h"

class CListedRegistry : public CDeviceRegistry {
 public:
  std::vector<SHidEntry> ListHidInterfaces(uint32_t vendorId_I) override {
    std::vector<SHidEntry> entries;
    for (const SHidEntry& entry : hid) {
      if (vendorId_I == 0 || entry.info.vendorId == vendorId_I) entries.push_back(entry);
    }
    return entries;
  }
  std::vector<SUsbEntry> ListUsbDevices(uint32_t vendorId_I) override {
    std::vector<SUsbEntry> entries;
    for (const SUsbEntry& entry : usb) {
      if (vendorId_I == 0 || entry.vendorId == vendorId_I) entries.push_back(entry);
    }
    return entries;
  }
  bool OpenWatch() override { return false; }
  void RunWatch(CRegistryWatcher&) override {}
  void StopWatching() override {}

  void AddHid(const DeviceInfo& info_I, uint32_t parentVendor_I = 0, uint32_t parentProduct_I = 0) {
    hid.push_back(SHidEntry{info_I, "node", 0, parentVendor_I, parentProduct_I});
  }

  std::vector<SHidEntry> hid;
  std::vector<SUsbEntry> usb;
};
