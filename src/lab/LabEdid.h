#pragma once
// The panel of a lab pen display and the EDID it gives: one 128-byte base
// block of EDID 1.4 with the family's manufacturer number (0x5B27, the
// three letters packed five bits each as EDID packs them), the product
// code, a 1920x1080 detailed timing, range limits, the monitor name (tag
// 0xFC) and the serial text (tag 0xFF), no extension, and the checksum
// that brings the block's sum to 0.

#include <cstdint>
#include <string>
#include <vector>

inline constexpr uint16_t kLabDisplayManufacturer = 0x5B27;

struct SLabPanel {
  std::string connector;     // how the display stack names where it is attached
  uint16_t productCode = 0;  // the scalar's product id in the device configuration
  std::string name;          // at most 12 characters
  std::string serial;        // at most 13 characters, upper case
};

std::vector<uint8_t> MakeLabEdid(const SLabPanel& panel_I);
