#include "settings/CSettingsDouble.h"

#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/MathUtilities.h"
#include "settings/XmlUtils.h"

CSettingsDouble::CSettingsDouble(CPasskeyToken token_I, double value_I)
    : CSettingsObject(token_I), mValue(value_I) {}

std::shared_ptr<CSettingsDouble> CSettingsDouble::New(double value_I) {
  return std::make_shared<CSettingsDouble>(CPasskeyToken(), value_I);
}

std::shared_ptr<CSettingsDouble> CSettingsDouble::CastToDouble(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsDouble::CastToDouble got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsDouble>(object_I);
  if (!result) {
    TavLog::Warning(
        "CSettingsDouble::CastToDouble got a %s and failed to cast to CSettingsDouble\n",
        object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsDouble::DeepCopy() const { return New(mValue); }

std::string CSettingsDouble::GetStringValue() const { return std::to_string(mValue); }

std::string CSettingsDouble::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsDouble::AppendASN1Node(Bytes& out_IO) const {
  ASN1Coding::EncodeDoubleToArchive(mValue, out_IO);
}

bool CSettingsDouble::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsDouble>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsDouble::CreateJSONNode(int /*level_I*/) const { return GetStringValue(); }

std::shared_ptr<CSettingsDouble> CSettingsDouble::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsDouble::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New(MathUtilities::StringToDouble(XmlUtils::GetNodeValue(node_I), 0.0));
}

std::shared_ptr<CSettingsDouble> CSettingsDouble::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "real") {
    TavLog::Info("CSettingsDouble::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  return New(MathUtilities::StringToDouble(XmlUtils::GetNodeValue(node_I), 0.0));
}

std::shared_ptr<CSettingsDouble> CSettingsDouble::ReadFromJSONNode(const std::string& buffer_I,
                                                                   size_t& position_IO) {
  const size_t start = position_IO;
  if (start >= buffer_I.size()) return nullptr;
  const char first = buffer_I[start];
  if (!((first >= '0' && first <= '9') || first == '-')) return nullptr;

  size_t end = start;
  while (end < buffer_I.size() && IsJSONNumberCharacter(buffer_I[end])) ++end;
  position_IO = end;
  return New(MathUtilities::StringToDouble(buffer_I.substr(start, end - start), 0.0));
}

std::shared_ptr<CSettingsDouble> CSettingsDouble::ReadFromASN1Node(const Bytes& bytes_I,
                                                                   size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_DOUBLE}) {
    return nullptr;
  }
  return New(ASN1Coding::DecodeDoubleFromArchive(bytes_I, position_IO));
}
