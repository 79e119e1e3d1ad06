#include <gtest/gtest.h>

#include <functional>
#include <tuple>

#include "common/CVirtualClock.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/RecordingFTDIExAPI32.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;
using Fake = RecordingFTDIExAPI32;

class CI2CConnectorFTDITest : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    CI2CConnectorFTDI::SetApi(&mApi);
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    CClock::Set(nullptr);
  }
  // Opens the bridge and forgets the writes of opening.
  void OpenQuietly() {
    ASSERT_TRUE(mLink.Open(0));
    mApi.writes.clear();
  }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  Fake mApi;
  CI2CConnectorFTDI mLink;
};

TEST_F(CI2CConnectorFTDITest, OpeningProbesTheEngineAndSetsUpI2CAt100kHz) {
  mApi.pending = {0x01, 0x02, 0x03};  // stale bytes from an earlier user
  ASSERT_TRUE(mLink.Open(0));
  EXPECT_TRUE(mLink.IsOpen());
  EXPECT_EQ(mApi.writes, (std::vector<Bytes>{{0x84},
                                             {0xAA},
                                             {0x85},
                                             {0x8A, 0x97, 0x8D},
                                             {0x9E, 0x02, 0x00, 0x80, 0x03, 0x03},
                                             {0x86, 0x2B, 0x01},
                                             {0x82, 0x14, 0xFF}}));
  mLink.Close();
  EXPECT_FALSE(mApi.open);
}

TEST_F(CI2CConnectorFTDITest, OpenFailsClosedOrSucceedsAfterTheResetRetries) {
  // name, set-up, opens, found but not openable, resets
  // clang-format off
  const std::vector<std::tuple<const char*, std::function<void(Fake&)>, bool, bool, int>> rows = {
      {"no bridge", [](Fake& f) { f.bridges = 0; }, false, false, 0},
      {"held by another", [](Fake& f) { f.openStatus = FT_DEVICE_NOT_OPENED; }, false, true, 0},
      {"reset on the last retry", [](Fake& f) { f.resetFailures = 20; }, true, false, 21},
      {"reset never", [](Fake& f) { f.resetFailures = 21; }, false, false, 21},
      {"probe answered short", [](Fake& f) { f.probeAnswer = {0xFA}; }, false, false, 1},
      {"probe not answered as bad", [](Fake& f) { f.probeAnswer = {0x00, 0x00}; }, false, false, 1},
      {"probe echo only", [](Fake& f) { f.probeAnswer = {0x00, 0xAA}; }, true, false, 1},
  };
  // clang-format on
  for (const auto& [name, setUp, opens, notOpenable, resets] : rows) {
    SCOPED_TRACE(name);
    Fake api;
    setUp(api);
    CI2CConnectorFTDI::SetApi(&api);
    CI2CConnectorFTDI link;
    EXPECT_EQ(link.Open(0), opens);
    EXPECT_EQ(link.IsOpen(), opens);
    EXPECT_EQ(api.open, opens);
    EXPECT_EQ(link.GetFoundButNotOpenable(), notOpenable);
    EXPECT_EQ(api.resets, resets);
  }
  CI2CConnectorFTDI::SetApi(nullptr);
  EXPECT_EQ(CI2CConnectorFTDI::NumberOfDevices(), 0);
  EXPECT_FALSE(CI2CConnectorFTDI().Open(0));
}

TEST_F(CI2CConnectorFTDITest, SendRequestFindsTheHeaderAndReadsPayloadAndChecksum) {
  const Bytes request{0x6E, 0x51, 0x82, 0x01, 0xC9, 0x75};
  const std::string written = "B S 6E 51 82 01 C9 75 P S 6F";
  // reads answered, reply, bus traffic after the read address
  // clang-format off
  const std::vector<std::tuple<const char*, Bytes, Bytes, std::string>> rows = {
      {"a zero header is the null reply", {0x00}, {0x6E, 0x80, 0xBE}, "R P"},
      {"junk before the header", {0x12, 0x34, 0x6E, 0x82, 0xAA, 0xBB, 0xCC},
       {0x6E, 0x82, 0xAA, 0xBB, 0xCC}, "R R R R R R R P"},
      {"0xFF header is nothing", {0x12, 0xFF}, {}, "R R P"},
  };
  // clang-format on
  for (const auto& [name, reads, reply, traffic] : rows) {
    SCOPED_TRACE(name);
    OpenQuietly();
    mApi.reads.assign(reads.begin(), reads.end());
    const double slept = mClock->GetTotalSlept();
    EXPECT_EQ(mLink.SendRequest(request, 0.07, 38, 1), reply);
    EXPECT_EQ(mApi.Trace(), written + " " + traffic);
    // Every byte written, the read address too, waits 20 ms.
    EXPECT_NEAR(mClock->GetTotalSlept() - slept, 7 * 0.02 + 0.07, 1e-9);
  }
}

TEST_F(CI2CConnectorFTDITest, SendRequestWritesAgainOnlyAsDeepAsAsked) {
  // acknowledges, depth, bus traffic
  // clang-format off
  const std::vector<std::tuple<Bytes, int, std::string>> rows = {
      {{0, 0, 1}, 1, "B S 6E 51 81 P B S 6E 51 81 0C B2 P S 6F R R R P"},
      {{1, 1, 1}, 1, "B S 6E P B S 6E P B S 6E P"},
      {{1, 1}, 0, "B S 6E P B S 6E P"},
      {{1}, -1, "B S 6E P"},
  };
  // clang-format on
  for (const auto& [acks, depth, traffic] : rows) {
    SCOPED_TRACE(depth);
    OpenQuietly();
    mApi.acks.assign(acks.begin(), acks.end());
    mApi.reads = {0x6E, 0x80, 0xBE};
    const Bytes reply = mLink.SendRequest({0x6E, 0x51, 0x81, 0x0C, 0xB2}, 0.0, 38, depth);
    EXPECT_EQ(reply, traffic.ends_with("R P") ? DDCFrame::NullReply() : Bytes{});
    EXPECT_EQ(mApi.Trace(), traffic);
  }
}

TEST_F(CI2CConnectorFTDITest, AFailedProbeBeforeARequestClosesTheBridge) {
  OpenQuietly();
  mApi.failWrite = 0;
  EXPECT_TRUE(mLink.SendRequest({0x6E, 0x51, 0x81, 0x0C, 0xB2}, 0.0, 38, 1).empty());
  EXPECT_FALSE(mLink.IsOpen());
  EXPECT_FALSE(mApi.open);
}

}  // namespace

namespace {

TEST_F(CI2CConnectorFTDITest, TraceLinesAreFormattedOnlyWhileDebugTraceIsOn) {
  for (int trace : {0, 1}) {
    SCOPED_TRACE(trace);
    LogCapture log;
    g_DebugTrace = trace;
    CI2CConnectorFTDI link;
    link.Open(0);
    mApi.reads = {0x00};
    link.SendRequest({0x6E, 0x51, 0x81, 0x0C, 0xB2}, 0.0, 38, 1);
    g_DebugTrace = 0;
    EXPECT_EQ(log.LogContains("CI2CConnectorFTDI::Open ID = 0\n"), trace == 1);
    EXPECT_EQ(log.LogContains("I2CWrite buffer"), trace == 1);
    EXPECT_EQ(log.LogContains("CI2CConnectorFTDI::SendRequest: Read I2CGetByte header zero\n"),
              trace == 1);
  }
}

}  // namespace
