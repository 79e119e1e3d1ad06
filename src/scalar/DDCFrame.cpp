#include "scalar/DDCFrame.h"

#include <algorithm>

namespace DDCFrame {

namespace {

uint8_t High(uint16_t value_I) { return static_cast<uint8_t>(value_I >> 8); }
uint8_t Low(uint16_t value_I) { return static_cast<uint8_t>(value_I & 0xFF); }

SRequest Request(const std::vector<uint8_t>& payload_I, unsigned long sizeHint_I, int depth_I,
                 double delay_I) {
  return SRequest{Frame(payload_I), delay_I, sizeHint_I, depth_I};
}

}  // namespace

uint8_t Checksum(const std::vector<uint8_t>& bytes_I, uint8_t seed_I) {
  uint8_t sum = seed_I;
  for (uint8_t byte : bytes_I) sum ^= byte;
  return sum;
}

std::vector<uint8_t> Frame(const std::vector<uint8_t>& payload_I) {
  std::vector<uint8_t> frame;
  frame.reserve(payload_I.size() + 4);
  frame.push_back(kDestination);
  frame.push_back(kSource);
  frame.push_back(static_cast<uint8_t>(kLengthFlag | payload_I.size()));
  frame.insert(frame.end(), payload_I.begin(), payload_I.end());
  frame.push_back(Checksum(frame, 0));
  return frame;
}

const std::vector<uint8_t>& NullReply() {
  static const std::vector<uint8_t> reply{kDestination, kLengthFlag, 0xBE};
  return reply;
}

bool IsNullReply(const std::vector<uint8_t>& reply_I) {
  return reply_I.size() == 3 && reply_I[0] == kDestination && reply_I[1] == kLengthFlag;
}

bool IsChecksumGood(const std::vector<uint8_t>& reply_I) {
  return Checksum(reply_I, kReplySeed) == 0;
}

bool StartsWith(const std::vector<uint8_t>& bytes_I, std::initializer_list<uint8_t> start_I) {
  return bytes_I.size() >= start_I.size() &&
         std::equal(start_I.begin(), start_I.end(), bytes_I.begin());
}

bool IsOffsetEcho(const std::vector<uint8_t>& reply_I, uint16_t offset_I) {
  return reply_I.size() >= 5 && (reply_I[1] & 0x7F) == 3 && reply_I[3] == High(offset_I) &&
         reply_I[4] == Low(offset_I);
}

SRequest ReadEDID(uint16_t offset_I) {
  return Request({0xE2, 0xC3, High(offset_I), Low(offset_I)}, 37, 1, 0.05);
}

SRequest ReadEDIDGreyOwl24(uint16_t block_I) {
  return Request({0x01, 0xF2, High(block_I), Low(block_I)}, 37, 1, 0.05);
}

SRequest ReadDisplayInformation() { return Request({0x01, 0xF2}, 64, 1, 0.01); }

SRequest ReadDisplayInfoGreyOwl16R() { return Request({0x01, 0xF2, 0x00, 0x00}, 64, 1, 0.05); }

SRequest CapabilitiesStringLinnet(uint16_t offset_I) {
  return Request({0xE2, 0xF3, High(offset_I), Low(offset_I)}, 37, 1, 0.05);
}

SRequest CapabilitiesStringGreyowl(uint16_t offset_I) {
  return Request({0xF3, High(offset_I), Low(offset_I)}, 37, 1, 0.05);
}

SRequest FWVersion() { return Request({0x01, 0xC9}, 38, 1, 0.07); }

SRequest ScalarReset() {
  // Addressed to the scalar's reset port, not framed: sent as it stands.
  return SRequest{{0xEE, 0x05, 0x11, 0x00, 0x00, 0xEA}, 0.07, 38, 0};
}

SRequest SaveSettingsToScalar() { return Request({0x0C}, 38, 0, 0.22); }

}  // namespace DDCFrame
