#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "common/OSUtils.h"

using FV = FileVersion;

TEST(OSUtils, VersionFromFourByteNumber) {
  EXPECT_EQ(OSUtils::GetVersionFromVersNumber(0x02158005), FV(2, 1, 5, FV::EFinalVersion, 5));
  EXPECT_EQ(OSUtils::GetVersionFromVersNumber(0x0A3F2001),
            FV(10, 3, 15, FV::EDevelopmentVersion, 1));
  EXPECT_EQ(OSUtils::GetVersionFromVersNumber(0x01004007), FV(1, 0, 0, FV::EAlphaVersion, 7));
  EXPECT_EQ(OSUtils::GetVersionFromVersNumber(0x01006008), FV(1, 0, 0, FV::EBetaVersion, 8));
  for (unsigned stage : {0x00u, 0x10u, 0x21u, 0x81u, 0xFFu}) {
    EXPECT_EQ(OSUtils::GetVersionFromVersNumber(0xFFFF0000u | (stage << 8) | 0xEEu),
              FV(255, 15, 15, FV::EUnknownVersion, 0xEE))
        << stage;
  }
}

TEST(OSUtils, ProgramAndPackageVersionsAndTheClock) {
  EXPECT_EQ(OSUtils::GetMainBundleVersion(), FV(std::string(TAV_TEST_PROGRAM_VERSION)));
  EXPECT_TRUE(OSUtils::GetMainBundleVersion().IsValid());
  EXPECT_EQ(OSUtils::GetVersionFromBundle("", true), FV());
  EXPECT_EQ(OSUtils::GetVersionFromBundle("2.1.3", true), FV(2, 1, 3, FV::EWebVersion, 0));
  EXPECT_EQ(OSUtils::GetVersionFromBundle("2.1.3b4", false), FV(2, 1, 3, FV::EBetaVersion, 4));

  const uint64_t before = OSUtils::CurrentTimeInMicroseconds();
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  const uint64_t elapsed = OSUtils::CurrentTimeInMicroseconds() - before;
  EXPECT_GE(elapsed, 20000u);
  EXPECT_LT(elapsed, 5000000u);
}
