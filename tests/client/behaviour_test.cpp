// The differential check: where two traces part, that the check finds transformations that change
// what a program does (made by hand here, since the library's are meant to be right), that runs
// stopped by a guard count for nothing, and that the library's pipelines keep the behaviour of the
// examples at every stage.
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

TEST(ComparingTraces, ValuesCompareExactlyButTheZerosAreOneValueAndNaNIsNaN) {
  EXPECT_FALSE(
      compareTraces(completed({call(1, 0.0), call(2, NAN)}), completed({call(1, -0.0), call(2, NAN)})));
  std::optional<TraceDifference> tiny =
      compareTraces(completed({call(1, 0.0)}), completed({call(1, 1e-300)}));
  ASSERT_TRUE(tiny);
  EXPECT_EQ(tiny->transformed, "step 1: extern show(x = 1e-300)");
}

TEST(ComparingTraces, TheFirstEventThatDiffersIsReportedWithItsStep) {
  std::optional<TraceDifference> where = compareTraces(completed({call(1, 1), call(2, 2), call(2, 3)}),
                                                       completed({call(1, 1), call(2, 5), call(2, 7)}));
  ASSERT_TRUE(where);
  EXPECT_EQ(where->step, 2u);
  EXPECT_EQ(where->original, "step 2: extern show(x = 2)");
  EXPECT_EQ(where->transformed, "step 2: extern show(x = 5)");
}

TEST(ComparingTraces, AnEventMissingInOneTraceMeetsTheOthersEnding) {
  std::optional<TraceDifference> where =
      compareTraces(completed({call(1, 1), call(2, 2)}), completed({call(1, 1)}));
  ASSERT_TRUE(where);
  EXPECT_EQ(where->original, "step 2: extern show(x = 2)");
  EXPECT_EQ(where->transformed, "completed 2 steps");
}

TEST(ComparingTraces, TheSameEventsWithAnotherEndingDiffer) {
  Trace faulty = completed({call(1, 1)}, 1);
  faulty.ending = Ending::Fault;
  faulty.detail = "bb3 goes false but has no such edge";
  std::optional<TraceDifference> where = compareTraces(completed({call(1, 1)}, 1), faulty);
  ASSERT_TRUE(where);
  EXPECT_EQ(where->transformed, "fault in step 1: bb3 goes false but has no such edge");
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

class WrongTransformations : public clienttest::ClientTest {
protected:
  // The program twice: as written, and after the typical run, to be broken by the test.
  void SetUp() override {
    m_pOriginal = load(kClamp);
    m_pTransformed = load(kClamp);
    ssaopt::tool::runPipeline(ssaopt::tool::defaultPipeline(), *m_pTransformed);
  }

  CheckReport check(const CheckSettings& settings = {}) {
    return ssaopt::client::checkBehaviour(*m_pOriginal, *m_pTransformed, settings);
  }

  // The block of the transformed program that holds a statement or condition `matches` accepts.
  template <class Matches>
  KvCBasicBlock* blockWhere(Matches matches) {
    for (KvCBasicBlock* pBlock : blocksOf(*m_pTransformed))
      if (matches(*pBlock)) return pBlock;
    ADD_FAILURE() << "no such block";
    return nullptr;
  }

  // Both programs agree on the seed the check reports: it reproduces the difference.
  void expectReproducible(const CheckReport& report) {
    ssaopt::client::RunLimits limits;
    limits.steps = CheckSettings().limits.steps;
    ssaopt::client::SeededInputs originalInputs(report.difference->seed);
    ssaopt::client::SeededInputs transformedInputs(report.difference->seed);
    EXPECT_TRUE(compareTraces(ssaopt::client::Interpreter(*m_pOriginal).run(limits, originalInputs),
                              ssaopt::client::Interpreter(*m_pTransformed).run(limits, transformedInputs)));
  }

  Program* m_pOriginal = nullptr;
  Program* m_pTransformed = nullptr;
};

TEST_F(WrongTransformations, ChangingTheValueAnAssignmentStoresIsCaught) {
  ASSERT_FALSE(check().difference);
  // y = 0 becomes y = 1.
  KvCBasicBlock* pBlock = blockWhere([this](KvCBasicBlock& block) {
    KvCCfgStatement* pStatement = block.isStatement();
    KvCCfgSFAssignment* pAssignment = pStatement ? pStatement->isSFAssignment() : nullptr;
    return pAssignment && pAssignment->getSFRHS()->getTerms().size() == 1 &&
           pAssignment->getSFRHS()->getTerms()[0].op == ssaopt::client::TermOp::Literal &&
           ssaopt::client::originalOf(pAssignment->getLHS()) == m_pTransformed->findVariable("y");
  });
  ASSERT_TRUE(pBlock);
  pBlock->isStatement()->isSFAssignment()->getSFRHS()->replaceConditionWithConstant(1.0);
  CheckReport report = check();
  ASSERT_TRUE(report.difference) << formatReport(report);
  const TraceDifference& where = report.difference->where;
  EXPECT_EQ(where.original, "step " + std::to_string(where.step) + ": extern show(y = 0)");
  EXPECT_EQ(where.transformed, "step " + std::to_string(where.step) + ": extern show(y = 1)");
  expectReproducible(report);
}

TEST_F(WrongTransformations, DroppingAnExternalCallIsCaught) {
  KvCBasicBlock* pBlock = blockWhere(
      [](KvCBasicBlock& block) { return block.isStatement() && block.isStatement()->isExternCall(); });
  ASSERT_TRUE(pBlock);
  pBlock->del(pBlock->isStatement());
  CheckReport report = check();
  ASSERT_TRUE(report.difference) << formatReport(report);
  EXPECT_EQ(report.difference->seed, CheckSettings().firstSeed);
  EXPECT_EQ(report.difference->where.step, 1u);
  EXPECT_EQ(report.difference->where.transformed.rfind("output y = ", 0), 0u)
      << report.difference->where.transformed;
}

TEST_F(WrongTransformations, SwappingTheEdgesOfABranchIsCaught) {
  KvCBasicBlock* pBlock = blockWhere([this](KvCBasicBlock& block) {
    return block.getBranchCond() && block.getBranchCond() != m_pTransformed->mainLoopCondition();
  });
  ASSERT_TRUE(pBlock);
  KvCControlFlowGraph& graph = m_pTransformed->graph();
  for (ssaopt::node v : graph.nodes())
    if (graph.getBasicBlock(v) == pBlock) {
      ssaopt::edge first = graph.first_adj_edge(v);
      ssaopt::edge second = graph.adj_succ(first);
      KvCCfgEdgeInfo* pFirst = graph.inf(first);
      graph.assign(first, graph.inf(second));
      graph.assign(second, pFirst);
    }
  CheckReport report = check();
  ASSERT_TRUE(report.difference) << formatReport(report);
  expectReproducible(report);
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

class GuardedChecks : public clienttest::ClientTest {
protected:
  static CheckSettings guarded() {
    CheckSettings settings;
    settings.limits.maxStatementsPerStep = 1000;
    return settings;
  }
};

TEST_F(GuardedChecks, RunsThatHitAGuardAreReportedAndSkipped) {
  Program* pOriginal = load(kSpinsOnLargeInputs);
  Program* pTransformed = load(kSpinsOnLargeInputs);
  ssaopt::tool::runPipeline(ssaopt::tool::defaultPipeline(), *pTransformed);
  CheckReport report = ssaopt::client::checkBehaviour(*pOriginal, *pTransformed, guarded());
  EXPECT_FALSE(report.difference);
  ASSERT_FALSE(report.inconclusive.empty());
  EXPECT_GT(report.sameRuns, 0u);
  EXPECT_EQ(report.sameRuns + report.inconclusive.size(), guarded().runs);
  EXPECT_TRUE(report.inconclusive.front().inOriginal);
  EXPECT_NE(formatReport(report).find("the original program is inconclusive in step "), std::string::npos)
      << formatReport(report);
}

// The transformed program spins whatever the input: wrong, but a run that stops at a guard cannot
// tell whether the program would have gone on as the original did.
TEST_F(GuardedChecks, AGuardInTheTransformedProgramIsNoDifference) {
  Program* pOriginal = load(kSpinsOnLargeInputs);
  Program* pTransformed = load(kSpinsOnLargeInputs);
  for (KvCBasicBlock* pBlock : blocksOf(*pTransformed))
    if (pBlock->getBranchCond() && pBlock->getBranchCond() != pTransformed->mainLoopCondition())
      pBlock->getBranchCond()->replaceConditionWithConstant(1.0);
  CheckReport report = ssaopt::client::checkBehaviour(*pOriginal, *pTransformed, guarded());
  EXPECT_FALSE(report.difference);
  EXPECT_EQ(report.sameRuns, 0u);
  EXPECT_EQ(report.inconclusive.size(), guarded().runs);
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
