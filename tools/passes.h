// The passes the tool can run: each public operation of the graph that transforms it, by name.
#pragma once

#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::tool {

struct Pass {
  const char* name;
  const char* summary;
  void (*run)(client::Program& program);
  // Passes that must have run earlier in a pipeline: the library's operations rely on the graph's
  // state (constant propagation on a divided graph in SSA form; propagation over SSA edges on the
  // edges being there) and misbehave, some never ending, without it.
  std::vector<std::string_view> needs = {};
  // Whether the pass works on a graph before the SSA transformation only.
  bool beforeSSAOnly = false;
  // Passes whose work this one does as well, which meets their needs.
  std::vector<std::string_view> includes = {};
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

// The unknown pass error, else "pass 'x' needs 'y' earlier in the pipeline" or "pass 'x' must come
// before 'ssa'" for the first pass whose needs the passes before it do not meet; empty when the
// pipeline can run.
std::string findPipelineError(const std::vector<std::string>& pipeline);

// Runs the passes named in `pipeline`, in order; every name must be known.
void runPipeline(const std::vector<std::string>& pipeline, client::Program& program);

// The program in file `path` after `pipeline`, or null after its errors were written to `err`. Loading
// a file twice shows the same warnings twice, so the second load passes `showWarnings` false.
std::unique_ptr<client::Program> loadProgramAndRunPipeline(const std::string& path,
                                                           const std::vector<std::string>& pipeline,
                                                           bool showWarnings, std::ostream& err);

}  // namespace ssaopt::tool
