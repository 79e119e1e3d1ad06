// Discovery's rules over a registry that lists exactly what a test puts in
// it: the search criteria, the roles, the parent test and reconciliation.

#include <gtest/gtest.h>

#include "devices/IOUtils.h"
#include "firmware/FirmwareFiles.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "platform/linux/CListedRegistry.h"

namespace {

using DevicePtr = std::shared_ptr<CDevice>;

// Bus 1, hub on root port 1, board on hub port `port_I`.
uint32_t BehindHub(unsigned port_I) { return 0x01100000u | (port_I << 16); }

class DiscoveryRules : public ::testing::Test {
 protected:
  std::vector<DevicePtr> Scan(const std::string& config_I) {
    mDiscovery.SetConfig(mFolder.Write("fw_loader.ini", config_I));
    EXPECT_TRUE(mDiscovery.GenerateDeviceList());
    const CDeviceList list = mDiscovery.GetDeviceList();
    std::vector<DevicePtr> devices;
    for (size_t i = 0; i < list.GetDeviceCount(); ++i) devices.push_back(list.GetDevice(i));
    return devices;
  }

  CTempFolder mFolder;
  std::shared_ptr<CListedRegistry> mRegistry = std::make_shared<CListedRegistry>();
  CLinuxDiscovery mDiscovery{mRegistry, nullptr, nullptr};
};

std::shared_ptr<CFLDeviceInterface> Hid(const DeviceInfo& info_I) {
  return std::make_shared<CLinuxHIDFLDeviceInterface>(info_I, nullptr);
}

}  // namespace

TEST_F(DiscoveryRules, NoProductIsListedWithoutAnEntryOrAnyEntries) {
  mRegistry->AddHid({0x7A5D, 0x100, BehindHub(1), 1, 0xFF00});
  // The configured product under another vendor, and under another usage.
  mRegistry->AddHid({0x7A71, 0x200, BehindHub(2), 1, 0xFF00});
  mRegistry->AddHid({0x7A5D, 0x200, BehindHub(3), 2, 0xFF00});
  // An empty table has no row to read a criterion from.
  EXPECT_TRUE(Scan("[]").empty());
  EXPECT_TRUE(Scan(R"([{"name": "Other", "penBoard": {"pid": "200", "usageId": "1",
                                                       "usagePg": "FF00"}}])")
                  .empty());
  EXPECT_EQ(mDiscovery.GetBestDevice(), nullptr);
}

TEST_F(DiscoveryRules, TheGuardedProductCountsOnlyBehindItsOwnHub) {
  const char* config = R"([{"name": "Guarded", "penBoard": {"pid": "FA", "usageId": "1",
                                                             "usagePg": "FF00"}}])";
  mRegistry->AddHid({0x7A5D, 0xFA, BehindHub(1), 1, 0xFF00}, 0x7A5D, 0xF8);
  mRegistry->AddHid({0x7A5D, 0xFA, 0x01200000, 1, 0xFF00});
  EXPECT_TRUE(Scan(config).empty());

  mRegistry->AddHid({0x7A5D, 0xFA, 0x01310000, 1, 0xFF00}, 0x7A5D, 0xF9);
  const std::vector<DevicePtr> devices = Scan(config);
  ASSERT_EQ(devices.size(), 1u);
  EXPECT_EQ(devices[0]->GetPenInterface()->GetPath(), "31325:250:19988480:1:65280");
}

TEST_F(DiscoveryRules, APenOfAnotherUsageIsNoPenUnlessItsEntryIsALoader) {
  // The second product's pen has no usage, so its criterion finds every
  // HID interface of the vendor and the role tests alone decide.
  const char* config = R"([
    {"name": "Slate", "penBoard": {"pid": "100", "usageId": "1", "usagePg": "FF00"}},
    {"name": "Any", "penBoard": {"pid": "200"}},
    {"name": "Slate loader", "loaderBoard": {"pid": "101", "usageId": "1", "usagePg": "FF00"}}
  ])";
  mRegistry->AddHid({0x7A5D, 0x100, BehindHub(1), 2, 0xFF00});
  mRegistry->AddHid({0x7A5D, 0x101, BehindHub(2), 7, 0xFF07});
  const std::vector<DevicePtr> devices = Scan(config);
  ASSERT_EQ(devices.size(), 2u) << "the loader, and the same loader kept again";
  for (const DevicePtr& device : devices) {
    EXPECT_EQ(device->GetDeviceName(), "Slate loader");
    EXPECT_TRUE(device->GetIsFlashLoader());
    EXPECT_EQ(device->GetPenInterface()->GetPath(), "31325:257:17956864:7:65287");
  }
}

TEST_F(DiscoveryRules, ALoaderJoinsEveryProductThatLacksItsBluetoothModule) {
  const char* config = R"([
    {"name": "A", "penBoard": {"pid": "100", "usageId": "1", "usagePg": "FF00"},
     "bluetoothBoard": {"pid": "110", "usageId": "1", "usagePg": "FF00"}},
    {"name": "B", "penBoard": {"pid": "200", "usageId": "1", "usagePg": "FF00"},
     "bluetoothBoard": {"pid": "210", "usageId": "1", "usagePg": "FF00"}},
    {"name": "L", "loaderBoard": {"pid": "300", "usageId": "1", "usagePg": "FF00"}}
  ])";
  mRegistry->AddHid({0x7A5D, 0x100, 0x01100000, 1, 0xFF00});
  mRegistry->AddHid({0x7A5D, 0x200, 0x01200000, 1, 0xFF00});
  mRegistry->AddHid({0x7A5D, 0x300, 0x01300000, 1, 0xFF00});
  const std::vector<DevicePtr> devices = Scan(config);
  ASSERT_EQ(devices.size(), 3u);
  const auto loader = devices[2]->GetPenInterface();
  ASSERT_NE(loader, nullptr);
  // No parent test for the Bluetooth module: both products take it.
  EXPECT_EQ(devices[0]->GetBluetoothInterface(), loader);
  EXPECT_EQ(devices[1]->GetBluetoothInterface(), loader);
  EXPECT_TRUE(devices[0]->GetIsFlashLoader());
  EXPECT_TRUE(devices[1]->GetIsFlashLoader());
  EXPECT_EQ(mDiscovery.GetBestDevice(), devices[0]);
}

TEST_F(DiscoveryRules, BoardsWithoutTheirPenAreListedAsTheirRulesSay) {
  const char* config = R"([{"name": "Display", "penBoard": {"pid": "100", "usageId": "1",
                                                             "usagePg": "FF00", "topology": 2},
     "bluetoothBoard": {"pid": "110", "usageId": "1", "usagePg": "FF00", "topology": 2},
     "scalarBoard": {"vid": "7A5D", "pid": "120", "interface": "HID", "usageId": "1",
                     "usagePg": "FF00", "topology": 2}}])";
  mRegistry->AddHid({0x7A5D, 0x110, BehindHub(2), 1, 0xFF00});
  mRegistry->AddHid({0x7A5D, 0x120, BehindHub(3), 1, 0xFF00});
  const std::vector<DevicePtr> devices = Scan(config);
  ASSERT_EQ(devices.size(), 2u);
  // A Bluetooth module with no pen gets a device that holds it.
  EXPECT_EQ(devices[0]->GetBluetoothInterface()->GetPath(), "31325:272:17956864:1:65280");
  EXPECT_EQ(devices[0]->GetPenInterface(), nullptr);
  EXPECT_EQ(devices[0]->ToString(), "");
  // A scalar with no pen gets a device without it.
  EXPECT_EQ(devices[1]->GetDeviceName(), "Display");
  EXPECT_EQ(devices[1]->GetScalarInterface(), nullptr);
}

TEST_F(DiscoveryRules, ParentsMatchAtTheTopologyOfEachBoard) {
  auto device = std::make_shared<CDevice>();
  device->SetPenTopology(2);
  device->SetTouchTopology(2);
  device->SetBluetoothTopology(1);
  device->SetScalarTopology(3);
  const auto pen = Hid({0x7A5D, 0x100, BehindHub(1), 1, 0xFF00});
  const auto sibling = Hid({0x7A5D, 0x110, BehindHub(2), 1, 0xFF00});
  const auto elsewhere = Hid({0x7A5D, 0x110, 0x01210000, 1, 0xFF00});

  EXPECT_TRUE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_TOUCH));
  EXPECT_TRUE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_UNKNOWN));
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, pen, elsewhere, EUPDATE_TOUCH));
  // The module's own device is not the hub.
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_BLUETOOTH));
  // Three levels up from the scalar is the bus, not the hub.
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_SCALAR_HID));
  device->SetScalarTopology(2);
  EXPECT_TRUE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_SCALAR_FTDI));
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, pen, sibling, EUPDATE_PEN));
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, pen, nullptr, EUPDATE_TOUCH));
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(nullptr, pen, sibling, EUPDATE_TOUCH));
  // Without a location nothing is known of the product.
  const auto nowhere = Hid({0x7A5D, 0x100, 0, 1, 0xFF00});
  EXPECT_FALSE(CLinuxDiscovery::DoParentsMatch(device, nowhere, nowhere, EUPDATE_TOUCH));

  EXPECT_EQ(IOUtils::AncestorLocationId(0x01234000, 0), 0x01234000u);
  EXPECT_EQ(IOUtils::AncestorLocationId(0x01234000, 1), 0x01230000u);
  EXPECT_EQ(IOUtils::AncestorLocationId(0x01234000, 9), 0x01000000u);
}

TEST_F(DiscoveryRules, TheUsbPassKeepsTheGuardAndTakesLoadersOnlyOnTheirOwnTransport) {
  // The guarded product behind another hub, on a root port, and behind its own.
  mRegistry->usb = {SUsbEntry{0x7A5D, 0xFA, BehindHub(1), 0, 0x7A5D, 0xF8},
                    SUsbEntry{0x7A5D, 0xFA, 0x01200000, 0, 0, 0},
                    SUsbEntry{0x7A5D, 0xFA, 0x01310000, 0, 0x7A5D, 0xF9}};
  const std::vector<DeviceInfo> found = IOUtils::FindUsbDevices(*mRegistry, 0x7A5D);
  ASSERT_EQ(found.size(), 1u);
  EXPECT_EQ(found[0].locationId, 0x01310000u);

  // A HID loader is a USB device too; tried as a vendor-class interface it
  // must not come back as a second loader product.
  mRegistry->usb = {SUsbEntry{0x7A5D, 0x302, BehindHub(1), 0, 0, 0},
                    SUsbEntry{0x7A5D, 0x311, BehindHub(2), 0, 0, 0}};
  mRegistry->AddHid({0x7A5D, 0x302, BehindHub(1), 1, 0xFF00});
  const std::vector<DevicePtr> devices = Scan(R"([{"name": "Tablet",
      "penBoard": {"pid": "301", "usageId": "1", "usagePg": "FF00", "topology": 2},
      "touchBoard": {"pid": "311", "interface": "BULK", "topology": 2},
      "loaderBoard": {"pid": "302", "usageId": "1", "usagePg": "FF00", "topology": 2}}])");
  ASSERT_FALSE(devices.empty());
  ASSERT_NE(devices[0]->GetTouchInterface(), nullptr);
  for (const DevicePtr& device : devices) {
    ASSERT_NE(device->GetPenInterface(), nullptr);
    EXPECT_EQ(device->GetPenInterface()->GetInterfaceType(), EHID_INTERFACE);
    if (device->GetTouchInterface()) {
      EXPECT_EQ(device->GetTouchInterface()->GetPath(), "31325:785:17956864:0:0")
          << "the loader taken for a touch board";
    }
  }
}
