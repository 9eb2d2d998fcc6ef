// Conversion of a number to the value set of a data type of the generated code, as the generated
// code's own assignment to a variable of that type would store it.
#include <cmath>
#include <cstdint>
#include <limits>

#include "ssaopt/frame/types.h"
#include "ssaopt/values/arithmetic.h"

namespace {

// An integer type by the base-type test that recognises it and the bits it keeps.
struct IntegerTarget {
  bool (KV_BaseType::*test)() const;
  int width;
  bool isSigned;
};

// In the order in which the base type is tested.
const IntegerTarget kIntegerTargets[] = {
    {&KV_BaseType::isInt32, 32, true},   {&KV_BaseType::isInt16, 16, true},
    {&KV_BaseType::isInt8, 8, true},     {&KV_BaseType::isUInt32, 32, false},
    {&KV_BaseType::isUInt16, 16, false}, {&KV_BaseType::isUInt8, 8, false},
};

// A Boolean that is not normalised keeps the low byte, as an unsigned char would.
constexpr int kBoolWidth = 8;

// The low `width` bits of the integer view, read as signed or unsigned.
double wrapInteger(double number, int width, bool isSigned) {
  const std::uint32_t mask = ~0u >> (32 - width);
  const std::uint32_t low = static_cast<std::uint32_t>(ssaopt::integerView(number)) & mask;
  const bool negative = isSigned && (low >> (width - 1)) != 0;
  return static_cast<double>(low) - (negative ? std::ldexp(1.0, width) : 0.0);
}

// Rounds to the nearest float. The plain conversion is undefined beyond the float range, so the
// overflow to infinity that IEEE 754 rounding gives there is made explicit: from the midpoint between
// the largest float and 2^128 on, the nearest even neighbour is infinity.
double roundToFloat32(double number) {
  constexpr double kFloat32OverflowEdge = 0x1.ffffffp127;
  if (!std::isfinite(number)) return number;
  if (std::fabs(number) >= kFloat32OverflowEdge)
    return std::copysign(std::numeric_limits<double>::infinity(), number);
  return static_cast<float>(number);
}

// How a data type converts numbers, found once from the type tests in their order.
struct Conversion {
  enum class Kind { Keep, Float32, Integer, NormalisedBool };
  Kind kind = Kind::Keep;
  IntegerTarget integer{};
};

Conversion conversionOf(const KV_DataType& type, bool normaliseBool) {
  const KV_BaseType* base = type.getBaseType();
  if (!base || base->isFloat64()) return {};
  if (base->isFloat32()) return {Conversion::Kind::Float32};
  for (const IntegerTarget& target : kIntegerTargets)
    if ((base->*target.test)()) return {Conversion::Kind::Integer, target};
  if (!type.isBool()) return {};
  if (normaliseBool) return {Conversion::Kind::NormalisedBool};
  return {Conversion::Kind::Integer, {nullptr, kBoolWidth, false}};
}

double castNumber(const KV_DataType& type, double number, bool normaliseBool) {
  Conversion conversion = conversionOf(type, normaliseBool);
  switch (conversion.kind) {
    case Conversion::Kind::Keep:
      return number;
    case Conversion::Kind::Float32:
      return roundToFloat32(number);
    case Conversion::Kind::Integer:
      return wrapInteger(number, conversion.integer.width, conversion.integer.isSigned);
    case Conversion::Kind::NormalisedBool:
      // -0.0 becomes +0.0: a Boolean holds 0 or 1, and 1 / b must not tell the zeros apart.
      return number == 0.0 ? 0.0 : 1.0;
  }
  return number;
}

// The integer view wraps: it is monotone only between two wraps of the type, and beyond the 64-bit
// range it gives 0. Two ends less than a full turn of the type apart whose wrapped values keep their
// order lie between the same two wraps, and so does everything between them; any other range covers
// the whole type.
void castIntegerRange(const IntegerTarget& target, double& minimum, double& maximum) {
  constexpr double kInt64Bound = 0x1p63;
  const double turn = std::ldexp(1.0, target.width);
  const double lowest = target.isSigned ? -turn / 2 : 0.0;
  bool inView = std::fabs(minimum) < kInt64Bound && std::fabs(maximum) < kInt64Bound;
  if (inView) {
    auto low = static_cast<std::int64_t>(minimum), high = static_cast<std::int64_t>(maximum);
    double wrappedLow = wrapInteger(minimum, target.width, target.isSigned);
    double wrappedHigh = wrapInteger(maximum, target.width, target.isSigned);
    bool lessThanATurn =
        static_cast<std::uint64_t>(high) - static_cast<std::uint64_t>(low) < static_cast<std::uint64_t>(turn);
    if (lessThanATurn && wrappedLow <= wrappedHigh) {
      minimum = wrappedLow;
      maximum = wrappedHigh;
      return;
    }
  }
  minimum = lowest;
  maximum = lowest + turn - 1;
}

}  // namespace

KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v, bool normaliseBool) {
  if (type) v.setValue(castNumber(*type, v.getValue(), normaliseBool));
  return v;
}

KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v) { return cast(type, v, false); }

void castRange(const KV_DataType* type, double& minimum, double& maximum, bool normaliseBool) {
  if (!(minimum <= maximum)) {
    minimum = -std::numeric_limits<double>::infinity();
    maximum = std::numeric_limits<double>::infinity();
  }
  if (!type) return;
  Conversion conversion = conversionOf(*type, normaliseBool);
  switch (conversion.kind) {
    case Conversion::Kind::Keep:
      return;
    case Conversion::Kind::Float32:
      minimum = roundToFloat32(minimum);
      maximum = roundToFloat32(maximum);
      return;
    case Conversion::Kind::Integer:
      castIntegerRange(conversion.integer, minimum, maximum);
      return;
    case Conversion::Kind::NormalisedBool: {
      // 0 stays 0 and every other number becomes 1.
      bool holdsZero = minimum <= 0.0 && 0.0 <= maximum;
      bool holdsOther = minimum != 0.0 || maximum != 0.0;
      minimum = holdsZero ? 0.0 : 1.0;
      maximum = holdsOther ? 1.0 : 0.0;
      return;
    }
  }
}
