#include "lab/CLabI2CMaster.h"

namespace {

constexpr uint8_t kDoneNoData = 0xF0;
constexpr uint8_t kBusy = 0xF1;
constexpr uint8_t kDone = 0xF2;
constexpr uint8_t kRefused = 0xF3;
constexpr size_t kMaxCommand = 261;

}  // namespace

CLabI2CMaster::CLabI2CMaster(const SLabI2CDescription& description_I)
    : CLabBoard(description_I.name),
      mLoader(ELabProtocol::eLoader, description_I.cpus, description_I.deviceInfo) {
  mIdentity.vendorId = description_I.vendorId;
  mIdentity.productId = description_I.productId;
  mIdentity.link = ELabLink::eHid;
  mIdentity.usages = {description_I.usage};
  mIdentity.release = description_I.release;
  mLoader.FactoryImage(0x12C0);
  PowerOn();
}

std::vector<SLabInterface> CLabI2CMaster::GetInterfaces() const {
  SLabIdentity identity = mIdentity;
  identity.release = mLoader.FindImageRelease().value_or(mIdentity.release);
  return identity.Interfaces();
}

void CLabI2CMaster::PowerOn() {
  const bool valid = mLoader.IsImageValid();
  mSlaveMode = valid ? ESlaveMode::eMainFw : ESlaveMode::eLoader;
  mLoader.Boot(valid ? eLabStartPowerOn : eLabStartInvalidImage);
  mWriteStatus = mReadStatus = kDoneNoData;
}

std::vector<std::string> CLabI2CMaster::GetViolations() const {
  std::vector<std::string> violations = CLabBoard::GetViolations();
  for (const std::string& text : mLoader.GetViolations()) violations.push_back(text);
  return violations;
}

CLabI2CMaster::ESlaveMode CLabI2CMaster::CurrentSlaveMode() {
  if (mSlaveMode == ESlaveMode::eRestarting && Now() >= mRestartDone) {
    mSlaveMode = mRestartInto;
    mLoader.Boot(mSlaveMode == ESlaveMode::eLoader && !mLoader.IsImageValid()
                     ? eLabStartInvalidImage
                     : eLabStartHostRequest);
  }
  return mSlaveMode;
}

void CLabI2CMaster::SwitchSlave(uint8_t mode_I) {
  if (Faults().RefuseSwitch()) return;
  const ESlaveMode current = CurrentSlaveMode();
  if (current == ESlaveMode::eRestarting) return;
  // Main firmware runs only from a valid image.
  const ESlaveMode target =
      (mode_I == 0 || !mLoader.IsImageValid()) ? ESlaveMode::eLoader : ESlaveMode::eMainFw;
  if (target == current) return;
  mSlaveMode = ESlaveMode::eRestarting;
  mRestartInto = target;
  mRestartDone = Now() + kSlaveRestart;
}

bool CLabI2CMaster::OnSetFeature(const DeviceInfo&, const std::vector<uint8_t>& report_I) {
  const std::vector<uint8_t>& r = report_I;
  if (r.size() == 2 && r[0] == 0x02 && r[1] == 0x00) return true;
  if (r[0] == 0xB0) {
    if (r.size() != 3 || r[1] != r[2] || r[1] > 1) {
      Violation("malformed mode report");
      return false;
    }
    SwitchSlave(r[1]);
    return true;
  }
  if (r[0] == 0xB2) {
    const size_t length = r.size() >= 4 ? (r[2] | (r[3] << 8)) : 0;
    if (r.size() != 265 || length == 0 || length > kMaxCommand) {
      Violation("malformed tunnel write request");
      return false;
    }
    const std::vector<uint8_t> command(r.begin() + 4, r.begin() + 4 + length);
    mWriteId = command[0];
    const bool taken = CurrentSlaveMode() == ESlaveMode::eLoader && mLoader.SetReport(command);
    mWriteStatus = taken ? kDone : kRefused;
    bool save = false;
    if (mLoader.TakeResetRequest(save)) SwitchSlave(1);
    return true;
  }
  if (r[0] == 0xB1) {
    const size_t length = r.size() == 5 ? (r[3] | (r[4] << 8)) : 0;
    if (r.size() != 5 || length == 0 || length > kMaxCommand) {
      Violation("malformed tunnel read request");
      return false;
    }
    mReadData.assign(length, 0);
    mReadData[0] = r[2];
    const bool answered = CurrentSlaveMode() == ESlaveMode::eLoader && mLoader.GetReport(mReadData);
    mReadStatus = answered ? kDone : kRefused;
    return true;
  }
  return false;
}

bool CLabI2CMaster::OnGetFeature(const DeviceInfo&, std::vector<uint8_t>& report_IO) {
  std::vector<uint8_t>& r = report_IO;
  if (r[0] == 0xB0 && r.size() == 3) {
    const ESlaveMode mode = CurrentSlaveMode();
    if (mode == ESlaveMode::eRestarting) {
      Faults().NoteBusyAnswer();
      return false;
    }
    r[1] = r[2] = mode == ESlaveMode::eLoader ? 0 : 1;
    return true;
  }
  if (r[0] == 0xB2 && r.size() == 6) {
    std::fill(r.begin() + 1, r.end(), 0);
    if (Faults().TakeBusy()) {
      Faults().NoteBusyAnswer();
      r[1] = kBusy;
      return true;
    }
    r[1] = mWriteStatus;
    if (mWriteStatus == kDone) r[5] = mWriteId;
    mWriteStatus = kDoneNoData;
    return true;
  }
  if (r[0] == 0xB1 && r.size() == 266) {
    std::fill(r.begin() + 1, r.end(), 0);
    if (Faults().TakeBusy()) {
      Faults().NoteBusyAnswer();
      r[1] = kBusy;
      return true;
    }
    r[1] = mReadStatus;
    if (mReadStatus == kDone) {
      r[3] = static_cast<uint8_t>(mReadData.size());
      r[4] = static_cast<uint8_t>(mReadData.size() >> 8);
      std::copy(mReadData.begin(), mReadData.end(), r.begin() + 5);
    }
    mReadStatus = kDoneNoData;
    return true;
  }
  return false;
}

std::pair<size_t, size_t> CLabI2CMaster::DataRange(const std::vector<uint8_t>& report_I) const {
  if (report_I.size() != 265 || report_I[0] != 0xB2) return {0, 0};
  const size_t length = report_I[2] | (report_I[3] << 8);
  if (length == 0 || length > kMaxCommand) return {0, 0};
  const std::vector<uint8_t> command(report_I.begin() + 4, report_I.begin() + 4 + length);
  const std::pair<size_t, size_t> range = mLoader.DataRange(command);
  if (range.second <= range.first) return {0, 0};
  return {range.first + 4, range.second + 4};
}

void CLabI2CMaster::Save(CLabStateFile& state_IO) const {
  const bool loader = mSlaveMode == ESlaveMode::eLoader || (mSlaveMode == ESlaveMode::eRestarting &&
                                                            mRestartInto == ESlaveMode::eLoader);
  state_IO.PutNumber("mode", loader ? 1 : 0);
  mLoader.Save(state_IO, "loader");
}

void CLabI2CMaster::Load(const CLabStateFile& state_I, bool powerCycled_I) {
  mLoader.Load(state_I, "loader");
  if (powerCycled_I) {
    PowerOn();
    return;
  }
  const bool loader = state_I.GetNumber("mode", 0) == 1 || !mLoader.IsImageValid();
  mSlaveMode = loader ? ESlaveMode::eLoader : ESlaveMode::eMainFw;
  mLoader.Boot(eLabStartPowerOn);
}
