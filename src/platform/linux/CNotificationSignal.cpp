#include "platform/linux/CNotificationSignal.h"

#include <cstdlib>
#include <cstring>

namespace CNotificationSignal {

namespace {

std::string Replaced(std::string text_I, char from_I, char to_I) {
  for (char& c : text_I) {
    if (c == from_I) c = to_I;
  }
  return text_I;
}

int AppendValue(sd_bus_message* signal_I, const std::string& key_I,
                const NotificationValue& value_I) {
  if (const auto* number = std::get_if<int32_t>(&value_I)) {
    return sd_bus_message_append(signal_I, "{sv}", key_I.c_str(), "i", *number);
  }
  return sd_bus_message_append(signal_I, "{sv}", key_I.c_str(), "s",
                               std::get<std::string>(value_I).c_str());
}

// One "{sv}" entry; values of other types are passed over.
int ReadEntry(sd_bus_message* signal_I, NotificationInfo& info_IO) {
  const char* key = nullptr;
  int status = sd_bus_message_read(signal_I, "s", &key);
  if (status < 0) return status;
  char type = 0;
  const char* contents = nullptr;
  status = sd_bus_message_peek_type(signal_I, &type, &contents);
  if (status < 0) return status;
  if (contents != nullptr && std::strcmp(contents, "i") == 0) {
    int32_t number = 0;
    status = sd_bus_message_read(signal_I, "v", "i", &number);
    info_IO[key] = number;
  } else if (contents != nullptr && std::strcmp(contents, "s") == 0) {
    const char* text = nullptr;
    status = sd_bus_message_read(signal_I, "v", "s", &text);
    info_IO[key] = std::string(text);
  } else {
    status = sd_bus_message_skip(signal_I, "v");
  }
  return status;
}

}  // namespace

std::string MemberFor(const std::string& name_I) { return Replaced(name_I, '.', '_'); }

std::string NameFor(const std::string& member_I) { return Replaced(member_I, '_', '.'); }

int Make(sd_bus* bus_I, const SNotification& notification_I, sd_bus_message** signal_O) {
  std::string path = kPath;
  if (!notification_I.object.empty()) {
    char* encoded = nullptr;
    const int status = sd_bus_path_encode(kPath, notification_I.object.c_str(), &encoded);
    if (status < 0) return status;
    path = encoded;
    std::free(encoded);
  }
  sd_bus_message* signal = nullptr;
  int status = sd_bus_message_new_signal(bus_I, &signal, path.c_str(), kInterface,
                                         MemberFor(notification_I.name).c_str());
  if (status >= 0) status = sd_bus_message_open_container(signal, 'a', "{sv}");
  for (const auto& [key, value] : notification_I.userInfo) {
    if (status < 0) break;
    status = AppendValue(signal, key, value);
  }
  if (status >= 0) status = sd_bus_message_close_container(signal);
  if (status < 0) {
    sd_bus_message_unref(signal);
    return status;
  }
  *signal_O = signal;
  return 0;
}

bool Read(sd_bus_message* signal_I, SNotification& notification_O) {
  if (sd_bus_message_is_signal(signal_I, kInterface, nullptr) <= 0) return false;
  notification_O = SNotification{NameFor(sd_bus_message_get_member(signal_I)), {}, {}};
  const char* path = sd_bus_message_get_path(signal_I);
  char* object = nullptr;
  if (path != nullptr && sd_bus_path_decode(path, kPath, &object) > 0) {
    notification_O.object = object;
    std::free(object);
  }
  int status = sd_bus_message_enter_container(signal_I, 'a', "{sv}");
  while (status > 0) {
    status = sd_bus_message_enter_container(signal_I, 'e', "sv");
    if (status <= 0) break;
    status = ReadEntry(signal_I, notification_O.userInfo);
    if (status >= 0) status = sd_bus_message_exit_container(signal_I);
  }
  return status >= 0;
}

}  // namespace CNotificationSignal
