#include "common/TavAssert.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <mutex>
#include <vector>

#include "common/OSUtils.h"

namespace {

struct SObservers {
  std::mutex mLock;
  std::vector<std::pair<int, TavAssert::Observer>> mList;
  int mNextHandle = 1;
};

SObservers& Observers() {
  static SObservers observers;
  return observers;
}

}  // namespace

void __TAVASSERT(const char* text_I, const char* file_I, int line_I) {
  const char* file = file_I != nullptr ? file_I : "";
  const char* slash = std::strrchr(file, '/');
  const char* base = slash != nullptr ? slash + 1 : file;
  const char* text = text_I != nullptr ? text_I : "";
  const unsigned line = static_cast<unsigned>(line_I);

  if (isatty(STDERR_FILENO)) {
    std::fprintf(stderr, "[E] %s:%u: failed assertion: %s\n", base, line, text);
  } else if (OSUtils::HasSystemLog()) {
    syslog(LOG_ERR, "[E] %s:%u: failed assertion: %s\n", base, line, text);
  }

  char finished[1024];
  std::snprintf(finished, sizeof finished, "%s:%u: failed assertion: %s", base, line, text);
  SObservers& observers = Observers();
  std::lock_guard<std::mutex> guard(observers.mLock);
  for (auto& entry : observers.mList) entry.second(finished);
}

namespace TavAssert {

int AddObserver(Observer observer_I) {
  SObservers& observers = Observers();
  std::lock_guard<std::mutex> guard(observers.mLock);
  const int handle = observers.mNextHandle++;
  observers.mList.emplace_back(handle, std::move(observer_I));
  return handle;
}

void RemoveObserver(int handle_I) {
  SObservers& observers = Observers();
  std::lock_guard<std::mutex> guard(observers.mLock);
  std::erase_if(observers.mList, [&](const auto& entry) { return entry.first == handle_I; });
}

}  // namespace TavAssert
