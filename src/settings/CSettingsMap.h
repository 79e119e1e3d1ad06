#pragma once
// A map from key to node. Keys are kept in ascending byte order, and every
// walk over a map follows it. Keys double as XML element names, so each
// should be a valid XML name.

#include <cstdint>
#include <map>
#include <type_traits>
#include <vector>

#include "common/TavLog.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsBool.h"
#include "settings/CSettingsBytes.h"
#include "settings/CSettingsDouble.h"
#include "settings/CSettingsInteger.h"
#include "settings/CSettingsKEString.h"
#include "settings/CSettingsObject.h"
#include "settings/CSettingsString.h"

class CSettingsMap : public CSettingsObject {
 public:
  explicit CSettingsMap(CPasskeyToken token_I);
  static std::shared_ptr<CSettingsMap> New();
  static const char* GetClassTypeName() { return "map"; }
  static const char* GetClassName() { return "CSettingsMap"; }

  // Count and keys include keys that hold a CSettingsNULL.
  size_t ObjectCount() const { return mObjectMap.size(); }
  std::vector<std::string> GetKeys() const;
  // False for a key that holds a CSettingsNULL.
  bool IsKeyPresent(const std::string& key_I) const;
  void RemoveObjectForKey(const std::string& key_I);

  // Empty for an absent key and for a stored CSettingsNULL.
  std::shared_ptr<CSettingsObject> ObjectForKey(const std::string& key_I) const;
  // A node of another class logs a warning and gives empty; never converts.
  template <class T>
  std::shared_ptr<T> ObjectForKey(const std::string& key_I) const;
  template <class T>
  std::shared_ptr<T> ObjectForKeyWithDefault(const std::string& key_I,
                                             std::shared_ptr<T> default_I) const;

  bool BoolForKeyWithDefault(const std::string& key_I, bool default_I) const;
  int64_t IntegerForKeyWithDefault(const std::string& key_I, int64_t default_I) const;
  // The 64-bit value narrowed to T.
  template <typename T>
  requires(std::is_same_v<T, int> || std::is_same_v<T, unsigned short> ||
           std::is_same_v<T, unsigned long>) T
      IntegerForKeyWithDefault(const std::string& key_I, T default_I)
  const { return static_cast<T>(IntegerForKeyWithDefault(key_I, static_cast<int64_t>(default_I))); }
  double DoubleForKeyWithDefault(const std::string& key_I, double default_I) const;
  std::string StringForKeyWithDefault(const std::string& key_I, const std::string& default_I) const;
  std::string KEStringForKeyWithDefault(const std::string& key_I,
                                        const std::string& default_I) const;
  std::string TypeNameForKeyOrEmpty(const std::string& key_I) const;

  // An empty object_I stores a new CSettingsNULL. A key that is no valid
  // XML name asserts and is stored all the same.
  void SetKeyAndObject(const std::string& key_I, std::shared_ptr<CSettingsObject> object_I);
  void SetKeyAndBool(const std::string& key_I, bool value_I);
  void SetKeyAndInteger(const std::string& key_I, int64_t value_I);
  void SetKeyAndDouble(const std::string& key_I, double value_I);
  void SetKeyAndString(const std::string& key_I, const std::string& value_I);
  void SetKeyAndKEString(const std::string& key_I, const std::string& value_I);

  // Stores every key of other_I here; nodes are shared, not copied.
  void MergeMapObject(std::shared_ptr<CSettingsMap> other_I);

  static std::shared_ptr<CSettingsMap> CastToMap(std::shared_ptr<CSettingsObject> object_I,
                                                 bool warn_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override { return {}; }
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;
  xmlNodePtr CreateXMLNode(const std::string& name_I) const override;
  xmlNodePtr CreatePListNode() const override;

  static std::shared_ptr<CSettingsMap> ReadFromXMLBuffer(const std::string& buffer_I);
  static std::shared_ptr<CSettingsMap> ReadFromXMLFile(const std::string& path_I,
                                                       std::string& errorText_O);
  static std::shared_ptr<CSettingsMap> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsMap> ReadFromPListNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsMap> ReadFromJSONNode(const std::string& buffer_I,
                                                        size_t& position_IO);
  static std::shared_ptr<CSettingsMap> ReadFromASN1Node(const Bytes& bytes_I, size_t& position_IO);

 private:
  std::map<std::string, std::shared_ptr<CSettingsObject>> mObjectMap;
};

template <class T>
std::shared_ptr<T> CSettingsMap::ObjectForKey(const std::string& key_I) const {
  std::shared_ptr<CSettingsObject> object = ObjectForKey(key_I);
  if (!object) return nullptr;
  std::shared_ptr<T> typed = std::dynamic_pointer_cast<T>(object);
  if (!typed) {
    TavLog::Warning("CSettingsMap::ObjectForKey got a %s and failed to cast to %s\n",
                    object->GetTypeName().c_str(), T::GetClassName());
  }
  return typed;
}

template <class T>
std::shared_ptr<T> CSettingsMap::ObjectForKeyWithDefault(const std::string& key_I,
                                                         std::shared_ptr<T> default_I) const {
  std::shared_ptr<T> object = ObjectForKey<T>(key_I);
  return object ? object : default_I;
}
