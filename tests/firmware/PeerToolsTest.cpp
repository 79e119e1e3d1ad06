// Files written by srec_cat and objcopy must load byte for byte.

#include <gtest/gtest.h>

#include <random>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"

namespace {

bool HaveTools() {
  return std::system("command -v srec_cat >/dev/null && command -v objcopy >/dev/null") == 0;
}

// Runs the command with OUT replaced by the path of `name_I` in the folder.
std::string Make(const CTempFolder& folder_I, const std::string& name_I, std::string command_I) {
  const std::string out = folder_I.Path(name_I);
  command_I.replace(command_I.find("OUT"), 3, out);
  EXPECT_EQ(std::system((command_I + " 2>/dev/null").c_str()), 0) << command_I;
  return out;
}

std::vector<uint8_t> RandomImage(size_t size_I, unsigned seed_I) {
  std::mt19937 rng(seed_I);
  std::vector<uint8_t> image(size_I);
  for (uint8_t& byte : image) byte = static_cast<uint8_t>(rng());
  return image;
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
  const std::string cat = "srec_cat " + bin + " -binary -offset 0x1000 -o OUT -Motorola";
  // S1, S2 and S3 records, each with another line length.
  for (const auto& [width, line] : {std::pair{2, 16}, {3, 32}, {4, 64}}) {
    const std::string options =
        " -address-length=" + std::to_string(width) + " -obs=" + std::to_string(line);
    EXPECT_EQ(LoadSRec(Make(folder, "w.pen", cat + options)), one) << options;
  }
  EXPECT_EQ(LoadSRec(Make(folder, "crlf.touch", cat + " -crlf")), one);
  EXPECT_EQ(LoadSRec(Make(folder, "obj.tav",
                          "objcopy -I binary -O srec --srec-len=28 --srec-forceS3 "
                          "--change-addresses 0x1000 " +
                              bin + " OUT")),
            one);

  // Two pieces with a hole: two blocks.
  const std::vector<uint8_t> second = RandomImage(500, 2);
  const std::string bin2 = folder.Write("second.bin", second);
  EXPECT_EQ(LoadSRec(Make(folder, "holes.pen",
                          "srec_cat " + bin + " -binary -offset 0x100 " + bin2 +
                              " -binary -offset 0x2000 -o OUT -Motorola")),
            (std::vector<SContinuousDataBlock>{{0x100, image}, {0x2000, second}}));
}

TEST(PeerTools, IntelHexFilesOfSrecCatAndObjcopyLoadByteForByte) {
  if (!HaveTools()) GTEST_SKIP() << "srec_cat or objcopy missing";
  CTempFolder folder;
  const std::vector<uint8_t> image = RandomImage(5000, 4);
  const std::string bin = folder.Write("image.bin", image);
  std::vector<uint8_t> expected = image;
  expected.resize(5120, 0xFF);
  const std::string cat = "srec_cat " + bin + " -binary -offset 0x8000 -o OUT -Intel";
  for (const std::string& command :
       {cat, cat + " -crlf -obs=32", cat + " -address-length=4",
        "objcopy -I binary -O ihex --change-addresses 0x8000 " + bin + " OUT"}) {
    CIntelHex hex;
    ASSERT_TRUE(hex.Load(Make(folder, "out.hex", command))) << command;
    EXPECT_EQ(hex.Size(), 5120u);
    EXPECT_EQ(std::vector<uint8_t>(hex.GetData(), hex.GetData() + hex.Size()), expected) << command;
  }
}
