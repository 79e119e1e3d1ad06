#include "app/CUpdateReport.h"

#include <cstdio>
#include <ctime>

#include "app/JsonString.h"
#include "app/TavVersion.h"

namespace {

std::string TextOrNull(const std::string& text_I) {
  return text_I.empty() ? "null" : JsonString(text_I);
}

const char* OutcomeWord(EBoardOutcome outcome_I) {
  switch (outcome_I) {
    case EBOARD_UPDATED: return "updated";
    case EBOARD_FAILED: return "failed";
    case EBOARD_NOT_FOUND: return "not-found";
    case EBOARD_FILE_REFUSED: return "file-refused";
    case EBOARD_UPDATING:
    case EBOARD_NOT_REACHED: break;
  }
  return "not-reached";
}

std::string Utc(std::chrono::system_clock::time_point time_I) {
  const std::time_t seconds = std::chrono::system_clock::to_time_t(time_I);
  std::tm parts{};
  gmtime_r(&seconds, &parts);
  char text[32];
  std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts);
  return text;
}

}  // namespace

CUpdateReport::CUpdateReport()
    : mStartTime(std::chrono::system_clock::now()), mStart(std::chrono::steady_clock::now()) {}

const char* CUpdateReport::StateName(ECONTROLLER_STATE state_I) {
  switch (state_I) {
    case ESTATE_NONE: return "ESTATE_NONE";
    case ESTATE_READY: return "ESTATE_READY";
    case ESTATE_WAIT_LOADER: return "ESTATE_WAIT_LOADER";
    case ESTATE_PROGRAM: return "ESTATE_PROGRAM";
    case ESTATE_WAIT_DEVICE: return "ESTATE_WAIT_DEVICE";
    case ESTATE_SUCCESS: return "ESTATE_SUCCESS";
    case ESTATE_FAILURE: return "ESTATE_FAILURE";
    case ESTATE_TERMINATE: return "ESTATE_TERMINATE";
    case ESTATE_INVALID: return "ESTATE_INVALID";
  }
  return "ESTATE_INVALID";
}

const char* CUpdateReport::ErrorName(ECONTROLLER_ERROR error_I) {
  switch (error_I) {
    case EERROR_NO_DEVICE: return "EERROR_NO_DEVICE";
    case EERROR_FILE_LOAD: return "EERROR_FILE_LOAD";
    case EERROR_FILE_MISMATCH: return "EERROR_FILE_MISMATCH";
    case EERROR_LEAVE_LOADER: return "EERROR_LEAVE_LOADER";
    case EERROR_PROGRAM: return "EERROR_PROGRAM";
    case EERROR_INTERFACE: return "EERROR_INTERFACE";
    default: return "EERROR_NONE";
  }
}

std::string CUpdateReport::BoardJson(const SBoardResult& board_I, bool skipped_I) const {
  std::string states;
  for (ECONTROLLER_STATE state : board_I.states) {
    states += std::string(states.empty() ? "" : ",") + "\"" + StateName(state) + "\"";
  }
  const auto checksum = [&](uint32_t sum_I) {
    return board_I.checksumsKnown ? std::to_string(sum_I) : std::string("null");
  };
  const std::string error = board_I.errorCode == EERROR_NONE
                                ? "null"
                                : "{\"code\":" + std::to_string(board_I.errorCode) +
                                      ",\"name\":\"" + ErrorName(board_I.errorCode) +
                                      "\",\"text\":" + JsonString(board_I.errorText) + "}";
  return "{\"kind\":" + JsonString(board_I.kind) + ",\"product\":" + TextOrNull(board_I.product) +
         ",\"path\":" + TextOrNull(board_I.path) + ",\"file\":" + TextOrNull(board_I.file) +
         ",\"versionBefore\":" + TextOrNull(board_I.versionBefore) +
         ",\"versionAfter\":" + TextOrNull(board_I.versionAfter) +
         ",\"checksumBefore\":" + checksum(board_I.checksumBefore) +
         ",\"checksumAfter\":" + checksum(board_I.checksumAfter) +
         ",\"checksumFile\":" + checksum(board_I.checksumFile) +
         ",\"skipped\":" + (skipped_I ? "true" : "false") + ",\"outcome\":\"" +
         (skipped_I ? "skipped" : OutcomeWord(board_I.outcome)) +
         "\",\"reason\":" + TextOrNull(board_I.reason) + ",\"states\":[" + states +
         "],\"error\":" + error + "}";
}

std::string CUpdateReport::ToJson(const std::vector<SBoardResult>& boards_I, int status_I,
                                  const std::string& text_I) const {
  // The product is the first one a board was found on; each board names its own.
  std::string product = "null";
  const SBoardResult* firstError = nullptr;
  for (const std::vector<SBoardResult>* list : {&boards_I, &mSkipped}) {
    for (const SBoardResult& board : *list) {
      if (product == "null" && !board.product.empty()) {
        product = "{\"name\":" + JsonString(board.product) +
                  ",\"vendorId\":" + std::to_string(board.vendorId) +
                  ",\"productId\":" + std::to_string(board.productId) + "}";
      }
      if (firstError == nullptr && board.errorCode != EERROR_NONE) firstError = &board;
    }
  }
  std::string boards;
  for (const SBoardResult& board : boards_I)
    boards += (boards.empty() ? "" : ",") + BoardJson(board, false);
  for (const SBoardResult& board : mSkipped)
    boards += (boards.empty() ? "" : ",") + BoardJson(board, true);

  const double seconds =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - mStart).count();
  char duration[32];
  std::snprintf(duration, sizeof duration, "%.3f", seconds);
  return std::string("{\"program\":\"") + TAV_PROGRAM_NAME + "\",\"version\":\"" +
         TAV_PROGRAM_VERSION + "\",\"started\":\"" + Utc(mStartTime) +
         "\",\"durationSeconds\":" + duration + ",\"product\":" + product + ",\"boards\":[" +
         boards + "],\"outcome\":{\"status\":" + std::to_string(status_I) +
         ",\"text\":" + JsonString(text_I) +
         ",\"errorCode\":" + (firstError ? std::to_string(firstError->errorCode) : "null") +
         ",\"errorText\":" + (firstError ? JsonString(firstError->errorText) : "null") +
         "},\"exitStatus\":" + std::to_string(status_I) + "}\n";
}
