#include <gtest/gtest.h>
#include <sys/utsname.h>

#include "common/SystemState.h"
#include "support/LogCapture.h"

class SystemStateTest : public ::testing::Test {
 protected:
  void SetUp() override { SystemState::Clear(); }
  void TearDown() override { SystemState::Clear(); }
};

TEST_F(SystemStateTest, UnsetValuesAssertAndGiveTheirDefaults) {
  LogCapture capture;
  EXPECT_EQ(SystemState::GetCPUType(), eCPUIntel);
  EXPECT_TRUE(
      capture.AssertionContains("failed assertion: \"CPUType requested before it was set\""));
  EXPECT_EQ(SystemState::GetOSType(), eOSUnknown);
  EXPECT_TRUE(
      capture.AssertionContains("failed assertion: \"OSType requested before it was set\""));
  EXPECT_EQ(SystemState::GetOSTypeString(), "Unset");
  EXPECT_EQ(capture.Assertions().size(), 2u);
}

TEST_F(SystemStateTest, UnameGivesLinuxAndTheProcessor) {
  LogCapture capture;
  SystemState::SetOSTypeFromUname("Linux", "6.1.0-test", "x86_64");
  EXPECT_EQ(SystemState::GetOSType(), eOSLinux);
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxX86_64);
  SystemState::SetOSTypeFromUname("Linux", "6.1.0", "aarch64");
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxARM64);
  SystemState::SetOSTypeFromUname("Linux", "6.1.0", "riscv64");
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxOther);
  EXPECT_TRUE(capture.Assertions().empty());

  // A foreign system leaves the OS unset.
  SystemState::Clear();
  SystemState::SetOSTypeFromUname("FreeBSD", "14.0", "amd64");
  EXPECT_EQ(SystemState::GetOSType(), eOSUnknown);
  EXPECT_TRUE(capture.AssertionContains("OSType requested before it was set"));
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxX86_64);
}

TEST_F(SystemStateTest, ThisMachineAndProcess) {
  SystemState::SetOSType();
  utsname names{};
  ASSERT_EQ(uname(&names), 0);
  EXPECT_EQ(SystemState::GetOSType(), eOSLinux);
  const std::string machine = names.machine;
  if (machine == "x86_64" || machine == "aarch64") {
    EXPECT_EQ(SystemState::GetCPUType(), machine == "x86_64" ? eCPULinuxX86_64 : eCPULinuxARM64);
  }
}
