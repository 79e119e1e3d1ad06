#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <optional>

#include "common/LinuxPaths.h"

using namespace LinuxPaths;

// Sets or clears environment variables for one test and puts them back.
class CEnvironment {
 public:
  ~CEnvironment() {
    for (const auto& [name, value] : mSaved) Set(name, value ? value->c_str() : nullptr);
  }
  void Set(const std::string& name_I, const char* value_I) {
    const char* old = std::getenv(name_I.c_str());
    mSaved.try_emplace(name_I, old ? std::optional<std::string>(old) : std::nullopt);
    value_I ? setenv(name_I.c_str(), value_I, 1) : unsetenv(name_I.c_str());
  }

 private:
  std::map<std::string, std::optional<std::string>> mSaved;
};

TEST(LinuxPaths, XDGFoldersSetUnsetAndInvalid) {
  CEnvironment env;
  env.Set("HOME", "/home/tester/");
  env.Set("XDG_CONFIG_HOME", nullptr);
  EXPECT_EQ(GetUserFolderPath(), "/home/tester");
  EXPECT_EQ(GetConfigFolderPath(), "/home/tester/.config/tavik");
  EXPECT_EQ(GetUserPreferencesFolderPath(), "/home/tester/.config/tavik");

  env.Set("XDG_CONFIG_HOME", "/xdg/config/");
  EXPECT_EQ(GetConfigFolderPath(), "/xdg/config/tavik");

  // Empty or relative values are not valid base folders.
  for (const char* invalid : {"", "relative/config"}) {
    env.Set("XDG_CONFIG_HOME", invalid);
    EXPECT_EQ(GetConfigFolderPath(), "/home/tester/.config/tavik") << invalid;
  }

  // Without a usable HOME the password database knows the folder.
  env.Set("XDG_CONFIG_HOME", nullptr);
  const passwd* entry = getpwuid(getuid());
  ASSERT_NE(entry, nullptr);
  for (const char* unusable : {static_cast<const char*>(nullptr), ""}) {
    env.Set("HOME", unusable);
    EXPECT_EQ(GetUserFolderPath(), entry->pw_dir);
    EXPECT_EQ(GetConfigFolderPath(), AppendPathComponent(entry->pw_dir, ".config/tavik"));
  }
}

TEST(LinuxPaths, ProgramFolders) {
  const std::string data = GetInstalledDataFolderPath();
  EXPECT_EQ(data.front(), '/');
  EXPECT_EQ(LastPathComponent(data), "tavik-fwupdater");
  EXPECT_EQ(LastPathComponent(DeleteLastPathComponent(data)), "share");
  const std::string executableFolder = GetExecutableFolderPath();
  EXPECT_EQ(executableFolder.front(), '/');
  EXPECT_EQ(access(AppendPathComponent(executableFolder, "tests_common").c_str(), X_OK), 0)
      << executableFolder;
}

// An installed tree unpacked under another root finds its own data; a
// program with no data folder beside it falls back to the fixed one.
TEST(LinuxPaths, InstalledDataFolderFollowsTheExecutable) {
  namespace fs = std::filesystem;
  const fs::path root = fs::path(testing::TempDir()) / ("tav-prefix-" + std::to_string(getpid()));
  fs::create_directories(root / "usr/bin");
  const std::string fixed = FindInstalledDataFolder("");
  EXPECT_EQ(FindInstalledDataFolder((root / "usr/bin").string()), fixed);
  fs::create_directories(root / "usr/share/tavik-fwupdater");
  EXPECT_EQ(FindInstalledDataFolder((root / "usr/bin").string()),
            (root / "usr/share/tavik-fwupdater").string());
  EXPECT_EQ(FindInstalledDataFolder((root / "usr/bin/").string()),
            (root / "usr/share/tavik-fwupdater").string());
  EXPECT_EQ(FindInstalledDataFolder((root / "usr/libexec/tavik-fwupdater").string()),
            (root / "usr/share/tavik-fwupdater").string());
  fs::remove_all(root);
}

TEST(LinuxPaths, ComponentAndExtensionOperations) {
  using Op = std::string (*)(const std::string&);
  const struct {
    Op op;
    const char* name;
    std::vector<std::pair<const char*, const char*>> cases;
  } ops[] = {// clang-format off
      {LastPathComponent, "LastPathComponent",
       {{"/tmp/scratch.tiff", "scratch.tiff"}, {"/tmp/lock/", "lock"}, {"scratch///", "scratch"},
        {"/", "/"}, {"", ""}}},
      {DeleteLastPathComponent, "DeleteLastPathComponent",
       {{"/tmp/scratch.tiff", "/tmp"}, {"/tmp/lock/", "/tmp"}, {"/tmp//lock", "/tmp"},
        {"/tmp", "/"}, {"/", "/"}, {"scratch.tiff", ""}, {"", ""}}},
      {DeletePathExtension, "DeletePathExtension",
       {{"/tmp/scratch.tiff", "/tmp/scratch"}, {"/tmp.d/scratch", "/tmp.d/scratch"},
        {"scratch.bundle/", "scratch"}, {"/home/u/.profile", "/home/u/.profile"}, {"/", "/"}}}};
  const std::vector<std::array<const char*, 3>> appends{
      {"/a", "b", "/a/b"}, {"/a/", "/b/", "/a/b"}, {"/", "b", "/b"}, {"", "b", "b"},
      {"/a//", "", "/a"}};
  // clang-format on
  for (const auto& op : ops) {
    for (const auto& [in, out] : op.cases) EXPECT_EQ(op.op(in), out) << op.name << "(" << in << ")";
  }
  for (const auto& [a, b, out] : appends) EXPECT_EQ(AppendPathComponent(a, b), out) << a << b;
}
