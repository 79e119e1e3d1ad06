// The update controller: one update through its states, how each way it
// ends is reported, the choice of type and file, attach and detach.
#include <chrono>

#include "update/UpdateDoubles.h"

namespace update_test {
namespace {

// Keeps states, errors ("<error>:<text>"), logs and progress apart.
class CRecordingNotifier : public CUpdateNotifier {
 public:
  void UpdateLog(const std::string& text_I) override { mLogs.Add(text_I); }
  void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) override {
    mErrors.Add(Error(error_I, text_I));
  }
  void UpdateStatus(ECONTROLLER_STATE state_I) override {
    mStates.Add(state_I);
    if (mOnStatus) mOnStatus(state_I);
  }
  void UpdateProgress(unsigned int percent_I) override { mProgress.Add(percent_I); }

  CJournal mLogs, mErrors;
  CLog<ECONTROLLER_STATE> mStates;
  CLog<unsigned> mProgress;
  std::function<void(ECONTROLLER_STATE)> mOnStatus;
};

using States = std::vector<ECONTROLLER_STATE>;
using Words = std::vector<std::string>;

// One update: how the board is attached and fails, and how the run ends.
struct SRun {
  const char* name;
  std::function<void()> arrange;
  States states;  // from the file's READY on
  Words errors;
  double slept;                        // virtual seconds
  Words tail;                          // the last board calls
  std::map<std::string, long> counts;  // of board calls and log lines
};

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
    mBus->Set(std::move(devices_I));
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
    mPenAgain = Board("penAgain", kNormalPath);
    mNormalDevice = Product(mPen, false, true);
    mLoaderDevice = Product(mLoader, true, true);
    mPen->mOnSwitchTo = [this] {
      mClock->Schedule(3, [this] {
        mBus->Set({mLoaderDevice});
        mController->DeviceAttach(kLoaderPath);
      });
    };
    mLoader->mOnSwitchFrom = [this] {
      mClock->Schedule(2, [this] {
        mBus->Set({Product(mPenAgain, false, true)});
        mController->DeviceAttach(kNormalPath);
      });
    };
    Connect({mNormalDevice});
  }
  std::string ImageFile(const std::string& name_I) { return WriteImage(mFolder / name_I); }

  void Run(const std::vector<SRun>& rows_I) {
    for (const SRun& row : rows_I) {
      SCOPED_TRACE(row.name);
      Reset();
      LogCapture capture;
      row.arrange();
      ASSERT_TRUE(mController->SetUpdateFile(ImageFile("image.pen")));
      const bool success = row.states.back() == ESTATE_SUCCESS;
      EXPECT_EQ(mController->UpdateDevice(), success);
      EXPECT_EQ(mNotifier->mStates.Get(), row.states);
      EXPECT_EQ(mController->GetState(), row.states.back());
      EXPECT_EQ(mNotifier->mErrors.Get(), row.errors);
      EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), row.slept);
      const Words journal = mJournal.Get();
      ASSERT_GE(journal.size(), row.tail.size());
      EXPECT_EQ(Words(journal.end() - static_cast<long>(row.tail.size()), journal.end()), row.tail);
      for (const auto& [text, count] : row.counts) {
        EXPECT_EQ(mJournal.Count(text) + mNotifier->mLogs.Count(text), count) << text;
      }
      // No loader interface is no update and no error callback of its own.
      EXPECT_EQ(capture.AssertionContains("Oops - Could not get a loaderInterface pointer"),
                mNotifier->mLogs.Has("loaderInterface not valid."));
      if (success) {
        // Whatever the path, the board ends in its normal mode.
        EXPECT_FALSE(mController->GetSelectedDevice()->GetIsFlashLoader());
        EXPECT_FALSE(mController->GetSelectedDevice()->GetPenInterface()->GetIsFlashLoader());
      }
    }
  }

  std::unique_ptr<CRecordingNotifier> mNotifier;
  std::unique_ptr<CLinuxUpdateController> mController;
  std::shared_ptr<CFakeInterface> mPen, mLoader, mPenAgain;
  std::shared_ptr<CDevice> mNormalDevice, mLoaderDevice;
};

using Flow = ControllerTest;
using Failure = ControllerTest;
using File = ControllerTest;
using Attach = ControllerTest;

constexpr const char* kSums = "UpdateChecksums(4369,8738,13107)";

TEST_F(Flow, PenReEnumeratesIntoItsLoaderAndBack) {
  ConnectReEnumeratingPen();
  ASSERT_TRUE(mController->SetUpdateFile(ImageFile("image.pen")));

  const auto start = std::chrono::steady_clock::now();
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));

  EXPECT_EQ(mNotifier->mStates.Get(), (States{ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM,
                                              ESTATE_WAIT_DEVICE, ESTATE_SUCCESS, ESTATE_SUCCESS}));
  EXPECT_EQ(mNotifier->mErrors.Get(), Words{});
  // The attach came on the clock's thread three seconds in; the update
  // thread picked it up at the next one-second poll, and so on the way back.
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 3.0 + 2.0);
  EXPECT_TRUE(mNotifier->mLogs.Has(std::string("IMPORTANT Attach Message (") + kLoaderPath +
                                   ") STATE->ESTATE_PROGRAM"));
  EXPECT_EQ(mNotifier->mLogs.Count("Waiting for bootloader mode..."), 3);
  EXPECT_TRUE(mNotifier->mLogs.Has("Switching Pen to Loader mode... "));
  EXPECT_TRUE(mNotifier->mLogs.Has("Setting protocolType to 0"));

  // Open and switch, open the loader, init, program, leave with save, then
  // carry the loader's sums to the new normal interface.
  EXPECT_EQ(
      mJournal.Get(),
      (Words{"pen.RegisterCallback", "pen.Open", "pen.SwitchToBLMode", "loader.Open",
             "loader.RegisterCallback", "loader.SetProtocolType(0)", "loader.Init(64 bytes)",
             "loader.ProgramBoard", "loader.RegisterCallback", "loader.SwitchFromBLMode(true)",
             "penAgain.Open", "penAgain.RegisterCallback", std::string("penAgain.") + kSums,
             "penAgain.UnregisterCallback", "penAgain.Close"}));
  // Progress from the interface passes through; the run ends at 100.
  EXPECT_EQ(mNotifier->mProgress.Get(), (std::vector<unsigned>{1, 50, 100}));
  EXPECT_EQ(mController->GetSelectedDevice()->GetPenInterface(), mPenAgain);
}

TEST_F(Flow, OtherPathsEndInTheirStatesAndCalls) {
  const States inPlace = {ESTATE_READY,       ESTATE_WAIT_LOADER, ESTATE_PROGRAM,
                          ESTATE_WAIT_DEVICE, ESTATE_SUCCESS,     ESTATE_SUCCESS};
  Run({{"already in its loader: no switch, no block count check",
        [this] {
          ConnectReEnumeratingPen();
          mLoader->mBlocks = 17;  // not the 64 the product expects
          Connect({mLoaderDevice});
        },
        {ESTATE_READY, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE, ESTATE_SUCCESS, ESTATE_SUCCESS},
        {},
        2.0,
        {std::string("penAgain.") + kSums, "penAgain.UnregisterCallback", "penAgain.Close"},
        {{"Device already in loader mode", 1}, {"loader.SwitchToBLMode", 0}}},
       {"switches in place, without waiting",
        [this] { ConnectPenOf(EHID_INTERFACE, false); },
        inPlace,
        {},
        0.0,
        {"pen.SwitchFromBLMode(true)", "pen.Open", "pen.RegisterCallback",
         std::string("pen.") + kSums, "pen.UnregisterCallback", "pen.Close"},
        {{"Setting protocolType to 1", 1}, {"pen.SetProtocolType(1)", 1}}},
       {"a HID board's failed switches are only logged",
        [this] {
          ConnectPenOf(EHID_INTERFACE, false);
          mPen->mFails = {"SwitchToBLMode", "SwitchFromBLMode"};
        },
        inPlace,
        {},
        0.0,
        {std::string("pen.") + kSums, "pen.UnregisterCallback", "pen.Close"},
        {{"Error returned from SwitchToBLMode()", 1},
         {"Error returned from SwitchFromBLMode()", 1}}}});
}

TEST_F(Failure, EachFaultEndsInItsStatesErrorsAndCalls) {
  const States programFails = {ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_FAILURE};
  const Words sentBack = {"loader.SwitchFromBLMode(false)", "loader.UnregisterCallback",
                          "loader.Close"};
  auto afterInit = [&sentBack] {
    Words tail = {"loader.Init(64 bytes)"};
    tail.insert(tail.end(), sentBack.begin(), sentBack.end());
    return tail;
  };
  const std::string general = Error(EERROR_PROGRAM, "General Program Failure");
  Run({
      // No error callback and no failure state: the state stays where the
      // switch left it, and the list is never rebuilt without an attach.
      {"a loader that never comes",
       [this] {
         ConnectReEnumeratingPen();
         mPen->mOnSwitchTo = nullptr;
       },
       {ESTATE_READY, ESTATE_WAIT_LOADER},
       {},
       90.0,
       {"pen.Open", "pen.SwitchToBLMode"},
       {{"Waiting for bootloader mode...", 90},
        {"Bootloader mode timeout.", 1},
        {"loaderInterface not valid.", 1},
        {"Updating Device List...", 1}}},
      // The return wait logs nothing of its own and rebuilds the list each pass.
      {"a board that never leaves its loader",
       [this] {
         ConnectReEnumeratingPen();
         mLoader->mOnSwitchFrom = nullptr;
       },
       {ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE, ESTATE_FAILURE},
       {Error(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode")},
       3.0 + 90.0,
       {"loader.ProgramBoard", "loader.RegisterCallback", "loader.SwitchFromBLMode(true)"},
       {{"Updating Device List...", 1 + 1 + 90}, {"Device Update failed!", 1}}},
      // The board is sent back before the failure is reported.
      {"programming fails",
       [this] {
         ConnectReEnumeratingPen();
         mLoader->mFails = {"ProgramBoard"};
       },
       programFails,
       {Error(EERROR_INTERFACE, "lab: write failed"),
        Error(EERROR_INTERFACE, "Error Programming Board"), general},
       3.0,
       {"loader.ProgramBoard", sentBack[0], sentBack[1], sentBack[2]},
       {{"Device Update failed!", 1}}},
      {"the loader reports other blocks",
       [this] {
         ConnectReEnumeratingPen();
         mLoader->mBlocks = 32;
       },
       programFails,
       {Error(EERROR_INTERFACE,
              "InitCheckForSRecData: Sector/Block mismatch! Expected 64 got 32\n"),
        general},
       3.0,
       afterInit(),
       {{"loader.ProgramBoard", 0}}},
      {"the product expects no blocks at all",
       [this] {
         ConnectReEnumeratingPen();
         mNormalDevice->SetPenFlashSectors(0);
       },
       programFails,
       {Error(EERROR_INTERFACE, "InitCheckForSRecData: Sector/Block mismatch! Expected 0 got 64\n"),
        general},
       3.0,
       afterInit(),
       {}},
      {"init fails",
       [this] {
         ConnectReEnumeratingPen();
         mLoader->mFails = {"Init"};
       },
       programFails,
       {Error(EERROR_INTERFACE, "InitCheckForSRecData: Error Initializing Board"), general},
       3.0,
       afterInit(),
       {}},
      // Opened once for the switch; never again as a loader.
      {"an I2C board does not enter its loader",
       [this] {
         ConnectPenOf(EI2C_INTERFACE, true);
         mPen->mFails = {"SwitchToBLMode"};
       },
       {ESTATE_READY, ESTATE_WAIT_LOADER},
       {Error(EERROR_PROGRAM, "I2C Device failed to switch to Loader mode")},
       0.0,
       {"pen.RegisterCallback", "pen.Open", "pen.SwitchToBLMode"},
       {{"loaderInterface not valid.", 1}}},
      // Reported twice, and no waits on I2C.
      {"an I2C board does not leave its loader",
       [this] {
         ConnectPenOf(EI2C_INTERFACE, false);
         mPen->mFails = {"SwitchFromBLMode"};
       },
       {ESTATE_READY, ESTATE_WAIT_LOADER, ESTATE_PROGRAM, ESTATE_WAIT_DEVICE, ESTATE_FAILURE},
       {Error(EERROR_LEAVE_LOADER, "I2C Device failed to switch from Loader mode"),
        Error(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode")},
       0.0,
       {"pen.ProgramBoard", "pen.RegisterCallback", "pen.SwitchFromBLMode(true)"},
       {}},
      {"a board in its loader does not open",
       [this] {
         mPen = Board("pen", kNormalPath);
         mPen->mFails = {"Open"};
         Connect({Product(mPen, true, true)});
       },
       {ESTATE_READY, ESTATE_FAILURE},
       {},
       0.0,
       {"pen.RegisterCallback", "pen.Open"},
       {{"loaderInterface not valid.", 1}}},
  });
}

TEST_F(Flow, TouchLeavesItsLoaderWithSaveOnlyForTwoPenProducts) {
  for (const uint32_t penProduct : {0x100u, 855u, 856u}) {
    SCOPED_TRACE(penProduct);
    Reset();
    auto touch = Board("touch", kTouchPath);
    touch->mBlocks = 16;
    auto device = Product(Board("pen", kNormalPath), false, false, touch);
    device->SetPenProductId(penProduct);
    Connect({device});
    mController->SetUpdateType(EUPDATE_TOUCH);
    ASSERT_TRUE(mController->SetUpdateFile(ImageFile("image.touch")));
    EXPECT_TRUE(mController->UpdateDevice());
    EXPECT_TRUE(mNotifier->mLogs.Has("Switching Touch to Loader mode... "));
    const std::string save = penProduct == 0x100u ? "false" : "true";
    EXPECT_EQ(mJournal.Count("touch.SwitchFromBLMode(" + save + ")"), 1);
  }
}

TEST_F(Flow, BinaryImagesAreHandedToTheInterfaceBeforeProgramming) {
  // Bluetooth module and HID scalar of a product that switches in place.
  auto bluetooth = Board("bt", "31325:900:16777216:1:65289");
  auto device = Product(Board("pen", kNormalPath), false, false);
  device->SetBluetoothSupported(true);
  device->SetBluetoothInterface(bluetooth);
  device->SetScalarSupported(true);
  device->SetScalarInterfaceType(EHID_INTERFACE);
  device->SetScalarInterface(Board("scalar", "31325:4192:16777216:1:65280"));
  Connect({device});
  std::ofstream(mFolder / "image.airoflash", std::ios::binary) << std::string(4096, '\x5A');
  std::ofstream(mFolder / "image.bin", std::ios::binary) << std::string(4096, '\x5A');

  struct {
    EUPDATE_TYPE type;
    const char* file;
    const char* board;
    const char* handOver;
    const char* loaded;
  } rows[] = {{EUPDATE_BLUETOOTH, "image.airoflash", "bt", "SetBinaryAiroFlashData",
               "InitCheckForAiroFlashData: AeroFlash file data is loaded; we're good to go..."},
              {EUPDATE_SCALAR_HID, "image.bin", "scalar", "SetScalarBinaryData",
               "InitCheckForScalarBinaryData: Scalar Binary file data is loaded; we're good to "
               "go..."}};
  for (const auto& row : rows) {
    SCOPED_TRACE(row.file);
    mController->SetUpdateType(row.type);
    ASSERT_TRUE(mController->SetUpdateFile((mFolder / row.file).string()));
    EXPECT_TRUE(mController->UpdateDevice());
    EXPECT_TRUE(mNotifier->mLogs.Has(row.loaded));
    const std::string board = row.board;
    EXPECT_EQ(mJournal.At(board + "." + row.handOver) + 1, mJournal.At(board + ".ProgramBoard"));
  }
  // Any board that is neither pen nor touch is switched as "Bluetooth".
  EXPECT_EQ(mNotifier->mLogs.Count("Switching Bluetooth to Loader mode... "), 2);
}

TEST_F(Flow, StateIsStoredOnlyAfterTheNotifierReturns) {
  ConnectReEnumeratingPen();
  ASSERT_TRUE(mController->SetUpdateFile(ImageFile("image.pen")));
  Words seen;
  mNotifier->mOnStatus = [&](ECONTROLLER_STATE state_I) {
    seen.push_back(std::to_string(state_I) + "<-" + std::to_string(mController->GetState()));
    // An attach that arrives inside the callback is judged by the old state.
    if (state_I == ESTATE_WAIT_LOADER) mController->DeviceAttach("elsewhere");
  };
  mController->SetUpdateType(EUPDATE_PEN);
  EXPECT_EQ(seen, Words{"0<-1"});
  ASSERT_TRUE(mController->SetUpdateFile(ImageFile("again.pen")));
  EXPECT_TRUE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier->mLogs.Has("Ignored Attach Message (elsewhere)"));
  EXPECT_EQ(seen[2], "2<-1");
}

TEST_F(Failure, MissingInterfaceOrFileStopsBeforeTheDeviceIsTouched) {
  // No device selected: no main interface.
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_TRUE(mNotifier->mLogs.Has("mainInterface not valid."));
  EXPECT_TRUE(mCapture.AssertionContains("Oops - Could not get a mainInterface pointer"));

  // A device in loader mode and no file loaded. A new data source counts as
  // loaded (its fresh scalar reader says so), so the file check lets it
  // through and the update stops at the format check instead.
  auto loader = Board("loader", kLoaderPath);
  Connect({Product(loader, true, true)});
  EXPECT_FALSE(mController->UpdateDevice());
  EXPECT_EQ(mNotifier->mErrors.Get(),
            (Words{Error(EERROR_INTERFACE, "InitCheck: unrecognized data format"),
                   Error(EERROR_PROGRAM, "General Program Failure")}));
  EXPECT_FALSE(mJournal.Has("loader.ProgramBoard"));
  EXPECT_TRUE(mJournal.Has("loader.SwitchFromBLMode(false)"));
}

TEST_F(Failure, DeviceListFailuresAreNoDeviceErrors) {
  mBus->failGenerate = true;
  EXPECT_FALSE(mController->UpdateDeviceList());
  mBus->failGenerate = false;
  EXPECT_FALSE(mController->UpdateDeviceList());  // nothing attached
  EXPECT_EQ(mNotifier->mErrors.Get(),
            (Words{Error(EERROR_NO_DEVICE, "Device List Failed to Update!"),
                   Error(EERROR_NO_DEVICE, "Could not find selected device")}));
  EXPECT_EQ(mController->GetSelectedDevice(), nullptr);
}

TEST_F(File, TheTypeDecidesWhichBoardAndWhichImagesFit) {
  auto pen = Board("pen", kNormalPath);
  auto touch = Board("touch", kTouchPath);
  mBus->Set({Product(pen, false, true, touch)});
  const struct {
    EUPDATE_TYPE type;
    const char* file;
    ECONTROLLER_ERROR error;
  } rows[] = {{EUPDATE_PEN, "missing.pen", EERROR_FILE_LOAD},
              {EUPDATE_PEN, "image.touch", EERROR_FILE_MISMATCH},  // loads, but does not fit
              {EUPDATE_PEN, "image.tav", EERROR_NONE},
              {EUPDATE_TOUCH, "image.touch", EERROR_NONE},
              {EUPDATE_TOUCH, "image.pen", EERROR_FILE_MISMATCH},
              {EUPDATE_PEN, "image.PEN", EERROR_NONE}};
  for (const auto& row : rows) {
    SCOPED_TRACE(row.file);
    Reset();
    ASSERT_TRUE(mController->UpdateDeviceList());
    mController->SetUpdateType(row.type);
    const std::string path =
        row.error == EERROR_FILE_LOAD ? (mFolder / row.file).string() : ImageFile(row.file);
    const bool fits = row.error == EERROR_NONE;
    EXPECT_EQ(mController->SetUpdateFile(path), fits);
    EXPECT_EQ(mNotifier->mStates.Get(), (States{ESTATE_NONE, fits ? ESTATE_READY : ESTATE_NONE}));
    EXPECT_EQ(mNotifier->mErrors.Get(), fits ? Words{} : Words{Error(row.error, "")});
    EXPECT_TRUE(mNotifier->mLogs.Has("Update type changed to " + std::to_string(row.type)));
    EXPECT_TRUE(mNotifier->mLogs.Has("Processing update file: " + path));
  }
  EXPECT_EQ(mController->GetUpdateFileExt(), "pen");
  EXPECT_TRUE(mCapture.AssertionContains(
      "This method is deprecated; use CSRec::GetDataSourceFormat instead!"));

  // Types without a board of their own, or of this product, have no
  // interface and no sectors.
  const std::vector<std::tuple<EUPDATE_TYPE, std::shared_ptr<CFakeInterface>, uint32_t>> boards = {
      {EUPDATE_PEN, pen, 64},
      {EUPDATE_TOUCH, touch, 16},
      {EUPDATE_BLUETOOTH, nullptr, 0},
      {EUPDATE_SCALAR_FTDI, nullptr, 0}};
  for (const auto& [type, board, sectors] : boards) {
    mController->SetUpdateType(type);
    EXPECT_EQ(mController->GetActiveInterface(), board) << type;
    EXPECT_EQ(mController->GetActiveFlashSectors(), sectors) << type;
  }
}

TEST_F(File, AutoUpdateFileAcceptsWhatTheLoadAccepts) {
  auto device = Product(Board("pen", kNormalPath), false, true);
  device->SetPenUpdate("firmware.touch");  // a touch image named for the pen
  Connect({device});
  ImageFile("firmware.touch");

  // No format check on this path: only the load decides.
  EXPECT_TRUE(mController->SetAutoUpdateFile("pen", mFolder.string()));
  EXPECT_TRUE(mController->ValidAutoUpdate());
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  EXPECT_EQ(mController->GetUpdateFile(), (mFolder / "firmware.touch").string());
  EXPECT_FALSE(mController->UpdateTypeMatchesDataSource());

  // Unknown kinds, kinds in another case and boards without an update name
  // return false and leave the state alone.
  for (const char* kind : {"Pen", "touch", "stylus"}) {
    EXPECT_FALSE(mController->SetAutoUpdateFile(kind, mFolder.string())) << kind;
  }
  EXPECT_FALSE(mController->ValidAutoUpdate());
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

TEST_F(File, ScalarKindPicksTheTypeFromTheScalarInterface) {
  auto device = Product(Board("pen", kNormalPath), false, true);
  device->SetScalarUpdate("scalar.bin");
  Connect({device});
  std::ofstream(mFolder / "scalar.bin") << std::string(300, 'x');
  for (const auto& [interface, type, format] :
       {std::tuple{EHID_INTERFACE, EUPDATE_SCALAR_HID, EDS_SCALAR_BINARY},
        std::tuple{EFTDI_INTERFACE, EUPDATE_SCALAR_FTDI, EDS_SCALAR_RTDISP}}) {
    device->SetScalarInterfaceType(interface);
    mController->SetAutoUpdateFile("scalar", mFolder.string());
    EXPECT_EQ(mController->GetUpdateType(), type);
    EXPECT_EQ(mController->GetDataSource().GetDataSourceFormat(), format);
  }
}

TEST_F(Attach, OnlyTheWaitingStatesMoveAndOnlyOutsideAnUpdateDoesADetachEnd) {
  Connect({Product(Board("pen", kNormalPath), false, true, Board("touch", kTouchPath))});
  // Attach: only the state counts, not which device it is.
  const struct {
    ECONTROLLER_STATE from, attachTo;
    bool detachEnds;
  } rows[] = {{ESTATE_NONE, ESTATE_NONE, true},
              {ESTATE_READY, ESTATE_READY, true},
              {ESTATE_WAIT_LOADER, ESTATE_PROGRAM, false},
              {ESTATE_PROGRAM, ESTATE_PROGRAM, false},
              {ESTATE_WAIT_DEVICE, ESTATE_SUCCESS, false},
              {ESTATE_SUCCESS, ESTATE_SUCCESS, true},
              {ESTATE_FAILURE, ESTATE_FAILURE, false},
              {ESTATE_TERMINATE, ESTATE_TERMINATE, false}};
  for (const auto& row : rows) {
    SCOPED_TRACE(row.from);
    mController->ProcessStateChange(row.from);
    mController->DeviceAttach("1:2:3:4:5");
    EXPECT_EQ(mController->GetState(), row.attachTo);
    const char* to = row.attachTo == ESTATE_PROGRAM ? "ESTATE_PROGRAM" : "ESTATE_SUCCESS";
    EXPECT_EQ(mNotifier->mLogs.Get().back(),
              row.attachTo == row.from
                  ? "Ignored Attach Message (1:2:3:4:5)"
                  : std::string("IMPORTANT Attach Message (1:2:3:4:5) STATE->") + to);

    mController->ProcessStateChange(row.from);
    mController->DeviceDetach(kTouchPath);
    EXPECT_EQ(mController->GetState(), row.detachEnds ? ESTATE_TERMINATE : row.from);
    EXPECT_EQ(mNotifier->mLogs.Get().back(),
              std::string(row.detachEnds ? "IMPORTANT " : "Ignored ") + "Detach Message (" +
                  kTouchPath + ")" + (row.detachEnds ? " STATE->ESTATE_TERMINATE" : ""));
  }
}

TEST_F(Attach, UnimportantDetachesAreIgnored) {
  auto device = Product(Board("pen", kNormalPath), false, false);
  device->SetScalarSupported(true);
  device->SetScalarInterface(Board("scalar", "31325:4192:1:1:1"));
  Connect({device});

  mController->ProcessStateChange(ESTATE_READY);
  // A product that switches in place never terminates on a detach.
  mController->DeviceDetach(kNormalPath);
  // A scalar path is never active, nor an unknown one.
  device->SetPenIntoBLMode(true);
  mController->DeviceDetach("31325:4192:1:1:1");
  mController->DeviceDetach("other");
  EXPECT_EQ(mController->GetState(), ESTATE_READY);
  for (const std::string path : {kNormalPath, "31325:4192:1:1:1", "other"}) {
    EXPECT_EQ(mNotifier->mLogs.Count("Ignored Unimportant Detach Message (" + path + ")"), 1);
  }
  // The path case does not matter.
  device->SetPenInterface(Board("upper", "ABC:1"));
  mController->DeviceDetach("abc:1");
  EXPECT_EQ(mController->GetState(), ESTATE_TERMINATE);
}

TEST_F(Attach, SelectionRefusesInvalidDevicesAndReadsTheList) {
  auto device = Product(Board("pen", kNormalPath), false, true);
  mBus->Set({device});
  EXPECT_FALSE(mController->SetSelectedDevice(std::shared_ptr<CDevice>()));
  EXPECT_FALSE(mController->SetSelectedDevice(std::make_shared<CDevice>()));  // no name
  EXPECT_FALSE(mController->SetSelectedDevice(kVendor, 0x100));               // list not built yet
  ASSERT_TRUE(mController->UpdateDeviceList());
  EXPECT_EQ(mController->GetDeviceCount(), 1u);
  EXPECT_TRUE(mController->SetSelectedDevice(kVendor, 0x100));
  EXPECT_TRUE(mController->SetSelectedDevice(std::string(kNormalPath)));
  EXPECT_FALSE(mController->SetSelectedDevice(std::string("1:1:1:1:1")));
  EXPECT_EQ(mController->GetSelectedDevice(), device);

  EXPECT_TRUE(mController->PenAutoUpdateExists());
  EXPECT_FALSE(mController->TouchAutoUpdateExists());
  EXPECT_FALSE(mController->BluetoothAutoUpdateExists());
  EXPECT_FALSE(mController->ScalarAutoUpdateExists());
}

TEST_F(Attach, CheckDeviceListOpensAsksAndAlwaysCloses) {
  EXPECT_FALSE(mController->CheckDeviceList());
  ConnectPenOf(EHID_INTERFACE, true);
  EXPECT_TRUE(mController->CheckDeviceList());
  mPen->mFails = {"Open"};
  EXPECT_FALSE(mController->CheckDeviceList());
  EXPECT_EQ(mJournal.Get(),
            (Words{"pen.Open", "pen.IsAlive", "pen.Close", "pen.Open", "pen.Close"}));
  EXPECT_TRUE(mCapture.LogContains("CUpdateController::CheckDeviceList - checking IsAlive()"));
}

}  // namespace
}  // namespace update_test
