#pragma once
// A byte-string node. Its text forms carry Base64 without padding; in JSON
// it is the object {"SbyteS":"<Base64>"}.

#include "settings/CSettingsObject.h"

// The key that marks a byte string in the JSON form.
inline constexpr char SETTINGS_JSON_BYTES_KEY[] = "SbyteS";

class CSettingsBytes : public CSettingsObject {
 public:
  CSettingsBytes(CPasskeyToken token_I, Bytes value_I);
  static std::shared_ptr<CSettingsBytes> New(const Bytes& value_I);
  static const char* GetClassTypeName() { return "bytes"; }
  static const char* GetClassName() { return "CSettingsBytes"; }

  const Bytes& GetValue() const { return mValue; }
  void SetValue(const Bytes& value_I) { mValue = value_I; }

  static std::shared_ptr<CSettingsBytes> CastToBytes(std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override;
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;

  static std::shared_ptr<CSettingsBytes> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsBytes> ReadFromPListNode(xmlNodePtr node_I);
  // Reads the byte-string object; anything else leaves position_IO and
  // gives empty.
  static std::shared_ptr<CSettingsBytes> ReadFromJSONNode(const std::string& buffer_I,
                                                          size_t& position_IO);
  static std::shared_ptr<CSettingsBytes> ReadFromASN1Node(const Bytes& bytes_I,
                                                          size_t& position_IO);

 private:
  Bytes mValue;
};
