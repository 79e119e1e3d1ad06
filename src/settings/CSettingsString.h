#pragma once
// A text node: a byte string, UTF-8 by convention.

#include "settings/CSettingsObject.h"

class CSettingsString : public CSettingsObject {
 public:
  CSettingsString(CPasskeyToken token_I, std::string value_I);
  static std::shared_ptr<CSettingsString> New(const std::string& value_I);
  static const char* GetClassTypeName() { return "string"; }
  static const char* GetClassName() { return "CSettingsString"; }

  const std::string& GetValue() const { return mValue; }
  void SetValue(const std::string& value_I) { mValue = value_I; }

  static std::shared_ptr<CSettingsString> CastToString(std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override { return mValue; }
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  // The text between double quotes, not escaped.
  std::string CreateJSONNode(int level_I) const override;

  // Leading and trailing white space does not survive a reading.
  static std::shared_ptr<CSettingsString> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsString> ReadFromPListNode(xmlNodePtr node_I);
  // Needs a double quote at position_IO and leaves position_IO behind the
  // closing one. Empty for an unknown escape or a string that does not end.
  static std::shared_ptr<CSettingsString> ReadFromJSONNode(const std::string& buffer_I,
                                                           size_t& position_IO);
  static std::shared_ptr<CSettingsString> ReadFromASN1Node(const Bytes& bytes_I,
                                                           size_t& position_IO);

  // The text of a JSON string, for the readers that share its syntax.
  static bool ReadJSONText(const std::string& buffer_I, size_t& position_IO, std::string& text_O);

 private:
  std::string mValue;
};
