#pragma once
// The HID transport's logic: loader commands go as feature reports; this
// class knows how to enter and leave the loader, how to probe a device and
// how to initialise its EEPROM. A platform form supplies Open, Close, Read
// and Write.

#include <string>

#include "flash/CFLDeviceInterface.h"

class CHIDFLDeviceInterface : public CFLDeviceInterface {
 public:
  CHIDFLDeviceInterface();
  explicit CHIDFLDeviceInterface(const std::string& path_I);

  // Sends both switch reports, in this order, whatever the first gave;
  // true when either went through. Closes the interface in every case.
  bool SwitchToBLMode() override;
  bool SwitchFromBLMode(bool save_I) override;
  bool IsAlive() override;
  bool InitEEPROM() override;
};
