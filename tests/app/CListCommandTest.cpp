// --list over the lab: what a user sees first, in words and as JSON.

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>

#include "app/CCommandLine.h"
#include "app/CListCommand.h"
#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "lab/CLabBus.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabOptions.h"
#include "lab/CLabProducts.h"

namespace {

namespace fs = std::filesystem;

struct SRun {
  int status = -1;
  std::string out;
  std::string err;
};

std::string Drain(std::FILE* file_I) {
  std::string text;
  std::rewind(file_I);
  char buffer[4096];
  size_t got = 0;
  while ((got = std::fread(buffer, 1, sizeof(buffer), file_I)) > 0) text.append(buffer, got);
  std::fclose(file_I);
  return text;
}

// Lab state lives in a folder of the test's own.
class ListCommand : public ::testing::Test {
 protected:
  void SetUp() override {
    mState = fs::temp_directory_path() / ("list-state-" + std::to_string(getpid()));
    fs::remove_all(mState);
    setenv("XDG_STATE_HOME", mState.c_str(), 1);
  }
  void TearDown() override {
    unsetenv("XDG_STATE_HOME");
    fs::remove_all(mState);
  }

  SRun List(const std::vector<std::string>& arguments_I) {
    CCommandLine commandLine;
    EXPECT_TRUE(commandLine.Parse(arguments_I)) << commandLine.GetError();
    std::FILE* out = std::tmpfile();
    std::FILE* err = std::tmpfile();
    SRun run;
    run.status = CListCommand(commandLine).Run(out, err);
    run.out = Drain(out);
    run.err = Drain(err);
    return run;
  }

  fs::path mState;
  const std::string mConfig = TAV_DATA_DIR "/fw_loader.ini";
};

}  // namespace

TEST_F(ListCommand, ShowsTheDefaultProductWithEveryBoard) {
  const SRun run = List({"--list", "--lab", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.out,
            "1 product found (configuration " + mConfig +
                "):\n"
                "\n"
                "Lab Wireless Tablet, in normal mode\n"
                "  board      via   interface path                     version  firmware file\n"
                "  pen        HID   31325:1025:17891328:1:65280        1.20     "
                "wireless-tablet.pen\n"
                "  touch      HID   31325:1041:17956864:1:65280        1.00     "
                "wireless-tablet.hex\n"
                "  bluetooth  HID   31325:1057:18022400:1:65280        1.00     "
                "wireless-tablet.airoflash2\n");
}

TEST_F(ListCommand, BoardsThatAreNotSearchedOrNotFoundSaySo) {
  SRun run = List({"--list", "--lab", "display-ftdi", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_NE(run.out.find("  scalar     FTDI  behind the display's bridge        -        "
                         "display-ftdi.bin\n"),
            std::string::npos)
      << run.out;

  run = List({"--list", "--lab", "classic-tablet", "--json", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.out,
            "{\"configuration\":\"" + mConfig +
                "\",\"configurationRead\":true,\"products\":[{\"name\":\"Lab Classic Tablet\","
                "\"loaderMode\":false,\"boards\":["
                "{\"board\":\"pen\",\"found\":true,\"searched\":true,\"interface\":\"HID\","
                "\"path\":\"31325:769:17891328:1:65280\",\"version\":\"1.20\","
                "\"firmware\":\"classic-tablet.pen\"},"
                "{\"board\":\"touch\",\"found\":true,\"searched\":true,\"interface\":\"BULK\","
                "\"path\":\"31325:785:17956864:0:0\",\"version\":\"2.10\","
                "\"firmware\":\"classic-tablet.touch\"}]}]}\n");
}

TEST_F(ListCommand, APenALabRunLeftInItsLoaderIsListedInLoaderMode) {
  {
    CClock::Set(std::make_shared<CVirtualClock>());
    auto bus = CLabBus::Create();
    const auto boards = CLabProducts::Plug(*bus, "classic-tablet");
    DeviceInfo pen = boards[0]->GetInterfaces().at(1).info;
    pen.locationId = boards[0]->GetLocationId();
    CLabHidNode node(bus);
    ASSERT_EQ(node.Open(pen), EHidStatus::eSuccess);
    ASSERT_EQ(node.SetFeatureReport({0xCC, 0x05, 0x6A}), EHidStatus::eSuccess);
    node.Close();
    TavSleep(1.0);
    ASSERT_TRUE(bus->SaveState(CLabOptions::DefaultStateFolder()));
    CClock::Set(nullptr);
  }
  const SRun run = List({"--list", "--lab", "classic-tablet", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_NE(run.out.find("Lab Classic Tablet, in loader mode\n"), std::string::npos) << run.out;
  EXPECT_NE(run.out.find("  pen        HID   31325:770:17891328:1:65280         0.03     "
                         "classic-tablet.pen\n"),
            std::string::npos)
      << run.out;
}

TEST_F(ListCommand, NothingFoundIsSaidPlainlyWithStatusTwo) {
  SRun run = List({"--list", "--lab", "-f", mState.string() + "/missing.ini"});
  EXPECT_EQ(run.status, 2);
  EXPECT_EQ(run.out, "No supported tablet or pen display was found.\n");
  EXPECT_EQ(run.err, "The device configuration " + mState.string() +
                         "/missing.ini could not be read, so no product is known.\n");

  run = List({"--list", "--lab", "--json", "-f", mState.string() + "/missing.ini"});
  EXPECT_EQ(run.status, 2);
  EXPECT_NE(run.out.find("\"configurationRead\":false,\"products\":[]}"), std::string::npos);

  run = List({"--list", "--lab", "no-such-product"});
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.out, "");
  EXPECT_NE(run.err.find("no lab product called no-such-product"), std::string::npos);
}

TEST_F(ListCommand, LabListNamesEveryProductOnce) {
  const SRun run = List({"--list", "--lab", "list"});
  EXPECT_EQ(run.status, 0);
  size_t lines = 0;
  for (const SLabProduct& product : CLabProducts::All()) {
    EXPECT_NE(run.out.find(product.name + " "), std::string::npos) << product.name;
    ++lines;
  }
  EXPECT_EQ(static_cast<size_t>(std::count(run.out.begin(), run.out.end(), '\n')), lines);
  EXPECT_NE(run.out.find("(the default)"), std::string::npos);
}

TEST(ListCommandLine, TheLabNameIsOptionalAndJsonNeedsACommand) {
  CCommandLine named;
  ASSERT_TRUE(named.Parse({"--list", "--lab", "display-hid", "-f", "x.ini"}));
  EXPECT_TRUE(named.GetList());
  EXPECT_EQ(named.GetLabName(), "display-hid");
  EXPECT_EQ(named.GetUpdaterArguments(), (std::vector<std::string>{"-f", "x.ini"}));
  EXPECT_EQ(CListCommand::ConfigPath(named.GetUpdaterArguments()), "x.ini");

  CCommandLine unnamed;
  ASSERT_TRUE(unnamed.Parse({"--lab", "-f", "x.ini", "--list"}));
  EXPECT_TRUE(unnamed.GetLab());
  EXPECT_EQ(unnamed.GetLabName(), "");
  EXPECT_EQ(unnamed.GetUpdaterArguments().size(), 2u);

  CCommandLine json;
  EXPECT_FALSE(json.Parse({"--json"}));
  CCommandLine both;
  EXPECT_FALSE(both.Parse({"--list", "--inspect", "file.pen"}));
}
