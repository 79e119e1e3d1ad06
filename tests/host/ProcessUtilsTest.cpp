// Process control over the lab's desktop, whose applications are the
// family's driver: the answers that tell a refused question from a missing
// application, the quit that quits nothing, and the quit list.
#include <gtest/gtest.h>

#include "host/OProcessUtils.h"
#include "host/ProcessUtils.h"
#include "lab/CLabDesktop.h"

namespace {

const std::string kDriver = "com.tavik.TabletDriver";

class ProcessControl : public ::testing::Test {
 protected:
  void SetUp() override { OProcessUtils::SetDesktop(mDesktop); }
  void TearDown() override { OProcessUtils::SetDesktop(nullptr); }

  int DriverPid() { return mDesktop->RunningApplications(kDriver).at(0); }

  std::shared_ptr<CLabDesktop> mDesktop = std::make_shared<CLabDesktop>();
};

TEST_F(ProcessControl, ProcessIdAnswersKeepARefusedQuestionApartFromAMissingApplication) {
  OProcessUtils* utils = OProcessUtils::GetInstance();
  const int driver = DriverPid();
  // identifier, including the current process, answer
  const std::vector<std::tuple<std::optional<std::string>, bool, int>> rows = {
      {std::nullopt, true, -1},
      {kDriver, false, -1},
      {"com.tavik.Missing", true, -2},
      {kDriver, true, driver}};
  for (const auto& [id, including, answer] : rows) {
    EXPECT_EQ(utils->processIDWithBundleID(id, including), answer)
        << id.value_or("null") << including;
  }
  // Named for a path, it gives the identifier; the object's own gives the entry.
  EXPECT_EQ(ProcessUtils::GetBundlePathForProcessWithBundleID(kDriver), kDriver);
  EXPECT_EQ(utils->bundlePathWithBundleID(kDriver), mDesktop->GetApplicationPath(kDriver));
  EXPECT_EQ(ProcessUtils::GetPIDForProcessWithBundleID(kDriver, false), driver);
  EXPECT_EQ(ProcessUtils::GetPIDForProcessWithBundleID("com.tavik.Missing", true), 0);
}

TEST_F(ProcessControl, OnlyAQuitThatIncludesTheCurrentApplicationQuitsAndItsNoticeClearsTheList) {
  OProcessUtils* utils = OProcessUtils::GetInstance();
  const int driver = DriverPid();
  EXPECT_FALSE(utils->quitWithBundleIdentifier(kDriver));
  EXPECT_FALSE(mDesktop->IsTerminated(driver));

  // The lab's quit notice is handed over by hand, to see the list between.
  mDesktop->ObserveNotifications(nullptr);
  utils->setQuitProcessIDList({7});
  EXPECT_TRUE(utils->quitWithBundleIdentifier(kDriver, true));
  EXPECT_TRUE(mDesktop->IsTerminated(driver));
  EXPECT_EQ(utils->quitProcessIDList(), (std::vector<int>{7, driver}));
  const auto notice = [&](int pid_I) {
    utils->handleNotification({OProcessUtils::kQuitNotification, kDriver, {{"processID", pid_I}}});
  };
  notice(99);  // not one we asked to quit: nothing changes
  EXPECT_EQ(utils->quitProcessIDList(), (std::vector<int>{7, driver}));
  notice(driver);
  EXPECT_EQ(utils->quitProcessIDList(), std::vector<int>{7});
  EXPECT_FALSE(utils->quitWithBundleIdentifier(kDriver, true));  // nothing runs
}

}  // namespace
