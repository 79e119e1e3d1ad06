#include "common/TavLog.h"

#include <atomic>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <vector>

int g_DebugTrace = 0;

namespace {

bool gLogNewLine = true;

struct SOutputs {
  std::mutex mLock;
  std::vector<std::pair<int, TavLog::Output>> mList;
  int mNextHandle = 1;
  std::atomic<size_t> mCount{0};
};

SOutputs& Outputs() {
  static SOutputs outputs;
  return outputs;
}

const char* LevelTag(int level_I) {
  switch (level_I) {
    case 0: return "[D]";
    case 1: return "[I]";
    case 2: return "[N]";
    case 3: return "[W]";
    case 4: return "[E]";
    case 6: return "[C]";
    case 7: return "[A]";
    case 8: return "[*]";
    default: return "[U]";
  }
}

void PassToSink(int level_I, const std::string& format_I, va_list args_I) {
  try {
    TavTraceD(level_I, format_I.c_str(), args_I);
  } catch (...) {
    // Logging never throws towards its caller.
  }
}

}  // namespace

int TavTraceD(int /*level_I*/, const char* format_I, va_list args_I) {
  SOutputs& outputs = Outputs();
  if (outputs.mCount.load() == 0 || format_I == nullptr) return -1;

  va_list copy;
  va_copy(copy, args_I);
  const int needed = std::vsnprintf(nullptr, 0, format_I, copy);
  va_end(copy);
  if (needed < 0) return -1;
  std::string text(static_cast<size_t>(needed) + 1, '\0');
  std::vsnprintf(text.data(), text.size(), format_I, args_I);
  text.resize(static_cast<size_t>(needed));

  std::lock_guard<std::mutex> guard(outputs.mLock);
  for (auto& entry : outputs.mList) entry.second(text);
  return needed;
}

namespace TavLog {

std::string FormatWithLevel(int level_I, const char* format_I) {
  std::string result = LevelTag(level_I);
  result += ' ';
  if (format_I != nullptr) result += format_I;
  return result;
}

// The line state follows every call, output attached or not: only a
// line's first part gets the tag.
void Debug(const char* format_I, ...) {
  if (Outputs().mCount.load() != 0) {
    va_list args;
    va_start(args, format_I);
    if (gLogNewLine) {
      PassToSink(eDebug, FormatWithLevel(eDebug, format_I), args);
    } else {
      PassToSink(eDebug, format_I == nullptr ? std::string() : std::string(format_I), args);
    }
    va_end(args);
  }
  if (format_I != nullptr && format_I[0] != '\0') {
    gLogNewLine = format_I[std::strlen(format_I) - 1] == '\n';
  }
}

// With no output attached a line is not even given its tag: an S-record
// load logs each of the file's lines.
#define TAV_LOG_AT_LEVEL(level)                              \
  if (Outputs().mCount.load() == 0) return;                  \
  va_list args;                                              \
  va_start(args, format_I);                                  \
  PassToSink(level, FormatWithLevel(level, format_I), args); \
  va_end(args);

void Info(const char* format_I, ...) { TAV_LOG_AT_LEVEL(eInfo) }
void Warning(const char* format_I, ...) { TAV_LOG_AT_LEVEL(eWarning) }
void Error(const char* format_I, ...) { TAV_LOG_AT_LEVEL(eError) }

#undef TAV_LOG_AT_LEVEL

int AddOutput(Output output_I) {
  SOutputs& outputs = Outputs();
  std::lock_guard<std::mutex> guard(outputs.mLock);
  const int handle = outputs.mNextHandle++;
  outputs.mList.emplace_back(handle, std::move(output_I));
  outputs.mCount = outputs.mList.size();
  return handle;
}

void RemoveOutput(int handle_I) {
  SOutputs& outputs = Outputs();
  std::lock_guard<std::mutex> guard(outputs.mLock);
  std::erase_if(outputs.mList, [&](const auto& entry) { return entry.first == handle_I; });
  outputs.mCount = outputs.mList.size();
}

void ResetLineState() { gLogNewLine = true; }

}  // namespace TavLog
