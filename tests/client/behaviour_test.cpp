// The differential check: where two traces part, that the check finds a transformation that changes
// what a program does (made by hand here, since the library's are meant to be right), that a run the
// transformed program stopped at a guard counts for nothing, and that the library's pipelines keep
// the behaviour of the examples at every stage. Regressions of single programs are in
// tests/filetests/behaviour.
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

}  // namespace
