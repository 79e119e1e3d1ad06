// The libxml2 layer: walking, building and merging.

#include <gtest/gtest.h>

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

}  // namespace
