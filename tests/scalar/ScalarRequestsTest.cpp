// The readers of the request layer over a connector whose SendRequest plays
// back scripted replies, for the answers the lab scalar never gives: no
// data, a reply of another length or for another offset, a display whose
// serial is only in its display information, every reset and save answer.

#include <gtest/gtest.h>

#include <deque>
#include <tuple>

#include "common/CVirtualClock.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/DDCFrame.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;

class CScriptedConnector : public CI2CConnectorFTDI {
 public:
  std::vector<uint8_t> SendRequest(const std::vector<uint8_t>& toSend_I, double, unsigned long,
                                   int) override {
    requests.push_back(toSend_I);
    if (replies.empty()) return {};
    Bytes reply = replies.front();
    replies.pop_front();
    return reply;
  }
  std::deque<Bytes> replies;
  std::vector<Bytes> requests;
};

// 6E, 0x80 | length, payload, and the sum that makes the seeded XOR 0.
Bytes Reply(const Bytes& payload_I) {
  // Sized first: g++ 12 at -O3 takes an insert behind a two-byte list
  // for an overrun (-Warray-bounds).
  Bytes reply(2 + payload_I.size());
  reply[0] = 0x6E;
  reply[1] = static_cast<uint8_t>(0x80 | payload_I.size());
  std::copy(payload_I.begin(), payload_I.end(), reply.begin() + 2);
  reply.push_back(DDCFrame::Checksum(reply, DDCFrame::kReplySeed));
  return reply;
}
Bytes Chunk(uint8_t command_I, uint16_t offset_I, const std::string& data_I) {
  Bytes payload{command_I, static_cast<uint8_t>(offset_I >> 8), static_cast<uint8_t>(offset_I)};
  payload.insert(payload.end(), data_I.begin(), data_I.end());
  return Reply(payload);
}
Bytes Text(const std::string& text_I) { return Bytes(text_I.begin(), text_I.end()); }

class ScalarRequestsTest : public ::testing::Test {
 protected:
  void SetUp() override { CClock::Set(std::make_shared<CVirtualClock>()); }
  void TearDown() override { CClock::Set(nullptr); }
  CScriptedConnector mScalar;
  LogCapture mLog;
};

TEST_F(ScalarRequestsTest, EDIDIsReadByOffsetUntilTheScalarEchoesIt) {
  const SENSOR_ID other = 0x7A5D0999;
  // sid, replies, EDID, requests made, "no data" warning
  // clang-format off
  const std::vector<std::tuple<const char*, SENSOR_ID, std::deque<Bytes>, std::string, size_t, bool>>
      rows = {
          {"a null reply keeps what came", other, {Chunk(0xE3, 0, "abc"), DDCFrame::NullReply()},
           "abc", 2, true},
          {"nothing at all", other, {}, "", 1, true},
          {"Venus boards are not asked", 0x7A5D0390, {Chunk(0xE3, 0, "abc")}, "", 0, false},
          {"16 blocks, cut short by a reply of another length", -1,
           {Reply(Text("0123456789ABCDEF")), Chunk(0xE3, 0, "x")}, "0123456789ABCDEF", 2, false},
          {"no block read falls back to offsets", 0x7A5D0355,
           {Chunk(0xE3, 0, "x"), Chunk(0xE3, 0, "edid"), Chunk(0xE3, 4, "")}, "edid", 3, false},
          {"a reply for another offset adds nothing and ends the read", other,
           {Chunk(0xE3, 0, "ab"), Chunk(0xE3, 9, ""), Chunk(0xE3, 9, "")}, "ab", 2, false},
      };
  // clang-format on
  for (const auto& [name, sid, replies, edid, requests, warned] : rows) {
    SCOPED_TRACE(name);
    CScriptedConnector scalar;
    LogCapture log;
    scalar.replies = replies;
    EXPECT_EQ(scalar.ReadEDID(sid), Text(edid));
    EXPECT_EQ(scalar.requests.size(), requests);
    EXPECT_EQ(log.LogContains("ReadEDID: no data found!\n"), warned);
    EXPECT_EQ(log.Assertions(), std::vector<std::string>{}) << "the null reply is no surprise";
  }
}

TEST_F(ScalarRequestsTest, SerialNumberFallsBackToTheDisplayInformationInUpperCase) {
  Bytes record(52, 0x00);
  const std::string name = "Pen 13", serial = "ab12cd";
  std::copy(name.begin(), name.end(), record.begin() + 14);
  std::copy(serial.begin(), serial.end(), record.begin() + 27);
  Bytes payload{0xF2};
  payload.insert(payload.end(), record.begin(), record.end());
  // An EDID without descriptors, then the 55-byte display information.
  mScalar.replies = {Chunk(0xE3, 0, "plain"), Chunk(0xE3, 5, ""), Reply(payload)};
  EXPECT_EQ(mScalar.SerialNumber(0x7A5D0999), "AB12CD");
  EXPECT_EQ(mScalar.requests.back(), DDCFrame::ReadDisplayInformation().bytes);
  EXPECT_EQ(mScalar.MonitorName(), "Pen 13");
  EXPECT_EQ(mScalar.requests.size(), 3u);  // both answers come from what was kept
}

TEST_F(ScalarRequestsTest, ResetAndSaveAcceptOnlyTheKnownAnswers) {
  // reply, reset done, save done
  // clang-format off
  const std::vector<std::tuple<Bytes, bool, bool>> rows = {
      {{0x80, 0xBE, 0x6E, 0x00}, true, true},  // any checksum byte
      {{0xBE, 0x6E, 0x80, 0x11}, true, true},
      {{0x6E, 0x88, 0x02, 0x11}, true, false},
      {DDCFrame::NullReply(), false, true},  // too short for a reset
      {{0xEE, 0x80, 0x00, 0x6E}, false, false},
      {{}, false, false},
  };
  // clang-format on
  for (const auto& [reply, reset, save] : rows) {
    CScriptedConnector scalar;
    scalar.replies = {reply, reply};
    EXPECT_EQ(scalar.ScalarReset(), reset);
    EXPECT_EQ(scalar.SaveSettingsToScalar(), save);
    EXPECT_EQ(scalar.requests, (std::vector<Bytes>{DDCFrame::ScalarReset().bytes,
                                                   DDCFrame::SaveSettingsToScalar().bytes}));
  }
}

}  // namespace
