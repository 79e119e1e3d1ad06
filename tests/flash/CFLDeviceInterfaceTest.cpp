#include <gtest/gtest.h>

#include <memory>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "flash/CFLProtocol.h"
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

TEST_F(DeviceInterfaceBase, ADeadDeviceCostsAHundredTriesOneReopenAndAboutSevenSeconds) {
  mDevice.onRead = [](std::vector<uint8_t>&) { return false; };
  std::vector<uint8_t> report{0x14, 0, 0, 0, 0};
  EXPECT_FALSE(mDevice.SafeRead(report));

  EXPECT_EQ(mDevice.reads.size(), 101u);
  EXPECT_EQ(mDevice.opens, 1);
  // 100 growing waits of 11 to 110 ms, then one second after the reopen.
  EXPECT_NEAR(mClock->GetTotalSlept(), 6.05 + 1.0, 1e-9);
  EXPECT_TRUE(mNotifier.Logged("Read error: 1/100 - retrying..."));
  EXPECT_TRUE(mNotifier.Logged("Read error: 100/100 - retrying..."));
  EXPECT_TRUE(mNotifier.Logged("Attempting to reopen connection."));
  EXPECT_EQ(mNotifier.logs.back(), "Read failed.");
  EXPECT_TRUE(mNotifier.errors.empty()) << "a retried failure is not an error";
}

TEST_F(DeviceInterfaceBase, ATransientFailureIsRetriedWithGrowingWaits) {
  int failuresLeft = 3;
  mDevice.onWrite = [&](std::vector<uint8_t>&) { return failuresLeft-- <= 0; };
  std::vector<uint8_t> report{0x1C, 0, 0, 0, 0};
  EXPECT_TRUE(mDevice.SafeWrite(report));
  EXPECT_EQ(mDevice.writes.size(), 4u);
  EXPECT_NEAR(mClock->GetTotalSlept(), 0.011 + 0.012 + 0.013, 1e-9);
  EXPECT_EQ(mDevice.opens, 0);
  EXPECT_EQ(mNotifier.CountLogged("Write error: "), 3u);

  // The loop's flag was cleared: the next write again gets its retries.
  failuresLeft = 1;
  mDevice.writes.clear();
  EXPECT_TRUE(mDevice.SafeWrite(report));
  EXPECT_EQ(mDevice.writes.size(), 2u);
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
  EXPECT_TRUE(mNotifier.Logged("Prevent SafeWrite from recursing... returning immediately."));
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 0.0);
}

TEST_F(DeviceInterfaceBase, EveryWriteIsDumpedFirstInRowsOfThirtyTwoBytes) {
  std::vector<uint8_t> report(33);
  for (size_t i = 0; i < report.size(); ++i) report[i] = static_cast<uint8_t>(0xE0 + i);
  mDevice.SafeWrite(report);
  ASSERT_FALSE(mNotifier.logs.empty());
  const std::string& dump = mNotifier.logs.front();
  EXPECT_EQ(dump.rfind("cmd: \nE0 E1 E2 ", 0), 0u);
  EXPECT_NE(dump.find("FE FF \n00 "), std::string::npos);
  EXPECT_EQ(dump.substr(dump.size() - 3), "00 ");
}

TEST_F(DeviceInterfaceBase, ReportingWithAndWithoutANotifier) {
  mDevice.ReportProgress(0);
  mDevice.ReportProgress(42);
  EXPECT_EQ(mNotifier.progress, (std::vector<unsigned int>{1, 42}));

  LogCapture capture;
  mDevice.UnregisterCallback();
  mDevice.ReportLog("hello");
  mDevice.ReportError("broken");
  mDevice.ReportProgress(5);
  EXPECT_TRUE(capture.LogContains("[I] Log: hello"));
  EXPECT_TRUE(capture.LogContains("[E] Error: broken"));
  EXPECT_EQ(mNotifier.logs.size(), 0u);
}

TEST_F(DeviceInterfaceBase, ProgramBoardRefusesFormatsItCannotProgram) {
  LogCapture capture;
  for (EDataSourceFormat format : {EDS_SCALAR_RTDISP, EDS_UNKNOWN}) {
    mDevice.SetDataSourceFormat(format);
    EXPECT_FALSE(mDevice.ProgramBoard());
  }
  EXPECT_EQ(capture.Assertions().size(), 2u);
  EXPECT_TRUE(capture.AssertionContains("Unsupported data source format"));
  EXPECT_TRUE(mDevice.writes.empty());
}

TEST_F(DeviceInterfaceBase, PathCpuAndBlockLimitFollowLocationAndFormat) {
  mDevice.SetLocation(0x14200000);
  EXPECT_EQ(mDevice.GetPath(), "337641472");
  EXPECT_EQ(mDevice.GetLocation(), 0x14200000u);
  mDevice.SetPath("not a number");
  EXPECT_EQ(mDevice.GetLocation(), 0u);

  const std::pair<EDataSourceFormat, uint8_t> cpus[] = {
      {EDS_SREC_PEN, 0},      {EDS_SREC_TOUCH, 1}, {EDS_SREC_GENERIC, 0},
      {EDS_INTEL_HEX, 1},     {EDS_AIROFLASH, 2},  {EDS_SCALAR_RTDISP, 5},
      {EDS_SCALAR_BINARY, 4}, {EDS_AIROFLASH2, 2}, {EDS_UNKNOWN, 5}};
  for (const auto& [format, cpu] : cpus) {
    mDevice.SetDataSourceFormat(format);
    EXPECT_EQ(mDevice.GetDataSourceCpu(), cpu) << format;
  }

  mDevice.SetDataSourceFormat(EDS_SREC_PEN);
  EXPECT_TRUE(mDevice.ValidBlockIndex(38));
  EXPECT_FALSE(mDevice.ValidBlockIndex(39));
  mDevice.SetDataSourceFormat(EDS_SREC_GENERIC);
  EXPECT_TRUE(mDevice.ValidBlockIndex(39));

  const std::string text = mDevice.ToString();
  EXPECT_NE(text.find("\tFirmware Loader = YES\n"), std::string::npos);
  EXPECT_NE(text.find("\tInterface = INVALID\n"), std::string::npos);
}

// The loader answers the CPU queries from these two values.
struct SCpuAnswers {
  uint16_t current;
  uint16_t total;
};

void AnswerCpuQueries(ScriptedInterface& device_IO, SCpuAnswers answers_I) {
  device_IO.onRead = [answers_I](std::vector<uint8_t>& report_IO) {
    const uint16_t value = report_IO[0] == 0x21 ? answers_I.current : answers_I.total;
    report_IO[1] = static_cast<uint8_t>(value);
    report_IO[2] = static_cast<uint8_t>(value >> 8);
    return true;
  };
}

TEST_F(DeviceInterfaceBase, SyncSelectedCpuSendsTheSourceCpuOnlyOnMultiCpuLoaders) {
  mDevice.SetDataSourceFormat(EDS_SREC_TOUCH);
  AnswerCpuQueries(mDevice, {0, 1});
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  EXPECT_TRUE(mDevice.writes.empty()) << "a single CPU gets no set command";

  AnswerCpuQueries(mDevice, {0, 2});
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  ASSERT_EQ(mDevice.writes.size(), 1u);
  EXPECT_EQ(mDevice.writes.back(), (std::vector<uint8_t>{0x20, 0x01, 0x00}));
  // The CPU numbers appear as raw characters, not digits.
  EXPECT_TRUE(mNotifier.Logged(std::string("WARNING: Setting currentCpu: [") + '\0' +
                               "] to dataSourceCpu: [" + '\x01' + "]"));

  // A source CPU of 5 keeps what the device reported, and still sends it.
  mDevice.writes.clear();
  mDevice.SetDataSourceFormat(EDS_UNKNOWN);
  AnswerCpuQueries(mDevice, {3, 4});
  EXPECT_TRUE(mDevice.SyncSelectedCPU());
  ASSERT_EQ(mDevice.writes.size(), 1u);
  EXPECT_EQ(mDevice.writes.back(), (std::vector<uint8_t>{0x20, 0x03, 0x00}));
  EXPECT_TRUE(mNotifier.Logged(std::string("NOTE: Resetting currentCpu: [") + '\x03' + "]"));

  mDevice.SetOpen(false);
  EXPECT_FALSE(mDevice.SyncSelectedCPU());
}

TEST_F(DeviceInterfaceBase, CpuQueriesKeepTheirDefaultsWhenTheReadFails) {
  mDevice.onRead = [](std::vector<uint8_t>& report_IO) {
    report_IO[1] = report_IO[2] = 0;  // a count of 0 means one CPU
    return true;
  };
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
  EXPECT_FALSE(mDevice.FLProtGetTotalCPUs(count));
  EXPECT_EQ(count, 1u);
}

TEST_F(DeviceInterfaceBase, CommandRetriesFollowTheirOwnTable) {
  BL_HID_REP_GET_BL_PARAMETERS params;
  params.readSize = 8;
  params.wordSize = 4;
  params.blockSize = 16;
  params.numFlashBlocks = 2;
  mDevice.SetParams(params);
  // Every transfer fails after its SafeRead/SafeWrite retries.
  mDevice.onWrite = [](std::vector<uint8_t>&) { return false; };
  mDevice.onRead = [](std::vector<uint8_t>&) { return false; };
  const std::vector<uint8_t> data(16, 0xAB);

  // Erase: five tries, no reopen of its own, no wait of its own.
  EXPECT_FALSE(mDevice.FLProtEraseBlock(1));
  EXPECT_EQ(mDevice.writes.size(), 5u * 101u);
  EXPECT_EQ(mDevice.opens, 5);  // only SafeWrite's own reopens
  EXPECT_EQ(mNotifier.errors, (std::vector<std::string>{"Failed erasing block from device"}));
  EXPECT_NEAR(mClock->GetTotalSlept(), 5 * 7.05, 1e-6);

  // Write block: five tries, a reopen and half a second after tries 2 to 5.
  mDevice.writes.clear();
  mDevice.opens = 0;
  mNotifier.errors.clear();
  const double before = mClock->GetTotalSlept();
  EXPECT_FALSE(mDevice.FLProtWriteBlock(data, 0x1000));
  EXPECT_EQ(mDevice.writes.size(), 5u * 101u);
  EXPECT_EQ(mDevice.opens, 5 + 4);
  EXPECT_EQ(mNotifier.errors.size(), 5u);
  EXPECT_EQ(mNotifier.errors.front(), "Write Failed... Retrying...");
  EXPECT_NEAR(mClock->GetTotalSlept() - before, 5 * 7.05 + 4 * 0.5, 1e-6);

  // Write word: five tries, silent.
  mDevice.writes.clear();
  mNotifier.errors.clear();
  EXPECT_FALSE(mDevice.FLProtWriteWord(data, 0x1000));
  EXPECT_EQ(mDevice.writes.size(), 5u * 101u);
  EXPECT_TRUE(mNotifier.errors.empty());

  // Everything else: one try.
  mDevice.writes.clear();
  EXPECT_FALSE(mDevice.FLProtSetReadAddr(0x1000));
  EXPECT_EQ(mDevice.writes.size(), 101u);

  // Read data: five tries per repeat, then the error.
  std::vector<uint8_t> out;
  mDevice.reads.clear();
  EXPECT_FALSE(mDevice.FLProtReadData(out, 3));
  EXPECT_EQ(mDevice.reads.size(), 5u * 101u);
  EXPECT_EQ(mNotifier.errors.back(), "Failed reading from device");
}

TEST_F(DeviceInterfaceBase, CommandsNeedAnOpenLoaderAndTheirSizes) {
  mDevice.SetChecksumsSupported(false);
  EXPECT_TRUE(mDevice.FLProtSetMagicWord(0));
  EXPECT_TRUE(mDevice.FLProtSetBlockChecksum(3, 0));
  EXPECT_TRUE(mDevice.FLProtCalcSetBlockChecksum(3));
  EXPECT_TRUE(mDevice.FLProtWriteChecksumsToROM());
  EXPECT_TRUE(mDevice.writes.empty()) << "unsupported checksums send nothing";

  // Sizes of 0 refuse before the wire.
  std::vector<uint8_t> out;
  EXPECT_FALSE(mDevice.FLProtReadData(out, 1));
  EXPECT_FALSE(mDevice.FLProtWriteBlock(std::vector<uint8_t>(16), 0));
  EXPECT_FALSE(mDevice.FLProtWriteWord(std::vector<uint8_t>(16), 0));
  BL_HID_REP_GET_FLASH_DESCRIPTOR descriptor;
  EXPECT_FALSE(mDevice.FLProtGetFlashDescriptor(descriptor));
  BL_HID_REP_GET_BL_PARAMETERS params;
  params.readSize = 4;
  mDevice.SetParams(params);
  EXPECT_FALSE(mDevice.FLProtReadData(out, 0));
  EXPECT_TRUE(mDevice.reads.empty());

  // Not in loader mode: nothing is sent; the erase says so.
  mDevice.SetIsFlashLoader(false);
  mDevice.SetChecksumsSupported(true);
  uint32_t status = 0;
  EXPECT_FALSE(mDevice.FLProtGetStatus(status));
  EXPECT_FALSE(mDevice.FLProtSetMagicWord(0));
  EXPECT_FALSE(mDevice.FLProtResetCPU(true));
  EXPECT_FALSE(mDevice.FLProtEraseBlock(0));
  EXPECT_EQ(mNotifier.errors, (std::vector<std::string>{"Failed erasing block from device"}));
  EXPECT_TRUE(mDevice.writes.empty());
  EXPECT_TRUE(mDevice.reads.empty());
}

// The ids on the wire are checked report by report in FLProtWireTest; here
// the ones no loader command sends, and the fall-backs.
TEST(FLProtocol, IdsOutsideTheLoaderCommands) {
  LogCapture capture;
  std::shared_ptr<CFLProtocol> protocol = CFLProtocol::GetInstance();
  protocol->SetProtocolType(EFL_PROTOCOL_LOADER);
  EXPECT_FALSE(protocol->IsNonBLProtocol());
  EXPECT_EQ(protocol->GetCommand(eBL_HID_REP_PROGRAMMING_ID), 0);
  EXPECT_TRUE(
      capture.AssertionContains("eBL_HID_REP_PROGRAMMING_ID NOT SUPPORTED FOR CURRENT PROTOCOL"));
  EXPECT_EQ(protocol->GetCommand(static_cast<EBLHIDCmdId>(22)), 0);
  EXPECT_TRUE(capture.AssertionContains("Oops - unknown command ID"));

  protocol->SetProtocolType(EFL_PROTOCOL_NON_BL);
  EXPECT_TRUE(protocol->IsNonBLProtocol());
  EXPECT_EQ(protocol->GetCommand(eBL_HID_REP_NOT_USED_ID), 0xD0);
  EXPECT_EQ(protocol->GetCommand(eBL_HID_REP_PROGRAMMING_ID), 0xE4);

  // Anything but the non-BL value speaks the loader protocol.
  protocol->SetProtocolType(static_cast<EFLProtocolType>(7));
  EXPECT_FALSE(protocol->IsNonBLProtocol());
  EXPECT_EQ(protocol->GetCommand(eBL_HID_REP_WRITE_WORD_ID), 0x16);
  protocol->SetProtocolType(EFL_PROTOCOL_LOADER);
}

}  // namespace
