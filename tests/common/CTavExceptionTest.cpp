#include <gtest/gtest.h>

#include "common/CTavException.h"

TEST(CTavException, WhatTextHasFileLineStatusAndQuotedMessage) {
  const auto what = [](const std::exception& e_I) { return std::string(e_I.what()); };
  EXPECT_EQ(what(CTavException("x.cpp", 12, "bad", 0x1f)),
            "File: x.cpp, Line: 12, Status: 1f,  \"bad\"");
  EXPECT_EQ(what(CTavException("x.cpp", -3, "bad", 0)), "File: x.cpp, Line: -3,  \"bad\"");
  EXPECT_EQ(what(CTavException(nullptr, 7, "bad", 0xABCD)), "Status: abcd,  \"bad\"");
  // With neither file nor status only the blank and the quoted message stay.
  EXPECT_EQ(what(CTavException(nullptr, 7, "just this", 0)), " \"just this\"");
}
