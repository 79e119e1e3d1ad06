#include "scalar/RTDISP.h"

#include <algorithm>
#include <array>
#include <cmath>

#include "common/TavAssert.h"
#include "common/TavLog.h"

namespace {

// I2C addresses of the scalar's MCU.
constexpr uint8_t kMCUWrite = 0x94;
constexpr uint8_t kMCURead = 0x95;

// MCU registers.
constexpr uint8_t kFlashCommand = 0x60;  // bit 0: busy
constexpr uint8_t kFlashOpcode = 0x61;
constexpr uint8_t kFlashAddressHigh = 0x64;  // also the data of a status write
constexpr uint8_t kFlashAddressMiddle = 0x65;
constexpr uint8_t kFlashAddressLow = 0x66;
constexpr uint8_t kFlashResult0 = 0x67;
constexpr uint8_t kFlashResult1 = 0x68;
constexpr uint8_t kFlashResult2 = 0x69;
constexpr uint8_t kProgramOpcode = 0x6D;
constexpr uint8_t kISPControl = 0x6F;  // bit 7 ISP, 2 CRC busy, 4 buffer ready, 5 page program
constexpr uint8_t kProgramData = 0x70;
constexpr uint8_t kProgramControl = 0x71;
constexpr uint8_t kCRCEndHigh = 0x72;
constexpr uint8_t kCRCEndMiddle = 0x73;
constexpr uint8_t kCRCEndLow = 0x74;
constexpr uint8_t kCRCResult = 0x75;
constexpr uint8_t kRunControl = 0xEE;
constexpr uint8_t kIndirectAddress = 0xF4;
constexpr uint8_t kIndirectData = 0xF5;

constexpr uint8_t kISPMode = 0x80;
constexpr uint8_t kCRCBusy = 0x04;
constexpr uint8_t kBufferReady = 0x10;
constexpr uint8_t kPageProgram = 0x20;
constexpr uint8_t kStartPageProgram = 0xA0;
constexpr uint8_t kFlashBusy = 0x01;
// Leaves ISP and runs the new firmware at the next reset.
constexpr uint8_t kRunNewFirmware = 2;

// The flash's 64 KiB block erase.
constexpr uint8_t kBlockEraseOpcode = 0xD8;
constexpr uint8_t kPageProgramOpcode = 0x02;
constexpr size_t kPageSize = 256;
// CalcByteCRC of a whole block of 0xFF: what an erased block reads.
constexpr uint8_t kBlankBlockCRC = 0xDE;

constexpr unsigned int kISPEntryTries = 10;
constexpr unsigned int kBlockTries = 10;
constexpr unsigned int kISPWaitReads = 50;
constexpr unsigned int kBufferWaitReads = 100;
constexpr unsigned int kFlashWaitReads = 600;

constexpr std::array<uint8_t, 256> MakeCRCTable() {
  std::array<uint8_t, 256> table{};
  for (unsigned int byte = 0; byte < 256; ++byte) {
    uint8_t crc = static_cast<uint8_t>(byte);
    for (int bit = 0; bit < 8; ++bit) {
      crc = static_cast<uint8_t>((crc & 0x80) != 0 ? (crc << 1) ^ 0x07 : crc << 1);
    }
    table[byte] = crc;
  }
  return table;
}
constexpr std::array<uint8_t, 256> kCRCTable = MakeCRCTable();

}  // namespace

RTDISP::RTDISP(std::shared_ptr<CI2CConnectorFTDI> connector_I, const std::vector<uint8_t>& data_I,
               CInterfaceNotifier* notifier_I, bool quantaFirmware_I, bool qisdaVenusScalarBoard_I)
    : mConnector(std::move(connector_I)),
      mNotifier(notifier_I),
      mQuantaFirmware(quantaFirmware_I),
      mQisdaVenusScalarBoard(qisdaVenusScalarBoard_I) {
  LoadData(data_I);
}

void RTDISP::Log(const std::string& text_I, bool toFile_I) {
  if (mNotifier != nullptr) mNotifier->InterfaceLog(text_I);
  if (toFile_I) TavLog::Info("%s\n", text_I.c_str());
}

void RTDISP::Error(const std::string& text_I) {
  if (mNotifier != nullptr) {
    mNotifier->InterfaceError(text_I);
  } else {
    TavLog::Error("%s\n", text_I.c_str());
  }
}

void RTDISP::Progress(unsigned int percent_I) {
  if (mNotifier != nullptr) mNotifier->InterfaceProgress(percent_I);
}

void RTDISP::LoadData(const std::vector<uint8_t>& data_I) {
  Log("LoadData()", false);
  mBlockCount = static_cast<uint32_t>(data_I.size() / FLASH_UINT_SIZE);
  // A partial block at the end is dropped.
  if (data_I.size() % FLASH_UINT_SIZE != 0) TAVASSERT_TEXT("data_I.size() % FLASH_UINT_SIZE == 0");
  mBlocks.clear();
  mBlockSums.clear();
  for (uint32_t block = 0; block < mBlockCount; ++block) {
    const auto begin = data_I.begin() + static_cast<long>(block * FLASH_UINT_SIZE);
    mBlocks.emplace_back(begin, begin + FLASH_UINT_SIZE);
    uint32_t sum = 0;
    for (uint8_t byte : mBlocks.back()) sum += byte;
    mBlockSums.push_back(sum & 0xFFFF);
  }
  mDataLoaded = true;
}

bool RTDISP::StartISPFlash() {
  TavLog::Info("StartISPFlash()\n");
  if (!mConnector || mNotifier == nullptr || !mDataLoaded) {
    Error("Interface not setup");
    return false;
  }
  if (SerialFlashISPFlow()) return true;
  SerialFlashExitISP();
  return false;
}

bool RTDISP::SerialFlashISPFlow() {
  Log("SerialFlashISPFlow()", false);
  if (mQuantaFirmware) ReadMCUReg(kFlashCommand);

  unsigned int tries = 0;
  bool entered = false;
  while (!entered && tries < kISPEntryTries) {
    entered = SerialFlashIntoISP();
    ++tries;
  }
  // An entry at the last try counts as a failure too; the boards have
  // always been run this way.
  if (tries >= kISPEntryTries) {
    Error("Fail to Enter ISP mode");
    return false;
  }

  SetDefaultReg();
  if (mQuantaFirmware) QuantaCheckFlash();
  DisableHardwareFlashWriteProtect();
  if (!EnableSoftwareFlashWriteProtect(false)) {
    Error("Disable SW WP Fail");
    return false;
  }

  // The index is 8 bits and signed: more than 128 blocks were never meant
  // for these flashes, and such a count writes nothing.
  for (int8_t block = static_cast<int8_t>(mBlockCount - 1); block >= 0; --block) {
    Progress(BlockProgress(block));
    if (mBlocks[static_cast<size_t>(block)].empty()) continue;
    if (!WriteBlock(block)) return false;
    Log("Block " + std::to_string(block) + " upgrade success", false);
  }

  EnableSoftwareFlashWriteProtect(true);
  WriteMCUReg(kRunControl, kRunNewFirmware);
  return true;
}

unsigned int RTDISP::BlockProgress(int8_t block_I) const {
  // Rises from 0 to 100 as the blocks go down; one block alone is 100.
  const float share = static_cast<float>(block_I) / (static_cast<float>(mBlockCount) - 1.0f);
  const float scaled = share * 100.0f;
  const int done = std::isfinite(scaled) ? static_cast<int>(scaled) : 0;
  return static_cast<unsigned int>(100 - done);
}

bool RTDISP::WriteBlock(int8_t block_I) {
  const unsigned int block = static_cast<unsigned int>(block_I);
  const std::vector<uint8_t>& data = mBlocks[block];
  for (unsigned int attempt = 0; attempt < kBlockTries; ++attempt) {
    if (!BlockErase(block)) {
      Error("Block Erase Fail");
      continue;
    }
    SerialFlashWriteCode(block);
    const uint32_t size = static_cast<uint32_t>(data.size());
    if (CalcByteCRC(data.data(), data.size()) == ReadCRC(block * FLASH_UINT_SIZE, size)) {
      if (!mWriteTransferFailed) return true;
      // A lost byte shifts the rest of the block; the CRC cannot be trusted
      // to see that, so the block is written again.
      Error("Block " + std::to_string(block_I) + " lost bytes on the bus while being written");
      continue;
    }
    Error("Crc Check Fail");
  }
  Error("Exausted retries attempting to write block " + std::to_string(block_I));
  return false;
}

bool RTDISP::SerialFlashIntoISP() {
  Log("SerialFlashIntoISP()", false);
  WriteMCUReg(kISPControl, kISPMode);
  if (!WaitBitChange(kISPControl, kISPMode, kISPMode, kISPWaitReads)) return false;
  WriteMCURegs({{kIndirectAddress, 0x9F},
                {kIndirectData, 0x06},
                {kIndirectAddress, 0xA0},
                {kIndirectData, 0x74}});
  return true;
}

FT_STATUS RTDISP::SerialFlashExitISP() {
  Log("SerialFlashExitISP()", false);
  return WriteMCUReg(kISPControl, 0);
}

void RTDISP::SetDefaultReg() {
  Log("SetDefaultReg()", false);
  if (mQuantaFirmware) {
    WriteMCURegs({{0x1E, 2},
                  {0x1F, 0},
                  {0x20, 0x1C},
                  {0x2C, 2},
                  {0x2D, 0},
                  {0x2E, 0x1C},
                  {0x1B, 2},
                  {0x1C, 0x30},
                  {0x1D, 0x1C}});
  }
  WriteMCURegs({{0x6A, 3},
                {0x6B, 0x0B},
                {0x6C, 0},
                {0x62, 6},
                {0x63, 0x50},
                {0xED, 0x88},
                {kRunControl, 4}});
}

bool RTDISP::QuantaCheckFlash() {
  Log("QuantaCheckFlash()", false);
  // Reads the flash's identification; the values only show in a bus trace.
  WriteMCURegs({{kFlashCommand, 0x46}, {kFlashOpcode, 0x9F}, {kFlashCommand, 0x47}});
  WaitFlashIdle();
  for (uint8_t reg : {kFlashCommand, kFlashResult0, kFlashResult1, kFlashResult2}) {
    ReadMCUReg(reg);
  }
  WriteMCURegs({{kFlashCommand, 0x5A},
                {kFlashOpcode, 0xAB},
                {kFlashAddressHigh, 0},
                {kFlashAddressMiddle, 0},
                {kFlashAddressLow, 0},
                {kFlashCommand, 0x5B}});
  const bool idle = WaitFlashIdle();
  ReadMCUReg(kFlashCommand);
  ReadMCUReg(kFlashResult0);
  return idle;
}

void RTDISP::DisableHardwareFlashWriteProtect() {
  Log("DisableHardwareFlashWriteProtect()", true);
  if (mQuantaFirmware && mQisdaVenusScalarBoard) {
    TAVASSERT_TEXT("!(mQuantaFirmware && mQisdaVenusScalarBoard)");
  }
  if (mQuantaFirmware) {
    WriteMCURegs({{kIndirectAddress, 0x9F}, {kIndirectData, 0x00}, {kIndirectAddress, 0x00}});
    const uint8_t a = ReadMCUReg(kIndirectData);
    WriteMCURegs({{kIndirectAddress, 0x9F}, {kIndirectData, 0x00}, {kIndirectAddress, 0x0F}});
    const uint8_t b = ReadMCUReg(kIndirectData);

    // The board's size decides where its write-protect pins are; an unknown
    // board gets the 16-inch pins.
    uint8_t first = 0x36;
    uint8_t second = 0x26;
    if (a == 0xCF && b == 0x21) {
      TavLog::Info("Brodick 1.5 16\"\n");
    } else if (a == 0xCE && b == 0x23) {
      TavLog::Info("Brodick 1.5 13\"\n");
      first = 0x29;
      second = 0x19;
    } else {
      TavLog::Error("Error ID.\n");
    }
    WriteMCURegs({{kIndirectAddress, 0x9F}, {kIndirectData, 0x10}, {kIndirectAddress, first}});
    const uint8_t v = ReadMCUReg(kIndirectData);
    WriteMCURegs({{kIndirectAddress, first},
                  {kIndirectData, static_cast<uint8_t>((v & 0xF8) + 1)},
                  {kIndirectAddress, 0x9F},
                  {kIndirectData, 0xFE},
                  {kIndirectAddress, second},
                  {kIndirectData, 1}});
  } else if (mQisdaVenusScalarBoard) {
    WriteMCURegs({{kIndirectAddress, 0x95},
                  {kIndirectData, 0x10},
                  {kIndirectAddress, 0xD4},
                  {kIndirectData, 1},
                  {0xCD, 0},
                  {kIndirectAddress, 0x95},
                  {kIndirectData, 0x10},
                  {kIndirectAddress, 0xD8},
                  {kIndirectData, 1},
                  {0xA0, 1},
                  {kIndirectAddress, 0x95},
                  {kIndirectData, 0x10},
                  {kIndirectAddress, 0xEE},
                  {kIndirectData, 1},
                  {0xD7, 1}});
  } else {
    WriteMCURegs({{kIndirectAddress, 0x9F}, {kIndirectData, 0x10}, {kIndirectAddress, 0x38}});
    const uint8_t v = ReadMCUReg(kIndirectData);
    WriteMCURegs({{kIndirectAddress, 0x38},
                  {kIndirectData, static_cast<uint8_t>((v & 0xF8) + 1)},
                  {kIndirectAddress, 0x9F},
                  {kIndirectData, 0xFE},
                  {kIndirectAddress, 0x28},
                  {kIndirectData, 1}});
  }
}

bool RTDISP::EnableSoftwareFlashWriteProtect(bool enable_I) {
  Log("EnableSoftwareFlashWriteProtect()", false);
  // Write the flash's status register: every block protected, or none.
  WriteMCURegs({{kFlashCommand, 0x68},
                {kFlashOpcode, 0x01},
                {kFlashAddressHigh, static_cast<uint8_t>(enable_I ? 0xFF : 0x00)},
                {kFlashCommand, 0x69}});
  if (mQuantaFirmware) {
    WaitFlashIdle();
    WriteMCURegs({{kFlashCommand, 0x68},
                  {kFlashOpcode, 0x31},
                  {kFlashAddressHigh, 0x00},
                  {kFlashCommand, 0x69}});
    WaitFlashIdle();
    WriteMCURegs({{kFlashCommand, 0x68},
                  {kFlashOpcode, 0x11},
                  {kFlashAddressHigh, 0x60},
                  {kFlashCommand, 0x69}});
  }
  return WaitFlashIdle();
}

bool RTDISP::BlockErase(unsigned int block_I) {
  Log("BlockErase()", false);
  WriteMCURegs({{kFlashAddressHigh, static_cast<uint8_t>(block_I & 0xFF)},
                {kFlashAddressMiddle, 0},
                {kFlashAddressLow, 0},
                {kFlashCommand, 0xB8},
                {kFlashOpcode, kBlockEraseOpcode},
                {kFlashCommand, 0xB9}});
  if (!WaitFlashIdle()) return false;
  if (ReadCRC(block_I * FLASH_UINT_SIZE, FLASH_UINT_SIZE) != kBlankBlockCRC) {
    Error("Block erase check failed");
    return false;
  }
  return true;
}

bool RTDISP::SerialFlashWriteCode(unsigned int block_I) {
  Log("SerialFlashWriteCode()", false);
  // Only writes count: a busy MCU may refuse a poll, never data it took.
  mWriteTransferFailed = WriteMCURegs({{kProgramOpcode, kPageProgramOpcode},
                                       {kProgramControl, 0xFF},
                                       {kFlashAddressHigh, static_cast<uint8_t>(block_I & 0xFF)},
                                       {kFlashAddressMiddle, 0},
                                       {kFlashAddressLow, 0}}) != FT_OK;
  const std::vector<uint8_t>& data = mBlocks[block_I];
  // The MCU moves the flash address on by itself after every page.
  for (size_t page = 0; page < data.size(); page += kPageSize) {
    if (!WaitBitChange(kISPControl, kBufferReady, kBufferReady, kBufferWaitReads)) return false;
    const auto begin = data.begin() + static_cast<long>(page);
    const auto end = data.begin() + static_cast<long>(std::min(page + kPageSize, data.size()));
    if (WriteFlashData(std::vector<uint8_t>(begin, end)) != FT_OK) mWriteTransferFailed = true;
    if (WriteMCUReg(kISPControl, kStartPageProgram) != FT_OK) mWriteTransferFailed = true;
    if (!WaitBitChange(kISPControl, kPageProgram, 0, kFlashWaitReads)) return false;
  }
  return true;
}

uint8_t RTDISP::ReadCRC(unsigned int address_I, unsigned int length_I) {
  Log("ReadCRC()", false);
  const unsigned int end = address_I + ((length_I - 1) & 0xFFFF);
  const unsigned int last = address_I + length_I - 1;
  WriteMCURegs({{kFlashAddressHigh, static_cast<uint8_t>(address_I >> 16)},
                {kFlashAddressMiddle, static_cast<uint8_t>(address_I >> 8)},
                {kFlashAddressLow, static_cast<uint8_t>(address_I)},
                {kCRCEndHigh, static_cast<uint8_t>(end >> 16)},
                {kCRCEndMiddle, static_cast<uint8_t>(end >> 8)},
                {kCRCEndLow, static_cast<uint8_t>(last)}});
  WriteMCURegBit(kISPControl, 0xFF, kCRCBusy);
  // A CRC that never finishes shows as a wrong result below.
  WaitBitChange(kISPControl, kCRCBusy, 0, kFlashWaitReads);
  return ReadMCUReg(kCRCResult);
}

FT_STATUS RTDISP::WriteFlashData(const std::vector<uint8_t>& bytes_I) {
  Log("WriteFlashData()", false);
  FT_STATUS first = mConnector->Start();
  const auto keep = [&first](FT_STATUS status_I) {
    if (first == FT_OK) first = status_I;
  };
  keep(mConnector->SendByte(kMCUWrite, false));
  keep(mConnector->SendByte(kProgramData, false));
  for (uint8_t byte : bytes_I) keep(mConnector->SendByte(byte, false));
  keep(mConnector->Stop());
  return first;
}

FT_STATUS RTDISP::WriteMCUReg(uint8_t reg_I, uint8_t value_I) {
  Log("WriteMCUReg()", false);
  // The first failure or missing acknowledge is given back; only the
  // block writer looks at it; elsewhere a dead bus shows as a wait that
  // times out or a CRC that does not match.
  FT_STATUS first = mConnector->Start();
  for (uint8_t byte : {kMCUWrite, reg_I, value_I}) {
    const FT_STATUS status = mConnector->SendByte(byte, false);
    if (first == FT_OK) first = status;
  }
  const FT_STATUS stop = mConnector->Stop();
  return first != FT_OK ? first : stop;
}

FT_STATUS RTDISP::WriteMCURegBit(uint8_t reg_I, uint8_t andMask_I, uint8_t orMask_I) {
  Log("WriteMCURegBit()", false);
  const uint8_t value = static_cast<uint8_t>((ReadMCUReg(reg_I) & andMask_I) | orMask_I);
  return WriteMCUReg(reg_I, value);
}

uint8_t RTDISP::ReadMCUReg(uint8_t reg_I) {
  Log("ReadMCUReg()", false);
  mConnector->Start();
  mConnector->SendByte(kMCUWrite, false);
  mConnector->SendByte(reg_I, false);
  mConnector->Start();  // repeated start, no stop
  mConnector->SendByte(kMCURead, false);
  const uint8_t value = mConnector->GetByte(false).second;
  mConnector->Stop();
  return value;
}

FT_STATUS RTDISP::WriteMCURegs(std::initializer_list<std::pair<uint8_t, uint8_t>> writes_I) {
  FT_STATUS first = FT_OK;
  for (const auto& [reg, value] : writes_I) {
    const FT_STATUS status = WriteMCUReg(reg, value);
    if (first == FT_OK) first = status;
  }
  return first;
}

bool RTDISP::WaitFlashIdle() {
  return WaitBitChange(kFlashCommand, kFlashBusy, 0, kFlashWaitReads);
}

bool RTDISP::WaitBitChange(uint8_t reg_I, uint8_t mask_I, uint8_t target_I, unsigned int tries_I) {
  Log("WaitBitChange()", false);
  for (unsigned int read = 0; read < tries_I; ++read) {
    if (((ReadMCUReg(reg_I) ^ target_I) & mask_I) == 0) return true;
  }
  Error("Timed out waiting for bit change");
  return false;
}

uint8_t RTDISP::CalcByteCRC(const uint8_t* bytes_I, size_t length_I) {
  uint8_t crc = 0;
  for (size_t i = 0; i < length_I; ++i) crc = kCRCTable[crc ^ bytes_I[i]];
  return crc;
}
