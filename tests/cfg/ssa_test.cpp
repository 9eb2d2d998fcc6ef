// Phi placement, renaming and the SSA driver where the textual format cannot go: calls inside a
// block, virtual assignments, uses that no definition reaches, a procedure that never ends, and a
// procedure of a million blocks. Whole programs are tested as program texts with the client
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
  // The variables of the phi functions of `v`, as their originals.
  std::vector<KvCCfgVariable*> phiVariables(node v) {
    std::vector<KvCCfgVariable*> variables;
    for (KvCPhiFunction* pPhi : blockOf(v).getPhiFunctions())
      variables.push_back(original(pPhi->getVariable()));
    return variables;
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  KvCCfgProcedure* pMain = mainProcedure();
};

TEST_F(SSA, AUseRightAfterACallInTheSameBlockReadsTheReturnedVersion) {
  KvCCfgProcedure* pP = procedure("P");
  node caller = startWith(pMain, code(pMain, {call(pP), assign(y, {&x})}));
  startWith(pP, code(pP, {assign(x, {})}));
  transform();

  KvCCfgValueReturnStatement* pReturn = statement(caller, 1)->isValueReturnStatement();
  ASSERT_NE(pReturn, nullptr);
  KvCCfgAssignment* pUse = assignment(successors(caller).at(0), 0);
  EXPECT_EQ(pUse->getRHS()->getUsedVariables(), Variables{pReturn->getVariable()});
  EXPECT_TRUE(m_Log.empty());
}

// The exit of P has two predecessors and needs no phi function: the value-return expression takes
// its version from the first and is left alone by the second. A value-return statement of a
// variable that P never defines has no version at the exit.
TEST_F(SSA, AnExitReachedTwiceIsQuietAndAReturnWithoutVersionIsReported) {
  KvCCfgProcedure* pP = procedure("P");
  node caller = startWith(pMain, code(pMain, {call(pP)}));
  node top = startWith(pP, code(pP, {assign(x, {})}, reads({&c})));
  onTrue(top, code(pP, {}));
  onFalse(top, code(pP, {}));
  KvCCfgValueReturnStatement stray(&z);
  stray.setExpression(reads({&z}));
  pP->appendValueReturnStatement(&stray);
  transform();

  KvCCfgValueReturnStatement* pReturn = statement(caller, 1)->isValueReturnStatement();
  EXPECT_EQ(pReturn->getUsedVariables(), Variables{assignment(top, 0)->getLHS()});
  EXPECT_EQ(stray.getUsedVariables(), Variables{&z});
  EXPECT_EQ(m_Log.consistencyFailures().size(), 2u) << "once from each predecessor of the exit";
  for (const auto& failure : m_Log.consistencyFailures()) EXPECT_EQ(failure.line, 2087);
  EXPECT_TRUE(m_Log.messages().empty());
}

TEST_F(SSA, AVirtualAssignmentNamesTheLastNonVirtualVersion) {
  node v = startWith(pMain, code(pMain, {assign(x, {&y}), assignVirtually(x), assignVirtually(x)}));
  transform();

  KvCCfgVariable *pReal = assignment(v, 0)->getLHS(), *pFirst = assignment(v, 1)->getLHS(),
                 *pSecond = assignment(v, 2)->getLHS();
  EXPECT_EQ(pReal->getNonVirtualAlias(), pReal);
  EXPECT_EQ(pFirst->getNonVirtualAlias(), pReal);
  EXPECT_EQ(pSecond->getNonVirtualAlias(), pReal);
  pFirst->appendUse(v);
  pSecond->appendUse(v);
  EXPECT_EQ(pReal->countAllUses(), 2) << "both virtual versions are aliases of the first";
  EXPECT_TRUE(m_Log.empty());
}

TEST_F(SSA, AnAssignedVariableListAskedForEarlyHidesNoDefinition) {
  KvCCfgProcedure* pP = procedure("P");
  node top = startWith(pMain, code(pMain, {}, reads({&c})));
  node calling = code(pMain, {assign(a, {}), call(pP)}), other = code(pMain, {}), join = code(pMain, {});
  onTrue(top, calling);
  onFalse(top, other);
  plain(calling, join);
  plain(other, join);
  startWith(pP, code(pP, {assign(x, {})}));
  ASSERT_EQ(G.inf(calling)->getAssignedVariables().size(), 1u);
  transform();

  EXPECT_EQ(phiVariables(join), (std::vector<KvCCfgVariable*>{&a, &x}));
  EXPECT_TRUE(m_Log.empty());
}

// The client's front end refuses such a procedure; the library must still not fail on it.
TEST_F(SSA, AProcedureThatNeverEndsLeavesItsExitAloneWithoutHarm) {
  node spin = startWith(pMain, code(pMain, {assign(x, {&x})}));
  plain(spin, spin);
  transform();

  EXPECT_EQ(phiVariables(spin), std::vector<KvCCfgVariable*>{&x});
  EXPECT_EQ(m_Log.consistencyFailures().size(), 4u) << "the lone exit is a component of no procedure";
  for (const auto& failure : m_Log.consistencyFailures()) EXPECT_EQ(failure.condition, "checkConsistency()");
  EXPECT_TRUE(m_Log.messages().empty());
}

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
