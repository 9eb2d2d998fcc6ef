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

double castNumber(const KV_DataType& type, double number, bool normaliseBool) {
  const KV_BaseType* base = type.getBaseType();
  if (!base || base->isFloat64()) return number;
  if (base->isFloat32()) return roundToFloat32(number);
  for (const IntegerTarget& target : kIntegerTargets)
    if ((base->*target.test)()) return wrapInteger(number, target.width, target.isSigned);
  if (!type.isBool()) return number;
  // -0.0 becomes +0.0: a Boolean holds 0 or 1, and 1 / b must not tell the zeros apart.
  if (normaliseBool) return number == 0.0 ? 0.0 : 1.0;
  return wrapInteger(number, kBoolWidth, false);
}

}  // namespace

KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v, bool normaliseBool) {
  if (type) v.setValue(castNumber(*type, v.getValue(), normaliseBool));
  return v;
}

KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v) { return cast(type, v, false); }
