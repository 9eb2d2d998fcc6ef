// Arithmetic on lattice values: the abstract result of each operator of the generated C code, the
// merges of a phi function's operand values, minima and maxima, and the conversion of a number to a
// data type. No function changes its operands except cast, which converts the number it is given.
//
// Most binary operators take the combined kind of their operands: non-constant if either is
// non-constant, else undetermined if either is undetermined, else constant with the folded number.
// Operators that a single constant operand decides (a zero factor or dividend, a false operand of &&,
// a true operand of ||) instead stay undetermined while an undetermined operand could still turn out
// to be that deciding constant; see each declaration.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/values/value.h"

class KV_DataType;

namespace ssaopt {

// The 32-bit integer that the integer operators and integer casts see in a number: the number
// truncated toward zero to a 64-bit integer, whose low 32 bits are read as signed (2^32 + 1.9 gives
// 1, -1.5 gives -1). A number outside the 64-bit range, or NaN, gives 0.
std::int32_t integerView(double number);

}  // namespace ssaopt

// Combined kind; the double sum, difference.
KvCCfgValue operator+(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator-(const KvCCfgValue& a, const KvCCfgValue& b);

// A constant 0 on either side gives the constant 0 whatever the other is; else undetermined if either
// is undetermined, non-constant if either is non-constant, else the double product.
KvCCfgValue operator*(const KvCCfgValue& a, const KvCCfgValue& b);

// Decided by the dividend alone while it is undetermined, non-constant or the constant 0 (which gives
// 0 whatever the divisor). A non-zero constant dividend takes the combined kind and the double
// quotient; a zero divisor gives the infinity of IEEE 754 division.
KvCCfgValue operator/(const KvCCfgValue& a, const KvCCfgValue& b);

// Combined kind; the remainder of the integer views by truncating division (-7 % 3 is -1). A zero
// divisor and -2147483648 % -1 have no 32-bit result and give non-constant.
KvCCfgValue operator%(const KvCCfgValue& a, const KvCCfgValue& b);

// Combined kind; the integer view of `a` shifted by the integer view of `b` modulo 32 (1 << 33 is 2).
// The right shift is arithmetic: -8 >> 1 is -4.
KvCCfgValue operator<<(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator>>(const KvCCfgValue& a, const KvCCfgValue& b);

// Combined kind; bitwise and, or, exclusive or of the integer views.
KvCCfgValue operator&(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator|(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator^(const KvCCfgValue& a, const KvCCfgValue& b);

// As in C, a constant is true when it is not 0. && gives 0 when either side is the constant 0 and ||
// gives 1 when either side is a non-zero constant, whatever the other side is; else undetermined if
// either is undetermined, non-constant if either is non-constant, else 1 or 0.
KvCCfgValue operator&&(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator||(const KvCCfgValue& a, const KvCCfgValue& b);

// Combined kind; 1 when the relation holds between the doubles, else 0.
KvCCfgValue operator==(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator!=(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator<(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator<=(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator>(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue operator>=(const KvCCfgValue& a, const KvCCfgValue& b);

// Combined kind; the larger (smaller) number, and on equal numbers that of `b`.
KvCCfgValue maxValue(const KvCCfgValue& a, const KvCCfgValue& b);
KvCCfgValue minValue(const KvCCfgValue& a, const KvCCfgValue& b);

// The kind of `a`: 1 when a is 0, else 0; -a; the complement of the integer view (~5 is -6).
KvCCfgValue operator!(const KvCCfgValue& a);
KvCCfgValue operator-(const KvCCfgValue& a);
KvCCfgValue operator~(const KvCCfgValue& a);

// The kind of `a`; a + 1 and a - 1. Postfix in form only: the operand is left unchanged.
KvCCfgValue operator++(const KvCCfgValue& a, int);
KvCCfgValue operator--(const KvCCfgValue& a, int);

// The kind of `a`; |a| (a when a >= 0, else -a) and the sign -1, 0 or 1 (0 for NaN, as the C idiom
// (a > 0) - (a < 0) gives).
KvCCfgValue absoluteValue(const KvCCfgValue& a);
KvCCfgValue sgn(const KvCCfgValue& a);

// Taking an address or reading through one never gives a constant.
KvCCfgValue reference(const KvCCfgValue& a);
KvCCfgValue dereference(const KvCCfgValue& a);

// The meet of a phi function's operand values: non-constant if any is non-constant or two constants
// differ; else undetermined if any is undetermined; else the common constant. An empty list gives
// undetermined, which leaves whatever it flows into unchanged. The values are only read.
KvCCfgValue intersect(const ssaopt::list<KvCCfgValue*>& values);

// The least (greatest) constant, the first of equal ones. The first element that is not a constant
// decides instead, with its kind: order matters, (undetermined, non-constant) gives undetermined. An
// empty list gives undetermined.
KvCCfgValue determineMinimum(const ssaopt::list<KvCCfgValue*>& values);
KvCCfgValue determineMaximum(const ssaopt::list<KvCCfgValue*>& values);

// Brings the number of `v` into the value set of `type` and returns `v`: float32 rounds to single
// precision; the integer types take the low 8, 16 or 32 bits of the integer view, signed or not; a
// Boolean becomes 0 or 1 with `normaliseBool`, else takes the low 8 bits unsigned. A null type, a
// type without a base type and float64 leave the number alone. The kind is neither read nor changed:
// callers apply it to constants.
KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v, bool normaliseBool);
KvCCfgValue& cast(const KV_DataType* type, KvCCfgValue& v);

// Brings [minimum, maximum] to the least range holding what cast makes of every number in it; an
// infinite end stands for an open one, and an inverted or NaN range for no range at all. Casting the
// two ends alone is wrong wherever the type wraps between them: an int16 in [-32768, 32768] holds
// every int16, not only -32768. So an integer type (and a Boolean not normalised) gives its whole
// range unless both ends lie between the same two wraps; a normalised Boolean gives 0 or 1 or both;
// float32 rounds both ends; a null type, a type without a base type and float64 leave them.
void castRange(const KV_DataType* type, double& minimum, double& maximum, bool normaliseBool);
