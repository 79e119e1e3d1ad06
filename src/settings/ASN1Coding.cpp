#include "settings/ASN1Coding.h"

#include <bit>
#include <cstdint>
#include <stdexcept>

#include "common/TavAssert.h"

namespace ASN1Coding {

namespace {

// Identifiers of the form are single bytes: type numbers from 31 up would
// need the multi-byte form.
constexpr unsigned kHighTypeNumber = 31;
constexpr unsigned char kConstructedBit = 0x20;
constexpr unsigned char kClassMask = 0xC0;
constexpr unsigned char kTypeMask = 0x1F;
constexpr unsigned char kLongLengthBit = 0x80;
constexpr unsigned char kIndefiniteLengthByte = 0x80;

bool IsPrimitive(Identifier identifier_I) {
  const unsigned type = identifier_I.second;
  if (identifier_I.first == ECLASS_UNIVERSAL) {
    return type <= 7 || type == 9 || type == 10 || type == 12 || type == 24;
  }
  return identifier_I.first == ECLASS_APPLICATION && type == ETYPE_SETTINGS_DOUBLE;
}

size_t BytesLeft(const Archive& data_I, size_t position_I) {
  return position_I < data_I.size() ? data_I.size() - position_I : 0;
}

void RequireBytes(const Archive& data_I, size_t position_I, unsigned long count_I,
                  const char* what_I) {
  if (count_I > BytesLeft(data_I, position_I)) throw std::out_of_range(what_I);
}

void AppendLength(unsigned long length_I, Archive& out_IO) {
  const Archive length = MakeLength(length_I);
  out_IO.insert(out_IO.end(), length.begin(), length.end());
}

}  // namespace

unsigned char MakeIdentifier(Identifier identifier_I) {
  if (identifier_I.second >= kHighTypeNumber) {
    TAVASSERT_TEXT("Multi-byte identifiers are not supported");
    return 0;
  }
  unsigned char identifier = static_cast<unsigned char>(static_cast<unsigned>(identifier_I.first) |
                                                        static_cast<unsigned>(identifier_I.second));
  if (!IsPrimitive(identifier_I)) identifier |= kConstructedBit;
  return identifier;
}

unsigned char MakeIndefiniteLength() { return kIndefiniteLengthByte; }

Archive MakeLength(unsigned long length_I) {
  if (length_I == IndefiniteLength) return {MakeIndefiniteLength()};
  if (length_I < 128) return {static_cast<unsigned char>(length_I)};
  const size_t byteLength = MinByteLengthOfInt(length_I);
  Archive out{static_cast<unsigned char>(kLongLengthBit | byteLength)};
  WriteIntegerOfLengthToArchive(length_I, byteLength, out);
  return out;
}

void EncodeBoolToArchive(bool value_I, Archive& out_IO) {
  out_IO.push_back(MakeIdentifier({ECLASS_UNIVERSAL, ETYPE_BOOLEAN}));
  out_IO.push_back(1);
  out_IO.push_back(value_I ? 0xFF : 0x00);
}

void EncodeBytesToArchive(const std::vector<unsigned char>& bytes_I, Archive& out_IO) {
  out_IO.push_back(MakeIdentifier({ECLASS_UNIVERSAL, ETYPE_OCTET_STRING}));
  AppendLength(bytes_I.size(), out_IO);
  out_IO.insert(out_IO.end(), bytes_I.begin(), bytes_I.end());
}

void EncodeDoubleToArchive(double value_I, Archive& out_IO) {
  out_IO.push_back(MakeIdentifier({ECLASS_APPLICATION, ETYPE_SETTINGS_DOUBLE}));
  out_IO.push_back(sizeof(double));
  WriteIntegerOfLengthToArchive(std::bit_cast<uint64_t>(value_I), sizeof(double), out_IO);
}

void EncodeIntegerToArchive(unsigned long long value_I, Archive& out_IO) {
  out_IO.push_back(MakeIdentifier({ECLASS_UNIVERSAL, ETYPE_INTEGER}));
  const size_t byteLength = MinByteLengthOfInt(value_I);
  AppendLength(byteLength, out_IO);
  WriteIntegerOfLengthToArchive(value_I, byteLength, out_IO);
}

void EncodeStringToArchive(const std::string& text_I, Archive& out_IO, bool keString_I) {
  out_IO.push_back(keString_I ? MakeIdentifier({ECLASS_APPLICATION, ETYPE_SETTINGS_KESTRING})
                              : MakeIdentifier({ECLASS_UNIVERSAL, ETYPE_UTF8_STRING}));
  AppendLength(text_I.size(), out_IO);
  out_IO.insert(out_IO.end(), text_I.begin(), text_I.end());
}

void EncodeNULLToArchive(Archive& out_IO) {
  out_IO.push_back(MakeIdentifier({ECLASS_UNIVERSAL, ETYPE_NULL}));
  out_IO.push_back(0);
}

void EncodeEndOfContentsIdentifierToArchive(Archive& out_IO) {
  out_IO.push_back(0);
  out_IO.push_back(0);
}

Identifier DecodeIdentifierFromArchive(const Archive& data_I, size_t& position_IO, bool advance_I) {
  RequireBytes(data_I, position_IO, 1, "DecodeIdentifierFromArchive: end of data");
  const unsigned char byte = data_I[position_IO];
  if (advance_I) ++position_IO;
  return {static_cast<EClass>(byte & kClassMask), static_cast<EDataType>(byte & kTypeMask)};
}

unsigned long DecodeLengthFromArchive(const Archive& data_I, size_t& position_IO) {
  RequireBytes(data_I, position_IO, 1, "DecodeLengthFromArchive: end of data");
  const unsigned char first = data_I[position_IO++];
  if (first == kIndefiniteLengthByte) return IndefiniteLength;
  if ((first & kLongLengthBit) == 0) return first;
  return ReadIntegerOfLength(data_I, position_IO, first & ~kLongLengthBit);
}

bool DecodeBoolFromArchive(const Archive& data_I, size_t& position_IO) {
  RequireBytes(data_I, position_IO, 2, "DecodeBoolFromArchive: end of data");
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  if (length != 1) TAVASSERT_TEXT("length == 1");
  RequireBytes(data_I, position_IO, length, "DecodeBoolFromArchive: end of data");
  const bool value = length > 0 && data_I[position_IO] != 0;
  position_IO += length;
  return value;
}

std::vector<unsigned char> DecodeBytesFromArchive(const Archive& data_I, size_t& position_IO) {
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  if (length == 0) return {};
  RequireBytes(data_I, position_IO, length, "DecodeBytesFromArchive: length beyond data");
  std::vector<unsigned char> bytes(data_I.begin() + static_cast<ptrdiff_t>(position_IO),
                                   data_I.begin() + static_cast<ptrdiff_t>(position_IO + length));
  position_IO += length;
  return bytes;
}

double DecodeDoubleFromArchive(const Archive& data_I, size_t& position_IO) {
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  if (length != sizeof(double)) TAVASSERT_TEXT("length == sizeof(double)");
  return std::bit_cast<double>(
      static_cast<uint64_t>(ReadIntegerOfLength(data_I, position_IO, length)));
}

unsigned long long DecodeIntegerFromArchive(const Archive& data_I, size_t& position_IO) {
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  return ReadIntegerOfLength(data_I, position_IO, length);
}

std::string DecodeStringFromArchive(const Archive& data_I, size_t& position_IO) {
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  if (length == 0) return {};
  RequireBytes(data_I, position_IO, length, "DecodeStringFromArchive: length beyond data");
  std::string text(reinterpret_cast<const char*>(data_I.data()) + position_IO, length);
  position_IO += length;
  return text;
}

void DecodeNULLFromArchive(const Archive& data_I, size_t& position_IO) {
  const unsigned long length = DecodeLengthFromArchive(data_I, position_IO);
  if (length != 0) TAVASSERT_TEXT("!length");
  RequireBytes(data_I, position_IO, length, "DecodeNULLFromArchive: length beyond data");
  position_IO += length;
}

bool DecodeEndOfContentsIdentifierFromArchive(const Archive& data_I, size_t& position_IO) {
  RequireBytes(data_I, position_IO, 1, "DecodeEndOfContentsIdentifierFromArchive: end of data");
  if (data_I[position_IO] != 0) return false;
  RequireBytes(data_I, position_IO, 2, "DecodeEndOfContentsIdentifierFromArchive: end of data");
  if (data_I[position_IO + 1] != 0) return false;
  position_IO += 2;
  return true;
}

size_t MinByteLengthOfInt(unsigned long long value_I) {
  size_t length = 1;
  while (length < sizeof(value_I) && (value_I >> (8 * length)) != 0) ++length;
  return length;
}

unsigned long long ReadIntegerOfLength(const Archive& data_I, size_t& position_IO,
                                       size_t byteLength_I) {
  if (byteLength_I > sizeof(unsigned long long)) TAVASSERT_TEXT("byteLength_I <= 8");
  RequireBytes(data_I, position_IO, byteLength_I, "ReadIntegerOfLength: end of data");
  unsigned long long value = 0;
  for (size_t i = 0; i < byteLength_I; ++i) value = (value << 8) | data_I[position_IO++];
  return value;
}

void WriteIntegerOfLengthToArchive(unsigned long long value_I, size_t byteLength_I,
                                   Archive& out_IO) {
  for (size_t i = byteLength_I; i > 0; --i) {
    const size_t shift = 8 * (i - 1);
    out_IO.push_back(shift < 64 ? static_cast<unsigned char>(value_I >> shift) : 0);
  }
}

}  // namespace ASN1Coding
