#include <gtest/gtest.h>

#include <tuple>

#include "common/CVirtualClock.h"
#include "scalar/RTDISP.h"
#include "scalar/RecordingFTDIExAPI32.h"
#include "support/RecordingNotifier.h"

namespace {

using Bytes = std::vector<uint8_t>;
using Strings = std::vector<std::string>;

class RTDISPTest : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(std::make_shared<CVirtualClock>());
    CI2CConnectorFTDI::SetApi(&mApi);
    ASSERT_TRUE(mLink->Open(0));
    mApi.writes.clear();
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    CClock::Set(nullptr);
  }

  RecordingFTDIExAPI32 mApi;
  std::shared_ptr<CI2CConnectorFTDI> mLink = std::make_shared<CI2CConnectorFTDI>();
  RecordingNotifier mNotifier;
};

TEST_F(RTDISPTest, FlowsEndWithTheirReportsAndLeaveISPOnFailure) {
  const Strings tenEraseFailures = [] {
    Strings errors;
    for (int i = 0; i < 10; ++i) {
      errors.insert(errors.end(), {"Block erase check failed", "Block Erase Fail"});
    }
    errors.push_back("Exausted retries attempting to write block 0");
    return errors;
  }();
  const Strings nineTimeouts(9, "Timed out waiting for bit change");
  Strings enteredLate = nineTimeouts;
  enteredLate.push_back("Fail to Enter ISP mode");
  std::deque<uint8_t> lateEntry(9 * 50, 0x00);
  lateEntry.push_back(0x80);

  // name, image size, register reads, succeeds, errors, progress
  // clang-format off
  const std::vector<std::tuple<const char*, size_t, std::deque<uint8_t>, bool, Strings,
                               std::vector<unsigned int>>>
      rows = {
          {"no blocks", 0, {0x80, 0x5F}, true, {}, {}},
          {"a block that never erases blank", 65536, {0x80}, false, tenEraseFailures, {100}},
          {"ISP entered at the tenth try", 0, lateEntry, false, enteredLate, {}},
      };
  // clang-format on
  for (const auto& [name, size, reads, succeeds, errors, progress] : rows) {
    SCOPED_TRACE(name);
    RecordingNotifier notifier;
    RTDISP programmer(mLink, Bytes(size, 0x00), &notifier, false, false);
    mApi.writes.clear();
    mApi.reads = reads;
    mApi.defaultRead = 0x00;
    EXPECT_EQ(programmer.StartISPFlash(), succeeds);
    EXPECT_EQ(notifier.errors, errors);
    EXPECT_EQ(notifier.progress, progress);
    const std::string trace = mApi.Trace();
    // A good run hands control to the new firmware, a failed one leaves ISP.
    EXPECT_TRUE(trace.ends_with(succeeds ? "S 94 EE 02 P" : "S 94 6F 00 P")) << trace;
  }
}

TEST(RTDISPData, TheImageIsCutInto64KiBBlocksAndAPartialBlockIsDropped) {
  Bytes image(2 * 65536 + 10, 0x01);
  image[65536] = 0xFF;
  RTDISP programmer(nullptr, image, nullptr, false, false);
  EXPECT_EQ(programmer.GetBlockCount(), 2u);
  EXPECT_EQ(programmer.GetBlockSums(), (std::vector<uint32_t>{0x0000, 0x00FE}));
  EXPECT_FALSE(programmer.StartISPFlash());  // no connector
}

}  // namespace
