#pragma once
// Structures of the loader command protocol, as they lie in the reports.

#include <cstdint>

#pragma pack(push, 1)
// The loader's parameters: the reply's bytes 1 to 12, copied unchanged.
struct BL_HID_REP_GET_BL_PARAMETERS {
  uint16_t reserved0 = 0;     // not interpreted
  uint16_t readSize = 0;      // payload bytes of one read report
  uint16_t wordSize = 0;      // payload bytes of one write-word report
  uint16_t blockSize = 0;     // payload bytes of one write-block report
  uint16_t numFlashBlocks = 0;
  uint16_t reserved1 = 0;     // not interpreted
};
#pragma pack(pop)
static_assert(sizeof(BL_HID_REP_GET_BL_PARAMETERS) == 12);
