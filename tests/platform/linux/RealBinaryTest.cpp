// The installed program, run as a user runs it and without --lab, against
// a lab tablet that umockdev shows as hardware: the child's own libudev,
// hidraw and libusb code find the tablet, and its ioctls come back through
// umockdev's socket to this process, where the lab boards answer them.

#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <vector>

#include "common/CClock.h"
#include "common/CSteadyClock.h"
#include "lab/CLabPenController.h"
#include "lab/CLabProducts.h"
#include "platform/linux/CUmockdevLabHid.h"

namespace {

class RealBinary : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
    // umockdev's client waits with usleep(0), a real sleep under the default
    // timer slack; the child inherits the setting.
    prctl(PR_SET_TIMERSLACK, 1UL);
    CClock::Set(std::make_shared<CSteadyClock>());
    mBus->SetReenumerationDelays(0.05, 0.2);
    CLabProducts::Plug(*mBus, "classic-tablet");
    mPen = std::dynamic_pointer_cast<CLabPenController>(mBus->FindBoard("classic-tablet-pen"));
    ASSERT_NE(mPen, nullptr);
    mUsb->Sync();
    char folder[] = "real-binary.XXXXXX";
    ASSERT_NE(mkdtemp(folder), nullptr);
    mFolder = folder;
  }
  void TearDown() override {
    mUsb.reset();
    CClock::Set(nullptr);
    std::system(("rm -rf " + mFolder).c_str());
  }

  // Runs the program on the pen until it ends, keeping the testbed in line
  // with the bus; its status, and its output in `output_O`.
  int Run(std::string& output_O,
          std::vector<const char*> arguments_I = {"--headless", "--yes", "-p", ""}) {
    arguments_I.insert(arguments_I.begin(), TAV_PROGRAM);
    arguments_I.push_back(nullptr);
    const std::string log = mFolder + "/output";
    const pid_t child = fork();
    if (child == 0) {
      setenv("XDG_CONFIG_HOME", (mFolder + "/config").c_str(), 1);
      setenv("XDG_STATE_HOME", (mFolder + "/state").c_str(), 1);
      setenv("XDG_DATA_HOME", (mFolder + "/data").c_str(), 1);
      if (!freopen(log.c_str(), "w", stdout) || !freopen("/dev/null", "r", stdin)) _exit(120);
      dup2(fileno(stdout), fileno(stderr));
      execv(TAV_PROGRAM, const_cast<char* const*>(arguments_I.data()));
      _exit(127);
    }
    int status = 0;
    for (double waited = 0; waitpid(child, &status, WNOHANG) == 0; waited += 0.01) {
      if (waited > 240) kill(child, SIGKILL);
      mUsb->Sync();
      TavSleep(0.01);
    }
    std::ifstream in(log);
    std::stringstream text;
    text << in.rdbuf();
    output_O = text.str();
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  }

  std::shared_ptr<CLabBus> mBus = CLabBus::Create();
  std::unique_ptr<CUmockdevLabHid> mUsb = std::make_unique<CUmockdevLabHid>(mBus);
  std::shared_ptr<CLabPenController> mPen;
  std::string mFolder;
};

TEST_F(RealBinary, UpdatesThePenThroughItsLoaderAndBack) {
  std::string output;
  EXPECT_EQ(Run(output), 0) << output;
  EXPECT_NE(output.find("pen controller of Lab Classic Tablet: updated from version"),
            std::string::npos)
      << output;
  EXPECT_EQ(mPen->GetMode(), CLabLoaderBoard::EMode::eNormal);
  EXPECT_TRUE(mPen->GetLoader().IsImageValid());
  for (const std::string& violation : mPen->GetViolations()) ADD_FAILURE() << violation;
}

TEST_F(RealBinary, APenPulledMidUpdateFailsWithItsMessage) {
  // Gone from the bus, and so from sysfs, at its 100th report: in its loader,
  // with blocks erased.
  mBus->AddFaults({{ELabFaultKind::eVanish, 100, ""}}, 1);
  std::string output;
  EXPECT_EQ(Run(output), 1) << output;
  EXPECT_NE(output.find("pen controller of Lab Classic Tablet: failed:"), std::string::npos)
      << output;
  EXPECT_TRUE(mPen->IsUnplugged());
  EXPECT_EQ(mPen->GetReportCount(), 100u) << "nothing reaches a pulled board";
  EXPECT_EQ(mPen->GetMode(), CLabLoaderBoard::EMode::eLoader);
  EXPECT_FALSE(mPen->GetLoader().IsImageValid()) << "pulled while programming";
  EXPECT_NE(output.find("Result: the update failed."), std::string::npos) << output;
}

}  // namespace
