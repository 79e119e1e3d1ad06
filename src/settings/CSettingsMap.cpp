#include "settings/CSettingsMap.h"

#include <stdexcept>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "settings/ASN1Coding.h"
#include "settings/CSettingsDepthGuard.h"
#include "settings/CSettingsNULL.h"
#include "settings/XmlUtils.h"

namespace {

struct SFreeNode {
  void operator()(xmlNodePtr node_I) const { XmlUtils::FreeNode(node_I); }
};
using UniqueNode = std::unique_ptr<xmlNode, SFreeNode>;

}  // namespace

CSettingsMap::CSettingsMap(CPasskeyToken token_I) : CSettingsObject(token_I) {}

std::shared_ptr<CSettingsMap> CSettingsMap::New() {
  return std::make_shared<CSettingsMap>(CPasskeyToken());
}

std::vector<std::string> CSettingsMap::GetKeys() const {
  std::vector<std::string> keys;
  keys.reserve(mObjectMap.size());
  for (const auto& entry : mObjectMap) keys.push_back(entry.first);
  return keys;
}

bool CSettingsMap::IsKeyPresent(const std::string& key_I) const {
  return ObjectForKey(key_I) != nullptr;
}

void CSettingsMap::RemoveObjectForKey(const std::string& key_I) { mObjectMap.erase(key_I); }

std::shared_ptr<CSettingsObject> CSettingsMap::ObjectForKey(const std::string& key_I) const {
  const auto found = mObjectMap.find(key_I);
  if (found == mObjectMap.end()) return nullptr;
  if (!found->second) {
    TAVASSERT_TEXT("ObjectForKey: Object in map is null");
    return nullptr;
  }
  if (found->second->GetTypeName() == CSettingsNULL::GetClassTypeName()) return nullptr;
  return found->second;
}

bool CSettingsMap::BoolForKeyWithDefault(const std::string& key_I, bool default_I) const {
  return ObjectForKeyWithDefault<CSettingsBool>(key_I, CSettingsBool::New(default_I))->GetValue();
}

int64_t CSettingsMap::IntegerForKeyWithDefault(const std::string& key_I, int64_t default_I) const {
  return ObjectForKeyWithDefault<CSettingsInteger>(key_I, CSettingsInteger::New(default_I))
      ->GetValue();
}

double CSettingsMap::DoubleForKeyWithDefault(const std::string& key_I, double default_I) const {
  return ObjectForKeyWithDefault<CSettingsDouble>(key_I, CSettingsDouble::New(default_I))
      ->GetValue();
}

std::string CSettingsMap::StringForKeyWithDefault(const std::string& key_I,
                                                  const std::string& default_I) const {
  return ObjectForKeyWithDefault<CSettingsString>(key_I, CSettingsString::New(default_I))
      ->GetValue();
}

std::string CSettingsMap::KEStringForKeyWithDefault(const std::string& key_I,
                                                    const std::string& default_I) const {
  return ObjectForKeyWithDefault<CSettingsKEString>(key_I, CSettingsKEString::New(default_I))
      ->GetValue();
}

std::string CSettingsMap::TypeNameForKeyOrEmpty(const std::string& key_I) const {
  auto object = ObjectForKey(key_I);
  return object ? object->GetTypeName() : std::string();
}

void CSettingsMap::SetKeyAndObject(const std::string& key_I,
                                   std::shared_ptr<CSettingsObject> object_I) {
  if (!XmlUtils::ValidateNodeName(key_I)) TAVASSERT_TEXT("isValidXMLName");
  mObjectMap[key_I] = object_I ? std::move(object_I) : CSettingsNULL::New();
}

void CSettingsMap::SetKeyAndBool(const std::string& key_I, bool value_I) {
  SetKeyAndObject(key_I, CSettingsBool::New(value_I));
}

void CSettingsMap::SetKeyAndInteger(const std::string& key_I, int64_t value_I) {
  SetKeyAndObject(key_I, CSettingsInteger::New(value_I));
}

void CSettingsMap::SetKeyAndDouble(const std::string& key_I, double value_I) {
  SetKeyAndObject(key_I, CSettingsDouble::New(value_I));
}

void CSettingsMap::SetKeyAndString(const std::string& key_I, const std::string& value_I) {
  SetKeyAndObject(key_I, CSettingsString::New(value_I));
}

void CSettingsMap::SetKeyAndKEString(const std::string& key_I, const std::string& value_I) {
  SetKeyAndObject(key_I, CSettingsKEString::New(value_I));
}

void CSettingsMap::MergeMapObject(std::shared_ptr<CSettingsMap> other_I) {
  if (!other_I) return;
  for (const std::string& key : other_I->GetKeys())
    SetKeyAndObject(key, other_I->ObjectForKey(key));
}

std::shared_ptr<CSettingsMap> CSettingsMap::CastToMap(std::shared_ptr<CSettingsObject> object_I,
                                                      bool warn_I) {
  if (!object_I) return nullptr;
  std::shared_ptr<CSettingsMap> result;
  if (object_I->GetTypeName() == GetClassTypeName()) {
    result = std::dynamic_pointer_cast<CSettingsMap>(object_I);
  }
  if (!result && warn_I) {
    TavLog::Warning("CSettingsMap::CastToMap got a %s and failed to cast to CSettingsMap\n",
                    object_I->GetTypeName().c_str());
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsMap::DeepCopy() const {
  auto copy = New();
  for (const auto& entry : mObjectMap) {
    if (!entry.second) TAVASSERT_TEXT("obj.second");
    copy->SetKeyAndObject(entry.first, entry.second ? entry.second->DeepCopy() : nullptr);
  }
  return copy;
}

std::string CSettingsMap::GetTraceString() const {
  std::string trace = GetTypeName() + "[";
  for (const auto& entry : mObjectMap) {
    trace += entry.first;
    trace += ":";
    trace += entry.second ? entry.second->GetTraceString() : std::string();
    trace += ", ";
  }
  // Unconditional: on an empty map this eats "[" and the type's last letter.
  trace.erase(trace.size() - 2);
  return trace + "]";
}

void CSettingsMap::AppendASN1Node(Bytes& out_IO) const {
  out_IO.push_back(
      ASN1Coding::MakeIdentifier({ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_MAP}));
  out_IO.push_back(ASN1Coding::MakeIndefiniteLength());
  for (const auto& entry : mObjectMap) {
    ASN1Coding::EncodeStringToArchive(entry.first, out_IO, false);
    if (entry.second) {
      entry.second->AppendASN1Node(out_IO);
    } else {
      ASN1Coding::EncodeNULLToArchive(out_IO);
    }
  }
  ASN1Coding::EncodeEndOfContentsIdentifierToArchive(out_IO);
}

bool CSettingsMap::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsMap>(other_I);
  if (!other || other->GetKeys() != GetKeys()) return false;
  for (const auto& entry : mObjectMap) {
    auto mine = ObjectForKey(entry.first);
    if (!mine) {
      TAVASSERT_TEXT("mine");
      return false;
    }
    if (!mine->IsEqualTo(other->ObjectForKey(entry.first))) return false;
  }
  return true;
}

std::string CSettingsMap::CreateJSONNode(int level_I) const {
  const std::string tabs(level_I >= 0 ? static_cast<size_t>(level_I) + 1 : 0, '\t');
  const int childLevel = level_I >= 0 ? level_I + 1 : level_I;
  std::string json = "{\n";
  for (const auto& entry : mObjectMap) {
    json += tabs;
    json += "\"";
    json += entry.first;
    json += "\": ";
    json += entry.second ? entry.second->CreateJSONNode(childLevel) : std::string("null");
    json += ",\n";
  }
  // Unconditional: an empty map loses its opening brace too.
  json.erase(json.size() - 2);
  json += "\n";
  if (!tabs.empty()) json.append(tabs.size() - 1, '\t');
  return json + "}";
}

xmlNodePtr CSettingsMap::CreateXMLNode(const std::string& name_I) const {
  UniqueNode node(CSettingsObject::CreateXMLNode(name_I));
  for (const auto& entry : mObjectMap) {
    if (!entry.second) {
      TAVASSERT_TEXT("obj.second");
      continue;
    }
    XmlUtils::AddNodeData(node.get(), entry.second->CreateXMLNode(entry.first));
  }
  return node.release();
}

xmlNodePtr CSettingsMap::CreatePListNode() const {
  UniqueNode node(CSettingsObject::CreatePListNode());
  for (const auto& entry : mObjectMap) {
    XmlUtils::CreateChildNode(node.get(), nullptr, "key", entry.first, true);
    // A null has no property-list form: the key then stands alone.
    if (entry.second) XmlUtils::AddNodeData(node.get(), entry.second->CreatePListNode());
  }
  return node.release();
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromXMLBuffer(const std::string& buffer_I) {
  return CastToMap(CSettingsObject::ReadFromXMLBuffer(buffer_I), true);
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromXMLFile(const std::string& path_I,
                                                            std::string& errorText_O) {
  return CastToMap(CSettingsObject::ReadFromXMLFile(path_I, errorText_O), true);
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  const bool untypedMap = type.empty() && XmlUtils::GetChildCount(node_I) > 0;
  if (!untypedMap && type != GetClassTypeName()) {
    TavLog::Info("CSettingsMap::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto map = New();
  for (xmlNodePtr child = XmlUtils::GetChildNode(node_I, 0); child != nullptr;
       child = XmlUtils::GetNextNode(child)) {
    const std::string key = XmlUtils::GetNodeName(child);
    auto object = CSettingsObject::ReadFromXMLNode(child);
    if (!object) continue;
    // The later of two like names wins; only a hand-written map hears of it.
    if (type.empty() && map->mObjectMap.count(key) != 0) {
      TavLog::Warning("CSettingsMap::ReadFromXMLNode duplicate key %s\n", key.c_str());
    }
    map->SetKeyAndObject(key, object);
  }
  return map;
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "dict") {
    TavLog::Info("CSettingsMap::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto map = New();
  std::string pendingKey;
  for (xmlNodePtr child = XmlUtils::GetChildNode(node_I, 0); child != nullptr;
       child = XmlUtils::GetNextNode(child)) {
    const std::string childName = XmlUtils::GetNodeName(child);
    if (pendingKey.empty() && childName == "key") {
      pendingKey = StringUtilities::Trim_Copy(XmlUtils::GetNodeValue(child));
    } else if (!pendingKey.empty()) {
      if (childName == "key") TAVASSERT_TEXT("childName != \"key\"");
      auto object = CSettingsObject::ReadFromPListNode(child);
      // A value that does not read leaves the key for the next element.
      if (object) {
        map->SetKeyAndObject(pendingKey, object);
        pendingKey.clear();
      }
    } else {
      TavLog::Info("CSettingsMap::ReadFromPListNode got node with name %s\n", childName.c_str());
    }
  }
  return map;
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromJSONNode(const std::string& buffer_I,
                                                             size_t& position_IO) {
  if (position_IO >= buffer_I.size() || buffer_I[position_IO] != '{') return nullptr;
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto map = New();
  bool haveKey = false;
  std::string key;
  bool colonSeen = false;
  std::shared_ptr<CSettingsObject> value;
  size_t pos = position_IO + 1;
  for (;;) {
    SkipCommentsAndSpace(buffer_I, pos);
    if (pos >= buffer_I.size()) return nullptr;
    const char c = buffer_I[pos];
    const bool entryComplete = haveKey && colonSeen && value;

    if (c == '}') {
      if (entryComplete) {
        // {"SbyteS":"<Base64>"} is the byte-string form.
        if (map->ObjectCount() == 0 && key == SETTINGS_JSON_BYTES_KEY) {
          value = CSettingsBytes::New(StringUtilities::GetBytesFromBase64(value->GetStringValue()));
        }
        map->SetKeyAndObject(key, value);
      }
      position_IO = pos + 1;
      return map;
    }
    if (c == ',') {
      if (!entryComplete) return nullptr;
      map->SetKeyAndObject(key, value);
      haveKey = false;
      key.clear();
      colonSeen = false;
      value.reset();
      ++pos;
      continue;
    }
    if (!haveKey) {
      if (c != '"') return nullptr;
      if (value) TAVASSERT_TEXT("!obj");
      if (!CSettingsString::ReadJSONText(buffer_I, pos, key) || key.empty()) return nullptr;
      haveKey = true;
      colonSeen = false;
    } else if (!colonSeen) {
      if (c != ':') return nullptr;
      colonSeen = true;
      ++pos;
    } else if (!value) {
      value = CSettingsObject::ReadFromJSONNode(buffer_I, pos);
      if (!value) return nullptr;
    } else {
      return nullptr;
    }
  }
}

std::shared_ptr<CSettingsMap> CSettingsMap::ReadFromASN1Node(const Bytes& bytes_I,
                                                             size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_MAP}) {
    return nullptr;
  }
  const unsigned long length = ASN1Coding::DecodeLengthFromArchive(bytes_I, position_IO);
  if (length != ASN1Coding::IndefiniteLength && length != 0) {
    TAVASSERT_TEXT("(length == ASN1Coding::IndefiniteLength) || (length == 0)");
  }
  auto map = New();
  if (length != ASN1Coding::IndefiniteLength) return map;

  CSettingsDepthGuard depth;
  if (depth.TooDeep()) throw std::runtime_error("settings nest too deep in archive");
  while (!ASN1Coding::DecodeEndOfContentsIdentifierFromArchive(bytes_I, position_IO)) {
    const auto keyIdentifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
    // Anything but a key is stepped over a byte at a time.
    if (keyIdentifier !=
        ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_UTF8_STRING}) {
      continue;
    }
    const std::string key = ASN1Coding::DecodeStringFromArchive(bytes_I, position_IO);
    auto object = CSettingsObject::ReadFromASN1Node(bytes_I, position_IO);
    if (object) map->SetKeyAndObject(key, object);
  }
  return map;
}
