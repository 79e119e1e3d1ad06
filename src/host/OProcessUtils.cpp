#include "host/OProcessUtils.h"

#include <algorithm>
#include <cstdlib>

#include "common/SystemState.h"

namespace {

std::mutex gClassLock;
std::shared_ptr<CDesktop> gDesktop;
OProcessUtils* gInstance = nullptr;

int ProcessIdOf(const NotificationInfo& info_I) {
  const auto found = info_I.find("processID");
  if (found == info_I.end()) return 0;
  if (const auto* number = std::get_if<int32_t>(&found->second)) return *number;
  return std::atoi(std::get<std::string>(found->second).c_str());
}

}  // namespace

void OProcessUtils::SetDesktop(std::shared_ptr<CDesktop> desktop_I) {
  DisposeInstance();
  std::lock_guard<std::mutex> guard(gClassLock);
  gDesktop = std::move(desktop_I);
}

std::shared_ptr<CDesktop> OProcessUtils::GetDesktop() {
  std::lock_guard<std::mutex> guard(gClassLock);
  return gDesktop;
}

OProcessUtils* OProcessUtils::GetInstance() {
  std::lock_guard<std::mutex> guard(gClassLock);
  if (gInstance == nullptr) gInstance = new OProcessUtils(gDesktop);
  return gInstance;
}

void OProcessUtils::DisposeInstance() {
  OProcessUtils* instance = nullptr;
  {
    std::lock_guard<std::mutex> guard(gClassLock);
    std::swap(instance, gInstance);
  }
  if (instance == nullptr) return;
  // Waits for a notice under way, which may still be using the instance.
  if (instance->mDesktop) instance->mDesktop->ObserveNotifications(nullptr);
  delete instance;
}

OProcessUtils::OProcessUtils(std::shared_ptr<CDesktop> desktop_I) : mDesktop(std::move(desktop_I)) {
  allocProcessIDList();
  registerForCallBackOnce();
}

void OProcessUtils::allocProcessIDList() {
  std::lock_guard<std::mutex> guard(mLock);
  mQuitProcessIDList.clear();
}

void OProcessUtils::registerForCallBackOnce() {
  addObserver(kIOManagerStartup, "");
  addObserver(kFrontApplicationChanged, "");
  addObserver(kQuitNotification, "");
  if (!mDesktop) return;
  mDesktop->ObserveNotifications([this](const SNotification& notification_I) {
    if (IsObserved(notification_I)) handleNotification(notification_I);
  });
}

std::vector<int> OProcessUtils::quitProcessIDList() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mQuitProcessIDList;
}

void OProcessUtils::setQuitProcessIDList(std::vector<int> list_I) {
  std::lock_guard<std::mutex> guard(mLock);
  mQuitProcessIDList = std::move(list_I);
}

void OProcessUtils::addObserver(const std::string& name_I, const std::string& object_I) {
  std::lock_guard<std::mutex> guard(mLock);
  mObservers.emplace(name_I, object_I);
}

void OProcessUtils::addObserver(const std::string& name_I,
                                std::function<void(const SNotification&)> handler_I) {
  std::lock_guard<std::mutex> guard(mLock);
  mObservers.emplace(name_I, "");
  mHandlers.emplace(name_I, std::move(handler_I));
}

void OProcessUtils::removeObserver(const std::string& name_I, const std::string& object_I) {
  std::lock_guard<std::mutex> guard(mLock);
  mObservers.erase({name_I, object_I});
}

size_t OProcessUtils::GetObserverCount() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mObservers.size();
}

bool OProcessUtils::IsObserved(const SNotification& notification_I) const {
  std::lock_guard<std::mutex> guard(mLock);
  return mObservers.count({notification_I.name, ""}) != 0 ||
         mObservers.count({notification_I.name, notification_I.object}) != 0;
}

void OProcessUtils::handleNotification(const SNotification& notification_I) {
  if (notification_I.name == kIOManagerStartup) {
    handleIOManagerStartup(notification_I);
  } else if (notification_I.name == kFrontApplicationChanged) {
    SystemState::ApplicationSwitch();
  } else if (notification_I.name == kQuitNotification) {
    // The watch on a launched application ends with its first notice; the
    // watch on every sender stays.
    removeObserver(notification_I.name, notification_I.object);
    const int pid = ProcessIdOf(notification_I.userInfo);
    std::lock_guard<std::mutex> guard(mLock);
    auto found = std::find(mQuitProcessIDList.begin(), mQuitProcessIDList.end(), pid);
    // Not ours: an application that quit by itself, which changes nothing.
    if (found != mQuitProcessIDList.end()) mQuitProcessIDList.erase(found);
  }
  std::vector<std::function<void(const SNotification&)>> handlers;
  {
    std::lock_guard<std::mutex> guard(mLock);
    const auto [first, last] = mHandlers.equal_range(notification_I.name);
    for (auto it = first; it != last; ++it) handlers.push_back(it->second);
  }
  // Outside the lock: a handler may ask this object again.
  for (const auto& handler : handlers) handler(notification_I);
}

bool OProcessUtils::applicationIsRunningWithBundleIdentifier(
    const std::optional<std::string>& id_I) {
  return id_I && mDesktop && !mDesktop->RunningApplications(*id_I).empty();
}

int OProcessUtils::processIDWithBundleID(const std::optional<std::string>& id_I,
                                         bool includingCurrentPID_I) {
  if (!id_I || !includingCurrentPID_I) return -1;
  const std::vector<int> running =
      mDesktop ? mDesktop->RunningApplications(*id_I) : std::vector<int>();
  return running.empty() ? -2 : running.front();
}

std::string OProcessUtils::bundlePathWithBundleID(const std::optional<std::string>& id_I) {
  if (!applicationIsRunningWithBundleIdentifier(id_I)) return std::string();
  std::string path = mDesktop->GetApplicationPath(*id_I);
  if (path.rfind("file:", 0) == 0) path.erase(0, 5);
  return path;
}

bool OProcessUtils::quitWithBundleIdentifier(const std::optional<std::string>& id_I,
                                             bool includingCurrentApplication_I) {
  if (!id_I || !includingCurrentApplication_I || !mDesktop) return false;
  bool result = false;
  for (int pid : mDesktop->RunningApplications(*id_I)) {
    {
      std::lock_guard<std::mutex> guard(mLock);
      mQuitProcessIDList.push_back(pid);
    }
    // Outside the lock: the quit notice may arrive before this returns.
    result = mDesktop->TerminateApplication(pid);
  }
  return result;
}

bool OProcessUtils::launchWithBundleIdentifier(const std::optional<std::string>& id_I,
                                               const std::optional<std::string>& path_I,
                                               unsigned long option_I, bool checkIsRunning_I) {
  if (!id_I || !path_I || option_I == 0 || !mDesktop) return false;
  if (checkIsRunning_I && applicationIsRunningWithBundleIdentifier(id_I)) return true;
  const std::string entry = path_I->empty() ? mDesktop->GetApplicationPath(*id_I) : *path_I;
  if (entry.empty() || mDesktop->LaunchApplication({*id_I, entry, {}}) <= 0) return false;
  addObserver(kQuitNotification, *id_I);
  return true;
}

bool OProcessUtils::postCustomNotification(const std::string& name_I, int pid_I) {
  if (name_I.empty() || !mDesktop || pid_I <= 0 || !mDesktop->IsApplicationProcess(pid_I)) {
    return false;
  }
  const std::string id = mDesktop->GetApplicationIdOfProcess(pid_I);
  mDesktop->PostNotification(
      {name_I, id, {{"processID", pid_I}, {"bundleURL", mDesktop->GetApplicationPath(id)}}});
  return true;
}
