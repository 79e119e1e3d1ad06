#pragma once
// The FTDI bridge seam: the calls the scalar link makes of an FTDI USB
// bridge's driver library, one member per call, with that library's status
// numbers, flags and open-by-location model kept, so the link above reads
// the same whatever stands below. The Linux form is libftdi1; the lab form
// is an emulated bridge whose MPSSE engine drives a simulated I2C bus.
//
// Location ids follow the rule of every other transport: bus number in bits
// 31-24, then one nibble per port of the USB path from bit 23 down.
//
// Handles are opaque and belong to the object that opened them; a handle
// that object does not hold gives FT_INVALID_HANDLE.
//
// Threads: one caller at a time per handle. Every call returns; a read
// returns with fewer bytes than asked once the read time-out has passed.

#include <cstdint>

using FT_STATUS = uint32_t;
using FT_HANDLE = void*;

enum : FT_STATUS {
  FT_OK = 0,
  FT_INVALID_HANDLE = 1,
  FT_DEVICE_NOT_FOUND = 2,
  FT_DEVICE_NOT_OPENED = 3,
  FT_IO_ERROR = 4,
  FT_INSUFFICIENT_RESOURCES = 5,
  FT_INVALID_PARAMETER = 6,
  FT_OTHER_ERROR = 18,
};

// FT_ListDevices flags.
inline constexpr uint32_t FT_LIST_NUMBER_ONLY = 0x80000000;
inline constexpr uint32_t FT_LIST_BY_INDEX = 0x40000000;
// FT_OpenEx, and FT_ListDevices with FT_LIST_BY_INDEX: by location id.
inline constexpr uint32_t FT_OPEN_BY_LOCATION = 4;

// FT_SetBitMode modes.
inline constexpr uint8_t FT_BITMODE_RESET = 0x00;
inline constexpr uint8_t FT_BITMODE_MPSSE = 0x02;

// FT_Purge mask bits.
inline constexpr uint32_t FT_PURGE_RX = 1;
inline constexpr uint32_t FT_PURGE_TX = 2;

class CFTDIExAPI32 {
 public:
  virtual ~CFTDIExAPI32() = default;

  // With FT_LIST_NUMBER_ONLY: `arg1_O` points to a uint32_t that receives
  // the number of bridges attached; `arg2_I` is unused. With
  // FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION: `arg1_I` is the index (a
  // uint32_t passed by value in the pointer), `arg2_O` points to a uint32_t
  // that receives that bridge's location id; an index past the last bridge
  // gives FT_DEVICE_NOT_FOUND. Any other flags: FT_INVALID_PARAMETER.
  virtual FT_STATUS FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) = 0;

  // With FT_OPEN_BY_LOCATION: `arg1_I` is the location id passed by value
  // in the pointer. FT_DEVICE_NOT_FOUND: nothing there. FT_DEVICE_NOT_OPENED:
  // a bridge is there but cannot be opened (held by another, or no
  // permission).
  virtual FT_STATUS FT_OpenEx(void* arg1_I, uint32_t flags_I, FT_HANDLE* handle_O) = 0;
  virtual FT_STATUS FT_Close(FT_HANDLE handle_I) = 0;

  virtual FT_STATUS FT_ResetDevice(FT_HANDLE handle_I) = 0;
  virtual FT_STATUS FT_SetUSBParameters(FT_HANDLE handle_I, uint32_t inTransferSize_I,
                                        uint32_t outTransferSize_I) = 0;
  virtual FT_STATUS FT_SetChars(FT_HANDLE handle_I, uint8_t eventChar_I, uint8_t eventEnable_I,
                                uint8_t errorChar_I, uint8_t errorEnable_I) = 0;
  virtual FT_STATUS FT_SetTimeouts(FT_HANDLE handle_I, uint32_t readMs_I, uint32_t writeMs_I) = 0;
  virtual FT_STATUS FT_SetLatencyTimer(FT_HANDLE handle_I, uint8_t ms_I) = 0;
  virtual FT_STATUS FT_SetBitMode(FT_HANDLE handle_I, uint8_t mask_I, uint8_t mode_I) = 0;
  virtual FT_STATUS FT_Purge(FT_HANDLE handle_I, uint32_t mask_I) = 0;

  // Bytes to the MPSSE engine; `written_O` receives how many it took.
  virtual FT_STATUS FT_Write(FT_HANDLE handle_I, const void* buffer_I, uint32_t size_I,
                             uint32_t* written_O) = 0;
  // Bytes from the engine; `read_O` receives how many came, fewer than
  // asked when the read time-out passed first.
  virtual FT_STATUS FT_Read(FT_HANDLE handle_I, void* buffer_O, uint32_t size_I,
                            uint32_t* read_O) = 0;
  // How many bytes wait to be read.
  virtual FT_STATUS FT_GetQueueStatus(FT_HANDLE handle_I, uint32_t* rxBytes_O) = 0;
};
