// Any bytes through the firmware front-end as the program loads them: the
// first byte picks the file's extension and the board's link, the rest is
// the file. The front-end must pick the reader its format names and agree
// with it, and the file check must not refuse a file that loads.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzFirmwareFile.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"
#include "firmware/FirmwareFileCheck.h"

namespace {

// The format's own reader over the same file, as if the front-end were absent.
bool ReaderAlone(EDataSourceFormat format_I, const std::string& path_I) {
  switch (format_I) {
    case EDS_INTEL_HEX: return CIntelHex().Load(path_I);
    case EDS_AIROFLASH:
    case EDS_AIROFLASH2: return CBinaryAiroFlash().Load(path_I);
    case EDS_SCALAR_RTDISP: return CScalarRTDISP().Load(path_I);
    case EDS_SCALAR_BINARY: return CScalarBinary().Load(path_I);
    default: return false;
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const char* const kExtensions[] = {".pen",       ".touch",      ".tav", ".hex",
                                            ".airoflash", ".airoflash2", ".bin", ".txt"};
  static const EINTERFACE_TYPE kLinks[] = {EHID_INTERFACE, EBULK_INTERFACE, EI2C_INTERFACE,
                                           EFTDI_INTERFACE};
  static const auto files = [] {
    std::vector<CFuzzFile> all;
    all.reserve(std::size(kExtensions));  // a moved file would be unlinked
    for (const char* extension : kExtensions) all.emplace_back(extension);
    return all;
  }();
  if (size_I == 0) return 0;
  const CFuzzFile& file = files[data_I[0] % std::size(kExtensions)];
  const EINTERFACE_TYPE link = kLinks[(data_I[0] >> 3) % std::size(kLinks)];
  const std::string& path = file.Write(data_I + 1, size_I - 1);

  CSRec source;
  const bool loaded = source.Load(path, link);
  if (loaded) Require(source.IsLoaded());
  const EDataSourceFormat format = CSRec::FormatFor(path, link);
  Require(source.GetDataSourceFormat() == format);
  if (format == EDS_UNKNOWN) Require(!loaded);
  if (format != EDS_SREC_PEN && format != EDS_SREC_TOUCH && format != EDS_SREC_GENERIC) {
    Require(loaded == ReaderAlone(format, path));
  }
  if (loaded) Require(FirmwareFileCheck::Problem(path, link).empty());
  return 0;
}
