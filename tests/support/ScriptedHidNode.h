#pragma once
// A HID node whose answers a test scripts, recording what was sent.

#include <deque>
#include <functional>
#include <vector>

#include "seams/CHidNode.h"

class ScriptedHidNode : public CHidNode {
 public:
  struct SLog {
    std::vector<std::vector<uint8_t>> sets;
    std::vector<std::vector<uint8_t>> gets;
    int opens = 0;
    int closes = 0;
  };

  explicit ScriptedHidNode(SLog& log_I) : mLog(log_I) {}

  EHidStatus Open(const DeviceInfo&) override {
    ++mLog.opens;
    EHidStatus status = EHidStatus::eSuccess;
    if (!openResults.empty()) {
      status = openResults.front();
      openResults.pop_front();
    }
    mOpen = status == EHidStatus::eSuccess;
    return status;
  }
  void Close() override {
    if (mOpen) ++mLog.closes;
    mOpen = false;
  }
  bool IsOpen() const override { return mOpen; }
  uint16_t GetReleaseNumber() const override { return 0x0123; }
  EHidStatus SetFeatureReport(const std::vector<uint8_t>& report_I) override {
    mLog.sets.push_back(report_I);
    return onSet ? onSet(report_I) : EHidStatus::eSuccess;
  }
  EHidStatus GetFeatureReport(std::vector<uint8_t>& report_IO) override {
    mLog.gets.push_back(report_IO);
    return onGet ? onGet(report_IO) : EHidStatus::eSuccess;
  }

  std::deque<EHidStatus> openResults;
  std::function<EHidStatus(const std::vector<uint8_t>&)> onSet;
  std::function<EHidStatus(std::vector<uint8_t>&)> onGet;

 private:
  SLog& mLog;
  bool mOpen = false;
};
