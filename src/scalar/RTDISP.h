#pragma once
// Programs a display scalar's serial flash in system over the bridge link:
// the scalar's MCU goes into ISP mode, the flash's write protection opens,
// each 64 KiB block is erased, blank-checked, written page by page and
// checked by the MCU's CRC, highest block first, and the protection closes.
//
// The MCU's registers are reached at I2C address 0x94 (write) and 0x95
// (read), with no wait after each byte. Three board variants differ in the
// registers they need: plain, Quanta and Qisda Venus; at most one flag.
//
// A good run leaves ISP by the MCU's own register; the caller resets the
// scalar next. Reports go to the notifier: log lines, errors (each failed
// erase or CRC, also when a retry then succeeds) and progress.

#include <cstdint>
#include <initializer_list>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "flash/CInterfaceNotifier.h"
#include "scalar/CI2CConnectorFTDI.h"

class RTDISP {
 public:
  // The flash's erase unit, and the unit in which the image is cut.
  static constexpr uint32_t FLASH_UINT_SIZE = 65536;

  // `notifier_I` is borrowed and must outlive the object.
  RTDISP(std::shared_ptr<CI2CConnectorFTDI> connector_I, const std::vector<uint8_t>& data_I,
         CInterfaceNotifier* notifier_I, bool quantaFirmware_I, bool qisdaVenusScalarBoard_I);

  // The whole update; on failure ISP is left again.
  bool StartISPFlash();
  bool SerialFlashISPFlow();
  bool SerialFlashIntoISP();
  FT_STATUS SerialFlashExitISP();

  bool SerialFlashWriteCode(unsigned int block_I);
  // Erases the 64 KiB block and checks that it reads blank.
  bool BlockErase(unsigned int block_I);
  // The MCU's CRC of `length_I` flash bytes from `address_I`.
  uint8_t ReadCRC(unsigned int address_I, unsigned int length_I);
  FT_STATUS WriteFlashData(const std::vector<uint8_t>& bytes_I);

  FT_STATUS WriteMCUReg(uint8_t reg_I, uint8_t value_I);
  FT_STATUS WriteMCURegBit(uint8_t reg_I, uint8_t andMask_I, uint8_t orMask_I);
  uint8_t ReadMCUReg(uint8_t reg_I);
  // Reads `reg_I` up to `tries_I` times until the bits of `mask_I` equal
  // those of `target_I`. Counts reads, not time: the bus paces it.
  bool WaitBitChange(uint8_t reg_I, uint8_t mask_I, uint8_t target_I, unsigned int tries_I);

  bool EnableSoftwareFlashWriteProtect(bool enable_I);
  void DisableHardwareFlashWriteProtect();
  bool QuantaCheckFlash();
  void SetDefaultReg();

  // CRC-8, polynomial 0x07, initial 0, nothing reflected, no final XOR:
  // the sum the MCU computes over its flash.
  static uint8_t CalcByteCRC(const uint8_t* bytes_I, size_t length_I);

  void LoadData(const std::vector<uint8_t>& data_I);
  uint32_t GetBlockCount() const { return mBlockCount; }
  // The low 16 bits of each block's byte sum.
  const std::vector<uint32_t>& GetBlockSums() const { return mBlockSums; }

 private:
  void Log(const std::string& text_I, bool toFile_I);
  void Error(const std::string& text_I);
  void Progress(unsigned int percent_I);
  // Writes each register in turn; the sequences of the board variants.
  // Gives the first failed status, or FT_OK.
  FT_STATUS WriteMCURegs(std::initializer_list<std::pair<uint8_t, uint8_t>> writes_I);
  bool WaitFlashIdle();
  bool WriteBlock(int8_t block_I);
  unsigned int BlockProgress(int8_t block_I) const;

  std::shared_ptr<CI2CConnectorFTDI> mConnector;
  std::vector<uint32_t> mBlockSums;
  std::vector<std::vector<uint8_t>> mBlocks;
  uint32_t mBlockCount = 0;
  bool mDataLoaded = false;
  // Set when a byte of the last block's writing went unacknowledged or its
  // transfer failed: the eight-bit CRC alone lets such a block pass one
  // time in 256.
  bool mWriteTransferFailed = false;
  CInterfaceNotifier* mNotifier;
  bool mQuantaFirmware;
  bool mQisdaVenusScalarBoard;
};
