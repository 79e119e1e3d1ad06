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

TEST(LinuxLanguageManager, ALanguageWithoutCatalogsShowsKeysAndCountsAsLanguageZero) {
  LogCapture capture;
  LocaleEnvironment environment("fr");
  CLinuxLanguageManager manager(kTestCatalogs);
  EXPECT_EQ(manager.GetLocalizedString("in-both"), "in-both");
  EXPECT_EQ(manager.GetCurrentLanguage(), 0u);
  EXPECT_EQ(manager.GetISOLanguageCode(), "en");
  EXPECT_TRUE(capture.Assertions().empty());
}

TEST(LinuxLanguageManager, CurrentLanguageComesFromTheLanguageKeyWithinTheTable) {
  LocaleEnvironment environment("en");
  {
    // The application domain's "Language" wins over the one in Devices.
    CLinuxLanguageManager manager(kTestCatalogs);
    EXPECT_EQ(manager.GetCurrentLanguage(), 12u);
    EXPECT_EQ(manager.GetISOLanguageCode(), "nl");
  }
  {
    // Leading blanks and trailing words are read past, as an integer value.
    environment.SetLanguage("xc");
    LogCapture capture;
    CLinuxLanguageManager manager(kTestCatalogs);
    EXPECT_EQ(manager.GetCurrentLanguage(), 23u);
    EXPECT_TRUE(capture.Assertions().empty());
  }
  for (const char* language : {"xa", "xb"}) {
    environment.SetLanguage(language);
    LogCapture capture;
    CLinuxLanguageManager manager(kTestCatalogs);
    EXPECT_EQ(manager.GetCurrentLanguage(), 0u) << language;
    ASSERT_EQ(capture.Assertions().size(), 2u) << language;
    EXPECT_TRUE(capture.AssertionContains("failed assertion: languageCode < LAST_ELANGUAGE"));
    EXPECT_TRUE(capture.AssertionContains("failed assertion: \"BAD LANGUAGE CODE\""));
  }
}

TEST(LinuxLanguageManager, SharedInstanceFollowsLANGUAGEWithTheShippedCatalogs) {
  LocaleEnvironment environment("de");
  CLinuxLanguageManager::SetLocaleDirectory(kShippedCatalogs);
  CLanguageManager::DisposeInstance();

  EXPECT_EQ(TTCLocalizedNSString("Yes"), "Ja");
  EXPECT_EQ(TTCLocalizedString("Do you want to continue?"), "Möchten Sie fortfahren?");
  EXPECT_EQ(TTCLocalizedNSString("Pen"), "Stift");  // only in Devices
  EXPECT_EQ(CLanguageManager::SharedInstance()->GetCurrentLanguage(), 5u);
  EXPECT_EQ(CLanguageManager::SharedInstance()->GetISOLanguageCode(), "de");

  // A preference list falls through to the first language that has catalogs.
  environment.SetLanguage("fr:de");
  CLanguageManager::DisposeInstance();
  EXPECT_EQ(TTCLocalizedNSString("No"), "Nein");

  environment.SetLanguage("en");
  CLanguageManager::DisposeInstance();
  EXPECT_EQ(TTCLocalizedNSString("Yes"), "Yes");
  EXPECT_NE(TTCLocalizedNSString("200:250"), "200:250");
  EXPECT_EQ(CLanguageManager::SharedInstance()->GetCurrentLanguage(), 0u);
}

// Every text the application shows, as it passes them to the catalogs.
// clang-format off
const char* const kShownKeys[] = {
    "Tavik Firmware Update Utility", "You are about to update the firmware.",
    "While programming do not disconnect or power down your device.", "Do you want to continue?",
    "No", "Yes", "OK", "Try Again", "Waiting for Loader Mode", "Waiting for Device Mode",
    "Updating, this may take several minutes", "Programming Successful", "Programming Failed",
    "Firmware was successfully updated.",
    "Error: No supported tablet is connected. Please connect a tablet.",
    "Error: Invalid state resulted in updater termination.",
    "Error: The specified file does not appear to be a valid firmware file.",
    "200:250", "200:255", "200:257", "Pen", "Touch", "Bluetooth", "Scalar"};
// clang-format on

TEST(LinuxLanguageManager, EveryShippedLanguageHasEveryShownTextAndItsOwnNumber) {
  LocaleEnvironment environment("en");
  std::vector<std::string> languages;
  for (const auto& entry : std::filesystem::directory_iterator(kShippedCatalogs)) {
    // The English catalogs filed again for the C locale are no language.
    if (entry.path().filename() == "C.UTF-8") continue;
    languages.push_back(entry.path().filename().string());
  }
  ASSERT_GE(languages.size(), 2u);

  for (const std::string& language : languages) {
    environment.SetLanguage(language);
    CLinuxLanguageManager manager(kShippedCatalogs);
    EXPECT_EQ(manager.GetISOLanguageCode(), language);
    for (const char* key : kShownKeys) {
      std::string text;
      EXPECT_TRUE(manager.FindLocalizedString(key, text)) << language << ": " << key;
      EXPECT_FALSE(text.empty()) << language << ": " << key;
    }
  }
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

TEST(LinuxLanguageManager, AnExplicitLocaleFolderOverridesTheSearch) {
  LocaleEnvironment environment("en");
  CLinuxLanguageManager::SetLocaleDirectory(kTestCatalogs);
  CLanguageManager::DisposeInstance();
  EXPECT_EQ(TTCLocalizedNSString("in-both"), "from the application domain");

  // Without it the search starts beside the running program, where this
  // test program keeps its own catalogs.
  CLinuxLanguageManager::SetLocaleDirectory("");
  EXPECT_EQ(std::filesystem::path(CLinuxLanguageManager::GetLocaleDirectory()),
            std::filesystem::path(kTestCatalogs).lexically_normal());
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
