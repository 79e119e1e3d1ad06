#pragma once
// Writes a board's state through to its state folder as the board changes,
// as a chip's flash keeps what was programmed into it whatever becomes of
// the process that programmed it.
//
// The folder holds the board's state file (a snapshot, replaced whole
// through a rename) and beside it a log of changes ("NAME.state.log"):
// after each report the entries that changed are appended to the log in
// one write, as one batch with its length and a check value. Loading reads
// the snapshot and replays the log's whole batches in order; a batch cut
// off by a kill, or damaged, ends the replay there, so a kill between any
// two writes leaves the state before or after the report, never between.
// Once the log outgrows the snapshot it is folded into a new snapshot and
// emptied. A batch holds whole entries, so replaying a log that was
// already folded into the snapshot changes nothing.
//
// The file is opened once; writing costs one append per report that
// changed something, and comparing the state kept in memory.

#include <cstdint>
#include <string>

#include "lab/CLabStateFile.h"

class CLabStateJournal {
 public:
  ~CLabStateJournal();
  CLabStateJournal() = default;
  CLabStateJournal(const CLabStateJournal&) = delete;
  CLabStateJournal& operator=(const CLabStateJournal&) = delete;

  // Starts writing through to `statePath_I`: the state as it stands
  // becomes the snapshot and the log starts empty. Call Record or Fold
  // with the state put into State() since.
  bool Open(const std::string& statePath_I);
  bool IsOpen() const { return mFd >= 0; }
  // What the board puts its state into; only entries that changed are
  // written.
  CLabStateFile& State() { return mState; }
  // Appends what changed since the last call. False when the write failed.
  bool Record();
  // Records, then makes the snapshot whole again and empties the log.
  bool Fold();

  static std::string LogPath(const std::string& statePath_I) { return statePath_I + ".log"; }
  // Applies the whole batches of the log at `logPath_I` to `state_IO`; how
  // many it applied. A missing log is an empty one.
  static int Replay(const std::string& logPath_I, CLabStateFile& state_IO);

 private:
  std::string mPath;
  CLabStateFile mState;
  int mFd = -1;
  uint64_t mLogSize = 0;
  uint64_t mSnapshotSize = 0;
};
