#include <gtest/gtest.h>

#include "devices/CDevice.h"
#include "devices/CFakeInterface.h"

TEST(CDeviceTest, StartsFromTheDefaultsAndTakesTheProtocolFromThePenAlone) {
  CDevice device;
  EXPECT_FALSE(device.IsValid());
  EXPECT_EQ(device.GetPenVendorId(), 0u);
  EXPECT_EQ(device.GetTouchInterfaceType(), EINVALID_INTERFACE);
  EXPECT_EQ(device.GetBluetoothTopology(), 1);
  EXPECT_EQ(device.GetScalarFlashSectors(), 0u);
  EXPECT_FALSE(device.GetTouchSupported());
  EXPECT_FALSE(device.GetIsFlashLoader());
  EXPECT_FALSE(device.GetIsQuantaScalarBoard());
  EXPECT_EQ(device.GetPenInterface(), nullptr);
  EXPECT_TRUE(device.getPenIntoBLMode());
  EXPECT_TRUE(device.CanGoIntoBootloaderMode());
  EXPECT_EQ(device.GetProtocolType(), EFL_PROTOCOL_LOADER);

  // Only the pen's flag counts.
  device.SetTouchIntoBLMode(false);
  device.SetBluetoothIntoBLMode(false);
  device.SetScalarIntoBLMode(false);
  EXPECT_TRUE(device.CanGoIntoBootloaderMode());
  EXPECT_EQ(device.GetProtocolType(), EFL_PROTOCOL_LOADER);
  device.SetPenIntoBLMode(false);
  device.SetTouchIntoBLMode(true);
  EXPECT_FALSE(device.CanGoIntoBootloaderMode());
  EXPECT_EQ(device.GetProtocolType(), EFL_PROTOCOL_NON_BL);

  device.SetDeviceName("tablet");
  EXPECT_TRUE(device.IsValid());
}

TEST(CDeviceTest, AssignmentKeepsTheTargetsScalarSectorsAndScalarIntoBootloaderFlag) {
  auto pen = CFakeInterface::Make("1:2:3:4:5");
  CDevice source;
  source.SetDeviceName("display");
  source.SetPenProductId(0x300);
  source.SetPenInterface(pen);
  source.SetTouchFlashSectors(7);
  source.SetScalarProductId(4192);
  source.SetScalarFlashSectors(64);
  source.SetScalarIntoBLMode(false);
  source.SetScalarSupported(true);
  source.SetIsFlashLoader(true);
  source.SetIsQisdaVenusScalarBoard(true);

  CDevice target;
  target.SetScalarFlashSectors(9);
  target = source;
  EXPECT_EQ(target.GetDeviceName(), "display");
  EXPECT_EQ(target.GetPenProductId(), 0x300u);
  EXPECT_EQ(target.GetPenInterface(), pen);  // shared, not copied
  EXPECT_EQ(target.GetTouchFlashSectors(), 7u);
  EXPECT_EQ(target.GetScalarProductId(), 4192u);
  EXPECT_TRUE(target.GetScalarSupported());
  EXPECT_TRUE(target.GetIsFlashLoader());
  EXPECT_TRUE(target.GetIsQisdaVenusScalarBoard());
  EXPECT_EQ(target.GetScalarFlashSectors(), 9u);

  // A copy starts from the defaults, so the source's scalar sectors never
  // reach it.
  CDevice copy(source);
  EXPECT_EQ(copy.GetScalarFlashSectors(), 0u);
  EXPECT_EQ(copy.GetScalarProductId(), 4192u);
  EXPECT_EQ(copy.GetPenInterface(), pen);
}

TEST(CDeviceTest, CloseDropsNameAndInterfacesButTheScalars) {
  CDevice device;
  device.SetDeviceName("display");
  device.SetPenInterface(CFakeInterface::Make("p"));
  device.SetTouchInterface(CFakeInterface::Make("t"));
  device.SetBluetoothInterface(CFakeInterface::Make("b"));
  auto scalar = CFakeInterface::Make("s", EFTDI_INTERFACE);
  device.SetScalarInterface(scalar);
  device.Close();
  EXPECT_FALSE(device.IsValid());
  EXPECT_EQ(device.GetPenInterface(), nullptr);
  EXPECT_EQ(device.GetTouchInterface(), nullptr);
  EXPECT_EQ(device.GetBluetoothInterface(), nullptr);
  EXPECT_EQ(device.GetScalarInterface(), scalar);
}

TEST(CDeviceTest, ToStringDescribesPenTouchAndBluetoothOnlyWithAPenInterface) {
  CDevice device;
  device.SetDeviceName("tablet");
  device.SetTouchSupported(true);
  device.SetTouchInterface(CFakeInterface::Make("touch"));
  device.SetBluetoothInterface(CFakeInterface::Make("bt"));
  EXPECT_EQ(device.ToString(), "");

  device.SetTouchInterface(nullptr);
  device.SetBluetoothInterface(nullptr);
  auto pen = CFakeInterface::Make("pen");
  pen->SetIsFlashLoader(true);
  device.SetPenInterface(pen);
  device.SetPenFlashSectors(120);
  device.SetPenUsageId(2);
  device.SetPenUsagePage(0xFF0D);
  device.SetPenInitEEPROM(true);
  device.SetIsFlashLoader(true);
  device.SetScalarSupported(true);
  EXPECT_EQ(device.ToString(),
            "[tablet] (LOADER MODE)\n"
            "LOADER INTERFACE:\n"
            "\tSectors = 120\n"
            "\tUsageId (Non-HidRouter) = 2\n"
            "\tUsagePage (Non-HidRouter) = 65293\n"
            "\tInit Eeprom = YES\n"
            "\t<pen>\n"
            "TOUCH INTERFACE NOT FOUND\n"
            "BLUETOOTH INTERFACE NOT SUPPORTED\n");

  pen->SetIsFlashLoader(false);
  device.SetIsFlashLoader(false);
  device.SetTouchInterface(CFakeInterface::Make("touch"));
  device.SetTouchFlashSectors(30);
  device.SetTouchUsageId(1);
  device.SetTouchUsagePage(0xFF00);
  device.SetBluetoothSupported(true);
  EXPECT_EQ(device.ToString(),
            "[tablet] (NORMAL MODE)\n"
            "PEN INTERFACE:\n"
            "\tSectors = 120\n"
            "\tUsageId (Non-HidRouter) = 2\n"
            "\tUsagePage (Non-HidRouter) = 65293\n"
            "\tInit Eeprom = YES\n"
            "\t<pen>\n"
            "TOUCH INTERFACE:\n"
            "\tSectors = 30\n"
            "\tUsageId = 1\n"
            "\tUsagePage = 65280\n"
            "\tInit Eeprom = NO\n"
            "\t<touch>\n"
            "BLUETOOTH INTERFACE NOT FOUND\n");
}
