// What we write is read by standard readers: xmllint for XML, python3's
// plistlib and json for property lists and JSON, openssl's BER parser for
// the binary form. A missing tool skips its check loudly.
//
// Where the format itself departs from the standard the trees here avoid it,
// and the departures are these: Base64 without padding (plistlib refuses data
// whose length is not a multiple of three), a KEString tagged constructed but
// holding plain bytes (not valid BER), integers as unsigned minimal bytes
// (BER reads 128 to 255 as negative), and JSON strings written unescaped.

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

#include "settings/CSettingsMap.h"

namespace {

namespace fs = std::filesystem;

struct SToolResult {
  int mStatus = -1;
  std::string mOutput;
};

SToolResult RunTool(const std::string& command_I) {
  SToolResult result;
  FILE* pipe = popen((command_I + " 2>&1").c_str(), "r");
  if (pipe == nullptr) return result;
  char buffer[4096];
  for (size_t n; (n = fread(buffer, 1, sizeof buffer, pipe)) > 0;) result.mOutput.append(buffer, n);
  const int status = pclose(pipe);
  result.mStatus = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  return result;
}

#define SKIP_WITHOUT(tool_I) \
  if (RunTool("command -v " tool_I).mStatus != 0) GTEST_SKIP() << tool_I " is not installed"

// Named after the running test too: ctest runs tests side by side.
fs::path WriteTemp(const std::string& name_I, const std::string& content_I) {
  const std::string test = ::testing::UnitTest::GetInstance()->current_test_info()->name();
  const fs::path path = fs::temp_directory_path() / ("settings-interop-" + test + "-" + name_I);
  std::ofstream(path, std::ios::binary) << content_I;
  return path;
}

// The Python reader's view of a document: sorted JSON, bytes as hex.
const char kPythonDump[] =
    "import json, sys\n"
    "def dump(value):\n"
    "    print(json.dumps(value, sort_keys=True, separators=(',', ':'), ensure_ascii=False,\n"
    "                     default=lambda b: 'hex:' + b.hex()))\n";

std::shared_ptr<CSettingsMap> PortableTree() {
  auto list = CSettingsArray::New();
  list->AddBool(true);
  list->AddBool(false);
  list->AddInteger(-12);
  list->AddDouble(2.5);
  list->AddString("x");
  auto board = CSettingsMap::New();
  board->SetKeyAndString("Interface", "HID");
  board->SetKeyAndInteger("ProductId", 855);
  board->SetKeyAndObject("Key", CSettingsBytes::New({0x00, 0x10, 0xFF, 0x01, 0x02, 0x03}));
  auto tree = CSettingsMap::New();
  tree->SetKeyAndObject("Board", board);
  tree->SetKeyAndObject("List", list);
  tree->SetKeyAndString("Name", "Pen display 13 \xC3\xA9");
  tree->SetKeyAndInteger("Big", INT64_MAX);
  tree->SetKeyAndDouble("Ratio", 0.125);
  return tree;
}

TEST(InteropTest, XmlIsWellFormedForXmllint) {
  SKIP_WITHOUT("xmllint");
  auto tree = PortableTree();
  tree->SetKeyAndString("Escaped", "a<b & \"c\" 'd' ]]> e");
  tree->SetKeyAndKEString("Secret", "k]]>y");
  tree->SetKeyAndObject("Empty", CSettingsMap::New());
  tree->SetKeyAndObject("Nothing", nullptr);

  const fs::path xml = WriteTemp("tree.xml", tree->GetXMLString(""));
  const fs::path plist = WriteTemp("tree.plist", tree->GetPListString(true));
  for (const fs::path& path : {xml, plist}) {
    const SToolResult lint = RunTool("xmllint --noout '" + path.string() + "'");
    EXPECT_EQ(lint.mStatus, 0) << lint.mOutput;
  }
  for (const auto& [path, expected] :
       {std::pair<const char*, const char*>{"/root/Escaped", "a<b & \"c\" 'd' ]]> e\n"},
        {"/root/Secret", "k&rsqbracket;&rsqbracket;>y\n"},
        {"/root/Board/ProductId/@type", "integer\n"}}) {
    EXPECT_EQ(RunTool("xmllint --xpath 'string(" + std::string(path) + ")' '" + xml.string() + "'")
                  .mOutput,
              expected);
  }
  fs::remove(xml);
  fs::remove(plist);
}

TEST(InteropTest, PropertyListAndJsonLoadInPython) {
  SKIP_WITHOUT("python3");
  auto tree = PortableTree();
  const fs::path plist = WriteTemp("tree.plist", tree->GetPListString(true));
  tree->SetKeyAndObject("Nothing", nullptr);
  const fs::path json = WriteTemp("tree.json", "");
  ASSERT_TRUE(tree->SaveJSONToFile(json.string()));
  const struct {
    fs::path file;
    const char* load;
    const char* key;
    const char* nothing;
  } forms[] = {
      {plist, "import plistlib\nwith open(sys.argv[1], 'rb') as f:\n    dump(plistlib.load(f))\n",
       "\"hex:0010ff010203\"", ""},
      {json, "with open(sys.argv[1], encoding='utf-8') as f:\n    dump(json.load(f))\n",
       "{\"SbyteS\":\"ABD/AQID\"}", "\"Nothing\":null,"}};
  for (const auto& form : forms) {
    const fs::path script = WriteTemp("load.py", std::string(kPythonDump) + form.load);
    const SToolResult result =
        RunTool("python3 '" + script.string() + "' '" + form.file.string() + "'");
    EXPECT_EQ(result.mStatus, 0) << result.mOutput;
    EXPECT_EQ(result.mOutput, std::string("{\"Big\":9223372036854775807,"
                                          "\"Board\":{\"Interface\":\"HID\",\"Key\":") +
                                  form.key +
                                  ",\"ProductId\":855},\"List\":[true,false,-12,2.5,\"x\"],"
                                  "\"Name\":\"Pen display 13 \xC3\xA9\"," +
                                  form.nothing + "\"Ratio\":0.125}\n");
    fs::remove(script);
    fs::remove(form.file);
  }
}

TEST(InteropTest, BinaryFormIsValidBer) {
  SKIP_WITHOUT("openssl");
  auto list = CSettingsArray::New();
  list->AddBool(true);
  list->AddInteger(100);
  list->AddString("x");
  auto tree = CSettingsMap::New();
  tree->SetKeyAndObject("List", list);
  tree->SetKeyAndObject("b", CSettingsBytes::New({1, 2}));
  tree->SetKeyAndDouble("d", 1.5);
  tree->SetKeyAndObject("e", CSettingsMap::New());
  tree->SetKeyAndObject("n", nullptr);
  tree->SetKeyAndString("s", std::string(300, 'z'));

  const auto binary = tree->GetASN1Binary();
  const fs::path der = WriteTemp("tree.ber", std::string(binary.begin(), binary.end()));
  const SToolResult result = RunTool("openssl asn1parse -inform DER -in '" + der.string() + "'");
  EXPECT_EQ(result.mStatus, 0) << result.mOutput;

  // Depth, tag and value of each element as the parser saw them.
  std::vector<std::string> seen;
  const std::regex line(R"(d=(\d+)\s+hl=\d+\s+l=\s*(\w+)\s+(prim|cons):\s*([^:]*?)\s*(?::(.*))?$)");
  std::istringstream lines(result.mOutput);
  for (std::string text; std::getline(lines, text);) {
    std::smatch match;
    if (!std::regex_search(text, match, line)) {
      ADD_FAILURE() << "unexpected line: " << text;
      continue;
    }
    std::string value = match[5].str();
    if (value.size() > 8) value = value.substr(0, 8) + "...";
    seen.push_back(match[1].str() + " " + match[2].str() + " " + match[4].str() + " " + value);
  }
  EXPECT_EQ(seen, (std::vector<std::string>{
                      "0 4 INTEGER 5461766D",
                      "0 inf appl [ 0 ] ",
                      "1 4 UTF8STRING List",
                      "1 inf appl [ 2 ] ",
                      "2 1 BOOLEAN 255",
                      "2 1 INTEGER 64",
                      "2 1 UTF8STRING x",
                      "2 0 EOC ",
                      "1 1 UTF8STRING b",
                      "1 2 OCTET STRING      [HEX DUMP] 0102",
                      "1 1 UTF8STRING d",
                      "1 8 appl [ 1 ] ",
                      "1 1 UTF8STRING e",
                      "1 inf appl [ 0 ] ",
                      "2 0 EOC ",
                      "1 1 UTF8STRING n",
                      "1 0 NULL ",
                      "1 1 UTF8STRING s",
                      "1 300 UTF8STRING zzzzzzzz...",
                      "1 0 EOC ",
                  }));
  fs::remove(der);
}

}  // namespace
