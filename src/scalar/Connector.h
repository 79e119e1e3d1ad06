#pragma once
// An open line to a display scalar that speaks the request and reply frames
// of DDCFrame. The requests that any connector makes the same way live
// here; the one implementation is CI2CConnectorFTDI.
//
// mRawEDID caches the first EDID read until Close().

#include <cstdint>
#include <string>
#include <vector>

#include "common/FileVersion.h"
#include "common/TavTypes.h"

class Connector {
 public:
  Connector() = default;
  virtual ~Connector();
  Connector(const Connector&) = delete;
  Connector& operator=(const Connector&) = delete;

  virtual bool Init() = 0;
  virtual int GetType() const = 0;
  virtual bool Open(long index_I) = 0;
  virtual bool Open(const std::string& name_I) = 0;
  // Forgets the cached EDID and the found-but-not-openable flag.
  virtual bool Close();
  virtual bool IsOpen() const = 0;

  // Writes `toSend_I`, waits `delay_I` seconds and reads the reply, with
  // its checksum still on. Empty on failure; 6E 80 BE when the scalar has
  // nothing to say. A failed write is sent again `depth_I` + 1 times.
  virtual std::vector<uint8_t> SendRequest(const std::vector<uint8_t>& toSend_I, double delay_I,
                                           unsigned long sizeHint_I, int depth_I) = 0;

  virtual std::string CapabilitiesString() = 0;
  // The name of the EDID's name descriptor, the EDID read once.
  virtual std::string MonitorName();
  // The text of the EDID's serial descriptor, the EDID read once.
  virtual std::string SerialNumber(SENSOR_ID sid_I);
  virtual FileVersion FWVersion() = 0;
  virtual std::vector<uint8_t> ReadEDID(SENSOR_ID sid_I) = 0;

  // Restarts the scalar from its flash; true when it acknowledged.
  bool ScalarReset();
  // Has the scalar store its current settings; true when it acknowledged.
  bool SaveSettingsToScalar();
  // The text up to the parenthesis that closes the first one.
  static std::string ValidateCapabilitiesString(const std::vector<uint8_t>& capsStr_I);

  // A device was there but could not be opened (held by another program,
  // or no permission).
  void SetFoundButNotOpenable(bool found_I) { mFoundButNotOpenable = found_I; }
  bool GetFoundButNotOpenable() const { return mFoundButNotOpenable; }

 protected:
  std::vector<uint8_t> mRawEDID;

 private:
  bool mFoundButNotOpenable = false;
};
