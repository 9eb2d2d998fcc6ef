// The front end of the textual format: reads a program, checks it and builds its control-flow graph
// through the library's public building operations only, in the order a code generator would:
//
//   1. one demandProcedureEntryNode per procedure, "#main" among them;
//   2. the blocks of each procedure with their statements, plain edges, and true and false edges out
//      of blocks with a condition; splitAtStatement and splitAtCondition leave every call alone in a
//      block of its own with a single successor;
//   3. setParametersOfCall for every call of a procedure with formal parameters;
//   4. makeProcedureAndCall on every block written "outline L:" (the extra call it returns is
//      deleted: the calls it places are the real ones, split off into blocks of their own);
//   5. placeExitNodes, placeLoopAroundMain, and the start node at the entry of "#main".
//
// Calls are not registered in their procedures' call lists here: the graph's completeCallLists does
// that before the SSA transformation (the pipeline's "ssa" step), unless inlining already did.
//
// The graph it hands over keeps the invariants the library relies on: blocks that cannot be reached
// from their procedure's entry are dropped (with a warning naming them), every procedure reaches its
// end, no argument of a call reads a formal parameter of the called procedure other than its own, no
// variable is both volatile and erasable, and every variable an external call may modify is volatile
// or an array (the library treats external calls as defining nothing).
//
// The program is destroyed before the memory pool it was made in ends (see program.h).
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "ssaopt/client/diagnostics.h"
#include "ssaopt/client/program.h"

namespace ssaopt::client {

struct LoadResult {
  std::unique_ptr<Program> program;  // null when there are errors
  // Errors and warnings in the order of their positions, with their source lines. The front end goes
  // on after an error at the next statement or declaration (after a syntax error it only reads on),
  // up to DiagnosticList::kMaxErrors errors.
  std::vector<Diagnostic> diagnostics;
};

LoadResult loadProgram(std::string text);

// The text of the file at `path`, or nothing when it cannot be read. "-" is standard input, read at
// the first call; later calls give the same text, so a command may load the program twice.
std::optional<std::string> readSourceText(const std::string& path);

// Reads the file first (see readSourceText); an unreadable file is an error at line 0.
LoadResult loadProgramFile(const std::string& path);

// Starts the numbering of the library's objects again from 0, so that the program loaded next has the
// block names (bb12, ...) and orders that a fresh process gives it. The library never does this by
// itself; a client that loads one program after another and compares their text across processes
// calls it between them.
void restartObjectNumbering();

}  // namespace ssaopt::client
