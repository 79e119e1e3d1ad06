#pragma once
// The languages the program knows and the one language manager of the
// process. Every text a user sees is looked up through it by key; a key
// without a text comes back as itself, so a missing translation shows the
// key instead of failing.

#include <cstdint>
#include <string>
#include <vector>

class CLanguageManager {
 public:
  struct LanguageTableEntry {
    std::string code;  // as in the catalogs' folder names: "en", "zh_CN"
    uint32_t number = 0;
  };

  // Rows of the language table; the catalogs' "Language" text is one of them.
  static constexpr uint32_t LAST_ELANGUAGE = 24;

  virtual ~CLanguageManager() = default;
  CLanguageManager(const CLanguageManager&) = delete;
  CLanguageManager& operator=(const CLanguageManager&) = delete;

  // The number of the language the texts come in, always a row of the table.
  virtual uint32_t GetCurrentLanguage() = 0;
  // The text of `key_I`, or the key itself when no catalog has it.
  virtual std::string GetLocalizedString(const std::string& key_I) = 0;
  // The text of the key "<table>:<id>", as in "200:250".
  std::string GetLocalizedString(const std::string& table_I, unsigned short id_I);

  // The code of the current language, or "" when its number has no row.
  std::string GetISOLanguageCode();
  const std::vector<LanguageTableEntry>& GetLanguageTable() const { return mLanguageTable; }

  // The process-wide manager, made at first use. It is safe to ask for it
  // from any thread; DisposeInstance must not race with its users.
  static CLanguageManager* SharedInstance();
  static void DisposeInstance();

 protected:
  CLanguageManager();

 private:
  std::vector<LanguageTableEntry> mLanguageTable;
};

// The user's text for a key, through SharedInstance(); the key itself when
// there is none. Both names give the same text.
std::string TTCLocalizedString(const std::string& key_I);
std::string TTCLocalizedNSString(const std::string& key_I);
