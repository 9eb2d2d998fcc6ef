// Writes a program back in the textual format. Before the SSA transformation the text reads back to
// the same graph, so reading and printing again gives the same text. Afterwards it shows versions
// (x.3), phi functions, parameter, value-return and output statements, virtual assignments, and every
// block the library added.
#pragma once

#include <string>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

struct PrintOptions {
  // After each definition, the variable's propagated value and range ("// 4 in [4, 8]"); after each
  // branch, which of its out-edges are executable.
  bool showValues = false;
  // When not empty, only the procedure of this name, without the declarations (nothing when the
  // program has no such procedure).
  std::string procedure = {};
};

std::string printProgram(const Program& program, const PrintOptions& options = {});

}  // namespace ssaopt::client
