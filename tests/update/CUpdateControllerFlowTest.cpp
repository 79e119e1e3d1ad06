// Updates that succeed: a pen that re-enumerates into its loader, one that
// is already there, and one that switches in place.
#include <chrono>
#include <fstream>

#include "update/ControllerFixture.h"

namespace controller_test {
namespace {

using Flow = ControllerFixture;

TEST_F(Flow, PenReEnumeratesIntoItsLoaderAndBack) {
  SetUpReEnumeratingPen();
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));

  const auto start = std::chrono::steady_clock::now();
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));

  EXPECT_EQ(mNotifier.Only("state:"),
            (std::vector<std::string>{State(ESTATE_READY), State(ESTATE_WAIT_LOADER),
                                      State(ESTATE_PROGRAM), State(ESTATE_WAIT_DEVICE),
                                      State(ESTATE_SUCCESS), State(ESTATE_SUCCESS)}));
  EXPECT_EQ(mNotifier.Only("error:"), std::vector<std::string>{});
  EXPECT_EQ(mController->GetState(), ESTATE_SUCCESS);

  // The attach came on the clock's thread three seconds in; the update
  // thread picked it up at the next poll.
  EXPECT_TRUE(mNotifier.Logged(std::string("IMPORTANT Attach Message (") + kLoaderPath +
                               ") STATE->ESTATE_PROGRAM"));
  EXPECT_EQ(mNotifier.CountLogged("Waiting for bootloader mode..."), 3);
  EXPECT_TRUE(mNotifier.Logged("Switching Pen to Loader mode... "));
  EXPECT_TRUE(mNotifier.Logged("Setting protocolType to 0"));

  // The order on the wire: open and switch, open the loader, init, program, leave
  // with save, then carry the loader's sums to the new normal interface.
  const std::vector<std::string> journal = mJournal.Entries();
  const std::vector<std::string> expectedOrder = {"pen.RegisterCallback",
                                                  "pen.Open",
                                                  "pen.SwitchToBLMode",
                                                  "loader.Open",
                                                  "loader.RegisterCallback",
                                                  "loader.SetProtocolType(0)",
                                                  "loader.Init(64 bytes)",
                                                  "loader.ProgramBoard",
                                                  "loader.RegisterCallback",
                                                  "loader.SwitchFromBLMode(true)",
                                                  "penAgain.Open",
                                                  "penAgain.RegisterCallback",
                                                  "penAgain.UpdateChecksums(4369,8738,13107)",
                                                  "penAgain.UnregisterCallback",
                                                  "penAgain.Close"};
  EXPECT_EQ(journal, expectedOrder);

  // Progress from the interface passes through; the run ends at 100.
  EXPECT_EQ(mNotifier.Progress(), (std::vector<unsigned>{1, 50, 100}));
  EXPECT_EQ(mController->GetSelectedDevice()->GetPenInterface(), mPenAgain);
}

TEST_F(Flow, DeviceAlreadyInLoaderSkipsTheSwitchAndTheBlockCountCheck) {
  auto loader = MakeInterface("loader", kLoaderPath);
  loader->mReportedBlocks = 17;  // differs from the 64 the product expects
  auto device = MakeDevice(loader, true);
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.tav")));
  auto normal = MakeInterface("normal", kNormalPath);
  loader->mOnSwitchFrom = [&] {
    mClock->Schedule(1, [&] {
      mBus->Set({MakeDevice(normal, false)});
      mController->DeviceAttach(kNormalPath);
    });
  };

  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged("Device already in loader mode"));
  EXPECT_FALSE(mJournal.Contains("loader.SwitchToBLMode"));
  EXPECT_EQ(mNotifier.Only("state:"),
            (std::vector<std::string>{State(ESTATE_READY), State(ESTATE_PROGRAM),
                                      State(ESTATE_WAIT_DEVICE), State(ESTATE_SUCCESS),
                                      State(ESTATE_SUCCESS)}));
  EXPECT_EQ(mNotifier.Only("error:"), std::vector<std::string>{});
}

TEST_F(Flow, NonLoaderProtocolSwitchesInPlaceWithoutWaiting) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false, /*intoBLMode=*/false);
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));

  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 0.0);
  EXPECT_FALSE(device->GetIsFlashLoader());  // set for programming, cleared after
  EXPECT_FALSE(pen->GetIsFlashLoader());
  EXPECT_TRUE(mNotifier.Logged("Setting protocolType to 1"));
  EXPECT_EQ(mNotifier.Only("state:"),
            (std::vector<std::string>{State(ESTATE_READY), State(ESTATE_WAIT_LOADER),
                                      State(ESTATE_PROGRAM), State(ESTATE_WAIT_DEVICE),
                                      State(ESTATE_SUCCESS), State(ESTATE_SUCCESS)}));
  EXPECT_TRUE(mJournal.Contains("pen.SwitchFromBLMode(true)"));
  EXPECT_TRUE(mJournal.Contains("pen.UpdateChecksums(4369,8738,13107)"));
}

TEST_F(Flow, SaveFlagOnLeavingFollowsBoardAndPenProduct) {
  // A touch update sends save=false, unless the pen product is one of the
  // two that always need it.
  for (const uint32_t penProduct : {0x100u, 855u, 856u}) {
    const std::string name = "touch" + std::to_string(penProduct);
    auto pen = MakeInterface("pen", kNormalPath);
    auto touch = MakeInterface(name, kTouchPath);
    auto device = MakeDevice(pen, false, /*intoBLMode=*/false, touch);
    device->SetPenProductId(penProduct);
    mBus->Set({device});
    ASSERT_TRUE(mController->UpdateDeviceList());
    mController->SetUpdateType(EUPDATE_TOUCH);
    ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.touch")));
    touch->mReportedBlocks = 16;
    EXPECT_TRUE(mController->UpdateDevice());
    EXPECT_TRUE(mNotifier.Logged("Switching Touch to Loader mode... "));
    const bool save = penProduct != 0x100u;
    EXPECT_TRUE(mJournal.Contains(name + ".SwitchFromBLMode(" + (save ? "true" : "false") + ")"))
        << penProduct;
  }
}

TEST_F(Flow, BinaryImagesAreHandedToTheInterfaceBeforeProgramming) {
  // Bluetooth module and HID scalar of a product that switches in place.
  auto pen = MakeInterface("pen", kNormalPath);
  auto bluetooth = MakeInterface("bt", "31325:900:16777216:1:65289");
  auto scalar = MakeInterface("scalar", "31325:4192:16777216:1:65280");
  auto device = MakeDevice(pen, false, /*intoBLMode=*/false);
  device->SetBluetoothSupported(true);
  device->SetBluetoothInterface(bluetooth);
  device->SetScalarSupported(true);
  device->SetScalarInterfaceType(EHID_INTERFACE);
  device->SetScalarInterface(scalar);
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());
  const std::string image(4096, '\x5A');
  std::ofstream(mFolder / "bt.airoflash", std::ios::binary) << image;
  std::ofstream(mFolder / "scalar.bin", std::ios::binary) << image;

  mController->SetUpdateType(EUPDATE_BLUETOOTH);
  ASSERT_TRUE(mController->SetUpdateFile((mFolder / "bt.airoflash").string()));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged(
      "InitCheckForAiroFlashData: AeroFlash file data is loaded; we're good to go..."));
  EXPECT_LT(mJournal.IndexOf("bt.SetBinaryAiroFlashData"), mJournal.IndexOf("bt.ProgramBoard"));

  mController->SetUpdateType(EUPDATE_SCALAR_HID);
  ASSERT_TRUE(mController->SetUpdateFile((mFolder / "scalar.bin").string()));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged(
      "InitCheckForScalarBinaryData: Scalar Binary file data is loaded; we're good to go..."));
  EXPECT_LT(mJournal.IndexOf("scalar.SetScalarBinaryData"),
            mJournal.IndexOf("scalar.ProgramBoard"));
  EXPECT_TRUE(mNotifier.Logged("Switching Bluetooth to Loader mode... "));
  EXPECT_EQ(mNotifier.CountLogged("Switching Bluetooth to Loader mode... "), 2);
}

TEST_F(Flow, StateIsStoredOnlyAfterTheNotifierReturns) {
  SetUpReEnumeratingPen();
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("image.pen")));
  std::vector<std::string> seen;
  mNotifier.mOnStatus = [&](ECONTROLLER_STATE state_I) {
    seen.push_back(std::to_string(state_I) + "<-" + std::to_string(mController->GetState()));
    // An attach that arrives inside the callback is judged by the old state.
    if (state_I == ESTATE_WAIT_LOADER) mController->DeviceAttach("elsewhere");
  };
  mController->SetUpdateType(EUPDATE_PEN);
  EXPECT_EQ(seen, std::vector<std::string>{"0<-1"});
  ASSERT_TRUE(mController->SetUpdateFile(WriteFile("again.pen")));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier.Logged("Ignored Attach Message (elsewhere)"));
  EXPECT_EQ(seen[2], "2<-1");
}

}  // namespace
}  // namespace controller_test
