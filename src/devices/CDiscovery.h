#pragma once
// Builds the list of attached products from the interfaces the device
// registry reports, and searches it.

#include <memory>
#include <string>

#include "devices/CDeviceList.h"

class CDiscovery {
 public:
  CDiscovery() = default;
  virtual ~CDiscovery() = default;

  void SetConfig(const std::string& path_I) { mConfigPath = path_I; }
  std::string GetConfig() const { return mConfigPath; }

  // Rebuilds the list from what is attached.
  virtual bool GenerateDeviceList() = 0;

  CDeviceList GetDeviceList() const { return mDeviceList; }
  std::shared_ptr<CDevice> GetBestDevice() const { return mDeviceList.GetBestDevice(); }
  std::shared_ptr<CDevice> FindDevice(unsigned short vendorId_I, unsigned short productId_I) const {
    return mDeviceList.GetDevice(vendorId_I, productId_I);
  }
  std::shared_ptr<CDevice> FindDevice(const std::string& path_I) const {
    return mDeviceList.GetDevice(path_I);
  }

 protected:
  std::string mConfigPath;
  CDeviceList mDeviceList;
};
