#pragma once
// The emulated pen controller: a HID interface in normal mode that goes to
// its loader when sent either form of the switch report (0xCC 0x05 0x6A or
// 0xCC 0x6A 0x05), and a HID loader with one flash per CPU. Its normal
// firmware also takes the alive probe (0x02 0x00) and the EEPROM report
// (0x08 0x01 0x00 0xAA 0xAA).

#include <string>
#include <vector>

#include "lab/CLabLoaderBoard.h"

struct SLabPenDescription {
  std::string name = "pen";
  uint16_t vendorId = 0x7A71;
  uint16_t productId = 0x0301;
  uint16_t loaderProductId = 0x0302;
  uint16_t release = 0x0120;
  uint16_t loaderRelease = 0x0003;
  ELabProtocol protocol = ELabProtocol::eLoader;
  // One layout per CPU. The default: 48 blocks of 4 KiB from 0x08000000,
  // the first protected.
  std::vector<SLabFlashLayout> cpus{SLabFlashLayout::Uniform(0x08000000, 4096, 48, 1)};
  // The digitizer's pen usage; the loader shows a vendor usage.
  std::vector<std::pair<uint16_t, uint16_t>> usages{{0x000D, 0x0002}, {0xFF00, 0x0001}};
  std::vector<std::pair<uint16_t, uint16_t>> loaderUsages{{0xFF00, 0x0001}};
  uint16_t deviceInfo = 0x0301;
};

class CLabPenController : public CLabLoaderBoard {
 public:
  explicit CLabPenController(const SLabPenDescription& description_I = SLabPenDescription());

 protected:
  bool OnNormalSetFeature(const std::vector<uint8_t>& report_I) override;
};
