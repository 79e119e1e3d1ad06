// --list over the lab: what a user sees first, in words and as JSON.

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>

#include "app/CCommandLine.h"
#include "app/CListCommand.h"

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

TEST_F(ListCommand, AScalarBehindItsBridgeIsListedWithItsDisplaysSValueAndVersion) {
  SRun run = List({"--list", "--lab", "display-ftdi", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_NE(run.out.find("  scalar     FTDI  23335:4192:LABFT0701:255           1.0.0    "
                         "display-ftdi.bin\n"),
            std::string::npos)
      << run.out;

  // A bridge nobody can open is a scalar not found.
  run = List({"--list", "--lab", "display-ftdi", "--lab-fault", "refuse-open", "--json", "-f",
              mConfig});
  EXPECT_NE(run.out.find("{\"board\":\"scalar\",\"found\":false,\"interface\":\"FTDI\","
                         "\"path\":null,\"version\":null,"),
            std::string::npos)
      << run.out;

  run = List({"--list", "--lab", "classic-tablet", "--json", "-f", mConfig});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.out,
            "{\"configuration\":\"" + mConfig +
                "\",\"configurationRead\":true,\"products\":[{\"name\":\"Lab Classic Tablet\","
                "\"loaderMode\":false,\"boards\":["
                "{\"board\":\"pen\",\"found\":true,\"interface\":\"HID\","
                "\"path\":\"31325:769:17891328:1:65280\",\"version\":\"1.20\","
                "\"firmware\":\"classic-tablet.pen\"},"
                "{\"board\":\"touch\",\"found\":true,\"interface\":\"BULK\","
                "\"path\":\"31325:785:17956864:0:0\",\"version\":\"2.10\","
                "\"firmware\":\"classic-tablet.touch\"}]}]}\n");
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
}
