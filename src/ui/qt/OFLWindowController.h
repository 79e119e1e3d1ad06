#pragma once
// The update window drawn with Qt widgets, in its two forms: the update
// dialog (three icons, progress bar, status line) for runs that name their
// boards, and the full dialog (tablet header, board panel with its status
// panel) where the user picks the board and the file.
//
// Its main loop is Qt's event loop on the thread that made it, which must
// be the QApplication's. Tasks posted from any thread run there one at a
// time, in posting order.
//
// Alerts and questions are modal message boxes with their buttons in the
// given order; Escape gives the first, safe, button. Where nobody can
// answer (the offscreen and minimal platforms, which have no screen), an
// alert answers its first button and a question no, as the terminal does
// without a terminal, and the log says so.
//
// The window logs each new status text (trailing dots aside) with the
// progress the bar holds, so a run without a screen can be followed.

#include <QObject>
#include <QPointer>
#include <memory>
#include <mutex>
#include <optional>

#include "update/CWindowController.h"

class FLAppDelegate;
class QEventLoop;
class OFLMainWindow;
class OFLHeaderController;
class OFLContentController;
class OFLStatusController;
class OFLUpdateController;

class OFLWindowController : public CWindowController {
 public:
  // Needs a QApplication.
  OFLWindowController();
  ~OFLWindowController() override;

  // Questions are answered yes without being shown (the --yes option).
  void SetAssumeYes(bool assumeYes_I) { mAssumeYes = assumeYes_I; }
  // Whether a user can answer a dialog; unset, the platform tells.
  void SetInteractive(std::optional<bool> interactive_I) { mInteractive = interactive_I; }
  bool IsInteractive() const;
  // The board panel's actions go to this application object.
  void SetApplication(FLAppDelegate* application_I);
  // The folder under which "Firmware" holds the images.
  void SetDataFolder(const std::string& folder_I);

  void initForDialog(bool commandLine_I) override;
  void showWindow() override;
  void enableClose(bool enable_I) override;
  void SetCloseHandler(std::function<void()> handler_I) override;

  void setStatusText(const std::string& text_I) override;
  void setStatusProgress(double percent_I) override;
  void setStatusColor(ESTATUS_COLOR color_I) override;

  void setTabletName(const std::string& name_I) override;
  void setBoardArray(const std::vector<std::string>& boards_I) override;
  void setPenFirmwareVersion(uint32_t version_I) override;
  void setPenOldChecksum(uint32_t checksum_I) override;
  void setPenNewChecksum(uint32_t checksum_I) override;
  void setTouchFirmwareVersion(uint32_t version_I) override;
  void setTouchOldChecksum(uint32_t checksum_I) override;
  void setTouchNewChecksum(uint32_t checksum_I) override;
  void enableUIElements(bool enable_I) override;
  void enableProgramButton(bool enable_I) override;

  int ShowAlert(const SAlert& alert_I) override;
  bool AskYesNo(const SAlert& question_I) override;
  bool RunScalarConfirmation(const SAlert& question_I) override;

  void RunMainLoop() override;
  void QuitMainLoop() override;
  void PostToMainLoop(std::function<void()> task_I) override;
  void PostToMainLoopAfter(double delay_I, std::function<void()> task_I) override;
  bool IsMainLoopThread() const override;

  // The window and its panels; null where the dialog has none.
  OFLMainWindow* GetWindow() const { return mWindow.get(); }
  bool IsFullDialog() const { return mFullDialogFlag; }
  OFLHeaderController* GetHeader() const { return mHeaderController; }
  OFLContentController* GetContent() const { return mContentController; }
  OFLStatusController* GetStatus() const { return mStatusController; }
  OFLUpdateController* GetUpdate() const { return mUpdateController; }
  // What the status line and the bar hold now, in either dialog.
  std::string GetStatusText() const;
  double GetStatusProgress() const;

 private:
  struct SPostTarget;

  void doFullLayout();
  void OnCloseRequest();
  void LogStatus(const std::string& text_I);

  std::unique_ptr<OFLMainWindow> mWindow;
  bool mFullDialogFlag = false;
  OFLHeaderController* mHeaderController = nullptr;
  OFLContentController* mContentController = nullptr;
  OFLStatusController* mStatusController = nullptr;
  OFLUpdateController* mUpdateController = nullptr;
  FLAppDelegate* mApplication = nullptr;
  std::string mDataFolder;

  bool mAssumeYes = false;
  std::optional<bool> mInteractive;
  bool mCloseEnabled = true;
  std::function<void()> mCloseHandler;
  std::string mLoggedStatus;

  // The loop: tasks go to mContext's thread; a quit sets mQuit and stops
  // the running loop, or the next one at once.
  std::unique_ptr<QObject> mContext;
  std::shared_ptr<SPostTarget> mPostTarget;
  std::mutex mQuitLock;
  bool mQuit = false;
  QPointer<QEventLoop> mRunningLoop;
};
