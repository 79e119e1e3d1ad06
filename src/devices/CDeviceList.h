#pragma once
// The ordered list of attached products. Copying a list copies the
// pointers, not the devices.

#include <memory>
#include <string>
#include <vector>

#include "devices/CDevice.h"

class CDeviceList {
 public:
  using DevicePtr = std::shared_ptr<CDevice>;

  CDeviceList() = default;
  CDeviceList(const CDeviceList&) = default;
  CDeviceList& operator=(const CDeviceList&) = default;
  ~CDeviceList() { ClearDeviceList(); }

  void AddDevice(DevicePtr device_I) { mDevices.push_back(std::move(device_I)); }
  void ClearDeviceList() { mDevices.clear(); }
  unsigned int GetDeviceCount() const { return static_cast<unsigned int>(mDevices.size()); }

  DevicePtr GetDevice(unsigned int index_I) const;
  DevicePtr GetDevice(unsigned short vendorId_I, unsigned short productId_I) const;
  // Prints the comparisons it makes to standard output, as it always has.
  DevicePtr GetDevice(const std::string& path_I) const;
  // A device in loader mode wins; else the first device.
  DevicePtr GetBestDevice() const;

  std::string ToString() const;

 private:
  std::vector<DevicePtr> mDevices;
};
