#pragma once
// The emulated Bluetooth modules, programmed page by page (256 bytes), each
// page with its CRC-8 that the chip checks before taking it:
// - the AB1122 (target 1): bytes 3-9 are 02 00 0F 06 01 08 01, bytes 10-12
//   the page's address high byte first, 13 the CRC, the page from 14. The
//   range 0x3000-0x7FFF is the chip's own and must never be sent.
// - the AB1555 (target 6): byte 3 is 0, byte 4 is 1, byte 5 the CRC, bytes
//   6-9 zero, the page from 10; pages carry no address and come in order
//   from the image's start.

#include "lab/CLabProgrammingBoard.h"

class CLabBluetooth : public CLabProgrammingBoard {
 public:
  enum class EChip { eAB1122, eAB1555 };
  static constexpr uint32_t kPage = 256;

  CLabBluetooth(EChip chip_I, std::string name_I = "bluetooth", const SLabBoardIds& ids_I = {});

  EChip GetChip() const { return mChip; }

 protected:
  bool TakeData(const std::vector<uint8_t>& report_I) override;
  std::pair<size_t, size_t> Payload() const override;
  void OnStart() override { mNextPage = 0; }

 private:
  EChip mChip;
  uint32_t mNextPage = 0;
};
