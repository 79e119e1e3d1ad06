// The Linux forms of the HID node and USB control seams against umockdev:
// real libudev enumeration, real HIDIOCSFEATURE/HIDIOCGFEATURE ioctls and
// real libusb control transfers, answered by the lab's boards.

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "lab/CLabPenController.h"
#include "lab/CLabProducts.h"
#include "lab/CLabTouchBulk.h"
#include "platform/linux/CLinuxBulkFLDeviceInterface.h"
#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CLinuxUsbControl.h"
#include "platform/linux/UmockdevLab.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "support/LabSRecUpdate.h"

namespace {

using Bytes = std::vector<uint8_t>;

class Umockdev : public LabFixture {
 protected:
  void SetUp() override {
    // Without the preload library the real /sys would answer: refuse.
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
    LabFixture::SetUp();
  }
  void TearDown() override {
    mLab.reset();
    LabFixture::TearDown();
  }

  void Start() { mLab = std::make_unique<UmockdevLab>(mBus); }

  std::unique_ptr<UmockdevLab> mLab;
};

TEST_F(Umockdev, HidrawNodesAreFoundAndSpokenToThroughIoctls) {
  auto pen = std::make_shared<CLabPenController>();
  mBus->Plug(pen);
  Start();
  ASSERT_EQ(mLab->HidrawCount(), 2u);

  const DeviceInfo penUsage{0x7A71, 0x0301, 0x01100000, 0x0002, 0x000D};
  std::string node;
  uint16_t release = 0;
  CLinuxHidNode finder;
  ASSERT_TRUE(finder.FindNode(penUsage, node, release));
  EXPECT_EQ(node.rfind("/dev/hidraw", 0), 0u);
  EXPECT_EQ(release, 0x0120);
  DeviceInfo elsewhere = penUsage;
  elsewhere.locationId = 0x01200000;
  EXPECT_FALSE(finder.FindNode(elsewhere, node, release));

  CLinuxHidNode hid;
  ASSERT_EQ(hid.Open(penUsage), EHidStatus::eSuccess);
  EXPECT_EQ(hid.GetReleaseNumber(), 0x0120);
  CLinuxHidNode second;
  EXPECT_EQ(second.Open(penUsage), EHidStatus::eBusy) << "held by the first";
  EXPECT_EQ(second.Open(elsewhere), EHidStatus::eGone);

  EXPECT_EQ(hid.SetFeatureReport({0x02, 0x00}), EHidStatus::eSuccess);
  EXPECT_EQ(pen->GetTrace().back().bytes, (Bytes{0x02, 0x00}));
  // The normal firmware stalls what it does not know: EPIPE both ways.
  Bytes unknown{0x14, 0, 0, 0, 0};
  EXPECT_EQ(hid.GetFeatureReport(unknown), EHidStatus::eStall);
  EXPECT_EQ(hid.SetFeatureReport({0x55, 1}), EHidStatus::eStall);
  pen->Faults().Add({ELabFaultKind::eBusy, 1, ""});
  EXPECT_EQ(hid.SetFeatureReport({0x02, 0x00}), EHidStatus::eBusy);
}

TEST_F(Umockdev, PenSRecUpdateThroughHidraw) {
  auto pen = std::make_shared<CLabPenController>();
  mBus->Plug(pen);
  Start();
  // A stalled write still counts; the lab takes it before stalling.
  pen->Faults().Add({ELabFaultKind::eStall, 3, ""});

  const CLabFlash before = pen->GetLoader().GetCpu(0);
  const std::vector<SContinuousDataBlock> image{LabImages::Record(0x08001010, 0x2EF0, 41),
                                                LabImages::Record(0x0800A000, 100, 42)};
  LabSRecUpdate update(mBus, {0x7A71, 0x0301, 0x01100000, 0x0002, 0x000D},
                       {0x7A71, 0x0302, 0x01100000, 0x0001, 0xFF00});
  update.SetNodeFactory([] { return std::make_unique<CLinuxHidNode>(); });
  update.SetAfterWait([this] { mLab->Sync(); });
  update.SetFormat(EDS_SREC_PEN);
  const LabSRecUpdate::SResult result = update.Run(image);
  ASSERT_TRUE(result.programmed) << (update.Notifier().errors.empty()
                                         ? ""
                                         : update.Notifier().errors.back());
  EXPECT_TRUE(result.backToNormal);
  EXPECT_EQ(result.newChecksum, result.fwChecksum);

  EXPECT_EQ(pen->GetMode(), CLabLoaderBoard::EMode::eNormal);
  EXPECT_TRUE(pen->GetLoader().IsImageValid());
  const auto expected = LabImages::Expected(before, image);
  for (uint32_t i = 0; i < before.GetBlockCount(); ++i) {
    EXPECT_EQ(pen->GetLoader().GetCpu(0).GetBlockContent(i), expected[i]) << i;
  }
  EXPECT_TRUE(pen->GetViolations().empty());
  EXPECT_TRUE(pen->Faults().Empty());
  EXPECT_EQ(mLab->HidrawCount(), 2u) << "back under its normal identity";
}

TEST_F(Umockdev, TouchControllerSwitchedOverLibusbAndUpdatedOnItsLoader) {
  auto touch = std::make_shared<CLabTouchBulk>();
  mBus->Plug(touch);
  Start();
  const DeviceInfo normal{0x7A71, 0x0311, 0x01100000, 0, 0};
  const DeviceInfo loader{0x7A71, 0x0312, 0x01100000, 0x0002, 0xFF00};

  CLinuxBulkFLDeviceInterface bulk(normal, std::make_unique<CLinuxUsbControl>());
  ASSERT_TRUE(bulk.Open());
  EXPECT_EQ(bulk.GetVersion(), 0x0210u);
  EXPECT_TRUE(bulk.IsAlive());
  EXPECT_EQ(touch->GetTrace().back().bytes, (Bytes{0xC1, 0x01, 0, 0, 0, 0, 2, 0, 0x01, 0x00}));
  EXPECT_TRUE(bulk.InitEEPROM());
  EXPECT_EQ(touch->GetTrace().back().bytes, (Bytes{0x41, 0xF5, 0xFF, 0xFF, 0, 0, 0, 0}));
  EXPECT_EQ(touch->GetEEPROMInits(), 1u);
  Bytes unknownRequest{0x41, 0x77, 0, 0, 0};
  EXPECT_FALSE(bulk.Write(unknownRequest)) << "a stalled control request";
  ASSERT_TRUE(bulk.SwitchToBLMode());
  TavSleep(1.0);
  EXPECT_FALSE(bulk.IsAlive()) << "the USB device it had is gone";
  bulk.Close();

  const CLabFlash before = touch->GetLoader().GetCpu(1);
  const std::vector<SContinuousDataBlock> image{LabImages::Record(0x00100800, 6000, 51)};
  LabSRecUpdate update(mBus, normal, loader);
  update.SetNodeFactory([] { return std::make_unique<CLinuxHidNode>(); });
  update.SetAfterWait([this] { mLab->Sync(); });
  update.SetFormat(EDS_SREC_TOUCH);
  ASSERT_TRUE(update.WaitFor(loader)) << "the loader re-enumerates as a HID device";
  std::unique_ptr<CLinuxHIDFLDeviceInterface> hid = update.MakeInterface(loader);
  hid->RegisterCallback(&update.Notifier());
  hid->SetIsFlashLoader(true);
  ASSERT_TRUE(hid->Open());
  hid->SetDataSourceFormat(EDS_SREC_TOUCH);
  ASSERT_TRUE(hid->Init(image) && hid->ProgramBoard())
      << (update.Notifier().errors.empty() ? "" : update.Notifier().errors.back());
  ASSERT_TRUE(hid->SwitchFromBLMode(true));
  hid->Close();
  TavSleep(1.0);
  mLab->Sync();

  EXPECT_EQ(touch->GetMode(), CLabLoaderBoard::EMode::eNormal);
  const auto expected = LabImages::Expected(before, image);
  for (uint32_t i = 0; i < before.GetBlockCount(); ++i) {
    EXPECT_EQ(touch->GetLoader().GetCpu(1).GetBlockContent(i), expected[i]) << i;
  }
  EXPECT_EQ(hid->GetNewChecksum(), hid->GetFWChecksum());
  EXPECT_TRUE(touch->GetViolations().empty());

  // Back on its vendor interface, through libusb again.
  CLinuxBulkFLDeviceInterface again(normal, std::make_unique<CLinuxUsbControl>());
  ASSERT_TRUE(again.Open());
  EXPECT_TRUE(again.IsAlive());
}

TEST_F(Umockdev, DiscoveryFindsLabProductsBehindTheirHubsThroughLibudev) {
  const auto classic = CLabProducts::Plug(*mBus, "classic-tablet", 1);
  const auto wireless = CLabProducts::Plug(*mBus, "wireless-tablet", 2);
  Start();
  auto registry = std::make_shared<CLinuxDeviceRegistry>();
  CLinuxDiscovery discovery(
      registry, [registry] { return std::make_unique<CLinuxHidNode>(registry); },
      [] { return std::make_unique<CLinuxUsbControl>(); });
  discovery.SetConfig(TAV_DATA_DIR "/fw_loader.ini");

  ASSERT_TRUE(discovery.GenerateDeviceList());
  CDeviceList list = discovery.GetDeviceList();
  ASSERT_EQ(list.GetDeviceCount(), 2u);
  const auto tablet = list.GetDevice(0);
  EXPECT_EQ(tablet->GetDeviceName(), "Lab Classic Tablet");
  // Locations come from busnum and devpath: hub on port 1, boards on its ports.
  EXPECT_EQ(tablet->GetPenInterface()->GetPath(), "31325:769:17891328:1:65280");
  ASSERT_NE(tablet->GetTouchInterface(), nullptr);
  EXPECT_EQ(tablet->GetTouchInterface()->GetPath(), "31325:785:17956864:0:0");
  EXPECT_EQ(tablet->GetTouchInterface()->GetInterfaceType(), EBULK_INTERFACE);
  const auto other = list.GetDevice(1);
  EXPECT_EQ(other->GetDeviceName(), "Lab Wireless Tablet");
  ASSERT_NE(other->GetBluetoothInterface(), nullptr);
  EXPECT_EQ(other->GetBluetoothInterface()->GetPath(), "31325:1057:19070976:1:65280");

  // The pen goes to its loader through its hidraw node and comes back under
  // another product id at the same place.
  ASSERT_TRUE(tablet->GetPenInterface()->SwitchToBLMode());
  TavSleep(1.0);
  mLab->Sync();
  ASSERT_TRUE(discovery.GenerateDeviceList());
  const auto best = discovery.GetBestDevice();
  ASSERT_NE(best, nullptr);
  EXPECT_TRUE(best->GetIsFlashLoader());
  EXPECT_EQ(best->GetDeviceName(), "Lab Classic Tablet");
  EXPECT_EQ(best->GetPenUpdate(), "classic-tablet.pen");
  EXPECT_EQ(best->GetPenInterface()->GetPath(), "31325:770:17891328:1:65280");
  EXPECT_EQ(best->GetTouchInterface()->GetPath(), "31325:785:17956864:0:0");
  EXPECT_NE(discovery.FindDevice(other->GetBluetoothInterface()->GetPath()), nullptr);
}

}  // namespace
