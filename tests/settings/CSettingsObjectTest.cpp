// The tree itself: lookups, nulls, casts, copies, comparison, traces,
// freezing and the reading filters.

#include <gtest/gtest.h>

#include <array>

#include "settings/CSettingsMap.h"
#include "settings/CSettingsNULL.h"
#include "settings/CSettingsObject.h"
#include "support/LogCapture.h"

using Keys = std::vector<std::string>;

TEST(CSettingsMapTest, StoredNullLooksAbsentButIsCounted) {
  LogCapture capture;
  auto map = CSettingsMap::New();
  map->SetKeyAndObject("a", nullptr);
  map->SetKeyAndInteger("b", 2);
  EXPECT_FALSE(map->IsKeyPresent("a"));
  EXPECT_EQ(map->ObjectForKey("a"), nullptr);
  EXPECT_EQ(map->TypeNameForKeyOrEmpty("a"), "");
  EXPECT_EQ(map->ObjectCount(), 2u);
  EXPECT_EQ(map->GetKeys(), (Keys{"a", "b"}));
  EXPECT_EQ(map->IntegerForKeyWithDefault("a", int64_t{9}), 9);

  auto array = CSettingsArray::New();
  array->AddObject(nullptr);
  EXPECT_EQ(array->ObjectCount(), 1u);
  EXPECT_EQ(array->ObjectForIndex(0), nullptr);
  EXPECT_EQ(array->TypeNameForIndexOrEmpty(0), "");
  EXPECT_TRUE(capture.Assertions().empty());

  // Keys walk in byte order.
  for (const char* key : {"b", "B", "_z", "a1"}) map->SetKeyAndBool(key, true);
  EXPECT_EQ(map->GetKeys(), (Keys{"B", "_z", "a", "a1", "b"}));
}

TEST(CSettingsMapTest, TypedLookupsWarnAndNeverConvert) {
  LogCapture capture;
  auto map = CSettingsMap::New();
  map->SetKeyAndString("k", "12");
  map->SetKeyAndDouble("d", 3.0);
  map->SetKeyAndKEString("ke", "secret");
  map->SetKeyAndInteger("big", 65537);
  EXPECT_EQ(map->IntegerForKeyWithDefault("k", int64_t{7}), 7);
  EXPECT_EQ(map->StringForKeyWithDefault("ke", "dflt"), "dflt");
  EXPECT_EQ(map->KEStringForKeyWithDefault("ke", "dflt"), "secret");
  EXPECT_EQ(map->DoubleForKeyWithDefault("d", 0.5), 3.0);
  // The narrowed getters keep the low bits of the 64-bit value.
  EXPECT_EQ(map->IntegerForKeyWithDefault<unsigned short>("big", 0), 1);
  EXPECT_EQ(map->IntegerForKeyWithDefault<int>("big", 0), 65537);
  EXPECT_EQ(map->IntegerForKeyWithDefault<unsigned long>("missing", 5ul), 5ul);
  auto fallback = CSettingsString::New("fallback");
  EXPECT_EQ(map->ObjectForKeyWithDefault<CSettingsString>("d", fallback), fallback);
  EXPECT_EQ(map->ObjectForKey<CSettingsDouble>("d")->GetValue(), 3.0);

  // A key that is no valid XML name asserts but is stored.
  map->SetKeyAndInteger("1bad", 3);
  EXPECT_TRUE(capture.AssertionContains("isValidXMLName"));
  EXPECT_EQ(map->IntegerForKeyWithDefault("1bad", int64_t{0}), 3);
}

TEST(CSettingsArrayTest, IndexedAccessReplacesAppendsOrIgnores) {
  auto array = CSettingsArray::New();
  for (int i = 0; i < 3; ++i) array->AddInteger(i);
  array->SetObjectAtIndex(5, CSettingsString::New("x"));
  EXPECT_EQ(array->ObjectCount(), 3u);
  array->SetObjectAtIndex(3, CSettingsString::New("x"));
  EXPECT_EQ(array->ObjectCount(), 4u);
  EXPECT_EQ(array->StringForIndexWithDefault(3, ""), "x");
  array->SetObjectAtIndex(1, nullptr);
  EXPECT_EQ(array->ObjectForIndex(1), nullptr);
  EXPECT_EQ(array->GetIndexes(), (std::vector<size_t>{0, 1, 2, 3}));
  EXPECT_EQ(array->IntegerForIndexWithDefault(2, -1), 2);
  EXPECT_EQ(array->IntegerForIndexWithDefault(3, -1), -1);  // a string
  EXPECT_EQ(array->IntegerForIndexWithDefault(99, -1), -1);
  EXPECT_TRUE(array->BoolForIndexWithDefault(99, true));
  EXPECT_EQ(array->DoubleForIndexWithDefault(0, 1.5), 1.5);

  // IsStringPresent skips other items, a KEString included, and honours case.
  array->AddString("");
  array->AddObject(CSettingsKEString::New("Pen"));
  array->AddString("Touch");
  const std::tuple<const char*, bool, bool> lookups[] = {
      {"", true, false},      {"2", false, false},     {"Pen", false, false},
      {"Touch", false, true}, {"touch", false, false}, {"TOUCH", true, true}};
  for (const auto& [text, ignoreCase, present] : lookups) {
    EXPECT_EQ(array->IsStringPresent(text, ignoreCase), present) << text;
  }
}

TEST(CSettingsCastTest, CastsReportWhatTheyGotAndNeverConvert) {
  LogCapture capture;
  auto integer = CSettingsInteger::New(4);
  auto text = CSettingsString::New("4");
  EXPECT_EQ(CSettingsMap::CastToMap(nullptr, true), nullptr);
  EXPECT_EQ(CSettingsMap::CastToMap(integer, false), nullptr);
  EXPECT_TRUE(capture.Log().empty());
  EXPECT_EQ(CSettingsMap::CastToMap(integer, true), nullptr);
  EXPECT_FALSE(capture.Log().empty());
  EXPECT_EQ(CSettingsArray::CastToArray(text, true), nullptr);
  EXPECT_EQ(CSettingsInteger::CastToInteger(text), nullptr);
  EXPECT_EQ(CSettingsInteger::CastToInteger(integer), integer);
  EXPECT_EQ(CSettingsString::CastToString(CSettingsKEString::New("x")), nullptr);
  EXPECT_EQ(CSettingsBytes::CastToBytes(CSettingsBytes::New({1}))->GetValue().size(), 1u);
  EXPECT_EQ(CSettingsBool::CastToBool(nullptr), nullptr);
}

TEST(CSettingsObjectTest, EqualityComparesClassValueAndStructure) {
  LogCapture capture;
  EXPECT_TRUE(CSettingsDouble::New(0.1 + 0.2)->IsEqualTo(CSettingsDouble::New(0.1 + 0.2)));
  EXPECT_FALSE(CSettingsDouble::New(0.1 + 0.2)->IsEqualTo(CSettingsDouble::New(0.3)));
  EXPECT_FALSE(CSettingsString::New("a")->IsEqualTo(CSettingsKEString::New("a")));
  EXPECT_FALSE(CSettingsKEString::New("a")->IsEqualTo(CSettingsKEString::New("b")));
  EXPECT_FALSE(CSettingsInteger::New(1)->IsEqualTo(nullptr));
  EXPECT_TRUE(CSettingsNULL::New()->IsEqualTo(CSettingsNULL::New()));

  // A null in an array is compared against a lookup, which hides it.
  auto left = CSettingsArray::New();
  auto right = CSettingsArray::New();
  left->AddObject(nullptr);
  right->AddObject(nullptr);
  EXPECT_FALSE(left->IsEqualTo(right));

  auto a = CSettingsMap::New();
  a->SetKeyAndInteger("x", 1);
  a->SetKeyAndObject("list", left);
  auto b = CSettingsMap::New();
  b->SetKeyAndInteger("x", 1);
  EXPECT_FALSE(b->IsEqualTo(a));  // keys missing on this side
  b->SetKeyAndInteger("list", 1);
  EXPECT_FALSE(a->IsEqualTo(b));  // same keys, different class
  auto withNull = CSettingsMap::New();
  withNull->SetKeyAndObject("n", nullptr);
  EXPECT_FALSE(withNull->IsEqualTo(withNull->DeepCopy()));
  EXPECT_TRUE(capture.AssertionContains("mine"));
}

TEST(CSettingsObjectTest, DeepCopySharesNoNodeWhileMergeSharesThem) {
  auto inner = CSettingsArray::New();
  inner->AddString("one");
  auto original = CSettingsMap::New();
  original->SetKeyAndObject("inner", inner);
  original->SetKeyAndObject("blob", CSettingsBytes::New({1, 2, 3}));
  original->SetKeyAndObject("nothing", nullptr);
  auto copy = CSettingsMap::CastToMap(original->DeepCopy(), true);
  ASSERT_TRUE(copy);
  EXPECT_EQ(copy->GetTraceString(),
            "map[blob:bytes[AQID], inner:array[0:string[one]], nothing:null[]]");
  EXPECT_NE(copy->ObjectForKey("inner"), original->ObjectForKey("inner"));
  copy->ObjectForKey<CSettingsArray>("inner")->AddString("two");
  EXPECT_EQ(inner->ObjectCount(), 1u);

  // A merge turns nulls into new nulls.
  auto shared = CSettingsString::New("shared");
  auto other = CSettingsMap::New();
  other->SetKeyAndObject("s", shared);
  other->SetKeyAndObject("n", nullptr);
  auto target = CSettingsMap::New();
  target->SetKeyAndInteger("s", 1);
  target->SetKeyAndInteger("keep", 2);
  target->MergeMapObject(nullptr);
  EXPECT_EQ(target->ObjectCount(), 2u);
  target->MergeMapObject(other);
  EXPECT_EQ(target->ObjectForKey("s"), shared);
  EXPECT_EQ(target->GetTraceString(), "map[keep:integer[2], n:null[], s:string[shared]]");
}

TEST(CSettingsBoolTest, StringToBoolReadsWordsThenNumbers) {
  LogCapture capture;
  const std::tuple<const char*, bool, bool> cases[] = {
      {"TRUE", false, true}, {"False", true, false}, {"1", false, true},   {" -3 ", false, true},
      {"0", true, false},    {"yes", true, true},    {"yes", false, false}};
  for (const auto& [text, fallback, expected] : cases) {
    EXPECT_EQ(CSettingsBool::StringToBool(text, fallback), expected) << text << fallback;
  }
}

template <typename TRect>
auto Edges(const TRect& rect_I) {
  return std::array{rect_I.Left(), rect_I.Top(), rect_I.Right(), rect_I.Bottom()};
}

TEST(CSettingsFreezeTest, ShapesFreezeByTheirDerivedEdgesAndOthersThawToDefaults) {
  LogCapture capture;
  const SRect rect = SRect::FromEdges(10, 20, 30, 40, 1);
  EXPECT_EQ(rect.width, 21);
  auto frozen = CSettingsObject::FromComplexType(rect);
  EXPECT_EQ(frozen->IntegerForKeyWithDefault("Top", int64_t{-1}), 20);
  EXPECT_EQ(frozen->ToComplexType<SRect>(), rect);
  // Smaller than its epsilon: the top left edge moves by the sum.
  EXPECT_EQ(Edges(SRect(SPoint(5, 7), 0, -2, 1)), (std::array{6, 6, 5, 7}));
  const SDoubleRect doubleRect = SDoubleRect::FromEdges(0.5, 1.5, 10.5, 4.0, 0.25);
  EXPECT_EQ(CSettingsObject::FromComplexType(doubleRect)->ToComplexType<SDoubleRect>(), doubleRect);
  EXPECT_EQ(CSettingsObject::FromComplexType(SPoint(-3, 4))->ToComplexType<SPoint>(),
            SPoint(-3, 4));
  EXPECT_TRUE(capture.Assertions().empty());

  EXPECT_EQ(CSettingsInteger::New(1)->ToComplexType<SRect>(), SRect(0));
  EXPECT_TRUE(capture.AssertionContains("map && \"This isn't a frozen SRect\""));
  auto partial = CSettingsMap::New();
  partial->SetKeyAndInteger("Left", 2);
  partial->SetKeyAndInteger("Right", 4);
  partial->SetKeyAndInteger("Bottom", 3);
  EXPECT_EQ(partial->ToComplexType<SRect>(), SRect::FromEdges(2, 0, 4, 3, 0));
  EXPECT_TRUE(capture.AssertionContains("map->IsKeyPresent(\"Top\")"));
}
