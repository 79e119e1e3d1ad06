#pragma once
// The HID transport bound to a HID node: loader commands as feature
// reports. The node is the Linux hidraw form in a normal run and the lab's
// board in a lab run.

#include <memory>
#include <string>

#include "common/TavTypes.h"
#include "flash/CHIDFLDeviceInterface.h"
#include "seams/CHidNode.h"

class CLinuxHIDFLDeviceInterface : public virtual CHIDFLDeviceInterface {
 public:
  // Without a node every report "succeeds" with nothing sent, as an
  // interface that was never given a device does.
  CLinuxHIDFLDeviceInterface(const DeviceInfo& info_I, std::unique_ptr<CHidNode> node_I);
  ~CLinuxHIDFLDeviceInterface() override;

  // An interface that answers stays as it is; otherwise it is opened anew,
  // with one more try after 2 s when another holder has it.
  bool Open() override;
  void Close() override;
  // A stalled report counts as written, and only on a write.
  bool Write(std::vector<uint8_t>& data_IO) override;
  bool Read(std::vector<uint8_t>& data_IO) override;
  bool GetAttributes() override;
  std::string GetBasePath(uint8_t topology_I) override;
  bool Query() { return true; }

 private:
  bool OpenInterface(const DeviceInfo& info_I);

  std::unique_ptr<CHidNode> mNode;
};
