#pragma once
// The device registry on Linux, over libudev.
//
// HID interfaces are the hidraw nodes whose HID device sits on a USB
// interface: ids and release number (bcdDevice) come from the USB device,
// the usage pairs from the HID device's sysfs report descriptor, the
// location id from the USB topology (bus number in bits 31-24, then one
// nibble per port of devpath from bit 23 down: bus 1, "2.3" gives
// 0x01230000). A HID interface with no USB device above it (Bluetooth, I2C,
// uhid) takes its ids from the HID device, location LocationIdWithoutUsb of
// its bus type and sequence number, and release number 0.
//
// The watch is a udev netlink monitor on subsystem "hidraw", on the
// kernel's events where no udev daemon runs. It remembers
// the identity of every interface present when the watch was opened or
// added since, so that a removal carries it. Each top-level usage pair of an
// interface gets its own event; one whose report descriptor gives none is
// reported with usage and page 0.
//
// Each listing uses a udev context of its own, so lists may be asked for on
// one thread while RunWatch runs on another.

#include <atomic>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "seams/CDeviceRegistry.h"

struct udev;
struct udev_device;
struct udev_monitor;

class CLinuxDeviceRegistry : public CDeviceRegistry {
 public:
  CLinuxDeviceRegistry();
  ~CLinuxDeviceRegistry() override;
  CLinuxDeviceRegistry(const CLinuxDeviceRegistry&) = delete;
  CLinuxDeviceRegistry& operator=(const CLinuxDeviceRegistry&) = delete;

  std::vector<SHidEntry> ListHidInterfaces(uint32_t vendorId_I) override;
  std::vector<SUsbEntry> ListUsbDevices(uint32_t vendorId_I) override;
  bool OpenWatch() override;
  void RunWatch(CRegistryWatcher& watcher_I) override;
  void StopWatching() override;

  // Ports beyond 15 keep their low nibble; ports past the sixth are dropped.
  static uint32_t LocationIdFromTopology(uint32_t busNumber_I, const std::string& devpath_I);
  // Bus byte 0, the HID bus type in bits 23-16, the HID device's sequence
  // number in the low 16 bits: unique while attached, never a USB location.
  static uint32_t LocationIdWithoutUsb(uint32_t busType_I, uint32_t sequence_I);

 private:
  void RememberPresentInterfaces();
  void DeliverPendingEvents(CRegistryWatcher& watcher_I);
  void DeliverEvent(udev_device* device_I, CRegistryWatcher& watcher_I);

  udev* mWatchUdev = nullptr;
  udev_monitor* mMonitor = nullptr;
  // Written by StopWatching to wake RunWatch's poll.
  int mWakeFd = -1;
  std::atomic<bool> mStopRequested{false};
  // Identity of each watched interface by its sys path; RunWatch's thread
  // only, after OpenWatch.
  std::map<std::string, std::vector<DeviceInfo>> mKnownInterfaces;
};
