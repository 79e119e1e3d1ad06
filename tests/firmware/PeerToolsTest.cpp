// Files written by srec_cat and objcopy must load byte for byte.

#include <gtest/gtest.h>

#include <random>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"

TEST(PeerTools, FilesOfSrecCatAndObjcopyLoadByteForByte) {
  if (std::system("command -v srec_cat >/dev/null && command -v objcopy >/dev/null") != 0) {
    GTEST_SKIP() << "srec_cat or objcopy missing";
  }
  CTempFolder folder;
  std::mt19937 rng(1);
  std::vector<uint8_t> image(5000);
  for (uint8_t& byte : image) byte = static_cast<uint8_t>(rng());
  const std::string bin = folder.Write("image.bin", image);
  const auto make = [&](const std::string& name_I, const std::string& command_I) {
    EXPECT_EQ(std::system((command_I + " 2>/dev/null").c_str()), 0) << command_I;
    return folder.Path(name_I);
  };

  // S1, S2 and S3 records, each with another line length, and line ends
  // of both kinds.
  const std::string cat = "srec_cat " + bin + " -binary -offset 0x1000 -o " + folder.Path("s.tav");
  for (const std::string& command :
       {cat + " -address-length=2 -obs=16", cat + " -address-length=3 -obs=32",
        cat + " -address-length=4 -obs=64 -crlf",
        "objcopy -I binary -O srec --srec-len=28 --srec-forceS3 --change-addresses 0x1000 " + bin +
            " " + folder.Path("s.tav")}) {
    CSRec source;
    ASSERT_TRUE(source.Load(make("s.tav", command), EHID_INTERFACE)) << command;
    EXPECT_EQ(source.GetSRecData(), (std::vector<SContinuousDataBlock>{{0x1000, image}}));
  }

  std::vector<uint8_t> expected = image;
  expected.resize(5120, 0xFF);
  const std::string hex = "srec_cat " + bin + " -binary -offset 0x8000 -o " + folder.Path("t.hex");
  for (const std::string& command :
       {hex + " -Intel", hex + " -Intel -crlf -obs=32", hex + " -Intel -address-length=4",
        "objcopy -I binary -O ihex --change-addresses 0x8000 " + bin + " " +
            folder.Path("t.hex")}) {
    CIntelHex intelHex;
    ASSERT_TRUE(intelHex.Load(make("t.hex", command))) << command;
    EXPECT_EQ(std::vector<uint8_t>(intelHex.GetData(), intelHex.GetData() + intelHex.Size()),
              expected)
        << command;
  }
}
