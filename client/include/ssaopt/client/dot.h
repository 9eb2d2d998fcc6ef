// The program as a Graphviz digraph, named as the printer names it:
//
// - a cluster per procedure, with an "entry" ellipse and an "end" ellipse;
// - a box per piece of straight-line code: a block and the blocks it falls into that nothing else
//   enters, so that the blocks of a divided or split block are one box again. The box is titled with
//   the label the printer gives its first block; it lists the phi functions, statements and condition
//   of its blocks in order, with the label of every later block that the text names too ("bb31:",
//   which phi operands refer to);
// - true and false edges labelled T and F, an edge to the "end" ellipse where the text says "end", and
//   a branch that dead-code elimination removed as a dotted edge to "removed";
// - calls as dashed edges from the box holding the call to the entry of the procedure called.
//
// With showValues, definitions are followed by their propagated values and ranges as in the text, and
// the edges that constant propagation found not executable, and the removed branches, are red.
#pragma once

#include <string>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

struct DotOptions {
  bool showValues = false;
  // When not empty, only the procedure of this name.
  std::string procedure = {};
};

std::string writeDot(const Program& program, const DotOptions& options = {});

}  // namespace ssaopt::client
