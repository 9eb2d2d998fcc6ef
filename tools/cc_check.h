// The cc-check command of the tool: emits C for a program as written and after the pipeline, compiles
// both with the system's C compiler (warnings as errors, and once with the undefined-behaviour
// sanitizer), runs them on the interpreter's seeded input streams and compares their traces with
// each other and with the interpreter's.
#pragma once

#include <ostream>

#include "options.h"

namespace ssaopt::tool {

// Exit status: 0 when every conclusive run gave the same trace everywhere; 1 when the program cannot
// be read, the compiler rejects the emitted C, a sanitizer reports, or a trace differs.
int runCcCheckCommand(const Options& options, std::ostream& out, std::ostream& err);

}  // namespace ssaopt::tool
