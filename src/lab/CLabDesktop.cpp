#include "lab/CLabDesktop.h"

#include "common/TavLog.h"

void CLabDesktop::PostNotification(const std::string& name_I,
                                   const std::map<std::string, std::string>& /*userInfo_I*/) {
  TavLog::Info("Lab notification: %s\n", name_I.c_str());
  std::lock_guard<std::mutex> guard(mLock);
  mNotifications.push_back(name_I);
}

std::vector<std::string> CLabDesktop::GetNotifications() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mNotifications;
}
