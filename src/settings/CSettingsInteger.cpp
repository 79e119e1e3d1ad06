#include "settings/CSettingsInteger.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/MathUtilities.h"
#include "settings/XmlUtils.h"

CSettingsInteger::CSettingsInteger(CPasskeyToken token_I, int64_t value_I)
    : CSettingsObject(token_I), mValue(value_I) {}

std::shared_ptr<CSettingsInteger> CSettingsInteger::New(int64_t value_I) {
  return std::make_shared<CSettingsInteger>(CPasskeyToken(), value_I);
}

std::shared_ptr<CSettingsInteger> CSettingsInteger::CastToInteger(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsInteger::CastToInteger got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsInteger>(object_I);
  if (!result) {
    TavLog::Warning(
        "CSettingsInteger::CastToInteger got a %s and failed to cast to CSettingsInteger\n",
        object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsInteger::DeepCopy() const { return New(mValue); }

std::string CSettingsInteger::GetStringValue() const { return std::to_string(mValue); }

std::string CSettingsInteger::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsInteger::AppendASN1Node(Bytes& out_IO) const {
  // A negative value goes out as its two's-complement pattern.
  ASN1Coding::EncodeIntegerToArchive(static_cast<unsigned long long>(mValue), out_IO);
}

bool CSettingsInteger::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsInteger>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsInteger::CreateJSONNode(int /*level_I*/) const { return GetStringValue(); }

std::shared_ptr<CSettingsInteger> CSettingsInteger::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsInteger::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  const std::string text = StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I));
  if (!MathUtilities::IsInteger(text)) {
    TavLog::Error("CSettingsInteger::ReadFromXMLNode: ERROR: bad integer: %s\n", text.c_str());
  }
  return New(MathUtilities::StringToInteger(text, 0));
}

std::shared_ptr<CSettingsInteger> CSettingsInteger::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "integer") {
    TavLog::Info("CSettingsInteger::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  const std::string text = StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I));
  if (!MathUtilities::IsInteger(text)) {
    TavLog::Error("CSettingsInteger::ReadFromPListNode: ERROR: bad integer: %s\n", text.c_str());
  }
  return New(MathUtilities::StringToInteger(text, 0));
}

std::shared_ptr<CSettingsInteger> CSettingsInteger::ReadFromJSONNode(const std::string& buffer_I,
                                                                     size_t& position_IO) {
  const size_t start = position_IO;
  if (start >= buffer_I.size()) return nullptr;
  const char first = buffer_I[start];
  if (!((first >= '0' && first <= '9') || first == '-')) return nullptr;

  size_t end = start;
  for (; end < buffer_I.size() && IsJSONNumberCharacter(buffer_I[end]); ++end) {
    const char c = buffer_I[end];
    if (c == '+' || c == '.' || c == 'e' || c == 'E') {
      position_IO = start;
      return nullptr;
    }
  }
  position_IO = end;
  const std::string text = StringUtilities::Trim_Copy(buffer_I.substr(start, end - start));
  if (!MathUtilities::IsInteger(text)) {
    TavLog::Error("CSettingsInteger::ReadFromJSONNode: ERROR: bad integer: %s\n", text.c_str());
  }
  return New(MathUtilities::StringToInteger(text, 0));
}

std::shared_ptr<CSettingsInteger> CSettingsInteger::ReadFromASN1Node(const Bytes& bytes_I,
                                                                     size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_INTEGER}) {
    return nullptr;
  }
  return New(static_cast<int64_t>(ASN1Coding::DecodeIntegerFromArchive(bytes_I, position_IO)));
}
