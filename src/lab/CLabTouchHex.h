#pragma once
// The emulated touch controller programmed by Intel-hex chunks (target 0):
// each data report carries chunk n (from 0) as n + 1 in byte 4, its address
// 0x8000 + 128 n in bytes 5-8, 16 in byte 9 and 128 bytes from byte 10.
// Chunks must come in order.

#include "lab/CLabProgrammingBoard.h"

class CLabTouchHex : public CLabProgrammingBoard {
 public:
  static constexpr uint32_t kImageBase = 0x8000;
  static constexpr uint32_t kChunk = 128;

  explicit CLabTouchHex(std::string name_I = "touch-hex", const SLabBoardIds& ids_I = {});

 protected:
  bool TakeData(const std::vector<uint8_t>& report_I) override;
  std::pair<size_t, size_t> Payload() const override { return {10, 10 + kChunk}; }
  void OnStart() override { mNextChunk = 0; }

 private:
  uint32_t mNextChunk = 0;
};
