#pragma once
// The desktop on Linux: applications are XDG desktop entries, processes
// come from /proc, notifications are D-Bus signals on the session bus, and
// the launch sender is the parent process.

#include <memory>
#include <string>
#include <vector>

#include "seams/CDesktop.h"
#include "seams/CDeviceRegistry.h"

class CLinuxDesktop : public CDesktop {
 public:
  // The registry lists the tablet's device nodes for the access check.
  explicit CLinuxDesktop(std::shared_ptr<CDeviceRegistry> registry_I);

  int GetLaunchSenderPid() override;
  std::string GetApplicationIdOfProcess(int pid_I) override;
  bool IsApplicationProcess(int pid_I) override;
  int GetProcessArgumentCount() override;
  std::vector<int> RunningApplications(const std::string& applicationId_I) override;
  bool TerminateApplication(int pid_I) override;
  bool IsTerminated(int pid_I) override;
  bool LaunchApplication(const std::string& applicationId_I) override;
  void PostNotification(const std::string& name_I,
                        const std::map<std::string, std::string>& userInfo_I) override;
  bool RequestHidAccess() override;

  // The D-Bus form of a notification: interface and object path.
  static constexpr const char* kNotificationInterface = "com.tavik.Notification";
  static constexpr const char* kNotificationPath = "/com/tavik/Notification";
  // "com.tavik.TFUCompleted" is sent as member "com_tavik_TFUCompleted".
  static std::string SignalMemberFor(const std::string& name_I);

 private:
  std::shared_ptr<CDeviceRegistry> mRegistry;
};
