#pragma once
// Board families of the display scalars, told apart by their SENSOR_ID:
// every scalar board has the vendor half 0x7A5D, the product half names
// the board.

#include <algorithm>
#include <initializer_list>

#include "common/TavTypes.h"

namespace SensorFamilies {
constexpr bool IsOneOf(SENSOR_ID sid_I, std::initializer_list<SENSOR_ID> ids_I) {
  return std::find(ids_I.begin(), ids_I.end(), sid_I) != ids_I.end();
}
}  // namespace SensorFamilies

// The identity a display's scalar is read with: the family's vendor half
// and the product id of the display's pen, which serves for its scalar too.
constexpr SENSOR_ID ScalarSensorId(uint32_t penProductId_I) {
  return static_cast<SENSOR_ID>(0x7A5D0000u | (penProductId_I & 0xFFFFu));
}

constexpr bool IS_VENUS_M(SENSOR_ID sid_I) { return sid_I == 0x7A5D0390; }
constexpr bool IS_VENUS_M_VAVE(SENSOR_ID sid_I) { return sid_I == 0x7A5D03AE; }
constexpr bool IS_VENUS_L(SENSOR_ID sid_I) { return sid_I == 0x7A5D0391; }
constexpr bool IS_VENUS_BSU(SENSOR_ID sid_I) { return sid_I == 0x7A5D0396; }
constexpr bool IS_VENUS_BSU_VAVE(SENSOR_ID sid_I) { return sid_I == 0x7A5D03B0; }
constexpr bool IS_VENUS(SENSOR_ID sid_I) {
  return IS_VENUS_M(sid_I) || IS_VENUS_M_VAVE(sid_I) || IS_VENUS_L(sid_I) || IS_VENUS_BSU(sid_I) ||
         IS_VENUS_BSU_VAVE(sid_I);
}

constexpr bool IS_BRODICK10_13(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D034A, 0x7A5D034D});
}
constexpr bool IS_BRODICK15_13(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D0398, 0x7A5D039A});
}
constexpr bool IS_BRODICK_13(SENSOR_ID sid_I) {
  return IS_BRODICK10_13(sid_I) || IS_BRODICK15_13(sid_I);
}
constexpr bool IS_BRODICK10_16(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D034B, 0x7A5D034E, 0x7A5D03AA, 0x7A5D03AC});
}
constexpr bool IS_BRODICK15_16(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D0399, 0x7A5D039B});
}
constexpr bool IS_BRODICK_16(SENSOR_ID sid_I) {
  return IS_BRODICK10_16(sid_I) || IS_BRODICK15_16(sid_I);
}
constexpr bool IS_BRODICK(SENSOR_ID sid_I) { return IS_BRODICK_13(sid_I) || IS_BRODICK_16(sid_I); }

constexpr bool IS_GREYOWL_13(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D034F, 0x7A5D0353});
}
constexpr bool IS_GREYOWL_16(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D0350, 0x7A5D0354});
}
constexpr bool IS_GREYOWL_16R(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D03B2, 0x7A5D03B3});
}
constexpr bool IS_GREYOWL_24(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D0351, 0x7A5D0355});
}
constexpr bool IS_GREYOWL_24P(SENSOR_ID sid_I) { return sid_I == 0x7A5D037C; }
constexpr bool IS_GREYOWL_32(SENSOR_ID sid_I) {
  return SensorFamilies::IsOneOf(sid_I, {0x7A5D0352, 0x7A5D0356});
}
// The 16R is a GreyOwl board but reads its identity another way, so it
// stays out of the family test.
constexpr bool IS_GREYOWL(SENSOR_ID sid_I) {
  return IS_GREYOWL_13(sid_I) || IS_GREYOWL_16(sid_I) || IS_GREYOWL_24P(sid_I) ||
         IS_GREYOWL_24(sid_I) || IS_GREYOWL_32(sid_I);
}
