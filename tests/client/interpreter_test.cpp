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

// ---- Statements and what they store ------------------------------------------------------------

// An index outside the array reads 0 and writes nothing: C leaves such accesses undefined, and a run
// must not stop at one, since the code may be dead code that a transformation rightly removed.
TEST_F(Interpreting, AssignmentsBranchesExternalCallsAndElementWritesRunInOrder) {
  expectAtEveryStage(
      "var int16 v volatile;\n"
      "var int16 k volatile;\n"
      "var int16 x = 0;\n"
      "var int16 y = 0;\n"
      "var int16 a[2] output = 5;\n"
      "var uint8 i = 0;\n"
      "var int16 r output = 1;\n"
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
      "  a[i] = a[i] + 10;\n"
      "  i = i + 1;\n"
      "  a[k] = 9;\n"
      "  r = a[k];\n"
      "}\n",
      2, "v 20 3\nk -1 2 1 0",
      "step 1: extern report(x = 21, y = 42)\n"
      "step 2: extern report(x = 4, y = -4)\n"
      "output a = [15, 9]\n"
      "output r = 15\n"
      "completed 2 steps\n");
}

// Operators without a result in C (remainder by zero, shifts of 32 or more) give the value
// arithmetic's result.
TEST_F(Interpreting, AnAssignmentSaturatesScalesOrCastsTheValue) {
  expectAtEveryStage(
      "var int16 w = 300;\n"
      "var int16 zero = 0;\n"
      "var int32 seven = 7;\n"
      "var int8 wrapped output = 0;\n"
      "var uint16 unsigned output = 0;\n"
      "var bool truth output = 0;\n"
      "var int16 clamped saturate(-10..10) output = 0;\n"
      "var int16 quarter scale(0.25) output = 0;\n"
      "var int16 limited scale(0.5) saturate(..1.2) output = 0;\n"
      "var float32 single output = 0;\n"
      "var int32 remainder output = 1;\n"
      "var float64 quotient output = 0;\n"
      "var int32 shifted output = 0;\n"
      "proc #main {\n"
      "  wrapped = w - 100;\n"
      "  unsigned = 0 - w;\n"
      "  truth = w;\n"
      "  clamped = w;\n"
      "  quarter = w / 273;\n"
      "  limited = w;\n"
      "  single = w / 3000;\n"
      "  remainder = seven % zero;\n"
      "  quotient = seven / zero;\n"
      "  shifted = seven << 33;\n"
      "}\n",
      1, "",
      "output wrapped = -56\n"
      "output unsigned = 65236\n"
      "output truth = 1\n"
      "output clamped = 10\n"
      "output quarter = 1\n"
      "output limited = 1.2\n"
      "output single = 0.10000000149011612\n"
      "output remainder = 0\n"
      "output quotient = inf\n"
      "output shifted = 14\n"
      "completed 1 step\n");
}

// ---- Inputs -------------------------------------------------------------------------------------

// Every read of a volatile variable takes the next value of its own stream, whatever an external
// call did; the call refills the arrays it modifies.
TEST_F(Interpreting, VolatileReadsAndModifiedArraysTakeTheNextValuesOfTheirOwnStreams) {
  expectAtEveryStage(
      "var int16 u volatile;\n"
      "var int16 level volatile;\n"
      "var int16 buf[2] = 0;\n"
      "var int16 first = 0;\n"
      "var int16 second = 0;\n"
      "var int16 copy output = 0;\n"
      "proc #main {\n"
      "  first = u;\n"
      "  extern fill modifies(buf, level);\n"
      "  second = u;\n"
      "  copy = buf[1] + level;\n"
      "  extern show uses(first, second, copy, buf);\n"
      "}\n",
      2, "u 1 2 3 4\nbuf 4 5 6 7\nlevel 100 200",
      "step 1: extern fill()\n"
      "step 1: extern show(buf = [4, 5], first = 1, second = 2, copy = 105)\n"
      "step 2: extern fill()\n"
      "step 2: extern show(buf = [6, 7], first = 3, second = 4, copy = 207)\n"
      "output copy = 207\n"
      "completed 2 steps\n");
  EXPECT_EQ(
      runSteps("var int16 u volatile;\nvar int16 x;\nproc #main {\n  x = u;\n  extern show uses(x);\n}\n", 3,
               "u 7"),
      "step 1: extern show(x = 7)\n"
      "inconclusive in step 2: no more input for 'u'\n");
}

// ---- Calls --------------------------------------------------------------------------------------

// p is a formal of outer and inner: inner's argument 300 is stored as an int8. After the SSA
// transformation the calls run through parameter and value-return statements.
TEST_F(Interpreting, ACallStoresItsArgumentsInTheFormalsAndReturnsAfterTheCall) {
  expectAtEveryStage(
      "var int16 v volatile;\n"
      "var int8 p = 0;\n"
      "var int16 q = 0;\n"
      "var int16 n = 0;\n"
      "var int16 depth output = 0;\n"
      "var int16 calls output = 0;\n"
      "proc #main {\n"
      "  call outer(v, 3);\n"
      "  extern after uses(depth);\n"
      "  calls = 0;\n"
      "  call down(4);\n"
      "}\n"
      "proc outer(p, q) {\n"
      "  depth = p;\n"
      "  call inner(q * 100);\n"
      "  depth = depth + q;\n"
      "}\n"
      "proc inner(p) {\n"
      "  extern inside uses(p, q);\n"
      "  depth = depth + p;\n"
      "}\n"
      "proc down(n) {\n"
      "  calls = calls + 1;\n"
      "  if n > 0 goto more else end;\n"
      "more:\n"
      "  call down(n - 1);\n"
      "}\n",
      2, "v 5 6",
      "step 1: extern inside(p = 44, q = 3)\n"
      "step 1: extern after(depth = 52)\n"
      "step 2: extern inside(p = 44, q = 3)\n"
      "step 2: extern after(depth = 53)\n"
      "output depth = 53\n"
      "output calls = 5\n"
      "completed 2 steps\n");
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

// Calls nest on the interpreter's own stack, not on the native one: a depth that would overflow a
// recursive interpreter runs through, and only the depth limit stops it.
TEST_F(Interpreting, RecursionRunsDeeperThanTheNativeStackUpToTheCallDepthLimit) {
  const char* text =
      "var int32 n = 0;\n"
      "var int32 calls output = 0;\n"
      "proc #main {\n"
      "  call down(200000);\n"
      "}\n"
      "proc down(n) {\n"
      "  calls = calls + 1;\n"
      "  if n > 0 goto more else end;\n"
      "more:\n"
      "  call down(n - 1);\n"
      "}\n";
  RunLimits limits;
  limits.maxCallDepth = 300000;
  limits.maxStatementsPerStep = 10'000'000;
  EXPECT_EQ(run(text, "", limits), "output calls = 200001\ncompleted 1 step\n");
  limits.maxCallDepth = 50;
  EXPECT_EQ(run(text, "", limits), "inconclusive in step 1: calls nested more than 50 deep\n");
}

// ---- Graphs that cannot be followed -------------------------------------------------------------

TEST_F(Interpreting, ABranchTheGraphCannotFollowEndsTheRunWithAFault) {
  Program& program = *load(
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
  KvCControlFlowGraph& graph = program.graph();
  ssaopt::node branch = graph.target(graph.first_adj_edge(graph.findProcedure("#main")->getEntryNode()));
  std::string name = "bb" + std::to_string(graph.getBasicBlock(branch)->getIndex());
  graph.del_edge(graph.last_adj_edge(branch));  // the false edge
  EXPECT_EQ(traceOf(program, "c 1", {}), "output x = 1\ncompleted 1 step\n");
  EXPECT_EQ(traceOf(program, "c 0", {}), "fault in step 1: " + name + " goes false but has no such edge\n");
  graph.new_edge(branch, graph.target(graph.first_adj_edge(branch)), new KvCCfgEdgeInfo());
  graph.getBasicBlock(branch)->appendBranch(nullptr);
  EXPECT_EQ(traceOf(program, "c 1", {}), "fault in step 1: " + name + " has 2 successors and no condition\n");
}

}  // namespace
