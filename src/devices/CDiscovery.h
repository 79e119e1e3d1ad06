#pragma once
// Builds the list of attached products from the interfaces the device
// registry reports, and searches it. The base reads the configuration and
// keeps the list; a platform form fills the list from what is attached.

#include <memory>
#include <string>

#include "devices/CDeviceList.h"
#include "devices/CSupportedDeviceInfo.h"

class CDiscovery {
 public:
  CDiscovery() = default;
  virtual ~CDiscovery() = default;

  void SetConfig(const std::string& path_I) { mSupportedDeviceInfo.SetConfigPath(path_I); }
  std::string GetConfig() const { return mSupportedDeviceInfo.GetConfigPath(); }

  // Reads the configuration unless an earlier read gave products, and empties
  // the list. Always true.
  virtual bool GenerateDeviceList();

  CDeviceList GetDeviceList() const { return mDeviceList; }
  std::shared_ptr<CDevice> GetBestDevice() const { return mDeviceList.GetBestDevice(); }
  std::shared_ptr<CDevice> FindDevice(unsigned short vendorId_I, unsigned short productId_I) const {
    return mDeviceList.GetDevice(vendorId_I, productId_I);
  }
  std::shared_ptr<CDevice> FindDevice(const std::string& path_I) const {
    return mDeviceList.GetDevice(path_I);
  }

  const CSupportedDeviceInfo& GetSupportedDeviceInfo() const { return mSupportedDeviceInfo; }

 protected:
  CSupportedDeviceInfo mSupportedDeviceInfo;
  CDeviceList mDeviceList;
};
