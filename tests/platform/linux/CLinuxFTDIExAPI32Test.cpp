// The libftdi1 form of the FTDI bridge seam against umockdev: real libftdi
// and libusb traffic to an emulated FT232H that the lab's bridge answers,
// from the raw calls of the seam to a whole scalar update carried through it.

#include <gtest/gtest.h>
#include <sys/prctl.h>

#include <algorithm>

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

void* ByValue(uint32_t value_I) { return reinterpret_cast<void*>(uintptr_t{value_I}); }

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

TEST_F(LinuxFTDI, ListedByLocationFailedTransfersGiveIOErrorsAndUnpluggedItIsNoLongerFound) {
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
