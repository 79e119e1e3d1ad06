#pragma once
// Types shared by the lab's boards, bus and seam forms.

#include <cstddef>
#include <cstdint>
#include <vector>

#include "common/TavTypes.h"

// How an interface of a board is reached.
enum class ELabLink {
  eHid,        // feature reports, through the HID node seam
  eUsbVendor,  // control requests on a vendor-class interface, through the USB control seam
};

// One interface a board shows on the bus. The bus fills in the location.
struct SLabInterface {
  DeviceInfo info;
  ELabLink link = ELabLink::eHid;
  uint16_t release = 0;  // bcdDevice

  bool operator==(const SLabInterface&) const = default;
};

// One report a board saw, as it arrived.
struct SLabTraceEntry {
  enum EKind { eSetFeature, eGetFeature, eControl };
  EKind kind = eSetFeature;
  // Set: the report as received (after any fault changed it). Get: the
  // report as answered. Control: the 8 setup bytes, then the data stage.
  std::vector<uint8_t> bytes;
  size_t length = 0;  // the length asked for (get) or sent (set)
  bool succeeded = false;
};
