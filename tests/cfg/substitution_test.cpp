// Which expressions the substitution and folding walks ask, and which definitions removeUnusedVarDefs
// deletes, in how many passes, and which it keeps.
#include <gtest/gtest.h>

#include "cfg/propagation_testing.h"
#include "ssaopt/frame/report.h"

using namespace sccptest;

namespace {

// ---- Substitution and folding --------------------------------------------------------------------

class Substitution : public PropagationTest {
protected:
  // One undivided block: an assignment, an initialisation, a phi function, a parameter statement, a
  // value-return statement and a condition, each with an expression of its own.
  Substitution() {
    KvCBasicBlock& block = blockOf(startWith(pMain, empty()));
    block.append(phiFunction(version(x), {version(x)}));
    block.append(pAssignment);
    auto* pInit = new KvCCfgInitAssignment();
    pInit->setLHS(version(b));
    pInit->setRHS(pInitValue);
    block.append(pInit);
    auto* pParam = new KvCCfgParamStatement(version(c));
    pParam->setArgument(nullptr, pArgument);
    block.append(pParam);
    auto* pReturn = new KvCCfgValueReturnStatement(version(z));
    pReturn->setExpression(pReturned);
    block.append(pReturn);
    block.appendBranch(pCond);
  }

  Sum *pRHS = sum(1), *pInitValue = sum(2), *pArgument = sum(3), *pReturned = sum(4), *pCond = sum(5);
  FoldableAssign* pAssignment = new FoldableAssign(version(a), pRHS);
};

TEST_F(Substitution, ConstantsGoIntoRightHandSidesAndConditionsOnly) {
  G.replaceConstantVariables();

  EXPECT_EQ(pRHS->replaced(), 1);
  EXPECT_EQ(pCond->replaced(), 1);
  EXPECT_EQ(pInitValue->replaced(), 1) << "an initialisation is an assignment";
  EXPECT_EQ(pArgument->replaced() + pReturned->replaced(), 0);
}

TEST_F(Substitution, ConditionReplacementAsksTheConditionsAlone) {
  G.replaceConstantConditions();

  EXPECT_EQ(pCond->conditionReplaced(), 1);
  EXPECT_EQ(pRHS->conditionReplaced() + pInitValue->conditionReplaced(), 0);
}

TEST_F(Substitution, FoldingAsksAssignmentsAndConditionsAndLeavesInitialisationsAlone) {
  G.foldConstants();

  EXPECT_EQ(pAssignment->folded(), 1);
  EXPECT_EQ(pCond->folded(), 1);
  EXPECT_EQ(pRHS->folded() + pInitValue->folded() + pArgument->folded() + pReturned->folded(), 0)
      << "an assignment folds its own right-hand side, an initialisation nothing";
}

// ---- Unused definitions --------------------------------------------------------------------------

// Defines a variable that is never erasable, and counts how often it is asked what it defines: once
// per pass of removeUnusedVarDefs once the block has its assigned variables at hand.
class Counted : public irtest::TestStatement {
public:
  Counted(KvCCfgVariable* pDefined, int& visits) : TestStatement({pDefined}), m_Visits(visits) {}
  irtest::Variables getDefinedVariables() const override {
    ++m_Visits;
    return TestStatement::getDefinedVariables();
  }

private:
  int& m_Visits;
};

class UnusedDefinitions : public PropagationTest {
protected:
  UnusedDefinitions() {
    for (Var* pVariable : {&a, &b, &c, &x}) pVariable->markAsErasable();
  }
  bool holdsNothing(node v) { return !blockOf(v).isStatement() && !blockOf(v).isPhiFunction(); }
  node counter() {
    node v = holding(new Counted(&kept, passes));
    G.inf(v)->getAssignedVariables();
    passes = 0;
    return v;
  }

  Var kept{"kept"};
  int passes = 0;
  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
};

// a1 = 1; b1 = a1; c1 = b1, nothing reading c1. The definitions go from the last to the first; one
// that loses its last use falls in the same pass when its node comes later in node order.
TEST_F(UnusedDefinitions, AChainFallsInOnePassWhenItsNodesComeInReverseOrder) {
  KvCSSAVariable *a1 = version(a), *b1 = version(b), *c1 = version(c);
  node third = assign(c1, sum(0, {b1})), second = assign(b1, sum(0, {a1})), first = assign(a1, sum(1));
  run(pMain, {counter(), first, second, third});
  G.removeUnusedVarDefs();

  EXPECT_TRUE(holdsNothing(first) && holdsNothing(second) && holdsNothing(third));
  EXPECT_EQ(passes, 2);
  EXPECT_TRUE(m_Log.empty());
}

TEST_F(UnusedDefinitions, AChainFallsOnePassPerDefinitionWhenItsNodesComeInProgramOrder) {
  KvCSSAVariable *a1 = version(a), *b1 = version(b), *c1 = version(c);
  node first = assign(a1, sum(1)), second = assign(b1, sum(0, {a1})), third = assign(c1, sum(0, {b1}));
  run(pMain, {counter(), first, second, third});
  G.removeUnusedVarDefs();

  EXPECT_TRUE(holdsNothing(first) && holdsNothing(second) && holdsNothing(third));
  EXPECT_EQ(passes, 3) << "removing the first definition empties no use set, so no pass follows";
  EXPECT_TRUE(alive(first)) << "the block stays, emptied";
}

TEST_F(UnusedDefinitions, AnUnusedPhiFunctionGoesLikeAStatement) {
  KvCSSAVariable *x1 = version(x), *x2 = version(x);
  node define = assign(x1, sum(1)), merge = phi(x2, {x1});
  run(pMain, {define, merge});
  G.removeUnusedVarDefs();

  EXPECT_TRUE(holdsNothing(merge));
  EXPECT_TRUE(holdsNothing(define));
}

TEST_F(UnusedDefinitions, ADefinitionReadOnlyThroughAVirtualAliasStays) {
  KvCSSAVariable *x1 = version(x), *x2 = version(x);
  x1->appendVirtualAlias(x2);
  node aliased = assign(x1, sum(3));
  run(pMain, {aliased, holding(new irtest::TestStatement({}, {x2}))});
  G.removeUnusedVarDefs();

  EXPECT_TRUE(blockOf(aliased).isStatement());
}

TEST_F(UnusedDefinitions, ANodeWithoutPayloadIsReportedAndPassedOver) {
  KvCSSAVariable* a1 = version(a);
  node unused = assign(a1, sum(1));
  run(pMain, {unused});
  G.new_node();
  G.removeUnusedVarDefs();

  EXPECT_TRUE(holdsNothing(unused));
  EXPECT_TRUE(m_Log.hasConsistencyFailure("0"));
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 3306));
}

TEST_F(UnusedDefinitions, AStatementDefiningSeveralVariablesIsReportedAndStays) {
  node both = holding(new irtest::TestStatement({version(a), version(b)}));
  run(pMain, {both});
  G.removeUnusedVarDefs();

  EXPECT_TRUE(blockOf(both).isStatement());
  ASSERT_EQ(m_Log.consistencyFailures().size(), 1u);
  EXPECT_EQ(m_Log.consistencyFailures()[0].condition, "DefinedVariables.size() <= 1");
  EXPECT_EQ(m_Log.consistencyFailures()[0].line, 3323);
  EXPECT_EQ(m_Log.consistencyFailures()[0].file, "KvCControlFlowGraph");
}

}  // namespace
