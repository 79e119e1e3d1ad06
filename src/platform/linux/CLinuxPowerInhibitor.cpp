#include "platform/linux/CLinuxPowerInhibitor.h"

#include <fcntl.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <cstring>

#include "common/TavLog.h"
#include "common/TavSysErrStr.h"

namespace {

// Holds logind's descriptors; closing them ends the inhibitions.
class CInhibitLease : public CPowerAssertion {
 public:
  CInhibitLease(int idleFd_I, int shutdownFd_I) : mIdleFd(idleFd_I), mShutdownFd(shutdownFd_I) {}
  ~CInhibitLease() override {
    if (mShutdownFd >= 0) close(mShutdownFd);
    if (mIdleFd >= 0) close(mIdleFd);
  }

 private:
  int mIdleFd;
  int mShutdownFd;
};

// Nothing can idle the machine to sleep: granted, with nothing to hold.
class CNothingToHold : public CPowerAssertion {};

bool MeansNoLogind(const sd_bus_error& error_I) {
  return sd_bus_error_has_name(&error_I, SD_BUS_ERROR_SERVICE_UNKNOWN) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_NAME_HAS_NO_OWNER) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_UNKNOWN_OBJECT) ||
         sd_bus_error_has_name(&error_I, SD_BUS_ERROR_UNKNOWN_METHOD);
}

// Logind's Inhibit; the descriptor of the lock, our own copy, or -1 with
// `error_O` or `status_O` saying why.
int Inhibit(sd_bus* bus_I, const char* what_I, const std::string& why_I, const char* mode_I,
            sd_bus_error& error_O, int& status_O) {
  sd_bus_message* reply = nullptr;
  status_O = sd_bus_call_method(bus_I, "org.freedesktop.login1", "/org/freedesktop/login1",
                                "org.freedesktop.login1.Manager", "Inhibit", &error_O, &reply,
                                "ssss", what_I, CLinuxPowerInhibitor::kWho, why_I.c_str(), mode_I);
  int kept = -1;
  int fd = -1;
  if (status_O >= 0 && sd_bus_message_read(reply, "h", &fd) >= 0 && fd >= 0) {
    // The descriptor belongs to the message; keep a copy of our own.
    kept = fcntl(fd, F_DUPFD_CLOEXEC, 3);
  }
  sd_bus_message_unref(reply);
  return kept;
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
  const int idleFd = Inhibit(bus, "idle:sleep", name_I, "block", error, status);
  std::unique_ptr<CPowerAssertion> result;
  if (status < 0) {
    if (MeansNoLogind(error)) {
      TavLog::Info("No logind on the system bus: nothing can idle the machine to sleep\n");
      result = std::make_unique<CNothingToHold>();
    } else {
      TavLog::Error("Power assertion refused: %s\n",
                    error.message != nullptr ? error.message : TavSysErrStr(-status).c_str());
    }
  } else if (idleFd < 0) {
    TavLog::Error("Power assertion: logind's answer carried no descriptor\n");
  } else {
    // A shutdown waits for the board to leave its loader, as long as
    // logind lets a delay last; without this lock the update still runs.
    sd_bus_error shutdownError = SD_BUS_ERROR_NULL;
    const int shutdownFd = Inhibit(bus, "shutdown", name_I, "delay", shutdownError, status);
    if (shutdownFd < 0) {
      TavLog::Warning("A shutdown will not wait for the update: %s\n",
                      shutdownError.message != nullptr ? shutdownError.message : "no descriptor");
    }
    sd_bus_error_free(&shutdownError);
    result = std::make_unique<CInhibitLease>(idleFd, shutdownFd);
  }
  sd_bus_error_free(&error);
  sd_bus_flush_close_unref(bus);
  return result;
}
