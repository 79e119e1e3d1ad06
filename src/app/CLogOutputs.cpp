#include "app/CLogOutputs.h"

#include <sys/time.h>

#include <ctime>
#include <memory>

#include "common/TavLog.h"

namespace {

// "2026-11-23 20:59:01.123 ": local time to the millisecond.
std::string TimeStamp() {
  timeval now{};
  gettimeofday(&now, nullptr);
  tm local{};
  localtime_r(&now.tv_sec, &local);
  char text[40];
  const size_t length = std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &local);
  std::snprintf(text + length, sizeof text - length, ".%03ld ",
                static_cast<long>(now.tv_usec / 1000));
  return text;
}

}  // namespace

CLogOutputs::~CLogOutputs() {
  for (int handle : mHandles) TavLog::RemoveOutput(handle);
  if (mFile != nullptr) std::fclose(mFile);
}

void CLogOutputs::AttachStandardError() {
  mHandles.push_back(TavLog::AddOutput([](const std::string& text_I) {
    std::fputs(text_I.c_str(), stderr);
    // Lines are complete only when their text says so; a Debug piece may
    // continue on the next call.
    std::fflush(stderr);
  }));
}

bool CLogOutputs::AttachFile(const std::string& path_I) {
  if (mFile != nullptr) return true;
  mFile = std::fopen(path_I.c_str(), "ae");
  if (mFile == nullptr) return false;
  FILE* file = mFile;
  // A file is read later, so each line says when it was written. A Debug
  // piece may continue a line: only a line's first piece gets the stamp.
  auto atLineStart = std::make_shared<bool>(true);
  mHandles.push_back(TavLog::AddOutput([file, atLineStart](const std::string& text_I) {
    std::string stamped;
    for (size_t start = 0; start < text_I.size();) {
      const size_t end = text_I.find('\n', start);
      const size_t stop = end == std::string::npos ? text_I.size() : end + 1;
      if (*atLineStart) stamped += TimeStamp();
      stamped.append(text_I, start, stop - start);
      *atLineStart = end != std::string::npos;
      start = stop;
    }
    std::fputs(stamped.c_str(), file);
    std::fflush(file);
  }));
  return true;
}
