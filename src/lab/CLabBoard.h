#pragma once
// The base of every emulated board: what the bus and the seam forms need
// of it. A board shows interfaces on the bus, answers reports through the
// fault wrapper, keeps a trace of every report it saw, re-enumerates when
// its mode changes, and saves its state to the lab's state folder.
//
// Threads: a board is only ever called with its bus's lock held; it never
// locks anything itself.

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "lab/CLabFaults.h"
#include "lab/CLabStateFile.h"
#include "lab/CLabStateJournal.h"
#include "lab/LabTypes.h"
#include "seams/CHidNode.h"
#include "seams/CUsbControl.h"

class CLabBus;

// The identity a board shows in one of its modes.
struct SLabIdentity {
  uint16_t vendorId = 0;
  uint16_t productId = 0;
  ELabLink link = ELabLink::eHid;
  // One interface per pair: (usage page, usage). Vendor-class USB
  // interfaces have no usage: one pair of zeroes.
  std::vector<std::pair<uint16_t, uint16_t>> usages;
  // HID collections a vendor-class device shows beside its vendor interface,
  // as a touch controller shows its touch input: (usage page, usage).
  std::vector<std::pair<uint16_t, uint16_t>> hidUsages;
  uint16_t release = 0;

  std::vector<SLabInterface> Interfaces() const;
};

class CLabBoard {
 public:
  explicit CLabBoard(std::string name_I);
  virtual ~CLabBoard() = default;
  CLabBoard(const CLabBoard&) = delete;
  CLabBoard& operator=(const CLabBoard&) = delete;

  const std::string& GetName() const { return mName; }

  // The interfaces of the current mode, location not filled in; none while
  // the board is between modes.
  virtual std::vector<SLabInterface> GetInterfaces() const = 0;
  // As after plugging in: the mode follows from the image.
  virtual void PowerOn() = 0;

  // The seam entry points: each report goes through the fault wrapper, is
  // traced as it arrived, then answered by the board.
  EHidStatus SetFeature(const DeviceInfo& interface_I, const std::vector<uint8_t>& report_I);
  EHidStatus GetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO);
  EUsbStatus Control(uint8_t requestType_I, uint8_t request_I, uint16_t value_I, uint16_t index_I,
                     std::vector<uint8_t>& data_IO, size_t& transferred_O);

  // The length of get report `reportId_I` as the board's report descriptor
  // declares it, for a link that passes no length with its request (uhid);
  // 0 for a report the board does not declare.
  virtual size_t GetFeatureLength(uint8_t /*reportId_I*/) const { return 0; }

  CLabFaults& Faults() { return mFaults; }
  // A copy: the board is driven from the seam's thread while tests read it.
  std::vector<SLabTraceEntry> GetTrace() const {
    std::lock_guard<std::mutex> guard(mTraceLock);
    return mTrace;
  }
  void ClearTrace() {
    std::lock_guard<std::mutex> guard(mTraceLock);
    mTrace.clear();
  }
  void SetTraceEnabled(bool enabled_I) { mTraceEnabled = enabled_I; }
  uint64_t GetReportCount() const { return mReportCount; }
  // Rules of the protocol or of the flash that the host broke.
  virtual std::vector<std::string> GetViolations() const { return mViolations; }
  void ClearViolations() { mViolations.clear(); }

  // The board's file in a state folder.
  std::string StatePath(const std::string& folder_I) const;
  // While the board writes through to `folder_I`, folds its log instead.
  bool SaveState(const std::string& folder_I) const;
  // False, leaving the board as it is, when the folder has no state of it.
  bool LoadState(const std::string& folder_I);
  // From now on every change goes to the folder as it happens, after each
  // report and each re-enumeration.
  bool WriteThrough(const std::string& folder_I);
  // Writes what changed since the last call; nothing unless writing through.
  void WriteChanges();

  // Set by the bus.
  bool IsAttached() const { return mAttached; }
  bool IsUnplugged() const { return mUnplugged; }
  uint32_t GetLocationId() const { return mLocationId; }
  uint64_t GetGeneration() const { return mGeneration; }

 protected:
  // The board's answers: false stalls the report.
  virtual bool OnSetFeature(const DeviceInfo& interface_I, const std::vector<uint8_t>& report_I);
  virtual bool OnGetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO);
  virtual bool OnControl(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                         uint16_t index_I, std::vector<uint8_t>& data_IO, size_t& transferred_O);
  // Where a report carries flash data, as [begin, end); empty otherwise.
  virtual std::pair<size_t, size_t> DataRange(const std::vector<uint8_t>& report_I) const;
  // Boards with a busy notion of their own take busy faults themselves.
  virtual bool AnswersBusyItself() const { return false; }

  virtual void Save(CLabStateFile& state_IO) const = 0;
  virtual void Load(const CLabStateFile& state_I, bool powerCycled_I) = 0;
  // A number that goes up whenever what Save writes changes, so that
  // writing through can skip a board that did not change; 0, the default,
  // means the board keeps none and is compared after every report.
  virtual uint64_t StateRevision() const { return 0; }

  // Drops off the bus, runs `boot_I`, and comes back with the interfaces
  // of the mode it then has. The delays are the bus's.
  void Reenumerate(std::function<void()> boot_I);
  bool IsReenumerating() const { return mReenumerating; }
  void Violation(const std::string& text_I) { mViolations.push_back(text_I); }
  double Now() const;
  // After each report: a board whose vanish fault is due drops off the bus.
  void AfterReport();

 private:
  friend class CLabBus;
  void Trace(SLabTraceEntry::EKind kind_I, std::vector<uint8_t> bytes_I, size_t length_I,
             bool ok_I);

  std::string mName;
  CLabFaults mFaults;
  mutable std::mutex mTraceLock;
  std::vector<SLabTraceEntry> mTrace;
  bool mTraceEnabled = true;
  uint64_t mReportCount = 0;
  std::vector<std::string> mViolations;

  CLabBus* mBus = nullptr;
  bool mAttached = false;
  bool mUnplugged = false;
  bool mReenumerating = false;
  uint32_t mLocationId = 0;
  uint64_t mGeneration = 0;
  std::unique_ptr<CLabStateJournal> mJournal;
  std::string mJournalFolder;
  uint64_t mWrittenRevision = 0;
  bool mWrittenUnplugged = false;
};
