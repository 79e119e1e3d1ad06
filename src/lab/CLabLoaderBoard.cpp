#include "lab/CLabLoaderBoard.h"

CLabLoaderBoard::CLabLoaderBoard(std::string name_I, SLabIdentity normal_I,
                                 SLabIdentity loaderIdentity_I, CLabLoader engine_I)
    : CLabBoard(std::move(name_I)),
      mNormal(std::move(normal_I)),
      mLoaderIdentity(std::move(loaderIdentity_I)),
      mLoader(std::move(engine_I)),
      mRelease(mNormal.release) {}

void CLabLoaderBoard::FactoryReset(uint32_t seed_I) {
  mLoader.FactoryImage(seed_I);
  PowerOn();
}

std::vector<SLabInterface> CLabLoaderBoard::GetInterfaces() const {
  if (mMode != EMode::eNormal) return mLoaderIdentity.Interfaces();
  SLabIdentity normal = mNormal;
  normal.release = mRelease;
  return normal.Interfaces();
}

void CLabLoaderBoard::StartNormal() {
  mMode = EMode::eNormal;
  mRelease = mLoader.FindImageRelease().value_or(mNormal.release);
}

void CLabLoaderBoard::PowerOn() {
  const bool valid = mLoader.IsImageValid();
  mMode = EMode::eLoader;
  if (valid) StartNormal();
  mLoader.Boot(valid ? eLabStartPowerOn : eLabStartInvalidImage);
}

std::vector<std::string> CLabLoaderBoard::GetViolations() const {
  std::vector<std::string> violations = CLabBoard::GetViolations();
  for (const std::string& text : mLoader.GetViolations()) violations.push_back(text);
  return violations;
}

void CLabLoaderBoard::RequestLoader() {
  if (Faults().RefuseSwitch() || IsReenumerating()) return;
  Reenumerate([this]() {
    mMode = EMode::eLoader;
    mLoader.Boot(eLabStartHostRequest);
  });
}

void CLabLoaderBoard::Restart() {
  if (Faults().RefuseSwitch() || IsReenumerating()) return;
  const bool valid = mLoader.IsImageValid();
  const EMode next = valid ? EMode::eNormal : EMode::eLoader;
  // Firmware that answers the loader commands itself restarts in place
  // when it stays what it was.
  if (next == mMode && next == EMode::eNormal) {
    StartNormal();
    mLoader.Boot(eLabStartPowerOn);
    return;
  }
  Reenumerate([this, next, valid]() {
    mMode = next;
    if (next == EMode::eNormal) StartNormal();
    mLoader.Boot(valid ? eLabStartPowerOn : eLabStartInvalidImage);
  });
}

bool CLabLoaderBoard::OnSetFeature(const DeviceInfo&, const std::vector<uint8_t>& report_I) {
  if (IsReenumerating()) return false;
  bool taken = false;
  if (mMode == EMode::eLoader) {
    taken = mLoader.SetReport(report_I);
  } else {
    taken = OnNormalSetFeature(report_I);
  }
  bool save = false;
  if (mLoader.TakeResetRequest(save)) Restart();
  return taken;
}

bool CLabLoaderBoard::OnGetFeature(const DeviceInfo&, std::vector<uint8_t>& report_IO) {
  if (IsReenumerating()) return false;
  if (mMode == EMode::eLoader) return mLoader.GetReport(report_IO);
  return OnNormalGetFeature(report_IO);
}

bool CLabLoaderBoard::OnNormalSetFeature(const std::vector<uint8_t>& report_I) {
  if (SpeaksLoaderInNormalMode() && mLoader.Knows(report_I[0])) return mLoader.SetReport(report_I);
  return false;
}

bool CLabLoaderBoard::OnNormalGetFeature(std::vector<uint8_t>& report_IO) {
  if (SpeaksLoaderInNormalMode() && mLoader.Knows(report_IO[0])) {
    return mLoader.GetReport(report_IO);
  }
  return false;
}

size_t CLabLoaderBoard::GetFeatureLength(uint8_t reportId_I) const {
  if (mMode == EMode::eLoader || SpeaksLoaderInNormalMode())
    return mLoader.GetReportLength(reportId_I);
  return 0;
}

std::pair<size_t, size_t> CLabLoaderBoard::DataRange(const std::vector<uint8_t>& report_I) const {
  if (mMode == EMode::eLoader || SpeaksLoaderInNormalMode()) return mLoader.DataRange(report_I);
  return {0, 0};
}

void CLabLoaderBoard::Save(CLabStateFile& state_IO) const {
  state_IO.PutNumber("mode", mMode == EMode::eLoader ? 1 : 0);
  mLoader.Save(state_IO, "loader");
}

void CLabLoaderBoard::Load(const CLabStateFile& state_I, bool powerCycled_I) {
  mLoader.Load(state_I, "loader");
  if (powerCycled_I) {
    PowerOn();
    return;
  }
  // Still plugged in since the last run: the mode it was left in.
  mMode = state_I.GetNumber("mode", 0) == 1 ? EMode::eLoader : EMode::eNormal;
  if (mMode == EMode::eNormal && !mLoader.IsImageValid()) mMode = EMode::eLoader;
  if (mMode == EMode::eNormal) StartNormal();
  mLoader.Boot(eLabStartPowerOn);
}
