#include "lab/CLabFlash.h"

#include <algorithm>

namespace {

std::vector<uint8_t> NumbersToBytes(const std::vector<uint32_t>& numbers_I) {
  std::vector<uint8_t> bytes;
  bytes.reserve(numbers_I.size() * 4);
  for (uint32_t number : numbers_I) {
    for (int i = 0; i < 4; ++i) bytes.push_back(static_cast<uint8_t>(number >> (8 * i)));
  }
  return bytes;
}

void BytesToNumbers(const std::vector<uint8_t>& bytes_I, std::vector<uint32_t>& numbers_IO) {
  for (size_t i = 0; i < numbers_IO.size() && 4 * i + 3 < bytes_I.size(); ++i) {
    numbers_IO[i] = bytes_I[4 * i] | (bytes_I[4 * i + 1] << 8) | (bytes_I[4 * i + 2] << 16) |
                    (static_cast<uint32_t>(bytes_I[4 * i + 3]) << 24);
  }
}

std::string Hex(uint32_t value_I) {
  char text[16];
  std::snprintf(text, sizeof(text), "0x%08X", value_I);
  return text;
}

}  // namespace

SLabFlashLayout SLabFlashLayout::Uniform(uint32_t base_I, uint32_t blockBytes_I, uint32_t count_I,
                                         uint32_t protectedBlocks_I, uint16_t writeBlockSize_I,
                                         uint16_t wordSize_I) {
  SLabFlashLayout layout;
  layout.blockSize = writeBlockSize_I;
  layout.wordSize = wordSize_I;
  for (uint32_t i = 0; i < count_I; ++i) {
    layout.blocks.push_back(
        {base_I + i * blockBytes_I, blockBytes_I, wordSize_I, i < protectedBlocks_I});
  }
  return layout;
}

CLabFlash::CLabFlash(SLabFlashLayout layout_I) : mLayout(std::move(layout_I)) {
  const size_t count = mLayout.blocks.size();
  for (const SLabFlashBlock& block : mLayout.blocks) mContent.emplace_back(block.size, 0xFF);
  mChecksums.assign(count, 0);
  mRomChecksums.assign(count, 0);
  mBlankSinceErase.assign(count, false);
  mEraseCounts.assign(count, 0);
  mContentRevisions.assign(count, 0);
  for (uint32_t i = 0; i < count; ++i) Touch(i);
}

void CLabFlash::FactoryImage(uint32_t seed_I) {
  uint32_t state = seed_I * 2654435761u + 1;
  for (uint32_t i = 0; i < GetBlockCount(); ++i) {
    for (uint8_t& byte : mContent[i]) {
      state = state * 1103515245u + 12345u;
      byte = static_cast<uint8_t>(state >> 16);
    }
    Touch(i);
    CalculateChecksum(i);
  }
  CommitChecksums();
}

int CLabFlash::BlockOf(uint32_t address_I) const {
  for (size_t i = 0; i < mLayout.blocks.size(); ++i) {
    const SLabFlashBlock& block = mLayout.blocks[i];
    if (address_I >= block.start && address_I - block.start < block.size) {
      return static_cast<int>(i);
    }
  }
  return -1;
}

void CLabFlash::Violation(const std::string& text_I) { mViolations.push_back(text_I); }

bool CLabFlash::Erase(uint32_t block_I) {
  if (block_I >= GetBlockCount()) {
    Violation("erase of block " + std::to_string(block_I) + ", which does not exist");
    return false;
  }
  if (mLayout.blocks[block_I].isProtected) {
    Violation("erase of protected block " + std::to_string(block_I));
    return false;
  }
  if (mBlankSinceErase[block_I]) ++mNeedlessErases;
  std::fill(mContent[block_I].begin(), mContent[block_I].end(), 0xFF);
  Touch(block_I);
  mBlankSinceErase[block_I] = true;
  ++mEraseCounts[block_I];
  return true;
}

bool CLabFlash::Program(uint32_t address_I, const uint8_t* data_I, size_t size_I) {
  const int index = BlockOf(address_I);
  if (index < 0) {
    Violation("write at " + Hex(address_I) + ", outside the flash");
    return false;
  }
  const SLabFlashBlock& block = mLayout.blocks[index];
  const uint32_t offset = address_I - block.start;
  if (block.isProtected) {
    Violation("write at " + Hex(address_I) + ", into protected block " + std::to_string(index));
    return false;
  }
  if (size_t{offset} + size_I > block.size) {
    Violation("write at " + Hex(address_I) + " across the end of block " + std::to_string(index));
    return false;
  }
  if (block.wordSize != 0 && offset % block.wordSize != 0) {
    Violation("write at " + Hex(address_I) + ", off the word grid");
  }
  std::vector<uint8_t>& content = mContent[index];
  Touch(static_cast<uint32_t>(index));
  bool overUnerased = false;
  for (size_t i = 0; i < size_I; ++i) {
    uint8_t& cell = content[offset + i];
    if ((cell & data_I[i]) != data_I[i]) overUnerased = true;
    cell &= data_I[i];
  }
  if (overUnerased) Violation("write at " + Hex(address_I) + " over bytes not erased");
  mBlankSinceErase[index] = false;
  return true;
}

void CLabFlash::Read(uint32_t address_I, uint8_t* data_O, size_t size_I) const {
  for (size_t i = 0; i < size_I; ++i) {
    const uint32_t address = address_I + static_cast<uint32_t>(i);
    const int index = BlockOf(address);
    data_O[i] = index < 0 ? 0xFF : mContent[index][address - mLayout.blocks[index].start];
  }
}

uint32_t CLabFlash::ContentChecksum(uint32_t block_I) const {
  const std::vector<uint8_t>& content = mContent.at(block_I);
  uint32_t sum = 0;
  size_t i = 0;
  for (; i + 4 <= content.size(); i += 4) {
    sum += content[i] | (content[i + 1] << 8) | (content[i + 2] << 16) |
           (static_cast<uint32_t>(content[i + 3]) << 24);
  }
  // A block whose size is not a multiple of 4 ends in a word padded blank.
  if (i < content.size()) {
    uint32_t word = 0xFFFFFFFF;
    for (size_t k = 0; i + k < content.size(); ++k) {
      word &= ~(0xFFu << (8 * k));
      word |= static_cast<uint32_t>(content[i + k]) << (8 * k);
    }
    sum += word;
  }
  return sum;
}

void CLabFlash::CalculateChecksum(uint32_t block_I) {
  if (block_I < GetBlockCount()) mChecksums[block_I] = ContentChecksum(block_I);
}

void CLabFlash::SetChecksum(uint32_t block_I, uint32_t checksum_I) {
  if (block_I < GetBlockCount()) mChecksums[block_I] = checksum_I;
}

void CLabFlash::CommitChecksums() {
  bool allMatch = true;
  for (uint32_t i = 0; i < GetBlockCount(); ++i) {
    if (mChecksums[i] != ContentChecksum(i)) allMatch = false;
  }
  mRomChecksums = mChecksums;
  mRomMagicWord = allMatch ? kValidMagicWord : 0;
  mMagicWord = mRomMagicWord;
}

bool CLabFlash::IsImageValid() const {
  if (mRomMagicWord != kValidMagicWord) return false;
  for (uint32_t i = 0; i < GetBlockCount(); ++i) {
    if (mRomChecksums[i] != ContentChecksum(i)) return false;
  }
  return true;
}

void CLabFlash::Boot() {
  mChecksums = mRomChecksums;
  mMagicWord = mRomMagicWord;
}

void CLabFlash::Save(CLabStateFile& state_IO, const std::string& prefix_I) const {
  for (uint32_t i = 0; i < GetBlockCount(); ++i) {
    state_IO.PutBytes(prefix_I + ".block" + std::to_string(i), mContent[i], mContentRevisions[i]);
  }
  state_IO.PutBytes(prefix_I + ".checksums", NumbersToBytes(mChecksums));
  state_IO.PutBytes(prefix_I + ".rom-checksums", NumbersToBytes(mRomChecksums));
  state_IO.PutNumber(prefix_I + ".magic", mMagicWord);
  state_IO.PutNumber(prefix_I + ".rom-magic", mRomMagicWord);
}

void CLabFlash::Load(const CLabStateFile& state_I, const std::string& prefix_I) {
  for (uint32_t i = 0; i < GetBlockCount(); ++i) {
    std::vector<uint8_t> content;
    if (state_I.GetBytes(prefix_I + ".block" + std::to_string(i), content) &&
        content.size() == mContent[i].size()) {
      mContent[i] = std::move(content);
      Touch(i);
    }
  }
  std::vector<uint8_t> bytes;
  if (state_I.GetBytes(prefix_I + ".checksums", bytes)) BytesToNumbers(bytes, mChecksums);
  if (state_I.GetBytes(prefix_I + ".rom-checksums", bytes)) BytesToNumbers(bytes, mRomChecksums);
  mMagicWord = static_cast<uint32_t>(state_I.GetNumber(prefix_I + ".magic", 0));
  mRomMagicWord = static_cast<uint32_t>(state_I.GetNumber(prefix_I + ".rom-magic", 0));
}
