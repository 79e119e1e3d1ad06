#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>

#include "common/CLinuxReaderWriterSemaphore.h"
#include "common/CLinuxSemaphore.h"
#include "support/LogCapture.h"

using namespace std::chrono_literals;

// True once `flag_I` is set, waiting at most two seconds.
static bool BecomesTrue(const std::atomic<bool>& flag_I) {
  for (int i = 0; i < 400 && !flag_I; ++i) std::this_thread::sleep_for(5ms);
  return flag_I;
}

// Still false after a short while: the other thread is blocked.
static bool StaysFalse(const std::atomic<bool>& flag_I) {
  std::this_thread::sleep_for(50ms);
  return !flag_I;
}

TEST(CTavSemaphore, RecursiveOnOneThreadExclusiveAcrossThreads) {
  const auto semaphore = CTavSemaphore::New("mHIDMgrSemaphore");
  ASSERT_NE(dynamic_cast<CLinuxSemaphore*>(semaphore.get()), nullptr);
  EXPECT_EQ(semaphore->Init(), 0);
  EXPECT_EQ(semaphore->RequestSemaphore(), 0);
  EXPECT_EQ(semaphore->RequestSemaphore(), 0);  // the same thread again

  std::atomic<bool> taken{false};
  std::thread other([&] {
    EXPECT_EQ(semaphore->RequestSemaphore(), 0);
    taken = true;
    EXPECT_EQ(semaphore->ReleaseSemaphore(), 0);
  });
  EXPECT_TRUE(StaysFalse(taken));
  EXPECT_EQ(semaphore->ReleaseSemaphore(), 0);
  EXPECT_TRUE(StaysFalse(taken));  // still held once
  EXPECT_EQ(semaphore->ReleaseSemaphore(), 0);
  EXPECT_TRUE(BecomesTrue(taken));
  other.join();
}

TEST(CTavSemaphore, ReleaseWithoutHoldingAssertsAndLeavesTheLockAlone) {
  LogCapture capture;
  const auto semaphore = CTavSemaphore::New("s");
  // One release more than requests, as on the device thread's error path.
  EXPECT_EQ(semaphore->RequestSemaphore(), 0);
  EXPECT_EQ(semaphore->ReleaseSemaphore(), 0);
  EXPECT_EQ(semaphore->ReleaseSemaphore(), CTavSemaphore::kFailed);
  EXPECT_TRUE(capture.AssertionContains("failed assertion: aStatus == 0"));

  // A foreign thread cannot release what this one holds.
  EXPECT_EQ(semaphore->RequestSemaphore(), 0);
  int foreignRelease = 0;
  std::thread([&] { foreignRelease = semaphore->ReleaseSemaphore(); }).join();
  EXPECT_EQ(foreignRelease, 65535);
  std::atomic<bool> taken{false};
  std::thread waiter([&] {
    semaphore->RequestSemaphore();
    taken = true;
    semaphore->ReleaseSemaphore();
  });
  EXPECT_TRUE(StaysFalse(taken));
  EXPECT_EQ(semaphore->ReleaseSemaphore(), 0);
  EXPECT_TRUE(BecomesTrue(taken));
  waiter.join();
  EXPECT_EQ(capture.Assertions().size(), 2u);
}

TEST(CTavReaderWriterSemaphore, MisuseAssertsInsteadOfHanging) {
  LogCapture capture;
  const auto semaphore = CTavReaderWriterSemaphore::New("rw");
  EXPECT_EQ(semaphore->ReleaseReader(), 65535);
  EXPECT_EQ(semaphore->ReleaseWriter(), 65535);
  EXPECT_EQ(semaphore->RequestWriter(), 0);
  EXPECT_EQ(semaphore->RequestWriter(), 65535);  // would deadlock
  EXPECT_EQ(semaphore->RequestReader(), 65535);  // would deadlock
  int foreignRelease = 0;
  std::thread([&] { foreignRelease = semaphore->ReleaseWriter(); }).join();
  EXPECT_EQ(foreignRelease, 65535);
  EXPECT_EQ(semaphore->ReleaseWriter(), 0);
  EXPECT_EQ(semaphore->RequestReader(), 0);
  EXPECT_EQ(semaphore->RequestWriter(), 65535);  // a reader cannot upgrade
  EXPECT_EQ(semaphore->ReleaseReader(), 0);
  EXPECT_EQ(capture.Assertions().size(), 6u);
  for (const std::string& line : capture.Assertions()) {
    EXPECT_NE(line.find("failed assertion: aStatus == 0"), std::string::npos) << line;
  }
}
