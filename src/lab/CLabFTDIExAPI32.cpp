#include "lab/CLabFTDIExAPI32.h"

#include <algorithm>

#include "common/CClock.h"
#include "lab/CLabFTDIBridge.h"

namespace {

uint32_t FromPointer(void* value_I) {
  return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(value_I));
}

}  // namespace

CLabFTDIExAPI32::~CLabFTDIExAPI32() {
  for (auto& [handle, entry] : mHandles) mBus->Release(entry->binding);
}

std::vector<uint32_t> CLabFTDIExAPI32::Locations() const {
  std::vector<uint32_t> locations;
  for (const SLabInterface& entry : mBus->ListInterfaces()) {
    if (entry.link == ELabLink::eUsbVendor && entry.info.vendorId == CLabFTDIBridge::kVendorId &&
        entry.info.productId == CLabFTDIBridge::kProductId) {
      locations.push_back(entry.info.locationId);
    }
  }
  std::sort(locations.begin(), locations.end());
  return locations;
}

FT_STATUS CLabFTDIExAPI32::FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) {
  const std::vector<uint32_t> locations = Locations();
  if (flags_I == FT_LIST_NUMBER_ONLY) {
    if (arg1_IO == nullptr) return FT_INVALID_PARAMETER;
    *static_cast<uint32_t*>(arg1_IO) = static_cast<uint32_t>(locations.size());
    return FT_OK;
  }
  if (flags_I == (FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION)) {
    if (arg2_IO == nullptr) return FT_INVALID_PARAMETER;
    const uint32_t index = FromPointer(arg1_IO);
    if (index >= locations.size()) return FT_DEVICE_NOT_FOUND;
    *static_cast<uint32_t*>(arg2_IO) = locations[index];
    return FT_OK;
  }
  return FT_INVALID_PARAMETER;
}

FT_STATUS CLabFTDIExAPI32::FT_OpenEx(void* arg1_I, uint32_t flags_I, FT_HANDLE* handle_O) {
  if (handle_O == nullptr || flags_I != FT_OPEN_BY_LOCATION) return FT_INVALID_PARAMETER;
  *handle_O = nullptr;
  const DeviceInfo info{CLabFTDIBridge::kVendorId, CLabFTDIBridge::kProductId, FromPointer(arg1_I),
                        0, 0};
  auto entry = std::make_unique<SHandle>();
  switch (mBus->OpenUsb(info, entry->binding)) {
    case EUsbStatus::eSuccess: break;
    case EUsbStatus::eBusy: return FT_DEVICE_NOT_OPENED;
    default: return FT_DEVICE_NOT_FOUND;
  }
  bool refused = false;
  mBus->WithBoard(entry->binding, [&](CLabBoard& board_I) {
    refused = static_cast<CLabFTDIBridge&>(board_I).RefusesOpen();
  });
  if (refused) {
    mBus->Release(entry->binding);
    return FT_DEVICE_NOT_OPENED;
  }
  std::lock_guard<std::mutex> guard(mLock);
  FT_HANDLE handle = entry.get();
  mHandles.emplace(handle, std::move(entry));
  *handle_O = handle;
  return FT_OK;
}

FT_STATUS CLabFTDIExAPI32::FT_Close(FT_HANDLE handle_I) {
  std::unique_ptr<SHandle> entry;
  {
    std::lock_guard<std::mutex> guard(mLock);
    auto found = mHandles.find(handle_I);
    if (found == mHandles.end()) return FT_INVALID_HANDLE;
    entry = std::move(found->second);
    mHandles.erase(found);
  }
  mBus->Release(entry->binding);
  return FT_OK;
}

CLabFTDIExAPI32::SHandle* CLabFTDIExAPI32::Find(FT_HANDLE handle_I) {
  std::lock_guard<std::mutex> guard(mLock);
  auto found = mHandles.find(handle_I);
  return found == mHandles.end() ? nullptr : found->second.get();
}

template <typename TWork>
FT_STATUS CLabFTDIExAPI32::OnBridge(FT_HANDLE handle_I, const TWork& work_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  FT_STATUS status = FT_IO_ERROR;
  mBus->WithBoard(entry->binding, [&](CLabBoard& board_I) {
    status = work_I(static_cast<CLabFTDIBridge&>(board_I));
  });
  return status;
}

FT_STATUS CLabFTDIExAPI32::FT_ResetDevice(FT_HANDLE handle_I) {
  return OnBridge(handle_I, [](CLabFTDIBridge& bridge_I) { return bridge_I.ResetDevice(); });
}

FT_STATUS CLabFTDIExAPI32::FT_SetUSBParameters(FT_HANDLE handle_I, uint32_t inTransferSize_I,
                                               uint32_t outTransferSize_I) {
  const auto valid = [](uint32_t size_I) {
    return size_I >= 64 && size_I <= 65536 && size_I % 64 == 0;
  };
  return OnBridge(handle_I, [&](CLabFTDIBridge&) {
    return valid(inTransferSize_I) && valid(outTransferSize_I) ? FT_OK : FT_INVALID_PARAMETER;
  });
}

FT_STATUS CLabFTDIExAPI32::FT_SetChars(FT_HANDLE handle_I, uint8_t, uint8_t, uint8_t, uint8_t) {
  return OnBridge(handle_I, [](CLabFTDIBridge&) { return FT_OK; });
}

FT_STATUS CLabFTDIExAPI32::FT_SetTimeouts(FT_HANDLE handle_I, uint32_t readMs_I,
                                          uint32_t writeMs_I) {
  const FT_STATUS status = OnBridge(handle_I, [](CLabFTDIBridge&) { return FT_OK; });
  if (status == FT_OK) {
    SHandle* entry = Find(handle_I);
    entry->readTimeoutMs = readMs_I;
    entry->writeTimeoutMs = writeMs_I;
  }
  return status;
}

FT_STATUS CLabFTDIExAPI32::FT_SetLatencyTimer(FT_HANDLE handle_I, uint8_t ms_I) {
  return OnBridge(handle_I,
                  [&](CLabFTDIBridge&) { return ms_I == 0 ? FT_INVALID_PARAMETER : FT_OK; });
}

FT_STATUS CLabFTDIExAPI32::FT_SetBitMode(FT_HANDLE handle_I, uint8_t mask_I, uint8_t mode_I) {
  return OnBridge(handle_I,
                  [&](CLabFTDIBridge& bridge_I) { return bridge_I.SetBitMode(mask_I, mode_I); });
}

FT_STATUS CLabFTDIExAPI32::FT_Purge(FT_HANDLE handle_I, uint32_t mask_I) {
  return OnBridge(handle_I, [&](CLabFTDIBridge& bridge_I) { return bridge_I.Purge(mask_I); });
}

FT_STATUS CLabFTDIExAPI32::FT_Write(FT_HANDLE handle_I, const void* buffer_I, uint32_t size_I,
                                    uint32_t* written_O) {
  if (written_O == nullptr || (buffer_I == nullptr && size_I != 0)) return FT_INVALID_PARAMETER;
  *written_O = 0;
  return OnBridge(handle_I, [&](CLabFTDIBridge& bridge_I) {
    return bridge_I.Write(static_cast<const uint8_t*>(buffer_I), size_I, *written_O);
  });
}

FT_STATUS CLabFTDIExAPI32::FT_Read(FT_HANDLE handle_I, void* buffer_O, uint32_t size_I,
                                   uint32_t* read_O) {
  if (read_O == nullptr || (buffer_O == nullptr && size_I != 0)) return FT_INVALID_PARAMETER;
  *read_O = 0;
  const FT_STATUS status = OnBridge(handle_I, [&](CLabFTDIBridge& bridge_I) {
    return bridge_I.Read(static_cast<uint8_t*>(buffer_O), size_I, *read_O);
  });
  // Nothing more will come: the read runs out its time-out, off the lock.
  if (status == FT_OK && *read_O < size_I) TavSleep(Find(handle_I)->readTimeoutMs / 1000.0);
  return status;
}

FT_STATUS CLabFTDIExAPI32::FT_GetQueueStatus(FT_HANDLE handle_I, uint32_t* rxBytes_O) {
  if (rxBytes_O == nullptr) return FT_INVALID_PARAMETER;
  *rxBytes_O = 0;
  return OnBridge(handle_I, [&](CLabFTDIBridge& bridge_I) {
    *rxBytes_O = bridge_I.QueueStatus();
    return FT_OK;
  });
}
