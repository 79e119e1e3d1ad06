#include <gtest/gtest.h>
#include <sys/utsname.h>
#include <unistd.h>

#include "common/SystemState.h"
#include "support/LogCapture.h"

class SystemStateTest : public ::testing::Test {
 protected:
  void SetUp() override { SystemState::Clear(); }
  void TearDown() override { SystemState::Clear(); }
};

TEST_F(SystemStateTest, OSTypeTableBothWays) {
  // clang-format off
  const std::pair<int32_t, const char*> texts[] = {
      {2000, "Unset"}, {7, "Unknown"}, {-1, "Unknown"}, {1160, "macOS 12.0"}, {1070, "OSX 10.11"},
      {3000, "Linux"}};
  for (const auto& [value, text] : texts) EXPECT_EQ(SystemState::OSTypeToString(value), text);
  const std::pair<const char*, int32_t> values[] = {
      {"Windows 10", 62}, {"Windows 7 Starter", 51}, {"OSX Infinity", 1999}, {"x", -1},
      {"windows 10", -1} /* exact text only */, {"Linux", eOSLinux}};
  // clang-format on
  for (const auto& [text, value] : values) EXPECT_EQ(SystemState::StringToOSType(text), value);

  // Every value of the table comes back through its text.
  for (int32_t value :
       {40,   50,   51,   60,   61,   62,   63,   999,  1000, 1010, 1020, 1030, 1040, 1050,
        1060, 1070, 1080, 1090, 1100, 1110, 1120, 1130, 1140, 1150, 1160, 1999, 2000, 3000}) {
    const std::string text = SystemState::OSTypeToString(value);
    EXPECT_NE(text, "Unknown") << value;
    EXPECT_EQ(SystemState::StringToOSType(text), value) << text;
  }
}

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
  EXPECT_EQ(SystemState::GetOSTypeString(), "Linux");
  EXPECT_TRUE(capture.LogContains("Raw system version Linux 6.1.0-test x86_64\n"));
  EXPECT_TRUE(capture.LogContains("mCPU = ECPUType::eCPULinuxX86_64\n"));
  EXPECT_TRUE(capture.LogContains("mOS set to bb8\n"));
  SystemState::SetOSTypeFromUname("Linux", "6.1.0", "aarch64");
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxARM64);
  SystemState::SetOSTypeFromUname("Linux", "6.1.0", "riscv64");
  EXPECT_EQ(SystemState::GetCPUType(), eCPULinuxOther);
  EXPECT_TRUE(capture.LogContains("eCPULinuxOther (riscv64)"));
  EXPECT_TRUE(capture.Assertions().empty());

  // A foreign system leaves the OS unset.
  SystemState::Clear();
  SystemState::SetOSTypeFromUname("FreeBSD", "14.0", "amd64");
  EXPECT_TRUE(capture.LogContains("mOS set to 7d0\n"));
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
  EXPECT_TRUE(SystemState::GetSupportsNativeGestures());

  EXPECT_EQ(SystemState::GetProcessInstanceIdentifier(), "." + std::to_string(getpid()));
  const std::string parent = SystemState::GetProcessParentInstanceIdentifier();
  const std::string parentSuffix = "." + std::to_string(getppid());
  ASSERT_GT(parent.size(), parentSuffix.size());  // a name stands before the number
  EXPECT_EQ(parent.substr(parent.size() - parentSuffix.size()), parentSuffix);
  // No foreground application can be known here.
  SystemState::ApplicationSwitch();
  EXPECT_EQ(SystemState::GetForegroundAppIdentifier(), "");
  EXPECT_EQ(SystemState::GetForegroundProcessInstanceIdentifier(), "");
}
