#include "platform/linux/CLinuxServiceDirectory.h"

#include <systemd/sd-bus.h>

#include <cstdlib>
#include <cstring>

#include "platform/linux/CLinuxServiceConnection.h"

namespace {

// A bus that does not answer this quickly has no helper for us.
constexpr uint64_t kBusQueryTimeoutUsec = 2 * 1000 * 1000;

bool NameHasOwner(sd_bus* bus_I, const std::string& service_I) {
  sd_bus_message* reply = nullptr;
  int owned = 0;
  if (sd_bus_call_method(bus_I, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                         "org.freedesktop.DBus", "NameHasOwner", nullptr, &reply, "s",
                         service_I.c_str()) >= 0) {
    if (sd_bus_message_read(reply, "b", &owned) < 0) owned = 0;
  }
  sd_bus_message_unref(reply);
  return owned != 0;
}

bool IsActivatable(sd_bus* bus_I, const std::string& service_I) {
  sd_bus_message* reply = nullptr;
  char** names = nullptr;
  if (sd_bus_call_method(bus_I, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                         "org.freedesktop.DBus", "ListActivatableNames", nullptr, &reply,
                         "") >= 0) {
    sd_bus_message_read_strv(reply, &names);
  }
  sd_bus_message_unref(reply);
  bool found = false;
  for (char** name = names; name != nullptr && *name != nullptr; ++name) {
    found = found || service_I == *name;
    std::free(*name);
  }
  std::free(names);
  return found;
}

}  // namespace

bool CLinuxServiceDirectory::HasService(const std::string& service_I) {
  sd_bus* bus = nullptr;
  if (CLinuxServiceConnection::OpenBus(mSystemBus, &bus) < 0) return false;
  sd_bus_set_method_call_timeout(bus, kBusQueryTimeoutUsec);
  const bool found = NameHasOwner(bus, service_I) || IsActivatable(bus, service_I);
  sd_bus_flush_close_unref(bus);
  return found;
}

std::unique_ptr<CServiceConnection> CLinuxServiceDirectory::Connect(
    const std::string& service_I, const std::string& serverProtocol_I,
    const std::string& clientProtocol_I) {
  return CLinuxServiceConnection::Open(mSystemBus, service_I, serverProtocol_I, clientProtocol_I);
}
