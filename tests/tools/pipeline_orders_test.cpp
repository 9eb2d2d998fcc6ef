// Orders of passes other than the typical run: the tool refuses those that the graph is not ready for,
// with the pass and what is missing, and every order it accepts keeps the program's behaviour and a
// graph that the verifier passes after every step. The regressions are the programs and orders that
// drawing random orders (ssaopt fuzz --random-passes) found.
#include <string>
#include <vector>

#include "client/behaviour.h"
#include "client/client_testing.h"
#include "passes.h"
#include "ssaopt/client/pipeline.h"
#include "ssaopt/frame/report.h"
#include "tools/tool_running.h"

namespace {

using ssaopt::client::Program;

// The verifier after the client's part and the library's part of every step.
class VerifiedSteps : public ssaopt::client::ProgramSteps {
public:
  using ProgramSteps::ProgramSteps;
  void runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) override {
    ProgramSteps::runStep(step, graph);
    if (!graph.verify()) failedAfter += std::string(failedAfter.empty() ? "" : ", ") + step.name;
  }
  std::string failedAfter;
};

class PassOrders : public clienttest::ClientTest {
protected:
  // Runs `pipeline` on `text` with the verifier after every step; the reports of the steps and of the
  // verifier, one per line, empty when there were none.
  std::string reportsOf(const std::string& text, const std::vector<std::string>& pipeline) {
    ssaopt::ReportLog log;
    Program* pProgram = load(text);
    if (!pProgram) return "does not load";
    VerifiedSteps steps(*pProgram);
    ssaopt::runPipeline(pProgram->graph(), ssaopt::client::pipelineNamed(pipeline), steps);
    std::string reports = steps.failedAfter.empty() ? "" : "verifier failed after " + steps.failedAfter + "\n";
    for (const std::string& message : log.messages()) reports += message + "\n";
    for (const ssaopt::ReportLog::Consistency& failure : log.consistencyFailures())
      reports += failure.condition + "\n";
    return reports;
  }
  std::string printedAfter(const std::string& text, const std::vector<std::string>& pipeline) {
    Program* pProgram = load(text);
    if (!pProgram) return "";
    ssaopt::client::runPipeline(*pProgram, pipeline);
    return ssaopt::client::printProgram(*pProgram);
  }
};

// ---- Orders the tool refuses ---------------------------------------------------------------------

TEST(PassOrderRefusals, NameThePassAndWhatIsMissing) {
  struct Refused {
    const char* passes;
    const char* error;
  };
  const Refused kRefused[] = {
      {"ssa,ssa-edges,divide",
       "pass 'divide' cannot run after 'ssa-edges': SSA edges are present (dividing would leave every SSA edge "
       "of a block on the last block of its chain)"},
      {"valid-conditions,ssa,divide,sccp,valid-conditions",
       "pass 'valid-conditions' cannot run after 'ssa': the graph is in SSA form (a virtual assignment after "
       "renaming would define a version a second time)"},
      {"sccp", "pass 'sccp' needs 'ssa' earlier in the pipeline: the graph is not in SSA form"},
      {"divide,ssa,sccp", "pass 'sccp' needs 'divide' again after 'ssa': blocks are not divided"},
      {"ssa,divide,sccp,hoist,propagate",
       "pass 'propagate' needs one of 'sccp', 'sccp-keep-dead', 'ssa-edges' again after 'hoist': there are no "
       "SSA edges"},
      {"ssa,ssa", "pass 'ssa' cannot run after 'ssa': the graph is in SSA form"},
      {"remove-unused", "pass 'remove-unused' needs 'ssa' earlier in the pipeline: the graph is not in SSA form"},
  };
  for (const Refused& refused : kRefused) {
    tooltest::Result result =
        tooltest::ssaopt(std::string("--passes=") + refused.passes + " " + tooltest::example("loop"));
    EXPECT_EQ(result.status, 2) << refused.passes;
    EXPECT_EQ(result.err.rfind(std::string("ssaopt: ") + refused.error, 0), 0u) << result.err;
    EXPECT_EQ(result.out, "");
  }
}

// The tool's list of passes says where each can run, from the same contracts.
TEST(PassOrderRefusals, TheUsageSaysWhereEachPassRuns) {
  std::string usage = tooltest::ssaopt("--help").out;
  for (const char* line : {"sccp                 sparse conditional constant propagation, removing unreachable "
                           "code (needs SSA form, divided blocks)",
                           "divide               give every block one phi function, one statement or its "
                           "condition alone (not with SSA edges)",
                           "inline               put the body of each procedure called from one place in place "
                           "of its call (needs exit nodes; not in SSA form)"})
    EXPECT_NE(usage.find(line), std::string::npos) << line;
}

// ---- Regressions of random orders ----------------------------------------------------------------

// The two branches of `if a != 0` know `a` as different versions: 1 on one, 0 on the other. Twins
// reading them are not the same code: hoisted, the statement read the version of the false branch,
// defined after it, and replace-constants made it 0 on both.
TEST_F(PassOrders, RegressionTwinsReadingTheVersionsThatABranchGivesAVariableStayApart) {
  const char* const text =
      "var int16 v5 volatile;\n"
      "var int16 a = 0;\n"
      "var int16 v9 output = 0;\n"
      "proc #main {\n"
      "  a = v5;\n"
      "  if a != 0 goto t else f;\n"
      "t:\n"
      "  v9 = -a;\n"
      "  goto end;\n"
      "f:\n"
      "  v9 = -a;\n"
      "}\n";
  const std::vector<std::string> pipeline = {"valid-conditions", "ssa", "divide", "sccp", "hoist",
                                             "replace-constants"};
  EXPECT_TRUE(behaviourtest::sameBehaviour(text, pipeline));
  std::string printed = printedAfter(text, pipeline);
  EXPECT_NE(printed.find("t:\n  v9.3 = -a.3;\n"), std::string::npos) << printed;
  EXPECT_NE(printed.find("f:\n  v9.5 = -0;\n"), std::string::npos) << printed;
  EXPECT_EQ(reportsOf(text, pipeline), "");
}

// removeUnusedVarDefs emptied the first block of a chain of phi functions; propagation with dead-code
// removal afterwards took the operand of the dead branch from the first phi function only, and the
// next one kept an operand too many.
TEST_F(PassOrders, RegressionDeadCodeRemovalPassesAnEmptiedFirstPhiOfAChain) {
  const char* const text =
      "var int16 in volatile;\n"
      "var bool c = 0;\n"
      "var int16 x erasable = 0;\n"
      "var int16 y output = 0;\n"
      "proc #main {\n"
      "  c = 1;\n"
      "  if c goto a else b;\n"
      "a:\n"
      "  x = 1;\n"
      "  y = in;\n"
      "  goto j;\n"
      "b:\n"
      "  x = 2;\n"
      "  y = 3;\n"
      "j:\n"
      "  y = y + 1;\n"
      "}\n";
  const std::vector<std::string> pipeline = {"ssa", "divide", "sccp-keep-dead", "remove-unused", "sccp"};
  EXPECT_EQ(reportsOf(text, pipeline), "");
  EXPECT_TRUE(behaviourtest::sameBehaviour(text, pipeline));
}

// A call that dead-code removal takes away leaves the parameters of its procedure without its
// arguments; the use sets went on naming the parameter nodes for what only those arguments read
// (also behind a parameter that removeUnusedVarDefs had emptied).
TEST_F(PassOrders, RegressionUseSetsForgetTheArgumentsOfADeadCall) {
  const char* const deadCall =
      "var uint8 v6 saturate(..20) = 1;\n"
      "var bool v7 = 0;\n"
      "var float32 v10 saturate(-20..20) output = 2;\n"
      "var int32 p1_0 erasable = 0;\n"
      "var uint16 p1_1 = 0;\n"
      "proc #main {\n"
      "  if v7 != 5 goto yes0 else no0;\n"
      "yes0:\n"
      "  call f2();\n"
      "  goto join0;\n"
      "no0:\n"
      "outline join0:\n"
      "  call f1(!v10, v6);\n"
      "}\n"
      "proc f1(p1_0, p1_1) {\n"
      "}\n"
      "proc f2 {\n"
      "  v10 = 3;\n"
      "}\n";
  EXPECT_EQ(reportsOf(deadCall, ssaopt::tool::defaultPipeline()), "");
  const char* const behindAnEmptiedParameter =
      "var bool v4 = 1;\n"
      "var int32 v7 scale(0.001, -2) erasable = 3;\n"
      "var int8 p3_0 = 0;\n"
      "var uint8 p3_1 erasable = 0;\n"
      "var int16 depth = 0;\n"
      "proc #main {\n"
      "  if v4 goto yes1 else no1;\n"
      "yes1:\n"
      "outline join2:\n"
      "no1:\n"
      "  call f3(abs(v7), 0);\n"
      "}\n"
      "proc f3(p3_0, p3_1) {\n"
      "  depth = depth - 1;\n"
      "}\n";
  EXPECT_EQ(reportsOf(behindAnEmptiedParameter, {"ssa", "divide", "remove-unused", "sccp"}), "");
}

// Renaming gives every definition its version, but the blocks kept the lists of assigned variables
// that phi placement had asked for, naming the variables: rebuilding the use sets later left those of
// the versions as they were, and folding `1 || x` had since taken a read away.
TEST_F(PassOrders, RegressionUseSetsAreRebuiltForTheVersionsOfUndividedBlocks) {
  const char* const text =
      "var int16 in volatile;\n"
      "var int16 x = 0;\n"
      "var bool y output = 0;\n"
      "proc #main {\n"
      "  x = in;\n"
      "  y = 1 || x;\n"
      "}\n";
  EXPECT_EQ(reportsOf(text, {"ssa", "ssa-edges", "fold", "remove-unused"}), "");
}

// Before the SSA transformation the arguments of calls stand in no block, so a definition that only
// an argument read looked unused and went.
TEST_F(PassOrders, RegressionRemovingUnusedDefinitionsWaitsForTheSSAForm) {
  EXPECT_EQ(reportsOf("var int16 v5 erasable = 1;\nvar int16 p = 0;\nvar int16 out output = 0;\n"
                      "proc #main {\n  v5 = 4;\n  call f(v5);\n}\nproc f(p) {\n  out = p;\n}\n",
                      {"remove-unused"}),
            "Internal error. Error code: ssaopt::runPipeline4001: pipeline stopped before 'remove-unused': "
            "removeUnusedVarDefs: the graph is not in SSA form (before it, what the arguments of calls read is "
            "read by no block).\n");
}

// Folded before the SSA transformation, a value that its variable cannot hold printed as a literal
// that the front end rejects; it is stored as the variable holds it, which stores the same.
TEST_F(PassOrders, RegressionAFoldedValueIsPrintedAsItsVariableHoldsIt) {
  const char* const text =
      "var float32 v8 saturate(-20..) output = 0;\n"
      "var bool a12[3] = 0;\n"
      "var int32 n output = 0;\n"
      "proc #main {\n"
      "  a12[1] = (0.5 || v8) - 3;\n"
      "  n = 3 / 2;\n"
      "}\n";
  std::string printed = printedAfter(text, {"fold"});
  EXPECT_NE(printed.find("  a12[1] = 1;\n  n = 1;\n"), std::string::npos) << printed;
  EXPECT_EQ(print(printed), printed);
  EXPECT_TRUE(behaviourtest::sameBehaviour(text, {"fold"}));
}

// Stored, -1 wraps past the limit of a uint32 saturated at 20; the value it leaves, stored again,
// would be 20, and the text cannot hold -1 as a literal of the variable: the computation stays.
TEST_F(PassOrders, RegressionAValueThatWrapsPastASaturationLimitStaysUnfolded) {
  const char* const text =
      "var uint32 v8 saturate(..20) = 3;\n"
      "var int16 k = 0;\n"
      "proc #main {\n"
      "  v8 = (k || 1) * -1;\n"
      "  extern show uses(v8);\n"
      "}\n";
  std::string printed = printedAfter(text, {"fold"});
  EXPECT_NE(printed.find("  v8 = (k || 1) * -1;\n"), std::string::npos) << printed;
  EXPECT_EQ(print(printed), printed);
  EXPECT_TRUE(behaviourtest::sameBehaviour(text, ssaopt::tool::defaultPipeline()));
}

// Every pass order that fuzzing draws keeps behaviour and verifies: a few hundred of them here, many
// thousands in CI.
TEST(PassOrderFuzzing, RandomLegalOrdersKeepBehaviourAndVerify) {
  tooltest::Result result = tooltest::ssaopt("fuzz --programs 40 --seed 500 --random-passes");
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_NE(result.out.find("fuzz: 40 programs, 0 failures"), std::string::npos) << result.out;
}

TEST(PassOrderFuzzing, RandomOrdersBelongToTheFuzzCommandAlone) {
  for (const char* arguments : {"generate --random-passes", "fuzz --random-passes --passes=ssa",
                                "--random-passes x.ssa"}) {
    tooltest::Result result = tooltest::ssaopt(arguments);
    EXPECT_EQ(result.status, 2) << arguments;
    EXPECT_NE(result.err.find("--random-passes"), std::string::npos) << result.err;
  }
}

TEST(PassOrderFuzzing, TheSameSeedDrawsTheSameLegalOrder) {
  for (std::uint64_t seed : {1u, 2u, 77u}) {
    std::vector<std::string> pipeline = ssaopt::tool::randomLegalPipeline(seed, 16);
    EXPECT_EQ(pipeline, ssaopt::tool::randomLegalPipeline(seed, 16));
    EXPECT_LE(pipeline.size(), 16u);
    EXPECT_EQ(ssaopt::tool::findPipelineError(pipeline), "") << ssaopt::tool::joinedPassNames(pipeline);
  }
}

}  // namespace
