#include "host/CLinuxLanguageManager.h"

#include <libintl.h>

#include <climits>
#include <clocale>
#include <cstring>
#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <system_error>

#include "common/TavAssert.h"
#include "common/TavLog.h"

#ifndef TAV_INSTALLED_LOCALE_DIR
#error "TAV_INSTALLED_LOCALE_DIR must name the installed locale folder"
#endif

namespace {

std::mutex gDirectoryLock;
std::string gDirectoryOverride;

void BindDomain(const char* domain_I, const std::string& directory_I) {
  bindtextdomain(domain_I, directory_I.c_str());
  // Catalogs are UTF-8; without this gettext would recode them to the
  // locale's character set, which is ASCII in the C locales.
  bind_textdomain_codeset(domain_I, "UTF-8");
}

// gettext hands back the very pointer it was given when it has no text,
// which tells a miss apart from a text equal to its key.
bool LookUp(const char* domain_I, const std::string& key_I, std::string& text_O) {
  const char* text = dgettext(domain_I, key_I.c_str());
  if (text == key_I.c_str()) return false;
  text_O = text;
  return true;
}

// Reads like the platform's integer value of a text: leading blanks, an
// optional sign, digits; no digits gives 0, and a value beyond int clamps.
long long IntegerValue(const std::string& text_I) {
  const long long value = std::strtoll(text_I.c_str(), nullptr, 10);
  if (value > INT_MAX) return INT_MAX;
  if (value < INT_MIN) return INT_MIN;
  return value;
}

bool HoldsCatalogs(const std::filesystem::path& directory_I) {
  std::error_code error;
  return std::filesystem::is_regular_file(directory_I / CLinuxLanguageManager::kMarkerCatalog,
                                          error);
}

std::string ExecutableDirectory() {
  std::error_code error;
  const std::filesystem::path executable = std::filesystem::read_symlink("/proc/self/exe", error);
  if (error) return std::string();
  return executable.parent_path().string();
}

}  // namespace

CLinuxLanguageManager::CLinuxLanguageManager(const std::string& localeDirectory_I)
    : mLocaleDirectory(localeDirectory_I) {
  const char* chosen = std::setlocale(LC_MESSAGES, "");
  if (chosen == nullptr) {
    TavLog::Warning(
        "The message locale of the environment is not installed; texts stay in English\n");
  }
  // gettext never translates under C or POSIX, which would show the user
  // bare keys; C.UTF-8 reads the English catalogs filed under that name.
  if (chosen == nullptr || std::strcmp(chosen, "C") == 0 || std::strcmp(chosen, "POSIX") == 0) {
    std::setlocale(LC_MESSAGES, "C.UTF-8");
  }
  BindDomain(kApplicationDomain, mLocaleDirectory);
  BindDomain(kDevicesDomain, mLocaleDirectory);
}

uint32_t CLinuxLanguageManager::GetCurrentLanguage() {
  const long long languageCode = IntegerValue(GetLocalizedString("Language"));
  if (languageCode < 0 || languageCode >= LAST_ELANGUAGE) {
    TAVASSERT_TEXT("languageCode < LAST_ELANGUAGE");
    TAVASSERT_TEXT("\"BAD LANGUAGE CODE\"");
    return 0;
  }
  return static_cast<uint32_t>(languageCode);
}

std::string CLinuxLanguageManager::GetLocalizedString(const std::string& key_I) {
  std::string text;
  if (FindLocalizedString(key_I, text)) return text;
  return key_I;
}

bool CLinuxLanguageManager::FindLocalizedString(const std::string& key_I,
                                                std::string& text_O) const {
  // The empty key would fetch the catalog's header entry.
  if (key_I.empty()) return false;
  return LookUp(kApplicationDomain, key_I, text_O) || LookUp(kDevicesDomain, key_I, text_O);
}

void CLinuxLanguageManager::SetLocaleDirectory(const std::string& directory_I) {
  std::lock_guard<std::mutex> guard(gDirectoryLock);
  gDirectoryOverride = directory_I;
}

std::string CLinuxLanguageManager::GetLocaleDirectory() {
  {
    std::lock_guard<std::mutex> guard(gDirectoryLock);
    if (!gDirectoryOverride.empty()) return gDirectoryOverride;
  }
  const std::string directory =
      FindLocaleDirectory(ExecutableDirectory(), GetInstalledLocaleDirectory());
  if (!HoldsCatalogs(directory)) {
    TavLog::Warning("No message catalogs in %s; texts show their keys\n", directory.c_str());
  }
  return directory;
}

std::string CLinuxLanguageManager::FindLocaleDirectory(const std::string& executableDirectory_I,
                                                       const std::string& installedDirectory_I) {
  if (!executableDirectory_I.empty()) {
    const std::filesystem::path base(executableDirectory_I);
    for (const std::filesystem::path& candidate :
         {base / "locale", base / ".." / "share" / "locale", base / ".." / "locale",
          base / ".." / ".." / "locale"}) {
      if (HoldsCatalogs(candidate)) return candidate.lexically_normal().string();
    }
  }
  return installedDirectory_I;
}

std::string CLinuxLanguageManager::GetInstalledLocaleDirectory() {
  return TAV_INSTALLED_LOCALE_DIR;
}
