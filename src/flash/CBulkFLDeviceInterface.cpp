#include "flash/CBulkFLDeviceInterface.h"

#include "common/TavAssert.h"

namespace {
// Vendor requests of the touch controller's normal firmware, all to the
// device, of vendor type, to an interface.
constexpr uint8_t kVendorOut = 0x41;
constexpr uint8_t kVendorIn = 0xC1;
constexpr uint8_t kRequestSwitchToLoader = 0xF0;
constexpr uint8_t kRequestAlive = 0x01;
constexpr uint8_t kRequestInitEEPROM = 0xF5;
constexpr uint16_t kRequestKey = 0xFFFF;
constexpr size_t kRequestBufferSize = 16;
}  // namespace

CBulkFLDeviceInterface::CBulkFLDeviceInterface() { mInterfaceType = EBULK_INTERFACE; }

CBulkFLDeviceInterface::CBulkFLDeviceInterface(const std::string& path_I)
    : CFLDeviceInterface(path_I) {
  mInterfaceType = EBULK_INTERFACE;
}

bool CBulkFLDeviceInterface::SwitchToBLMode() {
  if (!IsOpen() || GetIsFlashLoader()) return false;
  return DeviceRequest(kVendorOut, kRequestSwitchToLoader, kRequestKey, 0, 0, kRequestBufferSize);
}

bool CBulkFLDeviceInterface::SwitchFromBLMode(bool save_I) {
  if (!save_I) TAVASSERT_TEXT("save_I");
  return false;
}

bool CBulkFLDeviceInterface::IsAlive() {
  if (!IsOpen() || GetIsFlashLoader()) return false;
  return DeviceRequest(kVendorIn, kRequestAlive, 0, 0, 2, kRequestBufferSize);
}

bool CBulkFLDeviceInterface::InitEEPROM() {
  if (!IsOpen() || GetIsFlashLoader()) return false;
  return DeviceRequest(kVendorOut, kRequestInitEEPROM, kRequestKey, 0, 0, kRequestBufferSize);
}
