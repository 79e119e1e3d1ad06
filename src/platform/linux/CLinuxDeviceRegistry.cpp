#include "platform/linux/CLinuxDeviceRegistry.h"

#include <libudev.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <memory>

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "devices/HIDReportDescriptor.h"

namespace {

// The kernel caps report descriptors at 4096 bytes; anything far beyond is
// not a descriptor.
constexpr std::streamsize kMaxDescriptorSize = 64 * 1024;
constexpr int kBusNumberShift = 24;
constexpr int kFirstPortShift = 20;
constexpr int kPortBits = 4;
// Without a USB device the bus byte stays 0, which no USB bus number is.
constexpr int kNonUsbBusTypeShift = 16;

struct SUdevUnref {
  void operator()(udev* udev_I) const { udev_unref(udev_I); }
  void operator()(udev_enumerate* enumerate_I) const { udev_enumerate_unref(enumerate_I); }
  void operator()(udev_device* device_I) const { udev_device_unref(device_I); }
};
using UdevPtr = std::unique_ptr<udev, SUdevUnref>;
using EnumeratePtr = std::unique_ptr<udev_enumerate, SUdevUnref>;
using DevicePtr = std::unique_ptr<udev_device, SUdevUnref>;

bool ParseNumber(const char* text_I, int base_I, uint32_t& value_O) {
  if (text_I == nullptr || *text_I == '\0') return false;
  char* end = nullptr;
  errno = 0;
  const unsigned long value = std::strtoul(text_I, &end, base_I);
  if (errno != 0 || value > 0xFFFFFFFFul) return false;
  while (*end == ' ' || *end == '\n') ++end;
  if (*end != '\0') return false;
  value_O = static_cast<uint32_t>(value);
  return true;
}

bool ReadAttribute(udev_device* device_I, const char* name_I, int base_I, uint32_t& value_O) {
  return ParseNumber(udev_device_get_sysattr_value(device_I, name_I), base_I, value_O);
}

udev_device* UsbDeviceAbove(udev_device* device_I) {
  return udev_device_get_parent_with_subsystem_devtype(device_I, "usb", "usb_device");
}

// Ids, location and release number of a USB device. Borrowed pointer.
bool ReadUsbDevice(udev_device* usb_I, SUsbEntry& entry_O) {
  if (usb_I == nullptr) return false;
  if (!ReadAttribute(usb_I, "idVendor", 16, entry_O.vendorId) ||
      !ReadAttribute(usb_I, "idProduct", 16, entry_O.productId)) {
    return false;
  }
  uint32_t version = 0;
  entry_O.version =
      ReadAttribute(usb_I, "bcdDevice", 16, version) ? static_cast<uint16_t>(version) : 0;
  uint32_t busNumber = 0;
  const char* devpath = udev_device_get_sysattr_value(usb_I, "devpath");
  entry_O.locationId = ReadAttribute(usb_I, "busnum", 10, busNumber) && devpath != nullptr
                           ? CLinuxDeviceRegistry::LocationIdFromTopology(busNumber, devpath)
                           : 0;
  return true;
}

// The hub a USB device hangs behind; root hubs stand for no hub at all.
void ReadParentHub(udev_device* usb_I, uint32_t& vendorId_O, uint32_t& productId_O) {
  udev_device* hub = UsbDeviceAbove(usb_I);
  if (hub == nullptr || UsbDeviceAbove(hub) == nullptr) return;
  SUsbEntry hubEntry;
  if (!ReadUsbDevice(hub, hubEntry)) return;
  vendorId_O = hubEntry.vendorId;
  productId_O = hubEntry.productId;
}

bool ReadReportDescriptor(udev_device* hidraw_I, std::vector<uint8_t>& bytes_O) {
  udev_device* hid = udev_device_get_parent_with_subsystem_devtype(hidraw_I, "hid", nullptr);
  if (hid == nullptr) return false;
  std::ifstream in(std::string(udev_device_get_syspath(hid)) + "/report_descriptor",
                   std::ios::binary);
  if (!in) return false;
  bytes_O.resize(kMaxDescriptorSize);
  in.read(reinterpret_cast<char*>(bytes_O.data()), kMaxDescriptorSize);
  bytes_O.resize(static_cast<size_t>(in.gcount()));
  return !in.bad();
}

// A HID device with no USB device above it (Bluetooth, I2C, uhid): the ids
// come from its HID_ID ("BBBB:VVVVVVVV:PPPPPPPP"), the location from its bus
// type and the sequence number the HID core gave it ("...PPPP.NNNN"), which
// holds while it stays attached. There is no release number to read.
bool ReadNonUsbHid(udev_device* hidraw_I, SUsbEntry& entry_O) {
  udev_device* hid = udev_device_get_parent_with_subsystem_devtype(hidraw_I, "hid", nullptr);
  if (hid == nullptr) return false;
  const char* id = udev_device_get_property_value(hid, "HID_ID");
  const char* name = udev_device_get_sysname(hid);
  if (id == nullptr || name == nullptr) return false;
  const std::vector<std::string> fields = StringUtilities::Tokenize(id, ":", false);
  const char* dot = std::strrchr(name, '.');
  uint32_t busType = 0;
  uint32_t sequence = 0;
  if (fields.size() != 3 || dot == nullptr || !ParseNumber(fields[0].c_str(), 16, busType) ||
      !ParseNumber(fields[1].c_str(), 16, entry_O.vendorId) ||
      !ParseNumber(fields[2].c_str(), 16, entry_O.productId) ||
      !ParseNumber(dot + 1, 16, sequence)) {
    return false;
  }
  entry_O.locationId = CLinuxDeviceRegistry::LocationIdWithoutUsb(busType, sequence);
  entry_O.version = 0;
  return true;
}

// The identity shared by every usage pair of one hidraw node.
bool ReadInterfaceBase(udev_device* hidraw_I, SHidEntry& base_O) {
  udev_device* usb = UsbDeviceAbove(hidraw_I);
  SUsbEntry usbEntry;
  if (usb == nullptr ? !ReadNonUsbHid(hidraw_I, usbEntry) : !ReadUsbDevice(usb, usbEntry))
    return false;
  base_O.info.vendorId = usbEntry.vendorId;
  base_O.info.productId = usbEntry.productId;
  base_O.info.locationId = usbEntry.locationId;
  base_O.version = usbEntry.version;
  const char* node = udev_device_get_devnode(hidraw_I);
  base_O.nodePath = node != nullptr ? node : std::string();
  if (usb != nullptr) ReadParentHub(usb, base_O.parentUsbVendorId, base_O.parentUsbProductId);
  return true;
}

std::vector<SHidEntry> EntriesForPairs(
    const SHidEntry& base_I, const std::vector<HIDReportDescriptor::SUsagePair>& pairs_I) {
  std::vector<SHidEntry> entries;
  for (const auto& pair : pairs_I) {
    SHidEntry entry = base_I;
    entry.info.usage = pair.usage;
    entry.info.usagePage = pair.usagePage;
    entries.push_back(entry);
  }
  return entries;
}

// The identities watch events carry: one per top-level usage pair, or one
// with usage 0 where the descriptor gives none.
bool ReadWatchedIdentities(udev_device* hidraw_I, std::vector<DeviceInfo>& infos_O) {
  SHidEntry base;
  if (!ReadInterfaceBase(hidraw_I, base)) return false;
  infos_O.clear();
  std::vector<uint8_t> descriptor;
  if (ReadReportDescriptor(hidraw_I, descriptor)) {
    for (const auto& pair : HIDReportDescriptor::TopLevelUsagePairs(descriptor)) {
      DeviceInfo info = base.info;
      info.usage = pair.usage;
      info.usagePage = pair.usagePage;
      infos_O.push_back(info);
    }
  }
  if (infos_O.empty()) infos_O.push_back(base.info);
  return true;
}

template <typename Visit>
void ForEachDevice(udev* udev_I, const char* subsystem_I, Visit visit_I) {
  EnumeratePtr enumerate(udev_enumerate_new(udev_I));
  if (!enumerate) return;
  udev_enumerate_add_match_subsystem(enumerate.get(), subsystem_I);
  if (udev_enumerate_scan_devices(enumerate.get()) < 0) return;
  udev_list_entry* item = nullptr;
  udev_list_entry_foreach(item, udev_enumerate_get_list_entry(enumerate.get())) {
    DevicePtr device(udev_device_new_from_syspath(udev_I, udev_list_entry_get_name(item)));
    if (device) visit_I(device.get());
  }
}

}  // namespace

CLinuxDeviceRegistry::CLinuxDeviceRegistry() : mWakeFd(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

CLinuxDeviceRegistry::~CLinuxDeviceRegistry() {
  if (mMonitor != nullptr) udev_monitor_unref(mMonitor);
  if (mWatchUdev != nullptr) udev_unref(mWatchUdev);
  if (mWakeFd >= 0) close(mWakeFd);
}

uint32_t CLinuxDeviceRegistry::LocationIdFromTopology(uint32_t busNumber_I,
                                                      const std::string& devpath_I) {
  uint32_t locationId = (busNumber_I & 0xFF) << kBusNumberShift;
  int shift = kFirstPortShift;
  for (const std::string& port : StringUtilities::Tokenize(devpath_I, ".", false)) {
    if (shift < 0) break;
    uint32_t number = 0;
    if (!ParseNumber(port.c_str(), 10, number)) number = 0;
    locationId |= (number & ((1u << kPortBits) - 1)) << shift;
    shift -= kPortBits;
  }
  return locationId;
}

uint32_t CLinuxDeviceRegistry::LocationIdWithoutUsb(uint32_t busType_I, uint32_t sequence_I) {
  return (busType_I & 0xFF) << kNonUsbBusTypeShift | (sequence_I & 0xFFFF);
}

std::vector<SHidEntry> CLinuxDeviceRegistry::ListHidInterfaces(uint32_t vendorId_I) {
  std::vector<SHidEntry> entries;
  UdevPtr context(udev_new());
  if (!context) return entries;
  ForEachDevice(context.get(), "hidraw", [&](udev_device* hidraw_I) {
    SHidEntry base;
    if (!ReadInterfaceBase(hidraw_I, base)) return;
    if (vendorId_I != 0 && base.info.vendorId != vendorId_I) return;
    std::vector<uint8_t> descriptor;
    if (!ReadReportDescriptor(hidraw_I, descriptor)) return;
    const auto more = EntriesForPairs(base, HIDReportDescriptor::TopLevelUsagePairs(descriptor));
    entries.insert(entries.end(), more.begin(), more.end());
  });
  // Pairs of one node stay in collection order.
  std::stable_sort(entries.begin(), entries.end(), [](const SHidEntry& a_I, const SHidEntry& b_I) {
    return a_I.nodePath < b_I.nodePath;
  });
  return entries;
}

std::vector<SUsbEntry> CLinuxDeviceRegistry::ListUsbDevices(uint32_t vendorId_I) {
  std::vector<SUsbEntry> entries;
  UdevPtr context(udev_new());
  if (!context) return entries;
  ForEachDevice(context.get(), "usb", [&](udev_device* device_I) {
    const char* type = udev_device_get_devtype(device_I);
    if (type == nullptr || std::strcmp(type, "usb_device") != 0) return;
    SUsbEntry entry;
    if (!ReadUsbDevice(device_I, entry)) return;
    if (vendorId_I != 0 && entry.vendorId != vendorId_I) return;
    ReadParentHub(device_I, entry.parentUsbVendorId, entry.parentUsbProductId);
    entries.push_back(entry);
  });
  return entries;
}

bool CLinuxDeviceRegistry::OpenWatch() {
  if (mMonitor != nullptr) return true;
  if (mWakeFd < 0) return false;
  mWatchUdev = udev_new();
  if (mWatchUdev == nullptr) return false;
  // Without a udev daemon (an initramfs, a container) nothing is sent to
  // the "udev" group and a watch there would wait for ever; the kernel's own
  // events carry the same add and remove, and devtmpfs has made the node.
  const bool udevRunning = access("/run/udev/control", F_OK) == 0;
  mMonitor = udev_monitor_new_from_netlink(mWatchUdev, udevRunning ? "udev" : "kernel");
  if (mMonitor == nullptr ||
      udev_monitor_filter_add_match_subsystem_devtype(mMonitor, "hidraw", nullptr) < 0 ||
      udev_monitor_enable_receiving(mMonitor) < 0) {
    TavLog::Error("Registry: cannot watch hidraw devices\n");
    if (mMonitor != nullptr) udev_monitor_unref(mMonitor);
    mMonitor = nullptr;
    return false;
  }
  // Listed after the monitor is receiving, so nothing falls between the two.
  RememberPresentInterfaces();
  return true;
}

void CLinuxDeviceRegistry::RememberPresentInterfaces() {
  ForEachDevice(mWatchUdev, "hidraw", [this](udev_device* hidraw_I) {
    std::vector<DeviceInfo> infos;
    if (ReadWatchedIdentities(hidraw_I, infos))
      mKnownInterfaces[udev_device_get_syspath(hidraw_I)] = infos;
  });
}

void CLinuxDeviceRegistry::RunWatch(CRegistryWatcher& watcher_I) {
  if (mMonitor == nullptr) return;
  while (!mStopRequested) {
    pollfd fds[2] = {{udev_monitor_get_fd(mMonitor), POLLIN, 0}, {mWakeFd, POLLIN, 0}};
    if (poll(fds, 2, -1) < 0 && errno != EINTR) {
      TavLog::Error("Registry: watch failed: %s\n", std::strerror(errno));
      return;
    }
    // The revents are not looked at: a wake-up of either kind is answered
    // by checking the stop and reading every event that is waiting, since
    // the monitor's socket does not block.
    if (mStopRequested) return;
    DeliverPendingEvents(watcher_I);
  }
}

void CLinuxDeviceRegistry::DeliverPendingEvents(CRegistryWatcher& watcher_I) {
  while (!mStopRequested) {
    DevicePtr device(udev_monitor_receive_device(mMonitor));
    if (!device) return;
    DeliverEvent(device.get(), watcher_I);
  }
}

void CLinuxDeviceRegistry::DeliverEvent(udev_device* device_I, CRegistryWatcher& watcher_I) {
  const char* action = udev_device_get_action(device_I);
  const char* sysPath = udev_device_get_syspath(device_I);
  if (action == nullptr || sysPath == nullptr) return;
  if (std::strcmp(action, "add") == 0) {
    std::vector<DeviceInfo> infos;
    if (!ReadWatchedIdentities(device_I, infos)) return;
    auto known = mKnownInterfaces.find(sysPath);
    if (known != mKnownInterfaces.end()) {
      // Present when the watch opened and announced again: already known.
      if (known->second == infos) return;
      // A node cannot change identity in place; its departure was missed.
      const std::vector<DeviceInfo> gone = known->second;
      known->second = infos;
      for (const DeviceInfo& info : gone) watcher_I.DeviceRemoved(info);
    } else {
      mKnownInterfaces[sysPath] = infos;
    }
    for (const DeviceInfo& info : infos) watcher_I.DeviceAdded(info);
  } else if (std::strcmp(action, "remove") == 0) {
    auto known = mKnownInterfaces.find(sysPath);
    if (known == mKnownInterfaces.end()) return;
    const std::vector<DeviceInfo> infos = known->second;
    mKnownInterfaces.erase(known);
    for (const DeviceInfo& info : infos) watcher_I.DeviceRemoved(info);
  }
}

void CLinuxDeviceRegistry::StopWatching() {
  mStopRequested = true;
  if (mWakeFd >= 0) {
    const uint64_t one = 1;
    // A full counter already wakes the poll, so a failed write loses nothing.
    [[maybe_unused]] const ssize_t written = write(mWakeFd, &one, sizeof(one));
  }
}
