#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <sstream>

#include "common/TavAssert.h"
#include "support/LogCapture.h"

TEST(TavAssert, ReportsBaseNameLineAndTextAndReturns) {
  LogCapture capture;
  __TAVASSERT("a != b", "/some/dir/file.cpp", 42);
  __TAVASSERT("\"quoted sentence\"", "plain.cpp", 7);
  EXPECT_EQ(capture.Assertions(),
            (std::vector<std::string>{"file.cpp:42: failed assertion: a != b",
                                      "plain.cpp:7: failed assertion: \"quoted sentence\""}));
}

TEST(TavAssert, RedirectedStandardErrorGetsNothing) {
  // With stderr not a terminal the line goes to the system log instead.
  char path[] = "/tmp/tavassert-XXXXXX";
  const int fd = mkstemp(path);
  ASSERT_GE(fd, 0);
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    dup2(fd, STDERR_FILENO);
    __TAVASSERT("redirected", "f.cpp", 1);
    _exit(0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  close(fd);
  std::stringstream text;
  text << std::ifstream(path).rdbuf();
  unlink(path);
  EXPECT_EQ(text.str(), "");
  EXPECT_TRUE(WIFEXITED(status));
}
