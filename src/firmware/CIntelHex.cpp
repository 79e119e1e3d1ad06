#include "firmware/CIntelHex.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "common/TavLog.h"

CIntelHex::~CIntelHex() {
  ClearData();
  CloseFile();
}

bool CIntelHex::Load(const std::string& path_I) {
  if (!OpenFile(path_I)) {
    TavLog::Error("CIntelHex::Load: ERROR - couldn't open file: %s\n", path_I.c_str());
    return false;
  }
  TavLog::Info("CIntelHex::Load: - opened file: %s\n", path_I.c_str());
  const uint64_t fileSize = FileSize();
  if (fileSize == 0) {
    TavLog::Error("CIntelHex::Load: ERROR - empty file: %s\n", path_I.c_str());
    return false;
  }
  if (!ReadText(fileSize)) return false;
  SParsed parsed;
  if (!ParseRecords(parsed)) return false;
  return Finish(parsed);
}

// The whole file into one buffer, line by line. Every line ends in CR LF or
// a lone CR there, so the parser needs to know only one line ending.
bool CIntelHex::ReadText(uint64_t fileSize_I) {
  // A new buffer replaces the one of an earlier load. One byte to spare: a
  // last line without line feed gets its terminator one place past the file
  // before the count check refuses it.
  mReadBuffer.reset();
  mReadBufferSize = 0;
  mTextSize = 0;
  if (fileSize_I < SIZE_MAX) mReadBuffer.reset(new (std::nothrow) char[fileSize_I + 1]);
  if (!mReadBuffer) {
    TavLog::Error("CIntelHex::Load: ERROR - could not alloc data buf\n");
    return false;
  }
  const size_t size = static_cast<size_t>(fileSize_I);
  mReadBufferSize = size + 1;
  mReadBuffer[size] = '\0';
  TavLog::Info("CIntelHex::Load: - reading %i chars...\n", static_cast<int>(size));

  size_t stored = 0;
  std::string line;
  while (stored < size && std::getline(mStream, line)) {
    const size_t length = strnlen(line.data(), line.size());
    StoreText(stored, line.data(), length);
    stored += length;
    // The first line has nothing before it; that counts as no carriage return.
    const bool afterReturn = stored > 0 && CharAt(stored - 1) == '\r';
    const char terminator = afterReturn ? '\n' : '\r';
    StoreText(stored, &terminator, 1);
    stored += 1;
  }
  if (stored != size) {
    TavLog::Error("CIntelHex::Load: ERROR - read error; expected %i bytes, read %i bytes\n",
                  static_cast<int>(size), static_cast<int>(stored));
    return false;
  }
  mTextSize = size;
  return true;
}

// Writes only within the buffer: a file that grew since its size was taken
// fails the count check, it cannot write past the buffer.
void CIntelHex::StoreText(size_t position_I, const char* text_I, size_t length_I) {
  if (position_I >= mReadBufferSize) return;
  const size_t room = mReadBufferSize - position_I;
  std::memcpy(mReadBuffer.get() + position_I, text_I, length_I < room ? length_I : room);
}

char CIntelHex::CharAt(size_t position_I) const {
  return position_I < mReadBufferSize ? mReadBuffer[position_I] : '\0';
}

// strtol in base 16 on a copy of just these characters; text past the end of
// the file reads as NUL and so ends the copy.
long CIntelHex::HexField(size_t position_I, size_t width_I) const {
  char text[9] = {};
  for (size_t i = 0; i < width_I && i < 8; ++i) text[i] = CharAt(position_I + i);
  return std::strtol(text, nullptr, 16);
}

bool CIntelHex::ParseRecords(SParsed& parsed_O) const {
  TavLog::Info("CIntelHex::Load: - parsing lines...\n");
  parsed_O.romData.assign(kImageCapacity, 0xFF);
  uint32_t base = 0;
  // A header field that does not read keeps its value from the record before.
  unsigned count = 0;
  unsigned address = 0;
  unsigned recordType = 0;
  size_t i = 0;
  for (;;) {
    const char c = CharAt(i);
    if (c == '\0') {
      TavLog::Error("CIntelHex::Load: ERROR - parsing error\n");
      return false;
    }
    // Text outside records is passed over without a word.
    if (c != ':') {
      if (++i >= mTextSize) break;
      continue;
    }
    char header[9] = {};
    for (size_t k = 0; k < 8; ++k) header[k] = CharAt(i + 1 + k);
    std::sscanf(header, "%2x%4x%2x", &count, &address, &recordType);
    if (recordType > 5) {
      TavLog::Error("CIntelHex::Load: ERROR - unknown record_type: %i\n",
                    static_cast<int>(recordType));
      return false;
    }
    const long sum = static_cast<long>((address & 0xFF) + ((address >> 8) & 0xFF)) +
                     static_cast<long>(count) + static_cast<long>(recordType);

    // Types 3, 4 and 5 test only four bits of their sum; a stricter test
    // would refuse files that the devices' own tools produce.
    size_t end = 0;
    switch (recordType) {
      case 0: {
        if (!ParseDataRecord(i, count, address + base, sum, parsed_O)) return false;
        end = i + 11 + 2 * size_t{count};
        break;
      }
      case 1: {
        if (((sum + HexField(i + 9, 2)) & 0xFF) != 0) {
          TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 1:\n");
          return false;
        }
        end = i + 11;  // the end record does not end the parsing
        break;
      }
      case 2: {
        const long value = HexField(i + 9, 4);
        if (((sum + (value & 0xFF) + ((value >> 8) & 0xFF) + HexField(i + 13, 2)) & 0xFF) != 0) {
          TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 2:\n");
          return false;
        }
        base = static_cast<uint32_t>(value) * 16;
        end = i + 15;
        break;
      }
      case 3: {
        const long high = HexField(i + 9, 4);
        const long low = HexField(i + 13, 4);
        if (((sum + high + (high >> 8) + low + (low >> 8) + HexField(i + 17, 2)) & 0x0F) != 0) {
          TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 3:\n");
          return false;
        }
        // Names an entry point, yet moves the base as well.
        base = (static_cast<uint32_t>(high) * 16 + static_cast<uint32_t>(low)) << 16;
        end = i + 19;
        break;
      }
      case 4: {
        const long value = HexField(i + 9, 4);
        if (((sum + value + (value >> 8) + HexField(i + 13, 2)) & 0x0F) != 0) {
          TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 4:\n");
          return false;
        }
        base = static_cast<uint32_t>(value) << 16;
        end = i + 15;
        break;
      }
      default: {
        const long value = HexField(i + 9, 8);
        const long bytes = value + (value >> 8) + (value >> 16) + (value >> 24);
        if (((sum + bytes + HexField(i + 17, 2)) & 0x0F) != 0) {
          TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 5:\n");
          return false;
        }
        end = i + 19;
        break;
      }
    }

    if (CharAt(end) != '\r') {
      TavLog::Error("CIntelHex::Load: ERROR - parsing error looking for carriage return\n");
      return false;
    }
    i = CharAt(end + 1) == '\n' ? end + 2 : end + 1;
    if (i >= mTextSize) break;
  }
  return true;
}

bool CIntelHex::ParseDataRecord(size_t position_I, uint32_t count_I, uint32_t fullAddress_I,
                                long sum_I, SParsed& parsed_IO) const {
  // The first data record fixes the start; one below it wraps to a huge offset.
  if (!parsed_IO.startSet) {
    parsed_IO.startSet = true;
    parsed_IO.startAddress = fullAddress_I;
  }
  const uint32_t offset = fullAddress_I - parsed_IO.startAddress;
  // The first record's own length counts only through the records after it.
  if (offset > parsed_IO.maxAddress) parsed_IO.maxAddress = offset + count_I - 1;

  long sum = sum_I;
  for (uint64_t k = 0; k < count_I; ++k) {
    if (offset + k > kImageCapacity - 1) {
      TavLog::Error("CIntelHex::Load: ERROR - exceeded %i\n", static_cast<int>(kImageCapacity));
      return false;
    }
    const uint8_t byte = static_cast<uint8_t>(HexField(position_I + 9 + 2 * k, 2));
    parsed_IO.romData[offset + k] = byte;  // a later record overwrites an earlier one
    sum += byte;
  }
  if (((sum + HexField(position_I + 9 + 2 * size_t{count_I}, 2)) & 0xFF) != 0) {
    TavLog::Error("CIntelHex::Load: ERROR - checksum error in case 0:\n");
    return false;
  }
  return true;
}

bool CIntelHex::Finish(const SParsed& parsed_I) {
  TavLog::Info("CIntelHex::Load: adjusting max_address...\n");
  // 32-bit arithmetic throughout: a max_address near the top wraps to 0.
  const uint32_t size =
      (parsed_I.maxAddress + 1 + (kSizeGranule - 1)) / kSizeGranule * kSizeGranule;
  if (size == 0 || size > kMaxSize) {
    TavLog::Error("CIntelHex::Load: ERROR - max_address exceeds %i\n", static_cast<int>(kMaxSize));
    return false;
  }
  // The word says exceeds, but any start other than 0x8000 fails.
  if (!parsed_I.startSet || parsed_I.startAddress != kRequiredStart) {
    TavLog::Error("CIntelHex::Load: ERROR - start_address exceeds %i\n",
                  static_cast<int>(kRequiredStart));
    return false;
  }
  mStartAddress = kRequiredStart;
  mSize = size;

  TavLog::Info("CIntelHex::Load: copying rom_data to m_byteData...\n");
  std::memcpy(mByteData.data(), parsed_I.romData.data(), size);
  TavLog::Info("CIntelHex::Load: calculating checksum...\n");
  int32_t sum = 0;
  for (uint32_t i = 0; i < size; ++i) sum += static_cast<int8_t>(mByteData[i]);
  mChecksum = static_cast<uint32_t>(sum) & 0xFFFF;

  CloseFile();
  TavLog::Info("CIntelHex::Load: done!\n");
  return true;
}

void CIntelHex::ClearData() {
  mStartAddress = kNotLoaded;
  mSize = 0;
  mChecksum = 0;
  mReadBuffer.reset();
  mReadBufferSize = 0;
  mTextSize = 0;
}

bool CIntelHex::OpenFile(const std::string& path_I) {
  // A failed load leaves its stream open; a new load starts afresh.
  CloseFile();
  mStream.clear();
  mStream.open(path_I, std::ios::in);
  if (mStream.is_open()) mFileName = path_I;
  return mStream.is_open();
}

void CIntelHex::CloseFile() {
  if (mStream.is_open()) mStream.close();
}

uint64_t CIntelHex::FileSize() {
  if (!mStream.is_open()) return 0;
  mStream.seekg(0, std::ios::end);
  const std::streamoff end = mStream.tellg();
  mStream.seekg(0, std::ios::beg);
  return end > 0 ? static_cast<uint64_t>(end) : 0;
}

void CIntelHex::DumpData() const {
  TavLog::Info("CIntelHex flash data:\n");
  for (uint32_t i = 0; i < mSize; ++i) {
    TavLog::Info("%02X ", mByteData[i]);
    if ((i + 1) % 32 == 0) TavLog::Info("\n");
  }
  TavLog::Info("\n");
}
