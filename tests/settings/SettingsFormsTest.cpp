// What every form of the tree shares: round trips, nulls and the nesting
// limit, one table over the forms. Their quirks stay with each form's tests.

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <functional>

#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/SettingsTestTrees.h"
#include "support/LogCapture.h"

namespace {

using Object = std::shared_ptr<CSettingsObject>;
using CSO = CSettingsObject;
// One file a process: ctest runs the tests side by side.
const std::string kPath =
    std::filesystem::temp_directory_path() / ("settings-forms-" + std::to_string(getpid()));

Object Xml(const Object& t_I) { return CSO::ReadFromXMLBuffer(t_I->GetXMLString("")); }
Object XmlFile(const Object& t_I) {
  std::string errorText = "untouched";
  auto back = t_I->SaveXMLToFile(kPath) ? CSO::ReadFromXMLFile(kPath, errorText) : nullptr;
  return errorText.empty() ? back : nullptr;
}
Object PList(const Object& t_I) { return CSO::ReadFromXMLBuffer(t_I->GetPListString(true)); }
Object Json(const Object& t_I) { return CSO::ReadFromJSONBuffer(t_I->GetJSONString()); }
Object JsonFile(const Object& t_I) {
  return t_I->SaveJSONToFile(kPath) ? CSO::ReadFromJSONFile(kPath) : nullptr;
}
Object Asn1(const Object& t_I) { return CSO::ReadFromASN1Binary(t_I->GetASN1Binary()); }
Object Zip(const Object& t_I) { return CSO::ReadFromCompressedBinary(t_I->GetCompressedBinary()); }

// The JSON writer escapes nothing and loses KEStrings and empty containers.
// A stored null has no property list element, and the binary reader has none.
const std::string kNull = "map[a:integer[1], n:null[]]";
const struct SForm {
  const char* name;
  Object (*writeAndRead)(const Object&);
  bool faithful;
  std::string nullTrace;
} kForms[] = {{"xml", Xml, true, kNull},
              {"xml file", XmlFile, true, kNull},
              {"plist", PList, true, "map[a:integer[1]]"},
              {"json", Json, false, kNull},
              {"json file", JsonFile, false, kNull},
              {"asn1", Asn1, true, ""},
              {"compressed", Zip, true, ""}};

TEST(SettingsFormsTest, TreesRoundTripThroughEveryForm) {
  auto everyClass = SettingsTestTrees::EveryClass();
  everyClass->SetKeyAndObject("Long", CSettingsString::New(std::string(70000, 'z')));
  everyClass->SetKeyAndInteger("Max", INT64_MAX);
  auto array = CSettingsArray::New();
  array->AddInteger(1);
  array->AddObject(SettingsTestTrees::Configuration(10));
  for (const SForm& form : kForms) {
    std::vector<Object> trees{SettingsTestTrees::Configuration(40), array};
    if (form.faithful) trees.push_back(everyClass);
    for (const Object& tree : trees) {
      const Object back = form.writeAndRead(tree);
      ASSERT_TRUE(back) << form.name;
      EXPECT_TRUE(back->IsEqualTo(tree)) << form.name << ": " << back->GetTraceString();
    }
  }
  // The binary forms keep every bit of a double.
  auto tiny = CSettingsMap::New();
  tiny->SetKeyAndDouble("Tiny", 5e-324);
  EXPECT_TRUE(Asn1(tiny)->IsEqualTo(tiny));
  EXPECT_TRUE(Zip(tiny)->IsEqualTo(tiny));
  std::filesystem::remove(kPath);
}

TEST(SettingsFormsTest, StoredNullsComeBackAsTheFormAllows) {
  LogCapture capture;
  auto tree = CSettingsMap::New();
  tree->SetKeyAndInteger("a", 1);
  tree->SetKeyAndObject("n", nullptr);
  for (const SForm& form : kForms) {
    const Object back = form.writeAndRead(tree);
    EXPECT_EQ(back ? back->GetTraceString() : "", form.nullTrace) << form.name;
  }
  EXPECT_TRUE(capture.LogContains("[I] ReadFromASN1Binary: unknown data type in archive"));
}

TEST(SettingsFormsTest, NestingBeyondTheLimitIsRefusedWithoutExhaustingTheStack) {
  LogCapture capture;
  const auto xml = [](const std::string& d_I) { return CSO::ReadFromXMLBuffer(d_I); };
  const auto asn1 = [](const std::string& d_I) {
    return CSO::ReadFromASN1Binary(CSO::Bytes(d_I.begin(), d_I.end()));
  };
  // Documents of `levels` containers; the plist element is one of them.
  const struct {
    std::function<Object(const std::string&)> read;
    std::string before, open, inner, close, after;
    int outerLevels;
  } forms[] = {{CSO::ReadFromJSONBuffer, "", "[", "", "]", "", 0},
               {xml, "<root>", "<a>", "x", "</a>", "</root>", 0},
               {xml, "<plist version=\"1.0\">", "<array>", "", "</array>", "</plist>", 1},
               {asn1, "\x02\x04Tavm", "\x62\x80", "", std::string(2, '\0'), "", 0}};
  for (const auto& form : forms) {
    for (const auto& [levels, readable] : {std::pair{200, true}, {201, false}, {100000, false}}) {
      std::string document = form.before;
      for (int i = form.outerLevels; i < levels; ++i) document += form.open;
      document += form.inner;
      for (int i = form.outerLevels; i < levels; ++i) document += form.close;
      EXPECT_EQ(form.read(document + form.after) != nullptr, readable) << form.before << levels;
    }
  }
  EXPECT_TRUE(capture.LogContains("nests deeper than 200 levels"));
}

}  // namespace
