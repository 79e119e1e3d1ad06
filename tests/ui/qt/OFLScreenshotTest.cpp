// Pictures of both dialogs, in English and German, at the scale the run
// was started with (QT_SCALE_FACTOR), for a person to look at; and the
// check that no text of either dialog is cut off at that scale.
#include <QAbstractButton>
#include <QDir>
#include <QLabel>
#include <QLineEdit>
#include <QProgressBar>
#include <QTest>
#include <cmath>

#include "ui/qt/OFLConfirmationController.h"
#include "ui/qt/OFLMainWindow.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

class Screenshots : public QtWindowFixture {
 protected:
  // Writes <name>-<language>-<percent>.png and checks the texts fit.
  void Take(QWidget& window_I, const std::string& name_I, const char* language_I) {
    window_I.ensurePolished();
    QCoreApplication::processEvents();
    const QPixmap picture = window_I.grab();
    const int percent = static_cast<int>(std::lround(picture.devicePixelRatio() * 100));
    QDir().mkpath(TAV_SCREENSHOT_DIR);
    const QString path = QStringLiteral(TAV_SCREENSHOT_DIR "/%1-%2-%3.png")
                             .arg(QString::fromStdString(name_I), language_I)
                             .arg(percent);
    EXPECT_TRUE(picture.save(path)) << path.toStdString();
    EXPECT_EQ(picture.width(), std::lround(window_I.width() * picture.devicePixelRatio()));

    for (QLabel* label : window_I.findChildren<QLabel*>()) {
      if (!label->isVisible() || label->text().isEmpty()) continue;
      const int needed = label->wordWrap() ? label->heightForWidth(label->width())
                                           : label->minimumSizeHint().height();
      EXPECT_LE(needed, label->height()) << name_I << ": " << label->text().toStdString();
      if (!label->wordWrap()) {
        EXPECT_LE(label->sizeHint().width(), label->width())
            << name_I << ": " << label->text().toStdString();
      }
    }
    for (QAbstractButton* button : window_I.findChildren<QAbstractButton*>()) {
      if (!button->isVisible()) continue;
      EXPECT_LE(button->sizeHint().width(), button->width())
          << name_I << ": " << button->text().toStdString();
    }
  }

  void UpdateDialogAt(ECONTROLLER_STATE state_I, double progress_I, const std::string& name_I,
                      const char* language_I) {
    FLAppDelegate& app = Make({"-p", ""});
    app.doStateMachine(ESTATE_PROGRAM);
    app.updateProgressBar(progress_I);
    mClock->Advance(1.0);  // the programming text's first steps
    QTest::qWait(50);
    if (state_I != ESTATE_PROGRAM) app.doStateMachine(state_I);
    Take(*mWindow->GetWindow(), name_I, language_I);
  }
};

TEST_F(Screenshots, BothDialogsInEnglishAndGerman) {
  mBus->devices = {Product(Board("pen", kNormalPath), false, false, Board("touch", kTouchPath))};
  mBus->devices.front()->SetDeviceName("Lab Pen Display 13");
  for (const char* language : {"en", "de"}) {
    SCOPED_TRACE(language);
    SetLanguage(language);
    UpdateDialogAt(ESTATE_WAIT_LOADER, 0, "update-waiting-for-loader", language);
    UpdateDialogAt(ESTATE_PROGRAM, 45, "update-programming", language);
    UpdateDialogAt(ESTATE_SUCCESS, 99, "update-success", language);
    UpdateDialogAt(ESTATE_FAILURE, 60, "update-failure", language);

    FLAppDelegate& app = Make({});
    app.doStateMachine(ESTATE_READY);
    mWindow->setStatusText(T("Waiting for Loader Mode"));
    Take(*mWindow->GetWindow(), "full-dialog", language);

    OFLConfirmationController confirmation(
        {EALERT_STYLE_WARNING, T("Tavik Firmware Update Utility"),
         T("You are about to update the firmware of the display.") + "\n\n" +
             T("Keep the display connected to power and to the computer, and do not switch it "
               "off until the update has finished.") +
             "\n\n" + T("Do you want to continue?"),
         {T("Cancel"), T("Update")}});
    confirmation.show();
    Take(confirmation, "scalar-confirmation", language);
  }
}

}  // namespace
}  // namespace qt_test
