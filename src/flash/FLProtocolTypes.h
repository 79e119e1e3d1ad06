#pragma once
// Structures of the loader command protocol, as they lie in the reports.
// Reports are decoded field by field as little-endian, whatever the host.

#include <cstdint>

// The logical loader commands; CFLProtocol::GetCommand gives each its
// report id under the protocol type in use.
enum EBLHIDCmdId : uint32_t {
  eBL_HID_REP_NOT_USED_ID = 0,
  eBL_HID_REP_READ_DATA_ID = 1,
  eBL_HID_REP_WRITE_BLOCK_ID = 2,
  eBL_HID_REP_ERASE_BLOCK_ID = 3,
  eBL_HID_REP_SET_READ_ADDR_ID = 4,
  eBL_HID_REP_GET_STATUS_ID = 5,
  eBL_HID_REP_RESET_CPU_SAVE_ID = 6,
  eBL_HID_REP_RESET_CPU_ID = 7,
  eBL_HID_REP_WRITE_WORD_ID = 8,
  eBL_HID_REP_GET_BL_PARAMETERS_ID = 9,
  eBL_HID_REP_GET_FLASH_DESCRIPTOR_ID = 10,
  eBL_HID_REP_GET_CHECKSUMS_ID = 11,
  eBL_HID_REP_SET_BLOCK_CHECKSUM_ID = 12,
  eBL_HID_REP_CALC_SET_BLOCK_CHECKSUM_ID = 13,
  eBL_HID_REP_SET_MAGIC_WORD_ID = 14,
  eBL_HID_REP_WRITE_CHECKSUMS_ID = 15,
  eBL_HID_REP_GET_DEVICE_INFO_ID = 16,
  eBL_HID_REP_GET_BL_START_REASON_ID = 17,
  eBL_HID_REP_SET_CURRENT_CPU_ID = 18,
  eBL_HID_REP_GET_CURRENT_CPU_ID = 19,
  eBL_HID_REP_GET_TOTAL_CPUS_ID = 20,
  eBL_HID_REP_PROGRAMMING_ID = 21,
};

// The most flash blocks a loader can describe.
inline constexpr uint32_t kMaxFlashBlocks = 1024;

#pragma pack(push, 1)
// The loader's parameters: the reply's bytes 1 to 12.
struct BL_HID_REP_GET_BL_PARAMETERS {
  uint16_t reserved0 = 0;  // not interpreted
  uint16_t readSize = 0;   // payload bytes of one read report
  uint16_t wordSize = 0;   // payload bytes of one write-word report
  uint16_t blockSize = 0;  // payload bytes of one write-block report
  uint16_t numFlashBlocks = 0;
  uint16_t reserved1 = 0;  // not interpreted
};

// One flash block as the loader describes it.
struct BL_FLASH_BLOCK_DESCRIPTOR {
  uint32_t startAddress = 0;
  uint32_t size = 0;
  // Bit 15: protected, never written. Bits 0-14: the block's write word
  // size in bytes.
  uint16_t flags = 0;
};

// The loader's flash description: one record per block, from the reply's
// byte 1.
struct BL_HID_REP_GET_FLASH_DESCRIPTOR {
  BL_FLASH_BLOCK_DESCRIPTOR blocks[kMaxFlashBlocks];
};

// The magic word and one stored checksum per block.
struct FLASH_CHECKSUM_STRUC {
  uint32_t magicWord = 0;
  uint32_t checksums[kMaxFlashBlocks] = {};
};

// The main device's information: the reply's bytes 1 to 33. Only the first
// field means something to this program.
struct BL_HID_REP_GET_DEVICE_INFO {
  uint16_t deviceInfo = 0;
  uint8_t rest[31] = {};
};
#pragma pack(pop)

static_assert(sizeof(BL_HID_REP_GET_BL_PARAMETERS) == 12);
static_assert(sizeof(BL_FLASH_BLOCK_DESCRIPTOR) == 10);
static_assert(sizeof(BL_HID_REP_GET_FLASH_DESCRIPTOR) == 10240);
static_assert(sizeof(FLASH_CHECKSUM_STRUC) == 4100);
static_assert(sizeof(BL_HID_REP_GET_DEVICE_INFO) == 33);

inline constexpr uint16_t kFlashBlockProtectedBit = 0x8000;
inline constexpr uint16_t kFlashBlockWordSizeMask = 0x7FFF;
