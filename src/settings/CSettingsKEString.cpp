#include "settings/CSettingsKEString.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/CSettingsString.h"
#include "settings/XmlUtils.h"

CSettingsKEString::CSettingsKEString(CPasskeyToken token_I, std::string value_I)
    : CSettingsObject(token_I), mValue(std::move(value_I)) {}

std::shared_ptr<CSettingsKEString> CSettingsKEString::New(const std::string& value_I) {
  return std::make_shared<CSettingsKEString>(CPasskeyToken(), value_I);
}

std::shared_ptr<CSettingsKEString> CSettingsKEString::CastToKEString(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsKEString::CastToKEString got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsKEString>(object_I);
  if (!result) {
    TavLog::Warning(
        "CSettingsKEString::CastToKEString got a %s and failed to cast to CSettingsKEString\n",
        object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsKEString::DeepCopy() const { return New(mValue); }

std::string CSettingsKEString::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsKEString::AppendASN1Node(Bytes& out_IO) const {
  ASN1Coding::EncodeStringToArchive(mValue, out_IO, true);
}

bool CSettingsKEString::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsKEString>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsKEString::CreateJSONNode(int /*level_I*/) const {
  return "\"" + mValue + "\"";
}

void CSettingsKEString::AddContentToNode(xmlNodePtr node_I, const std::string& content_I) const {
  std::string guarded;
  guarded.reserve(content_I.size());
  for (char c : content_I) {
    if (c == ']') {
      guarded += RSQBRACKETENTITY;
    } else {
      guarded += c;
    }
  }
  XmlUtils::SetNodeContentCDATA(node_I, guarded);
}

std::string CSettingsKEString::TextFromNode(xmlNodePtr node_I) {
  std::string text = StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I));
  StringUtilities::IReplaceAll(text, RSQBRACKETENTITY, "]");
  return text;
}

std::shared_ptr<CSettingsKEString> CSettingsKEString::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsKEString::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New(TextFromNode(node_I));
}

std::shared_ptr<CSettingsKEString> CSettingsKEString::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "string") {
    TavLog::Info("CSettingsKEString::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  return New(TextFromNode(node_I));
}

std::shared_ptr<CSettingsKEString> CSettingsKEString::ReadFromJSONNode(const std::string& buffer_I,
                                                                       size_t& position_IO) {
  std::string text;
  if (!CSettingsString::ReadJSONText(buffer_I, position_IO, text)) return nullptr;
  return New(text);
}

std::shared_ptr<CSettingsKEString> CSettingsKEString::ReadFromASN1Node(const Bytes& bytes_I,
                                                                       size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_KESTRING}) {
    return nullptr;
  }
  return New(ASN1Coding::DecodeStringFromArchive(bytes_I, position_IO));
}
