// The base's own logic over a scripted transport: retries, guards, CPU
// selection, and the flash layout rules a lab board never exercises
// (protected blocks with data, broken descriptors).

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <vector>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "flash/CFLProtocol.h"
#include "flash/FLASH_BLOCK.h"
#include "flash/ScriptedInterface.h"
#include "support/LogCapture.h"

namespace {

class DeviceInterfaceBase : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
    mDevice.RegisterCallback(&mNotifier);
  }
  void TearDown() override { CClock::Set(nullptr); }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  ScriptedInterface mDevice;
  RecordingNotifier mNotifier;
};

TEST_F(DeviceInterfaceBase, SafeTransfersRetryWithGrowingWaitsThenReopenOnce) {
  mDevice.onRead = [](std::vector<uint8_t>&) { return false; };
  std::vector<uint8_t> report{0x14, 0, 0, 0, 0};
  EXPECT_FALSE(mDevice.SafeRead(report));
  EXPECT_EQ(mDevice.reads.size(), 101u);
  EXPECT_EQ(mDevice.opens, 1);
  // 100 growing waits of 11 to 110 ms, then one second after the reopen.
  EXPECT_NEAR(mClock->GetTotalSlept(), 6.05 + 1.0, 1e-9);
  EXPECT_TRUE(mNotifier.errors.empty()) << "a retried failure is not an error";

  int failuresLeft = 3;
  mDevice.onWrite = [&](std::vector<uint8_t>&) { return failuresLeft-- <= 0; };
  const double before = mClock->GetTotalSlept();
  EXPECT_TRUE(mDevice.SafeWrite(report));
  EXPECT_EQ(mDevice.writes.size(), 4u);
  EXPECT_NEAR(mClock->GetTotalSlept() - before, 0.011 + 0.012 + 0.013, 1e-9);
  // The loop's flag was cleared: the next write again gets its retries.
  failuresLeft = 1;
  EXPECT_TRUE(mDevice.SafeWrite(report));
  EXPECT_EQ(mDevice.writes.size(), 6u);
}

TEST_F(DeviceInterfaceBase, ANestedSafeWriteMakesOnePlainAttempt) {
  bool nestedResult = true;
  int calls = 0;
  mDevice.onWrite = [&](std::vector<uint8_t>&) {
    if (++calls == 1) {
      std::vector<uint8_t> inner{0x02, 0x00};
      nestedResult = mDevice.SafeWrite(inner);
      return true;
    }
    return false;  // the inner attempt fails once and is not retried
  };
  std::vector<uint8_t> outer{0xCC, 0x05, 0x6A};
  EXPECT_TRUE(mDevice.SafeWrite(outer));
  EXPECT_FALSE(nestedResult);
  EXPECT_EQ(mDevice.writes.size(), 2u);
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 0.0);
}

TEST_F(DeviceInterfaceBase, SourceCpuFollowsTheFormat) {
  const std::pair<EDataSourceFormat, uint8_t> cpus[] = {
      {EDS_SREC_PEN, 0},      {EDS_SREC_TOUCH, 1}, {EDS_SREC_GENERIC, 0},
      {EDS_INTEL_HEX, 1},     {EDS_AIROFLASH, 2},  {EDS_SCALAR_RTDISP, 5},
      {EDS_SCALAR_BINARY, 4}, {EDS_AIROFLASH2, 2}, {EDS_UNKNOWN, 5}};
  for (const auto& [format, cpu] : cpus) {
    mDevice.SetDataSourceFormat(format);
    EXPECT_EQ(mDevice.GetDataSourceCpu(), cpu) << format;
  }
}

// The loader answers the CPU queries from these two values.
void AnswerCpuQueries(ScriptedInterface& device_IO, uint16_t current_I, uint16_t total_I) {
  device_IO.onRead = [=](std::vector<uint8_t>& report_IO) {
    const uint16_t value = report_IO[0] == 0x21 ? current_I : total_I;
    report_IO[1] = static_cast<uint8_t>(value);
    report_IO[2] = static_cast<uint8_t>(value >> 8);
    return true;
  };
}

TEST_F(DeviceInterfaceBase, SyncSelectedCpuSendsTheSourceCpuOnlyOnMultiCpuLoaders) {
  mDevice.SetDataSourceFormat(EDS_SREC_TOUCH);
  AnswerCpuQueries(mDevice, 0, 1);
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  EXPECT_TRUE(mDevice.writes.empty()) << "a single CPU gets no set command";
  AnswerCpuQueries(mDevice, 0, 2);
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  EXPECT_EQ(mDevice.writes, (std::vector<std::vector<uint8_t>>{{0x20, 0x01, 0x00}}));

  // A source CPU of 5 keeps what the device reported, and still sends it.
  mDevice.writes.clear();
  mDevice.SetDataSourceFormat(EDS_UNKNOWN);
  AnswerCpuQueries(mDevice, 3, 4);
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  EXPECT_EQ(mDevice.writes, (std::vector<std::vector<uint8_t>>{{0x20, 0x03, 0x00}}));

  // A count of 0 means one CPU; a failed read keeps the defaults.
  AnswerCpuQueries(mDevice, 0, 0);
  uint32_t count = 7;
  EXPECT_TRUE(mDevice.FLProtGetTotalCPUs(count));
  EXPECT_EQ(count, 1u);
  mDevice.onRead = [](std::vector<uint8_t>&) { return false; };
  uint32_t cpu = 9;
  EXPECT_TRUE(mDevice.FLProtGetCurrentCPU(cpu));
  EXPECT_EQ(cpu, 0u);
  count = 7;
  EXPECT_TRUE(mDevice.FLProtGetTotalCPUs(count));
  EXPECT_EQ(count, 1u);
  mDevice.SetOpen(false);
  EXPECT_FALSE(mDevice.SyncSelectedCPU());
}

TEST_F(DeviceInterfaceBase, CommandRetriesFollowTheirOwnTable) {
  BL_HID_REP_GET_BL_PARAMETERS params;
  params.readSize = 8;
  params.wordSize = 4;
  params.blockSize = 16;
  params.numFlashBlocks = 2;
  mDevice.SetParams(params);
  // Every transfer fails after its SafeRead/SafeWrite retries, each of
  // which costs 7.05 s and one reopen.
  mDevice.onWrite = [](std::vector<uint8_t>&) { return false; };
  mDevice.onRead = [](std::vector<uint8_t>&) { return false; };
  const std::vector<uint8_t> data(16, 0xAB);
  const struct {
    const char* command;
    std::function<bool()> run;
    int tries;
    int ownReopens;  // each with half a second of its own
  } cases[] = {{"erase", [&] { return mDevice.FLProtEraseBlock(1); }, 5, 0},
               {"write block", [&] { return mDevice.FLProtWriteBlock(data, 0x1000); }, 5, 4},
               {"write word", [&] { return mDevice.FLProtWriteWord(data, 0x1000); }, 5, 0}};
  for (const auto& c : cases) {
    mDevice.writes.clear();
    mDevice.reads.clear();
    mDevice.opens = 0;
    const double before = mClock->GetTotalSlept();
    EXPECT_FALSE(c.run()) << c.command;
    EXPECT_EQ(mDevice.writes.size() + mDevice.reads.size(), c.tries * 101u) << c.command;
    EXPECT_EQ(mDevice.opens, c.tries + c.ownReopens) << c.command;
    EXPECT_NEAR(mClock->GetTotalSlept() - before, c.tries * 7.05 + c.ownReopens * 0.5, 1e-6)
        << c.command;
  }
  EXPECT_EQ(mNotifier.errors.front(), "Failed erasing block from device");
}

TEST_F(DeviceInterfaceBase, CommandsNeedAnOpenLoaderAndTheirSizes) {
  mDevice.SetChecksumsSupported(false);
  EXPECT_TRUE(mDevice.FLProtSetMagicWord(0));
  EXPECT_TRUE(mDevice.FLProtSetBlockChecksum(3, 0));
  EXPECT_TRUE(mDevice.FLProtCalcSetBlockChecksum(3));
  EXPECT_TRUE(mDevice.FLProtWriteChecksumsToROM());
  EXPECT_TRUE(mDevice.writes.empty()) << "unsupported checksums send nothing";

  // Sizes of 0 refuse before the wire.
  EXPECT_FALSE(mDevice.FLProtWriteBlock(std::vector<uint8_t>(16), 0));
  EXPECT_FALSE(mDevice.FLProtWriteWord(std::vector<uint8_t>(16), 0));
  BL_HID_REP_GET_FLASH_DESCRIPTOR descriptor;
  EXPECT_FALSE(mDevice.FLProtGetFlashDescriptor(descriptor));
  EXPECT_TRUE(mDevice.reads.empty());

  // Not in loader mode: nothing is sent.
  mDevice.SetIsFlashLoader(false);
  mDevice.SetChecksumsSupported(true);
  uint32_t status = 0;
  EXPECT_FALSE(mDevice.FLProtGetStatus(status));
  EXPECT_FALSE(mDevice.FLProtSetMagicWord(0));
  EXPECT_FALSE(mDevice.FLProtResetCPU(true));
  EXPECT_FALSE(mDevice.FLProtEraseBlock(0));
  EXPECT_TRUE(mDevice.writes.empty());
  EXPECT_TRUE(mDevice.reads.empty());
}

// The commands no programming run sends. The ids and layouts of the others
// are checked by the lab's loader, which decodes them on its own, in
// SRecProgrammingTest.
TEST_F(DeviceInterfaceBase, ResetsAndTheCpuSetOnTheWire) {
  // Only multi-CPU loaders, which the lab runs do not use, get a CPU set.
  for (EFLProtocolType protocol : {EFL_PROTOCOL_LOADER, EFL_PROTOCOL_NON_BL}) {
    CFLProtocol::GetInstance()->SetProtocolType(protocol);
    ASSERT_TRUE(mDevice.FLProtResetCPU(false));
    ASSERT_TRUE(mDevice.FLProtResetCPU(true));
    ASSERT_TRUE(mDevice.FLProtSetCurrentCPU(1));
  }
  CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
  EXPECT_EQ(mDevice.writes, (std::vector<std::vector<uint8_t>>{{0x15, 0xA6, 0x50},
                                                               {0x15, 0x01, 0, 0, 0},
                                                               {0x20, 0x01, 0x00},
                                                               {0xCD, 0xA6, 0x50},
                                                               {0xD6, 0x01, 0, 0, 0},
                                                               {0xE1, 0x01, 0x00}}));
}

SContinuousDataBlock Filled(uint32_t start_I, size_t size_I, uint8_t value_I) {
  return SContinuousDataBlock{start_I, std::vector<uint8_t>(size_I, value_I)};
}

TEST_F(DeviceInterfaceBase, AProtectedBlockWithDataIsNeitherErasedNorSummed) {
  mDevice.SetDataSourceFormat(EDS_SREC_GENERIC);
  mDevice.SetChecksumsSupported(true);
  // Four blocks of 0x400 from 0x1000, block 3 protected; 4-byte words,
  // 0x100-byte write blocks.
  mDevice.SetLayout(0x1000, 0x400, 4, 4, 0x100, 0b1000);
  ASSERT_TRUE(mDevice.InitFlashVector());
  // One write block in block 0, nothing but blank in block 2.
  ASSERT_TRUE(mDevice.LoadSRecData(
      {Filled(0x1000, 0x100, 0x66), Filled(0x1800, 0x40, 0xFF), Filled(0x1C00, 8, 0x88)}));
  ASSERT_TRUE(mDevice.ProgramBoardSRec());
  EXPECT_EQ(mDevice.Sent(0x11), 1u) << "write blocks";
  EXPECT_EQ(mDevice.Sent(0x12), 2u) << "the blank block is erased, the protected one not";
  // The protected block is still addressed when checksums are cleared.
  EXPECT_EQ(mDevice.Sent(0x1A), 4u);
  // Its data stays out of the image's sum: blocks 0 and 2 of words.
  uint32_t expected = 0;
  for (int i = 0; i < 0x100 / 4; ++i) expected += 0x66666666;
  expected -= (0x400 - 0x100) / 4 + 0x400 / 4;
  EXPECT_EQ(mDevice.GetFWChecksum(), expected);
}

TEST_F(DeviceInterfaceBase, BlankBytesOffTheFourByteGridCountAsWholeWords) {
  mDevice.SetDataSourceFormat(EDS_SREC_GENERIC);
  // One block of 0x12 bytes with 2-byte words: six blank bytes, one word
  // of data, ten blank bytes.
  mDevice.SetLayout(0x1000, 0x12, 1, 2, 0x10);
  ASSERT_TRUE(mDevice.InitFlashVector());
  ASSERT_TRUE(mDevice.LoadSRecData({Filled(0x1006, 2, 0x11)}));
  ASSERT_TRUE(mDevice.ProgramBoardSRec());
  // Two words before, the data word read on past its end, three after.
  EXPECT_EQ(mDevice.GetFWChecksum(), 0xFFFF1111u - 2 - 3);
}

TEST_F(DeviceInterfaceBase, ABrokenDescriptorIsRefused) {
  LogCapture capture;
  mDevice.SetLayout(0x1000, 32u << 20, 2, 4, 0x100);
  EXPECT_FALSE(mDevice.InitFlashVector());
  mDevice.SetLayout(0x1000, 0x400, 0, 4, 0x100);
  EXPECT_FALSE(mDevice.InitFlashVector());
  mDevice.SetLayout(0x1000, 0x400, 2, 0, 0x100);
  ASSERT_TRUE(mDevice.InitFlashVector());
  EXPECT_FALSE(mDevice.LoadSRecData({Filled(0x1000, 8, 1)})) << "a word size of 0";
  mDevice.SetLayout(0x1000, 2, 1, 4, 0x100);
  ASSERT_TRUE(mDevice.InitFlashVector());
  EXPECT_FALSE(mDevice.LoadSRecData({Filled(0x1000, 1, 1)})) << "a word larger than its block";
}

TEST_F(DeviceInterfaceBase, OnlyTheWordsFromTheFirstToTheLastWrittenAreSent) {
  const struct {
    uint32_t blockSize, wordSize, at, bytes, start, size;
  } cases[] = {
      {0x400, 4, 5, 6, 4, 8},                    // both edges inside a word
      {0x400, 4, 0x3FF, 1, 0x3FC, 4},            // the last byte alone
      {0x400, 2, 0, 0x400, 0, 0x400},            // the whole block
      {0x402, 4, 0, 1, 0, 4},                    // a tail shorter than a word
      {0x402, 4, 0x401, 1, 0x3FE, 4},            // data only in that tail
      {16u << 20, 1, 0xFFFFF0, 2, 0xFFFFF0, 2},  // the largest block a loader may describe
  };
  for (const auto& c : cases) {
    mDevice.SetLayout(0x1000, c.blockSize, 1, c.wordSize, 0x100);
    ASSERT_TRUE(mDevice.InitFlashVector());
    ASSERT_TRUE(mDevice.LoadSRecData({Filled(0x1000 + c.at, c.bytes, 0x5A)}));
    const Flash flash = mDevice.GetFlash();
    EXPECT_EQ(flash.GetBlock(0).GetWriteStartOffset(), c.start) << c.at;
    EXPECT_EQ(flash.GetBlock(0).GetWriteSize(), c.size) << c.at;
  }
}

}  // namespace

// The block sum in the log is taken over the copied span only; it must
// still equal the plain sum of every byte, blank rest and wrap included.
TEST(FlashBlockImage, SumEqualsTheSumOfEveryByte) {
  struct Copy {
    uint32_t offset;
    std::vector<uint8_t> bytes;
  };
  const std::vector<std::vector<Copy>> cases = {
      {},
      {{0, {1, 2, 3}}},
      {{61, {9, 0xFF, 0}}},
      {{10, {7}}, {40, {0, 0}}},
      {{5, std::vector<uint8_t>(59, 0)}},
  };
  for (const auto& copies : cases) {
    FLASH_BLOCK block(0x1000, 64, 0, 4, 16, 0, 0, false);
    EXPECT_EQ(block.GetImageSum(), 0u) << "no image";
    block.MakeBlankImage();
    for (const Copy& copy : copies)
      block.CopyIn(copy.offset, copy.bytes.data(), static_cast<uint32_t>(copy.bytes.size()));
    uint32_t plain = 0;
    for (uint8_t byte : block.BlockData()) plain += byte;
    EXPECT_EQ(block.GetImageSum(), plain) << copies.size() << " copies";
  }
  // 32 Mi blank bytes sum past 2^32 and wrap.
  FLASH_BLOCK large(0, 1u << 25, 0, 4, 16, 0, 0, false);
  large.MakeBlankImage();
  EXPECT_EQ(large.GetImageSum(), static_cast<uint32_t>(uint64_t{0xFF} << 25));
}
