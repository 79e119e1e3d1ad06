#include "lab/CLabStateFile.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <fstream>

namespace {
const char kHeader[] = "tavik-lab-state 1\n";
}

void CLabStateFile::PutBytes(const std::string& key_I, const std::vector<uint8_t>& bytes_I,
                             uint64_t revision_I) {
  if (revision_I != 0) {
    uint64_t& known = mRevisions[key_I];
    if (known == revision_I && mEntries.count(key_I) != 0) return;
    known = revision_I;
  }
  auto [entry, added] = mEntries.try_emplace(key_I);
  std::vector<uint8_t>& bytes = entry->second;
  if (added || bytes.size() != bytes_I.size()) {
    bytes = bytes_I;
    mChanges.push_back({key_I, bytes.size(), 0, bytes.size()});
    return;
  }
  CopyChanged(key_I, bytes, bytes_I, 0, bytes.size());
}

void CLabStateFile::PutBytes(const std::string& key_I, const std::vector<uint8_t>& bytes_I,
                             uint64_t revision_I, uint64_t since_I, size_t begin_I, size_t end_I) {
  auto known = mRevisions.find(key_I);
  auto entry = mEntries.find(key_I);
  const bool tookSince = since_I != 0 && known != mRevisions.end() && known->second == since_I &&
                         entry != mEntries.end() && entry->second.size() == bytes_I.size();
  if (!tookSince || revision_I == 0) {
    PutBytes(key_I, bytes_I, revision_I);
    return;
  }
  known->second = revision_I;
  CopyChanged(key_I, entry->second, bytes_I, std::min(begin_I, bytes_I.size()),
              std::min(end_I, bytes_I.size()));
}

void CLabStateFile::CopyChanged(const std::string& key_I, std::vector<uint8_t>& entry_IO,
                                const std::vector<uint8_t>& bytes_I, size_t begin_I, size_t end_I) {
  // Compared before copied, chunk by chunk: a page programmed changes one.
  for (size_t offset = begin_I / kChunkSize * kChunkSize; offset < end_I; offset += kChunkSize) {
    const size_t length = std::min(kChunkSize, entry_IO.size() - offset);
    if (std::memcmp(entry_IO.data() + offset, bytes_I.data() + offset, length) == 0) continue;
    std::memcpy(entry_IO.data() + offset, bytes_I.data() + offset, length);
    mChanges.push_back({key_I, entry_IO.size(), offset, length});
  }
}

void CLabStateFile::PutRange(const std::string& key_I, size_t size_I, size_t offset_I,
                             const uint8_t* data_I, size_t length_I) {
  std::vector<uint8_t>& bytes = mEntries[key_I];
  bytes.resize(size_I);
  if (offset_I <= size_I && length_I <= size_I - offset_I) {
    std::copy(data_I, data_I + length_I, bytes.begin() + static_cast<std::ptrdiff_t>(offset_I));
  }
  mRevisions.erase(key_I);
  mChanges.push_back({key_I, size_I, offset_I, length_I});
}

void CLabStateFile::PutNumber(const std::string& key_I, uint64_t value_I) {
  const std::string text = std::to_string(value_I);
  PutBytes(key_I, std::vector<uint8_t>(text.begin(), text.end()));
}

bool CLabStateFile::GetBytes(const std::string& key_I, std::vector<uint8_t>& bytes_O) const {
  auto found = mEntries.find(key_I);
  if (found == mEntries.end()) return false;
  bytes_O = found->second;
  return true;
}

const std::vector<uint8_t>& CLabStateFile::Entry(const std::string& key_I) const {
  static const std::vector<uint8_t> kNone;
  auto found = mEntries.find(key_I);
  return found == mEntries.end() ? kNone : found->second;
}

uint64_t CLabStateFile::GetNumber(const std::string& key_I, uint64_t default_I) const {
  auto found = mEntries.find(key_I);
  if (found == mEntries.end()) return default_I;
  try {
    return std::stoull(std::string(found->second.begin(), found->second.end()));
  } catch (...) {
    return default_I;
  }
}

// Each entry: a line "key length", the bytes, a line feed.
bool CLabStateFile::Save(const std::string& path_I) const {
  const std::string temporary = path_I + ".new";
  {
    std::ofstream out(temporary, std::ios::binary | std::ios::trunc);
    if (!out) return false;
    out << kHeader;
    for (const auto& [key, bytes] : mEntries) {
      out << key << ' ' << bytes.size() << '\n';
      out.write(reinterpret_cast<const char*>(bytes.data()),
                static_cast<std::streamsize>(bytes.size()));
      out << '\n';
    }
    if (!out.flush()) return false;
  }
  return std::rename(temporary.c_str(), path_I.c_str()) == 0;
}

bool CLabStateFile::Load(const std::string& path_I) {
  mEntries.clear();
  mRevisions.clear();
  mChanges.clear();
  std::ifstream in(path_I, std::ios::binary | std::ios::ate);
  if (!in) return false;
  const std::streamoff fileSize = in.tellg();
  in.seekg(0);
  std::string line;
  if (!std::getline(in, line) || line + "\n" != kHeader) return false;
  while (std::getline(in, line)) {
    // "key length": a length of digits only, and no more than the file holds.
    const size_t blank = line.rfind(' ');
    const std::string key = blank == std::string::npos ? std::string() : line.substr(0, blank);
    const std::string digits = blank == std::string::npos ? std::string() : line.substr(blank + 1);
    if (key.empty() || digits.empty() || digits.size() > 12 ||
        digits.find_first_not_of("0123456789") != std::string::npos ||
        std::stoll(digits) > fileSize) {
      mEntries.clear();
      return false;
    }
    const size_t length = static_cast<size_t>(std::stoll(digits));
    std::vector<uint8_t> bytes(length);
    in.read(reinterpret_cast<char*>(bytes.data()), static_cast<std::streamsize>(length));
    if (static_cast<size_t>(in.gcount()) != length || in.get() != '\n') {
      mEntries.clear();
      return false;
    }
    mEntries[key] = std::move(bytes);
  }
  return true;
}
