#include <gtest/gtest.h>

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <stdexcept>
#include <thread>

#include "common/CMainThreadLoop.h"
#include "common/OSUtils.h"
#include "support/LogCapture.h"

TEST(DispatchOnMainThread, FromAWorkerRunsOnTheMainLoopWaitsAndCarriesExceptionsBack) {
  CMainThreadLoop loop;
  ASSERT_TRUE(loop.RegisterMainThread());
  const std::thread::id mainId = std::this_thread::get_id();
  EXPECT_TRUE(CMainThreadLoop::IsMainThread());

  std::thread::id ranOn;
  std::vector<int> order;
  bool caught = false;
  std::thread worker([&] {
    EXPECT_FALSE(CMainThreadLoop::IsMainThread());
    for (int i = 0; i < 3; ++i) {
      OSUtils::DispatchOnMainThread([&, i] {
        ranOn = std::this_thread::get_id();
        order.push_back(i);
      });
      // Synchronous: the block has run when the call returns.
      EXPECT_EQ(order.size(), static_cast<size_t>(i + 1));
    }
    try {
      OSUtils::DispatchOnMainThread([] { throw std::runtime_error("from main"); });
    } catch (const std::runtime_error& e) {
      caught = std::string(e.what()) == "from main";
    }
    OSUtils::DispatchOnMainThread([&] { loop.Quit(); });  // the loop went on
  });
  loop.Run();
  worker.join();
  EXPECT_EQ(ranOn, mainId);
  EXPECT_EQ(order, (std::vector<int>{0, 1, 2}));
  EXPECT_TRUE(caught);
}

TEST(DispatchOnMainThread, OnTheMainThreadOrWithoutALoopRunsAtOnceInPlace) {
  EXPECT_FALSE(CMainThreadLoop::IsMainThread());
  std::thread::id ranOn, workerId;
  std::thread([&] {
    workerId = std::this_thread::get_id();
    OSUtils::DispatchOnMainThread([&] { ranOn = std::this_thread::get_id(); });
  }).join();
  EXPECT_EQ(ranOn, workerId);

  CMainThreadLoop loop;
  ASSERT_TRUE(loop.RegisterMainThread());
  bool inner = false;
  OSUtils::DispatchOnMainThread([&] {
    OSUtils::DispatchOnMainThread([&] { inner = true; });  // would deadlock if queued
  });
  EXPECT_TRUE(inner);
  EXPECT_EQ(loop.RunPending(), 0u);  // nothing was queued
}

TEST(CMainThreadLoop, WakeHookLetsAForeignLoopDrainTheTasks) {
  CMainThreadLoop loop;
  ASSERT_TRUE(loop.RegisterMainThread());
  // Stands in for a foreign event loop: the hook only flags that there is
  // work, and the main thread drains when it sees the flag.
  std::mutex lock;
  std::condition_variable woken;
  int wakes = 0;
  loop.SetWakeHook([&] {
    std::lock_guard<std::mutex> guard(lock);
    ++wakes;
    woken.notify_all();
  });
  std::atomic<int> done{0};
  std::thread worker([&] {
    for (int i = 0; i < 5; ++i) OSUtils::DispatchOnMainThread([&] { ++done; });
  });
  for (int drained = 0; drained < 5;) {
    std::unique_lock<std::mutex> guard(lock);
    woken.wait(guard, [&] { return wakes > drained; });
    guard.unlock();
    drained += static_cast<int>(loop.RunPending());
  }
  worker.join();
  EXPECT_EQ(done, 5);
  EXPECT_EQ(wakes, 5);
}

TEST(CMainThreadLoop, UnregisterRunsWhatWaitsAndLaterDispatchesRunInPlace) {
  std::atomic<bool> posted{false};
  std::thread::id ranOn;
  std::thread worker;
  {
    CMainThreadLoop loop;
    ASSERT_TRUE(loop.RegisterMainThread());
    loop.SetWakeHook([&] { posted = true; });
    worker = std::thread(
        [&] { OSUtils::DispatchOnMainThread([&] { ranOn = std::this_thread::get_id(); }); });
    while (!posted) std::this_thread::yield();
    // The loop never runs; its end must still free the waiting worker.
  }
  worker.join();
  EXPECT_EQ(ranOn, std::this_thread::get_id());
  EXPECT_FALSE(CMainThreadLoop::IsMainThread());
}

TEST(CMainThreadLoop, QueueRulesAndSingleRegistration) {
  LogCapture capture;
  CMainThreadLoop loop;
  EXPECT_FALSE(loop.RunOnce());
  std::vector<int> ran;
  loop.Post([&] { ran.push_back(1); });
  loop.Post([&] {
    ran.push_back(2);
    loop.Post([&] { ran.push_back(3); });  // posted while draining: next round
  });
  EXPECT_TRUE(loop.RunOnce());
  EXPECT_EQ(loop.RunPending(), 1u);
  EXPECT_EQ(ran, (std::vector<int>{1, 2}));
  EXPECT_EQ(loop.RunPending(), 1u);
  EXPECT_EQ(ran, (std::vector<int>{1, 2, 3}));
  loop.Quit();
  loop.Run();  // a Quit that came first ends the next Run at once

  ASSERT_TRUE(loop.RegisterMainThread());
  CMainThreadLoop second;
  EXPECT_FALSE(second.RegisterMainThread());
  EXPECT_TRUE(capture.AssertionContains("\"Another main thread loop is registered\""));
  loop.Unregister();
  EXPECT_TRUE(second.RegisterMainThread());
}
