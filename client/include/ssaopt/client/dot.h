// The control-flow graph as a Graphviz digraph: one cluster per procedure, blocks as record nodes
// listing their phi functions, statements and condition, entry and exit nodes as ellipses, true and
// false edges labelled T and F, and SSA def-use edges (once constant propagation has added them)
// dashed. Unlike the printer it shows every node, also those the printer leaves implicit.
#pragma once

#include <string>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

std::string writeDot(const Program& program);

}  // namespace ssaopt::client
