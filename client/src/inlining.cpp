#include "ssaopt/client/inlining.h"

#include <cstdint>
#include <unordered_map>

#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::client {

namespace {

bool holdsCall(const KvCBasicBlock& block) {
  for (KvCCfgStatement* pStatement : block.getStatementSeq())
    if (pStatement->isProcedureCall()) return true;
  return false;
}

}  // namespace

// The in-edges of an inlined call block move to its parameter block, payloads and all, while the
// edges themselves may go with a procedure inlined later: so the payload of one in-edge identifies
// where each labelled call block went.
void inlineKeepingLabels(Program& program, const std::function<void()>& inlineStep) {
  KvCControlFlowGraph& graph = program.graph();
  std::unordered_map<KvCCfgEdgeInfo*, std::uint32_t> labelledCallEnteredBy;
  for (ssaopt::node v : graph.nodes()) {
    KvCBasicBlock* pBlock = graph.getBasicBlock(v);
    if (pBlock && graph.indeg(v) > 0 && program.blockLabel(pBlock->getIndex()) && holdsCall(*pBlock))
      labelledCallEnteredBy[graph.inf(graph.first_in_edge(v))] = pBlock->getIndex();
  }
  inlineStep();
  for (ssaopt::edge e : graph.edges()) {
    auto found = labelledCallEnteredBy.find(graph.inf(e));
    KvCBasicBlock* pTarget = graph.getBasicBlock(graph.target(e));
    if (found != labelledCallEnteredBy.end() && pTarget && pTarget->getIndex() != found->second)
      program.passBlockLabel(found->second, pTarget->getIndex());
  }
}

}  // namespace ssaopt::client
