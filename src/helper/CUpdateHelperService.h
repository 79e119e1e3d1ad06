#pragma once
// The update helper's service on the system bus: answers the messages of
// the updater's UpdateHelperProtocol for the parts of the family's driver
// that its configuration names, and for nothing else.
//
// stopLaunchDProcess and startLaunchDProcess stop and start the systemd
// units of the identifiers under "LaunchAgents"; stopProcess and
// startProcess the executables of those under "BundleID".
// findAllProcessesInList answers, under "Running", which identifiers under
// "BundleID" have a process; findLoggedInUsersWithReply the logged-in
// users' ids under "Users". Every other message is "not supported".
//
// A request is checked before anything is done: a malformed dictionary, an
// identifier that is not configured, or a caller whom polkit does not
// authorise get an error reply, are logged, and change nothing. Replies
// carry "Error Code", 0 for success; an error carries it, with "Error", in
// the user information that follows its text.

#include <systemd/sd-bus.h>

#include <string>

#include "helper/CHelperConfig.h"
#include "host/CXPCDictionary.h"

class CUpdateHelperService {
 public:
  // Error codes of the replies.
  enum EHelperError {
    EHELPER_OK = 0,
    EHELPER_NOT_SUPPORTED = 1,
    EHELPER_INVALID_REQUEST = 2,
    EHELPER_NOT_CONFIGURED = 3,
    EHELPER_NOT_AUTHORIZED = 4,
    EHELPER_FAILED = 5,
  };

  CUpdateHelperService(sd_bus* bus_I, const CHelperConfig& config_I);
  ~CUpdateHelperService();
  CUpdateHelperService(const CUpdateHelperService&) = delete;
  CUpdateHelperService& operator=(const CUpdateHelperService&) = delete;

  // Serves the object and takes the service's name; false when either fails.
  bool Start();

 private:
  enum EDriverAction { ESTOP_UNITS, ESTART_UNITS, ESTOP_EXECUTABLES, ESTART_EXECUTABLES };

  static int OnStopLaunchD(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnStartLaunchD(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnStopProcess(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnStartProcess(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnFindProcesses(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnFindUsers(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);
  static int OnNotSupported(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);

  int HandleDriverRequest(sd_bus_message* message_I, EDriverAction action_I);
  // The identifiers under `key_I`, checked: a list of short texts, each one
  // configured. False, with the error code and text, otherwise.
  bool ReadIdentifiers(const CXPCDictionary& request_I, const char* key_I,
                       std::vector<std::string>& identifiers_O, EHelperError& code_O,
                       std::string& problem_O) const;
  bool Act(EDriverAction action_I, const std::string& identifier_I, uid_t caller_I,
           std::string& problem_O);

  static int ReplySuccess(sd_bus_message* message_I, const CXPCDictionary& reply_I);
  static int ReplyError(sd_bus_message* message_I, EHelperError code_I, const std::string& text_I);

  sd_bus* mBus;
  const CHelperConfig& mConfig;
  sd_bus_slot* mSlot = nullptr;
  std::string mPath;
  std::string mInterface;
};
