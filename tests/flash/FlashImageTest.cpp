// Laying an S-record image over the flash blocks and the edges of the
// programming steps, over a scripted loader that takes every report.

#include <gtest/gtest.h>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "flash/CFLProtocol.h"
#include "flash/ScriptedInterface.h"
#include "support/LogCapture.h"

namespace {

SContinuousDataBlock Bytes(uint32_t start_I, size_t size_I, uint8_t value_I) {
  return SContinuousDataBlock{start_I, std::vector<uint8_t>(size_I, value_I)};
}

class FlashImage : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
    mDevice.RegisterCallback(&mNotifier);
    mDevice.SetDataSourceFormat(EDS_SREC_GENERIC);
    mDevice.SetChecksumsSupported(true);
    // Four blocks of 0x400 from 0x1000, block 3 protected; 4-byte words,
    // 0x100-byte write blocks.
    mDevice.SetLayout(0x1000, 0x400, 4, 4, 0x100, 0b1000);
    ASSERT_TRUE(mDevice.InitFlashVector());
  }
  void TearDown() override { CClock::Set(nullptr); }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  ScriptedInterface mDevice;
  RecordingNotifier mNotifier;
};

TEST_F(FlashImage, RecordsFillTheBlocksTheyCrossInAnyOrder) {
  ASSERT_TRUE(mDevice.LoadSRecData({Bytes(0x1900, 0x80, 0x22), Bytes(0x13F0, 0x20, 0x11)}));
  const Flash flash = mDevice.GetFlash();
  const FLASH_BLOCK& first = flash.GetBlock(0);
  const FLASH_BLOCK& second = flash.GetBlock(1);
  const FLASH_BLOCK& third = flash.GetBlock(2);
  ASSERT_EQ(first.GetBlockDataSize(), 0x400u);
  EXPECT_EQ(first.BlockData()[0x3EF], 0xFF);
  EXPECT_EQ(first.BlockData()[0x3F0], 0x11);
  EXPECT_EQ(second.BlockData()[0x00F], 0x11);
  EXPECT_EQ(second.BlockData()[0x010], 0xFF);
  EXPECT_EQ(third.BlockData()[0x100], 0x22);
  EXPECT_TRUE(flash.GetBlock(3).IsEmpty());
  // Write ranges on the word grid, blank head and tail left out.
  EXPECT_EQ(first.GetWriteStartOffset(), 0x3F0u);
  EXPECT_EQ(first.GetWriteSize(), 0x10u);
  EXPECT_EQ(second.GetWriteStartOffset(), 0u);
  EXPECT_EQ(second.GetWriteSize(), 0x10u);
  EXPECT_EQ(flash.GetTotalSize(), 0x10u + 0x10u + 0x80u);
  EXPECT_TRUE(mNotifier.Logged("Checksum Block [0x00001000] = 0x"));
  EXPECT_TRUE(mNotifier.Logged("Total size: 160"));
}

TEST_F(FlashImage, ABlankWordInsideTheRangeIsSentAndAnOddTailIsTrimmed) {
  SContinuousDataBlock record = Bytes(0x1002, 14, 0x33);
  record.data[6] = record.data[7] = record.data[8] = record.data[9] = 0xFF;  // the word at 8
  ASSERT_TRUE(mDevice.LoadSRecData({record}));
  const Flash flash = mDevice.GetFlash();
  const FLASH_BLOCK& block = flash.GetBlock(0);
  EXPECT_EQ(block.GetWriteStartOffset(), 0u);
  EXPECT_EQ(block.GetWriteSize(), 16u);
}

TEST_F(FlashImage, AByteOutsideEveryBlockFailsButKeepsWhatWasLaid) {
  EXPECT_FALSE(mDevice.LoadSRecData({Bytes(0x1000, 4, 0x44), Bytes(0x1FFE, 4, 0x55)}));
  EXPECT_EQ(mNotifier.errors.back(),
            "Address space from SREC file does not correspond to that of the connected CPU!");
  EXPECT_EQ(mDevice.GetFlash().GetBlock(0).BlockData()[0], 0x44);
  EXPECT_EQ(mDevice.GetFlash().GetBlock(3).BlockData()[0x3FE], 0x55) << "the part that fit";
}

TEST_F(FlashImage, WriteBlocksThenWordsAndBlankBlocks) {
  // 1.5 write blocks in block 0, exactly one in block 1, nothing but blank
  // in block 2, and data in the protected block 3.
  ASSERT_TRUE(mDevice.LoadSRecData({Bytes(0x1000, 0x180, 0x66), Bytes(0x1400, 0x100, 0x77),
                                    Bytes(0x1800, 0x40, 0xFF), Bytes(0x1C00, 8, 0x88)}));
  ASSERT_TRUE(mDevice.ProgramBoardSRec());
  EXPECT_EQ(mDevice.Sent(0x11), 2u) << "write blocks";
  EXPECT_EQ(mDevice.Sent(0x16), 0x80u / 4) << "words for the half block";
  EXPECT_EQ(mDevice.Sent(0x12), 3u) << "the blank block is erased, the protected one not";
  EXPECT_TRUE(mNotifier.Logged("Block 2 programmed."));
  EXPECT_TRUE(mNotifier.Logged("Protected Block Skipped"));
  // The protected block is still addressed when checksums are cleared and
  // computed.
  EXPECT_EQ(mDevice.Sent(0x1A), 4u);
  EXPECT_EQ(mDevice.Sent(0x1B), 4u);
  EXPECT_EQ(mDevice.Sent(0x1D), 2u);
  // Its data stays out of the image's sum: three blocks of words.
  uint32_t expected = 0;
  for (int i = 0; i < 0x180 / 4; ++i) expected += 0x66666666;
  expected -= (0x400 - 0x180) / 4;
  for (int i = 0; i < 0x100 / 4; ++i) expected += 0x77777777;
  expected -= (0x400 - 0x100) / 4;
  expected -= 0x400 / 4;
  EXPECT_EQ(mDevice.GetFWChecksum(), expected);
}

TEST_F(FlashImage, UnsupportedChecksumsSendNothingAroundTheWrites) {
  mDevice.SetChecksumsSupported(false);
  ASSERT_TRUE(mDevice.LoadSRecData({Bytes(0x1000, 0x100, 0x12)}));
  ASSERT_TRUE(mDevice.ProgramBoardSRec());
  EXPECT_EQ(mDevice.writes.size(), 2u) << "one erase, one write block";
  EXPECT_EQ(mDevice.GetNewChecksum(), 0u);
  EXPECT_EQ(mDevice.GetOldChecksum(), 0u);
}

TEST_F(FlashImage, ATailThatIsNotWholeWordsStopsTheBlock) {
  mDevice.SetLayout(0x1000, 0x400, 1, 8, 0x100);
  ASSERT_TRUE(mDevice.InitFlashVector());
  ASSERT_TRUE(mDevice.LoadSRecData({Bytes(0x1000, 0x104, 0x12)}));
  // The range is 0x108 bytes: one write block and one word of 8.
  ASSERT_TRUE(mDevice.WriteBlock(0));
  EXPECT_EQ(mDevice.Sent(0x16), 1u);

  // A write-block size the range cannot be cut into words of.
  mDevice.SetLayout(0x1000, 0x400, 1, 8, 0x0FC);
  ASSERT_TRUE(mDevice.InitFlashVector());
  ASSERT_TRUE(mDevice.LoadSRecData({Bytes(0x1000, 0x104, 0x12)}));
  EXPECT_FALSE(mDevice.WriteBlock(0));
  EXPECT_EQ(mNotifier.errors.back(), "Data left to write in block is not divisible by word size");
}

TEST_F(FlashImage, ABrokenDescriptorIsRefused) {
  LogCapture capture;
  mDevice.SetLayout(0x1000, 32u << 20, 2, 4, 0x100);
  EXPECT_FALSE(mDevice.InitFlashVector());
  EXPECT_TRUE(capture.AssertionContains("flash block size"));
  mDevice.SetLayout(0x1000, 0x400, 2, 0, 0x100);
  ASSERT_TRUE(mDevice.InitFlashVector());
  EXPECT_FALSE(mDevice.LoadSRecData({Bytes(0x1000, 8, 1)})) << "a word size of 0";
  mDevice.SetLayout(0x1000, 0x400, 0, 4, 0x100);
  EXPECT_FALSE(mDevice.InitFlashVector());
}

}  // namespace
