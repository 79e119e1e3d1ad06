#pragma once
// A dictionary as it travels to and from a background service: text keys,
// each holding a flag, an integer, a number, a text, a list of texts or a
// nested dictionary. What the program and its services exchange needs no
// more. Keys are free text ("Error Code" has a blank), unlike the settings
// tree's, which double as XML names.

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <variant>
#include <vector>

class CXPCDictionary {
 public:
  using Strings = std::vector<std::string>;
  using Value =
      std::variant<bool, int64_t, double, std::string, Strings, std::shared_ptr<CXPCDictionary>>;

  CXPCDictionary() = default;
  CXPCDictionary(std::initializer_list<std::pair<const std::string, Value>> entries_I)
      : mEntries(entries_I) {}

  void Set(const std::string& key_I, Value value_I) { mEntries[key_I] = std::move(value_I); }
  void Remove(const std::string& key_I) { mEntries.erase(key_I); }
  bool Has(const std::string& key_I) const { return mEntries.count(key_I) != 0; }
  size_t Count() const { return mEntries.size(); }
  const std::map<std::string, Value>& GetEntries() const { return mEntries; }

  // The value under the key when it is a T; null when absent or of another kind.
  template <class T>
  const T* Get(const std::string& key_I) const {
    const auto found = mEntries.find(key_I);
    return found == mEntries.end() ? nullptr : std::get_if<T>(&found->second);
  }
  // The integer under the key, or `default_I`.
  int64_t GetInteger(const std::string& key_I, int64_t default_I) const;

 private:
  std::map<std::string, Value> mEntries;
};
