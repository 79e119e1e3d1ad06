#include "lab/CLabDdcScalar.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "common/CClock.h"
#include "lab/LabRelease.h"

namespace {

constexpr uint8_t kRequestAddress = 0x6E;
constexpr uint8_t kReplyAddress = 0x6F;
constexpr uint8_t kResetAddress = 0xEE;
constexpr uint8_t kHostSource = 0x51;
constexpr uint8_t kReplySeed = 0x50;
constexpr uint8_t kPieceReply = 0xE3;
constexpr size_t kPieceSize = 32;
constexpr size_t kEdidBlockSize = 16;
constexpr size_t kRecordSize = 52;
constexpr size_t kNameAt = 14;
constexpr size_t kSerialAt = 27;
// Longer than any request of the protocol: a runaway write.
constexpr size_t kLongestRequest = 4 + 0x7F;
const std::vector<uint8_t> kResetRequest{0xEE, 0x05, 0x11, 0x00, 0x00, 0xEA};
const std::vector<uint8_t> kNullReply{0x6E, 0x80, 0xBE};

uint8_t Xor(const uint8_t* begin_I, const uint8_t* end_I, uint8_t seed_I) {
  uint8_t sum = seed_I;
  for (const uint8_t* at = begin_I; at != end_I; ++at) sum ^= *at;
  return sum;
}

unsigned FromBcd(uint8_t value_I) { return (value_I >> 4) * 10u + (value_I & 0x0F); }

std::string Hex(unsigned value_I) {
  char text[8];
  std::snprintf(text, sizeof text, "0x%02X", value_I);
  return text;
}

}  // namespace

CLabDdcScalar::CLabDdcScalar(SLabPanel panel_I, uint16_t shippedRelease_I,
                             const CLabSerialFlash& flash_I, CLabFaults& faults_I,
                             LabViolationSink sink_I)
    : mPanel(std::move(panel_I)),
      mShippedRelease(shippedRelease_I),
      mFlash(flash_I),
      mFaults(faults_I),
      mViolation(std::move(sink_I)),
      mEdid(MakeLabEdid(mPanel)),
      mReply(kNullReply) {}

const char* CLabDdcScalar::CapabilitiesString() {
  return "(prot(monitor)type(lcd)model(LAB)cmds(01 02 03 0C E3 F3)vcp(02 04 05 08 10 12 14(05 06 "
         "08 0B) 16 18 1A 60(0F 11) 62 6C 6E 70 AC AE B6 C6 C8 C9 D6(01 04 05) DF)mccs_ver(2.2))";
}

void CLabDdcScalar::Boot(double quietSeconds_I) {
  const std::vector<uint8_t>& data = mFlash.GetData();
  mRunning = !data.empty() && data[0] != 0xFF;
  mRelease = FindLabRelease(data.data(), data.size()).value_or(mShippedRelease);
  mAwakeAt = CClock::Get()->Now() + quietSeconds_I;
  mRequest.clear();
  mReply = kNullReply;
  mSent = 0;
  mReading = false;
}

bool CLabDdcScalar::Awake() const { return mRunning && CClock::Get()->Now() >= mAwakeAt; }

bool CLabDdcScalar::OnAddress(uint8_t address_I) {
  if (address_I != kRequestAddress && address_I != kReplyAddress && address_I != kResetAddress) {
    return false;
  }
  if (!Awake()) return false;
  mReading = address_I == kReplyAddress;
  mRequest.assign(1, address_I);
  mSent = 0;
  mLeading.clear();
  mLeadingSent = 0;
  mHeldBack = false;
  if (mReading && mFaults.TakeNotReady()) {
    mLeading = {0x00};
    mHeldBack = true;
  } else if (mReading && mFaults.TakeStale()) {
    mLeading = {kReplyAddress, kHostSource};
  }
  return true;
}

bool CLabDdcScalar::OnWrite(uint8_t byte_I) {
  if (mRequest.size() >= kLongestRequest) {
    mViolation("a request longer than any the scalar knows");
    return false;
  }
  mRequest.push_back(byte_I);
  return true;
}

uint8_t CLabDdcScalar::OnRead() {
  if (mLeadingSent < mLeading.size()) return mLeading[mLeadingSent++];
  // Nothing more to say: SDA let go, so the host's STOP gets through.
  if (mHeldBack) return 0xFF;
  return mSent < mReply.size() ? mReply[mSent++] : 0xFF;
}

void CLabDdcScalar::OnEnd(bool refused_I) {
  if (mReading) {
    // A reply is read once.
    if (mSent > 0 && !mHeldBack) mReply = kNullReply;
  } else if (!refused_I && mRequest.size() > 1) {
    TakeRequest();
  }
  mRequest.clear();
  mReading = false;
}

void CLabDdcScalar::TakeRequest() {
  const std::vector<uint8_t>& frame = mRequest;
  if (frame[0] == kResetAddress) {
    if (frame != kResetRequest) {
      mViolation("unknown request at 0xEE");
      return;
    }
    ++mResets;
    Boot(kBootSeconds);
    return;
  }
  if (frame.size() < 4 || frame[1] != kHostSource || (frame[2] & 0x80) == 0 ||
      frame.size() != 4u + (frame[2] & 0x7F)) {
    mViolation("a request frame of " + std::to_string(frame.size()) +
               " bytes with a wrong source or length");
    return;
  }
  if (Xor(frame.data(), frame.data() + frame.size() - 1, 0) != frame.back()) {
    mViolation("a request with a wrong checksum");
    return;
  }
  const std::vector<uint8_t> p(frame.begin() + 3, frame.end() - 1);
  const auto is = [&](std::initializer_list<uint8_t> head_I, size_t size_I) {
    return p.size() == size_I && std::equal(head_I.begin(), head_I.end(), p.begin());
  };
  if (is({0xE2, 0xC3}, 4)) {
    AnswerPiece(mEdid, {p[2], p[3]});
  } else if (is({0x01, 0xF2}, 4)) {
    const size_t at = (p[2] << 8 | p[3]) * kEdidBlockSize;
    if (at >= mEdid.size()) {
      AnswerNull();
    } else {
      Answer(
          std::vector<uint8_t>(mEdid.begin() + static_cast<std::ptrdiff_t>(at),
                               mEdid.begin() + static_cast<std::ptrdiff_t>(at + kEdidBlockSize)));
    }
  } else if (is({0x01, 0xF2}, 2)) {
    std::vector<uint8_t> payload{0x02};
    const std::vector<uint8_t> record = DisplayInformation();
    payload.insert(payload.end(), record.begin(), record.end());
    Answer(payload);
  } else if (is({0xE2, 0xF3}, 4) || is({0xF3}, 3)) {
    const char* caps = CapabilitiesString();
    AnswerPiece(std::vector<uint8_t>(caps, caps + std::strlen(caps) + 1),
                {p[p.size() - 2], p.back()});
  } else if (is({0x01, 0xC9}, 2)) {
    const uint32_t version = FromBcd(mRelease >> 8) << 16 | FromBcd(mRelease & 0xFF) << 8;
    Answer({0x02, 0x00, 0xC9, 0x00, static_cast<uint8_t>(version >> 24),
            static_cast<uint8_t>(version >> 16), static_cast<uint8_t>(version >> 8),
            static_cast<uint8_t>(version)});
  } else if (is({0x0C}, 1)) {
    ++mSaves;
    AnswerNull();
  } else {
    mViolation("a request the scalar does not know, command " + Hex(p.empty() ? 0 : p[0]));
    AnswerNull();
  }
}

void CLabDdcScalar::Answer(const std::vector<uint8_t>& payload_I) {
  mReply = {kRequestAddress, static_cast<uint8_t>(0x80 | payload_I.size())};
  mReply.insert(mReply.end(), payload_I.begin(), payload_I.end());
  mReply.push_back(Xor(mReply.data(), mReply.data() + mReply.size(), kReplySeed));
  mSent = 0;
}

void CLabDdcScalar::AnswerNull() {
  mReply = kNullReply;
  mSent = 0;
}

void CLabDdcScalar::AnswerPiece(const std::vector<uint8_t>& whole_I,
                                const std::vector<uint8_t>& offset_I) {
  const size_t at = offset_I[0] << 8 | offset_I[1];
  std::vector<uint8_t> payload{kPieceReply, offset_I[0], offset_I[1]};
  if (at < whole_I.size()) {
    const size_t count = std::min(kPieceSize, whole_I.size() - at);
    payload.insert(payload.end(), whole_I.begin() + static_cast<std::ptrdiff_t>(at),
                   whole_I.begin() + static_cast<std::ptrdiff_t>(at + count));
  }
  Answer(payload);
}

std::vector<uint8_t> CLabDdcScalar::DisplayInformation() const {
  std::vector<uint8_t> record(kRecordSize, 0x00);
  record[0] = kLabDisplayManufacturer >> 8;
  record[1] = kLabDisplayManufacturer & 0xFF;
  record[2] = static_cast<uint8_t>(mPanel.productCode);
  record[3] = static_cast<uint8_t>(mPanel.productCode >> 8);
  const std::string name = mPanel.name.substr(0, kSerialAt - kNameAt - 1);
  const std::string serial = mPanel.serial.substr(0, kRecordSize - kSerialAt - 1);
  std::copy(name.begin(), name.end(), record.begin() + kNameAt);
  std::copy(serial.begin(), serial.end(), record.begin() + kSerialAt);
  return record;
}
