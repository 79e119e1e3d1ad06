#include "common/CTavException.h"

#include <gtest/gtest.h>

namespace {

TEST(CTavException, WhatTextHasFileLineStatusAndQuotedMessage) {
  EXPECT_STREQ(CTavException("x.cpp", 12, "bad", 0x1f).what(),
               "File: x.cpp, Line: 12, Status: 1f,  \"bad\"");
  EXPECT_STREQ(CTavException("x.cpp", -3, "bad", 0).what(), "File: x.cpp, Line: -3,  \"bad\"");
  EXPECT_STREQ(CTavException(nullptr, 7, "bad", 0xABCD).what(), "Status: abcd,  \"bad\"");
  // With neither file nor status only the blank and the quoted message stay.
  EXPECT_STREQ(CTavException(nullptr, 7, "just this", 0).what(), " \"just this\"");
}

TEST(CTavException, IsCaughtAsStdException) {
  try {
    throw CTavException(nullptr, 0, "m", 0);
  } catch (const std::exception& e) {
    EXPECT_STREQ(e.what(), " \"m\"");
  }
}

}  // namespace
