// Every public step of the graph called where the graph is not ready for it: it reports the internal
// error that names the step and what is missing, and leaves the graph as it was (the same printed
// program, nodes, edges and state). Which orders the pipeline refuses is tested with the pipeline
// (tests/cfg/pipeline_test.cpp); these are the steps called one by one, as a front end may.
#include <functional>
#include <string>
#include <vector>

#include "client/client_testing.h"
#include "ssaopt/client/pipeline.h"
#include "ssaopt/frame/report.h"

namespace {

using ssaopt::node;
using ssaopt::client::Program;

const char* const kProgram =
    "var int16 in volatile;\n"
    "var int16 x = 0;\n"
    "var int16 y output = 0;\n"
    "var int16 p = 0;\n"
    "proc #main {\n"
    "  x = in;\n"
    "  y = x * 2;\n"
    "  if x > 0 goto pos else neg;\n"
    "pos:\n"
    "  call f(x);\n"
    "  goto end;\n"
    "neg:\n"
    "  call f(0);\n"
    "}\n"
    "proc f(p) {\n"
    "  y = p + 1;\n"
    "}\n";

// The first block holding at least `statements` statements.
node blockWith(Program& program, std::size_t statements) {
  for (node v : program.graph().nodes())
    if (KvCBasicBlock* pBlock = program.graph().getBasicBlock(v))
      if (pBlock->getStatementSeq().size() >= statements) return v;
  return ssaopt::nil;
}

KvCCfgProcedureCall* firstCall(Program& program) {
  for (node v : program.graph().nodes())
    if (KvCBasicBlock* pBlock = program.graph().getBasicBlock(v))
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
        if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall()) return pCall;
  return nullptr;
}

struct OutOfOrder {
  const char* name;
  std::vector<std::string> before;  // the steps that bring the graph where the step is not ready
  std::function<void(Program&)> step;
  const char* refusal;  // what the report says after the error code
};

void PrintTo(const OutOfOrder& call, std::ostream* out) { *out << call.name; }

const OutOfOrder kCalls[] = {
    {"MakeProcedureAndCallAfterExits",
     {},
     [](Program& program) { program.graph().makeProcedureAndCall(blockWith(program, 2)); },
     "makeProcedureAndCall: exit nodes are placed"},
    {"SetParametersOfCallInSSAForm",
     {"ssa"},
     [](Program& program) {
       ssaopt::list<KvCCfgVariable*> formals{program.findVariable("p")};
       ssaopt::list<KvCCfgExpression*> arguments{program.expressions().make({}, {})};
       program.graph().setParametersOfCall(firstCall(program), formals, arguments);
     },
     "setParametersOfCall: the graph is in SSA form"},
    {"PlaceExitNodesTwice",
     {},
     [](Program& program) { program.graph().placeExitNodes(); },
     "placeExitNodes: exit nodes are placed"},
    {"PlaceLoopAroundMainTwice",
     {},
     [](Program& program) { program.graph().placeLoopAroundMain(); },
     "placeLoopAroundMain: \"#main\" is closed into a loop"},
    {"SplitAtStatementWithSSAEdges",
     {"ssa", "ssa-edges"},
     [](Program& program) {
       node v = blockWith(program, 2);
       program.graph().splitAtStatement(v, program.graph().getBasicBlock(v)->getStatementSeq().back());
     },
     "splitAtStatement and splitAtCondition: SSA edges are present"},
    {"SplitAtConditionWithSSAEdges",
     {"ssa", "ssa-edges"},
     [](Program& program) { program.graph().splitAtCondition(blockWith(program, 2)); },
     "splitAtStatement and splitAtCondition: SSA edges are present"},
    {"DivideAfterSSAEdges",
     {"ssa", "ssa-edges"},
     [](Program& program) { program.graph().divideBasicBlock(); },
     "divideBasicBlock: SSA edges are present"},
    {"InlineInSSAForm",
     {"ssa"},
     [](Program& program) { program.graph().inlineProcedures(); },
     "inlineProcedures: the graph is in SSA form"},
    {"ValidConditionsAfterPropagation",
     {"ssa", "divide", "sccp"},
     [](Program& program) { program.graph().insertValidConditionAssignments(); },
     "insertValidConditionAssignments: the graph is in SSA form"},
    {"CompleteCallListsInSSAForm",
     {"ssa"},
     [](Program& program) { program.graph().completeCallLists(); },
     "completeCallLists: the graph is in SSA form"},
    {"TransformToSSAFormTwice",
     {"ssa"},
     [](Program& program) { program.graph().transformToSSAForm(); },
     "transformToSSAForm: the graph is in SSA form"},
    {"TransformToSSAFormWithCallsUnregistered",
     {},
     [](Program& program) { program.graph().transformToSSAForm(); },
     "transformToSSAForm: a call is not registered in its procedure's call list"},
    {"PlacePhiFunctionInSSAForm",
     {"ssa"},
     [](Program& program) { program.graph().placePhiFunction(); },
     "placePhiFunction: the graph is in SSA form"},
    {"AddSSAEdgesBeforeSSAForm",
     {},
     [](Program& program) { program.graph().addSSAEdges(); },
     "addSSAEdges: the graph is not in SSA form"},
    {"PropagateOverSSAEdgesUndivided",
     {"ssa", "ssa-edges"},
     [](Program& program) { program.graph().sparseConditionalConstant(true); },
     "sparseConditionalConstant: blocks are not divided"},
    {"PropagateWithoutSSAEdges",
     {"ssa", "divide"},
     [](Program& program) { program.graph().sparseConditionalConstant(false); },
     "sparseConditionalConstant: there are no SSA edges"},
    {"PropagateSparseConditionalConstantUndivided",
     {"ssa"},
     [](Program& program) { program.graph().propagateSparseConditionalConstant(true); },
     "propagateSparseConditionalConstant: blocks are not divided"},
    {"PropagateBeforeSSAForm",
     {"divide"},
     [](Program& program) { program.graph().propagateSparseConditionalConstant(false); },
     "propagateSparseConditionalConstant: the graph is not in SSA form"},
    {"RemoveUnusedBeforeSSAForm",
     {},
     [](Program& program) { program.graph().removeUnusedVarDefs(); },
     "removeUnusedVarDefs: the graph is not in SSA form"},
};

class StepOutOfOrder : public clienttest::ClientTest, public testing::WithParamInterface<OutOfOrder> {};

TEST_P(StepOutOfOrder, ReportsAndLeavesTheGraphAsItWas) {
  Program* pProgram = load(kProgram);
  ASSERT_TRUE(pProgram);
  ASSERT_TRUE(ssaopt::client::runPipeline(*pProgram, GetParam().before));
  KvCControlFlowGraph& G = pProgram->graph();
  std::string printed = ssaopt::client::printProgram(*pProgram);
  int nodes = G.number_of_nodes(), edges = G.number_of_edges();
  ssaopt::GraphState state = G.getState();

  ssaopt::ReportLog log;
  GetParam().step(*pProgram);

  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0].rfind(
                std::string("Internal error. Error code: KvCControlFlowGraph4000: ") + GetParam().refusal, 0),
            0u)
      << log.messages()[0];
  EXPECT_EQ(ssaopt::client::printProgram(*pProgram), printed);
  EXPECT_EQ(G.number_of_nodes(), nodes);
  EXPECT_EQ(G.number_of_edges(), edges);
  EXPECT_EQ(G.getState(), state);
}

INSTANTIATE_TEST_SUITE_P(, StepOutOfOrder, testing::ValuesIn(kCalls),
                         [](const testing::TestParamInfo<OutOfOrder>& call) { return call.param.name; });

class StepsInOrder : public clienttest::ClientTest {};

// The state that each step leaves is the state that the next one finds; the front end's graph is
// built.
TEST_F(StepsInOrder, TheStepsOfTheTypicalRunLeaveTheStateTheyPromise) {
  Program* pProgram = load(kProgram);
  ASSERT_TRUE(pProgram);
  EXPECT_EQ(pProgram->graph().getState(), ssaopt::client::kLoadedProgramState);
  ssaopt::GraphState expected = ssaopt::client::kLoadedProgramState;
  for (const ssaopt::PipelineStep* pStep : ssaopt::typicalRun()) {
    ASSERT_TRUE(ssaopt::client::runPipeline(*pProgram, ssaopt::Pipeline{pStep}));
    expected = ssaopt::stateAfter(pStep->operation, expected);
    EXPECT_EQ(pProgram->graph().getState(), expected) << pStep->name;
  }
  using F = ssaopt::GraphFact;
  EXPECT_EQ(expected,
            ssaopt::GraphState({F::ExitsPlaced, F::LoopAroundMain, F::SSAForm, F::Divided, F::Propagated}));
}

}  // namespace
