// The whole pipeline end to end: the typical run of a client step by step, hoisting as a real change
// of the program, and what each form of condition tells its branches.
#include <algorithm>
#include <sstream>
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
  const char* changes;
};

// examples/typical_run.ssa: "#main" sets the Boolean `enabled` to 1 and tests it; the true branch calls
// limitCommand, which nothing else calls. Each step names the lines of the procedures that it removes
// ("-") and adds ("+"); the printed result of the whole run is pinned by the golden-output test.
//  - inline: the only call of limitCommand gives way to a block that leads into the body, and the
//    procedure is gone;
//  - valid-conditions: each branch on `enabled` learns its value there;
//  - ssa: initialisations after the entry, phi functions at the joins (the loop around "#main" among
//    them), the output statement before the exit, and a version for every definition;
//  - divide: one phi function, one statement or one condition per block;
//  - sccp: the condition is the constant 1, so the false branch goes with the phi operands from it;
//  - replace-constants: the constants stand where the condition and the limit were read;
//  - remove-unused: the definitions that nothing reads any more go, with their initialisations;
//  - replace-conditions, fold and hoist find nothing left to do.
const Step kTypicalRun[] = {
    {"inline",
     "-  call limitCommand();\n"
     "-\n"
     "-proc limitCommand {\n"
     "-}\n"
     "+bb3:\n"
     "+  goto end;\n"
     "+  goto bb3;\n"},
    {"valid-conditions",
     "-  if enabled goto on else off;\n"
     "+  if enabled goto bb8 else bb9;\n"
     "+bb8:\n"
     "+  virtual enabled = 1;\n"
     "+  goto on;\n"
     "+bb9:\n"
     "+  virtual enabled = 0;\n"
     "+  goto off;\n"},
    {"ssa",
     "-  enabled = 1;\n"
     "-  if enabled goto bb8 else bb9;\n"
     "-  command = 0;\n"
     "-  goto end;\n"
     "-  limit = 100;\n"
     "-  command = speed;\n"
     "-  if command > limit goto clamp else end;\n"
     "-  command = limit;\n"
     "-  goto end;\n"
     "-  virtual enabled = 1;\n"
     "-  virtual enabled = 0;\n"
     "+bb10:\n"
     "+  init enabled.1 = 0;\n"
     "+  init speed.1 = 0;\n"
     "+  init limit.1 = 0;\n"
     "+  init command.1 = 0;\n"
     "+bb0:\n"
     "+  enabled.2 = phi(enabled.1 from bb10, enabled.4 from bb6);\n"
     "+  command.2 = phi(command.1 from bb10, command.3 from bb6);\n"
     "+  limit.2 = phi(limit.1 from bb10, limit.3 from bb6);\n"
     "+  enabled.3 = 1;\n"
     "+  if enabled.3 goto bb8 else bb9;\n"
     "+  command.6 = 0;\n"
     "+  goto bb6;\n"
     "+  limit.4 = 100;\n"
     "+  command.4 = speed.1;\n"
     "+  if command.4 > limit.4 goto clamp else bb5;\n"
     "+  command.5 = limit.4;\n"
     "+  goto bb6;\n"
     "+bb5:\n"
     "+bb6:\n"
     "+  enabled.4 = phi(enabled.6 from off, enabled.5 from clamp, enabled.5 from bb5);\n"
     "+  command.3 = phi(command.6 from off, command.5 from clamp, command.4 from bb5);\n"
     "+  limit.3 = phi(limit.2 from off, limit.4 from clamp, limit.4 from bb5);\n"
     "+  if ? goto bb0 else bb11;\n"
     "+  virtual enabled.5 = 1;\n"
     "+  virtual enabled.6 = 0;\n"
     "+bb11:\n"
     "+  output command.3;\n"},
    {"divide",
     "-bb10:\n"
     "-bb0:\n"
     "-  enabled.2 = phi(enabled.1 from bb10, enabled.4 from bb6);\n"
     "-  command.2 = phi(command.1 from bb10, command.3 from bb6);\n"
     "-  limit.2 = phi(limit.1 from bb10, limit.3 from bb6);\n"
     "-  if enabled.3 goto bb8 else bb9;\n"
     "-  goto bb6;\n"
     "-bb3:\n"
     "-  goto bb6;\n"
     "-bb6:\n"
     "-  if ? goto bb0 else bb11;\n"
     "-  goto bb3;\n"
     "-bb8:\n"
     "-bb9:\n"
     "-bb11:\n"
     "+bb31:\n"
     "+  goto bb12;\n"
     "+  goto bb22;\n"
     "+bb12:\n"
     "+  enabled.2 = phi(enabled.1 from bb31, enabled.4 from bb25);\n"
     "+  command.2 = phi(command.1 from bb31, command.3 from bb25);\n"
     "+  limit.2 = phi(limit.1 from bb31, limit.3 from bb25);\n"
     "+  if enabled.3 goto bb26 else bb27;\n"
     "+  goto bb22;\n"
     "+bb22:\n"
     "+bb25:\n"
     "+  if ? goto bb12 else bb32;\n"
     "+bb26:\n"
     "+bb27:\n"
     "+bb32:\n"},
    {"sccp",
     "-  if enabled.3 goto bb26 else bb27;\n"
     "-off:\n"
     "-  command.6 = 0;\n"
     "-  goto bb22;\n"
     "-  enabled.4 = phi(enabled.6 from off, enabled.5 from clamp, enabled.5 from bb5);\n"
     "-  command.3 = phi(command.6 from off, command.5 from clamp, command.4 from bb5);\n"
     "-  limit.3 = phi(limit.2 from off, limit.4 from clamp, limit.4 from bb5);\n"
     "-bb27:\n"
     "-  virtual enabled.6 = 0;\n"
     "-  goto off;\n"
     "+  if enabled.3 goto bb26 else removed;\n"
     "+  enabled.4 = phi(enabled.5 from clamp, enabled.5 from bb5);\n"
     "+  command.3 = phi(command.5 from clamp, command.4 from bb5);\n"
     "+  limit.3 = phi(limit.4 from clamp, limit.4 from bb5);\n"},
    {"replace-constants",
     "-  if command.4 > limit.4 goto clamp else bb5;\n"
     "-  if enabled.3 goto bb26 else removed;\n"
     "-  command.5 = limit.4;\n"
     "+  if command.4 > 100 goto clamp else bb5;\n"
     "+  if 1 goto bb26 else removed;\n"
     "+  command.5 = 100;\n"},
    {"replace-conditions", ""},
    {"fold", ""},
    {"remove-unused",
     "-  init enabled.1 = 0;\n"
     "-  init limit.1 = 0;\n"
     "-  limit.4 = 100;\n"
     "-  enabled.2 = phi(enabled.1 from bb31, enabled.4 from bb25);\n"
     "-  limit.2 = phi(limit.1 from bb31, limit.3 from bb25);\n"
     "-  enabled.3 = 1;\n"
     "-  enabled.4 = phi(enabled.5 from clamp, enabled.5 from bb5);\n"
     "-  limit.3 = phi(limit.4 from clamp, limit.4 from bb5);\n"
     "-  virtual enabled.5 = 1;\n"},
    {"hoist", ""},
};

std::vector<std::string> linesOf(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

// The lines of `before` that `after` lacks ("-"), then the lines of `after` that `before` lacks ("+"),
// each in its order, counting repeated lines.
std::string changedLines(const std::string& before, const std::string& after) {
  std::vector<std::string> removed = linesOf(before), added = linesOf(after);
  for (auto line = removed.begin(); line != removed.end();) {
    auto twin = std::find(added.begin(), added.end(), *line);
    if (twin == added.end()) {
      ++line;
    } else {
      added.erase(twin);
      line = removed.erase(line);
    }
  }
  std::string changes;
  for (const std::string& line : removed) changes += "-" + line + "\n";
  for (const std::string& line : added) changes += "+" + line + "\n";
  return changes;
}

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
    EXPECT_EQ(changedLines(before, printed), step.changes) << "after " << step.pass;
    before = printed;
  }
  EXPECT_TRUE(pProgram->expressions().notices().empty());
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

// The walk down a branch stops at a block of more than one statement: `z = b + 2` behind the two
// statements at `on` must not move above them.
TEST_F(Pipeline, RegressionHoistingStopsAtABlockOfSeveralStatements) {
  const char* const text =
      "var int16 a volatile;\n"
      "var int16 b;\n"
      "var int16 w;\n"
      "var int16 z output;\n"
      "proc #main {\n"
      "  b = a;\n"
      "  if b > 3 goto on else off;\n"
      "on:\n"
      "  w = b + 1;\n"
      "  w = w * 2;\n"
      "next:\n"
      "  z = b + 2;\n"
      "  goto end;\n"
      "off:\n"
      "  z = b + 2;\n"
      "}\n";
  EXPECT_EQ(after(text, {"hoist"}), proceduresOf(text));
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
