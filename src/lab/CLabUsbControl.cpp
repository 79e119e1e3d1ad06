#include "lab/CLabUsbControl.h"

// The bus binds the device and its vendor interface together; opening it
// is what takes it from other holders, so the claim only checks the board
// is still there.
EUsbStatus CLabUsbControl::Open(const DeviceInfo& info_I) {
  Close();
  const EUsbStatus status = mBus->OpenUsb(info_I, mBinding);
  mOpen = status == EUsbStatus::eSuccess;
  return status;
}

EUsbStatus CLabUsbControl::ClaimVendorInterface() {
  if (!mOpen) return EUsbStatus::eGone;
  if (!mBus->IsCurrent(mBinding)) return EUsbStatus::eGone;
  mClaimed = true;
  return EUsbStatus::eSuccess;
}

uint16_t CLabUsbControl::GetReleaseNumber() const {
  return mOpen ? mBus->ReleaseNumberOf(mBinding) : 0;
}

EUsbStatus CLabUsbControl::ControlTransfer(uint8_t requestType_I, uint8_t request_I,
                                           uint16_t value_I, uint16_t index_I,
                                           std::vector<uint8_t>& data_IO, size_t& transferred_O) {
  transferred_O = 0;
  if (!mOpen) return EUsbStatus::eGone;
  return mBus->Control(mBinding, requestType_I, request_I, value_I, index_I, data_IO,
                       transferred_O);
}

void CLabUsbControl::Close() {
  if (!mOpen) return;
  mBus->Release(mBinding);
  mOpen = false;
  mClaimed = false;
}
