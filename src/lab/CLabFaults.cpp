#include "lab/CLabFaults.h"

#include <algorithm>

namespace {

struct SKindName {
  ELabFaultKind kind;
  const char* name;
};

constexpr SKindName kKindNames[] = {
    {ELabFaultKind::eVanish, "vanish"},
    {ELabFaultKind::eFailRead, "fail-read"},
    {ELabFaultKind::eFailWrite, "fail-write"},
    {ELabFaultKind::eStall, "stall"},
    {ELabFaultKind::eBusy, "busy"},
    {ELabFaultKind::eRefuseSwitch, "refuse-switch"},
    {ELabFaultKind::eBadCrc, "bad-crc"},
    {ELabFaultKind::eFlaky, "flaky"},
    {ELabFaultKind::eNak, "nak"},
    {ELabFaultKind::eStuckBusy, "stuck-busy"},
    {ELabFaultKind::eCrcMismatch, "crc-mismatch"},
    {ELabFaultKind::eRefuseOpen, "refuse-open"},
    {ELabFaultKind::eNotReady, "not-ready"},
    {ELabFaultKind::eStale, "stale"},
    {ELabFaultKind::eNoReply, "no-reply"},
};

bool TakesCount(ELabFaultKind kind_I) {
  return kind_I != ELabFaultKind::eRefuseSwitch && kind_I != ELabFaultKind::eStuckBusy &&
         kind_I != ELabFaultKind::eRefuseOpen;
}

// Counts each countdown down; true when one of them reaches 0.
bool CountDown(std::vector<uint32_t>& countdowns_IO) {
  bool due = false;
  for (uint32_t& countdown : countdowns_IO) {
    if (countdown != 0 && --countdown == 0) due = true;
  }
  std::erase(countdowns_IO, 0u);
  return due;
}

}  // namespace

bool ParseLabFault(const std::string& text_I, SLabFault& fault_O, std::string& error_O) {
  std::string rest = text_I;
  SLabFault fault;
  const size_t colon = rest.find(':');
  if (colon != std::string::npos) {
    fault.board = rest.substr(colon + 1);
    rest.erase(colon);
    if (fault.board.empty()) {
      error_O = "empty board name in \"" + text_I + "\"";
      return false;
    }
  }
  const size_t at = rest.find('@');
  const std::string name = rest.substr(0, at);
  const SKindName* kind = std::find_if(std::begin(kKindNames), std::end(kKindNames),
                                       [&](const SKindName& entry) { return name == entry.name; });
  if (kind == std::end(kKindNames)) {
    error_O = "unknown fault kind \"" + name + "\"";
    return false;
  }
  fault.kind = kind->kind;
  if (!TakesCount(fault.kind)) {
    if (at != std::string::npos) {
      error_O = name + " takes no count";
      return false;
    }
  } else {
    const std::string number = at == std::string::npos ? std::string() : rest.substr(at + 1);
    if (number.empty() || number.size() > 9 ||
        !std::all_of(number.begin(), number.end(), [](char c) { return c >= '0' && c <= '9'; })) {
      error_O = "fault \"" + text_I + "\" needs a count: KIND@N";
      return false;
    }
    fault.count = static_cast<uint32_t>(std::stoul(number));
    if (fault.count == 0) {
      error_O = "fault \"" + text_I + "\" needs a count above 0";
      return false;
    }
  }
  fault_O = fault;
  return true;
}

std::string LabFaultText(const SLabFault& fault_I) {
  std::string text;
  for (const SKindName& entry : kKindNames) {
    if (entry.kind == fault_I.kind) text = entry.name;
  }
  if (TakesCount(fault_I.kind)) {
    text.push_back('@');
    text.append(std::to_string(fault_I.count));
  }
  if (!fault_I.board.empty()) {
    text.push_back(':');
    text.append(fault_I.board);
  }
  return text;
}

void CLabFaults::Add(const SLabFault& fault_I) {
  switch (fault_I.kind) {
    case ELabFaultKind::eVanish: mVanishAfter = fault_I.count; break;
    case ELabFaultKind::eFailRead: mFailReads += fault_I.count; break;
    case ELabFaultKind::eFailWrite: mFailWrites += fault_I.count; break;
    case ELabFaultKind::eStall: mStalls += fault_I.count; break;
    case ELabFaultKind::eBusy: mBusy += fault_I.count; break;
    case ELabFaultKind::eRefuseSwitch: mRefuseSwitch = true; break;
    case ELabFaultKind::eBadCrc: mBadDataReports.push_back(fault_I.count); break;
    case ELabFaultKind::eFlaky: mFlakyOneIn = fault_I.count; break;
    case ELabFaultKind::eNak: mNakBytes.push_back(fault_I.count); break;
    case ELabFaultKind::eStuckBusy: mStuckBusy = true; break;
    case ELabFaultKind::eCrcMismatch: mBadCrcs.push_back(fault_I.count); break;
    case ELabFaultKind::eRefuseOpen: mRefuseOpen = true; break;
    case ELabFaultKind::eNotReady: mNotReady.push_back(fault_I.count); break;
    case ELabFaultKind::eStale: mStale.push_back(fault_I.count); break;
    case ELabFaultKind::eNoReply: mNoReplies += fault_I.count; break;
  }
}

void CLabFaults::AddAt(uint64_t reports_I, const SLabFault& fault_I) {
  if (reports_I <= mReports) {
    Add(fault_I);
    return;
  }
  mPending.emplace_back(reports_I, fault_I);
}

void CLabFaults::Clear() {
  mVanishAfter = 0;
  mVanishDue = false;
  mFailReads = mFailWrites = mStalls = mBusy = 0;
  mRefuseSwitch = false;
  mBadDataReports.clear();
  mFlakyOneIn = 0;
  mNakBytes.clear();
  mStuckBusy = false;
  mBadCrcs.clear();
  mRefuseOpen = false;
  mNotReady.clear();
  mStale.clear();
  mNoReplies = 0;
  mPending.clear();
}

bool CLabFaults::Empty() const {
  return mVanishAfter == 0 && !mVanishDue && mFailReads == 0 && mFailWrites == 0 && mStalls == 0 &&
         mBusy == 0 && !mRefuseSwitch && mBadDataReports.empty() && mFlakyOneIn == 0 &&
         mNakBytes.empty() && !mStuckBusy && mBadCrcs.empty() && !mRefuseOpen &&
         mNotReady.empty() && mStale.empty() && mNoReplies == 0 && mPending.empty();
}

ELabFaultAction CLabFaults::OnReport(bool isRead_I, bool isData_I, bool ownBusy_I) {
  for (auto pending = mPending.begin(); pending != mPending.end();) {
    if (pending->first > mReports) {
      ++pending;
      continue;
    }
    Add(pending->second);
    pending = mPending.erase(pending);
  }
  ++mReports;
  if (mVanishAfter != 0 && --mVanishAfter == 0) mVanishDue = true;

  const bool corrupt = isData_I && CountDown(mBadDataReports);
  if (isRead_I && mNoReplies != 0) {
    --mNoReplies;
    return ELabFaultAction::eNoReply;
  }
  if (isRead_I && mFailReads != 0) {
    --mFailReads;
    return ELabFaultAction::eFail;
  }
  if (!isRead_I && mFailWrites != 0) {
    --mFailWrites;
    return ELabFaultAction::eFail;
  }
  if (mStalls != 0) {
    --mStalls;
    return ELabFaultAction::eStall;
  }
  if (mBusy != 0 && !ownBusy_I) {
    --mBusy;
    return ELabFaultAction::eBusy;
  }
  if (mFlakyOneIn != 0 && mRandom() % mFlakyOneIn == 0) return ELabFaultAction::eFail;
  return corrupt ? ELabFaultAction::eCorrupt : ELabFaultAction::ePass;
}

bool CLabFaults::TakeBusy() {
  if (mBusy == 0) return false;
  --mBusy;
  return true;
}

size_t CLabFaults::CorruptOffset(size_t size_I) {
  return size_I == 0 ? 0 : static_cast<size_t>(mRandom() % size_I);
}

bool CLabFaults::TakeNak() { return CountDown(mNakBytes); }

bool CLabFaults::TakeCrcMismatch() { return CountDown(mBadCrcs); }

bool CLabFaults::TakeNotReady() { return CountDown(mNotReady); }

bool CLabFaults::TakeStale() { return CountDown(mStale); }
