// A program built the way a client builds one, through the public operations only, and checked
// against every graph invariant.
#include <gtest/gtest.h>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"

using namespace cfgtest;

using Building = CfgTest;

TEST_F(Building, AProgramOfSeveralProceduresKeepsEveryInvariant) {
  irtest::InternalInfoOn info;
  ssaopt::ReportLog log;
  irtest::TestVariable gain;
  irtest::TestExpression fromMain, fromTail;
  KvCCfgProcedure* pMain = nullptr;
  G.setStartNode(G.demandProcedureEntryNode(KvCControlFlowGraph::kMainProcedureName, pMain));
  KvCCfgProcedure* pScale = procedure("scale");

  // "#main" arrives as one straight block ending in a condition. A label before its third
  // statement starts a new block; the condition is evaluated in a block of its own, found again
  // where the branches are attached.
  node head = startWith(pMain, block(pMain, 4, true));
  KvCCfgExpression* pCond = condition(head);
  G.splitAtStatement(head, statement(head, 2));
  node decision = G.splitAtCondition(G.findBranchNode(head, pCond));
  ASSERT_EQ(G.findBranchNode(head, pCond), decision);
  node calling = block(pMain, 1), other = block(pMain, 1), join = block(pMain, 2), tail = block(pMain, 1);
  onTrue(decision, calling);
  onFalse(decision, other);
  plain(calling, join);
  plain(other, join);
  plain(join, tail);
  KvCCfgProcedureCall *pFirst = new KvCCfgProcedureCall("scale"), *pSecond = new KvCCfgProcedureCall("scale");
  blockOf(calling).append(pFirst);
  blockOf(tail).append(pSecond);

  // "scale": a loop whose body becomes a procedure of its own.
  node loop = startWith(pScale, block(pScale, 0, true)), body = block(pScale, 1), done = block(pScale, 1);
  onTrue(loop, body);
  plain(body, loop);
  onFalse(loop, done);

  delete G.makeProcedureAndCall(join);
  delete G.makeProcedureAndCall(body);
  for (auto [pCall, pArgument] : {std::pair{pFirst, &fromMain}, std::pair{pSecond, &fromTail}}) {
    ssaopt::list<KvCCfgVariable*> formals{&gain};
    ssaopt::list<KvCCfgExpression*> arguments{pArgument};
    G.setParametersOfCall(pCall, formals, arguments);
  }
  G.placeExitNodes();
  G.placeLoopAroundMain();

  EXPECT_EQ(G.getProcedures().size(), 5u);
  EXPECT_EQ(G.findBranchNode(head, pCond), decision);
  EXPECT_EQ(pScale->getParamStatements().size(), 1u);
  for (const auto& named : G.getProcedures()) EXPECT_NE(named.second->getExitNode(), ssaopt::nil);
  expectInvariants(G);
  EXPECT_TRUE(G.checkConsistency());
  EXPECT_TRUE(log.empty());
}
