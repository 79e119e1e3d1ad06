#include "settings/CSettingsNULL.h"

#include "common/TavLog.h"
#include "settings/ASN1Coding.h"

CSettingsNULL::CSettingsNULL(CPasskeyToken token_I) : CSettingsObject(token_I) {}

std::shared_ptr<CSettingsNULL> CSettingsNULL::New() {
  return std::make_shared<CSettingsNULL>(CPasskeyToken());
}

std::shared_ptr<CSettingsObject> CSettingsNULL::DeepCopy() const { return New(); }

std::string CSettingsNULL::GetTraceString() const {
  return GetTypeName() + "[" + GetStringValue() + "]";
}

void CSettingsNULL::AppendASN1Node(Bytes& out_IO) const { ASN1Coding::EncodeNULLToArchive(out_IO); }

bool CSettingsNULL::IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const {
  return std::dynamic_pointer_cast<CSettingsNULL>(other_I) != nullptr;
}

std::string CSettingsNULL::CreateJSONNode(int /*level_I*/) const { return "null"; }

std::shared_ptr<CSettingsNULL> CSettingsNULL::ReadFromXMLNode(xmlNodePtr node_I) {
  std::string type;
  if (!ReadXMLFrame(node_I, type)) return nullptr;
  if (type != GetClassTypeName()) {
    // The null reader has always reported under the bool reader's name.
    TavLog::Info("CSettingsBool::ReadFromXMLNode got object of type %s\n", type.c_str());
    return nullptr;
  }
  return New();
}

std::shared_ptr<CSettingsNULL> CSettingsNULL::ReadFromASN1Node(const Bytes& bytes_I,
                                                               size_t& position_IO) {
  const auto identifier = ASN1Coding::DecodeIdentifierFromArchive(bytes_I, position_IO, true);
  if (identifier != ASN1Coding::Identifier{ASN1Coding::ECLASS_UNIVERSAL, ASN1Coding::ETYPE_NULL}) {
    return nullptr;
  }
  ASN1Coding::DecodeNULLFromArchive(bytes_I, position_IO);
  return New();
}
