#pragma once
// The lab form of the desktop seam: a session with no other programs of the
// family. Nothing runs, so there is nothing to quit or launch; notifications
// are kept in order, for the tests and the log. The user started the run,
// and the tablet's lab nodes are always open to them.

#include <mutex>

#include "seams/CDesktop.h"

class CLabDesktop : public CDesktop {
 public:
  int GetLaunchSenderPid() override { return 0; }
  std::string GetApplicationIdOfProcess(int) override { return std::string(); }
  bool IsApplicationProcess(int) override { return false; }
  int GetProcessArgumentCount() override { return 1; }
  std::vector<int> RunningApplications(const std::string&) override { return {}; }
  bool TerminateApplication(int) override { return false; }
  bool IsTerminated(int) override { return true; }
  bool LaunchApplication(const std::string&) override { return false; }
  void PostNotification(const std::string& name_I,
                        const std::map<std::string, std::string>& userInfo_I) override;
  bool RequestHidAccess() override { return true; }

  std::vector<std::string> GetNotifications() const;

 private:
  mutable std::mutex mLock;
  std::vector<std::string> mNotifications;
};
