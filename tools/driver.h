// One run of the tool: read, transform, write, report.
#pragma once

#include <ostream>

#include "options.h"

namespace ssaopt::tool {

// Exit status: 0 on success, 1 when the input has errors, an output cannot be written or --verify
// found reports, 2 for an unknown pass.
int runTool(const Options& options, std::ostream& out, std::ostream& err);

}  // namespace ssaopt::tool
