#pragma once
// The displays seam: the monitors attached to the machine, each with the
// EDID it gives. The Linux form reads /sys/class/drm/*/edid; the lab form
// is the lab's emulated displays.
//
// Threads: any; the list is read fresh on every call.

#include <cstdint>
#include <string>
#include <vector>

// One attached display.
struct SDisplay {
  // Where it is attached ("card0-DP-1" on Linux, a board name in the lab).
  std::string connector;
  // The EDID as the display gives it; empty when it gives none.
  std::vector<uint8_t> edid;
  // What the display stack knows without an EDID, used only when `edid` is
  // empty: the EDID manufacturer number, product code, serial and name.
  uint16_t manufacturerId = 0;
  uint16_t productId = 0;
  std::string serialNumber;
  std::string productName;
};

class CDisplays {
 public:
  virtual ~CDisplays() = default;
  // Every connected display, in a stable order.
  virtual std::vector<SDisplay> List() const = 0;
};
