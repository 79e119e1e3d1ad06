// The application object: launch rules, the state table, the moving text,
// the driver's stop and start, and every way out.
#include <future>
#include <thread>

#include "common/CMainThreadLoop.h"
#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"
#include "update/UpdateDoubles.h"

namespace update_test {
namespace {

class Application : public UpdateFixture {
 protected:
  void SetUp() override {
    UpdateFixture::SetUp();
    // The English catalogs of this build, whatever folder the tests run from.
    setenv("LANG", "C.UTF-8", 1);
    setenv("LANGUAGE", "en", 1);
    CLinuxLanguageManager::SetLocaleDirectory(TAV_BUILD_LOCALE_DIR);
    CLanguageManager::DisposeInstance();
    mConfig = WriteConfig();
  }

  // The run's seams and the application object, as main makes them.
  FLAppDelegate& Make(std::vector<std::string> arguments_I, bool terminal_I = true) {
    OFLUpdater::DisposeInstance();
    arguments_I.insert(arguments_I.begin(), "prog");
    arguments_I.insert(arguments_I.end(), {"-f", mConfig});
    OFLUpdater::Configure(Setup(arguments_I));
    mWindow.mCalls.Clear();
    mDesktop->mJournal.Clear();
    mReport.clear();
    mErrors.clear();
    mExitStatus = -100;
    mApp = std::make_unique<FLAppDelegate>(SApplicationSetup{
        .window = &mWindow,
        .desktop = mDesktop,
        .terminal = terminal_I,
        .exitProcess =
            [this](int status_I) {
              mExitStatus = status_I;
              if (mLoop) mLoop->Quit();
            },
        .printResult = [this](const std::string& line_I) { mReport.push_back(line_I); },
        .printError = [this](const std::string& line_I) { mErrors.push_back(line_I); }});
    return *mApp;
  }

  void RunToTheEnd(FLAppDelegate& app_I) {
    app_I.applicationDidFinishLaunching();
    OFLUpdater::updater()->joinProgramThread();
  }

  static std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }
  static std::string Alert(const std::string& text_I) {
    return "alert:" + T("Tavik Firmware Update Utility") + "|" + text_I;
  }

  std::string mConfig;
  std::shared_ptr<CFakeDesktop> mDesktop = std::make_shared<CFakeDesktop>();
  CFakeWindow mWindow;
  std::unique_ptr<FLAppDelegate> mApp;
  int mExitStatus = -100;
  Words mReport, mErrors;
  CMainThreadLoop* mLoop = nullptr;  // when the run has a real main loop
};

TEST_F(Application, LaunchSenderDecidesWhetherTheUserStartedUs) {
  AttachPen();
  // The sender's pid, its id, whether it is an application, our argument
  // count, and whether the user started us.
  const std::vector<std::tuple<int, std::string, bool, int, bool>> rows = {
      {42, "com.tavik.TabletDriver", true, 1, false},  // a program of the family
      {42, "com.tavik.helper", false, 1, false},       // its executable, not an application
      {42, "bash", false, 3, false},                   // a shell, with arguments
      {42, "bash", false, 1, true},                    // a shell, no arguments
      {42, "org.other.Files", true, 3, true},          // another maker's application
      {0, "", false, 3, true},                         // sender unknown
  };
  mWindow.mAnswerYes = false;
  for (const auto& [pid, id, application, arguments, userLaunched] : rows) {
    SCOPED_TRACE(id + " " + std::to_string(arguments));
    std::tie(mDesktop->mSenderPid, mDesktop->mSenderId, mDesktop->mSenderIsApplication,
             mDesktop->mArgumentCount) = std::tie(pid, id, application, arguments);
    FLAppDelegate& app = Make({"-p", ""});
    app.applicationDidFinishLaunching();
    EXPECT_EQ(app.userLaunched(), userLaunched);
  }
}

TEST_F(Application, RefusedDeviceAccessShowsTheAccessAlertAndEnds) {
  mDesktop->mHidAccess = false;
  Make({"-p", ""}).applicationDidFinishLaunching();
  ASSERT_EQ(mWindow.mLastAlert.style, EALERT_STYLE_CRITICAL);
  EXPECT_EQ(mWindow.mLastAlert.message, T("200:250"));
  EXPECT_NE(mWindow.mLastAlert.message, "200:250");  // the catalog was found
  EXPECT_EQ(mWindow.mLastAlert.informativeText, T("200:255") + "\n\n" + T("200:257"));
  EXPECT_EQ(mWindow.mLastAlert.buttons, Words{T("Try Again")});
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  // The driver is given back on this way out too.
  EXPECT_TRUE(mDesktop->mJournal.Has("launch:com.tavik.TabletDriver"));
  EXPECT_EQ(mDesktop->mJournal.Get().back(), "notify:com.tavik.TFUCompleted");
}

TEST_F(Application, SuccessfulRunShowsEveryStepAndEndsWithStatusZero) {
  AttachPen();
  mDesktop->mRunning["com.tavik.TabletDriver"] = {77};
  RunToTheEnd(Make({"-p", ""}));
  EXPECT_TRUE(mJournal.Has("pen.ProgramBoard"));
  EXPECT_EQ(mExitStatus, 0);
  EXPECT_EQ(mReport.back(), T("Result: the firmware was updated."));
  // The driver was stopped before the update and started after it.
  EXPECT_EQ(mDesktop->mJournal.Get(),
            (Words{"notify:com.tavik.removeTavikTablet.closeModalDialog", "quit:77",
                   "launch:com.tavik.taviktablet", "launch:com.tavik.TabletDriver",
                   "launch:com.tavik.TavikTouchDriver", "notify:com.tavik.TFUCompleted"}));

  const CJournal& window = mWindow.mCalls;
  EXPECT_LT(window.At("init:1"), window.At("ask"));
  EXPECT_TRUE(window.Has("name:Lab Tablet"));
  EXPECT_TRUE(window.Has("boards:Pen,"));
  EXPECT_LT(window.At("progress:100"), window.At("color:2"));
  EXPECT_LT(window.At("color:2"), window.At("text:" + T("Programming Successful")));
  EXPECT_LT(window.At("text:" + T("Programming Successful")),
            window.At(Alert(T("Firmware was successfully updated."))));
  EXPECT_TRUE(mCapture.LogContains("Firmware updater started."));
}

TEST_F(Application, TerminalStatusesTellEachOutcome) {
  const std::string file = (mFolder / "cfg" / "Firmware" / "pen.pen").string();
  const auto none = [](CFakeInterface&) {};
  // What changes, the status, and a line of the report or a dialog shown.
  // clang-format off
  const std::vector<std::tuple<const char*, Words, std::function<void(CFakeInterface&)>, int,
                               std::string>> rows = {
    {"programming fails", {"-p", ""},
     [](CFakeInterface& pen_I) { pen_I.mFails = {"ProgramBoard"}; }, ERUN_FAILED,
     "  pen controller of Lab Tablet: failed: lab: write failed"},
    {"the user says no", {"-p", ""}, [this](CFakeInterface&) { mWindow.mAnswerYes = false; },
     ERUN_DECLINED, "ask"},
    {"no tablet", {"-p", ""}, [this](CFakeInterface&) { mBus->devices = {}; }, ERUN_NO_DEVICE,
     Alert(T("Error: No supported tablet is connected. Please connect a tablet."))},
    {"no firmware file", {"-p", ""}, [&file](CFakeInterface&) { fs::remove(file); },
     ERUN_REFUSED_FILE,
     "  " + T("pen controller") + " of Lab Tablet: " + T("firmware file refused") + ": " + file +
         ": No such file or directory"},
    // A product without the board asked for says so, not that the file is bad.
    {"no such board", {"-b", ""}, none, ERUN_NO_DEVICE,
     Alert("Error: Lab Tablet has no " + T("Bluetooth module") + " to update.")},
    {"the loader never comes", {"-p", ""},
     [this](CFakeInterface&) { mBus->devices.front()->SetPenIntoBLMode(true); }, ERUN_FAILED,
     "  pen controller of Lab Tablet: failed: the board did not reach its loader mode in time"},
  };
  // clang-format on
  const std::map<int, const char*> results = {
      {ERUN_FAILED, "Result: the update failed."},
      {ERUN_DECLINED, "Result: nothing was updated."},
      {ERUN_NO_DEVICE, "Result: no supported tablet is connected."},
      {ERUN_REFUSED_FILE, "Result: the firmware file was refused."}};
  for (const auto& [name, arguments, change, status, shown] : rows) {
    SCOPED_TRACE(name);
    auto pen = AttachPen();
    WriteConfig();
    mWindow.mAnswerYes = true;
    change(*pen);
    RunToTheEnd(Make(arguments));
    EXPECT_EQ(mExitStatus, status);
    EXPECT_TRUE(mWindow.mCalls.Has(shown) ||
                std::find(mReport.begin(), mReport.end(), shown) != mReport.end());
    ASSERT_FALSE(mReport.empty());
    EXPECT_EQ(mReport.back(), T(results.at(status)));
  }
}

TEST_F(Application, TerminalRunReportsEveryBoardAndCountsEachOne) {
  AttachPen();
  // Named in the configuration, but not attached.
  mBus->devices.front()->SetTouchUpdate("pen.pen");
  RunToTheEnd(Make({"-t", "", "-p", ""}));
  EXPECT_TRUE(mJournal.Has("pen.ProgramBoard"));
  // The last board's success does not stand for the run.
  EXPECT_TRUE(mWindow.mCalls.Has(Alert(T("The last board was updated, but not every board was."))));
  EXPECT_EQ(mExitStatus, ERUN_NO_DEVICE);
  EXPECT_EQ(mReport,
            (Words{"Updating the pen controller of Lab Tablet (" + std::string(kNormalPath) +
                       "), from " + mFolder.string() + "/cfg/Firmware/pen.pen.",
                   "  touch controller of Lab Tablet: not found: the touch controller "
                   "of Lab Tablet was not found",
                   "  pen controller of Lab Tablet: updated",
                   T("Result: no supported tablet is connected.")}));
}

TEST_F(Application, WithoutABoardATerminalRunEndsAtOnceAndAWindowRunWaitsAndExitsWithZero) {
  auto pen = AttachPen();
  Make({}).applicationDidFinishLaunching();
  EXPECT_EQ(mExitStatus, ERUN_USAGE);
  ASSERT_EQ(mErrors.size(), 1u);
  EXPECT_NE(mErrors[0].find("-p, -t, -b or -s"), std::string::npos);
  EXPECT_EQ(mDesktop->mJournal.Get(), Words{});  // the driver was never touched

  FLAppDelegate& window = Make({}, /*terminal=*/false);
  RunToTheEnd(window);
  EXPECT_EQ(window.state(), ESTATE_PROGRAM);
  EXPECT_FALSE(window.HasTerminated());
  EXPECT_TRUE(mWindow.mCalls.Has("close:0"));  // the window cannot be closed either
  window.terminate(ERUN_DECLINED);             // from outside
  EXPECT_EQ(mExitStatus, 0);

  // A window run exits with 0 whatever the outcome.
  pen->mFails = {"ProgramBoard"};
  RunToTheEnd(Make({"-p", ""}, /*terminal=*/false));
  EXPECT_TRUE(mWindow.mCalls.Has("text:" + T("Programming Failed")));
  EXPECT_TRUE(mWindow.mCalls.Has("color:3"));
  EXPECT_EQ(mExitStatus, 0);
  EXPECT_EQ(mReport, Words{});
}

TEST_F(Application, WatchThatCannotBeSetUpEndsTheRunOnARealMainLoop) {
  AttachPen();
  mRegistry->mCanWatch = false;
  FLAppDelegate& app = Make({"-p", ""});
  // On a main loop of its own, as the program does, for ten real seconds
  // at most: dispatch to the main thread must not run inline here.
  CMainThreadLoop loop;
  loop.RegisterMainThread();
  mLoop = &loop;
  std::promise<void> ended;
  std::thread watchdog([&loop, done = ended.get_future()] {
    done.wait_for(std::chrono::seconds(10));
    loop.Quit();
  });
  loop.Post([&app] { app.applicationDidFinishLaunching(); });
  loop.Run();
  ended.set_value();
  watchdog.join();
  mLoop = nullptr;
  loop.Unregister();
  ASSERT_TRUE(app.HasTerminated()) << "the run hung";
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  EXPECT_EQ(mErrors, Words{T("Could not secure USB for Firmware Updater.")});
  // The terminate handler ran: the driver is back.
  EXPECT_TRUE(mDesktop->mJournal.Has("launch:com.tavik.TabletDriver"));
  EXPECT_EQ(mDesktop->mJournal.Get().back(), "notify:com.tavik.TFUCompleted");
}

TEST_F(Application, StateTableDrivesTheWindowInOrder) {
  AttachPen();
  FLAppDelegate& app = Make({"-p", ""});
  app.presentDialog();
  mWindow.mCalls.Clear();
  app.doStateMachine(ESTATE_NONE);
  app.doStateMachine(ESTATE_READY);
  app.doStateMachine(ESTATE_WAIT_DEVICE);
  app.doStateMachine(static_cast<ECONTROLLER_STATE>(8));  // no row: nothing shown
  EXPECT_EQ(mWindow.mCalls.Get(),
            (Words{"color:0", "ui:1", "button:0", "close:1",  // none
                   "ui:1", "close:1", "button:1",             // ready
                   "ui:0", "close:0", "text:" + T("Waiting for Device Mode"), "color:1"}));
  EXPECT_EQ(app.state(), 8);
  EXPECT_FALSE(app.HasTerminated());

  app.doStateMachine(ESTATE_INVALID);
  EXPECT_TRUE(
      mWindow.mCalls.Has(Alert(T("Error: Invalid state resulted in updater termination."))));
  EXPECT_TRUE(app.HasTerminated());
}

TEST_F(Application, ProgrammingTextMovesItsDotsUntilTheStateChanges) {
  AttachPen();
  FLAppDelegate& app = Make({"-p", ""});
  app.presentDialog();
  mWindow.mCalls.Clear();
  app.doStateMachine(ESTATE_PROGRAM);
  for (int i = 0; i < 4; ++i) {
    mClock->Advance(0.5);
    EXPECT_DOUBLE_EQ(mWindow.RunDelayed(), 0.5);
  }
  const std::string text = "text:" + T("Updating, this may take several minutes");
  EXPECT_EQ(mWindow.mCalls.Get(), (Words{"color:1", "ui:0", "close:0", text + ".", text + "..",
                                         text + "...", text + "."}));
  // A task that comes early waits for the rest of its half second.
  mClock->Advance(0.2);
  EXPECT_DOUBLE_EQ(mWindow.RunDelayed(), 0.5);
  EXPECT_NEAR(mWindow.RunDelayed(), 0.3, 1e-9);

  app.doStateMachine(ESTATE_WAIT_DEVICE);
  mClock->Advance(1.0);
  while (mWindow.RunDelayed() >= 0) {
  }
  EXPECT_LT(mWindow.RunDelayed(), 0);  // stopped by itself
}

class CRecordingClient : public OUpdaterClient {
 public:
  bool connectToService() override { return true; }
  void stopLaunchDProcess(const Request& request_I) override { mStops.push_back(request_I); }
  void stopProcess(const Request& request_I) override { mStops.push_back(request_I); }
  void startLaunchDProcess(const Request& request_I) override { mStarts.push_back(request_I); }
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
  EXPECT_EQ(client->mStops[0], (OUpdaterClient::Request{{"LaunchAgents", {"com.tavik.taviktablet"}},
                                                        {"User", {std::to_string(getuid())}}}));
  EXPECT_EQ(client->mStops[1].size(), 3u);
  EXPECT_EQ(
      client->mStops[1].at("BundleID"),
      (Words{"com.tavik.taviktablet", "com.tavik.TavikTouchDriver", "com.tavik.TabletDriver"}));

  // Starting launches only what is not running.
  mDesktop->mRunning["com.tavik.TavikTouchDriver"] = {9};
  FLAppDelegate::startDriver(*mDesktop);
  EXPECT_EQ(client->mStarts.size(), 1u);
  EXPECT_TRUE(mDesktop->mJournal.Has("launch:com.tavik.taviktablet"));
  EXPECT_FALSE(mDesktop->mJournal.Has("launch:com.tavik.TavikTouchDriver"));
}

}  // namespace
}  // namespace update_test
