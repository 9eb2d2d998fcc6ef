// The passes the tool can run: each public operation of the graph that transforms it, by name.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::tool {

struct Pass {
  const char* name;
  const char* summary;
  void (*run)(client::Program& program);
};

// Every pass, in the order of the typical run where they take part in it.
const std::vector<Pass>& passRegistry();

// Null for a name that no pass has.
const Pass* findPass(std::string_view name);

// The typical run of a client: inline, valid-condition assignments, SSA, divided blocks, sparse
// conditional constant propagation with dead-code removal, constant variables and conditions
// replaced, folding, removal of unused definitions, and hoisting out of if/else branches.
std::vector<std::string> defaultPipeline();

// "a, b, c"
std::string joinedPassNames(const std::vector<std::string>& names);

// "unknown pass 'x'; known passes: ..." for the first name of `pipeline` that no pass has; empty when
// every name is known.
std::string findUnknownPass(const std::vector<std::string>& pipeline);

// Runs the passes named in `pipeline`, in order; every name must be known.
void runPipeline(const std::vector<std::string>& pipeline, client::Program& program);

}  // namespace ssaopt::tool
