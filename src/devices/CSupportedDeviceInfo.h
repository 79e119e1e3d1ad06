#pragma once
// The supported products, read from the device configuration: a JSON array
// with one object per product (or per product's loader identity). Each
// product is stored under the plain sum of vendor and product id of each of
// its boards, so discovery can look an attached interface up by its ids.

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "common/TavTypes.h"
#include "devices/CDevice.h"

class CSettingsArray;
class CSettingsMap;

class CSupportedDeviceInfo {
 public:
  using DeviceMap = std::map<uint32_t, CDevice>;

  void SetConfigPath(const std::string& path_I) { mConfigPath = path_I; }
  const std::string& GetConfigPath() const { return mConfigPath; }

  // Rebuilds the map from the document at the configuration path; false when
  // the document could not be read or describes no product.
  bool ParseConfig();
  void Clear() { mSupportedDevices.clear(); }
  bool IsValid() const { return !mSupportedDevices.empty(); }
  // The last ParseConfig found a list of products, even an empty one ("[]").
  bool WasRead() const { return mRead; }

  DeviceMap ParseDevices(std::shared_ptr<CSettingsArray> array_I);
  CDevice ParseBoards(std::shared_ptr<CSettingsMap> map_I);

  static uint32_t ConvertHexParam(const std::string& text_I, uint32_t default_I);
  static EINTERFACE_TYPE ConvertInterfaceParam(const std::string& text_I,
                                               EINTERFACE_TYPE default_I);

  // The product stored under vendorId_I + productId_I, or an invalid device.
  CDevice FindDevice(uint32_t vendorId_I, uint32_t productId_I) const;
  // One copy per key, ascending: a product under several keys comes several times.
  std::vector<CDevice> GetAllDevices() const;
  std::string ToString() const;

 private:
  bool mRead = false;
  DeviceMap mSupportedDevices;
  std::string mConfigPath = "./fw_loader.ini";
};
