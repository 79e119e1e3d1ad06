#include <gtest/gtest.h>

#include "common/FileVersion.h"
#include "support/LogCapture.h"

namespace {

using FV = FileVersion;

struct SParseCase {
  const char* text;
  bool web;
  int major, minor, variation, release, build;
};

TEST(FileVersion, ParsesEveryTextForm) {
  const SParseCase cases[] = {
      {"1.2.3-4", false, 1, 2, 3, FV::EFinalVersion, 4},
      {"1.2.3a4", false, 1, 2, 3, FV::EAlphaVersion, 4},
      {"1.2.3B5", false, 1, 2, 3, FV::EBetaVersion, 5},
      {"1.2.3w6", false, 1, 2, 3, FV::EWebVersion, 6},
      {"1.2.3d7", false, 1, 2, 3, FV::EDevelopmentVersion, 7},
      {"1.2.3f8", false, 1, 2, 3, FV::EFinalVersion, 8},
      {"1.2.3?9", false, 1, 2, 3, FV::EUnknownVersion, 9},
      {"1.2.3.4", false, 1, 2, 3, FV::EFinalVersion, 4},
      {"1.2.3", false, 1, 2, 3, FV::EFinalVersion, 0},
      {"10.20.30", false, 10, 20, 30, FV::EFinalVersion, 0},
      {"3.21", false, 3, 2, 1, FV::EUnknownVersion, 0},
      {"3.5", false, 3, 0, 5, FV::EUnknownVersion, 0},
      {"7", false, 7, 0, 0, FV::EUnknownVersion, 0},
      {"", false, 0, 0, 0, FV::EUnknownVersion, 0},
      {"x.y.z", false, 0, 0, 0, FV::EFinalVersion, 0},
      // The web flag overrides whatever stage the text gave.
      {"1.2.3-4", true, 1, 2, 3, FV::EWebVersion, 4},
      {"1.2.3a4", true, 1, 2, 3, FV::EWebVersion, 4},
      {"1.2.3", true, 1, 2, 3, FV::EWebVersion, 0},
  };
  for (const SParseCase& c : cases) {
    const FV version(std::string(c.text), c.web);
    SCOPED_TRACE(c.text);
    EXPECT_EQ(version.Major(), c.major);
    EXPECT_EQ(version.Minor(), c.minor);
    EXPECT_EQ(version.Variation(), c.variation);
    EXPECT_EQ(version.Release(), c.release);
    EXPECT_EQ(version.Build(), c.build);
  }
}

TEST(FileVersion, TwoPartWebTextAssertsAndStaysUnknown) {
  LogCapture capture;
  const FV version(std::string("3.21"), true);
  EXPECT_TRUE(capture.AssertionContains("failed assertion: !bIsWeb_I"));
  EXPECT_EQ(version, FV(3, 2, 1, FV::EUnknownVersion, 0));
}

TEST(FileVersion, TextForms) {
  LogCapture capture;
  const FV full(1, 2, 3, FV::EFinalVersion, 4);
  EXPECT_EQ(full.AsString(FV::EStyleReleaseLetter), "1.2.3-4");
  EXPECT_EQ(FV(1, 2, 3, FV::EBetaVersion, 4).AsString(FV::EStyleReleaseLetter), "1.2.3b4");
  EXPECT_EQ(FV(1, 2, 3, FV::ERELEASE(9), 4).AsString(FV::EStyleReleaseLetter), "1.2.3?4");
  EXPECT_EQ(full.AsString(FV::EStyleFourPart), "1.2.3.4");
  EXPECT_EQ(full.AsString(FV::EVersionStyle(6)), "");
  EXPECT_TRUE(capture.Assertions().empty());

  EXPECT_EQ(FV(1, 2, 3, FV::EFinalVersion, 0).AsString(FV::EStyleThreePart), "1.2.3");
  EXPECT_TRUE(capture.Assertions().empty());
  EXPECT_EQ(full.AsString(FV::EStyleThreePart), "1.2.3");  // build is dropped, with a report
  EXPECT_TRUE(capture.AssertionContains("mBuild == 0"));

  const FV shortForm(3, 2, 1, FV::EUnknownVersion, 0);
  EXPECT_EQ(shortForm.AsString(FV::EStyleShort), "3.21");
  EXPECT_EQ(shortForm.AsString(FV::EStyleShortAsThreePart), "3.21");
  EXPECT_EQ(FV(1, 5, 0, FV::EUnknownVersion, 0).AsString(FV::EStyleMajorMinor), "1.05");
  EXPECT_EQ(FV(1, 12, 0, FV::EUnknownVersion, 0).AsString(FV::EStyleMajorMinor), "1.12");
  EXPECT_EQ(capture.Assertions().size(), 1u);

  EXPECT_EQ(FV(1, 5, 2, FV::EFinalVersion, 3).AsString(FV::EStyleMajorMinor), "1.05");
  EXPECT_TRUE(capture.AssertionContains("mVariation == 0"));
  EXPECT_TRUE(capture.AssertionContains("mRelease == FileVersion::EUnknownVersion"));
  EXPECT_EQ(capture.Assertions().size(), 4u);
}

TEST(FileVersion, NumberFormsBothWays) {
  LogCapture capture;
  const FV shortForm(3, 2, 1, FV::EUnknownVersion, 0);
  EXPECT_EQ(shortForm.AsLong(FV::EStyleShort), 0x030015);
  EXPECT_EQ(shortForm.AsLong(FV::EStyleShortAsThreePart), 0x030201);
  EXPECT_EQ(FV(1, 5, 0, FV::EUnknownVersion, 0).AsLong(FV::EStyleMajorMinor), 0x0105);
  EXPECT_EQ(FV(1, 2, 3, FV::EFinalVersion, 0).AsLong(FV::EStyleThreePart), 0x010203);
  EXPECT_TRUE(capture.Assertions().empty());

  EXPECT_EQ(FV(0x030015u, FV::EStyleShort), shortForm);
  EXPECT_EQ(FV(0x010203u, FV::EStyleThreePart), FV(1, 2, 3, FV::EFinalVersion, 0));
  EXPECT_EQ(FV(0xFF010203u, FV::EStyleShortAsThreePart), FV(1, 2, 3, FV::EUnknownVersion, 0));
  EXPECT_EQ(FV(0x12345u, FV::EStyleMajorMinor), FV(0x23, 0x45, 0, FV::EUnknownVersion, 0));
  EXPECT_TRUE(capture.Assertions().empty());

  // A minor that does not fit a byte is narrowed before the variation is
  // worked out from it.
  const FV wide(0x00FFFFu, FV::EStyleShort);
  EXPECT_EQ(wide.Minor(), static_cast<uint8_t>(65535 / 10));
  EXPECT_EQ(wide.Variation(), static_cast<uint8_t>(65535 - wide.Minor() * 10));

  EXPECT_EQ(FV(0x010203u, FV::EStyleFourPart), FV());
  EXPECT_TRUE(capture.AssertionContains("\"This style not supported from number\""));
  EXPECT_EQ(shortForm.AsLong(FV::EStyleReleaseLetter), 0);
  EXPECT_TRUE(capture.AssertionContains("\"This style not supported as number\""));

  // Misuse reports but the number is still given.
  EXPECT_EQ(FV(1, 30, 12, FV::EBetaVersion, 0).AsLong(FV::EStyleShort), 0x010000 + 312);
  EXPECT_TRUE(capture.AssertionContains("mMinor < 25"));
  EXPECT_TRUE(capture.AssertionContains("mVariation < 10"));
  EXPECT_EQ(FV(1, 2, 3, FV::EUnknownVersion, 0).AsLong(FV::EStyleThreePart), 0x010203);
  EXPECT_TRUE(capture.AssertionContains("mRelease != FileVersion::EUnknownVersion"));
}

TEST(FileVersion, OrderingAndStages) {
  const FV webBuild3(1, 0, 0, FV::EWebVersion, 3);
  const FV finalBuild2(1, 0, 0, FV::EFinalVersion, 2);
  const FV betaBuild9(1, 0, 0, FV::EBetaVersion, 9);
  const FV finalBuild1(1, 0, 0, FV::EFinalVersion, 1);

  // Two released versions: the stage is passed over and the build decides.
  EXPECT_TRUE(webBuild3 > finalBuild2);
  EXPECT_FALSE(finalBuild2 > webBuild3);
  // Otherwise the stage decides before the build.
  EXPECT_FALSE(betaBuild9 > finalBuild1);
  EXPECT_TRUE(finalBuild1 > betaBuild9);
  EXPECT_TRUE(betaBuild9 < finalBuild1);
  // Same build: only now does the stage count between released versions.
  EXPECT_TRUE(FV(1, 0, 0, FV::EFinalVersion, 2) > FV(1, 0, 0, FV::EWebVersion, 2));
  EXPECT_FALSE(FV(1, 0, 0, FV::EWebVersion, 2) > FV(1, 0, 0, FV::EFinalVersion, 2));
  // Numbers first.
  EXPECT_TRUE(FV(2, 0, 0, FV::EAlphaVersion, 0) > FV(1, 9, 9, FV::EFinalVersion, 9));
  EXPECT_TRUE(FV(1, 2, 0, FV::EAlphaVersion, 0) > FV(1, 1, 9, FV::EFinalVersion, 9));
  EXPECT_TRUE(FV(1, 1, 3, FV::EAlphaVersion, 0) > FV(1, 1, 2, FV::EFinalVersion, 9));

  EXPECT_TRUE(finalBuild1 == FV(std::string("1.0.0-1")));
  EXPECT_TRUE(finalBuild1 != finalBuild2);
  EXPECT_TRUE(finalBuild1 <= finalBuild1);
  EXPECT_TRUE(finalBuild1 >= finalBuild1);
  EXPECT_FALSE(finalBuild1 < finalBuild1);
  EXPECT_TRUE(finalBuild2 >= finalBuild1);

  EXPECT_TRUE(webBuild3.Released());
  EXPECT_TRUE(finalBuild1.Released());
  EXPECT_FALSE(betaBuild9.Released());
  EXPECT_FALSE(FV(1, 0, 0, FV::EDevelopmentVersion, 0).Released());
}

TEST(FileVersion, BetweenExcludesLowWithinRangeIncludesIt) {
  const FV low(1, 0, 0, FV::EFinalVersion, 0);
  const FV middle(1, 5, 0, FV::EFinalVersion, 0);
  const FV high(2, 0, 0, FV::EFinalVersion, 0);
  EXPECT_TRUE(middle.Between(low, high));
  EXPECT_FALSE(low.Between(low, high));
  EXPECT_TRUE(high.Between(low, high));
  EXPECT_TRUE(middle.WithinRange(low, high));
  EXPECT_TRUE(low.WithinRange(low, high));
  EXPECT_FALSE(high.WithinRange(low, high));
  EXPECT_FALSE(FV(3, 0, 0, FV::EFinalVersion, 0).WithinRange(low, high));
}

TEST(FileVersion, ValidityAndShortConversion) {
  EXPECT_FALSE(FV().IsValid());
  EXPECT_FALSE(FV(0, 0, 0, FV::EFinalVersion, 0).IsValid());  // the stage alone is not a version
  EXPECT_TRUE(FV(0, 0, 0, FV::EUnknownVersion, 1).IsValid());

  FV shortForm(std::string("3.21"));
  shortForm.OldStyleToSimpleShort();
  EXPECT_EQ(shortForm, FV(3, 21, 0, FV::EUnknownVersion, 0));

  for (FV unchanged : {FV(3, 2, 1, FV::EFinalVersion, 0), FV(3, 2, 1, FV::EUnknownVersion, 4),
                       FV(3, 2, 10, FV::EUnknownVersion, 0), FV()}) {
    const FV before = unchanged;
    unchanged.OldStyleToSimpleShort();
    EXPECT_EQ(unchanged, before) << before.AsString(FV::EStyleReleaseLetter);
  }
}

}  // namespace
