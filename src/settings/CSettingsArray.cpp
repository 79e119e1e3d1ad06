#include "settings/CSettingsArray.h"

#include <stdexcept>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
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

CSettingsArray::CSettingsArray(CPasskeyToken token_I) : CSettingsObject(token_I) {}

std::shared_ptr<CSettingsArray> CSettingsArray::New() {
  return std::make_shared<CSettingsArray>(CPasskeyToken());
}

std::vector<size_t> CSettingsArray::GetIndexes() const {
  std::vector<size_t> indexes(mObjectVector.size());
  for (size_t i = 0; i < indexes.size(); ++i) indexes[i] = i;
  return indexes;
}

void CSettingsArray::AddObject(std::shared_ptr<CSettingsObject> object_I) {
  mObjectVector.push_back(object_I ? std::move(object_I) : CSettingsNULL::New());
}

void CSettingsArray::AddBool(bool value_I) { AddObject(CSettingsBool::New(value_I)); }
void CSettingsArray::AddInteger(int64_t value_I) { AddObject(CSettingsInteger::New(value_I)); }
void CSettingsArray::AddDouble(double value_I) { AddObject(CSettingsDouble::New(value_I)); }
void CSettingsArray::AddString(const std::string& value_I) {
  AddObject(CSettingsString::New(value_I));
}

std::shared_ptr<CSettingsObject> CSettingsArray::ObjectForIndex(size_t index_I) const {
  if (index_I >= mObjectVector.size()) return nullptr;
  const std::shared_ptr<CSettingsObject>& object = mObjectVector[index_I];
  if (!object) {
    TAVASSERT_TEXT("object");
    return nullptr;
  }
  if (object->GetTypeName() == CSettingsNULL::GetClassTypeName()) return nullptr;
  return object;
}

bool CSettingsArray::BoolForIndexWithDefault(size_t index_I, bool default_I) const {
  return ObjectForIndexWithDefault<CSettingsBool>(index_I, CSettingsBool::New(default_I))
      ->GetValue();
}

int64_t CSettingsArray::IntegerForIndexWithDefault(size_t index_I, int64_t default_I) const {
  return ObjectForIndexWithDefault<CSettingsInteger>(index_I, CSettingsInteger::New(default_I))
      ->GetValue();
}

double CSettingsArray::DoubleForIndexWithDefault(size_t index_I, double default_I) const {
  return ObjectForIndexWithDefault<CSettingsDouble>(index_I, CSettingsDouble::New(default_I))
      ->GetValue();
}

std::string CSettingsArray::StringForIndexWithDefault(size_t index_I,
                                                      const std::string& default_I) const {
  return ObjectForIndexWithDefault<CSettingsString>(index_I, CSettingsString::New(default_I))
      ->GetValue();
}

std::string CSettingsArray::TypeNameForIndexOrEmpty(size_t index_I) const {
  auto object = ObjectForIndex(index_I);
  return object ? object->GetTypeName() : std::string();
}

void CSettingsArray::SetObjectAtIndex(size_t index_I, std::shared_ptr<CSettingsObject> object_I) {
  if (index_I < mObjectVector.size()) {
    mObjectVector[index_I] = object_I ? std::move(object_I) : CSettingsNULL::New();
  } else if (index_I == mObjectVector.size()) {
    AddObject(std::move(object_I));
  }
}

bool CSettingsArray::IsStringPresent(const std::string& text_I, bool ignoreCase_I) const {
  if (text_I.empty()) return false;
  for (const auto& object : mObjectVector) {
    auto text = std::dynamic_pointer_cast<CSettingsString>(object);
    if (!text || text->GetValue().empty()) continue;
    if (ignoreCase_I ? StringUtilities::IEquals(text->GetValue(), text_I)
                     : text->GetValue() == text_I) {
      return true;
    }
  }
  return false;
}

std::shared_ptr<CSettingsArray> CSettingsArray::CastToArray(
    std::shared_ptr<CSettingsObject> object_I, bool warn_I) {
  if (!object_I) return nullptr;
  if (object_I->GetTypeName() != GetClassTypeName()) {
    if (warn_I) {
      TavLog::Warning("CSettingsArray::CastToArray got a %s which is not a CSettingsArray\n",
                      object_I->GetTypeName().c_str());
    }
    return nullptr;
  }
  auto result = std::dynamic_pointer_cast<CSettingsArray>(object_I);
  if (!result && warn_I) {
    TavLog::Warning("CSettingsArray::CastToArray failed to cast to CSettingsArray\n");
  }
  return result;
}

std::shared_ptr<CSettingsObject> CSettingsArray::DeepCopy() const {
  auto copy = New();
  copy->mObjectVector.reserve(mObjectVector.size());
  for (const auto& object : mObjectVector) {
    if (!object) TAVASSERT_TEXT("obj");
    copy->AddObject(object ? object->DeepCopy() : nullptr);
  }
  return copy;
}

std::string CSettingsArray::GetTraceString() const {
  std::string trace = GetTypeName() + "[";
  for (const auto& object : mObjectVector) {
    trace += "0:";
    trace += object ? object->GetTraceString() : std::string();
    trace += ", ";
  }
  // Unconditional: on an empty array this eats "[" and the type's last letter.
  trace.erase(trace.size() - 2);
  return trace + "]";
}

void CSettingsArray::AppendASN1Node(Bytes& out_IO) const {
  out_IO.push_back(ASN1Coding::MakeIdentifier(
      {ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_ARRAY}));
  out_IO.push_back(ASN1Coding::MakeIndefiniteLength());
  for (const auto& object : mObjectVector) {
    if (object) object->AppendASN1Node(out_IO);
  }
  ASN1Coding::EncodeEndOfContentsIdentifierToArchive(out_IO);
}

bool CSettingsArray::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  auto other = std::dynamic_pointer_cast<CSettingsArray>(other_I);
  if (!other || other->ObjectCount() != ObjectCount()) return false;
  for (size_t i = 0; i < mObjectVector.size(); ++i) {
    if (!mObjectVector[i]) {
      TAVASSERT_TEXT("mObjectVector[i]");
      return false;
    }
    // The other side is looked up, so a null never equals anything here.
    if (!mObjectVector[i]->IsEqualTo(other->ObjectForIndex(i))) return false;
  }
  return true;
}

std::string CSettingsArray::CreateJSONNode(int level_I) const {
  const std::string tabs(level_I >= 0 ? static_cast<size_t>(level_I) + 1 : 0, '\t');
  const int childLevel = level_I >= 0 ? level_I + 1 : level_I;
  std::string json = "[\n";
  for (const auto& object : mObjectVector) {
    json += tabs;
    json += object ? object->CreateJSONNode(childLevel) : std::string("null");
    json += ",\n";
  }
  // Unconditional: an empty array loses its "[" too.
  json.erase(json.size() - 2);
  json += "\n";
  if (!tabs.empty()) json.append(tabs.size() - 1, '\t');
  return json + "]";
}

xmlNodePtr CSettingsArray::CreateXMLNode(const std::string& name_I) const {
  UniqueNode node(CSettingsObject::CreateXMLNode(name_I));
  for (const auto& object : mObjectVector) {
    if (!object) {
      TAVASSERT_TEXT("obj");
      continue;
    }
    XmlUtils::AddNodeData(node.get(), object->CreateXMLNode(SETTINGS_ARRAY_ELEMENT_NAME));
  }
  return node.release();
}

xmlNodePtr CSettingsArray::CreatePListNode() const {
  UniqueNode node(CSettingsObject::CreatePListNode());
  for (const auto& object : mObjectVector) {
    if (object) XmlUtils::AddNodeData(node.get(), object->CreatePListNode());
  }
  return node.release();
}

std::shared_ptr<CSettingsArray> CSettingsArray::ReadFromXMLFile(const std::string& path_I,
                                                                std::string& errorText_O) {
  return CastToArray(CSettingsObject::ReadFromXMLFile(path_I, errorText_O), true);
}

std::shared_ptr<CSettingsArray> CSettingsArray::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    TavLog::Info("CSettingsArray::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto array = New();
  for (xmlNodePtr child = XmlUtils::GetChildNode(node_I, 0); child != nullptr;
       child = XmlUtils::GetNextNode(child)) {
    auto object = CSettingsObject::ReadFromXMLNode(child);
    // Items of another name are read and dropped.
    if (object && XmlUtils::GetNodeName(child) == SETTINGS_ARRAY_ELEMENT_NAME) {
      array->AddObject(object);
    }
  }
  return array;
}

std::shared_ptr<CSettingsArray> CSettingsArray::ReadFromPListNode(xmlNodePtr node_I) {
  const std::string name = XmlUtils::GetNodeName(node_I);
  if (name != "array") {
    TavLog::Info("CSettingsArray::ReadFromPListNode got object of type %s\n", name.c_str());
    return nullptr;
  }
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto array = New();
  for (xmlNodePtr child = XmlUtils::GetChildNode(node_I, 0); child != nullptr;
       child = XmlUtils::GetNextNode(child)) {
    auto object = CSettingsObject::ReadFromPListNode(child);
    if (object) array->AddObject(object);
  }
  return array;
}

std::shared_ptr<CSettingsArray> CSettingsArray::ReadFromJSONNode(const std::string& buffer_I,
                                                                 size_t& position_IO) {
  if (position_IO >= buffer_I.size() || buffer_I[position_IO] != '[') return nullptr;
  CSettingsDepthGuard depth;
  if (depth.TooDeep()) return nullptr;

  auto array = New();
  std::shared_ptr<CSettingsObject> pending;
  size_t pos = position_IO + 1;
  for (;;) {
    SkipCommentsAndSpace(buffer_I, pos);
    if (pos >= buffer_I.size()) return nullptr;
    const char c = buffer_I[pos];
    if (c == ']') {
      if (pending) array->AddObject(pending);
      position_IO = pos + 1;
      return array;
    }
    if (c == ',') {
      if (!pending) return nullptr;
      array->AddObject(pending);
      pending.reset();
      ++pos;
      continue;
    }
    if (pending) return nullptr;
    pending = CSettingsObject::ReadFromJSONNode(buffer_I, pos);
    if (!pending) return nullptr;
  }
}

std::shared_ptr<CSettingsArray> CSettingsArray::ReadFromASN1Node(const Bytes& bytes_I,
                                                                 size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier !=
      ASN1Coding::Identifier{ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_ARRAY}) {
    return nullptr;
  }
  const unsigned long length = ASN1Coding::DecodeLengthFromArchive(bytes_I, position_IO);
  if (length != ASN1Coding::IndefiniteLength && length != 0) {
    TAVASSERT_TEXT("(length == ASN1Coding::IndefiniteLength) || (length == 0)");
  }
  auto array = New();
  if (length != ASN1Coding::IndefiniteLength) return array;

  CSettingsDepthGuard depth;
  if (depth.TooDeep()) throw std::runtime_error("settings nest too deep in archive");
  while (!ASN1Coding::DecodeEndOfContentsIdentifierFromArchive(bytes_I, position_IO)) {
    array->AddObject(CSettingsObject::ReadFromASN1Node(bytes_I, position_IO));
  }
  return array;
}
