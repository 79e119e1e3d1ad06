// The --inspect command: what the readers make of a file, as text, as JSON
// and as flat bytes.

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>

#include "app/CCommandLine.h"
#include "app/CFirmwareReportCommand.h"
#include "firmware/FirmwareFiles.h"

namespace {

struct SRun {
  int status = -1;
  std::string out, err;
};

std::string Drain(std::FILE* file_I) {
  std::string text;
  std::rewind(file_I);
  for (int c; (c = std::fgetc(file_I)) != EOF;) text += static_cast<char>(c);
  std::fclose(file_I);
  return text;
}

SRun Inspect(const std::vector<std::string>& arguments_I) {
  CCommandLine commandLine;
  EXPECT_TRUE(commandLine.Parse(arguments_I)) << commandLine.GetError();
  std::FILE* out = std::tmpfile();
  std::FILE* err = std::tmpfile();
  SRun run;
  run.status = CFirmwareReportCommand(commandLine).Run(out, err);
  run.out = Drain(out);
  run.err = Drain(err);
  return run;
}

const std::string kPen =
    SRecLine('1', 0x120, {1, 2, 3, 4}) + "\n" + SRecLine('1', 0x100, Bytes(16)) + "\n";
const std::string kHex = HexRecord(0, 0x8000, {0x01, 0x02}) + "\r\n" + HexRecord(1, 0, {}) + "\r\n";

}  // namespace

TEST(InspectCommand, ShowsWhatEachFormatHolds) {
  CTempFolder folder;
  const std::string pen = folder.Write("fw.pen", kPen);
  SRun run = Inspect({"--inspect", pen});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.out, "File: " + pen +
                         "\nFormat: EDS_SREC_PEN (S-record, pen controller)\nBlocks: 2\n"
                         "  start 0x00000100  size 16  sum 120\n"
                         "  start 0x00000120  size 4  sum 10\nBytes: 20\n");
  EXPECT_EQ(Inspect({"--inspect", pen, "--json"}).out,
            "{\"file\":\"" + pen +
                "\",\"format\":\"EDS_SREC_PEN\",\"formatValue\":0,"
                "\"description\":\"S-record, pen controller\",\"blocks\":["
                "{\"start\":256,\"size\":16,\"sum\":120},"
                "{\"start\":288,\"size\":4,\"sum\":10}],\"size\":20}\n");

  // Each check: the arguments after --inspect FILE, and a part of the output.
  const std::string hex = folder.Write("t.hex", kHex), bin = folder.Write("s.bin", Bytes(300));
  const std::vector<std::pair<std::vector<std::string>, std::string>> checks{
      {{hex}, "Format: EDS_INTEL_HEX (Intel hex)\n"},
      // Two bytes and 510 erased bytes, each erased one counting minus one.
      {{hex}, "Start address: 0x00008000\nSize: 512\nChecksum: 0xFE05\n"},
      {{hex, "--json"}, "\"startAddress\":32768,\"size\":512,\"checksum\":65029}"},
      {{bin}, "EDS_SCALAR_BINARY"},
      {{bin}, "Size: 300\nBlocks: 2\n"},
      {{bin, "--interface", "FTDI", "--json"},
       "\"format\":\"EDS_SCALAR_RTDISP\",\"formatValue\":5"},
      {{folder.Write("b.airoflash2", Bytes(3)), "--json"},
       "\"formatValue\":7,\"description\":\"Bluetooth module binary, second kind\",\"size\":3}"}};
  for (const auto& [arguments, part] : checks) {
    std::vector<std::string> all{"--inspect"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    run = Inspect(all);
    EXPECT_NE(run.out.find(part), std::string::npos) << run.out;
  }
}

TEST(InspectCommand, WritesTheLoadedImageAsFlatBytes) {
  CTempFolder folder;
  const std::string image = folder.Path("image.out");
  const std::string pen = folder.Write("fw.pen", kPen);
  ASSERT_EQ(Inspect({"--inspect", pen, "--output-binary", image}).status, 0);
  std::vector<uint8_t> expected = Bytes(16);
  expected.resize(32, 0xFF);
  expected.insert(expected.end(), {1, 2, 3, 4});
  EXPECT_EQ(CTempFolder::Read(image), std::string(expected.begin(), expected.end()));

  ASSERT_EQ(Inspect({"--inspect", folder.Write("t.hex", kHex), "--output-binary", image}).status,
            0);
  expected.assign(512, 0xFF);
  expected[0] = 1;
  expected[1] = 2;
  EXPECT_EQ(CTempFolder::Read(image), std::string(expected.begin(), expected.end()));

  for (const std::vector<std::string>& kind :
       {std::vector<std::string>{"s.bin"}, {"s.bin", "--interface", "ftdi"}, {"b.airoflash"}}) {
    const std::string input = folder.Write(kind[0], Bytes(300, 5));
    std::vector<std::string> arguments{"--inspect", input, "--output-binary", image};
    arguments.insert(arguments.end(), kind.begin() + 1, kind.end());
    ASSERT_EQ(Inspect(arguments).status, 0);
    EXPECT_EQ(CTempFolder::Read(image), CTempFolder::Read(input)) << kind[0];
  }
  EXPECT_EQ(Inspect({"--inspect", pen, "--output-binary", folder.Path("no/such/dir")}).status, 1);
}

TEST(InspectCommand, RefusesAFileThatDoesNotLoadInTheReadersWords) {
  CTempFolder folder;
  const std::string image = folder.Path("image.out");
  SRun run = Inspect({"--inspect", folder.Write("bad.pen", "S1050000010200\n"), "--output-binary",
                      image, "--json"});
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.err, "LoadSRecFile - FAILED on invalid CRC, line 1\n");
  EXPECT_EQ(run.out, "");
  EXPECT_NE(access(image.c_str(), F_OK), 0);

  const std::string text = folder.Write("notes.txt", "hello");
  const std::vector<std::pair<std::vector<std::string>, std::string>> cases{
      {{text}, "unrecognized file format for file: " + text + "\n"},
      {{folder.Write("empty.bin", "")}, "CScalarBinary::Load - ERROR - could not alloc data buf\n"},
      {{folder.Write("x.hex", HexRecord(0, 0x9000, {1}) + "\r\n")},
       "CIntelHex::Load: ERROR - start_address exceeds 32768\n"},
      {{text, "--interface", "usb"}, "unknown interface usb: use hid, bulk, i2c or ftdi\n"}};
  for (const auto& [arguments, error] : cases) {
    std::vector<std::string> all{"--inspect"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    run = Inspect(all);
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.err, error);
  }
  CCommandLine commandLine;
  EXPECT_FALSE(commandLine.Parse({"--json"}));
  EXPECT_FALSE(commandLine.Parse({"--inspect"}));
}

TEST(InspectCommand, ExitsWithTheStatusFromTheCommandLine) {
  CTempFolder folder;
  const auto status = [&](const std::string& file_I, const std::string& errorFile_I) {
    const std::string command =
        std::string(TAV_FWUPDATER_BINARY) + " --inspect " + file_I + " >/dev/null 2>" + errorFile_I;
    const int raw = std::system(command.c_str());
    return WIFEXITED(raw) ? WEXITSTATUS(raw) : -1;
  };
  EXPECT_EQ(status(folder.Write("fw.tav", SRecLine('3', 0, Bytes(8)) + "\n"), folder.Path("good")),
            0);
  EXPECT_EQ(CTempFolder::Read(folder.Path("good")), "");
  EXPECT_EQ(status(folder.Write("fw.touch", "\n\nS9\n"), folder.Path("bad")), 1);
  EXPECT_EQ(CTempFolder::Read(folder.Path("bad")),
            "LoadSRecFile - FAILED on invalid record length, line 3\n");
}
