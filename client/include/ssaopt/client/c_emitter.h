// Emits a program, at any stage of the pipeline, as one self-contained C99 translation unit that runs
// as the interpreter runs it (interpreter.h):
//
//   - the program's variables as static globals of their C types with their initial values (a
//     variable whose values that type cannot hold exactly, such as a scaled one, as a double holding
//     the value it stands for); variables that no statement names are left out;
//   - one function per procedure, its blocks as labelled statements joined by goto; every SSA
//     version reads and writes its variable, so phi functions, parameter, value-return and output
//     statements and virtual assignments generate nothing; a call assigns its arguments to the
//     formal parameters (all evaluated first), then calls the procedure's function;
//   - "#main" as a step function: `int ssaopt_step(void)` runs one pass of its body (the first from
//     its start, the later ones from the head of the loop the library closed around it) and returns
//     0 once "#main" has ended; `void ssaopt_finish(void)` leaves the loop; `void
//     ssaopt_outputs(void)` reports the output variables through the trace hooks;
//   - expressions through small inline helpers that compute as the value arithmetic does, with
//     volatile reads in the interpreter's order, and assignments storing as the client's variables
//     store (saturation, scaling, cast).
//
// The embedding program supplies `double ssa_input_NAME(void)` for every input stream (each volatile
// variable, and each array that an external call may refill) and the trace hooks declared at the top
// of the text (ssa_extern_begin, ssa_value, ssa_fault, ...).
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
