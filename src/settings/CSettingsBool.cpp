#include "settings/CSettingsBool.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/MathUtilities.h"
#include "settings/XmlUtils.h"

CSettingsBool::CSettingsBool(CPasskeyToken token_I, bool value_I)
    : CSettingsObject(token_I), mValue(value_I) {}

std::shared_ptr<CSettingsBool> CSettingsBool::New(bool value_I) {
  return std::make_shared<CSettingsBool>(CPasskeyToken(), value_I);
}

bool CSettingsBool::StringToBool(const std::string& text_I, bool default_I) {
  if (StringUtilities::IEquals(text_I, "true")) return true;
  if (StringUtilities::IEquals(text_I, "false")) return false;
  return MathUtilities::StringToInteger(text_I, default_I ? 1 : 0) != 0;
}

std::shared_ptr<CSettingsBool> CSettingsBool::CastToBool(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsBool::CastToBool got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsBool>(object_I);
  if (!result) {
    TavLog::Warning("CSettingsBool::CastToBool got a %s and failed to cast to CSettingsBool\n",
                    object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsBool::DeepCopy() const { return New(mValue); }

std::string CSettingsBool::GetStringValue() const { return mValue ? "true" : "false"; }

std::string CSettingsBool::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsBool::AppendASN1Node(Bytes& out_IO) const {
  ASN1Coding::EncodeBoolToArchive(mValue, out_IO);
}

bool CSettingsBool::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsBool>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsBool::CreateJSONNode(int /*level_I*/) const { return GetStringValue(); }

std::shared_ptr<CSettingsBool> CSettingsBool::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsBool::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New(StringToBool(StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I)), false));
}

std::shared_ptr<CSettingsBool> CSettingsBool::ReadFromASN1Node(const Bytes& bytes_I,
                                                               size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_BOOLEAN}) {
    return nullptr;
  }
  return New(ASN1Coding::DecodeBoolFromArchive(bytes_I, position_IO));
}
