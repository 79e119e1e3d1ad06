#include "platform/linux/CLinuxBulkFLDeviceInterface.h"

#include <algorithm>

#include "common/CClock.h"
#include "common/TavLog.h"
#include "devices/IOUtils.h"
#include "platform/linux/LinuxPlatformConstants.h"

CLinuxBulkFLDeviceInterface::CLinuxBulkFLDeviceInterface(const DeviceInfo& info_I,
                                                         std::unique_ptr<CUsbControl> usb_I)
    : CBulkFLDeviceInterface(), mUsb(std::move(usb_I)) {
  SetIdentity(info_I);
}

CLinuxBulkFLDeviceInterface::~CLinuxBulkFLDeviceInterface() { Close(); }

// The boards of one product share a USB ancestor: `topology_I` says how many
// levels up it is, so equal texts mean one product.
std::string CLinuxBulkFLDeviceInterface::GetBasePath(uint8_t topology_I) {
  return IOUtils::BasePathFromInfo(RebuildInfo(), topology_I);
}

bool CLinuxBulkFLDeviceInterface::Open() {
  const DeviceInfo info = RebuildInfo();
  mPath = PathFromInfo(info);
  if (IsAlive()) return true;
  Close();
  if (!mUsb) return false;
  const EUsbStatus status = mUsb->Open(info);
  if (status != EUsbStatus::eSuccess) {
    TavLog::Info("USB open of %s failed: %s\n", mPath.c_str(), UsbStatusName(status));
    return false;
  }
  mVersion = mUsb->GetReleaseNumber() & 0xFFFF;
  mIsOpen = OpenInterface();
  if (!mIsOpen) mUsb->Close();
  return mIsOpen;
}

bool CLinuxBulkFLDeviceInterface::OpenInterface() {
  mVersion = mUsb->GetReleaseNumber();
  EUsbStatus status = mUsb->ClaimVendorInterface();
  for (int retry = 0; status != EUsbStatus::eSuccess && retry < LinuxPlatform::kClaimRetries;
       ++retry) {
    // Only a holder that may let go is worth waiting for.
    if (status != EUsbStatus::eBusy) break;
    TavLog::Info("Failed to open Touch Interface... retrying\n");
    TavSleep(LinuxPlatform::kClaimRetryWait);
    status = mUsb->ClaimVendorInterface();
  }
  if (status != EUsbStatus::eSuccess) {
    TavLog::Error("USBInterfaceOpen Unable to open interface!\n");
    TavLog::Error("Could not open interface\n");
    return false;
  }
  return true;
}

void CLinuxBulkFLDeviceInterface::Close() {
  if (mIsOpen && mUsb) {
    mUsb->Close();
    mIsOpen = false;
  }
}

bool CLinuxBulkFLDeviceInterface::DeviceRequest(uint8_t requestType_I, uint8_t request_I,
                                                uint16_t value_I, uint16_t index_I,
                                                uint16_t length_I, size_t bufferSize_I) {
  if (!mUsb) return false;
  std::vector<uint8_t> buffer(std::min<size_t>(length_I, bufferSize_I), 0);
  size_t transferred = 0;
  return mUsb->ControlTransfer(requestType_I, request_I, value_I, index_I, buffer, transferred) ==
         EUsbStatus::eSuccess;
}

bool CLinuxBulkFLDeviceInterface::VectorRequest(const std::vector<uint8_t>& data_I) {
  auto field = [&](size_t index_I) -> uint8_t {
    return index_I < data_I.size() ? data_I[index_I] : 0;
  };
  const bool accepted = DeviceRequest(field(0), field(1), field(3), field(2), field(4),
                                      LinuxPlatform::kBulkRequestBufferSize);
  if (!accepted) TavLog::Error("Bulk Read/Write: Device Request Failed\n");
  return accepted;
}

bool CLinuxBulkFLDeviceInterface::Write(std::vector<uint8_t>& data_IO) {
  return VectorRequest(data_IO);
}

bool CLinuxBulkFLDeviceInterface::Read(std::vector<uint8_t>& data_IO) {
  return VectorRequest(data_IO);
}
