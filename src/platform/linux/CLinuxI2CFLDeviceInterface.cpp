#include "platform/linux/CLinuxI2CFLDeviceInterface.h"

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "devices/IOUtils.h"
#include "platform/linux/LinuxPlatformConstants.h"

CLinuxI2CFLDeviceInterface::CLinuxI2CFLDeviceInterface(const DeviceInfo& info_I,
                                                       std::unique_ptr<CHidNode> node_I)
    : CI2CFLDeviceInterface(), mNode(std::move(node_I)) {
  SetIdentity(info_I);
}

CLinuxI2CFLDeviceInterface::~CLinuxI2CFLDeviceInterface() { Close(); }

// The boards of one product share a USB ancestor: `topology_I` says how many
// levels up it is, so equal texts mean one product.
std::string CLinuxI2CFLDeviceInterface::GetBasePath(uint8_t topology_I) {
  return IOUtils::BasePathFromInfo(RebuildInfo(), topology_I);
}

bool CLinuxI2CFLDeviceInterface::Open() {
  const DeviceInfo info = RebuildInfo();
  mPath = PathFromInfo(info);
  if (IsAlive()) return true;
  Close();
  if (!mNode) return false;
  EHidStatus status = mNode->Open(info);
  if (status == EHidStatus::eBusy) {
    TavSleep(LinuxPlatform::kExclusiveOpenRetryWait);
    status = mNode->Open(info);
  }
  if (status != EHidStatus::eSuccess) {
    TavLog::Info("I2C master open of %s failed: %s\n", mPath.c_str(), HidStatusName(status));
    mIsOpen = false;
    return false;
  }
  mVersion = mNode->GetReleaseNumber();
  mIsOpen = true;
  return true;
}

void CLinuxI2CFLDeviceInterface::Close() {
  if (!IsOpen() || !mNode) return;
  mNode->Close();
  mIsOpen = false;
}

bool CLinuxI2CFLDeviceInterface::WriteMaster(std::vector<uint8_t>& data_IO) {
  if (data_IO.empty()) TAVASSERT_TEXT("data_I.size()");
  if (!mNode) return true;
  return mNode->SetFeatureReport(data_IO) == EHidStatus::eSuccess;
}

bool CLinuxI2CFLDeviceInterface::ReadMaster(std::vector<uint8_t>& data_IO) {
  if (data_IO.empty()) TAVASSERT_TEXT("data_I.size()");
  if (!mNode) return true;
  return mNode->GetFeatureReport(data_IO) == EHidStatus::eSuccess;
}
