// Code hoisting made a real change of the program. The library decides where a statement may leave an
// if/else branch and asks the statement classes: the statement at the head of the false branch to
// move before the branch (hoistOutOfIfElseBranch), its twin at the head of the true branch to go
// (remove). The client's assignments agree while this step listens; afterwards the step applies what
// they agreed to with the library's block operations:
//
//   before:  B [if (c)] -T-> [y.2 = a + 1] -> [z.1 = y.2] -> ...,  B -F-> [y.3 = a + 1] -> ...
//   after:   [y.3 = a + 1] -> B [if (c)] -T-> [z.1 = y.3] -> ...,   B -F-> ...
//
// The hoisted statement's block moves in front of the branch's condition, the twin's block leaves its
// branch, and what read the twin's SSA version reads the hoisted statement's version instead, so the
// graph stays in SSA form with every invariant kept. A pair whose blocks are not as the library left
// them (or whose branch block holds phi functions and no statement, in undivided graphs) stays as it
// is: the program is then merely not improved.
#pragma once

#include <functional>

#include "ssaopt/client/program.h"

class KvCCfgSFAssignment;

namespace ssaopt::client {

// Runs `hoistStep` (the library's hoistCodeOutOfIfElseBranches) listening to the assignments, then
// makes the moves they agreed to.
void hoistAsAgreed(Program& program, const std::function<void()>& hoistStep);

// The assignments' side of the hooks. While the step listens, agreeToHoist notes the statement and
// agrees, and noteDroppedTwin notes the twin of the statement agreed last; otherwise the one refuses
// and the other does nothing.
bool agreeToHoist(KvCCfgSFAssignment* pHoisted);
void noteDroppedTwin(KvCCfgSFAssignment* pTwin);

// What a read of `pVariable` reads once the moves agreed so far are made: the hoisted statement's
// version where `pVariable` is the version of a dropped twin, else `pVariable` itself. Two statements
// generate the same code only where they read the same versions in this sense: twins that read
// different versions (the virtual versions that the two branches of a condition give one variable)
// compute different values, and the hoisted one could read a version defined after it.
KvCCfgVariable* versionReadAfterHoisting(KvCCfgVariable* pVariable);

}  // namespace ssaopt::client
