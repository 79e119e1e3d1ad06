#pragma once
// The Linux form of CTavReaderWriterSemaphore: a std::shared_mutex. Plain
// portable C++, so it lives in common rather than with the platform seams.
//
// The lock is not recursive. What a POSIX reader-writer lock reports as an
// error is refused here before it reaches the mutex (where it would be
// undefined or hang): a thread asking again for a lock it writes (EDEADLK),
// and a release by a thread that does not hold that side (EPERM).

#include <map>
#include <mutex>
#include <shared_mutex>
#include <string>
#include <thread>

#include "common/CTavReaderWriterSemaphore.h"

class CLinuxReaderWriterSemaphore : public CTavReaderWriterSemaphore {
 public:
  explicit CLinuxReaderWriterSemaphore(const char* name_I);

  int Init() override;
  int RequestReader() override;
  int ReleaseReader() override;
  int RequestWriter() override;
  int ReleaseWriter() override;

  const std::string& GetName() const { return mName; }

 private:
  bool IsWriter() const;
  // How often the calling thread reads.
  unsigned ReadsOfThisThread() const;
  void CountRead(int change_I);

  std::string mName;
  std::shared_mutex mLock;
  // Who holds what, kept beside the lock to refuse misuse.
  mutable std::mutex mBookLock;
  std::thread::id mWriter;
  std::map<std::thread::id, unsigned> mReaders;
};
