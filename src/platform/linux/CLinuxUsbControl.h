#pragma once
// The Linux form of the USB control seam: the device is found through
// libudev by vendor id, product id and location, then opened with libusb-1.0
// by its bus number and address. Claiming its vendor-class interface takes
// it from a bound kernel driver, which Close gives back.
//
// libusb results stay inside: LIBUSB_ERROR_PIPE is a stall, _BUSY busy,
// _NO_DEVICE and _NOT_FOUND gone, _TIMEOUT a time-out, _ACCESS denied,
// anything else other.

#include <libusb.h>

#include "seams/CUsbControl.h"

class CLinuxUsbControl : public CUsbControl {
 public:
  CLinuxUsbControl() = default;
  ~CLinuxUsbControl() override;
  CLinuxUsbControl(const CLinuxUsbControl&) = delete;
  CLinuxUsbControl& operator=(const CLinuxUsbControl&) = delete;

  EUsbStatus Open(const DeviceInfo& info_I) override;
  EUsbStatus ClaimVendorInterface() override;
  uint16_t GetReleaseNumber() const override { return mHandle != nullptr ? mRelease : 0; }
  EUsbStatus ControlTransfer(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                             uint16_t index_I, std::vector<uint8_t>& data_IO,
                             size_t& transferred_O) override;
  void Close() override;
  bool IsOpen() const override { return mHandle != nullptr; }

  // The bus number and address of the attached device that `info_I`
  // names, and its release number; false when nothing matches.
  static bool FindDevice(const DeviceInfo& info_I, int& bus_O, int& address_O, uint16_t& release_O);

 private:
  libusb_context* mContext = nullptr;
  libusb_device_handle* mHandle = nullptr;
  uint16_t mRelease = 0;
  int mClaimed = -1;  // the claimed interface's number
  bool mDriverDetached = false;
};
