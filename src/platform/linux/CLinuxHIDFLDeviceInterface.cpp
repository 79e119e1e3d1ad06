#include "platform/linux/CLinuxHIDFLDeviceInterface.h"

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "devices/IOUtils.h"
#include "platform/linux/LinuxPlatformConstants.h"

CLinuxHIDFLDeviceInterface::CLinuxHIDFLDeviceInterface(const DeviceInfo& info_I,
                                                       std::unique_ptr<CHidNode> node_I)
    : CHIDFLDeviceInterface(), mNode(std::move(node_I)) {
  SetIdentity(info_I);
}

CLinuxHIDFLDeviceInterface::~CLinuxHIDFLDeviceInterface() { Close(); }

bool CLinuxHIDFLDeviceInterface::Open() {
  const DeviceInfo info = RebuildInfo();
  if (IsAlive()) return true;
  Close();
  mIsOpen = OpenInterface(info);
  return mIsOpen;
}

bool CLinuxHIDFLDeviceInterface::OpenInterface(const DeviceInfo& info_I) {
  if (!mNode) return false;
  EHidStatus status = mNode->Open(info_I);
  if (status == EHidStatus::eBusy) {
    TavSleep(LinuxPlatform::kExclusiveOpenRetryWait);
    status = mNode->Open(info_I);
  }
  if (status != EHidStatus::eSuccess) {
    TavLog::Info("HID open of %s failed: %s\n", PathFromInfo(info_I).c_str(),
                 HidStatusName(status));
    return false;
  }
  mPath = PathFromInfo(info_I);
  mVersion = mNode->GetReleaseNumber();
  return true;
}

void CLinuxHIDFLDeviceInterface::Close() {
  if (!IsOpen() || !mNode) return;
  mNode->Close();
  mIsOpen = false;
}

bool CLinuxHIDFLDeviceInterface::Write(std::vector<uint8_t>& data_IO) {
  if (data_IO.empty()) TAVASSERT_TEXT("data_I.size()");
  if (!mNode) return true;
  const EHidStatus status = mNode->SetFeatureReport(data_IO);
  // Controllers stall the status stage of some reports they have taken.
  return status == EHidStatus::eSuccess || status == EHidStatus::eStall;
}

bool CLinuxHIDFLDeviceInterface::Read(std::vector<uint8_t>& data_IO) {
  if (data_IO.empty()) TAVASSERT_TEXT("data_I.size()");
  if (!mNode) return true;
  return mNode->GetFeatureReport(data_IO) == EHidStatus::eSuccess;
}

bool CLinuxHIDFLDeviceInterface::GetAttributes() {
  mPath = PathFromInfo(RebuildInfo());
  return true;
}

// The boards of one product share a USB ancestor: `topology_I` says how many
// levels up it is, so equal texts mean one product.
std::string CLinuxHIDFLDeviceInterface::GetBasePath(uint8_t topology_I) {
  return IOUtils::BasePathFromInfo(RebuildInfo(), topology_I);
}
