// The binary forms: the BER-like encoding, the magic document and the
// compressed wrapper around it.

#include <gtest/gtest.h>

#include <stdexcept>

#include "settings/ASN1Coding.h"
#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/CompressionUtils.h"
#include "settings/SettingsTestTrees.h"
#include "support/LogCapture.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes NodeBytes(const CSettingsObject& object_I) {
  Bytes out;
  object_I.AppendASN1Node(out);
  return out;
}

Bytes WithMagic(const Bytes& node_I) {
  const unsigned char magic[] = {0x02, 0x04, 'T', 'a', 'v', 'm'};
  Bytes out(std::begin(magic), std::end(magic));
  out.resize(sizeof magic + node_I.size());
  std::copy(node_I.begin(), node_I.end(), out.begin() + sizeof magic);
  return out;
}

TEST(ASN1EncodingTest, NodesEncodeToTheirFixedTagsAndMinimalLengths) {
  auto array = CSettingsArray::New();
  array->AddString("a");
  auto map = CSettingsMap::New();
  map->SetKeyAndObject("L", array);
  auto withNull = CSettingsMap::New();
  withNull->SetKeyAndObject("n", nullptr);
  const std::pair<std::shared_ptr<CSettingsObject>, Bytes> cases[] = {
      {CSettingsInteger::New(0), {0x02, 0x01, 0x00}},
      {CSettingsInteger::New(0x1234), {0x02, 0x02, 0x12, 0x34}},
      {CSettingsInteger::New(-1), {0x02, 0x08, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}},
      {CSettingsBool::New(true), {0x01, 0x01, 0xFF}},
      {CSettingsBool::New(false), {0x01, 0x01, 0x00}},
      {CSettingsDouble::New(1.0), {0x41, 0x08, 0x3F, 0xF0, 0, 0, 0, 0, 0, 0}},
      {CSettingsBytes::New({7, 8}), {0x04, 0x02, 7, 8}},
      {CSettingsNULL::New(), {0x05, 0x00}},
      {CSettingsKEString::New("k"), {0x63, 0x01, 'k'}},
      {CSettingsMap::New(), {0x60, 0x80, 0x00, 0x00}},
      {map, {0x60, 0x80, 0x0C, 0x01, 'L', 0x62, 0x80, 0x0C, 0x01, 'a', 0x00, 0x00, 0x00, 0x00}},
      {withNull, {0x60, 0x80, 0x0C, 0x01, 'n', 0x05, 0x00, 0x00, 0x00}}};
  for (const auto& [object, bytes] : cases)
    EXPECT_EQ(NodeBytes(*object), bytes) << object->GetTraceString();

  Bytes longText{0x0C, 0x81, 0xC8};
  longText.resize(203, 'x');
  EXPECT_EQ(NodeBytes(*CSettingsString::New(std::string(200, 'x'))), longText);
  EXPECT_EQ(CSettingsInteger::New(5)->GetASN1Binary(), WithMagic({0x02, 0x01, 0x05}));
}

TEST(ASN1EncodingTest, BuildingBlocksFollowTheLengthAndIdentifierRules) {
  LogCapture capture;
  EXPECT_EQ(ASN1Coding::MakeLength(127), (Bytes{0x7F}));
  EXPECT_EQ(ASN1Coding::MakeLength(128), (Bytes{0x81, 0x80}));
  EXPECT_EQ(ASN1Coding::MakeLength(0x10000), (Bytes{0x83, 0x01, 0x00, 0x00}));
  EXPECT_EQ(ASN1Coding::MakeLength(ASN1Coding::IndefiniteLength), (Bytes{0x80}));
  for (const auto& [value, length] :
       {std::pair<uint64_t, size_t>{0, 1}, {0xFF, 1}, {0x100, 2}, {~0ULL, 8}}) {
    EXPECT_EQ(ASN1Coding::MinByteLengthOfInt(value), length) << value;
  }
  using ASN1Coding::Identifier;
  const auto universal = [](int type_I) {
    return ASN1Coding::MakeIdentifier(
        Identifier{ASN1Coding::ECLASS_UNIVERSAL, static_cast<ASN1Coding::EDataType>(type_I)});
  };
  EXPECT_EQ(universal(16), 0x30);  // a sequence is constructed
  EXPECT_EQ(universal(24), 0x18);
  EXPECT_EQ(universal(31), 0);
  EXPECT_TRUE(capture.AssertionContains("Multi-byte identifiers are not supported"));

  // Lengths of the long form read back; the decoders stop at the end of data.
  size_t length = 0, cut = 0, text = 0, lone = 0, endOfContents = 0, identifier = 0;
  EXPECT_EQ(ASN1Coding::DecodeLengthFromArchive(Bytes{0x82, 0x01, 0x00}, length), 256u);
  EXPECT_EQ(length, 3u);
  EXPECT_THROW(ASN1Coding::DecodeLengthFromArchive(Bytes{0x82, 0x01}, cut), std::out_of_range);
  EXPECT_THROW(ASN1Coding::DecodeStringFromArchive(Bytes{0x05, 'a'}, text), std::out_of_range);
  const Bytes loneZero{0x00};
  EXPECT_THROW(ASN1Coding::DecodeEndOfContentsIdentifierFromArchive(loneZero, lone),
               std::out_of_range);
  EXPECT_FALSE(
      ASN1Coding::DecodeEndOfContentsIdentifierFromArchive(Bytes{0x00, 0x01}, endOfContents));
  EXPECT_EQ(endOfContents, 0u);
  EXPECT_EQ(ASN1Coding::DecodeIdentifierFromArchive(Bytes{0x63}, identifier, false),
            (Identifier{ASN1Coding::ECLASS_APPLICATION, ASN1Coding::ETYPE_SETTINGS_KESTRING}));
  EXPECT_EQ(identifier, 0u);
}

TEST(ASN1DocumentTest, UnusableDocumentsGiveEmptyResultsWithoutThrowing) {
  LogCapture capture;
  EXPECT_EQ(CSettingsObject::ReadFromASN1Binary({}), nullptr);
  Bytes wrongMagic = CSettingsInteger::New(5)->GetASN1Binary();
  wrongMagic[5] = 'x';
  EXPECT_EQ(CSettingsObject::ReadFromASN1Binary(wrongMagic), nullptr);
  EXPECT_EQ(CSettingsObject::ReadFromASN1Binary(Bytes{0x04, 0x00}), nullptr);
  EXPECT_TRUE(capture.Log().empty());
  EXPECT_EQ(CSettingsObject::ReadFromASN1Binary(WithMagic({})), nullptr);

  // Cut anywhere, a document gives nothing, and says why.
  const Bytes whole = SettingsTestTrees::EveryClass()->GetASN1Binary();
  for (size_t size = 1; size < whole.size(); ++size) {
    const Bytes cut(whole.begin(), whole.begin() + static_cast<ptrdiff_t>(size));
    EXPECT_EQ(CSettingsObject::ReadFromASN1Binary(cut), nullptr) << size;
  }
  EXPECT_TRUE(capture.LogContains("[I] ReadFromASN1Binary: "));

  // Tags outside the vocabulary stop the read; an unknown tag inside a map
  // where a key belongs is stepped over a byte at a time.
  EXPECT_EQ(CSettingsObject::ReadFromASN1Binary(WithMagic({0x80, 0x00})), nullptr);
  auto skipped = CSettingsMap::CastToMap(
      CSettingsObject::ReadFromASN1Binary(
          WithMagic({0x60, 0x80, 0x31, 0x0C, 0x01, 'k', 0x01, 0x01, 0xFF, 0x00, 0x00})),
      true);
  ASSERT_TRUE(skipped);
  EXPECT_TRUE(skipped->BoolForKeyWithDefault("k", false));
}

TEST(CompressedDocumentTest, WrapperMapHoldsTheSizeAndTheSmallerBytes) {
  auto tree = SettingsTestTrees::Configuration(2000);
  const Bytes compressed = tree->GetCompressedBinary();
  const Bytes plain = tree->GetASN1Binary();
  EXPECT_LT(compressed.size(), plain.size() / 4);

  auto wrapper = CSettingsMap::CastToMap(CSettingsObject::ReadFromASN1Binary(compressed), true);
  ASSERT_TRUE(wrapper);
  EXPECT_EQ(wrapper->GetKeys(), (std::vector<std::string>{"bytes", "originalSize"}));
  EXPECT_EQ(wrapper->IntegerForKeyWithDefault("originalSize", int64_t{0}),
            static_cast<int64_t>(plain.size()));
}

TEST(CompressedDocumentTest, DamagedWrappersGiveEmptyResults) {
  LogCapture capture;
  const Bytes zipped = CompressionUtils::Compress(CSettingsInteger::New(1)->GetASN1Binary());
  Bytes damaged = zipped;
  damaged[damaged.size() / 2] ^= 0x5A;
  damaged.resize(damaged.size() - 2);
  const auto wrap = [](std::shared_ptr<CSettingsObject> bytes_I, int64_t size_I) {
    auto map = CSettingsMap::New();
    if (bytes_I) map->SetKeyAndObject("bytes", bytes_I);
    map->SetKeyAndInteger("originalSize", size_I);
    return map->GetASN1Binary();
  };
  // A size no zlib data of this length can reach is refused, not allocated.
  for (const Bytes& wrapper :
       {wrap(CSettingsBytes::New(zipped), 0), wrap(nullptr, 9), wrap(CSettingsString::New("x"), 9),
        CSettingsArray::New()->GetASN1Binary(), wrap(CSettingsBytes::New(damaged), 9),
        wrap(CSettingsBytes::New(zipped), int64_t{1} << 40),
        wrap(CSettingsBytes::New(zipped), -1)}) {
    EXPECT_EQ(CSettingsObject::ReadFromCompressedBinary(wrapper), nullptr);
  }
  EXPECT_TRUE(capture.LogContains("CSettingsMap::CastToMap got a array"));
  EXPECT_TRUE(capture.AssertionContains("!expandedBuffer.empty()"));
  // A size too small still expands: the buffer grows.
  auto small = CSettingsObject::ReadFromCompressedBinary(wrap(CSettingsBytes::New(zipped), 1));
  ASSERT_TRUE(small);
  EXPECT_TRUE(small->IsEqualTo(CSettingsInteger::New(1)));
}

TEST(CompressionUtilsTest, ZlibWrappersBehave) {
  EXPECT_TRUE(CompressionUtils::Compress({}).empty());
  EXPECT_TRUE(CompressionUtils::Expand({1, 2}, 0).empty());
  EXPECT_TRUE(CompressionUtils::Expand({}, 10).empty());

  Bytes noise(5000);
  unsigned state = 1;
  for (auto& byte : noise)
    byte = static_cast<unsigned char>((state = state * 1103515245 + 12345) >> 16);
  const Bytes packed = CompressionUtils::Compress(noise);
  EXPECT_FALSE(packed.empty());
  EXPECT_EQ(CompressionUtils::Expand(packed, noise.size()), noise);

  const std::string check = "123456789";
  EXPECT_EQ(CompressionUtils::CRC32(0, Bytes(check.begin(), check.end())), 0xCBF43926u);
}

}  // namespace
