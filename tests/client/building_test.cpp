// The graph the front end hands over: the shape and the promises the library relies on.
#include "client_testing.h"
#include "ssaopt/frame/report.h"

namespace {

using ssaopt::edge;
using ssaopt::node;

class Building : public clienttest::ClientTest {
protected:
  static std::vector<edge> controlOut(const KvCControlFlowGraph& graph, node v) {
    std::vector<edge> out;
    for (edge e : graph.out(v))
      if (!graph.inf(e)->isSSAEdge()) out.push_back(e);
    return out;
  }

  static std::vector<KvCCfgProcedureCall*> callsIn(ssaopt::client::Program& program) {
    std::vector<KvCCfgProcedureCall*> calls;
    for (KvCBasicBlock* pBlock : blocksOf(program))
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
        if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall()) calls.push_back(pCall);
    return calls;
  }
};

TEST_F(Building, EveryExampleIsConsistentAndStartsAtTheEntryOfMain) {
  for (const char* name : clienttest::kExamples) {
    SCOPED_TRACE(name);
    ssaopt::ReportLog log;
    ssaopt::setShowInternalInfo(true);
    ssaopt::client::Program* pProgram = load(clienttest::readExample(name));
    ASSERT_NE(pProgram, nullptr);
    KvCControlFlowGraph& graph = pProgram->graph();
    EXPECT_TRUE(graph.checkConsistency());
    ssaopt::setShowInternalInfo(false);
    EXPECT_TRUE(log.empty()) << (log.messages().empty() ? "" : log.messages()[0]);
    KvCCfgProcedure* pMain = graph.findProcedure("#main");
    EXPECT_EQ(graph.getStartNode(), pMain->getEntryNode());
    ASSERT_EQ(graph.indeg(pMain->getExitNode()), 1);
    node loop = graph.source(graph.first_in_edge(pMain->getExitNode()));
    EXPECT_EQ(graph.getBasicBlock(loop)->getBranchCond(), pProgram->mainLoopCondition());
  }
}

TEST_F(Building, EveryCallStandsAloneInABlockWithOneSuccessor) {
  for (const char* name : {"procedures", "outline", "typical_run"}) {
    SCOPED_TRACE(name);
    ssaopt::client::Program* pProgram = load(clienttest::readExample(name));
    KvCControlFlowGraph& graph = pProgram->graph();
    for (node v : graph.nodes()) {
      KvCBasicBlock* pBlock = graph.getBasicBlock(v);
      if (!pBlock || pBlock->getStatementSeq().empty() ||
          !pBlock->getStatementSeq().back()->isProcedureCall())
        continue;
      EXPECT_EQ(pBlock->getStatementSeq().size(), 1u);
      EXPECT_EQ(pBlock->getBranchCond(), nullptr);
      EXPECT_EQ(controlOut(graph, v).size(), 1u);
    }
  }
}

TEST_F(Building, CallsAreRegisteredOnceAndOnlyWhenAsked) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("procedures"));
  KvCControlFlowGraph& graph = pProgram->graph();
  KvCCfgProcedure* pAccumulate = graph.findProcedure("accumulate");
  KvCCfgProcedure* pRecord = graph.findProcedure("record");
  EXPECT_TRUE(pAccumulate->getCalls().empty());
  pProgram->completeCallLists();
  pProgram->completeCallLists();
  std::vector<KvCCfgProcedureCall*> calls = callsIn(*pProgram);
  ASSERT_EQ(calls.size(), 3u);
  EXPECT_EQ(pAccumulate->getCalls(), (ssaopt::list<KvCCfgProcedureCall*>{calls[0], calls[1]}));
  EXPECT_EQ(pRecord->getCalls(), (ssaopt::list<KvCCfgProcedureCall*>{calls[2]}));
}

TEST_F(Building, EachCallPassesItsArgumentsToTheParameterStatements) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("procedures"));
  std::vector<KvCCfgProcedureCall*> calls = callsIn(*pProgram);
  ssaopt::list<KvCCfgParamStatement*> params =
      pProgram->graph().findProcedure("accumulate")->getParamStatements();
  ASSERT_EQ(params.size(), 2u);
  EXPECT_EQ(params.front()->getVariable(), pProgram->findVariable("x"));
  EXPECT_EQ(params.back()->getVariable(), pProgram->findVariable("y"));
  for (int i = 0; i < 2; ++i) {
    const KvCCfgSFProcedureCall::Arguments& arguments = calls[i]->isSFProcedureCall()->getArguments();
    EXPECT_EQ(params.front()->getArgument(calls[i]), arguments[0]);
    EXPECT_EQ(params.back()->getArgument(calls[i]), arguments[1]);
  }
  EXPECT_TRUE(pProgram->graph().findProcedure("#main")->getParamStatements().empty());
}

TEST_F(Building, ACallDefinesAndUsesNothingByItself) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("procedures"));
  for (KvCCfgProcedureCall* pCall : callsIn(*pProgram)) {
    EXPECT_TRUE(pCall->getDefinedVariables().empty());
    EXPECT_TRUE(pCall->getUsedVariables().empty());
    EXPECT_TRUE(pCall->getVarsDefinedByFctReturn().empty());
  }
}

TEST_F(Building, AnElementWriteUsesTheArrayItsIndexAndItsValue) {
  ssaopt::client::Program* pProgram =
      load("var int16 t[4]; var uint8 i; var int16 y;\nproc #main { t[i] = y + 1; }\n");
  KvCCfgSFAssignment* pWrite = firstAssignment(*pProgram);
  ssaopt::set<KvCCfgVariable*> used = pWrite->getUsedVariables();
  EXPECT_EQ(used, (ssaopt::set<KvCCfgVariable*>{pProgram->findVariable("t"), pProgram->findVariable("i"),
                                                pProgram->findVariable("y")}));
  EXPECT_EQ(pWrite->getDefinedVariables(), ssaopt::set<KvCCfgVariable*>{pProgram->findVariable("t")});
}

TEST_F(Building, AnExternalCallUsesWhatItNamesAndDefinesNothing) {
  ssaopt::client::Program* pProgram = load(
      "var int16 a; var int16 in volatile; var int16 buf[2];\n"
      "proc #main { extern io uses(a) modifies(in, buf); }\n");
  KvCCfgStatement* pCall = blocksOf(*pProgram).front()->getStatementSeq().front();
  ASSERT_NE(pCall->isExternCall(), nullptr);
  EXPECT_EQ(pCall->getUsedVariables(), ssaopt::set<KvCCfgVariable*>{pProgram->findVariable("a")});
  EXPECT_TRUE(pCall->getDefinedVariables().empty());
  EXPECT_EQ(pCall->isExternCall()->getModifiableVariables().size(), 2u);
}

TEST_F(Building, EachBranchToTheEndGetsABlockOfItsOwn) {
  ssaopt::client::Program* pProgram = load("var bool b volatile;\nproc #main { if b goto end else end; }\n");
  KvCControlFlowGraph& graph = pProgram->graph();
  node branch = graph.target(graph.first_adj_edge(graph.findProcedure("#main")->getEntryNode()));
  std::vector<edge> out = controlOut(graph, branch);
  ASSERT_EQ(out.size(), 2u);
  EXPECT_NE(graph.target(out[0]), graph.target(out[1]));
  for (edge e : out) EXPECT_TRUE(graph.getBasicBlock(graph.target(e))->getStatementSeq().empty());
}

TEST_F(Building, OutliningMakesAProcedureCalledFromEachPredecessor) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("outline"));
  KvCControlFlowGraph& graph = pProgram->graph();
  ASSERT_EQ(graph.getProcedures().size(), 2u);
  std::vector<KvCCfgProcedureCall*> calls = callsIn(*pProgram);
  ASSERT_EQ(calls.size(), 2u);
  for (KvCCfgProcedureCall* pCall : calls) EXPECT_STREQ(pCall->getName().cstring(), "#block_3");
  EXPECT_NE(graph.findProcedure("#block_3"), nullptr);
}

}  // namespace
