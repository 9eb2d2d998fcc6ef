// Which definitions removeUnusedVarDefs keeps and reports. Chains of unused definitions are programs
// (tests/client).
#include <gtest/gtest.h>

#include "cfg/propagation_testing.h"
#include "ssaopt/frame/report.h"

using namespace sccptest;

namespace {

class UnusedDefinitions : public PropagationTest {
protected:
  UnusedDefinitions() {
    for (Var* pVariable : {&a, &b, &c, &x}) pVariable->markAsErasable();
  }
  bool holdsNothing(node v) { return !blockOf(v).isStatement() && !blockOf(v).isPhiFunction(); }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
};

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
