#include "platform/linux/CLinuxUsbControl.h"

#include <libudev.h>

#include <cstdlib>
#include <memory>

#include "platform/linux/CLinuxDeviceRegistry.h"

namespace {

constexpr uint8_t kVendorClass = 0xFF;
constexpr uint8_t kVendorSubclass = 0x00;

EUsbStatus StatusFromLibusb(int result_I) {
  switch (result_I) {
    case LIBUSB_SUCCESS: return EUsbStatus::eSuccess;
    case LIBUSB_ERROR_PIPE: return EUsbStatus::eStall;
    case LIBUSB_ERROR_BUSY: return EUsbStatus::eBusy;
    case LIBUSB_ERROR_NO_DEVICE:
    case LIBUSB_ERROR_NOT_FOUND: return EUsbStatus::eGone;
    case LIBUSB_ERROR_TIMEOUT: return EUsbStatus::eTimeout;
    case LIBUSB_ERROR_ACCESS: return EUsbStatus::eDenied;
    default: return EUsbStatus::eOther;
  }
}

unsigned long Attribute(udev_device* device_I, const char* name_I, int base_I) {
  const char* text = udev_device_get_sysattr_value(device_I, name_I);
  return text == nullptr ? 0 : std::strtoul(text, nullptr, base_I);
}

}  // namespace

CLinuxUsbControl::~CLinuxUsbControl() {
  Close();
  if (mContext != nullptr) libusb_exit(mContext);
}

bool CLinuxUsbControl::FindDevice(const DeviceInfo& info_I, int& bus_O, int& address_O,
                                  uint16_t& release_O) {
  udev* context = udev_new();
  if (context == nullptr) return false;
  udev_enumerate* enumerate = udev_enumerate_new(context);
  udev_enumerate_add_match_subsystem(enumerate, "usb");
  udev_enumerate_add_match_property(enumerate, "DEVTYPE", "usb_device");
  udev_enumerate_scan_devices(enumerate);
  bool found = false;
  udev_list_entry* entry = nullptr;
  udev_list_entry_foreach(entry, udev_enumerate_get_list_entry(enumerate)) {
    udev_device* device = udev_device_new_from_syspath(context, udev_list_entry_get_name(entry));
    if (device == nullptr) continue;
    const char* devpath = udev_device_get_sysattr_value(device, "devpath");
    const unsigned long bus = Attribute(device, "busnum", 10);
    // The registry's rule, so that both name a device by the same number.
    const uint32_t location = devpath != nullptr ? CLinuxDeviceRegistry::LocationIdFromTopology(
                                                       static_cast<uint32_t>(bus), devpath)
                                                 : 0;
    if (Attribute(device, "idVendor", 16) == info_I.vendorId &&
        Attribute(device, "idProduct", 16) == info_I.productId && location == info_I.locationId) {
      bus_O = static_cast<int>(bus);
      address_O = static_cast<int>(Attribute(device, "devnum", 10));
      release_O = static_cast<uint16_t>(Attribute(device, "bcdDevice", 16));
      found = true;
    }
    udev_device_unref(device);
    if (found) break;
  }
  udev_enumerate_unref(enumerate);
  udev_unref(context);
  return found;
}

EUsbStatus CLinuxUsbControl::Open(const DeviceInfo& info_I) {
  Close();
  int bus = 0;
  int address = 0;
  uint16_t release = 0;
  if (!FindDevice(info_I, bus, address, release)) return EUsbStatus::eGone;
  if (mContext == nullptr && libusb_init(&mContext) != LIBUSB_SUCCESS) {
    mContext = nullptr;
    return EUsbStatus::eOther;
  }
  libusb_device** list = nullptr;
  const ssize_t count = libusb_get_device_list(mContext, &list);
  EUsbStatus status = EUsbStatus::eGone;
  for (ssize_t i = 0; i < count; ++i) {
    if (libusb_get_bus_number(list[i]) != bus || libusb_get_device_address(list[i]) != address) {
      continue;
    }
    status = StatusFromLibusb(libusb_open(list[i], &mHandle));
    break;
  }
  if (list != nullptr) libusb_free_device_list(list, 1);
  if (status != EUsbStatus::eSuccess) {
    mHandle = nullptr;
    return status;
  }
  mRelease = release;
  return EUsbStatus::eSuccess;
}

EUsbStatus CLinuxUsbControl::ClaimVendorInterface() {
  if (mHandle == nullptr) return EUsbStatus::eGone;
  if (mClaimed >= 0) return EUsbStatus::eSuccess;
  libusb_config_descriptor* config = nullptr;
  int result = libusb_get_active_config_descriptor(libusb_get_device(mHandle), &config);
  if (result != LIBUSB_SUCCESS) return StatusFromLibusb(result);
  int number = -1;
  for (uint8_t i = 0; i < config->bNumInterfaces && number < 0; ++i) {
    const libusb_interface& interface = config->interface[i];
    for (int k = 0; k < interface.num_altsetting; ++k) {
      const libusb_interface_descriptor& setting = interface.altsetting[k];
      if (setting.bInterfaceClass == kVendorClass &&
          setting.bInterfaceSubClass == kVendorSubclass) {
        number = setting.bInterfaceNumber;
        break;
      }
    }
  }
  libusb_free_config_descriptor(config);
  if (number < 0) return EUsbStatus::eOther;

  if (libusb_kernel_driver_active(mHandle, number) == 1) {
    result = libusb_detach_kernel_driver(mHandle, number);
    if (result != LIBUSB_SUCCESS) return StatusFromLibusb(result);
    mDriverDetached = true;
  }
  result = libusb_claim_interface(mHandle, number);
  if (result != LIBUSB_SUCCESS) {
    if (mDriverDetached) libusb_attach_kernel_driver(mHandle, number);
    mDriverDetached = false;
    return StatusFromLibusb(result);
  }
  mClaimed = number;
  return EUsbStatus::eSuccess;
}

EUsbStatus CLinuxUsbControl::ControlTransfer(uint8_t requestType_I, uint8_t request_I,
                                             uint16_t value_I, uint16_t index_I,
                                             std::vector<uint8_t>& data_IO, size_t& transferred_O) {
  transferred_O = 0;
  if (mHandle == nullptr) return EUsbStatus::eGone;
  if (data_IO.size() > 0xFFFF) return EUsbStatus::eOther;
  const int result =
      libusb_control_transfer(mHandle, requestType_I, request_I, value_I, index_I, data_IO.data(),
                              static_cast<uint16_t>(data_IO.size()), kUsbControlTimeoutMs);
  if (result < 0) return StatusFromLibusb(result);
  transferred_O = static_cast<size_t>(result);
  return EUsbStatus::eSuccess;
}

void CLinuxUsbControl::Close() {
  if (mHandle == nullptr) return;
  if (mClaimed >= 0) {
    libusb_release_interface(mHandle, mClaimed);
    if (mDriverDetached) libusb_attach_kernel_driver(mHandle, mClaimed);
  }
  mClaimed = -1;
  mDriverDetached = false;
  libusb_close(mHandle);
  mHandle = nullptr;
  mRelease = 0;
}
