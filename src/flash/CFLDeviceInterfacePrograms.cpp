// The procedures that speak the programming report: Intel-hex images,
// scalar binaries and the two Bluetooth modules. One 512-byte vector is
// written to command the device and read back to poll it, and is never
// cleared between the two: the device's reply stays in it.

#include <algorithm>

#include "common/CClock.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CScalarBinary.h"
#include "flash/ByteOrder.h"
#include "flash/CBluetoothAB1122_CRC.h"
#include "flash/CBluetoothAB1555_CRC.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CFLProtocol.h"
#include "flash/FlashConstants.h"
#include "flash/FlashText.h"

using FlashText::Dec;
using FlashText::Hex;
namespace FC = FlashConstants;

namespace {

// Report targets, byte 1 of the programming report.
constexpr uint8_t kTargetIntelHex = 0;
constexpr uint8_t kTargetAB1122 = 1;
constexpr uint8_t kTargetScalar = 4;
constexpr uint8_t kTargetAB1555 = 6;
// Phases, byte 2.
constexpr uint8_t kPhaseStart = 1;
constexpr uint8_t kPhaseData = 2;
constexpr uint8_t kPhaseEnd = 3;
// Byte 3 of a reply: 0 when the device is not busy.
constexpr size_t kBusyByte = 3;

constexpr uint32_t kIntelHexChunk = 128;
constexpr uint32_t kIntelHexMaxChunks = 1408;
constexpr size_t kScalarBlockBytes = sizeof(BLOCKDATA_SCALAR);
constexpr uint32_t kPage = 256;
// The AB1122 keeps this range for itself; its pages are never sent.
constexpr uint32_t kAB1122ReservedFirst = 0x3000;
constexpr uint32_t kAB1122ReservedLast = 0x7FFF;
// The AB1122 data header before the address, and its length with the
// address, the CRC and the page: bytes 0 to 266 before the move.
constexpr uint8_t kAB1122Header[] = {0x02, 0x00, 0x0F, 0x06, 0x01, 0x08, 0x01};
constexpr size_t kAB1122Framed = 267;
constexpr size_t kAB1555Framed = 263;
// The AB1555's CRC8 takes the polynomial halved; its generator is 0x131.
constexpr uint8_t kAB1555Polynomial = 0x98;
// Both chips move the framed page up by three bytes to make room for the
// report id, the target and the phase.
constexpr size_t kFrameShift = 3;

uint8_t ProgrammingId() {
  return CFLProtocol::GetInstance()->GetCommand(eBL_HID_REP_PROGRAMMING_ID);
}

void InitCmdBytes(std::vector<uint8_t>& report_IO, uint8_t value_I) {
  std::fill(report_IO.begin(), report_IO.end(), value_I);
}

// Moves bytes 0 to `count_I` - 1 up by three places, highest first.
void ShiftFrame(std::vector<uint8_t>& report_IO, size_t count_I) {
  for (size_t i = count_I; i-- > 0;) report_IO[i + kFrameShift] = report_IO[i];
}

uint32_t Percent(uint64_t done_I, uint64_t total_I) {
  if (total_I == 0) return 0;
  return static_cast<uint32_t>(static_cast<double>(done_I) / static_cast<double>(total_I) * 100.0);
}

}  // namespace

// Waits 0.1 s and reads, until the device reads as not busy or the limit is
// reached; a failed read does not end the poll early, and only byte 3 as it
// then stands decides.
bool CFLDeviceInterface::BusyPoll(std::vector<uint8_t>& report_IO, unsigned int limit_I) {
  for (unsigned int i = 0; i < limit_I; ++i) {
    TavSleep(FC::kBusyPollWait);
    if (SafeRead(report_IO) && report_IO[kBusyByte] == 0) break;
  }
  return report_IO[kBusyByte] == 0;
}

// One write and up to `furtherWrites_I` more, each after a short wait. Only
// a success among the first `countedWrites_I` further writes counts.
bool CFLDeviceInterface::WriteStep(std::vector<uint8_t>& report_IO, unsigned int furtherWrites_I,
                                   unsigned int countedWrites_I) {
  if (SafeWrite(report_IO)) return true;
  for (unsigned int write = 1; write <= furtherWrites_I; ++write) {
    TavSleep(FC::kWriteStepWait);
    if (SafeWrite(report_IO)) return write <= countedWrites_I;
  }
  return false;
}

bool CFLDeviceInterface::ProgramBoardIntelHex() {
  ReportLog("Starting ProgramBoardIntelHex...");
  if (GetDataSourceFormat() != EDS_INTEL_HEX) {
    ReportError("ProgramBoardIntelHex: Datasource not correct");
    return false;
  }
  if (!mIntelHexData || !mIntelHexData->IsLoaded()) {
    ReportError("ProgramBoardIntelHex: No IntelHexData");
    return false;
  }
  const CIntelHex& image = *mIntelHexData;
  const std::string notResponding =
      "ProgramBoardIntelHex: Programming error happens - device not responding";

  std::vector<uint8_t> report(FC::kProgrammingReportSize, 0);
  report[0] = ProgrammingId();
  report[1] = kTargetIntelHex;
  report[2] = kPhaseStart;
  ReportLog("ProgramBoardIntelHex: sending command to start programming...");
  if (!WriteStep(report, 10, 10)) {
    ReportError(notResponding);
    return false;
  }
  ReportLog("ProgramBoardIntelHex: waiting for device not busy (up to 10 seconds)...");
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportError("ProgramBoardIntelHex: Cannot Start Programming - device is busy.");
    return false;
  }

  // Only the chunk's own fields are set: bytes 0 and 1, and everything
  // behind the chunk, are what the device's last reply left.
  uint32_t sent = 0;
  for (uint32_t chunk = 0; chunk * kIntelHexChunk < image.Size() && chunk < kIntelHexMaxChunks;
       ++chunk) {
    const uint32_t offset = chunk * kIntelHexChunk;
    report[2] = kPhaseData;
    report[3] = 1;
    report[4] = static_cast<uint8_t>(chunk + 1);
    PutLE32(report, 5, image.StartAddress() + offset);
    report[9] = 16;
    std::copy(image.GetData() + offset, image.GetData() + offset + kIntelHexChunk,
              report.begin() + 10);
    ReportLog("ProgramBoardIntelHex: sending program data at offset: " + Dec(offset));
    if (!WriteStep(report, 11, 10)) {
      ReportError(notResponding);
      return false;
    }
    if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
      ReportError("ProgramBoardIntelHex: Programming error happens - device is busy");
      return false;
    }
    ReportLog("ProgramBoardIntelHex: bytes offset: " + Dec(offset));
    TavSleep(FC::kIntelHexChunkWait);
    ReportProgress(Percent(offset + kIntelHexChunk, image.Size()));
    sent += kIntelHexChunk;
  }
  ReportLog("ProgramBoardIntelHex:  #bytes programmed: " + Dec(sent));

  InitCmdBytes(report, 0);
  report[0] = ProgrammingId();
  report[1] = kTargetIntelHex;
  report[2] = kPhaseEnd;
  ReportLog("ProgramBoardIntelHex: - sending command to end programming...");
  if (!SafeWrite(report)) {
    ReportLog("ProgramBoardIntelHex: - there was an error trying to end programming");
    return false;
  }
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportLog("ProgramBoardIntelHex: - there was an error after programming");
    return false;
  }
  ReportLog("ProgramBoardIntelHex: - " + Dec(image.Size()) + " bytes were programmed Successfully");
  ReportLog("ProgramBoardIntelHex done!");
  return true;
}

bool CFLDeviceInterface::ProgramBoardScalarBinary() {
  ReportLog("Starting ProgramBoardScalarBinary...");
  std::vector<uint8_t> report(FC::kProgrammingReportSize);
  if (GetDataSourceFormat() != EDS_SCALAR_BINARY) {
    ReportError("ProgramBoardScalarBinary: Datasource not correct");
    return false;
  }
  if (!mScalarBinaryData || !mScalarBinaryData->IsLoaded()) {
    ReportError("ProgramBoardScalarBinary: No ScalarBinary data loaded");
    return false;
  }
  const CScalarBinary& image = *mScalarBinaryData;
  const std::string notResponding =
      "ProgramBoardScalarBinary: Programming error happens - device not responding";

  InitCmdBytes(report, 0xFF);
  report[0] = ProgrammingId();
  report[1] = kTargetScalar;
  report[2] = kPhaseStart;
  ReportLog("ProgramBoardScalarBinary: sending command to start programming...");
  if (!WriteStep(report, 10, 10)) {
    ReportError(notResponding);
    return false;
  }
  ReportLog("ProgramBoardScalarBinary: waiting for device not busy (up to 10 seconds)...");
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportError("ProgramBoardScalarBinary: Cannot Start Programming - device is busy.");
    return false;
  }

  InitCmdBytes(report, 0xFF);
  report[0] = ProgrammingId();
  report[1] = kTargetScalar;
  report[2] = kPhaseData;
  ReportLog("ProgramBoardScalarBinary: sending commands to send programming blocks...");
  const size_t count = std::min(kScalarBlockBytes, report.size() - 3);
  uint64_t sent = 0;
  for (unsigned long i = 0; i < image.NumBlocks(); ++i) {
    const auto* block = reinterpret_cast<const uint8_t*>(image.BlockPtr(i));
    std::copy(block, block + count, report.begin() + 3);
    ReportLog("ProgramBoardScalarBinary: sending program data at offset: " +
              Dec(uint64_t{i} * kScalarBlockBytes));
    if (!WriteStep(report, 11, 10)) {
      ReportError(notResponding);
      return false;
    }
    if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
      ReportError("ProgramBoardScalarBinary: Programming error happens - device is busy");
      return false;
    }
    sent += count;
    ReportProgress(Percent(sent, image.Size()));
  }
  ReportLog("ProgramBoardScalarBinary:  #bytes programmed: " + Dec(sent));
  ReportLog("ProgramBoardScalarBinary: - sending command to end programming...");

  InitCmdBytes(report, 0xFF);
  report[0] = ProgrammingId();
  report[1] = kTargetScalar;
  report[2] = kPhaseEnd;
  if (!SafeWrite(report)) {
    ReportLog("ProgramBoardScalarBinary: - there was an error trying to end programming");
    return false;
  }
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportLog("ProgramBoardScalarBinary: - there was an error after programming");
    return false;
  }
  ReportLog("ProgramBoardScalarBinary: - " + Dec(image.Size()) +
            " bytes were programmed Successfully");
  ReportLog("ProgramBoardScalarBinary done!");
  return true;
}

bool CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1122() {
  const std::string P = "ProgramBoardAiroHaBinary_AB1122";
  ReportLog("Starting " + P + "...");
  std::vector<uint8_t> report(FC::kProgrammingReportSize, 0);
  if (GetDataSourceFormat() != EDS_AIROFLASH) {
    ReportError(P + ": Datasource not correct");
    return false;
  }
  if (!mAiroFlashData || !mAiroFlashData->IsLoaded()) {
    ReportError(P + ": No AiroFlashData");
    return false;
  }
  const CBinaryAiroFlash& image = *mAiroFlashData;

  report[0] = ProgrammingId();
  report[1] = kTargetAB1122;
  report[2] = kPhaseStart;
  ReportLog(P + ": sending command to start programming...");
  if (!WriteStep(report, 10, 10)) {
    ReportError(P + ": Programming error happens - device not responding");
    return false;
  }
  ReportLog(P + ": waiting for device not busy (up to 10 seconds)...");
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportError(P + ": Cannot Start Programming - device is busy.");
    return false;
  }

  uint64_t sent = 0;
  for (uint64_t offset = 0; offset < image.Size(); offset += kPage) {
    const uint32_t address = image.StartAddress() + static_cast<uint32_t>(offset);
    if (address >= kAB1122ReservedFirst && address <= kAB1122ReservedLast) continue;
    const uint32_t real = static_cast<uint32_t>(std::min<uint64_t>(kPage, image.Size() - offset));

    std::fill(report.begin(), report.begin() + kAB1122Framed, 0xFF);
    std::copy(std::begin(kAB1122Header), std::end(kAB1122Header), report.begin());
    report[7] = static_cast<uint8_t>(address >> 16);
    report[8] = static_cast<uint8_t>(address >> 8);
    report[9] = static_cast<uint8_t>(address);
    ReportLog(P + ": calculating crc at address: 0x" + Hex(address) +
              " bytes programmed: " + Dec(real));
    // The page, then blank filling, 256 bytes through the CRC in all.
    CBluetoothAB1122_CRC crc;
    for (uint32_t k = 0; k < kPage; ++k) {
      const uint8_t byte = k < real ? image.GetData()[offset + k] : 0xFF;
      report[11 + k] = byte;
      crc.DataIn(byte);
    }
    report[10] = crc.Crc();
    ShiftFrame(report, kAB1122Framed);
    report[0] = ProgrammingId();
    report[1] = kTargetAB1122;
    report[2] = kPhaseData;

    if (!WriteStep(report, 10, 10)) {
      ReportError(P + ": Programming error - device not responding");
      return false;
    }
    if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
      ReportError(P + ": Programming error");
      return false;
    }
    ReportLog(P + ": start address: 0x" + Hex(address) + " bytes programmed: " + Dec(real));
    sent += real;
    ReportProgress(Percent(sent, image.Size()));
  }

  // Bytes 0 and 1 are as the last reply left them.
  report[2] = kPhaseEnd;
  ReportLog(P + ": - sending command to end programming...");
  if (!SafeWrite(report)) {
    ReportLog(P + ": - there was an error trying to end programming");
    return false;
  }
  if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
    ReportLog(P + ": - there was an error after programming");
    return false;
  }
  ReportLog(P + ": - " + Dec(image.Size()) + " bytes were programmed Successfully");
  ReportLog(P + " done!");
  return true;
}

bool CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1555() {
  const std::string P = "ProgramBoardAiroHaBinary_AB1555";
  ReportLog("Starting " + P + "...");
  std::vector<uint8_t> report(FC::kProgrammingReportSize, 0xFF);
  if (GetDataSourceFormat() != EDS_AIROFLASH2) {
    ReportError(P + ": Datasource not correct");
    return false;
  }
  if (!mAiroFlashData || !mAiroFlashData->IsLoaded()) {
    ReportError(P + ": No AiroFlashData");
    return false;
  }
  const CBinaryAiroFlash& image = *mAiroFlashData;

  report[0] = ProgrammingId();
  report[1] = kTargetAB1555;
  report[2] = kPhaseStart;
  report[3] = 0;
  ReportLog(P + ": sending command to start programming...");
  if (!WriteStep(report, 10, 10)) {
    ReportError(P + ": Programming error happens - device not responding");
    return false;
  }
  ReportLog(P + ": waiting for device not busy (up to 60 seconds)...");
  if (!BusyPoll(report, FC::kBusyPollSixtySeconds)) {
    ReportError(P + ": status:" + std::string(1, static_cast<char>(report[kBusyByte])) +
                "Cannot Start Programming - device is busy.");
    return false;
  }

  uint64_t sent = 0;
  for (uint64_t offset = 0; offset < image.Size(); offset += kPage) {
    const uint32_t address = image.StartAddress() + static_cast<uint32_t>(offset);
    const uint32_t real = static_cast<uint32_t>(std::min<uint64_t>(kPage, image.Size() - offset));

    std::fill(report.begin(), report.begin() + kAB1555Framed, 0xFF);
    report[0] = 0;
    report[1] = 1;
    std::fill(report.begin() + 2, report.begin() + 7, 0);
    ReportLog(P + ": calculating crc at address: 0x" + Hex(address) +
              " bytes programmed: " + Dec(real));
    std::copy(image.GetData() + offset, image.GetData() + offset + real, report.begin() + 7);
    CBluetoothAB1555_CRC crc;
    report[2] = crc.CRC8(&report[7], kPage, kAB1555Polynomial);
    ShiftFrame(report, kAB1555Framed);
    report[0] = ProgrammingId();
    report[1] = kTargetAB1555;
    report[2] = kPhaseData;

    if (!WriteStep(report, 10, 10)) {
      ReportError(P + ": Programming error - device not responding");
      return false;
    }
    if (!BusyPoll(report, FC::kBusyPollTenSeconds)) {
      ReportError(P + ": Programming error");
      return false;
    }
    ReportLog(P + ": start address: 0x" + Hex(address) + " bytes programmed: " + Dec(real));
    sent += real;
    ReportProgress(Percent(sent, image.Size()));
  }

  report[2] = kPhaseEnd;
  ReportLog(P + ": - sending command to end programming...");
  ReportLog(P + ": waiting for device not busy (up to 60 seconds)...");
  if (!SafeWrite(report)) {
    ReportLog(P + ": - there was an error trying to end programming");
    return false;
  }
  if (!BusyPoll(report, FC::kBusyPollSixtySeconds)) {
    ReportLog(P + ": - there was an error after programming: " + Dec(report[kBusyByte]));
    return false;
  }
  ReportLog(P + ": - " + Dec(image.Size()) + " bytes were programmed Successfully");
  ReportLog(P + " done!");
  return true;
}
