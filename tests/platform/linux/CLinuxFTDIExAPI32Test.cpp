// The libftdi1 form of the FTDI bridge seam against umockdev: real libftdi
// and libusb traffic to an emulated FT232H that the lab's bridge answers,
// driven with the raw MPSSE byte strings of an I2C host, and a whole
// scalar update carried through it.

#include <gtest/gtest.h>
#include <sys/prctl.h>

#include <algorithm>
#include <numeric>

#include "firmware/FirmwareFiles.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabProducts.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "platform/linux/CLinuxFTDIExAPI32.h"
#include "platform/linux/UmockdevFTDI.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "support/LabFixture.h"
#include "update/CLinuxUpdateController.h"

namespace {

using Bytes = std::vector<uint8_t>;

Bytes operator+(Bytes head_I, const Bytes& tail_I) {
  head_I.insert(head_I.end(), tail_I.begin(), tail_I.end());
  return head_I;
}
Bytes& operator+=(Bytes& head_IO, const Bytes& tail_I) { return head_IO = head_IO + tail_I; }

void* ByValue(uint32_t value_I) { return reinterpret_cast<void*>(uintptr_t{value_I}); }

// The bus primitives: both lines set by 0x80 value, direction triples.
Bytes Start() {
  Bytes bytes;
  for (uint8_t value : {0x03, 0x01, 0x00}) {
    for (int i = 0; i < 4; ++i) bytes.insert(bytes.end(), {0x80, value, 0x03});
  }
  return bytes;
}
Bytes Stop() {
  Bytes bytes;
  for (uint8_t value : {0x01, 0x03}) {
    for (int i = 0; i < 4; ++i) bytes.insert(bytes.end(), {0x80, value, 0x03});
  }
  bytes.insert(bytes.end(), {0x80, 0x02, 0x03});
  return bytes;
}
// One byte out and its acknowledge clocked in and sent back at once.
Bytes SendByte(uint8_t byte_I) {
  return {0x11, 0x00, 0x00, byte_I, 0x80, 0x00, 0x01, 0x22,
          0x00, 0x87, 0x80, 0x00,   0x03, 0x80, 0x02, 0x03};
}
Bytes GetByte(bool ack_I) {
  return {0x80, 0x00, 0x01, 0x24, 0x00, 0x00,
          0x80, 0x00, 0x03, 0x13, 0x00, static_cast<uint8_t>(ack_I ? 0x00 : 0x80)};
}

class LinuxFTDI : public LabFixture {
 protected:
  void SetUp() override {
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
    // umockdev's client waits for its handler with usleep(0), which the
    // default 50 us timer slack turns into a real sleep per round trip: a
    // scalar block's 200,000 transfers would take minutes instead of seconds.
    prctl(PR_SET_TIMERSLACK, 1UL);
    LabFixture::SetUp();
    CLabProducts::Plug(*mBus, "display-ftdi");
    mBridge = std::dynamic_pointer_cast<CLabFTDIBridge>(mBus->FindBoard("display-ftdi-scalar"));
    ASSERT_NE(mBridge, nullptr);
    mUsb = std::make_unique<UmockdevFTDI>(mBus, mBridge);
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    mUsb.reset();
    LabFixture::TearDown();
  }

  // Opens the bridge and brings its engine up as the scalar link does.
  void Open() {
    ASSERT_EQ(mApi->FT_OpenEx(ByValue(kLocation), FT_OPEN_BY_LOCATION, &mHandle), FT_OK);
    const FT_STATUS statuses[] = {
        mApi->FT_ResetDevice(mHandle),
        mApi->FT_SetUSBParameters(mHandle, 65536, 65536),
        mApi->FT_SetChars(mHandle, 0, 0, 0, 0),
        mApi->FT_SetTimeouts(mHandle, 5000, 5000),
        mApi->FT_SetLatencyTimer(mHandle, 8),
        mApi->FT_SetBitMode(mHandle, 0, FT_BITMODE_RESET),
        mApi->FT_SetBitMode(mHandle, 0, FT_BITMODE_MPSSE),
    };
    for (FT_STATUS status : statuses) EXPECT_EQ(status, FT_OK);
    ASSERT_TRUE(mBridge->IsMpsse());
    Send({0x84});
    EXPECT_EQ(Waiting(), 0u);
    Send({0xAA});
    EXPECT_EQ(Take(2), (Bytes{0xFA, 0xAA})) << "the bad-command probe";
    Send({0x85, 0x8A, 0x97, 0x8D, 0x9E, 0x02, 0x00, 0x80, 0x03, 0x03, 0x86, 0x2B, 0x01, 0x82, 0x14,
          0xFF});
    EXPECT_EQ(mBridge->GetEngine().GetDivisor(), 0x12B);
  }

  void Send(const Bytes& bytes_I, FT_STATUS expected_I = FT_OK) {
    uint32_t written = 0;
    EXPECT_EQ(
        mApi->FT_Write(mHandle, bytes_I.data(), static_cast<uint32_t>(bytes_I.size()), &written),
        expected_I);
    EXPECT_EQ(written, expected_I == FT_OK ? bytes_I.size() : 0u);
  }
  Bytes Take(size_t count_I, FT_STATUS expected_I = FT_OK) {
    Bytes bytes(count_I);
    uint32_t read = 0;
    EXPECT_EQ(mApi->FT_Read(mHandle, bytes.data(), static_cast<uint32_t>(count_I), &read),
              expected_I);
    bytes.resize(read);
    return bytes;
  }
  uint32_t Waiting() {
    uint32_t waiting = 0;
    EXPECT_EQ(mApi->FT_GetQueueStatus(mHandle, &waiting), FT_OK);
    return waiting;
  }

  // The bridge of the product's hub port 5, on root port 1 of bus 1.
  static constexpr uint32_t kLocation = 0x01150000;
  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::unique_ptr<UmockdevFTDI> mUsb;
  std::unique_ptr<CLinuxFTDIExAPI32> mApi = std::make_unique<CLinuxFTDIExAPI32>();
  FT_HANDLE mHandle = nullptr;
};

TEST_F(LinuxFTDI, TheBridgeIsListedByLocationAndCarriesADisplayInformationRequest) {
  uint32_t count = 0;
  ASSERT_EQ(mApi->FT_ListDevices(&count, nullptr, FT_LIST_NUMBER_ONLY), FT_OK);
  EXPECT_EQ(count, 1u);
  uint32_t location = 0;
  ASSERT_EQ(mApi->FT_ListDevices(ByValue(0), &location, FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION),
            FT_OK);
  EXPECT_EQ(location, kLocation) << "the registry's rule for bus 1, ports 1.5";
  EXPECT_EQ(mApi->FT_ListDevices(ByValue(1), &location, FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION),
            FT_DEVICE_NOT_FOUND);
  Open();

  // Request 0x01 0xF2 to 0x6E, each byte acknowledged.
  Bytes request{0x6E, 0x51, 0x82, 0x01, 0xF2};
  request.push_back(std::accumulate(request.begin(), request.end(), uint8_t{0},
                                    [](uint8_t a, uint8_t b) { return uint8_t(a ^ b); }));
  Bytes bytes = Start();
  for (uint8_t byte : request) bytes += SendByte(byte);
  Send(bytes + Stop());
  EXPECT_EQ(Take(request.size()), Bytes(request.size(), 0x00)) << "every byte acknowledged";

  // The reply from 0x6F: 56 bytes, the last one refused.
  constexpr size_t kReply = 56;
  bytes = Start() + SendByte(0x6F);
  for (size_t i = 0; i < kReply; ++i) bytes += GetByte(i + 1 < kReply);
  Send(bytes + Stop());
  const Bytes answer = Take(1 + kReply);
  ASSERT_EQ(answer.size(), 1 + kReply);
  EXPECT_EQ(answer[0] & 1, 0);
  const Bytes reply(answer.begin() + 1, answer.end());
  EXPECT_EQ(std::accumulate(reply.begin(), reply.end(), uint8_t{0x50},
                            [](uint8_t a, uint8_t b) { return uint8_t(a ^ b); }),
            0);
  EXPECT_STREQ(reinterpret_cast<const char*>(&reply[3 + 14]), "Lab Display");
  EXPECT_STREQ(reinterpret_cast<const char*>(&reply[3 + 27]), "LABFT0701");
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
  EXPECT_EQ(mApi->FT_Close(mHandle), FT_OK);
}

TEST_F(LinuxFTDI, TheScalarLinkOpensTheBridgeAndIdentifiesTheDisplay) {
  CI2CConnectorFTDI::SetApi(mApi.get());
  ASSERT_EQ(CI2CConnectorFTDI::NumberOfDevices(), 1);
  CI2CConnectorFTDI link;
  ASSERT_TRUE(link.Open(0));
  EXPECT_EQ(link.SerialNumber(0x7A5D0701), "LABFT0701");
  EXPECT_EQ(link.MonitorName(), "Lab Display");
  EXPECT_TRUE(link.FWVersion() == FileVersion(1, 0, 0, FileVersion::EFinalVersion, 0));
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
  EXPECT_TRUE(link.Close());
}

TEST_F(LinuxFTDI, ReadsTimeOutShortAndTheBridgeServesOneHandle) {
  Open();
  ASSERT_EQ(mApi->FT_SetTimeouts(mHandle, 50, 50), FT_OK);
  Send({0xAA});
  const double before = mClock->Now();
  EXPECT_EQ(Take(3), (Bytes{0xFA, 0xAA}));
  EXPECT_GE(mClock->Now() - before, 0.05) << "short only once the read time-out passed";
  EXPECT_EQ(Take(1), Bytes{});

  // What the queue status read ahead is what the next read gives.
  Send({0xAB, 0xAC});
  EXPECT_EQ(Waiting(), 4u);
  EXPECT_EQ(Take(3), (Bytes{0xFA, 0xAB, 0xFA}));
  Send({0xAA});
  ASSERT_EQ(mApi->FT_Purge(mHandle, FT_PURGE_RX | FT_PURGE_TX), FT_OK);
  EXPECT_EQ(Waiting(), 0u);

  FT_HANDLE second = nullptr;
  EXPECT_EQ(mApi->FT_OpenEx(ByValue(kLocation), FT_OPEN_BY_LOCATION, &second),
            FT_DEVICE_NOT_OPENED);
  EXPECT_EQ(mApi->FT_OpenEx(ByValue(0x01250000), FT_OPEN_BY_LOCATION, &second),
            FT_DEVICE_NOT_FOUND);
  EXPECT_EQ(mApi->FT_Purge(&second, 3), FT_INVALID_HANDLE);
  EXPECT_EQ(mApi->FT_SetLatencyTimer(mHandle, 0), FT_INVALID_PARAMETER);
  EXPECT_EQ(mApi->FT_SetUSBParameters(mHandle, 65536, 100), FT_INVALID_PARAMETER);
}

TEST_F(LinuxFTDI, FailedTransfersGiveIOErrorsAndAnUnpluggedBridgeIsNoLongerFound) {
  Open();
  // A transfer the bridge fails is an I/O error; the handle goes on.
  mBus->AddFaults({SLabFault{ELabFaultKind::eFailWrite, 1, ""}}, 1);
  Send({0xAA}, FT_IO_ERROR);
  Send({0xAA});
  EXPECT_EQ(Take(2), (Bytes{0xFA, 0xAA}));

  mBus->AddFaults({SLabFault{ELabFaultKind::eVanish, 1, ""}}, 1);
  Send({0x87});  // the last transfer before it drops off
  Send({0x87}, FT_IO_ERROR);
  Take(1, FT_IO_ERROR);
  EXPECT_EQ(mApi->FT_SetBitMode(mHandle, 0, FT_BITMODE_RESET), FT_IO_ERROR);
  uint32_t waiting = 0;
  EXPECT_EQ(mApi->FT_GetQueueStatus(mHandle, &waiting), FT_IO_ERROR);

  mUsb->Unplug();
  uint32_t count = 1;
  ASSERT_EQ(mApi->FT_ListDevices(&count, nullptr, FT_LIST_NUMBER_ONLY), FT_OK);
  EXPECT_EQ(count, 0u);
  FT_HANDLE again = nullptr;
  EXPECT_EQ(mApi->FT_OpenEx(ByValue(kLocation), FT_OPEN_BY_LOCATION, &again), FT_DEVICE_NOT_FOUND);
  EXPECT_EQ(mApi->FT_Close(mHandle), FT_OK);
  EXPECT_EQ(mApi->FT_Close(mHandle), FT_INVALID_HANDLE);
}

TEST_F(LinuxFTDI, CarriesAScalarUpdateFromDiscoveryToTheProgrammedFlash) {
  CI2CConnectorFTDI::SetApi(mApi.get());
  auto discovery = std::make_unique<CLinuxDiscovery>(
      std::make_shared<CLabDeviceRegistry>(mBus),
      [this] { return std::make_unique<CLabHidNode>(mBus); },
      [this] { return std::make_unique<CLabUsbControl>(mBus); });
  discovery->SetConfig(TAV_DATA_DIR "/fw_loader.ini");
  CLinuxUpdateController controller(std::move(discovery));
  ASSERT_TRUE(controller.UpdateDeviceList());
  ASSERT_TRUE(controller.SetSelectedDevice(0x7A5D, 0x0701));
  controller.SetUpdateType(EUPDATE_SCALAR_FTDI);

  // One 64 KiB block, the least an image holds: every byte of it crosses
  // libusb as the link's own transfers.
  std::vector<uint8_t> image(65536);
  for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<uint8_t>(i * 7 + (i >> 8));
  CTempFolder folder;
  ASSERT_TRUE(controller.SetUpdateFile(folder.Write("scalar.bin", image)));
  EXPECT_TRUE(controller.UpdateScalar("LABFT0701", 0, false, std::string()));
  EXPECT_EQ(controller.GetState(), ESTATE_SUCCESS);
  const std::vector<uint8_t>& flash = mBridge->GetFlash().GetData();
  ASSERT_GE(flash.size(), image.size());
  EXPECT_TRUE(std::equal(image.begin(), image.end(), flash.begin()));
  EXPECT_EQ(mBridge->GetViolations(), std::vector<std::string>{});
}

}  // namespace
