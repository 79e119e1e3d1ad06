#include "firmware/CBinaryAiroFlash.h"

#include <cstring>
#include <new>

#include "common/TavLog.h"
#include "firmware/HexDumpLog.h"

CBinaryAiroFlash::~CBinaryAiroFlash() {
  ClearData();
  CloseFile();
}

bool CBinaryAiroFlash::Load(const std::string& path_I) {
  if (!OpenFile(path_I)) {
    TavLog::Error("CBinaryAiroFlash::Load: ERROR - couldn't open file: %s\n", path_I.c_str());
    return false;
  }
  TavLog::Info("CBinaryAiroFlash::Load: - opened file: %s\n", path_I.c_str());

  const uint64_t fileSize = FileSize();
  mSize = static_cast<uint32_t>(fileSize);
  if (mSize == 0) {
    TavLog::Error("CBinaryAiroFlash::Load: ERROR - empty file: %s\n", path_I.c_str());
    return false;
  }
  std::unique_ptr<uint8_t[]> image;
  if (fileSize <= UINT32_MAX) image.reset(new (std::nothrow) uint8_t[mSize]);
  if (!image) {
    TavLog::Error("CBinaryAiroFlash::Load: ERROR - could not alloc data buf\n");
    ForgetImageShorterThanSize();
    return false;
  }
  std::memset(image.get(), 0, mSize);
  mStream.read(reinterpret_cast<char*>(image.get()), mSize);
  // A short read that ends at the end of the file is accepted: the rest of
  // the image stays zero.
  if (mStream.bad() || (mStream.fail() && !mStream.eof())) {
    TavLog::Error("CBinaryAiroFlash::Load: ERROR - read failed\n");
    ForgetImageShorterThanSize();
    return false;
  }

  CloseFile();
  mData = std::move(image);
  mDataSize = mSize;
  mStartAddress = 0;
  DumpData();
  TavLog::Info("CBinaryAiroFlash::Load: done!\n");
  return true;
}

// A failed load keeps the image of an earlier one, but has already taken the
// new file's size. Where that size is larger than the image, a programmer
// would read past it, so the image goes.
void CBinaryAiroFlash::ForgetImageShorterThanSize() {
  if (mSize > mDataSize) ClearData();
}

bool CBinaryAiroFlash::OpenFile(const std::string& path_I) {
  // A failed load leaves its stream open; a new load starts afresh.
  CloseFile();
  mStream.clear();
  mStream.open(path_I, std::ios::in | std::ios::binary);
  if (mStream.is_open()) mFileName = path_I;
  return mStream.is_open();
}

void CBinaryAiroFlash::CloseFile() {
  if (mStream.is_open()) mStream.close();
}

uint64_t CBinaryAiroFlash::FileSize() {
  if (!mStream.is_open()) return 0;
  mStream.seekg(0, std::ios::end);
  const std::streamoff end = mStream.tellg();
  mStream.seekg(0, std::ios::beg);
  return end > 0 ? static_cast<uint64_t>(end) : 0;
}

void CBinaryAiroFlash::ClearData() {
  mStartAddress = kNotLoaded;
  mData.reset();
  mDataSize = 0;
}

void CBinaryAiroFlash::DumpData() const {
  HexDumpLog::Write("CBinaryAiroFlash flash data:\n", mData.get(), mData ? mDataSize : 0);
}
