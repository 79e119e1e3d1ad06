// The XML and property-list forms, read and written through libxml2.

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <stdexcept>

#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/SettingsTestTrees.h"
#include "settings/XmlUtils.h"
#include "support/LogCapture.h"

namespace fs = std::filesystem;

static std::shared_ptr<CSettingsMap> ReadXmlMap(const std::string& xml_I) {
  return CSettingsMap::CastToMap(CSettingsObject::ReadFromXMLBuffer(xml_I), false);
}

TEST(XMLReadTest, DocumentsReadAsTheirTrees) {
  LogCapture capture;
  const std::pair<std::string, const char*> cases[] = {
      // With or without types; "Other" is not an array element.
      {"<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<root type=\"map\">\n"
       "  <Name type=\"string\">abc</Name>\n  <Count type=\"integer\"> 12 </Count>\n"
       "  <Blob type=\"bytes\">AQID</Blob>\n  <List type=\"array\"><ArrayElement type=\"bool\">"
       "TRUE</ArrayElement><Other type=\"bool\">false</Other></List>\n"
       "  <Ratio type=\"double\">2.5</Ratio>\n  <Nothing type=\"null\"/>\n  <Empty/>\n"
       "  <M><A> 1 </A></M>\n</root>\n",
       "map[Blob:bytes[AQID], Count:integer[12], Empty:string[], List:array[0:bool[true]], "
       "M:map[A:string[1]], Name:string[abc], Nothing:null[], Ratio:double[2.500000]]"},
      // Bad values read what they can; padding is no Base64 character here,
      // so the whole value is lost; an unknown type is dropped.
      {"<root><I type=\"integer\">12abc</I><J type=\"integer\">abc</J><D type=\"double\">x</D>"
       "<B type=\"bytes\">AQ==</B><U type=\"color\">red</U></root>",
       "map[B:bytes[], D:double[0.000000], I:integer[12], J:integer[0]]"},
      // A foreign and damaged property list: dates read as text, and an
      // unknown element keeps the key pending for the next value.
      {"<plist version=\"1.1\"><dict><key>when</key><date>2024-01-02T03:04:05Z</date>"
       "<key>flag</key><true>ignored</true><key>late</key><mystery/><integer>7</integer>"
       "<orphan>1</orphan><key> spaced </key><string> s </string></dict></plist>",
       "map[flag:bool[true], late:integer[7], spaced:string[s], "
       "when:string[2024-01-02T03:04:05Z]]"}};
  std::vector<size_t> assertions;
  for (const auto& [xml, trace] : cases) {
    auto object = CSettingsObject::ReadFromXMLBuffer(xml);
    ASSERT_TRUE(object) << xml;
    EXPECT_EQ(object->GetTraceString(), trace);
    assertions.push_back(capture.Assertions().size());
  }
  EXPECT_EQ(assertions[0], 0u);  // the hand-written document reads cleanly

  // The later of two like keys wins.
  const std::string twice = "<A type=\"integer\">1</A><A type=\"integer\">2</A></root>";
  EXPECT_EQ(ReadXmlMap("<root type=\"map\">" + twice)->IntegerForKeyWithDefault("A", int64_t{0}),
            2);
  EXPECT_EQ(ReadXmlMap("<root>" + twice)->IntegerForKeyWithDefault("A", int64_t{0}), 2);
}

TEST(XMLReadTest, FiltersDropNodesForOtherLanguagesAndPlatforms) {
  CSettingsObject::SetLanguageIDFilter("en");
  CSettingsObject::SetPlatformIDFilter("linux");
  auto map = ReadXmlMap(
      "<root><T lang=\"en\">hello</T><U lang=\"de\">hallo</U><P plat=\"mac\">x</P>"
      "<Q plat=\"linux\" type=\"integer\">1</Q><L type=\"array\"><ArrayElement lang=\"fr\">a"
      "</ArrayElement><ArrayElement>b</ArrayElement></L></root>");
  CSettingsObject::SetLanguageIDFilter("");
  CSettingsObject::SetPlatformIDFilter("");
  ASSERT_TRUE(map);
  EXPECT_EQ(map->GetTraceString(), "map[L:array[0:string[b]], Q:integer[1], T:string[hello]]");
}

TEST(XMLReadTest, UnusableDocumentsGiveEmptyResults) {
  LogCapture capture;
  for (const char* bad : {"", "<root><a></root>", "<root type=\"nonsense\"/>",
                          "<plist version=\"1.0\"/>", "<plist version=\"1.0\"><set/></plist>"}) {
    EXPECT_EQ(CSettingsObject::ReadFromXMLBuffer(bad), nullptr) << bad;
  }
  std::string errorText = "untouched";
  EXPECT_EQ(CSettingsObject::ReadFromXMLFile("/nonexistent-folder/tdc.xml", errorText), nullptr);
  // The load traced and cleared the error before it could be reported here.
  EXPECT_EQ(errorText, "");
  // Another root name still loads, after saying so.
  EXPECT_TRUE(ReadXmlMap("<settings><a>1</a></settings>"));
  EXPECT_TRUE(capture.AssertionContains("rootName == SETTINGS_NODE_ROOT_ID"));
}

TEST(XMLReadTest, HostileEntitiesAreNotFollowed) {
  LogCapture capture;
  // Entities that expand exponentially are neither expanded nor followed.
  std::string laughs = "<?xml version=\"1.0\"?><!DOCTYPE root [<!ENTITY l0 \"lol\">";
  for (int i = 1; i < 30; ++i) {
    laughs += "<!ENTITY l" + std::to_string(i) + " \"";
    for (int k = 0; k < 10; ++k) laughs += "&l" + std::to_string(i - 1) + ";";
    laughs += "\">";
  }
  const auto start = std::chrono::steady_clock::now();
  auto map = ReadXmlMap(laughs + "]><root><a>&l29;</a></root>");
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
  EXPECT_LT(map ? map->StringForKeyWithDefault("a", "").size() : 0u, 1000u);
  auto external = ReadXmlMap(
      "<?xml version=\"1.0\"?><!DOCTYPE root [<!ENTITY e SYSTEM \"file:///etc/passwd\">]>"
      "<root><a>&e;</a></root>");
  EXPECT_EQ(external ? external->StringForKeyWithDefault("a", "").find("root:") : std::string::npos,
            std::string::npos);
}

TEST(XMLWriteTest, DocumentsAreIndentedAndNamedAsAsked) {
  auto map = CSettingsMap::New();
  map->SetKeyAndString("Name", "a<b");
  map->SetKeyAndObject("Nothing", nullptr);
  auto list = CSettingsArray::New();
  list->AddBool(true);
  map->SetKeyAndObject("List", list);
  EXPECT_EQ(map->GetXMLString(""),
            "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
            "<root type=\"map\">\n"
            "  <List type=\"array\">\n"
            "    <ArrayElement type=\"bool\">true</ArrayElement>\n"
            "  </List>\n"
            "  <Name type=\"string\">a&lt;b</Name>\n"
            "  <Nothing type=\"null\"/>\n"
            "</root>\n");
  EXPECT_EQ(CSettingsInteger::New(5)->GetXMLString("Count"), "<Count type=\"integer\">5</Count>\n");
  EXPECT_EQ(CSettingsKEString::New("x]y")->GetXMLString("K"),
            "<K type=\"kestring\"><![CDATA[x&rsqbracket;y]]></K>\n");
}

TEST(XMLWriteTest, FilesNeedAWritableFolderAndReadersTheirOwnClass) {
  std::string errorText;
  const std::string path = (fs::temp_directory_path() / "settings-file.xml").string();
  ASSERT_TRUE(CSettingsMap::New()->SaveXMLToFile(path));
  EXPECT_FALSE(CSettingsArray::ReadFromXMLFile(path, errorText));
  fs::remove(path);
  EXPECT_FALSE(CSettingsMap::New()->SaveXMLToFile("/nonexistent-folder/x.xml"));

  // The known losses stay.
  auto lossy = CSettingsMap::New();
  lossy->SetKeyAndString("padded", "  text  ");
  lossy->SetKeyAndString("blank", "   ");
  lossy->SetKeyAndKEString("entity", "&RsqBracket;");
  auto lossyBack = ReadXmlMap(lossy->GetXMLString(""));
  ASSERT_TRUE(lossyBack);
  EXPECT_EQ(lossyBack->StringForKeyWithDefault("padded", ""), "text");
  EXPECT_EQ(lossyBack->StringForKeyWithDefault("blank", "x"), "");
  EXPECT_EQ(lossyBack->KEStringForKeyWithDefault("entity", ""), "]");
}

TEST(XMLWriteTest, InvalidKeysThrowFromTheStringAndFailTheSave) {
  LogCapture capture;
  auto map = CSettingsMap::New();
  map->SetKeyAndObject("inner", CSettingsMap::New());
  map->ObjectForKey<CSettingsMap>("inner")->SetKeyAndInteger("1bad", 1);
  EXPECT_THROW(map->GetXMLString(""), std::invalid_argument);
  const std::string path = (fs::temp_directory_path() / "settings-bad.xml").string();
  fs::remove(path);
  EXPECT_FALSE(map->SaveXMLToFile(path));
  EXPECT_FALSE(fs::exists(path));
}

TEST(PListWriteTest, PropertyListUsesItsOwnElementsAndNullHasNone) {
  LogCapture capture;
  auto map = CSettingsMap::New();
  map->SetKeyAndBool("b", true);
  map->SetKeyAndInteger("i", 3);
  map->SetKeyAndDouble("r", 0.5);
  map->SetKeyAndString("s", "x&y");
  map->SetKeyAndKEString("k", "p]q");
  map->SetKeyAndObject("d", CSettingsBytes::New({1, 2, 3}));
  map->SetKeyAndObject("a", CSettingsArray::New());
  map->SetKeyAndObject("n", nullptr);  // leaves its key alone
  EXPECT_EQ(map->GetPListString(false),
            "<plist version=\"1.0\">\n"
            "  <dict>\n"
            "    <key>a</key>\n"
            "    <array/>\n"
            "    <key>b</key>\n"
            "    <true/>\n"
            "    <key>d</key>\n"
            "    <data>AQID</data>\n"
            "    <key>i</key>\n"
            "    <integer>3</integer>\n"
            "    <key>k</key>\n"
            "    <string kestring=\"1\"><![CDATA[p&rsqbracket;q]]></string>\n"
            "    <key>n</key>\n"
            "    <key>r</key>\n"
            "    <real>0.500000</real>\n"
            "    <key>s</key>\n"
            "    <string>x&amp;y</string>\n"
            "  </dict>\n"
            "</plist>\n");
  EXPECT_TRUE(capture.AssertionContains("Unknown type"));
  EXPECT_EQ(map->GetPListString(true).rfind("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n", 0), 0u);
}
