#pragma once
// Stops and starts systemd units through org.freedesktop.systemd1 on the
// system bus. The job is queued in "replace" mode; the helper does not
// wait for it to finish.

#include <systemd/sd-bus.h>

#include <string>

class CSystemdUnits {
 public:
  // False, with systemd's reason, when the job was not queued.
  static bool Stop(sd_bus* bus_I, const std::string& unit_I, std::string& why_O);
  static bool Start(sd_bus* bus_I, const std::string& unit_I, std::string& why_O);

 private:
  static bool Queue(sd_bus* bus_I, const char* method_I, const std::string& unit_I,
                    std::string& why_O);
};
