#pragma once
// The Linux form of CTavSemaphore: a std::recursive_mutex. It is plain
// portable C++ and needs nothing of the system, so it lives in common rather
// than with the platform seams.
//
// A release by a thread that does not hold the lock is refused with the
// failure code instead of reaching the mutex (where it would be undefined):
// the error path of the device thread releases once more than it took.

#include <atomic>
#include <mutex>
#include <string>
#include <thread>

#include "common/CTavSemaphore.h"

class CLinuxSemaphore : public CTavSemaphore {
 public:
  explicit CLinuxSemaphore(const char* name_I);

  int Init() override;
  int RequestSemaphore() override;
  int ReleaseSemaphore() override;

  const std::string& GetName() const { return mName; }

 private:
  std::string mName;
  std::recursive_mutex mMutex;
  // The holder and its depth; the depth is only touched by the holder.
  std::atomic<std::thread::id> mOwner{};
  unsigned mDepth = 0;
};
