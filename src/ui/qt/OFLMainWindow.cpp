#include "ui/qt/OFLMainWindow.h"

#include <QAction>
#include <QCloseEvent>
#include <QMenuBar>
#include <QMessageBox>
#include <cstdio>
#include <cstdlib>

#include "common/OSUtils.h"
#include "host/CLanguageManager.h"
#include "ui/qt/OFLImages.h"

namespace {

QString T(const char* key_I) { return QString::fromStdString(TTCLocalizedNSString(key_I)); }

}  // namespace

OFLMainWindow::OFLMainWindow(QWidget* parent_I) : QMainWindow(parent_I) {
  setWindowIcon(OFLImages::ApplicationIcon());
  QMenu* file = menuBar()->addMenu(T("&File"));
  QAction* quit = file->addAction(T("&Quit"));
  quit->setShortcut(QKeySequence::Quit);
  connect(quit, &QAction::triggered, this, &QWidget::close);
  QMenu* help = menuBar()->addMenu(T("&Help"));
  QAction* about = help->addAction(T("&About"));
  connect(about, &QAction::triggered, this, &OFLMainWindow::ShowAbout);
  mMenus = {file, help};
  if (std::getenv("TAVIK_REPORT_FIRST_FRAME") != nullptr) {
    connect(this, &OFLMainWindow::firstFrame, this, [] {
      std::fputs("first frame\n", stderr);
      std::fflush(stderr);
    });
  }
}

void OFLMainWindow::SetCloseEnabled(bool enable_I) {
  for (QMenu* menu : mMenus) menu->menuAction()->setEnabled(enable_I);
  if (enable_I == mCloseEnabled) return;
  mCloseEnabled = enable_I;
  // A change of window flags hides the window; it comes back where it was.
  const bool visible = isVisible();
  setWindowFlag(Qt::WindowCloseButtonHint, enable_I);
  if (visible) show();
}

void OFLMainWindow::closeEvent(QCloseEvent* event_I) {
  event_I->ignore();
  if (mCloseRequest) mCloseRequest();
}

bool OFLMainWindow::event(QEvent* event_I) {
  // An update request is where the backing store paints and flushes.
  const bool handled = QMainWindow::event(event_I);
  if (event_I->type() == QEvent::UpdateRequest && !mFramed && isVisible()) {
    mFramed = true;
    emit firstFrame();
  }
  return handled;
}

void OFLMainWindow::ShowAbout() {
  QMessageBox::about(this, T("Tavik Firmware Update Utility"),
                     T("Tavik Firmware Update Utility") + QStringLiteral(" ") +
                         QString::fromStdString(OSUtils::GetMainBundleVersion().AsString(
                             FileVersion::EStyleThreePart)));
}
