// Emits a program, at any stage of the pipeline, as one self-contained C99 translation unit that runs
// as the interpreter runs it (interpreter.h):
//
//   - the program's variables as static globals of their C types with their initial values (a
//     variable whose values that type cannot hold exactly, such as a scaled one, as a double holding
//     the value it stands for); variables that no statement names are left out;
//   - one static function per procedure that "#main" calls, directly or through others, its blocks as
//     labelled statements joined by goto; every SSA version reads and writes its variable, so phi
//     functions, parameter, value-return and output statements, virtual assignments and copies between
//     versions of one variable generate nothing, and neither do the stores of initial values that
//     start the first step; a call assigns its arguments to the formal parameters (all evaluated
//     first), then calls the procedure's function;
//   - "#main" as a step function: `int ssaopt_step(void)` runs one pass of its body (the first from
//     its start, the later ones from the head of the loop the library closed around it) and returns
//     0 once "#main" has ended; `void ssaopt_finish(void)` leaves the loop; `void
//     ssaopt_outputs(void)` reports the output variables through the trace hooks;
//   - expressions through small inline helpers, only those the unit calls, that compute as the value
//     arithmetic does, with volatile reads in the interpreter's order, and assignments storing as the
//     client's variables store (saturation, scaling, cast); in SSA form, without the checks that the
//     propagated ranges show to be needless (EmitOptions);
//   - no product and sum fused into a multiply-add (#pragma STDC FP_CONTRACT OFF, and for GCC's GNU
//     dialects its own pragma), so that every operation rounds as the interpreter's does.
//
// The embedding program supplies `double ssa_input_NAME(void)` for every input stream (each volatile
// variable, and each array that an external call may refill), giving values that the variable holds
// (within its declared bounds, never NaN), and the trace hooks declared at the top of the text
// (ssa_extern_begin, ssa_value, ssa_fault, ...). The text compiles without warnings under -std=c99
// -Wall -Wextra with GCC and clang.
#pragma once

#include <string>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

struct EmittedInput {
  std::string variable;  // the program's name of the variable
  std::string hook;      // the function the C code calls for its next value
};

struct EmittedC {
  std::string text;
  std::vector<EmittedInput> inputs;  // in declaration order
};

struct EmitOptions {
  // In SSA form, leave out a saturation, a wrapping cast or an index check where the range that
  // propagation left in the versions shows that it cannot change the value; the value is marked with
  // that range (SSA_RANGE), which the code checks when compiled with -DSSA_CHECK_RANGES.
  bool useRanges = true;
};

EmittedC emitC(const Program& program, const EmitOptions& options = {});

}  // namespace ssaopt::client
