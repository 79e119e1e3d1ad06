#include <gtest/gtest.h>

#include "host/CLanguageManager.h"
#include "support/LogCapture.h"

// A manager whose language number the test chooses.
class FakeLanguageManager : public CLanguageManager {
 public:
  uint32_t GetCurrentLanguage() override { return mLanguage; }
  std::string GetLocalizedString(const std::string& key_I) override { return key_I; }
  uint32_t mLanguage = 0;
};

TEST(LanguageTable, CodesByNumberKeepTheSharedRowsAndRefuseUnknownNumbers) {
  LogCapture capture;
  FakeLanguageManager manager;
  EXPECT_TRUE(capture.Assertions().empty());
  const std::pair<uint32_t, const char*> cases[] = {
      {0, "en"},  {1, "zh_CN"}, {2, "zh_TW"}, {3, "en"}, {5, "de"},       {10, "pt"},
      {11, "pt"}, {18, "no"},   {23, "sk"},   {24, ""},  {0xFFFFFFFF, ""}};
  for (const auto& [language, code] : cases) {
    manager.mLanguage = language;
    EXPECT_EQ(manager.GetISOLanguageCode(), code) << "language " << language;
  }
}
