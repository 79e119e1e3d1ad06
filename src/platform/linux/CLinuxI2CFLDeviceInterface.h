#pragma once
// The I2C transport bound to a HID node: the tunnel master's link is a HID
// feature report.

#include <memory>
#include <string>

#include "common/TavTypes.h"
#include "flash/CI2CFLDeviceInterface.h"
#include "seams/CHidNode.h"

class CLinuxI2CFLDeviceInterface : public virtual CI2CFLDeviceInterface {
 public:
  CLinuxI2CFLDeviceInterface(const DeviceInfo& info_I, std::unique_ptr<CHidNode> node_I);
  ~CLinuxI2CFLDeviceInterface() override;

  bool Open() override;
  void Close() override;
  // Unlike the HID transport's Write, a stall is a failure here.
  bool WriteMaster(std::vector<uint8_t>& data_IO) override;
  bool ReadMaster(std::vector<uint8_t>& data_IO) override;
  bool GetAttributes() override { return true; }
  std::string GetBasePath(uint8_t topology_I) override;
  bool Query() { return true; }

 private:

  std::unique_ptr<CHidNode> mNode;
};
