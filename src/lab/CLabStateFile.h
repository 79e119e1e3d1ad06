#pragma once
// One board's saved state: named byte strings and numbers, written to one
// file of the lab's state folder. The file is replaced whole, through a
// temporary file and a rename, so an interrupted save leaves the old one.

#include <cstdint>
#include <map>
#include <string>
#include <vector>

class CLabStateFile {
 public:
  void PutBytes(const std::string& key_I, const std::vector<uint8_t>& bytes_I);
  void PutNumber(const std::string& key_I, uint64_t value_I);
  bool GetBytes(const std::string& key_I, std::vector<uint8_t>& bytes_O) const;
  uint64_t GetNumber(const std::string& key_I, uint64_t default_I) const;
  bool Has(const std::string& key_I) const { return mEntries.count(key_I) != 0; }

  bool Save(const std::string& path_I) const;
  // False when the file is missing or not a state file; the entries are
  // then empty.
  bool Load(const std::string& path_I);

 private:
  std::map<std::string, std::vector<uint8_t>> mEntries;
};
