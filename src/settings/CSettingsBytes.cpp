#include "settings/CSettingsBytes.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/CSettingsMap.h"
#include "settings/XmlUtils.h"

CSettingsBytes::CSettingsBytes(CPasskeyToken token_I, Bytes value_I)
    : CSettingsObject(token_I), mValue(std::move(value_I)) {}

std::shared_ptr<CSettingsBytes> CSettingsBytes::New(const Bytes& value_I) {
  return std::make_shared<CSettingsBytes>(CPasskeyToken(), value_I);
}

std::shared_ptr<CSettingsBytes> CSettingsBytes::CastToBytes(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsBytes::CastToBytes got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsBytes>(object_I);
  if (!result) {
    TavLog::Warning("CSettingsBytes::CastToBytes got a %s and failed to cast to CSettingsBytes\n",
                    object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsBytes::DeepCopy() const { return New(mValue); }

std::string CSettingsBytes::GetStringValue() const { return StringUtilities::GetBase64(mValue); }

std::string CSettingsBytes::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsBytes::AppendASN1Node(Bytes& out_IO) const {
  ASN1Coding::EncodeBytesToArchive(mValue, out_IO);
}

bool CSettingsBytes::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsBytes>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsBytes::CreateJSONNode(int /*level_I*/) const {
  return std::string("{\"") + SETTINGS_JSON_BYTES_KEY + "\":\"" + GetStringValue() + "\"}";
}

std::shared_ptr<CSettingsBytes> CSettingsBytes::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsBytes::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New(StringUtilities::GetBytesFromBase64(XmlUtils::GetNodeValue(node_I)));
}

std::shared_ptr<CSettingsBytes> CSettingsBytes::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "data") {
    TavLog::Info("CSettingsBytes::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  return New(StringUtilities::GetBytesFromBase64(XmlUtils::GetNodeValue(node_I)));
}

std::shared_ptr<CSettingsBytes> CSettingsBytes::ReadFromJSONNode(const std::string& buffer_I,
                                                                 size_t& position_IO) {
  size_t position = position_IO;
  auto map = CSettingsMap::ReadFromJSONNode(buffer_I, position);
  if (!map || map->ObjectCount() != 1) return nullptr;
  auto bytes =
      std::dynamic_pointer_cast<CSettingsBytes>(map->ObjectForKey(SETTINGS_JSON_BYTES_KEY));
  if (!bytes) return nullptr;
  position_IO = position;
  return bytes;
}

std::shared_ptr<CSettingsBytes> CSettingsBytes::ReadFromASN1Node(const Bytes& bytes_I,
                                                                 size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_OCTET_STRING}) {
    return nullptr;
  }
  return New(ASN1Coding::DecodeBytesFromArchive(bytes_I, position_IO));
}
