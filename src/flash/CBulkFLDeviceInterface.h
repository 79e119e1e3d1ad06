#pragma once
// The bulk transport's logic: a touch controller's vendor-class USB
// interface, reached by vendor control requests. The loader commands are
// not adapted to it: their bytes reach Write as a control request's fields.
// A platform form supplies Open, Close, DeviceRequest, Read and Write.

#include <cstdint>
#include <string>

#include "flash/CFLDeviceInterface.h"

class CBulkFLDeviceInterface : public CFLDeviceInterface {
 public:
  CBulkFLDeviceInterface();
  explicit CBulkFLDeviceInterface(const std::string& path_I);

  bool SwitchToBLMode() override;
  // The bulk interface has no way of its own out of the loader: always
  // false, asserting when asked not to save.
  bool SwitchFromBLMode(bool save_I) override;
  // Answers false in loader mode.
  bool IsAlive() override;
  bool InitEEPROM() override;

 protected:
  // One control request on endpoint 0 with a zeroed data buffer of
  // `bufferSize_I` bytes; true when the device accepted it.
  virtual bool DeviceRequest(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                             uint16_t index_I, uint16_t length_I, size_t bufferSize_I) = 0;
};
