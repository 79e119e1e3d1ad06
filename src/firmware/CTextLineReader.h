#pragma once
// Reads a text file line by line in large chunks and hands out each line in
// place, without copying it: the line feed that ends it is overwritten with a
// NUL, so a line can go to printf-style code as it is.

#include <cstddef>
#include <cstdio>
#include <vector>

class CTextLineReader {
 public:
  // Borrows file_I; the caller opens and closes it.
  explicit CTextLineReader(std::FILE* file_I, size_t chunkSize_I = size_t{1} << 20);

  // The next line without its line feed, as std::getline splits: a file
  // ending in a line feed has no empty last line. False at the end of the
  // stream; a read error ends the stream as well.
  bool Next(char*& line_O, size_t& length_O);

 private:
  bool Fill();

  std::FILE* mFile;
  std::vector<char> mBuffer;  // one byte more than it ever holds, for the last NUL
  size_t mBegin = 0;
  size_t mEnd = 0;
  size_t mScanned = 0;  // no line feed in [mBegin, mScanned)
  bool mAtEnd = false;
};
