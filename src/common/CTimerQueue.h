#pragma once
// Due-ordered tasks for the clocks' Schedule. Not thread-safe by itself:
// the owning clock guards it with its own mutex.

#include <cstdint>
#include <functional>
#include <map>
#include <utility>

class CTimerQueue {
 public:
  void Push(double due_I, std::function<void()> task_I) {
    mTasks.emplace(std::make_pair(due_I, mNextSequence++), std::move(task_I));
  }
  bool Empty() const { return mTasks.empty(); }
  double NextDue() const { return mTasks.begin()->first.first; }
  std::function<void()> Pop() {
    auto first = mTasks.begin();
    std::function<void()> task = std::move(first->second);
    mTasks.erase(first);
    return task;
  }
  void Clear() { mTasks.clear(); }

 private:
  // Sequence numbers keep tasks with the same due time in push order.
  std::map<std::pair<double, uint64_t>, std::function<void()>> mTasks;
  uint64_t mNextSequence = 0;
};
