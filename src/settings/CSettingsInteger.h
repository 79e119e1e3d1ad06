#pragma once
// A signed 64-bit integer node.

#include <cstdint>

#include "settings/CSettingsObject.h"

class CSettingsInteger : public CSettingsObject {
 public:
  CSettingsInteger(CPasskeyToken token_I, int64_t value_I);
  static std::shared_ptr<CSettingsInteger> New(int64_t value_I);
  static const char* GetClassTypeName() { return "integer"; }
  static const char* GetClassName() { return "CSettingsInteger"; }

  int64_t GetValue() const { return mValue; }
  void SetValue(int64_t value_I) { mValue = value_I; }

  static std::shared_ptr<CSettingsInteger> CastToInteger(std::shared_ptr<CSettingsObject> object_I);

  std::shared_ptr<CSettingsObject> DeepCopy() const override;
  std::string GetTypeName() const override { return GetClassTypeName(); }
  std::string GetStringValue() const override;
  std::string GetTraceString() const override;
  void AppendASN1Node(Bytes& out_IO) const override;
  bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const override;
  std::string CreateJSONNode(int level_I) const override;

  static std::shared_ptr<CSettingsInteger> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsInteger> ReadFromPListNode(xmlNodePtr node_I);
  // Needs a digit or "-" at position_IO. A number with "+", ".", "e" or "E"
  // is no integer: position_IO goes back and the result is empty.
  static std::shared_ptr<CSettingsInteger> ReadFromJSONNode(const std::string& buffer_I,
                                                            size_t& position_IO);
  static std::shared_ptr<CSettingsInteger> ReadFromASN1Node(const Bytes& bytes_I,
                                                            size_t& position_IO);

 private:
  int64_t mValue;
};
