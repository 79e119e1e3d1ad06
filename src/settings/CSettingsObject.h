#pragma once
// The settings tree: the one model of every structured value the program
// reads or writes, with XML, property-list, JSON, ASN.1 and compressed forms.
//
// Nodes live behind shared pointers. A missing node is an empty pointer; a
// value stored as explicitly null is a CSettingsNULL, which every lookup
// treats as absent. No reader throws past its entry point: a document that
// cannot be used gives an empty pointer, and so does one whose containers
// nest deeper than CSettingsDepthGuard::kMaxNestingDepth (200) levels.

#include <libxml/tree.h>

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "settings/SDoublePoint.h"
#include "settings/SDoubleRect.h"
#include "settings/SPoint.h"
#include "settings/SRect.h"

class CSettingsArray;
class CSettingsBool;
class CSettingsBytes;
class CSettingsDouble;
class CSettingsInteger;
class CSettingsKEString;
class CSettingsMap;
class CSettingsNULL;
class CSettingsString;

// Root element of the XML form.
inline constexpr char SETTINGS_NODE_ROOT_ID[] = "root";
// Element of each item of an array in the XML form.
inline constexpr char SETTINGS_ARRAY_ELEMENT_NAME[] = "ArrayElement";
// Stands for "]" inside a CDATA section, so that no text can end it early.
inline constexpr char RSQBRACKETENTITY[] = "&rsqbracket;";

class CSettingsObject : public std::enable_shared_from_this<CSettingsObject> {
 public:
  // Only the family can make a token, so nodes are made through New alone.
  class CPasskeyToken {
   private:
    CPasskeyToken() = default;
    friend class CSettingsObject;
    friend class CSettingsArray;
    friend class CSettingsBool;
    friend class CSettingsBytes;
    friend class CSettingsDouble;
    friend class CSettingsInteger;
    friend class CSettingsKEString;
    friend class CSettingsMap;
    friend class CSettingsNULL;
    friend class CSettingsString;
  };

  using Bytes = std::vector<unsigned char>;

  virtual std::shared_ptr<CSettingsObject> DeepCopy() const = 0;
  virtual ~CSettingsObject() = default;
  virtual std::string GetTypeName() const = 0;
  virtual std::string GetStringValue() const = 0;
  virtual std::string GetTraceString() const = 0;
  virtual void AppendASN1Node(Bytes& out_IO) const = 0;
  virtual bool IsEqualTo(std::shared_ptr<CSettingsObject> other_I) const = 0;
  virtual std::string CreateJSONNode(int level_I) const = 0;
  // The node builders give a new element that the caller owns; an invalid
  // key throws std::invalid_argument from XmlUtils::CreateNode.
  virtual xmlNodePtr CreateXMLNode(const std::string& name_I) const;
  virtual xmlNodePtr CreatePListNode() const;
  virtual void AddContentToNode(xmlNodePtr node_I, const std::string& content_I) const;

  // XML and property-list forms.
  static std::shared_ptr<CSettingsObject> ReadFromXMLFile(const std::string& path_I,
                                                          std::string& errorText_O);
  static std::shared_ptr<CSettingsObject> ReadFromXMLBuffer(const std::string& buffer_I);
  static std::shared_ptr<CSettingsObject> ReadFromXMLDocument(xmlDocPtr doc_I);
  static std::shared_ptr<CSettingsObject> ReadFromXMLNode(xmlNodePtr node_I);
  static std::shared_ptr<CSettingsObject> ReadFromPListNode(xmlNodePtr node_I);
  // Without a name: root "root" and an XML declaration; with one: that root
  // and no declaration. Throws std::invalid_argument for a key that is no
  // XML name.
  std::string GetXMLString(const std::string& name_I) const;
  std::string GetPListString(bool withDeclaration_I) const;
  bool SaveXMLToFile(const std::string& path_I) const;

  // JSON form.
  static std::shared_ptr<CSettingsObject> ReadFromJSONFile(const std::string& path_I);
  static std::shared_ptr<CSettingsObject> ReadFromJSONBuffer(const std::string& buffer_I);
  static std::shared_ptr<CSettingsObject> ReadFromJSONNode(const std::string& buffer_I,
                                                           size_t& position_IO);
  std::string GetJSONString() const;
  bool SaveJSONToFile(const std::string& path_I) const;

  // ASN.1 and compressed forms.
  Bytes GetASN1Binary() const;
  Bytes GetCompressedBinary() const;
  static std::shared_ptr<CSettingsObject> ReadFromASN1Binary(const Bytes& bytes_I);
  static std::shared_ptr<CSettingsObject> ReadFromASN1Node(const Bytes& bytes_I,
                                                           size_t& position_IO);
  static std::shared_ptr<CSettingsObject> ReadFromCompressedBinary(const Bytes& bytes_I);

  // Language and platform filters of the XML readers: a node marked for
  // another language or platform than the filter's is left out.
  static bool ValidForCurrentLangAndPlat(const std::string& lang_I, const std::string& plat_I);
  static void SetPlatformIDFilter(const std::string& id_I);
  static void SetLanguageIDFilter(const std::string& id_I);
  static std::string PlatformIDFilter();
  static std::string LanguageIDFilter();

  // Freezing of the small geometric structures into maps, for T in SRect,
  // SDoubleRect, SPoint and SDoublePoint.
  template <typename T>
  static std::shared_ptr<CSettingsMap> FromComplexType(const T& value_I);
  template <typename T>
  T ToComplexType() const;

 protected:
  explicit CSettingsObject(CPasskeyToken /*token_I*/) {}

  // The frame shared by the XML readers: reads the attribute `type` and
  // gives false, silently, when the node is for another language or platform.
  static bool ReadXMLFrame(xmlNodePtr node_I, std::string& type_O);
  // Skips "//" comments and white space; gives the position of the next
  // character that is neither.
  static void SkipCommentsAndSpace(const std::string& buffer_I, size_t& position_IO);
  static void SkipComments(const std::string& buffer_I, size_t& position_IO);
  // Digits and "+ - . e E": the characters a JSON number is scanned over.
  static bool IsJSONNumberCharacter(char character_I);

 private:
  static std::string mPlatformID;
  static std::string mLanguageID;
};

template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SRect>(const SRect& value_I);
template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SDoubleRect>(
    const SDoubleRect& value_I);
template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SPoint>(const SPoint& value_I);
template <>
std::shared_ptr<CSettingsMap> CSettingsObject::FromComplexType<SDoublePoint>(
    const SDoublePoint& value_I);
template <>
SRect CSettingsObject::ToComplexType<SRect>() const;
template <>
SDoubleRect CSettingsObject::ToComplexType<SDoubleRect>() const;
template <>
SPoint CSettingsObject::ToComplexType<SPoint>() const;
template <>
SDoublePoint CSettingsObject::ToComplexType<SDoublePoint>() const;
