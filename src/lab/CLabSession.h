#pragma once
// One lab run: at its start the boards take their saved state and their
// faults, and with --lab-fast the process runs on a virtual clock; from
// then on every board writes its state through to the state folder as it
// changes, as a chip keeps what was programmed into it, so that a second
// run finds the boards as this one left them, even when this one was
// killed (an unplugged board as after a power cycle).
//
// At its end the run logs what it cost the boards: "Lab board NAME: N
// reports" for each (every transfer that reached the board, failed or not),
// "Lab board NAME: N busy answers" for a board that made the host wait,
// "Lab clock: S s", the time the run took on the lab's clock, and "Lab
// waits: S s", the part of it in which the program was asleep (on the
// virtual clock, where only sleeps move time, the two agree).

#include <memory>

#include "lab/CLabBus.h"
#include "lab/CLabOptions.h"

class CLabSession {
 public:
  CLabSession(std::shared_ptr<CLabBus> bus_I, CLabOptions options_I);
  // Saves, unless Finish already did.
  ~CLabSession();
  CLabSession(const CLabSession&) = delete;
  CLabSession& operator=(const CLabSession&) = delete;

  // Call with every board plugged in, before any other thread starts.
  // Returns how many boards took a saved state.
  int Start();
  bool Finish();

 private:
  std::shared_ptr<CLabBus> mBus;
  CLabOptions mOptions;
  bool mStarted = false;
  double mStartTime = 0.0;
  double mStartWaited = 0.0;
};
