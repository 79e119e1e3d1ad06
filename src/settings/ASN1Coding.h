#pragma once
// Primitive encoders and decoders of the binary settings form: a BER-like
// encoding with single-byte identifiers, minimal definite lengths and
// indefinite lengths for containers.
//
// The decoders read from `position_IO` and move it past what they consumed.
// Truncated data throws std::out_of_range; a wrong length asserts and reading
// goes on with the length as found.

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace ASN1Coding {

enum EClass : unsigned char {
  ECLASS_UNIVERSAL = 0x00,
  ECLASS_APPLICATION = 0x40,
  ECLASS_CONTEXT = 0x80,
  ECLASS_PRIVATE = 0xC0,
};

// Universal types by their BER numbers; the application types are the
// settings classes of this program.
enum EDataType : unsigned char {
  ETYPE_END_OF_CONTENTS = 0,
  ETYPE_BOOLEAN = 1,
  ETYPE_INTEGER = 2,
  ETYPE_OCTET_STRING = 4,
  ETYPE_NULL = 5,
  ETYPE_UTF8_STRING = 12,
  ETYPE_SETTINGS_MAP = 0,
  ETYPE_SETTINGS_DOUBLE = 1,
  ETYPE_SETTINGS_ARRAY = 2,
  ETYPE_SETTINGS_KESTRING = 3,
};

using Identifier = std::pair<EClass, EDataType>;
using Archive = std::vector<unsigned char>;

// What DecodeLengthFromArchive gives for the indefinite form.
inline constexpr unsigned long IndefiniteLength = ~0UL;

// Building
unsigned char MakeIdentifier(Identifier identifier_I);
unsigned char MakeIndefiniteLength();
Archive MakeLength(unsigned long length_I);

// Encoding
void EncodeBoolToArchive(bool value_I, Archive& out_IO);
void EncodeBytesToArchive(const std::vector<unsigned char>& bytes_I, Archive& out_IO);
void EncodeDoubleToArchive(double value_I, Archive& out_IO);
void EncodeIntegerToArchive(unsigned long long value_I, Archive& out_IO);
void EncodeStringToArchive(const std::string& text_I, Archive& out_IO, bool keString_I);
void EncodeNULLToArchive(Archive& out_IO);
void EncodeEndOfContentsIdentifierToArchive(Archive& out_IO);

// Decoding; each but the identifier starts at the length byte.
Identifier DecodeIdentifierFromArchive(const Archive& data_I, size_t& position_IO, bool advance_I);
unsigned long DecodeLengthFromArchive(const Archive& data_I, size_t& position_IO);
bool DecodeBoolFromArchive(const Archive& data_I, size_t& position_IO);
std::vector<unsigned char> DecodeBytesFromArchive(const Archive& data_I, size_t& position_IO);
double DecodeDoubleFromArchive(const Archive& data_I, size_t& position_IO);
unsigned long long DecodeIntegerFromArchive(const Archive& data_I, size_t& position_IO);
std::string DecodeStringFromArchive(const Archive& data_I, size_t& position_IO);
void DecodeNULLFromArchive(const Archive& data_I, size_t& position_IO);
bool DecodeEndOfContentsIdentifierFromArchive(const Archive& data_I, size_t& position_IO);

// Helpers
size_t MinByteLengthOfInt(unsigned long long value_I);
unsigned long long ReadIntegerOfLength(const Archive& data_I, size_t& position_IO,
                                       size_t byteLength_I);
void WriteIntegerOfLengthToArchive(unsigned long long value_I, size_t byteLength_I,
                                   Archive& out_IO);

}  // namespace ASN1Coding
