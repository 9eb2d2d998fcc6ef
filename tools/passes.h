// The passes the tool can run: the named steps of the library's pipeline (ssaopt/cfg/pipeline.h),
// with the reference client taking part in them. Where a pass can run comes from the library's
// contracts of the steps, walked from the state in which the front end leaves a program.
#pragma once

#include <cstdint>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "ssaopt/cfg/pipeline.h"
#include "ssaopt/client/program.h"

namespace ssaopt::tool {

using Pass = ssaopt::PipelineStep;

// Every pass, in the order of the typical run where they take part in it.
ssaopt::PipelineSteps passRegistry();

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

// The unknown pass error, else why the first pass that cannot run where it stands cannot ("pass
// 'divide' cannot run after 'ssa-edges': SSA edges are present (...)"); empty when the pipeline can
// run on a program as the front end leaves it.
std::string findPipelineError(const std::vector<std::string>& pipeline);

// " (needs SSA form, divided blocks)" for a pass that cannot run everywhere; empty otherwise.
std::string whereThePassRuns(const Pass& pass);

// A random pipeline that can run on a program as the front end leaves it: up to `maxLength` passes,
// each drawn from those that can run after the ones before. The same seed gives the same pipeline.
std::vector<std::string> randomLegalPipeline(std::uint64_t seed, std::size_t maxLength);

// Runs the passes named in `pipeline`, in order; every name must be known.
void runPipeline(const std::vector<std::string>& pipeline, client::Program& program);

// The program in file `path` after `pipeline`, or null after its errors were written to `err`. Loading
// a file twice shows the same warnings twice, so the second load passes `showWarnings` false.
std::unique_ptr<client::Program> loadProgramAndRunPipeline(const std::string& path,
                                                           const std::vector<std::string>& pipeline,
                                                           bool showWarnings, std::ostream& err);

}  // namespace ssaopt::tool
