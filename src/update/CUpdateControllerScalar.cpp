// The scalar's own update path: no loader mode and no attach wait, the
// bridge link and the flash programmer do the switching themselves.

#include <regex>

#include "common/TavLog.h"
#include "firmware/CScalarRTDISP.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/RTDISP.h"
#include "scalar/SensorFamilies.h"
#include "update/CUpdateController.h"

namespace {

// A pattern that is no regular expression matches nothing.
bool MatchesWhole(const std::string& text_I, const std::string& pattern_I) {
  try {
    return std::regex_match(text_I, std::regex(pattern_I));
  } catch (const std::regex_error&) {
    return false;
  }
}

}  // namespace

bool CUpdateController::UpdateScalar(const std::string& serial_I, unsigned char index_I,
                                     bool openByIndex_I, const std::string& pattern_I) {
  std::shared_ptr<CI2CConnectorFTDI> connector;
  const DevicePtr device = GetSelectedDevice();
  if (!device || device->GetScalarInterfaceType() != EFTDI_INTERFACE) {
    FailUpdate(EERROR_PROGRAM, "Unsupported I2C interface");
    return false;
  }
  const std::shared_ptr<CScalarRTDISP> image = mDataSource.GetScalarRtdIspData();
  if (!image) {
    FailUpdate(EERROR_PROGRAM, "Failed to load data");
    return false;
  }

  if (openByIndex_I && pattern_I.empty()) {
    connector = std::make_shared<CI2CConnectorFTDI>();
    if (!connector->Open(static_cast<long>(index_I))) connector.reset();
  } else {
    const SENSOR_ID sid = ScalarSensorId(device->GetPenProductId());
    const long count = CI2CConnectorFTDI::NumberOfDevices();
    for (long index = 0; index < count && !connector; ++index) {
      auto candidate = std::make_shared<CI2CConnectorFTDI>();
      if (!candidate->Open(index)) continue;
      const std::string serial = candidate->SerialNumber(sid);
      if (serial == serial_I) {
        connector = candidate;
      } else if (!pattern_I.empty() && MatchesWhole(serial, pattern_I)) {
        connector = candidate;
      } else {
        candidate->Close();
      }
    }
    if (!connector) TavLog::Error("No device found for serial number %s\n", serial_I.c_str());
  }
  if (!connector) {
    FailUpdate(EERROR_PROGRAM, "Failed to open device and/or load data");
    return false;
  }

  // The connector stays open: the scalar restarts on its own once written.
  RTDISP programmer(connector, image->GetData(), this, device->GetIsQuantaScalarBoard(),
                    device->GetIsQisdaVenusScalarBoard());
  ProcessStateChange(ESTATE_PROGRAM);
  if (programmer.StartISPFlash()) {
    PostUpdate();
    return true;
  }
  FailUpdate(EERROR_PROGRAM, "General Program Failure");
  return false;
}
