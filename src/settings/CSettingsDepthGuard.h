#pragma once
// Bounds the nesting that the readers follow, so that a hostile document
// cannot exhaust the stack. One guard lives in each container reader's
// frame; the count is per thread, since readers of different threads are
// independent.

#include "common/TavLog.h"

class CSettingsDepthGuard {
 public:
  // Containers deeper than this make the whole document unreadable. Real
  // configuration trees are under ten levels; 200 keeps a reader's stack
  // well under a megabyte, even with sanitizers.
  static constexpr int kMaxNestingDepth = 200;

  CSettingsDepthGuard() : mEntered(++Depth()) {
    if (mEntered > kMaxNestingDepth && !Exceeded()) {
      Exceeded() = true;
      TavLog::Error("Settings document nests deeper than %d levels\n", kMaxNestingDepth);
    }
  }
  ~CSettingsDepthGuard() { --Depth(); }
  CSettingsDepthGuard(const CSettingsDepthGuard&) = delete;
  CSettingsDepthGuard& operator=(const CSettingsDepthGuard&) = delete;

  // True when this level is beyond the limit: the reader gives up.
  bool TooDeep() const { return mEntered > kMaxNestingDepth; }

  // Whether a reader of this thread met the limit since the last Reset; the
  // entry points of the forms reset it and look at it at the end.
  static bool WasExceeded() { return Exceeded(); }
  static void Reset() { Exceeded() = false; }

 private:
  static int& Depth() {
    thread_local int depth = 0;
    return depth;
  }
  static bool& Exceeded() {
    thread_local bool exceeded = false;
    return exceeded;
  }

  int mEntered;
};
