// Procedure inlining: a procedure called from exactly one place takes the place of its call.
//
//   before:  #main:    E -> A [x = 1] -> C [call scale(x)] -> D [y = s] -> X
//            scale(p): E' -> S [s = p * 2] -> X'
//   inlineProcedures():
//            #main:    E -> A [x = 1] -> P [p = x] -> S [s = p * 2] -> D [y = s] -> X
//
// Needs: exit nodes placed, each call alone in a block with one successor; runs before SSA form.
#include "graph_mechanism.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

using ssaopt::edge;
using ssaopt::list;
using ssaopt::node;
using ssaopt::cfg::kGraphClass;
using ssaopt::cfg::newBlockNode;
using ssaopt::cfg::newPlainEdge;
using ssaopt::cfg::reportInternalFault;

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

// What one run of inlineProcedures knows: the procedures called from one place, and which procedure
// each inlined one went into.
//
// Nodes learn their new procedure once, at the end: giving it to every node an inlined body reaches
// at each inlining would walk an inner body again each time an enclosing procedure is inlined after
// it, the square of the nesting depth in all. Meanwhile the run looks a block's procedure up through
// the procedures inlined so far.
class KvCControlFlowGraph::InliningRun {
public:
  explicit InliningRun(KvCControlFlowGraph& G) : m_G(G) {}

  // Appends every call in the blocks of `nodes` to its procedure's call list, then notes the
  // procedures called from one place; returns the nodes whose blocks hold a call, in the order of
  // `nodes`. The lists are not emptied first: a call registered before, by the client or by an
  // earlier run, counts again, and its procedure is then no longer called once.
  list<node> registerCalls(const list<node>& nodes) {
    list<node> callBlocks;
    for (node v : nodes) {
      const KvCBasicBlock* pBlock = m_G.getBasicBlock(v);
      if (!pBlock) continue;
      bool holdsCall = false;
      for (KvCCfgStatement* pStatement : list<KvCCfgStatement*>(pBlock->getStatementSeq())) {
        KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
        if (!pCall) continue;
        holdsCall = true;
        if (KvCCfgProcedure* pCallee = m_G.findProcedure(pCall->getName()))
          pCallee->appendCall(pCall);
        else
          reportInternalFault(kLineCallOfUnknownProcedure);
      }
      if (holdsCall) callBlocks.push_back(v);
    }
    noteProceduresCalledOnce();
    return callBlocks;
  }

  bool isCalledOnce(const KvCCfgProcedure* pProcedure) const { return m_CalledOnce.count(pProcedure) != 0; }

  // Where the body of `pProcedure` stands now: in the procedure it was inlined into, or in the one
  // that procedure went into, and so on. Each lookup shortens the path it followed.
  KvCCfgProcedure* procedureNow(KvCCfgProcedure* pProcedure) {
    KvCCfgProcedure* pNow = pProcedure;
    while (KvCCfgProcedure** pInto = m_InlinedInto.lookup(pNow)) pNow = *pInto;
    while (KvCCfgProcedure** pInto = m_InlinedInto.lookup(pProcedure)) {
      pProcedure = *pInto;
      *pInto = pNow;
    }
    return pNow;
  }

  // The body is entered through the entry's only out-edge and continues after the call through the
  // call block's only out-edge. A callee whose exit nothing reaches (it never returns, or has no exit
  // yet) is left alone: the code after its call would be left without a way in.
  bool canTakeBodyOf(node v, const KvCCfgProcedure& callee) const {
    bool entryLeadsToBody = m_G.outdeg(callee.getEntryNode()) == 1;
    KV_CONSISTENCY_CHECK(entryLeadsToBody, "outdeg(ProcedureEntryNode) == 1", kGraphClass,
                         kLineCalleeEntryOutdeg);
    bool callHasSuccessor = m_G.outdeg(v) == 1;
    KV_CONSISTENCY_CHECK(callHasSuccessor, "outdeg(x) == 1", kGraphClass, kLineCallWithoutSingleSuccessor);
    node exit = callee.getExitNode();
    return entryLeadsToBody && callHasSuccessor && exit && m_G.indeg(exit) > 0;
  }

  void takeBody(node v, KvCCfgProcedure* pCaller, KvCCfgProcedure* pCallee, KvCCfgProcedureCall* pCall) {
    spliceBody(v, newParameterBlock(pCaller, *pCallee, pCall), pCallee);
    m_InlinedInto[pCallee] = pCaller;
  }

  // Every node of an inlined body gets the procedure it stands in now.
  void settleProcedures() {
    if (m_InlinedInto.empty()) return;
    for (node v : m_G.nodes())
      if (KvCCfgNodeInfo* pInf = m_G.inf(v))
        if (pInf->getProcedure()) pInf->setProcedure(procedureNow(pInf->getProcedure()));
  }

private:
  // Counted once per run: asking every call for the length of its callee's list would cost the
  // square of the number of calls of a procedure called from many places. "#main" stays whatever
  // calls it: the program starts there.
  void noteProceduresCalledOnce() {
    for (const auto& named : m_G.m_Procedures)
      if (named.first != kMainProcedureName && named.second->getCalls().size() == 1)
        m_CalledOnce.insert(named.second);
  }

  // One initialisation assignment per parameter, in parameter order, from the argument of this
  // call; a parameter that the call passes nothing for keeps its value, as the variables are global.
  // The parameter statements go with the procedure.
  node newParameterBlock(KvCCfgProcedure* pCaller, const KvCCfgProcedure& callee,
                         KvCCfgProcedureCall* pCall) {
    node w = newBlockNode(m_G, pCaller);
    KvCBasicBlock* pBlock = m_G.getBasicBlock(w);
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
  void spliceBody(node v, node parameters, KvCCfgProcedure* pCallee) {
    node entry = pCallee->getEntryNode();
    node exit = pCallee->getExitNode();
    node first = m_G.target(m_G.first_adj_edge(entry));
    while (edge e = m_G.first_in_edge(v)) m_G.move_edge(e, m_G.source(e), parameters);
    newPlainEdge(m_G, parameters, first);
    node after = m_G.target(m_G.first_adj_edge(v));
    while (edge e = m_G.first_in_edge(exit)) m_G.move_edge(e, m_G.source(e), after);
    m_G.del_node(v);
    m_G.del_node(entry);
    m_G.del_node(exit);
    m_G.m_Procedures.erase(pCallee->getName());
  }

  KvCControlFlowGraph& m_G;
  ssaopt::set<const KvCCfgProcedure*> m_CalledOnce;
  ssaopt::map<const KvCCfgProcedure*, KvCCfgProcedure*> m_InlinedInto;
};

// The second pass visits only the blocks that held a call when the first pass ran. An inlining
// deletes the call block it works on (visited then, never again) and the callee's entry and exit,
// which hold no call: so no node is visited after an inlining deleted it, whatever the node order.
void KvCControlFlowGraph::inlineProcedures() {
  if (!beginStep(ssaopt::GraphOperation::InlineProcedures)) return;
  InliningRun run(*this);
  list<node> callBlocks = run.registerCalls(all_nodes());
  for (node v : callBlocks) {
    KvCBasicBlock* pBlock = getBasicBlock(v);
    for (KvCCfgStatement* pStatement : list<KvCCfgStatement*>(pBlock->getStatementSeq()))
      if (pStatement->isProcedureCall() && inlineProcedureCalls(v, pBlock, run)) break;
  }
  run.settleProcedures();
  endStep(ssaopt::GraphOperation::InlineProcedures);
}

// Everything is checked before the first change, so that a call that cannot be inlined leaves the
// graph as it was. A call of the procedure that holds it (directly recursive, or so after an earlier
// inlining merged a mutual recursion) stays: splicing a procedure into itself would delete its own
// entry and exit.
bool KvCControlFlowGraph::inlineProcedureCalls(node v, KvCBasicBlock* pBasicBlock, InliningRun& run) {
  const list<KvCCfgStatement*>& statements = pBasicBlock->getStatementSeq();
  KV_CONSISTENCY_CHECK(statements.size() == 1, "StmtList.size() == 1", kGraphClass, kLineCallNotAlone);
  if (statements.size() != 1) return false;
  KvCCfgProcedureCall* pCall = statements.front()->isProcedureCall();
  if (!pCall) return false;
  KvCCfgProcedure* pCallee = findProcedure(pCall->getName());
  if (!pCallee || !run.isCalledOnce(pCallee)) return false;
  KvCCfgProcedure* pCaller = inf(v)->getProcedure();
  KV_CONSISTENCY_CHECK(pCaller, "pCallerProc", kGraphClass, kLineNoCallerProcedure);
  if (!pCaller) return false;
  pCaller = run.procedureNow(pCaller);
  if (pCaller == pCallee || !run.canTakeBodyOf(v, *pCallee)) return false;
  run.takeBody(v, pCaller, pCallee, pCall);
  return true;
}
