// The helper functions of emitted translation units: the value arithmetic of the client (the
// computation in double, the integer operators on the 32-bit integer view, casts, rounding to a
// scaling) written out in C99 so that the compiled program computes bit for bit what the interpreter
// computes, with nothing that C leaves undefined. A unit holds those its code calls.
#include <cctype>
#include <unordered_map>

#include "c_emitter_code.h"

namespace ssaopt::client::detail {

namespace {

bool isIdentifierCharacter(char c) { return std::isalnum(static_cast<unsigned char>(c)) || c == '_'; }

// The position after the comment or string literal that starts at `i`, else `i`.
std::size_t skipCommentOrString(const std::string& code, std::size_t i) {
  if (code.compare(i, 2, "/*") == 0) {
    std::size_t end = code.find("*/", i + 2);
    return end == std::string::npos ? code.size() : end + 2;
  }
  if (code[i] != '"') return i;
  for (++i; i < code.size() && code[i] != '"'; ++i)
    if (code[i] == '\\') ++i;
  return i + 1;
}

}  // namespace

std::vector<std::string> functionNamesIn(const std::string& code) {
  std::vector<std::string> names;
  std::size_t i = 0;
  while (i < code.size()) {
    if (std::size_t after = skipCommentOrString(code, i); after != i) {
      i = after;
      continue;
    }
    if (!isIdentifierCharacter(code[i])) {
      ++i;
      continue;
    }
    std::size_t start = i;
    while (i < code.size() && isIdentifierCharacter(code[i])) ++i;
    std::string name = code.substr(start, i - start);
    if (name.rfind("ssa_", 0) == 0 || name.rfind("SSA_", 0) == 0 || name.rfind("proc_", 0) == 0 ||
        name.rfind("sys_", 0) == 0)
      names.push_back(std::move(name));
  }
  return names;
}

std::string calledHelpersText(const std::vector<const CHelper*>& helpers, const std::string& code) {
  std::unordered_map<std::string, std::size_t> index;
  for (std::size_t i = 0; i < helpers.size(); ++i) index.emplace(helpers[i]->name, i);
  std::vector<bool> called(helpers.size(), false);
  std::vector<std::string> pending = functionNamesIn(code);
  while (!pending.empty()) {
    auto found = index.find(pending.back());
    pending.pop_back();
    if (found == index.end() || called[found->second]) continue;
    called[found->second] = true;
    std::vector<std::string> inside = functionNamesIn(helpers[found->second]->text);
    pending.insert(pending.end(), inside.begin(), inside.end());
  }
  std::string text;
  for (std::size_t i = 0; i < helpers.size(); ++i)
    if (called[i]) text += helpers[i]->text;
  return text;
}

const char* cPreludeText() {
  return R"(#include <stdint.h>

/* Every product and sum is rounded on its own, as the interpreter rounds it: no compiler may fuse
   them into one multiply-add. GCC ignores (and warns about) the standard pragma; it does not fuse in
   its ISO C modes (-std=c99) and is told not to in its GNU modes. Elsewhere compile with
   -ffp-contract=off where a compiler ignores the pragma. */
#if defined(__GNUC__) && !defined(__clang__)
#if !defined(__STRICT_ANSI__)
#pragma GCC optimize("fp-contract=off")
#endif
#else
#pragma STDC FP_CONTRACT OFF
#endif

#define SSA_INF (1.0 / 0.0)
#define SSA_NAN (0.0 / 0.0)

/* What the embedding program supplies: the trace of what an observer sees, and the end of a run
   that cannot go on. */
void ssa_extern_begin(const char *function);
void ssa_extern_end(void);
void ssa_output_begin(void);
void ssa_output_end(void);
void ssa_value(const char *variable, double value);
void ssa_array_begin(const char *variable);
void ssa_element(double value);
void ssa_array_end(void);
void ssa_fault(const char *message);
)";
}

// In the order they are defined, each after the helpers it calls.
const std::vector<CHelper>& cRuntimeHelpers() {
  static const std::vector<CHelper> kHelpers = {
      {"ssa_signed",
       R"(/* Reads 32 bits as a two's-complement number without the implementation-defined conversion. */
static inline int32_t ssa_signed(uint32_t bits) {
  return bits < 0x80000000u ? (int32_t)bits : (int32_t)(bits - 0x80000000u) + INT32_MIN;
}
)"},
      {"ssa_int",
       R"(/* The 32-bit integer view of a number, on which the integer operators and casts work: truncated
   toward zero to 64 bits, the low 32 bits read as signed; 0 outside the 64-bit range and for NaN,
   where the conversion would be undefined. Where a range shows a number to lie within the 32-bit
   range, the code converts it directly instead. */
static inline int32_t ssa_int(double x) {
  if (!(x >= -9223372036854775808.0 && x < 9223372036854775808.0)) return 0;
  return ssa_signed((uint32_t)(uint64_t)(int64_t)x);
}
)"},
      {"ssa_sign_bit",
       R"(static inline int ssa_sign_bit(double x) {
  union { double d; uint64_t u; } bits;
  bits.d = x;
  return (int)(bits.u >> 63);
}
)"},
      {"ssa_mul",
       R"(/* A zero factor gives +0 whatever the other factor is (also infinity or NaN). */
static inline double ssa_mul(double a, double b) { return a == 0.0 || b == 0.0 ? 0.0 : a * b; }
)"},
      {"ssa_div",
       R"(/* A zero dividend gives +0; a zero divisor gives the infinity (NaN) of IEEE 754 division. */
static inline double ssa_div(double a, double b) {
  if (a == 0.0) return 0.0;
  if (b != 0.0) return a / b;
  if (a != a) return SSA_NAN;
  return (a < 0.0) == ssa_sign_bit(b) ? SSA_INF : -SSA_INF;
}
)"},
      {"ssa_rem",
       R"(/* A remainder without a 32-bit result (x % 0, INT32_MIN % -1) gives 0. */
static inline double ssa_rem(int32_t x, int32_t y) {
  if (y == 0 || (x == INT32_MIN && y == -1)) return 0.0;
  return (double)(x % y);
}
)"},
      {"ssa_shl",
       R"(/* Shift counts are taken modulo 32; the right shift copies the sign bit in. */
static inline double ssa_shl(int32_t x, int32_t places) {
  return (double)ssa_signed((uint32_t)x << ((uint32_t)places & 31u));
}
)"},
      {"ssa_shr",
       R"(static inline double ssa_shr(int32_t x, int32_t places) {
  uint32_t count = (uint32_t)places & 31u;
  return (double)(x >= 0 ? x >> count : ~(~x >> count));
}
)"},
      {"ssa_bitand",
       R"(static inline double ssa_bitand(int32_t a, int32_t b) { return (double)(a & b); }
)"},
      {"ssa_bitor",
       R"(static inline double ssa_bitor(int32_t a, int32_t b) { return (double)(a | b); }
)"},
      {"ssa_bitxor",
       R"(static inline double ssa_bitxor(int32_t a, int32_t b) { return (double)(a ^ b); }
)"},
      {"ssa_compl",
       R"(static inline double ssa_compl(int32_t a) { return (double)~a; }
)"},
      {"ssa_and",
       R"(/* Both operands are evaluated: && and || of the program do not short-circuit. */
static inline double ssa_and(double a, double b) { return a == 0.0 || b == 0.0 ? 0.0 : 1.0; }
)"},
      {"ssa_or",
       R"(static inline double ssa_or(double a, double b) { return a != 0.0 || b != 0.0 ? 1.0 : 0.0; }
)"},
      {"ssa_not",
       R"(static inline double ssa_not(double a) { return a == 0.0 ? 1.0 : 0.0; }
)"},
      {"ssa_lt",
       R"(static inline double ssa_lt(double a, double b) { return a < b ? 1.0 : 0.0; }
)"},
      {"ssa_le",
       R"(static inline double ssa_le(double a, double b) { return a <= b ? 1.0 : 0.0; }
)"},
      {"ssa_gt",
       R"(static inline double ssa_gt(double a, double b) { return a > b ? 1.0 : 0.0; }
)"},
      {"ssa_ge",
       R"(static inline double ssa_ge(double a, double b) { return a >= b ? 1.0 : 0.0; }
)"},
      {"ssa_eq",
       R"(static inline double ssa_eq(double a, double b) { return a == b ? 1.0 : 0.0; }
)"},
      {"ssa_ne",
       R"(static inline double ssa_ne(double a, double b) { return a != b ? 1.0 : 0.0; }
)"},
      {"ssa_abs",
       R"(static inline double ssa_abs(double a) { return a >= 0.0 ? a : -a; }
)"},
      {"ssa_sgn",
       R"(static inline double ssa_sgn(double a) { return a > 0.0 ? 1.0 : a < 0.0 ? -1.0 : 0.0; }
)"},
      {"ssa_round",
       R"(/* Rounds half away from zero, keeping the sign of a zero result, as round() does. */
static inline double ssa_round(double x) {
  double whole;
  if (!(x > -4503599627370496.0 && x < 4503599627370496.0)) return x;
  whole = (double)(int64_t)x;
  if (x - whole >= 0.5)
    whole += 1.0;
  else if (whole - x >= 0.5)
    whole -= 1.0;
  return whole == 0.0 && ssa_sign_bit(x) ? -0.0 : whole;
}
)"},
      {"ssa_represent",
       R"(/* The value that the stored integer nearest to x stands for. */
static inline double ssa_represent(double x, double lsb, double offset) {
  return ssa_round((x - offset) / lsb) * lsb + offset;
}
)"},
      {"ssa_wrap",
       R"(/* The low `width` bits of an integer view, read as signed or unsigned. */
static inline double ssa_wrap(int32_t view, int width, int is_signed) {
  uint32_t low = (uint32_t)view & (0xFFFFFFFFu >> (32 - width));
  int negative = is_signed && (low >> (width - 1)) != 0;
  return (double)low - (negative ? (double)((uint64_t)1 << width) : 0.0);
}
)"},
      {"ssa_to_bool",
       R"(static inline _Bool ssa_to_bool(double x) { return x != 0.0; }
)"},
      {"ssa_to_int8",
       R"(static inline int8_t ssa_to_int8(int32_t view) { return (int8_t)ssa_wrap(view, 8, 1); }
)"},
      {"ssa_to_uint8",
       R"(static inline uint8_t ssa_to_uint8(int32_t view) { return (uint8_t)ssa_wrap(view, 8, 0); }
)"},
      {"ssa_to_int16",
       R"(static inline int16_t ssa_to_int16(int32_t view) { return (int16_t)ssa_wrap(view, 16, 1); }
)"},
      {"ssa_to_uint16",
       R"(static inline uint16_t ssa_to_uint16(int32_t view) { return (uint16_t)ssa_wrap(view, 16, 0); }
)"},
      {"ssa_to_int32",
       R"(static inline int32_t ssa_to_int32(int32_t view) { return (int32_t)ssa_wrap(view, 32, 1); }
)"},
      {"ssa_to_uint32",
       R"(static inline uint32_t ssa_to_uint32(int32_t view) { return (uint32_t)ssa_wrap(view, 32, 0); }
)"},
      {"ssa_to_float32",
       R"(/* Rounds to the nearest float. The plain conversion is undefined outside the float range, so what
   lies beyond it is rounded here: to infinity from the midpoint between the largest float and 2^128
   on, else to the largest float. */
static inline float ssa_to_float32(double x) {
  if (x != x || x == SSA_INF || x == -SSA_INF) return (float)x;
  if (x >= 0x1.ffffffp127 || x <= -0x1.ffffffp127) return x < 0.0 ? (float)-SSA_INF : (float)SSA_INF;
  if (x > 0x1.fffffep127 || x < -0x1.fffffep127) return x < 0.0 ? -0x1.fffffep127f : 0x1.fffffep127f;
  return (float)x;
}
)"},
      {"ssa_in_range",
       R"(/* A value whose propagated range made a check needless: the value itself, or, compiled with
   -DSSA_CHECK_RANGES, a fault where it lies outside that range (or is a NaN that it may not be). */
#ifdef SSA_CHECK_RANGES
#include <stdio.h>
static double ssa_in_range(double x, double lo, double hi, int nan) {
  static char message[128];
  if (!(x >= lo && x <= hi) && !(nan && x != x)) {
    snprintf(message, sizeof message, "%.17g lies outside its propagated range [%.17g, %.17g]", x, lo, hi);
    ssa_fault(message);
  }
  return x;
}
#endif
)"},
      {"SSA_RANGE",
       R"(#ifdef SSA_CHECK_RANGES
#define SSA_RANGE(x, lo, hi) ssa_in_range((x), (lo), (hi), 0)
#else
#define SSA_RANGE(x, lo, hi) (x)
#endif
)"},
      {"SSA_RANGE_OR_NAN",
       R"(#ifdef SSA_CHECK_RANGES
#define SSA_RANGE_OR_NAN(x, lo, hi) ssa_in_range((x), (lo), (hi), 1)
#else
#define SSA_RANGE_OR_NAN(x, lo, hi) (x)
#endif
)"},
  };
  return kHelpers;
}

}  // namespace ssaopt::client::detail
