#include "firmware/CStagingImage.h"

#include <sys/mman.h>

#include <algorithm>
#include <cstring>
#include <new>

namespace {

// Memory straight from the system, so that what is given back leaves the
// process at once; aligned to its size when asked.
uint8_t* MapAligned(size_t size_I, size_t alignment_I) {
  const size_t mapped = size_I + alignment_I;
  void* base = mmap(nullptr, mapped, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (base == MAP_FAILED) throw std::bad_alloc();
  const auto address = reinterpret_cast<uintptr_t>(base);
  const uintptr_t aligned = (address + alignment_I - 1) & ~(uintptr_t{alignment_I} - 1);
  if (aligned > address) munmap(base, aligned - address);
  if (aligned + size_I < address + mapped) {
    munmap(reinterpret_cast<void*>(aligned + size_I), address + mapped - aligned - size_I);
  }
  return reinterpret_cast<uint8_t*>(aligned);
}

}  // namespace

CStagingImage::~CStagingImage() { Clear(); }

CStagingImage::SPage& CStagingImage::MakePage(uint64_t key_I) {
  SPage& page = mPages[key_I];
  if (page.data != nullptr) return page;
  if (mNotes == nullptr) {
    // The budget bounds the pages made while records are placed.
    const uint64_t pages = std::min(mBudget / kPageSize, kPageCount);
    const size_t most = static_cast<size_t>(pages) * kStagedBytes;
    mNotesMapped = (most + kPageSize - 1) & ~(kPageSize - 1);
    mNotes = MapAligned(mNotesMapped, kPageSize);
    madvise(mNotes, mNotesMapped, MADV_HUGEPAGE);
  }
  mKeysMade.push_back(static_cast<uint32_t>(key_I));
  page.staged = reinterpret_cast<uint64_t*>(mNotes + mPagesMade++ * kStagedBytes);
  page.data = MapAligned(kPageSize, kPageSize);
  // Only a wish: without huge pages the page is taken 4 KiB at a time.
  madvise(page.data, kPageSize, MADV_HUGEPAGE);
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
  if (mNotes != nullptr) munmap(mNotes, mNotesMapped);
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
    munmap(page_IO.data, kPageSize);
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
