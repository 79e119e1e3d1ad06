#include "settings/SettingsText.h"

#include <algorithm>
#include <cctype>

#include "common/CTavException.h"
#include "common/TavLog.h"

namespace SettingsText {

namespace {

const char kBase64Alphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

char EncodeBase64Char(unsigned value_I) { return value_I < 64 ? kBase64Alphabet[value_I] : '='; }

unsigned DecodeBase64Char(char character_I) {
  if (character_I >= 'A' && character_I <= 'Z') return static_cast<unsigned>(character_I - 'A');
  if (character_I >= 'a' && character_I <= 'z')
    return static_cast<unsigned>(character_I - 'a') + 26;
  if (character_I >= '0' && character_I <= '9')
    return static_cast<unsigned>(character_I - '0') + 52;
  if (character_I == '+') return 62;
  if (character_I == '/') return 63;
  throw CTavException(nullptr, 0, "bad char", 65535);
}

bool IsBlank(char character_I) {
  return std::isspace(static_cast<unsigned char>(character_I)) != 0;
}

char LowerByte(char character_I) {
  return static_cast<char>(std::tolower(static_cast<unsigned char>(character_I)));
}

}  // namespace

bool IEquals(const std::string& left_I, const std::string& right_I) {
  return left_I.size() == right_I.size() &&
         std::equal(left_I.begin(), left_I.end(), right_I.begin(),
                    [](char a, char b) { return LowerByte(a) == LowerByte(b); });
}

std::string Trim_Copy(const std::string& text_I) {
  size_t first = 0;
  while (first < text_I.size() && IsBlank(text_I[first])) ++first;
  size_t last = text_I.size();
  while (last > first && IsBlank(text_I[last - 1])) --last;
  return text_I.substr(first, last - first);
}

std::string IReplaceAll(const std::string& text_I, const std::string& from_I,
                        const std::string& to_I) {
  if (from_I.empty()) return text_I;
  std::string lowerText(text_I.size(), '\0');
  std::transform(text_I.begin(), text_I.end(), lowerText.begin(), LowerByte);
  std::string lowerFrom(from_I.size(), '\0');
  std::transform(from_I.begin(), from_I.end(), lowerFrom.begin(), LowerByte);

  std::string result;
  size_t start = 0;
  for (size_t found = lowerText.find(lowerFrom); found != std::string::npos;
       found = lowerText.find(lowerFrom, start)) {
    result.append(text_I, start, found - start);
    result += to_I;
    start = found + from_I.size();
  }
  result.append(text_I, start, std::string::npos);
  return result;
}

std::string EncodeUnicodePointToUTF8(uint32_t point_I) {
  std::string out;
  if (point_I < 0x80) {
    out += static_cast<char>(point_I);
  } else if (point_I < 0x800) {
    out += static_cast<char>(0xC0 | (point_I >> 6));
    out += static_cast<char>(0x80 | (point_I & 0x3F));
  } else if (point_I < 0x10000) {
    out += static_cast<char>(0xE0 | (point_I >> 12));
    out += static_cast<char>(0x80 | ((point_I >> 6) & 0x3F));
    out += static_cast<char>(0x80 | (point_I & 0x3F));
  } else if (point_I <= 0x10FFFF) {
    out += static_cast<char>(0xF0 | (point_I >> 18));
    out += static_cast<char>(0x80 | ((point_I >> 12) & 0x3F));
    out += static_cast<char>(0x80 | ((point_I >> 6) & 0x3F));
    out += static_cast<char>(0x80 | (point_I & 0x3F));
  }
  return out;
}

std::string GetBase64(const std::vector<unsigned char>& bytes_I) {
  std::string out;
  out.reserve((bytes_I.size() + 2) / 3 * 4);
  size_t i = 0;
  for (; i + 3 <= bytes_I.size(); i += 3) {
    const unsigned group = (bytes_I[i] << 16) | (bytes_I[i + 1] << 8) | bytes_I[i + 2];
    out += EncodeBase64Char((group >> 18) & 0x3F);
    out += EncodeBase64Char((group >> 12) & 0x3F);
    out += EncodeBase64Char((group >> 6) & 0x3F);
    out += EncodeBase64Char(group & 0x3F);
  }
  const size_t left = bytes_I.size() - i;
  if (left == 1) {
    out += EncodeBase64Char(bytes_I[i] >> 2);
    out += EncodeBase64Char((bytes_I[i] & 0x03) << 4);
  } else if (left == 2) {
    const unsigned group = (bytes_I[i] << 8) | bytes_I[i + 1];
    out += EncodeBase64Char((group >> 10) & 0x3F);
    out += EncodeBase64Char((group >> 4) & 0x3F);
    out += EncodeBase64Char((group << 2) & 0x3F);
  }
  return out;
}

std::vector<unsigned char> GetBytesFromBase64(const std::string& text_I) {
  std::vector<unsigned char> out;
  out.reserve(text_I.size() / 4 * 3 + 2);
  try {
    for (size_t i = 0; i < text_I.size(); i += 4) {
      const size_t count = std::min<size_t>(4, text_I.size() - i);
      unsigned group = 0;
      for (size_t k = 0; k < count; ++k) group |= DecodeBase64Char(text_I[i + k]) << (18 - 6 * k);
      // Four characters carry three bytes, three carry two, two carry one.
      if (count >= 2) out.push_back(static_cast<unsigned char>(group >> 16));
      if (count >= 3) out.push_back(static_cast<unsigned char>(group >> 8));
      if (count == 4) out.push_back(static_cast<unsigned char>(group));
    }
  } catch (const std::exception& error) {
    TavLog::Warning("Base64 exception: %s\n", error.what());
    return {};
  }
  return out;
}

}  // namespace SettingsText
