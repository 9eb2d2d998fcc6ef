// What several steps of the control-flow graph use: the report of a case that a consistent graph
// never reaches, new blocks and plain edges, and walks over the control-flow edges alone. Only the
// graph's public operations are needed, so these are functions, not members.
#pragma once

#include "ssaopt/cfg/control_flow_graph.h"

namespace ssaopt::cfg {

// Class name and file of the graph's internal error and consistency reports.
inline constexpr const char* kGraphClass = "KvCControlFlowGraph";

// Reports the consistency condition "0" and the internal error at `line`.
void reportInternalFault(int line);
// The block of `v`, or null after reporting `lineNoPayload` or `lineNoBlock`.
KvCBasicBlock* requireBasicBlock(const KvCControlFlowGraph& G, node v, int lineNoPayload, int lineNoBlock);
// The target of the entry node's first out-edge, or nil.
node firstBlockOf(const KvCControlFlowGraph& G, const KvCCfgProcedure& procedure);
// A new empty block of `pProcedure` on a new node.
node newBlockNode(KvCControlFlowGraph& G, KvCCfgProcedure* pProcedure);
edge newPlainEdge(KvCControlFlowGraph& G, node v, node w);
// The control-flow out-edges of `v` in adjacency order, SSA edges left out; nil after the last.
edge firstCfgOutEdge(const KvCControlFlowGraph& G, node v);
edge nextCfgOutEdge(const KvCControlFlowGraph& G, edge e);

}  // namespace ssaopt::cfg
