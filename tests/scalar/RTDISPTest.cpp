// The flash programmer's runs over the lab are checked through UpdateScalar;
// here what the lab MCU never does: an ISP entry that comes only at the
// last try.

#include <gtest/gtest.h>

#include "common/CVirtualClock.h"
#include "scalar/RTDISP.h"
#include "scalar/RecordingFTDIExAPI32.h"
#include "support/RecordingNotifier.h"

namespace {

using Bytes = std::vector<uint8_t>;

class RTDISPTest : public ::testing::Test {
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
};

TEST_F(RTDISPTest, AnISPEntryAtTheLastTryFailsTheRunAndLeavesISP) {
  auto link = std::make_shared<CI2CConnectorFTDI>();
  ASSERT_TRUE(link->Open(0));
  // Nine entries wait out their 50 reads; the tenth sees ISP mode at once.
  mApi.reads.assign(9 * 50, 0x00);
  mApi.reads.push_back(0x80);
  mApi.defaultRead = 0x00;
  RecordingNotifier notifier;
  RTDISP programmer(link, Bytes{}, &notifier, false, false);
  EXPECT_FALSE(programmer.StartISPFlash());
  std::vector<std::string> errors(9, "Timed out waiting for bit change");
  errors.push_back("Fail to Enter ISP mode");
  EXPECT_EQ(notifier.errors, errors);
  const Bytes& sent = mApi.sent;
  EXPECT_EQ(Bytes(sent.end() - 3, sent.end()), (Bytes{0x94, 0x6F, 0x00})) << "ISP mode left";
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
