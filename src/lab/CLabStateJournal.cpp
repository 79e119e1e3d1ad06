#include "lab/CLabStateJournal.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <vector>

namespace {

// A batch: the magic, the payload's length and check value, the payload:
// per entry the key's length, the key, the value's length, the value.
constexpr char kBatchMagic[4] = {'T', 'L', 'J', '1'};
constexpr size_t kBatchHeader = 12;
// Fold once the log is this much larger than the snapshot: rare enough to
// cost nothing, early enough to keep the folder small.
constexpr uint64_t kFoldSlack = 1u << 20;

void PutWord(std::vector<uint8_t>& out_IO, uint32_t value_I) {
  for (int shift = 0; shift < 32; shift += 8)
    out_IO.push_back(static_cast<uint8_t>(value_I >> shift));
}

uint32_t GetWord(const uint8_t* bytes_I) {
  return bytes_I[0] | bytes_I[1] << 8 | bytes_I[2] << 16 | static_cast<uint32_t>(bytes_I[3]) << 24;
}

// FNV-1a: a torn or stale batch is what it has to catch, not an attacker.
uint32_t CheckValue(const uint8_t* bytes_I, size_t size_I) {
  uint32_t hash = 2166136261u;
  for (size_t i = 0; i < size_I; ++i) hash = (hash ^ bytes_I[i]) * 16777619u;
  return hash;
}

bool WriteAll(int fd_I, const std::vector<uint8_t>& bytes_I) {
  size_t done = 0;
  while (done < bytes_I.size()) {
    const ssize_t written = write(fd_I, bytes_I.data() + done, bytes_I.size() - done);
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return false;
    done += static_cast<size_t>(written);
  }
  return true;
}

uint64_t FileSize(const std::string& path_I) {
  struct stat info {};
  return stat(path_I.c_str(), &info) == 0 ? static_cast<uint64_t>(info.st_size) : 0;
}

}  // namespace

CLabStateJournal::~CLabStateJournal() {
  if (mFd >= 0) close(mFd);
}

bool CLabStateJournal::Open(const std::string& statePath_I) {
  mPath = statePath_I;
  mState.TakeChanges();
  // The snapshot first: a log left by an earlier run is already in it.
  if (!mState.Save(mPath)) return false;
  mSnapshotSize = FileSize(mPath);
  if (mFd >= 0) close(mFd);
  mFd = open(LogPath(mPath).c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC, 0600);
  mLogSize = 0;
  return mFd >= 0;
}

bool CLabStateJournal::Record() {
  if (mFd < 0) return false;
  const std::vector<CLabStateFile::SChange> changes = mState.TakeChanges();
  if (changes.empty()) return true;
  std::vector<uint8_t> batch(kBatchHeader);
  for (const CLabStateFile::SChange& change : changes) {
    // The bytes as they are now: a later change of the same part is in them.
    const std::vector<uint8_t>& value = mState.Entry(change.key);
    const size_t offset = std::min(change.offset, value.size());
    const size_t length = std::min(change.length, value.size() - offset);
    PutWord(batch, static_cast<uint32_t>(change.key.size()));
    batch.insert(batch.end(), change.key.begin(), change.key.end());
    PutWord(batch, static_cast<uint32_t>(value.size()));
    PutWord(batch, static_cast<uint32_t>(offset));
    PutWord(batch, static_cast<uint32_t>(length));
    batch.insert(batch.end(), value.begin() + static_cast<std::ptrdiff_t>(offset),
                 value.begin() + static_cast<std::ptrdiff_t>(offset + length));
  }
  const size_t payload = batch.size() - kBatchHeader;
  std::memcpy(batch.data(), kBatchMagic, 4);
  std::vector<uint8_t> header;
  PutWord(header, static_cast<uint32_t>(payload));
  PutWord(header, CheckValue(batch.data() + kBatchHeader, payload));
  std::copy(header.begin(), header.end(), batch.begin() + 4);
  if (!WriteAll(mFd, batch)) return false;
  mLogSize += batch.size();
  if (mLogSize > 2 * mSnapshotSize + kFoldSlack) return Fold();
  return true;
}

bool CLabStateJournal::Fold() {
  if (mFd < 0) return false;
  if (!Record()) return false;
  if (!mState.Save(mPath)) return false;
  mSnapshotSize = FileSize(mPath);
  // A kill before this leaves a log that the new snapshot already holds.
  if (ftruncate(mFd, 0) != 0) return false;
  mLogSize = 0;
  return true;
}

int CLabStateJournal::Replay(const std::string& logPath_I, CLabStateFile& state_IO) {
  const int fd = open(logPath_I.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return 0;
  std::vector<uint8_t> log;
  uint8_t buffer[1 << 16];
  for (ssize_t got; (got = read(fd, buffer, sizeof buffer)) != 0;) {
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) break;
    log.insert(log.end(), buffer, buffer + got);
  }
  close(fd);

  int applied = 0;
  size_t at = 0;
  while (log.size() - at >= kBatchHeader && std::memcmp(&log[at], kBatchMagic, 4) == 0) {
    const uint32_t payload = GetWord(&log[at + 4]);
    if (payload > log.size() - at - kBatchHeader) break;
    const uint8_t* begin = &log[at + kBatchHeader];
    if (CheckValue(begin, payload) != GetWord(&log[at + 8])) break;
    // The check value holds, so the lengths inside were written as they are.
    struct SRange {
      std::string key;
      uint32_t size, offset, length;
      const uint8_t* bytes;
    };
    std::vector<SRange> ranges;
    size_t inside = 0;
    bool whole = true;
    auto word = [&](uint32_t& value_O) {
      whole = whole && payload - inside >= 4;
      if (whole) value_O = GetWord(begin + inside);
      inside += whole ? 4 : 0;
    };
    while (inside < payload && whole) {
      SRange range{};
      uint32_t keyLength = 0;
      word(keyLength);
      whole = whole && keyLength <= payload - inside;
      if (!whole) break;
      range.key.assign(begin + inside, begin + inside + keyLength);
      inside += keyLength;
      word(range.size);
      word(range.offset);
      word(range.length);
      whole = whole && range.length <= payload - inside && range.offset <= range.size &&
              range.length <= range.size - range.offset;
      if (!whole) break;
      range.bytes = begin + inside;
      inside += range.length;
      ranges.push_back(std::move(range));
    }
    if (!whole) break;
    for (const SRange& range : ranges) {
      state_IO.PutRange(range.key, range.size, range.offset, range.bytes, range.length);
    }
    ++applied;
    at += kBatchHeader + payload;
  }
  state_IO.TakeChanges();
  return applied;
}
