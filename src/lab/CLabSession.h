#pragma once
// One lab run: at its start the boards take their saved state and their
// faults, and with --lab-fast the process runs on a virtual clock; at its
// end every board's state goes back to the state folder, so that a second
// run finds the boards as this one left them (an unplugged board as after
// a power cycle).

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
};
