#include "lab/CLabMpsse.h"

#include <algorithm>

namespace {

constexpr uint8_t kScl = 0x01;
constexpr uint8_t kDataOut = 0x02;
constexpr uint8_t kBadCommandReply = 0xFA;

// The opcodes, under the names the host's link gives them where it uses them.
constexpr uint8_t SET_DATA_BITS_LOW_BYTE = 0x80;
constexpr uint8_t READ_DATA_BITS_LOW_BYTE = 0x81;
constexpr uint8_t SET_DATA_BITS_HIGH_BYTE = 0x82;
constexpr uint8_t READ_DATA_BITS_HIGH_BYTE = 0x83;
constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BYTE_OUT = 0x11;
constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BIT_OUT = 0x13;
constexpr uint8_t MSB_RISING_EDGE_CLOCK_BYTE_IN = 0x20;
constexpr uint8_t MSB_RISING_EDGE_CLOCK_BIT_IN = 0x22;
constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BYTE_IN = 0x24;
constexpr uint8_t SEND_ANSWER_BACK_IMMEDIATE = 0x87;
constexpr uint8_t LOOPBACK_ENABLE = 0x84;
constexpr uint8_t LOOPBACK_DISABLE = 0x85;
constexpr uint8_t SET_CLK_DIVISOR = 0x86;
constexpr uint8_t DISABLE_CLK_DIVIDE_BY_5 = 0x8A;
constexpr uint8_t ENABLE_CLK_DIVIDE_BY_5 = 0x8B;
constexpr uint8_t DISABLE_ADAPTIVE_CLOCKING = 0x97;
constexpr uint8_t ENABLE_ADAPTIVE_CLOCKING = 0x96;
constexpr uint8_t DISABLE_3_PHASE_DATA_CLOCKING = 0x8D;
constexpr uint8_t ENABLE_3_PHASE_DATA_CLOCKING = 0x8C;
constexpr uint8_t ONLY_DRIVE_LOW_TRISTATE_HIGH = 0x9E;

}  // namespace

void CLabMpsse::Reset() {
  mIn.clear();
  mLowValue = mLowDirection = mHighValue = mHighDirection = 0;
  mOpenDrainLow = mOpenDrainHigh = 0;
  mDivisor = 0;
  mLoopback = false;
  mDivideBy5 = true;
  mAdaptive = mThreePhase = false;
  Apply();
}

void CLabMpsse::Purge(bool rx_I, bool tx_I) {
  if (rx_I) mOut.clear();
  if (tx_I) mIn.clear();
}

size_t CLabMpsse::Read(uint8_t* data_O, size_t size_I) {
  const size_t count = std::min(size_I, mOut.size());
  std::copy_n(mOut.begin(), count, data_O);
  mOut.erase(mOut.begin(), mOut.begin() + static_cast<std::ptrdiff_t>(count));
  return count;
}

void CLabMpsse::Write(const uint8_t* data_I, size_t size_I) {
  // Whole commands run from the host's buffer as it stands; only a command
  // split across writes is kept until the rest comes.
  if (mIn.empty()) {
    const size_t taken = RunCommands(data_I, size_I);
    mIn.assign(data_I + taken, data_I + size_I);
    return;
  }
  mIn.insert(mIn.end(), data_I, data_I + size_I);
  const size_t taken = RunCommands(mIn.data(), mIn.size());
  mIn.erase(mIn.begin(), mIn.begin() + static_cast<std::ptrdiff_t>(taken));
}

size_t CLabMpsse::RunCommands(const uint8_t* data_I, size_t size_I) {
  size_t taken = 0;
  while (taken < size_I) {
    const size_t length = CommandLength(data_I + taken, size_I - taken);
    if (length == 0 || size_I - taken < length) break;
    Run(data_I + taken, length);
    taken += length;
  }
  return taken;
}

size_t CLabMpsse::CommandLength(const uint8_t* command_I, size_t available_I) {
  switch (command_I[0]) {
    case SET_DATA_BITS_LOW_BYTE:
    case SET_DATA_BITS_HIGH_BYTE:
    case SET_CLK_DIVISOR:
    case ONLY_DRIVE_LOW_TRISTATE_HIGH: return 3;
    case MSB_RISING_EDGE_CLOCK_BYTE_IN:
    case MSB_FALLING_EDGE_CLOCK_BYTE_IN: return 3;
    case MSB_RISING_EDGE_CLOCK_BIT_IN: return 2;
    case MSB_FALLING_EDGE_CLOCK_BIT_OUT: return 3;
    case MSB_FALLING_EDGE_CLOCK_BYTE_OUT:
      if (available_I < 3) return 0;
      return 3 + (command_I[1] | (command_I[2] << 8)) + 1u;
    default: return 1;
  }
}

void CLabMpsse::Run(const uint8_t* command_I, size_t length_I) {
  const uint8_t opcode = command_I[0];
  switch (opcode) {
    case SET_DATA_BITS_LOW_BYTE: SetLow(command_I[1], command_I[2]); break;
    case SET_DATA_BITS_HIGH_BYTE:
      mHighValue = command_I[1];
      mHighDirection = command_I[2];
      break;
    case READ_DATA_BITS_LOW_BYTE:
      mOut.push_back(static_cast<uint8_t>((mLowValue & mLowDirection) | (mBus.GetScl() ? kScl : 0) |
                                          (mBus.GetSda() ? 0x06 : 0)));
      break;
    case READ_DATA_BITS_HIGH_BYTE: mOut.push_back(mHighValue); break;
    case MSB_FALLING_EDGE_CLOCK_BYTE_OUT: {
      const size_t count = length_I - 3;
      for (size_t i = 0; i < count; ++i) ClockOut(command_I[3 + i], 8);
      break;
    }
    case MSB_FALLING_EDGE_CLOCK_BIT_OUT: ClockOut(command_I[2], command_I[1] % 8 + 1); break;
    case MSB_RISING_EDGE_CLOCK_BYTE_IN:
    case MSB_FALLING_EDGE_CLOCK_BYTE_IN: {
      const size_t count = (command_I[1] | (command_I[2] << 8)) + 1u;
      for (size_t i = 0; i < count; ++i) mOut.push_back(ClockIn(8));
      break;
    }
    case MSB_RISING_EDGE_CLOCK_BIT_IN: mOut.push_back(ClockIn(command_I[1] % 8 + 1)); break;
    case SEND_ANSWER_BACK_IMMEDIATE: break;
    case LOOPBACK_ENABLE: mLoopback = true; break;
    case LOOPBACK_DISABLE: mLoopback = false; break;
    case SET_CLK_DIVISOR:
      mDivisor = static_cast<uint16_t>(command_I[1] | (command_I[2] << 8));
      break;
    case DISABLE_CLK_DIVIDE_BY_5: mDivideBy5 = false; break;
    case ENABLE_CLK_DIVIDE_BY_5: mDivideBy5 = true; break;
    case DISABLE_ADAPTIVE_CLOCKING: mAdaptive = false; break;
    case ENABLE_ADAPTIVE_CLOCKING: mAdaptive = true; break;
    case DISABLE_3_PHASE_DATA_CLOCKING: mThreePhase = false; break;
    case ENABLE_3_PHASE_DATA_CLOCKING: mThreePhase = true; break;
    case ONLY_DRIVE_LOW_TRISTATE_HIGH:
      mOpenDrainLow = command_I[1];
      mOpenDrainHigh = command_I[2];
      Apply();
      break;
    default:
      mOut.push_back(kBadCommandReply);
      mOut.push_back(opcode);
      break;
  }
}

void CLabMpsse::SetLow(uint8_t value_I, uint8_t direction_I) {
  mLowValue = value_I;
  mLowDirection = direction_I;
  Apply();
}

CLabI2CBus::EDrive CLabMpsse::PinDrive(int bit_I) const {
  const uint8_t mask = static_cast<uint8_t>(1u << bit_I);
  if ((mLowDirection & mask) == 0) return CLabI2CBus::EDrive::eReleased;
  if ((mLowValue & mask) == 0) return CLabI2CBus::EDrive::eLow;
  return (mOpenDrainLow & mask) != 0 ? CLabI2CBus::EDrive::eReleased : CLabI2CBus::EDrive::eHigh;
}

void CLabMpsse::Apply() { mBus.Drive(PinDrive(0), PinDrive(1)); }

// One clock pulse a bit: the data pin is set while SCL is low, then SCL
// rises and falls. The data pin keeps the last bit.
void CLabMpsse::ClockOut(uint8_t byte_I, int bits_I) {
  for (int bit = 7; bit > 7 - bits_I; --bit) {
    mLowValue = static_cast<uint8_t>((mLowValue & ~kDataOut) | (((byte_I >> bit) & 1) << 1));
    mLowValue = static_cast<uint8_t>(mLowValue & ~kScl);
    Apply();
    mLowValue |= kScl;
    Apply();
    mLowValue = static_cast<uint8_t>(mLowValue & ~kScl);
    Apply();
  }
}

bool CLabMpsse::DataIn() const {
  if (mLoopback) return (mLowValue & kDataOut) != 0;
  return mBus.GetSda();
}

uint8_t CLabMpsse::ClockIn(int bits_I) {
  uint8_t value = 0;
  for (int bit = 0; bit < bits_I; ++bit) {
    mLowValue = static_cast<uint8_t>(mLowValue & ~kScl);
    Apply();
    mLowValue |= kScl;
    Apply();
    value = static_cast<uint8_t>((value << 1) | (DataIn() ? 1 : 0));
    mLowValue = static_cast<uint8_t>(mLowValue & ~kScl);
    Apply();
  }
  return value;
}
