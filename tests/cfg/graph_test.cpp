// The graph object and block surgery: the procedure table, payload ownership, visited marks, splits,
// division into one-item blocks, the search for a branch node, and the consistency check.
#include <gtest/gtest.h>

#include <type_traits>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"

using namespace cfgtest;
using ssaopt::nil;

namespace {

// Payloads that count their destruction, to show that the graph deletes none.
struct CountedBlock : KvCBasicBlock {
  explicit CountedBlock(int& count) : m_Count(count) {}
  ~CountedBlock() override { ++m_Count; }
  int& m_Count;
};
struct CountedEdge : KvCCfgEdgeInfo {
  explicit CountedEdge(int& count) : m_Count(count) {}
  ~CountedEdge() override { ++m_Count; }
  int& m_Count;
};

}  // namespace

static_assert(!std::is_copy_constructible_v<KvCControlFlowGraph> &&
                  !std::is_copy_assignable_v<KvCControlFlowGraph>,
              "a copy would name the nodes of its source");

using GraphObject = CfgTest;

TEST_F(GraphObject, StartsEmptyAndKeepsProceduresInNameOrder) {
  EXPECT_EQ(G.getStartNode(), nil);
  EXPECT_TRUE(G.checkConsistency());
  KvCCfgProcedure* pStep = procedure("step");
  KvCCfgProcedure* pMain = procedure("#main");
  G.setStartNode(pMain->getEntryNode());

  EXPECT_EQ(G.getStartNode(), pMain->getEntryNode());
  EXPECT_EQ(G.findProcedure("step"), pStep);
  EXPECT_EQ(G.findProcedure("other"), nullptr);
  std::vector<std::string> names;
  for (const auto& named : G.getProcedures()) names.push_back(named.first.cstring());
  EXPECT_EQ(names, (std::vector<std::string>{"#main", "step"}));
}

TEST_F(GraphObject, DeletingNodesEdgesOrTheGraphDeletesNoPayload) {
  int blocksGone = 0, edgesGone = 0;
  CountedBlock* pKept = nullptr;
  {
    KvCControlFlowGraph local;
    node a = local.new_node(new CountedBlock(blocksGone));
    node b = local.new_node(pKept = new CountedBlock(blocksGone));
    local.new_edge(a, b, new CountedEdge(edgesGone));
    local.new_edge(b, a, new CountedEdge(edgesGone));
    local.del_edge(local.first_adj_edge(a));
    local.del_node(a);
  }
  EXPECT_EQ(blocksGone, 0);
  EXPECT_EQ(edgesGone, 0);
  delete pKept;
  EXPECT_EQ(blocksGone, 1);
}

TEST_F(GraphObject, VisitedMarksReadFalseUntilSetAndAfterClearing) {
  using Access = KvCControlFlowGraphTestAccess;
  node a = block(nullptr), b = block(nullptr);
  EXPECT_FALSE(Access::isVisited(G, a));
  Access::setVisited(G, b);
  EXPECT_TRUE(Access::isVisited(G, b));
  EXPECT_FALSE(Access::isVisited(G, a));
  Access::clearAllVisited(G);
  node c = block(nullptr);
  for (node v : {a, b, c}) EXPECT_FALSE(Access::isVisited(G, v));
}

using Splits = CfgTest;

TEST_F(Splits, AtTheFirstStatementNothingChanges) {
  node v = block(procedure("#main"), 3);
  EXPECT_EQ(G.splitAtStatement(v, statement(v, 0)), v);
  EXPECT_EQ(G.number_of_nodes(), 2);
  EXPECT_EQ(G.number_of_edges(), 0);
}

TEST_F(Splits, ABranchingBlockHandsItsBranchesToTheNewBlock) {
  KvCCfgProcedure* pMain = procedure("#main");
  node before = block(pMain), v = block(pMain, 3, true), yes = block(pMain), no = block(pMain);
  plain(before, v);
  edge t = onTrue(v, yes), f = onFalse(v, no);
  KvCCfgEdgeInfo *pTrue = G.inf(t), *pFalse = G.inf(f);
  KvCCfgStatement* pSecond = statement(v, 1);

  node w = G.splitAtStatement(v, pSecond);

  ASSERT_NE(w, v);
  EXPECT_EQ(predecessors(v), Nodes{before});
  EXPECT_EQ(successors(v), Nodes{w});
  KvCCfgEdgeInfo* pLink = G.inf(G.first_adj_edge(v));
  EXPECT_FALSE(pLink->isTrueBranch() || pLink->isFalseBranch());
  EXPECT_EQ(successors(w), (Nodes{yes, no}));
  EXPECT_EQ(G.inf(G.first_adj_edge(w)), pTrue);
  EXPECT_EQ(G.inf(G.last_adj_edge(w)), pFalse);
  EXPECT_EQ(blockOf(v).getStatementSeq().size(), 1u);
  EXPECT_EQ(statement(w, 0), pSecond);
  EXPECT_NE(condition(w), nullptr);
  EXPECT_EQ(procedureOf(w), pMain);
}

TEST_F(Splits, AtTheConditionOnlyWhenThereAreStatements) {
  KvCCfgProcedure* pMain = procedure("#main");
  node v = block(pMain, 2, true), bare = block(pMain, 0, true), next = block(pMain);
  onTrue(v, next);
  onFalse(v, next);
  KvCCfgExpression* pCond = condition(v);

  node w = G.splitAtCondition(v);

  EXPECT_EQ(condition(v), nullptr);
  EXPECT_EQ(blockOf(v).getStatementSeq().size(), 2u);
  EXPECT_EQ(condition(w), pCond);
  EXPECT_TRUE(blockOf(w).getStatementSeq().empty());
  EXPECT_EQ(successors(w), (Nodes{next, next}));
  EXPECT_EQ(G.splitAtCondition(bare), bare);
}

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

using Division = CfgTest;

TEST_F(Division, MakesAChainThatTakesTheEdgesAndDropsTheOldNode) {
  KvCCfgProcedure* pMain = procedure("#main");
  irtest::TestVariable x, y;
  node left = block(pMain, 0, true), right = block(pMain), v = block(pMain, 2, true), yes = block(pMain),
       no = block(pMain);
  KvCPhiFunction *pPhiX = new KvCPhiFunction(&x, 2), *pPhiY = new KvCPhiFunction(&y, 2);
  blockOf(v).append(pPhiX);
  blockOf(v).append(pPhiY);
  KvCCfgStatement *pFirst = statement(v, 0), *pSecond = statement(v, 1);
  KvCCfgExpression* pCond = condition(v);
  edge fromLeft = onTrue(left, v);
  onFalse(left, right);
  edge fromRight = plain(right, v);
  edge t = onTrue(v, yes), f = onFalse(v, no);

  G.divideBasicBlock();

  node head = G.target(fromLeft);
  std::vector<edge> into;
  for (edge e : G.in(head)) into.push_back(e);
  EXPECT_EQ(into, (std::vector<edge>{fromLeft, fromRight}));
  EXPECT_NE(G.inf(fromLeft)->isTrueBranch(), nullptr);
  Nodes chain{head};
  while (chain.size() < 5) chain.push_back(successors(chain.back()).at(0));
  node tail = chain.back();
  EXPECT_EQ(blockOf(chain[0]).isPhiFunction(), pPhiX);
  EXPECT_EQ(blockOf(chain[1]).isPhiFunction(), pPhiY);
  EXPECT_EQ(blockOf(chain[2]).isStatement(), pFirst);
  EXPECT_EQ(blockOf(chain[3]).isStatement(), pSecond);
  EXPECT_EQ(condition(tail), pCond);
  EXPECT_TRUE(blockOf(tail).getStatementSeq().empty());
  EXPECT_EQ(G.source(t), tail);
  EXPECT_EQ(G.source(f), tail);
  for (node link : chain) EXPECT_EQ(procedureOf(link), pMain);
  // v gave way to five blocks and the condition-only block `left` to one; the empty blocks stay.
  EXPECT_EQ(G.number_of_nodes(), 6 + 4);
  EXPECT_NE(G.source(fromLeft), left);
  EXPECT_EQ(G.source(fromRight), right);
}

TEST_F(Division, ABlockThatLoopsToItselfLoopsFromItsLastLinkToItsFirst) {
  node v = block(procedure("#main"), 2);
  plain(v, v);
  G.divideBasicBlock();
  node first = G.target(G.first_edge());
  node last = successors(first).at(0);
  EXPECT_EQ(successors(last), Nodes{first});
  EXPECT_EQ(predecessors(first), Nodes{last});
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
