// Valid-condition assignments: each branch learns what its condition implies about the variable
// that the condition tests, as a virtual assignment that generates no code but gives constant
// propagation the value.
//
//   before:  B [if (b)] -T-> C,  B -F-> D
//   insertValidConditionAssignments():
//            B [if (b)] -T-> [b := 1 (virtual)] -> C,  B -F-> [b := 0 (virtual)] -> D
//
// Needs: the graph before SSA form; renaming turns the virtual assignments into virtual aliases.
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/frame/types.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "ssaopt/values/arithmetic.h"

using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineNeitherTrueNorFalseBranch = 3559;
// A block with a condition lacks its true or its false out-edge.
constexpr int kLineMissingBranchEdge = 3571;

bool isLogical(const KvCCfgVariable& x) {
  const KV_DataType* pType = x.getDataType();
  return pType && pType->isLogicalType();
}

bool isFloatingPoint(const KvCCfgVariable& x) {
  const KV_DataType* pType = x.getDataType();
  const KV_BaseType* pBase = pType ? pType->getBaseType() : nullptr;
  return pBase && (pBase->isFloat32() || pBase->isFloat64());
}

bool isInBooleanRange(const KvCCfgValue& c) { return c.getValue() == 0.0 || c.getValue() == 1.0; }

KvCCfgAssignment* newVirtualAssignment(KvCCfgVariable* x, const KvCCfgValue& value) {
  KvCCfgInitAssignment* pAssignment = new KvCCfgInitAssignment();
  pAssignment->setLHS(x);
  pAssignment->setRHS(new KvCCfgValueExpression(value));
  pAssignment->setIsVirtual(true);
  return pAssignment;
}

// The assignment was made for a branch edge that is not there; nothing else refers to it.
void discard(KvCCfgAssignment* pAssignment) {
  delete pAssignment->getRHS();
  delete pAssignment;
}

// A branch on `x` or on `!x`.
void assignTestedVariable(KvCCfgVariable* x, bool negated, KvCCfgAssignment*& trueAssign,
                          KvCCfgAssignment*& falseAssign) {
  if (!isLogical(*x)) return;
  trueAssign = newVirtualAssignment(x, KvCCfgValue(negated ? 0.0 : 1.0));
  falseAssign = newVirtualAssignment(x, KvCCfgValue(negated ? 1.0 : 0.0));
}

// A logical variable compared with a constant in the Boolean range is that constant on one branch
// and its negation on the other; compared with any other constant, the outcome is fixed, and the
// condition becomes that outcome unless evaluating it has side effects (a volatile input read there
// must stay, or every later read would see another value). Any other
// variable is known only where it equals the constant. A floating-point variable that compares
// equal to 0 may hold -0.0, which behaves differently (1.0 / x), so it is not said to hold +0.0.
void assignComparedVariable(KvCCfgExpression& cond, KvCCfgVariable* x, const KvCCfgValue& c, bool inequality,
                            KvCCfgAssignment*& trueAssign, KvCCfgAssignment*& falseAssign) {
  if (isLogical(*x)) {
    if (!isInBooleanRange(c)) {
      cond.actOnComparisonOutsideBoolRange();
      if (!cond.hasSideEffects()) cond.replaceConditionWithConstant(inequality ? 1.0 : 0.0);
      return;
    }
    const KvCCfgValue negation = !c;
    trueAssign = newVirtualAssignment(x, inequality ? negation : c);
    falseAssign = newVirtualAssignment(x, inequality ? c : negation);
    return;
  }
  if (isFloatingPoint(*x) && c.getValue() == 0.0) return;
  (inequality ? falseAssign : trueAssign) = newVirtualAssignment(x, c);
}

}  // namespace

// New blocks are placed behind the nodes of the snapshot, so a second run meets only the branches it
// met before and adds a second layer of assignments.
void KvCControlFlowGraph::insertValidConditionAssignments() {
  if (!beginStep(ssaopt::GraphOperation::InsertValidConditionAssignments)) return;
  for (node v : all_nodes()) {
    KvCBasicBlock* pBlock = getBasicBlock(v);
    KvCCfgExpression* pCond = pBlock ? pBlock->getBranchCond() : nullptr;
    if (!pCond) continue;
    KvCCfgAssignment* trueAssign = nullptr;
    KvCCfgAssignment* falseAssign = nullptr;
    createValidConditionAssignments(pCond, trueAssign, falseAssign);
    if (!trueAssign && !falseAssign) continue;
    edge onTrue = nil;
    edge onFalse = nil;
    for (edge e : out(v)) {
      KvCCfgEdgeInfo* pEdgeInfo = inf(e);
      if (pEdgeInfo->isTrueBranch()) {
        onTrue = e;
        continue;
      }
      if (!pEdgeInfo->isFalseBranch()) reportInternalFault(kLineNeitherTrueNorFalseBranch);
      onFalse = e;
    }
    placeOnBranch(onTrue, trueAssign);
    placeOnBranch(onFalse, falseAssign);
  }
  endStep(ssaopt::GraphOperation::InsertValidConditionAssignments);
}

// The variable is asked for first; only a condition that is no variable is asked for a comparison.
void KvCControlFlowGraph::createValidConditionAssignments(KvCCfgExpression*& pCond,
                                                          KvCCfgAssignment*& trueAssign,
                                                          KvCCfgAssignment*& falseAssign) {
  trueAssign = nullptr;
  falseAssign = nullptr;
  bool negated = false;
  if (KvCCfgVariable* x = pCond->isVariable(negated)) {
    assignTestedVariable(x, negated, trueAssign, falseAssign);
    return;
  }
  KvCCfgVariable* x = nullptr;
  KvCCfgValue c;
  bool inequality = false;
  if (pCond->isVariableEqualToConstant(x, c, inequality) && x)
    assignComparedVariable(*pCond, x, c, inequality, trueAssign, falseAssign);
}

// v -e-> t becomes v -e-> w [assignment] -> t; `e` keeps its payload, and t's in-edge from v is
// replaced by one from w.
void KvCControlFlowGraph::placeOnBranch(edge e, KvCCfgAssignment* pAssign) {
  if (!pAssign) return;
  if (!e) {
    reportInternalFault(kLineMissingBranchEdge);
    discard(pAssign);
    return;
  }
  node v = source(e);
  node w = newBlockNode(inf(v)->getProcedure());
  getBasicBlock(w)->append(pAssign);
  newPlainEdge(w, target(e));
  move_edge(e, v, w);
}
