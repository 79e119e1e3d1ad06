#pragma once
// The task loop of the main thread. The window and the state machine live on
// the main thread; the device and update threads reach it only by posting a
// task here (OSUtils::DispatchOnMainThread posts and waits).
//
// Use on the main thread:
//   CMainThreadLoop loop;
//   loop.RegisterMainThread();
//   loop.Run();            // until some task or thread calls Quit()
// or, under a foreign event loop (Qt), set a wake hook that schedules a call
// of RunPending() on that loop, and let it drain the tasks.
//
// One loop is registered at a time. Destroying or unregistering the loop
// runs every task still queued, so that no thread stays blocked on a
// dispatch that nobody would run; later dispatches run at once on their own
// thread.

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>

class CMainThreadLoop {
 public:
  using Task = std::function<void()>;
  using WakeHook = std::function<void()>;

  CMainThreadLoop() = default;
  ~CMainThreadLoop();
  CMainThreadLoop(const CMainThreadLoop&) = delete;
  CMainThreadLoop& operator=(const CMainThreadLoop&) = delete;

  // Makes the calling thread the main thread and this loop the one that
  // dispatches go to. A second loop cannot register while one is: that
  // asserts and returns false.
  bool RegisterMainThread();
  // Ends the registration (if this loop holds it) and runs what is queued.
  void Unregister();

  // Queues a task and calls the wake hook. Any thread.
  void Post(Task task_I);
  // Called on the posting thread after each post, so that a foreign event
  // loop can be woken to call RunPending(). It must not post itself.
  void SetWakeHook(WakeHook hook_I);

  // Runs tasks as they arrive until Quit(). A Quit() that came before Run()
  // ends the next Run() at once. Tasks still queued stay queued.
  void Run();
  // Ends Run(); any thread, or a task.
  void Quit();
  // Runs the oldest queued task, if any, without waiting.
  bool RunOnce();
  // Runs the tasks queued at the moment of the call; returns how many ran.
  size_t RunPending();

  bool IsLoopThread() const;

  // True on the thread of the registered loop.
  static bool IsMainThread();
  // Posts to the registered loop; false when none is registered.
  static bool PostToMain(Task task_I);

 private:
  void RunTask(const Task& task_I);

  mutable std::mutex mLock;
  std::condition_variable mChanged;
  std::deque<Task> mQueue;
  bool mQuit = false;
  std::thread::id mThread;

  std::mutex mHookLock;
  WakeHook mWakeHook;
};
