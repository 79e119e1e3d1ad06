// The link against the lab bridge: its opening, and each bus primitive as
// the string of engine commands the bridge takes and the bus state it
// leaves. Through a recording bridge library, what the lab never does: a
// reset that needs its retries, a probe answered wrongly, 0xFF where a
// reply's header belongs, a byte nobody acknowledges.

#include <gtest/gtest.h>

#include <tuple>

#include "common/CVirtualClock.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/RecordingFTDIExAPI32.h"
#include "scalar/ScalarLabFixture.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;
using Transfers = std::vector<Bytes>;

// Pin settings (0x80, value, both lines driven), `times_I` of each value.
Bytes Pins(std::initializer_list<std::pair<uint8_t, int>> values_I) {
  Bytes bytes;
  for (const auto& [value, times] : values_I) {
    for (int i = 0; i < times; ++i) bytes.insert(bytes.end(), {0x80, value, 0x03});
  }
  return bytes;
}
const Bytes kStart = Pins({{0x03, 4}, {0x01, 4}, {0x00, 4}});
const Bytes kStop = Pins({{0x01, 4}, {0x03, 4}, {0x02, 1}});
const Bytes kReleaseSda = Pins({{0x02, 1}});
Bytes ByteOut(uint8_t byte_I) {
  return {0x11, 0x00, 0x00, byte_I, 0x80, 0x00, 0x01, 0x22, 0x00, 0x87, 0x80, 0x00, 0x03};
}
Bytes ByteIn(bool ack_I) {
  return {0x80, 0x00, 0x01, 0x24, 0x00, 0x00,
          0x80, 0x00, 0x03, 0x13, 0x00, static_cast<uint8_t>(ack_I ? 0x00 : 0x80)};
}

class CI2CConnectorFTDIOverLab : public ScalarLabFixture {
 protected:
  // The transfers the bridge took since it had taken `count_I`.
  Transfers TakenSince(size_t count_I) const {
    const auto& taken = mBridge->GetRecentWrites();
    EXPECT_LT(taken.size(), CLabFTDIBridge::kRecentWrites) << "older transfers were let go";
    return Transfers(taken.begin() + static_cast<long>(count_I), taken.end());
  }
  FT_HANDLE OpenElsewhere(FT_STATUS expected_I) {
    FT_HANDLE handle = nullptr;
    EXPECT_EQ(mApi->FT_OpenEx(reinterpret_cast<void*>(uintptr_t{mApi->Locations().at(0)}),
                              FT_OPEN_BY_LOCATION, &handle),
              expected_I);
    return handle;
  }
};

TEST_F(CI2CConnectorFTDIOverLab, OpeningDropsStaleBytesProbesTheEngineAndLeavesTheBusIdle) {
  // An earlier user left two pin readings waiting; read as the probe's
  // answer they would fail it.
  FT_HANDLE earlier = OpenElsewhere(FT_OK);
  uint32_t written = 0;
  const Bytes readPins{0x81, 0x81};
  mApi->FT_SetBitMode(earlier, 0, FT_BITMODE_MPSSE);
  mApi->FT_Write(earlier, readPins.data(), 2, &written);
  mApi->FT_Close(earlier);
  ASSERT_EQ(mBridge->QueueStatus(), 2u);

  LogCapture log;
  CI2CConnectorFTDI link;
  const size_t before = mBridge->GetRecentWrites().size();
  ASSERT_TRUE(link.Open(0));
  EXPECT_EQ(TakenSince(before), (Transfers{{0x84},
                                           {0xAA},
                                           {0x85},
                                           {0x8A, 0x97, 0x8D},
                                           {0x9E, 0x02, 0x00, 0x80, 0x03, 0x03},
                                           {0x86, 0x2B, 0x01},
                                           {0x82, 0x14, 0xFF}}));
  EXPECT_EQ(log.Assertions(), std::vector<std::string>{});
  EXPECT_EQ(mBridge->QueueStatus(), 0u);
  EXPECT_TRUE(mBridge->GetBus().GetScl() && mBridge->GetBus().GetSda());
  EXPECT_TRUE(mBridge->GetBus().IsIdle());
  link.Close();
  EXPECT_FALSE(link.IsOpen());
  mApi->FT_Close(OpenElsewhere(FT_OK));
}

TEST_F(CI2CConnectorFTDIOverLab, EachPrimitiveIsOneCommandStringAndLeavesTheBusAsExpected) {
  CI2CConnectorFTDI link;
  ASSERT_TRUE(link.Open(0));
  enum EStep { eStart, eStop, eOut, eInAck, eInLast };
  // step, byte out, status, byte in, transfers taken, SCL, SDA, transaction open
  // clang-format off
  const std::vector<std::tuple<EStep, uint8_t, FT_STATUS, uint8_t, Transfers, bool, bool, bool>>
      steps = {
          {eStart, 0, FT_OK, 0, {kStart}, false, false, true},
          // The scalar takes its read address and drives the first bit of
          // its null reply, a 0, at once.
          {eOut, 0x6F, FT_OK, 0, {ByteOut(0x6F), kReleaseSda}, false, false, true},
          {eInAck, 0, FT_OK, 0x6E, {ByteIn(true)}, false, false, true},
          // The refusal, a 1, stays on the data pin.
          {eInLast, 0, FT_OK, 0x80, {ByteIn(false)}, false, true, true},
          {eStop, 0, FT_OK, 0, {kStop}, false, true, false},
          {eStart, 0, FT_OK, 0, {kStart}, false, false, true},
          {eOut, 0x50, 4, 0, {ByteOut(0x50), kReleaseSda}, false, true, true},  // nobody there
          {eStop, 0, FT_OK, 0, {kStop}, false, true, false},
      };
  // clang-format on
  for (const auto& [step, out, status, in, transfers, scl, sda, open] : steps) {
    SCOPED_TRACE(testing::Message() << "step " << step << " byte " << int{out});
    const size_t before = mBridge->GetRecentWrites().size();
    std::pair<FT_STATUS, uint8_t> result{FT_OK, 0};
    switch (step) {
      case eStart: result.first = link.Start(); break;
      case eStop: result.first = link.Stop(); break;
      case eOut: result.first = link.SendByte(out, false); break;
      default: result = link.GetByte(step == eInAck);
    }
    EXPECT_EQ(result, std::make_pair(status, in));
    EXPECT_EQ(TakenSince(before), transfers);
    EXPECT_EQ(mBridge->GetBus().GetScl(), scl);
    EXPECT_EQ(mBridge->GetBus().GetSda(), sda);
    EXPECT_EQ(!mBridge->GetBus().IsIdle(), open);
  }
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
}

// A bridge held elsewhere or not there at all is left to the scalar update
// over the lab, which must then fail before programming.
TEST_F(CI2CConnectorFTDIOverLab, AProbeBeforeARequestThatCannotBeWrittenClosesTheBridge) {
  CI2CConnectorFTDI link;
  ASSERT_TRUE(link.Open(0));
  mBus->AddFaults({SLabFault{ELabFaultKind::eFailWrite, 1, ""}}, 1);
  EXPECT_EQ(link.SendRequest(DDCFrame::FWVersion().bytes, 0.07, 38, 1), Bytes{});
  EXPECT_FALSE(link.IsOpen());
  mApi->FT_Close(OpenElsewhere(FT_OK));
}

class CI2CConnectorFTDITest : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(std::make_shared<CVirtualClock>());
    CI2CConnectorFTDI::SetApi(&mApi);
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    CClock::Set(nullptr);
  }

  RecordingFTDIExAPI32 mApi;
  CI2CConnectorFTDI mLink;
};

TEST_F(CI2CConnectorFTDITest, OpensAfterTheResetRetriesAndOnlyWhenTheProbeIsAnsweredAsBad) {
  // reset failures, probe answer, opens, resets
  // clang-format off
  const std::vector<std::tuple<int, Bytes, bool, int>> rows = {
      {20, {0xFA, 0xAA}, true, 21},
      {21, {0xFA, 0xAA}, false, 21},
      {0, {0xFA}, false, 1},  // answered short
      {0, {0x00, 0x00}, false, 1},
      {0, {0x00, 0xAA}, true, 1},  // the echo of the opcode will do
  };
  // clang-format on
  for (const auto& [resetFailures, probeAnswer, opens, resets] : rows) {
    SCOPED_TRACE(resetFailures);
    RecordingFTDIExAPI32 api;
    api.resetFailures = resetFailures;
    api.probeAnswer = probeAnswer;
    CI2CConnectorFTDI::SetApi(&api);
    CI2CConnectorFTDI link;
    EXPECT_EQ(link.Open(0), opens);
    EXPECT_EQ(link.IsOpen(), opens);
    EXPECT_EQ(api.open, opens);
    EXPECT_EQ(api.resets, resets);
  }
}

// Not-ready and stale replies come from the lab scalar; a 0xFF where the
// header belongs is a bus nobody drives, which the lab never shows.
TEST_F(CI2CConnectorFTDITest, AnUndrivenBusWhereTheHeaderBelongsGivesNoReply) {
  ASSERT_TRUE(mLink.Open(0));
  mApi.reads = {0x12, 0xFF};
  EXPECT_EQ(mLink.SendRequest(DDCFrame::FWVersion().bytes, 0.07, 38, 1), Bytes{});
}

TEST_F(CI2CConnectorFTDITest, ARefusedByteStartsTheRequestAgainAsDeepAsAsked) {
  // acknowledges, depth, bytes clocked out
  // clang-format off
  const std::vector<std::tuple<Bytes, int, Bytes>> rows = {
      {{0, 0, 1}, 1, {0x6E, 0x51, 0x81, 0x6E, 0x51, 0x81, 0x0C, 0xB2, 0x6F}},
      {{1, 1, 1}, 1, {0x6E, 0x6E, 0x6E}},
      {{1, 1}, 0, {0x6E, 0x6E}},
      {{1}, -1, {0x6E}},
  };
  // clang-format on
  ASSERT_TRUE(mLink.Open(0));
  for (const auto& [acks, depth, sent] : rows) {
    SCOPED_TRACE(depth);
    mApi.sent.clear();
    mApi.acks.assign(acks.begin(), acks.end());
    mApi.reads = {0x6E, 0x80, 0xBE};
    const Bytes reply = mLink.SendRequest({0x6E, 0x51, 0x81, 0x0C, 0xB2}, 0.0, 38, depth);
    EXPECT_EQ(reply, sent.back() == 0x6F ? DDCFrame::NullReply() : Bytes{});
    EXPECT_EQ(mApi.sent, sent);
  }
}

}  // namespace
