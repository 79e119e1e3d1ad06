#pragma once
// Append-only byte storage in large chunks mapped straight from the system,
// read back once in the order of writing. Reading gives each chunk back as
// soon as it has been passed, so data can move out of the arena into its
// final place without being held twice.

#include <cstddef>
#include <cstdint>
#include <vector>

class CByteArena {
 public:
  // Large enough to make the system calls rare, small enough that the chunk
  // being read adds little to the peak.
  static constexpr size_t kChunkSize = size_t{1} << 20;

  CByteArena() = default;
  ~CByteArena();
  CByteArena(const CByteArena&) = delete;
  CByteArena& operator=(const CByteArena&) = delete;

  // Room for size_I contiguous bytes. Throws std::bad_alloc.
  uint8_t* Append(size_t size_I);
  // The next size_I bytes in the order they were appended, asked for with the
  // same sizes as they were appended. Chunks left behind are given back.
  const uint8_t* ReadNext(size_t size_I);
  void Clear();

 private:
  struct SChunk {
    uint8_t* base = nullptr;
    size_t mapped = 0;
    size_t used = 0;
  };
  static void Release(SChunk& chunk_IO);

  std::vector<SChunk> mChunks;
  size_t mReadChunk = 0;
  size_t mReadOffset = 0;
};
