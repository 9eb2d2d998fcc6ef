// The helper functions at the top of every emitted translation unit: the value arithmetic of the
// client (the computation in double, the integer operators on the 32-bit integer view, casts,
// rounding to a scaling) written out in C99 so that the compiled program computes bit for bit what the
// interpreter computes, with nothing that C leaves undefined.
#include "c_emitter_code.h"

namespace ssaopt::client::detail {

const char* cRuntimeText() {
  return R"(#include <stdint.h>

#define SSA_INF (1.0 / 0.0)
#define SSA_NAN (0.0 / 0.0)

/* Reads 32 bits as a two's-complement number without the implementation-defined conversion. */
static inline int32_t ssa_signed(uint32_t bits) {
  return bits < 0x80000000u ? (int32_t)bits : (int32_t)(bits - 0x80000000u) + INT32_MIN;
}

/* The 32-bit integer view of a number: truncated toward zero to 64 bits, the low 32 bits read as
   signed; 0 outside the 64-bit range and for NaN, where the conversion would be undefined. */
static inline int32_t ssa_int(double x) {
  if (!(x >= -9223372036854775808.0 && x < 9223372036854775808.0)) return 0;
  return ssa_signed((uint32_t)(uint64_t)(int64_t)x);
}

static inline int ssa_sign_bit(double x) {
  union { double d; uint64_t u; } bits;
  bits.d = x;
  return (int)(bits.u >> 63);
}

/* A zero factor gives +0 whatever the other factor is (also infinity or NaN). */
static inline double ssa_mul(double a, double b) { return a == 0.0 || b == 0.0 ? 0.0 : a * b; }

/* A zero dividend gives +0; a zero divisor gives the infinity (NaN) of IEEE 754 division. */
static inline double ssa_div(double a, double b) {
  if (a == 0.0) return 0.0;
  if (b != 0.0) return a / b;
  if (a != a) return SSA_NAN;
  return (a < 0.0) == ssa_sign_bit(b) ? SSA_INF : -SSA_INF;
}

/* A remainder without a 32-bit result (x % 0, INT32_MIN % -1) gives 0. */
static inline double ssa_rem(double a, double b) {
  int32_t x = ssa_int(a), y = ssa_int(b);
  if (y == 0 || (x == INT32_MIN && y == -1)) return 0.0;
  return (double)(x % y);
}

/* Shift counts are taken modulo 32; the right shift copies the sign bit in. */
static inline double ssa_shl(double a, double b) {
  return (double)ssa_signed((uint32_t)ssa_int(a) << ((uint32_t)ssa_int(b) & 31u));
}

static inline double ssa_shr(double a, double b) {
  int32_t x = ssa_int(a);
  uint32_t places = (uint32_t)ssa_int(b) & 31u;
  return (double)(x >= 0 ? x >> places : ~(~x >> places));
}

static inline double ssa_bitand(double a, double b) { return (double)(ssa_int(a) & ssa_int(b)); }
static inline double ssa_bitor(double a, double b) { return (double)(ssa_int(a) | ssa_int(b)); }
static inline double ssa_bitxor(double a, double b) { return (double)(ssa_int(a) ^ ssa_int(b)); }
static inline double ssa_compl(double a) { return (double)~ssa_int(a); }

/* Both operands are evaluated: && and || of the program do not short-circuit. */
static inline double ssa_and(double a, double b) { return a == 0.0 || b == 0.0 ? 0.0 : 1.0; }
static inline double ssa_or(double a, double b) { return a != 0.0 || b != 0.0 ? 1.0 : 0.0; }
static inline double ssa_not(double a) { return a == 0.0 ? 1.0 : 0.0; }

static inline double ssa_lt(double a, double b) { return a < b ? 1.0 : 0.0; }
static inline double ssa_le(double a, double b) { return a <= b ? 1.0 : 0.0; }
static inline double ssa_gt(double a, double b) { return a > b ? 1.0 : 0.0; }
static inline double ssa_ge(double a, double b) { return a >= b ? 1.0 : 0.0; }
static inline double ssa_eq(double a, double b) { return a == b ? 1.0 : 0.0; }
static inline double ssa_ne(double a, double b) { return a != b ? 1.0 : 0.0; }

static inline double ssa_abs(double a) { return a >= 0.0 ? a : -a; }
static inline double ssa_sgn(double a) { return a > 0.0 ? 1.0 : a < 0.0 ? -1.0 : 0.0; }

/* Rounds half away from zero, keeping the sign of a zero result, as round() does. */
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

/* The value that the stored integer nearest to x stands for. */
static inline double ssa_represent(double x, double lsb, double offset) {
  return ssa_round((x - offset) / lsb) * lsb + offset;
}

/* The low `width` bits of the integer view, read as signed or unsigned. */
static inline double ssa_wrap(double x, int width, int is_signed) {
  uint32_t low = (uint32_t)ssa_int(x) & (0xFFFFFFFFu >> (32 - width));
  int negative = is_signed && (low >> (width - 1)) != 0;
  return (double)low - (negative ? (double)((uint64_t)1 << width) : 0.0);
}

static inline _Bool ssa_to_bool(double x) { return x != 0.0; }
static inline int8_t ssa_to_int8(double x) { return (int8_t)ssa_wrap(x, 8, 1); }
static inline uint8_t ssa_to_uint8(double x) { return (uint8_t)ssa_wrap(x, 8, 0); }
static inline int16_t ssa_to_int16(double x) { return (int16_t)ssa_wrap(x, 16, 1); }
static inline uint16_t ssa_to_uint16(double x) { return (uint16_t)ssa_wrap(x, 16, 0); }
static inline int32_t ssa_to_int32(double x) { return (int32_t)ssa_wrap(x, 32, 1); }
static inline uint32_t ssa_to_uint32(double x) { return (uint32_t)ssa_wrap(x, 32, 0); }

/* Rounds to the nearest float. The plain conversion is undefined outside the float range, so what
   lies beyond it is rounded here: to infinity from the midpoint between the largest float and 2^128
   on, else to the largest float. */
static inline float ssa_to_float32(double x) {
  if (x != x || x == SSA_INF || x == -SSA_INF) return (float)x;
  if (x >= 0x1.ffffffp127 || x <= -0x1.ffffffp127) return x < 0.0 ? (float)-SSA_INF : (float)SSA_INF;
  if (x > 0x1.fffffep127 || x < -0x1.fffffep127) return x < 0.0 ? -0x1.fffffep127f : 0x1.fffffep127f;
  return (float)x;
}

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

}  // namespace ssaopt::client::detail
