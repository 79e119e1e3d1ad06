#pragma once
// The bulk transport bound to the USB control seam: the touch controller's
// vendor-class interface, reached by control requests on endpoint 0.

#include <memory>
#include <string>

#include "common/TavTypes.h"
#include "flash/CBulkFLDeviceInterface.h"
#include "seams/CUsbControl.h"

class CLinuxBulkFLDeviceInterface : public virtual CBulkFLDeviceInterface {
 public:
  CLinuxBulkFLDeviceInterface(const DeviceInfo& info_I, std::unique_ptr<CUsbControl> usb_I);
  ~CLinuxBulkFLDeviceInterface() override;

  bool Open() override;
  void Close() override;
  // The vector is taken as a control request: byte 0 bmRequestType, 1
  // bRequest, 2 wIndex, 3 wValue, 4 wLength. Nothing else of it is sent,
  // and data the device returns is not copied back.
  bool Write(std::vector<uint8_t>& data_IO) override;
  bool Read(std::vector<uint8_t>& data_IO) override;
  bool GetAttributes() override { return true; }
  std::string GetBasePath(uint8_t topology_I) override;

 protected:
  bool DeviceRequest(uint8_t requestType_I, uint8_t request_I, uint16_t value_I, uint16_t index_I,
                     uint16_t length_I, size_t bufferSize_I) override;

 private:
  bool OpenInterface();
  bool VectorRequest(const std::vector<uint8_t>& data_I);

  std::unique_ptr<CUsbControl> mUsb;
};
