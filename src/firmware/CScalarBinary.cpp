#include "firmware/CScalarBinary.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <new>

#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "firmware/HexDumpLog.h"

namespace {

constexpr std::array<uint8_t, 256> MakeCrc8Table() {
  std::array<uint8_t, 256> table{};
  for (int value = 0; value < 256; ++value) {
    uint8_t crc = static_cast<uint8_t>(value);
    for (int bit = 0; bit < 8; ++bit) {
      crc = static_cast<uint8_t>(crc & 0x80 ? (crc << 1) ^ 0x07 : crc << 1);
    }
    table[static_cast<size_t>(value)] = crc;
  }
  return table;
}
constexpr std::array<uint8_t, 256> kCrc8Table = MakeCrc8Table();

}  // namespace

CScalarBinary::~CScalarBinary() { mData.clear(); }

bool CScalarBinary::Load(const std::string& path_I) {
  if (!OpenFile(path_I)) {
    TavLog::Error("CScalarBinary::Load: ERROR - couldn't open file: %s\n", path_I.c_str());
    return false;
  }
  TavLog::Info("CScalarBinary::Load: - opened file: %s\n", path_I.c_str());

  const uint64_t fileSize = FileSize();
  mSize = static_cast<uint32_t>(fileSize);
  if (mSize == 0) {
    // The text names the buffer, although the cause is an empty file.
    TAVASSERT_TEXT("\"CScalarBinary::Load - ERROR - could not alloc data buf\"");
    CloseFile();
    return false;
  }
  std::vector<uint8_t> bytes;
  size_t got = 0;
  try {
    if (fileSize <= UINT32_MAX) {
      bytes.resize(mSize);
      mStream.read(reinterpret_cast<char*>(bytes.data()), mSize);
      got = static_cast<size_t>(mStream.gcount());
    }
  } catch (const std::bad_alloc&) {
    got = 0;
  }
  if (got != mSize || mStream.bad() || (mStream.fail() && !mStream.eof())) {
    TavLog::Error("CScalarBinary::Load: ERROR - read failed\n");
    CloseFile();
    return false;
  }

  CloseFile();
  mData = std::move(bytes);
  return Prepare(mData);
}

bool CScalarBinary::Prepare(const std::vector<uint8_t>& bytes_I) {
  std::vector<BLOCKDATA_SCALAR>().swap(mBlocks);
  if (bytes_I.empty()) return false;

  mBlocks.reserve((bytes_I.size() + kBlockDataSize - 1) / kBlockDataSize);
  for (size_t offset = 0; offset < bytes_I.size(); offset += kBlockDataSize) {
    BLOCKDATA_SCALAR block;
    block.offset[0] = static_cast<uint8_t>(offset >> 16);
    block.offset[1] = static_cast<uint8_t>(offset >> 8);
    block.offset[2] = static_cast<uint8_t>(offset);
    std::memset(block.data, 0xFF, kBlockDataSize);
    std::memcpy(block.data, bytes_I.data() + offset,
                std::min(kBlockDataSize, bytes_I.size() - offset));
    block.crc = CRC8_ATM(block.data, static_cast<int>(kBlockDataSize), 0);
    mBlocks.push_back(block);
  }
  return true;
}

void CScalarBinary::Clear() {
  std::vector<BLOCKDATA_SCALAR>().swap(mBlocks);
  mData.clear();
}

const BLOCKDATA_SCALAR* CScalarBinary::BlockPtr(unsigned long index_I) const {
  return index_I < mBlocks.size() ? &mBlocks[index_I] : nullptr;
}

bool CScalarBinary::OpenFile(const std::string& path_I) {
  CloseFile();
  mStream.clear();
  mStream.open(path_I, std::ios::in | std::ios::binary);
  if (mStream.is_open()) mFileName = path_I;
  return mStream.is_open();
}

void CScalarBinary::CloseFile() {
  if (mStream.is_open()) mStream.close();
}

uint64_t CScalarBinary::FileSize() {
  if (!mStream.is_open()) return 0;
  mStream.seekg(0, std::ios::end);
  const std::streamoff end = mStream.tellg();
  mStream.seekg(0, std::ios::beg);
  return end > 0 ? static_cast<uint64_t>(end) : 0;
}

void CScalarBinary::DumpData() const {
  HexDumpLog::Write("CScalarBinary flash data:\n", mData.data(), mData.size());
}

uint8_t CScalarBinary::CRC8_ATM(const uint8_t* data_I, int length_I, uint8_t initial_I) {
  if (length_I < 1) return 0;
  uint8_t crc = initial_I;
  for (int i = 0; i < length_I; ++i) crc = kCrc8Table[crc ^ data_I[i]];
  return crc;
}
