#pragma once
// The scalar's line through an FTDI USB bridge: the bridge's MPSSE engine
// is driven by hand, each I2C start, stop, byte and acknowledge a short
// string of engine commands sent in one FT_Write. The request layer of
// Connector runs on top, and RTDISP uses the bus primitives directly.
//
// Statuses are the bridge library's FT_STATUS numbers as they come, 0 for
// success, and three of the link's own: 2 location unknown, 4 short
// transfer, time-out or no acknowledge, 6 index out of range.
//
// The bridge library is one object for the whole process, set by the
// application before threads start (the Linux or the lab form). Without
// one no bridge is found.
//
// Threads: one caller at a time; the link takes no lock.

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "scalar/Connector.h"
#include "scalar/DDCFrame.h"
#include "scalar/MPSSECommands.h"
#include "seams/CFTDIExAPI32.h"

class CI2CConnectorFTDI : public Connector {
 public:
  // The link's own statuses beside the library's.
  static constexpr FT_STATUS kStatusLocationUnknown = 2;
  static constexpr FT_STATUS kStatusShortTransfer = 4;
  static constexpr FT_STATUS kStatusIndexOutOfRange = 6;

  CI2CConnectorFTDI() = default;
  ~CI2CConnectorFTDI() override;

  // Borrowed; must outlive every connector. Null: no bridge library.
  static void SetApi(CFTDIExAPI32* api_I);
  static CFTDIExAPI32* GetApi();

  // How many bridges are attached; 0 on any failure.
  static long NumberOfDevices();

  bool Init() override { return true; }
  int GetType() const override { return 1; }
  // Opens the bridge at `index_I` and leaves it in MPSSE mode at 100 kHz
  // with both lines high. A bridge that is there but cannot be opened sets
  // the found-but-not-openable flag.
  bool Open(long index_I) override;
  // Serial connections only; asserts here.
  bool Open(const std::string& name_I) override;
  bool Close() override;
  bool IsOpen() const override { return mHandle != nullptr; }

  std::vector<uint8_t> SendRequest(const std::vector<uint8_t>& toSend_I, double delay_I,
                                   unsigned long sizeHint_I, int depth_I) override;
  // The Linnet form first while no display information is known, then the
  // GreyOwl form.
  std::string CapabilitiesString() override;
  // From the EDID, else from the display information.
  std::string MonitorName() override;
  // From the EDID, else from the display information, in upper case.
  std::string SerialNumber(SENSOR_ID sid_I) override;
  FileVersion FWVersion() override;
  // Nothing for boards that have no EDID to read; the 16-block read for
  // the families that have it, else the read by offset.
  std::vector<uint8_t> ReadEDID(SENSOR_ID sid_I) override;
  // The 55 bytes of a display-information reply, checksum removed.
  std::vector<uint8_t> ReadDisplayInformation(SENSOR_ID sid_I);

  // Bus primitives for the flash programmer.
  FT_STATUS Start() { return I2CStart(); }
  FT_STATUS Stop() { return I2CStop(); }
  FT_STATUS Write(const std::vector<uint8_t>& bytes_I) { return I2CWrite(bytes_I); }
  // `wait_I` gives the slave 20 ms before the acknowledge is fetched.
  FT_STATUS SendByte(uint8_t byte_I, bool wait_I) { return I2CSendByte(byte_I, wait_I); }
  // `ack_I` acknowledges the byte, asking for another.
  std::pair<FT_STATUS, uint8_t> GetByte(bool ack_I) { return I2CGetByte(ack_I); }

 private:
  FT_STATUS OpenFTDIHandle(long index_I);
  void CloseFTDIHandle();
  long DeviceLocation(long index_I);
  FT_STATUS I2COpen(long location_I);
  FT_STATUS ResetDevice();
  FT_STATUS I2CPurge();
  long I2CQueryStatus();
  FT_STATUS SetI2CSpeed(FT_I2C_SPEED speed_I);
  FT_STATUS SendBadCommand(bool check_I);
  FT_STATUS WriteAndCheckQueueEmpty(uint8_t command_I);

  FT_STATUS I2CWrite(const std::vector<uint8_t>& bytes_I) {
    return I2CWrite(bytes_I.data(), bytes_I.size());
  }
  // The primitives build their few bytes on the stack: hundreds of
  // thousands of them go out in one update.
  FT_STATUS I2CWrite(const uint8_t* bytes_I, size_t size_I);
  FT_STATUS I2CStart();
  FT_STATUS I2CStop();
  FT_STATUS I2CSendByte(uint8_t byte_I, bool wait_I);
  std::pair<FT_STATUS, uint8_t> I2CGetByte(bool ack_I);
  std::pair<FT_STATUS, uint8_t> I2CRead1();
  std::pair<FT_STATUS, std::vector<uint8_t>> I2CRead(int count_I);
  std::pair<FT_STATUS, std::vector<uint8_t>> I2CReadAll();

  // Request-layer helpers.
  std::vector<uint8_t> Send(const DDCFrame::SRequest& request_I);
  std::vector<uint8_t> ReadEDIDGreyOwl24();
  std::vector<uint8_t> ReadEDIDByOffset(SENSOR_ID sid_I);
  std::vector<uint8_t> ReadDisplayInfoGreyOwl16R();
  std::string CapabilitiesStringLinnet();
  std::string CapabilitiesStringGreyowl();
  std::string DisplayInformationText(size_t recordOffset_I) const;

  FT_HANDLE mHandle = nullptr;
  std::vector<uint8_t> mRawDisplayInformation;

  static CFTDIExAPI32* mApi;
};
