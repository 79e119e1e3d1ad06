#include <gtest/gtest.h>

#include <stdexcept>

#include "devices/CDeviceList.h"
#include "devices/CFakeInterface.h"
#include "support/LogCapture.h"

namespace {

std::shared_ptr<CDevice> MakeDevice(const std::string& name_I, uint32_t penProduct_I) {
  auto device = std::make_shared<CDevice>();
  device->SetDeviceName(name_I);
  device->SetPenVendorId(0x7A5D);
  device->SetPenProductId(penProduct_I);
  return device;
}

// GetDevice(path) logs its comparisons; keep them out of the test output.
std::shared_ptr<CDevice> FindQuietly(const CDeviceList& list_I, const std::string& path_I) {
  LogCapture capture;
  return list_I.GetDevice(path_I);
}

}  // namespace

TEST(CDeviceListTest, BestDeviceIsTheFirstLoaderElseTheFirst) {
  CDeviceList list;
  EXPECT_EQ(list.GetBestDevice(), nullptr);
  EXPECT_EQ(list.GetDevice(0u), nullptr);
  auto first = MakeDevice("a", 1);
  auto second = MakeDevice("b", 2);
  auto third = MakeDevice("c", 3);
  for (const auto& device : {first, second, third}) list.AddDevice(device);
  EXPECT_EQ(list.GetBestDevice(), first);
  third->SetIsFlashLoader(true);
  EXPECT_EQ(list.GetBestDevice(), third);
  second->SetIsFlashLoader(true);
  EXPECT_EQ(list.GetBestDevice(), second);
  EXPECT_EQ(list.GetDevice(2u), third);
  EXPECT_EQ(list.GetDevice(3u), nullptr);
  list.ClearDeviceList();
  EXPECT_EQ(list.GetBestDevice(), nullptr);
}

TEST(CDeviceListTest, FindsByTheWholePairOfOneBoard) {
  auto device = MakeDevice("a", 0x300);
  device->SetTouchVendorId(0x7A5D);
  device->SetTouchProductId(0x301);
  device->SetBluetoothVendorId(0x1111);
  device->SetBluetoothProductId(0x302);
  device->SetScalarVendorId(0x5B27);
  device->SetScalarProductId(4192);
  CDeviceList list;
  list.AddDevice(MakeDevice("other", 0x200));
  list.AddDevice(device);

  EXPECT_EQ(list.GetDevice(0x7A5D, 0x301), device);
  EXPECT_EQ(list.GetDevice(0x1111, 0x302), device);
  EXPECT_EQ(list.GetDevice(0x5B27, 4192), device);
  // A vendor of one board with the product of another is no match.
  EXPECT_EQ(list.GetDevice(0x7A5D, 0x302), nullptr);
  EXPECT_EQ(list.GetDevice(0x1111, 0x300), nullptr);
  // Boards left out hold 0 and 0, and so match that pair.
  EXPECT_EQ(list.GetDevice(0, 0), list.GetDevice(0u));
}

TEST(CDeviceListTest, FindsByTheInterfacePathOfAnyBoard) {
  auto device = MakeDevice("a", 0x300);
  device->SetPenInterface(CFakeInterface::Make("31325:768:19922944:2:13"));
  device->SetTouchInterface(CFakeInterface::Make("31325:769:19922944:1:65280"));
  device->SetBluetoothInterface(CFakeInterface::Make("31325:770:19922944:1:65281"));
  CDeviceList list;
  list.AddDevice(MakeDevice("no interface", 2));
  list.AddDevice(device);
  for (const char* path :
       {"31325:768:19922944:2:13", "31325:769:19922944:1:65280", "31325:770:19922944:1:65281"}) {
    EXPECT_EQ(FindQuietly(list, path), device) << path;
  }
  EXPECT_EQ(FindQuietly(list, "31325:768:19922944:2:14"), nullptr);
}

TEST(CDeviceListTest, FindsAScalarByVendorAndProductWith4192And4195Interchangeable) {
  auto display = MakeDevice("display", 0x300);
  display->SetScalarSupported(true);
  display->SetScalarVendorId(0x5B27);
  display->SetScalarProductId(4192);
  CDeviceList list;
  list.AddDevice(display);

  const std::string vendor = std::to_string(0x5B27);
  const struct {
    uint32_t scalarProduct;
    std::string path;
    bool found;
  } cases[] = {
      {4192, vendor + ":4192:0:10:65280", true},
      {4192, vendor + ":4195", true},
      {4192, vendor + ":4196", false},
      {4192, "1:4192", false},
      {4195, vendor + ":4192", true},
      {4195, vendor, false},  // fewer than two numbers cannot name a scalar
  };
  for (const auto& entry : cases) {
    SCOPED_TRACE(entry.path);
    display->SetScalarProductId(entry.scalarProduct);
    EXPECT_EQ(FindQuietly(list, entry.path), entry.found ? display : nullptr);
  }

  // A path that is not numbers reaches the caller as the conversion's error,
  // unless no device has a scalar to convert it for.
  EXPECT_THROW(FindQuietly(list, "pen:x"), std::invalid_argument);
  display->SetScalarSupported(false);
  EXPECT_EQ(FindQuietly(list, "pen:x"), nullptr);
}
