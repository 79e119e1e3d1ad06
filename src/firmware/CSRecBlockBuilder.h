#pragma once
// Gathers the data records of one S-record file in their order and, once the
// file has been read, builds the blocks that merging them one at a time
// gives: the first data for an address wins, a record that starts inside a
// block is dropped whole, and only one block takes a record, at its end or
// at its front. Blocks that become adjacent stay apart.
//
// The records are kept compactly while the file is read and resolved at the
// end. Their data is staged at its own addresses where it shares no byte
// with data staged before, and kept in file order otherwise. Where no two
// records share a byte, which is what tools write, a record can only join
// the block of the record just below it or just above it in address order,
// and a single pass over them in file order settles every block. Any other
// file is merged record by record through CBlockMergeIndex. Both give
// exactly the blocks of the plain walk over all blocks.

#include <cstddef>
#include <cstdint>
#include <vector>

#include "firmware/CByteArena.h"
#include "firmware/CStagingImage.h"
#include "firmware/SContinuousDataBlock.h"

class CSRecBlockBuilder {
 public:
  CSRecBlockBuilder() = default;
  // Records live only while one file is read, and a front-end is copied
  // between loads: a copy starts empty.
  CSRecBlockBuilder(const CSRecBlockBuilder&) {}
  CSRecBlockBuilder& operator=(const CSRecBlockBuilder&) {
    Clear();
    return *this;
  }

  void Clear();
  // Room for every record a text of this many bytes can hold. Only address
  // space: the pages are touched as records come, and the list never has to
  // move to grow, which would hold it twice for a moment. Also what staging
  // may take: the most data such a text holds, and some room for pages
  // that are only partly used.
  void ReserveFor(uint64_t textBytes_I);
  // Keeps a copy of the record's data.
  void Add(uint32_t address_I, const uint8_t* data_I, size_t size_I);
  size_t RecordCount() const { return mRecords.size(); }

  // The blocks in their order of creation; where that order and the order
  // of their starts give the same sorted list, already in the latter. Gives
  // up the records.
  std::vector<SContinuousDataBlock> Build();

 private:
  static constexpr uint32_t kDropped = UINT32_MAX;
  struct SRecord {
    uint32_t address;
    uint32_t size;
  };
  struct SBounds {
    uint64_t start;
    uint64_t end;
  };
  // A record kept apart from the staging: its block's place in the list
  // (kDropped when the record was dropped), where in the block, how long.
  struct SOverlay {
    uint32_t place;
    uint32_t offset;
    uint32_t size;
  };

  std::vector<uint32_t> SortByAddress() const;
  bool Disjoint(const std::vector<uint32_t>& byAddress_I) const;
  void JoinNeighbours(const std::vector<uint32_t>& byAddress_I);
  void MergeOneByOne();
  std::vector<uint32_t> PlacesByAddress(const std::vector<uint32_t>& byAddress_I) const;
  // placeOf_I empty: blocks stay in their order of creation. sorted_I: the
  // blocks' places are in the order of their starts.
  std::vector<SContinuousDataBlock> Fill(const std::vector<uint32_t>& placeOf_I, bool sorted_I);

  void StagePending();

  std::vector<SRecord> mRecords;
  std::vector<bool> mStaged;  // per record: its data is in mImage, not mData
  // Records not yet staged, and their data: a few at a time, so that the
  // places of all of them are asked for before the first is written.
  static constexpr size_t kPendingRecords = 16;
  size_t mPendingFirst = 0;
  std::vector<uint8_t> mPendingData;
  CStagingImage mImage;
  CByteArena mData;
  // Whether every record so far starts at or after the end of the one before
  // and has data: then the file order is the address order.
  bool mAscending = true;
  uint64_t mLastEnd = 0;

  std::vector<uint32_t> mBlockOf;  // per record: its block, or kDropped
  std::vector<SBounds> mBlocks;    // per block, in order of creation
};
