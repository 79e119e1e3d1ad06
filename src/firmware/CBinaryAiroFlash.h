#pragma once
// A Bluetooth module image: the whole file, byte for byte, with no test of
// its content. The programmer sends it from its start address, which is 0
// once an image is loaded and 0xFFFFFFFF (nothing loaded) before.

#include <cstdint>
#include <fstream>
#include <memory>
#include <string>

class CBinaryAiroFlash {
 public:
  static constexpr uint32_t kNotLoaded = 0xFFFFFFFF;

  CBinaryAiroFlash() = default;
  ~CBinaryAiroFlash();
  CBinaryAiroFlash(const CBinaryAiroFlash&) = delete;
  CBinaryAiroFlash& operator=(const CBinaryAiroFlash&) = delete;

  bool Load(const std::string& path_I);
  bool IsLoaded() const { return mStartAddress != kNotLoaded; }
  uint32_t StartAddress() const { return mStartAddress; }
  uint32_t Size() const { return mSize; }
  const uint8_t* GetData() const { return mData.get(); }

  bool OpenFile(const std::string& path_I);
  void CloseFile();
  uint64_t FileSize();
  // Back to not loaded and frees the image; the size stays.
  void ClearData();
  void DumpData() const;

 private:
  void ForgetImageShorterThanSize();

  std::string mFileName;
  std::ifstream mStream;
  uint32_t mSize = 0;
  std::unique_ptr<uint8_t[]> mData;
  uint32_t mDataSize = 0;  // bytes behind mData
  uint32_t mStartAddress = kNotLoaded;
};
