#pragma once
// Firmware files for tests: a private folder under TMPDIR that goes with the
// test, and builders for S-record and Intel hex lines with right checksums.

#include <stdlib.h>

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

class CTempFolder {
 public:
  CTempFolder() {
    const char* base = std::getenv("TMPDIR");
    std::string pattern = std::string(base != nullptr ? base : "/tmp") + "/firmware-XXXXXX";
    mPath = mkdtemp(pattern.data()) != nullptr ? pattern : std::string();
  }
  ~CTempFolder() {
    std::error_code ignored;
    if (!mPath.empty()) std::filesystem::remove_all(mPath, ignored);
  }
  CTempFolder(const CTempFolder&) = delete;
  CTempFolder& operator=(const CTempFolder&) = delete;

  std::string Path(const std::string& name_I) const { return mPath + "/" + name_I; }
  std::string Write(const std::string& name_I, const std::string& content_I) const {
    std::ofstream(Path(name_I), std::ios::binary) << content_I;
    return Path(name_I);
  }
  std::string Write(const std::string& name_I, const std::vector<uint8_t>& content_I) const {
    return Write(name_I, std::string(content_I.begin(), content_I.end()));
  }
  static std::string Read(const std::string& path_I) {
    std::ifstream in(path_I, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
  }

 private:
  std::string mPath;
};

inline std::string HexBytes(const std::vector<uint8_t>& bytes_I) {
  static const char kDigits[] = "0123456789ABCDEF";
  std::string text;
  for (uint8_t byte : bytes_I) {
    text += kDigits[byte >> 4];
    text += kDigits[byte & 0x0F];
  }
  return text;
}

// The count (S-record) or length (Intel hex), address and data; the callers
// add the record type and the checksum.
inline std::vector<uint8_t> RecordBody(uint8_t count_I, uint32_t address_I, int addressBytes_I,
                                       const std::vector<uint8_t>& data_I) {
  // Reserved and filled by push_back: GCC 12 at -O3 misreads the growth of
  // a vector made from an initializer list as an overflow.
  std::vector<uint8_t> body;
  body.reserve(data_I.size() + 8);
  body.push_back(count_I);
  for (int i = addressBytes_I - 1; i >= 0; --i) body.push_back(uint8_t(address_I >> (8 * i)));
  body.insert(body.end(), data_I.begin(), data_I.end());
  return body;
}

inline uint8_t ByteSum(const std::vector<uint8_t>& bytes_I) {
  unsigned sum = 0;
  for (uint8_t byte : bytes_I) sum += byte;
  return static_cast<uint8_t>(sum);
}

// One S1, S2 or S3 line (type_I '1', '2' or '3') with its count and checksum.
inline std::string SRecLine(char type_I, uint32_t address_I, const std::vector<uint8_t>& data_I) {
  const int addressBytes = type_I - '0' + 1;
  std::vector<uint8_t> body =
      RecordBody(uint8_t(addressBytes + data_I.size() + 1), address_I, addressBytes, data_I);
  body.push_back(static_cast<uint8_t>(~ByteSum(body)));
  return std::string("S") + type_I + HexBytes(body);
}

// One Intel hex record with its checksum, without line end.
inline std::string HexRecord(uint8_t type_I, uint16_t address_I,
                             const std::vector<uint8_t>& data_I) {
  std::vector<uint8_t> body = RecordBody(uint8_t(data_I.size()), address_I, 2, {});
  body.push_back(type_I);
  body.insert(body.end(), data_I.begin(), data_I.end());
  body.push_back(static_cast<uint8_t>(-ByteSum(body)));
  return ":" + HexBytes(body);
}

inline std::vector<uint8_t> Bytes(size_t count_I, uint8_t first_I = 0) {
  std::vector<uint8_t> bytes(count_I);
  for (size_t i = 0; i < count_I; ++i) bytes[i] = static_cast<uint8_t>(first_I + i);
  return bytes;
}
