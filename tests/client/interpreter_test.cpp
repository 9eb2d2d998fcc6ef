// The interpreter runs programs as their C code would: programs in the textual format, input values
// listed per variable, and the trace they give. Most programs run at every stage of the pipeline and
// must give the same trace at each: as written, in SSA form, in divided blocks, after constant
// propagation removed what it could not reach, and after the whole typical run.
#include "ssaopt/client/interpreter.h"

#include <optional>

#include "client_testing.h"
#include "passes.h"

namespace {

using ssaopt::client::Interpreter;
using ssaopt::client::ListedInputs;
using ssaopt::client::Program;
using ssaopt::client::RunLimits;
using ssaopt::client::Trace;
using Pipeline = std::vector<std::string>;

// Constant propagation leaves its SSA edges in the graph, where the interpreter must not follow them.
std::vector<Pipeline> stages() {
  return {{}, {"ssa"}, {"ssa", "divide"}, {"ssa", "divide", "sccp"}, ssaopt::tool::defaultPipeline()};
}

class Interpreting : public clienttest::ClientTest {
protected:
  // The events and the ending of one run of `text` after `pipeline`, one per line, on the values
  // that `inputs` lists.
  std::string run(const std::string& text, const std::string& inputs = "", const RunLimits& limits = {},
                  const Pipeline& pipeline = {}) {
    Program* pProgram = load(text);
    if (!pProgram) return "";
    ssaopt::tool::runPipeline(pipeline, *pProgram);
    return traceOf(*pProgram, inputs, limits);
  }

  std::string runSteps(const std::string& text, std::uint64_t steps, const std::string& inputs = "",
                       const Pipeline& pipeline = {}) {
    RunLimits limits;
    limits.steps = steps;
    return run(text, inputs, limits, pipeline);
  }

  // Expects the same trace at every stage of the pipeline.
  void expectAtEveryStage(const std::string& text, std::uint64_t steps, const std::string& inputs,
                          const std::string& expected) {
    for (const Pipeline& pipeline : stages())
      EXPECT_EQ(runSteps(text, steps, inputs, pipeline), expected)
          << "after " << ssaopt::tool::joinedPassNames(pipeline);
  }

  static std::string traceOf(const Program& program, const std::string& inputs, const RunLimits& limits) {
    std::string error;
    std::optional<ListedInputs> streams = ListedInputs::parse(inputs, error);
    if (!streams) return error;
    return shown(Interpreter(program).run(limits, *streams));
  }

  static std::string shown(const Trace& trace) {
    std::string text;
    for (const ssaopt::client::Event& event : trace.events) text += formatEvent(event) + "\n";
    return text + formatEnding(trace) + "\n";
  }
};

// ---- Statements ---------------------------------------------------------------------------------

TEST_F(Interpreting, AssignmentsBranchesAndExternalCallsRunInOrder) {
  expectAtEveryStage(
      "var int16 v volatile;\n"
      "var int16 x = 0;\n"
      "var int16 y = 0;\n"
      "proc #main {\n"
      "  x = v + 1;\n"
      "  if x > 10 goto big else small;\n"
      "big:\n"
      "  y = x * 2;\n"
      "  goto show;\n"
      "small:\n"
      "  y = 0 - x;\n"
      "show:\n"
      "  extern report uses(y, x);\n"
      "}\n",
      2, "v 20 3",
      "step 1: extern report(x = 21, y = 42)\n"
      "step 2: extern report(x = 4, y = -4)\n"
      "completed 2 steps\n");
}

TEST_F(Interpreting, AnElementWriteChangesOneElementAndOutputsShowWholeArrays) {
  expectAtEveryStage(
      "var int16 a[3] output = 1;\n"
      "var uint8 i = 0;\n"
      "var int16 total output = 0;\n"
      "proc #main {\n"
      "  a[i] = a[i] + 10;\n"
      "  i = i + 1;\n"
      "  total = a[0] + a[1] + a[2];\n"
      "}\n",
      2, "",
      "output a = [11, 11, 1]\n"
      "output total = 23\n"
      "completed 2 steps\n");
}

// C leaves such accesses undefined; a run must not stop at one, since the code may be dead code that
// a transformation rightly removed.
TEST_F(Interpreting, AnIndexOutsideTheArrayReadsZeroAndWritesNothing) {
  expectAtEveryStage(
      "var int16 a[2] output = 5;\n"
      "var int16 k volatile;\n"
      "var int16 r output = 1;\n"
      "proc #main {\n"
      "  a[k] = 9;\n"
      "  r = a[k];\n"
      "}\n",
      1, "k -1 2",
      "output a = [5, 5]\n"
      "output r = 0\n"
      "completed 1 step\n");
}

TEST_F(Interpreting, StatementsOfTheLibraryRunAsTheCodeTheyStandFor) {
  // After the SSA transformation: initialisations, phi functions of the loop, parameter and
  // value-return statements of the calls, the output statement. The second call passes x to x.
  expectAtEveryStage(
      "var int16 v volatile;\n"
      "var int16 x = 2;\n"
      "var int16 s output = 0;\n"
      "proc #main {\n"
      "  call add(v);\n"
      "  call add(x);\n"
      "}\n"
      "proc add(x) {\n"
      "  s = s + x;\n"
      "}\n",
      2, "v 10 20",
      "output s = 60\n"
      "completed 2 steps\n");
}

// ---- What an assignment stores ------------------------------------------------------------------

TEST_F(Interpreting, AnAssignmentSaturatesScalesOrCastsTheValue) {
  expectAtEveryStage(
      "var int16 w = 300;\n"
      "var int8 wrapped output = 0;\n"
      "var uint16 unsigned output = 0;\n"
      "var bool truth output = 0;\n"
      "var int16 clamped saturate(-10..10) output = 0;\n"
      "var int16 quarter scale(0.25) output = 0;\n"
      "var int16 limited scale(0.5) saturate(..1.2) output = 0;\n"
      "var float32 single output = 0;\n"
      "proc #main {\n"
      "  wrapped = w - 100;\n"
      "  unsigned = 0 - w;\n"
      "  truth = w;\n"
      "  clamped = w;\n"
      "  quarter = w / 273;\n"
      "  limited = w;\n"
      "  single = w / 3000;\n"
      "}\n",
      1, "",
      "output wrapped = -56\n"
      "output unsigned = 65236\n"
      "output truth = 1\n"
      "output clamped = 10\n"
      "output quarter = 1\n"
      "output limited = 1.2\n"
      "output single = 0.10000000149011612\n"
      "completed 1 step\n");
}

TEST_F(Interpreting, OperatorsWithoutAResultInCStillGiveTheValueArithmeticsOne) {
  expectAtEveryStage(
      "var int16 zero = 0;\n"
      "var int32 seven = 7;\n"
      "var int32 remainder output = 1;\n"
      "var float64 quotient output = 0;\n"
      "var int32 shifted output = 0;\n"
      "proc #main {\n"
      "  remainder = seven % zero;\n"
      "  quotient = seven / zero;\n"
      "  shifted = seven << 33;\n"
      "}\n",
      1, "",
      "output remainder = 0\n"
      "output quotient = inf\n"
      "output shifted = 14\n"
      "completed 1 step\n");
}

// ---- Inputs -------------------------------------------------------------------------------------

TEST_F(Interpreting, EveryReadOfAVolatileVariableTakesTheNextValueOfItsOwnStream) {
  expectAtEveryStage(
      "var int16 u volatile;\n"
      "var int16 v volatile;\n"
      "var int16 first = 0;\n"
      "var int16 second = 0;\n"
      "var int16 third = 0;\n"
      "proc #main {\n"
      "  first = u;\n"
      "  second = v;\n"
      "  third = u;\n"
      "  extern show uses(first, second, third);\n"
      "}\n",
      2, "u 1 2 3 4\nv 10 20",
      "step 1: extern show(first = 1, second = 10, third = 2)\n"
      "step 2: extern show(first = 3, second = 20, third = 4)\n"
      "completed 2 steps\n");
}

TEST_F(Interpreting, ARunWhoseInputRunsOutIsInconclusive) {
  EXPECT_EQ(runSteps("var int16 u volatile;\n"
                     "var int16 x output = 0;\n"
                     "proc #main {\n"
                     "  x = u;\n"
                     "  extern show uses(x);\n"
                     "}\n",
                     3, "u 7"),
            "step 1: extern show(x = 7)\n"
            "inconclusive in step 2: no more input for 'u'\n");
}

TEST_F(Interpreting, AnExternalCallRecordsWhatItUsesAndRefillsTheArraysItModifies) {
  // level is volatile: its reads take their own values whatever the call did.
  expectAtEveryStage(
      "var int16 buf[2] = 0;\n"
      "var int16 level volatile;\n"
      "var int16 copy output = 0;\n"
      "proc #main {\n"
      "  extern fill modifies(buf, level);\n"
      "  copy = buf[1] + level;\n"
      "  extern show uses(copy, buf);\n"
      "}\n",
      2, "buf 4 5 6 7\nlevel 100 200",
      "step 1: extern fill()\n"
      "step 1: extern show(buf = [4, 5], copy = 105)\n"
      "step 2: extern fill()\n"
      "step 2: extern show(buf = [6, 7], copy = 207)\n"
      "output copy = 207\n"
      "completed 2 steps\n");
}

// ---- Calls --------------------------------------------------------------------------------------

TEST_F(Interpreting, ACallStoresItsArgumentsInTheFormalsAndReturnsAfterTheCall) {
  // p is a formal of both procedures: inner's argument 300 is stored as an int8.
  expectAtEveryStage(
      "var int16 v volatile;\n"
      "var int8 p = 0;\n"
      "var int16 q = 0;\n"
      "var int16 depth output = 0;\n"
      "proc #main {\n"
      "  call outer(v, 3);\n"
      "  extern after uses(depth);\n"
      "}\n"
      "proc outer(p, q) {\n"
      "  depth = p;\n"
      "  call inner(q * 100);\n"
      "  depth = depth + q;\n"
      "}\n"
      "proc inner(p) {\n"
      "  extern inside uses(p, q);\n"
      "  depth = depth + p;\n"
      "}\n",
      1, "v 5",
      "step 1: extern inside(p = 44, q = 3)\n"
      "step 1: extern after(depth = 52)\n"
      "output depth = 52\n"
      "completed 1 step\n");
}

TEST_F(Interpreting, ARecursiveCallPassesItsOwnFormalOnChanged) {
  expectAtEveryStage(
      "var int16 n = 0;\n"
      "var int16 calls output = 0;\n"
      "proc #main {\n"
      "  calls = 0;\n"
      "  call down(4);\n"
      "}\n"
      "proc down(n) {\n"
      "  calls = calls + 1;\n"
      "  if n > 0 goto more else end;\n"
      "more:\n"
      "  call down(n - 1);\n"
      "}\n",
      1, "",
      "output calls = 5\n"
      "completed 1 step\n");
}

// ---- The main loop ------------------------------------------------------------------------------

TEST_F(Interpreting, TheLoopAroundMainRunsTheGivenNumberOfSteps) {
  const char* counter =
      "var int32 count output = 0;\n"
      "proc #main {\n"
      "  count = count + 1;\n"
      "  extern tick uses(count);\n"
      "}\n";
  expectAtEveryStage(counter, 3, "",
                     "step 1: extern tick(count = 1)\n"
                     "step 2: extern tick(count = 2)\n"
                     "step 3: extern tick(count = 3)\n"
                     "output count = 3\n"
                     "completed 3 steps\n");
  // The body runs before the loop asks whether to go on.
  EXPECT_EQ(runSteps(counter, 0),
            "step 1: extern tick(count = 1)\n"
            "output count = 1\n"
            "completed 1 step\n");
}

// ---- Guards -------------------------------------------------------------------------------------

TEST_F(Interpreting, AnEndlessLoopStopsAtTheStatementLimitOfAStep) {
  RunLimits limits;
  limits.steps = 5;
  limits.maxStatementsPerStep = 1000;
  const char* text =
      "var int16 x = 0;\n"
      "var int16 v volatile;\n"
      "proc #main {\n"
      "  x = v;\n"
      "spin:\n"
      "  if x > 0 goto spin else end;\n"
      "}\n";
  EXPECT_EQ(run(text, "v -1 -2 5", limits),
            "inconclusive in step 3: more than 1000 statements in one step\n");
  // The limit counts each step on its own: many short steps are no endless loop.
  limits.steps = 3000;
  std::string zeros = "v";
  for (int i = 0; i < 3000; ++i) zeros += " 0";
  EXPECT_EQ(run(text, zeros, limits), "completed 3000 steps\n");
}

TEST_F(Interpreting, EndlessRecursionStopsAtTheCallDepthLimit) {
  RunLimits limits;
  limits.maxCallDepth = 50;
  EXPECT_EQ(run("proc #main {\n"
                "  call again();\n"
                "}\n"
                "proc again {\n"
                "  call again();\n"
                "}\n",
                "", limits),
            "inconclusive in step 1: calls nested more than 50 deep\n");
}

// Calls nest on the interpreter's own stack, not on the native one: a depth that would overflow a
// recursive interpreter runs through.
TEST_F(Interpreting, DeepRecursionRunsWithinTheLimit) {
  RunLimits limits;
  limits.maxCallDepth = 300000;
  limits.maxStatementsPerStep = 10'000'000;
  EXPECT_EQ(run("var int32 n = 0;\n"
                "var int32 calls output = 0;\n"
                "proc #main {\n"
                "  call down(200000);\n"
                "}\n"
                "proc down(n) {\n"
                "  calls = calls + 1;\n"
                "  if n > 0 goto more else end;\n"
                "more:\n"
                "  call down(n - 1);\n"
                "}\n",
                "", limits),
            "output calls = 200001\n"
            "completed 1 step\n");
}

// ---- Graphs that cannot be followed -------------------------------------------------------------

class BrokenGraphs : public Interpreting {
protected:
  // The program of a single branch on a volatile Boolean, and its branching block.
  Program* branching() {
    m_pProgram = load(
        "var bool c volatile;\n"
        "var int16 x output = 0;\n"
        "proc #main {\n"
        "  if c goto yes else no;\n"
        "yes:\n"
        "  x = 1;\n"
        "  goto end;\n"
        "no:\n"
        "  x = 2;\n"
        "}\n");
    for (ssaopt::node v : m_pProgram->graph().nodes()) {
      KvCBasicBlock* pBlock = m_pProgram->graph().getBasicBlock(v);
      if (pBlock && pBlock->getBranchCond() && pBlock->getBranchCond() != m_pProgram->mainLoopCondition())
        m_Branch = v;
    }
    return m_pProgram;
  }

  ssaopt::edge outEdge(bool trueBranch) {
    for (ssaopt::edge e : m_pProgram->graph().out(m_Branch))
      if ((m_pProgram->graph().inf(e)->isTrueBranch() != nullptr) == trueBranch) return e;
    return ssaopt::edge();
  }

  std::string branchName() {
    return "bb" + std::to_string(m_pProgram->graph().getBasicBlock(m_Branch)->getIndex());
  }

  Program* m_pProgram = nullptr;
  ssaopt::node m_Branch;
};

TEST_F(BrokenGraphs, AConditionThatSelectsAMissingEdgeEndsTheRunWithAFault) {
  Program& program = *branching();
  program.graph().del_edge(outEdge(false));
  EXPECT_EQ(traceOf(program, "c 1", {}), "output x = 1\ncompleted 1 step\n");
  EXPECT_EQ(traceOf(program, "c 0", {}),
            "fault in step 1: " + branchName() + " goes false but has no such edge\n");
}

TEST_F(BrokenGraphs, ABlockWithTwoSuccessorsAndNoConditionEndsTheRunWithAFault) {
  Program& program = *branching();
  program.graph().getBasicBlock(m_Branch)->appendBranch(nullptr);
  EXPECT_EQ(traceOf(program, "c 1", {}),
            "fault in step 1: " + branchName() + " has 2 successors and no condition\n");
}

}  // namespace
