// tavik-update-helper: stops and starts the family's tablet driver for the
// firmware updater, on the system bus, as the bus starts it on demand.

#include <systemd/sd-bus.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <string>

#include "helper/CHelperConfig.h"
#include "helper/CUpdateHelperService.h"
#include "helper/HelperLog.h"

namespace {

// polkit and systemd answer well within this; a bus that does not must not
// hold the helper for ever.
constexpr uint64_t kCallTimeoutUsec = 10 * 1000 * 1000;

}  // namespace

int main(int argc, char** argv) {
  std::string configPath = TAV_HELPER_CONFIG_PATH;
  for (int i = 1; i < argc; ++i) {
    const std::string argument = argv[i];
    if (argument == "--config" && i + 1 < argc) {
      configPath = argv[++i];
    } else {
      std::fprintf(stderr, "Usage: %s [--config FILE]\n", argv[0]);
      return 2;
    }
  }

  CHelperConfig config;
  std::string error;
  if (!config.Read(configPath, error)) {
    HelperLog::Print(LOG_WARNING, "%s: %s; nothing will be stopped or started", configPath.c_str(),
                     error.c_str());
  }

  sd_bus* bus = nullptr;
  int status = sd_bus_open_system(&bus);
  if (status < 0) {
    HelperLog::Print(LOG_ERR, "No system bus: %s", std::strerror(-status));
    return 1;
  }
  sd_bus_set_method_call_timeout(bus, kCallTimeoutUsec);
  CUpdateHelperService service(bus, config);
  if (!service.Start()) {
    sd_bus_flush_close_unref(bus);
    return 1;
  }
  // Serves until the bus goes away.
  for (;;) {
    status = sd_bus_process(bus, nullptr);
    if (status < 0) break;
    if (status > 0) continue;
    status = sd_bus_wait(bus, UINT64_MAX);
    if (status < 0 && status != -EINTR) break;
  }
  sd_bus_flush_close_unref(bus);
  return 0;
}
