#include "firmware/CTextLineReader.h"

#include <sys/stat.h>

#include <cstdint>
#include <cstring>

namespace {

// A small file needs no large buffer: a reader per load is cheap then.
size_t BufferSizeFor(std::FILE* file_I, size_t chunkSize_I) {
  size_t size = chunkSize_I < 1 ? 1 : chunkSize_I;
  struct stat status;
  if (fstat(fileno(file_I), &status) == 0 && S_ISREG(status.st_mode) &&
      static_cast<uint64_t>(status.st_size) < size) {
    size = static_cast<size_t>(status.st_size) + 1;
  }
  return size + 1;
}

}  // namespace

CTextLineReader::CTextLineReader(std::FILE* file_I, size_t chunkSize_I)
    : mFile(file_I), mBuffer(BufferSizeFor(file_I, chunkSize_I)) {}

bool CTextLineReader::Next(char*& line_O, size_t& length_O) {
  for (;;) {
    char* start = mBuffer.data();
    void* feed = std::memchr(start + mScanned, '\n', mEnd - mScanned);
    if (feed != nullptr) {
      const size_t end = static_cast<size_t>(static_cast<char*>(feed) - start);
      start[end] = '\0';
      line_O = start + mBegin;
      length_O = end - mBegin;
      mBegin = mScanned = end + 1;
      return true;
    }
    mScanned = mEnd;
    if (!mAtEnd && Fill()) continue;
    if (mBegin == mEnd) return false;
    // The last line has no line feed; the spare byte takes its NUL. Fill may
    // have moved the buffer.
    start = mBuffer.data();
    start[mEnd] = '\0';
    line_O = start + mBegin;
    length_O = mEnd - mBegin;
    mBegin = mScanned = mEnd;
    return true;
  }
}

// Moves the unfinished line to the front, grows the buffer when that line
// fills it, and reads more. False when nothing more came.
bool CTextLineReader::Fill() {
  const size_t kept = mEnd - mBegin;
  if (mBegin > 0) {
    std::memmove(mBuffer.data(), mBuffer.data() + mBegin, kept);
    mScanned -= mBegin;
    mBegin = 0;
    mEnd = kept;
  }
  if (mEnd + 1 >= mBuffer.size()) mBuffer.resize(mBuffer.size() * 2);
  const size_t room = mBuffer.size() - 1 - mEnd;
  const size_t got = std::fread(mBuffer.data() + mEnd, 1, room, mFile);
  mEnd += got;
  if (got == 0) mAtEnd = true;
  return got > 0;
}
