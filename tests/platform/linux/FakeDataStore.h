#pragma once
// A stand-in for the user's data store on the private bus.

#include <atomic>
#include <map>
#include <mutex>
#include <string>

#include "host/OPersistentDataStoreClient.h"
#include "platform/linux/BusDictionary.h"
#include "platform/linux/FakeBusService.h"

// A data store that keeps texts, answers either with a dictionary or with
// an error that carries the same dictionary, and never answers for the key
// "silent" (nor for any key once muted).
class CFakeDataStore {
 public:
  CFakeDataStore()
      : mService(OPersistentDataStoreClient::kServiceName, "/com/tavik/DataStoreMgr",
                 "com.tavik.OPersistentDataStoreServiceProtocol", kVtable, this) {}
  bool IsReady() const { return mService.IsReady(); }
  void SetAnswerAsErrors(bool errors_I) { mAnswerAsErrors = errors_I; }
  void SetMuted(bool muted_I) { mMuted = muted_I; }
  // Empty for a key it does not hold.
  std::string Stored(const std::string& key_I) {
    std::lock_guard<std::mutex> guard(mLock);
    const auto found = mValues.find(key_I);
    return found == mValues.end() ? std::string() : found->second;
  }
  bool Holds(const std::string& key_I) {
    std::lock_guard<std::mutex> guard(mLock);
    return mValues.count(key_I) != 0;
  }
  void Put(const std::string& key_I, const std::string& value_I) {
    std::lock_guard<std::mutex> guard(mLock);
    mValues[key_I] = value_I;
  }

 private:
  static int OnCall(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
    auto* self = static_cast<CFakeDataStore*>(self_I);
    const auto request = BusDictionary::Read(message_I);
    const std::string key =
        request && request->Get<std::string>("Key") ? *request->Get<std::string>("Key") : "";
    if (key == "silent" || self->mMuted) return 1;
    const std::string member = sd_bus_message_get_member(message_I);
    CXPCDictionary reply;
    {
      std::lock_guard<std::mutex> guard(self->mLock);
      const bool present = self->mValues.count(key) != 0;
      reply.Set("Error Code", int64_t{present || member == "setDataForKey" ? 0 : 1});
      if (member == "getDataForKey") reply.Set("Data", present ? self->mValues[key] : "");
      if (member == "setDataForKey") self->mValues[key] = *request->Get<std::string>("Data");
      if (member == "deleteKey") self->mValues.erase(key);
    }
    sd_bus_message* answer = nullptr;
    if (self->mAnswerAsErrors) {
      const sd_bus_error error =
          SD_BUS_ERROR_MAKE_CONST("com.tavik.DataStoreMgr.Error.Reply", "reply");
      sd_bus_message_new_method_error(message_I, &answer, &error);
    } else {
      sd_bus_message_new_method_return(message_I, &answer);
    }
    BusDictionary::Append(answer, reply);
    sd_bus_send(nullptr, answer, nullptr);
    sd_bus_message_unref(answer);
    return 1;
  }

  static constexpr sd_bus_vtable kVtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("hasKey", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("deleteKey", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("getDataForKey", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("setDataForKey", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_VTABLE_END};

  std::atomic<bool> mMuted{false};
  std::mutex mLock;
  std::map<std::string, std::string> mValues;
  std::atomic<bool> mAnswerAsErrors{false};
  CFakeBusService mService;
};
