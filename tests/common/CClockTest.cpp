#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "common/CClock.h"
#include "common/CSteadyClock.h"
#include "common/CVirtualClock.h"

class ClockInstalled : public ::testing::Test {
 protected:
  void SetUp() override { CClock::Set(mClock); }
  void TearDown() override { CClock::Set(nullptr); }
  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
};

TEST_F(ClockInstalled, TasksRunOnAnotherThreadInDueOrderBeforeTheSleepPastThemReturns) {
  std::vector<int> order;
  std::thread::id taskThread;
  mClock->Schedule(3, [&] { order.push_back(3); });
  mClock->Schedule(1, [&] {
    order.push_back(1);
    taskThread = std::this_thread::get_id();
    TavSleep(0.5);  // must not wait for itself
  });
  mClock->Schedule(1, [&] { order.push_back(2); });
  TavSleep(0.5);
  TavSleep(0.4);
  EXPECT_TRUE(order.empty());
  TavSleep(0.1);
  EXPECT_EQ(order, (std::vector<int>{1, 2}));
  EXPECT_NE(taskThread, std::this_thread::get_id());
  TavSleep(4);
  EXPECT_EQ(order, (std::vector<int>{1, 2, 3}));
  EXPECT_DOUBLE_EQ(mClock->Now(), 5.5);
}

TEST(SteadyClock, ScheduleRunsAfterRealDelayAndPendingTasksDieWithTheClock) {
  std::atomic<bool> ran{false};
  std::atomic<bool> dropped{false};
  {
    CSteadyClock clock;
    const double start = clock.Now();
    clock.Schedule(0.02, [&] { ran = true; });
    clock.Schedule(60, [&] { dropped = true; });
    while (!ran && clock.Now() - start < 2.0) clock.Sleep(0.005);
    EXPECT_TRUE(ran);
    EXPECT_GE(clock.Now() - start, 0.02);
  }
  EXPECT_FALSE(dropped);
}

// The benchmarks compare a run's wall time with the time it spent waiting:
// sleeps on two threads at once count once, sleeps one after the other add
// up, and what a sleep took beyond what it asked is not waiting.
TEST(SteadyClock, TimeWaitedCountsOverlappingSleepsOnce) {
  CSteadyClock clock;
  EXPECT_EQ(clock.GetTimeWaited(), 0.0);
  std::thread other([&] { clock.Sleep(0.2); });
  clock.Sleep(0.2);
  other.join();
  const double together = clock.GetTimeWaited();
  EXPECT_GE(together, 0.2);
  EXPECT_LT(together, 0.3) << "the two sleeps overlapped";
  clock.Sleep(0.05);
  clock.Sleep(0.05);
  EXPECT_NEAR(clock.GetTimeWaited() - together, 0.1, 1e-6);
}
