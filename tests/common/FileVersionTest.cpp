#include <gtest/gtest.h>

#include "common/FileVersion.h"
#include "support/LogCapture.h"

using FV = FileVersion;

// The program reads a scalar's version as a three-part number and shows it
// as text and as that number again; no other form has a caller.
TEST(FileVersion, ThreePartNumberFormReadsAndWritesBack) {
  LogCapture capture;
  const FV version(0x0A0B0Cu, FV::EStyleThreePart);
  EXPECT_EQ(version, FV(10, 11, 12, FV::EFinalVersion, 0));
  EXPECT_EQ(version.AsString(FV::EStyleThreePart), "10.11.12");
  EXPECT_EQ(version.AsLong(FV::EStyleThreePart), 0x0A0B0C);
  EXPECT_TRUE(capture.Assertions().empty());
  // A build has no place in the form: it is dropped, with a report.
  EXPECT_EQ(FV(1, 2, 3, FV::EFinalVersion, 4).AsString(FV::EStyleThreePart), "1.2.3");
  EXPECT_TRUE(capture.AssertionContains("mBuild == 0"));
}

TEST(FileVersion, ValidityNeedsANumber) {
  EXPECT_FALSE(FV().IsValid());
  EXPECT_FALSE(FV(0, 0, 0, FV::EFinalVersion, 0).IsValid());  // the stage alone is not a version
  EXPECT_TRUE(FV(0, 0, 0, FV::EUnknownVersion, 1).IsValid());
}
