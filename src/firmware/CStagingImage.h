#pragma once
// Record data at its own addresses while an S-record file is read, so that
// the blocks can afterwards be filled front to back whatever the order of
// the file, and the staged bytes given back as the filling passes them.
//
// Bytes are staged only where no byte of the record was staged before: what
// is staged is then exactly the data of the record that put it there. The
// address line is taken in pages as records come, up to a budget; a record
// that would pass the budget, or meets staged bytes, is refused and kept
// elsewhere by the caller. A page is 2 MiB, aligned and offered to the
// system as a huge page where it has them: records of a shuffled file land
// anywhere in the image, and small pages would cost a fault and a missed
// translation for nearly every one.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

class CStagingImage {
 public:
  static constexpr unsigned kPageBits = 21;
  static constexpr size_t kPageSize = size_t{1} << kPageBits;

  CStagingImage() = default;
  ~CStagingImage();
  CStagingImage(const CStagingImage&) = delete;
  CStagingImage& operator=(const CStagingImage&) = delete;

  // The most bytes of pages taken at any time; none at first.
  void SetBudget(uint64_t bytes_I) { mBudget = bytes_I; }
  // Stages the record when none of its bytes is staged yet, it has data, lies
  // below 4 GiB and its new pages fit the budget. False, staging nothing,
  // otherwise. Throws std::bad_alloc.
  bool Place(uint64_t address_I, const uint8_t* data_I, size_t size_I);
  // Asks for the memory a record at address_I would touch.
  void Expect(uint64_t address_I) const {
    const SPage* page = mPlacing ? FindPage(address_I >> kPageBits) : nullptr;
    if (page == nullptr) return;
    const size_t offset = address_I & (kPageSize - 1);
    __builtin_prefetch(&page->staged[offset >> 6]);
    __builtin_prefetch(page->data + offset, 1);
  }
  // Frees the notes of which bytes are staged: nothing is placed afterwards.
  void ForgetStaged();
  // Appends the bytes from address_I on; a page never taken gives zeros.
  // With release_I, each page the copy goes past the end of is given back.
  void CopyOut(uint64_t address_I, size_t size_I, std::vector<uint8_t>& out_IO, bool release_I);
  // Gives back every page that ends at or below address_I.
  void ReleaseBelow(uint64_t address_I);
  void Clear();

 private:
  static constexpr uint64_t kPageCount = (uint64_t{1} << 32) >> kPageBits;
  static constexpr size_t kStagedBytes = kPageSize / 8;
  struct SPage {
    uint8_t* data = nullptr;
    uint64_t* staged = nullptr;  // a bit a byte
  };

  SPage* FindPage(uint64_t key_I) const {
    SPage* page = &mPages[key_I];
    return page->data == nullptr ? nullptr : page;
  }
  SPage& MakePage(uint64_t key_I);
  static bool AnyStaged(const uint64_t* bits_I, size_t first_I, size_t count_I);
  static void MarkStaged(uint64_t* bits_IO, size_t first_I, size_t count_I);
  void ReleasePage(SPage& page_IO);
  void ForgetStagedNotes();

  // A page of every 2 MiB below 4 GiB: 32 KiB.
  std::unique_ptr<SPage[]> mPages{new SPage[kPageCount]{}};
  // The notes of all pages in one mapping, a page's share after another's in
  // the order the pages are made, offered as huge pages like the data.
  uint8_t* mNotes = nullptr;
  size_t mNotesMapped = 0;
  size_t mPagesMade = 0;
  uint64_t mBudget = 0;
  uint64_t mPagesTaken = 0;
  uint64_t mReleasedKeys = 0;  // pages below this one are given back
  // The pages made since the last clear: clearing visits these, not all
  // 2048 slots, for a file that touched a few.
  std::vector<uint32_t> mKeysMade;
  bool mPlacing = true;
};
