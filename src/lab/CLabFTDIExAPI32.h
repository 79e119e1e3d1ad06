#pragma once
// The lab form of the FTDI bridge seam: the bridges plugged into the lab
// bus (CLabFTDIBridge, 0403:6014), listed in the order of their location
// ids and opened by location id, the bridge of a product's hub port 5 at
// 0x01000000 | root port << 20 | 5 << 16. A bridge is open to one handle
// at a time: a second FT_OpenEx gives FT_DEVICE_NOT_OPENED, as a bridge
// held by another program does. Once a bridge drops off the bus every
// call on its handle but FT_Close gives FT_IO_ERROR.
//
// Time-outs: FT_Read with fewer bytes waiting than asked returns what
// there is after waiting out the read time-out on the process clock
// (TavSleep); the engine answers within the transfer, so nothing more can
// come. The time-outs default to 300 ms each, as the driver's do.
//
// Parameters are checked as the driver checks them: transfer sizes of 64
// to 65536 bytes in steps of 64, a latency of 1 to 255 ms.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <vector>

#include "lab/CLabBus.h"
#include "seams/CFTDIExAPI32.h"

class CLabFTDIBridge;

class CLabFTDIExAPI32 : public CFTDIExAPI32 {
 public:
  explicit CLabFTDIExAPI32(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}
  ~CLabFTDIExAPI32() override;

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

  // The location ids of the bridges attached, in listing order.
  std::vector<uint32_t> Locations() const;

 private:
  struct SHandle {
    CLabBus::SBinding binding;
    uint32_t readTimeoutMs = 300;
    uint32_t writeTimeoutMs = 300;
  };

  // The handle's entry, or null for a handle this object does not hold.
  SHandle* Find(FT_HANDLE handle_I);
  // Runs `work_I` on the handle's bridge: FT_INVALID_HANDLE for an unknown
  // handle, FT_IO_ERROR for a bridge that is gone. A template: a transfer
  // is the common case and should not allocate to wrap its work.
  template <typename TWork>
  FT_STATUS OnBridge(FT_HANDLE handle_I, const TWork& work_I);

  std::shared_ptr<CLabBus> mBus;
  std::mutex mLock;
  std::map<FT_HANDLE, std::unique_ptr<SHandle>> mHandles;
};
