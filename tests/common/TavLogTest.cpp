#include "common/TavLog.h"

#include <gtest/gtest.h>

#include "support/LogCapture.h"

namespace {

TEST(TavLog, FormatWithLevelPutsTheTagAndOneBlankBeforeTheText) {
  EXPECT_EQ(TavLog::FormatWithLevel(0, "x"), "[D] x");
  EXPECT_EQ(TavLog::FormatWithLevel(4, "%d"), "[E] %d");
  EXPECT_EQ(TavLog::FormatWithLevel(8, ""), "[*] ");
  // Level 5 has no use and unknown levels fall back to the same tag.
  EXPECT_EQ(TavLog::FormatWithLevel(5, "t"), "[U] t");
  EXPECT_EQ(TavLog::FormatWithLevel(99, "t"), "[U] t");
  EXPECT_EQ(TavLog::FormatWithLevel(-1, "t"), "[U] t");
}

TEST(TavLog, LevelsFormatTheirArguments) {
  LogCapture capture;
  TavLog::Info("a %d\n", 1);
  TavLog::Warning("b %s\n", "two");
  TavLog::Error("c %x\n", 255u);
  EXPECT_EQ(capture.Log(), (std::vector<std::string>{"[I] a 1\n", "[W] b two\n", "[E] c ff\n"}));
}

TEST(TavLog, DebugTagsOnlyTheStartOfALine) {
  TavLog::ResetLineState();
  LogCapture capture;
  TavLog::Debug("abc");
  TavLog::Debug("def\n");
  TavLog::Debug("x");
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-zero-length"
  TavLog::Debug("");  // an empty piece leaves the flag alone
#pragma GCC diagnostic pop
  TavLog::Debug("y\n");
  TavLog::Debug("z\n");
  EXPECT_EQ(capture.Log(),
            (std::vector<std::string>{"[D] abc", "def\n", "[D] x", "", "y\n", "[D] z\n"}));
}

TEST(TavLog, OtherLevelsDoNotTouchTheDebugLineState) {
  TavLog::ResetLineState();
  LogCapture capture;
  TavLog::Debug("start ");
  TavLog::Info("info\n");
  TavLog::Debug("rest\n");
  EXPECT_EQ(capture.Log(), (std::vector<std::string>{"[D] start ", "[I] info\n", "rest\n"}));
}

}  // namespace
