// The libxml2 layer: walking, building, XPath and merging.

#include <gtest/gtest.h>

#include <cmath>
#include <stdexcept>

#include "settings/XmlUtils.h"
#include "support/LogCapture.h"

namespace {

class XmlUtilsTest : public ::testing::Test {
 protected:
  xmlDocPtr Load(const std::string& xml_I) {
    xmlDocPtr doc = XmlUtils::LoadXmlDocumentFromMemory(xml_I);
    mDocs.push_back(doc);
    return doc;
  }
  void TearDown() override {
    for (xmlDocPtr doc : mDocs) XmlUtils::FreeDoc(doc);
  }

 private:
  std::vector<xmlDocPtr> mDocs;
};

TEST_F(XmlUtilsTest, WalkingSeesElementsOnly) {
  xmlDocPtr doc = Load(
      "<r>\n"
      "  <!-- note -->\n"
      "  <a id=\"1\">x<b/>y</a>\n"
      "  text\n"
      "  <c id=\"\"/>\n"
      "</r>");
  ASSERT_NE(doc, nullptr);
  xmlNodePtr root = XmlUtils::GetRootNode(doc);
  ASSERT_NE(root, nullptr);
  EXPECT_EQ(XmlUtils::GetChildCount(root), 2);
  xmlNodePtr a = XmlUtils::GetChildNode(root, 0);
  EXPECT_EQ(XmlUtils::GetNodeName(a), "a");
  EXPECT_EQ(XmlUtils::GetNodeValue(a), "xy");
  EXPECT_EQ(XmlUtils::GetNodeLineNumber(a), 3);
  EXPECT_EQ(XmlUtils::GetNodeName(XmlUtils::GetNextNode(a)), "c");
  EXPECT_EQ(XmlUtils::GetNextNode(XmlUtils::GetNextNode(a)), nullptr);
  EXPECT_EQ(XmlUtils::GetChildNode(root, "c"), XmlUtils::GetChildNode(root, 1));
  EXPECT_EQ(XmlUtils::GetChildNode(root, 2), nullptr);
  EXPECT_EQ(XmlUtils::GetNodeAttribValue(a, "id"), "1");
  // Absent and empty attributes cannot be told apart.
  EXPECT_EQ(XmlUtils::GetNodeAttribValue(XmlUtils::GetChildNode(root, 1), "id"), "");
  EXPECT_EQ(XmlUtils::GetNodeAttribValue(a, "missing"), "");
  EXPECT_EQ(XmlUtils::GetNodeName(nullptr), "");
  EXPECT_EQ(XmlUtils::NodeToString(a, false), "<a id=\"1\">x<b/>y</a>");

  // The root is a copy: changing it leaves the document alone.
  XmlUtils::SetNodeName(root, "changed");
  EXPECT_EQ(XmlUtils::GetNodeName(xmlDocGetRootElement(doc)), "r");
  XmlUtils::FreeNode(root);
}

TEST_F(XmlUtilsTest, BuildingEscapesAndValidates) {
  LogCapture capture;
  xmlDocPtr doc = XmlUtils::NewXmlDocument();
  xmlNodePtr root = XmlUtils::CreateRootNode(doc, "r");
  XmlUtils::CreateRootComment(doc, " first ");
  XmlUtils::CreateChildNode(root, nullptr, "escaped", "a<b&c", true);
  XmlUtils::CreateChildNode(root, nullptr, "raw", "&lt;x&gt;", false);
  XmlUtils::CreateChildNode(root, nullptr, "none", XmlUtils::kNoContent, true);
  xmlNodePtr node = XmlUtils::CreateChildNode(root, nullptr, "n", "", true);
  XmlUtils::SetNodeAttribValue(node, "k", "v");
  XmlUtils::SetNodeAttribValue(node, "gone", "v");
  XmlUtils::RemoveNodeAttrib(node, "gone");
  XmlUtils::AddNodeContent(node, "1<2");
  XmlUtils::SetNodeContentCDATA(XmlUtils::CreateChildNode(root, nullptr, "cd", "", true), "]]");
  XmlUtils::CreateComment(root, "end");
  XmlUtils::CreateNamespace(root, "urn:x", XmlUtils::kNoContent);

  EXPECT_EQ(XmlUtils::GetDocumentStringAndFormat(doc, false, false),
            "<!-- first -->\n<r xmlns=\"urn:x\"><escaped>a&lt;b&amp;c</escaped><raw>&lt;x&gt;</raw>"
            "<none/><n k=\"v\">1&lt;2</n><cd><![CDATA[]]]]></cd><!--end--></r>\n");

  EXPECT_TRUE(capture.Assertions().empty());
  XmlUtils::SetRootNode(doc, XmlUtils::CreateNode("other"));
  EXPECT_TRUE(capture.AssertionContains("!LxmlDocGetRootElement(xmlDoc_I)"));
  EXPECT_EQ(XmlUtils::GetNodeName(xmlDocGetRootElement(doc)), "other");
  XmlUtils::FreeDoc(doc);

  EXPECT_TRUE(XmlUtils::ValidateNodeName("a-b.c_d:e"));
  for (const std::string& bad :
       std::vector<std::string>{"", "1bad", "a b", "a<b", std::string("a\0b", 3)}) {
    EXPECT_FALSE(XmlUtils::ValidateNodeName(bad)) << bad;
  }
  EXPECT_THROW(XmlUtils::CreateNode("a b"), std::invalid_argument);
  EXPECT_TRUE(capture.LogContains("XmlUtils::CreateNode passed invalid node name: \"a b\""));
  EXPECT_EQ(XmlUtils::CreateChildNode(nullptr, nullptr, "x", "y", true), nullptr);
}

TEST_F(XmlUtilsTest, XPathQueriesGiveCopiesNumbersAndText) {
  xmlDocPtr doc = Load(
      "<devices><device kind=\"pen\" id=\"3\">P</device><device kind=\"touch\" id=\"9\">T</device>"
      "<device kind=\"\" id=\"1\"/></devices>");
  EXPECT_TRUE(XmlUtils::XPathExists(doc, "/devices/device[@kind='touch']"));
  EXPECT_FALSE(XmlUtils::XPathExists(doc, "/devices/scalar"));
  EXPECT_EQ(XmlUtils::GetXPathAsNumber(doc, "sum(//device/@id)"), 13.0);
  EXPECT_TRUE(std::isnan(XmlUtils::GetXPathAsNumber(doc, "/devices/none")));
  EXPECT_EQ(XmlUtils::GetXPathAsString(doc, "//device[2]"), "T");

  xmlXPathObjectPtr devices = XmlUtils::GetXPathObject(doc, "//device");
  EXPECT_EQ(XmlUtils::NodeCount(devices), 3);
  xmlNodePtr touch = XmlUtils::GetNodeByAttrib(devices, "kind", "touch");
  ASSERT_NE(touch, nullptr);
  EXPECT_EQ(XmlUtils::GetNodeAttribValue(touch, "id"), "9");
  XmlUtils::FreeNode(touch);
  EXPECT_EQ(XmlUtils::GetNodeByAttrib(devices, "kind", ""), nullptr);
  EXPECT_EQ(XmlUtils::GetNodeByIndex(devices, 3), nullptr);
  XmlUtils::FreeXPathObject(devices);

  LogCapture capture;
  EXPECT_EQ(XmlUtils::GetXPathObject(doc, "//device["), nullptr);
  EXPECT_TRUE(capture.LogContains("TraceXmlError"));

  xmlNodePtr pen = XmlUtils::GetXPathAsNode(doc, "//device[@kind='pen']");
  ASSERT_NE(pen, nullptr);
  EXPECT_EQ(XmlUtils::GetNodeValue(pen), "P");
  XmlUtils::FreeNode(pen);
}

TEST_F(XmlUtilsTest, MergeMatchesByNameAndAttributesAndAppendsTheRest) {
  xmlDocPtr target = Load(
      "<Config version=\"1\" keep=\"k\">"
      "<Device id=\"pen\"><Name>Old</Name></Device>"
      "<Device id=\"touch\"><Name>Touch</Name></Device>"
      "</Config>");
  xmlDocPtr source = Load(
      "<config version=\"2\" keep=\"\">"
      "<DEVICE id=\"PEN\"><Name>New</Name><Speed>4</Speed></DEVICE>"
      "<Device id=\"scalar\"><Name>Scalar</Name></Device>"
      "</config>");
  XmlUtils::MergeDocuments(target, source);
  EXPECT_EQ(XmlUtils::GetDocumentStringAndFormat(target, false, false),
            "<Config version=\"2\" keep=\"k\">"
            "<Device id=\"PEN\"><Name>New</Name><Speed>4</Speed></Device>"
            "<Device id=\"touch\"><Name>Touch</Name></Device>"
            "<Device id=\"scalar\"><Name>Scalar</Name></Device>"
            "</Config>\n");

  // Without attribute matching the first child of the name takes everything.
  xmlDocPtr target2 = Load("<c><d id=\"1\"/><d id=\"2\"/></c>");
  xmlDocPtr source2 = Load("<c><d id=\"3\" matchUsingAttributes=\"0\" x=\"y\"/></c>");
  XmlUtils::MergeDocuments(target2, source2);
  EXPECT_EQ(XmlUtils::GetDocumentStringAndFormat(target2, false, false),
            "<c><d id=\"3\" matchUsingAttributes=\"0\" x=\"y\"/><d id=\"2\"/></c>\n");

  XmlUtils::MergeDocuments(nullptr, source2);
  XmlUtils::MergeNodes(xmlDocGetRootElement(target2), nullptr);
}

TEST_F(XmlUtilsTest, NodesMatchIgnoresCaseAndNeedsOnlyTheMarkerToExist) {
  xmlDocPtr doc = Load(
      "<r><a k=\"V\" matchUsingAttributes=\"1\"/><A k=\"v\" matchUsingAttributes=\"0\"/>"
      "<a k=\"v\"/><a/></r>");
  xmlNodePtr root = xmlDocGetRootElement(doc);
  xmlNodePtr first = XmlUtils::GetChildNode(root, 0);
  xmlNodePtr second = XmlUtils::GetChildNode(root, 1);
  xmlNodePtr third = XmlUtils::GetChildNode(root, 2);
  xmlNodePtr bare = XmlUtils::GetChildNode(root, 3);
  EXPECT_TRUE(XmlUtils::NodesMatch(first, second, true));
  EXPECT_FALSE(XmlUtils::NodesMatch(first, third, true));  // the marker must exist
  EXPECT_TRUE(XmlUtils::NodesMatch(first, third, false));
  EXPECT_TRUE(XmlUtils::NodesMatch(bare, first, true));  // no attributes to compare
  EXPECT_FALSE(XmlUtils::NodesMatch(third, bare, true));
  // Attribute values compare ignoring case, so the first child already matches.
  EXPECT_EQ(XmlUtils::ChildMatchingNode(root, third), first);
  EXPECT_EQ(XmlUtils::ChildMatchingNode(XmlUtils::GetChildNode(root, 3), third), nullptr);
}

}  // namespace
