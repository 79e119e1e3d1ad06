#pragma once
// A touch controller image in Intel hex text, held as one flat image. The
// target takes exactly one shape: an image that starts at 0x8000 and fits in
// 180224 bytes; gaps between records read 0xFF.

#include <array>
#include <cstdint>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

class CIntelHex {
 public:
  static constexpr uint32_t kNotLoaded = 0xFFFFFFFF;
  // Room of the working image and of the held image.
  static constexpr uint32_t kImageCapacity = 196608;
  // Largest image the target takes, and where it must start.
  static constexpr uint32_t kMaxSize = 180224;
  static constexpr uint32_t kRequiredStart = 0x8000;
  // The image is sent in whole pages of this size.
  static constexpr uint32_t kSizeGranule = 512;

  CIntelHex() = default;
  virtual ~CIntelHex();
  CIntelHex(const CIntelHex&) = delete;
  CIntelHex& operator=(const CIntelHex&) = delete;

  bool Load(const std::string& path_I);
  bool IsLoaded() const { return mStartAddress != kNotLoaded; }
  uint32_t StartAddress() const { return mStartAddress; }
  // A multiple of 512 after a load.
  uint32_t Size() const { return mSize; }
  // The 16-bit sum of the image's bytes taken as signed values.
  uint32_t Checksum() const { return mChecksum; }
  // Always kImageCapacity bytes behind it, whatever Size() says.
  const uint8_t* GetData() const { return mByteData.data(); }

  void ClearData();
  bool OpenFile(const std::string& path_I);
  void CloseFile();
  uint64_t FileSize();
  void DumpData() const;

 private:
  struct SParsed {
    std::vector<uint8_t> romData;  // rom_data
    uint32_t maxAddress = 0;       // max_address
    bool startSet = false;
    uint32_t startAddress = 0;  // start_address
  };

  bool ReadText(uint64_t fileSize_I);
  void StoreText(size_t position_I, const char* text_I, size_t length_I);
  bool ParseRecords(SParsed& parsed_O) const;
  bool ParseDataRecord(size_t position_I, uint32_t count_I, uint32_t fullAddress_I, long sum_I,
                       SParsed& parsed_IO) const;
  bool Finish(const SParsed& parsed_I);
  char CharAt(size_t position_I) const;
  long HexField(size_t position_I, size_t width_I) const;

  std::string mFileName;
  std::ifstream mStream;
  uint32_t mStartAddress = kNotLoaded;
  uint32_t mSize = 0;
  uint32_t mChecksum = 0;
  std::array<uint8_t, kImageCapacity> mByteData{};  // m_byteData
  std::unique_ptr<char[]> mReadBuffer;
  size_t mReadBufferSize = 0;  // one more than the file, for a terminator past it
  size_t mTextSize = 0;
};
