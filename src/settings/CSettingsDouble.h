#pragma once
// A 64-bit floating-point node.

#include "settings/CSettingsObject.h"

class CSettingsDouble : public CSettingsObject {
 public:
  CSettingsDouble(CPasskeyToken token_I, double value_I);
  static std::shared_ptr<CSettingsDouble> New(double value_I);
  static const char* GetClassTypeName() { return "double"; }
  static const char* GetClassName() { return "CSettingsDouble"; }

  double GetValue() const { return mValue; }
  void SetValue(double value_I) { mValue = value_I; }

  static std::shared_ptr<CSettingsDouble> CastToDouble(std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  // Fixed notation with six decimals, so the text forms keep six decimals.
  std::string GetStringValue() const override;
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  // Exact equality, no tolerance.
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;

  static std::shared_ptr<CSettingsDouble> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsDouble> ReadFromPListNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsDouble> ReadFromJSONNode(const std::string& buffer_I,
                                                           size_t& position_IO);
  static std::shared_ptr<CSettingsDouble> ReadFromASN1Node(const Bytes& bytes_I,
                                                           size_t& position_IO);

 private:
  double mValue;
};
