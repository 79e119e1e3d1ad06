// Attach and detach messages in every state, and device selection.
#include "update/ControllerFixture.h"

namespace controller_test {
namespace {

class AttachDetach : public ControllerFixture {
 protected:
  // Puts the controller in `state_I` through its own operations.
  void Reach(ECONTROLLER_STATE state_I) { mController->ProcessStateChange(state_I); }
};

TEST_F(AttachDetach, AttachMovesOnlyTheTwoWaitingStatesWhateverThePath) {
  const std::vector<std::pair<ECONTROLLER_STATE, ECONTROLLER_STATE>> moves = {
      {ESTATE_WAIT_LOADER, ESTATE_PROGRAM}, {ESTATE_WAIT_DEVICE, ESTATE_SUCCESS}};
  for (const auto& [from, to] : moves) {
    Reach(from);
    mController->DeviceAttach("1:2:3:4:5");  // not the selected device
    EXPECT_EQ(mController->GetState(), to);
  }
  EXPECT_TRUE(mNotifier.Logged("IMPORTANT Attach Message (1:2:3:4:5) STATE->ESTATE_PROGRAM"));
  EXPECT_TRUE(mNotifier.Logged("IMPORTANT Attach Message (1:2:3:4:5) STATE->ESTATE_SUCCESS"));

  for (ECONTROLLER_STATE state : {ESTATE_NONE, ESTATE_READY, ESTATE_PROGRAM, ESTATE_SUCCESS,
                                  ESTATE_FAILURE, ESTATE_TERMINATE}) {
    Reach(state);
    mController->DeviceAttach("9:9:9:9:9");
    EXPECT_EQ(mController->GetState(), state);
  }
  EXPECT_EQ(mNotifier.CountLogged("Ignored Attach Message (9:9:9:9:9)"), 6);
}

TEST_F(AttachDetach, DetachOfTheSelectedDeviceTerminatesOnlyOutsideAnUpdate) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto touch = MakeInterface("touch", kTouchPath);
  mBus->Set({MakeDevice(pen, false, true, touch)});
  ASSERT_TRUE(mController->UpdateDeviceList());

  for (ECONTROLLER_STATE state : {ESTATE_NONE, ESTATE_READY, ESTATE_SUCCESS}) {
    Reach(state);
    mController->DeviceDetach(kTouchPath);
    EXPECT_EQ(mController->GetState(), ESTATE_TERMINATE) << state;
  }
  EXPECT_TRUE(mNotifier.Logged(std::string("IMPORTANT Detach Message (") + kTouchPath +
                               ") STATE->ESTATE_TERMINATE"));

  for (ECONTROLLER_STATE state : {ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE,
                                  ESTATE_FAILURE, ESTATE_TERMINATE}) {
    Reach(state);
    mController->DeviceDetach(kNormalPath);
    EXPECT_EQ(mController->GetState(), state);
  }
  EXPECT_EQ(mNotifier.CountLogged(std::string("Ignored Detach Message (") + kNormalPath + ")"), 5);
}

TEST_F(AttachDetach, UnimportantDetachesAreIgnoredInEveryState) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false, /*intoBLMode=*/false);
  device->SetScalarSupported(true);
  device->SetScalarInterface(MakeInterface("scalar", "4660:4192:1:1:1"));
  mBus->Set({device});
  ASSERT_TRUE(mController->UpdateDeviceList());

  Reach(ESTATE_READY);
  // A product that switches in place never terminates on a detach.
  mController->DeviceDetach(kNormalPath);
  // The path case does not matter, but a scalar path is never active.
  device->SetPenIntoBLMode(true);
  mController->DeviceDetach("4660:4192:1:1:1");
  mController->DeviceDetach("other");
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  EXPECT_EQ(mNotifier.CountLogged(std::string("Ignored Unimportant Detach Message (") +
                                  kNormalPath + ")"),
            1);
  EXPECT_TRUE(mNotifier.Logged("Ignored Unimportant Detach Message (4660:4192:1:1:1)"));

  auto upper = MakeInterface("upper", "ABC:1");
  device->SetPenInterface(upper);
  mController->DeviceDetach("abc:1");
  EXPECT_EQ(mController->GetState(), ESTATE_TERMINATE);
}

TEST_F(AttachDetach, SelectionRefusesInvalidDevicesAndReadsTheList) {
  auto pen = MakeInterface("pen", kNormalPath);
  auto device = MakeDevice(pen, false);
  mBus->Set({device});
  EXPECT_FALSE(mController->SetSelectedDevice(std::shared_ptr<CDevice>()));
  EXPECT_FALSE(mController->SetSelectedDevice(std::make_shared<CDevice>()));  // no name
  EXPECT_FALSE(mController->SetSelectedDevice(0x1234, 0x100));  // list not built yet
  ASSERT_TRUE(mController->UpdateDeviceList());
  EXPECT_EQ(mController->GetDeviceCount(), 1u);
  EXPECT_TRUE(mController->SetSelectedDevice(0x1234, 0x100));
  EXPECT_TRUE(mController->SetSelectedDevice(std::string(kNormalPath)));
  EXPECT_FALSE(mController->SetSelectedDevice(std::string("1:1:1:1:1")));
  EXPECT_EQ(mController->GetSelectedDevice(), device);

  EXPECT_TRUE(mController->PenAutoUpdateExists());
  EXPECT_FALSE(mController->TouchAutoUpdateExists());
  EXPECT_FALSE(mController->BluetoothAutoUpdateExists());
  EXPECT_FALSE(mController->ScalarAutoUpdateExists());
}

TEST_F(AttachDetach, CheckDeviceListOpensAsksAndAlwaysCloses) {
  EXPECT_FALSE(mController->CheckDeviceList());
  auto pen = MakeInterface("pen", kNormalPath);
  mBus->Set({MakeDevice(pen, false)});
  ASSERT_TRUE(mController->UpdateDeviceList());
  EXPECT_TRUE(mController->CheckDeviceList());
  pen->mOpenResult = false;
  EXPECT_FALSE(mController->CheckDeviceList());
  EXPECT_EQ(mJournal.Entries(), (std::vector<std::string>{"pen.Open", "pen.IsAlive", "pen.Close",
                                                          "pen.Open", "pen.Close"}));
  EXPECT_TRUE(mCapture.LogContains("CUpdateController::CheckDeviceList - checking IsAlive()"));
}

}  // namespace
}  // namespace controller_test
