#pragma once
// The Qt window of an update run. Linked into the window program only, so
// that a terminal run never maps Qt.

#include "app/CUpdaterRun.h"

class CWindowFrontEnd {
 public:
  // A CUpdaterRun::TWindowFrontEnd.
  static int Run(SRunSeams seams_I, SRunOptions options_I);
};
