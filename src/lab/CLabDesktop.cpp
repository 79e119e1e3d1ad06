#include "lab/CLabDesktop.h"

#include "common/TavLog.h"
#include "lab/CLabStateFile.h"

namespace {

// An application's entry, as the lab installs it.
const std::string kEntryPrefix = "lab:applications/";
const std::string kEntrySuffix = ".desktop";

}  // namespace

CLabDesktop::CLabDesktop(std::string stateFolder_I) {
  if (!stateFolder_I.empty()) mStatePath = stateFolder_I + "/desktop.state";
  CLabStateFile state;
  const bool saved = !mStatePath.empty() && state.Load(mStatePath);
  mNextPid = static_cast<int>(state.GetNumber("next-pid", kOwnPid + 1));
  for (const char* id : kApplications) {
    const int pid = static_cast<int>(state.GetNumber(std::string("pid:") + id, 0));
    mRunning[id] = saved ? pid : mNextPid++;
  }
}

void CLabDesktop::Save() const {
  if (mStatePath.empty()) return;
  CLabStateFile state;
  state.PutNumber("next-pid", static_cast<uint64_t>(mNextPid));
  for (const auto& [id, pid] : mRunning) state.PutNumber("pid:" + id, static_cast<uint64_t>(pid));
  if (!state.Save(mStatePath)) {
    TavLog::Warning("Lab desktop state not saved: %s\n", mStatePath.c_str());
  }
}

std::string CLabDesktop::RunningIdOf(int pid_I) const {
  for (const auto& [id, pid] : mRunning) {
    if (pid != 0 && pid == pid_I) return id;
  }
  return std::string();
}

std::string CLabDesktop::GetApplicationIdOfProcess(int pid_I) {
  if (pid_I == kOwnPid) return "tavik-fwupdater";
  std::lock_guard<std::mutex> guard(mLock);
  return RunningIdOf(pid_I);
}

std::string CLabDesktop::GetExecutableOfProcess(int pid_I) {
  const std::string id = GetApplicationIdOfProcess(pid_I);
  return id.empty() ? id : "/lab/bin/" + id;
}

bool CLabDesktop::IsApplicationProcess(int pid_I) {
  std::lock_guard<std::mutex> guard(mLock);
  return !RunningIdOf(pid_I).empty();
}

std::string CLabDesktop::GetApplicationPath(const std::string& applicationId_I) {
  std::lock_guard<std::mutex> guard(mLock);
  return mRunning.count(applicationId_I) != 0 ? kEntryPrefix + applicationId_I + kEntrySuffix
                                              : std::string();
}

std::vector<int> CLabDesktop::RunningApplications(const std::string& applicationId_I) {
  std::lock_guard<std::mutex> guard(mLock);
  const auto found = mRunning.find(applicationId_I);
  if (found == mRunning.end() || found->second == 0) return {};
  return {found->second};
}

bool CLabDesktop::TerminateApplication(int pid_I) {
  std::string id;
  {
    std::lock_guard<std::mutex> guard(mLock);
    id = RunningIdOf(pid_I);
    if (id.empty()) return false;
    mRunning[id] = 0;
    Save();
  }
  TavLog::Info("Lab application quit: %s (%d)\n", id.c_str(), pid_I);
  // As the family's applications do on their way out.
  PostNotification({"TavikApplicationQuitNotification",
                    id,
                    {{"processID", pid_I}, {"bundleURL", GetApplicationPath(id)}}});
  return true;
}

bool CLabDesktop::IsTerminated(int pid_I) {
  std::lock_guard<std::mutex> guard(mLock);
  return RunningIdOf(pid_I).empty();
}

int CLabDesktop::LaunchApplication(const SLaunchRequest& request_I) {
  std::string id = request_I.applicationId;
  const std::string& entry = request_I.entryPath;
  if (entry.rfind(kEntryPrefix, 0) == 0 &&
      entry.size() > kEntryPrefix.size() + kEntrySuffix.size()) {
    id =
        entry.substr(kEntryPrefix.size(), entry.size() - kEntryPrefix.size() - kEntrySuffix.size());
  } else if (!entry.empty()) {
    return 0;  // no such entry in the lab
  }
  std::lock_guard<std::mutex> guard(mLock);
  const auto found = mRunning.find(id);
  if (found == mRunning.end()) return 0;
  // One instance each: starting a running one brings up the one there is.
  if (found->second == 0) {
    found->second = mNextPid++;
    Save();
    TavLog::Info("Lab application started: %s (%d)\n", id.c_str(), found->second);
  }
  return found->second;
}

void CLabDesktop::PostNotification(const SNotification& notification_I) {
  TavLog::Info("Lab notification: %s\n", notification_I.name.c_str());
  {
    std::lock_guard<std::mutex> guard(mLock);
    mNotifications.push_back(notification_I.name);
  }
  std::lock_guard<std::mutex> guard(mObserverLock);
  if (mObserver) mObserver(notification_I);
}

bool CLabDesktop::ObserveNotifications(std::function<void(const SNotification&)> observer_I) {
  std::lock_guard<std::mutex> guard(mObserverLock);
  mObserver = std::move(observer_I);
  return true;
}

std::vector<std::string> CLabDesktop::GetNotifications() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mNotifications;
}
