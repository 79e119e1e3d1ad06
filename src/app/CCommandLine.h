#pragma once
// The program's own options, taken off the command line before the
// updater reads its board arguments (-p, -t, -b, -s, -f).

#include <string>
#include <vector>

class CCommandLine {
 public:
  // Returns false with a one-line error text for an unknown option, a stray
  // word, a missing or malformed value, or options that do not go together.
  bool Parse(const std::vector<std::string>& arguments_I);

  bool GetHelp() const { return mHelp; }
  bool GetVersion() const { return mVersion; }
  bool GetVerbose() const { return mVerbose; }
  const std::string& GetLogFile() const { return mLogFile; }
  const std::string& GetError() const { return mError; }
  // --inspect FILE [--interface NAME] [--json] [--output-binary PATH]
  const std::string& GetInspectFile() const { return mInspectFile; }
  const std::string& GetInspectInterface() const { return mInspectInterface; }
  bool GetInspectJson() const { return mInspectJson; }
  const std::string& GetInspectOutputBinary() const { return mInspectOutputBinary; }
  // --list [--lab [NAME]] [--json] [-f CONFIG]
  bool GetList() const { return mList; }
  // --all: every board the configuration names a file for, found by discovery.
  bool GetAll() const { return mAll; }
  // --lab runs on the lab's emulated products instead of the hardware.
  bool GetLab() const { return mLab; }
  // No window; a run ends with a status that tells its outcome.
  bool GetHeadless() const { return mHeadless; }
  // The confirmation is answered yes without asking.
  bool GetYes() const { return mYes; }
  // Lab runs: faults to inject (KIND@N), the state folder, the virtual clock.
  const std::vector<std::string>& GetLabFaults() const { return mLabFaults; }
  const std::string& GetLabState() const { return mLabState; }
  bool GetLabFast() const { return mLabFast; }
  // The product after --lab; empty for the default one.
  const std::string& GetLabName() const { return mLabName; }
  // "--lab list": name the lab's products and stop.
  bool GetLabListRequested() const;
  // -p, -t, -b, -s and -f with their values, in order, for the updater.
  const std::vector<std::string>& GetUpdaterArguments() const { return mUpdaterArguments; }
  bool HasBoardOption() const;

  static std::string HelpText();

 private:
  bool Fail(const std::string& text_I);
  bool Take(const std::string& name_I, const std::string& value_I, bool given_I);
  bool CheckCombinations();

  bool mHelp = false;
  bool mVersion = false;
  bool mVerbose = false;
  std::string mLogFile;
  std::string mError;
  std::string mInspectFile;
  std::string mInspectInterface;
  bool mInspectJson = false;
  std::string mInspectOutputBinary;
  bool mList = false;
  bool mAll = false;
  bool mLab = false;
  bool mHeadless = false;
  bool mYes = false;
  std::vector<std::string> mLabFaults;
  std::string mLabState;
  bool mLabFast = false;
  std::string mLabName;
  std::vector<std::string> mUpdaterArguments;
};
