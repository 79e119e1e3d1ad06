#pragma once
// A boolean node.

#include "settings/CSettingsObject.h"

class CSettingsBool : public CSettingsObject {
 public:
  CSettingsBool(CPasskeyToken token_I, bool value_I);
  static std::shared_ptr<CSettingsBool> New(bool value_I);
  static const char* GetClassTypeName() { return "bool"; }
  static const char* GetClassName() { return "CSettingsBool"; }

  bool GetValue() const { return mValue; }
  void SetValue(bool value_I) { mValue = value_I; }

  // "true" and "false" in any case; otherwise a number, non-zero being true;
  // otherwise default_I.
  static bool StringToBool(const std::string& text_I, bool default_I);
  static std::shared_ptr<CSettingsBool> CastToBool(std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override;
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;

  static std::shared_ptr<CSettingsBool> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsBool> ReadFromASN1Node(const Bytes& bytes_I, size_t& position_IO);

 private:
  bool mValue;
};
