// The window's modal dialogs as a user answers them: the scalar's own
// confirmation, alerts and questions, and the file chooser of the full
// dialog.
#include <QDialogButtonBox>
#include <QFileDialog>
#include <QLineEdit>
#include <QMessageBox>
#include <QPushButton>
#include <QTest>

#include "ui/qt/OFLConfirmationController.h"
#include "ui/qt/OFLContentController.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

const SAlert kQuestion{EALERT_STYLE_WARNING, "Title", "Text", {"No", "Yes"}};

TEST(ScalarConfirmation, OnlyItsButtonsChangeTheAnswer) {
  QtApp();
  using Action = std::function<void(OFLConfirmationController&)>;
  const Action update = [](OFLConfirmationController& dialog_I) {
    QTest::mouseClick(dialog_I.GetUpdateButton(), Qt::LeftButton);
  };
  const Action cancel = [](OFLConfirmationController& dialog_I) {
    QTest::mouseClick(dialog_I.GetCancelButton(), Qt::LeftButton);
  };
  const Action escape = [](OFLConfirmationController& d) { QTest::keyClick(&d, Qt::Key_Escape); };
  const Action enter = [](OFLConfirmationController& d) { QTest::keyClick(&d, Qt::Key_Return); };
  const Action close = [](OFLConfirmationController& d) { d.close(); };
  // The answer of an earlier showing, how this one ends, the answer.
  const std::vector<std::tuple<const char*, const Action*, const Action*, bool>> rows = {
      {"update", nullptr, &update, true},
      {"cancel", nullptr, &cancel, false},
      {"escape", nullptr, &escape, false},
      {"return takes the safe button", nullptr, &enter, false},
      {"closed", nullptr, &close, false},
      {"escape after an update", &update, &escape, true},
      {"closed after an update", &update, &close, true},
      {"cancel after an update", &update, &cancel, false},
  };
  for (const auto& [name, before, action, answer] : rows) {
    SCOPED_TRACE(name);
    OFLConfirmationController dialog({EALERT_STYLE_WARNING, "T", "I", {"Cancel", "Update"}});
    for (const Action* step : {before, action}) {
      if (step == nullptr) continue;
      OnModal([&dialog, step](QWidget&) { (*step)(dialog); });
      dialog.runModal();
    }
    EXPECT_EQ(dialog.GetUpdate(), answer);
  }
}

class QtDialogs : public QtWindowFixture {};

TEST_F(QtDialogs, AlertButtonsKeepTheirOrderAndEscapeGivesTheSafeOne) {
  AttachPen();
  Make({"-p", ""});
  mWindow->SetInteractive(true);
  std::vector<std::pair<int, QString>> seen;  // x position and text
  const auto press = [&seen](const char* text_I, Qt::Key key_I = Qt::Key_unknown) {
    OnModal([&seen, text_I, key_I](QWidget& box_I) {
      seen.clear();
      for (QPushButton* button : box_I.findChildren<QPushButton*>()) {
        seen.emplace_back(button->mapTo(&box_I, QPoint()).x(), button->text());
        if (key_I == Qt::Key_unknown && button->text() == text_I) button->click();
      }
      if (key_I != Qt::Key_unknown) QTest::keyClick(&box_I, key_I);
    });
  };
  press("", Qt::Key_Escape);
  EXPECT_EQ(mWindow->ShowAlert({EALERT_STYLE_CRITICAL, "M", "I", {"First", "Second", "Third"}}), 0);
  std::sort(seen.begin(), seen.end());
  ASSERT_EQ(seen.size(), 3u);
  EXPECT_EQ(seen[0].second, "First");
  EXPECT_EQ(seen[2].second, "Third");

  press("Yes");
  EXPECT_TRUE(mWindow->AskYesNo(kQuestion));
  press("", Qt::Key_Escape);
  EXPECT_FALSE(mWindow->AskYesNo(kQuestion));
  press("", Qt::Key_Return);  // the safe button is the default too
  EXPECT_FALSE(mWindow->AskYesNo(kQuestion));

  // --yes answers without a dialog.
  mWindow->SetAssumeYes(true);
  QTimer* unexpected = OnModal([](QWidget& box_I) {
    ADD_FAILURE() << "a dialog was shown";
    box_I.close();
  });
  EXPECT_TRUE(mWindow->AskYesNo(kQuestion));
  EXPECT_TRUE(mWindow->RunScalarConfirmation(kQuestion));
  delete unexpected;
}

TEST_F(QtDialogs, ProgramAsksTheScalarsOwnWindowOnlyForAScalarBehindItsBridge) {
  AttachPen();
  FLAppDelegate& app = Make({});
  mWindow->SetInteractive(true);
  for (const char* board : {"Scalar", "Pen"}) {
    SCOPED_TRACE(board);
    OFLUpdater::updater()->setUpdateType(board);
    bool ownWindow = false;
    OnModal([&ownWindow](QWidget& dialog_I) {
      ownWindow = qobject_cast<OFLConfirmationController*>(&dialog_I) != nullptr;
      QTest::keyClick(&dialog_I, Qt::Key_Escape);
    });
    EXPECT_FALSE(app.confirmProgram());
    EXPECT_EQ(ownWindow, std::string(board) == "Scalar");
  }
}

TEST_F(QtDialogs, FileChooserOpensInTheDevicesFirmwareFolderAndHandsThePickedFileOn) {
  mBus->devices = {Product(Board("pen", kNormalPath), false, false)};
  mBus->devices.front()->SetDeviceName("Lab Pen Display");
  const fs::path firmware = mFolder / "cfg" / "Firmware";
  const fs::path own = firmware / "Lab_Pen_Display";
  std::ofstream(firmware / "broken.pen") << "not an image\n";
  // Whether the device's own folder exists, the file picked, where the
  // chooser opened, and whether the file was taken.
  const std::vector<std::tuple<bool, fs::path, fs::path, bool>> rows = {
      {true, own / "pen.pen", own, true},
      {false, firmware / "pen.pen", firmware, true},
      {false, firmware / "broken.pen", firmware, false},
  };
  for (const auto& [ownFolder, picked, opened, taken] : rows) {
    SCOPED_TRACE(picked.string());
    if (ownFolder) WriteImage((fs::create_directories(own), own / "pen.pen"));
    if (!ownFolder) fs::remove_all(own);
    Make({});
    OFLContentController& content = *mWindow->GetContent();
    QString folder;
    QStringList filters;
    OnModal([&, file = picked](QWidget& dialog_I) {
      auto& chooser = dynamic_cast<QFileDialog&>(dialog_I);
      folder = chooser.directory().absolutePath();
      filters = chooser.nameFilters();
      chooser.selectFile(QString::fromStdString(file.string()));
      QMetaObject::invokeMethod(&chooser, "accept", Qt::DirectConnection);
    });
    QTest::mouseClick(content.GetBrowseButton(), Qt::LeftButton);
    EXPECT_EQ(folder.toStdString(), opened.string());
    ASSERT_EQ(filters.size(), 1);
    EXPECT_TRUE(filters[0].endsWith("(*.pen *.tav)")) << filters[0].toStdString();
    EXPECT_EQ(content.GetFileField()->text().toStdString(), picked.string());
    EXPECT_EQ(content.GetProgramButton()->isEnabled(), taken);
    EXPECT_EQ(mCapture.LogContains(
                  T("Error: The specified file does not appear to be a valid firmware file.")),
              !taken);
  }
}

}  // namespace
}  // namespace qt_test
