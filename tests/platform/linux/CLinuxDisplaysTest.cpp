// The DRM form of the displays seam against an emulated /sys/class/drm:
// the connected connectors in name order, each with its EDID or none.

#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>

#include "lab/LabEdid.h"
#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CLinuxDisplays.h"
#include "scalar/DisplayUtils.h"

namespace {

struct SConnector {
  const char* name;
  const char* status;
  std::vector<uint8_t> edid;
};

class LinuxDisplays : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
  }

  // A card with its connectors, as the kernel's DRM driver shows them.
  void AddCard(const std::string& card_I, const std::vector<SConnector>& connectors_I) {
    const std::string cardPath = "/devices/pci0000:00/0000:00:02.0/drm/" + card_I;
    mSysfs.Add("P: " + cardPath + "\nE: SUBSYSTEM=drm\nE: DEVTYPE=drm_minor\n");
    for (const SConnector& connector : connectors_I) {
      mSysfs.Add("P: " + cardPath + "/" + connector.name +
                 "\nE: SUBSYSTEM=drm\nA: status=" + connector.status +
                 "\\n\nA: enabled=disabled\\n\nH: edid=" + CEmulatedUsbBus::Hex(connector.edid) +
                 "\n");
    }
  }

  CEmulatedUsbBus mSysfs;
};

const SLabPanel kPanel{"", 0x1060, "Lab Display", "LABFT0701"};
const SLabPanel kOtherPanel{"", 0x1061, "Lab Quanta", "LABFQ0711"};

TEST_F(LinuxDisplays, ConnectedConnectorsInNameOrderWithTheirEdids) {
  AddCard("card1", {{"card1-DP-3", "connected", MakeLabEdid(kOtherPanel)}});
  AddCard("card0", {{"card0-HDMI-A-1", "disconnected", {}},
                    {"card0-eDP-1", "connected", {}},
                    {"card0-DP-1", "connected", MakeLabEdid(kPanel)},
                    {"card0-DP-2", "unknown", {}}});

  const std::vector<SDisplay> displays = CLinuxDisplays().List();
  ASSERT_EQ(displays.size(), 3u);
  const struct {
    const char* connector;
    std::vector<uint8_t> edid;
  } expected[] = {{"card0-DP-1", MakeLabEdid(kPanel)},
                  {"card0-eDP-1", {}},
                  {"card1-DP-3", MakeLabEdid(kOtherPanel)}};
  for (size_t i = 0; i < displays.size(); ++i) {
    EXPECT_EQ(displays[i].connector, expected[i].connector);
    EXPECT_EQ(displays[i].edid, expected[i].edid) << expected[i].connector;
    EXPECT_EQ(displays[i].manufacturerId, 0) << "nothing known beyond the EDID";
  }

  // Display identification finds the family's two by their EDIDs.
  const CLinuxDisplays source;
  DisplayUtils::SetDisplays(&source);
  std::vector<std::string> serials;
  for (const auto& entry : DisplayUtils::TavikDisplayAttributesWithPID(0x1061)) {
    serials.push_back(entry->StringForKeyWithDefault("AlphanumericSerialNumber", "?"));
  }
  EXPECT_EQ(DisplayUtils::TavikDisplayAttributes().size(), 2u);
  DisplayUtils::SetDisplays(nullptr);
  EXPECT_EQ(serials, std::vector<std::string>{"LABFQ0711"});
}

TEST_F(LinuxDisplays, NoDrmDriverGivesNoDisplays) { EXPECT_TRUE(CLinuxDisplays().List().empty()); }

// The EDID as read back through sysfs is one that the standard's own
// decoder takes, with the family's maker, the name and the serial.
TEST_F(LinuxDisplays, TheEdidReadBackDecodesAsTheStandardSays) {
  if (std::system("command -v edid-decode >/dev/null 2>&1") != 0) {
    GTEST_SKIP() << "edid-decode is not installed (scripts/setup.sh installs it)";
  }
  AddCard("card0", {{"card0-DP-1", "connected", MakeLabEdid(kPanel)}});
  const std::vector<SDisplay> displays = CLinuxDisplays().List();
  ASSERT_EQ(displays.size(), 1u);
  const std::string path = ::testing::TempDir() + "lab-edid.bin";
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char*>(displays[0].edid.data()),
             static_cast<std::streamsize>(displays[0].edid.size()));
  FILE* pipe = popen(("edid-decode --check " + path + " 2>&1").c_str(), "r");
  ASSERT_NE(pipe, nullptr);
  std::string output;
  char buffer[512];
  while (std::fgets(buffer, sizeof(buffer), pipe) != nullptr) output += buffer;
  const int status = pclose(pipe);
  EXPECT_EQ(status, 0) << output;
  for (const char* line :
       {"Manufacturer: VYG", "Model: 4192", "Display Product Name: 'Lab Display'",
        "Display Product Serial Number: 'LABFT0701'", "EDID conformity: PASS"}) {
    EXPECT_NE(output.find(line), std::string::npos) << line << "\n" << output;
  }
}

}  // namespace
