#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "LocaleEnvironment.h"
#include "host/CLinuxLanguageManager.h"
#include "support/LogCapture.h"

namespace {

const std::string kTestCatalogs = TAV_TEST_LOCALE_DIR;
const std::string kShippedCatalogs = TAV_BUILD_LOCALE_DIR;

TEST(LinuxLanguageManager, LooksInTheApplicationDomainThenDevicesThenGivesTheKey) {
  LocaleEnvironment environment("en");
  CLinuxLanguageManager manager(kTestCatalogs);

  EXPECT_EQ(manager.GetLocalizedString("in-both"), "from the application domain");
  EXPECT_EQ(manager.GetLocalizedString("only-in-devices"), "Grüße from the devices domain");
  EXPECT_EQ(manager.GetLocalizedString("in neither domain"), "in neither domain");
  EXPECT_EQ(manager.GetLocalizedString("7", 42), "numbered key");
  EXPECT_EQ(manager.GetLocalizedString("7", 43), "7:43");
  // The empty key must not fetch the catalog header.
  EXPECT_EQ(manager.GetLocalizedString(""), "");

  // A text equal to its key is still a found text, not a miss.
  std::string text;
  EXPECT_TRUE(manager.FindLocalizedString("same-as-key", text));
  EXPECT_EQ(text, "same-as-key");
  EXPECT_FALSE(manager.FindLocalizedString("in neither domain", text));
}

// The number comes from the "Language" key, the application domain's first;
// a language without catalogs shows keys and counts as language zero.
TEST(LinuxLanguageManager, CurrentLanguageComesFromTheLanguageKeyWithinTheTable) {
  const struct {
    const char* language;
    uint32_t number;
    bool refused;
  } cases[] = {{"en", 12, false},  // "12" in the application domain, "3" in Devices
               {"xc", 23, false},  // leading blanks and trailing words read past
               {"fr", 0, false},   // no catalogs
               {"xa", 0, true},    // beyond the table
               {"xb", 0, true}};   // negative
  LocaleEnvironment environment("en");
  for (const auto& entry : cases) {
    environment.SetLanguage(entry.language);
    LogCapture capture;
    CLinuxLanguageManager manager(kTestCatalogs);
    EXPECT_EQ(manager.GetCurrentLanguage(), entry.number) << entry.language;
    EXPECT_EQ(capture.Assertions().empty(), !entry.refused) << entry.language;
  }
  environment.SetLanguage("fr");
  EXPECT_EQ(CLinuxLanguageManager(kTestCatalogs).GetLocalizedString("in-both"), "in-both");
}

// The catalogs say their own language's number, and each has the texts of
// both domains.
TEST(LinuxLanguageManager, EveryShippedLanguageHasItsOwnNumber) {
  LocaleEnvironment environment("en");
  size_t languages = 0;
  for (const auto& entry : std::filesystem::directory_iterator(kShippedCatalogs)) {
    // The English catalogs filed again for the C locale are no language.
    const std::string language = entry.path().filename().string();
    if (language == "C.UTF-8") continue;
    ++languages;
    environment.SetLanguage(language);
    CLinuxLanguageManager manager(kShippedCatalogs);
    EXPECT_EQ(manager.GetISOLanguageCode(), language);
    std::string text;
    EXPECT_TRUE(manager.FindLocalizedString("Yes", text)) << language;
    EXPECT_TRUE(manager.FindLocalizedString("Pen", text)) << language;
  }
  EXPECT_GE(languages, 2u);
}

TEST(LinuxLanguageManager, LocaleFolderSearchPrefersTheProgramsSurroundings) {
  namespace fs = std::filesystem;
  const fs::path root = fs::path(testing::TempDir()) / "locale-search";
  fs::remove_all(root);
  const fs::path program = root / "build" / "src" / "app";
  fs::create_directories(program);
  const std::string installed = (root / "installed").string();
  auto addCatalogs = [](const fs::path& locale_I) {
    fs::create_directories(locale_I / "en" / "LC_MESSAGES");
    std::ofstream(locale_I / CLinuxLanguageManager::kMarkerCatalog).put('\0');
  };

  EXPECT_EQ(CLinuxLanguageManager::FindLocaleDirectory(program.string(), installed), installed);
  EXPECT_EQ(CLinuxLanguageManager::FindLocaleDirectory("", installed), installed);

  // A folder without the program's English catalog does not count.
  fs::create_directories(root / "build" / "locale" / "de" / "LC_MESSAGES");
  EXPECT_EQ(CLinuxLanguageManager::FindLocaleDirectory(program.string(), installed), installed);

  // Each nearer folder wins over the ones found before it.
  for (const fs::path& locale : {root / "build" / "locale", root / "build" / "src" / "locale",
                                 root / "build" / "src" / "share" / "locale", program / "locale"}) {
    addCatalogs(locale);
    EXPECT_EQ(CLinuxLanguageManager::FindLocaleDirectory(program.string(), installed),
              locale.string());
  }
  fs::remove_all(root);
}

TEST(LinuxLanguageManager, NoLocaleOrAnUninstalledOneStillShowsTheEnglishTexts) {
  // Neither the C locale nor a missing one may leave the user with bare keys.
  for (const char* lang : {"", "xx_YY.UTF-8"}) {
    LocaleEnvironment environment("en");
    unsetenv("LANGUAGE");
    unsetenv("LC_ALL");
    if (lang[0] == '\0') {
      unsetenv("LANG");
    } else {
      setenv("LANG", lang, 1);
    }
    CLinuxLanguageManager manager(kShippedCatalogs);
    EXPECT_EQ(manager.GetLocalizedString("Programming Failed"), "Programming Failed") << lang;
    EXPECT_NE(manager.GetLocalizedString("200:250"), "200:250") << lang;
    EXPECT_EQ(manager.GetCurrentLanguage(), 0u);
  }
}

}  // namespace
