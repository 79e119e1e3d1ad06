// S-record programming: the image laid over the flash blocks, the three
// sums, and the programming order that keeps an interrupted device
// recognisable as invalid.

#include <algorithm>
#include <iterator>

#include "common/TavAssert.h"
#include "flash/ByteOrder.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CFLProtocol.h"
#include "flash/FlashConstants.h"
#include "flash/FlashText.h"

using FlashText::Dec;
using FlashText::Hex;
using FlashText::Hex8;

namespace {

// A 32-bit little-endian word of an image; bytes past its end read as
// blank flash.
uint32_t ImageWord(const std::vector<uint8_t>& image_I, uint32_t offset_I) {
  if (size_t{offset_I} + 4 <= image_I.size()) return GetLE32(&image_I[offset_I]);
  uint32_t word = 0;
  for (uint32_t i = 0; i < 4; ++i) {
    const size_t at = size_t{offset_I} + i;
    const uint32_t byte = at < image_I.size() ? image_I[at] : 0xFF;
    word |= byte << (8 * i);
  }
  return word;
}

// Words, the last one possibly short, in `bytes_I` bytes.
uint32_t WordCount(uint32_t bytes_I) { return bytes_I / 4 + (bytes_I % 4 != 0); }

}  // namespace

bool CFLDeviceInterface::InitFlashVector() {
  const uint32_t blocks = mBLParams.numFlashBlocks;
  if (blocks == 0 || blocks > kMaxFlashBlocks) return false;
  mFlash.Clear();
  for (uint32_t i = 0; i < blocks; ++i) {
    const BL_FLASH_BLOCK_DESCRIPTOR& record = mBLDesc.blocks[i];
    if (record.size > FlashConstants::kMaxFlashBlockBytes) {
      TAVASSERT_TEXT("flash block size <= 16 MiB");
      mFlash.Clear();
      return false;
    }
    mFlash.AddBlock(FLASH_BLOCK(record.startAddress, record.size, mBLParams.readSize,
                                record.flags & kFlashBlockWordSizeMask, mBLParams.blockSize, 0, 0,
                                (record.flags & kFlashBlockProtectedBit) != 0));
  }
  return true;
}

bool CFLDeviceInterface::LoadSRecData(const std::vector<SContinuousDataBlock>& data_I) {
  ReportLog("Filling in mFlash blocks from srec data...");
  const uint32_t blockCount = mFlash.GetBlocksSize();

  // Each piece restarts the scan from the first block, so records in any
  // order land where they belong.
  for (const SContinuousDataBlock& record : data_I) {
    const uint64_t recordEnd = uint64_t{record.startAddress} + record.data.size();
    uint64_t cursor = record.startAddress;
    size_t consumed = 0;
    uint32_t index = 0;
    while (consumed < record.data.size() && index < blockCount) {
      FLASH_BLOCK& block = mFlash.GetBlock(index);
      const uint64_t blockEnd = uint64_t{block.GetStartAddr()} + block.GetSize();
      if (cursor < block.GetStartAddr() || cursor >= blockEnd) {
        ++index;
        continue;
      }
      const uint64_t pieceEnd = std::min(recordEnd, blockEnd);
      const uint32_t length = static_cast<uint32_t>(pieceEnd - cursor);
      block.MakeBlankImage();
      block.CopyIn(static_cast<uint32_t>(cursor - block.GetStartAddr()),
                   record.data.data() + (cursor - record.startAddress), length);
      cursor = pieceEnd;
      consumed += length;
      index = 0;
    }
    if (consumed != record.data.size()) {
      ReportError("Address space from SREC file does not correspond to that of the connected CPU!");
      return false;
    }
  }

  // Blank words at a block's head and tail are never sent; the range's
  // edges fall on word boundaries.
  for (uint32_t i = 0; i < blockCount; ++i) {
    FLASH_BLOCK& block = mFlash.GetBlock(i);
    if (block.IsEmpty()) continue;
    const uint32_t word = block.GetWriteWordSize();
    if (word == 0 || word > block.GetSize()) {
      TAVASSERT_TEXT("flash block word size > 0 and within the block");
      return false;
    }
    // One pass over the bytes from each end rather than a call a word, and
    // only where data was copied in: a loader may describe blocks of 16 MiB.
    const std::vector<uint8_t>& bytes = block.BlockData();
    const auto written = [](uint8_t byte_I) { return byte_I < 0xFF; };
    const FLASH_BLOCK::Span copied = block.GetCopiedSpan();
    const auto spanEnd = bytes.begin() + copied.to;
    const auto spanBegin = bytes.begin() + copied.from;
    const auto first = std::find_if(spanBegin, spanEnd, written);
    if (first != spanEnd) {
      uint32_t start = static_cast<uint32_t>(first - bytes.begin()) / word * word;
      // A block that is not a whole number of words ends in a short tail;
      // data there is sent as the last whole word, on the grid that counts
      // down from the end, never past the image.
      if (start > block.GetSize() - word) start = block.GetSize() - word;
      block.SetWriteStartOffset(start);
      block.SetWriteSize(word);
      if (block.GetSize() >= word) {
        // The last written word on the grid that counts down from the end.
        const int64_t last = std::find_if(std::make_reverse_iterator(spanEnd),
                                          std::make_reverse_iterator(spanBegin), written)
                                 .base() -
                             bytes.begin() - 1;
        const int64_t top = int64_t{block.GetSize()} - word;
        const int64_t offset = last >= top ? top : top - (top - last + word - 1) / word * word;
        if (offset > start) block.SetWriteSize(static_cast<uint32_t>(offset - start + word));
      }
    }
    mFlash.AddToTotalSize(block.GetWriteSize());
  }

  for (uint32_t i = 0; i < blockCount; ++i) {
    const FLASH_BLOCK& block = mFlash.GetBlock(i);
    ReportLog("Checksum Block [0x" + Hex8(block.GetStartAddr()) + "] = 0x" +
              Hex8(block.GetImageSum()));
  }
  ReportLog("Total size: " + Dec(mFlash.GetTotalSize()));
  return true;
}

bool CFLDeviceInterface::CalculateChecksums() {
  ReportLog("Starting CalculateChecksums...");
  FLASH_CHECKSUM_STRUC device;
  device.magicWord = 0;
  // A device that cannot report its sums still gets the image's sum.
  FLProtGetChecksums(device);
  mOldChecksum = 0;
  mFWChecksum = 0;

  const uint32_t blockCount = std::min(mFlash.GetBlocksSize(), kMaxFlashBlocks);
  std::string message = "Checksum Magic Word:" + Hex(device.magicWord);
  for (uint32_t i = 0; i < blockCount; ++i) {
    message += "\nChecksum Block [" + Dec(i) + "] = " + Hex(device.checksums[i]);
  }

  // Unwritten area counts as blank flash: one 0xFFFFFFFF word, that is -1,
  // for each four bytes.
  for (uint32_t i = 0; i < blockCount; ++i) {
    const FLASH_BLOCK& block = mFlash.GetBlock(i);
    if (block.IsEmpty() || block.IsProtected() || !ValidBlockIndex(i)) continue;
    if (mChecksumsSupported) mOldChecksum += device.checksums[i];
    const uint32_t start = block.GetWriteStartOffset();
    const uint32_t end = start + block.GetWriteSize();
    // Counted, not walked: a loader may describe blocks of 16 MiB.
    const uint32_t blankAfter = block.GetSize() > end ? block.GetSize() - end : 0;
    mFWChecksum -= WordCount(start) + WordCount(blankAfter);
    for (uint32_t offset = start; offset < end; offset += 4) {
      mFWChecksum += ImageWord(block.BlockData(), offset);
    }
  }
  ReportLog(message);
  return true;
}

bool CFLDeviceInterface::InitializeFlash() {
  ReportLog("Starting InitializeFlash...");
  ReportLog("Setting magic word to zero...");
  if (!FLProtSetMagicWord(0)) {
    ReportError("Failed to set magic word");
    return false;
  }
  const uint32_t blockCount = mFlash.GetBlocksSize();
  ReportLog("Invalidating " + Dec(blockCount) + " blocks' checksum ...");
  for (uint32_t i = 0; i < blockCount; ++i) {
    if (!FLProtSetBlockChecksum(static_cast<uint16_t>(i), 0)) {
      ReportError("Failed setting a block checksum");
      return false;
    }
  }
  ReportLog("Writing invalidated checksums to ROM... ");
  if (!FLProtWriteChecksumsToROM()) {
    ReportError("Failed writing checksums to ROM");
    return false;
  }
  return true;
}

bool CFLDeviceInterface::WriteFlash() {
  ReportLog("Starting WriteFlash...");
  const uint32_t blockCount = mFlash.GetBlocksSize();
  if (blockCount == 0) return true;
  for (uint32_t i = 0; i < blockCount; ++i) {
    const FLASH_BLOCK& block = mFlash.GetBlock(i);
    ReportLog("Block " + Dec(i) + " at [0x" + Hex8(block.GetStartAddr()) + "] :");
    if (block.IsEmpty()) {
      ReportLog("Empty Block Skipped");
    } else if (block.IsProtected()) {
      ReportLog("Protected Block Skipped");
    } else {
      bool written = false;
      for (int attempt = 0; attempt < FlashConstants::kWriteBlockTries && !written; ++attempt) {
        written = WriteBlock(i);
      }
      if (!written) return false;
    }
    ReportProgress(static_cast<uint32_t>(static_cast<double>(i) / blockCount * 100.0));
  }
  return true;
}

bool CFLDeviceInterface::WriteBlock(uint32_t index_I) {
  const FLASH_BLOCK& block = mFlash.GetBlock(index_I);
  ReportLog("Erasing block.");
  if (!FLProtEraseBlock(index_I)) {
    ReportError("Failed to erase block from device");
    return false;
  }

  const bool nonBL = CFLProtocol::GetInstance()->IsNonBLProtocol();
  const std::vector<uint8_t>& image = block.BlockData();
  const uint32_t start = block.GetWriteStartOffset();
  const uint32_t size = block.GetWriteSize();

  // Under the non-BL protocol the host checks the block itself: the
  // expected sum is that of a whole block, 1024 words, blank where unwritten.
  uint32_t expected = 0;
  if (nonBL) {
    if (size_t{start} + size > FlashConstants::kNonBLBlockSize) {
      TAVASSERT_TEXT("non-BL write range inside 4096 bytes");
      return false;
    }
    std::vector<uint8_t> scratch(FlashConstants::kNonBLBlockSize, 0xFF);
    std::copy(image.begin() + start, image.begin() + start + size, scratch.begin() + start);
    for (uint32_t offset = 0; offset < FlashConstants::kNonBLBlockSize; offset += 4) {
      expected += GetLE32(&scratch[offset]);
    }
  }

  uint32_t offset = start;
  uint32_t remainder = size;
  while (remainder != 0) {
    const uint32_t blockSize = block.GetWriteBlockSize();
    const uint32_t wordSize = block.GetWriteWordSize();
    const bool wholeBlock = blockSize != 0 && remainder >= blockSize;
    if (!wholeBlock && (wordSize == 0 || remainder % wordSize != 0)) {
      ReportError("Data left to write in block is not divisible by word size");
      return false;
    }
    const uint32_t length = wholeBlock ? blockSize : wordSize;
    const std::vector<uint8_t> piece(image.begin() + offset, image.begin() + offset + length);
    const uint32_t address = block.GetStartAddr() + offset;
    ReportLog("Block at [0x" + Hex8(address) + "]; checksum: [0x" +
              Hex8(CalculateBlockChecksum(piece)) + "]");
    if (wholeBlock) {
      if (!FLProtWriteBlock(piece, address)) {
        ReportError("Failed writing block to device");
        return false;
      }
    } else if (!FLProtWriteWord(piece, address)) {
      ReportError("Failed writing word to device");
      return false;
    }
    offset += length;
    remainder -= length;
  }
  ReportLog("Block " + Dec(index_I) + " programmed.");
  if (!nonBL) return true;

  if (!FLProtCalcSetBlockChecksum(static_cast<uint16_t>(index_I))) return false;
  FLASH_CHECKSUM_STRUC device;
  if (!FLProtGetChecksums(device)) return false;
  if (index_I >= kMaxFlashBlocks || device.checksums[index_I] != expected) return false;
  return FLProtSetBlockChecksum(static_cast<uint16_t>(index_I), expected);
}

bool CFLDeviceInterface::FinalizeFlash() {
  ReportLog("Starting FinalizeFlash...");
  mNewChecksum = 0;
  if (!mChecksumsSupported) return true;
  const uint32_t blockCount = mFlash.GetBlocksSize();
  for (uint32_t i = 0; i < blockCount; ++i) {
    if (!FLProtCalcSetBlockChecksum(static_cast<uint16_t>(i))) {
      ReportError("Failed calculating block checksum");
      return false;
    }
  }
  if (!FLProtWriteChecksumsToROM()) {
    ReportError("Failed writing checksum to ROM");
    return false;
  }
  FLASH_CHECKSUM_STRUC device;
  if (!FLProtGetChecksums(device)) {
    ReportError("Failed refreshing checksum info");
    return false;
  }
  for (uint32_t i = 0; i < std::min(blockCount, kMaxFlashBlocks); ++i) {
    const FLASH_BLOCK& block = mFlash.GetBlock(i);
    if (block.IsEmpty() || block.IsProtected() || !ValidBlockIndex(i)) continue;
    mNewChecksum += device.checksums[i];
  }
  return true;
}

// Nothing is erased before the device's magic word and every stored block
// checksum are zero in ROM, and the new checksums reach ROM in one commit
// after the last block: at any interruption the stored checksums do not
// describe a valid image, so the device stays reachable in its loader.
bool CFLDeviceInterface::ProgramBoardSRec() {
  ReportLog("Starting ProgramBoardSRec...");
  if (mDataSourceFormat != EDS_SREC_PEN && mDataSourceFormat != EDS_SREC_TOUCH &&
      mDataSourceFormat != EDS_SREC_GENERIC) {
    ReportError("ProgramBoardSRec:  Datasource not correct");
    return false;
  }
  if (!CalculateChecksums()) {
    ReportError("ProgramBoardSRec: Failed to calculate checksums");
    return false;
  }
  ReportLog("Checksums calculated");
  if (!InitializeFlash()) {
    ReportError("ProgramBoardSRec: Failed to initialize to flash data");
    return false;
  }
  ReportLog("Wrote checksums and magic word to flash");
  if (!WriteFlash()) {
    ReportError("ProgramBoardSRec: Failed to write flash data to device");
    return false;
  }
  ReportLog("Flash Write Complete");
  if (!FinalizeFlash()) {
    ReportError("ProgramBoardSRec: Failed to finalize flash data");
    return false;
  }
  ReportLog("ProgramBoardSRec: Flash Finalized");
  ReportLog("ProgramBoardSRec done!");
  return true;
}
