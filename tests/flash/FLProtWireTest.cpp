// The loader commands no programming run sends, as the lab's loader
// receives them under both protocol types; the rest are checked by what the
// lab's flash holds after the runs in SRecProgrammingTest.

#include <gtest/gtest.h>

#include "flash/CFLProtocol.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabPenController.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "support/LabFixture.h"
#include "support/RecordingNotifier.h"

namespace {

using Bytes = std::vector<uint8_t>;

struct SIds {
  EFLProtocolType protocol;
  uint8_t readAddress, status, resetSave, reset, deviceInfo, readData;
};

constexpr SIds kLoaderIds{EFL_PROTOCOL_LOADER, 0x13, 0x14, 0x15, 0x15, 0x1E, 0x10};
constexpr SIds kNonBLIds{EFL_PROTOCOL_NON_BL, 0xD4, 0xD5, 0xD6, 0xCD, 0xDF, 0xD1};

class WireTest : public LabFixture, public ::testing::WithParamInterface<SIds> {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    SLabPenDescription description;
    description.protocol =
        GetParam().protocol == EFL_PROTOCOL_NON_BL ? ELabProtocol::eNonBL : ELabProtocol::eLoader;
    mPen = std::make_shared<CLabPenController>(description);
    // Loader-protocol boards are addressed in their loader; the non-BL
    // firmware answers in normal mode.
    if (GetParam().protocol == EFL_PROTOCOL_LOADER) {
      mPen->GetLoader().GetCpu(0).SetChecksum(1, 0);
      mPen->GetLoader().GetCpu(0).CommitChecksums();
      mPen->PowerOn();
    }
    mBus->Plug(mPen);
    mInterface = std::make_unique<CLinuxHIDFLDeviceInterface>(Listed(*mPen),
                                                              std::make_unique<CLabHidNode>(mBus));
    mInterface->SetIsFlashLoader(true);
    mInterface->SetProtocolType(GetParam().protocol);
    mInterface->SetDataSourceFormat(EDS_SREC_GENERIC);
    ASSERT_TRUE(mInterface->Open());
    mInterface->RegisterCallback(&mNotifier);
    ASSERT_TRUE(mInterface->Init({})) << (mNotifier.errors.empty() ? "" : mNotifier.errors.back());
    mPen->GetLoader().ClearTrace();
  }

  // The last command the loader received.
  const SLabTraceEntry& Last() const { return mPen->GetLoader().GetTrace().back(); }

  std::shared_ptr<CLabPenController> mPen;
  std::unique_ptr<CLinuxHIDFLDeviceInterface> mInterface;
  RecordingNotifier mNotifier;
};

TEST_P(WireTest, CommandsOutsideTheProgrammingRun) {
  const SIds& id = GetParam();
  uint32_t status = 99;
  ASSERT_TRUE(mInterface->FLProtGetStatus(status));
  EXPECT_EQ(Last().bytes.size(), 5u);
  EXPECT_EQ(Last().bytes[0], id.status);
  EXPECT_EQ(status, 0u);

  BL_HID_REP_GET_DEVICE_INFO info;
  ASSERT_TRUE(mInterface->FLProtGetMainDeviceInfo(info));
  EXPECT_EQ(Last().bytes.size(), 34u);
  EXPECT_EQ(Last().bytes[0], id.deviceInfo);
  uint16_t shortInfo = 0;
  ASSERT_TRUE(mInterface->GetMainDeviceInfo(shortInfo));
  EXPECT_EQ(shortInfo, 0x0301);

  // The start reason keeps its one id under every protocol type.
  uint32_t reason = 99;
  ASSERT_TRUE(mInterface->FLProtGetBLStartReason(reason));
  EXPECT_EQ(Last().bytes.size(), 2u);
  EXPECT_EQ(Last().bytes[0], 0x1F);

  // Reading flash: set the address once, then each repeat reuses it.
  ASSERT_TRUE(mInterface->FLProtSetReadAddr(0x08001234));
  EXPECT_EQ(Last().bytes, (Bytes{id.readAddress, 0x34, 0x12, 0x00, 0x08}));
  ASSERT_TRUE(mInterface->FLProtSetReadAddr(0x08001000));
  Bytes data{0xEE};
  ASSERT_TRUE(mInterface->FLProtReadData(data, 2));
  EXPECT_EQ(Last().bytes.size(), 69u);
  EXPECT_EQ(Last().bytes[0], id.readData);
  const Bytes& content = mPen->GetLoader().GetCpu(0).GetBlockContent(1);
  ASSERT_EQ(data.size(), 1u + 128u);
  EXPECT_TRUE(std::equal(data.begin() + 1, data.end(), content.begin()));
  EXPECT_TRUE(mPen->GetViolations().empty());
}

TEST_P(WireTest, ResetReportsOfBothKinds) {
  const SIds& id = GetParam();
  ASSERT_TRUE(mInterface->FLProtResetCPU(false));
  EXPECT_EQ(Last().bytes, (Bytes{id.reset, 0xA6, 0x50}));
  TavSleep(1.0);
  mInterface->Close();
  const DeviceInfo info = mBus->ListInterfaces().front().info;
  mInterface =
      std::make_unique<CLinuxHIDFLDeviceInterface>(info, std::make_unique<CLabHidNode>(mBus));
  mInterface->SetIsFlashLoader(true);
  ASSERT_TRUE(mInterface->Open());
  ASSERT_TRUE(mInterface->FLProtResetCPU(true));
  EXPECT_EQ(Last().bytes, (Bytes{id.resetSave, 0x01, 0, 0, 0}));
}

INSTANTIATE_TEST_SUITE_P(BothProtocols, WireTest, ::testing::Values(kLoaderIds, kNonBLIds),
                         [](const auto& info) {
                           return info.param.protocol == EFL_PROTOCOL_LOADER ? "Loader" : "NonBL";
                         });

}  // namespace
