// Discovery against the lab's products and the installed configuration: the
// registry, HID node and USB control seams are the lab's, everything above
// them is what a run on hardware uses.

#include <gtest/gtest.h>

#include <algorithm>

#include "devices/IOUtils.h"
#include "flash/CFLDeviceInterface.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabFTDIBridge.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabProducts.h"
#include "lab/CLabTouchHex.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "support/LabFixture.h"

namespace {

using DevicePtr = std::shared_ptr<CDevice>;
using InterfacePtr = std::shared_ptr<CFLDeviceInterface>;

std::unique_ptr<CLinuxDiscovery> LabDiscovery(const std::shared_ptr<CLabBus>& bus_I) {
  auto discovery = std::make_unique<CLinuxDiscovery>(
      std::make_shared<CLabDeviceRegistry>(bus_I),
      [bus_I] { return std::make_unique<CLabHidNode>(bus_I); },
      [bus_I] { return std::make_unique<CLabUsbControl>(bus_I); });
  discovery->SetConfig(TAV_DATA_DIR "/fw_loader.ini");
  return discovery;
}

std::vector<DevicePtr> Scan(CLinuxDiscovery& discovery_I) {
  EXPECT_TRUE(discovery_I.GenerateDeviceList());
  const CDeviceList list = discovery_I.GetDeviceList();
  std::vector<DevicePtr> devices;
  for (size_t i = 0; i < list.GetDeviceCount(); ++i) devices.push_back(list.GetDevice(i));
  return devices;
}

// The interface path of a board's `index_I`-th interface as it is now.
std::string PathOf(const CLabBoard& board_I, size_t index_I) {
  DeviceInfo info = board_I.GetInterfaces().at(index_I).info;
  info.locationId = board_I.GetLocationId();
  return IOUtils::DevicePathFromInfo(info);
}

std::string PathOf(const InterfacePtr& interface_I) {
  return interface_I ? interface_I->GetPath() : "none";
}

EINTERFACE_TYPE TypeOf(const InterfacePtr& interface_I) {
  return interface_I ? interface_I->GetInterfaceType() : EINVALID_INTERFACE;
}

class DiscoveryOverLab : public LabFixture {};

}  // namespace

TEST_F(DiscoveryOverLab, ProductsSideBySideAreOneDeviceEachWithTheirOwnBoardsInTheirRoles) {
  struct SExpected {
    const char* name;
    EINTERFACE_TYPE pen;
    size_t penIndex;  // which of the pen board's interfaces is the update interface
    EINTERFACE_TYPE touch;
    EINTERFACE_TYPE bluetooth;
    EINTERFACE_TYPE scalar;
    bool intoLoader;
  };
  const SExpected expected[] = {
      {"classic-tablet", EHID_INTERFACE, 1, EBULK_INTERFACE, EINVALID_INTERFACE, EINVALID_INTERFACE,
       true},
      {"wireless-tablet", EHID_INTERFACE, 1, EHID_INTERFACE, EHID_INTERFACE, EINVALID_INTERFACE,
       false},
      {"wireless-tablet-1122", EHID_INTERFACE, 1, EINVALID_INTERFACE, EHID_INTERFACE,
       EINVALID_INTERFACE, false},
      {"display-hid", EHID_INTERFACE, 1, EHID_INTERFACE, EINVALID_INTERFACE, EHID_INTERFACE, false},
      {"display-ftdi", EHID_INTERFACE, 1, EINVALID_INTERFACE, EINVALID_INTERFACE,
       EINVALID_INTERFACE, true},
      {"display-ftdi-quanta", EHID_INTERFACE, 1, EINVALID_INTERFACE, EINVALID_INTERFACE,
       EINVALID_INTERFACE, true},
      {"display-ftdi-venus", EHID_INTERFACE, 1, EINVALID_INTERFACE, EINVALID_INTERFACE,
       EINVALID_INTERFACE, true},
      {"tunnel-tablet", EI2C_INTERFACE, 0, EINVALID_INTERFACE, EINVALID_INTERFACE,
       EINVALID_INTERFACE, true},
  };
  ASSERT_EQ(CLabProducts::All().size(), std::size(expected));

  // All side by side, each behind a hub of its own.
  std::vector<std::vector<std::shared_ptr<CLabBoard>>> boards;
  for (unsigned i = 0; i < std::size(expected); ++i) {
    boards.push_back(CLabProducts::Plug(*mBus, expected[i].name, i + 1));
  }
  auto discovery = LabDiscovery(mBus);
  const std::vector<DevicePtr> devices = Scan(*discovery);
  ASSERT_EQ(devices.size(), std::size(expected));
  EXPECT_EQ(discovery->GetBestDevice(), devices[0]) << "none is in its loader";
  for (size_t k = 0; k < std::size(expected); ++k) {
    const SExpected& product = expected[k];
    SCOPED_TRACE(product.name);
    const std::string penPath = PathOf(*boards[k][0], product.penIndex);
    const DevicePtr device = discovery->FindDevice(penPath);
    ASSERT_NE(device, nullptr);
    EXPECT_FALSE(device->GetIsFlashLoader());
    EXPECT_EQ(device->CanGoIntoBootloaderMode(), product.intoLoader);
    EXPECT_EQ(TypeOf(device->GetPenInterface()), product.pen);
    EXPECT_EQ(PathOf(device->GetPenInterface()), penPath);
    EXPECT_EQ(TypeOf(device->GetTouchInterface()), product.touch);
    EXPECT_EQ(TypeOf(device->GetBluetoothInterface()), product.bluetooth);
    EXPECT_EQ(TypeOf(device->GetScalarInterface()), product.scalar);
    // Each attached board is one of this product's boards.
    size_t attached = 0;
    for (const InterfacePtr& interface :
         {device->GetPenInterface(), device->GetTouchInterface(), device->GetBluetoothInterface(),
          device->GetScalarInterface()}) {
      if (!interface) continue;
      ++attached;
      bool ours = false;
      for (const auto& board : boards[k]) {
        for (size_t i = 0; i < board->GetInterfaces().size(); ++i) {
          ours = ours || PathOf(*board, i) == interface->GetPath();
        }
      }
      EXPECT_TRUE(ours) << interface->GetPath();
    }
    // A scalar behind a display's FTDI bridge is not searched by discovery.
    const auto searched = std::count_if(boards[k].begin(), boards[k].end(), [](const auto& board) {
      return dynamic_cast<const CLabFTDIBridge*>(board.get()) == nullptr;
    });
    EXPECT_EQ(attached, static_cast<size_t>(searched));
  }
}

TEST_F(DiscoveryOverLab, ATouchControllerInItsLoaderJoinsThePenOfItsProduct) {
  const auto boards = CLabProducts::Plug(*mBus, "classic-tablet");
  auto discovery = LabDiscovery(mBus);
  std::vector<DevicePtr> devices = Scan(*discovery);
  ASSERT_EQ(devices.size(), 1u);
  ASSERT_NE(devices[0]->GetTouchInterface(), nullptr);
  ASSERT_TRUE(devices[0]->GetTouchInterface()->Open());
  ASSERT_TRUE(devices[0]->GetTouchInterface()->SwitchToBLMode());
  devices[0]->GetTouchInterface()->Close();
  TavSleep(1.0);

  devices = Scan(*discovery);
  const DevicePtr best = discovery->GetBestDevice();
  ASSERT_NE(best, nullptr);
  EXPECT_TRUE(best->GetIsFlashLoader());
  EXPECT_EQ(PathOf(best->GetPenInterface()), PathOf(*boards[0], 1)) << "the pen is as it was";
  EXPECT_EQ(TypeOf(best->GetTouchInterface()), EHID_INTERFACE);
  EXPECT_EQ(PathOf(best->GetTouchInterface()), PathOf(*boards[1], 0));
  EXPECT_TRUE(best->GetTouchInterface()->GetIsFlashLoader());
}

TEST_F(DiscoveryOverLab, ATouchBehindAnotherHubIsAProductWithNoInterface) {
  CLabProducts::Plug(*mBus, "wireless-tablet", 1);
  // A second touch controller of the same kind on a hub of its own.
  mBus->Plug(std::make_shared<CLabTouchHex>("stray-touch",
                                            SLabBoardIds{0x7A5D, 0x0411, 0x0411, {0xFF00, 1}}),
             CLabProducts::HubLocation(2) | (2u << 16));
  auto discovery = LabDiscovery(mBus);
  const std::vector<DevicePtr> devices = Scan(*discovery);
  ASSERT_EQ(devices.size(), 2u);
  EXPECT_NE(devices[0]->GetTouchInterface(), nullptr);
  EXPECT_EQ(devices[1]->GetDeviceName(), "Lab Wireless Tablet");
  EXPECT_EQ(devices[1]->GetPenInterface(), nullptr);
  EXPECT_EQ(devices[1]->GetTouchInterface(), nullptr);
  EXPECT_EQ(devices[1]->ToString(), "");
  EXPECT_EQ(discovery->GetBestDevice(), devices[0]);
}

TEST_F(DiscoveryOverLab, EachScanMakesNewInterfacesWithTheSameContents) {
  CLabProducts::Plug(*mBus, "display-hid");
  auto discovery = LabDiscovery(mBus);
  const std::vector<DevicePtr> first = Scan(*discovery);
  const std::vector<DevicePtr> second = Scan(*discovery);
  ASSERT_EQ(first.size(), 1u);
  ASSERT_EQ(second.size(), 1u);
  EXPECT_NE(first[0]->GetPenInterface(), second[0]->GetPenInterface());
  EXPECT_NE(first[0]->GetScalarInterface(), second[0]->GetScalarInterface());
  EXPECT_EQ(first[0]->ToString(), second[0]->ToString());
  EXPECT_EQ(PathOf(first[0]->GetScalarInterface()), PathOf(second[0]->GetScalarInterface()));
}
