#include "firmware/CByteArena.h"

#include "common/SystemMemory.h"

CByteArena::~CByteArena() { Clear(); }

uint8_t* CByteArena::Append(size_t size_I) {
  if (mChunks.empty() || mChunks.back().mapped - mChunks.back().used < size_I) {
    SChunk chunk;
    chunk.mapped = size_I > kChunkSize ? size_I : kChunkSize;
    chunk.base = SystemMemory::Map(chunk.mapped);
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
  SystemMemory::Unmap(chunk_IO.base, chunk_IO.mapped);
  chunk_IO = SChunk{};
}
