#pragma once
// --inspect: loads a firmware file exactly as an update would and shows what
// it holds, as text or JSON, and can write the loaded image as flat bytes.
// Nothing is sent to a device.

#include <cstdint>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

#include "common/TavTypes.h"

class CCommandLine;
class CSRec;

class CFirmwareReportCommand {
 public:
  explicit CFirmwareReportCommand(const CCommandLine& commandLine_I);

  // 0 when the file loaded and everything asked for was written; 1 with the
  // reason on err_IO otherwise. A file that does not load writes nothing to
  // out_IO and no image file.
  int Run(std::FILE* out_IO, std::FILE* err_IO);

  // "hid", "bulk", "i2c" or "ftdi", in any case.
  static bool ParseInterface(const std::string& name_I, EINTERFACE_TYPE& interface_O);

 private:
  bool Load(CSRec& source_IO, std::string& reason_O) const;
  // sums_I: the byte sum of each S-record block, in list order.
  void PrintText(const CSRec& source_I, const std::vector<uint64_t>& sums_I,
                 std::FILE* out_IO) const;
  void PrintJson(const CSRec& source_I, const std::vector<uint64_t>& sums_I,
                 std::FILE* out_IO) const;
  // Runs whileClosing_I once the image is written, while it is flushed to
  // the disk and put in place.
  bool WriteImage(const CSRec& source_I, std::vector<uint64_t>& sums_O,
                  const std::function<void()>& whileClosing_I, std::string& reason_O) const;

  std::string mFile;
  std::string mInterfaceName;
  bool mJson;
  std::string mOutputBinary;
  EINTERFACE_TYPE mInterface = EHID_INTERFACE;
};
