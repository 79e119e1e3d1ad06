#include "lab/CLabSession.h"

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "common/TavLog.h"

CLabSession::CLabSession(std::shared_ptr<CLabBus> bus_I, CLabOptions options_I)
    : mBus(std::move(bus_I)), mOptions(std::move(options_I)) {}

CLabSession::~CLabSession() { Finish(); }

int CLabSession::Start() {
  // The boards already took times from the clock they were plugged in under.
  if (mOptions.GetFast()) CClock::Set(std::make_shared<CVirtualClock>(CClock::Get()->Now()));
  const int loaded = mBus->LoadState(mOptions.GetStateFolder());
  mBus->AddFaults(mOptions.GetFaults(), mOptions.GetSeed());
  if (!mBus->WriteThrough(mOptions.GetStateFolder())) {
    TavLog::Error("Lab state not written through to %s\n", mOptions.GetStateFolder().c_str());
  }
  for (const SLabFault& fault : mOptions.GetFaults()) {
    TavLog::Info("Lab fault: %s\n", LabFaultText(fault).c_str());
  }
  mStarted = true;
  mStartTime = CClock::Get()->Now();
  mStartWaited = CClock::Get()->GetTimeWaited();
  return loaded;
}

bool CLabSession::Finish() {
  if (!mStarted) return true;
  mStarted = false;
  for (const auto& board : mBus->GetBoards()) {
    TavLog::Info("Lab board %s: %llu reports\n", board->GetName().c_str(),
                 static_cast<unsigned long long>(board->Faults().GetReportCount()));
    if (board->Faults().GetBusyAnswers() != 0) {
      TavLog::Info("Lab board %s: %llu busy answers\n", board->GetName().c_str(),
                   static_cast<unsigned long long>(board->Faults().GetBusyAnswers()));
    }
  }
  TavLog::Info("Lab clock: %.3f s\n", CClock::Get()->Now() - mStartTime);
  TavLog::Info("Lab waits: %.3f s\n", CClock::Get()->GetTimeWaited() - mStartWaited);
  const bool saved = mBus->SaveState(mOptions.GetStateFolder());
  if (!saved) TavLog::Error("Lab state not saved to %s\n", mOptions.GetStateFolder().c_str());
  return saved;
}
