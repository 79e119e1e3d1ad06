#include "platform/linux/CLinuxPowerInhibitor.h"

#include <systemd/sd-bus.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstring>

#include "common/TavLog.h"
#include "common/TavSysErrStr.h"

namespace {

// Holds logind's descriptor; closing it ends the inhibition.
class CInhibitLease : public CPowerAssertion {
 public:
  explicit CInhibitLease(int fd_I) : mFd(fd_I) {}
  ~CInhibitLease() override {
    if (mFd >= 0) close(mFd);
  }

 private:
  int mFd;
};

// Nothing can idle the machine to sleep: granted, with nothing to hold.
class CNothingToHold : public CPowerAssertion {};

bool MeansNoLogind(const sd_bus_error& error_I) {
  return sd_bus_error_has_name(&error_I, SD_BUS_ERROR_SERVICE_UNKNOWN) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_NAME_HAS_NO_OWNER) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_UNKNOWN_OBJECT) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_UNKNOWN_METHOD);
}

}  // namespace

std::unique_ptr<CPowerAssertion> CLinuxPowerInhibitor::Create(const std::string& name_I) {
  sd_bus* bus = nullptr;
  int status = sd_bus_open_system(&bus);
  if (status < 0) {
    TavLog::Info("No system bus (%s): nothing can idle the machine to sleep\n",
                 TavSysErrStr(-status).c_str());
    return std::make_unique<CNothingToHold>();
  }
  // A short time-out: a hung bus must not hold the update back.
  sd_bus_set_method_call_timeout(bus, 5 * 1000 * 1000);

  sd_bus_error error = SD_BUS_ERROR_NULL;
  sd_bus_message* reply = nullptr;
  status = sd_bus_call_method(bus, "org.freedesktop.login1", "/org/freedesktop/login1",
                              "org.freedesktop.login1.Manager", "Inhibit", &error, &reply, "ssss",
                              "idle:sleep", kWho, name_I.c_str(), "block");
  std::unique_ptr<CPowerAssertion> result;
  if (status < 0) {
    if (MeansNoLogind(error)) {
      TavLog::Info("No logind on the system bus: nothing can idle the machine to sleep\n");
      result = std::make_unique<CNothingToHold>();
    } else {
      TavLog::Error("Power assertion refused: %s\n",
                    error.message != nullptr ? error.message : TavSysErrStr(-status).c_str());
    }
  } else {
    int fd = -1;
    if (sd_bus_message_read(reply, "h", &fd) >= 0 && fd >= 0) {
      // The descriptor belongs to the message; keep a copy of our own.
      const int kept = fcntl(fd, F_DUPFD_CLOEXEC, 3);
      if (kept >= 0) result = std::make_unique<CInhibitLease>(kept);
    }
    if (!result) TavLog::Error("Power assertion: logind's answer carried no descriptor\n");
  }
  sd_bus_error_free(&error);
  sd_bus_message_unref(reply);
  sd_bus_flush_close_unref(bus);
  return result;
}
