#include "lab/CLabBus.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "common/CClock.h"

namespace {

// A read that gets no answer holds its caller this long, as the kernel's
// wait on a feature report or a control transfer does.
constexpr double kReportTimeoutSeconds = 1.0;

bool MakeFolders(const std::string& path_I) {
  for (size_t slash = path_I.find('/', 1);; slash = path_I.find('/', slash + 1)) {
    const std::string part = path_I.substr(0, slash);
    if (!part.empty() && mkdir(part.c_str(), 0700) != 0 && errno != EEXIST) return false;
    if (slash == std::string::npos) return true;
  }
}

}  // namespace

std::shared_ptr<CLabBus> CLabBus::Create() { return std::shared_ptr<CLabBus>(new CLabBus()); }

CLabBus::~CLabBus() {
  for (const std::shared_ptr<CLabBoard>& board : mBoards) board->mBus = nullptr;
}

void CLabBus::Plug(std::shared_ptr<CLabBoard> board_I) {
  uint32_t location = 0;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    location = 0x01000000u | (static_cast<uint32_t>(mBoards.size() + 1) << 20);
  }
  Plug(std::move(board_I), location);
}

void CLabBus::Plug(std::shared_ptr<CLabBoard> board_I, uint32_t locationId_I) {
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    board_I->mBus = this;
    board_I->mLocationId = locationId_I;
    mBoards.push_back(board_I);
    if (!board_I->mUnplugged) Attach(*board_I);
  }
  DeliverEvents();
}

std::vector<std::shared_ptr<CLabBoard>> CLabBus::GetBoards() const {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  return mBoards;
}

std::shared_ptr<CLabBoard> CLabBus::FindBoard(const std::string& name_I) const {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  for (const std::shared_ptr<CLabBoard>& board : mBoards) {
    if (board->GetName() == name_I) return board;
  }
  return nullptr;
}

std::vector<SLabInterface> CLabBus::InterfacesOf(const CLabBoard& board_I) const {
  std::vector<SLabInterface> interfaces = board_I.GetInterfaces();
  for (SLabInterface& entry : interfaces) entry.info.locationId = board_I.mLocationId;
  return interfaces;
}

std::vector<SLabInterface> CLabBus::ListInterfaces() const {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  std::vector<SLabInterface> all;
  for (const std::shared_ptr<CLabBoard>& board : mBoards) {
    if (!board->mAttached) continue;
    std::vector<SLabInterface> interfaces = InterfacesOf(*board);
    all.insert(all.end(), interfaces.begin(), interfaces.end());
  }
  return all;
}

int CLabBus::AddListener(Listener listener_I) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  mListeners[mNextListener] = std::move(listener_I);
  return mNextListener++;
}

void CLabBus::RemoveListener(int handle_I) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  mListeners.erase(handle_I);
}

void CLabBus::SetReenumerationDelays(double detach_I, double boot_I) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  mDetachDelay = detach_I;
  mBootDelay = boot_I;
}

void CLabBus::Attach(CLabBoard& board_I) {
  board_I.mAttached = true;
  ++board_I.mGeneration;
  for (const SLabInterface& entry : InterfacesOf(board_I)) mPending.push_back({entry, true});
}

void CLabBus::Detach(CLabBoard& board_I) {
  if (!board_I.mAttached) return;
  for (const SLabInterface& entry : InterfacesOf(board_I)) mPending.push_back({entry, false});
  board_I.mAttached = false;
  ++board_I.mGeneration;
  mHeld.erase(&board_I);
}

void CLabBus::ScheduleReenumerate(CLabBoard& board_I, std::function<void()> boot_I) {
  std::weak_ptr<CLabBus> weakBus = weak_from_this();
  CLabBoard* board = &board_I;
  // Both steps are timed from now, and run on the clock's timer thread;
  // the bus may be gone by then.
  CClock::Get()->Schedule(mDetachDelay, [weakBus, board]() {
    std::shared_ptr<CLabBus> bus = weakBus.lock();
    if (!bus) return;
    {
      std::lock_guard<std::recursive_mutex> guard(bus->mLock);
      if (board->mUnplugged) return;
      bus->Detach(*board);
      board->WriteChanges();
    }
    bus->DeliverEvents();
  });
  CClock::Get()->Schedule(mDetachDelay + mBootDelay, [weakBus, board, boot_I]() {
    std::shared_ptr<CLabBus> bus = weakBus.lock();
    if (!bus) return;
    {
      std::lock_guard<std::recursive_mutex> guard(bus->mLock);
      if (board->mUnplugged) return;
      board->mReenumerating = false;
      boot_I();
      bus->Attach(*board);
      board->WriteChanges();
    }
    bus->DeliverEvents();
  });
}

void CLabBus::Vanish(CLabBoard& board_I) {
  Detach(board_I);
  board_I.mUnplugged = true;
  board_I.mReenumerating = false;
}

void CLabBus::DeliverEvents() {
  std::vector<SEvent> events;
  std::vector<Listener> listeners;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    // After most reports nothing happened: no copy of the listeners then.
    if (mPending.empty()) return;
    events.swap(mPending);
    for (const auto& [handle, listener] : mListeners) listeners.push_back(listener);
  }
  for (const SEvent& event : events) {
    for (const Listener& listener : listeners) listener(event.interface, event.attached);
  }
}

bool CLabBus::SaveState(const std::string& folder_I) const {
  if (!MakeFolders(folder_I)) return false;
  std::lock_guard<std::recursive_mutex> guard(mLock);
  bool saved = true;
  for (const std::shared_ptr<CLabBoard>& board : mBoards)
    saved = board->SaveState(folder_I) && saved;
  return saved;
}

bool CLabBus::WriteThrough(const std::string& folder_I) {
  if (!MakeFolders(folder_I)) return false;
  std::lock_guard<std::recursive_mutex> guard(mLock);
  bool opened = true;
  for (const std::shared_ptr<CLabBoard>& board : mBoards)
    opened = board->WriteThrough(folder_I) && opened;
  return opened;
}

int CLabBus::LoadState(const std::string& folder_I) {
  int loaded = 0;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    for (const std::shared_ptr<CLabBoard>& board : mBoards) {
      if (!board->LoadState(folder_I)) continue;
      ++loaded;
      // The board comes back on the bus in the mode it now has.
      Detach(*board);
      board->mUnplugged = false;
      Attach(*board);
    }
  }
  DeliverEvents();
  return loaded;
}

void CLabBus::AddFaults(const std::vector<SLabFault>& faults_I, uint64_t seed_I) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  for (const std::shared_ptr<CLabBoard>& board : mBoards) {
    board->Faults().SetSeed(seed_I);
    for (const SLabFault& fault : faults_I) {
      if (fault.board.empty() || fault.board == board->GetName()) board->Faults().Add(fault);
    }
  }
}

bool CLabBus::FindInterface(const DeviceInfo& info_I, ELabLink link_I, bool matchUsage_I,
                            SBinding& binding_O) const {
  for (const std::shared_ptr<CLabBoard>& board : mBoards) {
    if (!board->mAttached) continue;
    for (const SLabInterface& entry : InterfacesOf(*board)) {
      const DeviceInfo& info = entry.info;
      const bool same =
          entry.link == link_I && info.vendorId == info_I.vendorId &&
          info.productId == info_I.productId && info.locationId == info_I.locationId &&
          (!matchUsage_I || (info.usage == info_I.usage && info.usagePage == info_I.usagePage));
      if (!same) continue;
      binding_O.board = board;
      binding_O.generation = board->mGeneration;
      binding_O.info = info;
      binding_O.link = link_I;
      return true;
    }
  }
  return false;
}

EHidStatus CLabBus::OpenHid(const DeviceInfo& info_I, SBinding& binding_O) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  SBinding found;
  if (!FindInterface(info_I, ELabLink::eHid, true, found)) return EHidStatus::eGone;
  auto held = mHeld.equal_range(found.board.get());
  for (auto entry = held.first; entry != held.second; ++entry) {
    if (entry->second == found.info) return EHidStatus::eBusy;
  }
  mHeld.emplace(found.board.get(), found.info);
  binding_O = found;
  return EHidStatus::eSuccess;
}

EUsbStatus CLabBus::OpenUsb(const DeviceInfo& info_I, SBinding& binding_O) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  SBinding found;
  if (!FindInterface(info_I, ELabLink::eUsbVendor, false, found)) return EUsbStatus::eGone;
  auto held = mHeld.equal_range(found.board.get());
  for (auto entry = held.first; entry != held.second; ++entry) {
    if (entry->second == found.info) return EUsbStatus::eBusy;
  }
  mHeld.emplace(found.board.get(), found.info);
  binding_O = found;
  return EUsbStatus::eSuccess;
}

void CLabBus::Release(SBinding& binding_IO) {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  if (binding_IO.board && Holds(binding_IO)) {
    auto held = mHeld.equal_range(binding_IO.board.get());
    for (auto entry = held.first; entry != held.second; ++entry) {
      if (entry->second == binding_IO.info) {
        mHeld.erase(entry);
        break;
      }
    }
  }
  binding_IO = SBinding();
}

bool CLabBus::Holds(const SBinding& binding_I) const {
  return binding_I.board && binding_I.board->mAttached &&
         binding_I.board->mGeneration == binding_I.generation;
}

bool CLabBus::IsCurrent(const SBinding& binding_I) const {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  return Holds(binding_I);
}

uint16_t CLabBus::ReleaseNumberOf(const SBinding& binding_I) const {
  std::lock_guard<std::recursive_mutex> guard(mLock);
  if (!Holds(binding_I)) return 0;
  for (const SLabInterface& entry : InterfacesOf(*binding_I.board)) {
    if (entry.info == binding_I.info) return entry.release;
  }
  return 0;
}

EHidStatus CLabBus::SetFeature(const SBinding& binding_I, const std::vector<uint8_t>& report_I) {
  EHidStatus status = EHidStatus::eGone;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    if (Holds(binding_I)) status = binding_I.board->SetFeature(binding_I.info, report_I);
  }
  DeliverEvents();
  return status;
}

EHidStatus CLabBus::GetFeature(const SBinding& binding_I, std::vector<uint8_t>& report_IO) {
  EHidStatus status = EHidStatus::eGone;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    if (Holds(binding_I)) status = binding_I.board->GetFeature(binding_I.info, report_IO);
  }
  DeliverEvents();
  if (status == EHidStatus::eTimeout) TavSleep(kReportTimeoutSeconds);
  return status;
}

EUsbStatus CLabBus::Control(const SBinding& binding_I, uint8_t requestType_I, uint8_t request_I,
                            uint16_t value_I, uint16_t index_I, std::vector<uint8_t>& data_IO,
                            size_t& transferred_O) {
  EUsbStatus status = EUsbStatus::eGone;
  transferred_O = 0;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    if (Holds(binding_I)) {
      status = binding_I.board->Control(requestType_I, request_I, value_I, index_I, data_IO,
                                        transferred_O);
    }
  }
  DeliverEvents();
  if (status == EUsbStatus::eTimeout) TavSleep(kReportTimeoutSeconds);
  return status;
}

bool CLabBus::WithBoard(const SBinding& binding_I, const std::function<void(CLabBoard&)>& work_I) {
  bool held = false;
  bool pending = false;
  {
    std::lock_guard<std::recursive_mutex> guard(mLock);
    held = Holds(binding_I);
    if (held) work_I(*binding_I.board);
    // A bridge's transfers come by the hundred thousand and hardly ever
    // change the bus: then the lock is not taken again to find that out.
    pending = !mPending.empty();
  }
  if (pending) DeliverEvents();
  return held;
}
