// Pictures of both dialogs, in English and German, at the scale the run
// was started with (QT_SCALE_FACTOR), for a person to look at; and the
// check that no text in them is cut off at that scale.
#include <QAbstractButton>
#include <QDir>
#include <QLabel>
#include <QTest>
#include <cmath>

#include "ui/qt/OFLMainWindow.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

class Screenshots : public QtWindowFixture {
 protected:
  // Writes <name>-<language>-<percent>.png and checks that the texts fit.
  void Take(QWidget& window_I, const QString& name_I) {
    QCoreApplication::processEvents();
    const QPixmap picture = window_I.grab();
    QDir().mkpath(TAV_SCREENSHOT_DIR);
    const QString path = QStringLiteral(TAV_SCREENSHOT_DIR "/%1-%2-%3.png")
                             .arg(name_I, qgetenv("LANGUAGE"))
                             .arg(std::lround(picture.devicePixelRatio() * 100));
    EXPECT_TRUE(picture.save(path)) << path.toStdString();
    for (QWidget* widget : window_I.findChildren<QWidget*>()) {
      auto* label = qobject_cast<QLabel*>(widget);
      if (!widget->isVisible() || (label == nullptr && !qobject_cast<QAbstractButton*>(widget))) {
        continue;
      }
      const bool wraps = label != nullptr && label->wordWrap();
      EXPECT_LE(wraps ? label->heightForWidth(label->width()) : widget->sizeHint().height(),
                widget->height())
          << path.toStdString() << ": " << widget->property("text").toString().toStdString();
      if (!wraps) {
        EXPECT_LE(widget->sizeHint().width(), widget->width()) << path.toStdString();
      }
    }
  }
};

TEST_F(Screenshots, BothDialogsInEnglishAndGerman) {
  mBus->devices = {Product(Board("pen", kNormalPath), false, false, Board("touch", kTouchPath))};
  mBus->devices.front()->SetDeviceName("Lab Pen Display 13");
  const std::vector<std::tuple<ECONTROLLER_STATE, double, QString>> states = {
      {ESTATE_WAIT_LOADER, 0, "update-waiting-for-loader"},
      {ESTATE_PROGRAM, 45, "update-programming"},
      {ESTATE_SUCCESS, 99, "update-success"},
      {ESTATE_FAILURE, 60, "update-failure"}};
  for (const char* language : {"en", "de"}) {
    SetLanguage(language);
    for (const auto& [state, progress, name] : states) {
      FLAppDelegate& app = Make({"-p", ""});
      app.doStateMachine(ESTATE_PROGRAM);
      app.updateProgressBar(progress);
      mClock->Advance(1.0);  // the programming text's first steps
      QTest::qWait(50);
      if (state != ESTATE_PROGRAM) app.doStateMachine(state);
      Take(*mWindow->GetWindow(), name);
    }
    Make({}).doStateMachine(ESTATE_READY);
    mWindow->setStatusText(T("Waiting for Loader Mode"));
    Take(*mWindow->GetWindow(), "full-dialog");

    // The scalar's confirmation as the program asks it.
    OFLUpdater::updater()->setUpdateType("Scalar");
    mWindow->SetInteractive(true);
    OnModal([this](QWidget& dialog_I) {
      Take(dialog_I, "scalar-confirmation");
      dialog_I.close();
    });
    mApp->confirmProgram();
  }
}

}  // namespace
}  // namespace qt_test
