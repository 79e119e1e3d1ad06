// The request layer's multi-part readers against the lab scalar: each read
// ends the way the scalar ends it (the offset echoed, the null reply past
// the last block) and gathers the whole value.

#include <gtest/gtest.h>

#include <functional>
#include <tuple>

#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabProducts.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "support/LabFixture.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;

class ScalarRequestsOverLab : public LabFixture {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    CLabProducts::Plug(*mBus, "display-ftdi");
    mBridge = std::dynamic_pointer_cast<CLabFTDIBridge>(mBus->FindBoard("display-ftdi-scalar"));
    ASSERT_NE(mBridge, nullptr);
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
    CI2CConnectorFTDI::SetApi(mApi.get());
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    LabFixture::TearDown();
  }

  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::unique_ptr<CLabFTDIExAPI32> mApi;
};

TEST_F(ScalarRequestsOverLab, MultiPartReadsGatherTheWholeValueAndEndWithoutWarning) {
  const Bytes edid = mBridge->GetScalar().GetEdid();
  const std::string caps = CLabDdcScalar::CapabilitiesString();
  const Bytes capsBytes(caps.begin(), caps.end());
  // name, read, expected
  // clang-format off
  const std::vector<std::tuple<const char*, std::function<Bytes(CI2CConnectorFTDI&)>, Bytes>>
      rows = {
          {"EDID by offset, ended by the echoed offset",
           [](CI2CConnectorFTDI& link) { return link.ReadEDID(0x7A5D0701); }, edid},
          {"EDID by 16-byte block, ended by the null reply",
           [](CI2CConnectorFTDI& link) { return link.ReadEDID(-1); }, edid},
          {"capabilities, Linnet form",
           [](CI2CConnectorFTDI& link) {
             const std::string text = link.CapabilitiesString();
             return Bytes(text.begin(), text.end());
           }, capsBytes},
          {"capabilities, GreyOwl form once the display information is known",
           [](CI2CConnectorFTDI& link) {
             EXPECT_EQ(link.ReadDisplayInformation(-1).size(), 55u);
             const std::string text = link.CapabilitiesString();
             return Bytes(text.begin(), text.end());
           }, capsBytes},
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

TEST_F(ScalarRequestsOverLab, TheNullReplyToASaveIsAnAcknowledgement) {
  CI2CConnectorFTDI link;
  ASSERT_TRUE(link.Open(0));
  EXPECT_TRUE(link.SaveSettingsToScalar());
  EXPECT_EQ(mBridge->GetScalar().GetSaves(), 1u);
}

}  // namespace
