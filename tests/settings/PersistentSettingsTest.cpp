// The persistent store: the XML-file base form and the Linux form with its
// configuration folder, its YES/NO booleans and the one-time migration.

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>

#include "settings/CConfigFolderSettings.h"
#include "support/LogCapture.h"

namespace fs = std::filesystem;

namespace {

std::string ReadWholeFile(const fs::path& path_I) {
  std::ifstream in(path_I, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), {});
}

void WriteFile(const fs::path& path_I, const std::string& text_I) {
  fs::create_directories(path_I.parent_path());
  std::ofstream(path_I, std::ios::binary) << text_I;
}

// Points HOME and XDG_CONFIG_HOME at a fresh folder for the test's length.
class PersistentSettingsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    fs::remove_all(mRoot);
    fs::create_directories(mRoot / "home");
    setenv("HOME", (mRoot / "home").c_str(), 1);
    setenv("XDG_CONFIG_HOME", (mRoot / "config").c_str(), 1);
  }
  void TearDown() override {
    for (const auto& [name, value] : mSaved) {
      value ? setenv(name, value->c_str(), 1) : unsetenv(name);
    }
    fs::remove_all(mRoot);
  }
  static std::optional<std::string> Saved(const char* name_I) {
    const char* value = std::getenv(name_I);
    return value ? std::optional<std::string>(value) : std::nullopt;
  }
  fs::path StoreFile() const { return mRoot / "config" / "tavik" / "tdc.xml"; }
  fs::path LegacyFile() const { return mRoot / "home" / ".tavik" / "tdc.xml"; }

  const fs::path mRoot =
      fs::temp_directory_path() /
      ("settings-store-" +
       std::string(::testing::UnitTest::GetInstance()->current_test_info()->name()));
  const std::pair<const char*, std::optional<std::string>> mSaved[2] = {
      {"HOME", Saved("HOME")}, {"XDG_CONFIG_HOME", Saved("XDG_CONFIG_HOME")}};
};

TEST_F(PersistentSettingsTest, BaseStoreKeepsValuesInItsFileAcrossStarts) {
  const fs::path file = mRoot / "base.xml";
  {
    CPersistentSettings store(file.string());
    LogCapture capture;
    store.Init();
    EXPECT_TRUE(capture.LogContains("[W] CPersistentSettings::Init() - XML file was no help"));
    EXPECT_EQ(store.GetLastStatus(), CPersistentSettings::ESTATUS_READ_FAILED);

    EXPECT_TRUE(store.SetKeyAndBool("My Key", true));
    EXPECT_TRUE(store.GetBoolForKey("MyKey"));
    EXPECT_TRUE(store.IsKeyPresent(" M y K e y "));
    EXPECT_TRUE(store.SetKeyAndString("Last Path", "/media/fw", "Update History"));
    EXPECT_EQ(store.GetStringForKey("LastPath", "UpdateHistory"), "/media/fw");
    EXPECT_EQ(store.GetStringForKey("LastPath"), "");
    EXPECT_FALSE(store.GetBoolForKey("Absent"));
    EXPECT_EQ(store.CountKeys(), 2u);  // the key and the category
    EXPECT_EQ(store.GetLastStatus(), CPersistentSettings::ESTATUS_OK);
  }
  CPersistentSettings again(file.string());
  again.Init();
  EXPECT_TRUE(again.GetBoolForKey("My Key"));
  EXPECT_EQ(again.GetStringForKey("Last Path", "Update History"), "/media/fw");

  const auto written = fs::last_write_time(file);
  EXPECT_FALSE(again.DeleteKey("Absent"));
  EXPECT_EQ(fs::last_write_time(file), written);  // nothing was saved
  EXPECT_TRUE(again.DeleteCategory("Update History"));
  EXPECT_FALSE(again.IsKeyPresent("LastPath", "UpdateHistory"));
  EXPECT_TRUE(again.DeleteKey("MyKey"));

  CPersistentSettings third(file.string());
  third.Init();
  // Looking into a category makes it, so the lookup after the delete left an
  // empty one behind, and the last save wrote it.
  EXPECT_EQ(third.CountKeys(), 1u);
  EXPECT_EQ(third.CountKeys("UpdateHistory"), 0u);
  EXPECT_FALSE(third.IsKeyPresent("MyKey"));
}

TEST_F(PersistentSettingsTest, LinuxStoreWritesYesAndNoIntoTheConfigFolder) {
  CConfigFolderSettings store;
  store.Init();
  EXPECT_EQ(store.GetFilePath(), StoreFile().string());
  EXPECT_FALSE(fs::exists(StoreFile()));

  EXPECT_TRUE(store.SetKeyAndBool("Beta Updates", true));
  EXPECT_TRUE(store.SetKeyAndBool("Silent", false, "Options"));
  EXPECT_TRUE(store.SetKeyAndString("Device", "pen"));
  const std::string text = ReadWholeFile(StoreFile());
  EXPECT_NE(text.find("<BetaUpdates type=\"string\">YES</BetaUpdates>"), std::string::npos) << text;
  EXPECT_NE(text.find("<Silent type=\"string\">NO</Silent>"), std::string::npos) << text;
  EXPECT_FALSE(fs::exists(StoreFile().string() + ".new"));

  EXPECT_TRUE(store.GetBoolForKey("BetaUpdates"));
  EXPECT_FALSE(store.GetBoolForKey("Silent", "Options"));
  EXPECT_FALSE(store.GetBoolForKey("Device"));
  store.SetKeyAndString("Typed", "yes");
  EXPECT_TRUE(store.GetBoolForKey("Typed"));

  CConfigFolderSettings again;
  again.Init();
  EXPECT_TRUE(again.GetBoolForKey("Beta Updates"));
  EXPECT_EQ(again.GetStringForKey("Device"), "pen");
}

TEST_F(PersistentSettingsTest, LegacyFileMovesInOnceAndIsRemoved) {
  WriteFile(LegacyFile(),
            "<root type=\"map\"><Agreed type=\"bool\">true</Agreed><Off type=\"bool\">false</Off>"
            "<Name type=\"string\">old</Name><Count type=\"integer\">4</Count></root>");
  {
    CConfigFolderSettings store;
    store.Init();
    EXPECT_TRUE(store.GetBoolForKey("Agreed"));
    EXPECT_FALSE(store.GetBoolForKey("Off"));
    EXPECT_TRUE(store.IsKeyPresent("Off"));
    EXPECT_EQ(store.GetStringForKey("Name"), "old");
    EXPECT_FALSE(store.IsKeyPresent("Count"));  // only booleans and strings move
    EXPECT_FALSE(fs::exists(LegacyFile()));
    EXPECT_TRUE(fs::exists(LegacyFile().parent_path()));
  }
  CConfigFolderSettings second;
  second.Init();
  EXPECT_TRUE(second.GetBoolForKey("Agreed"));
  EXPECT_EQ(second.CountKeys(), 3u);
}

TEST_F(PersistentSettingsTest, LegacyFileStaysWhenItIsBadOrCannotBeMovedIn) {
  LogCapture capture;
  WriteFile(LegacyFile(), "<root><unclosed></root>");
  {
    CConfigFolderSettings store;
    store.Init();
    EXPECT_EQ(store.CountKeys(), 0u);
    EXPECT_TRUE(fs::exists(LegacyFile()));
  }

  // A file where the configuration folder should be: nothing can be saved.
  WriteFile(LegacyFile(), "<root><Name>old</Name></root>");
  WriteFile(mRoot / "config", "in the way");
  CConfigFolderSettings blocked;
  blocked.Init();
  EXPECT_EQ(blocked.GetLastStatus(), CPersistentSettings::ESTATUS_SAVE_FAILED);
  EXPECT_TRUE(fs::exists(LegacyFile()));
  // Reads still give what is in memory; writes report the failure.
  EXPECT_EQ(blocked.GetStringForKey("Name"), "old");
  EXPECT_FALSE(blocked.SetKeyAndString("x", "y"));
}

}  // namespace
