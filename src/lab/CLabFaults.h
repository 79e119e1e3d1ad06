#pragma once
// The lab's fault wrapper: one per board, it sits between the seam and the
// board and decides, report by report, whether the report reaches the board
// as sent. Faults come from tests or from the command line of a lab run as
// KIND@N (N counted from the moment the fault is added):
//
//   vanish@N      after N more reports the board is unplugged for the rest
//                 of the run; the next run finds it as after a power cycle
//   fail-read@N   the next N reads fail
//   fail-write@N  the next N writes fail
//   stall@N       the next N reports stall; a written report is still
//                 taken by the board first, as real controllers do when
//                 they stall the status stage
//   busy@N        the next N reports meet a busy device: answered busy at
//                 the node, or, on boards with a busy notion of their own
//                 (programming reports, the I2C tunnel), by that notion
//   refuse-switch the board acknowledges mode switches and ignores them
//   bad-crc@N     the Nth data report (a flash block, word or page) arrives
//                 with one payload byte changed
//   flaky@N       each report fails with a chance of 1 in N, drawn from
//                 the wrapper's seeded generator
//   no-reply@N    the next N reads get no answer: a get-report or a control
//                 read runs out its time-out, a bridge read returns nothing
//
// On an FTDI bridge each FT_Write and FT_Read counts as one report, so
// vanish@N there cuts the bridge off after N transfers, mid-block if N says
// so; every call after that fails, and the next run finds the flash as the
// cut left it. Faults of the bridge's scalar:
//   nak@N         the Nth byte the host writes on the bridge's I2C bus
//                 (address bytes too) is not acknowledged, and the device
//                 takes nothing more of that transaction
//   stuck-busy    the scalar MCU's flash busy bit (0x60 bit 0) never
//                 clears once an instruction has run
//   crc-mismatch@N  the Nth CRC the MCU's engine computes is wrong, once
//   refuse-open   FT_OpenEx finds the bridge but cannot open it
//                 (FT_DEVICE_NOT_OPENED)
//   not-ready@N   the Nth reply the host reads is not ready yet: the scalar
//                 sends a zero byte first, and keeps the reply for the
//                 next read
//   stale@N       the Nth reply comes after two stale bytes left on the bus
//
// A fault may name its board: KIND@N:board. The generator is seeded, so a
// run with the same faults and seed fails the same reports. A fault can also
// be held back until the wrapper has seen a number of reports (AddAt), so a
// campaign can strike one step of a sequence.

#include <cstdint>
#include <random>
#include <string>
#include <vector>

enum class ELabFaultKind {
  eVanish,
  eFailRead,
  eFailWrite,
  eStall,
  eBusy,
  eRefuseSwitch,
  eBadCrc,
  eFlaky,
  eNak,
  eStuckBusy,
  eCrcMismatch,
  eRefuseOpen,
  eNotReady,
  eStale,
  eNoReply,
};

struct SLabFault {
  ELabFaultKind kind = ELabFaultKind::eFailRead;
  uint32_t count = 0;
  std::string board;  // empty: every board

  bool operator==(const SLabFault&) const = default;
};

// Parses "KIND@N" or "KIND@N:board" ("refuse-switch", "stuck-busy" and
// "refuse-open" take no number).
// False, with a reason, on anything else.
bool ParseLabFault(const std::string& text_I, SLabFault& fault_O, std::string& error_O);
std::string LabFaultText(const SLabFault& fault_I);

// What the wrapper does with one report.
enum class ELabFaultAction {
  ePass,     // the board takes the report as sent
  eFail,     // the report fails; the board never sees it
  eStall,    // stalled; a written report still reaches the board
  eBusy,     // busy; the board never sees it
  eCorrupt,  // a payload byte is changed before the board sees it
  eNoReply,  // a read that never gets its answer; the board never sees it
};

class CLabFaults {
 public:
  void Add(const SLabFault& fault_I);
  // Adds the fault once `reports_I` reports have passed the wrapper.
  void AddAt(uint64_t reports_I, const SLabFault& fault_I);
  // Reports that have passed the wrapper since it was made.
  uint64_t GetReportCount() const { return mReports; }
  // Answers in which the board told the host to wait (a busy flag, a
  // controller still restarting): polls whose length the chip decides.
  void NoteBusyAnswer() { ++mBusyAnswers; }
  uint64_t GetBusyAnswers() const { return mBusyAnswers; }
  void Clear();
  void SetSeed(uint64_t seed_I) { mRandom.seed(seed_I); }
  bool Empty() const;

  // Decides the fate of one report. `isData_I`: the report carries flash
  // data. `ownBusy_I`: the board answers busy faults itself (TakeBusy).
  ELabFaultAction OnReport(bool isRead_I, bool isData_I, bool ownBusy_I);
  // True once the vanish count has run out; stays true.
  bool VanishDue() const { return mVanishDue; }
  bool RefuseSwitch() const { return mRefuseSwitch; }
  // For boards with their own busy notion: true while busy faults remain,
  // taking one each time.
  bool TakeBusy();
  // Which payload byte to change, below `size_I`.
  size_t CorruptOffset(size_t size_I);
  // One byte on a bridge's I2C bus: true when it is to be refused.
  bool TakeNak();
  bool StuckBusy() const { return mStuckBusy; }
  // One CRC computed: true when it is to come out wrong.
  bool TakeCrcMismatch();
  bool RefuseOpen() const { return mRefuseOpen; }
  // One reply read from the scalar: whether it is not ready, or stale.
  bool TakeNotReady();
  bool TakeStale();

 private:
  uint32_t mVanishAfter = 0;  // 0: no vanish fault
  bool mVanishDue = false;
  uint32_t mFailReads = 0;
  uint32_t mFailWrites = 0;
  uint32_t mStalls = 0;
  uint32_t mBusy = 0;
  bool mRefuseSwitch = false;
  std::vector<uint32_t> mBadDataReports;  // countdowns, one per bad-crc fault
  uint32_t mFlakyOneIn = 0;
  std::vector<uint32_t> mNakBytes;  // countdowns, one per nak fault
  bool mStuckBusy = false;
  std::vector<uint32_t> mBadCrcs;  // countdowns, one per crc-mismatch fault
  bool mRefuseOpen = false;
  std::vector<uint32_t> mNotReady;  // countdowns, one per not-ready fault
  std::vector<uint32_t> mStale;     // countdowns, one per stale fault
  uint32_t mNoReplies = 0;
  uint64_t mReports = 0;
  uint64_t mBusyAnswers = 0;
  std::vector<std::pair<uint64_t, SLabFault>> mPending;  // held back by AddAt
  std::mt19937_64 mRandom{0x7A5Cu};
};
