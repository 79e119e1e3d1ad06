#pragma once
// A value stored as explicitly null. Every lookup treats it as absent.

#include "settings/CSettingsObject.h"

class CSettingsNULL : public CSettingsObject {
 public:
  explicit CSettingsNULL(CPasskeyToken token_I);
  static std::shared_ptr<CSettingsNULL> New();
  static const char* GetClassTypeName() { return "null"; }
  static const char* GetClassName() { return "CSettingsNULL"; }

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override { return {}; }
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  // Any null equals any other null.
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;

  static std::shared_ptr<CSettingsNULL> ReadFromXMLNode(xmlNodePtr node_I);
  // Not reached from CSettingsObject::ReadFromASN1Node: a tree with a null
  // writes to ASN.1 but does not read back.
  static std::shared_ptr<CSettingsNULL> ReadFromASN1Node(const Bytes& bytes_I, size_t& position_IO);
};
