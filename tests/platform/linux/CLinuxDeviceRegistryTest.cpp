// The Linux device registry, HID node and USB control against umockdev's
// emulated sysfs, uevents and ioctls: the real libudev enumeration and
// monitor, hidraw feature reports and libusb control transfers.
#include <gtest/gtest.h>
#include <linux/hidraw.h>
#include <linux/ioctl.h>
#include <linux/usbdevice_fs.h>

#include <cstddef>
#include <cstdio>
#include <functional>
#include <memory>
#include <thread>
#include <tuple>
#include <vector>

#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CLinuxUsbControl.h"
#include "platform/linux/CRecordingWatcher.h"

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

using Bytes = std::vector<uint8_t>;

// Answers the ioctls of one node: hidraw feature reports, or the usbfs calls
// libusb makes for a control transfer. `answer` gets each report, or each
// request as its setup packet and data, and gives an errno, 0 for success;
// what it leaves in the bytes is what a read returns. Runs on umockdev's
// thread.
class CIoctlNode {
 public:
  CIoctlNode(CEmulatedUsbBus& bus_I, std::string node_I, bool usbfs_I)
      : mBus(bus_I), mNode(std::move(node_I)), mUsbfs(usbfs_I) {
    g_signal_connect(mHandler, "handle-ioctl", G_CALLBACK(&CIoctlNode::Handle), this);
    umockdev_testbed_attach_ioctl(mBus.GetTestbed(), mNode.c_str(), mHandler, nullptr);
  }
  ~CIoctlNode() {
    umockdev_testbed_detach_ioctl(mBus.GetTestbed(), mNode.c_str(), nullptr);
    if (mFinished != nullptr) umockdev_ioctl_data_unref(mFinished);
    g_object_unref(mHandler);
  }

  std::function<int(Bytes&)> answer = [](Bytes&) { return 0; };
  std::vector<Bytes> seen;

 private:
  static gboolean Handle(UMockdevIoctlBase*, UMockdevIoctlClient* client_I, CIoctlNode* self_I) {
    const unsigned long request = umockdev_ioctl_client_get_request(client_I);
    UMockdevIoctlData* argument = umockdev_ioctl_client_get_arg(client_I);
    if (!self_I->mUsbfs) return self_I->Hidraw(client_I, request, argument);
    switch (request) {
      case USBDEVFS_CLAIMINTERFACE:
      case USBDEVFS_RELEASEINTERFACE: umockdev_ioctl_client_complete(client_I, 0, 0); return TRUE;
      case USBDEVFS_SUBMITURB: return self_I->Submit(client_I, argument);
      case USBDEVFS_REAPURB:
      case USBDEVFS_REAPURBNDELAY: return self_I->Reap(client_I, argument);
      default: return FALSE;
    }
  }

  gboolean Hidraw(UMockdevIoctlClient* client_I, unsigned long request_I,
                  UMockdevIoctlData* argument_I) {
    const bool set = _IOC_NR(request_I) == _IOC_NR(HIDIOCSFEATURE(0));
    if (_IOC_TYPE(request_I) != 'H' || (!set && _IOC_NR(request_I) != _IOC_NR(HIDIOCGFEATURE(0)))) {
      return FALSE;
    }
    const size_t length = _IOC_SIZE(request_I);
    UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument_I, 0, length, nullptr);
    Bytes report(data->data, data->data + length);
    seen.push_back(report);
    const int error = answer(report);
    if (error == 0 && !set) std::copy(report.begin(), report.end(), data->data);
    umockdev_ioctl_client_complete(client_I, error == 0 ? static_cast<glong>(length) : -1, error);
    umockdev_ioctl_data_unref(data);
    return TRUE;
  }

  // A control URB is finished at once and waits to be reaped; libusb sends
  // one at a time.
  gboolean Submit(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    UMockdevIoctlData* urbData =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(usbdevfs_urb), nullptr);
    auto* urb = reinterpret_cast<usbdevfs_urb*>(urbData->data);
    UMockdevIoctlData* buffer = umockdev_ioctl_data_resolve(
        urbData, offsetof(usbdevfs_urb, buffer), static_cast<gsize>(urb->buffer_length), nullptr);
    Bytes request(buffer->data, buffer->data + urb->buffer_length);
    seen.push_back(request);
    const int error = answer(request);
    const bool in = (request[0] & 0x80) != 0;
    if (error == 0 && in) std::copy(request.begin() + 8, request.end(), buffer->data + 8);
    urb->status = -error;
    urb->actual_length = error != 0 ? 0 : static_cast<int>(request.size() - 8);
    mFinished = urbData;
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(buffer);
    return TRUE;
  }

  gboolean Reap(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    if (mFinished == nullptr) {
      umockdev_ioctl_client_complete(client_I, -1, EAGAIN);
      return TRUE;
    }
    UMockdevIoctlData* pointer =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(gpointer), nullptr);
    umockdev_ioctl_data_set_ptr(pointer, 0, mFinished);
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(pointer);
    umockdev_ioctl_data_unref(mFinished);
    mFinished = nullptr;
    return TRUE;
  }

  CEmulatedUsbBus& mBus;
  std::string mNode;
  bool mUsbfs;
  UMockdevIoctlBase* mHandler = umockdev_ioctl_base_new();
  UMockdevIoctlData* mFinished = nullptr;
};

class Umockdev : public CLinuxDeviceRegistryTest {};

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
  // Left out: a descriptor that cannot be read.
  mBus->AddHidInterface(tablet, 1, 3, {});
  // Not on USB: its HID bus type (I2C) and sequence number (5) place it.
  mBus->AddNonUsbHidInterface(4, kVendorOnly);

  // The hub's ids go with the device behind it; a root port gives none.
  CLinuxDeviceRegistry registry;
  Texts expected{"7A5D:374 @1200000 2/D /dev/hidraw0 v102 under 0:0",
                 "7A5D:374 @1200000 1/FF00 /dev/hidraw0 v102 under 0:0",
                 "7A5D:3A0 @1430000 2/FF0D /dev/hidraw1 v215 under 5E3:610",
                 "7A5D:1 @180005 1/FF00 /dev/hidraw4 v0 under 0:0"};
  EXPECT_EQ(TextsOf(registry.ListHidInterfaces(kVendor)), expected);
  // Vendor 0 lists every vendor.
  expected.insert(expected.begin() + 3, "1234:1 @1500000 1/FF00 /dev/hidraw2 v1 under 0:0");
  EXPECT_EQ(TextsOf(registry.ListHidInterfaces(0)), expected);
  EXPECT_TRUE(registry.ListHidInterfaces(0x4321).empty());
}

TEST_F(CLinuxDeviceRegistryTest, ListsUsbDevicesAndTheHubsTheyHangBehind) {
  const std::string hub = mBus->AddUsbDevice(mRootHub, 1, "1", kVendor, 0xF9, 0x0100);
  mBus->AddUsbDevice(hub, 1, "1.2", kVendor, 0xFA, 0x0310);
  mBus->AddUsbDevice(mRootHub, 1, "2", kVendor, 0xFA, 0x0310);
  mBus->AddUsbDevice(mRootHub, 1, "3", kOtherVendor, 0x5, 0x0001);

  // What the 0xFA product is judged by: the hub above it, none on a root port.
  CLinuxDeviceRegistry registry;
  std::vector<std::tuple<uint32_t, uint32_t, uint16_t, uint32_t, uint32_t>> ours;
  for (const SUsbEntry& entry : registry.ListUsbDevices(kVendor)) {
    ours.emplace_back(entry.productId, entry.locationId, entry.version, entry.parentUsbVendorId,
                      entry.parentUsbProductId);
  }
  EXPECT_EQ(ours, (decltype(ours){{0xF9, 0x01100000, 0x0100, 0, 0},
                                  {0xFA, 0x01120000, 0x0310, kVendor, 0xF9},
                                  {0xFA, 0x01200000, 0x0310, 0, 0}}));
  // The root hub and the other vendor's device are there under vendor 0.
  EXPECT_EQ(registry.ListUsbDevices(0).size(), 5u);
}

TEST_F(CLinuxDeviceRegistryTest, WatchFollowsADeviceThatReenumeratesUnderAnotherProductId) {
  const std::string normal = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x374, 0x0102);
  const auto normalNode = mBus->AddHidInterface(normal, 0, 0, kPenAndVendor);

  // The watch runs on a thread of its own, as on the device thread.
  CLinuxDeviceRegistry registry;
  ASSERT_TRUE(registry.OpenWatch());
  CRecordingWatcher watcher;
  std::thread thread([&] { registry.RunWatch(watcher); });

  // Present before the watch opened, its removal still says who it was.
  // Then back at the same place as another product on the same node name,
  // and out again under its own id.
  mBus->Unplug(normalNode);
  const std::string loader = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x94, 0x0001);
  const auto loaderNode = mBus->AddHidInterface(loader, 0, 0, kVendorOnly);
  // Read before it goes: a node unplugged before its arrival is read shows
  // no usage, as with real hardware that vanishes that fast.
  watcher.WaitFor(3);
  mBus->Unplug(loaderNode);
  const std::string back = mBus->AddUsbDevice(mRootHub, 1, "3", kVendor, 0x374, 0x0103);
  mBus->AddHidInterface(back, 0, 0, kPenAndVendor);

  using SEvent = CRecordingWatcher::SEvent;
  // One event per top-level pair: the pen's vendor collection, behind its
  // digitizer one, is seen as well.
  const DeviceInfo pen{kVendor, 0x374, 0x01300000, 0x02, 0x0D};
  const DeviceInfo penVendor{kVendor, 0x374, 0x01300000, 0x01, 0xFF00};
  const DeviceInfo loaderInfo{kVendor, 0x94, 0x01300000, 0x01, 0xFF00};
  EXPECT_EQ(watcher.WaitFor(6), (std::vector<SEvent>{{false, pen},
                                                     {false, penVendor},
                                                     {true, loaderInfo},
                                                     {false, loaderInfo},
                                                     {true, pen},
                                                     {true, penVendor}}));
  registry.StopWatching();
  thread.join();  // hangs here if the watch's poll is not woken
}

TEST_F(CLinuxDeviceRegistryTest, StopEndsAWatchNotYetStarted) {
  CLinuxDeviceRegistry registry;
  ASSERT_TRUE(registry.OpenWatch());
  registry.StopWatching();
  CRecordingWatcher watcher;
  const std::string device = mBus->AddUsbDevice(mRootHub, 1, "6", kVendor, 0x300, 0x0100);
  mBus->AddHidInterface(device, 0, 0, kVendorOnly);
  registry.RunWatch(watcher);  // returns at once, delivering nothing
  EXPECT_TRUE(watcher.WaitFor(0).empty());
  // A watch that was never opened has nothing to run.
  CLinuxDeviceRegistry().RunWatch(watcher);
}

TEST_F(Umockdev, HidrawNodesAreFoundLockedAndSpokenToThroughIoctls) {
  const std::string usb = mBus->AddUsbDevice(mRootHub, 1, "2", 0x7A71, 0x0301, 0x0120);
  mBus->AddHidInterface(usb, 0, 0, {0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01, 0xC0});
  CIoctlNode ioctls(*mBus, "/dev/hidraw0", false);
  const DeviceInfo pen{0x7A71, 0x0301, 0x01200000, 0x0002, 0x000D};
  DeviceInfo elsewhere = pen;
  elsewhere.locationId = 0x01300000;

  CLinuxHidNode hid;
  ASSERT_EQ(hid.Open(pen), EHidStatus::eSuccess);
  EXPECT_EQ(hid.GetReleaseNumber(), 0x0120);
  CLinuxHidNode second;
  EXPECT_EQ(second.Open(pen), EHidStatus::eBusy) << "held by the first";
  EXPECT_EQ(second.Open(elsewhere), EHidStatus::eGone);

  EXPECT_EQ(hid.SetFeatureReport({0x02, 0x00}), EHidStatus::eSuccess);
  ioctls.answer = [](Bytes& report_IO) {
    report_IO = {0x14, 1, 2, 3, 4};
    return 0;
  };
  Bytes read{0x14, 0, 0, 0, 0};
  EXPECT_EQ(hid.GetFeatureReport(read), EHidStatus::eSuccess);
  EXPECT_EQ(read, (Bytes{0x14, 1, 2, 3, 4}));
  EXPECT_EQ(ioctls.seen, (std::vector<Bytes>{{0x02, 0x00}, {0x14, 0, 0, 0, 0}}));

  // Any other error, such as the EIO a uhid device gives, is no stall.
  const std::pair<int, EHidStatus> errors[] = {{EPIPE, EHidStatus::eStall},
                                               {EBUSY, EHidStatus::eBusy},
                                               {ENODEV, EHidStatus::eGone},
                                               {EIO, EHidStatus::eOther}};
  for (const auto& [error, status] : errors) {
    ioctls.answer = [error](Bytes&) { return error; };
    EXPECT_EQ(hid.SetFeatureReport({0x55, 1}), status) << error;
    EXPECT_EQ(hid.GetFeatureReport(read), status) << error;
  }
  hid.Close();
  EXPECT_EQ(second.Open(pen), EHidStatus::eSuccess) << "closing lets go";
}

TEST_F(Umockdev, ControlTransfersGoThroughLibusbToTheVendorInterface) {
  const auto addDevice = [&](const char* devpath_I, unsigned devnum_I, uint16_t product_I,
                             uint8_t class_I) {
    return mBus->AddUsbfsDevice(mRootHub, devpath_I, devnum_I, 0x7A71, product_I, 0x0210,
                                CEmulatedUsbBus::Configuration(class_I));
  };
  CIoctlNode ioctls(*mBus, addDevice("3", 2, 0x0311, 0xFF), true);
  CIoctlNode hidOnlyIoctls(*mBus, addDevice("4", 3, 0x0312, 0x03), true);
  ioctls.answer = [](Bytes& request_IO) {
    if (request_IO[1] == 0x77) return EPIPE;
    if (request_IO[0] & 0x80) {
      request_IO.resize(8);  // two bytes back, whatever was asked for
      request_IO.resize(10, 0x5A);
    }
    return 0;
  };

  CLinuxUsbControl usb;
  EXPECT_EQ(usb.Open({0x7A71, 0x0311, 0x01400000, 0, 0}), EUsbStatus::eGone);
  ASSERT_EQ(usb.Open({0x7A71, 0x0311, 0x01300000, 0, 0}), EUsbStatus::eSuccess);
  EXPECT_EQ(usb.GetReleaseNumber(), 0x0210);
  ASSERT_EQ(usb.ClaimVendorInterface(), EUsbStatus::eSuccess);

  Bytes data(4, 0);
  size_t transferred = 9;
  ASSERT_EQ(usb.ControlTransfer(0xC1, 0x01, 0x0203, 0x0405, data, transferred),
            EUsbStatus::eSuccess);
  EXPECT_EQ(transferred, 2u);
  EXPECT_EQ(data, (Bytes{0x5A, 0x5A, 0, 0}));
  EXPECT_EQ(ioctls.seen.back(),
            (Bytes{0xC1, 0x01, 0x03, 0x02, 0x05, 0x04, 0x04, 0x00, 0, 0, 0, 0}));
  data = {0xAA};
  EXPECT_EQ(usb.ControlTransfer(0x41, 0xF5, 0xFFFF, 0, data, transferred), EUsbStatus::eSuccess);
  EXPECT_EQ(transferred, 1u);
  EXPECT_EQ(ioctls.seen.back(), (Bytes{0x41, 0xF5, 0xFF, 0xFF, 0, 0, 1, 0, 0xAA}));
  EXPECT_EQ(usb.ControlTransfer(0x41, 0x77, 0, 0, data, transferred), EUsbStatus::eStall);

  // A device with only a HID interface has nothing to claim.
  CLinuxUsbControl hidOnly;
  ASSERT_EQ(hidOnly.Open({0x7A71, 0x0312, 0x01400000, 0, 0}), EUsbStatus::eSuccess);
  EXPECT_EQ(hidOnly.ClaimVendorInterface(), EUsbStatus::eOther);
}
