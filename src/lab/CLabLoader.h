#pragma once
// The loader command set as a controller answers it: one engine for both
// protocol variants (the loader's own report ids, or the non-BL ids that
// normal firmware answers), with one flash per CPU. Reports of a length the
// command does not have are stalled and recorded as violations, so tests
// see every host mistake.
//
// The engine only answers; the board it belongs to decides what a reset
// means (see TakeResetRequest).

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "lab/CLabFlash.h"
#include "lab/CLabStateFile.h"
#include "lab/LabTypes.h"

enum class ELabProtocol { eLoader, eNonBL };

// Why the loader last started, as the start-reason command reports it.
enum ELabStartReason : uint8_t {
  eLabStartPowerOn = 0,
  eLabStartInvalidImage = 1,
  eLabStartHostRequest = 2,
};

class CLabLoader {
 public:
  CLabLoader(ELabProtocol protocol_I, std::vector<SLabFlashLayout> cpus_I, uint16_t deviceInfo_I);

  ELabProtocol GetProtocol() const { return mProtocol; }

  // True when the report id is one of this engine's commands.
  bool Knows(uint8_t reportId_I) const;
  // A set report: true when taken, false when stalled.
  bool SetReport(const std::vector<uint8_t>& report_I);
  // A get report: fills the vector from byte 0; false when stalled.
  bool GetReport(std::vector<uint8_t>& report_IO);

  // The length of get report `reportId_I` with the current flash; 0 for a
  // report that is not one of the engine's get reports.
  size_t GetReportLength(uint8_t reportId_I) const;

  // The payload of a report that carries flash data, as [begin, end);
  // empty for any other report.
  std::pair<size_t, size_t> DataRange(const std::vector<uint8_t>& report_I) const;

  // A reset command arrived since the last call; `save_O` tells which.
  bool TakeResetRequest(bool& save_O);

  // Every CPU's image is valid.
  bool IsImageValid() const;
  // The release the image names, in any CPU's flash.
  std::optional<uint16_t> FindImageRelease() const;
  void Boot(ELabStartReason reason_I);
  void FactoryImage(uint32_t seed_I);

  size_t GetCpuCount() const { return mCpus.size(); }
  CLabFlash& GetCpu(size_t index_I) { return mCpus.at(index_I); }
  const CLabFlash& GetCpu(size_t index_I) const { return mCpus.at(index_I); }
  uint32_t GetCurrentCpu() const { return mCurrentCpu; }

  // Every command as the engine received it.
  const std::vector<SLabTraceEntry>& GetTrace() const { return mTrace; }
  void ClearTrace() { mTrace.clear(); }
  void SetTraceEnabled(bool enabled_I) { mTraceEnabled = enabled_I; }
  // The engine's own violations, then each CPU's flash violations.
  std::vector<std::string> GetViolations() const;

  void Save(CLabStateFile& state_IO, const std::string& prefix_I) const;
  void Load(const CLabStateFile& state_I, const std::string& prefix_I);

 private:
  // The logical command of a report id under this engine's variant.
  std::optional<uint32_t> CommandOf(uint8_t reportId_I, size_t length_I) const;
  bool Expect(const std::vector<uint8_t>& report_I, size_t length_I, const char* name_I);
  void Trace(SLabTraceEntry::EKind kind_I, const std::vector<uint8_t>& bytes_I, bool ok_I);
  CLabFlash& Current() { return mCpus[mCurrentCpu]; }
  const CLabFlash& Current() const { return mCpus[mCurrentCpu]; }

  ELabProtocol mProtocol;
  std::vector<CLabFlash> mCpus;
  uint16_t mDeviceInfo;
  uint32_t mCurrentCpu = 0;
  uint32_t mReadAddress = 0;
  uint8_t mStartReason = eLabStartPowerOn;
  bool mResetRequested = false;
  bool mResetSave = false;
  bool mTraceEnabled = true;
  std::vector<SLabTraceEntry> mTrace;
  std::vector<std::string> mViolations;
};
