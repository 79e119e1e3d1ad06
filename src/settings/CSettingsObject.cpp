#include "settings/CSettingsObject.h"

#include <cctype>
#include <fstream>
#include <stdexcept>

#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "common/TavReplaceFile.h"
#include "settings/ASN1Coding.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsBool.h"
#include "settings/CSettingsBytes.h"
#include "settings/CSettingsDepthGuard.h"
#include "settings/CSettingsDouble.h"
#include "settings/CSettingsInteger.h"
#include "settings/CSettingsKEString.h"
#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/CSettingsString.h"
#include "settings/CompressionUtils.h"
#include "settings/XmlUtils.h"

namespace {

// The magic integer in front of every binary document: the letters "Tavm".
constexpr unsigned long long kASN1Magic = 0x5461766D;

// The byte that ends the read of a JSON file: the whole file is one line.
constexpr char kJSONFileDelimiter = '\x04';

// Save option of XML files: indented.
constexpr int kXMLSaveFormat = 1;

struct SFreeNode {
  void operator()(xmlNodePtr node_I) const { XmlUtils::FreeNode(node_I); }
};
using UniqueNode = std::unique_ptr<xmlNode, SFreeNode>;

struct SFreeDoc {
  void operator()(xmlDocPtr doc_I) const { XmlUtils::FreeDoc(doc_I); }
};
using UniqueDoc = std::unique_ptr<xmlDoc, SFreeDoc>;

bool IsSpace(char character_I) {
  return std::isspace(static_cast<unsigned char>(character_I)) != 0;
}

// Stray characters between tokens are stepped over; a garbage file has
// thousands of them, so a document reports only its first.
bool& StrayReported() {
  thread_local bool reported = false;
  return reported;
}

void ReportStray(const char* text_I) {
  if (StrayReported()) return;
  StrayReported() = true;
  TAVASSERT_TEXT(text_I);
}

bool IsContainer(const CSettingsObject& object_I) {
  const std::string type = object_I.GetTypeName();
  return type == CSettingsMap::GetClassTypeName() || type == CSettingsArray::GetClassTypeName();
}

// The name of a scalar's property-list element, or empty for none.
std::string PListElementName(const CSettingsObject& object_I) {
  const std::string type = object_I.GetTypeName();
  if (type == CSettingsArray::GetClassTypeName()) return "array";
  if (type == CSettingsMap::GetClassTypeName()) return "dict";
  if (type == CSettingsBool::GetClassTypeName()) return object_I.GetStringValue();
  if (type == CSettingsInteger::GetClassTypeName()) return "integer";
  if (type == CSettingsDouble::GetClassTypeName()) return "real";
  if (type == CSettingsString::GetClassTypeName()) return "string";
  if (type == CSettingsKEString::GetClassTypeName()) return "string";
  if (type == CSettingsBytes::GetClassTypeName()) return "data";
  return {};
}

}  // namespace

std::string CSettingsObject::mPlatformID;
std::string CSettingsObject::mLanguageID;

// ---------------------------------------------------------------- XML form

xmlNodePtr CSettingsObject::CreateXMLNode(const std::string& name_I) const {
  UniqueNode node(XmlUtils::CreateNode(name_I));
  XmlUtils::SetNodeAttribValue(node.get(), "type", GetTypeName());
  const std::string text = GetStringValue();
  if (!text.empty()) AddContentToNode(node.get(), text);
  return node.release();
}

void CSettingsObject::AddContentToNode(xmlNodePtr node_I, const std::string& content_I) const {
  XmlUtils::SetNodeContent(node_I, content_I, true);
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromXMLFile(const std::string& path_I,
                                                                  std::string& errorText_O) {
  UniqueDoc doc(XmlUtils::LoadXmlDocumentWithWarningsOnErr(path_I, errorText_O));
  if (!doc) return nullptr;
  return ReadFromXMLDocument(doc.get());
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromXMLBuffer(const std::string& buffer_I) {
  UniqueDoc doc(XmlUtils::LoadXmlDocumentFromMemory(buffer_I));
  if (!doc) return nullptr;
  return ReadFromXMLDocument(doc.get());
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromXMLDocument(xmlDocPtr doc_I) {
  UniqueNode root(XmlUtils::GetRootNode(doc_I));
  if (!root) return nullptr;

  CSettingsDepthGuard::Reset();
  std::shared_ptr<CSettingsObject> result;
  const std::string rootName = XmlUtils::GetNodeName(root.get());
  if (rootName == "plist") {
    const std::string version = XmlUtils::GetNodeAttribValue(root.get(), "version");
    if (version != "1.0") TAVASSERT_TEXT("version == \"1.0\"");
    result = ReadFromPListNode(root.get());
  } else {
    if (rootName != SETTINGS_NODE_ROOT_ID) TAVASSERT_TEXT("rootName == SETTINGS_NODE_ROOT_ID");
    result = ReadFromXMLNode(root.get());
  }
  // A subtree beyond the depth limit was dropped: the document as a whole
  // cannot be trusted.
  if (CSettingsDepthGuard::WasExceeded()) return nullptr;
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromXMLNode(xmlNodePtr node_I) {
  if (node_I == nullptr) return nullptr;
  const std::string type = XmlUtils::GetNodeAttribValue(node_I, "type");
  if (type.empty()) {
    if (XmlUtils::GetChildCount(node_I) == 0) return CSettingsString::ReadFromXMLNode(node_I);
    return CSettingsMap::ReadFromXMLNode(node_I);
  }
  if (type == CSettingsMap::GetClassTypeName()) return CSettingsMap::ReadFromXMLNode(node_I);
  if (type == CSettingsInteger::GetClassTypeName())
    return CSettingsInteger::ReadFromXMLNode(node_I);
  if (type == CSettingsString::GetClassTypeName()) return CSettingsString::ReadFromXMLNode(node_I);
  if (type == CSettingsBool::GetClassTypeName()) return CSettingsBool::ReadFromXMLNode(node_I);
  if (type == CSettingsBytes::GetClassTypeName()) return CSettingsBytes::ReadFromXMLNode(node_I);
  if (type == CSettingsArray::GetClassTypeName()) return CSettingsArray::ReadFromXMLNode(node_I);
  if (type == CSettingsDouble::GetClassTypeName()) return CSettingsDouble::ReadFromXMLNode(node_I);
  if (type == CSettingsKEString::GetClassTypeName()) {
    return CSettingsKEString::ReadFromXMLNode(node_I);
  }
  if (type == CSettingsNULL::GetClassTypeName()) return CSettingsNULL::ReadFromXMLNode(node_I);
  TAVASSERT_TEXT("Unknown node type");
  return nullptr;
}

bool CSettingsObject::ReadXMLFrame(xmlNodePtr node_I, std::string& type_O) {
  type_O = XmlUtils::GetNodeAttribValue(node_I, "type");
  const std::string lang = XmlUtils::GetNodeAttribValue(node_I, "lang");
  const std::string plat = XmlUtils::GetNodeAttribValue(node_I, "plat");
  return node_I != nullptr && ValidForCurrentLangAndPlat(lang, plat);
}

std::string CSettingsObject::GetXMLString(const std::string& name_I) const {
  UniqueDoc doc(XmlUtils::NewXmlDocument());
  XmlUtils::SetRootNode(doc.get(), CreateXMLNode(name_I.empty() ? SETTINGS_NODE_ROOT_ID : name_I));
  return XmlUtils::GetDocumentStringAndFormat(doc.get(), true, name_I.empty());
}

bool CSettingsObject::SaveXMLToFile(const std::string& path_I) const {
  try {
    UniqueDoc doc(XmlUtils::NewXmlDocument());
    XmlUtils::SetRootNode(doc.get(), CreateXMLNode(SETTINGS_NODE_ROOT_ID));
    return XmlUtils::SaveXmlDocument(path_I, doc.get(), kXMLSaveFormat);
  } catch (const std::exception& error) {
    TavLog::Error("CSettingsObject::SaveXMLToFile: %s\n", error.what());
  }
  return false;
}

// --------------------------------------------------------- property list

xmlNodePtr CSettingsObject::CreatePListNode() const {
  const std::string name = PListElementName(*this);
  if (name.empty()) {
    TAVASSERT_TEXT("Unknown type");
    return nullptr;
  }
  UniqueNode node(XmlUtils::CreateNode(name));
  const std::string type = GetTypeName();
  if (type == CSettingsKEString::GetClassTypeName()) {
    XmlUtils::SetNodeAttribValue(node.get(), "kestring", "1");
  }
  if (type != CSettingsArray::GetClassTypeName() && type != CSettingsMap::GetClassTypeName() &&
      type != CSettingsBool::GetClassTypeName()) {
    AddContentToNode(node.get(), GetStringValue());
  }
  return node.release();
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromPListNode(xmlNodePtr node_I) {
  if (node_I == nullptr) return nullptr;
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name == "plist") {
    CSettingsDepthGuard depth;
    if (depth.TooDeep()) return nullptr;
    return ReadFromPListNode(XmlUtils::GetChildNode(node_I, 0));
  }
  if (name == "dict") return CSettingsMap::ReadFromPListNode(node_I);
  if (name == "array") return CSettingsArray::ReadFromPListNode(node_I);
  if (name == "string") {
    if (!XmlUtils::GetNodeAttribValue(node_I, "kestring").empty()) {
      return CSettingsKEString::ReadFromPListNode(node_I);
    }
    return CSettingsString::ReadFromPListNode(node_I);
  }
  if (name == "date") {
    TavLog::Info("found date data. Converting to string\n");
    return CSettingsString::ReadFromPListNode(node_I);
  }
  if (name == "integer") return CSettingsInteger::ReadFromPListNode(node_I);
  if (name == "real") return CSettingsDouble::ReadFromPListNode(node_I);
  if (name == "true") return CSettingsBool::New(true);
  if (name == "false") return CSettingsBool::New(false);
  if (name == "data") return CSettingsBytes::ReadFromPListNode(node_I);
  TAVASSERT_TEXT("Bad formed Plist data");
  TavLog::Error("Found unknown tag %s\n", name.c_str());
  return nullptr;
}

std::string CSettingsObject::GetPListString(bool withDeclaration_I) const {
  UniqueDoc doc(XmlUtils::NewXmlDocument());
  xmlNodePtr root = XmlUtils::CreateRootNode(doc.get(), "plist");
  XmlUtils::SetNodeAttribValue(root, "version", "1.0");
  xmlNodePtr value = CreatePListNode();
  if (value != nullptr) XmlUtils::AddNodeData(root, value);
  return XmlUtils::GetDocumentStringAndFormat(doc.get(), true, withDeclaration_I);
}

// --------------------------------------------------------------- JSON form

void CSettingsObject::SkipComments(const std::string& buffer_I, size_t& position_IO) {
  while (position_IO + 1 < buffer_I.size() && buffer_I[position_IO] == '/' &&
         buffer_I[position_IO + 1] == '/') {
    const size_t lineEnd = buffer_I.find('\n', position_IO);
    position_IO = lineEnd == std::string::npos ? buffer_I.size() : lineEnd + 1;
  }
}

void CSettingsObject::SkipCommentsAndSpace(const std::string& buffer_I, size_t& position_IO) {
  for (;;) {
    SkipComments(buffer_I, position_IO);
    if (position_IO >= buffer_I.size() || !IsSpace(buffer_I[position_IO])) return;
    ++position_IO;
  }
}

bool CSettingsObject::IsJSONNumberCharacter(char character_I) {
  return (character_I >= '0' && character_I <= '9') || character_I == '+' || character_I == '-' ||
         character_I == '.' || character_I == 'e' || character_I == 'E';
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromJSONFile(const std::string& path_I) {
  try {
    std::ifstream in(path_I, std::ios::binary);
    if (!in.good()) return nullptr;
    std::string buffer;
    std::getline(in, buffer, kJSONFileDelimiter);
    return ReadFromJSONBuffer(buffer);
  } catch (const std::exception& error) {
    TavLog::Info("ReadFromJSONFile: %s\n", error.what());
  }
  return nullptr;
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromJSONBuffer(const std::string& buffer_I) {
  CSettingsDepthGuard::Reset();
  StrayReported() = false;
  size_t pos = 0;
  for (;;) {
    SkipComments(buffer_I, pos);
    if (pos >= buffer_I.size()) return nullptr;
    const char c = buffer_I[pos];
    if (c == '[') return CSettingsArray::ReadFromJSONNode(buffer_I, pos);
    if (c == '{') return CSettingsMap::ReadFromJSONNode(buffer_I, pos);
    if (!IsSpace(c)) ReportStray("isspace((int)buffer_I[pos])");
    ++pos;
  }
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromJSONNode(const std::string& buffer_I,
                                                                   size_t& position_IO) {
  for (;;) {
    SkipComments(buffer_I, position_IO);
    if (position_IO >= buffer_I.size()) return nullptr;
    const char c = buffer_I[position_IO];

    if (c == '[') return CSettingsArray::ReadFromJSONNode(buffer_I, position_IO);
    if (c == '{') {
      auto map = CSettingsMap::ReadFromJSONNode(buffer_I, position_IO);
      if (map && map->ObjectCount() == 1 &&
          map->TypeNameForKeyOrEmpty(SETTINGS_JSON_BYTES_KEY) ==
              CSettingsBytes::GetClassTypeName()) {
        return map->ObjectForKey(SETTINGS_JSON_BYTES_KEY);
      }
      return map;
    }
    if (buffer_I.compare(position_IO, 4, "true") == 0) {
      position_IO += 4;
      return CSettingsBool::New(true);
    }
    if (buffer_I.compare(position_IO, 5, "false") == 0) {
      position_IO += 5;
      return CSettingsBool::New(false);
    }
    if (buffer_I.compare(position_IO, 4, "null") == 0) {
      position_IO += 4;
      return CSettingsNULL::New();
    }
    if (c == '"') return CSettingsString::ReadFromJSONNode(buffer_I, position_IO);
    if ((c >= '0' && c <= '9') || c == '-') {
      size_t end = position_IO;
      bool fractional = false;
      for (; end < buffer_I.size() && IsJSONNumberCharacter(buffer_I[end]); ++end) {
        const char n = buffer_I[end];
        if (n == '.' || n == 'e' || n == 'E') fractional = true;
      }
      if (fractional) return CSettingsDouble::ReadFromJSONNode(buffer_I, position_IO);
      return CSettingsInteger::ReadFromJSONNode(buffer_I, position_IO);
    }
    if (!IsSpace(c)) ReportStray("isspace((int)buffer_I[pos_IO])");
    ++position_IO;
  }
}

std::string CSettingsObject::GetJSONString() const {
  return IsContainer(*this) ? CreateJSONNode(0) : std::string();
}

bool CSettingsObject::SaveJSONToFile(const std::string& path_I) const {
  try {
    if (!IsContainer(*this)) return false;
    std::string json = GetJSONString();
    if (json.empty()) json = "{}";
    return TavReplaceFile(path_I, [&json](const std::string& temporary_I) {
      std::ofstream out(temporary_I, std::ios::binary | std::ios::trunc);
      if (!out.good()) return false;
      out << json << std::endl;
      out.close();
      // A full disk shows only here; a document half written is no success.
      return !out.fail();
    });
  } catch (const std::exception& error) {
    TavLog::Info("SaveJSONToFile: %s\n", error.what());
  }
  return false;
}

// ---------------------------------------------------- ASN.1 and compressed

CSettingsObject::Bytes CSettingsObject::GetASN1Binary() const {
  Bytes out;
  ASN1Coding::EncodeIntegerToArchive(kASN1Magic, out);
  AppendASN1Node(out);
  return out;
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromASN1Binary(const Bytes& bytes_I) {
  if (bytes_I.empty()) return nullptr;
  try {
    CSettingsDepthGuard::Reset();
    size_t pos = 0;
    const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, pos, true);
    if (identifier !=
        ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_INTEGER}) {
      return nullptr;
    }
    if (ASN1Coding::DecodeIntegerFromArchive(bytes_I, pos) != kASN1Magic) return nullptr;
    return ReadFromASN1Node(bytes_I, pos);
  } catch (const std::exception& error) {
    TavLog::Info("ReadFromASN1Binary: %s\n", error.what());
  }
  return nullptr;
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromASN1Node(const Bytes& bytes_I,
                                                                   size_t& position_IO) {
  using namespace ASN1Coding;
  const Identifier identifier = DecodeIdentifierFromArchive(bytes_I, position_IO, false);
  std::shared_ptr<CSettingsObject> result;
  if (identifier.first == ECLASS_UNIVERSAL) {
    switch (identifier.second) {
      case ETYPE_BOOLEAN: result = CSettingsBool::ReadFromASN1Node(bytes_I, position_IO); break;
      case ETYPE_INTEGER: result = CSettingsInteger::ReadFromASN1Node(bytes_I, position_IO); break;
      case ETYPE_OCTET_STRING:
        result = CSettingsBytes::ReadFromASN1Node(bytes_I, position_IO);
        break;
      case ETYPE_UTF8_STRING:
        result = CSettingsString::ReadFromASN1Node(bytes_I, position_IO);
        break;
      // ETYPE_NULL is written but never read: a tree with a null does not
      // come back from this form.
      default: break;
    }
  } else if (identifier.first == ECLASS_APPLICATION) {
    switch (identifier.second) {
      case ETYPE_SETTINGS_MAP: result = CSettingsMap::ReadFromASN1Node(bytes_I, position_IO); break;
      case ETYPE_SETTINGS_DOUBLE:
        result = CSettingsDouble::ReadFromASN1Node(bytes_I, position_IO);
        break;
      case ETYPE_SETTINGS_ARRAY:
        result = CSettingsArray::ReadFromASN1Node(bytes_I, position_IO);
        break;
      case ETYPE_SETTINGS_KESTRING:
        result = CSettingsKEString::ReadFromASN1Node(bytes_I, position_IO);
        break;
      default: break;
    }
  }
  if (!result) throw std::runtime_error("unknown data type in archive");
  return result;
}

CSettingsObject::Bytes CSettingsObject::GetCompressedBinary() const {
  const Bytes inner = GetASN1Binary();
  auto wrapper = CSettingsMap::New();
  wrapper->SetKeyAndInteger("originalSize", static_cast<int64_t>(inner.size()));
  wrapper->SetKeyAndObject("bytes", CSettingsBytes::New(CompressionUtils::Compress(inner)));
  return wrapper->GetASN1Binary();
}

std::shared_ptr<CSettingsObject> CSettingsObject::ReadFromCompressedBinary(const Bytes& bytes_I) {
  auto wrapper = CSettingsMap::CastToMap(ReadFromASN1Binary(bytes_I), true);
  if (!wrapper) return nullptr;
  auto data = wrapper->ObjectForKey<CSettingsBytes>("bytes");
  const int64_t size = wrapper->IntegerForKeyWithDefault("originalSize", int64_t{0});
  if (size == 0 || !data) return nullptr;
  // A negative size reads as a huge one, which Expand refuses.
  const Bytes expandedBuffer =
      CompressionUtils::Expand(data->GetValue(), static_cast<size_t>(size));
  if (expandedBuffer.empty()) {
    TAVASSERT_TEXT("!expandedBuffer.empty()");
    return nullptr;
  }
  return ReadFromASN1Binary(expandedBuffer);
}

// ---------------------------------------------------------------- filters

bool CSettingsObject::ValidForCurrentLangAndPlat(const std::string& lang_I,
                                                 const std::string& plat_I) {
  if (!lang_I.empty() && !mLanguageID.empty() && lang_I != mLanguageID) return false;
  if (!plat_I.empty() && !mPlatformID.empty() && plat_I != mPlatformID) return false;
  return true;
}

void CSettingsObject::SetPlatformIDFilter(const std::string& id_I) { mPlatformID = id_I; }
void CSettingsObject::SetLanguageIDFilter(const std::string& id_I) { mLanguageID = id_I; }
std::string CSettingsObject::PlatformIDFilter() { return mPlatformID; }
std::string CSettingsObject::LanguageIDFilter() { return mLanguageID; }

// --------------------------------------------------------------- freezing

template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SRect>(const SRect& value_I) {
  auto map = CSettingsMap::New();
  map->SetKeyAndInteger("Top", value_I.Top());
  map->SetKeyAndInteger("Left", value_I.Left());
  map->SetKeyAndInteger("Bottom", value_I.Bottom());
  map->SetKeyAndInteger("Right", value_I.Right());
  map->SetKeyAndInteger("Epsilon", int64_t{value_I.Left()} + value_I.Width() - value_I.Right());
  return map;
}

template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SDoubleRect>(
    const SDoubleRect& value_I) {
  auto map = CSettingsMap::New();
  map->SetKeyAndDouble("Top", value_I.Top());
  map->SetKeyAndDouble("Left", value_I.Left());
  map->SetKeyAndDouble("Bottom", value_I.Bottom());
  map->SetKeyAndDouble("Right", value_I.Right());
  map->SetKeyAndDouble("Epsilon", value_I.Left() + value_I.Width() - value_I.Right());
  return map;
}

template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SPoint>(const SPoint& value_I) {
  auto map = CSettingsMap::New();
  map->SetKeyAndInteger("x", value_I.x);
  map->SetKeyAndInteger("y", value_I.y);
  return map;
}

template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SDoublePoint>(
    const SDoublePoint& value_I) {
  auto map = CSettingsMap::New();
  map->SetKeyAndDouble("x", value_I.x);
  map->SetKeyAndDouble("y", value_I.y);
  return map;
}

template <>
SRect CSettingsObject::ToComplexType<SRect>() const {
  const auto* map = dynamic_cast<const CSettingsMap*>(this);
  if (map == nullptr) {
    TAVASSERT_TEXT("map && \"This isn't a frozen SRect\"");
    return SRect(0);
  }
  if (!map->IsKeyPresent("Top")) TAVASSERT_TEXT("map->IsKeyPresent(\"Top\")");
  if (!map->IsKeyPresent("Left")) TAVASSERT_TEXT("map->IsKeyPresent(\"Left\")");
  if (!map->IsKeyPresent("Bottom")) TAVASSERT_TEXT("map->IsKeyPresent(\"Bottom\")");
  if (!map->IsKeyPresent("Right")) TAVASSERT_TEXT("map->IsKeyPresent(\"Right\")");
  return SRect::FromEdges(
      map->IntegerForKeyWithDefault("Left", 0), map->IntegerForKeyWithDefault("Top", 0),
      map->IntegerForKeyWithDefault("Right", 0), map->IntegerForKeyWithDefault("Bottom", 0),
      map->IntegerForKeyWithDefault("Epsilon", 0));
}

template <>
SDoubleRect CSettingsObject::ToComplexType<SDoubleRect>() const {
  const auto* map = dynamic_cast<const CSettingsMap*>(this);
  if (map == nullptr) {
    TAVASSERT_TEXT("map && \"This isn't a frozen SDoubleRect\"");
    return SDoubleRect(0.0);
  }
  if (!map->IsKeyPresent("Top")) TAVASSERT_TEXT("map->IsKeyPresent(\"Top\")");
  if (!map->IsKeyPresent("Left")) TAVASSERT_TEXT("map->IsKeyPresent(\"Left\")");
  if (!map->IsKeyPresent("Bottom")) TAVASSERT_TEXT("map->IsKeyPresent(\"Bottom\")");
  if (!map->IsKeyPresent("Right")) TAVASSERT_TEXT("map->IsKeyPresent(\"Right\")");
  return SDoubleRect::FromEdges(
      map->DoubleForKeyWithDefault("Left", 0.0), map->DoubleForKeyWithDefault("Top", 0.0),
      map->DoubleForKeyWithDefault("Right", 0.0), map->DoubleForKeyWithDefault("Bottom", 0.0),
      map->DoubleForKeyWithDefault("Epsilon", 0.0));
}

template <>
SPoint CSettingsObject::ToComplexType<SPoint>() const {
  const auto* map = dynamic_cast<const CSettingsMap*>(this);
  if (map == nullptr) {
    TAVASSERT_TEXT("map && \"This isn't a frozen SPoint\"");
    return SPoint();
  }
  if (!map->IsKeyPresent("x")) TAVASSERT_TEXT("map->IsKeyPresent(\"x\")");
  if (!map->IsKeyPresent("y")) TAVASSERT_TEXT("map->IsKeyPresent(\"y\")");
  return SPoint(map->IntegerForKeyWithDefault("x", 0), map->IntegerForKeyWithDefault("y", 0));
}

template <>
SDoublePoint CSettingsObject::ToComplexType<SDoublePoint>() const {
  const auto* map = dynamic_cast<const CSettingsMap*>(this);
  if (map == nullptr) {
    TAVASSERT_TEXT("map && \"This isn't a frozen SDoublePoint\"");
    return SDoublePoint();
  }
  if (!map->IsKeyPresent("x")) TAVASSERT_TEXT("map->IsKeyPresent(\"x\")");
  if (!map->IsKeyPresent("y")) TAVASSERT_TEXT("map->IsKeyPresent(\"y\")");
  return SDoublePoint(map->DoubleForKeyWithDefault("x", 0.0),
                      map->DoubleForKeyWithDefault("y", 0.0));
}
