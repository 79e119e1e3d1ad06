#pragma once
// The HID node seam: one HID interface of an attached USB device, spoken to
// by feature reports. The Linux form is a hidraw node; the lab form is the
// emulated board behind that interface.
//
// Reports: a report is a byte vector whose byte 0 is the report id. It goes
// out as it stands, id included, with the vector's size as its length, and a
// reply comes back into the same vector from byte 0, its own report id
// first. Devices without numbered reports are not served by this seam.
//
// Results keep apart what the logic above must tell apart; no errno or
// platform number ever leaves a form of this seam.
//
// Threads: one caller at a time per object. Every call returns; a report
// call is bounded by the transfer time-out of the form (1000 ms where the
// form can choose it; the Linux kernel applies its own HID control time-out,
// which the form cannot shorten).

#include <cstdint>
#include <vector>

#include "common/TavTypes.h"

enum class EHidStatus {
  eSuccess,
  eStall,    // the device stalled the transfer (EPIPE on Linux)
  eBusy,     // another holder has the interface, or the device said busy (EBUSY)
  eGone,     // the interface is not attached, or went away (ENODEV, no node)
  eTimeout,  // the transfer timed out (ETIMEDOUT)
  eDenied,   // no permission to open the node (EACCES, EPERM)
  eOther,    // any other failure
};

// A short name of a status for log lines and test messages.
inline const char* HidStatusName(EHidStatus status_I) {
  switch (status_I) {
    case EHidStatus::eSuccess: return "success";
    case EHidStatus::eStall: return "stall";
    case EHidStatus::eBusy: return "busy";
    case EHidStatus::eGone: return "gone";
    case EHidStatus::eTimeout: return "timeout";
    case EHidStatus::eDenied: return "denied";
    case EHidStatus::eOther: return "other";
  }
  return "other";
}

class CHidNode {
 public:
  virtual ~CHidNode() = default;

  // Finds the attached HID interface that `info_I` names (vendor, product,
  // location, and one of the interface's top-level usage pairs) and opens it
  // for this process alone. eBusy: another holder has it; the caller decides
  // whether to wait and try again. eGone: nothing attached matches. Opening
  // an open node closes it first.
  virtual EHidStatus Open(const DeviceInfo& info_I) = 0;

  // Gives the interface back. Safe on a closed node.
  virtual void Close() = 0;

  virtual bool IsOpen() const = 0;

  // The device release number (bcdDevice) of the USB device the open node
  // belongs to; 0 when closed.
  virtual uint16_t GetReleaseNumber() const = 0;

  // Sends `report_I` as a feature report. An empty report is eOther, with
  // nothing sent. On a closed node: eGone.
  virtual EHidStatus SetFeatureReport(const std::vector<uint8_t>& report_I) = 0;

  // Asks for the feature report whose id is in byte 0, as long as the
  // vector. The reply overwrites the vector from byte 0; bytes past a short
  // reply keep their value. On any result but eSuccess the vector's content
  // is unspecified. An empty vector is eOther. On a closed node: eGone.
  virtual EHidStatus GetFeatureReport(std::vector<uint8_t>& report_IO) = 0;
};
