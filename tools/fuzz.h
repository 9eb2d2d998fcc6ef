// The generate and fuzz commands of the tool: a random program, and the pipeline checked on many of
// them.
#pragma once

#include <ostream>

#include "options.h"

namespace ssaopt::tool {

// Exit status: 0 when generate wrote its program or fuzz found no failure; 1 when fuzz found one; 2
// for an unknown pass.
int runGeneratorCommand(const Options& options, std::ostream& out, std::ostream& err);

}  // namespace ssaopt::tool
