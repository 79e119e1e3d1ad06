#include "update/CBoardResults.h"

const char* CBoardResults::BoardName(const std::string& kind_I) {
  if (kind_I == "pen") return "pen controller";
  if (kind_I == "touch") return "touch controller";
  if (kind_I == "bluetooth") return "Bluetooth module";
  return "display scalar";
}

void CBoardResults::Reset(const std::vector<std::pair<std::string, std::string>>& entries_I) {
  std::lock_guard<std::mutex> guard(mLock);
  mResults.clear();
  for (const auto& entry : entries_I) {
    SBoardResult result;
    result.kind = entry.first;
    result.value = entry.second;
    mResults.push_back(result);
  }
  mCurrent = SIZE_MAX;
  mFirstError.clear();
}

void CBoardResults::Begin(size_t index_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (index_I >= mResults.size()) return;
  mCurrent = index_I;
  mResults[index_I].outcome = EBOARD_UPDATING;
  mFirstError.clear();
}

void CBoardResults::SetBoard(const std::string& product_I, const std::string& path_I,
                             const std::string& version_I) {
  std::lock_guard<std::mutex> guard(mLock);
  SBoardResult* result = CurrentLocked();
  if (result == nullptr) return;
  result->product = product_I;
  result->path = path_I;
  result->versionBefore = version_I;
}

void CBoardResults::SetFile(const std::string& file_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (SBoardResult* result = CurrentLocked()) result->file = file_I;
}

void CBoardResults::Finish(EBoardOutcome outcome_I, const std::string& reason_I) {
  std::lock_guard<std::mutex> guard(mLock);
  SBoardResult* result = CurrentLocked();
  if (result == nullptr || result->outcome != EBOARD_UPDATING) return;
  result->outcome = outcome_I;
  result->reason = reason_I.empty() && outcome_I != EBOARD_UPDATED ? mFirstError : reason_I;
}

void CBoardResults::SetIdentity(uint32_t vendorId_I, uint32_t productId_I) {
  std::lock_guard<std::mutex> guard(mLock);
  SBoardResult* result = CurrentLocked();
  if (result == nullptr) return;
  result->vendorId = vendorId_I;
  result->productId = productId_I;
}

void CBoardResults::NoteState(ECONTROLLER_STATE state_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (SBoardResult* result = CurrentLocked()) result->states.push_back(state_I);
}

void CBoardResults::SetChecksums(uint32_t before_I, uint32_t after_I, uint32_t file_I) {
  std::lock_guard<std::mutex> guard(mLock);
  SBoardResult* result = CurrentLocked();
  if (result == nullptr) return;
  result->checksumsKnown = true;
  result->checksumBefore = before_I;
  result->checksumAfter = after_I;
  result->checksumFile = file_I;
}

void CBoardResults::NoteError(ECONTROLLER_ERROR code_I, const std::string& text_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (mFirstError.empty()) mFirstError = text_I;
  // Some errors come without a text; the code alone still tells the kind.
  SBoardResult* result = CurrentLocked();
  if (result != nullptr && result->errorCode == EERROR_NONE) {
    result->errorCode = code_I;
    result->errorText = text_I;
  }
}

void CBoardResults::SetVersionAfter(size_t index_I, const std::string& version_I) {
  std::lock_guard<std::mutex> guard(mLock);
  if (index_I >= mResults.size()) return;
  mResults[index_I].versionAfter = version_I;
}

std::vector<SBoardResult> CBoardResults::Get() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mResults;
}

SBoardResult CBoardResults::GetCurrent() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mCurrent < mResults.size() ? mResults[mCurrent] : SBoardResult();
}

bool CBoardResults::HasCurrent() const {
  std::lock_guard<std::mutex> guard(mLock);
  return mCurrent < mResults.size();
}

ERunOutcome CBoardResults::Outcome(ERunOutcome ending_I) const {
  std::lock_guard<std::mutex> guard(mLock);
  bool refused = false, notFound = false, incomplete = false;
  for (const SBoardResult& result : mResults) {
    switch (result.outcome) {
      // A board that failed is the one thing a caller must not miss.
      case EBOARD_FAILED: return ERUN_FAILED;
      case EBOARD_FILE_REFUSED: refused = true; break;
      case EBOARD_NOT_FOUND: notFound = true; break;
      case EBOARD_UPDATED: break;
      default: incomplete = true; break;
    }
  }
  if (ending_I != ERUN_SUCCESS) return ending_I;
  if (refused) return ERUN_REFUSED_FILE;
  if (notFound) return ERUN_NO_DEVICE;
  if (incomplete) return ERUN_FAILED;
  return ERUN_SUCCESS;
}
