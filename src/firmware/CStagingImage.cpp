#include "firmware/CStagingImage.h"

#include <algorithm>
#include <cstring>

#include "common/SystemMemory.h"

CStagingImage::~CStagingImage() { Clear(); }

CStagingImage::SPage& CStagingImage::MakePage(uint64_t key_I) {
  SPage& page = mPages[key_I];
  if (page.data != nullptr) return page;
  if (mNotes == nullptr) {
    // The budget bounds the pages made while records are placed.
    const uint64_t pages = std::min(mBudget / kPageSize, kPageCount);
    const size_t most = static_cast<size_t>(pages) * kStagedBytes;
    mNotesMapped = (most + kPageSize - 1) & ~(kPageSize - 1);
    mNotes = SystemMemory::Map(mNotesMapped, kPageSize);
    SystemMemory::PreferHugePages(mNotes, mNotesMapped);
  }
  mKeysMade.push_back(static_cast<uint32_t>(key_I));
  page.staged = reinterpret_cast<uint64_t*>(mNotes + mPagesMade++ * kStagedBytes);
  page.data = SystemMemory::Map(kPageSize, kPageSize);
  SystemMemory::PreferHugePages(page.data, kPageSize);
  ++mPagesTaken;
  return page;
}

bool CStagingImage::Place(uint64_t address_I, const uint8_t* data_I, size_t size_I) {
  const uint64_t end = address_I + size_I;
  if (!mPlacing || size_I == 0 || end > (uint64_t{1} << 32)) return false;
  const uint64_t firstKey = address_I >> kPageBits;
  const uint64_t lastKey = (end - 1) >> kPageBits;
  uint64_t newPages = 0;
  for (uint64_t key = firstKey; key <= lastKey; ++key) {
    const SPage* page = FindPage(key);
    if (page == nullptr) {
      ++newPages;
      continue;
    }
    const uint64_t from = std::max(address_I, key << kPageBits);
    const uint64_t to = std::min(end, (key + 1) << kPageBits);
    if (AnyStaged(page->staged, from & (kPageSize - 1), to - from)) return false;
  }
  if ((mPagesTaken + newPages) * kPageSize > mBudget) return false;
  for (uint64_t key = firstKey; key <= lastKey; ++key) {
    SPage& page = MakePage(key);
    const uint64_t from = std::max(address_I, key << kPageBits);
    const uint64_t to = std::min(end, (key + 1) << kPageBits);
    const size_t offset = from & (kPageSize - 1);
    std::memcpy(page.data + offset, data_I + (from - address_I), to - from);
    MarkStaged(page.staged, offset, to - from);
  }
  return true;
}

void CStagingImage::ForgetStaged() {
  mPlacing = false;
  ForgetStagedNotes();
}

void CStagingImage::ForgetStagedNotes() {
  for (const uint32_t key : mKeysMade) mPages[key].staged = nullptr;
  SystemMemory::Unmap(mNotes, mNotesMapped);
  mNotes = nullptr;
  mNotesMapped = 0;
  mPagesMade = 0;
}

void CStagingImage::CopyOut(uint64_t address_I, size_t size_I, std::vector<uint8_t>& out_IO,
                            bool release_I) {
  const uint64_t end = address_I + size_I;
  for (uint64_t from = address_I; from < end;) {
    const uint64_t key = from >> kPageBits;
    const uint64_t to = std::min(end, (key + 1) << kPageBits);
    SPage* page = key < kPageCount ? FindPage(key) : nullptr;
    if (page == nullptr) {
      out_IO.resize(out_IO.size() + (to - from));
    } else {
      const uint8_t* bytes = page->data + (from & (kPageSize - 1));
      out_IO.insert(out_IO.end(), bytes, bytes + (to - from));
      if (release_I && to == (key + 1) << kPageBits) ReleasePage(*page);
    }
    from = to;
  }
}

void CStagingImage::ReleaseBelow(uint64_t address_I) {
  const uint64_t below = std::min(address_I >> kPageBits, kPageCount);
  for (; mReleasedKeys < below; ++mReleasedKeys) ReleasePage(mPages[mReleasedKeys]);
}

void CStagingImage::Clear() {
  for (const uint32_t key : mKeysMade) ReleasePage(mPages[key]);
  ForgetStagedNotes();
  mKeysMade.clear();
  mReleasedKeys = 0;
  mPlacing = true;
}

void CStagingImage::ReleasePage(SPage& page_IO) {
  if (page_IO.data != nullptr) {
    SystemMemory::Unmap(page_IO.data, kPageSize);
    --mPagesTaken;
  }
  page_IO.data = nullptr;
  page_IO.staged = nullptr;
}

bool CStagingImage::AnyStaged(const uint64_t* bits_I, size_t first_I, size_t count_I) {
  for (size_t bit = first_I, end = first_I + count_I; bit < end;) {
    const size_t inWord = bit & 63;
    const size_t now = std::min<size_t>(64 - inWord, end - bit);
    const uint64_t mask = (now == 64 ? ~uint64_t{0} : (uint64_t{1} << now) - 1) << inWord;
    if ((bits_I[bit >> 6] & mask) != 0) return true;
    bit += now;
  }
  return false;
}

void CStagingImage::MarkStaged(uint64_t* bits_IO, size_t first_I, size_t count_I) {
  for (size_t bit = first_I, end = first_I + count_I; bit < end;) {
    const size_t inWord = bit & 63;
    const size_t now = std::min<size_t>(64 - inWord, end - bit);
    bits_IO[bit >> 6] |= (now == 64 ? ~uint64_t{0} : (uint64_t{1} << now) - 1) << inWord;
    bit += now;
  }
}
