#include "common/CLinuxReaderWriterSemaphore.h"

#include <cerrno>

#include "common/TavAssert.h"

namespace {

int Checked(int status_I) {
  if (status_I != 0) {
    TAVASSERT_TEXT("aStatus == 0");
    return CTavReaderWriterSemaphore::kFailed;
  }
  return 0;
}

}  // namespace

CLinuxReaderWriterSemaphore::CLinuxReaderWriterSemaphore(const char* name_I)
    : mName(name_I != nullptr ? name_I : "") {}

int CLinuxReaderWriterSemaphore::Init() { return 0; }

int CLinuxReaderWriterSemaphore::RequestReader() {
  if (IsWriter()) return Checked(EDEADLK);
  mLock.lock_shared();
  CountRead(+1);
  return 0;
}

int CLinuxReaderWriterSemaphore::ReleaseReader() {
  if (ReadsOfThisThread() == 0) return Checked(EPERM);
  CountRead(-1);
  mLock.unlock_shared();
  return 0;
}

int CLinuxReaderWriterSemaphore::RequestWriter() {
  if (IsWriter() || ReadsOfThisThread() != 0) return Checked(EDEADLK);
  mLock.lock();
  std::lock_guard<std::mutex> guard(mBookLock);
  mWriter = std::this_thread::get_id();
  return 0;
}

int CLinuxReaderWriterSemaphore::ReleaseWriter() {
  if (!IsWriter()) return Checked(EPERM);
  {
    std::lock_guard<std::mutex> guard(mBookLock);
    mWriter = std::thread::id();
  }
  mLock.unlock();
  return 0;
}

bool CLinuxReaderWriterSemaphore::IsWriter() const {
  std::lock_guard<std::mutex> guard(mBookLock);
  return mWriter == std::this_thread::get_id();
}

unsigned CLinuxReaderWriterSemaphore::ReadsOfThisThread() const {
  std::lock_guard<std::mutex> guard(mBookLock);
  const auto entry = mReaders.find(std::this_thread::get_id());
  return entry == mReaders.end() ? 0 : entry->second;
}

void CLinuxReaderWriterSemaphore::CountRead(int change_I) {
  std::lock_guard<std::mutex> guard(mBookLock);
  unsigned& count = mReaders[std::this_thread::get_id()];
  count = static_cast<unsigned>(static_cast<int>(count) + change_I);
  if (count == 0) mReaders.erase(std::this_thread::get_id());
}
