#include "helper/CSystemdUnits.h"

bool CSystemdUnits::Stop(sd_bus* bus_I, const std::string& unit_I, std::string& why_O) {
  return Queue(bus_I, "StopUnit", unit_I, why_O);
}

bool CSystemdUnits::Start(sd_bus* bus_I, const std::string& unit_I, std::string& why_O) {
  return Queue(bus_I, "StartUnit", unit_I, why_O);
}

bool CSystemdUnits::Queue(sd_bus* bus_I, const char* method_I, const std::string& unit_I,
                          std::string& why_O) {
  sd_bus_error error = SD_BUS_ERROR_NULL;
  const int status =
      sd_bus_call_method(bus_I, "org.freedesktop.systemd1", "/org/freedesktop/systemd1",
                         "org.freedesktop.systemd1.Manager", method_I, &error, nullptr, "ss",
                         unit_I.c_str(), "replace");
  if (status < 0) why_O = error.message != nullptr ? error.message : "systemd did not answer";
  sd_bus_error_free(&error);
  return status >= 0;
}
