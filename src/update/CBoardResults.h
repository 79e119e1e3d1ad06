#pragma once
// What became of each board a run was asked to update. The state machine
// moves on after a loader that never came without raising an error; this
// record keeps each entry's own outcome so that a terminal run can say, per
// board, what happened, and end with a status that counts every board.
//
// Written by the update thread and the device thread, read on the main
// thread: every call takes the lock.

#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "update/CApplicationDelegate.h"

enum EBoardOutcome {
  EBOARD_NOT_REACHED,  // the run ended before this entry
  EBOARD_UPDATING,     // under way
  EBOARD_UPDATED,
  EBOARD_FAILED,
  EBOARD_NOT_FOUND,  // no product, or the product has no such board
  EBOARD_FILE_REFUSED,
};

struct SBoardResult {
  std::string kind;           // "pen", "touch", "bluetooth", "scalar"
  std::string value;          // what followed the option
  std::string product;        // the selected product's name
  std::string path;           // the board's interface path
  std::string file;           // the firmware file loaded for it
  std::string versionBefore;  // as the user reads it; empty when unknown
  std::string versionAfter;
  EBoardOutcome outcome = EBOARD_NOT_REACHED;
  std::string reason;     // why it was not updated
  uint32_t vendorId = 0;  // the selected product's pen identity
  uint32_t productId = 0;
  // Every state the controller passed through during this entry, in order.
  std::vector<ECONTROLLER_STATE> states;
  // The first error the controller raised during this entry, with its text.
  ECONTROLLER_ERROR errorCode = EERROR_NONE;
  std::string errorText;
  // The device's sum of block checksums before and after programming, and
  // the image's, where the board keeps checksums.
  bool checksumsKnown = false;
  uint32_t checksumBefore = 0;
  uint32_t checksumAfter = 0;
  uint32_t checksumFile = 0;
};

class CBoardResults {
 public:
  // The board of a kind as the user reads it, a key of the catalogs:
  // "pen controller", "touch controller", "Bluetooth module", "display scalar".
  static const char* BoardName(const std::string& kind_I);

  // One entry per update asked for, none reached yet.
  void Reset(const std::vector<std::pair<std::string, std::string>>& entries_I);
  // The entry at `index_I` is under way: later notes are about it.
  void Begin(size_t index_I);
  void SetBoard(const std::string& product_I, const std::string& path_I,
                const std::string& version_I);
  void SetFile(const std::string& file_I);
  void SetIdentity(uint32_t vendorId_I, uint32_t productId_I);
  void NoteState(ECONTROLLER_STATE state_I);
  void SetChecksums(uint32_t before_I, uint32_t after_I, uint32_t file_I);
  // Ends the current entry; a later end of the same entry does not change it.
  void Finish(EBoardOutcome outcome_I, const std::string& reason_I = std::string());
  // The first error reported during the current entry, kept as its reason.
  void NoteError(ECONTROLLER_ERROR code_I, const std::string& text_I);
  void SetVersionAfter(size_t index_I, const std::string& version_I);

  std::vector<SBoardResult> Get() const;
  SBoardResult GetCurrent() const;
  bool HasCurrent() const;
  // The run's outcome from every board, given how the run itself ended.
  ERunOutcome Outcome(ERunOutcome ending_I) const;

 private:
  // The board being updated, or null between boards; under mLock.
  SBoardResult* CurrentLocked() { return mCurrent < mResults.size() ? &mResults[mCurrent] : nullptr; }

  mutable std::mutex mLock;
  std::vector<SBoardResult> mResults;
  size_t mCurrent = SIZE_MAX;
  std::string mFirstError;
};
