#pragma once
// What the helper may stop and start: the parts of the family's driver as
// the updater names them, and what stands for each on this machine. One
// line each, "#" begins a comment:
//
//   unit <identifier> <systemd unit>        stopped and started by systemd
//   executable <identifier> <absolute path> its processes are stopped and
//                                           started by the helper
//   ignore <identifier>                     known, nothing to do here
//
// An identifier may have several lines. Only configured identifiers are
// acted on; a request that names any other is refused whole.

#include <map>
#include <string>
#include <vector>

class CHelperConfig {
 public:
  // False, with the reason, when the file cannot be read. Lines that make
  // no sense are logged and left out; the rest holds.
  bool Read(const std::string& path_I, std::string& error_O);

  bool Knows(const std::string& identifier_I) const { return mParts.count(identifier_I) != 0; }
  std::vector<std::string> GetUnits(const std::string& identifier_I) const;
  std::vector<std::string> GetExecutables(const std::string& identifier_I) const;
  // Every configured identifier, in order.
  std::vector<std::string> GetIdentifiers() const;

  static bool IsUnitName(const std::string& name_I);

 private:
  struct SDriverPart {
    std::vector<std::string> units;
    std::vector<std::string> executables;
  };
  std::map<std::string, SDriverPart> mParts;
};
