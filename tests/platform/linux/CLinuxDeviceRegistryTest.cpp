// The Linux device registry against umockdev's emulated sysfs and uevents:
// the real libudev enumeration and monitor, with no hardware.
#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <memory>
#include <mutex>
#include <thread>
#include <tuple>
#include <vector>

#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CLinuxDeviceRegistry.h"

namespace {

constexpr uint32_t kVendor = 0x7A5D;
constexpr uint32_t kOtherVendor = 0x1234;

// Pen (digitizer page, usage 2) with a nested physical collection, then a
// vendor collection (0xFF00, usage 1): two top-level pairs.
const std::vector<uint8_t> kPenAndVendor = {0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01, 0x09, 0x20, 0xA1,
                                            0x00, 0x09, 0x42, 0x81, 0x02, 0xC0, 0xC0, 0x06, 0x00,
                                            0xFF, 0x09, 0x01, 0xA1, 0x01, 0xB1, 0x02, 0xC0};
// A long item in front of a single vendor collection (0xFF0D, usage 2).
const std::vector<uint8_t> kLongItemThenVendor = {0xFE, 0x02, 0x11, 0xA1, 0x01, 0x06, 0x0D,
                                                  0xFF, 0x09, 0x02, 0xA1, 0x01, 0xC0};
const std::vector<uint8_t> kVendorOnly = {0x06, 0x00, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0xC0};

DeviceInfo Info(uint32_t vendor_I, uint32_t product_I, uint32_t location_I, uint32_t usage_I,
                uint32_t page_I) {
  return DeviceInfo{vendor_I, product_I, location_I, usage_I, page_I};
}

// An entry in one line: vendor:product @location usage/page node version,
// and the hub above it (all hex).
using Texts = std::vector<std::string>;
Texts TextsOf(const std::vector<SHidEntry>& entries_I) {
  Texts texts;
  char text[160];
  for (const SHidEntry& entry : entries_I) {
    std::snprintf(text, sizeof(text), "%X:%X @%X %X/%X %s v%X under %X:%X", entry.info.vendorId,
                  entry.info.productId, entry.info.locationId, entry.info.usage,
                  entry.info.usagePage, entry.nodePath.c_str(), entry.version,
                  entry.parentUsbVendorId, entry.parentUsbProductId);
    texts.push_back(text);
  }
  return texts;
}

class CLinuxDeviceRegistryTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
    mBus = std::make_unique<CEmulatedUsbBus>();
    mRootHub = mBus->AddRootHub(1);
  }

  std::unique_ptr<CEmulatedUsbBus> mBus;
  std::string mRootHub;
};

// Records watch events and lets the test wait for them.
class CRecordingWatcher : public CRegistryWatcher {
 public:
  struct SEvent {
    bool added;
    DeviceInfo info;
    bool operator==(const SEvent&) const = default;
  };

  void DeviceAdded(const DeviceInfo& info_I) override { Record({true, info_I}); }
  void DeviceRemoved(const DeviceInfo& info_I) override { Record({false, info_I}); }

  std::vector<SEvent> WaitFor(size_t count_I) {
    std::unique_lock<std::mutex> lock(mLock);
    mChanged.wait_for(lock, std::chrono::seconds(5), [&] { return mEvents.size() >= count_I; });
    return mEvents;
  }

 private:
  void Record(const SEvent& event_I) {
    std::lock_guard<std::mutex> lock(mLock);
    mEvents.push_back(event_I);
    mChanged.notify_all();
  }

  std::mutex mLock;
  std::condition_variable mChanged;
  std::vector<SEvent> mEvents;
};

// Runs the registry's watch on a thread of its own, as the device thread does.
class CWatchThread {
 public:
  explicit CWatchThread(CLinuxDeviceRegistry& registry_I) : mRegistry(registry_I) {
    mOpened = mRegistry.OpenWatch();
    mThread = std::thread([this] { mRegistry.RunWatch(mWatcher); });
  }
  ~CWatchThread() { Stop(); }

  bool IsOpened() const { return mOpened; }
  CRecordingWatcher& GetWatcher() { return mWatcher; }
  void Stop() {
    mRegistry.StopWatching();
    if (mThread.joinable()) mThread.join();
  }

 private:
  CLinuxDeviceRegistry& mRegistry;
  CRecordingWatcher mWatcher;
  bool mOpened = false;
  std::thread mThread;
};

}  // namespace

TEST(CLinuxDeviceRegistryLocationTest, PacksBusAndPortsIntoOneWord) {
  // The same ports on another bus, or one port more, is another place; ports
  // past the sixth do not spill into the bus number.
  const struct {
    unsigned bus;
    const char* devpath;
    uint32_t location;
  } cases[] = {{1, "2.3", 0x01230000}, {3, "2", 0x03200000},   {2, "1.4.2.3.1.5", 0x02142315},
               {1, "2.1", 0x01210000}, {2, "2.3", 0x02230000}, {1, "1.1.1.1.1.1.7", 0x01111111}};
  for (const auto& entry : cases) {
    EXPECT_EQ(CLinuxDeviceRegistry::LocationIdFromTopology(entry.bus, entry.devpath),
              entry.location)
        << entry.bus << "-" << entry.devpath;
  }
}

TEST_F(CLinuxDeviceRegistryTest, ListsOneEntryPerTopLevelPairWithIdentityAndNode) {
  const std::string tablet = mBus->AddUsbDevice(mRootHub, 1, "2", kVendor, 0x374, 0x0102);
  mBus->AddHidInterface(tablet, 0, 0, kPenAndVendor);
  const std::string hub = mBus->AddUsbDevice(mRootHub, 1, "4", 0x05E3, 0x0610, 0x0100);
  const std::string behindHub = mBus->AddUsbDevice(hub, 1, "4.3", kVendor, 0x3A0, 0x0215);
  mBus->AddHidInterface(behindHub, 1, 1, kLongItemThenVendor);
  const std::string foreign = mBus->AddUsbDevice(mRootHub, 1, "5", kOtherVendor, 0x1, 0x0001);
  mBus->AddHidInterface(foreign, 0, 2, kVendorOnly);

  // The hub's ids go with the device behind it; a root port gives none.
  CLinuxDeviceRegistry registry;
  Texts expected{"7A5D:374 @1200000 2/D /dev/hidraw0 v102 under 0:0",
                 "7A5D:374 @1200000 1/FF00 /dev/hidraw0 v102 under 0:0",
                 "7A5D:3A0 @1430000 2/FF0D /dev/hidraw1 v215 under 5E3:610"};
  EXPECT_EQ(TextsOf(registry.ListHidInterfaces(kVendor)), expected);
  // Vendor 0 lists every vendor.
  expected.push_back("1234:1 @1500000 1/FF00 /dev/hidraw2 v1 under 0:0");
  EXPECT_EQ(TextsOf(registry.ListHidInterfaces(0)), expected);
  EXPECT_TRUE(registry.ListHidInterfaces(0x4321).empty());
}

TEST_F(CLinuxDeviceRegistryTest, LeavesOutInterfacesItCannotIdentify) {
  const std::string tablet = mBus->AddUsbDevice(mRootHub, 1, "2", kVendor, 0x374, 0x0102);
  mBus->AddHidInterface(tablet, 0, 0, {});  // descriptor unreadable
  mBus->AddHidInterface(tablet, 1, 1, kVendorOnly);
  mBus->AddNonUsbHidInterface(2, kVendorOnly);
  EXPECT_EQ(TextsOf(CLinuxDeviceRegistry().ListHidInterfaces(0)),
            Texts{"7A5D:374 @1200000 1/FF00 /dev/hidraw1 v102 under 0:0"});
}

TEST_F(CLinuxDeviceRegistryTest, ListsUsbDevicesAndTheHubsTheyHangBehind) {
  const std::string hub = mBus->AddUsbDevice(mRootHub, 1, "1", kVendor, 0xF9, 0x0100);
  const std::string guarded = mBus->AddUsbDevice(hub, 1, "1.2", kVendor, 0xFA, 0x0310);
  mBus->AddHidInterface(guarded, 0, 0, kVendorOnly);
  const std::string loose = mBus->AddUsbDevice(mRootHub, 1, "2", kVendor, 0xFA, 0x0310);
  mBus->AddHidInterface(loose, 0, 1, kVendorOnly);
  mBus->AddUsbDevice(mRootHub, 1, "3", kOtherVendor, 0x5, 0x0001);

  CLinuxDeviceRegistry registry;
  // What the 0xFA product is judged by: the hub above it, none on a root port.
  EXPECT_EQ(TextsOf(registry.ListHidInterfaces(kVendor)),
            (Texts{"7A5D:FA @1120000 1/FF00 /dev/hidraw0 v310 under 7A5D:F9",
                   "7A5D:FA @1200000 1/FF00 /dev/hidraw1 v310 under 0:0"}));
  std::vector<std::tuple<uint32_t, uint32_t, uint16_t>> ours;
  for (const SUsbEntry& entry : registry.ListUsbDevices(kVendor)) {
    ours.emplace_back(entry.productId, entry.locationId, entry.version);
  }
  EXPECT_EQ(ours, (decltype(ours){{0xF9, 0x01100000, 0x0100},
                                  {0xFA, 0x01120000, 0x0310},
                                  {0xFA, 0x01200000, 0x0310}}));
  // The root hub and the other vendor's device are there under vendor 0.
  EXPECT_EQ(registry.ListUsbDevices(0).size(), 5u);
}

TEST_F(CLinuxDeviceRegistryTest, WatchFollowsADeviceThatReenumeratesUnderAnotherProductId) {
  const std::string normal = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x374, 0x0102);
  const auto normalNode = mBus->AddHidInterface(normal, 0, 0, kPenAndVendor);

  CLinuxDeviceRegistry registry;
  CWatchThread watch(registry);
  ASSERT_TRUE(watch.IsOpened());

  // Present before the watch opened, its removal still says who it was.
  // Then back at the same place as another product on the same node name,
  // and out again under its own id.
  mBus->Unplug(normalNode);
  const std::string loader = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x94, 0x0001);
  const auto loaderNode = mBus->AddHidInterface(loader, 0, 0, kVendorOnly);
  // Read before it goes: a node unplugged before its arrival is read shows
  // no usage, as with real hardware that vanishes that fast.
  watch.GetWatcher().WaitFor(2);
  mBus->Unplug(loaderNode);
  const std::string back = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x374, 0x0103);
  mBus->AddHidInterface(back, 0, 0, kPenAndVendor);

  using SEvent = CRecordingWatcher::SEvent;
  const DeviceInfo pen = Info(kVendor, 0x374, 0x01300000, 0x02, 0x0D);
  const DeviceInfo loaderInfo = Info(kVendor, 0x94, 0x01300000, 0x01, 0xFF00);
  EXPECT_EQ(
      watch.GetWatcher().WaitFor(4),
      (std::vector<SEvent>{{false, pen}, {true, loaderInfo}, {false, loaderInfo}, {true, pen}}));

  // The listing agrees with the last event.
  const std::vector<SHidEntry> entries = registry.ListHidInterfaces(kVendor);
  ASSERT_EQ(entries.size(), 2u);
  EXPECT_EQ(entries[0].info, pen);
  EXPECT_EQ(entries[0].version, 0x0103);
}

TEST_F(CLinuxDeviceRegistryTest, StopWakesARunningWatchAndEndsOneNotYetStarted) {
  {
    CLinuxDeviceRegistry registry;
    CWatchThread watch(registry);
    ASSERT_TRUE(watch.IsOpened());
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    const auto start = std::chrono::steady_clock::now();
    watch.Stop();  // joins: hangs here if the poll is not woken
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(2));
  }
  {
    CLinuxDeviceRegistry registry;
    ASSERT_TRUE(registry.OpenWatch());
    registry.StopWatching();
    CRecordingWatcher watcher;
    const std::string device = mBus->AddUsbDevice(mRootHub, 1, "6", kVendor, 0x300, 0x0100);
    mBus->AddHidInterface(device, 0, 0, kVendorOnly);
    registry.RunWatch(watcher);  // returns at once, delivering nothing
    EXPECT_TRUE(watcher.WaitFor(0).empty());
  }
  // A watch that was never opened has nothing to run.
  CLinuxDeviceRegistry unopened;
  CRecordingWatcher watcher;
  unopened.RunWatch(watcher);
}
