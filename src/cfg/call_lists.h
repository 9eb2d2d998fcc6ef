// The calls that the procedures' call lists hold, for registering the others (completeCallLists) and
// for telling that none is missing (the entry check of transformToSSAForm).
#pragma once

#include "ssaopt/cfg/control_flow_graph.h"

namespace ssaopt::cfg {

set<const KvCCfgProcedureCall*> registeredCalls(const KvCControlFlowGraph& G);

}  // namespace ssaopt::cfg
