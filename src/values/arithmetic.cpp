// The operators of the generated C code on lattice values. Each folds two constants the way the
// generated code computes them: in doubles, or in 32-bit two's-complement integers for the integer
// operators. Nothing here may rely on behaviour that C++ leaves undefined (signed overflow, shifts of
// negative numbers, out-of-range float conversions, division by zero), since the numbers come from
// whatever a model's author wrote.
#include "ssaopt/values/arithmetic.h"

#include <cmath>
#include <limits>
#include <optional>

namespace {

// -2^63, the lowest 64-bit integer, and 2^63, the first double above the highest; both are exact.
constexpr double kInt64Lowest = -9223372036854775808.0;
constexpr double kInt64End = 9223372036854775808.0;
constexpr std::uint32_t kShiftCountMask = 31;  // shift counts are taken modulo 32

// Reads 32 bits as a two's-complement number. The plain narrowing conversion would do the same on
// every compiler we build with, but before C++20 it is implementation-defined.
std::int32_t readSigned(std::uint32_t bits) {
  constexpr std::uint32_t kSignBit = 0x80000000u;
  if (bits < kSignBit) return static_cast<std::int32_t>(bits);
  return static_cast<std::int32_t>(bits - kSignBit) + std::numeric_limits<std::int32_t>::min();
}

std::uint32_t bitsOf(std::int32_t x) { return static_cast<std::uint32_t>(x); }

KvCCfgValue constant(double number) { return KvCCfgValue(number); }
KvCCfgValue truth(bool holds) { return constant(holds ? 1.0 : 0.0); }
bool isZero(const KvCCfgValue& v) { return v.isConstant() && v.getValue() == 0.0; }
bool isTrue(const KvCCfgValue& v) { return v.isConstant() && v.getValue() != 0.0; }

KvECfgValueKind combinedKind(const KvCCfgValue& a, const KvCCfgValue& b) {
  if (a.isNonConstant() || b.isNonConstant()) return eCfgNonConstant;
  if (a.isUndetermined() || b.isUndetermined()) return eCfgUndetermined;
  return eCfgConstant;
}

// The result under the combined kind; `fold` maps the two numbers to the result and is called only
// when both operands are constants.
template <class Fold>
KvCCfgValue combine(const KvCCfgValue& a, const KvCCfgValue& b, Fold fold) {
  const KvECfgValueKind kind = combinedKind(a, b);
  return kind == eCfgConstant ? fold(a.getValue(), b.getValue()) : KvCCfgValue(kind);
}

// The combined-kind result of an integer operator. `fold` works on the integer views and returns the
// 32-bit result, or nothing when the operation has no 32-bit result, which makes it non-constant.
template <class IntegerFold>
KvCCfgValue combineIntegers(const KvCCfgValue& a, const KvCCfgValue& b, IntegerFold fold) {
  return combine(a, b, [fold](double x, double y) {
    const std::optional<std::int32_t> result = fold(ssaopt::integerView(x), ssaopt::integerView(y));
    return result ? constant(*result) : KvCCfgValue(eCfgNonConstant);
  });
}

// For operators that one constant operand decides alone, whatever the other is. While an operand is
// undetermined the result stays undetermined rather than non-constant: that operand may yet become
// the deciding constant, and a non-constant result would then have to climb back to a constant.
template <class Decides, class Fold>
KvCCfgValue decideEarly(const KvCCfgValue& a, const KvCCfgValue& b, Decides decides, double decided,
                        Fold fold) {
  if (decides(a) || decides(b)) return constant(decided);
  if (a.isUndetermined() || b.isUndetermined()) return KvCCfgValue(eCfgUndetermined);
  if (a.isNonConstant() || b.isNonConstant()) return KvCCfgValue(eCfgNonConstant);
  return fold(a.getValue(), b.getValue());
}

// The result under the kind of `a`; `fold` maps its number and is called only for a constant.
template <class Fold>
KvCCfgValue mapConstant(const KvCCfgValue& a, Fold fold) {
  return a.isConstant() ? constant(fold(a.getValue())) : KvCCfgValue(a.getValueKind());
}

// x / y with the IEEE 754 result for a zero divisor, computed rather than left to a division by zero,
// which C++ does not define even for doubles.
double quotient(double x, double y) {
  if (y != 0.0) return x / y;
  if (x == 0.0 || std::isnan(x)) return std::numeric_limits<double>::quiet_NaN();
  const double infinity = std::numeric_limits<double>::infinity();
  return std::signbit(x) == std::signbit(y) ? infinity : -infinity;
}

// Truncating remainder; none for a zero divisor, and none for -2^31 % -1, whose quotient overflows.
std::optional<std::int32_t> truncatingRemainder(std::int32_t x, std::int32_t y) {
  if (y == 0 || (x == std::numeric_limits<std::int32_t>::min() && y == -1)) return std::nullopt;
  return x % y;
}

std::int32_t shiftLeft(std::int32_t x, std::int32_t count) {
  return readSigned(bitsOf(x) << (bitsOf(count) & kShiftCountMask));
}

// Copies the sign bit in; a right shift of a negative number is implementation-defined before C++20.
std::int32_t shiftRight(std::int32_t x, std::int32_t count) {
  const std::uint32_t places = bitsOf(count) & kShiftCountMask;
  return x >= 0 ? x >> places : ~(~x >> places);
}

}  // namespace

std::int32_t ssaopt::integerView(double number) {
  // The range test comes before the conversion, which is undefined outside the range; NaN fails it.
  if (!(number >= kInt64Lowest && number < kInt64End)) return 0;
  const auto whole = static_cast<std::int64_t>(number);
  return readSigned(static_cast<std::uint32_t>(whole));
}

KvCCfgValue operator+(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return constant(x + y); });
}

KvCCfgValue operator-(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return constant(x - y); });
}

KvCCfgValue operator*(const KvCCfgValue& a, const KvCCfgValue& b) {
  return decideEarly(a, b, isZero, 0.0, [](double x, double y) { return constant(x * y); });
}

KvCCfgValue operator/(const KvCCfgValue& a, const KvCCfgValue& b) {
  // Only the dividend can decide a quotient alone: 0 divided by anything is 0.
  if (!a.isConstant()) return KvCCfgValue(a.getValueKind());
  if (isZero(a)) return constant(0.0);
  return combine(a, b, [](double x, double y) { return constant(quotient(x, y)); });
}

KvCCfgValue operator%(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, truncatingRemainder);
}

KvCCfgValue operator<<(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, shiftLeft);
}

KvCCfgValue operator>>(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, shiftRight);
}

KvCCfgValue operator&(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, [](std::int32_t x, std::int32_t y) { return x & y; });
}

KvCCfgValue operator|(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, [](std::int32_t x, std::int32_t y) { return x | y; });
}

KvCCfgValue operator^(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combineIntegers(a, b, [](std::int32_t x, std::int32_t y) { return x ^ y; });
}

KvCCfgValue operator&&(const KvCCfgValue& a, const KvCCfgValue& b) {
  // Reached only with two non-zero constants.
  return decideEarly(a, b, isZero, 0.0, [](double, double) { return constant(1.0); });
}

KvCCfgValue operator||(const KvCCfgValue& a, const KvCCfgValue& b) {
  // Reached only with two zero constants.
  return decideEarly(a, b, isTrue, 1.0, [](double, double) { return constant(0.0); });
}

KvCCfgValue operator==(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x == y); });
}

KvCCfgValue operator!=(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x != y); });
}

KvCCfgValue operator<(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x < y); });
}

KvCCfgValue operator<=(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x <= y); });
}

KvCCfgValue operator>(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x > y); });
}

KvCCfgValue operator>=(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return truth(x >= y); });
}

KvCCfgValue maxValue(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return constant(x > y ? x : y); });
}

KvCCfgValue minValue(const KvCCfgValue& a, const KvCCfgValue& b) {
  return combine(a, b, [](double x, double y) { return constant(x < y ? x : y); });
}

KvCCfgValue operator!(const KvCCfgValue& a) {
  return mapConstant(a, [](double x) { return x == 0.0 ? 1.0 : 0.0; });
}

KvCCfgValue operator-(const KvCCfgValue& a) {
  return mapConstant(a, [](double x) { return -x; });
}

KvCCfgValue operator~(const KvCCfgValue& a) {
  return mapConstant(a, [](double x) { return static_cast<double>(~ssaopt::integerView(x)); });
}

KvCCfgValue operator++(const KvCCfgValue& a, int) {
  return mapConstant(a, [](double x) { return x + 1.0; });
}

KvCCfgValue operator--(const KvCCfgValue& a, int) {
  return mapConstant(a, [](double x) { return x - 1.0; });
}

KvCCfgValue absoluteValue(const KvCCfgValue& a) {
  return mapConstant(a, [](double x) { return x >= 0.0 ? x : -x; });
}

KvCCfgValue sgn(const KvCCfgValue& a) {
  return mapConstant(a, [](double x) { return x > 0.0 ? 1.0 : x < 0.0 ? -1.0 : 0.0; });
}

KvCCfgValue reference(const KvCCfgValue&) { return KvCCfgValue(eCfgNonConstant); }

KvCCfgValue dereference(const KvCCfgValue&) { return KvCCfgValue(eCfgNonConstant); }
