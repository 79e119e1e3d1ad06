#include <gtest/gtest.h>

#include "common/FileVersion.h"
#include "support/LogCapture.h"

using FV = FileVersion;

TEST(FileVersion, ParsesEveryTextForm) {
  const FV::ERELEASE fin = FV::EFinalVersion, unk = FV::EUnknownVersion, web = FV::EWebVersion;
  const struct {
    const char* text;
    bool web;
    FV expected;
  } cases[] = {// clang-format off
      {"1.2.3-4", false, FV(1, 2, 3, fin, 4)}, {"1.2.3a4", false, FV(1, 2, 3, FV::EAlphaVersion, 4)},
      {"1.2.3B5", false, FV(1, 2, 3, FV::EBetaVersion, 5)}, {"1.2.3w6", false, FV(1, 2, 3, web, 6)},
      {"1.2.3d7", false, FV(1, 2, 3, FV::EDevelopmentVersion, 7)},
      {"1.2.3f8", false, FV(1, 2, 3, fin, 8)}, {"1.2.3?9", false, FV(1, 2, 3, unk, 9)},
      {"1.2.3.4", false, FV(1, 2, 3, fin, 4)}, {"1.2.3", false, FV(1, 2, 3, fin, 0)},
      {"3.21", false, FV(3, 2, 1, unk, 0)}, {"7", false, FV(7, 0, 0, unk, 0)},
      {"", false, FV(0, 0, 0, unk, 0)}, {"x.y.z", false, FV(0, 0, 0, fin, 0)},
      // The web flag overrides whatever stage the text gave.
      {"1.2.3a4", true, FV(1, 2, 3, web, 4)}, {"1.2.3", true, FV(1, 2, 3, web, 0)}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    const FV version(std::string(c.text), c.web);
    EXPECT_EQ(version, c.expected);
  }
  LogCapture capture;
  EXPECT_EQ(FV(std::string("3.21"), true), FV(3, 2, 1, unk, 0));
  EXPECT_TRUE(capture.AssertionContains("failed assertion: !bIsWeb_I"));
}

TEST(FileVersion, TextAndNumberFormsReportTheirMisuse) {
  const struct {
    FV version;
    FV::EVersionStyle style;
    const char* text;
    long number;
    const char* assertion;  // what the text form reports, or nullptr
  } cases[] = {
      {FV(1, 2, 3, FV::EFinalVersion, 4), FV::EStyleReleaseLetter, "1.2.3-4", 0, nullptr},
      {FV(1, 2, 3, FV::EBetaVersion, 4), FV::EStyleReleaseLetter, "1.2.3b4", 0, nullptr},
      {FV(1, 2, 3, FV::ERELEASE(9), 4), FV::EStyleReleaseLetter, "1.2.3?4", 0, nullptr},
      {FV(1, 2, 3, FV::EFinalVersion, 4), FV::EStyleFourPart, "1.2.3.4", 0, nullptr},
      {FV(1, 2, 3, FV::EFinalVersion, 4), FV::EVersionStyle(6), "", 0, nullptr},
      {FV(1, 2, 3, FV::EFinalVersion, 0), FV::EStyleThreePart, "1.2.3", 0x010203, nullptr},
      // The build is dropped, with a report.
      {FV(1, 2, 3, FV::EFinalVersion, 4), FV::EStyleThreePart, "1.2.3", 0x010203, "mBuild == 0"},
      {FV(3, 2, 1, FV::EUnknownVersion, 0), FV::EStyleShort, "3.21", 0x030015, nullptr},
      {FV(3, 2, 1, FV::EUnknownVersion, 0), FV::EStyleShortAsThreePart, "3.21", 0x030201, nullptr},
      {FV(1, 5, 0, FV::EUnknownVersion, 0), FV::EStyleMajorMinor, "1.05", 0x0105, nullptr},
      {FV(1, 12, 0, FV::EUnknownVersion, 0), FV::EStyleMajorMinor, "1.12", 0x010C, nullptr}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    LogCapture capture;
    EXPECT_EQ(c.version.AsString(c.style), c.text);
    EXPECT_EQ(capture.Assertions().size(), c.assertion != nullptr ? 1u : 0u);
    EXPECT_TRUE(c.assertion == nullptr || capture.AssertionContains(c.assertion));
    EXPECT_EQ(c.number != 0 ? c.version.AsLong(c.style) : 0, c.number) << "as number";
  }
}

TEST(FileVersion, ReadsNumberForms) {
  LogCapture capture;
  EXPECT_EQ(FV(0x030015u, FV::EStyleShort), FV(3, 2, 1, FV::EUnknownVersion, 0));
  EXPECT_EQ(FV(0x010203u, FV::EStyleThreePart), FV(1, 2, 3, FV::EFinalVersion, 0));
  EXPECT_EQ(FV(0xFF010203u, FV::EStyleShortAsThreePart), FV(1, 2, 3, FV::EUnknownVersion, 0));
  EXPECT_EQ(FV(0x12345u, FV::EStyleMajorMinor), FV(0x23, 0x45, 0, FV::EUnknownVersion, 0));
  EXPECT_TRUE(capture.Assertions().empty());
  EXPECT_EQ(FV(0x010203u, FV::EStyleFourPart), FV());
  EXPECT_TRUE(capture.AssertionContains("\"This style not supported from number\""));
}

TEST(FileVersion, OrderingAndStages) {
  const FV web3(1, 0, 0, FV::EWebVersion, 3), final2(1, 0, 0, FV::EFinalVersion, 2);
  const FV beta9(1, 0, 0, FV::EBetaVersion, 9), final1(1, 0, 0, FV::EFinalVersion, 1);
  const FV web2(1, 0, 0, FV::EWebVersion, 2);
  const struct {
    FV a, b;
    bool greater;
  } cases[] = {// clang-format off
      // Two released versions: the stage is passed over and the build decides.
      {web3, final2, true}, {final2, web3, false},
      // Otherwise the stage decides before the build.
      {beta9, final1, false}, {final1, beta9, true},
      // Same build: only now does the stage count between released versions.
      {final2, web2, true}, {web2, final2, false}, {final1, final1, false},
      // Numbers first.
      {FV(2, 0, 0, FV::EAlphaVersion, 0), FV(1, 9, 9, FV::EFinalVersion, 9), true},
      {FV(1, 2, 0, FV::EAlphaVersion, 0), FV(1, 1, 9, FV::EFinalVersion, 9), true},
      {FV(1, 1, 3, FV::EAlphaVersion, 0), FV(1, 1, 2, FV::EFinalVersion, 9), true}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(c.a.AsString(FV::EStyleReleaseLetter) + " vs " +
                 c.b.AsString(FV::EStyleReleaseLetter));
    EXPECT_EQ(c.a > c.b, c.greater);
    EXPECT_EQ(c.b < c.a, c.greater);
  }
  EXPECT_TRUE(final1 == FV(std::string("1.0.0-1")));
  EXPECT_TRUE(final1 != final2);
  EXPECT_TRUE(final1 <= final1 && final1 >= final1 && final2 >= final1);
  EXPECT_FALSE(final1 < final1);
  EXPECT_TRUE(web3.Released() && final1.Released());
  EXPECT_FALSE(beta9.Released() || FV(1, 0, 0, FV::EDevelopmentVersion, 0).Released());
}

TEST(FileVersion, ValidityNeedsANumber) {
  EXPECT_FALSE(FV().IsValid());
  EXPECT_FALSE(FV(0, 0, 0, FV::EFinalVersion, 0).IsValid());  // the stage alone is not a version
  EXPECT_TRUE(FV(0, 0, 0, FV::EUnknownVersion, 1).IsValid());
}
