#pragma once
// The Qt window on the application object, over the doubles of the update
// folder: one QApplication for the test program, English or German texts
// from this build's catalogs, and a run made as the program makes it.

#include <QApplication>
#include <QCoreApplication>
#include <QTimer>
#include <QWidget>

#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"
#include "ui/qt/OFLWindowController.h"
#include "update/UpdateDoubles.h"

namespace qt_test {

using namespace update_test;

inline QApplication& QtApp() {
  static int argc = 1;
  static char name[] = "tests_ui_qt";
  static char* argv[] = {name, nullptr};
  static QApplication* application = [] {
    auto* made = new QApplication(argc, argv);
    QApplication::setQuitOnLastWindowClosed(false);
    return made;
  }();
  return *application;
}

// Runs `action_I` on the first modal window that opens, from the loop of
// whatever exec is waiting for it. Delete the timer to give up waiting.
inline QTimer* OnModal(std::function<void(QWidget&)> action_I) {
  auto* timer = new QTimer(&QtApp());
  timer->setInterval(5);
  QObject::connect(timer, &QTimer::timeout, timer, [timer, action = std::move(action_I)] {
    QWidget* modal = QApplication::activeModalWidget();
    if (modal == nullptr) return;
    timer->stop();
    timer->deleteLater();
    action(*modal);
  });
  timer->start();
  return timer;
}

class QtWindowFixture : public UpdateFixture {
 protected:
  void SetUp() override {
    UpdateFixture::SetUp();
    QtApp();
    SetLanguage("en");
    mConfig = WriteConfig();
  }
  void TearDown() override {
    mApp.reset();
    mWindow.reset();
    UpdateFixture::TearDown();
  }

  static void SetLanguage(const char* language_I) {
    setenv("LANG", "C.UTF-8", 1);
    setenv("LANGUAGE", language_I, 1);
    CLinuxLanguageManager::SetLocaleDirectory(TAV_BUILD_LOCALE_DIR);
    CLanguageManager::DisposeInstance();
  }

  // A window run with these board arguments, set up and its dialog shown:
  // the update dialog when they name a board, else the full one.
  FLAppDelegate& Make(std::vector<std::string> arguments_I) {
    mApp.reset();
    mWindow = std::make_unique<OFLWindowController>();
    mWindow->SetInteractive(false);
    mWindow->SetDataFolder((mFolder / "cfg").string());
    OFLUpdater::DisposeInstance();
    arguments_I.insert(arguments_I.begin(), "prog");
    arguments_I.insert(arguments_I.end(), {"-f", mConfig});
    mExitStatus = -100;
    mApp = std::make_unique<FLAppDelegate>(
        SApplicationSetup{.window = mWindow.get(),
                          .desktop = nullptr,
                          .terminal = false,
                          .exitProcess = [this](int status_I) { mExitStatus = status_I; },
                          .printResult = nullptr,
                          .printError = nullptr,
                          .runEnded = nullptr});
    mWindow->SetApplication(mApp.get());
    SUpdaterSetup setup = Setup(arguments_I);
    setup.delegate = mApp.get();
    OFLUpdater::Configure(std::move(setup));
    if (!OFLUpdater::updater()->setupUpdate()) ADD_FAILURE() << "no set-up";
    mApp->presentDialog();
    return *mApp;
  }

  static std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

  std::string mConfig;
  std::unique_ptr<OFLWindowController> mWindow;
  std::unique_ptr<FLAppDelegate> mApp;
  int mExitStatus = -100;
};

}  // namespace qt_test
