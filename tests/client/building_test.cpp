// The graph the front end hands over: the shape and the promises the library relies on.
#include "client_testing.h"

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

// A call defines and uses nothing by itself: its arguments go to the parameter statements.
TEST_F(Building, CallsAreRegisteredOnceWhenAskedAndPassTheirArgumentsToTheParameterStatements) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("procedures"));
  KvCControlFlowGraph& graph = pProgram->graph();
  KvCCfgProcedure* pAccumulate = graph.findProcedure("accumulate");
  EXPECT_TRUE(pAccumulate->getCalls().empty());
  pProgram->graph().completeCallLists();
  pProgram->graph().completeCallLists();
  std::vector<KvCCfgProcedureCall*> calls = callsIn(*pProgram);
  ASSERT_EQ(calls.size(), 3u);
  EXPECT_EQ(pAccumulate->getCalls(), (ssaopt::list<KvCCfgProcedureCall*>{calls[0], calls[1]}));
  EXPECT_EQ(graph.findProcedure("record")->getCalls(), ssaopt::list<KvCCfgProcedureCall*>{calls[2]});
  ssaopt::list<KvCCfgParamStatement*> params = pAccumulate->getParamStatements();
  ASSERT_EQ(params.size(), 2u);
  EXPECT_EQ(params.front()->getVariable(), pProgram->findVariable("x"));
  EXPECT_EQ(params.back()->getVariable(), pProgram->findVariable("y"));
  for (int i = 0; i < 2; ++i) {
    const KvCCfgSFProcedureCall::Arguments& arguments = calls[i]->isSFProcedureCall()->getArguments();
    EXPECT_EQ(params.front()->getArgument(calls[i]), arguments[0]);
    EXPECT_EQ(params.back()->getArgument(calls[i]), arguments[1]);
  }
  EXPECT_TRUE(graph.findProcedure("#main")->getParamStatements().empty());
  for (KvCCfgProcedureCall* pCall : calls) {
    EXPECT_TRUE(pCall->getDefinedVariables().empty() && pCall->getUsedVariables().empty());
    EXPECT_TRUE(pCall->getVarsDefinedByFctReturn().empty());
  }
}

// An element write uses the array, its index and its value; an external call uses what it names and
// defines nothing.
TEST_F(Building, ElementWritesAndExternalCallsDefineAndUseWhatTheyName) {
  ssaopt::client::Program* pProgram = load(
      "var int16 t[4]; var uint8 i; var int16 y; var int16 in volatile;\n"
      "proc #main {\n  t[i] = y + 1;\n  extern io uses(y) modifies(in, t);\n}\n");
  using Variables = ssaopt::set<KvCCfgVariable*>;
  KvCCfgVariable *t = pProgram->findVariable("t"), *y = pProgram->findVariable("y");
  KvCCfgSFAssignment* pWrite = firstAssignment(*pProgram);
  EXPECT_EQ(pWrite->getUsedVariables(), (Variables{t, pProgram->findVariable("i"), y}));
  EXPECT_EQ(pWrite->getDefinedVariables(), Variables{t});
  KvCCfgStatement* pCall = blocksOf(*pProgram).front()->getStatementSeq().back();
  ASSERT_NE(pCall->isExternCall(), nullptr);
  EXPECT_EQ(pCall->getUsedVariables(), Variables{y});
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

}  // namespace
