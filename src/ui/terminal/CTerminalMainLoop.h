#pragma once
// The main thread's task loop for the terminal front-end. Any thread posts
// tasks; a pipe wakes the loop. When the loop catches signals, the interrupt
// (Ctrl-C), hang-up and terminate signals only leave a note and a byte in that pipe,
// and the loop acts on them between tasks, outside the signal handler.
//
// One loop at a time may catch signals; it puts the previous handlers back
// when it lets them go. The handlers are installed without SA_RESTART, so a
// blocking read on the main thread returns with EINTR and the reader can
// look at TakeSignal.

#include <functional>
#include <memory>
#include <thread>

class CTerminalMainLoop {
 public:
  // The thread that makes the loop is its thread.
  CTerminalMainLoop();
  ~CTerminalMainLoop();
  CTerminalMainLoop(const CTerminalMainLoop&) = delete;
  CTerminalMainLoop& operator=(const CTerminalMainLoop&) = delete;

  // Runs tasks in posting order and caught signals as they come, until
  // Quit. A Quit made while the loop is not running makes the next Run
  // return at once. Tasks still queued at a quit stay queued.
  void Run();
  // Any thread.
  void Quit();
  void Post(std::function<void()> task_I);
  // Posts once `delay_I` seconds of the clock seam have passed; dropped if
  // the loop is gone by then.
  void PostAfter(double delay_I, std::function<void()> task_I);
  bool IsLoopThread() const { return std::this_thread::get_id() == mThread; }

  // Catches SIGINT, SIGHUP and SIGTERM; `handler_I` gets each on the loop's
  // thread.
  // False (and nothing changes) when another loop holds them already.
  bool CatchSignals(std::function<void(int signal_I)> handler_I);
  void ReleaseSignals();
  // A signal caught and not handled yet, or 0; forgets it.
  int TakeSignal();

 private:
  struct SShared;

  void WaitForWake();

  std::shared_ptr<SShared> mShared;
  std::function<void(int signal_I)> mSignalHandler;
  std::thread::id mThread;
};
