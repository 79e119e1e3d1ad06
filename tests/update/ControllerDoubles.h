#pragma once
// Test doubles of the controller's contracts: interfaces that record what
// was asked of them, a discovery over a small "bus" of attached devices,
// and a notifier that records everything in order.

#include <fstream>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "devices/CDiscovery.h"
#include "flash/CFLDeviceInterface.h"
#include "update/CLinuxUpdateController.h"
#include "update/CUpdateNotifier.h"

namespace controller_test {

// Calls are recorded as short words in one shared journal, so tests can
// check the order across several interfaces.
class CJournal {
 public:
  void Add(const std::string& entry_I) {
    std::lock_guard<std::mutex> guard(mLock);
    mEntries.push_back(entry_I);
  }
  std::vector<std::string> Entries() const {
    std::lock_guard<std::mutex> guard(mLock);
    return mEntries;
  }
  bool Contains(const std::string& entry_I) const {
    for (const std::string& e : Entries()) {
      if (e == entry_I) return true;
    }
    return false;
  }
  // Index of the first entry equal to `entry_I`, or -1.
  int IndexOf(const std::string& entry_I) const {
    const std::vector<std::string> entries = Entries();
    for (size_t i = 0; i < entries.size(); ++i) {
      if (entries[i] == entry_I) return static_cast<int>(i);
    }
    return -1;
  }

 private:
  mutable std::mutex mLock;
  std::vector<std::string> mEntries;
};

class CFakeInterface : public CFLDeviceInterface {
 public:
  CFakeInterface(std::string name_I, EINTERFACE_TYPE type_I, std::string path_I, CJournal& journal_I)
      : CFLDeviceInterface(type_I), mName(std::move(name_I)), mJournal(journal_I) {
    mPath = std::move(path_I);
  }

  bool Open() override {
    Record("Open");
    return mOpenResult;
  }
  void Close() override { Record("Close"); }
  bool SwitchToBLMode() override {
    Record("SwitchToBLMode");
    if (mOnSwitchTo) mOnSwitchTo();
    return mSwitchToResult;
  }
  bool SwitchFromBLMode(bool save_I) override {
    Record(std::string("SwitchFromBLMode(") + (save_I ? "true" : "false") + ")");
    if (mOnSwitchFrom) mOnSwitchFrom();
    return mSwitchFromResult;
  }
  bool IsAlive() override {
    Record("IsAlive");
    return true;
  }
  void RegisterCallback(CInterfaceNotifier* notifier_I) override {
    Record("RegisterCallback");
    CFLDeviceInterface::RegisterCallback(notifier_I);
  }
  void UnregisterCallback() override {
    Record("UnregisterCallback");
    CFLDeviceInterface::UnregisterCallback();
  }
  void SetProtocolType(EFLProtocolType protocolType_I) override {
    Record("SetProtocolType(" + std::to_string(protocolType_I) + ")");
  }
  std::string ToString() const override { return "fake interface " + mName + "\n"; }
  bool Init(const std::vector<SContinuousDataBlock>& data_I) override {
    size_t bytes = 0;
    for (const SContinuousDataBlock& block : data_I) bytes += block.data.size();
    Record("Init(" + std::to_string(bytes) + " bytes)");
    mBLParams.numFlashBlocks = mReportedBlocks;
    return mInitResult;
  }
  void SetIntelHexData(std::shared_ptr<CIntelHex> data_I) override {
    Record("SetIntelHexData");
    CFLDeviceInterface::SetIntelHexData(std::move(data_I));
  }
  void SetBinaryAiroFlashData(std::shared_ptr<CBinaryAiroFlash> data_I) override {
    Record("SetBinaryAiroFlashData");
    CFLDeviceInterface::SetBinaryAiroFlashData(std::move(data_I));
  }
  void SetScalarBinaryData(std::shared_ptr<CScalarBinary> data_I) override {
    Record("SetScalarBinaryData");
    CFLDeviceInterface::SetScalarBinaryData(std::move(data_I));
  }
  bool ProgramBoard() override {
    Record("ProgramBoard");
    if (mNotifier != nullptr) mNotifier->InterfaceProgress(50);
    if (!mProgramResult && mNotifier != nullptr) mNotifier->InterfaceError("lab: write failed");
    if (mProgramResult) CFLDeviceInterface::UpdateChecksums(0x1111, 0x2222, 0x3333);
    return mProgramResult;
  }
  void UpdateChecksums(uint32_t oldSum_I, uint32_t newSum_I, uint32_t fwSum_I) override {
    Record("UpdateChecksums(" + std::to_string(oldSum_I) + "," + std::to_string(newSum_I) + "," +
           std::to_string(fwSum_I) + ")");
    CFLDeviceInterface::UpdateChecksums(oldSum_I, newSum_I, fwSum_I);
  }

  bool mOpenResult = true;
  bool mSwitchToResult = true;
  bool mSwitchFromResult = true;
  bool mInitResult = true;
  bool mProgramResult = true;
  uint16_t mReportedBlocks = 64;
  std::function<void()> mOnSwitchTo;
  std::function<void()> mOnSwitchFrom;

 private:
  void Record(const std::string& call_I) { mJournal.Add(mName + "." + call_I); }

  std::string mName;
  CJournal& mJournal;
};

// What is attached right now; the discovery copies it into its list.
struct SBus {
  std::mutex lock;
  std::vector<std::shared_ptr<CDevice>> devices;
  bool failGenerate = false;

  void Set(std::vector<std::shared_ptr<CDevice>> devices_I) {
    std::lock_guard<std::mutex> guard(lock);
    devices = std::move(devices_I);
  }
};

class CFakeDiscovery : public CDiscovery {
 public:
  explicit CFakeDiscovery(std::shared_ptr<SBus> bus_I) : mBus(std::move(bus_I)) {}
  bool GenerateDeviceList() override {
    std::lock_guard<std::mutex> guard(mBus->lock);
    mDeviceList.ClearDeviceList();
    if (mBus->failGenerate) return false;
    for (const auto& device : mBus->devices) mDeviceList.AddDevice(device);
    return true;
  }

 private:
  std::shared_ptr<SBus> mBus;
};

// Records states, errors and logs in one sequence: "state:N", "error:N:text"
// and "log:text"; progress separately.
class CRecordingNotifier : public CUpdateNotifier {
 public:
  void UpdateLog(const std::string& text_I) override { Add("log:" + text_I); }
  void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) override {
    Add("error:" + std::to_string(error_I) + ":" + text_I);
  }
  void UpdateStatus(ECONTROLLER_STATE state_I) override {
    Add("state:" + std::to_string(state_I));
    if (mOnStatus) mOnStatus(state_I);
  }
  void UpdateProgress(unsigned int percent_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    mProgress.push_back(percent_I);
  }

  std::vector<std::string> Events() const {
    std::lock_guard<std::mutex> guard(mLock);
    return mEvents;
  }
  // Only the entries that start with `prefix_I` ("state:", "error:").
  std::vector<std::string> Only(const std::string& prefix_I) const {
    std::vector<std::string> result;
    for (const std::string& e : Events()) {
      if (e.rfind(prefix_I, 0) == 0) result.push_back(e);
    }
    return result;
  }
  bool Logged(const std::string& text_I) const {
    for (const std::string& e : Events()) {
      if (e == "log:" + text_I) return true;
    }
    return false;
  }
  int CountLogged(const std::string& text_I) const {
    int count = 0;
    for (const std::string& e : Events()) count += (e == "log:" + text_I) ? 1 : 0;
    return count;
  }
  std::vector<unsigned int> Progress() const {
    std::lock_guard<std::mutex> guard(mLock);
    return mProgress;
  }

  std::function<void(ECONTROLLER_STATE)> mOnStatus;

 private:
  void Add(const std::string& event_I) {
    std::lock_guard<std::mutex> guard(mLock);
    mEvents.push_back(event_I);
  }
  mutable std::mutex mLock;
  std::vector<std::string> mEvents;
  std::vector<unsigned int> mProgress;
};

// Writes a small, valid S-record file (S1 data records and an S9 end).
inline void WriteSRecFile(const std::string& path_I, uint16_t address_I, size_t bytes_I) {
  std::ofstream out(path_I);
  auto hex2 = [](unsigned value_I) {
    static const char* digits = "0123456789ABCDEF";
    return std::string{digits[(value_I >> 4) & 0xF], digits[value_I & 0xF]};
  };
  for (size_t offset = 0; offset < bytes_I; offset += 16) {
    const size_t count = std::min<size_t>(16, bytes_I - offset);
    const unsigned address = address_I + static_cast<unsigned>(offset);
    unsigned sum = static_cast<unsigned>(count + 3) + (address >> 8) + (address & 0xFF);
    std::string line = "S1" + hex2(static_cast<unsigned>(count + 3)) + hex2(address >> 8) +
                       hex2(address & 0xFF);
    for (size_t i = 0; i < count; ++i) {
      const unsigned byte = static_cast<unsigned>((offset + i) * 7 & 0xFF);
      sum += byte;
      line += hex2(byte);
    }
    line += hex2(~sum & 0xFF);
    out << line << "\n";
  }
  out << "S9030000FC\n";
}

}  // namespace controller_test
