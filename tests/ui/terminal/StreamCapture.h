#pragma once
// In-memory streams for the terminal window: an output to read back and an
// input with a fixed text (or at its end from the start).

#include <cstdio>
#include <cstdlib>
#include <string>

class OutputCapture {
 public:
  OutputCapture() : mStream(open_memstream(&mBuffer, &mSize)) {}
  ~OutputCapture() {
    std::fclose(mStream);
    std::free(mBuffer);
  }
  OutputCapture(const OutputCapture&) = delete;
  OutputCapture& operator=(const OutputCapture&) = delete;

  FILE* Stream() const { return mStream; }
  // Everything written so far, and the part since the last call of Take.
  std::string Text() {
    std::fflush(mStream);
    return std::string(mBuffer, mSize);
  }
  std::string Take() {
    const std::string text = Text();
    const std::string fresh = text.substr(mTaken);
    mTaken = text.size();
    return fresh;
  }

 private:
  char* mBuffer = nullptr;
  size_t mSize = 0;
  FILE* mStream;
  size_t mTaken = 0;
};

class InputText {
 public:
  explicit InputText(const std::string& text_I) : mText(text_I) {
    mStream =
        mText.empty() ? std::fopen("/dev/null", "r") : fmemopen(mText.data(), mText.size(), "r");
  }
  ~InputText() { std::fclose(mStream); }
  InputText(const InputText&) = delete;
  InputText& operator=(const InputText&) = delete;
  FILE* Stream() const { return mStream; }

 private:
  std::string mText;
  FILE* mStream;
};
