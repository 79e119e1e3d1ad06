#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

#include <cstdlib>
#include <map>
#include <optional>

#include "common/LinuxPaths.h"
#include "support/LogCapture.h"

namespace {

using namespace LinuxPaths;

// Sets or clears environment variables for one test and puts them back.
class CEnvironment {
 public:
  ~CEnvironment() {
    for (const auto& [name, value] : mSaved) {
      if (value) {
        setenv(name.c_str(), value->c_str(), 1);
      } else {
        unsetenv(name.c_str());
      }
    }
  }
  void Set(const std::string& name_I, const char* value_I) {
    if (!mSaved.contains(name_I)) {
      const char* old = std::getenv(name_I.c_str());
      mSaved[name_I] = old ? std::optional<std::string>(old) : std::nullopt;
    }
    if (value_I) {
      setenv(name_I.c_str(), value_I, 1);
    } else {
      unsetenv(name_I.c_str());
    }
  }

 private:
  std::map<std::string, std::optional<std::string>> mSaved;
};

TEST(LinuxPaths, XDGFoldersSetUnsetAndInvalid) {
  CEnvironment env;
  env.Set("HOME", "/home/tester/");
  env.Set("XDG_CONFIG_HOME", nullptr);
  env.Set("XDG_STATE_HOME", nullptr);
  EXPECT_EQ(GetUserFolderPath(), "/home/tester");
  EXPECT_EQ(GetConfigFolderPath(), "/home/tester/.config/tavik");
  EXPECT_EQ(GetUserPreferencesFolderPath(), "/home/tester/.config/tavik");
  EXPECT_EQ(GetStateFolderPath(), "/home/tester/.local/state/tavik");

  env.Set("XDG_CONFIG_HOME", "/xdg/config/");
  env.Set("XDG_STATE_HOME", "/xdg/state");
  EXPECT_EQ(GetConfigFolderPath(), "/xdg/config/tavik");
  EXPECT_EQ(GetStateFolderPath(), "/xdg/state/tavik");

  // Empty or relative values are not valid base folders.
  env.Set("XDG_CONFIG_HOME", "");
  env.Set("XDG_STATE_HOME", "relative/state");
  EXPECT_EQ(GetConfigFolderPath(), "/home/tester/.config/tavik");
  EXPECT_EQ(GetStateFolderPath(), "/home/tester/.local/state/tavik");
}

TEST(LinuxPaths, HomeFallsBackToThePasswordDatabase) {
  CEnvironment env;
  env.Set("XDG_CONFIG_HOME", nullptr);
  const passwd* entry = getpwuid(getuid());
  ASSERT_NE(entry, nullptr);
  const std::string home = entry->pw_dir;
  for (const char* unusable : {static_cast<const char*>(nullptr), ""}) {
    env.Set("HOME", unusable);
    EXPECT_EQ(GetUserFolderPath(), home);
    EXPECT_EQ(GetConfigFolderPath(), AppendPathComponent(home, ".config/tavik"));
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

TEST(LinuxPaths, ComponentOperations) {
  EXPECT_EQ(AppendPathComponent("/a", "b"), "/a/b");
  EXPECT_EQ(AppendPathComponent("/a/", "/b/"), "/a/b");
  EXPECT_EQ(AppendPathComponent("/", "b"), "/b");
  EXPECT_EQ(AppendPathComponent("", "b"), "b");
  EXPECT_EQ(AppendPathComponent("/a//", ""), "/a");
  EXPECT_EQ(AppendPathComponent("Firmware", "pen.pen"), "Firmware/pen.pen");

  EXPECT_EQ(LastPathComponent("/tmp/scratch.tiff"), "scratch.tiff");
  EXPECT_EQ(LastPathComponent("/tmp/lock/"), "lock");
  EXPECT_EQ(LastPathComponent("scratch///"), "scratch");
  EXPECT_EQ(LastPathComponent("/"), "/");
  EXPECT_EQ(LastPathComponent(""), "");

  EXPECT_EQ(DeleteLastPathComponent("/tmp/scratch.tiff"), "/tmp");
  EXPECT_EQ(DeleteLastPathComponent("/tmp/lock/"), "/tmp");
  EXPECT_EQ(DeleteLastPathComponent("/tmp//lock"), "/tmp");
  EXPECT_EQ(DeleteLastPathComponent("/tmp"), "/");
  EXPECT_EQ(DeleteLastPathComponent("/"), "/");
  EXPECT_EQ(DeleteLastPathComponent("scratch.tiff"), "");
  EXPECT_EQ(DeleteLastPathComponent(""), "");
}

TEST(LinuxPaths, ExtensionOperations) {
  EXPECT_EQ(PathExtension("/tmp/scratch.tiff"), "tiff");
  EXPECT_EQ(PathExtension("/fw/image.airoflash2"), "airoflash2");
  EXPECT_EQ(PathExtension("/tmp/a.b.c/"), "c");
  EXPECT_EQ(PathExtension("/tmp.d/scratch"), "");
  EXPECT_EQ(PathExtension("/home/u/.profile"), "");
  EXPECT_EQ(PathExtension("/"), "");

  EXPECT_EQ(DeletePathExtension("/tmp/scratch.tiff"), "/tmp/scratch");
  EXPECT_EQ(DeletePathExtension("/tmp.d/scratch"), "/tmp.d/scratch");
  EXPECT_EQ(DeletePathExtension("scratch.bundle/"), "scratch");
  EXPECT_EQ(DeletePathExtension("/home/u/.profile"), "/home/u/.profile");
  EXPECT_EQ(DeletePathExtension("/"), "/");

  LogCapture capture;
  EXPECT_EQ(AppendPathExtension("/tmp/scratch", "tiff"), "/tmp/scratch.tiff");
  EXPECT_EQ(AppendPathExtension("/tmp/lock/", "d"), "/tmp/lock.d");
  EXPECT_TRUE(capture.Log().empty());
  EXPECT_EQ(AppendPathExtension("", "parm"), "");
  EXPECT_EQ(capture.Log(),
            (std::vector<std::string>{"[W] cannot append extension 'parm' to nothing"}));
}

}  // namespace
