// Procedure inlining for the reference client: the library's inlineProcedures, after which a block
// label of the text that named a call names what took the call's place, the block of parameter
// assignments in front of the inlined body.
#pragma once

#include <functional>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

// Runs `inlineStep` (the library's inlineProcedures) and moves the labels of inlined call blocks.
void inlineKeepingLabels(Program& program, const std::function<void()>& inlineStep);

}  // namespace ssaopt::client
