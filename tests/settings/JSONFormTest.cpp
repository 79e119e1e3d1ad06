// The JSON form: the reader every update depends on for its device
// configuration, and the writer with its kept quirks.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
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

TEST(JSONReadTest, ValuesReadAsTheirClassesInOrder) {
  auto array = ReadArray("[1, 2.5, \"x\", true, null, false, -7, 1e3, {\"k\": []}]");
  ASSERT_TRUE(array);
  std::vector<std::string> types;
  for (size_t i = 0; i < array->ObjectCount(); ++i) {
    // Read the stored node itself: a lookup would hide the null.
    types.push_back(i == 4 ? "null" : array->TypeNameForIndexOrEmpty(i));
  }
  EXPECT_EQ(types, (std::vector<std::string>{"integer", "double", "string", "bool", "null", "bool",
                                             "integer", "double", "map"}));
  EXPECT_EQ(array->ObjectForIndex(4), nullptr);
  EXPECT_EQ(array->IntegerForIndexWithDefault(0, 0), 1);
  EXPECT_EQ(array->DoubleForIndexWithDefault(1, 0), 2.5);
  EXPECT_FALSE(array->BoolForIndexWithDefault(5, true));
  EXPECT_EQ(array->IntegerForIndexWithDefault(6, 0), -7);
  EXPECT_EQ(array->DoubleForIndexWithDefault(7, 0), 1000.0);
}

TEST(JSONReadTest, ByteStringObjectIsBytesInsideAndAMapAtTheTop) {
  auto map = ReadMap("{\"blob\": {\"SbyteS\":\"AQID\"}, \"list\": [{\"SbyteS\":\"/w\"}]}");
  ASSERT_TRUE(map);
  auto blob = map->ObjectForKey<CSettingsBytes>("blob");
  ASSERT_TRUE(blob);
  EXPECT_EQ(blob->GetValue(), (std::vector<unsigned char>{1, 2, 3}));
  EXPECT_EQ(map->ObjectForKey<CSettingsArray>("list")->TypeNameForIndexOrEmpty(0), "bytes");
  auto top = ReadMap("{\"SbyteS\":\"AQID\"}");
  ASSERT_TRUE(top);
  EXPECT_EQ(top->GetKeys(), (std::vector<std::string>{"SbyteS"}));
  EXPECT_EQ(top->ObjectForKey<CSettingsBytes>("SbyteS")->GetValue().size(), 3u);
  // Only a lone first entry is the byte-string form.
  EXPECT_EQ(ReadMap("{\"blob\": {\"a\": 1, \"SbyteS\":\"AQID\"}}")->TypeNameForKeyOrEmpty("blob"),
            "map");
}

TEST(JSONReadTest, CommentsRunToTheEndOfTheLineBetweenTokens) {
  auto map = ReadMap(
      "// device configuration\n"
      "{ // opening\n"
      "  \"a\" // before the colon\n"
      "  : 1, // after a value\n"
      "  \"b\": [ 1 // one\n"
      "    , 2 ] // last\n"
      "}// end without a newline");
  ASSERT_TRUE(map);
  EXPECT_EQ(map->IntegerForKeyWithDefault("a", int64_t{0}), 1);
  EXPECT_EQ(map->ObjectForKey<CSettingsArray>("b")->ObjectCount(), 2u);
  // Slashes inside a string are text.
  EXPECT_EQ(ReadMap("{\"u\": \"http://host/x\"}")->StringForKeyWithDefault("u", ""),
            "http://host/x");
}

TEST(JSONReadTest, StringEscapesDecode) {
  auto map = ReadMap(R"({"s": "q\"b\\s\/n\nt\tr\rb\bf\f", "u": "\u00e9\u20AC\u0041"})");
  ASSERT_TRUE(map);
  EXPECT_EQ(map->StringForKeyWithDefault("s", ""), "q\"b\\s/n\nt\tr\rb\bf\f");
  EXPECT_EQ(map->StringForKeyWithDefault("u", ""),
            "\xC3\xA9\xE2\x82\xAC"
            "A");
}

TEST(JSONReadTest, UnusableDocumentsGiveEmptyResults) {
  LogCapture capture;
  for (const char* bad : {"",
                          "   \n\t",
                          "// only a comment",
                          "\"just a string\"",
                          "42",
                          "{",
                          "[",
                          "[1 2]",
                          "[,]",
                          "[1,,2]",
                          "{\"a\" 1}",
                          "{\"\": 1}",
                          "{\"a\": 1 \"b\": 2}",
                          "{a: 1}",
                          "{\"a\": 1,",
                          "[1+2]",
                          "[tru]",
                          "{\"a\": [1, 2}",
                          R"({"s": "bad \q escape"})",
                          R"({"s": "\u12"})",
                          R"({"s": "\u12G4"})",
                          R"({"s": "no end})"}) {
    EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(bad), nullptr) << bad;
  }
}

TEST(JSONReadTest, LenientCornersAreKept) {
  LogCapture capture;
  // A trailing comma is harmless, and a closing brace drops an unfinished entry.
  EXPECT_EQ(ReadArray("[1, 2,]")->ObjectCount(), 2u);
  EXPECT_EQ(ReadMap("{\"a\": 1, \"b\"}")->GetKeys(), (std::vector<std::string>{"a"}));
  EXPECT_EQ(ReadMap("{\"a\": }")->ObjectCount(), 0u);
  // Stray characters between tokens are reported and stepped over.
  EXPECT_TRUE(ReadArray("x[1]"));
  EXPECT_TRUE(capture.AssertionContains("isspace((int)buffer_I[pos])"));
  // The later of two like keys wins.
  EXPECT_EQ(ReadMap("{\"k\": 1, \"k\": 2}")->IntegerForKeyWithDefault("k", int64_t{0}), 2);

  // Numbers read like their text says; out of range reads as 0.
  auto array = ReadArray("[9223372036854775807, -9223372036854775808, 5-, 99999999999999999999]");
  ASSERT_TRUE(array);
  EXPECT_EQ(array->IntegerForIndexWithDefault(0, 0), INT64_MAX);
  EXPECT_EQ(array->IntegerForIndexWithDefault(1, 0), INT64_MIN);
  EXPECT_EQ(array->IntegerForIndexWithDefault(2, 0), 5);
  EXPECT_TRUE(capture.LogContains("CSettingsInteger::ReadFromJSONNode: ERROR: bad integer: 5-"));
  EXPECT_EQ(array->IntegerForIndexWithDefault(3, -1), 0);
}

TEST(JSONReadTest, HostileNestingIsRefusedWithoutExhaustingTheStack) {
  LogCapture capture;
  EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(std::string(100000, '[')), nullptr);
  EXPECT_EQ(CSettingsObject::ReadFromJSONBuffer(std::string(300, '[') + std::string(300, ']')),
            nullptr);
  EXPECT_TRUE(capture.LogContains("nests deeper than 200 levels"));
  std::string deepest;
  for (int i = 0; i < 199; ++i) deepest += "{\"a\":";
  EXPECT_TRUE(ReadMap(deepest + "1" + std::string(199, '}')));
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

TEST(JSONFileTest, ConfigurationRoundTripsThroughAFile) {
  auto board = CSettingsMap::New();
  board->SetKeyAndString("Interface", "HID");
  board->SetKeyAndInteger("ProductId", 0x0357);
  board->SetKeyAndDouble("Delay", 0.25);
  board->SetKeyAndBool("Reset", false);
  board->SetKeyAndObject("Key", CSettingsBytes::New({0, 255, 16, 32}));
  auto boards = CSettingsArray::New();
  boards->AddObject(board);
  boards->AddObject(board->DeepCopy());
  auto config = CSettingsMap::New();
  config->SetKeyAndObject("Boards", boards);
  config->SetKeyAndString("Name", "Pen display 13");
  config->SetKeyAndObject("Nothing", nullptr);

  const std::string path = TempPath("roundtrip.ini");
  ASSERT_TRUE(config->SaveJSONToFile(path));
  auto back = CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONFile(path), true);
  ASSERT_TRUE(back);
  // Compare without the null, which IsEqualTo never matches.
  EXPECT_EQ(back->ObjectCount(), 3u);
  config->RemoveObjectForKey("Nothing");
  back->RemoveObjectForKey("Nothing");
  EXPECT_TRUE(back->IsEqualTo(config));
  std::filesystem::remove(path);
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
