#pragma once
// Discovery over the device registry seam: the registry's HID interfaces
// and USB devices become transports, the transports are sorted into roles
// by the supported-device configuration, and the roles are reconciled into
// one CDevice per product.
//
// The run chooses what stands behind the seams: the Linux registry with
// hidraw nodes and libusb, or the lab bus with its boards. Discovery cannot
// tell them apart. No interface is opened during a scan.
//
// Besides the HID and vendor-class passes, the HID interfaces are also tried
// as I2C tunnel masters, since a board configured as "I2C" is reached
// through a HID interface and would otherwise never be found.

#include <functional>
#include <memory>
#include <vector>

#include "devices/CDiscovery.h"
#include "seams/CDeviceRegistry.h"
#include "seams/CHidNode.h"
#include "seams/CUsbControl.h"
#include "update/UpdateTypes.h"

class CFLDeviceInterface;

class CLinuxDiscovery : public CDiscovery {
 public:
  using InterfacePtr = std::shared_ptr<CFLDeviceInterface>;
  using DevicePtr = std::shared_ptr<CDevice>;
  using HidNodeFactory = std::function<std::unique_ptr<CHidNode>()>;
  using UsbControlFactory = std::function<std::unique_ptr<CUsbControl>()>;

  CLinuxDiscovery(std::shared_ptr<CDeviceRegistry> registry_I, HidNodeFactory makeHidNode_I,
                  UsbControlFactory makeUsbControl_I);
  ~CLinuxDiscovery() override = default;

  bool GenerateDeviceList() override;

  // Attaches the interface to the first board of the device it fits that
  // has none yet: pen, touch, then Bluetooth. The scalar is not tried.
  bool UpdateDevice(const DevicePtr& device_I, const InterfacePtr& interface_I);
  DevicePtr GetExistingDevice(unsigned short vendorId_I, unsigned short productId_I) const;

  // The role tests: usage, usage page, vendor id, product id and interface
  // type of the interface against the board's members.
  static bool IsPenInterface(const DevicePtr& device_I, const InterfacePtr& interface_I);
  static bool IsTouchInterface(const DevicePtr& device_I, const InterfacePtr& interface_I);
  static bool IsBluetoothInterface(const DevicePtr& device_I, const InterfacePtr& interface_I);
  static bool IsScalarInterface(const DevicePtr& device_I, const InterfacePtr& interface_I);
  // Whether two interfaces belong to one product, with the topology of the
  // board that `type_I` names for the second.
  static bool DoParentsMatch(const DevicePtr& device_I, const InterfacePtr& first_I,
                             const InterfacePtr& second_I, EUPDATE_TYPE type_I);

 protected:
  void GetHIDDevices();
  void GetBulkDevices();
  void ProcessDevicePaths(EINTERFACE_TYPE interfaceType_I, const std::vector<DeviceInfo>& infos_I);
  InterfacePtr GetNewInterface(EINTERFACE_TYPE interfaceType_I, const DeviceInfo& info_I) const;
  DevicePtr GetNewSupportedDevice(unsigned short vendorId_I, unsigned short productId_I) const;
  void ReconcileDeviceList();

 private:
  void ClearRoleLists();
  // The steps of ReconcileDeviceList, each over the devices made so far.
  void ReconcilePens(std::vector<DevicePtr>& devices_IO) const;
  void ReconcileTouches(std::vector<DevicePtr>& devices_IO) const;
  void ReconcileBluetooths(std::vector<DevicePtr>& devices_IO) const;
  void ReconcileScalars(std::vector<DevicePtr>& devices_IO) const;
  void ReconcileLoaders(std::vector<DevicePtr>& devices_IO) const;

  std::shared_ptr<CDeviceRegistry> mRegistry;
  HidNodeFactory mMakeHidNode;
  UsbControlFactory mMakeUsbControl;

  // Alive for the length of one scan.
  std::vector<InterfacePtr> mPenInterfaces;
  std::vector<InterfacePtr> mTouchInterfaces;
  std::vector<InterfacePtr> mBluetoothInterfaces;
  std::vector<InterfacePtr> mScalarInterfaces;
  std::vector<InterfacePtr> mLoaderInterfaces;
};
