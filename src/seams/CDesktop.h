#pragma once
// The desktop seam: the other programs of the family and the session they
// run in.
//
// Linux form: applications are XDG desktop entries (an application id is the
// entry's id, its path the entry file's); running means a process in /proc,
// owned by the user running this program, whose executable is the entry's
// Exec program; quitting is SIGTERM; launching runs the Exec line detached.
// Notifications are D-Bus signals on the session bus. The sender of the
// launch is the parent process.
// Lab form: an in-process desktop whose applications are the family's
// driver, kept in the lab's state folder between runs.
//
// Contract: no operation throws or blocks for long; one that cannot reach
// what it asks for answers "nothing" (an empty list, an empty id, 0, false).
// Only this user's processes are ever listed, asked to quit or started: a
// process of another user is not this program's business.

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <variant>
#include <vector>

// A notification's user information: texts and numbers, "a{sv}" on D-Bus.
using NotificationValue = std::variant<std::string, int32_t>;
using NotificationInfo = std::map<std::string, NotificationValue>;

struct SNotification {
  std::string name;
  std::string object;  // the sender's application id, or empty
  NotificationInfo userInfo;
};

// What to start: the entry at `entryPath`, else the application `applicationId`.
struct SLaunchRequest {
  std::string applicationId;
  std::string entryPath;
  std::vector<std::string> arguments;  // after the entry's own
};

class CDesktop {
 public:
  virtual ~CDesktop() = default;

  // The process id of whoever started this program, 0 when unknown.
  virtual int GetLaunchSenderPid() = 0;
  virtual int GetOwnPid() = 0;
  // The application id of a running process; for a process that is no
  // application of the desktop, its executable's name; empty when unknown.
  virtual std::string GetApplicationIdOfProcess(int pid_I) = 0;
  // The program a process runs, as a path; empty when unknown.
  virtual std::string GetExecutableOfProcess(int pid_I) = 0;
  // True when the process is an application of the desktop.
  virtual bool IsApplicationProcess(int pid_I) = 0;
  // The number of arguments this process was started with, its name included.
  virtual int GetProcessArgumentCount() = 0;
  // Where the application is installed (its entry file); empty when it is not.
  virtual std::string GetApplicationPath(const std::string& applicationId_I) = 0;

  // This user's processes of the application with that id.
  virtual std::vector<int> RunningApplications(const std::string& applicationId_I) = 0;
  // Asks this user's process to quit; true when the request was delivered.
  virtual bool TerminateApplication(int pid_I) = 0;
  virtual bool IsTerminated(int pid_I) = 0;
  // Starts the application as this user, in a session of its own, with
  // nothing of ours open; its process id, or 0 when it could not start.
  // The process may not yet show as the application when this returns.
  virtual int LaunchApplication(const SLaunchRequest& request_I) = 0;

  // Tells other programs of the family.
  virtual void PostNotification(const SNotification& notification_I) = 0;
  // From now on every notification of the family, this program's own
  // included, goes to `observer_I`, on a thread of the desktop's choosing;
  // an empty observer stops that, and returns once no call is under way.
  // False when notifications cannot be received.
  virtual bool ObserveNotifications(std::function<void(const SNotification&)> observer_I) = 0;

  // True when this user may open the tablet's device nodes.
  virtual bool RequestHidAccess() = 0;
};
