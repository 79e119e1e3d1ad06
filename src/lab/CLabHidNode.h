#pragma once
// The lab form of the HID node seam: the interface of a board on the lab
// bus. A node opened on one enumeration of a board is gone once the board
// drops off the bus, as a hidraw node is.

#include <memory>

#include "lab/CLabBus.h"
#include "seams/CHidNode.h"

class CLabHidNode : public CHidNode {
 public:
  explicit CLabHidNode(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}
  ~CLabHidNode() override { Close(); }

  EHidStatus Open(const DeviceInfo& info_I) override;
  void Close() override;
  bool IsOpen() const override { return mOpen; }
  uint16_t GetReleaseNumber() const override;
  EHidStatus SetFeatureReport(const std::vector<uint8_t>& report_I) override;
  EHidStatus GetFeatureReport(std::vector<uint8_t>& report_IO) override;

 private:
  std::shared_ptr<CLabBus> mBus;
  CLabBus::SBinding mBinding;
  bool mOpen = false;
};
