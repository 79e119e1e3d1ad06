// The JSON form: the reader every update depends on for its device
// configuration, and the writer with its kept quirks.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/SettingsTestTrees.h"
#include "support/LogCapture.h"

namespace {

std::shared_ptr<CSettingsMap> ReadMap(const std::string& json_I) {
  return CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONBuffer(json_I), false);
}

std::shared_ptr<CSettingsArray> ReadArray(const std::string& json_I) {
  return CSettingsArray::CastToArray(CSettingsObject::ReadFromJSONBuffer(json_I), false);
}

std::string TempPath(const std::string& name_I) {
  return (std::filesystem::temp_directory_path() / ("settings-json-" + name_I)).string();
}

}  // namespace

TEST(JSONReadTest, DocumentsReadAsTheirTrees) {
  LogCapture capture;
  const std::pair<const char*, const char*> cases[] = {
      {"[1, 2.5, \"x\", true, null, false, -7, 1e3, {\"k\": []}]",
       "array[0:integer[1], 0:double[2.500000], 0:string[x], 0:bool[true], 0:null[], "
       "0:bool[false], 0:integer[-7], 0:double[1000.000000], 0:map[k:arra]]]"},
      // A byte-string object is bytes inside and a map at the top; only a
      // lone first entry is the byte-string form.
      {"{\"blob\": {\"SbyteS\":\"AQID\"}, \"list\": [{\"SbyteS\":\"/w\"}]}",
       "map[blob:bytes[AQID], list:array[0:bytes[/w]]]"},
      {"{\"SbyteS\":\"AQID\"}", "map[SbyteS:bytes[AQID]]"},
      {"{\"blob\": {\"a\": 1, \"SbyteS\":\"AQID\"}}",
       "map[blob:map[SbyteS:string[AQID], a:integer[1]]]"},
      // Comments run to the end of the line between tokens; slashes inside a
      // string are text.
      {"// device configuration\n{ // opening\n  \"a\" // before the colon\n  : 1, // after a "
       "value\n  \"b\": [ 1 // one\n    , 2 ] // last\n}// end without a newline",
       "map[a:integer[1], b:array[0:integer[1], 0:integer[2]]]"},
      {"{\"u\": \"http://host/x\"}", "map[u:string[http://host/x]]"},
      {R"({"s": "q\"b\\s\/n\nt\tr\rb\bf\f", "u": "\u00e9\u20AC\u0041"})",
       "map[s:string[q\"b\\s/n\nt\tr\rb\bf\f], u:string[\xC3\xA9\xE2\x82\xAC"
       "A]]"},
      // A trailing comma is harmless, a closing brace drops an unfinished
      // entry, stray characters between tokens are stepped over, and the
      // later of two like keys wins.
      {"[1, 2,]", "array[0:integer[1], 0:integer[2]]"},
      {"{\"a\": 1, \"b\"}", "map[a:integer[1]]"},
      {"x[1]", "array[0:integer[1]]"},
      {"{\"k\": 1, \"k\": 2}", "map[k:integer[2]]"},
      // Numbers read like their text says; out of range reads as 0.
      {"[9223372036854775807, -9223372036854775808, 5-, 99999999999999999999]",
       "array[0:integer[9223372036854775807], 0:integer[-9223372036854775808], 0:integer[5], "
       "0:integer[0]]"}};
  for (const auto& [json, trace] : cases) {
    auto object = CSettingsObject::ReadFromJSONBuffer(json);
    ASSERT_TRUE(object) << json;
    EXPECT_EQ(object->GetTraceString(), trace) << json;
  }
  EXPECT_TRUE(capture.AssertionContains("isspace((int)buffer_I[pos])"));
  EXPECT_TRUE(capture.LogContains("CSettingsInteger::ReadFromJSONNode: ERROR: bad integer: 5-"));
  // The stored null is a lookup's nothing.
  EXPECT_EQ(ReadArray("[null]")->ObjectForIndex(0), nullptr);
}

TEST(JSONReadTest, UnusableDocumentsGiveEmptyResults) {
  LogCapture capture;
  // One input per way out of each reader.
  for (const char* bad : {"// only a comment", "42", "{", "[", "[1 2]", "[,]", "{\"a\" 1}",
                          "{\"\": 1}", "{\"a\": 1 \"b\": 2}", "{a: 1}", "[1+2]", "[tru]",
                          "{\"a\": [1, 2}", R"({"s": "bad \q escape"})", R"({"s": "\u12"})",
                          R"({"s": "\u12G4"})", R"({"s": "no end})"}) {
    EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(bad), nullptr) << bad;
  }
  // A garbage file is one report, not one per stray character; the next
  // document reports its own.
  const size_t before = capture.Assertions().size();
  EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(std::string(5000, '#') + "[1, %%%% 2]")
                ->GetTraceString(),
            "array[0:integer[1], 0:integer[2]]");
  EXPECT_EQ(capture.Assertions().size(), before + 1);
  CSettingsObject::ReadFromJSONBuffer("# [1]");
  EXPECT_EQ(capture.Assertions().size(), before + 2);
}

TEST(JSONWriteTest, WriterIndentsWithTabsAndDoesNotEscape) {
  auto inner = CSettingsArray::New();
  inner->AddBool(true);
  inner->AddString("x");
  auto map = CSettingsMap::New();
  map->SetKeyAndInteger("a", 1);
  map->SetKeyAndObject("b", inner);
  map->SetKeyAndObject("c", CSettingsBytes::New({1, 2, 3}));
  map->SetKeyAndDouble("d", 2.5);
  map->SetKeyAndObject("e", nullptr);
  map->SetKeyAndKEString("f", "k");
  EXPECT_EQ(
      map->GetJSONString(),
      "{\n\t\"a\": 1,\n\t\"b\": [\n\t\ttrue,\n\t\t\"x\"\n\t],\n"
      "\t\"c\": {\"SbyteS\":\"AQID\"},\n\t\"d\": 2.500000,\n\t\"e\": null,\n\t\"f\": \"k\"\n}");
  EXPECT_EQ(map->CreateJSONNode(-1),
            "{\n\"a\": 1,\n\"b\": [\ntrue,\n\"x\"\n],\n"
            "\"c\": {\"SbyteS\":\"AQID\"},\n\"d\": 2.500000,\n\"e\": null,\n\"f\": \"k\"\n}");
  // The last two characters go unconditionally, the opening of an empty container with them.
  EXPECT_EQ(CSettingsMap::New()->GetJSONString(), "\n}");
  EXPECT_EQ(CSettingsArray::New()->GetJSONString(), "\n]");
  auto outer = CSettingsArray::New();
  outer->AddObject(inner);
  EXPECT_EQ(outer->GetJSONString(), "[\n\t[\n\t\ttrue,\n\t\t\"x\"\n\t]\n]");
  EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer("\n}"), nullptr);
  EXPECT_EQ(CSettingsInteger::New(3)->GetJSONString(), "");
}

TEST(JSONWriteTest, WhatTheWriterCannotExpressDoesNotComeBack) {
  LogCapture capture;
  auto map = CSettingsMap::New();
  map->SetKeyAndKEString("secret", "abc");
  EXPECT_EQ(ReadMap(map->GetJSONString())->TypeNameForKeyOrEmpty("secret"), "string");
  // Quotes are not escaped, so a text with one breaks the document.
  map->SetKeyAndString("q", "say \"hi\"");
  EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(map->GetJSONString()), nullptr);

  // Doubles keep six decimals. An empty nested map loses its opening brace,
  // so its closing one ends the document early and everything after is lost.
  auto lossy = CSettingsMap::New();
  lossy->SetKeyAndDouble("d", 1.0 / 3.0);
  EXPECT_EQ(ReadMap(lossy->GetJSONString())->DoubleForKeyWithDefault("d", 0), 0.333333);
  lossy->SetKeyAndObject("empty", CSettingsMap::New());
  lossy->SetKeyAndInteger("later", 1);
  EXPECT_EQ(ReadMap(lossy->GetJSONString())->GetKeys(), (std::vector<std::string>{"d"}));
}

TEST(JSONFileTest, FileEdgesFollowTheirRules) {
  LogCapture capture;
  const std::string path = TempPath("edges.json");
  std::filesystem::remove(path);
  EXPECT_FALSE(CSettingsInteger::New(1)->SaveJSONToFile(path));
  EXPECT_FALSE(std::filesystem::exists(path));
  ASSERT_TRUE(CSettingsMap::New()->SaveJSONToFile(path));
  std::ifstream in(path, std::ios::binary);
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(in), {}), "\n}\n");
  EXPECT_FALSE(CSettingsMap::New()->SaveJSONToFile("/nonexistent-folder/x.json"));
  EXPECT_EQ(CSettingsObject::ReadFromJSONFile("/nonexistent-folder/x.json"), nullptr);

  // The file is read up to the first 0x04 byte.
  std::ofstream(path, std::ios::binary) << "{\"a\": 1}\x04 garbage {";
  auto map = CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONFile(path), true);
  ASSERT_TRUE(map);
  EXPECT_EQ(map->IntegerForKeyWithDefault("a", int64_t{0}), 1);
  std::filesystem::remove(path);
}
