#include <cstdint>
#include <limits>
#include <utility>

#include "value_testing.h"

namespace {

using Binary = KvCCfgValue (*)(const KvCCfgValue&, const KvCCfgValue&);
using NamedBinary = std::pair<const char*, Binary>;

const double kInfinity = std::numeric_limits<double>::infinity();
const double kNaN = std::numeric_limits<double>::quiet_NaN();
const double kIntMin = std::numeric_limits<std::int32_t>::min();
const double kIntMax = std::numeric_limits<std::int32_t>::max();

// clang-format off
#define BINARY(expr) NamedBinary(#expr, [](const KvCCfgValue& a, const KvCCfgValue& b) { return expr; })

const NamedBinary kCombinedKindOperators[] = {
    BINARY(a + b),  BINARY(a - b),  BINARY(a % b),  BINARY(a << b), BINARY(a >> b), BINARY(a & b),
    BINARY(a | b),  BINARY(a ^ b),  BINARY(a == b), BINARY(a != b), BINARY(a < b),  BINARY(a <= b),
    BINARY(a > b),  BINARY(a >= b), BINARY(maxValue(a, b)),         BINARY(minValue(a, b)),
};
// clang-format on

TEST(CombinedKindOperators, NonConstantDominatesUndetermined) {
  const struct {
    KvCCfgValue a, b;
    KvECfgValueKind expected;
  } cases[] = {
      {undetermined, nonConstant, eCfgNonConstant},
      {nonConstant, undetermined, eCfgNonConstant},
      {undetermined, constant(3), eCfgUndetermined},
      {constant(6), undetermined, eCfgUndetermined},
      {constant(6), constant(3), eCfgConstant},
      // Neither 0 nor 1 decides any of these alone.
      {constant(0), nonConstant, eCfgNonConstant},
      {nonConstant, constant(1), eCfgNonConstant},
  };
  for (const auto& [name, op] : kCombinedKindOperators)
    for (const auto& c : cases)
      EXPECT_EQ(op(c.a, c.b).getValueKind(), c.expected)
          << name << " of " << ::testing::PrintToString(c.a) << ", " << ::testing::PrintToString(c.b);
}

TEST(CombinedKindOperators, FoldConstantsAsTheGeneratedCode) {
  EXPECT_VALUE(constant(6) * constant(7) + constant(1), constant(43));
  EXPECT_VALUE(constant(-1) & constant(4294967296.0 + 5), constant(5));
  EXPECT_VALUE(constant(6) ^ constant(3), constant(5));
  EXPECT_VALUE(constant(0.0) == constant(-0.0), constant(1));
  EXPECT_VALUE(constant(kNaN) != constant(kNaN), constant(1));
  EXPECT_VALUE(maxValue(constant(0.0), constant(-0.0)), constant(-0.0));  // of equal numbers, b's
  EXPECT_VALUE(minValue(constant(-0.0), constant(0.0)), constant(0.0));
}

TEST(IntegerOperators, RemainderTruncatesOrHasNoConstantResult) {
  EXPECT_VALUE(constant(7.9) % constant(2.1), constant(1));
  EXPECT_VALUE(constant(-7) % constant(3), constant(-1));
  EXPECT_VALUE(constant(7) % constant(-3), constant(1));
  EXPECT_VALUE(constant(5) % constant(0.5), nonConstant);  // the divisor's integer view is 0
  EXPECT_VALUE(constant(kIntMin) % constant(-1), nonConstant);
  EXPECT_VALUE(undetermined % constant(0), undetermined);
}

TEST(IntegerOperators, ShiftCountIsTakenModulo32AndRightShiftCopiesTheSign) {
  EXPECT_VALUE(constant(1) << constant(31), constant(kIntMin));
  EXPECT_VALUE(constant(1) << constant(32), constant(1));
  EXPECT_VALUE(constant(1) << constant(-1), constant(kIntMin));
  EXPECT_VALUE(constant(kIntMin) << constant(1), constant(0));
  EXPECT_VALUE(constant(7) >> constant(33), constant(3));
  EXPECT_VALUE(constant(-7) >> constant(1), constant(-4));
  EXPECT_VALUE(constant(kIntMin) >> constant(31), constant(-1));
}

TEST(IntegerOperators, IntegerViewTruncatesAndKeepsTheLow32Bits) {
  const std::pair<double, std::int32_t> cases[] = {
      {-2.7, -2},
      {4294967296.0 + 1.9, 1},
      {2147483648.0, std::numeric_limits<std::int32_t>::min()},
      {9223372036854774784.0, -1024},  // the largest double below 2^63
      {-9223372036854774784.0, 1024},
      {9223372036854775808.0, 0},  // 2^63 is out of range
      {-9223372036854777856.0, 0},
      {-kInfinity, 0},
      {kNaN, 0},
  };
  for (const auto& [number, view] : cases) EXPECT_EQ(ssaopt::integerView(number), view) << number;
  EXPECT_VALUE(~constant(2147483648.0), constant(kIntMax));
}

TEST(DecidingOperators, DivisionIsDecidedByTheDividendFirst) {
  EXPECT_VALUE(constant(0) / undetermined, constant(0));
  EXPECT_VALUE(constant(-0.0) / nonConstant, constant(0));
  EXPECT_VALUE(undetermined / constant(0), undetermined);
  EXPECT_VALUE(nonConstant / undetermined, nonConstant);
  EXPECT_VALUE(constant(5) / undetermined, undetermined);
  EXPECT_VALUE(constant(5) / nonConstant, nonConstant);
  EXPECT_VALUE(constant(1) / constant(0), constant(kInfinity));
  EXPECT_VALUE(constant(1) / constant(-0.0), constant(-kInfinity));
  EXPECT_VALUE(constant(kNaN) / constant(0), constant(kNaN));
}

TEST(DecidingOperators, ZeroDecidesProductAndAndWhileUndeterminedWaits) {
  for (const auto& [name, op] : {BINARY(a * b), BINARY(a && b)}) {
    SCOPED_TRACE(name);
    EXPECT_VALUE(op(constant(0), nonConstant), constant(0));
    EXPECT_VALUE(op(nonConstant, constant(-0.0)), constant(0));
    EXPECT_VALUE(op(undetermined, constant(0)), constant(0));
    EXPECT_VALUE(op(undetermined, nonConstant), undetermined);
    EXPECT_VALUE(op(nonConstant, constant(3)), nonConstant);
  }
  EXPECT_VALUE(constant(2) && constant(-3), constant(1));
}

TEST(DecidingOperators, AnyNonZeroConstantDecidesOr) {
  EXPECT_VALUE(constant(1) || nonConstant, constant(1));
  EXPECT_VALUE(undetermined || constant(2), constant(1));
  EXPECT_VALUE(constant(0) || constant(0), constant(0));
  EXPECT_VALUE(nonConstant || undetermined, undetermined);
  EXPECT_VALUE(constant(-0.0) || nonConstant, nonConstant);
}

TEST(UnaryOperators, KeepTheKindAndFoldConstants) {
  using Unary = KvCCfgValue (*)(const KvCCfgValue&);
  for (Unary op :
       {Unary([](const KvCCfgValue& a) { return !a; }), Unary([](const KvCCfgValue& a) { return ~a; }),
        Unary([](const KvCCfgValue& a) { return a--; }), Unary(absoluteValue), Unary(sgn)}) {
    EXPECT_VALUE(op(undetermined), undetermined);
    EXPECT_VALUE(op(nonConstant), nonConstant);
  }
  EXPECT_VALUE(!constant(-0.0), constant(1));
  EXPECT_VALUE(!constant(0.5), constant(0));
  EXPECT_VALUE(~constant(5), constant(-6));
  EXPECT_VALUE(absoluteValue(constant(-2.5)), constant(2.5));
  EXPECT_VALUE(sgn(constant(-3)), constant(-1));
  EXPECT_VALUE(sgn(constant(-0.0)), constant(0));
  EXPECT_VALUE(sgn(constant(kNaN)), constant(0));
  const KvCCfgValue three(3.0);
  EXPECT_VALUE(three++, constant(4));
  EXPECT_VALUE(three--, constant(2));
  EXPECT_VALUE(-three, constant(-3));
}

TEST(UnaryOperators, AddressesAreNeverConstant) {
  for (const KvCCfgValue& a : {undetermined, nonConstant, constant(4)}) {
    EXPECT_VALUE(reference(a), nonConstant);
    EXPECT_VALUE(dereference(a), nonConstant);
  }
}

}  // namespace
