#pragma once
// The lab scalar's DDC/CI side on the bridge's bus. A request is written to
// 0x6E as 0x6E 0x51 (0x80 | n) payload checksum, the checksum the XOR of
// every byte before it; the reply is read from 0x6F as 0x6E (0x80 | n)
// payload checksum, the checksum chosen so that the XOR of 0x50 and every
// reply byte is 0. A read with no reply waiting gives the null reply 0x6E
// 0x80 0xBE; past the end of a reply the scalar sends 0xFF, letting SDA go
// so the host's STOP can follow an acknowledged last byte.
//
// Requests answered (payload):
//   E2 C3 hi lo   EDID from offset hi:lo, 32 bytes a reply, as E3 hi lo data;
//                 past the end, E3 hi lo alone
//   01 F2 hi lo   EDID block hi:lo of 16 bytes, as the 16 bytes; a block past
//                 the end gets the null reply
//   01 F2         display information: 02 and the 52-byte record, the
//                 manufacturer number (high byte first) at 0, the product
//                 code (low byte first) at 2, the name at 14, the serial at
//                 27, each ended by a zero byte
//   E2 F3 hi lo,
//   F3 hi lo      the capabilities string from offset hi:lo, as the EDID;
//                 the string is sent with its terminating zero byte, as
//                 scalars store it
//   01 C9         firmware version: 02 00 C9 00, then the version as a 32-bit
//                 number, high byte first: major << 16 | minor << 8, the two
//                 digits pairs of the release the flash names (0x0110: 1.10)
//   0C            save settings: the null reply
// and at 0xEE the fixed reset request 05 11 00 00 EA, which restarts the
// scalar. A reply is ready as soon as the request's STOP.
//
// The scalar runs the firmware in its flash, read when it starts: at
// power-on, at a reset, and when the MCU ends ISP mode by 0xEE = 2. Its
// release is the one the flash names (LabRelease.h), or the release it
// shipped with. With its first flash byte erased it does not start and
// acknowledges none of its addresses. After a reset or the end of ISP mode
// it acknowledges nothing for kBootSeconds of clock time while it boots; a
// lab run finds it long started. The host's reset therefore reads no reply.
//
// Faults (not-ready@N, stale@N) count the replies the host reads: a reply
// not ready yet starts with a zero byte and stays for the next read; a
// stale reply has two leftover bytes ahead of its header.
//
// Violations: a request with a wrong checksum, source or length, and a
// request the scalar does not know. A request cut short by a refused byte
// is dropped silently: the host gave it up.

#include <cstdint>
#include <string>
#include <vector>

#include "lab/CLabFaults.h"
#include "lab/CLabI2CBus.h"
#include "lab/CLabSerialFlash.h"
#include "lab/LabEdid.h"

class CLabDdcScalar : public CLabI2CDevice {
 public:
  static constexpr double kBootSeconds = 0.2;

  CLabDdcScalar(SLabPanel panel_I, uint16_t shippedRelease_I, const CLabSerialFlash& flash_I,
                CLabFaults& faults_I, LabViolationSink sink_I);

  // Starts the firmware in the flash; it answers nothing for
  // `quietSeconds_I` (a power-on finds it long started).
  void Boot(double quietSeconds_I);
  bool IsRunning() const { return mRunning; }
  uint16_t GetRelease() const { return mRelease; }
  const std::vector<uint8_t>& GetEdid() const { return mEdid; }
  const SLabPanel& GetPanel() const { return mPanel; }
  static const char* CapabilitiesString();
  size_t GetSaves() const { return mSaves; }
  size_t GetResets() const { return mResets; }

  bool OnAddress(uint8_t address_I) override;
  bool OnWrite(uint8_t byte_I) override;
  uint8_t OnRead() override;
  void OnEnd(bool refused_I) override;

 private:
  void TakeRequest();
  void Answer(const std::vector<uint8_t>& payload_I);
  void AnswerNull();
  // The piece of `whole_I` at the offset whose two bytes are given.
  void AnswerPiece(const std::vector<uint8_t>& whole_I, const std::vector<uint8_t>& offset_I);
  std::vector<uint8_t> DisplayInformation() const;
  bool Awake() const;

  SLabPanel mPanel;
  uint16_t mShippedRelease;
  const CLabSerialFlash& mFlash;
  CLabFaults& mFaults;
  LabViolationSink mViolation;
  std::vector<uint8_t> mEdid;

  bool mRunning = false;
  uint16_t mRelease = 0;
  double mAwakeAt = 0.0;
  std::vector<uint8_t> mRequest;  // address byte first
  bool mReading = false;
  std::vector<uint8_t> mReply;
  size_t mSent = 0;
  std::vector<uint8_t> mLeading;  // what a faulty read sends ahead of the reply
  size_t mLeadingSent = 0;
  bool mHeldBack = false;  // the reply was not ready for this read
  size_t mSaves = 0;
  size_t mResets = 0;
};
