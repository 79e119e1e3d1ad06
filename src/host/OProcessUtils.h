#pragma once
// The singleton that keeps the process ids this program has asked to quit,
// and listens for the family's notifications: the quit notice of one of
// them takes it off the list. Everything goes through the desktop seam
// installed with SetDesktop; without one, every question answers nothing.
//
// Notices arrive on the desktop's listening thread; the list has its lock.

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "seams/CDesktop.h"

class OProcessUtils {
 public:
  static constexpr const char* kQuitNotification = "TavikApplicationQuitNotification";
  static constexpr const char* kIOManagerStartup = "com.tavik.com.tavik.IOManager.startup";
  static constexpr const char* kFrontApplicationChanged = "com.apple.HIToolbox.frontMenuBarShown";

  // The run's desktop. A singleton made for another desktop is let go.
  static void SetDesktop(std::shared_ptr<CDesktop> desktop_I);
  static std::shared_ptr<CDesktop> GetDesktop();
  static OProcessUtils* GetInstance();
  // Stops listening and lets the singleton go.
  static void DisposeInstance();

  std::vector<int> quitProcessIDList() const;
  void setQuitProcessIDList(std::vector<int> list_I);

  void handleNotification(const SNotification& notification_I);
  void handleIOManagerStartup(const SNotification&) {}

  bool applicationIsRunningWithBundleIdentifier(const std::optional<std::string>& id_I);
  // -1: the question is refused (no identifier, or the flag off); -2: no
  // such application runs.
  int processIDWithBundleID(const std::optional<std::string>& id_I, bool includingCurrentPID_I);
  std::string bundlePathWithBundleID(const std::optional<std::string>& id_I);
  // Quits nothing: it does not include the current application, and every
  // such call is refused.
  bool quitWithBundleIdentifier(const std::optional<std::string>& id_I) {
    return quitWithBundleIdentifier(id_I, false);
  }
  bool quitWithBundleIdentifier(const std::optional<std::string>& id_I,
                                bool includingCurrentApplication_I);
  bool launchWithBundleIdentifier(const std::optional<std::string>& id_I,
                                  const std::optional<std::string>& path_I, unsigned long option_I,
                                  bool checkIsRunning_I);
  // Posts `name_I` as sent by the application of process `pid_I`, with its
  // process id and entry path; false without a name or an application.
  bool postCustomNotification(const std::string& name_I, int pid_I);

  // `object_I` empty: from any sender.
  void addObserver(const std::string& name_I, const std::string& object_I);
  // Hands every notification of that name, from any sender, to `handler_I`
  // as well, on the desktop's listening thread.
  void addObserver(const std::string& name_I, std::function<void(const SNotification&)> handler_I);
  size_t GetObserverCount() const;

 private:
  explicit OProcessUtils(std::shared_ptr<CDesktop> desktop_I);
  void allocProcessIDList();
  void registerForCallBackOnce();
  void removeObserver(const std::string& name_I, const std::string& object_I);
  bool IsObserved(const SNotification& notification_I) const;

  std::shared_ptr<CDesktop> mDesktop;
  // The lock on the object: the list and the observers.
  mutable std::mutex mLock;
  std::vector<int> mQuitProcessIDList;
  std::multiset<std::pair<std::string, std::string>> mObservers;
  std::multimap<std::string, std::function<void(const SNotification&)>> mHandlers;
};
