// Procedures and calls: the procedure table, regions made procedures (with the single-entry
// repetition and its regressions), call arguments, exit nodes, the loop around "#main" and the
// function call graph.
#include <gtest/gtest.h>
#include <pthread.h>

#include <functional>
#include <utility>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/statement.h"

using namespace cfgtest;
using Names = std::vector<std::string>;

namespace {

// Every test here runs with the internal checks on and expects them quiet unless it says otherwise.
class ProcedureTest : public CfgTest {
protected:
  void TearDown() override { EXPECT_TRUE(m_ReportsExpected || m_Log.empty()) << "unexpected reports"; }
  KvCCfgProcedure* find(const std::string& name) { return G.findProcedure(name.c_str()); }
  void call(node v, const char* name) { blockOf(v).append(new KvCCfgProcedureCall(name)); }

  // What a refusal must leave as it was.
  std::vector<int> shape() {
    return {G.number_of_nodes(), G.number_of_edges(), static_cast<int>(G.getProcedures().size())};
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  bool m_ReportsExpected = false;
  KvCCfgProcedure* pMain = procedure("#main");
};

// A recursion as deep as the nest would not fit into this stack.
void runOnSmallStack(std::function<void()> work) {
  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  pthread_attr_setstacksize(&attributes, 128 * 1024);
  auto run = [](void* pWork) -> void* {
    (*static_cast<std::function<void()>*>(pWork))();
    return nullptr;
  };
  pthread_t thread;
  ASSERT_EQ(pthread_create(&thread, &attributes, run, &work), 0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
}

}  // namespace

using ProcedureTable = ProcedureTest;

TEST_F(ProcedureTable, DemandingANameAgainGivesTheSameEntryAndRecord) {
  KvCCfgProcedure* pAgain = nullptr;
  node entry = G.demandProcedureEntryNode("#main", pAgain);
  EXPECT_EQ(pAgain, pMain);
  EXPECT_EQ(entry, pMain->getEntryNode());
  EXPECT_EQ(G.inf(entry)->isEntryNode()->getProcedure(), pMain);
  EXPECT_EQ(G.getProcedures().size(), 1u);
  EXPECT_EQ(G.number_of_nodes(), 1);
  EXPECT_EQ(G.number_of_edges(), 0);
}

using MakeProcedure = ProcedureTest;

TEST_F(MakeProcedure, AfterAPlainBlockThePredecessorEndsInTheCall) {
  node a = startWith(pMain, block(pMain, 1)), b = block(pMain, 1), c = block(pMain, 1);
  plain(a, b);
  plain(b, c);
  std::string name = procedureNamedAfter(b);

  KvCCfgProcedureCall* pCall = G.makeProcedureAndCall(b);

  ASSERT_NE(pCall, nullptr);
  EXPECT_EQ(pCall->getName().cstring(), name);
  EXPECT_EQ(G.outdeg(a), 0);
  EXPECT_EQ(callsIn(a), Names{name});
  KvCCfgProcedure* pNew = find(name);
  ASSERT_NE(pNew, nullptr);
  EXPECT_EQ(successors(pNew->getEntryNode()), Nodes{b});
  EXPECT_EQ(procedureOf(a), pMain);
  EXPECT_EQ(procedureOf(b), pNew);
  EXPECT_EQ(procedureOf(c), pNew);
  EXPECT_TRUE(pMain->getCalls().empty() && pNew->getCalls().empty()) << "placed calls are not registered";
  expectInvariants(G);
  delete pCall;
}

TEST_F(MakeProcedure, AfterATrueEdgeTheCallGetsABlockOfItsOwnOnThatEdge) {
  node a = startWith(pMain, block(pMain, 1, true)), b = block(pMain, 1), no = block(pMain);
  edge t = onTrue(a, b);
  onFalse(a, no);
  KvCCfgEdgeInfo* pTrue = G.inf(t);

  delete G.makeProcedureAndCall(b);

  node callBlock = G.target(t);
  EXPECT_EQ(G.inf(t), pTrue);
  EXPECT_EQ(successors(a), (Nodes{callBlock, no}));
  EXPECT_EQ(callsIn(callBlock), Names{procedureNamedAfter(b)});
  EXPECT_EQ(blockOf(callBlock).getStatementSeq().size(), 1u);
  EXPECT_EQ(procedureOf(callBlock), pMain);
  expectInvariants(G);
}

TEST_F(MakeProcedure, OnTheFirstBlockOfAProcedureItOnlyCallsThatProcedure) {
  node a = startWith(pMain, block(pMain, 1)), b = block(pMain, 1);
  plain(a, b);
  std::vector<int> before = shape();
  KvCCfgProcedureCall* pCall = G.makeProcedureAndCall(a);
  EXPECT_EQ(pCall->getName(), BxCXString("#main"));
  EXPECT_EQ(shape(), before);
  delete pCall;

  delete G.makeProcedureAndCall(b);
  before = shape();
  pCall = G.makeProcedureAndCall(b);
  EXPECT_EQ(pCall->getName().cstring(), procedureNamedAfter(b));
  EXPECT_EQ(shape(), before);
  delete pCall;
}

// E -> a -> h [if] -T-> body -> h,  h -F-> after
TEST_F(MakeProcedure, ALoopHeaderEnteredFromOutsideBecomesAProcedureOfItsOwn) {
  node a = startWith(pMain, block(pMain, 1)), h = block(pMain, 0, true), body = block(pMain, 1),
       after = block(pMain, 1);
  plain(a, h);
  onTrue(h, body);
  plain(body, h);
  onFalse(h, after);
  std::string bodyName = procedureNamedAfter(body), headerName = procedureNamedAfter(h);

  delete G.makeProcedureAndCall(body);

  KvCCfgProcedure *pBody = find(bodyName), *pHeader = find(headerName);
  ASSERT_TRUE(pBody && pHeader);
  EXPECT_EQ(G.getProcedures().size(), 3u);
  EXPECT_EQ(firstBlock(pBody), body);
  EXPECT_EQ(firstBlock(pHeader), h);
  EXPECT_EQ(callsIn(a), Names{headerName});
  EXPECT_EQ(callsIn(body), Names{headerName});
  EXPECT_EQ(callsIn(successors(h).at(0)), Names{bodyName});
  EXPECT_EQ(procedureOf(after), pHeader);
  expectInvariants(G);
}

// A procedure whose body begins with a loop: the header took the entry's procedure name, changed
// nothing, and was found again by every pass.
TEST_F(MakeProcedure, RegressionLoopHeaderRightAfterTheEntryNoLongerRepeatsForEver) {
  node h = startWith(pMain, block(pMain, 0, true)), body = block(pMain, 1), after = block(pMain);
  onTrue(h, body);
  plain(body, h);
  onFalse(h, after);
  std::string headerName = procedureNamedAfter(h);

  delete G.makeProcedureAndCall(body);

  node first = firstBlock(pMain);
  EXPECT_EQ(procedureOf(first), pMain);
  EXPECT_EQ(blockOf(first).getStatementSeq().size(), 1u);
  EXPECT_EQ(callsIn(first), Names{headerName});
  ASSERT_NE(find(headerName), nullptr);
  EXPECT_EQ(firstBlock(find(headerName)), h);
  expectInvariants(G);
}

// E -> a [if] -T-> h [if] -T-> body -> h,  a -F-> skip,  h -F-> after. The call block on a's true
// edge was put into the procedure being split off, although it stands in "#main".
TEST_F(MakeProcedure, RegressionCallBlockOfTheRepetitionStandsInItsPredecessorsProcedure) {
  node a = startWith(pMain, block(pMain, 1, true)), skip = block(pMain), h = block(pMain, 0, true),
       body = block(pMain, 1), after = block(pMain);
  edge intoLoop = onTrue(a, h);
  onFalse(a, skip);
  onTrue(h, body);
  plain(body, h);
  onFalse(h, after);

  delete G.makeProcedureAndCall(body);

  node callBlock = G.target(intoLoop);
  EXPECT_EQ(callsIn(callBlock), Names{procedureNamedAfter(h)});
  EXPECT_EQ(procedureOf(callBlock), pMain);
  EXPECT_TRUE(G.checkConsistency());
  expectInvariants(G);
}

// The client made the loop header a procedure before it added the edge back to it. The header
// starts the procedure named after it, so it cannot give that name once more: the procedure split
// off for it starts at an empty block in front of it.
TEST_F(MakeProcedure, ALoopClosedAfterItsHeaderWasMadeAProcedure) {
  node a = startWith(pMain, block(pMain, 1)), h = block(pMain, 0, true), body = block(pMain, 1),
       after = block(pMain);
  plain(a, h);
  onTrue(h, body);
  onFalse(h, after);
  delete G.makeProcedureAndCall(h);
  KvCCfgProcedure* pHeader = find(procedureNamedAfter(h));
  plain(body, h);

  delete G.makeProcedureAndCall(body);

  EXPECT_EQ(G.getProcedures().size(), 4u);
  node first = firstBlock(pHeader);
  ASSERT_EQ(callsIn(first).size(), 1u);
  KvCCfgProcedure* pLoop = find(callsIn(first)[0]);
  ASSERT_NE(pLoop, nullptr);
  node gate = firstBlock(pLoop);
  EXPECT_TRUE(blockOf(gate).getStatementSeq().empty());
  EXPECT_EQ(successors(gate), Nodes{h});
  EXPECT_EQ(procedureOf(h), pLoop);
  expectInvariants(G);
}

// Loops nested `depth` deep, each header entered from the one outside it, the innermost body made a
// procedure: every header in turn becomes a procedure within the previous one.
TEST_F(MakeProcedure, ADeepNestOfLoopsNeedsNoDeepStack) {
  const int depth = 2000;
  Nodes headers;
  for (int i = 0; i < depth; ++i) headers.push_back(block(pMain, 0, true));
  node body = block(pMain, 1), after = block(pMain);
  startWith(pMain, headers[0]);
  for (int i = 0; i < depth; ++i) {
    onTrue(headers[i], i + 1 < depth ? headers[i + 1] : body);
    onFalse(headers[i], i > 0 ? headers[i - 1] : after);
  }
  plain(body, headers.back());

  runOnSmallStack([&] { delete G.makeProcedureAndCall(body); });

  EXPECT_EQ(G.getProcedures().size(), static_cast<std::size_t>(depth) + 2);
  for (node h : headers) EXPECT_EQ(firstBlock(procedureOf(h)), h);
  expectInvariants(G);
}

TEST_F(MakeProcedure, RefusalsAreReportedAndChangeNothing) {
  m_ReportsExpected = true;
  node a = startWith(pMain, block(pMain, 1)), b = block(pMain, 1), bare = G.new_node(),
       taken = block(pMain, 1);
  plain(a, b);
  plain(b, bare);
  plain(a, taken);
  procedure(procedureNamedAfter(taken).c_str());
  KvCCfgProcedure* pStep = procedure("step");
  node s = startWith(pStep, block(pStep, 1)), u = block(pStep, 1), exit = G.new_node(new KvCCfgExit()),
       t = block(pStep, 1);
  G.inf(exit)->setProcedure(pStep);
  plain(s, u);
  plain(u, exit);
  plain(exit, t);
  std::vector<int> before = shape();

  EXPECT_EQ(G.makeProcedureAndCall(pMain->getEntryNode()), nullptr);  // not a block
  EXPECT_EQ(G.makeProcedureAndCall(b), nullptr);                      // a region node without payload
  EXPECT_EQ(G.makeProcedureAndCall(t), nullptr);                      // an exit node cannot call
  EXPECT_EQ(G.makeProcedureAndCall(u), nullptr);                      // the region holds an exit node
  EXPECT_EQ(G.makeProcedureAndCall(taken), nullptr);                  // its name belongs to another procedure

  for (int line : {475, 561, 524, 480})
    EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", line)) << line;
  EXPECT_EQ(m_Log.messages().size(), 5u);
  EXPECT_EQ(shape(), before);
  EXPECT_TRUE(G.checkConsistency());
}

using Parameters = ProcedureTest;

TEST_F(Parameters, TwoCallsShareTheProceduresParameterStatements) {
  KvCCfgProcedure* pStep = procedure("step");
  irtest::TestVariable x, y;
  irtest::TestExpression x1, y1, x2, y2;
  KvCCfgProcedureCall first("step"), second("step");
  ssaopt::list<KvCCfgVariable*> formals{&x, &y};
  ssaopt::list<KvCCfgExpression*> arguments{&x1, &y1};
  G.setParametersOfCall(&first, formals, arguments);
  EXPECT_TRUE(formals.empty() && arguments.empty());
  formals = {&x, &y};
  arguments = {&x2, &y2};
  G.setParametersOfCall(&second, formals, arguments);

  auto params = irtest::items(pStep->getParamStatements());
  ASSERT_EQ(params.size(), 2u);
  EXPECT_EQ(params[0]->getVariable(), &x);
  EXPECT_EQ(params[1]->getVariable(), &y);
  EXPECT_EQ(params[0]->getArgument(&first), &x1);
  EXPECT_EQ(params[0]->getArgument(&second), &x2);
  EXPECT_EQ(params[1]->getArgument(&first), &y1);
  EXPECT_EQ(params[1]->getArgument(&second), &y2);
}

TEST_F(Parameters, ACallThatDoesNotFitIsReportedAndRecordsNothing) {
  m_ReportsExpected = true;
  KvCCfgProcedure* pStep = procedure("step");
  irtest::TestVariable x, y;
  irtest::TestExpression arg;
  KvCCfgProcedureCall first("step"), swapped("step"), shorter("step"), lost("nowhere");
  auto pass = [&](KvCCfgProcedureCall& call, ssaopt::list<KvCCfgVariable*> formals) {
    ssaopt::list<KvCCfgExpression*> arguments(formals.size(), &arg);
    G.setParametersOfCall(&call, formals, arguments);
    EXPECT_TRUE(formals.empty() && arguments.empty());
  };
  pass(first, {&x, &y});
  pass(swapped, {&y, &x});
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 430));
  pass(shorter, {&x});
  pass(lost, {&x});
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 414));

  auto params = irtest::items(pStep->getParamStatements());
  ASSERT_EQ(params.size(), 2u);
  EXPECT_EQ(params[0]->getArguments().size(), 2u);
  EXPECT_EQ(params[0]->getArgument(&shorter), &arg);
  EXPECT_EQ(params[1]->getArguments().size(), 1u);
  EXPECT_EQ(params[1]->getArgument(&swapped), nullptr);
  EXPECT_EQ(m_Log.messages().size(), 2u);
}

using ExitNodes = ProcedureTest;

TEST_F(ExitNodes, EveryDeadEndOfAProcedureLeadsToItsOneExit) {
  KvCCfgProcedure *pNone = procedure("endless"), *pOne = procedure("one"), *pTwo = procedure("two");
  node spin = startWith(pNone, block(pNone));
  plain(spin, spin);
  node single = startWith(pOne, block(pOne)), end = block(pOne);
  plain(single, end);
  node fork = startWith(pTwo, block(pTwo, 0, true)), left = block(pTwo), right = block(pTwo);
  onTrue(fork, left);
  onFalse(fork, right);
  startWith(pMain, block(pMain));
  int blocksAndEntries = G.number_of_nodes();

  G.placeExitNodes();

  EXPECT_EQ(G.number_of_nodes(), blocksAndEntries + 4);
  for (KvCCfgProcedure* pProcedure : {pMain, pNone, pOne, pTwo}) {
    KvCCfgNodeInfo* pExit = G.inf(pProcedure->getExitNode());
    ASSERT_NE(pExit->isExitNode(), nullptr);
    EXPECT_EQ(pExit->getProcedure(), pProcedure);
    EXPECT_EQ(G.outdeg(pProcedure->getExitNode()), 0);
  }
  EXPECT_EQ(predecessors(pNone->getExitNode()), Nodes{});
  EXPECT_EQ(predecessors(pOne->getExitNode()), Nodes{end});
  EXPECT_EQ(predecessors(pTwo->getExitNode()), (Nodes{left, right}));
}

using LoopAroundMain = ProcedureTest;

TEST_F(LoopAroundMain, EveryEndOfMainPassesTheLoopBlock) {
  node fork = startWith(pMain, block(pMain, 1, true)), left = block(pMain), right = block(pMain);
  onTrue(fork, left);
  onFalse(fork, right);
  G.placeExitNodes();

  G.placeLoopAroundMain();

  node exit = pMain->getExitNode();
  ASSERT_EQ(G.indeg(exit), 1);
  edge leave = G.first_in_edge(exit);
  EXPECT_NE(G.inf(leave)->isFalseBranch(), nullptr);
  node loop = G.source(leave);
  EXPECT_EQ(predecessors(loop), (Nodes{left, right}));
  EXPECT_EQ(successors(loop), (Nodes{fork, exit}));
  EXPECT_NE(G.inf(G.first_adj_edge(loop))->isTrueBranch(), nullptr);
  EXPECT_TRUE(condition(loop)->evaluate().isUndetermined());
  EXPECT_EQ(procedureOf(loop), pMain);
  expectInvariants(G);
}

// A loop block that nothing enters would have been a second node without in-edges in "#main".
TEST_F(LoopAroundMain, RegressionMainThatNeverEndsGetsNoLoop) {
  node spin = startWith(pMain, block(pMain));
  plain(spin, spin);
  G.placeExitNodes();
  std::vector<int> before = shape();
  G.placeLoopAroundMain();
  EXPECT_EQ(shape(), before);
  EXPECT_EQ(G.indeg(pMain->getExitNode()), 0);
}

using CallGraph = ProcedureTest;

TEST_F(CallGraph, OneEdgePerCallOfAnotherProcedure) {
  KvCCfgProcedure *pA = procedure("a"), *pB = procedure("b");
  node m = startWith(pMain, block(pMain)), x = startWith(pA, block(pA)), y = startWith(pB, block(pB));
  call(m, "a");
  call(m, "a");
  call(x, "b");
  call(y, "b");
  call(y, "a");
  node claimed = block(pMain);
  plain(y, claimed);
  ssaopt::graph fcg;
  ssaopt::map<node, KvCCfgProcedure*> procedureOf;

  KvCControlFlowGraphTestAccess::buildFunctionCallGraph(G, fcg, procedureOf);

  std::vector<KvCCfgProcedure*> order;
  for (node f : fcg.nodes()) order.push_back(procedureOf[f]);
  EXPECT_EQ(order, (std::vector<KvCCfgProcedure*>{pMain, pA, pB}));
  for (KvCCfgProcedure* pProcedure : order) EXPECT_EQ(procedureOf[pProcedure->getFcgNode()], pProcedure);
  std::vector<std::pair<KvCCfgProcedure*, KvCCfgProcedure*>> calls;
  for (edge e : fcg.edges()) calls.emplace_back(procedureOf[fcg.source(e)], procedureOf[fcg.target(e)]);
  EXPECT_EQ(calls, (decltype(calls){{pMain, pA}, {pMain, pA}, {pA, pB}, {pB, pA}}));
  EXPECT_EQ(G.inf(claimed)->getProcedure(), pB) << "ownership follows reachability";
}

TEST_F(CallGraph, CallsWithoutCallGraphNodeAreReportedAndLeftOut) {
  m_ReportsExpected = true;
  KvCCfgProcedure* pA = procedure("a");
  node m = startWith(pMain, block(pMain));
  startWith(pA, block(pA));
  call(m, "nowhere");
  call(m, "a");
  KvCCfgProcedure outsider;
  node unreachable = block(&outsider);
  plain(unreachable, m);
  call(unreachable, "a");
  ssaopt::graph fcg;
  ssaopt::map<node, KvCCfgProcedure*> procedureOf;

  KvCControlFlowGraphTestAccess::buildFunctionCallGraph(G, fcg, procedureOf);

  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 675));
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 670));
  ASSERT_EQ(fcg.number_of_edges(), 1);
  EXPECT_EQ(procedureOf[fcg.target(fcg.first_edge())], pA);
  EXPECT_TRUE(G.checkConsistency());
}
