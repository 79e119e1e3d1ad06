// A board's state written through as it changes: whatever moment a kill
// comes at, the folder loads as the state after some whole report.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>

#include "lab/CLabSerialFlash.h"
#include "lab/CLabStateJournal.h"

namespace {

using Bytes = std::vector<uint8_t>;
using SLoaded = std::vector<Bytes>;

SLoaded Snapshot(const CLabStateFile& state_I) {
  return {state_I.Entry("flash"), state_I.Entry("mode"), state_I.Entry("status")};
}

Bytes ReadFile(const std::string& path_I) {
  std::ifstream in(path_I, std::ios::binary);
  return Bytes(std::istreambuf_iterator<char>(in), {});
}

void WriteFile(const std::string& path_I, const Bytes& bytes_I, size_t size_I) {
  std::ofstream(path_I, std::ios::binary | std::ios::trunc)
      .write(reinterpret_cast<const char*>(bytes_I.data()), static_cast<std::streamsize>(size_I));
}

SLoaded LoadFolder(const std::string& path_I) {
  CLabStateFile state;
  EXPECT_TRUE(state.Load(path_I));
  CLabStateJournal::Replay(CLabStateJournal::LogPath(path_I), state);
  return Snapshot(state);
}

class LabStateJournal : public ::testing::Test {
 protected:
  void TearDown() override { std::filesystem::remove_all(mFolder); }
  std::filesystem::path mFolder =
      std::filesystem::temp_directory_path() / ("tavik-lab-journal-" + std::to_string(::getpid()));
  std::string mPath =
      (std::filesystem::create_directories(mFolder), mFolder / "pen.state").string();
};

TEST_F(LabStateJournal, AKillBetweenAnyTwoWritesLeavesTheStateOfAWholeReport) {
  CLabStateJournal journal;
  constexpr size_t kChunk = CLabStateFile::kChunkSize;
  Bytes flash(4 * kChunk, 0xFF);
  journal.State().PutBytes("flash", flash);
  journal.State().PutNumber("mode", 0);
  ASSERT_TRUE(journal.Open(mPath));

  // One report each: a page programmed, a mode change, two chunks and a new
  // entry at once, nothing at all, a page over a chunk's end.
  struct SStep {
    size_t offset, length;
    uint8_t value;
    int mode;
    bool status;
  };
  const SStep steps[] = {{0, 256, 0x11, 0, false},
                         {0, 0, 0, 1, false},
                         {kChunk - 96, kChunk + 404, 0x22, 1, true},
                         {0, 0, 0, 1, true},
                         {2 * kChunk - 92, 200, 0x00, 0, true}};
  std::vector<SLoaded> after{Snapshot(journal.State())};
  std::vector<size_t> logSizes{0};
  for (const SStep& step : steps) {
    std::fill_n(flash.begin() + static_cast<std::ptrdiff_t>(step.offset), step.length, step.value);
    journal.State().PutBytes("flash", flash);
    journal.State().PutNumber("mode", step.mode);
    if (step.status) journal.State().PutBytes("status", {0x9C, 0x00});
    ASSERT_TRUE(journal.Record());
    after.push_back(Snapshot(journal.State()));
    logSizes.push_back(std::filesystem::file_size(CLabStateJournal::LogPath(mPath)));
  }
  EXPECT_EQ(logSizes[3], logSizes[4]) << "a report that changed nothing writes nothing";
  EXPECT_LT(logSizes[1], 2 * CLabStateFile::kChunkSize) << "a page costs one chunk";

  const Bytes log = ReadFile(CLabStateJournal::LogPath(mPath));
  const std::string cut = mFolder / "cut.state";
  std::filesystem::copy_file(mPath, cut);
  // Every byte around each batch's edges, and a stride through the rest.
  std::set<size_t> cuts;
  for (size_t size = 0; size <= log.size(); size += 97) cuts.insert(size);
  for (size_t edge : logSizes) {
    for (size_t size = edge > 24 ? edge - 24 : 0; size <= std::min(edge + 24, log.size()); ++size)
      cuts.insert(size);
  }
  for (size_t size : cuts) {
    WriteFile(CLabStateJournal::LogPath(cut), log, size);
    const size_t whole =
        std::upper_bound(logSizes.begin(), logSizes.end(), size) - logSizes.begin() - 1;
    ASSERT_EQ(LoadFolder(cut), after[whole]) << "log cut at " << size;
  }
  // A damaged batch ends the replay where it starts.
  Bytes damaged = log;
  damaged[logSizes[2] + 40] ^= 0x01;
  WriteFile(CLabStateJournal::LogPath(cut), damaged, damaged.size());
  EXPECT_EQ(LoadFolder(cut), after[2]);
}

TEST_F(LabStateJournal, FoldingEmptiesTheLogAndALogLeftOverFromBeforeChangesNothing) {
  CLabStateJournal journal;
  Bytes flash(std::max<size_t>(2 * CLabStateFile::kChunkSize, 8 * 256), 0xFF);
  journal.State().PutBytes("flash", flash);
  ASSERT_TRUE(journal.Open(mPath));
  for (int page = 0; page < 8; ++page) {
    std::fill_n(flash.begin() + page * 256, 256, static_cast<uint8_t>(page));
    journal.State().PutBytes("flash", flash);
    journal.State().PutNumber("mode", page % 2);
    ASSERT_TRUE(journal.Record());
  }
  const Bytes log = ReadFile(CLabStateJournal::LogPath(mPath));
  ASSERT_TRUE(journal.Fold());
  EXPECT_EQ(std::filesystem::file_size(CLabStateJournal::LogPath(mPath)), 0u);
  const SLoaded folded = LoadFolder(mPath);
  EXPECT_EQ(folded, Snapshot(journal.State()));
  // A kill between the new snapshot and emptying the log.
  WriteFile(CLabStateJournal::LogPath(mPath), log, log.size());
  EXPECT_EQ(LoadFolder(mPath), folded);
}

// The flash compares only what changed since a file took its last save;
// a file that missed a save in between is compared whole, so what changed
// before that save still reaches it.
TEST(LabSerialFlashSave, EachFileSeesEveryChangeSinceItLastTookTheFlash) {
  CLabSerialFlash flash(2, false, [](const std::string&) {});
  const auto program = [&flash](uint32_t address_I, uint8_t value_I) {
    flash.Execute(0x06, {}, 0, true);
    flash.Execute(0x01, {0x00}, 0, true);  // protection off
    flash.Execute(0x06, {}, 0, true);
    flash.Program(address_I, Bytes(256, value_I));
  };
  const auto offsets = [](CLabStateFile& state_I) {
    std::set<size_t> changed;
    for (const auto& change : state_I.TakeChanges()) {
      if (change.key == "flash") changed.insert(change.offset);
    }
    return changed;
  };
  CLabStateFile journal, other;
  flash.Save(journal);
  journal.TakeChanges();
  program(0x1000, 0x11);
  flash.Save(other);
  program(0x9000, 0x22);
  flash.Save(journal);
  const auto chunk = [](size_t address_I) {
    return address_I / CLabStateFile::kChunkSize * CLabStateFile::kChunkSize;
  };
  EXPECT_EQ(offsets(journal), (std::set<size_t>{chunk(0x1000), chunk(0x9000)}));
  EXPECT_EQ(journal.Entry("flash"), flash.GetData());
  program(0xA100, 0x33);
  flash.Save(journal);
  EXPECT_EQ(offsets(journal), (std::set<size_t>{chunk(0xA100)}));
  EXPECT_EQ(journal.Entry("flash"), flash.GetData());
}

}  // namespace
