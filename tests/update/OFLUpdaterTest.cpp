// The updater driver: arguments, set-up, the device and update threads, and
// how status and progress reach the application.
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "common/CVirtualClock.h"
#include "devices/IOUtils.h"
#include "support/LogCapture.h"
#include "update/OFLUpdater.h"
#include "update/UpdaterDoubles.h"

namespace controller_test {
namespace {

namespace fs = std::filesystem;

constexpr uint32_t kVendor = 0x7A5D;

class Updater : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    mFolder = fs::temp_directory_path() /
              ("updater-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    fs::create_directories(mFolder / "prefs");
    fs::create_directories(mFolder / "bin");
    fs::create_directories(mFolder / "share");
  }

  void TearDown() override {
    OFLUpdater::DisposeInstance();
    CClock::Set(nullptr);
    mClock.reset();
    fs::remove_all(mFolder);
  }

  OFLUpdater* Make(std::vector<std::string> arguments_I) {
    SUpdaterSetup setup;
    auto bus = mBus;
    setup.makeDiscovery = [bus] { return std::make_unique<CFakeDiscovery>(bus); };
    setup.registry = mRegistry;
    setup.power = mPower;
    setup.processArguments = std::move(arguments_I);
    setup.preferencesFolder = (mFolder / "prefs").string();
    setup.executableFolder = (mFolder / "bin").string();
    setup.installedDataFolder = (mFolder / "share").string();
    setup.delegate = &mDelegate;
    OFLUpdater::Configure(std::move(setup));
    return OFLUpdater::updater();
  }

  // A product whose pen interface has the watched usage, with an update
  // name for the pen, and its firmware file beside the configuration.
  std::shared_ptr<CDevice> AttachProduct(const std::string& penUpdate_I = "pen.pen") {
    auto pen = std::make_shared<CFakeInterface>("pen", EHID_INTERFACE, kPath, mJournal);
    auto device = std::make_shared<CDevice>();
    device->SetDeviceName("Lab Tablet");
    device->SetPenVendorId(kVendor);
    device->SetPenProductId(0x100);
    device->SetPenIntoBLMode(false);  // switches in place: no re-enumeration
    device->SetPenFlashSectors(64);
    device->SetPenUpdate(penUpdate_I);
    device->SetPenInterface(pen);
    mBus->Set({device});
    return device;
  }

  std::string WriteConfigWithFirmware(const std::string& firmware_I) {
    fs::create_directories(mFolder / "cfg" / "Firmware");
    const std::string config = (mFolder / "cfg" / "fw_loader.ini").string();
    std::ofstream(config) << "{}";
    WriteSRecFile((mFolder / "cfg" / "Firmware" / firmware_I).string(), 0x1000, 64);
    return config;
  }

  static constexpr const char* kPath = "31325:256:16777216:1:65280";

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  std::shared_ptr<SBus> mBus = std::make_shared<SBus>();
  std::shared_ptr<CFakeRegistry> mRegistry = std::make_shared<CFakeRegistry>();
  std::shared_ptr<CFakePower> mPower = std::make_shared<CFakePower>();
  CRecordingDelegate mDelegate;
  CJournal mJournal;
  LogCapture mCapture;
  fs::path mFolder;
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
}

TEST_F(Updater, GetArgsReadsTheParmFileOnlyWhenNotUserLaunched) {
  std::ofstream(mFolder / "prefs" / "fwupdater.parm") << "  -p  -t x\n\n";
  OFLUpdater* updater = Make({"prog", " -b ", "\tv\n"});

  mDelegate.mUserLaunched = true;
  EXPECT_EQ(updater->getArgs(), (std::vector<std::string>{"prog", "-b", "v"}));

  // Two blanks in a row give an empty element; ends are trimmed.
  mDelegate.mUserLaunched = false;
  EXPECT_EQ(updater->getArgs(), (std::vector<std::string>{"prog", "-p", "", "-t", "x"}));
  EXPECT_EQ(OFLUpdater::parseArguments(updater->getArgs()),
            (std::vector<OFLUpdater::UpdateEntry>{{"pen", ""}, {"touch", "x"}}));
}

TEST_F(Updater, GetArgsWithOnlyTheProgramNameIsEmpty) {
  OFLUpdater* updater = Make({"prog"});
  EXPECT_EQ(updater->getArgs(), std::vector<std::string>{});
}

TEST_F(Updater, ConfigPathPrefersTheOptionThenBesideTheProgramThenTheInstallation) {
  EXPECT_EQ(Make({"prog", "-p", "", "-f", "/etc/x.ini"})->configPath(), "/etc/x.ini");
  OFLUpdater::DisposeInstance();

  OFLUpdater* updater = Make({"prog", "-p", ""});
  EXPECT_EQ(updater->configPath(), (mFolder / "share" / "fw_loader.ini").string());
  std::ofstream(mFolder / "bin" / "fw_loader.ini") << "{}";
  EXPECT_EQ(updater->configPath(), (mFolder / "bin" / "fw_loader.ini").string());
  // Worked out once, at creation.
  EXPECT_EQ(updater->GetController().getConfigPath(),
            (mFolder / "share" / "fw_loader.ini").string());
  OFLUpdater::DisposeInstance();

  // Launched by another program, the preferences file names the boards and
  // the configuration alike, and the configuration is the one updated from.
  std::ofstream(mFolder / "prefs" / "fwupdater.parm") << "-p  -f /opt/parm.ini";
  mDelegate.mUserLaunched = false;
  EXPECT_EQ(Make({"prog"})->GetController().getConfigPath(), "/opt/parm.ini");
}

TEST_F(Updater, ToHexReadsLeadingHexDigits) {
  EXPECT_EQ(OFLUpdater::toHex("357"), 0x357u);
  EXPECT_EQ(OFLUpdater::toHex("0xfA"), 0xFAu);
  EXPECT_EQ(OFLUpdater::toHex(" 12zz"), 0x12u);
  EXPECT_EQ(OFLUpdater::toHex("zz"), 0u);
  EXPECT_EQ(OFLUpdater::toHex("123456789"), 0xFFFFFFFFu);
}

TEST_F(Updater, SetupUpdateRetriesTheDeviceListSixTimesThenGivesUp) {
  OFLUpdater* updater = Make({"prog", "-p", ""});
  EXPECT_FALSE(updater->setupUpdate());
  EXPECT_DOUBLE_EQ(mClock->Now(), 1.0 + 5.0);
  EXPECT_FALSE(updater->isCommandLine());
}

TEST_F(Updater, SetupUpdateParsesTheArgumentsOnceTheWatchStands) {
  AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", "", "-t", ""});
  ASSERT_TRUE(updater->setupUpdate());
  EXPECT_TRUE(updater->isCommandLine());
  EXPECT_EQ(updater->deviceUpdates().size(), 2u);

  // Attach and detach of watched interfaces reach the controller; others do not.
  DeviceInfo watched{kVendor, 0x101, 1, 0x01, 0xFF00};
  DeviceInfo otherUsage{kVendor, 0x101, 1, 0x02, 0x0001};
  DeviceInfo otherVendor{0x1234, 0x101, 1, 0x01, 0xFF00};
  mRegistry->Deliver(true, otherUsage);
  mRegistry->Deliver(true, otherVendor);
  updater->GetController().ProcessStateChange(ESTATE_WAIT_LOADER);
  mRegistry->Deliver(true, watched);
  EXPECT_EQ(updater->GetController().GetState(), ESTATE_PROGRAM);
}

TEST_F(Updater, NoArgumentsStillCountsAsCommandLineWithNothingToDo) {
  AttachProduct();
  OFLUpdater* updater = Make({"prog"});
  ASSERT_TRUE(updater->setupUpdate());
  EXPECT_TRUE(updater->isCommandLine());
  updater->boardProgram();
  updater->joinProgramThread();
  EXPECT_EQ(mDelegate.mJournal.Entries(), std::vector<std::string>{"state:3"});
  EXPECT_EQ(mPower->mRequests, 0);
}

TEST_F(Updater, OptionInLastPlaceEndsTheRunWithAMessage) {
  AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", "", "-t"});
  EXPECT_FALSE(updater->setupUpdate());
  EXPECT_EQ(mDelegate.mJournal.Entries(),
            (std::vector<std::string>{
                "dialog:Error: An option at the end of the arguments has no value.", "terminate"}));
}

TEST_F(Updater, WatchThatCannotBeSetUpEndsSetupWithoutWaitingOnTheMainThread) {
  mRegistry->mCanWatch = false;
  AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", ""});
  // The device thread must not dispatch to the main thread, which is this
  // one, still inside setupUpdate: a dispatch would wait forever.
  EXPECT_FALSE(updater->setupUpdate());
  EXPECT_TRUE(updater->watchFailed());
  EXPECT_TRUE(mCapture.LogContains("Could not secure USB for Firmware Updater."));
  EXPECT_FALSE(updater->isCommandLine());
  EXPECT_FALSE(mDelegate.mJournal.Contains("terminate"));
}

TEST_F(Updater, UpdateRunsWithThePowerAssertionAndFileFromTheFirmwareFolder) {
  AttachProduct();
  const std::string config = WriteConfigWithFirmware("pen.pen");
  OFLUpdater* updater = Make({"prog", "-p", "", "-f", config});
  ASSERT_TRUE(updater->setupUpdate());
  updater->boardProgram();
  updater->joinProgramThread();

  EXPECT_EQ(mPower->mLastName, "Updating Tavik tablet firmware");
  EXPECT_EQ(mPower->mHeld, 0);  // released after the update
  EXPECT_TRUE(mJournal.Contains("pen.ProgramBoard"));
  EXPECT_EQ(updater->GetController().GetUpdateFile(),
            (mFolder / "cfg" / "Firmware" / "pen.pen").string());
  EXPECT_TRUE(mDelegate.mJournal.Contains("state:5"));
  EXPECT_EQ(mDelegate.mJournal.Entries().back(), "bar:100.000000");
}

TEST_F(Updater, RefusedPowerAssertionSkipsTheUpdate) {
  AttachProduct();
  mPower->mRefuse = true;
  const std::string config = WriteConfigWithFirmware("pen.pen");
  OFLUpdater* updater = Make({"prog", "-p", "", "-f", config});
  ASSERT_TRUE(updater->setupUpdate());
  updater->boardProgram();
  updater->joinProgramThread();
  EXPECT_FALSE(mJournal.Contains("pen.ProgramBoard"));
}

TEST_F(Updater, UnknownDevicePathCostsFiveSecondsThenUpdatesTheSelection) {
  AttachProduct();
  const std::string config = WriteConfigWithFirmware("pen.pen");
  OFLUpdater* updater = Make({"prog", "-p", "1:2:3:4:5", "-f", config});
  ASSERT_TRUE(updater->setupUpdate());
  const double before = mClock->Now();
  updater->boardProgram();
  updater->joinProgramThread();
  EXPECT_DOUBLE_EQ(mClock->Now() - before, 5.0);
  EXPECT_TRUE(mJournal.Contains("pen.ProgramBoard"));
}

TEST_F(Updater, RefusedAutoUpdateFileShowsTheDialogAndEnds) {
  AttachProduct("missing.pen");
  const std::string config = WriteConfigWithFirmware("pen.pen");
  OFLUpdater* updater = Make({"prog", "-p", "", "-f", config});
  ASSERT_TRUE(updater->setupUpdate());
  updater->boardProgram();
  updater->joinProgramThread();
  EXPECT_TRUE(mDelegate.mJournal.Contains(
      "dialog:Error: The specified file does not appear to be a valid firmware file."));
  EXPECT_TRUE(mDelegate.mJournal.Contains("terminate"));
  EXPECT_EQ(mDelegate.mOutcome, ERUN_REFUSED_FILE);
  EXPECT_FALSE(mJournal.Contains("pen.ProgramBoard"));
}

TEST_F(Updater, ProgressIsOneBarAndOnlyTheLastSuccessIsShown) {
  AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", "", "-t", ""});
  ASSERT_TRUE(updater->setupUpdate());

  updater->setUpdateIndex(1);
  updater->callBackProgress(50);
  EXPECT_TRUE(mDelegate.mJournal.Contains("bar:25.000000"));

  const double before = mClock->Now();
  updater->callBackStatus(ESTATE_SUCCESS);
  EXPECT_DOUBLE_EQ(mClock->Now() - before, 3.5);
  EXPECT_FALSE(mDelegate.mJournal.Contains("state:5"));

  updater->setUpdateIndex(2);
  updater->callBackProgress(50);
  EXPECT_TRUE(mDelegate.mJournal.Contains("bar:75.000000"));
  updater->callBackStatus(ESTATE_SUCCESS);
  EXPECT_TRUE(mDelegate.mJournal.Contains("state:5"));
}

TEST_F(Updater, AutoConfigBuildsArgumentsForTheNamedBoardsOfTheNamedProducts) {
  AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", ""});
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), std::vector<std::string>{});  // no watch yet
  ASSERT_TRUE(updater->setupUpdate());
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), std::vector<std::string>{});  // no rule file

  std::ofstream(mFolder / "bin" / "autoconfig.ini")
      << R"({"auto": ["touch", "pen", 7, "pen"], "product": ["0x100", "FFFF", 3]})";
  // The touch board is absent; the pen matches product 0x100, once per word.
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(),
            (std::vector<std::string>{(mFolder / "bin" / "tavik-fwupdater").string(), "-p", kPath,
                                      "-p", kPath}));

  std::ofstream(mFolder / "bin" / "autoconfig.ini") << R"({"auto": ["pen"]})";
  EXPECT_EQ(updater->createArgumentsFromAutoConfig(), std::vector<std::string>{});
}

TEST_F(Updater, UpdateDeviceListMakesUpForAMissedReEnumeration) {
  auto device = AttachProduct();
  OFLUpdater* updater = Make({"prog", "-p", ""});
  ASSERT_TRUE(updater->setupUpdate());
  CUpdateController& controller = updater->GetController();

  // On the way to the loader, the one present interface is the loader.
  const DeviceInfo loader{kVendor, 0x101, 7, 1, 0xFF00};
  mRegistry->SetEntries({SHidEntry{loader, "/dev/hidraw1", 0, 0, 0}});
  controller.ProcessStateChange(ESTATE_WAIT_LOADER);
  updater->updateDeviceList(true);
  EXPECT_EQ(controller.GetState(), ESTATE_PROGRAM);

  // Two present interfaces: nothing is made up.
  mRegistry->SetEntries({SHidEntry{loader, "/dev/hidraw1", 0, 0, 0},
                         SHidEntry{{kVendor, 0x100, 7, 1, 0xFF00}, "/dev/hidraw2", 0, 0, 0}});
  controller.ProcessStateChange(ESTATE_WAIT_DEVICE);
  updater->updateDeviceList(false);
  EXPECT_EQ(controller.GetState(), ESTATE_WAIT_DEVICE);
  EXPECT_TRUE(mDelegate.mJournal.Contains("state:2"));
}

}  // namespace
}  // namespace controller_test
