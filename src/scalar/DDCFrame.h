#pragma once
// The scalar's request and reply frames, built and checked apart from any
// bus. A request: destination 0x6E, source 0x51, 0x80 | payload length,
// payload (command first), XOR of everything before. A reply, as read after
// the address byte 0x6F: the request's first byte, 0x80 | payload length,
// payload, checksum, good when the XOR of it all seeded with 0x50 is 0.

#include <cstdint>
#include <initializer_list>
#include <vector>

namespace DDCFrame {

inline constexpr uint8_t kDestination = 0x6E;
inline constexpr uint8_t kSource = 0x51;
inline constexpr uint8_t kReadAddress = 0x6F;
inline constexpr uint8_t kLengthFlag = 0x80;
// Replies are summed from this seed: the 0x50 stands for the host, the
// source of the address byte 0x6F that the reply itself leaves out.
inline constexpr uint8_t kReplySeed = 0x50;

// One request with the way it is sent: the wait between write and read,
// the reply size to reserve, and the retry depth (a failed write is tried
// again depth + 1 times).
struct SRequest {
  std::vector<uint8_t> bytes;
  double delay = 0;
  unsigned long sizeHint = 0;
  int depth = 0;
};

// Starts from `seed_I` and XORs every byte in.
uint8_t Checksum(const std::vector<uint8_t>& bytes_I, uint8_t seed_I);
// A checksummed request frame around `payload_I`.
std::vector<uint8_t> Frame(const std::vector<uint8_t>& payload_I);

// The reply that stands for "no data, no error": 6E 80 BE.
const std::vector<uint8_t>& NullReply();
// Three bytes beginning 6E 80.
bool IsNullReply(const std::vector<uint8_t>& reply_I);
// Checksum included, the seeded sum is 0.
bool IsChecksumGood(const std::vector<uint8_t>& reply_I);
// `bytes_I` begins with `start_I`.
bool StartsWith(const std::vector<uint8_t>& bytes_I, std::initializer_list<uint8_t> start_I);
// A reply to a read by offset that carries only the offset back: the end
// of the data.
bool IsOffsetEcho(const std::vector<uint8_t>& reply_I, uint16_t offset_I);

SRequest ReadEDID(uint16_t offset_I);
SRequest ReadEDIDGreyOwl24(uint16_t block_I);
SRequest ReadDisplayInformation();
SRequest ReadDisplayInfoGreyOwl16R();
SRequest CapabilitiesStringLinnet(uint16_t offset_I);
SRequest CapabilitiesStringGreyowl(uint16_t offset_I);
SRequest FWVersion();
SRequest ScalarReset();
SRequest SaveSettingsToScalar();

}  // namespace DDCFrame
