// The Linux persistent settings: in the user's data store where one
// answers on the (private) session bus, else in the configuration folder.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "host/CLinuxPersistentSettings.h"
#include "host/OProcessUtils.h"
#include "lab/CLabDesktop.h"
#include "platform/linux/CLinuxServiceDirectory.h"
#include "platform/linux/FakeDataStore.h"
#include "platform/linux/PrivateBus.h"
#include "settings/CSettingsMap.h"

namespace fs = std::filesystem;

namespace {

void WriteFile(const fs::path& path_I, const std::string& text_I) {
  fs::create_directories(path_I.parent_path());
  std::ofstream(path_I) << text_I;
}

// HOME and XDG_CONFIG_HOME in a fresh folder, the session bus a private
// one, and the lab's desktop for notifications.
class LinuxPersistentSettings : public ::testing::Test {
 protected:
  void SetUp() override {
    fs::remove_all(mRoot);
    fs::create_directories(mRoot / "home");
    setenv("HOME", (mRoot / "home").c_str(), 1);
    setenv("XDG_CONFIG_HOME", (mRoot / "config").c_str(), 1);
    OProcessUtils::SetDesktop(mDesktop);
    if (!mBus.IsUp()) GTEST_SKIP() << "dbus-daemon is not installed";
    OXPCClient::SetServiceDirectory(0, std::make_shared<CLinuxServiceDirectory>(false));
  }
  void TearDown() override {
    OXPCClient::SetServiceDirectory(0, nullptr);
    OProcessUtils::SetDesktop(nullptr);
    CClock::Set(nullptr);
    fs::remove_all(mRoot);
  }
  fs::path StoreFile() const { return mRoot / "config" / "tavik" / "tdc.xml"; }
  fs::path LegacyFile() const { return mRoot / "home" / ".tavik" / "tdc.xml"; }

  const fs::path mRoot =
      fs::temp_directory_path() /
      ("linux-settings-" +
       std::string(::testing::UnitTest::GetInstance()->current_test_info()->name()));
  std::shared_ptr<CLabDesktop> mDesktop = std::make_shared<CLabDesktop>();
  CPrivateBus mBus;
};

TEST_F(LinuxPersistentSettings, ValuesTravelToTheStoreAsTextsUnderKeysWithoutBlanks) {
  CFakeDataStore store;
  ASSERT_TRUE(store.IsReady());
  std::vector<SNotification> heard;
  OProcessUtils::GetInstance()->addObserver(
      "LOGGING_ENABLED",
      [&](const SNotification& notification_I) { heard.push_back(notification_I); });
  const size_t observers = OProcessUtils::GetInstance()->GetObserverCount();

  CLinuxPersistentSettings settings;
  settings.Init();
  ASSERT_TRUE(settings.IsUsingDataStore());
  EXPECT_EQ(OProcessUtils::GetInstance()->GetObserverCount(), observers + 1);

  EXPECT_TRUE(settings.SetKeyAndBool("Beta Updates", true));
  EXPECT_EQ(store.Stored("BetaUpdates"), "YES");
  EXPECT_TRUE(settings.IsKeyPresent(" Beta Updates"));
  EXPECT_FALSE(settings.IsKeyPresent("Absent"));
  store.Put("Typed", "yes");
  EXPECT_TRUE(settings.GetBoolForKey("Typed"));

  EXPECT_TRUE(settings.SetKeyAndString("Last Path", "/media/fw", "Update History"));
  EXPECT_EQ(settings.GetStringForKey("LastPath", "UpdateHistory"), "/media/fw");
  settings.SetKeyAndBool("Silent", true, "Update History");
  EXPECT_EQ(settings.CountKeys("Update History"), 2u);
  // A category is one object under its own key; deleting within it answers
  // whether the key was there and writes nothing back.
  const auto stored = CSettingsMap::CastToMap(
      CSettingsObject::ReadFromJSONBuffer(store.Stored("UpdateHistory")), false);
  ASSERT_NE(stored, nullptr);
  EXPECT_EQ(stored->StringForKeyWithDefault("LastPath", ""), "/media/fw");
  EXPECT_TRUE(settings.DeleteKey("Silent", "Update History"));
  EXPECT_FALSE(settings.DeleteKey("Missing", "Update History"));
  EXPECT_TRUE(settings.IsKeyPresent("Silent", "Update History"));
  EXPECT_TRUE(settings.DeleteCategory("Update History"));
  EXPECT_FALSE(store.Holds("UpdateHistory"));

  // Only the root's key is the one the family listens for.
  settings.SetKeyAndBool("LOGGING_ENABLED", false, "Options");
  settings.SetKeyAndBool(" LOGGING_ENABLED", true);
  ASSERT_EQ(heard.size(), 1u);
  EXPECT_EQ(std::get<int32_t>(heard[0].userInfo.at("Enable")), 1);
  EXPECT_FALSE(fs::exists(StoreFile()));
}

TEST_F(LinuxPersistentSettings, OldFilesMoveIntoTheStoreOnceAndAreRemoved) {
  CFakeDataStore store;
  ASSERT_TRUE(store.IsReady());
  WriteFile(LegacyFile(),
            "<root type=\"map\"><Agreed type=\"bool\">true</Agreed>"
            "<Name type=\"string\">legacy</Name><Count type=\"integer\">4</Count></root>");
  WriteFile(StoreFile(),
            "<root type=\"map\"><Name type=\"string\">newer</Name>"
            "<Options type=\"map\"><Silent type=\"string\">YES</Silent></Options></root>");
  {
    CLinuxPersistentSettings settings;
    settings.Init();
    ASSERT_TRUE(settings.IsUsingDataStore());
    EXPECT_TRUE(settings.GetBoolForKey("Agreed"));
    EXPECT_EQ(settings.GetStringForKey("Name"), "newer");
    EXPECT_TRUE(settings.GetBoolForKey("Silent", "Options"));
    EXPECT_FALSE(settings.IsKeyPresent("Count"));  // only booleans and texts move
    EXPECT_FALSE(fs::exists(LegacyFile()));
    EXPECT_FALSE(fs::exists(StoreFile()));
    settings.SetKeyAndString("Name", "changed");
  }
  CLinuxPersistentSettings again;
  again.Init();
  EXPECT_EQ(again.GetStringForKey("Name"), "changed");
}

TEST_F(LinuxPersistentSettings, AStoreThatDoesNotAnswerReadsAsAbsent) {
  CFakeDataStore store;  // never answers for the key "silent"
  ASSERT_TRUE(store.IsReady());
  CLinuxPersistentSettings settings;
  settings.Init();
  ASSERT_TRUE(settings.IsUsingDataStore());
  CClock::Set(std::make_shared<CVirtualClock>());
  EXPECT_FALSE(settings.IsKeyPresent("silent"));
  EXPECT_FALSE(settings.GetBoolForKey("si lent"));
  EXPECT_FALSE(settings.SetKeyAndString("silent", "x"));
}

TEST_F(LinuxPersistentSettings, AStoreListedButMuteIsGivenUpWithinHalfAMinute) {
  CFakeDataStore store;
  ASSERT_TRUE(store.IsReady());
  store.SetMuted(true);
  auto clock = std::make_shared<CVirtualClock>();
  CClock::Set(clock);
  CLinuxPersistentSettings settings;
  settings.Init();
  EXPECT_FALSE(settings.IsUsingDataStore());
  EXPECT_LT(clock->Now(), 40.0);
}

TEST_F(LinuxPersistentSettings, WithoutAStoreTheValuesStayInTheConfigurationFolder) {
  {
    CLinuxPersistentSettings settings;  // a bus with no store on it
    settings.Init();
    EXPECT_TRUE(settings.SetKeyAndBool("Beta Updates", true));
  }
  EXPECT_TRUE(fs::exists(StoreFile()));
  // No bus at all, through the shared instance, which reads the file back.
  OXPCClient::SetServiceDirectory(0, nullptr);
  CPersistentSettings::SetFactory([] { return std::make_unique<CLinuxPersistentSettings>(); });
  auto* shared = dynamic_cast<CLinuxPersistentSettings*>(CPersistentSettings::SharedInstance());
  ASSERT_NE(shared, nullptr);
  EXPECT_FALSE(shared->IsUsingDataStore());
  EXPECT_TRUE(shared->GetBoolForKey("BetaUpdates"));
}

}  // namespace
