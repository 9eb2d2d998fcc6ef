// Block surgery where programs cannot go: splits and the search for a branch node that fail, and the
// consistency check.
#include <gtest/gtest.h>

#include <type_traits>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"

using namespace cfgtest;

static_assert(!std::is_copy_constructible_v<KvCControlFlowGraph> &&
                  !std::is_copy_assignable_v<KvCControlFlowGraph>,
              "a copy would name the nodes of its source");

using Splits = CfgTest;

TEST_F(Splits, ReportNodesWithoutBlockAndChangeNothing) {
  KvCCfgProcedure* pMain = procedure("#main");
  node entry = pMain->getEntryNode(), empty = G.new_node(), v = block(pMain, 2);
  plain(entry, v);
  plain(v, empty);
  irtest::TestStatement stranger;
  irtest::InternalInfoOn info;
  ssaopt::ReportLog log;

  EXPECT_EQ(G.splitAtStatement(empty, &stranger), empty);
  EXPECT_EQ(G.splitAtStatement(entry, &stranger), entry);
  EXPECT_EQ(G.splitAtStatement(v, &stranger), v);
  EXPECT_EQ(G.splitAtCondition(empty), empty);
  EXPECT_EQ(G.splitAtCondition(entry), entry);

  for (int line : {114, 116, 155, 157})
    EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", line)) << line;
  EXPECT_TRUE(log.hasInternalError("KvCBasicBlock", 338));
  EXPECT_EQ(G.number_of_nodes(), 3);
  EXPECT_EQ(G.number_of_edges(), 2);
  EXPECT_TRUE(G.checkConsistency());
}

using BranchSearch = CfgTest;

TEST_F(BranchSearch, WalksStraightLinesAndIntoSplitOffProcedures) {
  KvCCfgProcedure* pMain = procedure("#main");
  node a = startWith(pMain, block(pMain, 1)), b = block(pMain, 1), c = block(pMain, 1),
       d = block(pMain, 1, true);
  plain(a, b);
  plain(b, c);
  plain(c, d);
  delete G.makeProcedureAndCall(c);  // b now ends in the call of c's procedure

  EXPECT_EQ(G.findBranchNode(a, condition(d)), d);
  EXPECT_EQ(G.findBranchNode(d, condition(d)), d);
}

TEST_F(BranchSearch, StopsWithAReportWhereTheWalkCannotGoOn) {
  KvCCfgProcedure* pMain = procedure("#main");
  node branch = block(pMain, 1, true), loopA = block(pMain, 1), loopB = block(pMain, 1),
       emptyEnd = block(pMain), fork = block(pMain, 1), unknownCall = block(pMain, 1),
       callsHollow = block(pMain, 1);
  plain(loopA, loopB);
  plain(loopB, loopA);
  plain(fork, emptyEnd);
  plain(fork, emptyEnd);
  blockOf(unknownCall).append(new KvCCfgProcedureCall("nowhere"));
  procedure("hollow");  // an entry without first block
  blockOf(callsHollow).append(new KvCCfgProcedureCall("hollow"));
  irtest::TestExpression other;
  irtest::InternalInfoOn info;
  ssaopt::ReportLog log;

  EXPECT_EQ(G.findBranchNode(branch, &other), branch);
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 223));
  EXPECT_EQ(G.findBranchNode(loopA, &other), loopA);
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 244));
  EXPECT_EQ(G.findBranchNode(emptyEnd, &other), emptyEnd);
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 237));
  EXPECT_EQ(G.findBranchNode(fork, &other), fork);
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 228));
  log.clear();
  EXPECT_EQ(G.findBranchNode(unknownCall, &other), unknownCall);
  EXPECT_EQ(G.findBranchNode(callsHollow, &other), callsHollow);
  EXPECT_EQ(log.messages().size(), 2u);
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 240));
  EXPECT_EQ(G.findBranchNode(pMain->getEntryNode(), &other), pMain->getEntryNode());
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 210));
}

using Consistency = CfgTest;

TEST_F(Consistency, AComponentCountOtherThanTheProcedureCountIsFalseWithoutReports) {
  KvCCfgProcedure *pMain = procedure("#main"), *pStep = procedure("step");
  startWith(pMain, block(pMain));
  node first = startWith(pStep, block(pStep));
  irtest::InternalInfoOn info;
  ssaopt::ReportLog log;
  EXPECT_TRUE(G.checkConsistency());

  node stray = block(pStep);
  EXPECT_FALSE(G.checkConsistency());
  plain(first, stray);
  EXPECT_TRUE(G.checkConsistency());
  EXPECT_TRUE(log.empty());

  // An SSA edge from one procedure into another (a definition read by a parameter statement) is
  // not control flow and joins no components.
  G.new_edge(pMain->getEntryNode(), first, new KvCSSAEdge());
  EXPECT_TRUE(G.checkConsistency());
  EXPECT_TRUE(log.empty());
}

TEST_F(Consistency, ReportsEachNodeThatBreaksItsProcedureWhileInternalInfoIsShown) {
  KvCCfgProcedure *pMain = procedure("#main"), *pStep = procedure("step");
  node first = startWith(pMain, block(pMain)), foreign = block(pStep), secondRoot = block(pMain);
  plain(first, foreign);
  plain(secondRoot, first);
  plain(first, pMain->getEntryNode());
  startWith(pStep, block(pStep));
  ssaopt::ReportLog log;

  EXPECT_TRUE(G.checkConsistency());
  EXPECT_TRUE(log.empty());

  irtest::InternalInfoOn info;
  EXPECT_TRUE(G.checkConsistency());
  EXPECT_TRUE(log.hasConsistencyFailure("indeg(EntryNode) == 0"));
  EXPECT_TRUE(log.hasConsistencyFailure("pInf->getProcedure() == pProcedure"));
  EXPECT_TRUE(log.hasConsistencyFailure("v == EntryNode"));
  EXPECT_EQ(log.count(), 3u);
  EXPECT_EQ(log.consistencyFailures().at(1).line, 3767);
}
