// Procedure inlining: a procedure called from exactly one place takes the place of its call.
//
//   before:  #main:    E -> A [x = 1] -> C [call scale(x)] -> D [y = s] -> X
//            scale(p): E' -> S [s = p * 2] -> X'
//   inlineProcedures():
//            #main:    E -> A [x = 1] -> P [p = x] -> S [s = p * 2] -> D [y = s] -> X
//
// Needs: exit nodes placed, each call alone in a block with one successor; runs before SSA form.
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

using ssaopt::edge;
using ssaopt::list;
using ssaopt::node;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineCallNotAlone = 2931;
constexpr int kLineNoCallerProcedure = 2949;
constexpr int kLineCalleeEntryOutdeg = 2978;
constexpr int kLineCallWithoutSingleSuccessor = 2990;
// A call naming no procedure of the table; the procedure operations never make one.
constexpr int kLineCallOfUnknownProcedure = 2915;

KvCCfgInitAssignment* newInitAssignment(KvCCfgVariable* pVariable, KvCCfgExpression* pValue) {
  KvCCfgInitAssignment* pAssignment = new KvCCfgInitAssignment();
  pAssignment->setLHS(pVariable);
  pAssignment->setRHS(pValue);
  return pAssignment;
}

}  // namespace

// The second pass visits only the blocks that held a call when the first pass ran. An inlining
// deletes the call block it works on (visited then, never again) and the callee's entry and exit,
// which hold no call: so no node is visited after an inlining deleted it, whatever the node order.
//
// Nodes learn their new procedure once, at the end: giving it to every node an inlined body reaches
// at each inlining would walk an inner body again each time an enclosing procedure is inlined after
// it, the square of the nesting depth in all. Meanwhile the run looks a block's procedure up through
// the procedures inlined so far.
void KvCControlFlowGraph::inlineProcedures() {
  if (!beginStep(ssaopt::GraphOperation::InlineProcedures)) return;
  list<node> callBlocks = registerCalls(all_nodes());
  InliningRun run{proceduresCalledOnce(), {}};
  for (node v : callBlocks) {
    KvCBasicBlock* pBlock = getBasicBlock(v);
    for (KvCCfgStatement* pStatement : list<KvCCfgStatement*>(pBlock->getStatementSeq()))
      if (pStatement->isProcedureCall() && inlineProcedureCalls(v, pBlock, run)) break;
  }
  if (!run.inlinedInto.empty()) settleProcedures(run);
  endStep(ssaopt::GraphOperation::InlineProcedures);
}

// The lists are not emptied first: a call registered before, by the client or by an earlier run,
// counts again, and its procedure is then no longer called once.
list<node> KvCControlFlowGraph::registerCalls(const list<node>& nodes) {
  list<node> callBlocks;
  for (node v : nodes) {
    const KvCBasicBlock* pBlock = getBasicBlock(v);
    if (!pBlock) continue;
    bool holdsCall = false;
    for (KvCCfgStatement* pStatement : list<KvCCfgStatement*>(pBlock->getStatementSeq())) {
      KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
      if (!pCall) continue;
      holdsCall = true;
      if (KvCCfgProcedure* pCallee = findProcedure(pCall->getName()))
        pCallee->appendCall(pCall);
      else
        reportInternalFault(kLineCallOfUnknownProcedure);
    }
    if (holdsCall) callBlocks.push_back(v);
  }
  return callBlocks;
}

// Counted once per run: asking every call for the length of its callee's list would cost the square
// of the number of calls of a procedure called from many places. "#main" stays whatever calls it:
// the program starts there.
KvCControlFlowGraph::ProcedureSet KvCControlFlowGraph::proceduresCalledOnce() const {
  ProcedureSet calledOnce;
  for (const auto& named : m_Procedures)
    if (named.first != kMainProcedureName && named.second->getCalls().size() == 1)
      calledOnce.insert(named.second);
  return calledOnce;
}

// Everything is checked before the first change, so that a call that cannot be inlined leaves the
// graph as it was. A call of the procedure that holds it (directly recursive, or so after an earlier
// inlining merged a mutual recursion) stays: splicing a procedure into itself would delete its own
// entry and exit.
bool KvCControlFlowGraph::inlineProcedureCalls(node v, KvCBasicBlock* pBasicBlock, InliningRun& run) {
  const list<KvCCfgStatement*>& statements = pBasicBlock->getStatementSeq();
  KV_CONSISTENCY_CHECK(statements.size() == 1, "StmtList.size() == 1", kClassName, kLineCallNotAlone);
  if (statements.size() != 1) return false;
  KvCCfgProcedureCall* pCall = statements.front()->isProcedureCall();
  if (!pCall) return false;
  KvCCfgProcedure* pCallee = findProcedure(pCall->getName());
  if (!pCallee || run.calledOnce.count(pCallee) == 0) return false;
  KvCCfgProcedure* pCaller = inf(v)->getProcedure();
  KV_CONSISTENCY_CHECK(pCaller, "pCallerProc", kClassName, kLineNoCallerProcedure);
  if (!pCaller) return false;
  pCaller = run.procedureNow(pCaller);
  if (pCaller == pCallee || !canTakeBodyOf(v, *pCallee)) return false;

  spliceBody(v, newParameterBlock(pCaller, *pCallee, pCall), pCallee);
  run.inlinedInto[pCallee] = pCaller;
  return true;
}

// Where the body of `pProcedure` stands now: in the procedure it was inlined into, or in the one that
// procedure went into, and so on. Each lookup shortens the path it followed.
KvCCfgProcedure* KvCControlFlowGraph::InliningRun::procedureNow(KvCCfgProcedure* pProcedure) {
  KvCCfgProcedure* pNow = pProcedure;
  while (KvCCfgProcedure** pInto = inlinedInto.lookup(pNow)) pNow = *pInto;
  while (KvCCfgProcedure** pInto = inlinedInto.lookup(pProcedure)) {
    pProcedure = *pInto;
    *pInto = pNow;
  }
  return pNow;
}

// Every node of an inlined body gets the procedure it stands in now.
void KvCControlFlowGraph::settleProcedures(InliningRun& run) {
  for (node v : nodes())
    if (KvCCfgNodeInfo* pInf = inf(v))
      if (pInf->getProcedure()) pInf->setProcedure(run.procedureNow(pInf->getProcedure()));
}
// The body is entered through the entry's only out-edge and continues after the call through the
// call block's only out-edge. A callee whose exit nothing reaches (it never returns, or has no exit
// yet) is left alone: the code after its call would be left without a way in.
bool KvCControlFlowGraph::canTakeBodyOf(node v, const KvCCfgProcedure& callee) const {
  bool entryLeadsToBody = outdeg(callee.getEntryNode()) == 1;
  KV_CONSISTENCY_CHECK(entryLeadsToBody, "outdeg(ProcedureEntryNode) == 1", kClassName,
                       kLineCalleeEntryOutdeg);
  bool callHasSuccessor = outdeg(v) == 1;
  KV_CONSISTENCY_CHECK(callHasSuccessor, "outdeg(x) == 1", kClassName, kLineCallWithoutSingleSuccessor);
  node exit = callee.getExitNode();
  return entryLeadsToBody && callHasSuccessor && exit && indeg(exit) > 0;
}

// One initialisation assignment per parameter, in parameter order, from the argument of this call; a
// parameter that the call passes nothing for keeps its value, as the variables are global. The
// parameter statements go with the procedure.
node KvCControlFlowGraph::newParameterBlock(KvCCfgProcedure* pCaller, const KvCCfgProcedure& callee,
                                            KvCCfgProcedureCall* pCall) {
  node w = newBlockNode(pCaller);
  KvCBasicBlock* pBlock = getBasicBlock(w);
  for (KvCCfgParamStatement* pParam : callee.getParamStatements()) {
    if (KvCCfgExpression* pArgument = pParam->getArgument(pCall))
      pBlock->append(newInitAssignment(pParam->getVariable(), pArgument));
    delete pParam;
  }
  return w;
}

// The successor of the call is taken after the call block's in-edges have moved: a call block that
// loops to itself then continues, as it should, at the parameter block that stands in its place.
// Moved edges keep their payloads, so branches into the call block and out of the body stay
// branches.
void KvCControlFlowGraph::spliceBody(node v, node parameters, KvCCfgProcedure* pCallee) {
  node entry = pCallee->getEntryNode();
  node exit = pCallee->getExitNode();
  node first = target(first_adj_edge(entry));
  while (edge e = first_in_edge(v)) move_edge(e, source(e), parameters);
  newPlainEdge(parameters, first);
  node after = target(first_adj_edge(v));
  while (edge e = first_in_edge(exit)) move_edge(e, source(e), after);
  del_node(v);
  del_node(entry);
  del_node(exit);
  m_Procedures.erase(pCallee->getName());
}
