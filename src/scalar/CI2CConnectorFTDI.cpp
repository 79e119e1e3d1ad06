#include "scalar/CI2CConnectorFTDI.h"

#include <array>
#include <cstdint>

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "scalar/ScalarTrace.h"

namespace {

// The bridge needs a while after attachment before it takes a reset.
constexpr int kResetRetries = 20;
constexpr double kResetRetrySeconds = 0.05;
constexpr uint32_t kUSBTransferSize = 65536;
constexpr uint32_t kTimeoutMs = 5000;
constexpr uint8_t kLatencyMs = 8;
// Time for the engine to settle after MPSSE mode, and after a new clock.
constexpr double kMpsseSettleSeconds = 0.05;
constexpr double kClockSettleSeconds = 0.02;
// Time a slave gets to take a byte when the caller asks for it.
constexpr double kByteWaitSeconds = 0.02;
// ACBUS: every pin driven, at the value the board's other lines need.
constexpr uint8_t kHighByteValue = 0x14;
constexpr uint8_t kHighByteDirection = 0xFF;

// What a run without a bridge library gets: no bridges, nothing opens.
class CAbsentFTDILibrary : public CFTDIExAPI32 {
 public:
  FT_STATUS FT_ListDevices(void*, void*, uint32_t) override { return FT_DEVICE_NOT_FOUND; }
  FT_STATUS FT_OpenEx(void*, uint32_t, FT_HANDLE*) override { return FT_DEVICE_NOT_FOUND; }
  FT_STATUS FT_Close(FT_HANDLE) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_ResetDevice(FT_HANDLE) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_SetUSBParameters(FT_HANDLE, uint32_t, uint32_t) override {
    return FT_INVALID_HANDLE;
  }
  FT_STATUS FT_SetChars(FT_HANDLE, uint8_t, uint8_t, uint8_t, uint8_t) override {
    return FT_INVALID_HANDLE;
  }
  FT_STATUS FT_SetTimeouts(FT_HANDLE, uint32_t, uint32_t) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_SetLatencyTimer(FT_HANDLE, uint8_t) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_SetBitMode(FT_HANDLE, uint8_t, uint8_t) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_Purge(FT_HANDLE, uint32_t) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_Write(FT_HANDLE, const void*, uint32_t, uint32_t*) override {
    return FT_INVALID_HANDLE;
  }
  FT_STATUS FT_Read(FT_HANDLE, void*, uint32_t, uint32_t*) override { return FT_INVALID_HANDLE; }
  FT_STATUS FT_GetQueueStatus(FT_HANDLE, uint32_t*) override { return FT_INVALID_HANDLE; }
};

CFTDIExAPI32& Api() {
  static CAbsentFTDILibrary absent;
  CFTDIExAPI32* api = CI2CConnectorFTDI::GetApi();
  return api != nullptr ? *api : absent;
}

void* ByValue(uint32_t value_I) { return reinterpret_cast<void*>(static_cast<uintptr_t>(value_I)); }

// `times_I` pin commands of value and direction, from `at_IO` on.
template <size_t N>
void AppendPins(std::array<uint8_t, N>& command_IO, size_t& at_IO, uint8_t value_I,
                uint8_t direction_I, int times_I) {
  for (int i = 0; i < times_I; ++i) {
    command_IO[at_IO++] = SET_DATA_BITS_LOW_BYTE;
    command_IO[at_IO++] = value_I;
    command_IO[at_IO++] = direction_I;
  }
}

}  // namespace

CFTDIExAPI32* CI2CConnectorFTDI::mApi = nullptr;

void CI2CConnectorFTDI::SetApi(CFTDIExAPI32* api_I) { mApi = api_I; }

CFTDIExAPI32* CI2CConnectorFTDI::GetApi() { return mApi; }

CI2CConnectorFTDI::~CI2CConnectorFTDI() { CloseFTDIHandle(); }

long CI2CConnectorFTDI::NumberOfDevices() {
  uint32_t count = 0;
  if (Api().FT_ListDevices(&count, nullptr, FT_LIST_NUMBER_ONLY) != FT_OK) return 0;
  return static_cast<long>(count);
}

bool CI2CConnectorFTDI::Open(long index_I) {
  SCALAR_TRACE(Info, "%s ID = %li\n", "CI2CConnectorFTDI::Open", index_I);
  const FT_STATUS status = OpenFTDIHandle(index_I);
  if (status == FT_DEVICE_NOT_OPENED) SetFoundButNotOpenable(true);
  return status == FT_OK;
}

bool CI2CConnectorFTDI::Open(const std::string& /*name_I*/) {
  TAVASSERT_TEXT("This is only used by serial connections");
  return false;
}

bool CI2CConnectorFTDI::Close() {
  Connector::Close();
  CloseFTDIHandle();
  mRawDisplayInformation.clear();
  return true;
}

FT_STATUS CI2CConnectorFTDI::OpenFTDIHandle(long index_I) {
  // A second open starts from a closed bridge rather than leak the first.
  CloseFTDIHandle();
  const auto fail = [this](FT_STATUS status_I) {
    CloseFTDIHandle();
    return status_I;
  };

  if (index_I >= NumberOfDevices()) {
    SCALAR_TRACE(Error,
                 "CI2CConnectorFTDI::OpenFTDIHandle trying to access a device index great than "
                 "the number of devices\n");
    return fail(kStatusIndexOutOfRange);
  }
  const long location = DeviceLocation(index_I);
  if (location == -1) {
    SCALAR_TRACE(Error,
                 "CI2CConnectorFTDI::OpenFTDIHandle could not translate device index to "
                 "location id\n");
    return fail(kStatusLocationUnknown);
  }
  FT_STATUS status = I2COpen(location);
  if (status != FT_OK) {
    SCALAR_TRACE(Error,
                 "CI2CConnectorFTDI::OpenFTDIHandle found locationID but can not open it.  "
                 "AppleUSBFTDI???\n");
    return fail(status);
  }
  if ((status = ResetDevice()) != FT_OK) return fail(status);
  I2CReadAll();

  CFTDIExAPI32& api = Api();
  if ((status = api.FT_SetUSBParameters(mHandle, kUSBTransferSize, kUSBTransferSize)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_ResetDevice failed (%i)\n", status);
    return fail(status);
  }
  if ((status = api.FT_SetChars(mHandle, 0, 0, 0, 0)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_SetChars failed (%i)\n", status);
    return fail(status);
  }
  if ((status = api.FT_SetTimeouts(mHandle, kTimeoutMs, kTimeoutMs)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_SetTimeouts failed (%i)\n", status);
    return fail(status);
  }
  if ((status = api.FT_SetLatencyTimer(mHandle, kLatencyMs)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_SetLatencyTimer failed (%i)\n", status);
    return fail(status);
  }
  if ((status = api.FT_SetBitMode(mHandle, 0, FT_BITMODE_RESET)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_SetBitMode RESET_MPSSE_INTERFACE failed (%i)\n", status);
    return fail(status);
  }
  if ((status = api.FT_SetBitMode(mHandle, 0, FT_BITMODE_MPSSE)) != FT_OK) {
    SCALAR_TRACE(Error, "FT_SetBitMode ENABLE_MPSSE_INTERFACE failed (%i)\n", status);
    return fail(status);
  }
  TavSleep(kMpsseSettleSeconds);
  I2CReadAll();

  // Loopback on, so the bad-command probe proves the engine answers.
  if ((status = WriteAndCheckQueueEmpty(LOOPBACK_ENABLE)) != FT_OK) return fail(status);
  if ((status = SendBadCommand(true)) != FT_OK) {
    SCALAR_TRACE(Error, "Not bad command\n");
    return fail(status);
  }
  if ((status = WriteAndCheckQueueEmpty(LOOPBACK_DISABLE)) != FT_OK) return fail(status);
  if ((status = I2CWrite({DISABLE_CLK_DIVIDE_BY_5, DISABLE_ADAPTIVE_CLOCKING,
                          DISABLE_3_PHASE_DATA_CLOCKING})) != FT_OK) {
    return fail(status);
  }
  // SDA alone open-drain, SCL push-pull; both lines high and driven.
  if ((status = I2CWrite({ONLY_DRIVE_LOW_TRISTATE_HIGH, SDA_O, 0x00, SET_DATA_BITS_LOW_BYTE,
                          BOTH_LINES, BOTH_LINES})) != FT_OK) {
    return fail(status);
  }
  SetI2CSpeed(FT_I2C_SPEED_100KHZ);
  if ((status = I2CWrite({SET_DATA_BITS_HIGH_BYTE, kHighByteValue, kHighByteDirection})) != FT_OK) {
    return fail(status);
  }
  I2CReadAll();
  return FT_OK;
}

void CI2CConnectorFTDI::CloseFTDIHandle() {
  if (mHandle == nullptr) return;
  const FT_STATUS status = Api().FT_Close(mHandle);
  if (status != FT_OK) SCALAR_TRACE(Error, "FT_Close failed (%i)\n", status);
  mHandle = nullptr;
}

long CI2CConnectorFTDI::DeviceLocation(long index_I) {
  uint32_t location = 0;
  const FT_STATUS status = Api().FT_ListDevices(ByValue(static_cast<uint32_t>(index_I)), &location,
                                                FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "FT_ListDevices failed for device %ldi (%i)\n", index_I, status);
    return -1;
  }
  return static_cast<long>(location);
}

FT_STATUS CI2CConnectorFTDI::I2COpen(long location_I) {
  const FT_STATUS status =
      Api().FT_OpenEx(ByValue(static_cast<uint32_t>(location_I)), FT_OPEN_BY_LOCATION, &mHandle);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "FT_OpenEx failed (%i)\n", status);
    mHandle = nullptr;
  }
  return status;
}

FT_STATUS CI2CConnectorFTDI::ResetDevice() {
  FT_STATUS status = Api().FT_ResetDevice(mHandle);
  for (int retry = 0; status != FT_OK && retry < kResetRetries; ++retry) {
    TavSleep(kResetRetrySeconds);
    status = Api().FT_ResetDevice(mHandle);
  }
  if (status != FT_OK) SCALAR_TRACE(Error, "FT_ResetDevice failed (%i)\n", status);
  return status;
}

FT_STATUS CI2CConnectorFTDI::I2CPurge() {
  const FT_STATUS status = Api().FT_Purge(mHandle, FT_PURGE_RX | FT_PURGE_TX);
  if (status != FT_OK) SCALAR_TRACE(Error, "FT_Purge failed (%i)\n", status);
  return status;
}

long CI2CConnectorFTDI::I2CQueryStatus() {
  uint32_t waiting = 0;
  const FT_STATUS status = Api().FT_GetQueueStatus(mHandle, &waiting);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "FT_GetQueueStatus failed (%i)\n", status);
    return -1;
  }
  return static_cast<long>(waiting);
}

FT_STATUS CI2CConnectorFTDI::SetI2CSpeed(FT_I2C_SPEED speed_I) {
  const FT_STATUS status = I2CWrite(
      {SET_CLK_DIVISOR, static_cast<uint8_t>(speed_I & 0xFF), static_cast<uint8_t>(speed_I >> 8)});
  if (status == FT_OK) TavSleep(kClockSettleSeconds);
  return FT_OK;
}

FT_STATUS CI2CConnectorFTDI::SendBadCommand(bool check_I) {
  FT_STATUS status = I2CWrite({BAD_COMMAND});
  if (status != FT_OK) return status;
  const auto [readStatus, answer] = I2CRead(2);
  if (readStatus != FT_OK) return readStatus;
  if (!check_I) return FT_OK;
  return answer[0] == BAD_COMMAND_ANSWER || answer[1] == BAD_COMMAND ? FT_OK : kStatusShortTransfer;
}

FT_STATUS CI2CConnectorFTDI::WriteAndCheckQueueEmpty(uint8_t command_I) {
  const FT_STATUS status = I2CWrite({command_I});
  if (status != FT_OK) return status;
  if (I2CQueryStatus() > 0) TAVASSERT_TEXT("Bytes in the buffer");
  return FT_OK;
}

FT_STATUS CI2CConnectorFTDI::I2CWrite(const uint8_t* bytes_I, size_t size_I) {
  ScalarTrace::Bytes("I2CWrite buffer", bytes_I, size_I);
  uint32_t written = 0;
  const FT_STATUS status =
      Api().FT_Write(mHandle, bytes_I, static_cast<uint32_t>(size_I), &written);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "FT_Write failed (%i)\n", status);
    return status;
  }
  if (written != size_I) {
    SCALAR_TRACE(Error, "I2CWrite had %lu sent %i\n", size_I, written);
    return kStatusShortTransfer;
  }
  return FT_OK;
}

FT_STATUS CI2CConnectorFTDI::I2CStart() {
  std::array<uint8_t, 36> command;
  size_t at = 0;
  AppendPins(command, at, BOTH_LINES, BOTH_LINES, 4);  // both lines high
  AppendPins(command, at, SCL, BOTH_LINES, 4);         // SDA falls while SCL is high
  AppendPins(command, at, 0x00, BOTH_LINES, 4);        // both low
  // A failed start shows at the first byte's acknowledge.
  I2CWrite(command.data(), at);
  return FT_OK;
}

FT_STATUS CI2CConnectorFTDI::I2CStop() {
  std::array<uint8_t, 27> command;
  size_t at = 0;
  AppendPins(command, at, SCL, BOTH_LINES, 4);         // SCL high, SDA low
  AppendPins(command, at, BOTH_LINES, BOTH_LINES, 4);  // SDA rises: both high
  AppendPins(command, at, SDA_O, BOTH_LINES, 1);       // SCL low, SDA high: idle
  return I2CWrite(command.data(), at);
}

FT_STATUS CI2CConnectorFTDI::I2CSendByte(uint8_t byte_I, bool wait_I) {
  const std::array<uint8_t, 13> command{MSB_FALLING_EDGE_CLOCK_BYTE_OUT,
                                        0x00,
                                        0x00,
                                        byte_I,
                                        SET_DATA_BITS_LOW_BYTE,
                                        0x00,
                                        SCL,  // SCL driven low, SDA released
                                        MSB_RISING_EDGE_CLOCK_BIT_IN,
                                        0x00,  // the acknowledge bit
                                        SEND_ANSWER_BACK_IMMEDIATE,
                                        SET_DATA_BITS_LOW_BYTE,
                                        0x00,
                                        BOTH_LINES};
  FT_STATUS status = I2CWrite(command.data(), command.size());
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "I2CSendByte write failed (%i)\n", status);
    return status;
  }
  // SDA released high, SCL low, whatever the slave answered.
  static constexpr uint8_t kReleaseSda[] = {SET_DATA_BITS_LOW_BYTE, SDA_O, BOTH_LINES};
  status = I2CWrite(kReleaseSda, sizeof kReleaseSda);
  if (status != FT_OK) SCALAR_TRACE(Error, "I2CSendByte direction reset failed (%i)\n", status);
  if (wait_I) TavSleep(kByteWaitSeconds);

  // Plain locals, not a structured binding: the trace's lambda captures
  // them, which clang before 16 refuses.
  const std::pair<FT_STATUS, uint8_t> read = I2CRead1();
  if (read.first != FT_OK) return read.first;
  const uint8_t ack = read.second;
  if ((ack & 0x01) != 0) {
    SCALAR_TRACE(Error, "I2CSendByte ACK failed (%i)\n", ack);
    return kStatusShortTransfer;
  }
  return FT_OK;
}

std::pair<FT_STATUS, uint8_t> CI2CConnectorFTDI::I2CGetByte(bool ack_I) {
  const std::array<uint8_t, 12> command{
      SET_DATA_BITS_LOW_BYTE,
      0x00,
      SCL,  // SDA released
      MSB_FALLING_EDGE_CLOCK_BYTE_IN,
      0x00,
      0x00,
      SET_DATA_BITS_LOW_BYTE,
      0x00,
      BOTH_LINES,
      MSB_FALLING_EDGE_CLOCK_BIT_OUT,
      0x00,
      static_cast<uint8_t>(ack_I ? 0x00 : 0x80)};  // the master's acknowledge
  const FT_STATUS status = I2CWrite(command.data(), command.size());
  if (status != FT_OK) return {status, 0};
  return I2CRead1();
}

std::pair<FT_STATUS, uint8_t> CI2CConnectorFTDI::I2CRead1() {
  uint8_t byte = 0;
  uint32_t count = 0;
  const FT_STATUS status = Api().FT_Read(mHandle, &byte, 1, &count);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "I2CRead1 failed\n");
    return {status, 0};
  }
  if (count != 1) {
    SCALAR_TRACE(Error, "I2CRead1 timeout\n");
    return {kStatusShortTransfer, 0};
  }
  SCALAR_TRACE(Debug, "I2CRead1 read %i\n", count);
  return {FT_OK, byte};
}

std::pair<FT_STATUS, std::vector<uint8_t>> CI2CConnectorFTDI::I2CRead(int count_I) {
  std::vector<uint8_t> bytes(static_cast<size_t>(count_I), 0);
  uint32_t count = 0;
  const FT_STATUS status =
      Api().FT_Read(mHandle, bytes.data(), static_cast<uint32_t>(bytes.size()), &count);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "I2CRead failed\n");
    return {status, {}};
  }
  if (count != bytes.size()) {
    SCALAR_TRACE(Error, "I2CRead count mis-match\n");
    bytes.resize(std::min<size_t>(count, bytes.size()));
    return {kStatusShortTransfer, bytes};
  }
  SCALAR_TRACE(Debug, "I2CRead read %i\n", count);
  ScalarTrace::Bytes("", bytes);
  return {FT_OK, bytes};
}

std::pair<FT_STATUS, std::vector<uint8_t>> CI2CConnectorFTDI::I2CReadAll() {
  const long waiting = I2CQueryStatus();
  if (waiting <= 0) {
    SCALAR_TRACE(Debug, "I2CReadAll No data\n");
    return {FT_OK, {}};
  }
  std::vector<uint8_t> bytes(static_cast<size_t>(waiting), 0);
  uint32_t count = 0;
  const FT_STATUS status =
      Api().FT_Read(mHandle, bytes.data(), static_cast<uint32_t>(bytes.size()), &count);
  if (status != FT_OK) {
    SCALAR_TRACE(Error, "I2CReadAll failed\n");
    return {status, {}};
  }
  if (count != bytes.size()) {
    SCALAR_TRACE(Error, "I2CReadAll count mis-match\n");
    bytes.resize(std::min<size_t>(count, bytes.size()));
    return {kStatusShortTransfer, bytes};
  }
  SCALAR_TRACE(Debug, "I2CReadAll read %i\n", count);
  return {FT_OK, bytes};
}
