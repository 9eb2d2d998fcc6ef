// Phi placement, renaming and the SSA driver where the textual format cannot go: returns without a
// version, uses that no definition reaches, a procedure that never ends, and a procedure of a million
// blocks. Whole programs are tested as program texts with the client
// (ssa_construction_test.cpp).
#include <gtest/gtest.h>

#include "cfg/ssa_testing.h"
#include "ssaopt/frame/report.h"

using namespace ssatest;

namespace {

// Internal information is on throughout: a correct program must leave every check quiet.
class SSA : public SSATest {
protected:
  void transform() {
    G.placeExitNodes();
    G.transformToSSAForm();
  }
  static KvCCfgStatement* assignVirtually(Var& lhs) {
    KvCCfgStatement* pStatement = assign(lhs, {});
    pStatement->setIsVirtual(true);
    return pStatement;
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  KvCCfgProcedure* pMain = mainProcedure();
};

// A graph without interface statements, so that no use below finds a definition. Each is reported
// and keeps naming its variable; the virtual version stands for itself.
TEST_F(SSA, AUseThatNoDefinitionReachesKeepsItsVariable) {
  node top = startWith(pMain, code(pMain, {assign(y, {&u})}, reads({&c})));
  node left = code(pMain, {assign(x, {}), assignVirtually(z)}), right = code(pMain, {});
  node join = code(pMain, {new KvCCfgOutputStatement(&w)});
  onTrue(top, left);
  onFalse(top, right);
  plain(left, join);
  plain(right, join);
  G.computeAllIdoms();
  Access::Trees trees;
  int count = Access::buildDominatorTrees(G, trees);
  G.computeDominanceFrontiers(trees);
  G.placePhiFunction();
  Access::renameVariables(G, trees);
  Access::freeDominatorTrees(G, trees, count);

  EXPECT_EQ(assignment(top, 0)->getRHS()->getUsedVariables(), Variables{&u});
  EXPECT_EQ(condition(top)->getUsedVariables(), Variables{&c});
  EXPECT_EQ(statement(join, 0)->getUsedVariables(), Variables{&w});
  KvCCfgVariable* pVirtual = assignment(left, 1)->getLHS();
  EXPECT_EQ(pVirtual->getNonVirtualAlias(), pVirtual);
  for (KvCPhiFunction* pPhi : blockOf(join).getPhiFunctions()) {
    KvCCfgVariable* pVariable = original(pPhi->getVariable());
    EXPECT_EQ(pPhi->getReplacementVariables()[1], pVariable) << "the operand from the right";
  }
  for (int line : {1904, 1914, 1985, 2028, 2062})
    EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", line)) << line;
}

// Long procedures become straight lines of blocks; every walk of the construction must cope
// without recursing once per block.
TEST_F(SSA, AStraightLineOfAMillionBlocksGoesThroughOnTheDefaultStack) {
  constexpr int kBlocks = 1'000'000, kAssignmentEvery = 1000;
  node last = startWith(pMain, code(pMain, {}));
  Nodes assigning;
  for (int i = 1; i <= kBlocks; ++i) {
    node v = i % kAssignmentEvery ? code(pMain, {}) : code(pMain, {assign(x, {&x})});
    if (i % kAssignmentEvery == 0) assigning.push_back(v);
    plain(last, v);
    last = v;
  }
  node before = G.source(G.first_in_edge(last));
  transform();

  EXPECT_EQ(G.inf(last)->getIdom(), before);
  KvCCfgAssignment *pLast = assignment(assigning.back(), 0), *pBefore = assignment(assigning.end()[-2], 0);
  EXPECT_EQ(original(pLast->getLHS()), &x);
  EXPECT_EQ(pLast->getRHS()->getUsedVariables(), Variables{pBefore->getLHS()});
  EXPECT_TRUE(m_Log.empty());
}

}  // namespace
