#include "scalar/ScalarProbe.h"

#include "scalar/CI2CConnectorFTDI.h"

SScalarProbe ProbeScalar(const std::string& serial_I, SENSOR_ID sid_I) {
  SScalarProbe probe;
  const long count = CI2CConnectorFTDI::NumberOfDevices();
  for (long index = 0; index < count && !probe.found; ++index) {
    CI2CConnectorFTDI connector;
    if (!connector.Open(index)) continue;
    if (connector.SerialNumber(sid_I) == serial_I) {
      probe.found = true;
      const FileVersion version = connector.FWVersion();
      if (version.AsLong(FileVersion::EStyleThreePart) != 0) {
        probe.version = version.AsString(FileVersion::EStyleThreePart);
      }
    }
    connector.Close();
  }
  return probe;
}
