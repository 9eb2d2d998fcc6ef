// The run and check commands of the tool: the trace of one run of a program, and the differential
// check of a program against itself after a pipeline.
#pragma once

#include <ostream>

#include "options.h"

namespace ssaopt::tool {

// Exit status: 0 when run printed a trace (however the run ended) or check found no difference; 1
// when the program or the input values cannot be read, or check found a difference; 2 for an unknown
// pass.
int runBehaviourCommand(const Options& options, std::ostream& out, std::ostream& err);

}  // namespace ssaopt::tool
