// The application object: launch rules, the state table, the moving text,
// the driver's stop and start, and every way out.
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <thread>

#include "common/CMainThreadLoop.h"
#include "common/CVirtualClock.h"
#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"
#include "support/LogCapture.h"
#include "update/AppDoubles.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

namespace controller_test {
namespace {

namespace fs = std::filesystem;

constexpr const char* kPath = "31325:256:16777216:1:65280";

class Application : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    // The English catalogs of this build, whatever folder the tests run from.
    setenv("LANG", "C.UTF-8", 1);
    setenv("LANGUAGE", "en", 1);
    CLinuxLanguageManager::SetLocaleDirectory(TAV_BUILD_LOCALE_DIR);
    CLanguageManager::DisposeInstance();
    mFolder = fs::temp_directory_path() /
              ("app-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    fs::create_directories(mFolder / "cfg" / "Firmware");
    std::ofstream(mFolder / "cfg" / "fw_loader.ini") << "{}";
    WriteSRecFile((mFolder / "cfg" / "Firmware" / "pen.pen").string(), 0x1000, 64);
  }
  void TearDown() override {
    OFLUpdater::DisposeInstance();
    OUpdaterClient::SetFactory(nullptr);
    CClock::Set(nullptr);
    mClock.reset();
    fs::remove_all(mFolder);
  }

  // The run's seams and the application object, as main makes them.
  FLAppDelegate& Make(std::vector<std::string> arguments_I, bool terminal_I = true) {
    SUpdaterSetup setup;
    auto bus = mBus;
    setup.makeDiscovery = [bus] { return std::make_unique<CFakeDiscovery>(bus); };
    setup.registry = mRegistry;
    setup.power = std::make_shared<CFakePower>();
    arguments_I.insert(arguments_I.begin(), "prog");
    arguments_I.push_back("-f");
    arguments_I.push_back((mFolder / "cfg" / "fw_loader.ini").string());
    setup.processArguments = arguments_I;
    OFLUpdater::Configure(std::move(setup));

    SApplicationSetup app;
    app.window = &mWindow;
    app.desktop = mDesktop;
    app.terminal = terminal_I;
    app.exitProcess = [this](int status_I) {
      mExitStatus = status_I;
      if (mLoop) mLoop->Quit();
    };
    app.printResult = [this](const std::string& line_I) {
      mResult = line_I;
      mReport.push_back(line_I);
    };
    app.printError = [this](const std::string& line_I) { mErrors.push_back(line_I); };
    mApp = std::make_unique<FLAppDelegate>(app);
    return *mApp;
  }

  // A pen that switches in place, so the update needs no re-enumeration.
  std::shared_ptr<CFakeInterface> AttachPen() {
    auto pen = std::make_shared<CFakeInterface>("pen", EHID_INTERFACE, kPath, mJournal);
    auto device = std::make_shared<CDevice>();
    device->SetDeviceName("Lab Tablet");
    device->SetPenVendorId(0x7A5D);
    device->SetPenProductId(0x100);
    device->SetPenIntoBLMode(false);
    device->SetPenFlashSectors(64);
    device->SetPenUpdate("pen.pen");
    device->SetPenInterface(pen);
    mBus->Set({device});
    return pen;
  }

  // Launches on a main loop of its own, as the program does, until the run
  // ends; false when it had not ended after ten real seconds.
  bool RunOnMainLoop(FLAppDelegate& app_I) {
    CMainThreadLoop loop;
    loop.RegisterMainThread();
    mLoop = &loop;
    std::atomic<bool> ended{false};
    std::thread watchdog([&] {
      for (int i = 0; i < 1000 && !ended; ++i) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
      }
      loop.Quit();
    });
    loop.Post([&app_I] { app_I.applicationDidFinishLaunching(); });
    loop.Run();
    const bool finished = app_I.HasTerminated();
    ended = true;
    watchdog.join();
    mLoop = nullptr;
    loop.Unregister();
    return finished;
  }

  void RunToTheEnd(FLAppDelegate& app_I) {
    app_I.applicationDidFinishLaunching();
    OFLUpdater::updater()->joinProgramThread();
  }

  static std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  std::shared_ptr<SBus> mBus = std::make_shared<SBus>();
  std::shared_ptr<CFakeRegistry> mRegistry = std::make_shared<CFakeRegistry>();
  std::shared_ptr<CFakeDesktop> mDesktop = std::make_shared<CFakeDesktop>();
  CFakeWindow mWindow;
  CJournal mJournal;
  LogCapture mCapture;
  std::unique_ptr<FLAppDelegate> mApp;
  int mExitStatus = -100;
  std::string mResult;
  std::vector<std::string> mReport;
  std::vector<std::string> mErrors;
  // A real main loop, for the runs where dispatch must not run inline.
  CMainThreadLoop* mLoop = nullptr;
  fs::path mFolder;
};

TEST_F(Application, LaunchSenderDecidesWhetherTheUserStartedUs) {
  AttachPen();
  struct SCase {
    int pid;
    std::string id;
    bool application;
    int arguments;
    bool userLaunched;
  };
  const std::vector<SCase> cases = {
      {42, "com.tavik.TabletDriver", true, 1, false},  // a program of the family
      {42, "com.tavik.helper", false, 1, false},       // its executable, not an application
      {42, "bash", false, 3, false},                   // a shell, with arguments
      {42, "bash", false, 1, true},                    // a shell, no arguments
      {42, "org.other.Files", true, 3, true},          // another maker's application
      {0, "", false, 3, true},                         // sender unknown
  };
  for (const SCase& c : cases) {
    mDesktop->mSenderPid = c.pid;
    mDesktop->mSenderId = c.id;
    mDesktop->mSenderIsApplication = c.application;
    mDesktop->mArgumentCount = c.arguments;
    mWindow.mAnswerYes = false;
    FLAppDelegate& app = Make({"-p", ""});
    app.applicationDidFinishLaunching();
    EXPECT_EQ(app.userLaunched(), c.userLaunched) << c.id << " " << c.arguments;
    OFLUpdater::DisposeInstance();
  }
}

TEST_F(Application, RefusedDeviceAccessShowsTheAccessAlertAndEnds) {
  mDesktop->mHidAccess = false;
  FLAppDelegate& app = Make({"-p", ""});
  app.applicationDidFinishLaunching();
  ASSERT_EQ(mWindow.mLastAlert.style, EALERT_STYLE_CRITICAL);
  EXPECT_EQ(mWindow.mLastAlert.message, T("200:250"));
  EXPECT_NE(mWindow.mLastAlert.message, "200:250");  // the catalog was found
  EXPECT_EQ(mWindow.mLastAlert.informativeText, T("200:255") + "\n\n" + T("200:257"));
  EXPECT_EQ(mWindow.mLastAlert.buttons, std::vector<std::string>{T("Try Again")});
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  // The driver is given back on this way out too.
  EXPECT_TRUE(mDesktop->mJournal.Contains("launch:com.tavik.TabletDriver"));
  EXPECT_TRUE(mDesktop->mJournal.Contains("notify:com.tavik.TFUCompleted"));
}

TEST_F(Application, SuccessfulRunShowsEveryStepAndEndsWithStatusZero) {
  AttachPen();
  mDesktop->mRunning["com.tavik.TabletDriver"] = {77};
  FLAppDelegate& app = Make({"-p", ""});
  RunToTheEnd(app);

  EXPECT_TRUE(mJournal.Contains("pen.ProgramBoard"));
  EXPECT_EQ(mExitStatus, 0);
  EXPECT_EQ(mResult, T("Result: the firmware was updated."));
  // The driver was stopped before the update and started after it.
  const std::vector<std::string> desktop = mDesktop->mJournal.Entries();
  ASSERT_GE(desktop.size(), 3u);
  EXPECT_EQ(desktop[0], "notify:com.tavik.removeTavikTablet.closeModalDialog");
  EXPECT_EQ(desktop[1], "quit:77");
  EXPECT_EQ(desktop.back(), "notify:com.tavik.TFUCompleted");
  EXPECT_TRUE(mDesktop->mJournal.Contains("launch:com.tavik.TabletDriver"));

  const std::vector<std::string> window = mWindow.Calls();
  auto at = [&](const std::string& call_I) {
    return std::find(window.begin(), window.end(), call_I) - window.begin();
  };
  EXPECT_LT(at("init:1"), at("ask"));
  EXPECT_TRUE(mWindow.Called("name:Lab Tablet"));
  EXPECT_TRUE(mWindow.Called("boards:Pen,"));
  EXPECT_LT(at("progress:100"), at("color:2"));
  EXPECT_LT(at("color:2"), at("text:" + T("Programming Successful")));
  EXPECT_LT(at("text:" + T("Programming Successful")),
            at("alert:" + T("Tavik Firmware Update Utility") + "|" +
               T("Firmware was successfully updated.")));
  EXPECT_TRUE(mCapture.LogContains("Firmware updater started."));
}

TEST_F(Application, WindowRunExitsWithZeroWhateverTheOutcome) {
  auto pen = AttachPen();
  pen->mProgramResult = false;
  FLAppDelegate& app = Make({"-p", ""}, /*terminal=*/false);
  RunToTheEnd(app);
  EXPECT_TRUE(mWindow.Called("text:" + T("Programming Failed")));
  EXPECT_TRUE(mWindow.Called("color:3"));
  EXPECT_EQ(mExitStatus, 0);
  EXPECT_EQ(mResult, "");
}

TEST_F(Application, TerminalStatusesTellEachOutcome) {
  {
    auto pen = AttachPen();
    pen->mProgramResult = false;
    RunToTheEnd(Make({"-p", ""}));
    EXPECT_EQ(mExitStatus, ERUN_FAILED);
    EXPECT_EQ(mResult, T("Result: the update failed."));
    OFLUpdater::DisposeInstance();
  }
  {
    AttachPen();
    mWindow.mAnswerYes = false;
    RunToTheEnd(Make({"-p", ""}));
    EXPECT_EQ(mExitStatus, ERUN_DECLINED);
    OFLUpdater::DisposeInstance();
  }
  {
    mBus->Set({});
    RunToTheEnd(Make({"-p", ""}));
    EXPECT_EQ(mExitStatus, ERUN_NO_DEVICE);
    EXPECT_TRUE(
        mWindow.Called("alert:" + T("Tavik Firmware Update Utility") + "|" +
                       T("Error: No supported tablet is connected. Please connect a tablet.")));
    OFLUpdater::DisposeInstance();
  }
  {
    AttachPen();
    mWindow.mAnswerYes = true;
    fs::remove(mFolder / "cfg" / "Firmware" / "pen.pen");
    RunToTheEnd(Make({"-p", ""}));
    EXPECT_EQ(mExitStatus, ERUN_REFUSED_FILE);
    EXPECT_NE(
        std::find(mReport.begin(), mReport.end(),
                  "  " + T("pen controller") + " of Lab Tablet: " + T("firmware file refused") +
                      ": " + (mFolder / "cfg" / "Firmware" / "pen.pen").string() +
                      ": No such file or directory"),
        mReport.end());
    OFLUpdater::DisposeInstance();
  }
  {
    // A product without the board asked for says so, not that the file is bad.
    AttachPen();
    RunToTheEnd(Make({"-b", ""}));
    EXPECT_EQ(mExitStatus, ERUN_NO_DEVICE);
    EXPECT_TRUE(mWindow.Called("alert:" + T("Tavik Firmware Update Utility") +
                               "|Error: Lab Tablet has no " + T("Bluetooth module") +
                               " to update."));
  }
}

TEST_F(Application, TerminalRunReportsEveryBoardAndCountsEachOne) {
  AttachPen();
  // Named in the configuration, but not attached.
  mBus->devices.front()->SetTouchUpdate("pen.pen");
  RunToTheEnd(Make({"-t", "", "-p", ""}));
  EXPECT_TRUE(mJournal.Contains("pen.ProgramBoard"));
  // The last board's success does not stand for the run.
  EXPECT_TRUE(mWindow.Called("alert:" + T("Tavik Firmware Update Utility") + "|" +
                             T("The last board was updated, but not every board was.")));
  EXPECT_EQ(mExitStatus, ERUN_NO_DEVICE);
  const std::string file = (mFolder / "cfg" / "Firmware" / "pen.pen").string();
  EXPECT_EQ(mReport,
            (std::vector<std::string>{
                "Updating the pen controller of Lab Tablet (" + std::string(kPath) + "), from " +
                    file + ".",
                "  touch controller of Lab Tablet: not found: the touch controller of Lab Tablet "
                "was not found",
                "  pen controller of Lab Tablet: updated",
                T("Result: no supported tablet is connected.")}));
}

TEST_F(Application, TerminalRunWhoseLoaderNeverReturnsEndsAsAFailure) {
  AttachPen();
  mBus->devices.front()->SetPenIntoBLMode(true);  // waits for a loader that never comes
  RunToTheEnd(Make({"-p", ""}));
  EXPECT_FALSE(mJournal.Contains("pen.ProgramBoard"));
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  EXPECT_EQ(
      mReport.end()[-2],
      "  pen controller of Lab Tablet: failed: the board did not reach its loader mode in time");
}

TEST_F(Application, WithoutABoardATerminalRunEndsAtOnceAndAWindowRunWaits) {
  AttachPen();
  FLAppDelegate& terminal = Make({});
  terminal.applicationDidFinishLaunching();
  EXPECT_EQ(mExitStatus, ERUN_USAGE);
  ASSERT_EQ(mErrors.size(), 1u);
  EXPECT_NE(mErrors[0].find("-p, -t, -b or -s"), std::string::npos);
  EXPECT_TRUE(mDesktop->mJournal.Entries().empty());  // the driver was never touched
  OFLUpdater::DisposeInstance();

  FLAppDelegate& window = Make({}, /*terminal=*/false);
  RunToTheEnd(window);
  EXPECT_EQ(window.state(), ESTATE_PROGRAM);
  EXPECT_FALSE(window.HasTerminated());
  EXPECT_TRUE(mWindow.Called("close:0"));  // the window cannot be closed either
  window.terminate(ERUN_DECLINED);         // from outside
  EXPECT_EQ(mExitStatus, 0);
}

TEST_F(Application, WatchThatCannotBeSetUpEndsTheRunOnARealMainLoop) {
  AttachPen();
  mRegistry->mCanWatch = false;
  ASSERT_TRUE(RunOnMainLoop(Make({"-p", ""}))) << "the run hung";
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  EXPECT_EQ(mErrors, std::vector<std::string>{T("Could not secure USB for Firmware Updater.")});
  // The terminate handler ran: the driver is back.
  EXPECT_TRUE(mDesktop->mJournal.Contains("launch:com.tavik.TabletDriver"));
  EXPECT_TRUE(mDesktop->mJournal.Contains("notify:com.tavik.TFUCompleted"));
}

TEST_F(Application, StateTableDrivesTheWindowInOrder) {
  AttachPen();
  FLAppDelegate& app = Make({"-p", ""});
  mWindow.mAnswerYes = false;
  app.presentDialog();
  const size_t before = mWindow.Calls().size();

  app.doStateMachine(ESTATE_NONE);
  app.doStateMachine(ESTATE_READY);
  app.doStateMachine(ESTATE_WAIT_DEVICE);
  const std::vector<std::string> all = mWindow.Calls();
  const std::vector<std::string> calls(all.begin() + static_cast<long>(before), all.end());
  EXPECT_EQ(calls, (std::vector<std::string>{"color:0", "ui:1", "button:0", "close:1",  // none
                                             "ui:1", "close:1", "button:1",             // ready
                                             "ui:0", "close:0",
                                             "text:" + T("Waiting for Device Mode"), "color:1"}));

  app.doStateMachine(static_cast<ECONTROLLER_STATE>(8));
  EXPECT_EQ(app.state(), 8);
  EXPECT_EQ(mWindow.Calls().size(), before + calls.size());
  EXPECT_FALSE(app.HasTerminated());

  app.doStateMachine(ESTATE_INVALID);
  EXPECT_TRUE(mWindow.Called("alert:" + T("Tavik Firmware Update Utility") + "|" +
                             T("Error: Invalid state resulted in updater termination.")));
  EXPECT_TRUE(app.HasTerminated());
}

TEST_F(Application, ProgrammingTextMovesItsDotsUntilTheStateChanges) {
  AttachPen();
  FLAppDelegate& app = Make({"-p", ""});
  app.presentDialog();
  app.doStateMachine(ESTATE_PROGRAM);
  const std::string base = "text:" + T("Updating, this may take several minutes");
  double delay = 0;
  std::vector<std::string> texts;
  for (int i = 0; i < 4; ++i) {
    mClock->Advance(0.5);
    ASSERT_TRUE(mWindow.RunDelayed(&delay));
    EXPECT_DOUBLE_EQ(delay, 0.5);
  }
  for (const std::string& call : mWindow.Calls()) {
    if (call.rfind(base, 0) == 0) texts.push_back(call.substr(base.size()));
  }
  EXPECT_EQ(texts, (std::vector<std::string>{".", "..", "...", "."}));

  // A task that comes early waits for the rest of its half second.
  mClock->Advance(0.2);
  ASSERT_TRUE(mWindow.RunDelayed());
  ASSERT_TRUE(mWindow.RunDelayed(&delay));
  EXPECT_NEAR(delay, 0.3, 1e-9);

  app.doStateMachine(ESTATE_WAIT_DEVICE);
  mClock->Advance(1.0);
  while (mWindow.RunDelayed()) {
  }
  EXPECT_FALSE(mWindow.RunDelayed());  // stopped by itself
}

class CRecordingClient : public OUpdaterClient {
 public:
  bool connectToService() override { return mConnected = true; }
  void stopLaunchDProcess(const Request& request_I) override { mStops.push_back(request_I); }
  void stopProcess(const Request& request_I) override { mStops.push_back(request_I); }
  void startLaunchDProcess(const Request& request_I) override { mStarts.push_back(request_I); }
  bool mConnected = false;
  std::vector<Request> mStops, mStarts;
};

TEST_F(Application, DriverStopsThroughTheServiceWhenThereIsOne) {
  mDesktop->mRunning["com.tavik.taviktablet"] = {5, 6};
  FLAppDelegate::stopDriver(*mDesktop);
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 2 * 2.0);  // no service: no 6-second wait

  auto client = std::make_shared<CRecordingClient>();
  OUpdaterClient::SetFactory([client] { return client; });
  const double before = mClock->GetTotalSlept();
  FLAppDelegate::stopDriver(*mDesktop);
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept() - before, 6.0);
  ASSERT_EQ(client->mStops.size(), 2u);
  EXPECT_EQ(client->mStops[0].size(), 2u);  // LaunchAgents and User
  EXPECT_EQ(client->mStops[0].at("LaunchAgents"),
            std::vector<std::string>{"com.tavik.taviktablet"});
  EXPECT_EQ(client->mStops[0].at("User"), std::vector<std::string>{std::to_string(getuid())});
  EXPECT_EQ(client->mStops[1].size(), 3u);
  EXPECT_EQ(client->mStops[1].at("BundleID"),
            (std::vector<std::string>{"com.tavik.taviktablet", "com.tavik.TavikTouchDriver",
                                      "com.tavik.TabletDriver"}));

  // Starting launches only what is not running.
  mDesktop->mRunning["com.tavik.TavikTouchDriver"] = {9};
  FLAppDelegate::startDriver(*mDesktop);
  EXPECT_EQ(client->mStarts.size(), 1u);
  EXPECT_TRUE(mDesktop->mJournal.Contains("launch:com.tavik.taviktablet"));
  EXPECT_FALSE(mDesktop->mJournal.Contains("launch:com.tavik.TavikTouchDriver"));
}

}  // namespace
}  // namespace controller_test
