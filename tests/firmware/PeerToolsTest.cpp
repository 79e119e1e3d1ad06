// Files written by srec_cat and objcopy must load byte for byte.

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"

namespace {

bool HaveTools() {
  return std::system("command -v srec_cat >/dev/null 2>&1 && command -v objcopy >/dev/null 2>&1") ==
         0;
}

void RunTool(const std::string& command_I) {
  ASSERT_EQ(std::system((command_I + " 2>/dev/null").c_str()), 0) << command_I;
}

std::vector<uint8_t> RandomImage(size_t size_I, unsigned seed_I) {
  std::mt19937 rng(seed_I);
  std::vector<uint8_t> image(size_I);
  for (uint8_t& byte : image) byte = static_cast<uint8_t>(rng());
  return image;
}

// The blocks laid out from the lowest start with gaps erased.
std::vector<uint8_t> Flat(const std::vector<SContinuousDataBlock>& blocks_I) {
  std::vector<uint8_t> flat;
  for (const SContinuousDataBlock& block : blocks_I) {
    flat.resize(block.startAddress - blocks_I.front().startAddress, 0xFF);
    flat.insert(flat.end(), block.data.begin(), block.data.end());
  }
  return flat;
}

std::vector<SContinuousDataBlock> LoadSRec(const std::string& path_I) {
  CSRec source;
  EXPECT_TRUE(source.Load(path_I, EHID_INTERFACE)) << path_I;
  return source.GetSRecData();
}

}  // namespace

TEST(PeerTools, SRecordFilesOfSrecCatAndObjcopyLoadByteForByte) {
  if (!HaveTools()) GTEST_SKIP() << "srec_cat or objcopy missing";
  CTempFolder folder;
  const std::vector<uint8_t> image = RandomImage(3000, 1);
  const std::string bin = folder.Write("image.bin", image);
  const std::vector<SContinuousDataBlock> one{{0x1000, image}};

  for (int width : {2, 3, 4}) {
    for (int line : {16, 32, 64}) {
      std::string name = "width";
      name += std::to_string(width);
      name += ".pen";
      const std::string out = folder.Path(name);
      RunTool("srec_cat " + bin + " -binary -offset 0x1000 -o " + out +
              " -Motorola -address-length=" + std::to_string(width) +
              " -obs=" + std::to_string(line));
      EXPECT_EQ(LoadSRec(out), one) << width << " " << line;
    }
  }
  const std::string crlf = folder.Path("crlf.touch");
  RunTool("srec_cat " + bin + " -binary -offset 0x1000 -o " + crlf + " -Motorola -crlf");
  EXPECT_EQ(LoadSRec(crlf), one);

  const std::string objcopied = folder.Path("obj.tav");
  RunTool("objcopy -I binary -O srec --srec-len=28 --srec-forceS3 --change-addresses 0x1000 " +
          bin + " " + objcopied);
  EXPECT_EQ(LoadSRec(objcopied), one);

  // Two pieces with a hole: two blocks.
  const std::vector<uint8_t> second = RandomImage(500, 2);
  const std::string bin2 = folder.Write("second.bin", second);
  const std::string holes = folder.Path("holes.pen");
  RunTool("srec_cat " + bin + " -binary -offset 0x100 " + bin2 + " -binary -offset 0x2000 -o " +
          holes + " -Motorola");
  EXPECT_EQ(LoadSRec(holes), (std::vector<SContinuousDataBlock>{{0x100, image}, {0x2000, second}}));

  // The same records shuffled: blocks may stay apart, the image may not change.
  std::istringstream lines(CTempFolder::Read(objcopied));
  std::vector<std::string> records;
  for (std::string line; std::getline(lines, line);) records.push_back(line);
  std::shuffle(records.begin() + 1, records.end(), std::mt19937(3));
  std::string shuffled;
  for (const std::string& line : records) shuffled += line + "\n";
  const std::vector<SContinuousDataBlock> blocks = LoadSRec(folder.Write("shuffled.tav", shuffled));
  ASSERT_FALSE(blocks.empty());
  EXPECT_EQ(blocks.front().startAddress, 0x1000u);
  EXPECT_EQ(Flat(blocks), image);
}

TEST(PeerTools, IntelHexFilesOfSrecCatAndObjcopyLoadByteForByte) {
  if (!HaveTools()) GTEST_SKIP() << "srec_cat or objcopy missing";
  CTempFolder folder;
  const std::vector<uint8_t> image = RandomImage(5000, 4);
  const std::string bin = folder.Write("image.bin", image);
  std::vector<uint8_t> expected = image;
  expected.resize(5120, 0xFF);

  const std::vector<std::string> commands{
      "srec_cat " + bin + " -binary -offset 0x8000 -o OUT -Intel",
      "srec_cat " + bin + " -binary -offset 0x8000 -o OUT -Intel -crlf -obs=32",
      "srec_cat " + bin + " -binary -offset 0x8000 -o OUT -Intel -address-length=4",
      "objcopy -I binary -O ihex --change-addresses 0x8000 " + bin + " OUT",
  };
  for (size_t i = 0; i < commands.size(); ++i) {
    std::string command = commands[i];
    std::string name = "out";
    name += std::to_string(i);
    name += ".hex";
    const std::string out = folder.Path(name);
    command.replace(command.find("OUT"), 3, out);
    RunTool(command);
    CIntelHex hex;
    ASSERT_TRUE(hex.Load(out)) << command;
    EXPECT_EQ(hex.Size(), 5120u);
    EXPECT_EQ(std::vector<uint8_t>(hex.GetData(), hex.GetData() + hex.Size()), expected) << command;
  }
}
