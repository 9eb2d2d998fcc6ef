#include "ssaopt/client/numbers.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>

namespace ssaopt::client {

namespace {

constexpr int kMaxSignificantDigits = 17;    // enough for every double to read back unchanged
constexpr double kExactWholeNumbers = 1e15;  // below this, every whole double prints in full

}  // namespace

std::string formatNumber(double number) {
  if (std::isnan(number)) return "nan";
  if (std::isinf(number)) return number < 0 ? "-inf" : "inf";
  char text[32];
  // Whole numbers as written in C code ("100", not "1e+02") while every digit is exact.
  if (number == std::trunc(number) && std::fabs(number) < kExactWholeNumbers) {
    std::snprintf(text, sizeof text, "%.0f", number);
    return text;
  }
  for (int digits = 1; digits <= kMaxSignificantDigits; ++digits) {
    std::snprintf(text, sizeof text, "%.*g", digits, number);
    if (std::strtod(text, nullptr) == number) break;
  }
  return text;
}

}  // namespace ssaopt::client
