#pragma once
// String helpers shared by every subsystem. Free functions, no state: any
// thread may call them.
//
// Case folding is ASCII only and byte by byte, so the answers do not depend
// on the process locale (a device path or a configuration key compares the
// same on every machine).

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace StringUtilities {

// Splits `text_I` at any character of `delimiters_I`. With `skipEmpty_I`
// empty tokens are dropped. A delimiter at the very end adds no token, and
// an empty text gives no tokens: "a::b" at ":" gives "a", "", "b" (or "a",
// "b" when skipping), "a:" gives just "a".
std::vector<std::string> Tokenize(const std::string& text_I, const std::string& delimiters_I,
                                  bool skipEmpty_I);
std::vector<std::wstring> Tokenize(const std::wstring& text_I, const std::wstring& delimiters_I,
                                   bool skipEmpty_I);

void ToLower(std::string& text_IO);
void ToUpper(std::string& text_IO);
std::string ToLower_Copy(const std::string& text_I);
std::string ToUpper_Copy(const std::string& text_I);

// White space is blank, tab, new line, carriage return, form feed and
// vertical tab.
void Trim(std::string& text_IO);
std::string Trim_Copy(const std::string& text_I);

bool IEquals(const std::string& a_I, const std::string& b_I);
bool IEquals(const std::wstring& a_I, const std::wstring& b_I);

// Position of the first match ignoring case, or std::string::npos. An empty
// `search_I` matches at 0, as std::string::find does.
size_t IFindFirst(const std::string& text_I, const std::string& search_I);
bool IContains(const std::string& text_I, const std::string& search_I);
bool Contains(const std::string& text_I, const std::string& search_I);

// Replaces every match of `from_I`, ignoring case, by `to_I`. The search
// goes on behind each replacement, so a `to_I` that contains `from_I` does
// not loop. An empty `from_I` changes nothing.
void IReplaceAll(std::string& text_IO, const std::string& from_I, const std::string& to_I);

bool IStartsWith(const std::string& text_I, const std::string& prefix_I);
bool StartsWith(const std::string& text_I, const std::string& prefix_I);
bool IEndsWith(const std::string& text_I, const std::string& suffix_I);
bool EndsWith(const std::string& text_I, const std::string& suffix_I);

std::string Format(const char* format_I, ...) __attribute__((format(printf, 1, 2)));

// A null pointer gives the empty string.
std::string StringFromCharArray(const char* text_I);

// Local time as "YYYY-MM-DD HH:MM:SS".
std::string CurrentSystemTime();

// One to four bytes by the standard rule. Surrogate points are encoded like
// any other (the JSON reader hands them over one at a time). A point above
// 0x10FFFF gives the empty string.
std::string EncodeUnicodePointToUTF8(uint32_t point_I);

// Decodes the sequence that starts at `position_IO`. On success stores the
// point, moves `position_IO` behind the sequence and returns true. It takes
// back exactly what EncodeUnicodePointToUTF8 writes: overlong forms, points
// above 0x10FFFF, stray continuation bytes and cut sequences are refused,
// and then nothing is moved.
bool DecodeUTF8ToUnicodePoint(const std::string& text_I, size_t& position_IO, uint32_t& point_O);

// True when the whole text decodes; an empty text is valid.
bool IsValidUTF8(const std::string& text_I);

// "TL#" and the id in upper-case hexadecimal, at least six digits.
std::string StringFromWirelessID(uint32_t id_I);
// "R#", bits 31-24 as two hexadecimal digits, "-", the low 24 bits as six.
std::string StringFromRemoteID(uint32_t id_I);
// The reverse of StringFromRemoteID; 0 unless the text has 11 characters and
// starts with "R#". The separator at position 4 is not looked at.
uint32_t StringToRemoteID(const std::string& text_I);

// Base64 with the standard alphabet. No padding is written, and none is
// accepted: "=" is a bad character like any other outside the alphabet.
char EncodeBase64Char(uint8_t value_I);
// Throws CTavException ("bad char", status 65535) for a character outside
// the alphabet.
uint8_t DecodeBase64Char(char character_I);
std::string GetBase64(const std::vector<uint8_t>& bytes_I);
// Any bad character logs "Base64 exception: ..." at warning level and gives
// an empty result, even when earlier groups had decoded.
std::vector<uint8_t> GetBytesFromBase64(const std::string& text_I);
std::string GetStringFromBase64(const std::string& text_I);
std::string GetBase64StrFromString(const std::string& text_I);

}  // namespace StringUtilities
