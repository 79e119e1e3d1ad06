#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <vector>

#include "app/CCommandLine.h"
#include "app/CFirmwareReportCommand.h"
#include "firmware/FirmwareFiles.h"

namespace {

struct SRun {
  int status = -1;
  std::string out;
  std::string err;
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

const std::string kEnd = HexRecord(1, 0, {});

}  // namespace

TEST(InspectCommand, ShowsWhatEachFormatHolds) {
  CTempFolder folder;
  const std::string pen = folder.Write(
      "fw.pen", SRecLine('1', 0x120, {1, 2, 3, 4}) + "\n" + SRecLine('1', 0x100, Bytes(16)) + "\n");
  SRun run = Inspect({"--inspect", pen});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.out, "File: " + pen +
                         "\nFormat: EDS_SREC_PEN (S-record, pen controller)\nBlocks: 2\n"
                         "  start 0x00000100  size 16  sum 120\n"
                         "  start 0x00000120  size 4  sum 10\nBytes: 20\n");
  run = Inspect({"--inspect", pen, "--json"});
  EXPECT_EQ(run.out, "{\"file\":\"" + pen +
                         "\",\"format\":\"EDS_SREC_PEN\",\"formatValue\":0,"
                         "\"description\":\"S-record, pen controller\",\"blocks\":["
                         "{\"start\":256,\"size\":16,\"sum\":120},"
                         "{\"start\":288,\"size\":4,\"sum\":10}],\"size\":20}\n");

  const std::string hex =
      folder.Write("t.hex", HexRecord(0, 0x8000, {0x01, 0x02}) + "\r\n" + kEnd + "\r\n");
  run = Inspect({"--inspect", hex});
  EXPECT_NE(run.out.find("Format: EDS_INTEL_HEX (Intel hex)\n"), std::string::npos);
  // Two bytes and 510 erased bytes, each erased one counting minus one.
  EXPECT_NE(run.out.find("Start address: 0x00008000\nSize: 512\nChecksum: 0xFE05\n"),
            std::string::npos)
      << run.out;

  const std::string bin = folder.Write("s.bin", Bytes(300));
  run = Inspect({"--inspect", bin});
  EXPECT_NE(run.out.find("EDS_SCALAR_BINARY"), std::string::npos);
  EXPECT_NE(run.out.find("Size: 300\nBlocks: 2\n"), std::string::npos);
}

TEST(InspectCommand, WritesTheLoadedImageAsFlatBytes) {
  CTempFolder folder;
  const std::string image = folder.Path("image.out");
  const std::string pen = folder.Write(
      "fw.pen", SRecLine('1', 0x120, {1, 2, 3, 4}) + "\n" + SRecLine('1', 0x100, Bytes(16)) + "\n");
  ASSERT_EQ(Inspect({"--inspect", pen, "--output-binary", image}).status, 0);
  std::vector<uint8_t> expected = Bytes(16);
  expected.resize(32, 0xFF);
  expected.insert(expected.end(), {1, 2, 3, 4});
  EXPECT_EQ(CTempFolder::Read(image), std::string(expected.begin(), expected.end()));

  const std::string hex =
      folder.Write("t.hex", HexRecord(0, 0x8000, {0x01, 0x02}) + "\r\n" + kEnd + "\r\n");
  ASSERT_EQ(Inspect({"--inspect", hex, "--output-binary", image}).status, 0);
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

// More blocks and gaps than one batch of writes holds, and a listing longer
// than one piece of output.
TEST(InspectCommand, WritesAndListsAnImageOfManySmallBlocks) {
  CTempFolder folder;
  static constexpr uint32_t kBlocks = 2500;
  std::string text;
  std::string image;
  std::string listing = "Blocks: " + std::to_string(kBlocks) + "\n";
  char line[64];
  for (uint32_t i = 0; i < kBlocks; ++i) {
    const std::vector<uint8_t> data{static_cast<uint8_t>(i), static_cast<uint8_t>(i >> 8)};
    text += SRecLine('2', 4 * i, data) + "\n";
    image += std::string(data.begin(), data.end());
    if (i + 1 < kBlocks) image += "\xFF\xFF";
    std::snprintf(line, sizeof line, "  start 0x%08X  size 2  sum %u\n", 4 * i, data[0] + data[1]);
    listing += line;
  }
  listing += "Bytes: " + std::to_string(2 * kBlocks) + "\n";
  const std::string out = folder.Path("image.out");
  const SRun run = Inspect({"--inspect", folder.Write("many.pen", text), "--output-binary", out});
  ASSERT_EQ(run.status, 0) << run.err;
  EXPECT_EQ(CTempFolder::Read(out), image);
  EXPECT_EQ(run.out.substr(run.out.find("Blocks: ")), listing);
}

TEST(InspectCommand, RefusesAFileThatDoesNotLoadInTheReadersWords) {
  CTempFolder folder;
  const std::string image = folder.Path("image.out");
  SRun run = Inspect({"--inspect", folder.Write("bad.pen", "S1050000010200\n"), "--output-binary",
                      image, "--json"});
  EXPECT_EQ(run.status, 1);
  // With --json the error is a JSON object too.
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.out, "{\"file\":\"" + folder.Path("bad.pen") +
                         "\",\"error\":\"LoadSRecFile - FAILED on invalid CRC, line 1\"}\n");
  EXPECT_NE(access(image.c_str(), F_OK), 0);

  run = Inspect({"--inspect", folder.Write("empty.bin", "")});
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.err, "tavik-fwupdater: " + folder.Path("empty.bin") + ": the file is empty\n");

  run = Inspect({"--inspect", folder.Write("x.hex", HexRecord(0, 0x9000, {1}) + "\r\n")});
  EXPECT_EQ(run.err, "tavik-fwupdater: " + folder.Path("x.hex") +
                         ": CIntelHex::Load: ERROR - start_address exceeds 32768\n");
}
