// The window run's threads on a real Qt event loop: dispatches from other
// threads run on the GUI thread in order and hold their thread until done,
// progress is on the bar when the dispatch returns, and an end requested
// while the main thread is still in the set-up neither hangs nor skips the
// terminate handler.
#include <QFileDialog>
#include <QLineEdit>
#include <QProgressBar>
#include <QTest>
#include <QThread>
#include <thread>

#include "common/CMainThreadLoop.h"
#include "common/OSUtils.h"
#include "lab/CLabDesktop.h"
#include "ui/qt/OFLContentController.h"
#include "ui/qt/OFLUpdateController.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

// The loop of a window run: dispatches to the main thread are drained by
// the window's loop, as the program wires them.
struct SWindowLoop {
  explicit SWindowLoop(OFLWindowController& window_I) {
    loop.RegisterMainThread();
    loop.SetWakeHook([this, &window_I] { window_I.PostToMainLoop([this] { loop.RunPending(); }); });
  }
  ~SWindowLoop() { loop.Unregister(); }
  CMainThreadLoop loop;
};

// Runs the window's loop, but never longer than ten seconds.
bool RunForAtMostTenSeconds(OFLWindowController& window_I) {
  bool timedOut = false;
  QTimer::singleShot(10000, &QtApp(), [&window_I, &timedOut] {
    timedOut = true;
    window_I.QuitMainLoop();
  });
  window_I.RunMainLoop();
  return !timedOut;
}

class QtMainLoop : public QtWindowFixture {};

TEST_F(QtMainLoop, DispatchesRunOnTheGuiThreadInOrderAndProgressIsDrawnBeforeTheyReturn) {
  OFLWindowController window;
  window.initForDialog(true);
  SWindowLoop wiring(window);
  std::vector<std::pair<int, int>> ran;  // thread, sequence; touched on the GUI thread only
  bool offGuiThread = false;
  std::vector<int> barAfterDispatch;
  auto worker = [&](int thread_I) {
    for (int sequence = 0; sequence < 50; ++sequence) {
      OSUtils::DispatchOnMainThread([&, thread_I, sequence] {
        offGuiThread |= QThread::currentThread() != QtApp().thread();
        ran.emplace_back(thread_I, sequence);
      });
    }
    if (thread_I != 0) return;
    for (int percent : {10, 55, 100}) {
      OSUtils::DispatchOnMainThread([&window, percent] { window.setStatusProgress(percent); });
      barAfterDispatch.push_back(window.GetUpdate()->GetProgressBar()->value());
    }
  };
  std::thread first(worker, 0), second(worker, 1);
  std::thread quitter([&] {
    first.join();
    second.join();
    window.QuitMainLoop();
  });
  const bool ended = RunForAtMostTenSeconds(window);
  quitter.join();
  ASSERT_TRUE(ended) << "the dispatches hung";
  EXPECT_FALSE(offGuiThread);
  ASSERT_EQ(ran.size(), 100u);
  std::vector<int> next(2, 0);
  for (const auto& [thread, sequence] : ran) EXPECT_EQ(sequence, next[thread]++);
  EXPECT_EQ(barAfterDispatch, (std::vector<int>{11, 56, 100}));
}

TEST_F(QtMainLoop, AnEndDuringTheSetUpRunsTheTerminateHandlerWithoutHanging) {
  AttachPen();
  mRegistry->mCanWatch = false;  // the device thread gives up during setupUpdate
  OFLWindowController window;
  window.SetInteractive(false);
  SWindowLoop wiring(window);
  auto desktop = std::make_shared<CLabDesktop>();
  OFLUpdater::Configure(Setup({"prog", "-p", "", "-f", mConfig}));
  int status = -100;
  FLAppDelegate app(SApplicationSetup{.window = &window,
                                      .desktop = desktop,
                                      .terminal = false,
                                      .exitProcess =
                                          [&status, &window](int status_I) {
                                            status = status_I;
                                            window.QuitMainLoop();
                                          },
                                      .printResult = nullptr,
                                      .printError = nullptr,
                                      .runEnded = nullptr});
  window.PostToMainLoop([&app] { app.applicationDidFinishLaunching(); });
  ASSERT_TRUE(RunForAtMostTenSeconds(window)) << "the run hung";
  EXPECT_TRUE(app.HasTerminated());
  EXPECT_EQ(status, 0);
  // The terminate handler ran: the driver stopped and back, and the end
  // announced last.
  const Words notices = desktop->GetNotifications();
  ASSERT_FALSE(notices.empty());
  EXPECT_EQ(notices.front(), "com.tavik.removeTavikTablet.closeModalDialog");
  EXPECT_EQ(notices.back(), "com.tavik.TFUCompleted");
  EXPECT_FALSE(desktop->RunningApplications("com.tavik.TabletDriver").empty());
}

TEST_F(QtMainLoop, AFileChosenInTheFullDialogIsProgrammedWithTheStatesComingThroughTheLoop) {
  AttachPen();
  Make({});
  SWindowLoop wiring(*mWindow);
  mWindow->SetAssumeYes(true);
  OFLContentController& content = *mWindow->GetContent();
  OnModal([this](QWidget& dialog_I) {
    auto& chooser = dynamic_cast<QFileDialog&>(dialog_I);
    chooser.findChild<QLineEdit*>("fileNameEdit")
        ->setText(QString::fromStdString((mFolder / "cfg" / "Firmware" / "pen.pen").string()));
    QMetaObject::invokeMethod(&chooser, "accept", Qt::DirectConnection);
  });
  mWindow->PostToMainLoop([&content] {
    QTest::mouseClick(content.GetBrowseButton(), Qt::LeftButton);
    QTest::mouseClick(content.GetProgramButton(), Qt::LeftButton);
  });
  QTimer ended;
  // The update thread still reports after the end; the window must outlive it.
  QObject::connect(&ended, &QTimer::timeout, [this] {
    if (mExitStatus != -100 && OFLUpdater::updater()->programThreadFinished()) {
      mWindow->QuitMainLoop();
    }
  });
  ended.start(5);
  ASSERT_TRUE(RunForAtMostTenSeconds(*mWindow)) << "the update did not end";
  OFLUpdater::updater()->joinProgramThread();
  EXPECT_TRUE(mJournal.Has("pen.ProgramBoard"));
  EXPECT_EQ(mWindow->GetStatusText(), T("Programming Successful"));
  EXPECT_EQ(mWindow->GetStatusProgress(), 100);
  EXPECT_EQ(mExitStatus, 0);
}

}  // namespace
}  // namespace qt_test
