#include "platform/linux/CLinuxDiscovery.h"

#include <algorithm>

#include "common/TavLog.h"
#include "devices/IOUtils.h"
#include "flash/CFLDeviceInterface.h"
#include "platform/linux/CLinuxBulkFLDeviceInterface.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "platform/linux/CLinuxI2CFLDeviceInterface.h"

namespace {

// Every board of the family answers under this vendor id.
constexpr uint32_t kFamilyVendorId = 0x7A5D;
// The vendor collection display scalars are searched by.
constexpr uint32_t kScalarUsagePage = 0xFF00;
constexpr uint32_t kScalarUsage = 0xA;

// Interfaces report their ids in 32 bits; the boards compare at 16.
uint16_t Low16(uint32_t value_I) { return static_cast<uint16_t>(value_I & 0xFFFF); }

// The comparison shared by the four role tests, in its order: usage, usage
// page, vendor id, product id, interface type.
bool MatchesBoard(const CFLDeviceInterface& interface_I, uint32_t usage_I, uint32_t usagePage_I,
                  uint32_t vendorId_I, uint32_t productId_I, EINTERFACE_TYPE type_I) {
  if (Low16(interface_I.GetUsageId()) != Low16(usage_I)) return false;
  if (Low16(interface_I.GetUsagePage()) != Low16(usagePage_I)) return false;
  if (Low16(interface_I.GetVendorId()) != Low16(vendorId_I)) return false;
  if (Low16(interface_I.GetProductId()) != Low16(productId_I)) return false;
  return interface_I.GetInterfaceType() == type_I;
}

}  // namespace

CLinuxDiscovery::CLinuxDiscovery(std::shared_ptr<CDeviceRegistry> registry_I,
                                 HidNodeFactory makeHidNode_I, UsbControlFactory makeUsbControl_I)
    : mRegistry(std::move(registry_I)),
      mMakeHidNode(std::move(makeHidNode_I)),
      mMakeUsbControl(std::move(makeUsbControl_I)) {}

bool CLinuxDiscovery::GenerateDeviceList() {
  CDiscovery::GenerateDeviceList();
  ClearRoleLists();
  GetHIDDevices();
  GetBulkDevices();
  ReconcileDeviceList();
  ClearRoleLists();
  return true;
}

void CLinuxDiscovery::ClearRoleLists() {
  mPenInterfaces.clear();
  mTouchInterfaces.clear();
  mBluetoothInterfaces.clear();
  mScalarInterfaces.clear();
  mLoaderInterfaces.clear();
}

void CLinuxDiscovery::GetHIDDevices() {
  if (!mRegistry) return;
  const std::vector<CDevice> supported = mSupportedDeviceInfo.GetAllDevices();
  std::vector<DeviceInfo> criteria;
  for (size_t index = 0; index <= supported.size(); ++index) {
    DeviceInfo criterion;
    if (index < supported.size()) {
      criterion.vendorId = kFamilyVendorId;
      criterion.usagePage = supported[index].GetPenUsagePage();
      criterion.usage = supported[index].GetPenUsageId();
    } else {
      criterion.usagePage = kScalarUsagePage;
      criterion.usage = kScalarUsage;
    }
    if (std::find(criteria.begin(), criteria.end(), criterion) == criteria.end()) {
      criteria.push_back(criterion);
    }
  }
  const std::vector<DeviceInfo> found = IOUtils::FindMatchedDevicesMultiple(*mRegistry, criteria);
  ProcessDevicePaths(EHID_INTERFACE, found);
  ProcessDevicePaths(EI2C_INTERFACE, found);
}

void CLinuxDiscovery::GetBulkDevices() {
  if (!mRegistry) return;
  ProcessDevicePaths(EBULK_INTERFACE, IOUtils::FindUsbDevices(*mRegistry, kFamilyVendorId));
}

void CLinuxDiscovery::ProcessDevicePaths(EINTERFACE_TYPE interfaceType_I,
                                         const std::vector<DeviceInfo>& infos_I) {
  if (!mSupportedDeviceInfo.IsValid()) return;
  for (const DeviceInfo& info : infos_I) {
    InterfacePtr interface = GetNewInterface(interfaceType_I, info);
    if (!interface || !interface->GetAttributes()) continue;
    DevicePtr device = GetNewSupportedDevice(Low16(info.vendorId), Low16(info.productId));
    if (!device || !device->IsValid()) continue;

    // Every USB device is also tried as a vendor-class interface: a loader
    // counts only on the transport its configuration names, or a HID loader
    // would come a second time from the USB pass, as a product of its own.
    if (device->GetIsFlashLoader() && interface->GetInterfaceType() != EI2C_INTERFACE &&
        interface->GetInterfaceType() == device->GetPenInterfaceType()) {
      interface->SetIsFlashLoader(true);
      mLoaderInterfaces.push_back(interface);
    }
    // The roles do not exclude each other.
    if (IsPenInterface(device, interface)) mPenInterfaces.push_back(interface);
    if (IsTouchInterface(device, interface)) mTouchInterfaces.push_back(interface);
    if (IsBluetoothInterface(device, interface)) mBluetoothInterfaces.push_back(interface);
    if (IsScalarInterface(device, interface)) mScalarInterfaces.push_back(interface);
  }
}

CLinuxDiscovery::InterfacePtr CLinuxDiscovery::GetNewInterface(EINTERFACE_TYPE interfaceType_I,
                                                               const DeviceInfo& info_I) const {
  switch (interfaceType_I) {
    case EHID_INTERFACE:
      return std::make_shared<CLinuxHIDFLDeviceInterface>(info_I,
                                                          mMakeHidNode ? mMakeHidNode() : nullptr);
    case EBULK_INTERFACE:
      return std::make_shared<CLinuxBulkFLDeviceInterface>(
          info_I, mMakeUsbControl ? mMakeUsbControl() : nullptr);
    case EI2C_INTERFACE:
      return std::make_shared<CLinuxI2CFLDeviceInterface>(info_I,
                                                          mMakeHidNode ? mMakeHidNode() : nullptr);
    default: return nullptr;
  }
}

CLinuxDiscovery::DevicePtr CLinuxDiscovery::GetNewSupportedDevice(
    unsigned short vendorId_I, unsigned short productId_I) const {
  return std::make_shared<CDevice>(mSupportedDeviceInfo.FindDevice(vendorId_I, productId_I));
}

bool CLinuxDiscovery::IsPenInterface(const DevicePtr& device_I, const InterfacePtr& interface_I) {
  if (!device_I || !interface_I) return false;
  // A loader shows usages of its own.
  const bool loader = device_I->GetIsFlashLoader();
  return MatchesBoard(*interface_I, loader ? interface_I->GetUsageId() : device_I->GetPenUsageId(),
                      loader ? interface_I->GetUsagePage() : device_I->GetPenUsagePage(),
                      device_I->GetPenVendorId(), device_I->GetPenProductId(),
                      device_I->GetPenInterfaceType());
}

bool CLinuxDiscovery::IsTouchInterface(const DevicePtr& device_I, const InterfacePtr& interface_I) {
  if (!device_I || !interface_I) return false;
  // A vendor-class interface has no usage.
  const bool bulk = interface_I->GetInterfaceType() == EBULK_INTERFACE;
  return MatchesBoard(*interface_I, bulk ? 0 : device_I->GetTouchUsageId(),
                      bulk ? 0 : device_I->GetTouchUsagePage(), device_I->GetTouchVendorId(),
                      device_I->GetTouchProductId(), device_I->GetTouchInterfaceType());
}

bool CLinuxDiscovery::IsBluetoothInterface(const DevicePtr& device_I,
                                           const InterfacePtr& interface_I) {
  if (!device_I || !interface_I) return false;
  const bool loader = device_I->GetIsFlashLoader();
  return MatchesBoard(*interface_I,
                      loader ? interface_I->GetUsageId() : device_I->GetBluetoothUsageId(),
                      loader ? interface_I->GetUsagePage() : device_I->GetBluetoothUsagePage(),
                      device_I->GetBluetoothVendorId(), device_I->GetBluetoothProductId(),
                      device_I->GetBluetoothInterfaceType());
}

bool CLinuxDiscovery::IsScalarInterface(const DevicePtr& device_I,
                                        const InterfacePtr& interface_I) {
  if (!device_I || !interface_I) return false;
  const bool hid = interface_I->GetInterfaceType() == EHID_INTERFACE;
  return MatchesBoard(*interface_I, hid ? device_I->GetScalarUsageId() : 0,
                      hid ? device_I->GetScalarUsagePage() : 0, device_I->GetScalarVendorId(),
                      device_I->GetScalarProductId(), device_I->GetScalarInterfaceType());
}

bool CLinuxDiscovery::DoParentsMatch(const DevicePtr& device_I, const InterfacePtr& first_I,
                                     const InterfacePtr& second_I, EUPDATE_TYPE type_I) {
  if (!device_I || !first_I || !second_I) return false;
  const std::string firstPath = first_I->GetBasePath(device_I->GetPenTopology());
  uint8_t topology = 0;
  switch (type_I) {
    case EUPDATE_TOUCH:
    case EUPDATE_UNKNOWN: topology = device_I->GetTouchTopology(); break;
    case EUPDATE_BLUETOOTH: topology = device_I->GetBluetoothTopology(); break;
    case EUPDATE_SCALAR_FTDI:
    case EUPDATE_SCALAR_HID: topology = device_I->GetScalarTopology(); break;
    default: return false;
  }
  const std::string secondPath = second_I->GetBasePath(topology);
  if (firstPath.empty()) return false;
  return firstPath == secondPath;
}

void CLinuxDiscovery::ReconcileDeviceList() {
  std::vector<DevicePtr> devices;
  ReconcilePens(devices);
  ReconcileTouches(devices);
  ReconcileBluetooths(devices);
  ReconcileScalars(devices);
  ReconcileLoaders(devices);
  for (const DevicePtr& device : devices) mDeviceList.AddDevice(device);
}

// Every pen interface is a product of its own; the other boards join them.
void CLinuxDiscovery::ReconcilePens(std::vector<DevicePtr>& devices_IO) const {
  for (const InterfacePtr& pen : mPenInterfaces) {
    DevicePtr device = GetNewSupportedDevice(Low16(pen->GetVendorId()), Low16(pen->GetProductId()));
    device->SetPenInterface(pen);
    devices_IO.push_back(device);
  }
}

void CLinuxDiscovery::ReconcileTouches(std::vector<DevicePtr>& devices_IO) const {
  for (const InterfacePtr& touch : mTouchInterfaces) {
    bool taken = false;
    for (const DevicePtr& device : devices_IO) {
      if (device->GetTouchSupported() && !device->GetTouchInterface() &&
          DoParentsMatch(device, device->GetPenInterface(), touch, EUPDATE_TOUCH)) {
        device->SetTouchInterface(touch);
        taken = true;
        break;
      }
    }
    // The product is listed, but the interface stays unattached.
    if (!taken) {
      devices_IO.push_back(
          GetNewSupportedDevice(Low16(touch->GetVendorId()), Low16(touch->GetProductId())));
    }
  }
}

void CLinuxDiscovery::ReconcileBluetooths(std::vector<DevicePtr>& devices_IO) const {
  for (const InterfacePtr& bluetooth : mBluetoothInterfaces) {
    bool taken = false;
    for (const DevicePtr& device : devices_IO) {
      if (device->GetBluetoothSupported() && !device->GetBluetoothInterface() &&
          DoParentsMatch(device, device->GetPenInterface(), bluetooth, EUPDATE_BLUETOOTH)) {
        device->SetBluetoothInterface(bluetooth);
        taken = true;
        break;
      }
    }
    if (!taken) {
      DevicePtr device =
          GetNewSupportedDevice(Low16(bluetooth->GetVendorId()), Low16(bluetooth->GetProductId()));
      device->SetBluetoothInterface(bluetooth);
      devices_IO.push_back(device);
    }
  }
}

void CLinuxDiscovery::ReconcileScalars(std::vector<DevicePtr>& devices_IO) const {
  for (const InterfacePtr& scalar : mScalarInterfaces) {
    bool taken = false;
    for (const DevicePtr& device : devices_IO) {
      if (device->GetScalarSupported() && !device->GetScalarInterface() &&
          DoParentsMatch(device, device->GetPenInterface(), scalar, EUPDATE_SCALAR_HID)) {
        device->SetScalarInterface(scalar);
        taken = true;
        break;
      }
    }
    if (!taken) {
      DevicePtr device =
          GetNewSupportedDevice(Low16(scalar->GetVendorId()), Low16(scalar->GetProductId()));
      TavLog::Info("ReconcileDeviceList: adding device: [%s] for sclar interface: %s\n",
                   device->GetDeviceName().c_str(), scalar->GetPath().c_str());
      devices_IO.push_back(device);
    }
  }
}

// A loader joins every device it may belong to; one it joins nowhere is a
// product of its own.
void CLinuxDiscovery::ReconcileLoaders(std::vector<DevicePtr>& devices_IO) const {
  for (const InterfacePtr& loader : mLoaderInterfaces) {
    bool found = false;
    for (const DevicePtr& device : devices_IO) {
      bool attached = false;
      if (!device->GetPenInterface() &&
          DoParentsMatch(device, loader, device->GetTouchInterface(), EUPDATE_UNKNOWN)) {
        device->SetPenInterface(loader);
        attached = true;
      } else if (device->GetTouchSupported() && !device->GetTouchInterface() &&
                 DoParentsMatch(device, device->GetPenInterface(), loader, EUPDATE_UNKNOWN)) {
        device->SetTouchInterface(loader);
        attached = true;
      } else if (device->GetBluetoothSupported() && !device->GetBluetoothInterface()) {
        device->SetBluetoothInterface(loader);
        attached = true;
      }
      if (attached) {
        device->SetIsFlashLoader(true);
        found = true;
      }
    }
    if (!found) {
      DevicePtr device =
          GetNewSupportedDevice(Low16(loader->GetVendorId()), Low16(loader->GetProductId()));
      device->SetPenInterface(loader);
      device->SetIsFlashLoader(true);
      devices_IO.push_back(device);
    }
  }
}

bool CLinuxDiscovery::UpdateDevice(const DevicePtr& device_I, const InterfacePtr& interface_I) {
  if (!device_I) return false;
  if (IsPenInterface(device_I, interface_I) && !device_I->GetPenInterface()) {
    device_I->SetPenInterface(interface_I);
    return true;
  }
  if (IsTouchInterface(device_I, interface_I) && !device_I->GetTouchInterface()) {
    device_I->SetTouchInterface(interface_I);
    return true;
  }
  if (IsBluetoothInterface(device_I, interface_I) && !device_I->GetBluetoothInterface()) {
    device_I->SetBluetoothInterface(interface_I);
    return true;
  }
  return false;
}

CLinuxDiscovery::DevicePtr CLinuxDiscovery::GetExistingDevice(unsigned short vendorId_I,
                                                              unsigned short productId_I) const {
  return mDeviceList.GetDevice(vendorId_I, productId_I);
}
