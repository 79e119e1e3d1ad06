#pragma once
// The USB control seam: control requests on endpoint 0 of a USB device
// that carries a vendor-class interface (class 0xFF, subclass 0). The Linux
// form is libusb-1.0; the lab form is the emulated board on that device.
//
// Results keep apart what the logic above must tell apart; no errno or
// libusb number ever leaves a form of this seam.
//
// Threads: one caller at a time per object. Every call returns; a control
// transfer is bounded by kUsbControlTimeoutMs.

#include <cstddef>
#include <cstdint>
#include <vector>

#include "common/TavTypes.h"

enum class EUsbStatus {
  eSuccess,
  eStall,    // the device stalled the request (EPIPE)
  eBusy,     // another holder has the interface or the device (EBUSY)
  eGone,     // no such device attached, or it went away (ENODEV)
  eTimeout,  // the request timed out
  eDenied,   // no permission to open the device (EACCES)
  eOther,    // any other failure
};

inline const char* UsbStatusName(EUsbStatus status_I) {
  switch (status_I) {
    case EUsbStatus::eSuccess: return "success";
    case EUsbStatus::eStall: return "stall";
    case EUsbStatus::eBusy: return "busy";
    case EUsbStatus::eGone: return "gone";
    case EUsbStatus::eTimeout: return "timeout";
    case EUsbStatus::eDenied: return "denied";
    case EUsbStatus::eOther: return "other";
  }
  return "other";
}

// Every control transfer of the program waits at most this long.
inline constexpr unsigned int kUsbControlTimeoutMs = 1000;

class CUsbControl {
 public:
  virtual ~CUsbControl() = default;

  // Opens the attached USB device with the vendor id, product id and
  // location id of `info_I` (usage and usage page are not looked at). eGone:
  // nothing attached matches. Opening an open object closes it first.
  virtual EUsbStatus Open(const DeviceInfo& info_I) = 0;

  // Claims the device's first vendor-class interface (class 0xFF, subclass
  // 0), taking it from a bound kernel driver first. eBusy: another holder
  // has it; the caller decides whether to wait and try again. eOther: the
  // device has no such interface. Needs an open device.
  virtual EUsbStatus ClaimVendorInterface() = 0;

  // The device release number (bcdDevice); 0 when closed.
  virtual uint16_t GetReleaseNumber() const = 0;

  // One control transfer on endpoint 0. The data stage is `data_IO`, whose
  // size is wLength: sent for a host-to-device request, filled for a
  // device-to-host one (bit 7 of `requestType_I`), where `transferred_O`
  // receives the count the device returned. On a closed object: eGone.
  virtual EUsbStatus ControlTransfer(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                                     uint16_t index_I, std::vector<uint8_t>& data_IO,
                                     size_t& transferred_O) = 0;

  // Releases a claimed interface, gives it back to the kernel driver it was
  // taken from, and closes the device. Safe on a closed object.
  virtual void Close() = 0;

  virtual bool IsOpen() const = 0;
};
