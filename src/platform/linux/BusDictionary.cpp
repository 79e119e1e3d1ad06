#include "platform/linux/BusDictionary.h"

#include <cstdlib>
#include <cstring>
#include <optional>

namespace {

using Value = CXPCDictionary::Value;

int AppendMap(sd_bus_message* message_IO, const CXPCDictionary& dictionary_I);

int AppendStrings(sd_bus_message* message_IO, const CXPCDictionary::Strings& texts_I) {
  std::vector<char*> list;
  for (const std::string& text : texts_I) list.push_back(const_cast<char*>(text.c_str()));
  list.push_back(nullptr);
  return sd_bus_message_append_strv(message_IO, list.data());
}

int AppendVariant(sd_bus_message* message_IO, const Value& value_I) {
  if (const auto* flag = std::get_if<bool>(&value_I)) {
    return sd_bus_message_append(message_IO, "v", "b", static_cast<int>(*flag));
  }
  if (const auto* integer = std::get_if<int64_t>(&value_I)) {
    return sd_bus_message_append(message_IO, "v", "x", *integer);
  }
  if (const auto* number = std::get_if<double>(&value_I)) {
    return sd_bus_message_append(message_IO, "v", "d", *number);
  }
  if (const auto* text = std::get_if<std::string>(&value_I)) {
    return sd_bus_message_append(message_IO, "v", "s", text->c_str());
  }
  const bool isList = std::holds_alternative<CXPCDictionary::Strings>(value_I);
  int status = sd_bus_message_open_container(message_IO, 'v', isList ? "as" : "a{sv}");
  if (status < 0) return status;
  if (isList) {
    status = AppendStrings(message_IO, std::get<CXPCDictionary::Strings>(value_I));
  } else {
    const auto& nested = std::get<std::shared_ptr<CXPCDictionary>>(value_I);
    status = AppendMap(message_IO, nested ? *nested : CXPCDictionary());
  }
  return status < 0 ? status : sd_bus_message_close_container(message_IO);
}

int AppendMap(sd_bus_message* message_IO, const CXPCDictionary& dictionary_I) {
  int status = sd_bus_message_open_container(message_IO, 'a', "{sv}");
  for (const auto& [key, value] : dictionary_I.GetEntries()) {
    if (status >= 0) status = sd_bus_message_open_container(message_IO, 'e', "sv");
    if (status >= 0) status = sd_bus_message_append(message_IO, "s", key.c_str());
    if (status >= 0) status = AppendVariant(message_IO, value);
    if (status >= 0) status = sd_bus_message_close_container(message_IO);
  }
  return status < 0 ? status : sd_bus_message_close_container(message_IO);
}

std::shared_ptr<CXPCDictionary> ReadMap(sd_bus_message* message_IO, int depth_I);

// Reads one value of type `contents_I`; leaves `value_O` empty and skips it
// when a dictionary holds no such kind. False when the message is broken.
bool ReadValue(sd_bus_message* message_IO, const char* contents_I, int depth_I,
               std::optional<Value>& value_O) {
  const std::string type = contents_I;
  if (type.size() == 1 && std::strchr("ynqiuxt", type[0]) != nullptr) {
    union {
      uint8_t y;
      int16_t n;
      uint16_t q;
      int32_t i;
      uint32_t u;
      int64_t x;
      uint64_t t;
    } number{};
    if (sd_bus_message_read_basic(message_IO, type[0], &number) < 0) return false;
    switch (type[0]) {
      case 'y': value_O = static_cast<int64_t>(number.y); break;
      case 'n': value_O = static_cast<int64_t>(number.n); break;
      case 'q': value_O = static_cast<int64_t>(number.q); break;
      case 'i': value_O = static_cast<int64_t>(number.i); break;
      case 'u': value_O = static_cast<int64_t>(number.u); break;
      case 'x': value_O = number.x; break;
      default: value_O = static_cast<int64_t>(number.t); break;
    }
    return true;
  }
  if (type == "b") {
    int flag = 0;
    if (sd_bus_message_read_basic(message_IO, 'b', &flag) < 0) return false;
    value_O = flag != 0;
    return true;
  }
  if (type == "d") {
    double number = 0;
    if (sd_bus_message_read_basic(message_IO, 'd', &number) < 0) return false;
    value_O = number;
    return true;
  }
  if (type == "s" || type == "o" || type == "g") {
    const char* text = nullptr;
    if (sd_bus_message_read_basic(message_IO, type[0], &text) < 0) return false;
    value_O = std::string(text);
    return true;
  }
  if (type == "as") {
    char** list = nullptr;
    if (sd_bus_message_read_strv(message_IO, &list) < 0) return false;
    CXPCDictionary::Strings texts;
    for (char** item = list; item != nullptr && *item != nullptr; ++item) {
      texts.emplace_back(*item);
      std::free(*item);
    }
    std::free(list);
    value_O = std::move(texts);
    return true;
  }
  if (type == "a{sv}" && depth_I < BusDictionary::kMaxDepth) {
    std::shared_ptr<CXPCDictionary> nested = ReadMap(message_IO, depth_I + 1);
    if (!nested) return false;
    value_O = std::move(nested);
    return true;
  }
  return sd_bus_message_skip(message_IO, contents_I) >= 0;
}

std::shared_ptr<CXPCDictionary> ReadMap(sd_bus_message* message_IO, int depth_I) {
  if (sd_bus_message_enter_container(message_IO, 'a', "{sv}") <= 0) return nullptr;
  auto dictionary = std::make_shared<CXPCDictionary>();
  int entered = 0;
  while ((entered = sd_bus_message_enter_container(message_IO, 'e', "sv")) > 0) {
    const char* key = nullptr;
    char kind = 0;
    const char* contents = nullptr;
    if (sd_bus_message_read_basic(message_IO, 's', &key) < 0 ||
        sd_bus_message_peek_type(message_IO, &kind, &contents) < 0 || contents == nullptr ||
        sd_bus_message_enter_container(message_IO, 'v', contents) < 0) {
      return nullptr;
    }
    std::optional<Value> value;
    if (!ReadValue(message_IO, contents, depth_I, value)) return nullptr;
    if (sd_bus_message_exit_container(message_IO) < 0 ||
        sd_bus_message_exit_container(message_IO) < 0) {
      return nullptr;
    }
    if (value) dictionary->Set(key, std::move(*value));
  }
  if (entered < 0 || sd_bus_message_exit_container(message_IO) < 0) return nullptr;
  return dictionary;
}

}  // namespace

int BusDictionary::Append(sd_bus_message* message_IO, const CXPCDictionary& dictionary_I) {
  return AppendMap(message_IO, dictionary_I);
}

std::shared_ptr<CXPCDictionary> BusDictionary::Read(sd_bus_message* message_IO) {
  return ReadMap(message_IO, 0);
}
