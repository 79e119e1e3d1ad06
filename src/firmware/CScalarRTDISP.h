#pragma once
// A display scalar image for in-system programming over the bridge link: the
// whole file, byte for byte, with no test of its content.

#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

class CScalarRTDISP {
 public:
  CScalarRTDISP() = default;
  ~CScalarRTDISP();
  CScalarRTDISP(const CScalarRTDISP&) = delete;
  CScalarRTDISP& operator=(const CScalarRTDISP&) = delete;

  bool Load(const std::string& path_I);
  // True while the image holds as many bytes as the size says. A new object
  // has both at 0 and so answers true; a read that failed after the size was
  // taken answers false.
  bool IsLoaded() const { return mData.size() == mSize; }
  uint32_t Size() const { return mSize; }
  std::vector<uint8_t> GetData() const { return mData; }

  bool OpenFile(const std::string& path_I);
  void CloseFile();
  uint64_t FileSize();
  // Empties the image; the size stays.
  void ClearData();
  void DumpData() const;

 private:
  std::string mFileName;
  std::ifstream mStream;
  uint32_t mSize = 0;
  std::vector<uint8_t> mData;
};
