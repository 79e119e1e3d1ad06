#include "helper/CUpdateHelperService.h"

#include <systemd/sd-login.h>

#include <cstdlib>
#include <cstring>

#include "helper/CDriverProcesses.h"
#include "helper/CPolkitAuthority.h"
#include "helper/CSystemdUnits.h"
#include "helper/HelperLog.h"
#include "host/OUpdaterClient.h"
#include "platform/linux/BusDictionary.h"
#include "platform/linux/CLinuxServiceConnection.h"

namespace {

// Far more than the updater sends (three identifiers, one user), and short
// enough that no request can make the helper's log or work grow.
constexpr size_t kMaxListEntries = 16;
constexpr size_t kMaxTextLength = 255;

const char* const kErrorNames[] = {"",
                                   "com.tavik.UpdateHelper.Error.NotSupported",
                                   "com.tavik.UpdateHelper.Error.InvalidRequest",
                                   "com.tavik.UpdateHelper.Error.NotConfigured",
                                   "com.tavik.UpdateHelper.Error.NotAuthorized",
                                   "com.tavik.UpdateHelper.Error.Failed"};

std::string Caller(sd_bus_message* message_I) {
  const char* sender = sd_bus_message_get_sender(message_I);
  return sender != nullptr ? sender : "";
}

std::string Member(sd_bus_message* message_I) {
  const char* member = sd_bus_message_get_member(message_I);
  return member != nullptr ? member : "";
}

bool IsListOfShortTexts(const CXPCDictionary::Strings& texts_I) {
  if (texts_I.empty() || texts_I.size() > kMaxListEntries) return false;
  for (const std::string& text : texts_I) {
    if (text.empty() || text.size() > kMaxTextLength) return false;
  }
  return true;
}

}  // namespace

CUpdateHelperService::CUpdateHelperService(sd_bus* bus_I, const CHelperConfig& config_I)
    : mBus(bus_I),
      mConfig(config_I),
      mPath(CLinuxServiceConnection::ObjectPathFor(OUpdaterClient::kServiceName)),
      mInterface(CLinuxServiceConnection::InterfaceFor(OUpdaterClient::kServiceName,
                                                       OUpdaterClient::kServerProtocol)) {}

CUpdateHelperService::~CUpdateHelperService() { sd_bus_slot_unref(mSlot); }

bool CUpdateHelperService::Start() {
  static const sd_bus_vtable vtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("stopLaunchDProcess", "a{sv}", "a{sv}", &OnStopLaunchD,
                    SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("startLaunchDProcess", "a{sv}", "a{sv}", &OnStartLaunchD,
                    SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("stopProcess", "a{sv}", "a{sv}", &OnStopProcess, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("startProcess", "a{sv}", "a{sv}", &OnStartProcess, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("findAllProcessesInList", "a{sv}", "a{sv}", &OnFindProcesses,
                    SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("findLoggedInUsers", "", "a{sv}", &OnFindUsers, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("loadDriverKext", "", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("performInstall", "a{sv}", "a{sv}", &OnNotSupported,
                    SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("performRemove", "a{sv}", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("removePrefs", "a{sv}", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("verifyInstallation", "", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("wakeSystem", "", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("stopService", "a{sv}", "a{sv}", &OnNotSupported, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_VTABLE_END};
  int status =
      sd_bus_add_object_vtable(mBus, &mSlot, mPath.c_str(), mInterface.c_str(), vtable, this);
  if (status >= 0) status = sd_bus_request_name(mBus, OUpdaterClient::kServiceName, 0);
  if (status < 0) {
    HelperLog::Print(LOG_ERR, "Cannot serve %s: %s", OUpdaterClient::kServiceName,
                     std::strerror(-status));
  }
  return status >= 0;
}

int CUpdateHelperService::OnStopLaunchD(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
  return static_cast<CUpdateHelperService*>(self_I)->HandleDriverRequest(message_I, ESTOP_UNITS);
}

int CUpdateHelperService::OnStartLaunchD(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
  return static_cast<CUpdateHelperService*>(self_I)->HandleDriverRequest(message_I, ESTART_UNITS);
}

int CUpdateHelperService::OnStopProcess(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
  return static_cast<CUpdateHelperService*>(self_I)->HandleDriverRequest(message_I,
                                                                         ESTOP_EXECUTABLES);
}

int CUpdateHelperService::OnStartProcess(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
  return static_cast<CUpdateHelperService*>(self_I)->HandleDriverRequest(message_I,
                                                                         ESTART_EXECUTABLES);
}

int CUpdateHelperService::OnNotSupported(sd_bus_message* message_I, void*, sd_bus_error*) {
  HelperLog::Print(LOG_NOTICE, "%s from %s: not supported", Member(message_I).c_str(),
                   Caller(message_I).c_str());
  return ReplyError(message_I, EHELPER_NOT_SUPPORTED, "not supported");
}

bool CUpdateHelperService::ReadIdentifiers(const CXPCDictionary& request_I, const char* key_I,
                                           std::vector<std::string>& identifiers_O,
                                           EHelperError& code_O, std::string& problem_O) const {
  code_O = EHELPER_INVALID_REQUEST;
  // Every key the updater sends must be what it sends, wherever it goes.
  for (const char* key : {"LaunchAgents", "BundleID", "User"}) {
    if (!request_I.Has(key)) continue;
    const auto* texts = request_I.Get<CXPCDictionary::Strings>(key);
    if (texts == nullptr || !IsListOfShortTexts(*texts)) {
      problem_O = std::string("\"") + key + "\" is no list of short texts";
      return false;
    }
  }
  if (const auto* users = request_I.Get<CXPCDictionary::Strings>("User")) {
    for (const std::string& user : *users) {
      if (user.find_first_not_of("0123456789") != std::string::npos) {
        problem_O = "\"User\" holds something that is no user id";
        return false;
      }
    }
  }
  const auto* identifiers = request_I.Get<CXPCDictionary::Strings>(key_I);
  if (identifiers == nullptr) {
    problem_O = std::string("\"") + key_I + "\" is missing";
    return false;
  }
  for (const std::string& identifier : *identifiers) {
    if (!mConfig.Knows(identifier)) {
      code_O = EHELPER_NOT_CONFIGURED;
      problem_O = identifier + " is not configured as a part of the driver";
      return false;
    }
  }
  identifiers_O = *identifiers;
  return true;
}

int CUpdateHelperService::HandleDriverRequest(sd_bus_message* message_I, EDriverAction action_I) {
  const std::string member = Member(message_I);
  const std::string caller = Caller(message_I);
  const char* key =
      action_I == ESTOP_UNITS || action_I == ESTART_UNITS ? "LaunchAgents" : "BundleID";

  const std::shared_ptr<CXPCDictionary> request = BusDictionary::Read(message_I);
  std::vector<std::string> identifiers;
  EHelperError code = EHELPER_INVALID_REQUEST;
  std::string problem = "the request is no dictionary";
  if (!request || !ReadIdentifiers(*request, key, identifiers, code, problem)) {
    HelperLog::Print(LOG_WARNING, "%s from %s refused: %s", member.c_str(), caller.c_str(),
                     problem.c_str());
    return ReplyError(message_I, code, problem);
  }
  std::string why;
  if (!CPolkitAuthority::IsAuthorized(mBus, caller, why)) {
    HelperLog::Print(LOG_WARNING, "%s from %s refused: %s", member.c_str(), caller.c_str(),
                     why.c_str());
    return ReplyError(message_I, EHELPER_NOT_AUTHORIZED, "Not authorized: " + why);
  }
  uid_t user = 0;
  if (action_I == ESTART_EXECUTABLES) {
    sd_bus_creds* creds = nullptr;
    const bool known = sd_bus_query_sender_creds(message_I, SD_BUS_CREDS_EUID, &creds) >= 0 &&
                       sd_bus_creds_get_euid(creds, &user) >= 0;
    sd_bus_creds_unref(creds);
    if (!known) return ReplyError(message_I, EHELPER_FAILED, "the caller's user is unknown");
  }
  std::string failures;
  for (const std::string& identifier : identifiers) {
    if (!Act(action_I, identifier, user, problem))
      failures += (failures.empty() ? "" : "; ") + problem;
  }
  if (!failures.empty()) return ReplyError(message_I, EHELPER_FAILED, failures);
  return ReplySuccess(message_I, CXPCDictionary{{OXPCClient::kErrorCodeKey, int64_t{0}}});
}

bool CUpdateHelperService::Act(EDriverAction action_I, const std::string& identifier_I,
                               uid_t caller_I, std::string& problem_O) {
  bool done = true;
  if (action_I == ESTOP_UNITS || action_I == ESTART_UNITS) {
    const bool stop = action_I == ESTOP_UNITS;
    for (const std::string& unit : mConfig.GetUnits(identifier_I)) {
      std::string why;
      const bool queued =
          stop ? CSystemdUnits::Stop(mBus, unit, why) : CSystemdUnits::Start(mBus, unit, why);
      HelperLog::Print(queued ? LOG_INFO : LOG_ERR, "%s %s for %s%s%s",
                       stop ? "Stopping" : "Starting", unit.c_str(), identifier_I.c_str(),
                       queued ? "" : " failed: ", why.c_str());
      if (!queued) problem_O = unit + ": " + why;
      done = done && queued;
    }
    return done;
  }
  for (const std::string& executable : mConfig.GetExecutables(identifier_I)) {
    if (action_I == ESTOP_EXECUTABLES) {
      const int stopped = CDriverProcesses::Stop(executable);
      HelperLog::Print(LOG_INFO, "Asked %d process(es) of %s for %s to quit", stopped,
                       executable.c_str(), identifier_I.c_str());
    } else if (CDriverProcesses::Find(executable).empty()) {
      const bool started = CDriverProcesses::Start(executable, caller_I);
      HelperLog::Print(started ? LOG_INFO : LOG_ERR, "Starting %s for %s as user %u%s",
                       executable.c_str(), identifier_I.c_str(), static_cast<unsigned>(caller_I),
                       started ? "" : " failed");
      if (!started) problem_O = executable + " could not be started";
      done = done && started;
    }
  }
  return done;
}

int CUpdateHelperService::OnFindProcesses(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
  auto* self = static_cast<CUpdateHelperService*>(self_I);
  const std::shared_ptr<CXPCDictionary> request = BusDictionary::Read(message_I);
  std::vector<std::string> identifiers;
  EHelperError code = EHELPER_INVALID_REQUEST;
  std::string problem = "the request is no dictionary";
  if (!request || !self->ReadIdentifiers(*request, "BundleID", identifiers, code, problem)) {
    HelperLog::Print(LOG_WARNING, "%s from %s refused: %s", Member(message_I).c_str(),
                     Caller(message_I).c_str(), problem.c_str());
    return ReplyError(message_I, code, problem);
  }
  CXPCDictionary::Strings running;
  for (const std::string& identifier : identifiers) {
    for (const std::string& executable : self->mConfig.GetExecutables(identifier)) {
      if (!CDriverProcesses::Find(executable).empty()) {
        running.push_back(identifier);
        break;
      }
    }
  }
  return ReplySuccess(
      message_I, CXPCDictionary{{OXPCClient::kErrorCodeKey, int64_t{0}}, {"Running", running}});
}

int CUpdateHelperService::OnFindUsers(sd_bus_message* message_I, void*, sd_bus_error*) {
  uid_t* uids = nullptr;
  const int count = sd_get_uids(&uids);
  CXPCDictionary::Strings users;
  for (int i = 0; i < count; ++i) users.push_back(std::to_string(uids[i]));
  std::free(uids);
  return ReplySuccess(message_I,
                      CXPCDictionary{{OXPCClient::kErrorCodeKey, int64_t{0}}, {"Users", users}});
}

int CUpdateHelperService::ReplySuccess(sd_bus_message* message_I, const CXPCDictionary& reply_I) {
  sd_bus_message* reply = nullptr;
  int status = sd_bus_message_new_method_return(message_I, &reply);
  if (status >= 0) status = BusDictionary::Append(reply, reply_I);
  if (status >= 0) status = sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
  return status;
}

int CUpdateHelperService::ReplyError(sd_bus_message* message_I, EHelperError code_I,
                                     const std::string& text_I) {
  const sd_bus_error error = SD_BUS_ERROR_MAKE_CONST(kErrorNames[code_I], text_I.c_str());
  sd_bus_message* reply = nullptr;
  int status = sd_bus_message_new_method_error(message_I, &reply, &error);
  if (status >= 0) {
    status = BusDictionary::Append(
        reply, CXPCDictionary{{OXPCClient::kErrorCodeKey, int64_t{code_I}}, {"Error", text_I}});
  }
  if (status >= 0) status = sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
  return status;
}
