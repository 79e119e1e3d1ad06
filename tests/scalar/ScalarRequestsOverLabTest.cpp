// The request layer's readers against the lab scalar: each multi-part read
// ends the way the scalar ends it (the offset echoed, the null reply past
// the last block) and gathers the whole value; the version and the display
// information come back as the scalar keeps them.

#include <gtest/gtest.h>

#include <functional>
#include <tuple>

#include "scalar/DDCFrame.h"
#include "scalar/ScalarLabFixture.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;

class ScalarRequestsOverLab : public ScalarLabFixture {};

Bytes AsBytes(const std::string& text_I) { return Bytes(text_I.begin(), text_I.end()); }

TEST_F(ScalarRequestsOverLab, ReadsGatherTheWholeValueAndEndWithoutWarning) {
  const Bytes edid = mBridge->GetScalar().GetEdid();
  const Bytes caps = AsBytes(CLabDdcScalar::CapabilitiesString());
  // name, read, expected
  // clang-format off
  const std::vector<std::tuple<const char*, std::function<Bytes(CI2CConnectorFTDI&)>, Bytes>>
      rows = {
          {"EDID by offset, ended by the echoed offset",
           [](CI2CConnectorFTDI& link) { return link.ReadEDID(0x7A5D0701); }, edid},
          {"EDID by 16-byte block, ended by the null reply",
           [](CI2CConnectorFTDI& link) { return link.ReadEDID(-1); }, edid},
          {"capabilities, Linnet form",
           [](CI2CConnectorFTDI& link) { return AsBytes(link.CapabilitiesString()); }, caps},
          {"capabilities, GreyOwl form once the display information is known",
           [](CI2CConnectorFTDI& link) {
             const Bytes information = link.ReadDisplayInformation(-1);
             EXPECT_EQ(information.size(), 55u);
             EXPECT_STREQ(reinterpret_cast<const char*>(&information.at(3 + 27)), "LABFT0701");
             return AsBytes(link.CapabilitiesString());
           }, caps},
          {"firmware version of the shipped release",
           [](CI2CConnectorFTDI& link) {
             return AsBytes(link.FWVersion().AsString(FileVersion::EStyleThreePart));
           }, AsBytes("1.0.0")},
      };
  // clang-format on
  for (const auto& [name, read, expected] : rows) {
    SCOPED_TRACE(name);
    LogCapture log;
    CI2CConnectorFTDI link;
    ASSERT_TRUE(link.Open(0));
    EXPECT_EQ(read(link), expected);
    EXPECT_FALSE(log.LogContains("no data found"));
    EXPECT_EQ(log.Assertions(), std::vector<std::string>{});
  }
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
}

TEST_F(ScalarRequestsOverLab, ASaveIsAcknowledgedByTheNullReplyAndTracedOnlyWhileTracingIsOn) {
  for (int trace : {0, 1}) {
    SCOPED_TRACE(trace);
    LogCapture log;
    g_DebugTrace = trace;
    CI2CConnectorFTDI link;
    ASSERT_TRUE(link.Open(0));
    const double slept = mClock->GetTotalSlept();
    EXPECT_TRUE(link.SaveSettingsToScalar());
    g_DebugTrace = 0;
    EXPECT_EQ(mBridge->GetScalar().GetSaves(), trace + 1u);
    // 20 ms for each of the five request bytes and the read address, the
    // request's own wait, and the scalar's time to commit.
    EXPECT_NEAR(mClock->GetTotalSlept() - slept, 6 * 0.02 + 0.22 + 0.2, 1e-9);
    EXPECT_EQ(log.LogContains("CI2CConnectorFTDI::Open ID = 0\n"), trace == 1);
    EXPECT_EQ(log.LogContains("I2CWrite buffer"), trace == 1);
  }
}

TEST_F(ScalarRequestsOverLab, AReplyNotReadyIsTheNullReplyAndAStaleOneIsFoundPastItsLeftovers) {
  CI2CConnectorFTDI link;
  ASSERT_TRUE(link.Open(0));
  const Bytes request = DDCFrame::FWVersion().bytes;
  const Bytes reply = link.SendRequest(request, 0.07, 38, 1);
  ASSERT_EQ(reply.size(), 11u);
  // fault, reply
  const std::vector<std::tuple<std::string, Bytes>> rows = {
      {"not-ready", DDCFrame::NullReply()},
      {"stale", reply},
  };
  for (const auto& [kind, expected] : rows) {
    SCOPED_TRACE(kind);
    SLabFault fault;
    std::string error;
    ASSERT_TRUE(ParseLabFault(kind + "@1", fault, error)) << error;
    mBus->AddFaults({fault}, 1);
    EXPECT_EQ(link.SendRequest(request, 0.07, 38, 1), expected);
    EXPECT_TRUE(mBridge->GetBus().IsIdle());
  }
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
}

}  // namespace
