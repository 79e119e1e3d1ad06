#pragma once
// The lab form of the desktop seam: a session whose applications are the
// family's driver, as lab processes. They run until asked to quit, post the
// family's quit notice as they go, and can be started again; which of them
// runs, under which lab process id, is kept in the state folder, so a run
// cut off between stopping and starting the driver leaves it stopped for
// the next. Notifications are logged, kept in order and handed to the
// observer on the poster's thread. The user started the run, and the
// tablet's lab nodes are always open to them.

#include <functional>
#include <map>
#include <mutex>

#include "seams/CDesktop.h"

class CLabDesktop : public CDesktop {
 public:
  // The applications installed, each running at first.
  static constexpr const char* kApplications[] = {"com.tavik.taviktablet", "com.tavik.TabletDriver",
                                                  "com.tavik.TavikTouchDriver"};
  // This program's own lab process id; the applications' ids come after it.
  static constexpr int kOwnPid = 1000;

  // An empty folder keeps nothing between runs.
  explicit CLabDesktop(std::string stateFolder_I = std::string());

  int GetLaunchSenderPid() override { return 0; }
  int GetOwnPid() override { return kOwnPid; }
  std::string GetApplicationIdOfProcess(int pid_I) override;
  std::string GetExecutableOfProcess(int pid_I) override;
  bool IsApplicationProcess(int pid_I) override;
  int GetProcessArgumentCount() override { return 1; }
  std::string GetApplicationPath(const std::string& applicationId_I) override;
  std::vector<int> RunningApplications(const std::string& applicationId_I) override;
  bool TerminateApplication(int pid_I) override;
  bool IsTerminated(int pid_I) override;
  int LaunchApplication(const SLaunchRequest& request_I) override;
  void PostNotification(const SNotification& notification_I) override;
  bool ObserveNotifications(std::function<void(const SNotification&)> observer_I) override;
  bool RequestHidAccess() override { return true; }

  std::vector<std::string> GetNotifications() const;

 private:
  // The running application of that lab process id, or empty.
  std::string RunningIdOf(int pid_I) const;
  void Save() const;

  std::string mStatePath;
  mutable std::mutex mLock;
  std::map<std::string, int> mRunning;  // id to lab process id, 0 when stopped
  int mNextPid = kOwnPid + 1;
  std::vector<std::string> mNotifications;
  // Held while the observer runs, so that replacing it waits for the call.
  std::mutex mObserverLock;
  std::function<void(const SNotification&)> mObserver;
};
