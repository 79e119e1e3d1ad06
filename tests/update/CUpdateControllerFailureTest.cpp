// Updates that fail, and how each failure is reported.
#include "update/ControllerFixture.h"

namespace controller_test {
namespace {

using Failure = ControllerFixture;

TEST_F(Failure, LoaderThatNeverComesBackTimesOutWithoutFailureState) {
  auto pen = MakeInterface("pen", kNormalPath);
  mBus->Set({MakeDevice(pen, false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));

  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier.CountLogged("Waiting for bootloader mode..."), 90);
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 90.0);
  EXPECT_TRUE(mNotifier.Logged("Bootloader mode timeout."));
  EXPECT_TRUE(mNotifier.Logged("loaderInterface not valid."));
  EXPECT_TRUE(mCapture.AssertionContains("Oops - Could not get a loaderInterface pointer"));
  // No error callback and no failure state: the state stays where the
  // switch left it.
  EXPECT_EQ(mNotifier.Only("error:"), std::vector<std::string>{});
  EXPECT_EQ(mController->GetState(), ESTATE_WAIT_LOADER);
  // The list is never rebuilt while no attach moved the state.
  EXPECT_EQ(mNotifier.CountLogged("Updating Device List..."), 1);
}

TEST_F(Failure, NormalSideTimeoutFailsWithLeaveLoader) {
  SetUpReEnumeratingPen();
  mLoader->mOnSwitchFrom = nullptr;  // the device never returns
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));

  EXPECT_FALSE(mController->UpdateDevice());
  // The return wait logs nothing of its own and rebuilds the list each pass.
  EXPECT_EQ(mNotifier.CountLogged("Updating Device List..."), 1 + 1 + 90);
  EXPECT_EQ(mNotifier.Only("state:").back(), State(ESTATE_FAILURE));
  EXPECT_EQ(mNotifier.Only("error:").back(),
            Error(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode"));
  EXPECT_TRUE(mNotifier.Logged("Device Update failed!"));
}

TEST_F(Failure, ProgrammingFailureSendsTheDeviceBackBeforeReporting) {
  SetUpReEnumeratingPen();
  mLoader->mProgramResult = false;
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));

  EXPECT_FALSE(mController->UpdateDevice());
  const int back = mJournal.IndexOf("loader.SwitchFromBLMode(false)");
  ASSERT_GE(back, 0);
  EXPECT_LT(back, mJournal.IndexOf("loader.UnregisterCallback"));
  EXPECT_LT(mJournal.IndexOf("loader.UnregisterCallback"), mJournal.IndexOf("loader.Close"));
  EXPECT_EQ(mNotifier.Only("error:"),
            (std::vector<std::string>{Error(EERROR_INTERFACE, "lab: write failed"),
                                      Error(EERROR_INTERFACE, "Error Programming Board"),
                                      Error(EERROR_PROGRAM, "General Program Failure")}));
  EXPECT_EQ(mController->GetState(), ESTATE_FAILURE);
}

TEST_F(Failure, BlockCountMismatchIsAnInterfaceError) {
  SetUpReEnumeratingPen();
  mLoader->mReportedBlocks = 32;
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(
      mNotifier.Only("error:").front(),
      Error(EERROR_INTERFACE, "InitCheckForSRecData: Sector/Block mismatch! Expected 64 got 32\n"));
  EXPECT_FALSE(mJournal.Contains("loader.ProgramBoard"));
}

TEST_F(Failure, ZeroExpectedBlocksAlwaysMismatch) {
  SetUpReEnumeratingPen();
  mNormalDevice->SetPenFlashSectors(0);
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(
      mNotifier.Only("error:").front(),
      Error(EERROR_INTERFACE, "InitCheckForSRecData: Sector/Block mismatch! Expected 0 got 64\n"));
}

TEST_F(Failure, InitFailureIsAnInterfaceErrorThenAProgramFailure) {
  SetUpReEnumeratingPen();
  mLoader->mInitResult = false;
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier.Only("error:").front(),
            Error(EERROR_INTERFACE, "InitCheckForSRecData: Error Initializing Board"));
  EXPECT_EQ(mNotifier.Only("error:").back(), Error(EERROR_PROGRAM, "General Program Failure"));
}

TEST_F(Failure, I2CFailureToEnterTheLoaderEndsTheAttemptThroughTheErrorCallback) {
  auto pen = MakeInterface("i2c", kNormalPath, EI2C_INTERFACE);
  pen->mSwitchToResult = false;
  mBus->Set({MakeDevice(pen, false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier.Only("error:"),
            std::vector<std::string>{
                Error(EERROR_PROGRAM, "I2C Device failed to switch to Loader mode")});
  EXPECT_EQ(mController->GetState(), ESTATE_WAIT_LOADER);
  // Opened once for the switch; never again as a loader.
  EXPECT_EQ(mJournal.IndexOf("i2c.Open"), mJournal.IndexOf("i2c.SwitchToBLMode") - 1);
  EXPECT_TRUE(mCapture.AssertionContains("Oops - Could not get a loaderInterface pointer"));
}

TEST_F(Failure, I2CFailureToLeaveTheLoaderIsReportedTwice) {
  // A product that switches in place, so the loader flag is set on the way in.
  auto i2c = MakeInterface("i2c", kNormalPath, EI2C_INTERFACE);
  i2c->mSwitchFromResult = false;
  mBus->Set({MakeDevice(i2c, false, /*intoBLMode=*/false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier.Only("error:"),
            (std::vector<std::string>{
                Error(EERROR_LEAVE_LOADER, "I2C Device failed to switch from Loader mode"),
                Error(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode")}));
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 0.0);  // no waits on I2C
}

TEST_F(Failure, OtherTransportsGoOnAfterAFailedSwitch) {
  auto pen = MakeInterface("pen", kNormalPath);
  pen->mSwitchToResult = false;
  pen->mSwitchFromResult = false;
  mBus->Set({MakeDevice(pen, false, /*intoBLMode=*/false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged("Error returned from SwitchToBLMode()"));
  EXPECT_TRUE(mNotifier.Logged("Error returned from SwitchFromBLMode()"));
}

TEST_F(Failure, OpenFailureInTheTailIsAFailureState) {
  auto pen = MakeInterface("pen", kNormalPath);
  pen->mOpenResult = false;
  mBus->Set({MakeDevice(pen, true)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mController->GetState(), ESTATE_FAILURE);
  EXPECT_TRUE(mNotifier.Logged("loaderInterface not valid."));
}

TEST_F(Failure, MissingInterfaceOrFileStopsBeforeTheDeviceIsTouched) {
  // No device selected: no main interface.
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged("mainInterface not valid."));
  EXPECT_TRUE(mCapture.AssertionContains("Oops - Could not get a mainInterface pointer"));

  // A device in loader mode and no file loaded. A new data source counts as
  // loaded (its fresh scalar reader says so), so the file check lets it
  // through and the update stops at the format check instead.
  auto loader = MakeInterface("loader", kLoaderPath);
  mBus->Set({MakeDevice(loader, true)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(
      mNotifier.Only("error:"),
      (std::vector<std::string>{Error(EERROR_INTERFACE, "InitCheck: unrecognized data format"),
                                Error(EERROR_PROGRAM, "General Program Failure")}));
  EXPECT_FALSE(mJournal.Contains("loader.ProgramBoard"));
  EXPECT_TRUE(mJournal.Contains("loader.SwitchFromBLMode(false)"));
}

TEST_F(Failure, DeviceListFailuresAreNoDeviceErrors) {
  mBus->failGenerate = true;
  EXPECT_FALSE(mController->UpdateDeviceList());
  mBus->failGenerate = false;
  EXPECT_FALSE(mController->UpdateDeviceList());  // nothing attached
  EXPECT_EQ(mNotifier.Only("error:"),
            (std::vector<std::string>{Error(EERROR_NO_DEVICE, "Device List Failed to Update!"),
                                      Error(EERROR_NO_DEVICE, "Could not find selected device")}));
  EXPECT_EQ(mController->GetSelectedDevice(), nullptr);
}

}  // namespace
}  // namespace controller_test
