// Lattice values in tests: shorthands, printing, and an exact comparison that shows both values when
// it fails.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <ostream>

#include "ssaopt/values/arithmetic.h"
#include "ssaopt/values/value.h"

inline KvCCfgValue constant(double number) { return KvCCfgValue(number); }
inline const KvCCfgValue undetermined(eCfgUndetermined);
inline const KvCCfgValue nonConstant(eCfgNonConstant);

// Found by GoogleTest through argument-dependent lookup.
inline void PrintTo(const KvCCfgValue& value, std::ostream* out) {
  if (value.isUndetermined())
    *out << "undetermined";
  else if (value.isNonConstant())
    *out << "non-constant";
  else
    *out << "constant " << value.getValue();
}

// The same lattice element with the very same number: stricter than compare(), NaN matches NaN and
// -0.0 does not match 0.0, so a test sees which of two equal numbers an operator picked.
inline ::testing::AssertionResult sameValue(const char* actualText, const char* expectedText,
                                            const KvCCfgValue& actual, const KvCCfgValue& expected) {
  const double x = actual.getValue(), y = expected.getValue();
  const bool sameNumber = (std::isnan(x) && std::isnan(y)) || (x == y && std::signbit(x) == std::signbit(y));
  if (actual.getValueKind() == expected.getValueKind() && (!actual.isConstant() || sameNumber))
    return ::testing::AssertionSuccess();
  return ::testing::AssertionFailure()
         << actualText << " is " << ::testing::PrintToString(actual) << ", expected " << expectedText << " = "
         << ::testing::PrintToString(expected);
}

#define EXPECT_VALUE(actual, expected) EXPECT_PRED_FORMAT2(sameValue, actual, expected)
