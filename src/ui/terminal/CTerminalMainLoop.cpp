#include "ui/terminal/CTerminalMainLoop.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <deque>
#include <mutex>

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "common/TavSysErrStr.h"

struct CTerminalMainLoop::SShared {
  std::mutex lock;
  std::deque<std::function<void()>> tasks;
  bool quit = false;
  int wakeRead = -1;
  int wakeWrite = -1;

  ~SShared() {
    if (wakeRead >= 0) close(wakeRead);
    if (wakeWrite >= 0) close(wakeWrite);
  }
  // A full pipe already holds a wake-up, so a failed write loses nothing.
  void Wake() const {
    const char byte = 'w';
    const ssize_t written = write(wakeWrite, &byte, 1);
    (void)written;
  }
};

namespace {

constexpr int kCaughtSignals[] = {SIGINT, SIGHUP, SIGTERM};

// Shared with the signal handler, hence lock-free atomics only.
std::atomic<int> gSignalWakeFd{-1};
// One bit per caught signal, by its place in kCaughtSignals, so an
// interrupt and a hang-up close together are both seen.
std::atomic<unsigned> gPendingSignals{0};
std::atomic<CTerminalMainLoop*> gSignalOwner{nullptr};
static_assert(std::atomic<int>::is_always_lock_free && std::atomic<unsigned>::is_always_lock_free,
              "the signal handler may touch lock-free atomics only");
struct sigaction gPreviousActions[std::size(kCaughtSignals)];

extern "C" void OnCaughtSignal(int signal_I) {
  const int savedErrno = errno;
  for (size_t index = 0; index < std::size(kCaughtSignals); ++index) {
    if (kCaughtSignals[index] == signal_I) gPendingSignals.fetch_or(1u << index);
  }
  const int fd = gSignalWakeFd.load();
  if (fd >= 0) {
    const char byte = 's';
    const ssize_t written = write(fd, &byte, 1);
    (void)written;
  }
  errno = savedErrno;
}

}  // namespace

CTerminalMainLoop::CTerminalMainLoop()
    : mShared(std::make_shared<SShared>()), mThread(std::this_thread::get_id()) {
  int fds[2];
  if (pipe2(fds, O_CLOEXEC | O_NONBLOCK) != 0) {
    // Without the pipe the loop cannot sleep; nothing can go on.
    TavLog::Error("Main loop: pipe2 failed: %s\n", TavSysErrStr(errno).c_str());
    TAVASSERT_TEXT("\"main loop has no wake pipe\"");
    return;
  }
  mShared->wakeRead = fds[0];
  mShared->wakeWrite = fds[1];
}

CTerminalMainLoop::~CTerminalMainLoop() { ReleaseSignals(); }

void CTerminalMainLoop::Run() {
  for (;;) {
    if (const int signal = TakeSignal(); signal != 0) {
      if (mSignalHandler) mSignalHandler(signal);
      continue;
    }
    std::function<void()> task;
    {
      std::lock_guard<std::mutex> guard(mShared->lock);
      if (mShared->quit) {
        mShared->quit = false;
        return;
      }
      if (!mShared->tasks.empty()) {
        task = std::move(mShared->tasks.front());
        mShared->tasks.pop_front();
      }
    }
    if (task) {
      task();
    } else {
      WaitForWake();
    }
  }
}

void CTerminalMainLoop::Quit() {
  {
    std::lock_guard<std::mutex> guard(mShared->lock);
    mShared->quit = true;
  }
  mShared->Wake();
}

void CTerminalMainLoop::Post(std::function<void()> task_I) {
  {
    std::lock_guard<std::mutex> guard(mShared->lock);
    mShared->tasks.push_back(std::move(task_I));
  }
  mShared->Wake();
}

void CTerminalMainLoop::PostAfter(double delay_I, std::function<void()> task_I) {
  std::weak_ptr<SShared> weakShared = mShared;
  CClock::Get()->Schedule(delay_I, [weakShared, task = std::move(task_I)]() mutable {
    const std::shared_ptr<SShared> shared = weakShared.lock();
    if (!shared) return;
    {
      std::lock_guard<std::mutex> guard(shared->lock);
      shared->tasks.push_back(std::move(task));
    }
    shared->Wake();
  });
}

bool CTerminalMainLoop::CatchSignals(std::function<void(int signal_I)> handler_I) {
  CTerminalMainLoop* expected = nullptr;
  if (!gSignalOwner.compare_exchange_strong(expected, this)) {
    if (expected != this) return false;
    mSignalHandler = std::move(handler_I);
    return true;
  }
  mSignalHandler = std::move(handler_I);
  gPendingSignals.store(0);
  gSignalWakeFd.store(mShared->wakeWrite);
  struct sigaction action {};
  action.sa_handler = OnCaughtSignal;
  sigemptyset(&action.sa_mask);
  action.sa_flags = 0;  // no SA_RESTART: a blocked read must see the signal
  for (size_t index = 0; index < std::size(kCaughtSignals); ++index) {
    sigaction(kCaughtSignals[index], &action, &gPreviousActions[index]);
  }
  return true;
}

void CTerminalMainLoop::ReleaseSignals() {
  if (gSignalOwner.load() != this) return;
  for (size_t index = 0; index < std::size(kCaughtSignals); ++index) {
    sigaction(kCaughtSignals[index], &gPreviousActions[index], nullptr);
  }
  gSignalWakeFd.store(-1);
  gPendingSignals.store(0);
  mSignalHandler = nullptr;
  gSignalOwner.store(nullptr);
}

int CTerminalMainLoop::TakeSignal() {
  if (gSignalOwner.load() != this) return 0;
  for (size_t index = 0; index < std::size(kCaughtSignals); ++index) {
    const unsigned bit = 1u << index;
    if (gPendingSignals.fetch_and(~bit) & bit) return kCaughtSignals[index];
  }
  return 0;
}

void CTerminalMainLoop::WaitForWake() {
  struct pollfd wake {};
  wake.fd = mShared->wakeRead;
  wake.events = POLLIN;
  // EINTR comes from a caught signal, which Run looks at next.
  if (poll(&wake, 1, -1) < 0 && errno != EINTR) {
    TavLog::Error("Main loop: poll failed: %s\n", TavSysErrStr(errno).c_str());
    return;
  }
  char bytes[64];
  while (read(mShared->wakeRead, bytes, sizeof(bytes)) > 0) {
  }
}
