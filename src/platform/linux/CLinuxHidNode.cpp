#include "platform/linux/CLinuxHidNode.h"

#include <fcntl.h>
#include <libudev.h>
#include <linux/hidraw.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <memory>

#include "platform/linux/HidReportDescriptor.h"
#include "platform/linux/LinuxErrno.h"
#include "platform/linux/LinuxUsbTopology.h"

namespace {

struct SUdevDeleter {
  void operator()(udev* handle_I) const { udev_unref(handle_I); }
  void operator()(udev_enumerate* handle_I) const { udev_enumerate_unref(handle_I); }
  void operator()(udev_device* handle_I) const { udev_device_unref(handle_I); }
};

unsigned long Attribute(udev_device* device_I, const char* name_I, int base_I) {
  const char* text = udev_device_get_sysattr_value(device_I, name_I);
  return text == nullptr ? 0 : std::strtoul(text, nullptr, base_I);
}

// The report descriptor of a hidraw node: the sysfs attribute of its HID
// parent.
std::vector<std::pair<uint16_t, uint16_t>> UsagesOf(udev_device* hidraw_I) {
  udev_device* hid = udev_device_get_parent_with_subsystem_devtype(hidraw_I, "hid", nullptr);
  if (hid == nullptr) return {};
  const char* syspath = udev_device_get_syspath(hid);
  if (syspath == nullptr) return {};
  const std::string path = std::string(syspath) + "/report_descriptor";
  std::vector<uint8_t> descriptor(4096);
  const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return {};
  const ssize_t length = ::read(fd, descriptor.data(), descriptor.size());
  ::close(fd);
  if (length <= 0) return {};
  return HidTopLevelUsages(descriptor.data(), static_cast<size_t>(length));
}

}  // namespace

bool CLinuxHidNode::FindNode(const DeviceInfo& info_I, std::string& node_O, uint16_t& release_O) {
  std::unique_ptr<udev, SUdevDeleter> context(udev_new());
  if (!context) return false;
  std::unique_ptr<udev_enumerate, SUdevDeleter> enumerate(udev_enumerate_new(context.get()));
  if (!enumerate) return false;
  udev_enumerate_add_match_subsystem(enumerate.get(), "hidraw");
  udev_enumerate_scan_devices(enumerate.get());
  udev_list_entry* entry = nullptr;
  udev_list_entry_foreach(entry, udev_enumerate_get_list_entry(enumerate.get())) {
    std::unique_ptr<udev_device, SUdevDeleter> hidraw(
        udev_device_new_from_syspath(context.get(), udev_list_entry_get_name(entry)));
    if (!hidraw) continue;
    udev_device* usb =
        udev_device_get_parent_with_subsystem_devtype(hidraw.get(), "usb", "usb_device");
    const char* node = udev_device_get_devnode(hidraw.get());
    if (usb == nullptr || node == nullptr) continue;
    const char* devpath = udev_device_get_sysattr_value(usb, "devpath");
    const uint32_t location = LocationIdFromTopology(
        static_cast<unsigned int>(Attribute(usb, "busnum", 10)), devpath ? devpath : "");
    if (Attribute(usb, "idVendor", 16) != info_I.vendorId ||
        Attribute(usb, "idProduct", 16) != info_I.productId || location != info_I.locationId) {
      continue;
    }
    for (const auto& [page, usage] : UsagesOf(hidraw.get())) {
      if (page == info_I.usagePage && usage == info_I.usage) {
        node_O = node;
        release_O = static_cast<uint16_t>(Attribute(usb, "bcdDevice", 16));
        return true;
      }
    }
  }
  return false;
}

EHidStatus CLinuxHidNode::Open(const DeviceInfo& info_I) {
  Close();
  std::string node;
  uint16_t release = 0;
  if (!FindNode(info_I, node, release)) return EHidStatus::eGone;
  const int fd = ::open(node.c_str(), O_RDWR | O_CLOEXEC);
  if (fd < 0) return HidStatusFromErrno(errno);
  // hidraw has no exclusive open of its own; an advisory lock keeps two
  // updaters off one interface.
  if (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
    const int error = errno;
    ::close(fd);
    return HidStatusFromErrno(error);
  }
  mFd = fd;
  mRelease = release;
  mNodePath = node;
  return EHidStatus::eSuccess;
}

void CLinuxHidNode::Close() {
  if (mFd < 0) return;
  ::close(mFd);  // releases the lock too
  mFd = -1;
  mRelease = 0;
  mNodePath.clear();
}

EHidStatus CLinuxHidNode::SetFeatureReport(const std::vector<uint8_t>& report_I) {
  if (mFd < 0) return EHidStatus::eGone;
  if (report_I.empty()) return EHidStatus::eOther;
  std::vector<uint8_t> buffer = report_I;
  int result = 0;
  do {
    result = ::ioctl(mFd, HIDIOCSFEATURE(buffer.size()), buffer.data());
  } while (result < 0 && errno == EINTR);
  return result < 0 ? HidStatusFromErrno(errno) : EHidStatus::eSuccess;
}

EHidStatus CLinuxHidNode::GetFeatureReport(std::vector<uint8_t>& report_IO) {
  if (mFd < 0) return EHidStatus::eGone;
  if (report_IO.empty()) return EHidStatus::eOther;
  int result = 0;
  do {
    result = ::ioctl(mFd, HIDIOCGFEATURE(report_IO.size()), report_IO.data());
  } while (result < 0 && errno == EINTR);
  return result < 0 ? HidStatusFromErrno(errno) : EHidStatus::eSuccess;
}
