#pragma once
// The lab form of the USB control seam: the vendor-class interface of a
// board on the lab bus.

#include <memory>

#include "lab/CLabBus.h"
#include "seams/CUsbControl.h"

class CLabUsbControl : public CUsbControl {
 public:
  explicit CLabUsbControl(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}
  ~CLabUsbControl() override { Close(); }

  EUsbStatus Open(const DeviceInfo& info_I) override;
  EUsbStatus ClaimVendorInterface() override;
  uint16_t GetReleaseNumber() const override;
  EUsbStatus ControlTransfer(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                             uint16_t index_I, std::vector<uint8_t>& data_IO,
                             size_t& transferred_O) override;
  void Close() override;
  bool IsOpen() const override { return mOpen; }

 private:
  std::shared_ptr<CLabBus> mBus;
  CLabBus::SBinding mBinding;
  bool mOpen = false;
  bool mClaimed = false;
};
