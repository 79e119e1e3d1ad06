// The hidraw node, the device registry and a pen update against the real
// kernel's HID core: lab boards shown through /dev/uhid. Runs as root inside
// the small virtual machine of kernel_vm.sh, where no udev daemon runs.

#include <gtest/gtest.h>

#include <thread>

#include "common/CClock.h"
#include "common/CSteadyClock.h"
#include "flash/CFLProtocol.h"
#include "lab/CLabPenController.h"
#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CRecordingWatcher.h"
#include "platform/linux/CUhidLabDevice.h"
#include "support/LabImages.h"
#include "support/RecordingNotifier.h"

namespace {

using Bytes = std::vector<uint8_t>;
constexpr uint32_t kVendor = 0x7A71;
constexpr uint32_t kNormal = 0x0301;
constexpr uint32_t kLoader = 0x0302;

class KernelHid : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_EQ(::access("/dev/uhid", R_OK | W_OK), 0) << "needs /dev/uhid, as root";
    CClock::Set(std::make_shared<CSteadyClock>());
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
    mBus->SetReenumerationDelays(0.05, 0.2);
    mBus->Plug(mPen);
  }
  void TearDown() override {
    mDevice.reset();
    CClock::Set(nullptr);
  }

  // The registry's entry for the pen's vendor collection under `product_I`,
  // waiting up to `seconds_I` for the kernel to make its node.
  bool WaitForEntry(uint32_t product_I, SHidEntry& entry_O, double seconds_I = 5) {
    for (double waited = 0; waited < seconds_I; waited += 0.02) {
      for (const SHidEntry& entry : mRegistry->ListHidInterfaces(kVendor)) {
        if (entry.info.productId == product_I && entry.info.usagePage == 0xFF00) {
          entry_O = entry;
          return true;
        }
      }
      TavSleep(0.02);
    }
    return false;
  }

  std::shared_ptr<CLabBus> mBus = CLabBus::Create();
  std::shared_ptr<CLabPenController> mPen = std::make_shared<CLabPenController>();
  std::shared_ptr<CLinuxDeviceRegistry> mRegistry = std::make_shared<CLinuxDeviceRegistry>();
  std::unique_ptr<CUhidLabDevice> mDevice = std::make_unique<CUhidLabDevice>(mBus, mPen);
};

}  // namespace

TEST_F(KernelHid, RegistryListsAUsblessHidDeviceAndWatchesItComeAndGo) {
  SHidEntry entry;
  ASSERT_TRUE(WaitForEntry(kNormal, entry));
  // No USB device above a uhid device: bus type USB (3) and the HID core's
  // sequence number make the location, and there is no release number.
  EXPECT_EQ(entry.info.locationId & 0xFFFF0000u, 0x00030000u);
  EXPECT_NE(entry.info.locationId & 0xFFFFu, 0u);
  EXPECT_EQ(entry.version, 0);
  EXPECT_EQ(entry.nodePath.rfind("/dev/hidraw", 0), 0u) << entry.nodePath;
  std::vector<std::pair<uint32_t, uint32_t>> pairs;
  for (const SHidEntry& each : mRegistry->ListHidInterfaces(kVendor))
    pairs.emplace_back(each.info.usagePage, each.info.usage);
  EXPECT_EQ(pairs, (std::vector<std::pair<uint32_t, uint32_t>>{{0x0D, 0x02}, {0xFF00, 0x01}}));

  // The kernel's own events reach the watch; the node's identity goes with
  // its removal.
  ASSERT_TRUE(mRegistry->OpenWatch());
  CRecordingWatcher watcher;
  std::thread thread([&] { mRegistry->RunWatch(watcher); });
  mDevice.reset();
  auto second = std::make_shared<CLabPenController>();
  CUhidLabDevice other(mBus, second);
  mBus->Plug(second);
  // One event for each of the two collections, each way.
  const auto events = watcher.WaitFor(4);
  mRegistry->StopWatching();
  thread.join();
  ASSERT_EQ(events.size(), 4u);
  EXPECT_EQ(events[1], (CRecordingWatcher::SEvent{false, entry.info}));
  DeviceInfo again = entry.info;
  again.locationId = events[3].info.locationId;
  EXPECT_EQ(events[3], (CRecordingWatcher::SEvent{true, again}));
  EXPECT_NE(again.locationId, entry.info.locationId) << "a new HID device, a new place";
}

TEST_F(KernelHid, PenUpdateThroughTheLoaderAndBack) {
  SHidEntry normal;
  ASSERT_TRUE(WaitForEntry(kNormal, normal));
  const std::vector<SContinuousDataBlock> image{LabImages::Record(0x08001000, 3 * 4096 + 100, 7),
                                                LabImages::Record(0x08010000, 700, 8)};
  const CLabFlash before = mPen->GetLoader().GetCpu(0);
  RecordingNotifier notifier;

  CLinuxHIDFLDeviceInterface main(normal.info, std::make_unique<CLinuxHidNode>(mRegistry));
  ASSERT_TRUE(main.SwitchToBLMode());
  SHidEntry loaderEntry;
  ASSERT_TRUE(WaitForEntry(kLoader, loaderEntry)) << "the loader re-enumerates as a new device";
  CLinuxHIDFLDeviceInterface loader(loaderEntry.info, std::make_unique<CLinuxHidNode>(mRegistry));
  loader.SetIsFlashLoader(true);
  ASSERT_TRUE(loader.Open());
  loader.SetProtocolType(EFL_PROTOCOL_LOADER);
  loader.RegisterCallback(&notifier);
  loader.SetDataSourceFormat(EDS_SREC_PEN);
  EXPECT_TRUE(loader.Init(image) && loader.ProgramBoard())
      << (notifier.errors.empty() ? "" : notifier.errors.back());
  EXPECT_TRUE(loader.SwitchFromBLMode(true));
  loader.Close();
  SHidEntry back;
  ASSERT_TRUE(WaitForEntry(kNormal, back));

  EXPECT_EQ(mPen->GetMode(), CLabLoaderBoard::EMode::eNormal);
  EXPECT_TRUE(mPen->GetLoader().IsImageValid());
  const auto expected = LabImages::Expected(before, image);
  const CLabFlash& after = mPen->GetLoader().GetCpu(0);
  for (uint32_t i = 0; i < after.GetBlockCount(); ++i)
    EXPECT_EQ(after.GetBlockContent(i), expected[i]) << "block " << i;
  for (const std::string& violation : mPen->GetViolations()) ADD_FAILURE() << violation;
}
