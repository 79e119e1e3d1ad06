#include "devices/CDevice.h"

#include <sstream>

#include "flash/CFLDeviceInterface.h"

CDevice::CDevice(const CDevice& other_I) {
  // A copy starts from the defaults, so it always has scalar flash sectors 0
  // and scalar into-bootloader true, whatever the source held.
  *this = other_I;
}

CDevice& CDevice::operator=(const CDevice& other_I) {
  if (this == &other_I) return *this;
  const uint32_t keptScalarSectors = mScalar.flashSectors;
  const bool keptScalarIntoBL = mScalar.intoBLMode;
  mDeviceName = other_I.mDeviceName;
  mPen = other_I.mPen;
  mTouch = other_I.mTouch;
  mBluetooth = other_I.mBluetooth;
  mScalar = other_I.mScalar;
  mScalar.flashSectors = keptScalarSectors;
  mScalar.intoBLMode = keptScalarIntoBL;
  mIsFlashLoader = other_I.mIsFlashLoader;
  mIsQuantaScalarBoard = other_I.mIsQuantaScalarBoard;
  mIsQisdaVenusScalarBoard = other_I.mIsQisdaVenusScalarBoard;
  return *this;
}

void CDevice::Close() {
  mDeviceName.clear();
  if (mPen.interface) mPen.interface.reset();
  if (mTouch.interface) mTouch.interface.reset();
  if (mBluetooth.interface) mBluetooth.interface.reset();
}

std::string CDevice::ToString() const {
  if (!mPen.interface) return std::string();
  std::ostringstream out;
  out << "[" << mDeviceName << "] (" << (mIsFlashLoader ? "LOADER" : "NORMAL") << " MODE)\n";

  out << (mPen.interface->GetIsFlashLoader() ? "LOADER INTERFACE:" : "PEN INTERFACE:") << "\n";
  out << "\tSectors = " << mPen.flashSectors << "\n";
  out << "\tUsageId (Non-HidRouter) = " << mPen.usageId << "\n";
  out << "\tUsagePage (Non-HidRouter) = " << mPen.usagePage << "\n";
  out << "\tInit Eeprom = " << (mPen.initEEPROM ? "YES" : "NO") << "\n";
  out << mPen.interface->ToString();

  auto boardBlock = [&out](const SBoard& board_I, const char* title_I, const char* name_I) {
    if (board_I.interface) {
      out << (board_I.interface->GetIsFlashLoader() ? "LOADER INTERFACE:" : title_I) << "\n";
      out << "\tSectors = " << board_I.flashSectors << "\n";
      out << "\tUsageId = " << board_I.usageId << "\n";
      out << "\tUsagePage = " << board_I.usagePage << "\n";
      out << "\tInit Eeprom = " << (board_I.initEEPROM ? "YES" : "NO") << "\n";
      out << board_I.interface->ToString();
    } else {
      out << name_I << (board_I.supported ? " INTERFACE NOT FOUND" : " INTERFACE NOT SUPPORTED")
          << "\n";
    }
  };
  boardBlock(mTouch, "TOUCH INTERFACE:", "TOUCH");
  boardBlock(mBluetooth, "BLUETOOTH INTERFACE:", "BLUETOOTH");
  return out.str();
}
