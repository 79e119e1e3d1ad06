#include "flash/CHIDFLDeviceInterface.h"

#include "common/TavLog.h"

namespace {
// The two forms of the switch-to-loader report; controllers answer one or
// the other, so both are always sent.
const std::vector<uint8_t> kSwitchToLoaderFirst{0xCC, 0x05, 0x6A};
const std::vector<uint8_t> kSwitchToLoaderSecond{0xCC, 0x6A, 0x05};
// A report every normal-mode firmware accepts.
const std::vector<uint8_t> kAliveProbe{0x02, 0x00};
const std::vector<uint8_t> kInitEEPROM{0x08, 0x01, 0x00, 0xAA, 0xAA};
}  // namespace

CHIDFLDeviceInterface::CHIDFLDeviceInterface() { mInterfaceType = EHID_INTERFACE; }

CHIDFLDeviceInterface::CHIDFLDeviceInterface(const std::string& path_I)
    : CFLDeviceInterface(path_I) {
  mInterfaceType = EHID_INTERFACE;
}

bool CHIDFLDeviceInterface::SwitchToBLMode() {
  bool switched = false;
  if (!GetIsFlashLoader() && Open()) {
    std::vector<uint8_t> first = kSwitchToLoaderFirst;
    std::vector<uint8_t> second = kSwitchToLoaderSecond;
    TavLog::Info("Switch to BLMode 1st try...\n");
    const bool firstSent = SafeWrite(first);
    TavLog::Info("Switch to BLMode 2nd try...\n");
    const bool secondSent = SafeWrite(second);
    switched = firstSent || secondSent;
  }
  Close();
  return switched;
}

bool CHIDFLDeviceInterface::SwitchFromBLMode(bool save_I) {
  if (!IsOpen() || !GetIsFlashLoader()) return false;
  return FLProtResetCPU(save_I);
}

bool CHIDFLDeviceInterface::IsAlive() {
  if (!IsOpen()) return false;
  if (GetIsFlashLoader()) {
    uint32_t status = 0;
    return FLProtGetStatus(status);
  }
  std::vector<uint8_t> probe = kAliveProbe;
  return SafeWrite(probe);
}

bool CHIDFLDeviceInterface::InitEEPROM() {
  if (!IsOpen() || GetIsFlashLoader()) return false;
  std::vector<uint8_t> report = kInitEEPROM;
  return SafeWrite(report);
}
