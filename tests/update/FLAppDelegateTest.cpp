// The application object where the runs of the real program over the lab
// (tests/app/lab_runs.sh) cannot reach it: who launched us, refused device
// access, the driver's stop and start, outcomes that need a fault at the
// right moment, the window through the states, and a watch that fails on a
// real main loop.
#include <future>
#include <thread>

#include "common/CMainThreadLoop.h"
#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"
#include "ui/terminal/CTerminalWindowController.h"
#include "update/UpdateDoubles.h"

namespace update_test {
namespace {

// The terminal window, the program's own, with what a user can see of it
// journaled instead of drawn, on the thread that asks; the rest (colours,
// header, board panel, buttons) it shows nothing of. Tasks for later wait
// for RunDelayed.
class CFakeWindow : public CTerminalWindowController {
 public:
  CFakeWindow() : CTerminalWindowController(stdout, stdin) {}
  void enableClose(bool enable_I) override { mCalls.Add("close:", enable_I); }
  void setStatusText(const std::string& text_I) override { mCalls.Add("text:" + text_I); }
  void setStatusProgress(double percent_I) override {
    mCalls.Add("progress:", static_cast<int>(percent_I));
  }
  int ShowAlert(const SAlert& alert_I) override {
    mCalls.Add("alert:" + alert_I.message + "|" + alert_I.informativeText);
    mLastAlert = alert_I;
    return 0;
  }
  bool AskYesNo(const SAlert&) override {
    mCalls.Add("ask");
    return mAnswerYes;
  }
  void PostToMainLoop(std::function<void()> task_I) override { task_I(); }
  void PostToMainLoopAfter(double delay_I, std::function<void()> task_I) override {
    mDelayed.emplace_back(delay_I, std::move(task_I));
  }
  bool IsMainLoopThread() const override { return true; }

  // Runs the oldest task for later; -1 when there is none, else its delay.
  double RunDelayed() {
    if (mDelayed.empty()) return -1;
    const auto [delay, task] = mDelayed.front();
    mDelayed.erase(mDelayed.begin());
    task();
    return delay;
  }

  bool mAnswerYes = true;
  SAlert mLastAlert;
  CJournal mCalls;

 private:
  std::vector<std::pair<double, std::function<void()>>> mDelayed;
};

// Quits and launches only in its journal; what runs is what a test sets.
class CFakeDesktop : public CDesktop {
 public:
  int GetLaunchSenderPid() override { return mSenderPid; }
  int GetOwnPid() override { return 1; }
  std::string GetApplicationIdOfProcess(int) override { return mSenderId; }
  std::string GetExecutableOfProcess(int) override { return std::string(); }
  bool IsApplicationProcess(int) override { return mSenderIsApplication; }
  int GetProcessArgumentCount() override { return mArgumentCount; }
  std::string GetApplicationPath(const std::string& id_I) override { return "/apps/" + id_I; }
  std::vector<int> RunningApplications(const std::string& id_I) override { return mRunning[id_I]; }
  bool TerminateApplication(int pid_I) override {
    mJournal.Add("quit:" + std::to_string(pid_I));
    for (auto& [id, pids] : mRunning) std::erase(pids, pid_I);
    return true;
  }
  bool IsTerminated(int) override { return true; }
  int LaunchApplication(const SLaunchRequest& request_I) override {
    mJournal.Add("launch:" + request_I.applicationId);
    mRunning[request_I.applicationId].push_back(++mLastPid);
    return mLastPid;
  }
  void PostNotification(const SNotification& notification_I) override {
    mJournal.Add("notify:" + notification_I.name);
  }
  bool ObserveNotifications(std::function<void(const SNotification&)>) override { return false; }
  bool RequestHidAccess() override { return mHidAccess; }

  int mSenderPid = 1;
  std::string mSenderId = "systemd";
  bool mSenderIsApplication = false;
  int mArgumentCount = 1;
  bool mHidAccess = true;
  std::map<std::string, std::vector<int>> mRunning;
  int mLastPid = 100;
  CJournal mJournal;
};

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
        .printError = [this](const std::string& line_I) { mErrors.push_back(line_I); },
        .runEnded = nullptr});
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

TEST_F(Application, RefusedDeviceAccessShowsTheAccessAlertAndGivesTheDriverBack) {
  mDesktop->mHidAccess = false;
  Make({"-p", ""}).applicationDidFinishLaunching();
  ASSERT_EQ(mWindow.mLastAlert.style, EALERT_STYLE_CRITICAL);
  EXPECT_EQ(mWindow.mLastAlert.message, T("200:250"));
  EXPECT_NE(mWindow.mLastAlert.message, "200:250");  // the catalog was found
  EXPECT_EQ(mExitStatus, ERUN_FAILED);
  EXPECT_EQ(mDesktop->mJournal.Get(),
            (Words{"launch:com.tavik.taviktablet", "launch:com.tavik.TabletDriver",
                   "launch:com.tavik.TavikTouchDriver", "notify:com.tavik.TFUCompleted"}));
}

TEST_F(Application, DriverIsStoppedBeforeTheUpdateAndStartedAfterIt) {
  AttachPen();
  mDesktop->mRunning["com.tavik.TabletDriver"] = {77};
  mDesktop->mRunning["com.tavik.TavikTouchDriver"] = {78, 79};
  RunToTheEnd(Make({"-p", ""}));
  EXPECT_EQ(mExitStatus, 0);
  EXPECT_EQ(mDesktop->mJournal.Get(),
            (Words{"notify:com.tavik.removeTavikTablet.closeModalDialog", "quit:77", "quit:78",
                   "quit:79", "launch:com.tavik.taviktablet", "launch:com.tavik.TabletDriver",
                   "launch:com.tavik.TavikTouchDriver", "notify:com.tavik.TFUCompleted"}));
  EXPECT_TRUE(mJournal.Has("pen.ProgramBoard"));
  // The green text stays on show before the dialog.
  const CJournal& window = mWindow.mCalls;
  EXPECT_LT(window.At("progress:100"), window.At("text:" + T("Programming Successful")));
  EXPECT_LT(window.At("text:" + T("Programming Successful")),
            window.At(Alert(T("Firmware was successfully updated."))));
}

TEST_F(Application, EachOutcomeEndsWithItsStatus) {
  const std::string file = (mFolder / "cfg" / "Firmware" / "pen.pen").string();
  const auto none = [](CFakeInterface&) {};
  // What changes, whether the run is in a terminal, the status, and a line of
  // the report or a call of the window.
  // clang-format off
  const std::vector<std::tuple<const char*, Words, bool, std::function<void(CFakeInterface&)>,
                               int, std::string>> rows = {
    {"no firmware file", {"-p", ""}, true, [&file](CFakeInterface&) { fs::remove(file); },
     ERUN_REFUSED_FILE,
     "  " + T("pen controller") + " of Lab Tablet: " + T("firmware file refused") + ": " + file +
         ": No such file or directory"},
    // A product without the board asked for says so, not that the file is bad.
    {"no such board", {"-b", ""}, true, none, ERUN_NO_DEVICE,
     Alert("Error: Lab Tablet has no " + T("Bluetooth module") + " to update.")},
    {"the loader never comes", {"-p", ""}, true,
     [this](CFakeInterface&) { mBus->devices.front()->SetPenIntoBLMode(true); }, ERUN_FAILED,
     "  pen controller of Lab Tablet: failed: the board did not reach its loader mode in time"},
    // A window run exits with 0 whatever the outcome, and can be closed again.
    {"a window run that fails", {"-p", ""}, false,
     [](CFakeInterface& pen_I) { pen_I.mFails = {"ProgramBoard"}; }, 0, "close:1"},
  };
  // clang-format on
  const std::map<int, const char*> results = {
      {ERUN_FAILED, "Result: the update failed."},
      {ERUN_NO_DEVICE, "Result: no supported tablet is connected."},
      {ERUN_REFUSED_FILE, "Result: the firmware file was refused."}};
  for (const auto& [name, arguments, terminal, change, status, shown] : rows) {
    SCOPED_TRACE(name);
    auto pen = AttachPen();
    WriteConfig();
    change(*pen);
    RunToTheEnd(Make(arguments, terminal));
    EXPECT_EQ(mExitStatus, status);
    const Words& window = mWindow.mCalls.Get();
    EXPECT_TRUE((!window.empty() && window.back() == shown) ||
                std::find(mReport.begin(), mReport.end(), shown) != mReport.end());
    // A window run prints no report.
    EXPECT_EQ(mReport.empty() ? "none" : mReport.back(), terminal ? T(results.at(status)) : "none");
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

TEST_F(Application, ARunWithoutABoardOptionWaitsForTheUserOrEndsWithTheUsageStatus) {
  AttachPen();
  for (const bool terminal : {false, true}) {
    SCOPED_TRACE(terminal ? "terminal" : "window");
    FLAppDelegate& app = Make({}, terminal);
    RunToTheEnd(app);
    // A window leaves board and file to the user; a terminal has nobody to ask.
    EXPECT_FALSE(mJournal.Has("pen.ProgramBoard"));
    EXPECT_EQ(app.HasTerminated(), terminal);
    EXPECT_EQ(mExitStatus, terminal ? ERUN_USAGE : -100);
  }
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
            (Words{"close:1", "close:1", "close:0", "text:" + T("Waiting for Device Mode")}));
  EXPECT_EQ(app.state(), 8);
  EXPECT_FALSE(app.HasTerminated());

  app.doStateMachine(ESTATE_INVALID);  // said, and the window can be closed again
  const Words& calls = mWindow.mCalls.Get();
  EXPECT_EQ(Words(calls.end() - 2, calls.end()),
            (Words{Alert(T("Error: Invalid state resulted in updater termination.")), "close:1"}));
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
  EXPECT_EQ(mWindow.mCalls.Get(),
            (Words{"close:0", text + ".", text + "..", text + "...", text + "."}));
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

}  // namespace
}  // namespace update_test
