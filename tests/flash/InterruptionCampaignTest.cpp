// The interruption campaign: an S-record update is cut at every report of
// its sequence in turn (the board vanishes), power returns (the lab's state
// folder carries the board into a second run, as a power cycle), and a
// second full update must then succeed.

#include <gtest/gtest.h>

#include <filesystem>

#include "firmware/FirmwareFiles.h"
#include "lab/CLabPenController.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "support/LabSRecUpdate.h"

namespace {

using LabImages::Record;

SLabPenDescription SmallPen(ELabProtocol protocol_I) {
  SLabPenDescription description;
  description.protocol = protocol_I;
  description.cpus = {SLabFlashLayout::Uniform(0x08000000, 4096, 12, 1, 1024)};
  return description;
}

class InterruptionCampaign : public LabFixture, public ::testing::WithParamInterface<ELabProtocol> {
 protected:
  EFLProtocolType Protocol() const {
    return GetParam() == ELabProtocol::eNonBL ? EFL_PROTOCOL_NON_BL : EFL_PROTOCOL_LOADER;
  }

  // A fresh run: a new bus with a factory-fresh pen, or the pen of the
  // state folder.
  std::shared_ptr<CLabPenController> NewRun(bool fromFolder_I) {
    mBus = CLabBus::Create();
    auto pen = std::make_shared<CLabPenController>(SmallPen(GetParam()));
    mBus->Plug(pen);
    if (fromFolder_I) {
      EXPECT_EQ(mBus->LoadState(mFolder), 1);
    }
    return pen;
  }

  LabSRecUpdate::SResult RunUpdate(const CLabPenController& pen_I,
                                   const std::vector<SContinuousDataBlock>& image_I) {
    const uint32_t location = pen_I.GetLocationId();
    LabSRecUpdate update(mBus, {0x7A71, 0x0301, location, 0x0002, 0x000D},
                         {0x7A71, 0x0302, location, 0x0001, 0xFF00});
    update.SetProtocol(Protocol());
    update.SetFormat(EDS_SREC_GENERIC);
    return update.Run(image_I);
  }

  CTempFolder mTemp;
  const std::string mFolder = mTemp.Path("state");
};

std::vector<std::vector<uint8_t>> Blocks(const CLabFlash& flash_I) {
  std::vector<std::vector<uint8_t>> blocks;
  for (uint32_t i = 0; i < flash_I.GetBlockCount(); ++i)
    blocks.push_back(flash_I.GetBlockContent(i));
  return blocks;
}

TEST_P(InterruptionCampaign, EveryCutLeavesTheBoardRecoverable) {
  const std::vector<SContinuousDataBlock> image{Record(0x08002100, 3 * 4096 + 200, 11),
                                                Record(0x08009000, 300, 12)};
  // The uninterrupted sequence: how many reports.
  std::shared_ptr<CLabPenController> pen = NewRun(false);
  const auto oldImage = Blocks(pen->GetLoader().GetCpu(0));
  const auto newImage = LabImages::Expected(pen->GetLoader().GetCpu(0), image);
  ASSERT_TRUE(RunUpdate(*pen, image).backToNormal);
  const uint64_t sequence = pen->GetReportCount();

  // A cut leaves the old firmware running, the loader waiting with no valid
  // image, or the new firmware running; in that order as the cut moves on.
  int phase = 0;
  uint64_t leftInLoader = 0;
  for (uint64_t cut = 1; cut <= sequence; ++cut) {
    SCOPED_TRACE("cut after report " + std::to_string(cut));
    std::filesystem::remove_all(mFolder);
    pen = NewRun(false);
    pen->Faults().Add({ELabFaultKind::eVanish, static_cast<uint32_t>(cut), ""});
    EXPECT_FALSE(RunUpdate(*pen, image).backToNormal);
    ASSERT_TRUE(mBus->SaveState(mFolder));

    // Power returns.
    pen = NewRun(true);
    const CLabFlash& flash = pen->GetLoader().GetCpu(0);
    const bool inLoader = pen->GetMode() == CLabLoaderBoard::EMode::eLoader;
    EXPECT_NE(inLoader, pen->GetLoader().IsImageValid());
    int now = 1;
    if (inLoader) {
      EXPECT_EQ(flash.GetRomMagicWord(), 0u);
      ++leftInLoader;
    } else {
      const auto content = Blocks(flash);
      EXPECT_TRUE(content == oldImage || content == newImage) << "a mixed image runs";
      now = content == oldImage ? 0 : 2;
    }
    EXPECT_GE(now, phase) << "the board went back to an earlier state";
    phase = now;

    // A second full update brings the new image in every case.
    const LabSRecUpdate::SResult second = RunUpdate(*pen, image);
    EXPECT_TRUE(second.programmed && second.backToNormal);
    EXPECT_TRUE(pen->GetLoader().IsImageValid());
    EXPECT_EQ(Blocks(pen->GetLoader().GetCpu(0)), newImage);
    for (const std::string& violation : pen->GetViolations()) ADD_FAILURE() << violation;
    if (HasFailure()) break;
  }
  // The board is invalidated early and made valid only at the very end.
  EXPECT_EQ(phase, 2);
  EXPECT_GT(leftInLoader, sequence / 2);
}

INSTANTIATE_TEST_SUITE_P(BothProtocols, InterruptionCampaign,
                         ::testing::Values(ELabProtocol::eLoader, ELabProtocol::eNonBL),
                         [](const auto& info) {
                           return info.param == ELabProtocol::eLoader ? "Loader" : "NonBL";
                         });

}  // namespace
