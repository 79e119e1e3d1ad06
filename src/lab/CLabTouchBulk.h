#pragma once
// The emulated touch controller on a vendor-class USB interface. Its normal
// firmware answers three vendor requests: switch to loader (0x41, 0xF0,
// wValue 0xFFFF), the alive probe (0xC1, 0x01, two bytes back) and EEPROM
// initialisation (0x41, 0xF5, wValue 0xFFFF). Its loader comes back as a
// HID interface speaking the loader command set.

#include <string>
#include <vector>

#include "lab/CLabLoaderBoard.h"

struct SLabTouchBulkDescription {
  std::string name = "touch";
  uint16_t vendorId = 0x7A71;
  uint16_t productId = 0x0311;
  uint16_t loaderProductId = 0x0312;
  uint16_t release = 0x0210;
  uint16_t loaderRelease = 0x0004;
  // The touch firmware runs on the controller's second CPU.
  std::vector<SLabFlashLayout> cpus{SLabFlashLayout::Uniform(0x00000000, 2048, 16, 1),
                                    SLabFlashLayout::Uniform(0x00100000, 2048, 24, 1)};
  std::vector<std::pair<uint16_t, uint16_t>> loaderUsages{{0xFF00, 0x0002}};
  uint16_t deviceInfo = 0x0311;
};

class CLabTouchBulk : public CLabLoaderBoard {
 public:
  explicit CLabTouchBulk(
      const SLabTouchBulkDescription& description_I = SLabTouchBulkDescription());

 protected:
  bool OnControl(uint8_t requestType_I, uint8_t request_I, uint16_t value_I, uint16_t index_I,
                 std::vector<uint8_t>& data_IO, size_t& transferred_O) override;
};
