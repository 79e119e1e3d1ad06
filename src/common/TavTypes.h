#pragma once
// Types shared by every subsystem.

#include <cstdint>
#include <string>

// How a board is reached.
enum EINTERFACE_TYPE : int32_t {
  EINVALID_INTERFACE = 0,
  EHID_INTERFACE = 1,
  EBULK_INTERFACE = 2,
  EI2C_INTERFACE = 3,
  EFTDI_INTERFACE = 4,
};

// The kind of firmware loaded; decides the programming procedure.
enum EDataSourceFormat : int32_t {
  EDS_SREC_PEN = 0,
  EDS_SREC_TOUCH = 1,
  EDS_SREC_GENERIC = 2,
  EDS_INTEL_HEX = 3,
  EDS_AIROFLASH = 4,
  EDS_SCALAR_RTDISP = 5,
  EDS_SCALAR_BINARY = 6,
  EDS_AIROFLASH2 = 7,
  EDS_UNKNOWN = 99,
};

// One value for the whole process.
enum EFLProtocolType : int32_t {
  EFL_PROTOCOL_LOADER = 0,
  EFL_PROTOCOL_NON_BL = 1,
};

// One HID usage on one USB device. Its text form, the interface path, is
// the five numbers in decimal joined by ":".
struct DeviceInfo {
  uint32_t vendorId = 0;
  uint32_t productId = 0;
  uint32_t locationId = 0;
  uint32_t usage = 0;
  uint32_t usagePage = 0;

  bool operator==(const DeviceInfo&) const = default;
};

// A 32-bit product identity: vendor id in the high half, product id in the
// low half, -1 for unknown.
using SENSOR_ID = int32_t;
