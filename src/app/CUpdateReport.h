#pragma once
// --json on an update run: one JSON object on standard output when the run
// ends, for scripts and fleet tools. Its shape is documented, and checked by
// the tests, in data/update-report.schema.json.

#include <chrono>
#include <string>
#include <vector>

#include "update/CBoardResults.h"

class CUpdateReport {
 public:
  CUpdateReport();

  // A board --all left alone; `board_I.reason` says why.
  void AddSkipped(const SBoardResult& board_I) { mSkipped.push_back(board_I); }

  // The report of a run whose boards came to `boards_I`, that ended with
  // `status_I` and showed `text_I` as its last line.
  std::string ToJson(const std::vector<SBoardResult>& boards_I, int status_I,
                     const std::string& text_I) const;

  static const char* StateName(ECONTROLLER_STATE state_I);
  static const char* ErrorName(ECONTROLLER_ERROR error_I);

 private:
  std::string BoardJson(const SBoardResult& board_I, bool skipped_I) const;

  std::chrono::system_clock::time_point mStartTime;
  std::chrono::steady_clock::time_point mStart;
  std::vector<SBoardResult> mSkipped;
};
