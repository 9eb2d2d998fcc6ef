// Procedure inlining for the reference client: the library's inlineProcedures, after which a block
// label of the text that named a call names what took the call's place, the block of parameter
// assignments in front of the inlined body.
#pragma once

#include "ssaopt/client/program.h"

namespace ssaopt::client {

void inlineProcedures(Program& program);

}  // namespace ssaopt::client
