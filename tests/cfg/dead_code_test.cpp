// Dead-code elimination between the passes of constant propagation, on small graphs: operand
// positions counted among the edges that are left and among control-flow edges only, use sets that
// forget what went, and what is never removed. The chains of phi functions and the regressions are
// programs (tests/client/propagation_programs_test.cpp).
#include <gtest/gtest.h>

#include <vector>

#include "cfg/propagation_testing.h"
#include "ssaopt/frame/report.h"

using namespace sccptest;

namespace {

using Operands = std::vector<KvCCfgVariable*>;

class DeadCode : public PropagationTest {
protected:
  // A branch on the constant 1: `never` is reached only through its false edge, which no pass takes.
  node decided(node taken, node never) {
    Sum* pCond = sum(1);
    if (!pFirstDecider) pFirstDecider = pCond;
    node v = branch(pCond);
    onTrue(v, taken);
    onFalse(v, never);
    return v;
  }
  // The passes of the propagation, as visits of the first decided branch.
  int passes() { return static_cast<int>(pFirstDecider->evaluated().size()); }
  static Operands operandsOf(KvCPhiFunction* pPhi) { return irtest::items(pPhi->getReplacementVariables()); }

  Sum* pFirstDecider = nullptr;
  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
};

// ---- Operands of reached phi functions -----------------------------------------------------------

// Each dead predecessor's position is counted among the in-edges that are left. The variables of
// the removed operands no longer name the phi node as a use.
TEST_F(DeadCode, TwoDeadPredecessorsOfOnePhiNodeEachLoseTheirOwnOperand) {
  node top = branch(new irtest::TestExpression({}, nonConstant));
  startWith(pMain, top);
  node live = empty(), dead1 = empty(), dead2 = empty(), on = empty();
  onTrue(top, live);
  onFalse(top, decided(on, dead1));
  plain(on, decided(empty(), dead2));
  node join = empty();
  for (node v : {dead1, live, dead2}) plain(v, join);
  KvCSSAVariable *x1 = version(x), *x2 = version(x), *x3 = version(x);
  KvCPhiFunction* pPhi = phiFunction(version(x), {x1, x2, x3});
  blockOf(join).append(pPhi);
  G.propagateSparseConditionalConstant(true);

  EXPECT_FALSE(alive(dead1));
  EXPECT_FALSE(alive(dead2));
  EXPECT_EQ(operandsOf(pPhi), (Operands{x2}));
  EXPECT_EQ(x1->countUses() + x3->countUses(), 0);
  EXPECT_EQ(passes(), 2) << "a removed operand asks for another pass";
  EXPECT_TRUE(m_Log.empty());
}

// ---- What goes and what stays --------------------------------------------------------------------

TEST_F(DeadCode, ADeadBlockBeforeNoPhiFunctionGoesWithItsStatementAndItsUsesButAsksForNoPass) {
  KvCSSAVariable* a1 = version(a);
  irtest::Fate fate;
  node define = assign(a1, new irtest::TestExpression({}, nonConstant));
  node dead = holding(new irtest::TestStatement({}, {a1}, &fate));
  node after = empty();
  run(pMain, {define, decided(after, dead)});
  path({dead, after});
  G.propagateSparseConditionalConstant(true);

  EXPECT_FALSE(alive(dead));
  EXPECT_EQ(fate.destroyed, 1);
  EXPECT_EQ(a1->countUses(), 0) << "no use set keeps a deleted node";
  EXPECT_EQ(passes(), 1);
  EXPECT_TRUE(m_Log.empty());
}

// SSA edges into a phi node stand among its in-edges, after the control-flow edges that existed when
// they were added; only control-flow edges have operands.
TEST_F(DeadCode, SSAInEdgesDoNotCountForTheOperandPosition) {
  KvCSSAVariable *x1 = version(x), *x2 = version(x);
  node define = assign(x1, sum(1)), dead = empty(), join = phi(version(x), {x1, x2});
  startWith(pMain, decided(define, dead));
  path({define, join});
  G.addSSAEdges();
  plain(dead, join);
  G.sparseConditionalConstant(true);

  EXPECT_FALSE(alive(dead));
  EXPECT_EQ(operandsOf(blockOf(join).isPhiFunction()), (Operands{x1}));
  EXPECT_TRUE(m_Log.empty());
}

TEST_F(DeadCode, EntryAndExitNodesStayReachedOrNot) {
  KvCCfgProcedure* pIdle = procedure("idle");
  node exit = G.new_node(new KvCCfgExit());
  G.inf(exit)->setProcedure(pMain);
  pMain->setExitNode(exit);
  node loop = empty();
  run(pMain, {decided(loop, exit)});
  plain(loop, loop);
  G.propagateSparseConditionalConstant(true);

  EXPECT_TRUE(alive(exit));
  EXPECT_TRUE(alive(pIdle->getEntryNode()));
  EXPECT_TRUE(alive(loop));
}

}  // namespace
