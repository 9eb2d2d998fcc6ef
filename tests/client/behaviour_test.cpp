// The differential check: where two traces part, that the check finds a transformation that changes
// what a program does (made by hand here, since the library's are meant to be right), that a run the
// transformed program stopped at a guard counts for nothing, and that the library's pipelines keep
// the behaviour of the examples at every stage.
#include "behaviour.h"

#include <cmath>

#include "client_testing.h"
#include "ssaopt/client/interpreter.h"

namespace {

using ssaopt::client::CheckReport;
using ssaopt::client::CheckSettings;
using ssaopt::client::compareTraces;
using ssaopt::client::Ending;
using ssaopt::client::Event;
using ssaopt::client::Program;
using ssaopt::client::Trace;
using ssaopt::client::TraceDifference;

// ---- Comparing traces ---------------------------------------------------------------------------

Event call(std::uint64_t step, double x) {
  return Event{Event::Kind::ExternCall, step, "show", {{"x", {x}}}};
}

Trace completed(std::vector<Event> events, std::uint64_t steps = 2) {
  Trace trace;
  trace.events = std::move(events);
  trace.step = steps;
  return trace;
}

// The zeros are one value and NaN equals NaN; otherwise values compare exactly. A difference names
// the first event that differs, with its step, or the ending that the other trace met instead.
TEST(ComparingTraces, TheFirstDifferenceIsReportedWithItsStep) {
  Trace faulty = completed({call(1, 1)}, 1);
  faulty.ending = Ending::Fault;
  faulty.detail = "bb3 goes false but has no such edge";
  struct Case {
    Trace original, transformed;
    const char *expectedOriginal, *expectedTransformed;
  } const cases[] = {
      {completed({call(1, 0.0)}), completed({call(1, 1e-300)}), "step 1: extern show(x = 0)",
       "step 1: extern show(x = 1e-300)"},
      {completed({call(1, 1), call(2, 2), call(2, 3)}), completed({call(1, 1), call(2, 5), call(2, 7)}),
       "step 2: extern show(x = 2)", "step 2: extern show(x = 5)"},
      {completed({call(1, 1), call(2, 2)}), completed({call(1, 1)}), "step 2: extern show(x = 2)",
       "completed 2 steps"},
      {completed({call(1, 1)}, 1), faulty, "completed 1 step",
       "fault in step 1: bb3 goes false but has no such edge"},
  };
  EXPECT_FALSE(
      compareTraces(completed({call(1, 0.0), call(2, NAN)}), completed({call(1, -0.0), call(2, NAN)})));
  for (const Case& c : cases) {
    std::optional<TraceDifference> where = compareTraces(c.original, c.transformed);
    ASSERT_TRUE(where) << c.expectedTransformed;
    EXPECT_EQ(where->original, c.expectedOriginal);
    EXPECT_EQ(where->transformed, c.expectedTransformed);
  }
}

// ---- The check finds what changes behaviour -----------------------------------------------------

const char* const kClamp =
    "var int16 v volatile;\n"
    "var int16 x = 0;\n"
    "var int16 y output = 0;\n"
    "proc #main {\n"
    "  x = v;\n"
    "  if x > 100 goto high else low;\n"
    "high:\n"
    "  y = x - 100;\n"
    "  goto show;\n"
    "low:\n"
    "  y = 0;\n"
    "show:\n"
    "  extern show uses(y);\n"
    "}\n";

using WrongTransformations = clienttest::ClientTest;

// y = 0 becomes y = 1 after the typical run; the check reports where, and the seed it names gives the
// same difference again.
TEST_F(WrongTransformations, ChangingTheValueAnAssignmentStoresIsCaught) {
  Program* pOriginal = load(kClamp);
  Program* pTransformed = load(kClamp);
  ssaopt::tool::runPipeline(ssaopt::tool::defaultPipeline(), *pTransformed);
  ASSERT_FALSE(ssaopt::client::checkBehaviour(*pOriginal, *pTransformed, {}).difference);
  for (KvCBasicBlock* pBlock : blocksOf(*pTransformed)) {
    KvCCfgStatement* pStatement = pBlock->isStatement();
    KvCCfgSFAssignment* pAssignment = pStatement ? pStatement->isSFAssignment() : nullptr;
    if (pAssignment && pAssignment->getSFRHS()->getTerms().size() == 1 &&
        pAssignment->getSFRHS()->getTerms()[0].op == ssaopt::client::TermOp::Literal &&
        ssaopt::client::originalOf(pAssignment->getLHS()) == pTransformed->findVariable("y"))
      pAssignment->getSFRHS()->replaceConditionWithConstant(1.0);
  }
  CheckReport report = ssaopt::client::checkBehaviour(*pOriginal, *pTransformed, {});
  ASSERT_TRUE(report.difference) << formatReport(report);
  const TraceDifference& where = report.difference->where;
  EXPECT_EQ(where.original, "step " + std::to_string(where.step) + ": extern show(y = 0)");
  EXPECT_EQ(where.transformed, "step " + std::to_string(where.step) + ": extern show(y = 1)");
  ssaopt::client::RunLimits limits;
  limits.steps = CheckSettings().limits.steps;
  ssaopt::client::SeededInputs originalInputs(report.difference->seed),
      transformedInputs(report.difference->seed);
  EXPECT_TRUE(compareTraces(ssaopt::client::Interpreter(*pOriginal).run(limits, originalInputs),
                            ssaopt::client::Interpreter(*pTransformed).run(limits, transformedInputs)));
}

// ---- Runs that prove nothing --------------------------------------------------------------------

const char* const kSpinsOnLargeInputs =
    "var int16 v volatile;\n"
    "var int16 x = 0;\n"
    "proc #main {\n"
    "  x = v;\n"
    "  extern show uses(x);\n"
    "spin:\n"
    "  if x > 30000 goto spin else end;\n"
    "}\n";

using GuardedChecks = clienttest::ClientTest;

// The transformed program spins whatever the input: wrong, but a run that stops at a guard cannot
// tell whether the program would have gone on as the original did.
TEST_F(GuardedChecks, AGuardInTheTransformedProgramIsNoDifference) {
  Program* pOriginal = load(kSpinsOnLargeInputs);
  Program* pTransformed = load(kSpinsOnLargeInputs);
  for (KvCBasicBlock* pBlock : blocksOf(*pTransformed))
    if (pBlock->getBranchCond() && pBlock->getBranchCond() != pTransformed->mainLoopCondition())
      pBlock->getBranchCond()->replaceConditionWithConstant(1.0);
  CheckSettings guarded;
  guarded.limits.maxStatementsPerStep = 1000;
  CheckReport report = ssaopt::client::checkBehaviour(*pOriginal, *pTransformed, guarded);
  EXPECT_FALSE(report.difference);
  EXPECT_EQ(report.sameRuns, 0u);
  EXPECT_EQ(report.inconclusive.size(), guarded.runs);
  EXPECT_FALSE(report.inconclusive.front().inOriginal);
}

// ---- The library's pipelines keep the behaviour ------------------------------------------------

std::vector<std::vector<std::string>> pipelines() {
  std::vector<std::vector<std::string>> pipelines;
  std::vector<std::string> prefix;
  for (const std::string& pass : ssaopt::tool::defaultPipeline()) {
    prefix.push_back(pass);
    pipelines.push_back(prefix);
  }
  pipelines.push_back({"ssa", "divide", "sccp-keep-dead", "replace-constants", "replace-conditions", "fold",
                       "remove-unused"});
  return pipelines;
}

TEST(Behaviour, EveryExampleBehavesTheSameAfterEachStageOfThePipeline) {
  for (const char* example : clienttest::kExamples)
    for (const std::vector<std::string>& pipeline : pipelines())
      EXPECT_TRUE(behaviourtest::sameBehaviour(clienttest::readExample(example), pipeline))
          << example << " after " << ssaopt::tool::joinedPassNames(pipeline);
}

// The summaries pass v to the callee through a parameter statement; reading v there would take an
// input the program never reads.
TEST(Behaviour, AParameterStatementThatPassesAVolatileToItselfReadsNoInput) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var int16 v volatile;\n"
                                   "var int16 x output = 0;\n"
                                   "proc #main {\n"
                                   "  call take();\n"
                                   "  call take();\n"
                                   "}\n"
                                   "proc take {\n"
                                   "  x = x + v;\n"
                                   "}\n",
                                   {"ssa"}));
}

// Virtual assignments record what a condition implies and generate no code: b, volatile, keeps the
// value the program stored (none, so its initial 0) whatever its reads gave.
TEST(Behaviour, VirtualAssignmentsRunAsNothing) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var bool b volatile;\n"
                                   "var int16 y output = 0;\n"
                                   "proc #main {\n"
                                   "  if b goto yes else no;\n"
                                   "yes:\n"
                                   "  y = y + 1;\n"
                                   "no:\n"
                                   "  extern show uses(b);\n"
                                   "}\n",
                                   {"valid-conditions", "ssa", "divide"}));
}

// The parameter statement of an unused formal was removed although its argument reads a volatile
// input: the program then read one input fewer per call, and later reads saw other values.
TEST(Behaviour, RegressionAParameterWhoseArgumentReadsAnInputStays) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var int16 v volatile;\n"
                                   "var int16 p erasable = 0;\n"
                                   "var int16 x = 0;\n"
                                   "proc #main {\n"
                                   "  call f(v);\n"
                                   "  call f(v);\n"
                                   "  x = v;\n"
                                   "  extern show uses(x);\n"
                                   "}\n"
                                   "proc f(p) {\n"
                                   "}\n",
                                   {"ssa", "divide", "remove-unused"}));
}

// A volatile Boolean compared with a constant outside 0 and 1 has a fixed outcome, but replacing the
// condition by it dropped the read of the input: every later read saw another value.
TEST(Behaviour, RegressionAFixedComparisonOfAnInputKeepsItsRead) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var bool in0 volatile;\n"
                                   "var bool seen output = 0;\n"
                                   "proc #main {\n"
                                   "  if in0 != 5 goto yes else no;\n"
                                   "yes:\n"
                                   "  seen = in0;\n"
                                   "no:\n"
                                   "}\n",
                                   {"valid-conditions"}));
}

// Storing -1 in an unsigned variable saturated at 20 leaves 4294967295 (the clamp comes before the
// cast); the phi function joining two such stores adjusted the value again and clamped it to 20.
TEST(Behaviour, RegressionAPhiFunctionDoesNotSaturateWhatItsOperandsHold) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var bool one = 0;\n"
                                   "var bool in0 volatile;\n"
                                   "var uint32 u saturate(..20) = 0;\n"
                                   "var float32 y output = 0;\n"
                                   "proc #main {\n"
                                   "  one = 1;\n"
                                   "  if in0 goto a else b;\n"
                                   "a:\n"
                                   "  u = -one;\n"
                                   "  goto j;\n"
                                   "b:\n"
                                   "  u = -one;\n"
                                   "j:\n"
                                   "  y = u;\n"
                                   "}\n",
                                   {"ssa", "divide", "sccp", "replace-constants"}));
}

// The same through a value-return statement: what a procedure stored comes back to its caller as it
// was, not saturated again.
TEST(Behaviour, RegressionAReturnedValueIsNotSaturatedAgain) {
  EXPECT_TRUE(
      behaviourtest::sameBehaviour("var bool one = 0;\n"
                                   "var uint32 u saturate(..20) = 0;\n"
                                   "var float32 y output = 0;\n"
                                   "proc #main {\n"
                                   "  call set();\n"
                                   "  call set();\n"
                                   "  y = u;\n"
                                   "}\n"
                                   "proc set {\n"
                                   "  one = 1;\n"
                                   "  u = -one;\n"
                                   "}\n",
                                   {"ssa", "divide", "sccp", "replace-constants"}));
}

}  // namespace
