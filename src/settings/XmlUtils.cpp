#include "settings/XmlUtils.h"

#include <libxml/parser.h>
#include <libxml/xmlerror.h>
#include <libxml/xmlsave.h>
#include <libxml/xpathInternals.h>

#include <memory>
#include <stdexcept>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "common/TavReplaceFile.h"

namespace XmlUtils {

namespace {

// Parse options of files: no warnings, pedantic, never the network.
constexpr int kFileParseOptions = XML_PARSE_NOWARNING | XML_PARSE_PEDANTIC | XML_PARSE_NONET;
// Parse options of buffers: pedantic, never the network.
constexpr int kMemoryParseOptions = XML_PARSE_PEDANTIC | XML_PARSE_NONET;
static_assert(kFileParseOptions == 2240 && kMemoryParseOptions == 2176);

// The URL that names a buffer in libxml2's messages.
constexpr char kBufferURL[] = "untitled.xml";

const xmlChar* ToXml(const std::string& text_I) {
  return reinterpret_cast<const xmlChar*>(text_I.c_str());
}

std::string FromXml(const xmlChar* text_I) {
  return text_I != nullptr ? std::string(reinterpret_cast<const char*>(text_I)) : std::string();
}

// Takes an xmlChar* that libxml2 allocated, gives its text and frees it.
std::string TakeXml(xmlChar* text_I) {
  std::string result = FromXml(text_I);
  if (text_I != nullptr) xmlFree(text_I);
  return result;
}

void SilentGenericError(void* /*context_I*/, const char* /*format_I*/, ...) {}

// Errors reach the log once, through TraceXmlError; libxml2 is kept from
// printing them to stderr as well. Its handler is per thread, so this runs
// before each parse.
void SilenceLibraryOutput() {
  xmlSetGenericErrorFunc(nullptr, SilentGenericError);
  xmlThrDefSetGenericErrorFunc(nullptr, SilentGenericError);
}

// Replaces the root of doc_I by node_I and frees the one it had.
void ReplaceRoot(xmlDocPtr doc_I, xmlNodePtr node_I) {
  if (xmlDocGetRootElement(doc_I) != nullptr) TAVASSERT_TEXT("!LxmlDocGetRootElement(xmlDoc_I)");
  xmlNodePtr previous = xmlDocSetRootElement(doc_I, node_I);
  if (previous != nullptr && previous != node_I) xmlFreeNode(previous);
}

std::string AttributeValue(xmlAttrPtr attribute_I) {
  return TakeXml(xmlNodeListGetString(attribute_I->doc, attribute_I->children, 1));
}

bool IsElement(xmlNodePtr node_I) { return node_I != nullptr && node_I->type == XML_ELEMENT_NODE; }

// The attribute as written on the element; unlike xmlHasProp it never gives
// a declaration from a DTD.
xmlAttrPtr FindAttribute(xmlNodePtr node_I, const xmlChar* name_I) {
  for (xmlAttrPtr attribute = node_I->properties; attribute != nullptr;
       attribute = attribute->next) {
    if (xmlStrEqual(attribute->name, name_I)) return attribute;
  }
  return nullptr;
}

}  // namespace

void Initialize() {
  xmlInitParser();
  SilenceLibraryOutput();
}

void Cleanup() { xmlCleanupParser(); }

xmlDocPtr NewXmlDocument() { return xmlNewDoc(BAD_CAST "1.0"); }

xmlDocPtr LoadXmlDocument(const std::string& path_I) {
  SilenceLibraryOutput();
  xmlDocPtr doc = xmlReadFile(path_I.c_str(), nullptr, kFileParseOptions);
  TraceXmlError();
  return doc;
}

xmlDocPtr LoadXmlDocumentWithWarningsOnErr(const std::string& path_I, std::string& errorText_O) {
  xmlDocPtr doc = LoadXmlDocument(path_I);
  errorText_O = ConstructErrorMessage();
  return doc;
}

xmlDocPtr LoadXmlDocumentFromMemory(const std::string& buffer_I) {
  SilenceLibraryOutput();
  if (buffer_I.size() > static_cast<size_t>(INT32_MAX)) return nullptr;
  xmlDocPtr doc = xmlReadMemory(buffer_I.data(), static_cast<int>(buffer_I.size()), kBufferURL,
                                nullptr, kMemoryParseOptions);
  TraceXmlError();
  return doc;
}

bool SaveXmlDocument(const std::string& path_I, xmlDocPtr doc_I, int options_I) {
  TavLog::Info("XmlUtils::SaveXmlDocument - saving to file: %s...\n", path_I.c_str());
  SilenceLibraryOutput();
  return TavReplaceFile(path_I, [doc_I, options_I](const std::string& temporary_I) {
    xmlSaveCtxtPtr context = xmlSaveToFilename(temporary_I.c_str(), "UTF-8", options_I);
    if (context == nullptr) {
      TraceXmlError();
      return false;
    }
    xmlSaveDoc(context, doc_I);
    TraceXmlError();
    return xmlSaveClose(context) >= 0;
  });
}

std::string GetDocumentStringAndFormat(xmlDocPtr doc_I, bool format_I, bool withDeclaration_I) {
  if (doc_I == nullptr) return {};
  std::unique_ptr<xmlBuffer, decltype(&xmlBufferFree)> buffer(xmlBufferCreate(), xmlBufferFree);
  if (!buffer) return {};
  int options = format_I ? XML_SAVE_FORMAT : 0;
  if (!withDeclaration_I) options |= XML_SAVE_NO_DECL;
  xmlSaveCtxtPtr context = xmlSaveToBuffer(buffer.get(), "UTF-8", options);
  if (context == nullptr) return {};
  const long written = xmlSaveDoc(context, doc_I);
  if (xmlSaveClose(context) < 0 || written < 0) return {};
  return std::string(reinterpret_cast<const char*>(xmlBufferContent(buffer.get())),
                     static_cast<size_t>(xmlBufferLength(buffer.get())));
}

void FreeDoc(xmlDocPtr doc_I) {
  if (doc_I != nullptr) xmlFreeDoc(doc_I);
}

void MergeDocuments(xmlDocPtr target_IO, xmlDocPtr source_I) {
  if (target_IO == nullptr || source_I == nullptr) return;
  MergeNodes(xmlDocGetRootElement(target_IO), xmlDocGetRootElement(source_I));
}

void TraceXmlError() {
  const xmlError* error = xmlGetLastError();
  if (error == nullptr || error->code == XML_ERR_OK) return;
  TavLog::Error("TraceXmlError: %s", error->message != nullptr ? error->message : "");
  xmlResetLastError();
}

std::string ConstructErrorMessage() {
  const xmlError* error = xmlGetLastError();
  if (error == nullptr || error->code == XML_ERR_OK) return {};
  std::string message = error->message != nullptr ? error->message : "";
  if (!message.empty() && message.back() == '\n') message.pop_back();
  message += " at line: " + std::to_string(error->line);
  xmlResetLastError();
  return message;
}

xmlNodePtr GetRootNode(xmlDocPtr doc_I) {
  if (doc_I == nullptr) return nullptr;
  xmlNodePtr root = xmlDocGetRootElement(doc_I);
  return root != nullptr ? xmlCopyNode(root, 1) : nullptr;
}

xmlNodePtr GetNextNode(xmlNodePtr node_I) {
  return node_I != nullptr ? xmlNextElementSibling(node_I) : nullptr;
}

int GetChildCount(xmlNodePtr node_I) {
  return node_I != nullptr ? static_cast<int>(xmlChildElementCount(node_I)) : 0;
}

xmlNodePtr GetChildNode(xmlNodePtr node_I, int index_I) {
  if (node_I == nullptr || index_I < 0) return nullptr;
  xmlNodePtr child = xmlFirstElementChild(node_I);
  for (int i = 0; child != nullptr && i < index_I; ++i) child = xmlNextElementSibling(child);
  return child;
}

xmlNodePtr GetChildNode(xmlNodePtr node_I, const std::string& name_I) {
  if (node_I == nullptr) return nullptr;
  for (xmlNodePtr child = xmlFirstElementChild(node_I); child != nullptr;
       child = xmlNextElementSibling(child)) {
    if (FromXml(child->name) == name_I) return child;
  }
  return nullptr;
}

std::string GetNodeName(xmlNodePtr node_I) {
  return node_I != nullptr ? FromXml(node_I->name) : std::string();
}

std::string GetNodeValue(xmlNodePtr node_I) {
  return node_I != nullptr ? TakeXml(xmlNodeGetContent(node_I)) : std::string();
}

long GetNodeLineNumber(xmlNodePtr node_I) { return node_I != nullptr ? xmlGetLineNo(node_I) : -1; }

std::string GetNodeAttribValue(xmlNodePtr node_I, const std::string& attribute_I) {
  if (!IsElement(node_I)) return {};
  return TakeXml(xmlGetProp(node_I, ToXml(attribute_I)));
}

std::string NodeToString(xmlNodePtr node_I, bool format_I) {
  if (node_I == nullptr) return {};
  std::unique_ptr<xmlBuffer, decltype(&xmlBufferFree)> buffer(xmlBufferCreate(), xmlBufferFree);
  if (!buffer) return {};
  if (xmlNodeDump(buffer.get(), node_I->doc, node_I, 0, format_I ? 1 : 0) < 0) return {};
  return std::string(reinterpret_cast<const char*>(xmlBufferContent(buffer.get())),
                     static_cast<size_t>(xmlBufferLength(buffer.get())));
}

void FreeNode(xmlNodePtr node_I) {
  if (node_I == nullptr) return;
  xmlUnlinkNode(node_I);
  xmlFreeNode(node_I);
}

xmlNodePtr CopyNode(xmlNodePtr node_I, bool recursive_I) {
  return node_I != nullptr ? xmlCopyNode(node_I, recursive_I ? 1 : 0) : nullptr;
}

xmlNodePtr CreateNode(const std::string& name_I) {
  if (!ValidateNodeName(name_I)) {
    const std::string message = "XmlUtils::CreateNode passed invalid node name: \"" + name_I + "\"";
    TavLog::Error("%s\n", message.c_str());
    throw std::invalid_argument(message);
  }
  return xmlNewNode(nullptr, ToXml(name_I));
}

xmlNodePtr CreateRootNode(xmlDocPtr doc_I, const std::string& name_I) {
  if (doc_I == nullptr) return nullptr;
  xmlNodePtr node = CreateNode(name_I);
  ReplaceRoot(doc_I, node);
  return node;
}

void SetRootNode(xmlDocPtr doc_I, xmlNodePtr node_I) {
  if (doc_I == nullptr || node_I == nullptr) return;
  ReplaceRoot(doc_I, node_I);
}

xmlNodePtr CreateChildNode(xmlNodePtr parent_I, xmlNsPtr namespace_I, const std::string& name_I,
                           const std::string& content_I, bool escape_I) {
  if (parent_I == nullptr) return nullptr;
  if (content_I == kNoContent) return xmlNewChild(parent_I, namespace_I, ToXml(name_I), nullptr);
  if (!escape_I) return xmlNewChild(parent_I, namespace_I, ToXml(name_I), ToXml(content_I));
  xmlChar* escaped = xmlEncodeSpecialChars(parent_I->doc, ToXml(content_I));
  xmlNodePtr child = xmlNewChild(parent_I, namespace_I, ToXml(name_I), escaped);
  xmlFree(escaped);
  return child;
}

xmlNsPtr CreateNamespace(xmlNodePtr node_I, const std::string& href_I,
                         const std::string& prefix_I) {
  if (node_I == nullptr) return nullptr;
  return xmlNewNs(node_I, ToXml(href_I), prefix_I == kNoContent ? nullptr : ToXml(prefix_I));
}

xmlNodePtr CreateRootComment(xmlDocPtr doc_I, const std::string& text_I) {
  if (doc_I == nullptr) return nullptr;
  xmlNodePtr comment = xmlNewDocComment(doc_I, ToXml(text_I));
  xmlNodePtr root = xmlDocGetRootElement(doc_I);
  if (root != nullptr) return xmlAddPrevSibling(root, comment);
  return xmlAddChild(reinterpret_cast<xmlNodePtr>(doc_I), comment);
}

xmlNodePtr CreateComment(xmlNodePtr parent_I, const std::string& text_I) {
  if (parent_I == nullptr) return nullptr;
  return xmlAddChild(parent_I, xmlNewDocComment(parent_I->doc, ToXml(text_I)));
}

xmlNodePtr AddNodeData(xmlNodePtr parent_I, xmlNodePtr child_I) {
  if (parent_I == nullptr || child_I == nullptr) return nullptr;
  return xmlAddChild(parent_I, child_I);
}

void SetNodeName(xmlNodePtr node_I, const std::string& name_I) {
  if (node_I != nullptr) xmlNodeSetName(node_I, ToXml(name_I));
}

void SetNodeContent(xmlNodePtr node_I, const std::string& content_I, bool escape_I) {
  if (node_I == nullptr) return;
  if (!escape_I) {
    xmlNodeSetContent(node_I, ToXml(content_I));
    return;
  }
  xmlChar* escaped = xmlEncodeSpecialChars(node_I->doc, ToXml(content_I));
  xmlNodeSetContent(node_I, escaped);
  xmlFree(escaped);
}

void SetNodeContentCDATA(xmlNodePtr node_I, const std::string& content_I) {
  if (node_I == nullptr || content_I.size() > static_cast<size_t>(INT32_MAX)) return;
  xmlNodePtr section =
      xmlNewCDataBlock(node_I->doc, ToXml(content_I), static_cast<int>(content_I.size()));
  xmlAddChild(node_I, section);
}

void AddNodeContent(xmlNodePtr node_I, const std::string& content_I) {
  if (node_I == nullptr || content_I.size() > static_cast<size_t>(INT32_MAX)) return;
  xmlNodeAddContentLen(node_I, ToXml(content_I), static_cast<int>(content_I.size()));
}

void SetNodeAttribValue(xmlNodePtr node_I, const std::string& attribute_I,
                        const std::string& value_I) {
  if (IsElement(node_I)) xmlSetProp(node_I, ToXml(attribute_I), ToXml(value_I));
}

void RemoveNodeAttrib(xmlNodePtr node_I, const std::string& attribute_I) {
  if (IsElement(node_I)) xmlUnsetProp(node_I, ToXml(attribute_I));
}

bool ValidateNodeName(const std::string& name_I) {
  // libxml2 reads C strings: a name with a zero byte would pass on its prefix.
  if (name_I.find('\0') != std::string::npos) return false;
  return xmlValidateName(ToXml(name_I), 0) == 0;
}

xmlXPathContextPtr GetContext(xmlDocPtr doc_I) {
  return doc_I != nullptr ? xmlXPathNewContext(doc_I) : nullptr;
}

xmlXPathObjectPtr GetXPathObject(xmlXPathContextPtr context_I, const std::string& xpath_I) {
  if (context_I == nullptr) return nullptr;
  SilenceLibraryOutput();
  xmlXPathObjectPtr object = xmlXPathEvalExpression(ToXml(xpath_I), context_I);
  TraceXmlError();
  return object;
}

xmlXPathObjectPtr GetXPathObject(xmlDocPtr doc_I, const std::string& xpath_I) {
  xmlXPathContextPtr context = GetContext(doc_I);
  xmlXPathObjectPtr object = GetXPathObject(context, xpath_I);
  FreeXPathContext(context);
  return object;
}

void FreeXPathObject(xmlXPathObjectPtr object_I) {
  if (object_I != nullptr) xmlXPathFreeObject(object_I);
}

void FreeXPathContext(xmlXPathContextPtr context_I) {
  if (context_I != nullptr) xmlXPathFreeContext(context_I);
}

xmlNodePtr GetNodeByXPath(xmlDocPtr doc_I, const std::string& xpath_I) {
  xmlXPathObjectPtr object = GetXPathObject(doc_I, xpath_I);
  xmlNodePtr node = GetNodeByIndex(object, 0);
  FreeXPathObject(object);
  return node;
}

int NodeCount(xmlXPathObjectPtr object_I) {
  if (object_I == nullptr || object_I->type != XPATH_NODESET || object_I->nodesetval == nullptr) {
    return 0;
  }
  return object_I->nodesetval->nodeNr;
}

xmlNodePtr GetNodeByIndex(xmlXPathObjectPtr object_I, int index_I) {
  if (index_I < 0 || index_I >= NodeCount(object_I)) return nullptr;
  return xmlCopyNode(object_I->nodesetval->nodeTab[index_I], 1);
}

xmlNodePtr GetNodeByAttrib(xmlXPathObjectPtr object_I, const std::string& attribute_I,
                           const std::string& value_I) {
  for (int index = 0; index < 0x7FFFFFFF; ++index) {
    xmlNodePtr node = GetNodeByIndex(object_I, index);
    if (node == nullptr) return nullptr;
    const std::string value = GetNodeAttribValue(node, attribute_I);
    if (!value.empty() && value == value_I) return node;
    FreeNode(node);
  }
  return nullptr;
}

bool XPathExists(xmlDocPtr doc_I, const std::string& xpath_I) {
  xmlXPathObjectPtr object = GetXPathObject(doc_I, xpath_I);
  const bool exists = NodeCount(object) > 0;
  FreeXPathObject(object);
  return exists;
}

double GetXPathAsNumber(xmlDocPtr doc_I, const std::string& xpath_I) {
  xmlXPathObjectPtr object = GetXPathObject(doc_I, xpath_I);
  if (object == nullptr) return xmlXPathNAN;
  const double number = xmlXPathCastToNumber(object);
  FreeXPathObject(object);
  return number;
}

std::string GetXPathAsString(xmlDocPtr doc_I, const std::string& xpath_I) {
  xmlXPathObjectPtr object = GetXPathObject(doc_I, xpath_I);
  if (object == nullptr) return {};
  std::string text = TakeXml(xmlXPathCastToString(object));
  FreeXPathObject(object);
  return text;
}

xmlNodePtr GetXPathAsNode(xmlDocPtr doc_I, const std::string& xpath_I) {
  return GetNodeByXPath(doc_I, xpath_I);
}

void MergeNodes(xmlNodePtr target_IO, xmlNodePtr source_I) {
  if (target_IO == nullptr || source_I == nullptr) return;

  const std::string sourceName = GetNodeName(source_I);
  if (!StringUtilities::IEquals(sourceName, "text") &&
      StringUtilities::IEquals(sourceName, GetNodeName(target_IO)) && IsElement(source_I) &&
      IsElement(target_IO)) {
    for (xmlAttrPtr attribute = source_I->properties; attribute != nullptr;
         attribute = attribute->next) {
      const std::string value = AttributeValue(attribute);
      if (!value.empty()) xmlSetProp(target_IO, attribute->name, ToXml(value));
    }
  }

  for (xmlNodePtr child = source_I->children; child != nullptr; child = child->next) {
    xmlNodePtr match = ChildMatchingNode(target_IO, child);
    if (match != nullptr) {
      MergeNodes(match, child);
    } else {
      xmlAddChild(target_IO, xmlDocCopyNode(child, target_IO->doc, 1));
    }
  }

  if (source_I->type != XML_ELEMENT_NODE && source_I->content != nullptr &&
      source_I->content[0] != 0) {
    xmlNodeSetContent(target_IO, source_I->content);
  }
}

xmlNodePtr ChildMatchingNode(xmlNodePtr parent_I, xmlNodePtr node_I) {
  if (parent_I == nullptr || node_I == nullptr) return nullptr;
  const bool useAttributes = GetNodeAttribValue(node_I, "matchUsingAttributes") != "0";
  for (xmlNodePtr child = parent_I->children; child != nullptr; child = child->next) {
    if (NodesMatch(node_I, child, useAttributes)) return child;
  }
  return nullptr;
}

bool NodesMatch(xmlNodePtr a_I, xmlNodePtr b_I, bool useAttributes_I) {
  if (a_I == nullptr || b_I == nullptr) return false;
  const std::string name = GetNodeName(a_I);
  if (!StringUtilities::IEquals(name, GetNodeName(b_I))) return false;
  if (!useAttributes_I) return true;
  if (StringUtilities::IEquals(name, "text") || !IsElement(a_I) || a_I->properties == nullptr) {
    return true;
  }
  if (!IsElement(b_I)) return false;
  for (xmlAttrPtr attribute = a_I->properties; attribute != nullptr; attribute = attribute->next) {
    xmlAttrPtr other = FindAttribute(b_I, attribute->name);
    if (other == nullptr) return false;
    if (FromXml(attribute->name) == "matchUsingAttributes") continue;
    if (!StringUtilities::IEquals(AttributeValue(attribute), AttributeValue(other))) return false;
  }
  return true;
}

}  // namespace XmlUtils
