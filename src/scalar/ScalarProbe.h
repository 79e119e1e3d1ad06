#pragma once
// What the scalar of an attached display says of itself: the bridge whose
// scalar gives the display's serial number, and the firmware it runs. Every
// bridge opened here is closed again.

#include <string>

#include "common/TavTypes.h"

struct SScalarProbe {
  bool found = false;
  std::string version;  // "1.10.0"; empty when the scalar gave none
};

// `sid_I`: the identity the scalar answers to (vendor half 0x7A5D, the
// pen's product id).
SScalarProbe ProbeScalar(const std::string& serial_I, SENSOR_ID sid_I);
