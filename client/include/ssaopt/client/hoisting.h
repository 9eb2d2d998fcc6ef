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

#include "ssaopt/client/program.h"

class KvCCfgSFAssignment;

namespace ssaopt::client {

// The library's hoistCodeOutOfIfElseBranches, listening to the assignments, then the moves they
// agreed to.
void hoistCodeOutOfIfElseBranches(Program& program);

// The assignments' side of the hooks. While the step listens, agreeToHoist notes the statement and
// agrees, and noteDroppedTwin notes the twin of the statement agreed last; otherwise the one refuses
// and the other does nothing.
bool agreeToHoist(KvCCfgSFAssignment* pHoisted);
void noteDroppedTwin(KvCCfgSFAssignment* pTwin);

}  // namespace ssaopt::client
