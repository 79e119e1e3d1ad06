#include "lab/CLabScalarMcu.h"

#include <algorithm>
#include <cstdio>

namespace {

constexpr uint8_t kWriteAddress = 0x94;
constexpr uint8_t kReadAddress = 0x95;
constexpr uint8_t kPageProgramOpcode = 0x02;
constexpr uint8_t kWriteEnable = 0x06;
constexpr uint8_t kBlockEraseOpcode = 0xD8;

std::string Hex(unsigned value_I) {
  char text[8];
  std::snprintf(text, sizeof text, "0x%02X", value_I);
  return text;
}

uint16_t Key(uint8_t page_I, uint8_t sub_I) { return static_cast<uint16_t>(page_I << 8 | sub_I); }

}  // namespace

CLabScalarMcu::CLabScalarMcu(ELabScalarVariant variant_I, CLabSerialFlash& flash_I,
                             CLabFaults& faults_I, LabViolationSink sink_I,
                             std::function<void()> restart_I)
    : mVariant(variant_I),
      mFlash(flash_I),
      mFaults(faults_I),
      mViolation(std::move(sink_I)),
      mRestart(std::move(restart_I)) {
  PowerOn();
}

void CLabScalarMcu::PowerOn() {
  mRegisters.fill(0);
  mIndirect.clear();
  switch (mVariant) {
    case ELabScalarVariant::ePlain: mIndirect[Key(0x10, 0x38)] = 0x5A; break;
    case ELabScalarVariant::eQuanta:
      // The board id of the 16-inch board.
      mIndirect[Key(0x00, 0x00)] = 0xCF;
      mIndirect[Key(0x00, 0x0F)] = 0x21;
      mIndirect[Key(0x10, 0x36)] = 0x5A;
      break;
    case ELabScalarVariant::eQisdaVenus: mRegisters[0xCD] = 1; break;
  }
  mSub = mPage = 0;
  mIsp = false;
  mArmed = -1;
  mInstructionBusy = mProgramBusy = mCrcBusy = 0;
  mBuffer.clear();
  mReading = mHavePointer = false;
  mPointer = 0;
}

uint8_t CLabScalarMcu::Indirect(uint8_t page_I, uint8_t sub_I) const {
  const auto found = mIndirect.find(Key(page_I, sub_I));
  return found == mIndirect.end() ? 0 : found->second;
}

uint8_t CLabScalarMcu::PageSelect() const {
  return mVariant == ELabScalarVariant::eQisdaVenus ? 0x95 : 0x9F;
}

bool CLabScalarMcu::IsProtectPinHigh() const {
  switch (mVariant) {
    case ELabScalarVariant::ePlain:
      return (Indirect(0x10, 0x38) & 7) == 1 && Indirect(0xFE, 0x28) == 1;
    case ELabScalarVariant::eQuanta:
      return (Indirect(0x10, 0x36) & 7) == 1 && Indirect(0xFE, 0x26) == 1;
    case ELabScalarVariant::eQisdaVenus:
      return Indirect(0x10, 0xD4) == 1 && Indirect(0x10, 0xD8) == 1 && Indirect(0x10, 0xEE) == 1 &&
             mRegisters[0xCD] == 0 && mRegisters[0xA0] == 1 && mRegisters[0xD7] == 1;
  }
  return false;
}

bool CLabScalarMcu::OnAddress(uint8_t address_I) {
  if (address_I != kWriteAddress && address_I != kReadAddress) return false;
  mReading = address_I == kReadAddress;
  mHavePointer = false;
  return true;
}

bool CLabScalarMcu::OnWrite(uint8_t byte_I) {
  if (!mHavePointer) {
    mPointer = byte_I;
    mHavePointer = true;
    return true;
  }
  const uint8_t target = mPointer;
  if (target != 0x70 && target != 0xF5) ++mPointer;
  WriteRegister(target, byte_I);
  return true;
}

uint8_t CLabScalarMcu::OnRead() { return ReadRegister(mPointer); }

void CLabScalarMcu::OnEnd(bool) { mReading = false; }

uint32_t CLabScalarMcu::AddressAt(uint8_t first_I) const {
  return static_cast<uint32_t>(mRegisters[first_I] << 16 | mRegisters[first_I + 1] << 8 |
                               mRegisters[first_I + 2]);
}

void CLabScalarMcu::WriteRegister(uint8_t register_I, uint8_t value_I) {
  switch (register_I) {
    case 0x60:
      if ((value_I & 1) != 0) {
        StartInstruction(value_I);
      } else {
        mArmed = value_I;
      }
      mRegisters[0x60] = static_cast<uint8_t>(value_I & 0xFE);
      return;
    case 0x6F: WriteControl(value_I); return;
    case 0x70:
      if (!mIsp) {
        mViolation("page buffer written outside ISP mode");
      } else if (mBuffer.size() >= CLabSerialFlash::kPageSize) {
        mViolation("page buffer written past 256 bytes");
      } else {
        mBuffer.push_back(value_I);
      }
      return;
    case 0xF4: mSub = value_I; return;
    case 0xF5:
      if (mSub == PageSelect()) {
        mPage = value_I;
      } else {
        mIndirect[Key(mPage, mSub)] = value_I;
      }
      return;
    case 0xEE:
      mRegisters[0xEE] = value_I;
      if (value_I == 2) mRestart();
      return;
    default: mRegisters[register_I] = value_I; return;
  }
}

void CLabScalarMcu::StartInstruction(uint8_t control_I) {
  const int armed = mArmed;
  mArmed = -1;
  if (!mIsp) {
    mViolation("flash instruction outside ISP mode");
    return;
  }
  if (armed != (control_I & 0xFE)) {
    mViolation("flash instruction " + Hex(control_I) + " started without being armed");
    return;
  }
  const uint8_t opcode = mRegisters[0x61];
  const size_t outCount = (control_I >> 3) & 3;
  const size_t readCount = (control_I >> 1) & 3;
  const std::vector<uint8_t> out(mRegisters.begin() + 0x64,
                                 mRegisters.begin() + 0x64 + static_cast<std::ptrdiff_t>(outCount));
  if ((control_I & 0x20) != 0) mFlash.Execute(kWriteEnable, {}, 0, IsProtectPinHigh());
  const std::vector<uint8_t> in = mFlash.Execute(opcode, out, readCount, IsProtectPinHigh());
  std::copy(in.begin(), in.end(), mRegisters.begin() + 0x67);
  mInstructionBusy = opcode == kBlockEraseOpcode ? kEraseBusyReads : kInstructionBusyReads;
}

void CLabScalarMcu::WriteControl(uint8_t value_I) {
  mRegisters[0x6F] = value_I;
  if ((value_I & 0x80) == 0) {
    mIsp = false;
    mBuffer.clear();
    return;
  }
  mIsp = true;
  if ((value_I & 0x20) != 0) {
    if (mRegisters[0x6D] != kPageProgramOpcode) {
      mViolation("page program with programming opcode " + Hex(mRegisters[0x6D]));
    } else if (mBuffer.empty()) {
      mViolation("page program with an empty buffer");
    } else {
      const uint32_t address = AddressAt(0x64);
      mFlash.Execute(kWriteEnable, {}, 0, IsProtectPinHigh());
      mFlash.Program(address, mBuffer);
      const uint32_t next = address + static_cast<uint32_t>(mBuffer.size());
      mRegisters[0x64] = static_cast<uint8_t>(next >> 16);
      mRegisters[0x65] = static_cast<uint8_t>(next >> 8);
      mRegisters[0x66] = static_cast<uint8_t>(next);
      mBuffer.clear();
      mProgramBusy = kProgramBusyReads;
    }
  }
  if ((value_I & 0x04) != 0) {
    const uint32_t first = AddressAt(0x64);
    const uint32_t last = AddressAt(0x72);
    if (last < first || last >= mFlash.GetData().size()) {
      mViolation("CRC over a range outside the flash");
    }
    uint8_t crc = mFlash.Crc(first, last);
    if (mFaults.TakeCrcMismatch()) crc ^= 0x5A;
    mRegisters[0x75] = crc;
    mCrcBusy = kCrcBusyReads;
  }
}

bool CLabScalarMcu::Counts(int& reads_IO) {
  if (reads_IO <= 0) return false;
  --reads_IO;
  return true;
}

uint8_t CLabScalarMcu::ReadRegister(uint8_t register_I) {
  switch (register_I) {
    case 0x60: {
      const bool busy = mInstructionBusy > 0;
      if (busy && !mFaults.StuckBusy()) --mInstructionBusy;
      if (busy) mFaults.NoteBusyAnswer();
      return static_cast<uint8_t>((mRegisters[0x60] & 0xFE) | (busy ? 1 : 0));
    }
    case 0x6F: {
      uint8_t value = mIsp ? 0x80 : 0x00;
      bool busy = false;
      if (Counts(mProgramBusy)) {
        value |= 0x20;
        busy = true;
      } else if (mIsp && mBuffer.empty()) {
        value |= 0x10;
      }
      if (Counts(mCrcBusy)) {
        value |= 0x04;
        busy = true;
      }
      if (busy) mFaults.NoteBusyAnswer();
      return value;
    }
    case 0xF5: return mSub == PageSelect() ? mPage : Indirect(mPage, mSub);
    default: return mRegisters[register_I];
  }
}
