#include "firmware/CSRec.h"

#include <algorithm>
#include <array>
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
  const std::string extension = GetUpdateFileExt();
  for (const SFormatByExtension& entry : kFormats) {
    if (extension == entry.extension) {
      mDataSourceFormat = entry.format;
      return;
    }
  }
  // A plain binary is a scalar image; the link decides which programmer reads it.
  if (extension == "bin") {
    if (interfaceType_I == EFTDI_INTERFACE) mDataSourceFormat = EDS_SCALAR_RTDISP;
    if (interfaceType_I == EHID_INTERFACE) mDataSourceFormat = EDS_SCALAR_BINARY;
  }
}

std::string CSRec::GetUpdateFileExt() const {
  // The last dot of the whole path: a dot in a folder name counts too.
  const size_t dot = mUpdateFile.rfind('.');
  if (dot == std::string::npos) return std::string();
  return StringUtilities::ToLower_Copy(mUpdateFile.substr(dot + 1));
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
  std::vector<size_t>().swap(mFrontRoom);
  mMergeIndex.Clear();
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
  CTextLineReader reader(file);
  const bool read = ReadSRecLines(reader);
  std::fclose(file);
  return read && FinishSRecData();
}

// Each record is merged a few records after it is read, so that the cache
// lines its merge needs arrive while the lines between are parsed. A merge
// logs nothing and a failing line clears everything, so the log and the
// result are those of merging each record the moment it is read.
bool CSRec::ReadSRecLines(CTextLineReader& reader_IO) {
  static constexpr size_t kAhead = 16;
  std::array<SContinuousDataBlock, kAhead> pending;
  std::array<uint32_t, kAhead> takers{};
  size_t read = 0;
  size_t merged = 0;
  const auto at = [&merged](size_t distance_I) { return (merged + distance_I) % kAhead; };

  int lineNumber = 0;
  char* line = nullptr;
  size_t length = 0;
  while (reader_IO.Next(line, length)) {
    ++lineNumber;  // blank lines count too
    TavLog::Info(">>    %s\n", line);
    SContinuousDataBlock& record = pending[read % kAhead];
    const ELineResult result = ReadSRecLine(std::string_view(line, length), lineNumber, record);
    if (result == ELineResult::eFailed) return false;
    if (result != ELineResult::eRead) continue;

    mMergeIndex.PrefetchSlot(record.startAddress);
    if (++read - merged < kAhead) continue;
    mMergeIndex.PrefetchEntries(pending[at(8)].startAddress);
    const SContinuousDataBlock& soon = pending[at(4)];
    takers[at(4)] = mMergeIndex.FirstTaker(soon.startAddress, soon.data.size());
    PrefetchBlock(takers[at(4)], false);
    PrefetchBlock(takers[at(2)], true);
    AddRecordToSRecData(pending[at(0)]);
    ++merged;
  }
  while (merged < read) AddRecordToSRecData(pending[merged++ % kAhead]);
  return true;
}

// Only a hint: the block named may no longer be the one that takes the record.
void CSRec::PrefetchBlock(uint32_t block_I, bool data_I) const {
  if (block_I >= mSRecData.size()) return;
  const SContinuousDataBlock& block = mSRecData[block_I];
  if (!data_I) {
    __builtin_prefetch(&block);
    __builtin_prefetch(&mFrontRoom[block_I]);
    return;
  }
  __builtin_prefetch(block.data.data() + mFrontRoom[block_I]);
  __builtin_prefetch(block.data.data() + block.data.size());
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
  record_O.data.resize(dataEnd > addressEnd ? (dataEnd - addressEnd + 1) / 2 : 0);
  uint8_t* data = record_O.data.data();
  for (size_t index = addressEnd; index < dataEnd; index += 2) {
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
  for (size_t block = 0; block < mSRecData.size(); ++block) {
    std::vector<uint8_t>& data = mSRecData[block].data;
    data.erase(data.begin(), data.begin() + static_cast<ptrdiff_t>(mFrontRoom[block]));
  }
  std::vector<size_t>().swap(mFrontRoom);
  mMergeIndex.Clear();

  if (mSRecData.empty()) {
    Clear();
    TavLog::Error("LoadSRecFile - FAILED on SRecData empty\n");
    return false;
  }
  // Stable, so that blocks with equal starts keep their order of appearance
  // and a file reads the same everywhere.
  std::stable_sort(mSRecData.begin(), mSRecData.end(), BlocksAscSorter);
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

// The first block, in order of appearance, that holds the record's address,
// ends at it or starts right after the record takes the record; the index
// names that block without a walk over all of them.
bool CSRec::AddRecordToSRecData(const SContinuousDataBlock& record_I) {
  const uint64_t address = record_I.startAddress;
  const uint64_t size = record_I.data.size();
  const uint32_t taker = mMergeIndex.FirstTaker(address, size);
  if (taker == CBlockMergeIndex::kNoBlock) {
    mMergeIndex.BlockAdded(static_cast<uint32_t>(mSRecData.size()), address, size);
    mSRecData.push_back(record_I);
    mFrontRoom.push_back(0);
    return true;
  }

  const SContinuousDataBlock& block = mSRecData[taker];
  const uint64_t start = block.startAddress;
  const uint64_t end = start + block.data.size() - mFrontRoom[taker];
  // The first data for an address wins: a record that starts inside a block
  // is dropped whole, even where it differs or runs past the block's end.
  if (address >= start && address < end) return true;
  if (end == address) AppendToBlock(taker, record_I);
  if (address + size == start) PrependToBlock(taker, record_I);
  return true;
}

void CSRec::AppendToBlock(uint32_t block_I, const SContinuousDataBlock& record_I) {
  std::vector<uint8_t>& data = mSRecData[block_I].data;
  const uint64_t address =
      uint64_t{mSRecData[block_I].startAddress} + data.size() - mFrontRoom[block_I];
  const size_t needed = data.size() + record_I.data.size();
  // Grow by half rather than double: many small blocks then waste less.
  if (needed > data.capacity()) data.reserve(std::max(needed, data.size() + data.size() / 2));
  data.insert(data.end(), record_I.data.begin(), record_I.data.end());
  mMergeIndex.BlockAppended(block_I, address, record_I.data.size());
}

void CSRec::PrependToBlock(uint32_t block_I, const SContinuousDataBlock& record_I) {
  SContinuousDataBlock& block = mSRecData[block_I];
  size_t& room = mFrontRoom[block_I];
  const size_t size = record_I.data.size();
  if (size > room) {
    // Leave room in front in proportion to the block, so that a file in
    // descending order moves each byte only a few times.
    const size_t used = block.data.size() - room;
    const size_t newRoom = size + used / 2;
    std::vector<uint8_t> grown(newRoom + used);
    std::copy(block.data.begin() + static_cast<ptrdiff_t>(room), block.data.end(),
              grown.begin() + static_cast<ptrdiff_t>(newRoom));
    block.data.swap(grown);
    room = newRoom;
  }
  room -= size;
  std::copy(record_I.data.begin(), record_I.data.end(),
            block.data.begin() + static_cast<ptrdiff_t>(room));
  block.startAddress = record_I.startAddress;
  mMergeIndex.BlockPrepended(block_I, record_I.startAddress, size);
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
