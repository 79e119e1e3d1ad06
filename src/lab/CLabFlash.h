#pragma once
// The flash of one emulated controller CPU: blocks as its loader describes
// them, their content, and the checksum area (a magic word and one checksum
// per block) in a working copy and a committed ROM copy.
//
// Choices this model makes where the host leaves them open:
// - A block's checksum is the wrapping sum of its content's 32-bit
//   little-endian words. (The host's non-BL check computes the same sum.)
// - Set-checksum, calculate-checksum and set-magic commands change the
//   working copy; the commit copies it to ROM. At the commit the loader
//   itself decides the magic word: kValidMagicWord when every checksum
//   being committed matches its block's content, 0 otherwise. The host's
//   own magic word is thus only ever a way to clear it.
// - The image is valid only when the ROM magic word is kValidMagicWord and
//   every ROM checksum matches its block's content. A controller with an
//   invalid image starts in its loader.
// - Like NOR flash, programming can only clear bits: erase sets a block to
//   0xFF, a write ANDs its bytes in.
//
// The model also watches the host: a write outside the blocks, into a
// protected block, across a block's end, off its word grid or over bytes
// not erased is recorded as a violation (and, where flash would refuse it,
// refused). Erasing a block that is still blank since its last erase is
// counted as needless.

#include <cstdint>
#include <string>
#include <vector>

#include "lab/CLabStateFile.h"

struct SLabFlashBlock {
  uint32_t start = 0;
  uint32_t size = 0;
  uint16_t wordSize = 4;
  bool isProtected = false;
};

// A CPU's flash as its loader describes it.
struct SLabFlashLayout {
  std::vector<SLabFlashBlock> blocks;
  uint16_t readSize = 64;
  uint16_t wordSize = 4;
  uint16_t blockSize = 256;

  // `count_I` blocks of `blockBytes_I` from `base_I`; the first
  // `protectedBlocks_I` of them protected (the loader's own).
  static SLabFlashLayout Uniform(uint32_t base_I, uint32_t blockBytes_I, uint32_t count_I,
                                 uint32_t protectedBlocks_I, uint16_t writeBlockSize_I = 256,
                                 uint16_t wordSize_I = 4);
};

class CLabFlash {
 public:
  static constexpr uint32_t kValidMagicWord = 0x5441564B;

  explicit CLabFlash(SLabFlashLayout layout_I);

  const SLabFlashLayout& GetLayout() const { return mLayout; }
  uint32_t GetBlockCount() const { return static_cast<uint32_t>(mLayout.blocks.size()); }

  // Fills every block with a pattern of `seed_I` and commits valid
  // checksums: a board as it leaves the factory.
  void FactoryImage(uint32_t seed_I);

  bool Erase(uint32_t block_I);
  bool Program(uint32_t address_I, const uint8_t* data_I, size_t size_I);
  // Bytes outside every block read as 0xFF.
  void Read(uint32_t address_I, uint8_t* data_O, size_t size_I) const;

  uint32_t ContentChecksum(uint32_t block_I) const;
  void CalculateChecksum(uint32_t block_I);
  void SetChecksum(uint32_t block_I, uint32_t checksum_I);
  void SetMagicWord(uint32_t value_I) { mMagicWord = value_I; }
  void CommitChecksums();
  // The working copy, as the loader reports it.
  uint32_t GetMagicWord() const { return mMagicWord; }
  uint32_t GetChecksum(uint32_t block_I) const { return mChecksums.at(block_I); }
  uint32_t GetRomMagicWord() const { return mRomMagicWord; }
  uint32_t GetRomChecksum(uint32_t block_I) const { return mRomChecksums.at(block_I); }

  bool IsImageValid() const;
  // A restart: the working copy is loaded from ROM.
  void Boot();

  const std::vector<uint8_t>& GetBlockContent(uint32_t block_I) const {
    return mContent.at(block_I);
  }
  // -1 where no block holds the address.
  int BlockOf(uint32_t address_I) const;

  const std::vector<std::string>& GetViolations() const { return mViolations; }
  uint32_t GetEraseCount(uint32_t block_I) const { return mEraseCounts.at(block_I); }
  uint32_t GetNeedlessErases() const { return mNeedlessErases; }

  void Save(CLabStateFile& state_IO, const std::string& prefix_I) const;
  void Load(const CLabStateFile& state_I, const std::string& prefix_I);

 private:
  void Violation(const std::string& text_I);
  void Touch(uint32_t block_I) { mContentRevisions[block_I] = ++mLastRevision; }

  SLabFlashLayout mLayout;
  std::vector<std::vector<uint8_t>> mContent;
  // Per block, a value that changes with its content, so that a board saved
  // after every report compares only the blocks that were written.
  std::vector<uint64_t> mContentRevisions;
  uint64_t mLastRevision = 0;
  std::vector<uint32_t> mChecksums;
  std::vector<uint32_t> mRomChecksums;
  uint32_t mMagicWord = 0;
  uint32_t mRomMagicWord = 0;
  std::vector<bool> mBlankSinceErase;
  std::vector<uint32_t> mEraseCounts;
  uint32_t mNeedlessErases = 0;
  std::vector<std::string> mViolations;
};
