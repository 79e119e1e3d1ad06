#pragma once
// Texts from gettext catalogs. A key is looked up in the program's own
// domain first, then in the domain of device texts; a key in neither comes
// back as itself.
//
// The language follows the environment the usual gettext way: LANGUAGE (a
// colon-separated list, honoured unless the message locale is "C"), else
// LC_ALL, LC_MESSAGES, LANG. The manager sets the process's LC_MESSAGES
// category from the environment when it is made, and only that category, so
// number formatting and parsing elsewhere keep the C rules. A language whose
// system locale is not installed falls back to the keys (English), as in
// every other gettext program on that machine. Make the manager on the main
// thread before other threads start: setlocale is not thread-safe.
//
// Catalogs are <locale folder>/<language>/LC_MESSAGES/<domain>.mo, read as
// UTF-8 whatever the locale's character set.

#include <string>

#include "host/CLanguageManager.h"

class CLinuxLanguageManager : public CLanguageManager {
 public:
  // The program's own texts, then the texts about devices and boards.
  static constexpr const char* kApplicationDomain = "tavik-fwupdater";
  static constexpr const char* kDevicesDomain = "Devices";
  // The catalog whose presence marks a usable locale folder.
  static constexpr const char* kMarkerCatalog = "en/LC_MESSAGES/tavik-fwupdater.mo";

  explicit CLinuxLanguageManager(const std::string& localeDirectory_I);

  // Reads the text of "Language" as an integer; a value outside the table
  // raises assertions and gives 0.
  uint32_t GetCurrentLanguage() override;
  using CLanguageManager::GetLocalizedString;
  std::string GetLocalizedString(const std::string& key_I) override;

  // True, with the text, when one of the two domains has the key.
  bool FindLocalizedString(const std::string& key_I, std::string& text_O) const;
  const std::string& GetBoundDirectory() const { return mLocaleDirectory; }

  // Fixes the locale folder of managers made from now on; an empty path
  // goes back to the search. For tests and for a command-line option.
  static void SetLocaleDirectory(const std::string& directory_I);
  // The folder set above, else the result of the search from the running
  // executable's folder.
  static std::string GetLocaleDirectory();
  // The search, first match wins, each candidate holding kMarkerCatalog:
  //   1. <exe dir>/locale             an unpacked or portable copy
  //   2. <exe dir>/../share/locale    an installation moved to another prefix
  //   3. <exe dir>/../locale
  //   4. <exe dir>/../../locale       the build tree (programs lie two
  //                                   folders below it, catalogs at its top)
  //   5. `installedDirectory_I`       returned even when it holds nothing
  static std::string FindLocaleDirectory(const std::string& executableDirectory_I,
                                         const std::string& installedDirectory_I);
  // Where the catalogs are installed, fixed at build time.
  static std::string GetInstalledLocaleDirectory();

 private:
  std::string mLocaleDirectory;
};
