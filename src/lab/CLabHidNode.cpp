#include "lab/CLabHidNode.h"

EHidStatus CLabHidNode::Open(const DeviceInfo& info_I) {
  Close();
  const EHidStatus status = mBus->OpenHid(info_I, mBinding);
  mOpen = status == EHidStatus::eSuccess;
  return status;
}

void CLabHidNode::Close() {
  if (!mOpen) return;
  mBus->Release(mBinding);
  mOpen = false;
}

uint16_t CLabHidNode::GetReleaseNumber() const {
  return mOpen ? mBus->ReleaseNumberOf(mBinding) : 0;
}

EHidStatus CLabHidNode::SetFeatureReport(const std::vector<uint8_t>& report_I) {
  if (!mOpen) return EHidStatus::eGone;
  if (report_I.empty()) return EHidStatus::eOther;
  return mBus->SetFeature(mBinding, report_I);
}

EHidStatus CLabHidNode::GetFeatureReport(std::vector<uint8_t>& report_IO) {
  if (!mOpen) return EHidStatus::eGone;
  if (report_IO.empty()) return EHidStatus::eOther;
  return mBus->GetFeature(mBinding, report_IO);
}
