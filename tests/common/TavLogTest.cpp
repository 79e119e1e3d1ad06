#include <gtest/gtest.h>

#include "common/TavLog.h"
#include "support/LogCapture.h"

TEST(TavLog, LevelsFormatTheirArgumentsAndOnlyDebugTagsTheStartOfALine) {
  TavLog::ResetLineState();
  LogCapture capture;
  TavLog::Info("a %d\n", 1);
  TavLog::Warning("b %s\n", "two");
  TavLog::Error("c %x\n", 255u);
  TavLog::Debug("abc");
  TavLog::Debug("def\n");
  TavLog::Debug("x");
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-zero-length"
  TavLog::Debug("");  // an empty piece leaves the flag alone
#pragma GCC diagnostic pop
  TavLog::Debug("y\n");
  // Other levels do not touch the debug line state.
  TavLog::Debug("start ");
  TavLog::Info("info\n");
  TavLog::Debug("rest\n");
  TavLog::Debug("z\n");
  EXPECT_EQ(capture.Log(),
            (std::vector<std::string>{"[I] a 1\n", "[W] b two\n", "[E] c ff\n", "[D] abc", "def\n",
                                      "[D] x", "", "y\n", "[D] start ", "[I] info\n", "rest\n",
                                      "[D] z\n"}));
}
