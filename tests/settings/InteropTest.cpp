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
#include <unistd.h>

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

// Depth, length, tag and value of each element as openssl's parser saw them.
std::string BerSummary(const std::string& output_I) {
  const std::regex line(R"(d=(\d+)\s+hl=\d+\s+l=\s*(\w+)\s+(prim|cons):\s*([^:]*?)\s*(?::(.*))?$)");
  std::istringstream lines(output_I);
  std::string summary;
  for (std::string text; std::getline(lines, text);) {
    std::smatch match;
    if (!std::regex_search(text, match, line)) return "unexpected line: " + text;
    std::string value = match[5].str();
    if (value.size() > 8) value = value.substr(0, 8) + "...";
    summary += match[1].str() + " " + match[2].str() + " " + match[4].str() + " " + value + "\n";
  }
  return summary;
}

// The Python reader's view of a document: sorted JSON, bytes as hex.
std::string Python(const std::string& load_I) {
  return "python3 -c 'import json, plistlib, sys\n"
         "def dump(value):\n"
         "    print(json.dumps(value, sort_keys=True, separators=(\",\", \":\"),\n"
         "          ensure_ascii=False, default=lambda b: \"hex:\" + b.hex()))\n"
         "with open(sys.argv[1], \"rb\") as f:\n"
         "    dump(" +
         load_I + "(f))' FILE";
}

std::string PythonView(const std::string& key_I, const std::string& nothing_I) {
  return "{\"Big\":9223372036854775807,\"Board\":{\"Interface\":\"HID\",\"Key\":" + key_I +
         ",\"ProductId\":855},\"List\":[true,false,-12,2.5,\"x\"],\"Name\":\"Pen display 13 "
         "\xC3\xA9\"," +
         nothing_I + "\"Ratio\":0.125}\n";
}

TEST(InteropTest, StandardReadersReadWhatWeWrite) {
  auto marked = PortableTree();
  marked->SetKeyAndString("Escaped", "a<b & \"c\" 'd' ]]> e");
  marked->SetKeyAndKEString("Secret", "k]]>y");
  marked->SetKeyAndObject("Empty", CSettingsMap::New());
  marked->SetKeyAndObject("Nothing", nullptr);
  auto withNull = PortableTree();
  withNull->SetKeyAndObject("Nothing", nullptr);
  auto list = CSettingsArray::New();
  list->AddBool(true);
  list->AddInteger(100);
  list->AddString("x");
  auto ber = CSettingsMap::New();
  ber->SetKeyAndObject("List", list);
  ber->SetKeyAndObject("b", CSettingsBytes::New({1, 2}));
  ber->SetKeyAndDouble("d", 1.5);
  ber->SetKeyAndObject("e", CSettingsMap::New());
  ber->SetKeyAndObject("n", nullptr);
  ber->SetKeyAndString("s", std::string(300, 'z'));
  const auto binary = ber->GetASN1Binary();

  const struct {
    const char* tool;
    std::string document;
    std::string command;  // FILE stands for the document
    std::string expected;
  } checks[] = {{"xmllint", marked->GetXMLString(""),
                 "xmllint --xpath 'concat(/root/Escaped, \"|\", /root/Secret, \"|\", "
                 "/root/Board/ProductId/@type)' FILE",
                 "a<b & \"c\" 'd' ]]> e|k&rsqbracket;&rsqbracket;>y|integer\n"},
                {"xmllint", marked->GetPListString(true), "xmllint --noout FILE", ""},
                {"python3", PortableTree()->GetPListString(true), Python("plistlib.load"),
                 PythonView("\"hex:0010ff010203\"", "")},
                {"python3", withNull->GetJSONString(), Python("json.load"),
                 PythonView("{\"SbyteS\":\"ABD/AQID\"}", "\"Nothing\":null,")},
                {"openssl", std::string(binary.begin(), binary.end()),
                 "openssl asn1parse -inform DER -in FILE",
                 "0 4 INTEGER 5461766D\n0 inf appl [ 0 ] \n1 4 UTF8STRING List\n1 inf appl [ 2 ] \n"
                 "2 1 BOOLEAN 255\n2 1 INTEGER 64\n2 1 UTF8STRING x\n2 0 EOC \n1 1 UTF8STRING b\n"
                 "1 2 OCTET STRING      [HEX DUMP] 0102\n1 1 UTF8STRING d\n1 8 appl [ 1 ] \n"
                 "1 1 UTF8STRING e\n1 inf appl [ 0 ] \n2 0 EOC \n1 1 UTF8STRING n\n1 0 NULL \n"
                 "1 1 UTF8STRING s\n1 300 UTF8STRING zzzzzzzz...\n1 0 EOC \n"}};
  std::string missing;
  for (const auto& check : checks) {
    if (RunTool(std::string("command -v ") + check.tool).mStatus != 0) {
      missing += std::string(" ") + check.tool;
      continue;
    }
    const fs::path path =
        fs::temp_directory_path() / ("settings-interop-" + std::to_string(getpid()));
    std::ofstream(path, std::ios::binary) << check.document;
    std::string command = check.command;
    command.replace(command.find("FILE"), 4, "'" + path.string() + "'");
    const SToolResult result = RunTool(command);
    EXPECT_EQ(result.mStatus, 0) << command << "\n" << result.mOutput;
    EXPECT_EQ(check.tool == std::string("openssl") ? BerSummary(result.mOutput) : result.mOutput,
              check.expected)
        << command;
    fs::remove(path);
  }
  if (!missing.empty()) GTEST_SKIP() << "not installed:" << missing;
}

}  // namespace
