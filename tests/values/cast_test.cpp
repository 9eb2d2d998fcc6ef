#include <cfloat>
#include <cmath>
#include <limits>

#include "ssaopt/frame/types.h"
#include "value_testing.h"

namespace {

const double kInfinity = std::numeric_limits<double>::infinity();
const double kNaN = std::numeric_limits<double>::quiet_NaN();

struct CastCase {
  const KV_DataType* type;
  double number;
  double expected;
};

void expectCasts(std::initializer_list<CastCase> cases, bool normaliseBool = false) {
  for (const CastCase& c : cases) {
    KvCCfgValue value(c.number);
    SCOPED_TRACE(::testing::Message() << c.type->getName() << " from " << c.number);
    EXPECT_VALUE(cast(c.type, value, normaliseBool), constant(c.expected));
  }
}

TEST(Cast, IntegerTypesKeepTheLowBitsOfTheIntegerView) {
  const KV_DataType *i32 = KV_DataType::int32(), *i16 = KV_DataType::int16(), *i8 = KV_DataType::int8();
  const KV_DataType *u32 = KV_DataType::uint32(), *u16 = KV_DataType::uint16(), *u8 = KV_DataType::uint8();
  expectCasts({{i32, 2.7, 2},
               {i32, -2.7, -2},
               {i32, 2147483648.0, -2147483648.0},
               {i32, 1e300, 0},
               {i16, 40000, -25536},
               {i16, -32769, 32767},
               {i8, 300, 44},
               {i8, 128, -128},
               {u32, -1, 4294967295.0},
               {u16, -1, 65535},
               {u8, 256, 0},
               {u8, -1.5, 255},
               {u8, kNaN, 0}});
}

TEST(Cast, FloatTypesRoundOnlyToSinglePrecision) {
  const KV_DataType *f64 = KV_DataType::float64(), *f32 = KV_DataType::float32();
  const double largestFloat = FLT_MAX;
  expectCasts({{f64, 0.1, 0.1},
               {f64, 1e300, 1e300},
               {f32, 0.1, static_cast<double>(0.1f)},
               {f32, 16777217, 16777216},
               // Just below the midpoint between the largest float and 2^128, and at it.
               {f32, largestFloat + std::ldexp(1.0, 102), largestFloat},
               {f32, 0x1.ffffffp127, kInfinity},
               {f32, -1e39, -kInfinity},
               {f32, kNaN, kNaN}});
}

TEST(Cast, BooleansNormaliseOrKeepTheLowByte) {
  const KV_DataType* boolean = KV_DataType::boolean();
  expectCasts({{boolean, 5, 1}, {boolean, 0.5, 1}, {boolean, 256, 1}, {boolean, 0, 0}}, true);
  // Regression: -0.0 stayed, so a folded 1 / b gave -inf where the compiled C (a _Bool) gives inf.
  KvCCfgValue negativeZero(-0.0);
  EXPECT_FALSE(std::signbit(cast(boolean, negativeZero, true).getValue()));
  expectCasts({{boolean, 5, 5}, {boolean, 256, 0}, {boolean, 0.5, 0}, {boolean, -1, 255}}, false);
  KvCCfgValue value(5.0);
  EXPECT_VALUE(cast(boolean, value), constant(5));  // the short form does not normalise
}

TEST(Cast, WithoutANumericBaseTypeTheNumberStays) {
  const KV_BaseType boolBase(KV_BaseType::Kind::Bool);
  const KV_DataType opaque(nullptr, false, "opaque");
  const KV_DataType booleanWithoutBase(nullptr, true, "bool without base");
  const KV_DataType nonBooleanOnBoolBase(&boolBase, false, "non-Boolean on a Boolean base");
  expectCasts({{&opaque, 2.7, 2.7}, {&booleanWithoutBase, 5, 5}, {&nonBooleanOnBoolBase, 5, 5}}, true);
}

TEST(Cast, ChangesOnlyTheNumberOfTheGivenValue) {
  KvCCfgValue varying(eCfgNonConstant), unconverted(2.7);
  varying.setValue(300);
  EXPECT_EQ(&cast(KV_DataType::int8(), varying), &varying);
  EXPECT_TRUE(varying.isNonConstant());
  EXPECT_EQ(varying.getValue(), 44);
  EXPECT_EQ(&cast(nullptr, unconverted, true), &unconverted);
  EXPECT_VALUE(unconverted, constant(2.7));
}

// ---- Ranges ----------------------------------------------------------------------------------------

struct RangeCase {
  const KV_DataType* type;
  double minimum, maximum;
  double castMinimum, castMaximum;
};

void expectRanges(std::initializer_list<RangeCase> cases, bool normaliseBool = false) {
  for (const RangeCase& c : cases) {
    double minimum = c.minimum, maximum = c.maximum;
    castRange(c.type, minimum, maximum, normaliseBool);
    EXPECT_EQ(minimum, c.castMinimum) << c.type->getName() << " [" << c.minimum << ", " << c.maximum << "]";
    EXPECT_EQ(maximum, c.castMaximum) << c.type->getName() << " [" << c.minimum << ", " << c.maximum << "]";
  }
}

// Casting each end alone claims too little: an int16 in [-32768, 32768] was cast to [-32768, -32768].
TEST(CastRange, AnIntegerTypeThatWrapsInsideTheRangeGivesItsWholeRange) {
  const KV_DataType *i32 = KV_DataType::int32(), *i16 = KV_DataType::int16(), *i8 = KV_DataType::int8();
  const KV_DataType* u8 = KV_DataType::uint8();
  expectRanges({{i16, -32768, 32768, -32768, 32767},
                {i16, 0, 65536, -32768, 32767},  // more than a full turn
                {i8, 100, 200, -128, 127},
                {u8, -1, 0, 0, 255},
                {i32, 0, 2147483648.0, -2147483648.0, 2147483647.0},
                {i32, -kInfinity, 5, -2147483648.0, 2147483647.0},  // an open end
                {i32, 1e300, 1e300, -2147483648.0, 2147483647.0},   // beyond the 64-bit view
                {i16, 5, 3, -32768, 32767},                         // no range at all
                {i16, kNaN, 3, -32768, 32767}});
}

TEST(CastRange, AnIntegerRangeBetweenTwoWrapsKeepsItsWidth) {
  const KV_DataType *i16 = KV_DataType::int16(), *i8 = KV_DataType::int8();
  const KV_DataType *u32 = KV_DataType::uint32(), *u8 = KV_DataType::uint8();
  expectRanges({{i16, -1, 1, -1, 1},
                {i16, 32768, 32770, -32768, -32766},
                {i8, 200, 300, -56, 44},
                {u8, -2.5, -1.5, 254, 255},  // truncated toward zero first
                {u8, 0.5, 255.9, 0, 255},
                {u32, 4294967296.0, 4294967301.0, 0, 5}});
}

TEST(CastRange, BooleansFloatsAndTypesWithoutConversion) {
  const KV_DataType* boolean = KV_DataType::boolean();
  expectRanges(
      {{boolean, -50, 50, 0, 1}, {boolean, 1, 101, 1, 1}, {boolean, 0, 0, 0, 0}, {boolean, -3, -1, 1, 1}},
      true);
  expectRanges({{boolean, 250, 260, 0, 255}, {boolean, 3, 5, 3, 5}});  // not normalised: the low byte
  expectRanges({{KV_DataType::float32(), 0.1, 1e39, static_cast<double>(0.1f), kInfinity},
                {KV_DataType::float64(), -kInfinity, 3, -kInfinity, 3},
                {KV_DataType::float64(), 5, 3, -kInfinity, kInfinity}});
  double minimum = 200, maximum = 300;
  castRange(nullptr, minimum, maximum, true);
  EXPECT_EQ(minimum, 200);  // no type, nothing to convert
  EXPECT_EQ(maximum, 300);
}

}  // namespace
