#include "lab/CLabLoader.h"

#include <algorithm>

#include "lab/LabRelease.h"

namespace {

// The engine's commands, with their report id under each variant.
enum ECommand : uint32_t {
  cReadData,
  cWriteBlock,
  cEraseBlock,
  cSetReadAddress,
  cGetStatus,
  cResetSave,
  cReset,
  cWriteWord,
  cGetParameters,
  cGetDescriptor,
  cGetChecksums,
  cSetBlockChecksum,
  cCalcBlockChecksum,
  cSetMagicWord,
  cWriteChecksums,
  cGetDeviceInfo,
  cGetStartReason,
  cSetCpu,
  cGetCpu,
  cGetCpuCount,
};

struct SCommandId {
  ECommand command;
  uint8_t loaderId;
  uint8_t nonBLId;
};

constexpr SCommandId kCommandIds[] = {
    {cReadData, 0x10, 0xD1},
    {cWriteBlock, 0x11, 0xD2},
    {cEraseBlock, 0x12, 0xD3},
    {cSetReadAddress, 0x13, 0xD4},
    {cGetStatus, 0x14, 0xD5},
    {cResetSave, 0x15, 0xD6},
    {cReset, 0x15, 0xCD},
    {cWriteWord, 0x16, 0xD7},
    {cGetParameters, 0x17, 0xD8},
    {cGetDescriptor, 0x18, 0xD9},
    {cGetChecksums, 0x19, 0xDA},
    {cSetBlockChecksum, 0x1A, 0xDB},
    {cCalcBlockChecksum, 0x1B, 0xDC},
    {cSetMagicWord, 0x1C, 0xDD},
    {cWriteChecksums, 0x1D, 0xDE},
    {cGetDeviceInfo, 0x1E, 0xDF},
    {cGetStartReason, 0x1F, 0xE0},
    {cSetCpu, 0x20, 0xE1},
    {cGetCpu, 0x21, 0xE2},
    {cGetCpuCount, 0x22, 0xE3},
};

// The start reason has one fixed id that every variant answers.
constexpr uint8_t kStartReasonId = 0x1F;
// A reset without saving must carry these two key bytes.
constexpr uint8_t kResetKey0 = 0xA6;
constexpr uint8_t kResetKey1 = 0x50;

uint32_t LE32(const std::vector<uint8_t>& report_I, size_t offset_I) {
  return report_I[offset_I] | (report_I[offset_I + 1] << 8) | (report_I[offset_I + 2] << 16) |
         (static_cast<uint32_t>(report_I[offset_I + 3]) << 24);
}
uint16_t LE16(const std::vector<uint8_t>& report_I, size_t offset_I) {
  return static_cast<uint16_t>(report_I[offset_I] | (report_I[offset_I + 1] << 8));
}
void Put32(std::vector<uint8_t>& report_IO, size_t offset_I, uint32_t value_I) {
  for (size_t i = 0; i < 4; ++i) report_IO[offset_I + i] = static_cast<uint8_t>(value_I >> (8 * i));
}
void Put16(std::vector<uint8_t>& report_IO, size_t offset_I, uint16_t value_I) {
  report_IO[offset_I] = static_cast<uint8_t>(value_I);
  report_IO[offset_I + 1] = static_cast<uint8_t>(value_I >> 8);
}

}  // namespace

CLabLoader::CLabLoader(ELabProtocol protocol_I, std::vector<SLabFlashLayout> cpus_I,
                       uint16_t deviceInfo_I)
    : mProtocol(protocol_I), mDeviceInfo(deviceInfo_I) {
  for (SLabFlashLayout& layout : cpus_I) mCpus.emplace_back(std::move(layout));
}

std::optional<uint32_t> CLabLoader::CommandOf(uint8_t reportId_I, size_t length_I) const {
  if (reportId_I == kStartReasonId) return cGetStartReason;
  for (const SCommandId& entry : kCommandIds) {
    const uint8_t id = mProtocol == ELabProtocol::eLoader ? entry.loaderId : entry.nonBLId;
    if (id != reportId_I) continue;
    // Under the loader ids both resets share one id; the length tells them apart.
    if (mProtocol == ELabProtocol::eLoader && reportId_I == 0x15) {
      return length_I == 3 ? cReset : cResetSave;
    }
    return entry.command;
  }
  return std::nullopt;
}

bool CLabLoader::Knows(uint8_t reportId_I) const { return CommandOf(reportId_I, 0).has_value(); }

void CLabLoader::Trace(SLabTraceEntry::EKind kind_I, const std::vector<uint8_t>& bytes_I,
                       bool ok_I) {
  if (!mTraceEnabled) return;
  mTrace.push_back({kind_I, bytes_I, bytes_I.size(), ok_I});
}

bool CLabLoader::Expect(const std::vector<uint8_t>& report_I, size_t length_I, const char* name_I) {
  if (report_I.size() == length_I) return true;
  mViolations.push_back(std::string(name_I) + " report of " + std::to_string(report_I.size()) +
                        " bytes, expected " + std::to_string(length_I));
  return false;
}

size_t CLabLoader::GetReportLength(uint8_t reportId_I) const {
  const std::optional<uint32_t> command = CommandOf(reportId_I, 0);
  if (!command) return 0;
  const CLabFlash& flash = Current();
  const size_t blocks = flash.GetBlockCount();
  switch (*command) {
    case cReadData: return flash.GetLayout().readSize + 5u;
    case cGetStatus: return 5;
    case cGetParameters: return 13;
    case cGetDescriptor: return 10 * blocks + 1;
    case cGetChecksums: return 4 * blocks + 5;
    case cGetDeviceInfo: return 34;
    case cGetStartReason: return 2;
    case cGetCpu:
    case cGetCpuCount: return 3;
    default: return 0;
  }
}

std::pair<size_t, size_t> CLabLoader::DataRange(const std::vector<uint8_t>& report_I) const {
  if (report_I.empty()) return {0, 0};
  const std::optional<uint32_t> command = CommandOf(report_I[0], report_I.size());
  if (command == cWriteBlock || command == cWriteWord) {
    if (report_I.size() > 5) return {5, report_I.size()};
  }
  return {0, 0};
}

bool CLabLoader::SetReport(const std::vector<uint8_t>& report_I) {
  const bool ok = [&]() {
    if (report_I.empty()) return false;
    const std::optional<uint32_t> command = CommandOf(report_I[0], report_I.size());
    if (!command) {
      mViolations.push_back("unknown set report id " + std::to_string(report_I[0]));
      return false;
    }
    const SLabFlashLayout& layout = Current().GetLayout();
    switch (*command) {
      case cWriteBlock:
        if (!Expect(report_I, layout.blockSize + 5u, "write block")) return false;
        return Current().Program(LE32(report_I, 1), &report_I[5], layout.blockSize);
      case cWriteWord:
        if (!Expect(report_I, layout.wordSize + 5u, "write word")) return false;
        return Current().Program(LE32(report_I, 1), &report_I[5], layout.wordSize);
      case cEraseBlock:
        if (!Expect(report_I, 5, "erase block")) return false;
        return Current().Erase(LE32(report_I, 1));
      case cSetReadAddress:
        if (!Expect(report_I, 5, "set read address")) return false;
        mReadAddress = LE32(report_I, 1);
        return true;
      case cResetSave:
        if (!Expect(report_I, 5, "reset") || report_I[1] != 0x01) return false;
        mResetRequested = true;
        mResetSave = true;
        return true;
      case cReset:
        if (!Expect(report_I, 3, "reset") || report_I[1] != kResetKey0 ||
            report_I[2] != kResetKey1) {
          return false;
        }
        mResetRequested = true;
        mResetSave = false;
        return true;
      case cSetBlockChecksum:
        if (!Expect(report_I, 7, "set block checksum")) return false;
        if (LE16(report_I, 1) >= Current().GetBlockCount()) return false;
        Current().SetChecksum(LE16(report_I, 1), LE32(report_I, 3));
        return true;
      case cCalcBlockChecksum:
        if (!Expect(report_I, 3, "calculate block checksum")) return false;
        if (LE16(report_I, 1) >= Current().GetBlockCount()) return false;
        Current().CalculateChecksum(LE16(report_I, 1));
        return true;
      case cSetMagicWord:
        if (!Expect(report_I, 5, "set magic word")) return false;
        Current().SetMagicWord(LE32(report_I, 1));
        return true;
      case cWriteChecksums:
        if (!Expect(report_I, 5, "write checksums")) return false;
        Current().CommitChecksums();
        return true;
      case cSetCpu:
        if (!Expect(report_I, 3, "set CPU")) return false;
        if (LE16(report_I, 1) >= mCpus.size()) return false;
        mCurrentCpu = LE16(report_I, 1);
        return true;
      default:
        mViolations.push_back("get command " + std::to_string(report_I[0]) + " sent as a set");
        return false;
    }
  }();
  Trace(SLabTraceEntry::eSetFeature, report_I, ok);
  return ok;
}

bool CLabLoader::GetReport(std::vector<uint8_t>& report_IO) {
  const bool ok = [&]() {
    if (report_IO.empty()) return false;
    const uint8_t id = report_IO[0];
    const std::optional<uint32_t> command = CommandOf(id, report_IO.size());
    if (!command) {
      mViolations.push_back("unknown get report id " + std::to_string(id));
      return false;
    }
    const CLabFlash& flash = Current();
    const SLabFlashLayout& layout = flash.GetLayout();
    const uint32_t blocks = flash.GetBlockCount();
    std::vector<uint8_t> reply;
    switch (*command) {
      case cReadData:
        if (!Expect(report_IO, layout.readSize + 5u, "read data")) return false;
        reply.assign(report_IO.size(), 0);
        flash.Read(mReadAddress, &reply[5], layout.readSize);
        mReadAddress += layout.readSize;
        break;
      case cGetStatus:
        if (!Expect(report_IO, 5, "get status")) return false;
        reply.assign(5, 0);
        break;
      case cGetParameters:
        if (!Expect(report_IO, 13, "get parameters")) return false;
        reply.assign(13, 0);
        Put16(reply, 3, layout.readSize);
        Put16(reply, 5, layout.wordSize);
        Put16(reply, 7, layout.blockSize);
        Put16(reply, 9, static_cast<uint16_t>(blocks));
        break;
      case cGetDescriptor:
        if (!Expect(report_IO, 10 * blocks + 1, "get flash descriptor")) return false;
        reply.assign(report_IO.size(), 0);
        for (uint32_t i = 0; i < blocks; ++i) {
          const SLabFlashBlock& block = layout.blocks[i];
          Put32(reply, 1 + 10 * i, block.start);
          Put32(reply, 5 + 10 * i, block.size);
          Put16(
              reply, 9 + 10 * i,
              static_cast<uint16_t>((block.wordSize & 0x7FFF) | (block.isProtected ? 0x8000 : 0)));
        }
        break;
      case cGetChecksums:
        if (!Expect(report_IO, 4 * blocks + 5, "get checksums")) return false;
        reply.assign(report_IO.size(), 0);
        Put32(reply, 1, flash.GetMagicWord());
        for (uint32_t i = 0; i < blocks; ++i) Put32(reply, 5 + 4 * i, flash.GetChecksum(i));
        break;
      case cGetDeviceInfo:
        if (!Expect(report_IO, 34, "get device info")) return false;
        reply.assign(34, 0);
        Put16(reply, 1, mDeviceInfo);
        break;
      case cGetStartReason:
        if (!Expect(report_IO, 2, "get start reason")) return false;
        reply.assign(2, 0);
        reply[1] = mStartReason;
        break;
      case cGetCpu:
        if (!Expect(report_IO, 3, "get CPU")) return false;
        reply.assign(3, 0);
        Put16(reply, 1, static_cast<uint16_t>(mCurrentCpu));
        break;
      case cGetCpuCount:
        if (!Expect(report_IO, 3, "get CPU count")) return false;
        reply.assign(3, 0);
        Put16(reply, 1, static_cast<uint16_t>(mCpus.size()));
        break;
      default:
        mViolations.push_back("set command " + std::to_string(id) + " asked as a get");
        return false;
    }
    reply[0] = id;
    std::copy(reply.begin(), reply.end(), report_IO.begin());
    return true;
  }();
  Trace(SLabTraceEntry::eGetFeature, report_IO, ok);
  return ok;
}

bool CLabLoader::TakeResetRequest(bool& save_O) {
  if (!mResetRequested) return false;
  mResetRequested = false;
  save_O = mResetSave;
  return true;
}

bool CLabLoader::IsImageValid() const {
  return std::all_of(mCpus.begin(), mCpus.end(),
                     [](const CLabFlash& flash) { return flash.IsImageValid(); });
}

void CLabLoader::Boot(ELabStartReason reason_I) {
  for (CLabFlash& flash : mCpus) flash.Boot();
  mCurrentCpu = 0;
  mReadAddress = 0;
  mResetRequested = false;
  mStartReason = reason_I;
}

void CLabLoader::FactoryImage(uint32_t seed_I) {
  for (size_t i = 0; i < mCpus.size(); ++i) {
    mCpus[i].FactoryImage(seed_I + static_cast<uint32_t>(i));
  }
}

std::vector<std::string> CLabLoader::GetViolations() const {
  std::vector<std::string> violations = mViolations;
  for (size_t i = 0; i < mCpus.size(); ++i) {
    for (const std::string& text : mCpus[i].GetViolations()) {
      violations.push_back("CPU " + std::to_string(i) + ": " + text);
    }
  }
  return violations;
}

void CLabLoader::Save(CLabStateFile& state_IO, const std::string& prefix_I) const {
  for (size_t i = 0; i < mCpus.size(); ++i) {
    mCpus[i].Save(state_IO, prefix_I + ".cpu" + std::to_string(i));
  }
}

void CLabLoader::Load(const CLabStateFile& state_I, const std::string& prefix_I) {
  for (size_t i = 0; i < mCpus.size(); ++i) {
    mCpus[i].Load(state_I, prefix_I + ".cpu" + std::to_string(i));
  }
}

std::optional<uint16_t> CLabLoader::FindImageRelease() const {
  for (const CLabFlash& cpu : mCpus) {
    for (uint32_t block = 0; block < cpu.GetBlockCount(); ++block) {
      const std::vector<uint8_t>& content = cpu.GetBlockContent(block);
      if (auto release = FindLabRelease(content.data(), content.size())) return release;
    }
  }
  return std::nullopt;
}
