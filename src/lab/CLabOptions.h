#pragma once
// The options of a lab run as the command line gives them:
//   --lab-fault KIND@N   (repeatable; see CLabFaults.h for the kinds)
//   --lab-state DIR      the state folder; default $XDG_STATE_HOME/tavik/lab,
//                        or ~/.local/state/tavik/lab without XDG_STATE_HOME
//   --lab-fast           run on the virtual clock
// The application parses its own command line and hands each value here.

#include <cstdint>
#include <string>
#include <vector>

#include "lab/CLabFaults.h"

class CLabOptions {
 public:
  // One --lab-fault value; false, with a reason, when it does not parse.
  bool AddFault(const std::string& text_I, std::string& error_O);
  const std::vector<SLabFault>& GetFaults() const { return mFaults; }

  void SetStateFolder(const std::string& folder_I) { mStateFolder = folder_I; }
  // The folder given, or the default.
  std::string GetStateFolder() const;
  static std::string DefaultStateFolder();

  void SetFast(bool fast_I) { mFast = fast_I; }
  bool GetFast() const { return mFast; }

  // The seed of the fault wrapper's generator.
  void SetSeed(uint64_t seed_I) { mSeed = seed_I; }
  uint64_t GetSeed() const { return mSeed; }

 private:
  std::vector<SLabFault> mFaults;
  std::string mStateFolder;
  bool mFast = false;
  uint64_t mSeed = 1;
};
