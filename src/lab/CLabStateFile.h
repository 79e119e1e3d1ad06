#pragma once
// One board's saved state: named byte strings and numbers, written to one
// file of the lab's state folder. The file is replaced whole, through a
// temporary file and a rename, so an interrupted save leaves the old one.
// It notes which parts of its entries a Put changed, in chunks of
// kChunkSize, for the journal that writes them through (CLabStateJournal).

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

class CLabStateFile {
 public:
  // A flash page: a page programmed is written through as itself.
  static constexpr size_t kChunkSize = 256;

  // A part of an entry that a Put changed; `size` is the entry's size.
  struct SChange {
    std::string key;
    size_t size = 0;
    size_t offset = 0;
    size_t length = 0;
  };

  // A non-zero `revision_I` that equals the one given with the entry last
  // time says the bytes did not change, and spares comparing them: large
  // flash contents are put after every report.
  void PutBytes(const std::string& key_I, const std::vector<uint8_t>& bytes_I,
                uint64_t revision_I = 0);
  // As above, from one who knows that since revision `since_I` only the
  // bytes in [begin_I, end_I) can have changed: where this file took that
  // revision, only those are compared. A page programmed then costs a page,
  // not the flash.
  void PutBytes(const std::string& key_I, const std::vector<uint8_t>& bytes_I, uint64_t revision_I,
                uint64_t since_I, size_t begin_I, size_t end_I);
  // The entry becomes `size_I` bytes long (new bytes zero), with `length_I`
  // bytes of `data_I` at `offset_I`, which must fit.
  void PutRange(const std::string& key_I, size_t size_I, size_t offset_I, const uint8_t* data_I,
                size_t length_I);
  void PutNumber(const std::string& key_I, uint64_t value_I);
  bool GetBytes(const std::string& key_I, std::vector<uint8_t>& bytes_O) const;
  uint64_t GetNumber(const std::string& key_I, uint64_t default_I) const;
  // The entry's bytes; empty when there is none.
  const std::vector<uint8_t>& Entry(const std::string& key_I) const;
  bool Has(const std::string& key_I) const { return mEntries.count(key_I) != 0; }
  // What the Puts changed since the last call, in the order they did.
  std::vector<SChange> TakeChanges() { return std::exchange(mChanges, {}); }

  bool Save(const std::string& path_I) const;
  // False when the file is missing or not a state file; the entries are
  // then empty.
  bool Load(const std::string& path_I);

 private:
  // Copies the chunks of [begin_I, end_I) that differ, noting each.
  void CopyChanged(const std::string& key_I, std::vector<uint8_t>& entry_IO,
                   const std::vector<uint8_t>& bytes_I, size_t begin_I, size_t end_I);

  std::map<std::string, std::vector<uint8_t>> mEntries;
  std::map<std::string, uint64_t> mRevisions;
  std::vector<SChange> mChanges;
};
