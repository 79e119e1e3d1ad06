#pragma once
// The clock seam. Every wait of the program goes through TavSleep, which
// asks the installed clock. The default is the real steady clock; tests and
// lab runs can install a CVirtualClock so that long waits cost nothing.
//
// Contract of a clock:
// - Sleep(s) returns once s seconds of this clock's time have passed.
// - Now() is monotonic seconds since an arbitrary origin.
// - Schedule(d, fn) runs fn once on the clock's own timer thread when d
//   seconds of this clock's time have passed. Used to emulate events that
//   arrive from another thread (a device re-attaching, for example).
//   Tasks run one at a time, in due order; a task may call Sleep.
// - BeginWork() and EndWork() bracket an event that another thread has yet
//   to take in (an attach queued for the device thread). A virtual clock
//   lets such work finish before it moves time on, for a short real while
//   at most, so that a wait of 90 passes cannot run out before an event
//   that is already on its way. The real clock ignores them.
// - GetTimeWaited() is the clock time during which at least one thread was
//   asleep, each sleep counted for the time it asked: waits that overlap
//   count once. On a virtual clock time moves only by sleeps, so it is Now().

#include <functional>
#include <memory>

class CClock {
 public:
  virtual ~CClock() = default;
  virtual void Sleep(double seconds_I) = 0;
  virtual double Now() const = 0;
  virtual void Schedule(double delay_I, std::function<void()> task_I) = 0;
  virtual void BeginWork() {}
  virtual void EndWork() {}
  virtual double GetTimeWaited() const { return Now(); }

  // The process-wide clock. Install one before threads start.
  static std::shared_ptr<CClock> Get();
  static void Set(std::shared_ptr<CClock> clock_I);
};

// The one sleep of the system.
void TavSleep(double seconds_I);

// Polls `done` every `interval_I` seconds of clock time until it is true
// or `timeout_I` seconds have passed; returns the last answer of `done`.
// `done` is asked once before the first wait.
bool TavPollUntil(double timeout_I, double interval_I, const std::function<bool()>& done_I);
