// Choosing the update type and the file.
#include <fstream>

#include "update/ControllerFixture.h"

namespace controller_test {
namespace {

using Files = ControllerFixture;

TEST_F(Files, SetUpdateFileRefusesUnreadableAndMismatchedFiles) {
  auto pen = MakeInterface("pen", kNormalPath);
  mBus->Set({MakeDevice(pen, false)});
  ASSERT_TRUE(mController->UpdateDeviceList());

  EXPECT_FALSE(mController->SetUpdateFile((mFolder / "missing.pen").string()));
  EXPECT_TRUE(mNotifier.Logged("Processing update file: " + (mFolder / "missing.pen").string()));
  EXPECT_EQ(mController->GetState(), ESTATE_NONE);

  // A touch image offered for a pen update loads but does not fit.
  EXPECT_FALSE(mController->SetUpdateFile(WriteFile("image.touch")));
  EXPECT_EQ(mController->GetState(), ESTATE_NONE);
  EXPECT_EQ(mNotifier.Only("error:"),
            (std::vector<std::string>{Error(EERROR_FILE_LOAD, ""), Error(EERROR_FILE_MISMATCH, "")}));
  EXPECT_EQ(mNotifier.Only("state:"),
            (std::vector<std::string>{State(ESTATE_NONE), State(ESTATE_NONE)}));

  EXPECT_TRUE(mController->SetUpdateFile(WriteFile("image.tav")));
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
}

TEST_F(Files, UpdateTypeDecidesWhichFormatsFit) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto touch = MakeInterface("touch", kTouchPath);
  mBus->Set({MakeDevice(pen, false, true, touch)});
  ASSERT_TRUE(mController->UpdateDeviceList());

  mController->SetUpdateType(EUPDATE_TOUCH);
  EXPECT_TRUE(mNotifier.Logged("Update type changed to 1"));
  EXPECT_EQ(mController->GetActiveInterface(), touch);
  EXPECT_EQ(mController->GetActiveFlashSectors(), 16u);
  EXPECT_TRUE(mController->SetUpdateFile(WriteFile("image.touch")));
  EXPECT_FALSE(mController->SetUpdateFile(WriteFile("image.pen")));

  // Types without a board of their own have no interface and no sectors.
  mController->SetUpdateType(EUPDATE_SCALAR_FTDI);
  EXPECT_EQ(mController->GetActiveInterface(), nullptr);
  EXPECT_EQ(mController->GetActiveFlashSectors(), 0u);
  mController->SetUpdateType(EUPDATE_BLUETOOTH);
  EXPECT_EQ(mController->GetActiveInterface(), nullptr);  // this product has none
}

TEST_F(Files, AutoUpdateFileAcceptsWhatTheLoadAccepts) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false);
  device->SetPenUpdate("firmware.touch");  // a touch image named for the pen
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());
  WriteFile("firmware.touch");

  // No format check on this path: only the load decides.
  EXPECT_TRUE(mController->SetAutoUpdateFile("pen", mFolder.string()));
  EXPECT_TRUE(mController->ValidAutoUpdate());
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  EXPECT_EQ(mController->GetUpdateFile(), (mFolder / "firmware.touch").string());
  EXPECT_FALSE(mController->UpdateTypeMatchesDataSource());

  // Unknown kinds, kinds in another case and boards without an update name
  // return false and leave the state alone.
  EXPECT_FALSE(mController->SetAutoUpdateFile("Pen", mFolder.string()));
  EXPECT_FALSE(mController->SetAutoUpdateFile("touch", mFolder.string()));
  EXPECT_FALSE(mController->SetAutoUpdateFile("stylus", mFolder.string()));
  EXPECT_FALSE(mController->ValidAutoUpdate());
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
}

TEST_F(Files, AutoUpdateFileWithEmptyFolderLoadsTheBareName) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false);
  const std::string bare = "bare-" + std::to_string(getpid()) + ".pen";
  device->SetPenUpdate(bare);
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());

  EXPECT_FALSE(mController->SetAutoUpdateFile("pen", ""));
  EXPECT_EQ(mController->GetUpdateFile(), bare);  // no "/" in front

  WriteSRecFile(bare, 0x2000, 32);  // relative: in the working folder
  EXPECT_TRUE(mController->SetAutoUpdateFile("pen", ""));
  std::remove(bare.c_str());
}

TEST_F(Files, ScalarKindPicksTheTypeFromTheScalarInterface) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false);
  device->SetScalarUpdate("scalar.bin");
  device->SetScalarInterfaceType(EHID_INTERFACE);
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());
  std::ofstream(mFolder / "scalar.bin") << std::string(300, 'x');

  mController->SetAutoUpdateFile("scalar", mFolder.string());
  EXPECT_EQ(mController->GetUpdateType(), EUPDATE_SCALAR_HID);
  EXPECT_EQ(mController->GetDataSource().GetDataSourceFormat(), EDS_SCALAR_BINARY);

  device->SetScalarInterfaceType(EFTDI_INTERFACE);
  mController->SetAutoUpdateFile("scalar", mFolder.string());
  EXPECT_EQ(mController->GetUpdateType(), EUPDATE_SCALAR_FTDI);
  EXPECT_EQ(mController->GetDataSource().GetDataSourceFormat(), EDS_SCALAR_RTDISP);
}

TEST_F(Files, DeprecatedExtensionQueryAssertsAndStillAnswers) {
  auto pen = MakeInterface("pen", kNormalPath);
  mBus->Set({MakeDevice(pen, false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.PEN")));
  EXPECT_EQ(mController->GetUpdateFileExt(), "pen");
  EXPECT_TRUE(mCapture.AssertionContains(
      "This method is deprecated; use CSRec::GetDataSourceFormat instead!"));
}

}  // namespace
}  // namespace controller_test
