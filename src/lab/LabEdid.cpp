#include "lab/LabEdid.h"

#include <algorithm>
#include <numeric>

namespace {

constexpr uint8_t kHeader[] = {0x00, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x00};
// sRGB primaries and white point.
constexpr uint8_t kChromaticity[] = {0xEE, 0x91, 0xA3, 0x54, 0x4C, 0x99, 0x26, 0x0F, 0x50, 0x54};
// 1920x1080 at 60 Hz, 148.5 MHz, on a 344 x 194 mm panel.
constexpr uint8_t kTiming[] = {0x02, 0x3A, 0x80, 0x18, 0x71, 0x38, 0x2D, 0x40, 0x58,
                               0x2C, 0x45, 0x00, 0x58, 0xC2, 0x10, 0x00, 0x00, 0x1E};
// 56-75 Hz, 30-83 kHz, 170 MHz; limits only (byte 10 = 1): GTF would need
// the continuous-frequency flag that a fixed panel does not set.
constexpr uint8_t kRangeLimits[] = {0x00, 0x00, 0x00, 0xFD, 0x00, 0x38, 0x4B, 0x1E, 0x53,
                                    0x11, 0x01, 0x0A, 0x20, 0x20, 0x20, 0x20, 0x20, 0x20};

// A text descriptor: its tag, up to 13 characters, a line feed, blanks.
void PutText(std::vector<uint8_t>& edid_IO, size_t at_I, uint8_t tag_I, const std::string& text_I) {
  const uint8_t head[] = {0x00, 0x00, 0x00, tag_I, 0x00};
  std::copy(std::begin(head), std::end(head), edid_IO.begin() + static_cast<std::ptrdiff_t>(at_I));
  const std::string text = text_I.substr(0, 13);
  for (size_t i = 0; i < 13; ++i) {
    uint8_t byte = 0x20;
    if (i < text.size()) byte = static_cast<uint8_t>(text[i]);
    if (i == text.size()) byte = 0x0A;
    edid_IO[at_I + 5 + i] = byte;
  }
}

}  // namespace

std::vector<uint8_t> MakeLabEdid(const SLabPanel& panel_I) {
  std::vector<uint8_t> edid(128, 0x00);
  std::copy(std::begin(kHeader), std::end(kHeader), edid.begin());
  edid[8] = kLabDisplayManufacturer >> 8;
  edid[9] = kLabDisplayManufacturer & 0xFF;
  edid[10] = static_cast<uint8_t>(panel_I.productCode);
  edid[11] = static_cast<uint8_t>(panel_I.productCode >> 8);
  // The numeric serial field is left 0: the serial is the text descriptor.
  edid[16] = 12;  // week
  edid[17] = 34;  // 2024
  edid[18] = 1;
  edid[19] = 4;
  edid[20] = 0xA5;  // digital, 8 bits a colour, DisplayPort
  edid[21] = 34;    // cm
  edid[22] = 19;
  edid[23] = 0x78;  // gamma 2.2
  edid[24] = 0x06;  // sRGB, preferred timing native
  std::copy(std::begin(kChromaticity), std::end(kChromaticity), edid.begin() + 25);
  std::fill(edid.begin() + 38, edid.begin() + 54, 0x01);  // no standard timings
  std::copy(std::begin(kTiming), std::end(kTiming), edid.begin() + 54);
  std::copy(std::begin(kRangeLimits), std::end(kRangeLimits), edid.begin() + 72);
  PutText(edid, 90, 0xFC, panel_I.name);
  PutText(edid, 108, 0xFF, panel_I.serial);
  edid[126] = 0;  // no extension block
  const unsigned sum = std::accumulate(edid.begin(), edid.end() - 1, 0u);
  edid[127] = static_cast<uint8_t>(0x100 - (sum & 0xFF));
  return edid;
}
