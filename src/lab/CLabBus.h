#pragma once
// The lab's bus: the boards plugged into it, the interfaces they show, and
// attach and detach as boards re-enumerate. It registers boards the way
// hardware appears to the device registry: a list of interfaces as
// DeviceInfo (vendor, product, location, usage, usage page) and events when
// they come and go.
//
// Locations: the board plugged in k-th (from 0) sits on bus 1, port k + 1,
// so its location id is 0x01000000 | (k + 1) << 20, the same in every mode,
// unless the board is plugged in at a location given with it.
//
// Threads: every entry takes the bus's lock; listeners are called after it
// is released, on the thread that caused the event (a report's caller, or
// the clock's timer thread for re-enumeration). Re-enumeration is timed on
// the process clock, so under a virtual clock it costs no real time.

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "lab/CLabBoard.h"
#include "lab/LabTypes.h"
#include "seams/CHidNode.h"
#include "seams/CUsbControl.h"

class CLabBus : public std::enable_shared_from_this<CLabBus> {
 public:
  using Listener = std::function<void(const SLabInterface& interface_I, bool attached_I)>;

  // What a seam form holds while it has an interface open.
  struct SBinding {
    std::shared_ptr<CLabBoard> board;
    uint64_t generation = 0;
    DeviceInfo info;
    ELabLink link = ELabLink::eHid;
  };

  static std::shared_ptr<CLabBus> Create();
  ~CLabBus();

  // Plugs a board in: it gets its location and attaches as it stands.
  void Plug(std::shared_ptr<CLabBoard> board_I);
  // Plugs a board in at a location of the caller's choosing: a board behind
  // a product's own hub (bus 1, root port p, hub port q: 0x01000000 | p << 20
  // | q << 16). The caller keeps locations apart.
  void Plug(std::shared_ptr<CLabBoard> board_I, uint32_t locationId_I);
  std::vector<std::shared_ptr<CLabBoard>> GetBoards() const;
  std::shared_ptr<CLabBoard> FindBoard(const std::string& name_I) const;

  // The attached interfaces, locations filled in.
  std::vector<SLabInterface> ListInterfaces() const;
  int AddListener(Listener listener_I);
  void RemoveListener(int handle_I);

  // How long a re-enumerating board stays off the bus: it drops off after
  // `detach_I` seconds and is back `boot_I` seconds later.
  void SetReenumerationDelays(double detach_I, double boot_I);

  // Every board's state into, or from, a state folder (created if needed).
  bool SaveState(const std::string& folder_I) const;
  // Boards with a saved state take it; returns how many did.
  int LoadState(const std::string& folder_I);
  // Every board writes its state through to the folder from now on, so a
  // run that is killed leaves the boards as the kill found them.
  bool WriteThrough(const std::string& folder_I);
  // Gives every board the faults meant for it.
  void AddFaults(const std::vector<SLabFault>& faults_I, uint64_t seed_I);

  // The seam forms' side. Open fails with eGone when nothing attached
  // matches and eBusy when another binding holds the interface.
  EHidStatus OpenHid(const DeviceInfo& info_I, SBinding& binding_O);
  EUsbStatus OpenUsb(const DeviceInfo& info_I, SBinding& binding_O);
  void Release(SBinding& binding_IO);
  uint16_t ReleaseNumberOf(const SBinding& binding_I) const;
  // The bound board is still attached in the enumeration it was bound in.
  bool IsCurrent(const SBinding& binding_I) const;
  EHidStatus SetFeature(const SBinding& binding_I, const std::vector<uint8_t>& report_I);
  EHidStatus GetFeature(const SBinding& binding_I, std::vector<uint8_t>& report_IO);
  EUsbStatus Control(const SBinding& binding_I, uint8_t requestType_I, uint8_t request_I,
                     uint16_t value_I, uint16_t index_I, std::vector<uint8_t>& data_IO,
                     size_t& transferred_O);
  // For seam forms whose traffic is not reports (the FTDI bridge): runs
  // `work_I` on the bound board with the lock held, and delivers the events
  // it caused after. False, without running it, once the binding no longer
  // holds.
  bool WithBoard(const SBinding& binding_I, const std::function<void(CLabBoard&)>& work_I);

 private:
  friend class CLabBoard;
  struct SEvent {
    SLabInterface interface;
    bool attached;
  };

  CLabBus() = default;
  std::vector<SLabInterface> InterfacesOf(const CLabBoard& board_I) const;
  bool Holds(const SBinding& binding_I) const;
  bool FindInterface(const DeviceInfo& info_I, ELabLink link_I, bool matchUsage_I,
                     SBinding& binding_O) const;
  void Attach(CLabBoard& board_I);
  void Detach(CLabBoard& board_I);
  void ScheduleReenumerate(CLabBoard& board_I, std::function<void()> boot_I);
  void Vanish(CLabBoard& board_I);
  void DeliverEvents();

  mutable std::recursive_mutex mLock;
  std::vector<std::shared_ptr<CLabBoard>> mBoards;
  std::map<int, Listener> mListeners;
  int mNextListener = 1;
  std::vector<SEvent> mPending;
  std::multimap<const CLabBoard*, DeviceInfo> mHeld;
  double mDetachDelay = 0.1;
  double mBootDelay = 0.5;
};
