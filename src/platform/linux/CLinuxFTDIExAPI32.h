#pragma once
// The Linux form of the FTDI bridge seam, over libftdi1. The bridges are
// the FT232H, FT2232H and FT4232H that libftdi finds, one entry per USB
// device (channel A, the one with an MPSSE engine on every kind), listed
// in the order of their location ids; the location id comes from the USB
// port path by the registry's rule, so it names the same device as the
// registry does. Each open handle has a libftdi context of its own.
//
// What libftdi lacks is made here: FT_Read loops on ftdi_read_data until
// it has all it asked for or its read time-out has passed, waiting between
// tries through TavSleep; FT_GetQueueStatus reads what the bridge has sent
// into a read-ahead buffer, which FT_Read empties first, and reports its
// size. Time-outs default to 300 ms each, as the driver's do.
//
// libftdi and libusb results stay inside: a failing call on an open handle
// is FT_IO_ERROR (an unplugged bridge too), a parameter the driver would
// refuse FT_INVALID_PARAMETER, a location with no bridge
// FT_DEVICE_NOT_FOUND, a bridge that libftdi finds but cannot open or
// claim (held by another, no permission) FT_DEVICE_NOT_OPENED.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <vector>

#include "seams/CFTDIExAPI32.h"

struct ftdi_context;

class CLinuxFTDIExAPI32 : public CFTDIExAPI32 {
 public:
  CLinuxFTDIExAPI32();
  ~CLinuxFTDIExAPI32() override;
  CLinuxFTDIExAPI32(const CLinuxFTDIExAPI32&) = delete;
  CLinuxFTDIExAPI32& operator=(const CLinuxFTDIExAPI32&) = delete;

  FT_STATUS FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) override;
  FT_STATUS FT_OpenEx(void* arg1_I, uint32_t flags_I, FT_HANDLE* handle_O) override;
  FT_STATUS FT_Close(FT_HANDLE handle_I) override;
  FT_STATUS FT_ResetDevice(FT_HANDLE handle_I) override;
  FT_STATUS FT_SetUSBParameters(FT_HANDLE handle_I, uint32_t inTransferSize_I,
                                uint32_t outTransferSize_I) override;
  FT_STATUS FT_SetChars(FT_HANDLE handle_I, uint8_t eventChar_I, uint8_t eventEnable_I,
                        uint8_t errorChar_I, uint8_t errorEnable_I) override;
  FT_STATUS FT_SetTimeouts(FT_HANDLE handle_I, uint32_t readMs_I, uint32_t writeMs_I) override;
  FT_STATUS FT_SetLatencyTimer(FT_HANDLE handle_I, uint8_t ms_I) override;
  FT_STATUS FT_SetBitMode(FT_HANDLE handle_I, uint8_t mask_I, uint8_t mode_I) override;
  FT_STATUS FT_Purge(FT_HANDLE handle_I, uint32_t mask_I) override;
  FT_STATUS FT_Write(FT_HANDLE handle_I, const void* buffer_I, uint32_t size_I,
                     uint32_t* written_O) override;
  FT_STATUS FT_Read(FT_HANDLE handle_I, void* buffer_O, uint32_t size_I, uint32_t* read_O) override;
  FT_STATUS FT_GetQueueStatus(FT_HANDLE handle_I, uint32_t* rxBytes_O) override;

 private:
  struct SHandle;

  // The handle's entry, or null for a handle this object does not hold.
  SHandle* Find(FT_HANDLE handle_I);
  // Moves what the bridge has sent into the read-ahead buffer.
  static FT_STATUS ReadAhead(SHandle& handle_IO);

  std::mutex mLock;
  std::map<FT_HANDLE, std::unique_ptr<SHandle>> mHandles;
};
