#pragma once
// The serial NOR flash beside the lab scalar's MCU, at the level of its
// instructions: 64 KiB blocks that erase to 0xFF, 256-byte pages that
// program by clearing bits, a write-enable latch, and status register 1
// with its block-protect bits (2-4) and its status-register-write-disable
// bit (7). With that bit set, status register 1 can be written only while
// the board holds the write-protect pin high; with any block-protect bit
// set, nothing can be erased or programmed. A refused instruction changes
// nothing and is recorded as a violation.
//
// Instructions: 0x06 write enable, 0x04 write disable, 0x05/0x35/0x15 read
// status registers 1-3, 0x01 write status register 1, 0x03 read, 0x9F
// JEDEC id, 0xAB signature, 0xD8 64 KiB block erase, 0x02 page program; a
// flash with three status registers also takes 0x31 and 0x11 (write
// status registers 2 and 3).

#include <cstdint>
#include <string>
#include <vector>

#include "lab/CLabI2CBus.h"
#include "lab/CLabStateFile.h"

class CLabSerialFlash {
 public:
  static constexpr size_t kBlockSize = 65536;
  static constexpr size_t kPageSize = 256;
  // Status register 1 as the factory leaves it: every block protected, and
  // the register locked behind the write-protect pin.
  static constexpr uint8_t kFactoryStatus = 0x9C;

  CLabSerialFlash(size_t blocks_I, bool threeStatusRegisters_I, LabViolationSink sink_I);

  // One instruction: its opcode, the bytes sent after it, how many bytes
  // to read back. `protectPinHigh_I`: the level of the write-protect pin.
  std::vector<uint8_t> Execute(uint8_t opcode_I, const std::vector<uint8_t>& out_I,
                               size_t readCount_I, bool protectPinHigh_I);
  // Page program (after a write enable) of `data_I` at `address_I`.
  void Program(uint32_t address_I, const std::vector<uint8_t>& data_I);
  // CRC-8 (polynomial 0x07, from 0) of the bytes from `first_I` to
  // `last_I`, both included.
  uint8_t Crc(uint32_t first_I, uint32_t last_I) const;

  const std::vector<uint8_t>& GetData() const { return mData; }
  void SetData(std::vector<uint8_t> data_I);
  uint8_t GetStatus() const { return mStatus[0]; }
  bool IsProtected() const { return (mStatus[0] & 0x1C) != 0; }
  size_t GetErases() const { return mErases; }
  // Goes up with every change of what Save writes.
  uint64_t GetRevision() const { return mRevision; }

  // Puts the data, comparing only what changed since the last Save where
  // the state file took that one.
  void Save(CLabStateFile& state_IO) const;
  void Load(const CLabStateFile& state_I);

 private:
  bool WriteAllowed(const std::string& what_I);
  void Erase(uint32_t address_I);
  void WriteStatus(size_t register_I, uint8_t value_I, bool protectPinHigh_I);
  void Touch(size_t begin_I, size_t end_I);

  std::vector<uint8_t> mData;
  // Goes up with every change of mData and mStatus: saving after each
  // transfer then costs nothing while nothing was programmed.
  uint64_t mRevision = 1;
  // The revision of the last Save, and the bytes of mData changed since.
  mutable uint64_t mSavedRevision = 0;
  mutable size_t mDirtyBegin = 0;
  mutable size_t mDirtyEnd = 0;
  bool mThreeStatusRegisters;
  LabViolationSink mViolation;
  uint8_t mStatus[3] = {kFactoryStatus, 0, 0};
  bool mWriteEnabled = false;
  size_t mErases = 0;
};
