#pragma once
// Doubles of the window and the desktop for the application object.

#include <map>

#include "seams/CDesktop.h"
#include "update/CWindowController.h"
#include "update/UpdaterDoubles.h"

namespace controller_test {

class CFakeWindow : public CWindowController {
 public:
  void initForDialog(bool commandLine_I) override { Add("init:" + std::to_string(commandLine_I)); }
  void showWindow() override { Add("show"); }
  void enableClose(bool enable_I) override { Add("close:" + std::to_string(enable_I)); }
  void SetCloseHandler(std::function<void()> handler_I) override { mCloseHandler = handler_I; }
  void setStatusText(const std::string& text_I) override { Add("text:" + text_I); }
  void setStatusProgress(double percent_I) override {
    Add("progress:" + std::to_string(static_cast<int>(percent_I)));
  }
  void setStatusColor(ESTATUS_COLOR color_I) override { Add("color:" + std::to_string(color_I)); }
  void setTabletName(const std::string& name_I) override { Add("name:" + name_I); }
  void setBoardArray(const std::vector<std::string>& boards_I) override {
    std::string joined;
    for (const std::string& board : boards_I) joined += board + ",";
    Add("boards:" + joined);
  }
  void setPenFirmwareVersion(uint32_t) override {}
  void setPenOldChecksum(uint32_t) override {}
  void setPenNewChecksum(uint32_t) override {}
  void setTouchFirmwareVersion(uint32_t) override {}
  void setTouchOldChecksum(uint32_t) override {}
  void setTouchNewChecksum(uint32_t) override {}
  void enableUIElements(bool enable_I) override { Add("ui:" + std::to_string(enable_I)); }
  void enableProgramButton(bool enable_I) override { Add("button:" + std::to_string(enable_I)); }
  int ShowAlert(const SAlert& alert_I) override {
    Add("alert:" + alert_I.message + "|" + alert_I.informativeText);
    mLastAlert = alert_I;
    return 0;
  }
  bool AskYesNo(const SAlert& question_I) override {
    Add("ask");
    mLastAlert = question_I;
    return mAnswerYes;
  }
  void RunMainLoop() override {}
  void QuitMainLoop() override {}
  void PostToMainLoop(std::function<void()> task_I) override { task_I(); }
  void PostToMainLoopAfter(double delay_I, std::function<void()> task_I) override {
    std::lock_guard<std::mutex> guard(mTaskLock);
    mDelayed.emplace_back(delay_I, std::move(task_I));
  }
  bool IsMainLoopThread() const override { return true; }

  // Runs the oldest delayed task; false when there is none.
  bool RunDelayed(double* delay_O = nullptr) {
    std::pair<double, std::function<void()>> next;
    {
      std::lock_guard<std::mutex> guard(mTaskLock);
      if (mDelayed.empty()) return false;
      next = std::move(mDelayed.front());
      mDelayed.erase(mDelayed.begin());
    }
    if (delay_O != nullptr) *delay_O = next.first;
    next.second();
    return true;
  }

  std::vector<std::string> Calls() const { return mJournal.Entries(); }
  bool Called(const std::string& call_I) const { return mJournal.Contains(call_I); }

  bool mAnswerYes = true;
  SAlert mLastAlert;
  std::function<void()> mCloseHandler;

 private:
  void Add(const std::string& call_I) { mJournal.Add(call_I); }
  CJournal mJournal;
  std::mutex mTaskLock;
  std::vector<std::pair<double, std::function<void()>>> mDelayed;
};

class CFakeDesktop : public CDesktop {
 public:
  int GetLaunchSenderPid() override { return mSenderPid; }
  std::string GetApplicationIdOfProcess(int) override { return mSenderId; }
  bool IsApplicationProcess(int) override { return mSenderIsApplication; }
  int GetProcessArgumentCount() override { return mArgumentCount; }
  std::vector<int> RunningApplications(const std::string& id_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    auto found = mRunning.find(id_I);
    return found == mRunning.end() ? std::vector<int>{} : found->second;
  }
  bool TerminateApplication(int pid_I) override {
    mJournal.Add("quit:" + std::to_string(pid_I));
    std::lock_guard<std::mutex> guard(mLock);
    for (auto& [id, pids] : mRunning) std::erase(pids, pid_I);
    return true;
  }
  bool IsTerminated(int) override { return true; }
  bool LaunchApplication(const std::string& id_I) override {
    mJournal.Add("launch:" + id_I);
    return true;
  }
  void PostNotification(const std::string& name_I,
                        const std::map<std::string, std::string>&) override {
    mJournal.Add("notify:" + name_I);
  }
  bool RequestHidAccess() override { return mHidAccess; }

  int mSenderPid = 1;
  std::string mSenderId = "systemd";
  bool mSenderIsApplication = false;
  int mArgumentCount = 1;
  bool mHidAccess = true;
  std::map<std::string, std::vector<int>> mRunning;
  std::mutex mLock;
  CJournal mJournal;
};

}  // namespace controller_test
