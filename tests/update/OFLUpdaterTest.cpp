// The updater driver: arguments, set-up, the device and update threads, and
// how status and progress reach the application.
#include <thread>

#include "scalar/DisplayUtils.h"
#include "update/UpdateDoubles.h"

namespace update_test {
namespace {

// Journals what the driver asks of the application.
class CRecordingDelegate : public CApplicationDelegate {
 public:
  bool userLaunched() const override { return mUserLaunched; }
  void doStateMachine(ECONTROLLER_STATE state_I) override { mJournal.Add("state:", state_I); }
  void updateProgressBar(double percent_I) override { mJournal.Add("bar:", percent_I); }
  void notifyDialog(const std::string& text_I) override { mJournal.Add("dialog:" + text_I); }
  void terminate(ERunOutcome outcome_I) override { mJournal.Add("terminate:", outcome_I); }
  bool mUserLaunched = true;
  CJournal mJournal;
};

class Updater : public UpdateFixture {
 protected:
  void SetUp() override {
    UpdateFixture::SetUp();
    for (const char* folder : {"prefs", "bin", "share"}) fs::create_directories(mFolder / folder);
  }
  OFLUpdater* Make(std::vector<std::string> arguments_I) {
    OFLUpdater::DisposeInstance();
    SUpdaterSetup setup = Setup(std::move(arguments_I));
    std::tie(setup.preferencesFolder, setup.executableFolder, setup.installedDataFolder) =
        std::tuple((mFolder / "prefs").string(), (mFolder / "bin").string(),
                   (mFolder / "share").string());
    setup.delegate = &mDelegate;
    OFLUpdater::Configure(std::move(setup));
    return OFLUpdater::updater();
  }

  CRecordingDelegate mDelegate;
};

TEST_F(Updater, ParseArgumentsKeepsOrderAndTakesTheNextElementBlindly) {
  using Entries = std::vector<OFLUpdater::UpdateEntry>;
  EXPECT_EQ(
      OFLUpdater::parseArguments({"prog", "-p", "", "-f", "cfg", "-t", "1:2:3:4:5", "-p", "x"}),
      (Entries{{"pen", ""}, {"touch", "1:2:3:4:5"}, {"pen", "x"}}));
  // The value of an option is not looked at: it may be another option,
  // which the walk then reads as an option too. Stray words are skipped.
  EXPECT_EQ(OFLUpdater::parseArguments({"prog", "-b", "-s", "stray", "word", "-s", "1:2:SN:255"}),
            (Entries{{"bluetooth", "-s"}, {"scalar", "stray"}, {"scalar", "1:2:SN:255"}}));
  EXPECT_EQ(OFLUpdater::parseArguments({}), Entries{});
  EXPECT_THROW(OFLUpdater::parseArguments({"prog", "-t", "", "-p"}), std::out_of_range);

  EXPECT_EQ(OFLUpdater::toHex("357"), 0x357u);
  EXPECT_EQ(OFLUpdater::toHex("0xfA"), 0xFAu);
  EXPECT_EQ(OFLUpdater::toHex(" 12zz"), 0x12u);
  EXPECT_EQ(OFLUpdater::toHex("zz"), 0u);
  EXPECT_EQ(OFLUpdater::toHex("123456789"), 0xFFFFFFFFu);
}

TEST_F(Updater, ArgumentsAndConfigurationComeFromTheParmFileOnlyWhenNotUserLaunched) {
  EXPECT_EQ(Make({"prog"})->getArgs(), Words{});  // only the program name
  // The configuration: the option, else beside the program, else installed.
  EXPECT_EQ(Make({"prog", "-p", "", "-f", "/etc/x.ini"})->configPath(), "/etc/x.ini");
  OFLUpdater* updater = Make({"prog", " -b ", "\tv\n"});
  EXPECT_EQ(updater->configPath(), (mFolder / "share" / "fw_loader.ini").string());
  std::ofstream(mFolder / "bin" / "fw_loader.ini") << "{}";
  EXPECT_EQ(updater->configPath(), (mFolder / "bin" / "fw_loader.ini").string());
  // Worked out once, at creation.
  EXPECT_EQ(updater->GetController().getConfigPath(),
            (mFolder / "share" / "fw_loader.ini").string());

  // Launched by another program, the preferences file names the boards and
  // the configuration alike, and the configuration is the one updated from.
  std::ofstream(mFolder / "prefs" / "fwupdater.parm") << "  -p  -t x  -f /opt/parm.ini\n\n";
  EXPECT_EQ(updater->getArgs(), (Words{"prog", "-b", "v"}));  // ends trimmed
  mDelegate.mUserLaunched = false;
  // Two blanks in a row give an empty element.
  EXPECT_EQ(updater->getArgs(), (Words{"prog", "-p", "", "-t", "x", "", "-f", "/opt/parm.ini"}));
  EXPECT_EQ(Make({"prog"})->GetController().getConfigPath(), "/opt/parm.ini");
}

TEST_F(Updater, SetupGivesUpWithoutADeviceAWatchOrAValueForTheLastOption) {
  // Six tries of the device list, one second apart.
  EXPECT_FALSE(Make({"prog", "-p", ""})->setupUpdate());
  EXPECT_DOUBLE_EQ(mClock->Now(), 1.0 + 5.0);
  EXPECT_FALSE(OFLUpdater::updater()->isCommandLine());

  // The device thread must not dispatch to the main thread, which is this
  // one, still inside setupUpdate: a dispatch would wait forever.
  AttachPen();
  mRegistry->mCanWatch = false;
  EXPECT_FALSE(Make({"prog", "-p", ""})->setupUpdate());
  EXPECT_TRUE(OFLUpdater::updater()->watchFailed());
  EXPECT_FALSE(OFLUpdater::updater()->isCommandLine());
  EXPECT_EQ(mDelegate.mJournal.Get(), Words{});

  mRegistry->mCanWatch = true;
  EXPECT_FALSE(Make({"prog", "-p", "", "-t"})->setupUpdate());
  EXPECT_EQ(
      mDelegate.mJournal.Get(),
      (Words{"dialog:Error: An option at the end of the arguments has no value.", "terminate:1"}));
}

TEST_F(Updater, SetupWaitsForTheDeviceWatchWithoutBoundAndGoesOnOnceItStands) {
  AttachPen();
  std::promise<void> watchReady;
  mRegistry->mWatchReady = watchReady.get_future().share();
  std::atomic<bool> setupDone{false};
  std::atomic<bool> stillWaiting{false};
  // The task holds the virtual clock until the watch stands: standing
  // takes real time, which must not show as virtual passes.
  mClock->Schedule(3600.0, [&] {
    stillWaiting = !setupDone;
    watchReady.set_value();
    while (!mRegistry->mWatchRunning) std::this_thread::yield();
  });
  const bool ready = Make({"prog", "-p", ""})->setupUpdate();
  setupDone = true;
  EXPECT_TRUE(stillWaiting) << "gave up within the hour";
  EXPECT_TRUE(ready);
  EXPECT_LE(mClock->Now(), 3600.0 + 2.0) << "went on waiting once the watch stood";
}

TEST_F(Updater, SetupParsesTheArgumentsOnceTheWatchStandsAndTheWatchFilters) {
  AttachPen();
  OFLUpdater* updater = Make({"prog", "-p", "", "-t", ""});
  ASSERT_TRUE(updater->setupUpdate());
  EXPECT_TRUE(updater->isCommandLine());
  EXPECT_EQ(updater->deviceUpdates().size(), 2u);

  // Attach and detach of the family's interfaces of these usages (usage,
  // page) reach the controller; another usage or vendor does not.
  CUpdateController& controller = updater->GetController();
  // clang-format off
  const std::vector<std::tuple<uint32_t, uint32_t, uint32_t>> rows = {
      {kVendor, 0x01, 0x000D}, {kVendor, 0x01, 0xFF00}, {kVendor, 0x05, 0xFF00},
      {kVendor, 0x11, 0xFF00}, {kVendor, 0x80, 0xFF00}, {kVendor, 0x80, 0xFF01},
      {kVendor, 0x11, 0xFF09}, {kVendor, 0x01, 0xFF0D}, {kVendor, 0x02, 0xFF0D},
      {kVendor, 0x02, 0x0001}, {0x1234, 0x01, 0xFF00}};
  // clang-format on
  for (const auto& [vendor, usage, page] : rows) {
    controller.ProcessStateChange(ESTATE_WAIT_LOADER);
    updater->DeviceAdded({vendor, 0x101, 1, usage, page});
    EXPECT_EQ(controller.GetState(),
              vendor == kVendor && page != 1 ? ESTATE_PROGRAM : ESTATE_WAIT_LOADER)
        << usage << " " << page;
  }
  mBus->devices.front()->SetPenIntoBLMode(true);  // now the pen's detach ends the run
  controller.ProcessStateChange(ESTATE_READY);
  updater->DeviceRemoved({kVendor, 0x100, 16777216, 0x01, 0xFF00});
  EXPECT_EQ(controller.GetState(), ESTATE_TERMINATE);
}

TEST_F(Updater, TheUpdateThreadTellsTheApplicationEveryStep) {
  const std::string config = WriteConfig();
  const Words ready = {"state:3", "state:0", "state:0", "state:1"};
  Words updated = ready;
  for (const char* step : {"state:2", "state:3", "bar:1.000000", "bar:50.000000", "state:4",
                           "state:5", "state:5", "bar:100.000000"}) {
    updated.push_back(step);
  }
  // The pen's option, whether power stays on, the seconds of the update
  // thread and what the application was told.
  // clang-format off
  const std::vector<std::tuple<const char*, Words, bool, double, Words>> rows = {
    {"an update, under a power assertion", {"-p", ""}, false, 0.0, updated},
    {"no power assertion, no update", {"-p", ""}, true, 0.0, ready},
    // Five one-second tries to select the path, then the board found.
    {"an unknown path", {"-p", "1:2:3:4:5"}, false, 5.0, updated},
  };
  // clang-format on
  for (const auto& [name, option, refusePower, seconds, delegate] : rows) {
    SCOPED_TRACE(name);
    AttachPen();
    mPower->mRefuse = refusePower;
    mPower->mRequests = 0;
    mDelegate.mJournal.Clear();
    mJournal.Clear();
    Words arguments = {"prog", "-f", config};
    arguments.insert(arguments.end(), option.begin(), option.end());
    OFLUpdater* updater = Make(arguments);
    ASSERT_TRUE(updater->setupUpdate());
    const double before = mClock->Now();
    updater->boardProgram();
    updater->joinProgramThread();
    EXPECT_DOUBLE_EQ(mClock->Now() - before, seconds);
    EXPECT_EQ(mDelegate.mJournal.Get(), delegate);
    EXPECT_EQ(mJournal.Has("pen.ProgramBoard"), !refusePower);
    EXPECT_EQ(mPower->mRequests, 1);
    EXPECT_EQ(mPower->mHeld, 0);  // released after the update
    // The file is the one beside the configuration.
    EXPECT_EQ(updater->GetController().GetUpdateFile(),
              (mFolder / "cfg" / "Firmware" / "pen.pen").string());
  }
}

TEST_F(Updater, ProgressIsOneBarAndOnlyTheLastSuccessIsShown) {
  AttachPen();
  OFLUpdater* updater = Make({"prog", "-p", "", "-t", ""});
  ASSERT_TRUE(updater->setupUpdate());
  updater->setUpdateIndex(1);
  updater->callBackProgress(50);
  // A success that is not the last is held 3.5 s and never shown.
  const double before = mClock->Now();
  updater->callBackStatus(ESTATE_SUCCESS);
  EXPECT_DOUBLE_EQ(mClock->Now() - before, 3.5);
  updater->setUpdateIndex(2);
  updater->callBackProgress(50);
  updater->callBackStatus(ESTATE_SUCCESS);
  EXPECT_EQ(mDelegate.mJournal.Get(), (Words{"bar:25.000000", "bar:75.000000", "state:5"}));
}

TEST_F(Updater, AutoConfigBuildsArgumentsForTheNamedBoardsOfTheNamedProducts) {
  AttachPen();
  mBus->devices[0]->SetScalarProductId(0x1060);
  // Two of the family's displays; only the first is this product's.
  struct : CDisplays {
    std::vector<SDisplay> List() const override {
      return {{"a", {}, 0x5B27, 0x1060, "SER1", "Lab"}, {"b", {}, 0x5B27, 0x1061, "SER2", "Lab"}};
    }
  } displays;
  DisplayUtils::SetDisplays(&displays);
  OFLUpdater* updater = Make({"prog", "-p", ""});
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), Words{});  // no watch yet
  ASSERT_TRUE(updater->setupUpdate());
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), Words{});  // no rule file

  std::ofstream(mFolder / "bin" / "autoconfig.ini")
      << R"({"auto": ["touch", "pen", 7, "scalar"], "product": ["0x100", "FFFF", 3]})";
  // The touch board is absent; the pen and the display match product 0x100.
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(),
            (Words{(mFolder / "bin" / "tavik-fwupdater").string(), "-p", kNormalPath, "-s",
                   "23335:4192:SER1:255"}));
  std::ofstream(mFolder / "bin" / "autoconfig.ini") << R"({"auto": ["pen"]})";
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), Words{});
  DisplayUtils::SetDisplays(nullptr);
}

TEST_F(Updater, UpdateDeviceListMakesUpForAMissedReEnumeration) {
  AttachPen();
  OFLUpdater* updater = Make({"prog", "-p", ""});
  ASSERT_TRUE(updater->setupUpdate());
  CUpdateController& controller = updater->GetController();

  // On the way to the loader, the one present interface is the loader.
  const DeviceInfo loader{kVendor, 0x101, 7, 1, 0xFF00};
  mRegistry->mEntries = {SHidEntry{loader, "/dev/hidraw1", 0, 0, 0}};
  controller.ProcessStateChange(ESTATE_WAIT_LOADER);
  updater->updateDeviceList(true);
  EXPECT_EQ(controller.GetState(), ESTATE_PROGRAM);

  // Two present interfaces: nothing is made up.
  mRegistry->mEntries = {SHidEntry{loader, "/dev/hidraw1", 0, 0, 0},
                         SHidEntry{{kVendor, 0x100, 7, 1, 0xFF00}, "/dev/hidraw2", 0, 0, 0}};
  controller.ProcessStateChange(ESTATE_WAIT_DEVICE);
  updater->updateDeviceList(false);
  EXPECT_EQ(controller.GetState(), ESTATE_WAIT_DEVICE);
  EXPECT_TRUE(mDelegate.mJournal.Has("state:2"));
}

}  // namespace
}  // namespace update_test
