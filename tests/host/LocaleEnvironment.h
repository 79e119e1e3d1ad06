#pragma once
// Sets the locale variables of the environment for one test and puts the
// previous values back afterwards, with the shared language manager gone.

#include <clocale>
#include <cstdlib>
#include <map>
#include <optional>
#include <string>

#include "host/CLanguageManager.h"
#include "host/CLinuxLanguageManager.h"

class LocaleEnvironment {
 public:
  // C.UTF-8 is installed everywhere and, unlike "C", lets LANGUAGE choose.
  explicit LocaleEnvironment(const std::string& language_I) {
    for (const char* name : {"LANGUAGE", "LC_ALL", "LC_MESSAGES", "LANG"}) {
      const char* value = std::getenv(name);
      mSaved[name] = value ? std::optional<std::string>(value) : std::nullopt;
    }
    unsetenv("LC_MESSAGES");
    setenv("LANG", "C.UTF-8", 1);
    setenv("LC_ALL", "C.UTF-8", 1);
    SetLanguage(language_I);
  }
  ~LocaleEnvironment() {
    CLanguageManager::DisposeInstance();
    CLinuxLanguageManager::SetLocaleDirectory("");
    for (const auto& [name, value] : mSaved) {
      if (value) {
        setenv(name.c_str(), value->c_str(), 1);
      } else {
        unsetenv(name.c_str());
      }
    }
    std::setlocale(LC_MESSAGES, "C");
  }
  void SetLanguage(const std::string& language_I) { setenv("LANGUAGE", language_I.c_str(), 1); }

 private:
  std::map<std::string, std::optional<std::string>> mSaved;
};
