#include "common/CLinuxSemaphore.h"

#include <cerrno>
#include <system_error>

#include "common/TavAssert.h"

namespace {

int Checked(int status_I) {
  if (status_I != 0) {
    TAVASSERT_TEXT("aStatus == 0");
    return CTavSemaphore::kFailed;
  }
  return 0;
}

}  // namespace

CLinuxSemaphore::CLinuxSemaphore(const char* name_I) : mName(name_I != nullptr ? name_I : "") {}

int CLinuxSemaphore::Init() { return 0; }

int CLinuxSemaphore::RequestSemaphore() {
  int status = 0;
  try {
    mMutex.lock();
    mOwner = std::this_thread::get_id();
    ++mDepth;
  } catch (const std::system_error& e) {
    status = e.code().value() != 0 ? e.code().value() : EAGAIN;
  }
  return Checked(status);
}

int CLinuxSemaphore::ReleaseSemaphore() {
  if (mOwner.load() != std::this_thread::get_id()) return Checked(EPERM);
  if (--mDepth == 0) mOwner = std::thread::id();
  mMutex.unlock();
  return 0;
}
