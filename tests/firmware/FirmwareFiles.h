#pragma once
// Firmware files for tests: a private folder under TMPDIR that goes with the
// test, and builders for S-record and Intel hex lines with right checksums.

#include <stdlib.h>

#include <cstdint>
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
    const std::string path = Path(name_I);
    std::ofstream(path, std::ios::binary) << content_I;
    return path;
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

// One S1, S2 or S3 line (type_I '1', '2' or '3') with its count and checksum.
inline std::string SRecLine(char type_I, uint32_t address_I, const std::vector<uint8_t>& data_I) {
  const int addressBytes = type_I == '1' ? 2 : type_I == '2' ? 3 : 4;
  std::vector<uint8_t> body;
  body.reserve(data_I.size() + 6);
  body.push_back(static_cast<uint8_t>(addressBytes + data_I.size() + 1));
  for (int i = addressBytes - 1; i >= 0; --i) {
    body.push_back(static_cast<uint8_t>(address_I >> (8 * i)));
  }
  body.insert(body.end(), data_I.begin(), data_I.end());
  unsigned sum = 0;
  for (uint8_t byte : body) sum += byte;
  body.push_back(static_cast<uint8_t>(~sum));
  std::string line(1, 'S');
  line.push_back(type_I);
  line.append(HexBytes(body));
  return line;
}

// One Intel hex record with its checksum, without line end.
inline std::string HexRecord(uint8_t type_I, uint16_t address_I,
                             const std::vector<uint8_t>& data_I) {
  std::vector<uint8_t> body;
  body.reserve(data_I.size() + 5);
  body.push_back(static_cast<uint8_t>(data_I.size()));
  body.push_back(static_cast<uint8_t>(address_I >> 8));
  body.push_back(static_cast<uint8_t>(address_I));
  body.push_back(type_I);
  body.insert(body.end(), data_I.begin(), data_I.end());
  unsigned sum = 0;
  for (uint8_t byte : body) sum += byte;
  body.push_back(static_cast<uint8_t>(-sum));
  std::string record(1, ':');
  record.append(HexBytes(body));
  return record;
}

inline std::vector<uint8_t> Bytes(size_t count_I, uint8_t first_I = 0) {
  std::vector<uint8_t> bytes(count_I);
  for (size_t i = 0; i < count_I; ++i) bytes[i] = static_cast<uint8_t>(first_I + i);
  return bytes;
}
