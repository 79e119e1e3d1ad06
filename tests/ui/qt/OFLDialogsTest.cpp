// The window's modal dialogs as a user answers them: the scalar's own
// confirmation, alerts and questions, and the full dialog's file chooser.
#include <QFileDialog>
#include <QLineEdit>
#include <QPushButton>
#include <QTest>

#include "ui/qt/OFLConfirmationController.h"
#include "ui/qt/OFLContentController.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

// Ends the next modal dialog by a click on the button with this text, or
// by this key.
void Answer(const QString& button_I, Qt::Key key_I = Qt::Key_unknown) {
  OnModal([button_I, key_I](QWidget& dialog_I) {
    if (key_I != Qt::Key_unknown) return QTest::keyClick(&dialog_I, key_I);
    for (QPushButton* button : dialog_I.findChildren<QPushButton*>()) {
      if (button->text() == button_I) return button->click();
    }
    dialog_I.close();
  });
}

TEST(ScalarConfirmation, OnlyItsButtonsChangeTheAnswer) {
  QtApp();
  // The answer of an earlier showing, how this one ends, and the answer.
  const std::vector<std::tuple<const char*, const char*, Qt::Key, bool>> rows = {
      {"", "Update", Qt::Key_unknown, true},
      {"", "Cancel", Qt::Key_unknown, false},
      {"", "", Qt::Key_Escape, false},
      {"", "", Qt::Key_Return, false},
      {"", "closed", Qt::Key_unknown, false},
      {"Update", "", Qt::Key_Escape, true},
      {"Update", "closed", Qt::Key_unknown, true},
      {"Update", "Cancel", Qt::Key_unknown, false},
  };
  for (const auto& [before, button, key, answer] : rows) {
    SCOPED_TRACE(std::string(before) + "/" + button + "/" + std::to_string(key));
    OFLConfirmationController dialog({EALERT_STYLE_WARNING, "T", "I", {"Cancel", "Update"}});
    if (*before != '\0') {
      Answer(before);
      dialog.runModal();
    }
    Answer(button, key);
    EXPECT_EQ(dialog.runModal(), answer);
  }
}

class QtDialogs : public QtWindowFixture {};

TEST_F(QtDialogs, QuestionsGiveTheSafeAnswerOnEscapeOrReturn) {
  AttachPen();
  FLAppDelegate& app = Make({});
  mWindow->SetInteractive(true);
  const SAlert question{EALERT_STYLE_WARNING, "Title", "Text", {"No", "Yes"}};
  Answer("Yes");
  EXPECT_TRUE(mWindow->AskYesNo(question));
  Answer("", Qt::Key_Escape);
  EXPECT_FALSE(mWindow->AskYesNo(question));
  Answer("", Qt::Key_Return);
  EXPECT_FALSE(mWindow->AskYesNo(question));

  // Only a scalar behind its bridge gets its own window.
  for (const char* board : {"Scalar", "Pen"}) {
    OFLUpdater::updater()->setUpdateType(board);
    bool ownWindow = false;
    OnModal([&ownWindow](QWidget& dialog_I) {
      ownWindow = qobject_cast<OFLConfirmationController*>(&dialog_I) != nullptr;
      QTest::keyClick(&dialog_I, Qt::Key_Escape);
    });
    EXPECT_FALSE(app.confirmProgram());
    EXPECT_EQ(ownWindow, std::string(board) == "Scalar") << board;
  }

  // --yes answers without a dialog, which would wait here for ever.
  mWindow->SetAssumeYes(true);
  EXPECT_TRUE(mWindow->AskYesNo(question));
  EXPECT_TRUE(mWindow->RunScalarConfirmation(question));
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
    QString folder, filter;
    OnModal([&, file = picked](QWidget& dialog_I) {
      auto& chooser = dynamic_cast<QFileDialog&>(dialog_I);
      folder = chooser.directory().absolutePath();
      filter = chooser.nameFilters().join('|');
      // Typed, as a user would; selectFile leaves a focused name field alone.
      chooser.findChild<QLineEdit*>("fileNameEdit")->setText(QString::fromStdString(file.string()));
      QMetaObject::invokeMethod(&chooser, "accept", Qt::DirectConnection);
    });
    QTest::mouseClick(content.GetBrowseButton(), Qt::LeftButton);
    EXPECT_EQ(folder.toStdString(), opened.string());
    EXPECT_TRUE(filter.endsWith("(*.pen *.tav)")) << filter.toStdString();
    EXPECT_EQ(content.GetFileField()->text().toStdString(), picked.string());
    EXPECT_EQ(content.GetProgramButton()->isEnabled(), taken);
    EXPECT_EQ(mCapture.LogContains(
                  T("Error: The specified file does not appear to be a valid firmware file.")),
              !taken);
  }
}

}  // namespace
}  // namespace qt_test
