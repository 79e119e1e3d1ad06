#include "host/ProcessUtils.h"

#include <algorithm>

#include "common/CClock.h"
#include "host/OProcessUtils.h"

namespace {

// A launched application has this long to show up as running, asked this
// often.
constexpr double kLaunchWaitSeconds = 1.0;
constexpr double kLaunchPollSeconds = 0.001;

bool Contains(const std::vector<int>& pids_I, int pid_I) {
  return std::find(pids_I.begin(), pids_I.end(), pid_I) != pids_I.end();
}

}  // namespace

namespace ProcessUtils {

bool LaunchApplicationWithBundleID(const OptionalText& bundleId_I, const OptionalText& path_I,
                                   unsigned long /*options_I*/, bool checkRunning_I,
                                   const OptionalText& argument_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (!desktop) return false;
  SLaunchRequest request;
  if (argument_I && !argument_I->empty()) request.arguments.push_back(*argument_I);
  if (!bundleId_I) {
    if (!path_I || path_I->empty()) return false;
    request.entryPath = *path_I;
  } else {
    if (checkRunning_I && !desktop->RunningApplications(*bundleId_I).empty()) return false;
    request.applicationId = *bundleId_I;
    request.entryPath =
        path_I && !path_I->empty() ? *path_I : desktop->GetApplicationPath(*bundleId_I);
  }
  if (request.entryPath.empty()) return false;

  const int pid = desktop->LaunchApplication(request);
  // Running means the process runs the application's program, not just
  // that it was forked.
  const bool running = pid > 0 && TavPollUntil(kLaunchWaitSeconds, kLaunchPollSeconds, [&] {
                         return bundleId_I
                                    ? Contains(desktop->RunningApplications(*bundleId_I), pid)
                                    : desktop->IsApplicationProcess(pid);
                       });
  if (!running) return false;

  const std::string id = bundleId_I ? *bundleId_I : GetBundleIdentifierForProcessWithUnixPID(pid);
  if (id.empty()) return true;
  OProcessUtils::GetInstance()->addObserver(OProcessUtils::kQuitNotification, id);
  return true;
}

bool QuitApplicationWithBundleID(const OptionalText& bundleId_I, bool includeSelf_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (!bundleId_I || !desktop) return false;
  const std::vector<int> running = desktop->RunningApplications(*bundleId_I);
  if (running.empty()) return false;
  const int self = desktop->GetOwnPid();
  for (int pid : running) {
    if (pid != self || includeSelf_I) desktop->TerminateApplication(pid);
  }
  return true;
}

int GetPIDForProcessWithBundleID(const OptionalText& bundleId_I, bool includeSelf_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (!bundleId_I || !desktop) return 0;
  int found = 0;
  for (int pid : desktop->RunningApplications(*bundleId_I)) {
    found = !includeSelf_I && pid == desktop->GetOwnPid() ? 0 : pid;
  }
  return found;
}

std::string GetBundlePathForProcessWithBundleID(const OptionalText& bundleId_I) {
  return ApplicationIsRunning(bundleId_I) ? *bundleId_I : std::string();
}

std::string GetExecutableNameForProcessWithPID(int pid_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (pid_I == 0 || !desktop) return std::string();
  const std::string path = desktop->GetExecutableOfProcess(pid_I);
  return path.substr(path.rfind('/') + 1);
}

bool ApplicationIsRunning(const OptionalText& bundleId_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  return bundleId_I && desktop && !desktop->RunningApplications(*bundleId_I).empty();
}

std::string GetBundleIdentifierForProcessWithUnixPID(int pid_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (pid_I == 0 || !desktop || !desktop->IsApplicationProcess(pid_I)) return std::string();
  return desktop->GetApplicationIdOfProcess(pid_I);
}

int GetSelfPID() {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  return desktop ? desktop->GetOwnPid() : 0;
}

int GetForegroundProcessPID() { return 0; }

std::string GetProcessIdentifier(int pid_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  return pid_I == 0 || !desktop ? std::string() : desktop->GetApplicationIdOfProcess(pid_I);
}

std::string GetProcessVersion(int /*pid_I*/) { return "0.0.0"; }

std::string FindPathForApplicationName(const std::string& name_I) {
  return FindPathForApplicationSecondaryID(name_I);
}

std::string FindPathForApplicationSecondaryID(const std::string& id_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  return desktop ? desktop->GetApplicationPath(id_I) : std::string();
}

}  // namespace ProcessUtils
