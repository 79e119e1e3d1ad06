#include "firmware/CByteArena.h"

#include <sys/mman.h>

#include <new>

CByteArena::~CByteArena() { Clear(); }

uint8_t* CByteArena::Append(size_t size_I) {
  if (mChunks.empty() || mChunks.back().mapped - mChunks.back().used < size_I) {
    SChunk chunk;
    chunk.mapped = size_I > kChunkSize ? size_I : kChunkSize;
    void* base =
        mmap(nullptr, chunk.mapped, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (base == MAP_FAILED) throw std::bad_alloc();
    chunk.base = static_cast<uint8_t*>(base);
    mChunks.push_back(chunk);
  }
  SChunk& chunk = mChunks.back();
  uint8_t* room = chunk.base + chunk.used;
  chunk.used += size_I;
  return room;
}

const uint8_t* CByteArena::ReadNext(size_t size_I) {
  // A piece never spans two chunks: Append started a new chunk where the
  // current one had too little room, and reading follows the same rule.
  while (mReadChunk < mChunks.size() && mChunks[mReadChunk].used - mReadOffset < size_I) {
    Release(mChunks[mReadChunk]);
    ++mReadChunk;
    mReadOffset = 0;
  }
  if (mReadChunk == mChunks.size()) return nullptr;
  const uint8_t* piece = mChunks[mReadChunk].base + mReadOffset;
  mReadOffset += size_I;
  return piece;
}

void CByteArena::Clear() {
  for (SChunk& chunk : mChunks) Release(chunk);
  std::vector<SChunk>().swap(mChunks);
  mReadChunk = 0;
  mReadOffset = 0;
}

void CByteArena::Release(SChunk& chunk_IO) {
  if (chunk_IO.base != nullptr) munmap(chunk_IO.base, chunk_IO.mapped);
  chunk_IO = SChunk{};
}
