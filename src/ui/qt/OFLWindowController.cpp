#include "ui/qt/OFLWindowController.h"

#include <QApplication>
#include <QEventLoop>
#include <QGuiApplication>
#include <QMessageBox>
#include <QPushButton>
#include <QThread>
#include <QVBoxLayout>

#include "common/CClock.h"
#include "common/OSUtils.h"
#include "common/TavLog.h"
#include "host/CLanguageManager.h"
#include "ui/qt/OFLConfirmationController.h"
#include "ui/qt/OFLContentController.h"
#include "ui/qt/OFLHeaderController.h"
#include "ui/qt/OFLImages.h"
#include "ui/qt/OFLMainWindow.h"
#include "ui/qt/OFLStatusController.h"
#include "ui/qt/OFLUpdateController.h"

namespace {

constexpr int kAlertIconSide = 64;

QString Q(const std::string& text_I) { return QString::fromStdString(text_I); }
std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

std::string WithoutTrailingDots(const std::string& text_I) {
  const size_t end = text_I.find_last_not_of('.');
  return end == std::string::npos ? std::string() : text_I.substr(0, end + 1);
}

QColor ColorOf(ESTATUS_COLOR color_I) {
  switch (color_I) {
    case ESTATUS_COLOR_YELLOW: return Qt::yellow;
    case ESTATUS_COLOR_GREEN: return Qt::green;
    case ESTATUS_COLOR_RED: return Qt::red;
    default: return Qt::lightGray;
  }
}

}  // namespace

// Where a task posted for later goes once its time has come; the window
// clears it when it goes, so a late timer posts nothing.
struct OFLWindowController::SPostTarget {
  std::mutex lock;
  QObject* context = nullptr;
};

OFLWindowController::OFLWindowController()
    : mWindow(std::make_unique<OFLMainWindow>()),
      mContext(std::make_unique<QObject>()),
      mPostTarget(std::make_shared<SPostTarget>()) {
  mPostTarget->context = mContext.get();
  mWindow->SetCloseRequestHandler([this] { OnCloseRequest(); });
}

OFLWindowController::~OFLWindowController() {
  std::lock_guard<std::mutex> guard(mPostTarget->lock);
  mPostTarget->context = nullptr;
}

bool OFLWindowController::IsInteractive() const {
  if (mInteractive) return *mInteractive;
  const QString platform = QGuiApplication::platformName();
  return platform != QLatin1String("offscreen") && platform != QLatin1String("minimal");
}

void OFLWindowController::SetApplication(FLAppDelegate* application_I) {
  mApplication = application_I;
  if (mContentController != nullptr) mContentController->SetApplication(application_I);
}

void OFLWindowController::SetDataFolder(const std::string& folder_I) {
  mDataFolder = folder_I;
  if (mContentController != nullptr) mContentController->SetDataFolder(Q(folder_I));
}

void OFLWindowController::initForDialog(bool commandLine_I) {
  mFullDialogFlag = !commandLine_I;
  const std::string version =
      OSUtils::GetMainBundleVersion().AsString(FileVersion::EStyleThreePart);
  mWindow->setWindowTitle(Q(T("Tavik Firmware Update Utility") + " " + version));
  mWindow->setAccessibleName(Q(T("Tavik Firmware Update Utility")));
  if (mFullDialogFlag) {
    doFullLayout();
  } else {
    mUpdateController = new OFLUpdateController;
    mWindow->setCentralWidget(mUpdateController);
  }
  setStatusProgress(0);
  enableClose(true);
  mWindow->adjustSize();
  mWindow->setMinimumSize(mWindow->sizeHint());
}

void OFLWindowController::doFullLayout() {
  auto* main = new QWidget;
  mHeaderController = new OFLHeaderController(main);
  mContentController = new OFLContentController(main);
  mContentController->SetApplication(mApplication);
  mContentController->SetDataFolder(Q(mDataFolder));
  auto* layout = new QVBoxLayout(main);
  layout->setContentsMargins(0, 0, 0, 0);
  layout->setSpacing(0);
  layout->addWidget(mHeaderController);
  layout->addWidget(mContentController, 1);

  mStatusController = new OFLStatusController(mContentController->getStatusView());
  auto* statusHost = new QVBoxLayout(mContentController->getStatusView());
  statusHost->setContentsMargins(0, 0, 0, 0);
  statusHost->addWidget(mStatusController);
  mWindow->setCentralWidget(main);
}

void OFLWindowController::showWindow() {
  // Before initForDialog there is nothing to show: an alert stands alone.
  if (mWindow->centralWidget() == nullptr) return;
  mWindow->show();
  mWindow->raise();
  mWindow->activateWindow();
}

void OFLWindowController::enableClose(bool enable_I) {
  mCloseEnabled = enable_I;
  mWindow->SetCloseEnabled(enable_I);
}

void OFLWindowController::SetCloseHandler(std::function<void()> handler_I) {
  mCloseHandler = std::move(handler_I);
}

void OFLWindowController::OnCloseRequest() {
  // While programming the update must not be cut off.
  if (!mCloseEnabled) return;
  if (mCloseHandler) {
    mCloseHandler();
  } else {
    QuitMainLoop();
  }
}

void OFLWindowController::setStatusText(const std::string& text_I) {
  if (mFullDialogFlag) {
    if (mStatusController != nullptr) mStatusController->setStatusText(Q(text_I));
  } else if (mUpdateController != nullptr) {
    mUpdateController->setStatusText(Q(text_I));
  }
  LogStatus(text_I);
}

void OFLWindowController::setStatusProgress(double percent_I) {
  if (mFullDialogFlag) {
    if (mStatusController != nullptr) mStatusController->setProgress(percent_I);
  } else if (mUpdateController != nullptr) {
    mUpdateController->setProgress(percent_I);
  }
}

void OFLWindowController::setStatusColor(ESTATUS_COLOR color_I) {
  if (mStatusController != nullptr) mStatusController->setColor(ColorOf(color_I));
}

void OFLWindowController::LogStatus(const std::string& text_I) {
  const std::string key = WithoutTrailingDots(text_I);
  if (key == mLoggedStatus) return;
  mLoggedStatus = key;
  TavLog::Info("Window: \"%s\", progress %g\n", text_I.c_str(), GetStatusProgress());
}

std::string OFLWindowController::GetStatusText() const {
  if (mStatusController != nullptr) return mStatusController->GetStatusText().toStdString();
  if (mUpdateController != nullptr) return mUpdateController->GetStatusText().toStdString();
  return std::string();
}

double OFLWindowController::GetStatusProgress() const {
  if (mStatusController != nullptr) return mStatusController->GetProgress();
  if (mUpdateController != nullptr) return mUpdateController->GetProgress();
  return 0.0;
}

void OFLWindowController::setTabletName(const std::string& name_I) {
  if (mHeaderController != nullptr) mHeaderController->setName(Q(name_I));
}

void OFLWindowController::setBoardArray(const std::vector<std::string>& boards_I) {
  if (mContentController != nullptr) mContentController->setBoardList(boards_I);
}

void OFLWindowController::setPenFirmwareVersion(uint32_t version_I) {
  if (mContentController != nullptr) mContentController->setPenFirmwareVersion(version_I);
}
void OFLWindowController::setPenOldChecksum(uint32_t checksum_I) {
  if (mContentController != nullptr) mContentController->setPenOldChecksum(checksum_I);
}
void OFLWindowController::setPenNewChecksum(uint32_t checksum_I) {
  if (mContentController != nullptr) mContentController->setPenNewChecksum(checksum_I);
}
void OFLWindowController::setTouchFirmwareVersion(uint32_t version_I) {
  if (mContentController != nullptr) mContentController->setTouchFirmwareVersion(version_I);
}
void OFLWindowController::setTouchOldChecksum(uint32_t checksum_I) {
  if (mContentController != nullptr) mContentController->setTouchOldChecksum(checksum_I);
}
void OFLWindowController::setTouchNewChecksum(uint32_t checksum_I) {
  if (mContentController != nullptr) mContentController->setTouchNewChecksum(checksum_I);
}
void OFLWindowController::enableUIElements(bool enable_I) {
  if (mContentController != nullptr) mContentController->enableUIElements(enable_I);
}
void OFLWindowController::enableProgramButton(bool enable_I) {
  if (mContentController != nullptr) mContentController->enableProgramButton(enable_I);
}

int OFLWindowController::ShowAlert(const SAlert& alert_I) {
  std::vector<std::string> buttons = alert_I.buttons;
  if (buttons.empty()) buttons.push_back(T("OK"));
  if (!IsInteractive()) {
    TavLog::Info("Alert with nobody to answer it: \"%s\" \"%s\", answered \"%s\"\n",
                 alert_I.message.c_str(), alert_I.informativeText.c_str(), buttons[0].c_str());
    return 0;
  }
  QMessageBox box(mWindow->isVisible() ? mWindow.get() : nullptr);
  box.setWindowTitle(Q(T("Tavik Firmware Update Utility")));
  box.setWindowIcon(OFLImages::ApplicationIcon());
  box.setTextFormat(Qt::PlainText);
  box.setText(Q(alert_I.message));
  box.setInformativeText(Q(alert_I.informativeText));
  switch (alert_I.style) {
    case EALERT_STYLE_CRITICAL: box.setIcon(QMessageBox::Critical); break;
    case EALERT_STYLE_INFORMATIONAL: box.setIcon(QMessageBox::Information); break;
    default: {
      // The default style shows the program's own icon.
      const qreal ratio = box.devicePixelRatio();
      QPixmap icon =
          OFLImages::ApplicationIcon().pixmap(QSize(kAlertIconSide, kAlertIconSide), ratio);
      box.setIconPixmap(icon);
      break;
    }
  }
  // One role for all keeps them in the given order, left to right.
  std::vector<QPushButton*> pushButtons;
  for (const std::string& text : buttons) {
    pushButtons.push_back(box.addButton(Q(text), QMessageBox::ActionRole));
  }
  box.setDefaultButton(pushButtons.front());
  box.setEscapeButton(pushButtons.front());
  box.exec();
  for (size_t index = 0; index < pushButtons.size(); ++index) {
    if (box.clickedButton() == pushButtons[index]) return static_cast<int>(index);
  }
  return 0;
}

bool OFLWindowController::AskYesNo(const SAlert& question_I) {
  if (mAssumeYes) {
    TavLog::Info("Question answered yes as asked: \"%s\"\n", question_I.informativeText.c_str());
    return true;
  }
  if (question_I.buttons.size() < 2) return false;
  if (!IsInteractive()) {
    TavLog::Info("Question with nobody to answer it: \"%s\", answered no\n",
                 question_I.informativeText.c_str());
    return false;
  }
  return ShowAlert(question_I) == 1;
}

bool OFLWindowController::RunScalarConfirmation(const SAlert& question_I) {
  if (mAssumeYes) return AskYesNo(question_I);
  if (!IsInteractive()) return AskYesNo(question_I);
  OFLConfirmationController confirmation(question_I,
                                         mWindow->isVisible() ? mWindow.get() : nullptr);
  return confirmation.runModal();
}

void OFLWindowController::RunMainLoop() {
  {
    std::lock_guard<std::mutex> guard(mQuitLock);
    if (mQuit) {
      mQuit = false;
      return;
    }
  }
  QEventLoop loop;
  mRunningLoop = &loop;
  loop.exec();
  mRunningLoop = nullptr;
  std::lock_guard<std::mutex> guard(mQuitLock);
  mQuit = false;
}

void OFLWindowController::QuitMainLoop() {
  {
    std::lock_guard<std::mutex> guard(mQuitLock);
    mQuit = true;
  }
  // Runs on the loop's thread: a loop that runs now stops, and a quit that
  // came while none ran waits for the next.
  PostToMainLoop([this] {
    std::lock_guard<std::mutex> guard(mQuitLock);
    if (mQuit && mRunningLoop) mRunningLoop->quit();
  });
}

void OFLWindowController::PostToMainLoop(std::function<void()> task_I) {
  QMetaObject::invokeMethod(mContext.get(), std::move(task_I), Qt::QueuedConnection);
}

void OFLWindowController::PostToMainLoopAfter(double delay_I, std::function<void()> task_I) {
  std::weak_ptr<SPostTarget> weakTarget = mPostTarget;
  CClock::Get()->Schedule(delay_I, [weakTarget, task = std::move(task_I)]() mutable {
    const std::shared_ptr<SPostTarget> target = weakTarget.lock();
    if (!target) return;
    std::lock_guard<std::mutex> guard(target->lock);
    if (target->context == nullptr) return;
    QMetaObject::invokeMethod(target->context, std::move(task), Qt::QueuedConnection);
  });
}

bool OFLWindowController::IsMainLoopThread() const {
  return QThread::currentThread() == mContext->thread();
}
