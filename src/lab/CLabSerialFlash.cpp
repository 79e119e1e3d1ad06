#include "lab/CLabSerialFlash.h"

#include <algorithm>
#include <cstdio>

#include "lab/LabCrc.h"

namespace {

// A 1 MiB flash of no maker in particular.
constexpr uint8_t kJedecId[] = {0x5A, 0x40, 0x14};
constexpr uint8_t kSignature = 0x13;

std::string Hex(uint32_t value_I) {
  char text[16];
  std::snprintf(text, sizeof text, "0x%06X", value_I);
  return text;
}

uint32_t Address(const std::vector<uint8_t>& out_I) {
  return out_I.size() < 3 ? 0 : static_cast<uint32_t>(out_I[0] << 16 | out_I[1] << 8 | out_I[2]);
}

}  // namespace

CLabSerialFlash::CLabSerialFlash(size_t blocks_I, bool threeStatusRegisters_I,
                                 LabViolationSink sink_I)
    : mData(blocks_I * kBlockSize, 0xFF),
      mThreeStatusRegisters(threeStatusRegisters_I),
      mViolation(std::move(sink_I)) {}

void CLabSerialFlash::SetData(std::vector<uint8_t> data_I) {
  data_I.resize(mData.size(), 0xFF);
  mData = std::move(data_I);
  ++mRevision;
  Touch(0, mData.size());
}

void CLabSerialFlash::Touch(size_t begin_I, size_t end_I) {
  if (mDirtyBegin == mDirtyEnd) {
    mDirtyBegin = begin_I;
    mDirtyEnd = end_I;
    return;
  }
  mDirtyBegin = std::min(mDirtyBegin, begin_I);
  mDirtyEnd = std::max(mDirtyEnd, end_I);
}

std::vector<uint8_t> CLabSerialFlash::Execute(uint8_t opcode_I, const std::vector<uint8_t>& out_I,
                                              size_t readCount_I, bool protectPinHigh_I) {
  std::vector<uint8_t> in;
  switch (opcode_I) {
    case 0x06: mWriteEnabled = true; break;
    case 0x04: mWriteEnabled = false; break;
    case 0x05: in.assign(readCount_I, mStatus[0] | (mWriteEnabled ? 0x02 : 0)); break;
    case 0x35: in.assign(readCount_I, mStatus[1]); break;
    case 0x15: in.assign(readCount_I, mStatus[2]); break;
    case 0x9F: in.assign(std::begin(kJedecId), std::end(kJedecId)); break;
    case 0xAB: in.assign(readCount_I, kSignature); break;
    case 0x03:
      for (size_t i = 0; i < readCount_I; ++i) {
        in.push_back(mData[(Address(out_I) + i) % mData.size()]);
      }
      break;
    case 0x01:
    case 0x31:
    case 0x11: {
      const size_t index = opcode_I == 0x01 ? 0 : opcode_I == 0x31 ? 1 : 2;
      if (index != 0 && !mThreeStatusRegisters) {
        mViolation("flash instruction " + Hex(opcode_I) + " this flash does not have");
      } else if (out_I.empty()) {
        mViolation("status register write with no value");
      } else {
        WriteStatus(index, out_I[0], protectPinHigh_I);
      }
      break;
    }
    case 0xD8:
      if (out_I.size() < 3) {
        mViolation("block erase with no address");
      } else {
        Erase(Address(out_I));
      }
      break;
    default: mViolation("unknown flash instruction " + Hex(opcode_I)); break;
  }
  in.resize(readCount_I, 0xFF);
  return in;
}

bool CLabSerialFlash::WriteAllowed(const std::string& what_I) {
  const bool enabled = mWriteEnabled;
  mWriteEnabled = false;
  if (!enabled) {
    mViolation(what_I + " without write enable");
    return false;
  }
  if (IsProtected()) {
    mViolation(what_I + " while the flash is write-protected");
    return false;
  }
  return true;
}

void CLabSerialFlash::WriteStatus(size_t register_I, uint8_t value_I, bool protectPinHigh_I) {
  const bool enabled = mWriteEnabled;
  mWriteEnabled = false;
  if (!enabled) {
    mViolation("status register write without write enable");
    return;
  }
  if (register_I == 0 && (mStatus[0] & 0x80) != 0 && !protectPinHigh_I) {
    mViolation("status register write while the write-protect pin is low");
    return;
  }
  // The busy and write-enable bits are not stored.
  mStatus[register_I] = register_I == 0 ? static_cast<uint8_t>(value_I & 0xFC) : value_I;
  ++mRevision;
}

void CLabSerialFlash::Erase(uint32_t address_I) {
  if (!WriteAllowed("erase of block at " + Hex(address_I))) return;
  const size_t first = address_I / kBlockSize * kBlockSize;
  if (first >= mData.size()) {
    mViolation("erase at " + Hex(address_I) + " past the end of the flash");
    return;
  }
  std::fill_n(mData.begin() + static_cast<std::ptrdiff_t>(first), kBlockSize, 0xFF);
  ++mRevision;
  Touch(first, first + kBlockSize);
  ++mErases;
}

void CLabSerialFlash::Program(uint32_t address_I, const std::vector<uint8_t>& data_I) {
  if (!WriteAllowed("page program at " + Hex(address_I))) return;
  if (data_I.size() > kPageSize || address_I % kPageSize + data_I.size() > kPageSize ||
      address_I + data_I.size() > mData.size()) {
    mViolation("page program at " + Hex(address_I) + " outside one page of the flash");
    return;
  }
  bool overwrote = false;
  ++mRevision;
  Touch(address_I, address_I + data_I.size());
  for (size_t i = 0; i < data_I.size(); ++i) {
    uint8_t& cell = mData[address_I + i];
    overwrote |= (cell & data_I[i]) != data_I[i];
    // Programming only clears bits.
    cell &= data_I[i];
  }
  if (overwrote) mViolation("page program at " + Hex(address_I) + " over bytes not erased");
}

uint8_t CLabSerialFlash::Crc(uint32_t first_I, uint32_t last_I) const {
  if (last_I < first_I || last_I >= mData.size()) return 0;
  return LabCrc::ScalarBlock(mData.data() + first_I, last_I - first_I + 1);
}

void CLabSerialFlash::Save(CLabStateFile& state_IO) const {
  state_IO.PutBytes("flash", mData, mRevision, mSavedRevision, mDirtyBegin, mDirtyEnd);
  mSavedRevision = mRevision;
  mDirtyBegin = mDirtyEnd = 0;
  state_IO.PutBytes("flashStatus", {mStatus[0], mStatus[1], mStatus[2]});
}

void CLabSerialFlash::Load(const CLabStateFile& state_I) {
  std::vector<uint8_t> bytes;
  if (state_I.GetBytes("flash", bytes) && bytes.size() == mData.size()) mData = bytes;
  ++mRevision;
  Touch(0, mData.size());
  if (state_I.GetBytes("flashStatus", bytes) && bytes.size() == 3) {
    std::copy(bytes.begin(), bytes.end(), mStatus);
  }
  ++mRevision;
  mWriteEnabled = false;
}
