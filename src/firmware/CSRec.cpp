#include "firmware/CSRec.h"

#include <sys/stat.h>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"
#include "firmware/CTextLineReader.h"

namespace {

// Digit values of ParseByte, one table per position. Neither refuses a
// character: anything that is not 0 to 9 has 55 taken off, kept to 8 bits.
// Only the high digit is folded to upper case first, as toupper does in the
// "C" locale, which this program never leaves.
struct SDigitTables {
  uint8_t high[256] = {};
  uint8_t low[256] = {};

  constexpr SDigitTables() {
    for (int c = 0; c < 256; ++c) {
      const bool decimal = c >= '0' && c <= '9';
      const int upper = c >= 'a' && c <= 'z' ? c - ('a' - 'A') : c;
      high[c] = static_cast<uint8_t>(decimal ? c - '0' : upper - 55);
      low[c] = static_cast<uint8_t>(decimal ? c - '0' : c - 55);
    }
  }
};
constexpr SDigitTables kDigits;

struct SFormatByExtension {
  const char* extension;
  EDataSourceFormat format;
};
constexpr SFormatByExtension kFormats[] = {
    {"pen", EDS_SREC_PEN},  {"touch", EDS_SREC_TOUCH},    {"tav", EDS_SREC_GENERIC},
    {"hex", EDS_INTEL_HEX}, {"airoflash", EDS_AIROFLASH}, {"airoflash2", EDS_AIROFLASH2},
};

#if defined(__SSE2__)
// Eight data bytes from sixteen characters at once, where every one of them
// is 0 to 9 or A to F: both digit rules give the plain value there. False,
// writing nothing, where any is something else.
bool ReadEightBytes(const char* text_I, uint8_t* bytes_O, unsigned& sum_IO) {
  const __m128i chars = _mm_loadu_si128(reinterpret_cast<const __m128i*>(text_I));
  const __m128i digit = _mm_sub_epi8(chars, _mm_set1_epi8('0'));
  const __m128i letter = _mm_sub_epi8(chars, _mm_set1_epi8('A'));
  // Unsigned "at most": the smaller of the two is the value itself.
  const __m128i isDigit = _mm_cmpeq_epi8(_mm_min_epu8(digit, _mm_set1_epi8(9)), digit);
  const __m128i isLetter = _mm_cmpeq_epi8(_mm_min_epu8(letter, _mm_set1_epi8(5)), letter);
  if (_mm_movemask_epi8(_mm_or_si128(isDigit, isLetter)) != 0xFFFF) return false;
  const __m128i values =
      _mm_or_si128(_mm_and_si128(isDigit, digit),
                   _mm_and_si128(isLetter, _mm_add_epi8(letter, _mm_set1_epi8(10))));
  // A 16-bit lane holds a byte's high digit in its low half.
  const __m128i high = _mm_and_si128(values, _mm_set1_epi16(0x00FF));
  const __m128i low = _mm_srli_epi16(values, 8);
  const __m128i bytes =
      _mm_packus_epi16(_mm_or_si128(_mm_slli_epi16(high, 4), low), _mm_setzero_si128());
  _mm_storel_epi64(reinterpret_cast<__m128i*>(bytes_O), bytes);
  sum_IO += static_cast<unsigned>(_mm_cvtsi128_si32(_mm_sad_epu8(bytes, _mm_setzero_si128())));
  return true;
}
#endif

// Address characters of the data records S1, S2 and S3.
size_t AddressCharacters(char type_I) { return type_I == '1' ? 4 : type_I == '2' ? 6 : 8; }

}  // namespace

CSRec::CSRec()
    : mIntelHex(std::make_shared<CIntelHex>()),
      mBinaryAiroFlash(std::make_shared<CBinaryAiroFlash>()),
      mScalarRtdIsp(std::make_shared<CScalarRTDISP>()),
      mScalarBinary(std::make_shared<CScalarBinary>()) {}

CSRec::~CSRec() = default;

bool CSRec::Load(const std::string& path_I, EINTERFACE_TYPE interfaceType_I) {
  mUpdateFile = path_I;
  SetDataSourceFormat(interfaceType_I);
  switch (mDataSourceFormat) {
    case EDS_SREC_PEN:
    case EDS_SREC_TOUCH:
    case EDS_SREC_GENERIC: return LoadSRecFile(path_I);
    case EDS_INTEL_HEX: return LoadIntelHexFile(path_I);
    case EDS_AIROFLASH:
    case EDS_AIROFLASH2: return LoadAiroHaBinaryFile(path_I);
    case EDS_SCALAR_RTDISP: return LoadScalarRtdIspFile(path_I);
    case EDS_SCALAR_BINARY: return LoadScalarBinaryFile(path_I);
    default: break;
  }
  TavLog::Error("unrecognized file format for file: %s\n", path_I.c_str());
  TAVASSERT_TEXT("\"unrecognized file format\"");
  return false;
}

void CSRec::SetDataSourceFormat(EINTERFACE_TYPE interfaceType_I) {
  if (interfaceType_I == EINVALID_INTERFACE) {
    TAVASSERT_TEXT("interfaceType_I != EINVALID_INTERFACE");
  }
  mDataSourceFormat = EDS_UNKNOWN;
  if (mUpdateFile.empty()) {
    TAVASSERT_TEXT("\"firmware file not specified\"");
    return;
  }
  mDataSourceFormat = FormatFor(mUpdateFile, interfaceType_I);
}

EDataSourceFormat CSRec::FormatFor(const std::string& path_I, EINTERFACE_TYPE interfaceType_I) {
  const std::string extension = ExtensionOf(path_I);
  for (const SFormatByExtension& entry : kFormats) {
    if (extension == entry.extension) return entry.format;
  }
  // A plain binary is a scalar image; the link decides which programmer reads it.
  if (extension == "bin" && interfaceType_I == EFTDI_INTERFACE) return EDS_SCALAR_RTDISP;
  if (extension == "bin" && interfaceType_I == EHID_INTERFACE) return EDS_SCALAR_BINARY;
  return EDS_UNKNOWN;
}

std::string CSRec::GetUpdateFileExt() const { return ExtensionOf(mUpdateFile); }

std::string CSRec::ExtensionOf(const std::string& path_I) {
  // The last dot of the whole path: a dot in a folder name counts too.
  const size_t dot = path_I.rfind('.');
  if (dot == std::string::npos) return std::string();
  return StringUtilities::ToLower_Copy(path_I.substr(dot + 1));
}

bool CSRec::IsLoaded() const {
  if (mIntelHex && mIntelHex->IsLoaded()) return true;
  if (mBinaryAiroFlash && mBinaryAiroFlash->IsLoaded()) return true;
  // A new scalar reader answers true here, so the questions below are only
  // reached after a scalar load that failed half-way.
  if (mScalarRtdIsp && mScalarRtdIsp->IsLoaded()) return true;
  if (mScalarBinary && mScalarBinary->IsLoaded()) return true;
  TavLog::Error("FWUpdater::IsLoaded - ERROR - mSRecData is empty\n");
  return !mSRecData.empty();
}

void CSRec::Clear() {
  std::vector<SContinuousDataBlock>().swap(mSRecData);
  mBlockBuilder.Clear();
}

int CSRec::ParseByte(std::string_view line_I, size_t index_I) {
  const uint8_t high = kDigits.high[static_cast<uint8_t>(line_I[index_I])];
  const uint8_t low = kDigits.low[static_cast<uint8_t>(line_I[index_I + 1])];
  return high * 16 + low;
}

bool CSRec::BlocksAscSorter(const SContinuousDataBlock& a_I, const SContinuousDataBlock& b_I) {
  return a_I.startAddress < b_I.startAddress;
}

bool CSRec::LoadSRecFile(const std::string& path_I) {
  if (mDataSourceFormat >= EDS_INTEL_HEX) {
    TAVASSERT_TEXT("\"Trying to load a non-SREC file format!\"");
    return false;
  }
  std::FILE* file = std::fopen(path_I.c_str(), "r");
  const int openError = errno;
  Clear();
  TavLog::Info("LoadSRecFile - file: %s\n", path_I.c_str());
  if (file == nullptr) {
    TavLog::Error("LoadSRecFile - FAILED to open with error: %i\n", openError);
    return false;
  }

  TavLog::Info("LoadSRecFile - lines\n");
  struct stat status;
  if (fstat(fileno(file), &status) == 0 && S_ISREG(status.st_mode)) {
    mBlockBuilder.ReserveFor(static_cast<uint64_t>(status.st_size));
  }
  bool read = false;
  {
    // The reader's buffer goes before the blocks are built.
    CTextLineReader reader(file);
    read = ReadSRecLines(reader);
  }
  std::fclose(file);
  return read && FinishSRecData();
}

bool CSRec::ReadSRecLines(CTextLineReader& reader_IO) {
  SContinuousDataBlock record;
  int lineNumber = 0;
  char* line = nullptr;
  size_t length = 0;
  while (reader_IO.Next(line, length)) {
    ++lineNumber;  // blank lines count too
    TavLog::Info(">>    %s\n", line);
    const ELineResult result = ReadSRecLine(std::string_view(line, length), lineNumber, record);
    if (result == ELineResult::eFailed) return false;
    if (result == ELineResult::eRead) AddRecordToSRecData(record);
  }
  return true;
}

CSRec::ELineResult CSRec::ReadSRecLine(std::string_view line_I, int lineNumber_I,
                                       SContinuousDataBlock& record_O) {
  if (line_I.empty() || line_I == "\r") return ELineResult::eSkipped;
  if (line_I.size() <= 9) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on invalid record length, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }
  if (line_I[0] != 'S') return ELineResult::eSkipped;

  const char type = line_I[1];
  if (type < '0' || type > '9' || type == '4' || type == '6') {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on invalid format, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }
  // Header, count and end records are taken on trust: nothing of them is read.
  if (type != '1' && type != '2' && type != '3') return ELineResult::eSkipped;

  if (line_I.back() == '\r') line_I.remove_suffix(1);
  const int count = ParseByte(line_I, 2);
  const int checksum = ParseByte(line_I, line_I.size() - 2);
  if (count < 3) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on bytes count, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }

  // An S2 or S3 line can be too short to hold its own address. It is refused
  // as a record of invalid length rather than read past its end.
  const size_t addressEnd = 4 + AddressCharacters(type);
  if (addressEnd > line_I.size()) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on invalid record length, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }

  uint32_t address = 0;
  unsigned sum = static_cast<unsigned>(count) & 0xFF;
  for (size_t index = 4; index < addressEnd; index += 2) {
    const uint8_t byte = static_cast<uint8_t>(ParseByte(line_I, index));
    address = (address << 8) | byte;
    sum += byte;
  }

  // The line's length, not the count field, decides how much data there is;
  // the last two characters are always the checksum.
  const size_t dataEnd = line_I.size() - 2;
  record_O.startAddress = address;
  const size_t dataSize = dataEnd > addressEnd ? (dataEnd - addressEnd + 1) / 2 : 0;
  // Record sizes are kept in 32 bits; a line of over 8 GiB is refused.
  if (dataSize > UINT32_MAX) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on invalid record length, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }
  record_O.data.resize(dataSize);
  uint8_t* data = record_O.data.data();
  size_t index = addressEnd;
#if defined(__SSE2__)
  for (; index + 16 <= dataEnd; index += 16, data += 8) {
    if (!ReadEightBytes(line_I.data() + index, data, sum)) break;
  }
#endif
  for (; index < dataEnd; index += 2) {
    const uint8_t byte = static_cast<uint8_t>(ParseByte(line_I, index));
    *data++ = byte;
    sum += byte;
  }

  if ((sum & 0xFF) + (static_cast<unsigned>(checksum) & 0xFF) != 255) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on invalid CRC, line %i\n", lineNumber_I);
    return ELineResult::eFailed;
  }
  return ELineResult::eRead;
}

bool CSRec::FinishSRecData() {
  mSRecData = mBlockBuilder.Build();
  if (mSRecData.empty()) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on SRecData empty\n");
    return false;
  }
  // Stable, so that blocks with equal starts keep their order of appearance
  // and a file reads the same everywhere. Files in address order, and files
  // whose records share no byte, come sorted already.
  if (!std::is_sorted(mSRecData.begin(), mSRecData.end(), BlocksAscSorter)) {
    std::stable_sort(mSRecData.begin(), mSRecData.end(), BlocksAscSorter);
  }
  for (size_t pair = 1; pair < mSRecData.size(); ++pair) {
    const SContinuousDataBlock& block = mSRecData[pair - 1];
    const uint64_t end = uint64_t{block.startAddress} + block.data.size();
    if (end > mSRecData[pair].startAddress) {
      Clear();
      TavLog::Error("LoadSRecFile - FAILED on data overlap, recCount: %i\n",
                    static_cast<int>(pair));
      return false;
    }
  }
  return true;
}

// The record joins the first block, in order of appearance, that holds its
// address, ends at it or starts where it ends, or is dropped when it starts
// inside that block. Nothing reads the blocks before the file has been read,
// so the records are resolved together then, with the same result as taking
// them one at a time here.
bool CSRec::AddRecordToSRecData(const SContinuousDataBlock& record_I) {
  mBlockBuilder.Add(record_I.startAddress, record_I.data.data(), record_I.data.size());
  return true;
}

bool CSRec::LoadIntelHexFile(const std::string& path_I) { return mIntelHex->Load(path_I); }

bool CSRec::LoadAiroHaBinaryFile(const std::string& path_I) {
  if (mDataSourceFormat != EDS_AIROFLASH && mDataSourceFormat != EDS_AIROFLASH2) {
    TAVASSERT_TEXT("\"Trying to load a non-AiroHa file format!\"");
    return false;
  }
  return mBinaryAiroFlash->Load(path_I);
}

bool CSRec::LoadScalarRtdIspFile(const std::string& path_I) {
  if (mDataSourceFormat != EDS_SCALAR_RTDISP) {
    TAVASSERT_TEXT("\"Trying to load a non-scalar file format!\"");
    return false;
  }
  return mScalarRtdIsp->Load(path_I);
}

bool CSRec::LoadScalarBinaryFile(const std::string& path_I) {
  if (mDataSourceFormat != EDS_SCALAR_BINARY) {
    TAVASSERT_TEXT("\"Trying to load a non-scalar file format!\"");
    return false;
  }
  return mScalarBinary->Load(path_I);
}
