// The entry check of every public step: the graph's state must meet the step's contract (see
// graph_state.cpp), and a few steps need more of the graph than a fact can say. A step that is not
// ready reports why as an internal error and changes nothing.
#include "call_lists.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

using ssaopt::GraphOperation;
using ssaopt::node;

namespace {

// Source line of the report of a step called where the graph is not ready for it.
constexpr int kLineStepNotReady = 4000;

// The first call of the graph that names no procedure of the table, or that its procedure's call list
// does not hold; null when every call is registered.
const KvCCfgProcedureCall* firstUnregisteredCall(const KvCControlFlowGraph& G, bool& unknownCallee) {
  ssaopt::set<const KvCCfgProcedureCall*> registered = ssaopt::cfg::registeredCalls(G);
  for (node v : G.nodes()) {
    const KvCBasicBlock* pBlock = G.getBasicBlock(v);
    if (!pBlock) continue;
    for (KvCCfgStatement* pStatement : pBlock->getStatementSeq()) {
      const KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
      if (!pCall) continue;
      unknownCallee = !G.findProcedure(pCall->getName());
      if (unknownCallee || !registered.count(pCall)) return pCall;
    }
  }
  return nullptr;
}

// What the SSA transformation needs beyond the facts: "#main" with its exit, the start node, and
// every call in its procedure's call list (a call missing there would get no arguments, and its
// procedure's parameters would claim values that this call does not pass).
BxCXString whyNotReadyForSSA(const KvCControlFlowGraph& G) {
  const KvCCfgProcedure* pMain = G.findProcedure(KvCControlFlowGraph::kMainProcedureName);
  if (!pMain || !pMain->getExitNode()) return "there is no procedure \"#main\" with an exit node";
  if (!G.getStartNode()) return "no start node is set";
  bool unknownCallee = false;
  if (const KvCCfgProcedureCall* pCall = firstUnregisteredCall(G, unknownCallee))
    return BxCXString(unknownCallee ? "a call names no procedure of the graph: '"
                                    : "a call is not registered in its procedure's call list "
                                      "(appendCall, inlineProcedures or completeCallLists): '") +
           pCall->getName() + "'";
  return BxCXString();
}

}  // namespace

BxCXString KvCControlFlowGraph::checkReadiness(GraphOperation operation) const {
  BxCXString refusal = ssaopt::describeRefusal(operation, m_State);
  if (!refusal.empty() || operation != GraphOperation::TransformToSSAForm) return refusal;
  BxCXString missing = whyNotReadyForSSA(*this);
  return missing.empty() ? missing : BxCXString(ssaopt::contractOf(operation).name) + ": " + missing;
}

bool KvCControlFlowGraph::beginStep(GraphOperation operation) {
  BxCXString refusal = checkReadiness(operation);
  if (refusal.empty()) return true;
  ssaopt::reportInternalError(kClassName, kLineStepNotReady, refusal.cstring());
  return false;
}
