#include <gtest/gtest.h>

#include "devices/CDevice.h"
#include "devices/CFakeInterface.h"

TEST(CDeviceTest, IsValidOnceNamedAndTheProtocolFollowsThePenFlagAlone) {
  CDevice device;
  EXPECT_FALSE(device.IsValid());
  EXPECT_EQ(device.GetTouchInterfaceType(), EINVALID_INTERFACE);
  EXPECT_EQ(device.GetBluetoothTopology(), 1);
  EXPECT_TRUE(device.CanGoIntoBootloaderMode());
  EXPECT_EQ(device.GetProtocolType(), EFL_PROTOCOL_LOADER);

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

TEST(CDeviceTest, CopiesShareInterfacesButKeepTheTargetsScalarSectors) {
  auto pen = CFakeInterface::Make("1:2:3:4:5");
  CDevice source;
  source.SetDeviceName("display");
  source.SetPenInterface(pen);
  source.SetTouchFlashSectors(7);
  source.SetScalarProductId(4192);
  source.SetScalarFlashSectors(64);
  source.SetIsFlashLoader(true);
  source.SetIsQisdaVenusScalarBoard(true);

  CDevice target;
  target.SetScalarFlashSectors(9);
  target = source;
  EXPECT_EQ(target.GetDeviceName(), "display");
  EXPECT_EQ(target.GetPenInterface(), pen);  // shared, not copied
  EXPECT_EQ(target.GetTouchFlashSectors(), 7u);
  EXPECT_EQ(target.GetScalarProductId(), 4192u);
  EXPECT_TRUE(target.GetIsFlashLoader());
  EXPECT_TRUE(target.GetIsQisdaVenusScalarBoard());
  EXPECT_EQ(target.GetScalarFlashSectors(), 9u);
  // A copy starts from the defaults, so the source's sectors never reach it.
  EXPECT_EQ(CDevice(source).GetScalarFlashSectors(), 0u);
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
  EXPECT_EQ(device.ToString(), "");

  device.SetTouchInterface(nullptr);
  auto pen = CFakeInterface::Make("pen");
  pen->SetIsFlashLoader(true);
  device.SetPenInterface(pen);
  device.SetPenFlashSectors(120);
  device.SetPenUsageId(2);
  device.SetPenUsagePage(0xFF0D);
  device.SetPenInitEEPROM(true);
  device.SetIsFlashLoader(true);
  const std::string penText =
      "\tSectors = 120\n\tUsageId (Non-HidRouter) = 2\n\tUsagePage (Non-HidRouter) = 65293\n"
      "\tInit Eeprom = YES\n\t<pen>\n";
  EXPECT_EQ(device.ToString(),
            "[tablet] (LOADER MODE)\nLOADER INTERFACE:\n" + penText +
                "TOUCH INTERFACE NOT FOUND\nBLUETOOTH INTERFACE NOT SUPPORTED\n");

  pen->SetIsFlashLoader(false);
  device.SetIsFlashLoader(false);
  device.SetTouchInterface(CFakeInterface::Make("touch"));
  device.SetTouchFlashSectors(30);
  device.SetTouchUsageId(1);
  device.SetTouchUsagePage(0xFF00);
  device.SetBluetoothSupported(true);
  EXPECT_EQ(device.ToString(),
            "[tablet] (NORMAL MODE)\nPEN INTERFACE:\n" + penText +
                "TOUCH INTERFACE:\n\tSectors = 30\n\tUsageId = 1\n\tUsagePage = 65280\n"
                "\tInit Eeprom = NO\n\t<touch>\nBLUETOOTH INTERFACE NOT FOUND\n");
}
