#pragma once
// The desktop seam: the other programs of the family and the session they
// run in.
//
// Linux form: applications are XDG desktop entries (an application id is the
// entry's id); running means a process in /proc whose executable is the
// entry's Exec program; quitting is SIGTERM; launching runs the Exec line
// detached. Notifications are D-Bus signals on the session bus. The sender
// of the launch is the parent process.
// Lab form: an in-process desktop with no other applications.
//
// Contract: no operation throws or blocks for long; one that cannot reach
// what it asks for answers "nothing" (an empty list, an empty id, false).

#include <map>
#include <string>
#include <vector>

class CDesktop {
 public:
  virtual ~CDesktop() = default;

  // The process id of whoever started this program, 0 when unknown.
  virtual int GetLaunchSenderPid() = 0;
  // The application id of a running process; for a process that is no
  // application of the desktop, its executable's name; empty when unknown.
  virtual std::string GetApplicationIdOfProcess(int pid_I) = 0;
  // True when the process is an application of the desktop.
  virtual bool IsApplicationProcess(int pid_I) = 0;
  // The number of arguments this process was started with, its name included.
  virtual int GetProcessArgumentCount() = 0;

  // The processes of the application with that id.
  virtual std::vector<int> RunningApplications(const std::string& applicationId_I) = 0;
  // Asks the process to quit; true when the request was delivered.
  virtual bool TerminateApplication(int pid_I) = 0;
  virtual bool IsTerminated(int pid_I) = 0;
  // Starts the application; true when it was started.
  virtual bool LaunchApplication(const std::string& applicationId_I) = 0;

  // Tells other programs of the family; `userInfo_I` may be empty.
  virtual void PostNotification(const std::string& name_I,
                                const std::map<std::string, std::string>& userInfo_I) = 0;

  // True when this user may open the tablet's device nodes.
  virtual bool RequestHidAccess() = 0;
};
