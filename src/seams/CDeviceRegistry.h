#pragma once
// The device registry seam: what is attached, and when that changes.
//
// Linux form: libudev over subsystem "hidraw" (and "usb" for the USB device
// list), with a netlink monitor for the watch. Lab form: the lab bus.
//
// Contract:
// - ListHidInterfaces() gives one SHidEntry per top-level usage pair of every
//   HID interface whose USB device is from `vendorId_I` (0 lists all). An
//   interface whose report descriptor cannot be read gives no entry.
//   Entries come in a stable order: by node path, then by collection order.
// - ListUsbDevices() gives one SUsbEntry per USB device from `vendorId_I`
//   (0 lists all).
// - OpenWatch() sets up the watch of HID attach and detach without blocking;
//   false when it cannot be set up. RunWatch() then blocks on the calling
//   thread and calls the watcher for every HID interface that is added or
//   removed, until StopWatching() is called from another thread (a stop that
//   came first ends the next RunWatch at once). Each top-level usage
//   pair of the interface gets an event of its own, with the identity its
//   ListHidInterfaces entry has, so that a watcher matching on one pair sees
//   an interface whose first collection is another. A removal carries the identity
//   the interface had when it was added, since a removed node can no longer
//   be read. Events of one watch arrive on the RunWatch thread, in order.
// - Errors never leave the seam as errno values: a list that cannot be read
//   is an empty list.

#include <cstdint>
#include <string>
#include <vector>

#include "common/TavTypes.h"

struct SHidEntry {
  DeviceInfo info;                  // ids, location id and one usage pair
  std::string nodePath;             // what the HID node seam opens
  uint16_t version = 0;             // the USB device's release number (bcdDevice)
  uint32_t parentUsbVendorId = 0;   // the USB device this one hangs behind (a hub),
  uint32_t parentUsbProductId = 0;  // 0 when it sits on a root port
};

struct SUsbEntry {
  uint32_t vendorId = 0;
  uint32_t productId = 0;
  uint32_t locationId = 0;
  uint16_t version = 0;
  uint32_t parentUsbVendorId = 0;  // as for SHidEntry
  uint32_t parentUsbProductId = 0;
};

class CRegistryWatcher {
 public:
  virtual ~CRegistryWatcher() = default;
  virtual void DeviceAdded(const DeviceInfo& info_I) = 0;
  virtual void DeviceRemoved(const DeviceInfo& info_I) = 0;
};

class CDeviceRegistry {
 public:
  virtual ~CDeviceRegistry() = default;
  virtual std::vector<SHidEntry> ListHidInterfaces(uint32_t vendorId_I) = 0;
  virtual std::vector<SUsbEntry> ListUsbDevices(uint32_t vendorId_I) = 0;
  virtual bool OpenWatch() = 0;
  virtual void RunWatch(CRegistryWatcher& watcher_I) = 0;
  virtual void StopWatching() = 0;
};
