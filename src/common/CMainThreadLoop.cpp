#include "common/CMainThreadLoop.h"

#include <exception>

#include "common/TavAssert.h"
#include "common/TavLog.h"

namespace {

// The registered loop. Posting to it happens under this lock, so a loop
// that unregisters has either received a task (and runs it while draining)
// or the poster learns that there is no loop.
std::mutex gMainLock;
CMainThreadLoop* gMain = nullptr;

}  // namespace

CMainThreadLoop::~CMainThreadLoop() { Unregister(); }

bool CMainThreadLoop::RegisterMainThread() {
  std::lock_guard<std::mutex> guard(gMainLock);
  if (gMain != nullptr && gMain != this) {
    TAVASSERT_TEXT("\"Another main thread loop is registered\"");
    return false;
  }
  gMain = this;
  std::lock_guard<std::mutex> loopGuard(mLock);
  mThread = std::this_thread::get_id();
  return true;
}

void CMainThreadLoop::Unregister() {
  {
    std::lock_guard<std::mutex> guard(gMainLock);
    if (gMain == this) gMain = nullptr;
  }
  {
    std::lock_guard<std::mutex> guard(mLock);
    mThread = std::thread::id();
  }
  while (RunPending() > 0) {
  }
}

void CMainThreadLoop::Post(Task task_I) {
  {
    std::lock_guard<std::mutex> guard(mLock);
    mQueue.push_back(std::move(task_I));
  }
  mChanged.notify_all();
  std::lock_guard<std::mutex> hookGuard(mHookLock);
  if (mWakeHook) mWakeHook();
}

void CMainThreadLoop::SetWakeHook(WakeHook hook_I) {
  std::lock_guard<std::mutex> hookGuard(mHookLock);
  mWakeHook = std::move(hook_I);
}

void CMainThreadLoop::Run() {
  for (;;) {
    Task task;
    {
      std::unique_lock<std::mutex> lock(mLock);
      mChanged.wait(lock, [this] { return mQuit || !mQueue.empty(); });
      if (mQuit) {
        mQuit = false;
        return;
      }
      task = std::move(mQueue.front());
      mQueue.pop_front();
    }
    RunTask(task);
  }
}

void CMainThreadLoop::Quit() {
  {
    std::lock_guard<std::mutex> guard(mLock);
    mQuit = true;
  }
  mChanged.notify_all();
}

bool CMainThreadLoop::RunOnce() {
  Task task;
  {
    std::lock_guard<std::mutex> guard(mLock);
    if (mQueue.empty()) return false;
    task = std::move(mQueue.front());
    mQueue.pop_front();
  }
  RunTask(task);
  return true;
}

size_t CMainThreadLoop::RunPending() {
  std::deque<Task> tasks;
  {
    std::lock_guard<std::mutex> guard(mLock);
    tasks.swap(mQueue);
  }
  for (const Task& task : tasks) RunTask(task);
  return tasks.size();
}

bool CMainThreadLoop::IsLoopThread() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mThread == std::this_thread::get_id();
}

bool CMainThreadLoop::IsMainThread() {
  std::lock_guard<std::mutex> guard(gMainLock);
  return gMain != nullptr && gMain->IsLoopThread();
}

bool CMainThreadLoop::PostToMain(Task task_I) {
  std::lock_guard<std::mutex> guard(gMainLock);
  if (gMain == nullptr) return false;
  gMain->Post(std::move(task_I));
  return true;
}

void CMainThreadLoop::RunTask(const Task& task_I) {
  // A failing task must not take the main loop down with it; a dispatched
  // task hands its exception to the waiting thread before it gets here.
  try {
    if (task_I) task_I();
  } catch (const std::exception& e) {
    TavLog::Error("Main thread task failed: %s\n", e.what());
  } catch (...) {
    TavLog::Error("Main thread task failed\n");
  }
}
