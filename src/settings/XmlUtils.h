#pragma once
// Thin layer over libxml2 for the XML-based settings forms and for callers
// that walk, build, query or merge XML documents.
//
// Ownership: documents come back owned by the caller (FreeDoc); GetRootNode,
// GetNodeByIndex, GetNodeByAttrib, GetNodeByXPath and GetXPathAsNode give
// deep copies that the caller frees with FreeNode; XPath contexts and objects
// are freed with FreeXPathContext and FreeXPathObject. Everything else
// borrows.

#include <libxml/tree.h>
#include <libxml/xpath.h>

#include <string>

namespace XmlUtils {

// The two bytes that CreateChildNode and CreateNamespace read as "none".
inline const std::string kNoContent("\xFF\xFF");

// Library
void Initialize();
void Cleanup();

// Documents
xmlDocPtr NewXmlDocument();
xmlDocPtr LoadXmlDocument(const std::string& path_I);
// Loads and reports the parser's last error in errorText_O. The load traces
// and clears that error itself, so after a plain parse failure the text
// comes back empty: go by the returned document.
xmlDocPtr LoadXmlDocumentWithWarningsOnErr(const std::string& path_I, std::string& errorText_O);
xmlDocPtr LoadXmlDocumentFromMemory(const std::string& buffer_I);
bool SaveXmlDocument(const std::string& path_I, xmlDocPtr doc_I, int options_I);
std::string GetDocumentStringAndFormat(xmlDocPtr doc_I, bool format_I, bool withDeclaration_I);
void FreeDoc(xmlDocPtr doc_I);
void MergeDocuments(xmlDocPtr target_IO, xmlDocPtr source_I);

// Errors
void TraceXmlError();
std::string ConstructErrorMessage();

// Reading nodes. Children and siblings are element nodes only.
xmlNodePtr GetRootNode(xmlDocPtr doc_I);
xmlNodePtr GetNextNode(xmlNodePtr node_I);
int GetChildCount(xmlNodePtr node_I);
xmlNodePtr GetChildNode(xmlNodePtr node_I, int index_I);
xmlNodePtr GetChildNode(xmlNodePtr node_I, const std::string& name_I);
std::string GetNodeName(xmlNodePtr node_I);
std::string GetNodeValue(xmlNodePtr node_I);
long GetNodeLineNumber(xmlNodePtr node_I);
std::string GetNodeAttribValue(xmlNodePtr node_I, const std::string& attribute_I);
std::string NodeToString(xmlNodePtr node_I, bool format_I);
void FreeNode(xmlNodePtr node_I);
xmlNodePtr CopyNode(xmlNodePtr node_I, bool recursive_I);

// Building nodes
// Throws std::invalid_argument for a name that is not a valid XML name.
xmlNodePtr CreateNode(const std::string& name_I);
xmlNodePtr CreateRootNode(xmlDocPtr doc_I, const std::string& name_I);
void SetRootNode(xmlDocPtr doc_I, xmlNodePtr node_I);
xmlNodePtr CreateChildNode(xmlNodePtr parent_I, xmlNsPtr namespace_I, const std::string& name_I,
                           const std::string& content_I, bool escape_I);
xmlNsPtr CreateNamespace(xmlNodePtr node_I, const std::string& href_I, const std::string& prefix_I);
xmlNodePtr CreateRootComment(xmlDocPtr doc_I, const std::string& text_I);
xmlNodePtr CreateComment(xmlNodePtr parent_I, const std::string& text_I);
// Adds child_I as the last child of parent_I and gives it back.
xmlNodePtr AddNodeData(xmlNodePtr parent_I, xmlNodePtr child_I);
void SetNodeName(xmlNodePtr node_I, const std::string& name_I);
// Without escape_I the text is read as XML content, entity references and all.
void SetNodeContent(xmlNodePtr node_I, const std::string& content_I, bool escape_I);
void SetNodeContentCDATA(xmlNodePtr node_I, const std::string& content_I);
// Appends the text as it stands.
void AddNodeContent(xmlNodePtr node_I, const std::string& content_I);
void SetNodeAttribValue(xmlNodePtr node_I, const std::string& attribute_I,
                        const std::string& value_I);
void RemoveNodeAttrib(xmlNodePtr node_I, const std::string& attribute_I);
bool ValidateNodeName(const std::string& name_I);

// XPath
xmlXPathContextPtr GetContext(xmlDocPtr doc_I);
xmlXPathObjectPtr GetXPathObject(xmlXPathContextPtr context_I, const std::string& xpath_I);
xmlXPathObjectPtr GetXPathObject(xmlDocPtr doc_I, const std::string& xpath_I);
void FreeXPathObject(xmlXPathObjectPtr object_I);
void FreeXPathContext(xmlXPathContextPtr context_I);
xmlNodePtr GetNodeByXPath(xmlDocPtr doc_I, const std::string& xpath_I);
int NodeCount(xmlXPathObjectPtr object_I);
xmlNodePtr GetNodeByIndex(xmlXPathObjectPtr object_I, int index_I);
xmlNodePtr GetNodeByAttrib(xmlXPathObjectPtr object_I, const std::string& attribute_I,
                           const std::string& value_I);
bool XPathExists(xmlDocPtr doc_I, const std::string& xpath_I);
double GetXPathAsNumber(xmlDocPtr doc_I, const std::string& xpath_I);
std::string GetXPathAsString(xmlDocPtr doc_I, const std::string& xpath_I);
xmlNodePtr GetXPathAsNode(xmlDocPtr doc_I, const std::string& xpath_I);

// Merging
void MergeNodes(xmlNodePtr target_IO, xmlNodePtr source_I);
xmlNodePtr ChildMatchingNode(xmlNodePtr parent_I, xmlNodePtr node_I);
bool NodesMatch(xmlNodePtr a_I, xmlNodePtr b_I, bool useAttributes_I);

}  // namespace XmlUtils
