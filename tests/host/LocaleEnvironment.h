#pragma once
// Sets the locale variables of the environment for one test and puts the
// previous values back afterwards, with the shared language manager gone.

#include <clocale>
#include <cstdlib>
#include <optional>
#include <string>

#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"

class LocaleEnvironment {
 public:
  // C.UTF-8 is installed everywhere and, unlike "C", lets LANGUAGE choose.
  explicit LocaleEnvironment(const std::string& language_I) {
    for (auto& [name, value] : mSaved) {
      if (const char* old = std::getenv(name)) value = old;
    }
    unsetenv("LC_MESSAGES");
    setenv("LANG", "C.UTF-8", 1);
    setenv("LC_ALL", "C.UTF-8", 1);
    SetLanguage(language_I);
  }
  ~LocaleEnvironment() {
    CLanguageManager::DisposeInstance();
    CLinuxLanguageManager::SetLocaleDirectory("");
    for (const auto& [name, value] : mSaved)
      value ? setenv(name, value->c_str(), 1) : unsetenv(name);
    std::setlocale(LC_MESSAGES, "C");
  }
  void SetLanguage(const std::string& language_I) { setenv("LANGUAGE", language_I.c_str(), 1); }

 private:
  std::pair<const char*, std::optional<std::string>> mSaved[4] = {
      {"LANGUAGE", {}}, {"LC_ALL", {}}, {"LC_MESSAGES", {}}, {"LANG", {}}};
};
