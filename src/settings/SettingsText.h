#pragma once
// String helpers the settings tree needs. They stand in for the common
// StringUtilities until that lands; the names and behaviour are the same so
// that the switch is a change of namespace.

#include <cstdint>
#include <string>
#include <vector>

namespace SettingsText {

bool IEquals(const std::string& left_I, const std::string& right_I);
std::string Trim_Copy(const std::string& text_I);
std::string IReplaceAll(const std::string& text_I, const std::string& from_I,
                        const std::string& to_I);
std::string EncodeUnicodePointToUTF8(uint32_t point_I);
std::string GetBase64(const std::vector<unsigned char>& bytes_I);
// Logs "Base64 exception" and gives nothing when a character is not of the
// alphabet; padding counts as such a character.
std::vector<unsigned char> GetBytesFromBase64(const std::string& text_I);

}  // namespace SettingsText
