#pragma once
// Collects log lines and assertion lines while a test runs.

#include <mutex>
#include <string>
#include <vector>

#include "common/TavAssert.h"
#include "common/TavLog.h"

class LogCapture {
 public:
  LogCapture() {
    mLogHandle = TavLog::AddOutput([this](const std::string& text_I) {
      std::lock_guard<std::mutex> guard(mLock);
      mLog.push_back(text_I);
    });
    mAssertHandle = TavAssert::AddObserver([this](const std::string& line_I) {
      std::lock_guard<std::mutex> guard(mLock);
      mAssertions.push_back(line_I);
    });
  }
  ~LogCapture() {
    TavLog::RemoveOutput(mLogHandle);
    TavAssert::RemoveObserver(mAssertHandle);
  }

  std::vector<std::string> Log() const {
    std::lock_guard<std::mutex> guard(mLock);
    return mLog;
  }
  std::vector<std::string> Assertions() const {
    std::lock_guard<std::mutex> guard(mLock);
    return mAssertions;
  }
  bool LogContains(const std::string& part_I) const { return AnyContains(Log(), part_I); }
  bool AssertionContains(const std::string& part_I) const {
    return AnyContains(Assertions(), part_I);
  }

 private:
  static bool AnyContains(const std::vector<std::string>& lines_I, const std::string& part_I) {
    for (const std::string& line : lines_I) {
      if (line.find(part_I) != std::string::npos) return true;
    }
    return false;
  }

  mutable std::mutex mLock;
  std::vector<std::string> mLog;
  std::vector<std::string> mAssertions;
  int mLogHandle = 0;
  int mAssertHandle = 0;
};
