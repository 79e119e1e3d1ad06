// Each loader command's report, byte for byte, as the lab's loader receives
// it, under both protocol types.

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
  uint8_t erase, readAddress, status, resetSave, reset, writeWord, writeBlock, parameters,
      descriptor, checksums, setChecksum, calcChecksum, magic, commit, deviceInfo, setCpu, getCpu,
      cpuCount, readData;
};

// clang-format off
constexpr SIds kLoaderIds{EFL_PROTOCOL_LOADER, 0x12, 0x13, 0x14, 0x15, 0x15, 0x16, 0x11, 0x17, 0x18,
                          0x19, 0x1A, 0x1B, 0x1C, 0x1D, 0x1E, 0x20, 0x21, 0x22, 0x10};
constexpr SIds kNonBLIds{EFL_PROTOCOL_NON_BL, 0xD3, 0xD4, 0xD5, 0xD6, 0xCD, 0xD7, 0xD2, 0xD8, 0xD9,
                         0xDA, 0xDB, 0xDC, 0xDD, 0xDE, 0xDF, 0xE1, 0xE2, 0xE3, 0xD1};
// clang-format on

class WireTest : public LabFixture, public ::testing::WithParamInterface<SIds> {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    SLabPenDescription description;
    // 39 blocks: the count whose report lengths are 391 and 161 bytes.
    description.cpus = {SLabFlashLayout::Uniform(0x08000000, 4096, 39, 1)};
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

TEST_P(WireTest, SetCommandsArriveByteForByte) {
  const SIds& id = GetParam();
  ASSERT_TRUE(mInterface->FLProtEraseBlock(7));
  EXPECT_EQ(Last().bytes, (Bytes{id.erase, 7, 0, 0, 0}));
  ASSERT_TRUE(mInterface->FLProtSetReadAddr(0x08001234));
  EXPECT_EQ(Last().bytes, (Bytes{id.readAddress, 0x34, 0x12, 0x00, 0x08}));
  ASSERT_TRUE(mInterface->FLProtWriteWord({0xA1, 0xA2, 0xA3, 0xA4, 0xEE}, 0x08007000));
  EXPECT_EQ(Last().bytes, (Bytes{id.writeWord, 0x00, 0x70, 0x00, 0x08, 0xA1, 0xA2, 0xA3, 0xA4}));

  Bytes block(256);
  for (size_t i = 0; i < block.size(); ++i) block[i] = static_cast<uint8_t>(i);
  ASSERT_TRUE(mInterface->FLProtWriteBlock(block, 0x08007100));
  Bytes expected{id.writeBlock, 0x00, 0x71, 0x00, 0x08};
  expected.insert(expected.end(), block.begin(), block.end());
  EXPECT_EQ(Last().bytes, expected);

  ASSERT_TRUE(mInterface->FLProtSetBlockChecksum(3, 0xA1B2C3D4));
  EXPECT_EQ(Last().bytes, (Bytes{id.setChecksum, 3, 0, 0xD4, 0xC3, 0xB2, 0xA1}));
  ASSERT_TRUE(mInterface->FLProtCalcSetBlockChecksum(0x0102));
  EXPECT_EQ(Last().bytes, (Bytes{id.calcChecksum, 0x02, 0x01}));
  ASSERT_TRUE(mInterface->FLProtSetMagicWord(0x11223344));
  EXPECT_EQ(Last().bytes, (Bytes{id.magic, 0x44, 0x33, 0x22, 0x11}));
  ASSERT_TRUE(mInterface->FLProtWriteChecksumsToROM());
  EXPECT_EQ(Last().bytes, (Bytes{id.commit, 0, 0, 0, 0}));
  ASSERT_TRUE(mInterface->FLProtSetCurrentCPU(0x10000));
  EXPECT_EQ(Last().bytes, (Bytes{id.setCpu, 0, 0})) << "only the low 16 bits go out";

  // Block 0x0102 does not exist on this loader, which refuses it; a HID
  // write cannot tell. Everything else was taken.
  std::vector<Bytes> refused;
  for (const SLabTraceEntry& entry : mPen->GetLoader().GetTrace()) {
    if (!entry.succeeded) refused.push_back(entry.bytes);
  }
  EXPECT_EQ(refused, (std::vector<Bytes>{{id.calcChecksum, 0x02, 0x01}}));
  EXPECT_TRUE(mPen->GetViolations().empty());
}

TEST_P(WireTest, GetCommandsHaveTheirLengthsAndDecodeTheReply) {
  const SIds& id = GetParam();
  uint32_t status = 99;
  ASSERT_TRUE(mInterface->FLProtGetStatus(status));
  EXPECT_EQ(Last().bytes.size(), 5u);
  EXPECT_EQ(Last().bytes[0], id.status);
  EXPECT_EQ(status, 0u);

  BL_HID_REP_GET_BL_PARAMETERS params;
  ASSERT_TRUE(mInterface->FLProtGetBLParameters(params));
  EXPECT_EQ(Last().bytes, (Bytes{id.parameters, 0, 0, 64, 0, 4, 0, 0, 1, 39, 0, 0, 0}));
  EXPECT_EQ(params.readSize, 64);
  EXPECT_EQ(params.wordSize, 4);
  EXPECT_EQ(params.blockSize, 256);
  EXPECT_EQ(params.numFlashBlocks, 39);

  BL_HID_REP_GET_FLASH_DESCRIPTOR descriptor;
  ASSERT_TRUE(mInterface->FLProtGetFlashDescriptor(descriptor));
  EXPECT_EQ(Last().bytes.size(), 391u);
  EXPECT_EQ(Last().bytes[0], id.descriptor);
  EXPECT_EQ(descriptor.blocks[2].startAddress, 0x08002000u);
  EXPECT_EQ(descriptor.blocks[2].size, 4096u);
  EXPECT_EQ(descriptor.blocks[0].flags, 0x8004) << "protected, word size 4";
  EXPECT_EQ(descriptor.blocks[2].flags, 0x0004);

  FLASH_CHECKSUM_STRUC checksums;
  ASSERT_TRUE(mInterface->FLProtGetChecksums(checksums));
  EXPECT_EQ(Last().bytes.size(), 161u);
  EXPECT_EQ(Last().bytes[0], id.checksums);
  EXPECT_EQ(checksums.checksums[5], mPen->GetLoader().GetCpu(0).GetChecksum(5));
  EXPECT_EQ(checksums.magicWord, mPen->GetLoader().GetCpu(0).GetMagicWord());

  BL_HID_REP_GET_DEVICE_INFO info;
  ASSERT_TRUE(mInterface->FLProtGetMainDeviceInfo(info));
  EXPECT_EQ(Last().bytes.size(), 34u);
  EXPECT_EQ(Last().bytes[0], id.deviceInfo);
  EXPECT_EQ(info.deviceInfo, 0x0301);
  uint16_t shortInfo = 0;
  ASSERT_TRUE(mInterface->GetMainDeviceInfo(shortInfo));
  EXPECT_EQ(shortInfo, 0x0301);

  // The start reason keeps its one id under every protocol type.
  uint32_t reason = 99;
  ASSERT_TRUE(mInterface->FLProtGetBLStartReason(reason));
  EXPECT_EQ(Last().bytes.size(), 2u);
  EXPECT_EQ(Last().bytes[0], 0x1F);

  uint32_t cpu = 99;
  uint32_t count = 99;
  ASSERT_TRUE(mInterface->FLProtGetCurrentCPU(cpu));
  EXPECT_EQ(Last().bytes, (Bytes{id.getCpu, 0, 0}));
  ASSERT_TRUE(mInterface->FLProtGetTotalCPUs(count));
  EXPECT_EQ(Last().bytes, (Bytes{id.cpuCount, 1, 0}));
  EXPECT_EQ(count, 1u);

  // Reading flash: set the address once, then each repeat reuses it.
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
