// The S-record merge against a plain walk over all blocks, on random files:
// descending runs, repeated addresses where the first data wins, records
// starting inside a block, gap fillers that join the block before them.

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <sstream>

#include "firmware/CBlockMergeIndex.h"
#include "firmware/CSRec.h"
#include "firmware/CStagingImage.h"
#include "firmware/CTextLineReader.h"
#include "firmware/FirmwareFiles.h"
#include "firmware/SRecReferenceMerge.h"
#include "support/LogCapture.h"

namespace {

using CRecords = std::vector<SContinuousDataBlock>;

std::vector<uint8_t> RandomData(std::mt19937& rng_IO, size_t size_I) {
  std::vector<uint8_t> data(size_I);
  for (uint8_t& byte : data) byte = static_cast<uint8_t>(rng_IO());
  return data;
}

size_t Below(std::mt19937& rng_IO, size_t limit_I) { return rng_IO() % limit_I; }

// Records that tile a range with an occasional hole, in a random order: the
// shape that tools write.
CRecords Tiles(std::mt19937& rng_IO, uint32_t base_I, size_t count_I, size_t longest_I) {
  CRecords records;
  uint64_t address = base_I;
  for (size_t i = 0; i < count_I && address <= UINT32_MAX; ++i) {
    const size_t size = 1 + Below(rng_IO, longest_I);
    records.push_back({static_cast<uint32_t>(address), RandomData(rng_IO, size)});
    address += size + (Below(rng_IO, 8) == 0 ? Below(rng_IO, 64) : 0);
  }
  switch (Below(rng_IO, 4)) {
    case 0: break;
    case 1: std::reverse(records.begin(), records.end()); break;
    default: std::shuffle(records.begin(), records.end(), rng_IO); break;
  }
  return records;
}

// Records thrown into a narrow window: repeats, overlaps, records without data.
CRecords Scattered(std::mt19937& rng_IO, uint32_t base_I, size_t window_I, size_t count_I,
                   size_t longest_I) {
  CRecords records;
  for (size_t i = 0; i < count_I; ++i) {
    records.push_back({static_cast<uint32_t>(base_I + Below(rng_IO, window_I)),
                       RandomData(rng_IO, Below(rng_IO, longest_I + 1))});
  }
  return records;
}

// Records around the edges of the staging's pages, on more pages than a
// small file may stage: some records are staged, others kept apart, some
// straddle two pages.
CRecords AroundPageEdges(std::mt19937& rng_IO, size_t count_I) {
  static constexpr unsigned kBits = CStagingImage::kPageBits;
  CRecords records;
  const uint32_t firstPage = 1 + static_cast<uint32_t>(Below(rng_IO, (1u << (32 - kBits)) - 9));
  for (size_t i = 0; i < count_I; ++i) {
    const uint32_t edge = (firstPage + static_cast<uint32_t>(Below(rng_IO, 8))) << kBits;
    records.push_back({edge - 64 + static_cast<uint32_t>(Below(rng_IO, 128)),
                       RandomData(rng_IO, 1 + Below(rng_IO, 64))});
  }
  return records;
}

void InsertAnywhere(std::mt19937& rng_IO, CRecords& records_IO, SContinuousDataBlock record_I) {
  records_IO.insert(
      records_IO.begin() + static_cast<ptrdiff_t>(Below(rng_IO, records_IO.size() + 1)),
      std::move(record_I));
}

// Loads the records as an S3 file and compares with the plain walk.
void ExpectSameAsTheWalk(const CRecords& records_I, const CTempFolder& folder_I) {
  std::string text = "S00600004844521B\n";
  for (const auto& record : records_I)
    text += SRecLine('3', record.startAddress, record.data) + "\n";
  const auto [blocks, overlapPair] = ReferenceMerge(records_I);
  LogCapture capture;
  // One reader for every round: each load starts from what the last left.
  static CSRec source;
  const bool loaded = source.Load(folder_I.Write("merge.tav", text), EHID_INTERFACE);
  EXPECT_EQ(loaded, overlapPair == 0);
  EXPECT_EQ(source.GetSRecData(), blocks);
  if (overlapPair > 0) {
    const std::string message =
        "[E] LoadSRecFile - FAILED on data overlap, recCount: " + std::to_string(overlapPair) +
        "\n";
    EXPECT_TRUE(capture.LogContains(message)) << message;
  }
}

}  // namespace

TEST(SRecMerge, GivesTheBlocksOfThePlainWalk) {
  CTempFolder folder;
  std::mt19937 rng(7);
  for (int round = 0; round < 540; ++round) {
    SCOPED_TRACE(round);
    CRecords records;
    switch (round % 6) {
      // Tool-shaped, now and then near the top of the address space, with a
      // record that comes twice with other data: the first one wins.
      case 0:
      case 1: {
        const uint32_t base = round % 10 == 0 ? 0xFFFFF000u : uint32_t(rng() & 0xFFFFF);
        records = Tiles(rng, base, 1 + Below(rng, 150), round % 3 == 0 ? 250 : 40);
        for (size_t i = 0, repeats = round % 2 ? 1 + Below(rng, 5) : 0; i < repeats; ++i) {
          SContinuousDataBlock again = records[Below(rng, records.size())];
          again.data = RandomData(rng, again.data.size());
          InsertAnywhere(rng, records, again);
        }
        break;
      }
      case 2: records = Scattered(rng, 0x1000, 200, 1 + Below(rng, 60), 24); break;
      // Long records across the index's pages.
      case 3: records = Scattered(rng, 0x7000, 20000, 1 + Below(rng, 80), 250); break;
      case 4: records = AroundPageEdges(rng, 1 + Below(rng, 300)); break;
      // Records without data among tiles, also at the tiles' ends.
      default:
        records = Tiles(rng, 0x40, 1 + Below(rng, 60), 20);
        for (size_t i = 0, empties = 1 + Below(rng, 6); i < empties; ++i) {
          const SContinuousDataBlock& near = records[Below(rng, records.size())];
          const size_t at = near.startAddress + (Below(rng, 2) ? near.data.size() : 0);
          InsertAnywhere(rng, records, {static_cast<uint32_t>(at), {}});
        }
    }
    ExpectSameAsTheWalk(records, folder);
  }
}

TEST(BlockMergeIndex, NamesTheBlockAWalkOverAllBlocksWouldFind) {
  std::mt19937 rng(3);
  for (unsigned pageBits : {2u, 5u, 12u}) {
    SCOPED_TRACE(pageBits);
    CBlockMergeIndex index(pageBits);
    std::vector<std::pair<uint64_t, uint64_t>> blocks;  // start and end
    for (int step = 0; step < 3000; ++step) {
      const uint64_t address = Below(rng, 400);
      const uint64_t size = Below(rng, 4) == 0 ? 0 : 1 + Below(rng, 30);
      uint32_t walk = CBlockMergeIndex::kNoBlock;
      for (size_t i = 0; i < blocks.size() && walk == CBlockMergeIndex::kNoBlock; ++i) {
        const auto [start, end] = blocks[i];
        if ((start <= address && address <= end) || start == address + size) walk = uint32_t(i);
      }
      ASSERT_EQ(index.FirstTaker(address, size), walk) << "step " << step;
      if (walk == CBlockMergeIndex::kNoBlock) {
        index.BlockAdded(static_cast<uint32_t>(blocks.size()), address, size);
        blocks.emplace_back(address, address + size);
        continue;
      }
      auto& [start, end] = blocks[walk];
      if (address >= start && address < end) continue;
      const uint64_t oldStart = start;
      if (end == address) {
        end = address + size;
        index.BlockAppended(walk, address, size);
      }
      if (address + size == oldStart) {
        start = address;
        index.BlockPrepended(walk, address, size);
      }
    }
    index.Clear();
    EXPECT_EQ(index.FirstTaker(10, 1), CBlockMergeIndex::kNoBlock);
  }
}

TEST(TextLineReader, SplitsLinesAsGetlineDoes) {
  std::mt19937 rng(5);
  const char alphabet[] = {'a', 'b', '\n', '\r', '\0', 'S'};
  CTempFolder folder;
  for (int round = 0; round < 200; ++round) {
    std::string text;
    for (size_t i = 0, length = Below(rng, 300); i < length; ++i) {
      text += alphabet[Below(rng, sizeof alphabet)];
    }
    if (round % 5 == 0) text += std::string(100, 'x');  // longer than the buffer
    std::vector<std::string> expected, lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) expected.push_back(line);

    std::FILE* file = std::fopen(folder.Write("lines.txt", text).c_str(), "r");
    ASSERT_NE(file, nullptr);
    CTextLineReader reader(file, 1 + Below(rng, 16));
    char* line = nullptr;
    size_t size = 0;
    while (reader.Next(line, size)) {
      EXPECT_EQ(line[size], '\0');
      lines.emplace_back(line, size);
    }
    std::fclose(file);
    EXPECT_EQ(lines, expected) << "round " << round;
  }
}
