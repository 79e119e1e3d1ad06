// A file replaced whole or not at all, and no temporary left behind.
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <iterator>

#include "common/TavReplaceFile.h"

namespace {

std::string Content(const std::filesystem::path& path_I) {
  std::ifstream in(path_I);
  return std::string(std::istreambuf_iterator<char>(in), {});
}

TEST(TavReplaceFile, TheOldFileStaysUntilTheNewOneIsWholeAndNoTemporaryRemains) {
  const auto folder =
      std::filesystem::temp_directory_path() / ("tavik-replace-" + std::to_string(::getpid()));
  std::filesystem::create_directories(folder);
  const auto path = folder / "settings.xml";
  std::ofstream(path) << "old";

  // A writer that fails halfway, and one that succeeds.
  for (const bool succeeds : {false, true}) {
    EXPECT_EQ(TavReplaceFile(path.string(),
                             [&](const std::string& temporary_I) {
                               EXPECT_EQ(std::filesystem::path(temporary_I).parent_path(), folder);
                               std::ofstream(temporary_I) << "ne";
                               EXPECT_EQ(Content(path), "old") << "untouched while written";
                               if (succeeds) std::ofstream(temporary_I, std::ios::app) << "w";
                               return succeeds;
                             }),
              succeeds);
    EXPECT_EQ(Content(path), succeeds ? "new" : "old");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder), {}), 1);
  }
  // A folder that cannot take the temporary.
  EXPECT_FALSE(TavReplaceFile((folder / "missing" / "x").string(), [](const std::string& path_I) {
    return static_cast<bool>(std::ofstream(path_I));
  }));
  std::filesystem::remove_all(folder);
}

}  // namespace
