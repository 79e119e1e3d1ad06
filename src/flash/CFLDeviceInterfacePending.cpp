// The programming procedures of Intel-hex, scalar-binary and Bluetooth
// images need the firmware readers, which this build does not have yet.
// Until then each refuses with an error, so nothing is sent to a device.

#include "flash/CFLDeviceInterface.h"

bool CFLDeviceInterface::ProgramBoardIntelHex() {
  ReportError("ProgramBoardIntelHex: not available in this build");
  return false;
}

bool CFLDeviceInterface::ProgramBoardScalarBinary() {
  ReportError("ProgramBoardScalarBinary: not available in this build");
  return false;
}

bool CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1122() {
  ReportError("ProgramBoardAiroHaBinary_AB1122: not available in this build");
  return false;
}

bool CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1555() {
  ReportError("ProgramBoardAiroHaBinary_AB1555: not available in this build");
  return false;
}
