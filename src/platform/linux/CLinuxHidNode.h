#pragma once
// The Linux form of the HID node seam: the hidraw node that the device
// registry lists for the interface (vendor id, product id, location and one
// top-level usage pair), opened read-write and held exclusively by an
// advisory lock, and spoken to with HIDIOCSFEATURE and HIDIOCGFEATURE.
//
// errno stays inside: EPIPE is a stall, EBUSY (or the lock held by another
// process) busy, ENODEV, ENXIO, ENOENT and ESHUTDOWN gone, ETIMEDOUT a
// time-out, EACCES and EPERM denied, anything else other.

#include <memory>
#include <string>

#include "seams/CDeviceRegistry.h"
#include "seams/CHidNode.h"

class CLinuxHidNode : public CHidNode {
 public:
  // Without a registry, the Linux one over libudev.
  explicit CLinuxHidNode(std::shared_ptr<CDeviceRegistry> registry_I = nullptr);
  ~CLinuxHidNode() override { Close(); }
  CLinuxHidNode(const CLinuxHidNode&) = delete;
  CLinuxHidNode& operator=(const CLinuxHidNode&) = delete;

  EHidStatus Open(const DeviceInfo& info_I) override;
  void Close() override;
  bool IsOpen() const override { return mFd >= 0; }
  uint16_t GetReleaseNumber() const override { return mFd >= 0 ? mRelease : 0; }
  EHidStatus SetFeatureReport(const std::vector<uint8_t>& report_I) override;
  EHidStatus GetFeatureReport(std::vector<uint8_t>& report_IO) override;

  // The node that Open found, as "/dev/hidrawN"; empty when closed.
  const std::string& GetNodePath() const { return mNodePath; }

  // The hidraw node of the interface `info_I` names, and its device's
  // release number; false when nothing attached matches.
  bool FindNode(const DeviceInfo& info_I, std::string& node_O, uint16_t& release_O);

 private:
  std::shared_ptr<CDeviceRegistry> mRegistry;
  int mFd = -1;
  uint16_t mRelease = 0;
  std::string mNodePath;
};
