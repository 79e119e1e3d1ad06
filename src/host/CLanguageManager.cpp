#include "host/CLanguageManager.h"

#include <array>
#include <mutex>

#include "common/TavAssert.h"
#include "host/CLinuxLanguageManager.h"

namespace {

// By number from 0. Rows 0 and 3 share "en" and rows 10 and 11 share "pt":
// the catalogs of older releases carry those numbers, so both stay.
constexpr std::array<const char*, CLanguageManager::LAST_ELANGUAGE> kLanguageCodes = {
    "en", "zh_CN", "zh_TW", "en", "fr", "de", "ja", "ko", "it", "es", "pt", "pt",
    "nl", "ru",    "sv",    "pl", "da", "fi", "no", "tr", "cs", "el", "hu", "sk"};

std::mutex gInstanceLock;
CLanguageManager* gInstance = nullptr;

}  // namespace

CLanguageManager::CLanguageManager() {
  if (!mLanguageTable.empty()) TAVASSERT_TEXT("mLanguageTable.empty()");
  for (uint32_t number = 0; number < kLanguageCodes.size(); ++number) {
    mLanguageTable.push_back(LanguageTableEntry{kLanguageCodes[number], number});
  }
  if (mLanguageTable.size() != LAST_ELANGUAGE) {
    TAVASSERT_TEXT("mLanguageTable.size() == LAST_ELANGUAGE");
  }
}

std::string CLanguageManager::GetLocalizedString(const std::string& table_I, unsigned short id_I) {
  return GetLocalizedString(table_I + ":" + std::to_string(id_I));
}

std::string CLanguageManager::GetISOLanguageCode() {
  const uint32_t language = GetCurrentLanguage();
  for (const LanguageTableEntry& entry : mLanguageTable) {
    if (entry.number == language) return entry.code;
  }
  return std::string();
}

CLanguageManager* CLanguageManager::SharedInstance() {
  std::lock_guard<std::mutex> guard(gInstanceLock);
  if (gInstance == nullptr) {
    gInstance = new CLinuxLanguageManager(CLinuxLanguageManager::GetLocaleDirectory());
  }
  return gInstance;
}

void CLanguageManager::DisposeInstance() {
  std::lock_guard<std::mutex> guard(gInstanceLock);
  delete gInstance;
  gInstance = nullptr;
}

std::string TTCLocalizedString(const std::string& key_I) {
  return CLanguageManager::SharedInstance()->GetLocalizedString(key_I);
}

std::string TTCLocalizedNSString(const std::string& key_I) {
  return CLanguageManager::SharedInstance()->GetLocalizedString(key_I);
}
