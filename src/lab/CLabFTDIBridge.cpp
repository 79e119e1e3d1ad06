#include "lab/CLabFTDIBridge.h"

CLabFTDIBridge::CLabFTDIBridge(SLabFTDIDescription description_I)
    : CLabBoard(description_I.name),
      mDescription(std::move(description_I)),
      mFlash(kFlashBlocks, mDescription.variant == ELabScalarVariant::eQuanta, Sink()),
      mBus(Sink()),
      mEngine(mBus),
      mScalar(mDescription.panel, kShippedRelease, mFlash, Faults(), Sink()),
      mMcu(mDescription.variant, mFlash, Faults(), Sink(), [this] { Restart(); }) {
  mBus.Attach(&mScalar);
  mBus.Attach(&mMcu);
  mBus.SetRefuseHook([this] { return Faults().TakeNak(); });
  FactoryReset();
}

LabViolationSink CLabFTDIBridge::Sink() {
  return [this](const std::string& text_I) { Violation(mDescription.name + ": " + text_I); };
}

void CLabFTDIBridge::FactoryReset() {
  std::vector<uint8_t> image(kFactoryBlocks * CLabSerialFlash::kBlockSize);
  uint32_t state = 0x5CA1Au;
  for (uint8_t& byte : image) {
    state = state * 1103515245u + 12345u;
    // No 0xFF, so the image reads as programmed everywhere.
    byte = static_cast<uint8_t>((state >> 16) % 0xFF);
  }
  mFlash.SetData(std::move(image));
  PowerOn();
}

std::vector<SLabInterface> CLabFTDIBridge::GetInterfaces() const {
  SLabIdentity identity;
  identity.vendorId = kVendorId;
  identity.productId = kProductId;
  identity.link = ELabLink::eUsbVendor;
  identity.usages = {{0, 0}};
  identity.release = kBridgeRelease;
  return identity.Interfaces();
}

void CLabFTDIBridge::PowerOn() {
  mMode = FT_BITMODE_RESET;
  mBus.Reset();
  mEngine.Reset();
  mEngine.Purge(true, true);
  mMcu.PowerOn();
  mScalar.Boot(0.0);
}

void CLabFTDIBridge::Restart() {
  mMcu.PowerOn();
  mScalar.Boot(CLabDdcScalar::kBootSeconds);
}

FT_STATUS CLabFTDIBridge::ResetDevice() {
  mMode = FT_BITMODE_RESET;
  mEngine.Reset();
  return FT_OK;
}

FT_STATUS CLabFTDIBridge::SetBitMode(uint8_t, uint8_t mode_I) {
  // Entering or leaving MPSSE starts the engine afresh, every pin an input.
  mEngine.Reset();
  mMode = mode_I;
  return FT_OK;
}

FT_STATUS CLabFTDIBridge::Purge(uint32_t mask_I) {
  if ((mask_I & ~(FT_PURGE_RX | FT_PURGE_TX)) != 0) return FT_INVALID_PARAMETER;
  mEngine.Purge((mask_I & FT_PURGE_RX) != 0, (mask_I & FT_PURGE_TX) != 0);
  return FT_OK;
}

bool CLabFTDIBridge::TakeTransfer(bool isRead_I) {
  const ELabFaultAction action = Faults().OnReport(isRead_I, false, false);
  return action == ELabFaultAction::ePass || action == ELabFaultAction::eCorrupt;
}

FT_STATUS CLabFTDIBridge::Write(const uint8_t* data_I, uint32_t size_I, uint32_t& written_O) {
  written_O = 0;
  const bool taken = TakeTransfer(false);
  if (taken) {
    if (IsMpsse()) mEngine.Write(data_I, size_I);
    written_O = size_I;
    Remember(data_I, size_I);
  }
  AfterReport();
  return taken ? FT_OK : FT_IO_ERROR;
}

FT_STATUS CLabFTDIBridge::Read(uint8_t* data_O, uint32_t size_I, uint32_t& read_O) {
  read_O = 0;
  const ELabFaultAction action = Faults().OnReport(true, false, false);
  const bool taken = action == ELabFaultAction::ePass || action == ELabFaultAction::eCorrupt;
  if (taken) read_O = static_cast<uint32_t>(mEngine.Read(data_O, size_I));
  // The answer is lost on the way: the read comes back empty after its
  // time-out, and the bytes never arrive.
  if (action == ELabFaultAction::eNoReply) mEngine.Purge(true, false);
  AfterReport();
  return taken || action == ELabFaultAction::eNoReply ? FT_OK : FT_IO_ERROR;
}

uint32_t CLabFTDIBridge::QueueStatus() const { return static_cast<uint32_t>(mEngine.Pending()); }

void CLabFTDIBridge::Save(CLabStateFile& state_IO) const { mFlash.Save(state_IO); }

void CLabFTDIBridge::Load(const CLabStateFile& state_I, bool) {
  // The flash keeps what it had, a cut-off update too; everything else
  // starts afresh, as after a power cycle.
  mFlash.Load(state_I);
  PowerOn();
}
