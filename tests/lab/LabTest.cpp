// The lab's own parts: the fault wrapper, the flash model's rules, the bus,
// and the state folder.

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <thread>

#include "common/CClock.h"
#include "lab/CLabBluetooth.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabFlash.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabI2CMaster.h"
#include "lab/CLabOptions.h"
#include "lab/CLabPenController.h"
#include "lab/CLabScalarHid.h"
#include "lab/CLabSession.h"
#include "lab/CLabStateFile.h"
#include "lab/LabCrc.h"
#include "support/LabFixture.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<uint8_t>;

TEST(LabFaults, ParsingTheCommandLineForm) {
  SLabFault fault;
  std::string error;
  ASSERT_TRUE(ParseLabFault("vanish@12", fault, error));
  EXPECT_EQ(fault, (SLabFault{ELabFaultKind::eVanish, 12, ""}));
  ASSERT_TRUE(ParseLabFault("bad-crc@3:bluetooth", fault, error));
  EXPECT_EQ(fault, (SLabFault{ELabFaultKind::eBadCrc, 3, "bluetooth"}));
  ASSERT_TRUE(ParseLabFault("refuse-switch", fault, error));
  EXPECT_EQ(fault.kind, ELabFaultKind::eRefuseSwitch);
  for (const char* text :
       {"fail-read@1", "fail-write@2", "stall@3", "busy@4", "flaky@5", "refuse-switch:pen",
        "no-reply@6", "nak@2", "stuck-busy", "crc-mismatch@2", "refuse-open"}) {
    ASSERT_TRUE(ParseLabFault(text, fault, error)) << text;
    EXPECT_EQ(LabFaultText(fault), text);
  }
  for (const char* text : {"melt@3", "vanish", "vanish@", "vanish@0", "vanish@x1", "stall@-2",
                           "refuse-switch@2", "busy@3:", "vanish@99999999999", "stuck-busy@2"}) {
    error.clear();
    EXPECT_FALSE(ParseLabFault(text, fault, error)) << text;
    EXPECT_FALSE(error.empty()) << text;
  }
}

TEST(LabFaults, EachKindMeetsOnlyItsReports) {
  CLabFaults faults;
  faults.Add({ELabFaultKind::eFailRead, 2, ""});
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::ePass);
  EXPECT_EQ(faults.OnReport(true, false, false), ELabFaultAction::eFail);
  EXPECT_EQ(faults.OnReport(true, false, false), ELabFaultAction::eFail);
  EXPECT_EQ(faults.OnReport(true, false, false), ELabFaultAction::ePass);

  faults.Add({ELabFaultKind::eBadCrc, 2, ""});
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::ePass) << "not data";
  EXPECT_EQ(faults.OnReport(false, true, false), ELabFaultAction::ePass);
  EXPECT_EQ(faults.OnReport(false, true, false), ELabFaultAction::eCorrupt);
  EXPECT_EQ(faults.OnReport(false, true, false), ELabFaultAction::ePass);

  faults.Add({ELabFaultKind::eBusy, 1, ""});
  EXPECT_EQ(faults.OnReport(false, false, true), ELabFaultAction::ePass) << "board's own busy";
  EXPECT_TRUE(faults.TakeBusy());
  EXPECT_FALSE(faults.TakeBusy());

  faults.Add({ELabFaultKind::eNoReply, 1, ""});
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::ePass) << "a write";
  EXPECT_EQ(faults.OnReport(true, false, false), ELabFaultAction::eNoReply);

  // Held back until the given report, counted from the wrapper's start.
  faults.AddAt(faults.GetReportCount() + 2, {ELabFaultKind::eFailWrite, 1, ""});
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::ePass);
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::ePass);
  EXPECT_EQ(faults.OnReport(false, false, false), ELabFaultAction::eFail);

  faults.Add({ELabFaultKind::eVanish, 2, ""});
  faults.OnReport(true, false, false);
  EXPECT_FALSE(faults.VanishDue());
  faults.OnReport(false, false, false);
  EXPECT_TRUE(faults.VanishDue());
  EXPECT_FALSE(faults.Empty());
  faults.Clear();
  EXPECT_TRUE(faults.Empty());
}

TEST(LabFaults, FlakyFailuresFollowTheSeed) {
  auto pattern = [](uint64_t seed_I) {
    CLabFaults faults;
    faults.SetSeed(seed_I);
    faults.Add({ELabFaultKind::eFlaky, 3, ""});
    std::string failures;
    for (int i = 0; i < 64; ++i) {
      failures += faults.OnReport(i % 2 == 0, false, false) == ELabFaultAction::eFail ? 'x' : '.';
    }
    return failures;
  };
  EXPECT_EQ(pattern(7), pattern(7));
  EXPECT_NE(pattern(7), pattern(8));
  const std::string failures = pattern(7);
  const auto count = std::count(failures.begin(), failures.end(), 'x');
  EXPECT_GT(count, 8);
  EXPECT_LT(count, 40);
}

TEST(LabFlash, ProgrammingRulesAndTheValidityOfAnImage) {
  CLabFlash flash(SLabFlashLayout::Uniform(0x1000, 256, 4, 1, 64, 4));
  flash.FactoryImage(1);
  EXPECT_TRUE(flash.IsImageValid());
  EXPECT_EQ(flash.GetRomMagicWord(), CLabFlash::kValidMagicWord);

  // Programming clears bits only; over unerased bytes it is a violation.
  const Bytes zeroes(4, 0x00);
  ASSERT_TRUE(flash.Erase(1));
  EXPECT_TRUE(flash.Program(0x1100, zeroes.data(), 4));
  EXPECT_TRUE(flash.GetViolations().empty());
  const Bytes ones(4, 0xFF);
  EXPECT_TRUE(flash.Program(0x1100, ones.data(), 4));
  EXPECT_EQ(flash.GetViolations().size(), 1u) << "the bytes cannot become 0xFF again";
  EXPECT_FALSE(flash.IsImageValid()) << "block 1 no longer matches its stored checksum";
  const Bytes pattern{0x0F, 0xF0, 0x3C, 0xC3};
  ASSERT_TRUE(flash.Erase(2));
  flash.Program(0x1200, pattern.data(), 4);
  const Bytes other{0xF0, 0x0F, 0xFF, 0xFF};
  flash.Program(0x1200, other.data(), 4);
  EXPECT_EQ(Bytes(flash.GetBlockContent(2).begin(), flash.GetBlockContent(2).begin() + 4),
            (Bytes{0x00, 0x00, 0x3C, 0xC3}));
  ASSERT_EQ(flash.GetViolations().size(), 2u);

  // The loader's own block and the space outside the blocks are refused.
  EXPECT_FALSE(flash.Erase(0));
  EXPECT_FALSE(flash.Program(0x1000, zeroes.data(), 4));
  EXPECT_FALSE(flash.Program(0x2000, zeroes.data(), 4));
  EXPECT_FALSE(flash.Program(0x11FE, zeroes.data(), 4)) << "across a block's end";
  EXPECT_EQ(flash.GetViolations().size(), 6u);

  // A second erase of a block still blank is needless.
  ASSERT_TRUE(flash.Erase(3));
  ASSERT_TRUE(flash.Erase(3));
  EXPECT_EQ(flash.GetNeedlessErases(), 1u);

  // The commit, not the host, decides the magic word.
  flash.SetMagicWord(0x12345678);
  flash.CommitChecksums();
  EXPECT_EQ(flash.GetRomMagicWord(), 0u) << "stored checksums do not match";
  for (uint32_t i = 0; i < 4; ++i) flash.CalculateChecksum(i);
  flash.SetMagicWord(0);
  flash.CommitChecksums();
  EXPECT_EQ(flash.GetRomMagicWord(), CLabFlash::kValidMagicWord);
  EXPECT_TRUE(flash.IsImageValid());

  // Working copy versus ROM: a restart forgets what was not committed.
  flash.SetChecksum(2, 0);
  flash.Boot();
  EXPECT_EQ(flash.GetChecksum(2), flash.ContentChecksum(2));
}

TEST(LabCrc, TheChipsCheckValues) {
  const uint8_t check[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  EXPECT_EQ(LabCrc::BluetoothPage(check, 9), 0x45);
  EXPECT_EQ(LabCrc::ScalarBlock(check, 9), 0xF4);
  const std::vector<uint8_t> zeroes(256, 0x00);
  EXPECT_EQ(LabCrc::BluetoothPage(zeroes.data(), zeroes.size()), 0x00);
}

class LabBus : public LabFixture {
 protected:
  // Runs `body_I` in a started session with a state folder of its own; the
  // session logs its summary as it ends.
  void InSession(const std::function<void()>& body_I) {
    const std::filesystem::path folder =
        std::filesystem::temp_directory_path() / ("tavik-lab-summary-" + std::to_string(::getpid()));
    CLabOptions options;
    options.SetStateFolder(folder.string());
    {
      CLabSession session(mBus, options);
      session.Start();
      body_I();
    }
    std::filesystem::remove_all(folder);
  }
};

// A programming-report board as a host would drive it, report by report.
TEST_F(LabBus, AProgrammingBoardRefusesABadPageAndStaysInvalid) {
  auto scalar = std::make_shared<CLabScalarHid>();
  mBus->Plug(scalar);
  CLabHidNode node(mBus);
  ASSERT_EQ(node.Open(Listed(*scalar)), EHidStatus::eSuccess);
  auto frame = [](uint8_t phase_I) {
    Bytes report(512, 0xFF);
    report[0] = 0xE4;
    report[1] = 4;
    report[2] = phase_I;
    return report;
  };
  auto status = [&]() {
    Bytes report(512, 0);
    report[0] = 0xE4;
    EXPECT_EQ(node.GetFeatureReport(report), EHidStatus::eSuccess);
    EXPECT_EQ(Bytes(report.begin(), report.begin() + 2), (Bytes{0xE4, 4}));
    return report[3];
  };
  auto block = [&](uint32_t offset_I, uint8_t fill_I, bool goodCrc_I) {
    Bytes report = frame(2);
    report[3] = static_cast<uint8_t>(offset_I >> 16);
    report[4] = static_cast<uint8_t>(offset_I >> 8);
    report[5] = static_cast<uint8_t>(offset_I);
    std::fill(report.begin() + 7, report.begin() + 263, fill_I);
    report[6] = static_cast<uint8_t>(LabCrc::ScalarBlock(&report[7], 256) ^ (goodCrc_I ? 0 : 1));
    return report;
  };

  EXPECT_TRUE(scalar->IsImageValid());
  ASSERT_EQ(node.SetFeatureReport(frame(1)), EHidStatus::eSuccess);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusBusy) << "erasing";
  TavSleep(0.3);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusReady);
  EXPECT_FALSE(scalar->IsImageValid()) << "the start invalidates";
  ASSERT_EQ(node.SetFeatureReport(block(0x100, 0x11, true)), EHidStatus::eSuccess);
  TavSleep(0.1);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusReady);
  EXPECT_EQ(scalar->GetImage()[0x100], 0x11);
  ASSERT_EQ(node.SetFeatureReport(block(0x200, 0x22, false)), EHidStatus::eSuccess);
  TavSleep(0.1);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusRefused);
  EXPECT_EQ(scalar->GetImage()[0x200], 0xFF) << "a refused block is not written";
  ASSERT_EQ(node.SetFeatureReport(frame(3)), EHidStatus::eSuccess);
  EXPECT_FALSE(scalar->IsImageValid()) << "an end after a refusal stores no sum";
  EXPECT_EQ(scalar->GetRefusals(), 1u);

  // A report while busy is a violation, answered until the next start.
  ASSERT_EQ(node.SetFeatureReport(frame(1)), EHidStatus::eSuccess);
  ASSERT_EQ(node.SetFeatureReport(block(0, 0x33, true)), EHidStatus::eSuccess);
  EXPECT_EQ(scalar->GetViolations().size(), 1u);
  TavSleep(0.3);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusBadFrame);

  // A clean pass makes the image valid again.
  ASSERT_EQ(node.SetFeatureReport(frame(1)), EHidStatus::eSuccess);
  TavSleep(0.3);
  ASSERT_EQ(node.SetFeatureReport(block(0, 0x33, true)), EHidStatus::eSuccess);
  TavSleep(0.1);
  ASSERT_EQ(node.SetFeatureReport(frame(3)), EHidStatus::eSuccess);
  EXPECT_TRUE(scalar->IsImageValid());

  // Busy faults show in byte 3, for the poll to wait out.
  TavSleep(0.3);
  scalar->Faults().Add({ELabFaultKind::eBusy, 2, ""});
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusBusy);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusBusy);
  EXPECT_EQ(status(), CLabProgrammingBoard::kStatusReady);
  EXPECT_EQ(scalar->Faults().GetBusyAnswers(), 3u) << "the erase and the two faults";

  // Cut off mid-update, the board comes back under its loader identity.
  ASSERT_EQ(node.SetFeatureReport(frame(1)), EHidStatus::eSuccess);
  scalar->PowerOn();
  EXPECT_EQ(scalar->GetMode(), CLabProgrammingBoard::EMode::eLoader);
  EXPECT_EQ(scalar->GetInterfaces().at(0).info.productId, 0x0352u);
}

TEST_F(LabBus, ASwitchReenumeratesUnlessRefusedAndStaleNodesAreGone) {
  auto pen = std::make_shared<CLabPenController>();
  mBus->Plug(pen);
  std::vector<std::pair<DeviceInfo, bool>> events;
  mBus->AddListener([&](const SLabInterface& interface_I, bool attached_I) {
    events.emplace_back(interface_I.info, attached_I);
  });
  CLabHidNode node(mBus);
  ASSERT_EQ(node.Open(Listed(*pen)), EHidStatus::eSuccess);

  pen->Faults().Add({ELabFaultKind::eRefuseSwitch, 0, ""});
  EXPECT_EQ(node.SetFeatureReport({0xCC, 0x6A, 0x05}), EHidStatus::eSuccess);
  TavSleep(2.0);
  EXPECT_EQ(pen->GetMode(), CLabLoaderBoard::EMode::eNormal) << "acknowledged and ignored";
  EXPECT_TRUE(events.empty());
  pen->Faults().Clear();

  EXPECT_EQ(node.SetFeatureReport({0xCC, 0x05, 0x6A}), EHidStatus::eSuccess);
  EXPECT_TRUE(events.empty()) << "the board drops off a moment later";
  TavSleep(0.2);
  ASSERT_EQ(events.size(), 2u) << "both usages of the pen";
  EXPECT_FALSE(events[0].second);
  EXPECT_EQ(node.SetFeatureReport({0x02, 0x00}), EHidStatus::eGone);
  TavSleep(0.5);
  ASSERT_EQ(events.size(), 3u);
  EXPECT_TRUE(events[2].second);
  EXPECT_EQ(events[2].first.productId, 0x0302u);
  EXPECT_EQ(events[2].first.locationId, events[0].first.locationId) << "same port";
  Bytes status{0x14, 0, 0, 0, 0};
  EXPECT_EQ(node.GetFeatureReport(status), EHidStatus::eGone);
  EXPECT_EQ(pen->GetMode(), CLabLoaderBoard::EMode::eLoader);
}

// A board cut off mid-update comes back from the folder power cycled: the
// interruption campaign covers that. Here, a board left waiting in its
// loader, carried by the session.
TEST_F(LabBus, TheStateFolderCarriesBoardsIntoTheNextRun) {
  const std::filesystem::path folder =
      std::filesystem::temp_directory_path() / ("tavik-lab-state-" + std::to_string(::getpid()));
  std::filesystem::remove_all(folder);
  auto waiting = std::make_shared<CLabPenController>(SLabPenDescription{.name = "waiting"});
  mBus->Plug(waiting);
  CLabHidNode node(mBus);
  ASSERT_EQ(node.Open(Listed(*waiting)), EHidStatus::eSuccess);
  node.SetFeatureReport({0xCC, 0x05, 0x6A});
  TavSleep(1.0);

  CLabOptions options;
  options.SetStateFolder(folder.string());
  {
    CLabSession session(mBus, options);
    EXPECT_EQ(session.Start(), 0);
  }  // saved on the way out
  EXPECT_TRUE(std::filesystem::exists(folder / "waiting.state"));

  auto bus = CLabBus::Create();
  auto waitingAgain = std::make_shared<CLabPenController>(SLabPenDescription{.name = "waiting"});
  bus->Plug(waitingAgain);
  CLabSession session(bus, options);
  EXPECT_EQ(session.Start(), 1);
  EXPECT_EQ(waitingAgain->GetMode(), CLabLoaderBoard::EMode::eLoader) << "still plugged in";
  EXPECT_TRUE(waitingAgain->GetLoader().IsImageValid());
  ASSERT_EQ(bus->ListInterfaces().size(), 1u);
  EXPECT_EQ(bus->ListInterfaces()[0].info.productId, 0x0302u);
  std::filesystem::remove_all(folder);
}

// The summary the benchmarks read: every report that reached a board, the
// busy answers of a board that gave any, and the time the run took on the
// lab's clock.
TEST_F(LabBus, ASessionEndsWithWhatItCostTheBoards) {
  auto pen = std::make_shared<CLabPenController>(SLabPenDescription{.name = "counted"});
  auto scalar = std::make_shared<CLabScalarHid>("polled");
  mBus->Plug(pen);
  mBus->Plug(scalar);
  LogCapture log;
  InSession([&] {
    CLabHidNode node(mBus);
    ASSERT_EQ(node.Open(Listed(*pen)), EHidStatus::eSuccess);
    Bytes status{0x14, 0, 0, 0, 0};
    node.GetFeatureReport(status);
    node.GetFeatureReport(status);
    node.SetFeatureReport({0xEE});
    // Started, the scalar erases for a while: busy once, then ready.
    CLabHidNode scalarNode(mBus);
    ASSERT_EQ(scalarNode.Open(Listed(*scalar)), EHidStatus::eSuccess);
    Bytes programming(512, 0xFF);
    programming[0] = 0xE4;
    programming[1] = 4;
    programming[2] = 1;
    scalarNode.SetFeatureReport(programming);
    scalarNode.GetFeatureReport(programming);
    TavSleep(2.5);
    scalarNode.GetFeatureReport(programming);
  });
  EXPECT_TRUE(log.LogContains("Lab board counted: 3 reports\n"));
  EXPECT_FALSE(log.LogContains("Lab board counted: 0 busy answers"));
  EXPECT_TRUE(log.LogContains("Lab board polled: 3 reports\n"));
  EXPECT_TRUE(log.LogContains("Lab board polled: 1 busy answers\n"));
  EXPECT_TRUE(log.LogContains("Lab clock: 2.500 s\n"));
  EXPECT_TRUE(log.LogContains("Lab waits: 2.500 s\n"));
}

// Polls whose length the chip decides are told apart by the busy answers
// the summary names: a Bluetooth module erasing after its start, a tunnel
// master whose controller is restarting. A board that never made the host
// wait gets no such line.
TEST_F(LabBus, TheSummaryCountsTheAnswersThatMadeTheHostWait) {
  auto module = std::make_shared<CLabBluetooth>(CLabBluetooth::EChip::eAB1555, "module");
  SLabI2CDescription tunnel;
  tunnel.name = "tunnel";
  auto master = std::make_shared<CLabI2CMaster>(tunnel);
  auto idle = std::make_shared<CLabPenController>(SLabPenDescription{.name = "idle"});
  mBus->Plug(module);
  mBus->Plug(master);
  mBus->Plug(idle);
  LogCapture log;
  InSession([&] {
    CLabHidNode moduleNode(mBus), masterNode(mBus), idleNode(mBus);
    ASSERT_EQ(moduleNode.Open(Listed(*module)), EHidStatus::eSuccess);
    ASSERT_EQ(masterNode.Open(Listed(*master)), EHidStatus::eSuccess);
    ASSERT_EQ(idleNode.Open(Listed(*idle)), EHidStatus::eSuccess);
    Bytes start(512, 0);
    start[0] = 0xE4, start[1] = 6, start[2] = 1;
    moduleNode.SetFeatureReport(start);
    EXPECT_EQ(masterNode.SetFeatureReport({0xB0, 0, 0}), EHidStatus::eSuccess);
    Bytes status(512, 0), mode{0xB0, 0xFF, 0xFF}, idleStatus{0x14, 0, 0, 0, 0};
    for (int read = 0; read < 2; ++read) {
      status[0] = 0xE4;
      ASSERT_EQ(moduleNode.GetFeatureReport(status), EHidStatus::eSuccess);
      EXPECT_EQ(status[3], 1) << "erasing";
      EXPECT_NE(masterNode.GetFeatureReport(mode), EHidStatus::eSuccess) << "restarting";
      idleNode.GetFeatureReport(idleStatus);
    }
    TavSleep(5.0);
    status[0] = 0xE4;
    ASSERT_EQ(moduleNode.GetFeatureReport(status), EHidStatus::eSuccess);
    EXPECT_EQ(status[3], 0);
    EXPECT_EQ(masterNode.GetFeatureReport(mode), EHidStatus::eSuccess);
  });
  EXPECT_TRUE(log.LogContains("Lab board module: 4 reports\n"));
  EXPECT_TRUE(log.LogContains("Lab board module: 2 busy answers\n"));
  EXPECT_TRUE(log.LogContains("Lab board tunnel: 2 busy answers\n"));
  EXPECT_FALSE(log.LogContains("Lab board idle: 0 busy answers"));
}

TEST(LabStateFile, ACorruptFileIsRefusedWhole) {
  const std::string path =
      (std::filesystem::temp_directory_path() / ("tavik-lab-corrupt-" + std::to_string(::getpid())))
          .string();
  CLabStateFile state;
  state.PutNumber("mode", 1);
  state.PutBytes("loader.cpu0.block3", {0x00, 0x0A, 0xFF});
  ASSERT_TRUE(state.Save(path));
  CLabStateFile again;
  ASSERT_TRUE(again.Load(path));
  std::vector<uint8_t> bytes;
  ASSERT_TRUE(again.GetBytes("loader.cpu0.block3", bytes));
  EXPECT_EQ(bytes, (std::vector<uint8_t>{0x00, 0x0A, 0xFF})) << "a line feed inside the bytes";
  EXPECT_EQ(again.GetNumber("mode", 0), 1u);

  for (const char* text : {"tavik-lab-state 1\nmode -1\n1\n", "tavik-lab-state 1\nmode 99\n1\n",
                           "tavik-lab-state 1\nmode 1\n12", "tavik-lab-state 2\n"}) {
    FILE* file = std::fopen(path.c_str(), "wb");
    std::fputs(text, file);
    std::fclose(file);
    EXPECT_FALSE(again.Load(path)) << text;
    EXPECT_FALSE(again.Has("mode"));
  }
  std::filesystem::remove(path);
}

}  // namespace

TEST_F(LabBus, AVirtualWaitDoesNotRunOutBeforeAQueuedAttachIsTakenIn) {
  // A device thread slowed down, as on a loaded machine.
  struct SSlowWatcher : CRegistryWatcher {
    std::atomic<bool> seen{false};
    void DeviceAdded(const DeviceInfo&) override {
      std::this_thread::sleep_for(std::chrono::milliseconds(50));
      seen = true;
    }
    void DeviceRemoved(const DeviceInfo&) override {}
  } watcher;
  CLabDeviceRegistry registry(mBus);
  ASSERT_TRUE(registry.OpenWatch());
  std::thread watch([&] { registry.RunWatch(watcher); });

  mBus->Plug(std::make_shared<CLabPenController>());
  // The update thread's wait: 90 passes of one second of the clock's time.
  int passes = 0;
  while (!watcher.seen && passes < 90) {
    TavSleep(1.0);
    ++passes;
  }
  EXPECT_TRUE(watcher.seen);
  EXPECT_LT(passes, 90);
  registry.StopWatching();
  watch.join();
}
