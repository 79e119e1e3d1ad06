#include "flash/CI2CFLDeviceInterface.h"

#include <algorithm>

#include "common/CClock.h"

namespace {

constexpr uint8_t kModeReportId = 0xB0;
constexpr uint8_t kTunnelReadId = 0xB1;
constexpr uint8_t kTunnelWriteId = 0xB2;
// What the master does with this byte is its own; it is sent as it stands.
constexpr uint8_t kTunnelChannel = 0x01;

constexpr size_t kModeReportSize = 3;
constexpr size_t kTunnelWriteSize = 265;
constexpr size_t kTunnelWriteStatusSize = 6;
constexpr size_t kTunnelReadRequestSize = 5;
constexpr size_t kTunnelReadReplySize = 266;
// The longest command the write request holds behind its 4 header bytes.
constexpr size_t kMaxTunnelled = 261;

constexpr uint8_t kStatusDoneNoData = 0xF0;
constexpr uint8_t kStatusBusy = 0xF1;
constexpr uint8_t kStatusDone = 0xF2;

// The master needs this long to pass a request on before it is asked.
constexpr double kTunnelWait = 0.02;
constexpr int kModeSwitchTries = 60;
constexpr double kModeSwitchWait = 0.5;

}  // namespace

CI2CFLDeviceInterface::CI2CFLDeviceInterface() { mInterfaceType = EI2C_INTERFACE; }

CI2CFLDeviceInterface::CI2CFLDeviceInterface(const std::string& path_I)
    : CFLDeviceInterface(path_I) {
  mInterfaceType = EI2C_INTERFACE;
}

bool CI2CFLDeviceInterface::GetIsFlashLoader() {
  std::vector<uint8_t> report(kModeReportSize, 0xFF);
  report[0] = kModeReportId;
  // A controller that does not answer, rebooting for example, counts as
  // out of loader mode.
  const bool loader = ReadMaster(report) && report[1] == 0 && report[2] == 0;
  SetIsFlashLoader(loader);
  return loader;
}

void CI2CFLDeviceInterface::SendMode(uint8_t mode_I) {
  std::vector<uint8_t> report(kModeReportSize, mode_I);
  report[0] = kModeReportId;
  WriteMaster(report);
}

bool CI2CFLDeviceInterface::SwitchToBLMode() {
  if (!Open()) {
    Close();
    return false;
  }
  if (GetIsFlashLoader()) {
    Close();
    return true;
  }
  for (int i = 0; i < kModeSwitchTries; ++i) {
    if (GetIsFlashLoader()) break;
    SendMode(FW_MODE_BOOTLOADER);
    TavSleep(kModeSwitchWait);
  }
  const bool loader = GetIsFlashLoader();
  Close();
  return loader;
}

bool CI2CFLDeviceInterface::SwitchFromBLMode(bool /*save_I*/) {
  if (!IsOpen()) return false;
  if (!GetIsFlashLoader()) return true;
  for (int i = 0; i < kModeSwitchTries; ++i) {
    if (!GetIsFlashLoader()) break;
    SendMode(FW_MODE_MAIN_FW);
  }
  return !GetIsFlashLoader();
}

bool CI2CFLDeviceInterface::IsAlive() {
  if (!IsOpen()) return false;
  if (GetIsFlashLoader()) {
    uint32_t status = 0;
    return FLProtGetStatus(status);
  }
  std::vector<uint8_t> probe{0x02, 0x00};
  return WriteMaster(probe);
}

bool CI2CFLDeviceInterface::Write(std::vector<uint8_t>& data_IO) {
  const uint8_t reportId = data_IO.empty() ? 0 : data_IO[0];
  const size_t size = data_IO.size();
  if ((size & ~size_t{1}) >= 262) return false;

  std::vector<uint8_t> request(kTunnelWriteSize, 0);
  request[0] = kTunnelWriteId;
  request[1] = kTunnelChannel;
  request[2] = static_cast<uint8_t>(size);
  request[3] = static_cast<uint8_t>(size >> 8);
  std::copy(data_IO.begin(), data_IO.end(), request.begin() + 4);
  const bool sent = WriteMaster(request);
  TavSleep(kTunnelWait);
  if (!sent) return false;

  // A master that keeps answering busy holds the caller here: the loader
  // is finishing a flash operation that must not be cut short.
  while (true) {
    std::vector<uint8_t> status(kTunnelWriteStatusSize, 0);
    status[0] = kTunnelWriteId;
    if (!ReadMaster(status) || status[0] != kTunnelWriteId) return false;
    switch (status[1]) {
      case kStatusDoneNoData: return true;
      case kStatusBusy: TavSleep(kTunnelWait); continue;
      case kStatusDone: return status[5] == reportId;
      default: return false;
    }
  }
}

bool CI2CFLDeviceInterface::Read(std::vector<uint8_t>& data_IO) {
  const uint8_t reportId = data_IO.empty() ? 0 : data_IO[0];
  const size_t length = std::min(data_IO.size(), kMaxTunnelled);

  std::vector<uint8_t> request(kTunnelReadRequestSize, 0);
  request[0] = kTunnelReadId;
  request[1] = kTunnelChannel;
  request[2] = reportId;
  request[3] = static_cast<uint8_t>(length);
  request[4] = static_cast<uint8_t>(length >> 8);
  const bool sent = WriteMaster(request);
  TavSleep(kTunnelWait);
  if (!sent) return false;

  while (true) {
    std::vector<uint8_t> reply(kTunnelReadReplySize, 0);
    reply[0] = kTunnelReadId;
    if (!ReadMaster(reply) || reply[0] != kTunnelReadId) return false;
    switch (reply[1]) {
      case kStatusDoneNoData: return true;
      case kStatusBusy: TavSleep(kTunnelWait); continue;
      case kStatusDone: {
        const size_t replyLength = reply[3] | (reply[4] << 8);
        if (replyLength != length || reply[5] != reportId) return false;
        std::copy(reply.begin() + 5, reply.begin() + 5 + length, data_IO.begin());
        return true;
      }
      default: return false;
    }
  }
}
