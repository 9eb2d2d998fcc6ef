// The whole pipeline end to end: the typical run of a client step by step, hoisting as a real change
// of the program, and the examples through the default pipeline.
#include <algorithm>
#include <string>
#include <vector>

#include "client/behaviour.h"
#include "client/client_testing.h"
#include "passes.h"

namespace {

using ssaopt::client::printProgram;
using ssaopt::client::Program;

// The procedures of a printed program; no pass changes the declarations before them.
std::string proceduresOf(const std::string& printed) { return printed.substr(printed.find("proc ")); }

struct Step {
  const char* pass;
  const char* after;  // null where the pass changes nothing
};

// examples/typical_run.ssa: "#main" sets the Boolean `enabled` to 1 and tests it; the true branch calls
// limitCommand, which nothing else calls.
const Step kTypicalRun[] = {
    // The call of limitCommand, its only call, is registered; the call block gives way to an empty
    // block of parameter assignments (it has none), which leads into the body. The procedure is gone.
    {"inline",
     "proc #main {\n"
     "  enabled = 1;\n"
     "  if enabled goto on else off;\n"
     "off:\n"
     "  command = 0;\n"
     "  goto end;\n"
     "bb3:\n"
     "  limit = 100;\n"
     "  command = speed;\n"
     "  if command > limit goto clamp else end;\n"
     "clamp:\n"
     "  command = limit;\n"
     "  goto end;\n"
     "on:\n"
     "  goto bb3;\n"
     "}\n"},
    // Each branch on `enabled` learns its value there: 1 on the true edge, 0 on the false edge.
    {"valid-conditions",
     "proc #main {\n"
     "  enabled = 1;\n"
     "  if enabled goto bb8 else bb9;\n"
     "off:\n"
     "  command = 0;\n"
     "  goto end;\n"
     "bb3:\n"
     "  limit = 100;\n"
     "  command = speed;\n"
     "  if command > limit goto clamp else end;\n"
     "clamp:\n"
     "  command = limit;\n"
     "  goto end;\n"
     "on:\n"
     "  goto bb3;\n"
     "bb8:\n"
     "  virtual enabled = 1;\n"
     "  goto on;\n"
     "bb9:\n"
     "  virtual enabled = 0;\n"
     "  goto off;\n"
     "}\n"},
    // Initialisations after the entry, phi functions at the joins (the loop around "#main" among
    // them), the output statement before the exit, and a version for every definition.
    {"ssa",
     "proc #main {\n"
     "bb10:\n"
     "  init enabled.1 = 0;\n"
     "  init speed.1 = 0;\n"
     "  init limit.1 = 0;\n"
     "  init command.1 = 0;\n"
     "bb0:\n"
     "  enabled.2 = phi(enabled.1 from bb10, enabled.4 from bb6);\n"
     "  command.2 = phi(command.1 from bb10, command.3 from bb6);\n"
     "  limit.2 = phi(limit.1 from bb10, limit.3 from bb6);\n"
     "  enabled.3 = 1;\n"
     "  if enabled.3 goto bb8 else bb9;\n"
     "off:\n"
     "  command.6 = 0;\n"
     "  goto bb6;\n"
     "bb3:\n"
     "  limit.4 = 100;\n"
     "  command.4 = speed.1;\n"
     "  if command.4 > limit.4 goto clamp else bb5;\n"
     "clamp:\n"
     "  command.5 = limit.4;\n"
     "  goto bb6;\n"
     "bb5:\n"
     "bb6:\n"
     "  enabled.4 = phi(enabled.6 from off, enabled.5 from clamp, enabled.5 from bb5);\n"
     "  command.3 = phi(command.6 from off, command.5 from clamp, command.4 from bb5);\n"
     "  limit.3 = phi(limit.2 from off, limit.4 from clamp, limit.4 from bb5);\n"
     "  if ? goto bb0 else bb11;\n"
     "on:\n"
     "  goto bb3;\n"
     "bb8:\n"
     "  virtual enabled.5 = 1;\n"
     "  goto on;\n"
     "bb9:\n"
     "  virtual enabled.6 = 0;\n"
     "  goto off;\n"
     "bb11:\n"
     "  output command.3;\n"
     "}\n"},
    // One phi function, one statement or one condition per block.
    {"divide",
     "proc #main {\n"
     "  init enabled.1 = 0;\n"
     "  init speed.1 = 0;\n"
     "  init limit.1 = 0;\n"
     "bb31:\n"
     "  init command.1 = 0;\n"
     "  goto bb12;\n"
     "bb5:\n"
     "  goto bb22;\n"
     "on:\n"
     "  limit.4 = 100;\n"
     "  command.4 = speed.1;\n"
     "  if command.4 > limit.4 goto clamp else bb5;\n"
     "bb12:\n"
     "  enabled.2 = phi(enabled.1 from bb31, enabled.4 from bb25);\n"
     "  command.2 = phi(command.1 from bb31, command.3 from bb25);\n"
     "  limit.2 = phi(limit.1 from bb31, limit.3 from bb25);\n"
     "  enabled.3 = 1;\n"
     "  if enabled.3 goto bb26 else bb27;\n"
     "off:\n"
     "  command.6 = 0;\n"
     "  goto bb22;\n"
     "clamp:\n"
     "  command.5 = limit.4;\n"
     "bb22:\n"
     "  enabled.4 = phi(enabled.6 from off, enabled.5 from clamp, enabled.5 from bb5);\n"
     "  command.3 = phi(command.6 from off, command.5 from clamp, command.4 from bb5);\n"
     "  limit.3 = phi(limit.2 from off, limit.4 from clamp, limit.4 from bb5);\n"
     "bb25:\n"
     "  if ? goto bb12 else bb32;\n"
     "bb26:\n"
     "  virtual enabled.5 = 1;\n"
     "  goto on;\n"
     "bb27:\n"
     "  virtual enabled.6 = 0;\n"
     "  goto off;\n"
     "bb32:\n"
     "  output command.3;\n"
     "}\n"},
    // The condition is the constant 1: only the true edge is executable, and the false branch is
    // deleted, with the phi operands that came from it.
    {"sccp",
     "proc #main {\n"
     "  init enabled.1 = 0;\n"
     "  init speed.1 = 0;\n"
     "  init limit.1 = 0;\n"
     "bb31:\n"
     "  init command.1 = 0;\n"
     "  goto bb12;\n"
     "bb5:\n"
     "  goto bb22;\n"
     "on:\n"
     "  limit.4 = 100;\n"
     "  command.4 = speed.1;\n"
     "  if command.4 > limit.4 goto clamp else bb5;\n"
     "bb12:\n"
     "  enabled.2 = phi(enabled.1 from bb31, enabled.4 from bb25);\n"
     "  command.2 = phi(command.1 from bb31, command.3 from bb25);\n"
     "  limit.2 = phi(limit.1 from bb31, limit.3 from bb25);\n"
     "  enabled.3 = 1;\n"
     "  if enabled.3 goto bb26 else removed;\n"
     "clamp:\n"
     "  command.5 = limit.4;\n"
     "bb22:\n"
     "  enabled.4 = phi(enabled.5 from clamp, enabled.5 from bb5);\n"
     "  command.3 = phi(command.5 from clamp, command.4 from bb5);\n"
     "  limit.3 = phi(limit.4 from clamp, limit.4 from bb5);\n"
     "bb25:\n"
     "  if ? goto bb12 else bb32;\n"
     "bb26:\n"
     "  virtual enabled.5 = 1;\n"
     "  goto on;\n"
     "bb32:\n"
     "  output command.3;\n"
     "}\n"},
    // The constants go in place of the reads: the condition becomes 1, the limit 100.
    {"replace-constants",
     "proc #main {\n"
     "  init enabled.1 = 0;\n"
     "  init speed.1 = 0;\n"
     "  init limit.1 = 0;\n"
     "bb31:\n"
     "  init command.1 = 0;\n"
     "  goto bb12;\n"
     "bb5:\n"
     "  goto bb22;\n"
     "on:\n"
     "  limit.4 = 100;\n"
     "  command.4 = speed.1;\n"
     "  if command.4 > 100 goto clamp else bb5;\n"
     "bb12:\n"
     "  enabled.2 = phi(enabled.1 from bb31, enabled.4 from bb25);\n"
     "  command.2 = phi(command.1 from bb31, command.3 from bb25);\n"
     "  limit.2 = phi(limit.1 from bb31, limit.3 from bb25);\n"
     "  enabled.3 = 1;\n"
     "  if 1 goto bb26 else removed;\n"
     "clamp:\n"
     "  command.5 = 100;\n"
     "bb22:\n"
     "  enabled.4 = phi(enabled.5 from clamp, enabled.5 from bb5);\n"
     "  command.3 = phi(command.5 from clamp, command.4 from bb5);\n"
     "  limit.3 = phi(limit.4 from clamp, limit.4 from bb5);\n"
     "bb25:\n"
     "  if ? goto bb12 else bb32;\n"
     "bb26:\n"
     "  virtual enabled.5 = 1;\n"
     "  goto on;\n"
     "bb32:\n"
     "  output command.3;\n"
     "}\n"},
    // Already constant: nothing left to replace.
    {"replace-conditions", nullptr},
    // Nothing left to fold.
    {"fold", nullptr},
    // The definitions that nothing reads any more go: limit and enabled, and their
    // initialisations.
    {"remove-unused",
     "proc #main {\n"
     "  init speed.1 = 0;\n"
     "bb31:\n"
     "  init command.1 = 0;\n"
     "  goto bb12;\n"
     "bb5:\n"
     "  goto bb22;\n"
     "on:\n"
     "  command.4 = speed.1;\n"
     "  if command.4 > 100 goto clamp else bb5;\n"
     "bb12:\n"
     "  command.2 = phi(command.1 from bb31, command.3 from bb25);\n"
     "  if 1 goto bb26 else removed;\n"
     "clamp:\n"
     "  command.5 = 100;\n"
     "bb22:\n"
     "  command.3 = phi(command.5 from clamp, command.4 from bb5);\n"
     "bb25:\n"
     "  if ? goto bb12 else bb32;\n"
     "bb26:\n"
     "  goto on;\n"
     "bb32:\n"
     "  output command.3;\n"
     "}\n"},
    // No branch begins alike on both sides.
    {"hoist", nullptr},
};

class Pipeline : public clienttest::ClientTest {
protected:
  // The procedures of `text` after `pipeline`.
  std::string after(const std::string& text, const std::vector<std::string>& pipeline) {
    Program* pProgram = load(text);
    if (!pProgram) return "";
    ssaopt::tool::runPipeline(pipeline, *pProgram);
    return proceduresOf(printProgram(*pProgram));
  }
};

}  // namespace

TEST_F(Pipeline, TheTypicalRunStepByStep) {
  Program* pProgram = load(clienttest::readExample("typical_run"));
  ASSERT_NE(pProgram, nullptr);
  std::vector<std::string> passes;
  for (const Step& step : kTypicalRun) passes.push_back(step.pass);
  ASSERT_EQ(ssaopt::tool::defaultPipeline(), passes);
  std::string before = proceduresOf(printProgram(*pProgram));
  for (const Step& step : kTypicalRun) {
    ssaopt::tool::runPipeline({step.pass}, *pProgram);
    std::string printed = proceduresOf(printProgram(*pProgram));
    EXPECT_EQ(printed, step.after ? step.after : before) << "after " << step.pass;
    before = printed;
  }
  EXPECT_TRUE(pProgram->expressions().notices().empty());
}

TEST_F(Pipeline, EveryExampleKeepsItsBehaviourThroughTheDefaultPipeline) {
  for (const char* name : clienttest::kExamples)
    EXPECT_TRUE(behaviourtest::sameBehaviour(clienttest::readExample(name), ssaopt::tool::defaultPipeline()))
        << name;
}

// ---- Hoisting as a real change of the program -----------------------------------------------------

const char* const kSameStartOnBothSides =
    "var int16 a volatile;\n"
    "var int16 b;\n"
    "var int16 y;\n"
    "var int16 z output;\n"
    "proc #main {\n"
    "  b = a;\n"
    "  if b > 3 goto on else off;\n"
    "on:\n"
    "  y = b + 1;\n"
    "  z = y * 2;\n"
    "  goto end;\n"
    "off:\n"
    "  y = b + 1;\n"
    "  z = y * 3;\n"
    "}\n";

TEST_F(Pipeline, AStatementThatBothBranchesBeginWithStandsOnceBeforeTheBranch) {
  EXPECT_EQ(after(kSameStartOnBothSides, {"divide", "hoist"}),
            "proc #main {\n"
            "  b = a;\n"
            "  y = b + 1;\n"
            "  if b > 3 goto on else off;\n"
            "on:\n"
            "  z = y * 2;\n"
            "  goto end;\n"
            "off:\n"
            "  z = y * 3;\n"
            "}\n");
  EXPECT_TRUE(behaviourtest::sameBehaviour(kSameStartOnBothSides, {"divide", "hoist"}));
}

// The dropped twin's version goes with it: what read it (z.3 = y.? * 2, the phi function at the
// join) reads the hoisted statement's version.
TEST_F(Pipeline, InSSAFormWhatReadTheDroppedTwinReadsTheHoistedStatement) {
  std::string printed = after(kSameStartOnBothSides, {"ssa", "divide", "hoist"});
  EXPECT_NE(printed.find("  b.3 = a.1;\n"
                         "  y.3 = b.3 + 1;\n"
                         "  if b.3 > 3 goto on else off;\n"
                         "on:\n"
                         "  z.3 = y.3 * 2;\n"
                         "  goto bb15;\n"
                         "off:\n"
                         "  z.4 = y.3 * 3;\n"
                         "bb15:\n"
                         "  y.4 = phi(y.3 from on, y.3 from off);\n"),
            std::string::npos)
      << printed;
  EXPECT_TRUE(behaviourtest::sameBehaviour(kSameStartOnBothSides, ssaopt::tool::defaultPipeline()));
}

// Each pair generates the same code and the conditions read nothing the pairs define, but reading a
// volatile, writing one and calling a procedure are more than their text: the client refuses them,
// and the program stays as written.
TEST_F(Pipeline, RegressionStatementsWithSideEffectsAndCallsStayInTheirBranches) {
  const char* const text =
      "var int16 a volatile;\n"
      "var int16 v volatile;\n"
      "var int16 y;\n"
      "var int16 n;\n"
      "proc count {\n"
      "  n = n + 1;\n"
      "}\n"
      "\n"
      "proc #main {\n"
      "  if n > 3 goto read1 else read2;\n"
      "read1:\n"
      "  y = a + 1;\n"
      "  goto write;\n"
      "read2:\n"
      "  y = a + 1;\n"
      "write:\n"
      "  if n > 4 goto write1 else write2;\n"
      "write1:\n"
      "  v = 1;\n"
      "  goto calls;\n"
      "write2:\n"
      "  v = 1;\n"
      "calls:\n"
      "  if n > 5 goto call1 else call2;\n"
      "call1:\n"
      "  call count();\n"
      "  goto end;\n"
      "call2:\n"
      "  call count();\n"
      "}\n";
  EXPECT_EQ(after(text, {"divide", "hoist"}), proceduresOf(text));
}

// Three statements leave both branches of the outer branch (one of them an element write, passing
// the valid-condition assignments at the heads), and one leaves the branches of the inner one.
TEST_F(Pipeline, HoistingAtNestedBranchesKeepsTheBehaviour) {
  const char* const text =
      "var int16 a volatile;\n"
      "var int16 b = 0;\n"
      "var int16 y erasable = 0;\n"
      "var int16 w = 0;\n"
      "var int16 z output = 0;\n"
      "var int16 t[4] = 0;\n"
      "var bool c = 0;\n"
      "var bool d = 0;\n"
      "proc #main {\n"
      "  b = a;\n"
      "  c = a > 3;\n"
      "  d = a < 0;\n"
      "  if c goto on else off;\n"
      "on:\n"
      "  y = b + 1;\n"
      "  w = y - b;\n"
      "  t[b % 4] = w;\n"
      "  if d goto in1 else in2;\n"
      "in1:\n"
      "  z = w + 1;\n"
      "  z = z * 2;\n"
      "  goto end;\n"
      "in2:\n"
      "  z = w + 1;\n"
      "  z = z * 3;\n"
      "  goto end;\n"
      "off:\n"
      "  y = b + 1;\n"
      "  w = y - b;\n"
      "  t[b % 4] = w;\n"
      "  z = 7;\n"
      "}\n";
  std::string printed = after(text, ssaopt::tool::defaultPipeline());
  EXPECT_NE(
      printed.find("  y.1 = b.3 + 1;\n  w.4 = y.1 - b.3;\n  t.4 = t.2 with [b.3 % 4] = w.4;\n  if c.3 goto"),
      std::string::npos)
      << printed;
  EXPECT_NE(printed.find("on:\n  z.5 = w.4 + 1;\n"), std::string::npos) << printed;
  EXPECT_EQ(printed.find("w.4 + 1"), printed.rfind("w.4 + 1")) << "once, before the inner branch";
  EXPECT_TRUE(behaviourtest::sameBehaviour(text, ssaopt::tool::defaultPipeline()));
}

// ---- Valid-condition assignments and calls ---------------------------------------------------------

// Each form of condition that the client's expressions recognise, with what its branches learn: a
// Boolean on both branches, an integer only where it equals the constant, a floating-point variable
// compared with 0 nowhere (it may be -0.0).
TEST_F(Pipeline, EachFormOfConditionTellsItsBranchesWhatItImplies) {
  EXPECT_EQ(after("var bool b;\nvar int16 x;\nvar float64 f;\nvar int16 r output;\n"
                  "proc #main {\n"
                  "  if b goto b1 else b2;\nb1:\n  r = 1;\n"
                  "b2:\n  if !b goto n1 else n2;\nn1:\n  r = 2;\n"
                  "n2:\n  if 0 != b goto e1 else e2;\ne1:\n  r = 3;\n"
                  "e2:\n  if x == 7 goto x1 else x2;\nx1:\n  r = 4;\n"
                  "x2:\n  if 7 != x goto y1 else y2;\ny1:\n  r = 5;\n"
                  "y2:\n  if f == 0 goto f1 else f2;\nf1:\n  r = 6;\n"
                  "f2:\n  r = 7;\n"
                  "}\n",
                  {"valid-conditions"}),
            "proc #main {\n"
            "  if b goto bb14 else bb15;\n"
            "b1:\n  r = 1;\n"
            "b2:\n  if !b goto bb16 else bb17;\n"
            "n1:\n  r = 2;\n"
            "n2:\n  if 0 != b goto bb18 else bb19;\n"
            "e1:\n  r = 3;\n"
            "e2:\n  if x == 7 goto bb20 else x2;\n"
            "x1:\n  r = 4;\n"
            "x2:\n  if 7 != x goto y1 else bb21;\n"
            "y1:\n  r = 5;\n"
            "y2:\n  if f == 0 goto f1 else f2;\n"
            "f1:\n  r = 6;\n"
            "f2:\n  r = 7;\n  goto end;\n"
            "bb14:\n  virtual b = 1;\n  goto b1;\n"
            "bb15:\n  virtual b = 0;\n  goto b2;\n"
            "bb16:\n  virtual b = 0;\n  goto n1;\n"
            "bb17:\n  virtual b = 1;\n  goto n2;\n"
            "bb18:\n  virtual b = 1;\n  goto e1;\n"
            "bb19:\n  virtual b = 0;\n  goto e2;\n"
            "bb20:\n  virtual x = 7;\n  goto x1;\n"
            "bb21:\n  virtual x = 7;\n  goto y2;\n"
            "}\n");
}

// Before the SSA transformation every call is in its procedure's call list exactly once: registered
// by inlining when the pipeline inlines, by the client otherwise. (`record` is called once and
// inlined; `accumulate` twice.)
TEST_F(Pipeline, EveryCallIsRegisteredOnceWhetherOrNotThePipelineInlines) {
  for (const std::vector<std::string>& pipeline : {std::vector<std::string>{"ssa"}, {"inline", "ssa"}}) {
    Program* pProgram = load(clienttest::readExample("procedures"));
    ssaopt::tool::runPipeline(pipeline, *pProgram);
    std::vector<KvCCfgProcedureCall*> placed, registered;
    for (KvCBasicBlock* pBlock : blocksOf(*pProgram))
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
        if (pStatement->isProcedureCall()) placed.push_back(pStatement->isProcedureCall());
    for (const auto& named : pProgram->graph().getProcedures())
      for (KvCCfgProcedureCall* pCall : named.second->getCalls()) registered.push_back(pCall);
    std::sort(placed.begin(), placed.end());
    std::sort(registered.begin(), registered.end());
    EXPECT_EQ(registered, placed) << ssaopt::tool::joinedPassNames(pipeline);
    EXPECT_EQ(placed.size(), pipeline.size() == 1 ? 3u : 2u);
  }
}
