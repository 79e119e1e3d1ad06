#include <gtest/gtest.h>

#include <array>

#include "common/CTavException.h"
#include "common/StringUtilities.h"
#include "support/LogCapture.h"

using namespace StringUtilities;
using Strings = std::vector<std::string>;
using Bytes = std::vector<uint8_t>;

TEST(Tokenize, EmptyTokensTrailingDelimiterAndEmptyText) {
  // A delimiter at the very end adds nothing; one at the start does. Any
  // character of the set splits; no delimiter in the text gives it whole.
  const struct {
    const char *text, *delimiters;
    bool skipEmpty;
    Strings expected;
  } cases[] = {// clang-format off
      {"a::b", ":", false, {"a", "", "b"}}, {"a::b", ":", true, {"a", "b"}},
      {"a:", ":", false, {"a"}}, {"a::", ":", false, {"a", ""}}, {":a", ":", false, {"", "a"}},
      {":a", ":", true, {"a"}}, {"", ":", false, {}}, {":::", ":", true, {}},
      {"whole", ":", false, {"whole"}}, {"1133:222 3,4", ": ,", true, {"1133", "222", "3", "4"}}};
  // clang-format on
  for (const auto& c : cases)
    EXPECT_EQ(Tokenize(c.text, c.delimiters, c.skipEmpty), c.expected) << c.text;
}

TEST(StringUtilities, CaseTrimSearchAndReplace) {
  std::string text = "MiXeD 123 \xC3\x84";
  ToLower(text);
  EXPECT_EQ(text, "mixed 123 \xC3\x84");  // bytes above ASCII stay as they are
  EXPECT_EQ(ToLower_Copy("HID"), "hid");
  EXPECT_EQ(Trim_Copy(" \t\r\n x y \v\f"), "x y");
  EXPECT_EQ(Trim_Copy("   "), "");
  std::string padded = "  pen  ";
  Trim(padded);
  EXPECT_EQ(padded, "pen");

  EXPECT_TRUE(IEquals("Touch", "tOUCH"));
  EXPECT_FALSE(IEquals("Touch", "Touch "));
  EXPECT_FALSE(StartsWith("COM.tavik.x", "com"));
  EXPECT_FALSE(EndsWith("image.HEX", ".hex"));
  EXPECT_FALSE(EndsWith("x", "longer"));

  // Every match is replaced once, and an empty pattern changes nothing.
  for (auto [in, from, to, out] :
       {std::array<std::string, 4>{"Pen pen PEN", "pen", "pen-pen", "pen-pen pen-pen pen-pen"},
        {"abc", "", "x", "abc"},
        {"aAaA", "aa", "b", "bb"}}) {
    IReplaceAll(in, from, to);
    EXPECT_EQ(in, out);
  }
}

TEST(StringUtilities, Format) {
  EXPECT_EQ(Format("%s-%04X-%d", "id", 0xBEEFu, -3), "id-BEEF--3");
  EXPECT_EQ(Format("%s", ""), "");
  EXPECT_EQ(Format("<%s>", std::string(5000, 'z').c_str()).size(), 5002u);
}

TEST(UTF8, EncodesAtEveryLengthBoundaryAndDecodesBack) {
  // clang-format off
  const std::pair<uint32_t, std::string> encodings[] = {
      {0x00, std::string(1, '\0')}, {0x7F, "\x7F"}, {0x80, "\xC2\x80"}, {0x7FF, "\xDF\xBF"},
      {0x800, "\xE0\xA0\x80"}, {0xD800, "\xED\xA0\x80"}, {0xFFFF, "\xEF\xBF\xBF"},
      {0x10000, "\xF0\x90\x80\x80"}, {0x10FFFF, "\xF4\x8F\xBF\xBF"}, {1114112, ""}, {0xFFFFFFFF, ""}};
  // clang-format on
  for (const auto& [point, bytes] : encodings) {
    EXPECT_EQ(EncodeUnicodePointToUTF8(point), bytes);
    size_t position = 0;
    uint32_t decoded = 0xDEAD;
    EXPECT_EQ(DecodeUTF8ToUnicodePoint(bytes, position, decoded), !bytes.empty()) << point;
    EXPECT_EQ(decoded, bytes.empty() ? 0xDEAD : point);
    EXPECT_EQ(position, bytes.size());
  }
  // Several points in a row, the position walking over each.
  const std::string text = "a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80";
  size_t position = 0;
  uint32_t point = 0;
  std::vector<uint32_t> points;
  while (DecodeUTF8ToUnicodePoint(text, position, point)) points.push_back(point);
  EXPECT_EQ(points, (std::vector<uint32_t>{0x61, 0xE9, 0x20AC, 0x1F600}));
  EXPECT_EQ(position, text.size());
}

TEST(UTF8, RefusesMalformedSequences) {
  // A continuation without a lead, a cut sequence, a lead before a
  // non-continuation, overlong forms of 0x7F, 0x7FF and 0xFFFF, 0x110000
  // beyond Unicode, and a five-byte lead.
  // clang-format off
  const char* bad[] = {"\x80", "\xC3", "\xC3\x41", "\xC1\xBF", "\xE0\x9F\xBF", "\xF0\x8F\xBF\xBF",
                       "\xF4\x90\x80\x80", "\xF8\x88\x80\x80\x80"};
  // clang-format on
  for (const char* sequence : bad) {
    const std::string text(sequence);
    size_t position = 0;
    uint32_t point = 7;
    EXPECT_FALSE(DecodeUTF8ToUnicodePoint(text, position, point)) << text.size();
    EXPECT_EQ(position, 0u);
    EXPECT_EQ(point, 7u);
  }
  size_t past = 3;
  uint32_t point = 0;
  EXPECT_FALSE(DecodeUTF8ToUnicodePoint("abc", past, point));
}

TEST(Base64, RoundTripsEveryTailLengthWithoutPadding) {
  EXPECT_EQ(GetBase64({}), "");
  EXPECT_EQ(GetBase64({0xFF}), "/w");
  EXPECT_EQ(GetBytesFromBase64("/w"), (Bytes{0xFF}));
  EXPECT_EQ(GetBase64({'M', 'a'}), "TWE");
  EXPECT_EQ(GetBase64({'M', 'a', 'n'}), "TWFu");
  Bytes all(256);
  for (size_t i = 0; i < all.size(); ++i) all[i] = static_cast<uint8_t>(i);
  for (size_t length = 0; length <= all.size(); ++length) {
    const Bytes bytes(all.begin(), all.begin() + static_cast<long>(length));
    const std::string text = GetBase64(bytes);
    EXPECT_EQ(text.size(), (length * 4 + 2) / 3);
    EXPECT_EQ(GetBytesFromBase64(text), bytes) << length;
  }
}

TEST(Base64, PaddingOrAnyBadCharacterRefusesTheWholeText) {
  EXPECT_EQ(EncodeBase64Char(0), 'A');
  EXPECT_EQ(EncodeBase64Char(63), '/');
  EXPECT_EQ(EncodeBase64Char(64), '=');
  EXPECT_EQ(DecodeBase64Char('+'), 62);
  EXPECT_THROW(DecodeBase64Char('='), CTavException);
  LogCapture capture;
  // Padding, a blank, the neighbours of the letter ranges: all refused,
  // even after good groups.
  for (const char* text :
       {"TWE=", "TWFu/w==", "TWFu TWFu", "TW@u", "TW[u", "TW`u", "TW{u", "T:Fu"}) {
    EXPECT_TRUE(GetBytesFromBase64(text).empty()) << text;
  }
  EXPECT_TRUE(capture.LogContains("[W] Base64 exception: Status: ffff,  \"bad char\"\n"));
  // A lone last character gives no byte but is still checked.
  EXPECT_EQ(GetBytesFromBase64("TWFuT"), (Bytes{'M', 'a', 'n'}));
  EXPECT_TRUE(GetBytesFromBase64("TWFu=").empty());
}
