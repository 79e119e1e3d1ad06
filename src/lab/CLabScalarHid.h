#pragma once
// The emulated scalar programmed through HID (target 4): each data report
// carries one 260-byte block from byte 3: its offset in bytes 0-2, high
// byte first, its CRC-8 (polynomial 0x07) in byte 3, 256 bytes of image.
// The scalar refuses a block whose CRC does not match.

#include "lab/CLabProgrammingBoard.h"

class CLabScalarHid : public CLabProgrammingBoard {
 public:
  explicit CLabScalarHid(std::string name_I = "scalar", const SLabBoardIds& ids_I = {});

 protected:
  bool TakeData(const std::vector<uint8_t>& report_I) override;
  std::pair<size_t, size_t> Payload() const override { return {7, 7 + 256}; }
};
