// The fault matrix: every programming procedure of the lab's products meets
// every fault kind at every report of its sequence (or at a seeded sample
// of them), one fault per cell. A cell passes when the run neither crashes
// nor waits past the procedure's own bounds, ends in the state and with the
// error the controller gives for its outcome, and leaves the board either
// updated or mended by a second run. The table of cells goes to
// fault-matrix.md in the build folder.
//
// TAV_FAULT_MATRIX=full strikes every report; otherwise each kind strikes
// a few reports drawn with the printed seed (TAV_FAULT_MATRIX_SEED gives it
// again). TAV_FAULT_MATRIX_CELL="COLUMN@REPORT" runs that one cell alone.

#include <gtest/gtest.h>

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <map>
#include <mutex>
#include <optional>
#include <random>
#include <set>
#include <sstream>

#include "common/TavLog.h"
#include "firmware/FirmwareFiles.h"
#include "flash/FlashConstants.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabProducts.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "support/LabFixture.h"
#include "update/CLinuxUpdateController.h"

namespace {

// Cells per fault kind in a sampled campaign; a bridge run clocks every
// bit of a whole flash image, so it gets fewer.
constexpr size_t kSampledSteps = 12;
constexpr size_t kSampledBridgeSteps = 2;

// Cells that once failed run in every sampled campaign as well.
const struct {
  const char* procedure;
  const char* column;
  uint64_t report;
} kOnceFailed[] = {
    {"I2C tunnel", "fail-read", 24},  // read as a loader without checksums
    {"FTDI scalar", "fail-write", 264912},  // a lost data byte the block CRC missed
};

struct SProcedure {
  const char* name;
  const char* product;
  const char* kind;    // the board word of SetAutoUpdateFile
  const char* serial;  // the display's serial for the FTDI scalar; null otherwise
  // The procedure never checks the data it sent: under the loader protocol
  // the host compares no sums, and Intel-hex chunks carry none. A byte
  // changed on the way is then programmed and the update succeeds; such a
  // cell counts as unseen, and the second run must still mend the board.
  bool dataUnchecked;
};

const SProcedure kProcedures[] = {
    {"pen S-record, loader protocol", "classic-tablet", "pen", nullptr, true},
    {"pen S-record, non-BL protocol", "wireless-tablet", "pen", nullptr, false},
    {"touch Intel hex", "wireless-tablet", "touch", nullptr, true},
    {"touch, vendor-class interface", "classic-tablet", "touch", nullptr, true},
    {"Bluetooth AB1555", "wireless-tablet", "bluetooth", nullptr, false},
    {"Bluetooth AB1122", "wireless-tablet-1122", "bluetooth", nullptr, false},
    {"HID scalar", "display-hid", "scalar", nullptr, false},
    {"I2C tunnel", "tunnel-tablet", "pen", nullptr, true},
    {"FTDI scalar", "display-ftdi", "scalar", "LABFT0701", false},
};

// Test names and failures name the procedure.
void PrintTo(const SProcedure& procedure_I, std::ostream* out_I) { *out_I << procedure_I.name; }

// The columns, and the lab fault each stands for on a board reached by HID
// or USB control, and on the FTDI bridge. A kind a transport cannot meet
// (a NAK needs an I2C bus of the lab's own) is left out: no cell, "n/a".
struct SFaultColumn {
  const char* name;
  std::optional<ELabFaultKind> hid;
  std::optional<ELabFaultKind> bridge;
};

const SFaultColumn kColumns[] = {
    {"fail-read", ELabFaultKind::eFailRead, ELabFaultKind::eFailRead},
    {"fail-write", ELabFaultKind::eFailWrite, ELabFaultKind::eFailWrite},
    {"stall", ELabFaultKind::eStall, ELabFaultKind::eStall},
    {"busy", ELabFaultKind::eBusy, ELabFaultKind::eNotReady},
    {"NAK", std::nullopt, ELabFaultKind::eNak},
    {"bad CRC", ELabFaultKind::eBadCrc, ELabFaultKind::eCrcMismatch},
    {"vanish", ELabFaultKind::eVanish, ELabFaultKind::eVanish},
    {"no reply", ELabFaultKind::eNoReply, ELabFaultKind::eNoReply},
};

struct SCounts {
  size_t run = 0, updated = 0, recovered = 0, unseen = 0, byIndex = 0, failed = 0;
};

// What the campaign found, procedure by column; written out once at the end.
std::map<std::string, std::map<std::string, SCounts>>& Table() {
  static std::map<std::string, std::map<std::string, SCounts>> table;
  return table;
}

class CTableWriter : public ::testing::Environment {
 public:
  void TearDown() override {
    std::ofstream out(TAV_MATRIX_REPORT);
    out << "# Fault matrix\n\nEach cell: cells run / updated by the faulted run / recovered by a "
           "second run / failed. A + marks cells where a changed byte was programmed unseen, "
           "as the procedure checks no data, and the second run mended the board. "
           "\"By index\": the cut left the scalar without running firmware, so no display "
           "gives its serial; the second run opened the bridge by its index. On the FTDI "
           "scalar, busy is a reply not ready yet and bad CRC a wrong CRC from the scalar's "
           "engine; n/a: the transport has no I2C bus of the lab's own to refuse a byte.\n\n"
           "| procedure |";
    for (const SFaultColumn& column : kColumns) out << ' ' << column.name << " |";
    out << "\n|---|";
    for (size_t i = 0; i < std::size(kColumns); ++i) out << "---|";
    out << '\n';
    for (const SProcedure& procedure : kProcedures) {
      out << "| " << procedure.name << " |";
      for (const SFaultColumn& column : kColumns) {
        const auto& row = Table()[procedure.name];
        const auto cell = row.find(column.name);
        if (cell == row.end()) {
          out << " n/a |";
        } else {
          const SCounts& c = cell->second;
          out << ' ' << c.run << " / " << c.updated << " / " << c.recovered << " / " << c.failed;
          if (c.unseen != 0) out << " (+" << c.unseen << " unseen)";
          if (c.byIndex != 0) out << " (" << c.byIndex << " by index)";
          out << " |";
        }
      }
      out << '\n';
    }
    std::cout << "fault matrix written to " << TAV_MATRIX_REPORT << '\n';
  }
};
const auto* const kTableWriter = ::testing::AddGlobalTestEnvironment(new CTableWriter);

struct SRunOutcome {
  bool updated = false;
  ECONTROLLER_STATE state = ESTATE_NONE;
  std::vector<std::pair<ECONTROLLER_ERROR, std::string>> errors;
  double seconds = 0;  // clock time of the run
  uint64_t reports = 0;
  bool overran = false;
  std::string boardState;  // the board's state file after the run
  std::vector<std::string> violations;
};

class CRecorder : public CUpdateNotifier {
 public:
  void UpdateError(ECONTROLLER_ERROR error_I, const std::string& text_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    errors.emplace_back(error_I, text_I);
  }
  void UpdateStatus(ECONTROLLER_STATE) override {}
  void UpdateProgress(unsigned int) override {}
  std::vector<std::pair<ECONTROLLER_ERROR, std::string>> errors;

 private:
  std::mutex mLock;
};

// The virtual clock of the campaign: a run still sleeping past its bound is
// cut off (its board vanishes), so an endless wait fails its cell instead
// of holding the campaign.
class CBoundedClock : public CVirtualClock {
 public:
  void Sleep(double seconds_I) override {
    CVirtualClock::Sleep(seconds_I);
    if (mOnOverrun && Now() > mDeadline) {
      std::function<void()> onOverrun;
      std::swap(onOverrun, mOnOverrun);
      onOverrun();
    }
  }
  void Arm(double deadline_I, std::function<void()> onOverrun_I) {
    mDeadline = deadline_I;
    mOnOverrun = std::move(onOverrun_I);
  }

 private:
  double mDeadline = 0;
  std::function<void()> mOnOverrun;
};

std::string ReadFile(const std::string& path_I) {
  std::ifstream in(path_I);
  std::stringstream text;
  text << in.rdbuf();
  return text.str();
}

// The entries of two state files that differ, by name: "key size", the
// bytes, an end of line. Whether the board is on the bus is no part of what
// it holds.
std::string DifferingEntries(const std::string& a_I, const std::string& b_I) {
  auto entries = [](const std::string& text_I) {
    std::map<std::string, std::string> entries;
    size_t at = text_I.find('\n') + 1;
    while (at != 0 && at < text_I.size()) {
      const size_t end = text_I.find('\n', at);
      const std::string head = text_I.substr(at, end - at);
      const size_t space = head.rfind(' ');
      const size_t size = std::strtoul(head.c_str() + space + 1, nullptr, 10);
      entries[head.substr(0, space)] = text_I.substr(end + 1, size);
      at = end + 1 + size + 1;
    }
    return entries;
  };
  const auto a = entries(a_I), b = entries(b_I);
  std::string keys;
  for (const auto& [key, value] : a) {
    if (key != "unplugged" && (!b.count(key) || b.at(key) != value)) keys += " " + key;
  }
  return keys;
}

class FaultMatrix : public LabFixture, public ::testing::WithParamInterface<SProcedure> {
 protected:
  void SetUp() override {
    mClock = mBoundedClock;
    LabFixture::SetUp();
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    LabFixture::TearDown();
  }

  std::string BoardName() const {
    const std::string kind = GetParam().kind;
    return std::string(GetParam().product) + "-" + (kind == "bluetooth" ? "bluetooth" : kind);
  }
  bool OnBridge() const { return GetParam().serial != nullptr; }

  // One run of the procedure on a fresh bus: the product as the state
  // folder has it (or factory-fresh), `strike_I` given the board's faults.
  SRunOutcome Run(bool fromFolder_I, double bound_I,
                  const std::function<void(CLabFaults&)>& strike_I = nullptr,
                  bool byIndex_I = false) {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    mBus = CLabBus::Create();
    CLabProducts::Plug(*mBus, GetParam().product);
    if (fromFolder_I) mBus->LoadState(mState.Path("state"));
    const std::shared_ptr<CLabBoard> board = mBus->FindBoard(BoardName());
    if (board == nullptr) {
      ADD_FAILURE() << "no board " << BoardName();
      return {};
    }
    if (strike_I) strike_I(board->Faults());
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
    CI2CConnectorFTDI::SetApi(mApi.get());

    auto discovery = std::make_unique<CLinuxDiscovery>(
        std::make_shared<CLabDeviceRegistry>(mBus),
        [this] { return std::make_unique<CLabHidNode>(mBus); },
        [this] { return std::make_unique<CLabUsbControl>(mBus); });
    discovery->SetConfig(TAV_DATA_DIR "/fw_loader.ini");
    CLinuxUpdateController controller(std::move(discovery));
    CRecorder recorder;
    controller.RegisterCallback(&recorder);
    const int listener = mBus->AddListener([&](const SLabInterface& interface_I, bool attached_I) {
      const std::string path = CFLDeviceInterface::PathFromInfo(interface_I.info);
      attached_I ? controller.DeviceAttach(path) : controller.DeviceDetach(path);
    });

    SRunOutcome outcome;
    const double start = mClock->Now();
    mBoundedClock->Arm(start + bound_I, [&] {
      outcome.overran = true;
      board->Faults().Add({ELabFaultKind::eVanish, 1, ""});
    });
    if (controller.UpdateDeviceList() &&
        controller.SetAutoUpdateFile(GetParam().kind, TAV_LAB_FIRMWARE_DIR)) {
      outcome.updated = OnBridge() ? controller.UpdateScalar(GetParam().serial, 0, byIndex_I, "")
                                   : controller.UpdateDevice();
    }
    outcome.seconds = mClock->Now() - start;
    mBoundedClock->Arm(0, nullptr);
    // A board on its way back to normal mode settles before power goes.
    mClock->Advance(10.0);
    mBus->RemoveListener(listener);
    outcome.state = controller.GetState();
    outcome.errors = recorder.errors;
    outcome.reports = board->Faults().GetReportCount();
    outcome.violations = board->GetViolations();
    EXPECT_TRUE(mBus->SaveState(mState.Path("state")));
    outcome.boardState = ReadFile(board->StatePath(mState.Path("state")));
    return outcome;
  }

  std::shared_ptr<CBoundedClock> mBoundedClock = std::make_shared<CBoundedClock>();
  std::unique_ptr<CLabFTDIExAPI32> mApi;
  CTempFolder mState;
};

// The errors that end a failed update in ESTATE_FAILURE, and the one a
// tunnel that will not switch gives while the state stays where it was.
bool IsFailureError(const std::pair<ECONTROLLER_ERROR, std::string>& error_I) {
  static const std::set<std::pair<ECONTROLLER_ERROR, std::string>> known = {
      {EERROR_PROGRAM, "General Program Failure"},
      {EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode"},
      {EERROR_PROGRAM, "Failed to open device and/or load data"},
  };
  return known.count(error_I) != 0;
}

// Empty when the first run's state and errors are the controller's for
// its outcome; else what is wrong.
std::string StateAndErrorProblem(const SRunOutcome& run_I) {
  std::vector<std::pair<ECONTROLLER_ERROR, std::string>> raised;
  for (const auto& error : run_I.errors) {
    if (error.first != EERROR_INTERFACE) raised.push_back(error);
  }
  if (run_I.updated) {
    if (run_I.state != ESTATE_SUCCESS) return "updated, yet state " + std::to_string(run_I.state);
    if (!raised.empty()) return "updated, yet raised \"" + raised.back().second + "\"";
    return {};
  }
  switch (run_I.state) {
    case ESTATE_FAILURE:
      // A loader interface that cannot be opened fails with no error of its own.
      if (!raised.empty() && !IsFailureError(raised.back()))
        return "failed with \"" + raised.back().second + "\"";
      return {};
    case ESTATE_WAIT_LOADER:
      // The loader never came, or the tunnel would not switch to it.
      for (const auto& error : raised) {
        if (error.second != "I2C Device failed to switch to Loader mode")
          return "left waiting for the loader with \"" + error.second + "\"";
      }
      return {};
    default: return "not updated, in state " + std::to_string(run_I.state);
  }
}

// How long one fault may hold a run beyond its clean time, from the bounds
// the procedures set: both mode waits running out, every try of one command
// exhausting its safe retries with a reply time-out each, and the longest
// busy poll with every read failing (its limit counts passes, and each pass
// runs a whole safe read).
double FaultAllowance() {
  namespace FC = FlashConstants;
  const double modeWaits = 2 * 90 * 1.0;
  double safeRetries = FC::kSafeReopenWait;
  for (int i = 0; i < FC::kSafeTries; ++i) safeRetries += FC::kSafeWaitBase + FC::kSafeWaitStep * i;
  const double timeouts = FC::kSafeTries * 1.0;
  const double command = FC::kCommandTries * (safeRetries + timeouts + FC::kCommandReopenWait);
  const double busyPoll = FC::kBusyPollSixtySeconds * (FC::kBusyPollWait + safeRetries);
  return modeWaits + command + busyPoll;
}

TEST_P(FaultMatrix, EveryFaultAtEveryStepEndsUpdatedOrMendedByASecondRun) {
  const double allowance = FaultAllowance();
  const SRunOutcome clean = Run(false, allowance);
  ASSERT_TRUE(clean.updated) << "the clean run failed";
  ASSERT_TRUE(clean.violations.empty()) << clean.violations.front();
  const double bound = clean.seconds + allowance;
  const std::string updatedState = clean.boardState;

  const char* full = std::getenv("TAV_FAULT_MATRIX");
  const bool everyStep = full != nullptr && std::string(full) == "full";
  const char* seedText = std::getenv("TAV_FAULT_MATRIX_SEED");
  const uint64_t seed =
      seedText != nullptr ? std::strtoull(seedText, nullptr, 0) : std::random_device()() | 1ull;
  std::cout << GetParam().name << ": " << clean.reports << " reports, "
            << (everyStep ? "every step" : "seed " + std::to_string(seed)) << '\n';
  std::mt19937_64 random(seed);
  const char* cellText = std::getenv("TAV_FAULT_MATRIX_CELL");
  const std::string onlyCell = cellText != nullptr ? cellText : "";
  // A replayed cell shows its runs' log.
  const int logOutput = onlyCell.empty() ? 0 : TavLog::AddOutput([](const std::string& line_I) {
    std::fputs(line_I.c_str(), stderr);
  });

  for (const SFaultColumn& column : kColumns) {
    const std::optional<ELabFaultKind> kind = OnBridge() ? column.bridge : column.hid;
    if (!kind) continue;
    SCounts& counts = Table()[GetParam().name][column.name];
    std::vector<uint64_t> steps;
    const size_t sampled = OnBridge() ? kSampledBridgeSteps : kSampledSteps;
    if (!onlyCell.empty()) {
      const size_t at = onlyCell.rfind('@');
      if (onlyCell.substr(0, at) != column.name) continue;
      steps.push_back(std::strtoull(onlyCell.c_str() + at + 1, nullptr, 10));
    } else if (everyStep || clean.reports <= sampled) {
      for (uint64_t step = 0; step < clean.reports; ++step) steps.push_back(step);
    } else {
      for (size_t i = 0; i < sampled; ++i) steps.push_back(random() % clean.reports);
      for (const auto& once : kOnceFailed) {
        if (GetParam().name == std::string(once.procedure) && column.name == std::string(once.column))
          steps.push_back(once.report);
      }
    }
    for (const uint64_t step : steps) {
      const std::string cell = std::string(column.name) + " at report " + std::to_string(step);
      SCOPED_TRACE(cell);
      const bool failedBefore = HasFailure();
      ++counts.run;
      const SRunOutcome first = Run(false, bound, [&](CLabFaults& faults_I) {
        faults_I.AddAt(step, {*kind, 1, ""});
      });
      EXPECT_FALSE(first.overran) << "waited past " << bound << " s";
      EXPECT_LE(first.seconds, bound);
      const std::string problem = StateAndErrorProblem(first);
      EXPECT_TRUE(problem.empty()) << problem;
      const std::string firstLeft = DifferingEntries(updatedState, first.boardState);
      const bool unseen = first.updated && !firstLeft.empty() && GetParam().dataUnchecked &&
                          *kind == ELabFaultKind::eBadCrc;
      bool mended = first.updated && !unseen;
      if (mended) {
        ++counts.updated;
        EXPECT_EQ(firstLeft, "") << "a success that left another image";
      } else {
        SRunOutcome second = Run(true, bound);
        // A scalar cut between erasing and writing its first block runs no
        // firmware, and no display answers with its serial any more.
        const bool lost = OnBridge() && !second.updated && !second.errors.empty() &&
                          second.errors.back().second == "Failed to open device and/or load data";
        if (lost) second = Run(true, bound, nullptr, true);
        EXPECT_TRUE(second.updated)
            << "a second run did not mend the board"
            << (second.errors.empty() ? "" : ": " + second.errors.back().second);
        const std::string secondLeft = DifferingEntries(updatedState, second.boardState);
        EXPECT_EQ(secondLeft, "") << "the second run left another image";
        for (const std::string& violation : second.violations) ADD_FAILURE() << violation;
        mended = second.updated && secondLeft.empty();
        if (mended) ++(unseen ? counts.unseen : lost ? counts.byIndex : counts.recovered);
      }
      if (!mended || HasFailure() != failedBefore) {
        ++counts.failed;
        std::cout << "  failed cell: " << GetParam().name << ", " << cell << '\n';
      }
    }
  }
  if (logOutput != 0) TavLog::RemoveOutput(logOutput);
}

INSTANTIATE_TEST_SUITE_P(EveryProcedure, FaultMatrix, ::testing::ValuesIn(kProcedures),
                         [](const auto& info) {
                           std::string name;
                           for (const char* c = info.param.name; *c != 0; ++c) {
                             if (std::isalnum(static_cast<unsigned char>(*c))) name += *c;
                           }
                           return name;
                         });

}  // namespace
