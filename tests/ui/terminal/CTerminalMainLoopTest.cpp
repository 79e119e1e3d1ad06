#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "common/CVirtualClock.h"
#include "ui/terminal/CTerminalMainLoop.h"

namespace {

TEST(TerminalMainLoop, RunsTasksFromAnyThreadInOrderOnItsOwnThread) {
  CTerminalMainLoop loop;
  EXPECT_TRUE(loop.IsLoopThread());
  std::vector<int> order;
  bool allOnLoopThread = true;
  std::thread poster([&] {
    EXPECT_FALSE(loop.IsLoopThread());
    for (int index = 0; index < 100; ++index) {
      loop.Post([&, index] {
        order.push_back(index);
        allOnLoopThread = allOnLoopThread && loop.IsLoopThread();
      });
    }
    loop.Post([&] { loop.Quit(); });
    loop.Post([&] { order.push_back(-1); });
  });
  loop.Run();
  poster.join();
  ASSERT_EQ(order.size(), 100u);
  for (int index = 0; index < 100; ++index) EXPECT_EQ(order[index], index);
  EXPECT_TRUE(allOnLoopThread);

  // The task behind the quit waits for the next run; a quit made while no
  // loop runs ends that run at once, before it.
  loop.Quit();
  loop.Run();
  EXPECT_EQ(order.size(), 100u);
  loop.Post([&] { loop.Quit(); });
  loop.Run();
  EXPECT_EQ(order.back(), -1);
}

TEST(TerminalMainLoop, DelayedTasksWaitForTheClockSeam) {
  auto clock = std::make_shared<CVirtualClock>();
  CClock::Set(clock);
  {
    CTerminalMainLoop loop;
    std::vector<std::string> order;
    loop.PostAfter(1000.0, [&] {
      order.push_back("delayed");
      loop.Quit();
    });
    loop.Post([&] {
      order.push_back("first");
      clock->Advance(999.0);
      order.push_back("999 s");
      clock->Advance(1.0);
      order.push_back("1000 s");
    });
    loop.Run();
    EXPECT_EQ(order, (std::vector<std::string>{"first", "999 s", "1000 s", "delayed"}));

    // A task due after its loop is gone is dropped.
    auto doomed = std::make_unique<CTerminalMainLoop>();
    bool ran = false;
    doomed->PostAfter(1.0, [&] { ran = true; });
    doomed.reset();
    clock->Advance(1.0);
    EXPECT_FALSE(ran);
  }
  CClock::Set(nullptr);
}

}  // namespace
