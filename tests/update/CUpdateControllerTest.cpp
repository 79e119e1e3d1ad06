// The update controller: each way one update goes, in states, errors and
// board calls; the choice of type and file; attach and detach.
#include <chrono>

#include "update/UpdateDoubles.h"

namespace update_test {
namespace {

// Keeps states, errors ("<error>:<text>") and progress apart.
class CRecordingNotifier : public CUpdateNotifier {
 public:
  void UpdateLog(const std::string&) override {}
  void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) override {
    mErrors.Add(Error(error_I, text_I));
  }
  void UpdateStatus(ECONTROLLER_STATE state_I) override {
    mStates.Add(state_I);
    if (mOnStatus) mOnStatus(state_I);
  }
  void UpdateProgress(unsigned int percent_I) override { mProgress.Add(percent_I); }

  CJournal mErrors;
  CLog<ECONTROLLER_STATE> mStates;
  CLog<unsigned> mProgress;
  std::function<void(ECONTROLLER_STATE)> mOnStatus;
};

using States = std::vector<ECONTROLLER_STATE>;

// One update of the re-enumerating pen after a change: its name, states,
// errors, virtual seconds and last board calls.
using SRun = std::tuple<const char*, States, Words, double, Words, std::function<void()>>;

class ControllerTest : public UpdateFixture {
 protected:
  void SetUp() override {
    UpdateFixture::SetUp();
    Reset();
  }
  // A new clock, controller and journal: one row of a table, as a test.
  void Reset() {
    // The old clock's thread stops before the controller its tasks reach.
    CClock::Set(mClock = std::make_shared<CVirtualClock>());
    mController.reset();
    mNotifier = std::make_unique<CRecordingNotifier>();
    mController = std::make_unique<CLinuxUpdateController>(std::make_unique<CFakeDiscovery>(mBus));
    mController->RegisterCallback(mNotifier.get());
    mJournal.Clear();
  }
  void Connect(std::vector<std::shared_ptr<CDevice>> devices_I) {
    mBus->devices = std::move(devices_I);
    ASSERT_TRUE(mController->UpdateDeviceList());
  }
  // A pen of this transport; without intoBLMode it switches in place.
  void ConnectPenOf(EINTERFACE_TYPE type_I, bool intoBLMode_I) {
    mPen = Board("pen", kNormalPath, type_I);
    Connect({Product(mPen, false, intoBLMode_I)});
  }
  // A pen that leaves for its loader 3 s after the switch and comes back
  // 2 s after the switch back, each time with an attach from the clock's
  // thread while the update thread polls.
  void ConnectReEnumeratingPen() {
    mPen = Board("pen", kNormalPath);
    mLoader = Board("loader", kLoaderPath);
    mNormalDevice = Product(mPen, false, true);
    mLoaderDevice = Product(mLoader, true, true);
    mPen->mOnSwitchTo = [this] {
      mClock->Schedule(3, [this] {
        mBus->devices = {mLoaderDevice};
        mController->DeviceAttach(kLoaderPath);
      });
    };
    mLoader->mOnSwitchFrom = [this] {
      mClock->Schedule(2, [this] {
        mBus->devices = {Product(Board("penAgain", kNormalPath), false, true)};
        mController->DeviceAttach(kNormalPath);
      });
    };
    Connect({mNormalDevice});
  }
  // A product with a touch board beside its pen, both switching in place.
  void ConnectTouch(uint32_t penProduct_I) {
    auto touch = Board("touch", kTouchPath);
    touch->mBlocks = 16;
    auto device = Product(Board("pen", kNormalPath), false, false, touch);
    device->SetPenProductId(penProduct_I);
    Connect({device});
    mController->SetUpdateType(EUPDATE_TOUCH);
    mFile = WriteImage(mFolder / "image.touch");
  }

  void Run(const std::vector<SRun>& rows_I) {
    for (const auto& [name, states, errors, slept, tail, change] : rows_I) {
      SCOPED_TRACE(name);
      Reset();
      ConnectReEnumeratingPen();
      mFile = WriteImage(mFolder / "image.pen");
      change();
      mNotifier->mStates.Clear();
      ASSERT_TRUE(mController->SetUpdateFile(mFile.string()));
      const bool success = states.back() == ESTATE_SUCCESS;
      const auto start = std::chrono::steady_clock::now();
      EXPECT_EQ(mController->UpdateDevice(), success);
      EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
      EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), slept);
      EXPECT_EQ(mNotifier->mStates.Get(), states);
      EXPECT_EQ(mController->GetState(), states.back());
      EXPECT_EQ(mNotifier->mErrors.Get(), errors);
      const Words journal = mJournal.Get();
      ASSERT_GE(journal.size(), tail.size());
      EXPECT_EQ(Words(journal.end() - static_cast<long>(tail.size()), journal.end()), tail);
      if (!success) continue;
      // Progress from the interface passes through; the run ends at 100
      // with the board in its normal mode.
      EXPECT_EQ(mNotifier->mProgress.Get(), (std::vector<unsigned>{1, 50, 100}));
      EXPECT_FALSE(mController->GetSelectedDevice()->GetIsFlashLoader());
      EXPECT_FALSE(mController->GetActiveInterface()->GetIsFlashLoader());
    }
  }

  std::unique_ptr<CRecordingNotifier> mNotifier;
  std::unique_ptr<CLinuxUpdateController> mController;
  std::shared_ptr<CFakeInterface> mPen, mLoader;
  std::shared_ptr<CDevice> mNormalDevice, mLoaderDevice;
  fs::path mFile;
};

using Flow = ControllerTest;
using Failure = ControllerTest;
using File = ControllerTest;
using Attach = ControllerTest;

// The last calls of a board that switched in place, leaving with `save`.
Words LeftInPlace(const std::string& board_I, bool save_I) {
  Words calls = {".SwitchFromBLMode(" + std::string(save_I ? "true)" : "false)"),
                 ".Open",
                 ".RegisterCallback",
                 ".UpdateChecksums(4369,8738,13107)",
                 ".UnregisterCallback",
                 ".Close"};
  for (std::string& call : calls) call = board_I + call;
  return calls;
}

TEST_F(Flow, EachPathEndsInItsStatesAndCalls) {
  const States inPlace = {ESTATE_READY,       ESTATE_WAIT_LOADER, ESTATE_PROGRAM,
                          ESTATE_WAIT_DEVICE, ESTATE_SUCCESS,     ESTATE_SUCCESS};
  Words penAgain = LeftInPlace("penAgain", true);
  penAgain.erase(penAgain.begin());  // it never was a loader
  Words pen = {"pen.SetProtocolType(1)", "pen.Init(64 bytes)", "pen.ProgramBoard",
               "pen.RegisterCallback"};
  for (const std::string& call : LeftInPlace("pen", true)) pen.push_back(call);
  // clang-format off
  Run({
    // Switch (a HID board opens itself for it), open the loader, init,
    // program, leave with save, then carry the loader's sums to the new
    // normal interface. Each attach comes on the clock's thread; the update
    // thread takes it at its next poll.
    {"re-enumerates into its loader and back", inPlace, {}, 3.0 + 2.0,
     {"pen.RegisterCallback", "pen.SwitchToBLMode", "loader.Open",
      "loader.RegisterCallback", "loader.SetProtocolType(0)", "loader.Init(64 bytes)",
      "loader.ProgramBoard", "loader.RegisterCallback", "loader.SwitchFromBLMode(true)",
      penAgain[0], penAgain[1], penAgain[2], penAgain[3], penAgain[4]},
     [] {}},
    {"already in its loader: no switch, no block count check",
     {ESTATE_READY, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE, ESTATE_SUCCESS, ESTATE_SUCCESS}, {}, 2.0,
     penAgain,
     [this] { mLoader->mBlocks = 17; /* not the 64 expected */ Connect({mLoaderDevice}); }},
    // A HID board's failed switches are only logged.
    {"switches in place, without waiting", inPlace, {}, 0.0, pen,
     [this] {
       ConnectPenOf(EHID_INTERFACE, false);
       mPen->mFails = {"SwitchToBLMode", "SwitchFromBLMode"};
     }},
    // A touch board leaves without save, but for two pen products.
    {"touch", inPlace, {}, 0.0, LeftInPlace("touch", false), [this] { ConnectTouch(0x100); }},
    {"touch of product 855", inPlace, {}, 0.0, LeftInPlace("touch", true),
     [this] { ConnectTouch(855); }},
    {"touch of product 856", inPlace, {}, 0.0, LeftInPlace("touch", true),
     [this] { ConnectTouch(856); }},
  });
  // clang-format on
}

TEST_F(Failure, EachFaultEndsInItsStatesErrorsAndCalls) {
  const States toLoader = {ESTATE_READY, ESTATE_WAIT_LOADER};
  const States programFails = {ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_FAILURE};
  const States leaveFails = {ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE,
                             ESTATE_FAILURE};
  // Sent back before the failure is reported, whatever it answers.
  const Words sentBack = {"loader.SwitchFromBLMode(false)", "loader.UnregisterCallback",
                          "loader.Close"};
  const Words afterInit = {"loader.Init(64 bytes)", sentBack[0], sentBack[1], sentBack[2]};
  const std::string general = Error(EERROR_PROGRAM, "General Program Failure");
  const std::string swapping =
      Error(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode");
  // clang-format off
  Run({
    // No error callback and no failure state: the state stays where the
    // switch left it.
    {"a loader that never comes", toLoader, {}, 90.0,
     {"pen.RegisterCallback", "pen.SwitchToBLMode"},
     [this] { mPen->mOnSwitchTo = nullptr; }},
    {"a board that never leaves its loader", leaveFails, {swapping}, 3.0 + 90.0,
     {"loader.ProgramBoard", "loader.RegisterCallback", "loader.SwitchFromBLMode(true)"},
     [this] { mLoader->mOnSwitchFrom = nullptr; }},
    {"programming fails", programFails,
     {Error(EERROR_INTERFACE, "lab: write failed"),
      Error(EERROR_INTERFACE, "Error Programming Board"), general},
     3.0, {"loader.ProgramBoard", sentBack[0], sentBack[1], sentBack[2]},
     [this] { mLoader->mFails = {"ProgramBoard"}; }},
    {"the loader reports other blocks", programFails,
     {Error(EERROR_INTERFACE, "InitCheckForSRecData: Sector/Block mismatch! Expected 64 got 32\n"),
      general}, 3.0, afterInit, [this] { mLoader->mBlocks = 32; }},
    {"init fails", programFails,
     {Error(EERROR_INTERFACE, "InitCheckForSRecData: Error Initializing Board"), general}, 3.0,
     afterInit, [this] { mLoader->mFails = {"Init"}; }},
    // The switch opens the board itself; never opened again as a loader.
    {"an I2C board does not enter its loader", toLoader,
     {Error(EERROR_PROGRAM, "I2C Device failed to switch to Loader mode")}, 0.0,
     {"pen.RegisterCallback", "pen.SwitchToBLMode"},
     [this] { ConnectPenOf(EI2C_INTERFACE, true); mPen->mFails = {"SwitchToBLMode"}; }},
    // Reported twice, and no waits on I2C.
    {"an I2C board does not leave its loader", leaveFails,
     {Error(EERROR_LEAVE_LOADER, "I2C Device failed to switch from Loader mode"), swapping}, 0.0,
     {"pen.ProgramBoard", "pen.RegisterCallback", "pen.SwitchFromBLMode(true)"},
     [this] { ConnectPenOf(EI2C_INTERFACE, false); mPen->mFails = {"SwitchFromBLMode"}; }},
    {"a board in its loader does not open", {ESTATE_READY, ESTATE_FAILURE}, {}, 0.0,
     {"loader.RegisterCallback", "loader.Open"},
     [this] { mLoader->mFails = {"Open"}; Connect({mLoaderDevice}); }},
  });
  // clang-format on
}

TEST_F(Flow, StateIsStoredOnlyAfterTheNotifierReturns) {
  ConnectReEnumeratingPen();
  Words seen;
  mNotifier->mOnStatus = [&](ECONTROLLER_STATE state_I) {
    seen.push_back(std::to_string(state_I) + "<-" + std::to_string(mController->GetState()));
    // An attach that arrives inside the callback is judged by the old state.
    if (state_I == ESTATE_WAIT_LOADER) mController->DeviceAttach("elsewhere");
  };
  ASSERT_TRUE(mController->SetUpdateFile(WriteImage(mFolder / "image.pen")));
  mController->SetUpdateType(EUPDATE_PEN);  // a new type starts over from ESTATE_NONE
  ASSERT_TRUE(mController->SetUpdateFile(WriteImage(mFolder / "image.pen")));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_EQ(Words(seen.begin(), seen.begin() + 4), (Words{"1<-0", "0<-1", "1<-0", "2<-1"}));
}

TEST_F(Failure, NoDeviceNoInterfaceOrNoFileStopsBeforeTheBoardIsProgrammed) {
  mBus->failGenerate = true;
  EXPECT_FALSE(mController->UpdateDeviceList());
  mBus->failGenerate = false;
  EXPECT_FALSE(mController->UpdateDeviceList());  // nothing attached
  EXPECT_EQ(mController->GetSelectedDevice(), nullptr);
  EXPECT_FALSE(mController->UpdateDevice());

  // In loader mode with no file loaded. A new data source counts as loaded
  // (its fresh scalar reader says so), so the update stops at the format.
  Connect({Product(Board("loader", kLoaderPath), true, true)});
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier->mErrors.Get(),
            (Words{Error(EERROR_NO_DEVICE, "Device List Failed to Update!"),
                   Error(EERROR_NO_DEVICE, "Could not find selected device"),
                   Error(EERROR_INTERFACE, "InitCheck: unrecognized data format"),
                   Error(EERROR_PROGRAM, "General Program Failure")}));
  // Sent back, and never programmed.
  EXPECT_EQ(mJournal.Get(),
            (Words{"loader.RegisterCallback", "loader.Open", "loader.RegisterCallback",
                   "loader.SetProtocolType(0)", "loader.SwitchFromBLMode(false)",
                   "loader.UnregisterCallback", "loader.Close"}));
}

TEST_F(File, TheTypeDecidesWhichImagesFit) {
  mBus->devices = {Product(Board("pen", kNormalPath), false, true, Board("touch", kTouchPath))};
  // A touch image loads for a pen update, but does not fit.
  // clang-format off
  const std::vector<std::tuple<EUPDATE_TYPE, const char*, ECONTROLLER_ERROR>> rows = {
      {EUPDATE_PEN, "missing.pen", EERROR_FILE_LOAD},     {EUPDATE_PEN, "a.tav", EERROR_NONE},
      {EUPDATE_PEN, "a.touch", EERROR_FILE_MISMATCH},     {EUPDATE_TOUCH, "a.touch", EERROR_NONE},
      {EUPDATE_TOUCH, "a.pen", EERROR_FILE_MISMATCH},     {EUPDATE_PEN, "a.PEN", EERROR_NONE}};
  // clang-format on
  for (const auto& [type, file, error] : rows) {
    SCOPED_TRACE(file);
    Reset();
    ASSERT_TRUE(mController->UpdateDeviceList());
    mController->SetUpdateType(type);
    const fs::path path = mFolder / file;
    if (error != EERROR_FILE_LOAD) WriteImage(path);
    const bool fits = error == EERROR_NONE;
    EXPECT_EQ(mController->SetUpdateFile(path.string()), fits);
    EXPECT_EQ(mNotifier->mStates.Get(), (States{ESTATE_NONE, fits ? ESTATE_READY : ESTATE_NONE}));
    EXPECT_EQ(mNotifier->mErrors.Get(), fits ? Words{} : Words{Error(error, "")});
  }
  // The scalar behind the display's bridge has no board interface of its own.
  mController->SetUpdateType(EUPDATE_SCALAR_FTDI);
  EXPECT_EQ(mController->GetActiveInterface(), nullptr);
  EXPECT_EQ(mController->GetActiveFlashSectors(), 0u);
}

TEST_F(File, AutoUpdateFileAcceptsWhatTheLoadAccepts) {
  auto device = Product(Board("pen", kNormalPath), false, true);
  device->SetPenUpdate("firmware.touch");  // a touch image named for the pen
  Connect({device});
  WriteImage(mFolder / "firmware.touch");

  // No format check on this path: only the load decides.
  EXPECT_TRUE(mController->SetAutoUpdateFile("pen", mFolder.string()));
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  EXPECT_EQ(mController->GetUpdateFile(), (mFolder / "firmware.touch").string());
  EXPECT_FALSE(mController->UpdateTypeMatchesDataSource());

  // A board without an update name returns false and leaves the state alone.
  EXPECT_FALSE(mController->SetAutoUpdateFile("touch", mFolder.string()));
  EXPECT_EQ(mController->GetState(), ESTATE_READY);

  // An empty folder: the bare name, relative to the working folder.
  const std::string bare = "bare-" + std::to_string(getpid()) + ".pen";
  device->SetPenUpdate(bare);
  EXPECT_FALSE(mController->SetAutoUpdateFile("pen", ""));
  EXPECT_EQ(mController->GetUpdateFile(), bare);  // no "/" in front
  WriteImage(bare);
  EXPECT_TRUE(mController->SetAutoUpdateFile("pen", ""));
  fs::remove(bare);
}

TEST_F(Attach, OnlyTheWaitingStatesMoveAndOnlyOutsideAnUpdateDoesADetachEnd) {
  auto device = Product(Board("pen", kNormalPath), false, true, Board("touch", kTouchPath));
  device->SetScalarSupported(true);
  device->SetScalarInterface(Board("scalar", "31325:4192:1:1:1"));
  Connect({device});
  // From each state: where an attach (of any device) moves it, and whether
  // a detach of the selected product ends the run.
  // clang-format off
  const std::vector<std::tuple<ECONTROLLER_STATE, ECONTROLLER_STATE, bool>> rows = {
      {ESTATE_NONE, ESTATE_NONE, true},            {ESTATE_READY, ESTATE_READY, true},
      {ESTATE_WAIT_LOADER, ESTATE_PROGRAM, false}, {ESTATE_PROGRAM, ESTATE_PROGRAM, false},
      {ESTATE_WAIT_DEVICE, ESTATE_SUCCESS, false}, {ESTATE_SUCCESS, ESTATE_SUCCESS, true},
      {ESTATE_FAILURE, ESTATE_FAILURE, false},     {ESTATE_TERMINATE, ESTATE_TERMINATE, false}};
  // clang-format on
  for (const auto& [from, attachTo, detachEnds] : rows) {
    SCOPED_TRACE(from);
    mController->ProcessStateChange(from);
    mController->DeviceAttach("1:2:3:4:5");
    EXPECT_EQ(mController->GetState(), attachTo);
    mController->ProcessStateChange(from);
    mController->DeviceDetach(kTouchPath);
    EXPECT_EQ(mController->GetState(), detachEnds ? ESTATE_TERMINATE : from);
  }

  // A scalar path is never active, nor an unknown one, and a product that
  // switches in place never ends on a detach.
  mController->ProcessStateChange(ESTATE_READY);
  mController->DeviceDetach("31325:4192:1:1:1");
  mController->DeviceDetach("other");
  device->SetPenIntoBLMode(false);
  mController->DeviceDetach(kNormalPath);
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  // The path case does not matter.
  device->SetPenIntoBLMode(true);
  device->SetPenInterface(Board("upper", "ABC:1"));
  mController->DeviceDetach("abc:1");
  EXPECT_EQ(mController->GetState(), ESTATE_TERMINATE);
}

TEST_F(Attach, SelectionRefusesInvalidDevices) {
  auto device = Product(Board("pen", kNormalPath), false, true);
  mBus->devices = {device};
  EXPECT_FALSE(mController->SetSelectedDevice(std::shared_ptr<CDevice>()));
  EXPECT_FALSE(mController->SetSelectedDevice(std::make_shared<CDevice>()));  // no name
  EXPECT_FALSE(mController->SetSelectedDevice(kVendor, 0x100));               // list not built yet
  ASSERT_TRUE(mController->UpdateDeviceList());
  EXPECT_TRUE(mController->SetSelectedDevice(kVendor, 0x100));
  EXPECT_TRUE(mController->SetSelectedDevice(std::string(kNormalPath)));
  EXPECT_FALSE(mController->SetSelectedDevice(std::string("1:1:1:1:1")));
  EXPECT_EQ(mController->GetSelectedDevice(), device);
}

}  // namespace
}  // namespace update_test
