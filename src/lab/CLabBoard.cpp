#include "lab/CLabBoard.h"

#include "common/CClock.h"
#include "lab/CLabBus.h"

std::vector<SLabInterface> SLabIdentity::Interfaces() const {
  std::vector<SLabInterface> interfaces;
  for (const auto& [page, usage] : usages) {
    SLabInterface entry;
    entry.info.vendorId = vendorId;
    entry.info.productId = productId;
    entry.info.usage = usage;
    entry.info.usagePage = page;
    entry.link = link;
    entry.release = release;
    interfaces.push_back(entry);
  }
  for (const auto& [page, usage] : hidUsages) {
    SLabInterface entry;
    entry.info = DeviceInfo{vendorId, productId, 0, usage, page};
    entry.link = ELabLink::eHid;
    entry.release = release;
    interfaces.push_back(entry);
  }
  return interfaces;
}

CLabBoard::CLabBoard(std::string name_I) : mName(std::move(name_I)) {}

double CLabBoard::Now() const { return CClock::Get()->Now(); }

void CLabBoard::Trace(SLabTraceEntry::EKind kind_I, std::vector<uint8_t> bytes_I, size_t length_I,
                      bool ok_I) {
  if (!mTraceEnabled) return;
  std::lock_guard<std::mutex> guard(mTraceLock);
  mTrace.push_back({kind_I, std::move(bytes_I), length_I, ok_I});
}

void CLabBoard::AfterReport() {
  if (mFaults.VanishDue() && !mUnplugged && mBus != nullptr) mBus->Vanish(*this);
  WriteChanges();
}

EHidStatus CLabBoard::SetFeature(const DeviceInfo& interface_I,
                                 const std::vector<uint8_t>& report_I) {
  if (report_I.empty()) return EHidStatus::eOther;
  ++mReportCount;
  const std::pair<size_t, size_t> data = DataRange(report_I);
  const bool isData = data.second > data.first;
  std::vector<uint8_t> received = report_I;
  EHidStatus status = EHidStatus::eSuccess;
  switch (mFaults.OnReport(false, isData, AnswersBusyItself())) {
    case ELabFaultAction::eFail: status = EHidStatus::eOther; break;
    case ELabFaultAction::eBusy: status = EHidStatus::eBusy; break;
    case ELabFaultAction::eNoReply: status = EHidStatus::eTimeout; break;
    case ELabFaultAction::eStall:
      OnSetFeature(interface_I, received);
      status = EHidStatus::eStall;
      break;
    case ELabFaultAction::eCorrupt:
      received[data.first + mFaults.CorruptOffset(data.second - data.first)] ^= 0x5A;
      [[fallthrough]];
    case ELabFaultAction::ePass:
      status = OnSetFeature(interface_I, received) ? EHidStatus::eSuccess : EHidStatus::eStall;
      break;
  }
  const size_t length = received.size();
  Trace(SLabTraceEntry::eSetFeature, std::move(received), length, status == EHidStatus::eSuccess);
  AfterReport();
  return status;
}

EHidStatus CLabBoard::GetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO) {
  if (report_IO.empty()) return EHidStatus::eOther;
  ++mReportCount;
  EHidStatus status = EHidStatus::eSuccess;
  switch (mFaults.OnReport(true, false, AnswersBusyItself())) {
    case ELabFaultAction::eFail: status = EHidStatus::eOther; break;
    case ELabFaultAction::eBusy: status = EHidStatus::eBusy; break;
    case ELabFaultAction::eStall: status = EHidStatus::eStall; break;
    case ELabFaultAction::eNoReply: status = EHidStatus::eTimeout; break;
    case ELabFaultAction::eCorrupt:
    case ELabFaultAction::ePass:
      status = OnGetFeature(interface_I, report_IO) ? EHidStatus::eSuccess : EHidStatus::eStall;
      break;
  }
  Trace(SLabTraceEntry::eGetFeature, report_IO, report_IO.size(), status == EHidStatus::eSuccess);
  AfterReport();
  return status;
}

EUsbStatus CLabBoard::Control(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                              uint16_t index_I, std::vector<uint8_t>& data_IO,
                              size_t& transferred_O) {
  ++mReportCount;
  transferred_O = 0;
  const bool isRead = (requestType_I & 0x80) != 0;
  EUsbStatus status = EUsbStatus::eSuccess;
  auto answer = [&]() {
    return OnControl(requestType_I, request_I, value_I, index_I, data_IO, transferred_O)
               ? EUsbStatus::eSuccess
               : EUsbStatus::eStall;
  };
  switch (mFaults.OnReport(isRead, false, AnswersBusyItself())) {
    case ELabFaultAction::eFail: status = EUsbStatus::eOther; break;
    case ELabFaultAction::eBusy: status = EUsbStatus::eBusy; break;
    case ELabFaultAction::eNoReply: status = EUsbStatus::eTimeout; break;
    case ELabFaultAction::eStall:
      if (!isRead) answer();
      status = EUsbStatus::eStall;
      break;
    case ELabFaultAction::eCorrupt:
    case ELabFaultAction::ePass: status = answer(); break;
  }
  std::vector<uint8_t> bytes{requestType_I,
                             request_I,
                             static_cast<uint8_t>(value_I),
                             static_cast<uint8_t>(value_I >> 8),
                             static_cast<uint8_t>(index_I),
                             static_cast<uint8_t>(index_I >> 8),
                             static_cast<uint8_t>(data_IO.size()),
                             static_cast<uint8_t>(data_IO.size() >> 8)};
  bytes.insert(bytes.end(), data_IO.begin(), data_IO.end());
  Trace(SLabTraceEntry::eControl, std::move(bytes), data_IO.size(), status == EUsbStatus::eSuccess);
  AfterReport();
  return status;
}

bool CLabBoard::OnSetFeature(const DeviceInfo&, const std::vector<uint8_t>&) { return false; }
bool CLabBoard::OnGetFeature(const DeviceInfo&, std::vector<uint8_t>&) { return false; }
bool CLabBoard::OnControl(uint8_t, uint8_t, uint16_t, uint16_t, std::vector<uint8_t>&, size_t&) {
  return false;
}
std::pair<size_t, size_t> CLabBoard::DataRange(const std::vector<uint8_t>&) const { return {0, 0}; }

void CLabBoard::Reenumerate(std::function<void()> boot_I) {
  if (mBus == nullptr) {
    boot_I();
    return;
  }
  mReenumerating = true;
  mBus->ScheduleReenumerate(*this, std::move(boot_I));
}

std::string CLabBoard::StatePath(const std::string& folder_I) const {
  return folder_I + "/" + mName + ".state";
}

bool CLabBoard::SaveState(const std::string& folder_I) const {
  if (mJournal && mJournalFolder == folder_I) {
    mJournal->State().PutNumber("unplugged", mUnplugged ? 1 : 0);
    Save(mJournal->State());
    return mJournal->Fold();
  }
  CLabStateFile state;
  state.PutNumber("unplugged", mUnplugged ? 1 : 0);
  Save(state);
  return state.Save(StatePath(folder_I));
}

bool CLabBoard::LoadState(const std::string& folder_I) {
  CLabStateFile state;
  if (!state.Load(StatePath(folder_I))) return false;
  // What the last run wrote through after its last snapshot: all of it, if
  // that run was killed.
  CLabStateJournal::Replay(CLabStateJournal::LogPath(StatePath(folder_I)), state);
  // A board that was unplugged comes back as after a power cycle.
  Load(state, state.GetNumber("unplugged", 0) != 0);
  return true;
}

bool CLabBoard::WriteThrough(const std::string& folder_I) {
  mJournal = std::make_unique<CLabStateJournal>();
  mJournalFolder = folder_I;
  mJournal->State().PutNumber("unplugged", mUnplugged ? 1 : 0);
  Save(mJournal->State());
  if (mJournal->Open(StatePath(folder_I))) return true;
  mJournal.reset();
  return false;
}

void CLabBoard::WriteChanges() {
  if (!mJournal) return;
  const uint64_t revision = StateRevision();
  if (revision != 0 && revision == mWrittenRevision && mUnplugged == mWrittenUnplugged) return;
  mWrittenRevision = revision;
  mWrittenUnplugged = mUnplugged;
  mJournal->State().PutNumber("unplugged", mUnplugged ? 1 : 0);
  Save(mJournal->State());
  mJournal->Record();
}
