#pragma once
// An ordered list of nodes, kept in insertion order.

#include <cstdint>
#include <type_traits>
#include <vector>

#include "settings/CSettingsBool.h"
#include "settings/CSettingsDouble.h"
#include "settings/CSettingsInteger.h"
#include "settings/CSettingsObject.h"
#include "settings/CSettingsString.h"

class CSettingsArray : public CSettingsObject {
 public:
  explicit CSettingsArray(CPasskeyToken token_I);
  static std::shared_ptr<CSettingsArray> New();
  static const char* GetClassTypeName() { return "array"; }
  static const char* GetClassName() { return "CSettingsArray"; }

  size_t ObjectCount() const { return mObjectVector.size(); }
  std::vector<size_t> GetIndexes() const;

  // An empty object_I appends a CSettingsNULL.
  void AddObject(std::shared_ptr<CSettingsObject> object_I);
  void AddBool(bool value_I);
  void AddInteger(int64_t value_I);
  void AddDouble(double value_I);
  void AddString(const std::string& value_I);

  // Empty beyond the end and for a stored CSettingsNULL.
  std::shared_ptr<CSettingsObject> ObjectForIndex(size_t index_I) const;
  // For T in CSettingsBool, CSettingsDouble, CSettingsInteger, CSettingsString.
  template <class T>
  std::shared_ptr<T> ObjectForIndex(size_t index_I) const;
  template <class T>
  std::shared_ptr<T> ObjectForIndexWithDefault(size_t index_I, std::shared_ptr<T> default_I) const;

  bool BoolForIndexWithDefault(size_t index_I, bool default_I) const;
  int64_t IntegerForIndexWithDefault(size_t index_I, int64_t default_I) const;
  double DoubleForIndexWithDefault(size_t index_I, double default_I) const;
  std::string StringForIndexWithDefault(size_t index_I, const std::string& default_I) const;
  std::string TypeNameForIndexOrEmpty(size_t index_I) const;

  // Below the count it replaces, at the count it appends, beyond it nothing
  // happens.
  void SetObjectAtIndex(size_t index_I, std::shared_ptr<CSettingsObject> object_I);
  // Whether a non-empty string item equals text_I; other items are skipped.
  bool IsStringPresent(const std::string& text_I, bool ignoreCase_I) const;

  static std::shared_ptr<CSettingsArray> CastToArray(std::shared_ptr<CSettingsObject> object_I,
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

  static std::shared_ptr<CSettingsArray> ReadFromXMLFile(const std::string& path_I,
                                                         std::string& errorText_O);
  static std::shared_ptr<CSettingsArray> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsArray> ReadFromPListNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsArray> ReadFromJSONNode(const std::string& buffer_I,
                                                          size_t& position_IO);
  static std::shared_ptr<CSettingsArray> ReadFromASN1Node(const Bytes& bytes_I,
                                                          size_t& position_IO);

 private:
  std::vector<std::shared_ptr<CSettingsObject>> mObjectVector;
};

template <class T>
std::shared_ptr<T> CSettingsArray::ObjectForIndex(size_t index_I) const {
  std::shared_ptr<CSettingsObject> object = ObjectForIndex(index_I);
  if constexpr (std::is_same_v<T, CSettingsBool>) {
    return CSettingsBool::CastToBool(object);
  } else if constexpr (std::is_same_v<T, CSettingsDouble>) {
    return CSettingsDouble::CastToDouble(object);
  } else if constexpr (std::is_same_v<T, CSettingsInteger>) {
    return CSettingsInteger::CastToInteger(object);
  } else {
    static_assert(std::is_same_v<T, CSettingsString>, "no typed index lookup for this class");
    return CSettingsString::CastToString(object);
  }
}

template <class T>
std::shared_ptr<T> CSettingsArray::ObjectForIndexWithDefault(size_t index_I,
                                                             std::shared_ptr<T> default_I) const {
  std::shared_ptr<T> object = ObjectForIndex<T>(index_I);
  return object ? object : default_I;
}
