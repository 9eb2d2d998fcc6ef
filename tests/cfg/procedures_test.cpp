// Procedures and calls: regions made procedures (with the single-entry repetition and its
// regressions), and what the procedure steps refuse and report. The ordinary cases are programs
// (tests/client).
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

class ProcedureTest : public QuietCfgTest {
protected:
  KvCCfgProcedure* find(const std::string& name) { return G.findProcedure(name.c_str()); }
  void call(node v, const char* name) { blockOf(v).append(new KvCCfgProcedureCall(name)); }
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

using MakeProcedure = ProcedureTest;

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

using LoopAroundMain = ProcedureTest;

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
