// The loader commands of the device interface: one report each, built
// zero-filled at its full length, fields little-endian.

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "flash/ByteOrder.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CFLProtocol.h"
#include "flash/FlashConstants.h"

namespace {

// Report id of a command under the process's protocol type.
uint8_t Id(EBLHIDCmdId command_I) { return CFLProtocol::GetInstance()->GetCommand(command_I); }

std::vector<uint8_t> NewReport(size_t length_I, EBLHIDCmdId command_I) {
  std::vector<uint8_t> report(length_I, 0);
  report[0] = Id(command_I);
  return report;
}

// A reset without saving carries two key bytes, so that a stray report
// cannot restart the controller; a reset with saving carries one flag.
constexpr uint8_t kResetNoSaveKey0 = 0xA6;
constexpr uint8_t kResetNoSaveKey1 = 0x50;
constexpr uint8_t kResetSaveFlag = 0x01;
// The start-reason report id is fixed in the loader; it is not mapped.
constexpr uint8_t kStartReasonReportId = 0x1F;

}  // namespace

bool CFLDeviceInterface::FLProtReadData(std::vector<uint8_t>& data_O, uint32_t count_I) {
  if (!LoaderReady()) return false;
  const uint32_t readSize = mBLParams.readSize;
  if (readSize == 0) return false;
  if (static_cast<int32_t>(count_I) < 1) return false;

  std::vector<uint8_t> report(readSize + 5, 0);
  for (uint32_t repeat = 0; repeat < count_I; ++repeat) {
    bool read = false;
    for (int attempt = 1; attempt <= FlashConstants::kCommandTries && !read; ++attempt) {
      report[0] = Id(eBL_HID_REP_READ_DATA_ID);
      read = SafeRead(report);
      if (!read && attempt >= 2) {
        ReportLog("Attempting to Reopen connection...");
        Open();
        TavSleep(FlashConstants::kCommandReopenWait);
      }
    }
    if (!read) {
      ReportError("Failed reading from device");
      return false;
    }
    data_O.insert(data_O.end(), report.begin() + 5, report.end());
  }
  return true;
}

bool CFLDeviceInterface::FLProtWriteBlock(const std::vector<uint8_t>& data_I, uint32_t address_I) {
  if (!LoaderReady()) return false;
  const uint32_t blockSize = mBLParams.blockSize;
  if (blockSize == 0) return false;
  if (data_I.size() < blockSize) {
    TAVASSERT_TEXT("data_I.size() >= blockSize");
    return false;
  }
  for (int attempt = 1; attempt <= FlashConstants::kCommandTries; ++attempt) {
    std::vector<uint8_t> report = NewReport(blockSize + 5, eBL_HID_REP_WRITE_BLOCK_ID);
    PutLE32(report, 1, address_I);
    std::copy(data_I.begin(), data_I.begin() + blockSize, report.begin() + 5);
    if (SafeWrite(report)) return true;
    ReportError("Write Failed... Retrying...");
    if (attempt >= 2) {
      ReportLog("Attempting to Reopen connection...");
      Open();
      TavSleep(FlashConstants::kCommandReopenWait);
    }
  }
  return false;
}

bool CFLDeviceInterface::FLProtEraseBlock(uint32_t block_I) {
  if (!LoaderReady()) {
    ReportError("Failed erasing block from device");
    return false;
  }
  std::vector<uint8_t> report = NewReport(5, eBL_HID_REP_ERASE_BLOCK_ID);
  PutLE32(report, 1, block_I);
  for (int attempt = 1; attempt <= FlashConstants::kCommandTries; ++attempt) {
    if (SafeWrite(report)) return true;
  }
  ReportError("Failed erasing block from device");
  return false;
}

bool CFLDeviceInterface::FLProtSetReadAddr(uint32_t address_I) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(5, eBL_HID_REP_SET_READ_ADDR_ID);
  PutLE32(report, 1, address_I);
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtGetStatus(uint32_t& status_O) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(5, eBL_HID_REP_GET_STATUS_ID);
  if (!SafeRead(report)) return false;
  status_O = GetLE32(&report[1]);
  return true;
}

bool CFLDeviceInterface::FLProtResetCPU(bool save_I) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report;
  if (save_I) {
    report = NewReport(5, eBL_HID_REP_RESET_CPU_SAVE_ID);
    report[1] = kResetSaveFlag;
  } else {
    report = NewReport(3, eBL_HID_REP_RESET_CPU_ID);
    report[1] = kResetNoSaveKey0;
    report[2] = kResetNoSaveKey1;
  }
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtWriteWord(const std::vector<uint8_t>& data_I, uint32_t address_I) {
  if (!LoaderReady()) return false;
  const uint32_t wordSize = mBLParams.wordSize;
  if (wordSize == 0) return false;
  if (data_I.size() < wordSize) {
    TAVASSERT_TEXT("data_I.size() >= wordSize");
    return false;
  }
  for (int attempt = 1; attempt <= FlashConstants::kCommandTries; ++attempt) {
    std::vector<uint8_t> report = NewReport(wordSize + 5, eBL_HID_REP_WRITE_WORD_ID);
    PutLE32(report, 1, address_I);
    std::copy(data_I.begin(), data_I.begin() + wordSize, report.begin() + 5);
    if (SafeWrite(report)) return true;
  }
  return false;
}

bool CFLDeviceInterface::FLProtGetBLParameters(BL_HID_REP_GET_BL_PARAMETERS& params_O) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(13, eBL_HID_REP_GET_BL_PARAMETERS_ID);
  if (!SafeRead(report)) return false;
  params_O.reserved0 = GetLE16(&report[1]);
  params_O.readSize = GetLE16(&report[3]);
  params_O.wordSize = GetLE16(&report[5]);
  params_O.blockSize = GetLE16(&report[7]);
  params_O.numFlashBlocks = GetLE16(&report[9]);
  params_O.reserved1 = GetLE16(&report[11]);
  return true;
}

bool CFLDeviceInterface::FLProtGetFlashDescriptor(BL_HID_REP_GET_FLASH_DESCRIPTOR& descriptor_O) {
  if (!LoaderReady()) return false;
  const uint32_t blocks = mBLParams.numFlashBlocks;
  if (blocks == 0) return false;
  if (blocks > kMaxFlashBlocks) {
    TAVASSERT_TEXT("numFlashBlocks <= 1024");
    return false;
  }
  std::vector<uint8_t> report = NewReport((blocks * 10) | 1, eBL_HID_REP_GET_FLASH_DESCRIPTOR_ID);
  if (!SafeRead(report)) return false;
  for (uint32_t i = 0; i < blocks; ++i) {
    const uint8_t* record = &report[1 + 10 * i];
    descriptor_O.blocks[i].startAddress = GetLE32(record);
    descriptor_O.blocks[i].size = GetLE32(record + 4);
    descriptor_O.blocks[i].flags = GetLE16(record + 8);
  }
  return true;
}

bool CFLDeviceInterface::FLProtGetChecksums(FLASH_CHECKSUM_STRUC& checksums_O) {
  if (!LoaderReady()) return false;
  const uint32_t blocks = mBLParams.numFlashBlocks;
  if (blocks > kMaxFlashBlocks) {
    TAVASSERT_TEXT("numFlashBlocks <= 1024");
    return false;
  }
  std::vector<uint8_t> report = NewReport(4 * blocks + 5, eBL_HID_REP_GET_CHECKSUMS_ID);
  if (!SafeRead(report)) return false;
  checksums_O.magicWord = GetLE32(&report[1]);
  for (uint32_t i = 0; i < blocks; ++i) checksums_O.checksums[i] = GetLE32(&report[5 + 4 * i]);
  return true;
}

bool CFLDeviceInterface::FLProtSetBlockChecksum(uint16_t block_I, uint32_t checksum_I) {
  if (!LoaderReady()) return false;
  if (!GetChecksumsSupported()) return true;
  std::vector<uint8_t> report = NewReport(7, eBL_HID_REP_SET_BLOCK_CHECKSUM_ID);
  PutLE16(report, 1, block_I);
  PutLE32(report, 3, checksum_I);
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtCalcSetBlockChecksum(uint16_t block_I) {
  if (!LoaderReady()) return false;
  if (!GetChecksumsSupported()) return true;
  std::vector<uint8_t> report = NewReport(3, eBL_HID_REP_CALC_SET_BLOCK_CHECKSUM_ID);
  PutLE16(report, 1, block_I);
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtSetMagicWord(uint32_t value_I) {
  if (!LoaderReady()) return false;
  if (!GetChecksumsSupported()) return true;
  std::vector<uint8_t> report = NewReport(5, eBL_HID_REP_SET_MAGIC_WORD_ID);
  PutLE32(report, 1, value_I);
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtWriteChecksumsToROM() {
  if (!LoaderReady()) return false;
  if (!GetChecksumsSupported()) return true;
  std::vector<uint8_t> report = NewReport(5, eBL_HID_REP_WRITE_CHECKSUMS_ID);
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtGetMainDeviceInfo(BL_HID_REP_GET_DEVICE_INFO& info_O) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(34, eBL_HID_REP_GET_DEVICE_INFO_ID);
  if (!SafeRead(report)) return false;
  info_O.deviceInfo = GetLE16(&report[1]);
  std::copy(report.begin() + 3, report.end(), info_O.rest);
  return true;
}

bool CFLDeviceInterface::FLProtGetBLStartReason(uint32_t& reason_O) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report(2, 0);
  report[0] = kStartReasonReportId;
  if (!SafeRead(report)) return false;
  reason_O = report[1];
  return true;
}

bool CFLDeviceInterface::FLProtSetCurrentCPU(uint32_t cpu_I) {
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(3, eBL_HID_REP_SET_CURRENT_CPU_ID);
  PutLE16(report, 1, static_cast<uint16_t>(cpu_I));
  return SafeWrite(report);
}

bool CFLDeviceInterface::FLProtGetCurrentCPU(uint32_t& cpu_O) {
  cpu_O = 0;
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(3, eBL_HID_REP_GET_CURRENT_CPU_ID);
  // A failed read shows only in the default left in place.
  if (SafeRead(report)) cpu_O = GetLE16(&report[1]);
  return true;
}

bool CFLDeviceInterface::FLProtGetTotalCPUs(uint32_t& count_O) {
  count_O = 1;
  if (!LoaderReady()) return false;
  std::vector<uint8_t> report = NewReport(3, eBL_HID_REP_GET_TOTAL_CPUS_ID);
  if (SafeRead(report)) {
    const uint16_t count = GetLE16(&report[1]);
    if (count != 0) count_O = count;
  }
  return true;
}
