// The reduce command of the tool: shrinks a program while a command keeps failing on it the same way,
// with the shrinker of the fuzz command.
#pragma once

#include <ostream>

#include "options.h"

namespace ssaopt::tool {

// Exit status: 0 when the smallest program found was written; 1 when the program has errors, the
// command does not fail on it, or the result cannot be written.
int runReduceCommand(const Options& options, std::ostream& out, std::ostream& err);

}  // namespace ssaopt::tool
