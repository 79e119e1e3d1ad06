#include "platform/linux/CLinuxFTDIExAPI32.h"

#include <ftdi.h>
#include <libusb.h>

#include <algorithm>
#include <string>

#include "common/CClock.h"
#include "platform/linux/CLinuxDeviceRegistry.h"

namespace {

// FT232H, FT2232H, FT4232H: the bridges with an MPSSE engine.
constexpr int kVendorId = 0x0403;
constexpr int kProductIds[] = {0x6014, 0x6010, 0x6011};
constexpr uint32_t kDefaultTimeoutMs = 300;
// A read still short asks libftdi again this often; on a bridge each empty
// ask already takes up to its latency timer.
constexpr double kReadPollInterval = 0.001;
constexpr int kReadAheadChunk = 4096;
// libusb gives at most seven port numbers, the deepest USB path.
constexpr int kMaxPorts = 7;

uint32_t FromPointer(void* value_I) {
  return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(value_I));
}

FT_STATUS FromLibftdi(int result_I) { return result_I < 0 ? FT_IO_ERROR : FT_OK; }

uint32_t LocationOf(libusb_device* device_I) {
  uint8_t ports[kMaxPorts];
  const int count = libusb_get_port_numbers(device_I, ports, kMaxPorts);
  std::string devpath;
  for (int i = 0; i < count; ++i) devpath += (i ? "." : "") + std::to_string(ports[i]);
  return CLinuxDeviceRegistry::LocationIdFromTopology(libusb_get_bus_number(device_I), devpath);
}

// The bridges libftdi finds through one context, in the order of their
// location ids; their libusb devices stay valid while the list lives.
class CBridgeList {
 public:
  struct SBridge {
    uint32_t location = 0;
    libusb_device* device = nullptr;
  };

  explicit CBridgeList(ftdi_context* context_I) {
    for (int product : kProductIds) {
      ftdi_device_list* list = nullptr;
      mFailed = ftdi_usb_find_all(context_I, &list, kVendorId, product) < 0 || mFailed;
      if (list == nullptr) continue;
      mLists.push_back(list);
      for (ftdi_device_list* entry = list; entry != nullptr; entry = entry->next) {
        mBridges.push_back({LocationOf(entry->dev), entry->dev});
      }
    }
    std::sort(mBridges.begin(), mBridges.end(),
              [](const SBridge& a, const SBridge& b) { return a.location < b.location; });
  }
  ~CBridgeList() {
    for (ftdi_device_list* list : mLists) ftdi_list_free(&list);
  }
  CBridgeList(const CBridgeList&) = delete;
  CBridgeList& operator=(const CBridgeList&) = delete;

  bool Failed() const { return mFailed; }
  const std::vector<SBridge>& Get() const { return mBridges; }
  libusb_device* Find(uint32_t location_I) const {
    for (const SBridge& bridge : mBridges) {
      if (bridge.location == location_I) return bridge.device;
    }
    return nullptr;
  }

 private:
  std::vector<ftdi_device_list*> mLists;
  std::vector<SBridge> mBridges;
  bool mFailed = false;
};

}  // namespace

struct CLinuxFTDIExAPI32::SHandle {
  SHandle() : context(ftdi_new()) {}
  ~SHandle() {
    if (context == nullptr) return;
    ftdi_usb_close(context);
    ftdi_free(context);
  }
  SHandle(const SHandle&) = delete;
  SHandle& operator=(const SHandle&) = delete;

  ftdi_context* context;
  uint32_t readTimeoutMs = kDefaultTimeoutMs;
  // What the bridge sent that no FT_Read has taken yet.
  std::vector<uint8_t> readAhead;
};

CLinuxFTDIExAPI32::CLinuxFTDIExAPI32() = default;
CLinuxFTDIExAPI32::~CLinuxFTDIExAPI32() = default;

CLinuxFTDIExAPI32::SHandle* CLinuxFTDIExAPI32::Find(FT_HANDLE handle_I) {
  std::lock_guard<std::mutex> guard(mLock);
  auto found = mHandles.find(handle_I);
  return found == mHandles.end() ? nullptr : found->second.get();
}

FT_STATUS CLinuxFTDIExAPI32::FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) {
  const bool count = flags_I == FT_LIST_NUMBER_ONLY;
  const bool byIndex = flags_I == (FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION);
  if ((!count && !byIndex) || (count && arg1_IO == nullptr) || (byIndex && arg2_IO == nullptr)) {
    return FT_INVALID_PARAMETER;
  }
  std::unique_ptr<ftdi_context, void (*)(ftdi_context*)> context(ftdi_new(), &ftdi_free);
  if (context == nullptr) return FT_INSUFFICIENT_RESOURCES;
  const CBridgeList bridges(context.get());
  if (bridges.Failed()) return FT_OTHER_ERROR;
  if (count) {
    *static_cast<uint32_t*>(arg1_IO) = static_cast<uint32_t>(bridges.Get().size());
    return FT_OK;
  }
  const uint32_t index = FromPointer(arg1_IO);
  if (index >= bridges.Get().size()) return FT_DEVICE_NOT_FOUND;
  *static_cast<uint32_t*>(arg2_IO) = bridges.Get()[index].location;
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_OpenEx(void* arg1_I, uint32_t flags_I, FT_HANDLE* handle_O) {
  if (handle_O == nullptr || flags_I != FT_OPEN_BY_LOCATION) return FT_INVALID_PARAMETER;
  *handle_O = nullptr;
  auto entry = std::make_unique<SHandle>();
  if (entry->context == nullptr) return FT_INSUFFICIENT_RESOURCES;
  {
    // The handle's own context finds the device, so that it owns it.
    const CBridgeList bridges(entry->context);
    libusb_device* device = bridges.Find(FromPointer(arg1_I));
    if (device == nullptr) return FT_DEVICE_NOT_FOUND;
    if (ftdi_usb_open_dev(entry->context, device) != 0) return FT_DEVICE_NOT_OPENED;
  }
  entry->context->usb_read_timeout = static_cast<int>(kDefaultTimeoutMs);
  entry->context->usb_write_timeout = static_cast<int>(kDefaultTimeoutMs);
  std::lock_guard<std::mutex> guard(mLock);
  FT_HANDLE handle = entry.get();
  mHandles.emplace(handle, std::move(entry));
  *handle_O = handle;
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_Close(FT_HANDLE handle_I) {
  std::unique_ptr<SHandle> entry;
  {
    std::lock_guard<std::mutex> guard(mLock);
    auto found = mHandles.find(handle_I);
    if (found == mHandles.end()) return FT_INVALID_HANDLE;
    entry = std::move(found->second);
    mHandles.erase(found);
  }
  // Closing an unplugged bridge still lets the handle go.
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_ResetDevice(FT_HANDLE handle_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  // libftdi drops its own buffered bytes on reset; so does the read-ahead.
  entry->readAhead.clear();
  return FromLibftdi(ftdi_usb_reset(entry->context));
}

FT_STATUS CLinuxFTDIExAPI32::FT_SetUSBParameters(FT_HANDLE handle_I, uint32_t inTransferSize_I,
                                                 uint32_t outTransferSize_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  const auto valid = [](uint32_t size_I) {
    return size_I >= 64 && size_I <= 65536 && size_I % 64 == 0;
  };
  if (!valid(inTransferSize_I) || !valid(outTransferSize_I)) return FT_INVALID_PARAMETER;
  if (ftdi_read_data_set_chunksize(entry->context, inTransferSize_I) < 0) return FT_IO_ERROR;
  return FromLibftdi(ftdi_write_data_set_chunksize(entry->context, outTransferSize_I));
}

FT_STATUS CLinuxFTDIExAPI32::FT_SetChars(FT_HANDLE handle_I, uint8_t eventChar_I,
                                         uint8_t eventEnable_I, uint8_t errorChar_I,
                                         uint8_t errorEnable_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  if (ftdi_set_event_char(entry->context, eventChar_I, eventEnable_I) < 0) return FT_IO_ERROR;
  return FromLibftdi(ftdi_set_error_char(entry->context, errorChar_I, errorEnable_I));
}

FT_STATUS CLinuxFTDIExAPI32::FT_SetTimeouts(FT_HANDLE handle_I, uint32_t readMs_I,
                                            uint32_t writeMs_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  entry->readTimeoutMs = readMs_I;
  // One USB transfer never outlasts the call it serves.
  entry->context->usb_read_timeout = static_cast<int>(std::min<uint32_t>(readMs_I, INT32_MAX));
  entry->context->usb_write_timeout = static_cast<int>(std::min<uint32_t>(writeMs_I, INT32_MAX));
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_SetLatencyTimer(FT_HANDLE handle_I, uint8_t ms_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  if (ms_I == 0) return FT_INVALID_PARAMETER;
  return FromLibftdi(ftdi_set_latency_timer(entry->context, ms_I));
}

FT_STATUS CLinuxFTDIExAPI32::FT_SetBitMode(FT_HANDLE handle_I, uint8_t mask_I, uint8_t mode_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  return FromLibftdi(ftdi_set_bitmode(entry->context, mask_I, mode_I));
}

FT_STATUS CLinuxFTDIExAPI32::FT_Purge(FT_HANDLE handle_I, uint32_t mask_I) {
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  if ((mask_I & ~(FT_PURGE_RX | FT_PURGE_TX)) != 0) return FT_INVALID_PARAMETER;
  const bool rx = (mask_I & FT_PURGE_RX) != 0;
  const bool tx = (mask_I & FT_PURGE_TX) != 0;
  if (rx) entry->readAhead.clear();
  if (rx && tx) return FromLibftdi(ftdi_tcioflush(entry->context));
  if (rx) return FromLibftdi(ftdi_tciflush(entry->context));
  if (tx) return FromLibftdi(ftdi_tcoflush(entry->context));
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_Write(FT_HANDLE handle_I, const void* buffer_I, uint32_t size_I,
                                      uint32_t* written_O) {
  if (written_O == nullptr || (buffer_I == nullptr && size_I != 0) || size_I > INT32_MAX) {
    return FT_INVALID_PARAMETER;
  }
  *written_O = 0;
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  if (size_I == 0) return FT_OK;
  const int written = ftdi_write_data(entry->context, static_cast<const unsigned char*>(buffer_I),
                                      static_cast<int>(size_I));
  if (written < 0) return FT_IO_ERROR;
  *written_O = static_cast<uint32_t>(written);
  return FT_OK;
}

FT_STATUS CLinuxFTDIExAPI32::FT_Read(FT_HANDLE handle_I, void* buffer_O, uint32_t size_I,
                                     uint32_t* read_O) {
  if (read_O == nullptr || (buffer_O == nullptr && size_I != 0) || size_I > INT32_MAX) {
    return FT_INVALID_PARAMETER;
  }
  *read_O = 0;
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  auto* bytes = static_cast<unsigned char*>(buffer_O);
  const size_t early = std::min<size_t>(size_I, entry->readAhead.size());
  std::copy_n(entry->readAhead.begin(), early, bytes);
  entry->readAhead.erase(entry->readAhead.begin(), entry->readAhead.begin() + early);
  uint32_t got = static_cast<uint32_t>(early);
  FT_STATUS status = FT_OK;
  TavPollUntil(entry->readTimeoutMs / 1000.0, kReadPollInterval, [&] {
    if (got < size_I) {
      const int result =
          ftdi_read_data(entry->context, bytes + got, static_cast<int>(size_I - got));
      if (result < 0) status = FT_IO_ERROR;
      got += result > 0 ? static_cast<uint32_t>(result) : 0;
    }
    return got == size_I || status != FT_OK;
  });
  *read_O = got;
  return status;
}

FT_STATUS CLinuxFTDIExAPI32::FT_GetQueueStatus(FT_HANDLE handle_I, uint32_t* rxBytes_O) {
  if (rxBytes_O == nullptr) return FT_INVALID_PARAMETER;
  *rxBytes_O = 0;
  SHandle* entry = Find(handle_I);
  if (entry == nullptr) return FT_INVALID_HANDLE;
  const FT_STATUS status = ReadAhead(*entry);
  *rxBytes_O = static_cast<uint32_t>(entry->readAhead.size());
  return status;
}

FT_STATUS CLinuxFTDIExAPI32::ReadAhead(SHandle& handle_IO) {
  unsigned char chunk[kReadAheadChunk];
  for (;;) {
    const int result = ftdi_read_data(handle_IO.context, chunk, kReadAheadChunk);
    if (result < 0) return FT_IO_ERROR;
    handle_IO.readAhead.insert(handle_IO.readAhead.end(), chunk, chunk + result);
    if (result < kReadAheadChunk) return FT_OK;
  }
}
