#pragma once
// A text node that holds the enciphered form of a secret value. The tree
// carries the text unchanged; enciphering is the business of the callers.
// Its XML and property-list forms keep the text in a CDATA section, with
// every "]" written as RSQBRACKETENTITY; its JSON form is a plain string that
// reads back as a CSettingsString.

#include "settings/CSettingsObject.h"

class CSettingsKEString : public CSettingsObject {
 public:
  CSettingsKEString(CPasskeyToken token_I, std::string value_I);
  static std::shared_ptr<CSettingsKEString> New(const std::string& value_I);
  static const char* GetClassTypeName() { return "kestring"; }
  static const char* GetClassName() { return "CSettingsKEString"; }

  const std::string& GetValue() const { return mValue; }
  void SetValue(const std::string& value_I) { mValue = value_I; }

  static std::shared_ptr<CSettingsKEString> CastToKEString(
      std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override { return mValue; }
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;
  void AddContentToNode(xmlNodePtr node_I, const std::string& content_I) const override;

  static std::shared_ptr<CSettingsKEString> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsKEString> ReadFromPListNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsKEString> ReadFromJSONNode(const std::string& buffer_I,
                                                             size_t& position_IO);
  static std::shared_ptr<CSettingsKEString> ReadFromASN1Node(const Bytes& bytes_I,
                                                             size_t& position_IO);

 private:
  // The text of a CDATA section as the writer made it: trimmed, brackets back.
  static std::string TextFromNode(xmlNodePtr node_I);

  std::string mValue;
};
