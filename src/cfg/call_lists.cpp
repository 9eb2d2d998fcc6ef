// Call lists: every call of a procedure must be in that procedure's call list before the SSA
// transformation, which gives each listed call its arguments. inlineProcedures registers the calls it
// meets, a client may register its own with appendCall; completeCallLists registers the rest.
//
//   before:  #main: [call f] [call f]      f's call list: (the first call)
//   completeCallLists():                   f's call list: (the first call, the second call)
//
// Needs: a graph before the SSA transformation.
#include "call_lists.h"

#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::cfg {

set<const KvCCfgProcedureCall*> registeredCalls(const KvCControlFlowGraph& G) {
  set<const KvCCfgProcedureCall*> registered;
  for (const auto& named : G.getProcedures())
    for (const KvCCfgProcedureCall* pCall : named.second->getCalls()) registered.insert(pCall);
  return registered;
}

}  // namespace ssaopt::cfg

// Each procedure's list is copied once, so the whole walk is linear in the number of calls. A call
// of a procedure that is not in the table stays unregistered; transformToSSAForm refuses it.
void KvCControlFlowGraph::completeCallLists() {
  if (!beginStep(ssaopt::GraphOperation::CompleteCallLists)) return;
  ssaopt::set<const KvCCfgProcedureCall*> registered = ssaopt::cfg::registeredCalls(*this);
  for (ssaopt::node v : nodes()) {
    const KvCBasicBlock* pBlock = getBasicBlock(v);
    if (!pBlock) continue;
    for (KvCCfgStatement* pStatement : pBlock->getStatementSeq()) {
      KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
      KvCCfgProcedure* pCallee = pCall ? findProcedure(pCall->getName()) : nullptr;
      if (pCallee && registered.insert(pCall).second) pCallee->appendCall(pCall);
    }
  }
  endStep(ssaopt::GraphOperation::CompleteCallLists);
}
