#include "settings/CSettingsString.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "settings/ASN1Coding.h"
#include "settings/XmlUtils.h"

namespace {

// Length of the hexadecimal code point after "\u".
constexpr size_t kUnicodeEscapeLength = 4;

bool ParseHexPoint(const std::string& buffer_I, size_t position_I, uint32_t& point_O) {
  point_O = 0;
  for (size_t i = 0; i < kUnicodeEscapeLength; ++i) {
    const char c = buffer_I[position_I + i];
    uint32_t digit = 0;
    if (c >= '0' && c <= '9') {
      digit = static_cast<uint32_t>(c - '0');
    } else if (c >= 'a' && c <= 'f') {
      digit = static_cast<uint32_t>(c - 'a') + 10;
    } else if (c >= 'A' && c <= 'F') {
      digit = static_cast<uint32_t>(c - 'A') + 10;
    } else {
      return false;
    }
    point_O = (point_O << 4) | digit;
  }
  return true;
}

}  // namespace

CSettingsString::CSettingsString(CPasskeyToken token_I, std::string value_I)
    : CSettingsObject(token_I), mValue(std::move(value_I)) {}

std::shared_ptr<CSettingsString> CSettingsString::New(const std::string& value_I) {
  return std::make_shared<CSettingsString>(CPasskeyToken(), value_I);
}

std::shared_ptr<CSettingsString> CSettingsString::CastToString(
    std::shared_ptr<CSettingsObject> object_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    TavLog::Info("CSettingsString::CastToString got source object of type %s\n",
                 object_I->GetTypeName().c_str());
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsString>(object_I);
  if (!result) {
    TavLog::Warning(
        "CSettingsString::CastToString got a %s and failed to cast to CSettingsString\n",
        object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsString::DeepCopy() const { return New(mValue); }

std::string CSettingsString::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsString::AppendASN1Node(Bytes& out_IO) const {
  ASN1Coding::EncodeStringToArchive(mValue, out_IO, false);
}

bool CSettingsString::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsString>(other_I);
  return other && other->mValue == mValue;
}

std::string CSettingsString::CreateJSONNode(int /*level_I*/) const { return "\"" + mValue + "\""; }

std::shared_ptr<CSettingsString> CSettingsString::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  const bool untypedText = type.empty() && XmlUtils::GetChildCount(node_I) == 0;
  if (!untypedText && type != GetClassTypeName()) {
    TavLog::Info("CSettingsString::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New(StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I)));
}

std::shared_ptr<CSettingsString> CSettingsString::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "string" && name != "date") {
    TavLog::Info("CSettingsString::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  return New(StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(node_I)));
}

bool CSettingsString::ReadJSONText(const std::string& buffer_I, size_t& position_IO,
                                   std::string& text_O) {
  text_O.clear();
  size_t pos = position_IO;
  if (pos >= buffer_I.size() || buffer_I[pos] != '"') return false;
  ++pos;
  while (pos < buffer_I.size()) {
    const char c = buffer_I[pos++];
    if (c == '"') {
      position_IO = pos;
      return true;
    }
    if (c != '\\') {
      text_O += c;
      continue;
    }
    if (pos >= buffer_I.size()) return false;
    const char escaped = buffer_I[pos++];
    switch (escaped) {
      case 'n': text_O += '\n'; break;
      case 'r': text_O += '\r'; break;
      case 't': text_O += '\t'; break;
      case 'b': text_O += '\b'; break;
      case 'f': text_O += '\f'; break;
      case '"':
      case '\\':
      case '/': text_O += escaped; break;
      case 'u': {
        uint32_t point = 0;
        if (buffer_I.size() - pos < kUnicodeEscapeLength) return false;
        if (!ParseHexPoint(buffer_I, pos, point)) return false;
        pos += kUnicodeEscapeLength;
        text_O += StringUtilities::EncodeUnicodePointToUTF8(point);
        break;
      }
      default: return false;
    }
  }
  return false;
}

std::shared_ptr<CSettingsString> CSettingsString::ReadFromJSONNode(const std::string& buffer_I,
                                                                   size_t& position_IO) {
  std::string text;
  if (!ReadJSONText(buffer_I, position_IO, text)) return nullptr;
  return New(text);
}

std::shared_ptr<CSettingsString> CSettingsString::ReadFromASN1Node(const Bytes& bytes_I,
                                                                   size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_UTF8_STRING}) {
    return nullptr;
  }
  return New(ASN1Coding::DecodeStringFromArchive(bytes_I, position_IO));
}
