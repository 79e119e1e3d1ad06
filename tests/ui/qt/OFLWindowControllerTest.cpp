// The state machine's table drives the Qt window in both of its dialogs:
// what each state does to the status line, the bar, the close button and
// menus and the board panel, read back from the widgets.
#include <QComboBox>
#include <QMenu>
#include <QProgressBar>
#include <QPushButton>
#include <QSignalSpy>
#include <QTest>
#include <optional>

#include "ui/qt/OFLContentController.h"
#include "ui/qt/OFLHeaderController.h"
#include "ui/qt/OFLMainWindow.h"
#include "ui/qt/OFLUpdateController.h"
#include "ui/qt/QtWindowFixture.h"

namespace qt_test {
namespace {

class QtStateTable : public QtWindowFixture {
 protected:
  // The title bar's button and every menu, which must agree.
  bool CloseEnabled() const {
    const OFLMainWindow& window = *mWindow->GetWindow();
    const bool enabled = window.windowFlags().testFlag(Qt::WindowCloseButtonHint);
    for (QMenu* menu : window.GetMenus()) EXPECT_EQ(menu->menuAction()->isEnabled(), enabled);
    return enabled;
  }
};

TEST_F(QtStateTable, EachStateDrivesBothDialogs) {
  AttachPen();
  struct SRow {
    ECONTROLLER_STATE state;
    std::string text;                    // the status line afterwards
    bool close;                          // close button and menus
    std::optional<bool> panel, program;  // the full dialog's; unset: not touched
    std::string alert;                   // the dialog it shows, if any
    bool terminated;
  };
  // clang-format off
  const std::vector<SRow> rows = {
    {ESTATE_NONE, "", true, true, false, "", false},
    {ESTATE_READY, "", true, true, true, "", false},
    {ESTATE_WAIT_LOADER, T("Waiting for Loader Mode"), false, false, {}, "", false},
    {ESTATE_PROGRAM, T("Updating, this may take several minutes") + ".", false, false, {}, "", false},
    {ESTATE_WAIT_DEVICE, T("Waiting for Device Mode"), false, false, {}, "", false},
    {ESTATE_SUCCESS, T("Programming Successful"), true, {}, {},
     T("Firmware was successfully updated."), true},
    {ESTATE_FAILURE, T("Programming Failed"), true, true, {}, T("Programming Failed"), true},
    {ESTATE_TERMINATE, "", true, {}, {},
     T("Error: No supported tablet is connected. Please connect a tablet."), true},
    {ESTATE_INVALID, "", true, {}, {},
     T("Error: Invalid state resulted in updater termination."), true},
    {static_cast<ECONTROLLER_STATE>(8), "", false, {}, {}, "", false},  // no row: nothing
  };
  // clang-format on
  for (const bool updateDialog : {true, false}) {
    for (const SRow& row : rows) {
      SCOPED_TRACE((updateDialog ? "update dialog, state " : "full dialog, state ") +
                   std::to_string(row.state));
      FLAppDelegate& app = Make(updateDialog ? Words{"-p", ""} : Words{});
      ASSERT_EQ(mWindow->IsFullDialog(), !updateDialog);
      // Everything off, so that each state shows what it switches on.
      mWindow->enableClose(false);
      mWindow->enableUIElements(false);
      mWindow->enableProgramButton(false);
      mWindow->setStatusProgress(40);

      app.doStateMachine(row.state);
      if (row.state == ESTATE_PROGRAM) {
        mClock->Advance(0.5);  // the moving text's first step
        EXPECT_TRUE(QTest::qWaitFor([this] { return !mWindow->GetStatusText().empty(); }, 5000));
      }
      EXPECT_EQ(mWindow->GetStatusText(), row.text);
      EXPECT_EQ(CloseEnabled(), row.close);
      EXPECT_EQ(mExitStatus, row.terminated ? 0 : -100);  // a window run ends with 0
      // A close request ends the run only while closing is enabled.
      if (!row.terminated) {
        mWindow->GetWindow()->close();
        EXPECT_EQ(mExitStatus, row.close ? 0 : -100);
      }
      if (!row.alert.empty()) {
        EXPECT_TRUE(mCapture.LogContains("\"" + row.alert + "\", answered \"" + T("OK") + "\""));
      }
      if (updateDialog) {
        EXPECT_EQ(mWindow->GetContent(), nullptr);
        // The update dialog shows one more than it is given: 100 as 101.
        EXPECT_EQ(mWindow->GetStatusProgress(), row.state == ESTATE_SUCCESS ? 101 : 41);
        const QProgressBar& bar = *mWindow->GetUpdate()->GetProgressBar();
        EXPECT_EQ(bar.value(), row.state == ESTATE_SUCCESS ? bar.maximum() : 41);
        continue;
      }
      EXPECT_EQ(mWindow->GetStatusProgress(), row.state == ESTATE_SUCCESS ? 100 : 40);
      const OFLContentController& content = *mWindow->GetContent();
      EXPECT_EQ(content.GetBoardList()->isEnabled(), row.panel.value_or(false));
      EXPECT_EQ(content.GetBrowseButton()->isEnabled(), row.panel.value_or(false));
      EXPECT_EQ(content.GetProgramButton()->isEnabled(), row.program.value_or(false));
    }
  }
}

// A board with a version and checksums of its own.
class CVersionedBoard : public CFakeInterface {
 public:
  CVersionedBoard(const char* name_I, const char* path_I, CJournal& journal_I, uint32_t version_I)
      : CFakeInterface(name_I, path_I, journal_I), mShownVersion(version_I) {}
  uint32_t GetVersion() const override { return mShownVersion; }
  uint32_t GetOldChecksum() const override { return 0xAB; }
  uint32_t GetNewChecksum() const override { return 0x1234; }
  uint32_t mShownVersion;
};

TEST_F(QtStateTable, FullDialogShowsTheTabletAndHandsTheBoardNameBackUntranslated) {
  mBus->devices = {
      Product(std::make_shared<CVersionedBoard>("pen", kNormalPath, mJournal, 0xFFFFFFFF), false,
              false, std::make_shared<CVersionedBoard>("touch", kTouchPath, mJournal, 0x0A2B))};
  SetLanguage("de");
  Make({});
  EXPECT_EQ(mWindow->GetHeader()->GetName().toStdString(), "Lab Tablet");
  const OFLContentController& content = *mWindow->GetContent();
  EXPECT_EQ(content.GetPenFirmwareVersion()->text(), "N/A");
  // The low byte splits in decimal, the rest prints in hexadecimal.
  EXPECT_EQ(content.GetTouchFirmwareVersion()->text(), "a.4.3");
  EXPECT_EQ(content.GetPenOldChecksum()->text(), "  ab");
  EXPECT_EQ(content.GetTouchNewChecksum()->text(), "1234");

  // The list shows "Stift"; choosing it gives the updater "Pen".
  QComboBox& boards = *content.GetBoardList();
  ASSERT_EQ(boards.count(), 2);
  EXPECT_EQ(boards.itemText(0).toStdString(), TTCLocalizedNSString("Pen"));
  EXPECT_NE(boards.itemText(0), "Pen");
  CUpdateController& controller = OFLUpdater::updater()->GetController();
  QTest::keyClick(&boards, Qt::Key_Down);
  EXPECT_EQ(controller.GetUpdateType(), EUPDATE_TOUCH);
  QTest::keyClick(&boards, Qt::Key_Up);
  EXPECT_EQ(controller.GetUpdateType(), EUPDATE_PEN);
}

// The start-up benchmark times a run to this signal.
TEST(QtMainWindow, TellsItsFirstFrameOnceItIsShown) {
  QtApp();
  OFLMainWindow window;
  QSignalSpy frames(&window, &OFLMainWindow::firstFrame);
  QTest::qWait(20);
  EXPECT_EQ(frames.count(), 0) << "not shown yet";
  window.show();
  EXPECT_TRUE(frames.wait(5000));
  window.resize(window.width() + 10, window.height());
  window.update();
  QTest::qWait(50);
  EXPECT_EQ(frames.count(), 1);
}

}  // namespace
}  // namespace qt_test
