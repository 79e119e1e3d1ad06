#include "common/StringUtilities.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <cwctype>

#include "common/CTavException.h"
#include "common/TavLog.h"

namespace StringUtilities {

namespace {

char AsciiLower(char c_I) { return (c_I >= 'A' && c_I <= 'Z') ? static_cast<char>(c_I + 32) : c_I; }
char AsciiUpper(char c_I) { return (c_I >= 'a' && c_I <= 'z') ? static_cast<char>(c_I - 32) : c_I; }

bool IsBlank(char c_I) {
  return c_I == ' ' || c_I == '\t' || c_I == '\n' || c_I == '\r' || c_I == '\f' || c_I == '\v';
}

template <typename TString>
std::vector<TString> TokenizeAny(const TString& text_I, const TString& delimiters_I,
                                 bool skipEmpty_I) {
  std::vector<TString> tokens;
  size_t start = 0;
  while (start < text_I.size()) {
    size_t end = text_I.find_first_of(delimiters_I, start);
    if (end == TString::npos) end = text_I.size();
    if (end > start || !skipEmpty_I) tokens.push_back(text_I.substr(start, end - start));
    start = end + 1;
  }
  return tokens;
}

constexpr char kBase64Alphabet[] =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr uint16_t kBadCharStatus = 65535;

}  // namespace

std::vector<std::string> Tokenize(const std::string& text_I, const std::string& delimiters_I,
                                  bool skipEmpty_I) {
  return TokenizeAny(text_I, delimiters_I, skipEmpty_I);
}

std::vector<std::wstring> Tokenize(const std::wstring& text_I, const std::wstring& delimiters_I,
                                   bool skipEmpty_I) {
  return TokenizeAny(text_I, delimiters_I, skipEmpty_I);
}

void ToLower(std::string& text_IO) {
  for (char& c : text_IO) c = AsciiLower(c);
}

void ToUpper(std::string& text_IO) {
  for (char& c : text_IO) c = AsciiUpper(c);
}

std::string ToLower_Copy(const std::string& text_I) {
  std::string copy = text_I;
  ToLower(copy);
  return copy;
}

std::string ToUpper_Copy(const std::string& text_I) {
  std::string copy = text_I;
  ToUpper(copy);
  return copy;
}

void Trim(std::string& text_IO) {
  size_t end = text_IO.size();
  while (end > 0 && IsBlank(text_IO[end - 1])) --end;
  size_t start = 0;
  while (start < end && IsBlank(text_IO[start])) ++start;
  text_IO = text_IO.substr(start, end - start);
}

std::string Trim_Copy(const std::string& text_I) {
  std::string copy = text_I;
  Trim(copy);
  return copy;
}

bool IEquals(const std::string& a_I, const std::string& b_I) {
  if (a_I.size() != b_I.size()) return false;
  for (size_t i = 0; i < a_I.size(); ++i) {
    if (AsciiLower(a_I[i]) != AsciiLower(b_I[i])) return false;
  }
  return true;
}

bool IEquals(const std::wstring& a_I, const std::wstring& b_I) {
  if (a_I.size() != b_I.size()) return false;
  for (size_t i = 0; i < a_I.size(); ++i) {
    if (std::towlower(static_cast<wint_t>(a_I[i])) != std::towlower(static_cast<wint_t>(b_I[i])))
      return false;
  }
  return true;
}

size_t IFindFirst(const std::string& text_I, const std::string& search_I) {
  return ToLower_Copy(text_I).find(ToLower_Copy(search_I));
}

bool IContains(const std::string& text_I, const std::string& search_I) {
  return IFindFirst(text_I, search_I) != std::string::npos;
}

bool Contains(const std::string& text_I, const std::string& search_I) {
  return text_I.find(search_I) != std::string::npos;
}

void IReplaceAll(std::string& text_IO, const std::string& from_I, const std::string& to_I) {
  if (from_I.empty()) return;
  const std::string from = ToLower_Copy(from_I);
  std::string lower = ToLower_Copy(text_IO);
  size_t position = lower.find(from);
  while (position != std::string::npos) {
    text_IO.replace(position, from.size(), to_I);
    lower.replace(position, from.size(), ToLower_Copy(to_I));
    position = lower.find(from, position + to_I.size());
  }
}

bool IStartsWith(const std::string& text_I, const std::string& prefix_I) {
  return text_I.size() >= prefix_I.size() && IEquals(text_I.substr(0, prefix_I.size()), prefix_I);
}

bool StartsWith(const std::string& text_I, const std::string& prefix_I) {
  return text_I.starts_with(prefix_I);
}

bool IEndsWith(const std::string& text_I, const std::string& suffix_I) {
  return text_I.size() >= suffix_I.size() &&
         IEquals(text_I.substr(text_I.size() - suffix_I.size()), suffix_I);
}

bool EndsWith(const std::string& text_I, const std::string& suffix_I) {
  return text_I.ends_with(suffix_I);
}

std::string Format(const char* format_I, ...) {
  if (format_I == nullptr) return std::string();
  va_list args;
  va_start(args, format_I);
  va_list copy;
  va_copy(copy, args);
  const int needed = std::vsnprintf(nullptr, 0, format_I, copy);
  va_end(copy);
  std::string text;
  if (needed > 0) {
    text.resize(static_cast<size_t>(needed) + 1);
    std::vsnprintf(text.data(), text.size(), format_I, args);
    text.resize(static_cast<size_t>(needed));
  }
  va_end(args);
  return text;
}

std::string StringFromCharArray(const char* text_I) {
  return text_I != nullptr ? std::string(text_I) : std::string();
}

std::string CurrentSystemTime() {
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  localtime_r(&now, &local);
  char text[32];
  const size_t length = std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &local);
  return std::string(text, length);
}

std::string EncodeUnicodePointToUTF8(uint32_t point_I) {
  std::string bytes;
  if (point_I < 0x80) {
    bytes += static_cast<char>(point_I);
  } else if (point_I < 0x800) {
    bytes += static_cast<char>(0xC0 | (point_I >> 6));
    bytes += static_cast<char>(0x80 | (point_I & 0x3F));
  } else if (point_I < 0x10000) {
    bytes += static_cast<char>(0xE0 | (point_I >> 12));
    bytes += static_cast<char>(0x80 | ((point_I >> 6) & 0x3F));
    bytes += static_cast<char>(0x80 | (point_I & 0x3F));
  } else if (point_I <= 0x10FFFF) {
    bytes += static_cast<char>(0xF0 | (point_I >> 18));
    bytes += static_cast<char>(0x80 | ((point_I >> 12) & 0x3F));
    bytes += static_cast<char>(0x80 | ((point_I >> 6) & 0x3F));
    bytes += static_cast<char>(0x80 | (point_I & 0x3F));
  }
  return bytes;
}

bool DecodeUTF8ToUnicodePoint(const std::string& text_I, size_t& position_IO, uint32_t& point_O) {
  if (position_IO >= text_I.size()) return false;
  const auto lead = static_cast<uint8_t>(text_I[position_IO]);

  size_t length = 0;
  uint32_t point = 0;
  uint32_t smallest = 0;  // below this the sequence is overlong
  if (lead < 0x80) {
    point_O = lead;
    ++position_IO;
    return true;
  } else if ((lead & 0xE0) == 0xC0) {
    length = 2, point = lead & 0x1F, smallest = 0x80;
  } else if ((lead & 0xF0) == 0xE0) {
    length = 3, point = lead & 0x0F, smallest = 0x800;
  } else if ((lead & 0xF8) == 0xF0) {
    length = 4, point = lead & 0x07, smallest = 0x10000;
  } else {
    return false;  // a continuation byte or 0xF8..0xFF cannot lead
  }
  if (text_I.size() - position_IO < length) return false;

  for (size_t i = 1; i < length; ++i) {
    const auto next = static_cast<uint8_t>(text_I[position_IO + i]);
    if ((next & 0xC0) != 0x80) return false;
    point = (point << 6) | (next & 0x3F);
  }
  if (point < smallest || point > 0x10FFFF) return false;

  point_O = point;
  position_IO += length;
  return true;
}

bool IsValidUTF8(const std::string& text_I) {
  size_t position = 0;
  uint32_t point = 0;
  while (position < text_I.size()) {
    if (!DecodeUTF8ToUnicodePoint(text_I, position, point)) return false;
  }
  return true;
}

std::string StringFromWirelessID(uint32_t id_I) { return Format("TL#%06X", id_I); }

std::string StringFromRemoteID(uint32_t id_I) {
  return Format("R#%02X-%06X", (id_I >> 24) & 0xFF, id_I & 0xFFFFFF);
}

uint32_t StringToRemoteID(const std::string& text_I) {
  if (text_I.size() != 11 || !StartsWith(text_I, "R#")) return 0;
  const auto high = static_cast<uint32_t>(std::strtoul(text_I.substr(2, 2).c_str(), nullptr, 16));
  const auto low = static_cast<uint32_t>(std::strtoul(text_I.substr(5).c_str(), nullptr, 16));
  return (high << 24) + low;
}

char EncodeBase64Char(uint8_t value_I) { return value_I < 64 ? kBase64Alphabet[value_I] : '='; }

uint8_t DecodeBase64Char(char character_I) {
  if (character_I >= 'A' && character_I <= 'Z') return static_cast<uint8_t>(character_I - 'A');
  if (character_I >= 'a' && character_I <= 'z') return static_cast<uint8_t>(character_I - 'a' + 26);
  if (character_I >= '0' && character_I <= '9') return static_cast<uint8_t>(character_I - '0' + 52);
  if (character_I == '+') return 62;
  if (character_I == '/') return 63;
  throw CTavException(nullptr, 0, "bad char", kBadCharStatus);
}

std::string GetBase64(const std::vector<uint8_t>& bytes_I) {
  std::string text;
  text.reserve((bytes_I.size() + 2) / 3 * 4);
  for (size_t i = 0; i < bytes_I.size(); i += 3) {
    const size_t left = bytes_I.size() - i;
    const uint8_t b0 = bytes_I[i];
    const uint8_t b1 = left > 1 ? bytes_I[i + 1] : 0;
    const uint8_t b2 = left > 2 ? bytes_I[i + 2] : 0;
    text += EncodeBase64Char(b0 >> 2);
    text += EncodeBase64Char(static_cast<uint8_t>(((b0 & 0x03) << 4) | (b1 >> 4)));
    if (left > 1) text += EncodeBase64Char(static_cast<uint8_t>(((b1 & 0x0F) << 2) | (b2 >> 6)));
    if (left > 2) text += EncodeBase64Char(b2 & 0x3F);
  }
  return text;
}

std::vector<uint8_t> GetBytesFromBase64(const std::string& text_I) {
  std::vector<uint8_t> bytes;
  bytes.reserve(text_I.size() / 4 * 3 + 2);
  try {
    for (size_t i = 0; i < text_I.size(); i += 4) {
      const size_t count = std::min<size_t>(4, text_I.size() - i);
      uint8_t sextets[4] = {0, 0, 0, 0};
      for (size_t k = 0; k < count; ++k) sextets[k] = DecodeBase64Char(text_I[i + k]);
      // A lone last character carries fewer than eight bits: it is checked
      // but gives no byte.
      if (count >= 2) bytes.push_back(static_cast<uint8_t>((sextets[0] << 2) | (sextets[1] >> 4)));
      if (count >= 3) bytes.push_back(static_cast<uint8_t>((sextets[1] << 4) | (sextets[2] >> 2)));
      if (count >= 4) bytes.push_back(static_cast<uint8_t>((sextets[2] << 6) | sextets[3]));
    }
  } catch (const CTavException& e) {
    TavLog::Warning("Base64 exception: %s\n", e.what());
    return {};
  }
  return bytes;
}

std::string GetStringFromBase64(const std::string& text_I) {
  const std::vector<uint8_t> bytes = GetBytesFromBase64(text_I);
  return std::string(bytes.begin(), bytes.end());
}

std::string GetBase64StrFromString(const std::string& text_I) {
  return GetBase64(std::vector<uint8_t>(text_I.begin(), text_I.end()));
}

}  // namespace StringUtilities
