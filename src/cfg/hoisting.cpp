// Code hoisting: where both branches of an if/else begin with statements that generate the same
// code, one of them moves before the branch and the other goes; then the next pair, and so on.
//
//   before:  B [if (c)] -T-> [y = a + 1] -> [z = 2] -> ...,  B -F-> [y = a + 1] -> [z = 3] -> ...
//   hoistCodeOutOfIfElseBranches():
//            [y = a + 1] -> B [if (c)] -T-> [z = 2] -> ...,  B -F-> [z = 3] -> ...
//
// The library only decides where a statement may move; moving and dropping are the statement
// classes' (generatesSameCode, hoistOutOfIfElseBranch, remove), and the base classes refuse.
// Needs nothing of the graph's state: the walks take blocks of one item, which dividing makes of
// every block. It deletes the SSA edges, so propagation over them cannot follow it.
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;
using Variables = ssaopt::set<KvCCfgVariable*>;

namespace {

// Several statements, or a statement beside phi functions, may depend on one another: a statement
// found behind such a block could not move above it.
bool holdsSeveralItems(const KvCBasicBlock& block) {
  return block.getStatementSeq().size() + block.getPhiFunctions().size() > 1;
}

// Virtual assignments generate no code and value-return statements only link procedures: the walk
// passes them.
bool generatesCode(KvCCfgStatement* s) { return !s->getIsVirtual() && !s->isValueReturnStatement(); }

// SSA versions of one variable count as that variable.
Variables originalsOf(const Variables& variables) {
  Variables originals;
  for (KvCCfgVariable* pVariable : variables) {
    KvCSSAVariable* pVersion = pVariable->isSSAVariable();
    originals.insert(pVersion ? pVersion->getOrigVar() : pVariable);
  }
  return originals;
}

bool sharesAny(const Variables& a, const Variables& b) {
  for (KvCCfgVariable* pVariable : a)
    if (b.count(pVariable)) return true;
  return false;
}

}  // namespace

void KvCControlFlowGraph::hoistCodeOutOfIfElseBranches() {
  if (!beginStep(ssaopt::GraphOperation::HoistCodeOutOfIfElseBranches)) return;
  deleteSSAEdges();
  for (node v : all_nodes()) {
    const KvCBasicBlock* pBlock = getBasicBlock(v);
    if (pBlock && pBlock->getBranchCond()) performCodeHoisting(v);
  }
  endStep(ssaopt::GraphOperation::HoistCodeOutOfIfElseBranches);
}

// Each pass takes the next statement down each branch; the pair moves when the statements generate
// the same code, the statement may precede the condition, and its class agrees to move it. The class
// may ask (through skipNext) that the statement that each walk finds next be passed over once.
void KvCControlFlowGraph::performCodeHoisting(node v) {
  KvCCfgExpression* cond = getBasicBlock(v)->getBranchCond();
  if (cond->hasSideEffects()) return;
  edge eT = nil;
  edge eF = nil;
  for (edge e : out(v)) {
    if (inf(e)->isTrueBranch()) eT = e;
    if (inf(e)->isFalseBranch()) eF = e;
  }
  if (!eT || !eF) return;
  bool skipNext = false;
  for (;;) {
    KvCCfgStatement* sT = nextHoistingCandidate(eT, skipNext);
    KvCCfgStatement* sF = sT ? nextHoistingCandidate(eF, skipNext) : nullptr;
    if (!sF || !sT->generatesSameCode(sF) || !checkForHoisting(sF, cond) ||
        !sF->hoistOutOfIfElseBranch(skipNext))
      return;
    sT->remove();
  }
}

// The walk stays on the branch: it stops where another path joins (in-degree above 1), at the next
// branch, at anything but a block, and at a block holding more than one item. Blocks holding one
// phi function or nothing are passed, as are statements that generate no code.
KvCCfgStatement* KvCControlFlowGraph::nextHoistingCandidate(edge& e, bool skipNext) const {
  while (e) {
    node w = target(e);
    const KvCBasicBlock* pBlock = getBasicBlock(w);
    if (!pBlock || pBlock->getBranchCond() || indeg(w) > 1 || holdsSeveralItems(*pBlock)) return nullptr;
    e = first_adj_edge(w);
    KvCCfgStatement* s = pBlock->isStatement();
    if (!s || !generatesCode(s)) continue;
    if (!skipNext) return s;
    skipNext = false;
  }
  return nullptr;
}

bool KvCControlFlowGraph::checkForHoisting(KvCCfgStatement* s, KvCCfgExpression* cond) const {
  if (cond->hasSideEffects()) return false;
  return !sharesAny(originalsOf(variablesDefinedBy(s)), originalsOf(cond->getUsedVariables()));
}

// A call defines what its procedure (with all that it calls) defines, and what its function return
// defines.
Variables KvCControlFlowGraph::variablesDefinedBy(KvCCfgStatement* s) const {
  KvCCfgProcedureCall* pCall = s->isProcedureCall();
  if (!pCall) return s->getDefinedVariables();
  Variables defined = pCall->getVarsDefinedByFctReturn();
  if (const KvCCfgProcedure* pCallee = findProcedure(pCall->getName()))
    ssaopt::insertAll(defined, pCallee->getDefinedVariables());
  return defined;
}

// Constant propagation rebuilds the SSA edges when it runs again; until then the graph holds control
// flow only, which is what the walks above follow.
void KvCControlFlowGraph::deleteSSAEdges() {
  for (edge e : edges())
    if (inf(e)->isSSAEdge()) del_edge(e);
}
