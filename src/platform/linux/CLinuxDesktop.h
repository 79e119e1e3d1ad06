#pragma once
// The desktop on Linux: applications are XDG desktop entries, processes
// come from /proc, notifications are D-Bus signals on the session bus, and
// the launch sender is the parent process.
//
// Only processes whose real owner is the user running this program are
// listed, asked to quit or started. A run as root starts no application
// that another user has running: a second one of root's would fight that
// user's for the tablet.

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "platform/linux/CProcFolder.h"
#include "seams/CDesktop.h"
#include "seams/CDeviceRegistry.h"

class CLinuxDesktop : public CDesktop {
 public:
  // The registry lists the tablet's device nodes for the access check.
  explicit CLinuxDesktop(std::shared_ptr<CDeviceRegistry> registry_I,
                         CProcFolder processes_I = CProcFolder());
  ~CLinuxDesktop() override;
  CLinuxDesktop(const CLinuxDesktop&) = delete;
  CLinuxDesktop& operator=(const CLinuxDesktop&) = delete;

  int GetLaunchSenderPid() override;
  int GetOwnPid() override;
  std::string GetApplicationIdOfProcess(int pid_I) override;
  std::string GetExecutableOfProcess(int pid_I) override;
  bool IsApplicationProcess(int pid_I) override;
  int GetProcessArgumentCount() override;
  std::string GetApplicationPath(const std::string& applicationId_I) override;
  std::vector<int> RunningApplications(const std::string& applicationId_I) override;
  bool TerminateApplication(int pid_I) override;
  bool IsTerminated(int pid_I) override;
  int LaunchApplication(const SLaunchRequest& request_I) override;
  void PostNotification(const SNotification& notification_I) override;
  bool ObserveNotifications(std::function<void(const SNotification&)> observer_I) override;
  bool RequestHidAccess() override;

 private:
  // The live processes running `program_I`; this user's only, or anyone's.
  std::vector<int> ProcessesOf(const std::string& program_I, bool ownOnly_I) const;
  bool IsOwn(int pid_I) const;
  bool StartListening();

  std::shared_ptr<CDeviceRegistry> mRegistry;
  CProcFolder mProcesses;

  // Held while the observer runs, so that replacing it waits for the call.
  std::mutex mObserverLock;
  std::function<void(const SNotification&)> mObserver;
  std::thread mListener;
  std::atomic<bool> mStopListening{false};
};
