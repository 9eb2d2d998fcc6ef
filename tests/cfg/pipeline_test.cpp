// The library's pipeline without a client: which orders of the named steps can run (walked from the
// step contracts before anything runs), what a pipeline does when a step is not ready, and the
// helpers for reading a graph back. Programs through the pipeline are tested with the client
// (tests/filetests/pipeline, tests/golden).
#include "ssaopt/cfg/pipeline.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "cfg/propagation_testing.h"
#include "ssaopt/frame/report.h"

using namespace sccptest;
using ssaopt::GraphFact;
using ssaopt::GraphState;

namespace {

ssaopt::Pipeline named(std::initializer_list<const char*> names) {
  ssaopt::Pipeline pipeline;
  for (const char* name : names) pipeline.push_back(ssaopt::findPipelineStep(name));
  return pipeline;
}

std::string problemOf(std::initializer_list<const char*> names, GraphState start = ssaopt::kBuiltGraph) {
  return ssaopt::findPipelineProblem(named(names), start).cstring();
}

// ---- Orders ------------------------------------------------------------------------------------

TEST(PipelineOrders, TheTypicalRunAndItsVariantsCanRun) {
  EXPECT_EQ(ssaopt::findPipelineProblem(ssaopt::typicalRun(), ssaopt::kBuiltGraph), BxCXString());
  for (auto names : {std::initializer_list<const char*>{"ssa", "divide", "ssa-edges", "propagate", "hoist"},
                     {"divide", "ssa", "divide", "sccp-keep-dead", "propagate", "replace-constants", "fold"},
                     {"inline", "inline", "valid-conditions", "hoist", "ssa", "divide", "sccp", "sccp"},
                     {"ssa", "divide", "sccp", "hoist", "divide", "sccp", "remove-unused", "hoist"}})
    EXPECT_EQ(problemOf(names), "");
}

TEST(PipelineOrders, AStepThatIsNotReadyNamesTheStepThatTookWhatItNeeds) {
  EXPECT_EQ(
      problemOf({"ssa", "ssa-edges", "divide"}),
      "pass 'divide' cannot run after 'ssa-edges': SSA edges are present (dividing would leave every SSA "
      "edge of a block on the last block of its chain)");
  EXPECT_EQ(problemOf({"divide", "ssa", "sccp"}),
            "pass 'sccp' needs 'divide' again after 'ssa': blocks are not divided (a visit takes one phi "
            "function, one statement or one condition per block)");
  EXPECT_EQ(problemOf({"ssa", "divide", "propagate"}),
            "pass 'propagate' needs one of 'sccp', 'sccp-keep-dead', 'ssa-edges' earlier in the pipeline: "
            "there are no SSA edges (values travel along the SSA edges)");
  EXPECT_EQ(problemOf({"ssa", "inline"}),
            "pass 'inline' cannot run after 'ssa': the graph is in SSA form (an inlined body's versions and "
            "interface statements would be left in the caller)");
  EXPECT_EQ(problemOf({"inline"}, GraphState()),
            "pass 'inline' cannot run on this graph: exit nodes are not placed (the inlined body continues "
            "where the callee's exit node was entered)");
}

TEST(PipelineOrders, WhereEachStepRunsComesFromItsContract) {
  EXPECT_EQ(std::string(ssaopt::describeWhereStepRuns(*ssaopt::findPipelineStep("ssa")).cstring()),
            "needs exit nodes; not in SSA form");
  EXPECT_EQ(std::string(ssaopt::describeWhereStepRuns(*ssaopt::findPipelineStep("propagate")).cstring()),
            "needs SSA form, divided blocks, SSA edges");
  EXPECT_EQ(std::string(ssaopt::describeWhereStepRuns(*ssaopt::findPipelineStep("fold")).cstring()), "");
  EXPECT_EQ(ssaopt::findPipelineStep("nosuch"), nullptr);
}

// ---- Running a pipeline ------------------------------------------------------------------------

class PipelineRun : public PropagationTest {
protected:
  PipelineRun() { G.setState({}); }
};

// A client takes part around each step, and a step that the graph is not ready for stops the run:
// reported, with nothing of it or after it done.
TEST_F(PipelineRun, StopsAtAStepThatIsNotReadyWithTheGraphAsTheStepsBeforeLeftIt) {
  run(pMain, {holding(new irtest::TestStatement()), empty()});
  struct Recording : ssaopt::PipelineClient {
    void runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) override {
      ran.push_back(step.name);
      PipelineClient::runStep(step, graph);
    }
    std::vector<std::string> ran;
  } client;
  ssaopt::ReportLog log;
  int nodes = G.number_of_nodes();
  EXPECT_FALSE(ssaopt::runPipeline(G, named({"fold", "sccp", "fold"}), client));
  EXPECT_EQ(client.ran, std::vector<std::string>{"fold"});
  EXPECT_EQ(G.number_of_nodes(), nodes);
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0],
            "Internal error. Error code: ssaopt::runPipeline4001: pipeline stopped before 'sccp': "
            "propagateSparseConditionalConstant: the graph is not in SSA form (values are propagated between "
            "versions).");
}

// The SSA transformation needs more than its facts: a start node, and every call registered.
TEST_F(PipelineRun, TheSSATransformationRefusesAGraphWithoutStartNode) {
  run(pMain, {empty()});
  G.placeExitNodes();
  ssaopt::ReportLog log;
  G.transformToSSAForm();
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0],
            "Internal error. Error code: KvCControlFlowGraph4000: transformToSSAForm: no start node is set.");
  EXPECT_FALSE(G.getState().has(GraphFact::SSAForm));
  G.setStartNode(pMain->getEntryNode());
  EXPECT_TRUE(ssaopt::runPipeline(G, named({"ssa", "divide", "sccp"})));
  EXPECT_EQ(log.messages().size(), 1u);
}

// ---- Reading the graph back --------------------------------------------------------------------

TEST_F(PipelineRun, ControlFlowEdgesLeaveTheSSAEdgesOut) {
  KvCSSAVariable* x1 = version(x);
  node def = holding(new irtest::TestStatement({x1})), use = holding(new irtest::TestStatement({}, {x1}));
  run(pMain, {def, use});
  G.setState({GraphFact::SSAForm});
  G.addSSAEdges();
  ASSERT_EQ(G.outdeg(def), 2);
  EXPECT_EQ(irtest::items(G.getControlFlowOutEdges(def)), std::vector<edge>{G.first_adj_edge(def)});
  EXPECT_EQ(G.getControlFlowInEdges(use).size(), 1u);
  EXPECT_FALSE(G.isControlFlowEdge(G.last_adj_edge(def)));
}

// Program order: the first block, then chains in node order, a block followed by the one it falls
// into when nothing else enters that one; a filter leaves blocks out.
TEST_F(PipelineRun, BlocksInProgramOrder) {
  KvCCfgProcedure* pOther = procedure("f");
  node top = branch(new irtest::TestExpression()), join = empty(), then = empty(), after = empty();
  node otherwise = empty();
  run(pMain, {top});
  onTrue(top, then);
  onFalse(top, otherwise);
  path({otherwise, join});
  path({then, join, after});
  node only = startWith(pOther, empty(pOther));
  ssaopt::array<ssaopt::ProcedureBlocks> order = G.getProgramOrder();
  ASSERT_EQ(order.size(), 2u);
  EXPECT_EQ(order[0].pProcedure, pMain);
  EXPECT_EQ(irtest::items(order[0].blocks), (Nodes{top, join, after, then, otherwise}));
  EXPECT_EQ(irtest::items(order[1].blocks), Nodes{only});
  order = G.getProgramOrder([&](node v) { return v != join; });
  EXPECT_EQ(irtest::items(order[0].blocks), (Nodes{top, then, after, otherwise}));
}

}  // namespace
