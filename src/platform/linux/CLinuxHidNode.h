#pragma once
// The Linux form of the HID node seam: a hidraw node, found through libudev
// by the USB device's vendor id, product id and location and the report
// descriptor's top-level usages, opened read-write and held exclusively by
// an advisory lock, and spoken to with HIDIOCSFEATURE and HIDIOCGFEATURE.
//
// errno stays inside: EPIPE is a stall, EBUSY (or the lock held by another
// process) busy, ENODEV, ENXIO, ENOENT and ESHUTDOWN gone, ETIMEDOUT a
// time-out, EACCES and EPERM denied, anything else other.

#include <string>

#include "seams/CHidNode.h"

class CLinuxHidNode : public CHidNode {
 public:
  CLinuxHidNode() = default;
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
  static bool FindNode(const DeviceInfo& info_I, std::string& node_O, uint16_t& release_O);

 private:
  int mFd = -1;
  uint16_t mRelease = 0;
  std::string mNodePath;
};
