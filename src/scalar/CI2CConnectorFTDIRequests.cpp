// The request layer of the bridge link: one framed request written to the
// scalar at 0x6E, a wait, one reply read from 0x6F, and the readers of the
// scalar's identity, version and capabilities built on it.

#include <cctype>

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/HelperUtils.h"
#include "scalar/ScalarTrace.h"
#include "scalar/SensorFamilies.h"

namespace {

// The display-information record behind the reply's 3 header bytes.
constexpr size_t kDisplayInformationHeader = 3;
constexpr size_t kDisplayInformationRecord = 52;
constexpr size_t kDisplayInformationSize = kDisplayInformationHeader + kDisplayInformationRecord;
constexpr size_t kMonitorNameOffset = 14;
constexpr size_t kSerialNumberOffset = 27;

// A reply carries payload from this byte on when it answers a read by
// offset: header, length, command, offset high, offset low.
constexpr size_t kOffsetReplyData = 5;
// The 16-block EDID read: 16 data bytes between the 2 header bytes and the
// checksum.
constexpr uint16_t kEDIDBlocks = 16;
constexpr size_t kEDIDBlockReplySize = 19;
constexpr size_t kMultiPartReserve = 1024;

// A read by offset goes on only while each reply adds data within what a
// 16-bit offset can address: a scalar that answers without data, or without
// end, would otherwise keep the update waiting for ever.
bool Advances(size_t gathered_I, uint16_t offset_I) {
  if (gathered_I > offset_I && gathered_I <= 0xFFFF) return true;
  TavLog::Warning(
      "Read by offset stopped at %u bytes: the scalar's reply added no data or ran past 64 KiB\n",
      static_cast<unsigned int>(gathered_I));
  return false;
}

constexpr double kSerialRetrySeconds = 1.0;
constexpr double kFWVersionRetrySeconds = 0.05;

// The checksum stays on every reply; a bad one is reported and the data
// used all the same, since the scalar's sums are not always right.
void CheckAndDropChecksum(std::vector<uint8_t>& reply_IO, const char* assertion_I,
                          const char* logText_I) {
  if (!DDCFrame::IsChecksumGood(reply_IO)) {
    TAVASSERT_TEXT(assertion_I);
    TavLog::Error("%s", logText_I);
  }
  reply_IO.pop_back();
}

void AppendFrom(std::vector<uint8_t>& gathered_IO, const std::vector<uint8_t>& reply_I,
                size_t first_I) {
  if (reply_I.size() > first_I) {
    gathered_IO.insert(gathered_IO.end(), reply_I.begin() + static_cast<long>(first_I),
                       reply_I.end());
  }
}

// With tracing on, what is wrong with a version reply, before the checks.
void TraceFWVersionReply(const std::vector<uint8_t>& reply_I) {
  ConditionalFunction(g_DebugTrace != 0)([&] {
    if (reply_I[0] != 0x6E) TavLog::Error("address is incorrect\n");
    if (reply_I[1] != 0x88) TavLog::Error("length is incorrect\n");
    if (reply_I[2] != 0x02) TavLog::Error("reply code is incorrect\n");
    if (reply_I[3] == 0x01) TavLog::Error("unsupported vcp code\n");
    if (reply_I[4] != 0xC9) TavLog::Error("it is not a response to our query\n");
  });
}

}  // namespace

std::vector<uint8_t> CI2CConnectorFTDI::Send(const DDCFrame::SRequest& request_I) {
  return SendRequest(request_I.bytes, request_I.delay, request_I.sizeHint, request_I.depth);
}

std::vector<uint8_t> CI2CConnectorFTDI::SendRequest(const std::vector<uint8_t>& toSend_I,
                                                    double delay_I, unsigned long sizeHint_I,
                                                    int depth_I) {
  if (toSend_I.empty()) {
    TAVASSERT_TEXT("!toSend_I.empty()");
    return {};
  }
  ScalarTrace::Bytes("CI2CConnectorFTDI::SendRequest: data", toSend_I);

  if (SendBadCommand(false) != FT_OK) {
    CloseFTDIHandle();
    SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: SendBadCommand failed\n");
    return {};
  }
  I2CReadAll();  // stale bytes go

  I2CStart();
  for (size_t i = 0; i < toSend_I.size(); ++i) {
    if (I2CSendByte(toSend_I[i], true) == FT_OK) continue;
    I2CStop();
    if (depth_I < 0) {
      SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: I2CSendByte failed at byte: [%i]\n",
                   static_cast<int>(i));
      return {};
    }
    SCALAR_TRACE(Error,
                 "CI2CConnectorFTDI::SendRequest I2CSendByte failed at byte [%i]; depth [%i] - "
                 "attempting SendRequest...\n",
                 static_cast<int>(i), depth_I);
    return SendRequest(toSend_I, delay_I, sizeHint_I, depth_I - 1);
  }
  if (I2CStop() != FT_OK) {
    SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: I2CStop failed\n");
    return {};
  }

  TavSleep(delay_I);

  std::vector<uint8_t> inBuffer;
  inBuffer.reserve(sizeHint_I);
  I2CStart();
  if (I2CSendByte(DDCFrame::kReadAddress, true) != FT_OK) {
    I2CStop();
    SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: I2CSendByte - Read failed\n");
    return {};
  }

  // The scalar may clock out bytes of its own before the reply's header.
  while (inBuffer.empty()) {
    // Plain locals: the trace's lambda below captures `byte`.
    const std::pair<FT_STATUS, uint8_t> read = I2CGetByte(true);
    const FT_STATUS status = read.first;
    const uint8_t byte = read.second;
    if (status != FT_OK) {
      I2CStop();
      SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte header failed\n");
      return {};
    }
    if (byte == toSend_I[0]) {
      inBuffer.push_back(byte);
      const auto [sizeStatus, size] = I2CGetByte(true);
      if (sizeStatus != FT_OK) {
        I2CStop();
        SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte size failed\n");
        return {};
      }
      inBuffer.push_back(size);
    } else if (byte == 0x00) {
      I2CStop();
      SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte header zero\n");
      return DDCFrame::NullReply();
    } else if (byte == 0xFF) {
      I2CStop();
      SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte header bad\n");
      return {};
    } else {
      SCALAR_TRACE(Debug, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte status: %i [0x%X]\n",
                   byte, byte);
    }
  }

  if (inBuffer.size() != 2) TAVASSERT_TEXT("inBuffer.size() == 2");
  if ((inBuffer[1] & DDCFrame::kLengthFlag) == 0x00) TAVASSERT_TEXT("(inBuffer[1] & 0x80) != 0x00");
  const int bytesToRead = (inBuffer[1] & 0x7F) + 1;  // payload and checksum
  for (int i = 0; i < bytesToRead; ++i) {
    // Every byte is acknowledged, the last one too.
    const auto [status, byte] = I2CGetByte(true);
    if (status != FT_OK) {
      I2CStop();
      SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CGetByte data failed\n");
      return {};
    }
    inBuffer.push_back(byte);
  }
  if (I2CStop() != FT_OK) {
    SCALAR_TRACE(Error, "CI2CConnectorFTDI::SendRequest: Read I2CStop failed\n");
    return {};
  }
  if (static_cast<size_t>(bytesToRead + 2) != inBuffer.size()) {
    TAVASSERT_TEXT("(size_t)(bytesToRead + 2) == inBuffer.size()");
  }
  SCALAR_TRACE(Debug, "CI2CConnectorFTDI::SendRequest: Succeeded!\n");
  return inBuffer;
}

std::vector<uint8_t> CI2CConnectorFTDI::ReadEDID(SENSOR_ID sid_I) {
  if (IS_VENUS(sid_I) || IS_GREYOWL_16R(sid_I)) {
    TavLog::Info("CI2CConnectorFTDI::ReadEDID - skipping for sid_I 0x%X\n",
                 static_cast<unsigned int>(sid_I));
    return {};
  }
  if (IS_BRODICK(sid_I) || IS_GREYOWL(sid_I) || sid_I == -1) {
    std::vector<uint8_t> edid = ReadEDIDGreyOwl24();
    if (!edid.empty()) return edid;
  }
  return ReadEDIDByOffset(sid_I);
}

std::vector<uint8_t> CI2CConnectorFTDI::ReadEDIDByOffset(SENSOR_ID sid_I) {
  std::vector<uint8_t> edid;
  edid.reserve(kMultiPartReserve);
  uint16_t offset = 0;
  for (;;) {
    const DDCFrame::SRequest request = DDCFrame::ReadEDID(offset);
    const std::vector<uint8_t> reply = Send(request);
    if (reply.size() <= kOffsetReplyData) {
      if (reply.empty()) {
        if (IS_GREYOWL_24(sid_I)) TAVASSERT_TEXT("WARNING - unexpected EDID response");
        TavLog::Warning(
            "CI2CConnectorFTDI::ReadEDID: WARNING - unexpected EDID response for sid: 0x%X\n",
            static_cast<unsigned int>(sid_I));
      } else if (!DDCFrame::IsNullReply(reply)) {
        TAVASSERT_TEXT("WARNING - unexpected EDID response");
      }
      TavLog::Warning("ReadEDID: no data found!\n");
      return edid;
    }
    if (DDCFrame::IsOffsetEcho(reply, offset)) return edid;

    std::vector<uint8_t> data = reply;
    CheckAndDropChecksum(data, "ReadEDID: read checksum mismatch",
                         "ReadEDID:Read checksum failed\n");
    AppendFrom(edid, data, kOffsetReplyData);
    if (!Advances(edid.size(), offset)) return edid;
    offset = static_cast<uint16_t>(edid.size());
  }
}

std::vector<uint8_t> CI2CConnectorFTDI::ReadEDIDGreyOwl24() {
  std::vector<uint8_t> edid;
  edid.reserve(kMultiPartReserve);
  for (uint16_t block = 0; block < kEDIDBlocks; ++block) {
    std::vector<uint8_t> reply = Send(DDCFrame::ReadEDIDGreyOwl24(block));
    if (reply.empty()) {
      TAVASSERT_TEXT("WARNING - empty response!");
      break;
    }
    if (reply.size() != kEDIDBlockReplySize) break;
    CheckAndDropChecksum(reply, "ReadEDID read checksum mismatch",
                         "ReadEDID:Read checksum failed\n");
    AppendFrom(edid, reply, 2);
  }
  ConditionalFunction(g_DebugTrace != 0)([&] {
    TavLog::Debug("GreyOwl24 EDID as read through FTDI:\n");
    for (size_t i = 0; i < edid.size(); ++i) {
      TavLog::Debug("%2.2X ", edid[i]);
      if (i % 16 == 15) TavLog::Debug("\n");
    }
  });
  return edid;
}

std::vector<uint8_t> CI2CConnectorFTDI::ReadDisplayInformation(SENSOR_ID sid_I) {
  if (IS_GREYOWL_16R(sid_I)) {
    std::vector<uint8_t> information = ReadDisplayInfoGreyOwl16R();
    if (!information.empty()) return information;
  }
  std::vector<uint8_t> reply;
  while (reply.size() < 6) {
    reply = Send(DDCFrame::ReadDisplayInformation());
    if (reply.empty() || DDCFrame::IsNullReply(reply)) return {};
    if (reply.size() < 6) TAVASSERT_TEXT("break");
  }
  // The answer of a scalar that does not keep this record.
  if (reply.size() == 11 && DDCFrame::StartsWith(reply, {0x6E, 0x88, 0x02, 0x01, 0xF2, 0x00}))
    return {};
  CheckAndDropChecksum(reply, "ReadDisplayInformation read checksum mismatch",
                       "ReadDisplayInformation:Read checksum failed\n");
  if (reply.size() != kDisplayInformationSize) return {};
  return reply;
}

std::vector<uint8_t> CI2CConnectorFTDI::ReadDisplayInfoGreyOwl16R() {
  std::vector<uint8_t> reply;
  while (reply.size() < 6) {
    reply = Send(DDCFrame::ReadDisplayInfoGreyOwl16R());
    if (reply.empty() || DDCFrame::IsNullReply(reply)) return {};
    if (reply.size() < 6) TAVASSERT_TEXT("break");
  }
  if (reply.size() == kDisplayInformationSize) return reply;
  CheckAndDropChecksum(reply, "ReadDisplayInformation read checksum mismatch",
                       "ReadDisplayInformation:Read checksum failed\n");
  if (reply.size() != kDisplayInformationSize) return {};
  return reply;
}

std::string CI2CConnectorFTDI::DisplayInformationText(size_t recordOffset_I) const {
  if (mRawDisplayInformation.size() != kDisplayInformationSize) {
    TAVASSERT_TEXT("mRawDisplayInformation.size() == sizeof(DisplayInformation) + 3");
  }
  std::string text;
  for (size_t i = kDisplayInformationHeader + recordOffset_I;
       i < mRawDisplayInformation.size() && mRawDisplayInformation[i] != 0; ++i) {
    text.push_back(static_cast<char>(mRawDisplayInformation[i]));
  }
  return text;
}

std::string CI2CConnectorFTDI::MonitorName() {
  std::string name = Connector::MonitorName();
  if (!name.empty()) return name;
  if (mRawDisplayInformation.empty()) mRawDisplayInformation = ReadDisplayInformation(-1);
  if (mRawDisplayInformation.empty()) return {};
  return DisplayInformationText(kMonitorNameOffset);
}

std::string CI2CConnectorFTDI::SerialNumber(SENSOR_ID sid_I) {
  std::string serial = Connector::SerialNumber(sid_I);
  if (serial.empty()) {
    if (mRawDisplayInformation.empty()) mRawDisplayInformation = ReadDisplayInformation(sid_I);
    if (mRawDisplayInformation.empty()) {
      TavLog::Warning(
          "CI2CConnectorFTDI::SerialNumber - ReadDisplayInformation() failed on first attempt; "
          "trying again...\n");
      TavSleep(kSerialRetrySeconds);
      mRawDisplayInformation = ReadDisplayInformation(sid_I);
    }
    if (mRawDisplayInformation.empty()) {
      TAVASSERT_TEXT("!!!!! ReadDisplayInformation FAILED 2 attempts");
    } else {
      serial = DisplayInformationText(kSerialNumberOffset);
    }
  }
  TavLog::Info("CI2CConnectorFTDI::SerialNumber: %s\n",
               serial.empty() ? "WARNING: NO SERIAL NUMBER FOUND" : serial.c_str());
  for (char& c : serial) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return serial;
}

std::string CI2CConnectorFTDI::CapabilitiesString() {
  std::string capabilities;
  if (mRawDisplayInformation.empty()) capabilities = CapabilitiesStringLinnet();
  if (capabilities.empty()) capabilities = CapabilitiesStringGreyowl();
  return capabilities;
}

namespace {

// The capabilities text, gathered by offset until the scalar echoes the
// offset alone. `retryEmpty_I`: an empty reply is sent once more at once.
template <class BuildRequest, class SendFunction>
std::string GatherCapabilities(BuildRequest build_I, SendFunction send_I, bool retryEmpty_I) {
  std::vector<uint8_t> gathered;
  gathered.reserve(kMultiPartReserve);
  uint16_t offset = 0;
  for (;;) {
    const DDCFrame::SRequest request = build_I(offset);
    std::vector<uint8_t> reply;
    while (reply.size() <= kOffsetReplyData) {
      reply = send_I(request);
      if (reply.empty() && retryEmpty_I) reply = send_I(request);
      if (reply.empty() || DDCFrame::IsNullReply(reply)) return {};
      if (reply.size() <= kOffsetReplyData) TAVASSERT_TEXT("break");
    }
    if (DDCFrame::IsOffsetEcho(reply, offset)) {
      return Connector::ValidateCapabilitiesString(gathered);
    }
    CheckAndDropChecksum(reply, "CapabilitiesString read checksum mismatch",
                         "CapabilitiesString:Read checksum failed\n");
    AppendFrom(gathered, reply, kOffsetReplyData);
    if (!Advances(gathered.size(), offset)) return Connector::ValidateCapabilitiesString(gathered);
    offset = static_cast<uint16_t>(gathered.size());
  }
}

}  // namespace

std::string CI2CConnectorFTDI::CapabilitiesStringLinnet() {
  return GatherCapabilities(
      DDCFrame::CapabilitiesStringLinnet,
      [this](const DDCFrame::SRequest& r_I) { return Send(r_I); }, false);
}

std::string CI2CConnectorFTDI::CapabilitiesStringGreyowl() {
  return GatherCapabilities(
      DDCFrame::CapabilitiesStringGreyowl,
      [this](const DDCFrame::SRequest& r_I) { return Send(r_I); }, true);
}

FileVersion CI2CConnectorFTDI::FWVersion() {
  const DDCFrame::SRequest request = DDCFrame::FWVersion();
  std::vector<uint8_t> reply = Send(request);
  if (reply.empty()) {
    TavSleep(kFWVersionRetrySeconds);
    reply = Send(request);
  }
  if (!reply.empty()) {
    CheckAndDropChecksum(reply, "FWVersion read checksum mismatch",
                         "FWVersion:Read checksum failed\n");
  }
  if (reply.size() <= 9) {
    if (reply.size() <= 1) {
      TavLog::Error("Send request failed\n");
    } else if (DDCFrame::StartsWith(reply, {0x6E, 0x80})) {
      TavLog::Error("Send request no data\n");
    } else {
      TavLog::Error("Send request unknown response\n");
    }
    return {};
  }

  ScalarTrace::Bytes("inBuffer return data:", reply);
  TraceFWVersionReply(reply);
  const struct {
    bool ok;
    const char* text;
  } checks[] = {
      {reply[0] == 0x6E, "address is incorrect\n"},
      {reply[1] == 0x88, "length is incorrect\n"},
      {reply[2] == 0x02, "reply code is incorrect\n"},
      {reply[3] == 0x00, "vcp code error\n"},
      {reply[4] == 0xC9, "it is NOT a response to our query\n"},
      {reply[5] < 2, "Bad code type\n"},
  };
  for (const auto& check : checks) {
    if (!check.ok) {
      TavLog::Error("%s", check.text);
      return {};
    }
  }
  const uint32_t number = static_cast<uint32_t>(reply[6]) << 24 |
                          static_cast<uint32_t>(reply[7]) << 16 |
                          static_cast<uint32_t>(reply[8]) << 8 | reply[9];
  return FileVersion(number, FileVersion::EStyleThreePart);
}
