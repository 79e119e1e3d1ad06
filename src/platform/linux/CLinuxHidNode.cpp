#include "platform/linux/CLinuxHidNode.h"

#include <fcntl.h>
#include <linux/hidraw.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/LinuxErrno.h"

CLinuxHidNode::CLinuxHidNode(std::shared_ptr<CDeviceRegistry> registry_I)
    : mRegistry(registry_I ? std::move(registry_I) : std::make_shared<CLinuxDeviceRegistry>()) {}

bool CLinuxHidNode::FindNode(const DeviceInfo& info_I, std::string& node_O, uint16_t& release_O) {
  for (const SHidEntry& entry : mRegistry->ListHidInterfaces(info_I.vendorId)) {
    if (entry.info == info_I && !entry.nodePath.empty()) {
      node_O = entry.nodePath;
      release_O = entry.version;
      return true;
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
