#include "scalar/Connector.h"

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "scalar/DDCFrame.h"
#include "scalar/HelperUtils.h"
#include "scalar/ScalarTrace.h"

namespace {

// How long the scalar needs to commit its settings once it acknowledged.
constexpr double kSaveSettleSeconds = 0.2;

// The bytes a scalar answers a save with when it took it.
bool IsAcknowledgeByte(uint8_t byte_I) {
  return byte_I == 0x80 || byte_I == 0x6E || byte_I == 0xBE;
}

}  // namespace

Connector::~Connector() = default;

bool Connector::Close() {
  mRawEDID.clear();
  mFoundButNotOpenable = false;
  return true;
}

std::string Connector::MonitorName() {
  if (mRawEDID.empty()) mRawEDID = ReadEDID(-1);
  if (mRawEDID.empty()) return {};
  return ExtractMonitorName(mRawEDID);
}

std::string Connector::SerialNumber(SENSOR_ID sid_I) {
  if (mRawEDID.empty()) mRawEDID = ReadEDID(sid_I);
  if (mRawEDID.empty()) return {};
  return ExtractSerialNumber(mRawEDID);
}

bool Connector::ScalarReset() {
  const DDCFrame::SRequest request = DDCFrame::ScalarReset();
  ScalarTrace::Bytes("Reset w", request.bytes);
  std::vector<uint8_t> reply =
      SendRequest(request.bytes, request.delay, request.sizeHint, request.depth);
  if (reply.size() < 4) {
    TavLog::Error("Send request failed\n");
    return false;
  }
  ScalarTrace::Bytes("Reset r", reply);
  const uint8_t sum = reply.back();
  reply.pop_back();
  const uint8_t expected = DDCFrame::Checksum(reply, DDCFrame::kReplySeed);
  // The scalar's own reset answer is not always summed right; the words
  // of it are what count.
  if (sum != expected) TavLog::Error("ScalarReset:Read checksum failed %i %i\n", sum, expected);
  if (DDCFrame::StartsWith(reply, {0x80, 0xBE, 0x6E}) ||
      DDCFrame::StartsWith(reply, {0xBE, 0x6E, 0x80}) ||
      DDCFrame::StartsWith(reply, {0x6E, 0x88, 0x02})) {
    return true;
  }
  TavLog::Error("response was one we don't recognize\n");
  return false;
}

bool Connector::SaveSettingsToScalar() {
  const DDCFrame::SRequest request = DDCFrame::SaveSettingsToScalar();
  ScalarTrace::Bytes("Save w", request.bytes);
  std::vector<uint8_t> reply =
      SendRequest(request.bytes, request.delay, request.sizeHint, request.depth);
  ScalarTrace::Bytes("Save r", reply);
  if (reply.size() <= 2) {
    TavLog::Error("Send request failed\n");
    return false;
  }
  const uint8_t sum = reply.back();
  reply.pop_back();
  const uint8_t expected = DDCFrame::Checksum(reply, DDCFrame::kReplySeed);
  if (sum != expected) {
    TavLog::Error("SaveSettingsToScalar:Read checksum failed %i %i\n", sum, expected);
  }
  if (IsAcknowledgeByte(reply[0]) && IsAcknowledgeByte(reply[1])) {
    TavSleep(kSaveSettleSeconds);
    return true;
  }
  TavLog::Error("response was one we don't recognize\n");
  return false;
}

std::string Connector::ValidateCapabilitiesString(const std::vector<uint8_t>& capsStr_I) {
  if (capsStr_I.empty() || capsStr_I[0] != '(') TAVASSERT_TEXT("capsStr_I[0] == '('");
  std::string capabilitiesStr;
  int depth = 0;
  for (uint8_t byte : capsStr_I) {
    if (byte == ')') --depth;
    if (byte == '(') ++depth;
    capabilitiesStr.push_back(static_cast<char>(byte));
    if (depth == 0) break;
  }
  if (capabilitiesStr.empty()) TAVASSERT_TEXT("!capabilitiesStr.empty()");
  SCALAR_TRACE(Debug, "caps: %s\n", capabilitiesStr.c_str());
  return capabilitiesStr;
}
