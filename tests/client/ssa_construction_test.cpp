// SSA construction as a client sees it: programs in the textual format and what they print after
// transformToSSAForm, every internal check of the library on and silent, as under --verify. Versions
// are numbered in the order in which renaming makes them; "#main" always runs in a loop.
#include "client_testing.h"
#include "ssaopt/frame/report.h"

namespace {

class SSAConstruction : public clienttest::ClientTest {
protected:
  SSAConstruction() { ssaopt::setShowInternalInfo(true); }
  ~SSAConstruction() override { ssaopt::setShowInternalInfo(false); }
  void TearDown() override {
    EXPECT_TRUE(m_Log.empty()) << "the library reported " << m_Log.count() << " fault(s)";
  }

  // The whole program as printed after the transformation.
  std::string transformed(const char* text) {
    m_pProgram = load(text);
    if (!m_pProgram) return "";
    m_pProgram->graph().completeCallLists();
    m_pProgram->graph().transformToSSAForm();
    return ssaopt::client::printProgram(*m_pProgram);
  }

  // The lines of `printed` from "proc NAME" to its closing brace.
  static std::string procedure(const std::string& printed, const std::string& name) {
    std::size_t begin = printed.find("proc " + name + " ");
    if (begin == std::string::npos) begin = printed.find("proc " + name + "(");
    if (begin == std::string::npos) return "";
    return printed.substr(begin, printed.find("\n}\n", begin) + 3 - begin);
  }

  // The variables that the parameter statements of a printed procedure define, without versions.
  static std::string parameters(const std::string& printed) {
    std::string names;
    std::istringstream lines(printed);
    for (std::string line; std::getline(lines, line);)
      if (line.find(" = param(") != std::string::npos)
        names += (names.empty() ? "" : " ") + line.substr(2, line.find('.') - 2);
    return names;
  }

  ssaopt::ReportLog m_Log;
  ssaopt::client::Program* m_pProgram = nullptr;
};

// k is only initialised and passed on, so it gets no phi function anywhere; #main has the one of
// its loop for x.
TEST_F(SSAConstruction, ADiamondJoinsTheVersionsOfItsBranchesInInEdgeOrder) {
  std::string printed = transformed(
      "var bool c volatile;\n"
      "var int16 x = 0;\n"
      "var int16 k = 5;\n"
      "proc #main {\n"
      "  call pick();\n"
      "}\n"
      "proc pick {\n"
      "  if c goto left else right;\n"
      "left:\n"
      "  x = 1;\n"
      "  goto join;\n"
      "right:\n"
      "  x = 2;\n"
      "join:\n"
      "  x = x + k;\n"
      "}\n");
  EXPECT_EQ(procedure(printed, "pick"),
            "proc pick {\n"
            "  c.2 = param(c.1 from #main:bb0);\n"
            "  x.4 = param(x.2 from #main:bb0);\n"
            "  k.2 = param(k.1 from #main:bb0);\n"
            "  if c.2 goto left else right;\n"
            "left:\n"
            "  x.5 = 1;\n"
            "  goto join;\n"
            "right:\n"
            "  x.6 = 2;\n"
            "join:\n"
            "  x.7 = phi(x.5 from left, x.6 from right);\n"
            "  x.8 = x.7 + k.2;\n"
            "}\n");
  std::string main = procedure(printed, "#main");
  EXPECT_NE(main.find("  x.2 = phi(x.1 from bb6, x.3 from bb5);\n  call pick();\n"), std::string::npos);
  EXPECT_EQ(main.find("phi", main.find("phi") + 1), std::string::npos);
}

// The formal p is written by the call, so the caller reads it back after the call.
TEST_F(SSAConstruction, ACallPassesTheCallersVersionsAndTakesBackTheCalleesVersionsAtItsExit) {
  std::string printed = transformed(
      "var int16 a = 0;\n"
      "var int16 b = 0;\n"
      "var int16 p = 0;\n"
      "proc #main {\n"
      "  a = 3;\n"
      "  call twice(a + 1);\n"
      "  a = b + p;\n"
      "}\n"
      "proc twice(p) {\n"
      "  b = p * 2;\n"
      "}\n");
  EXPECT_EQ(procedure(printed, "#main") + procedure(printed, "twice"),
            "proc #main {\n"
            "bb5:\n"
            "  init a.1 = 0;\n"
            "  init b.1 = 0;\n"
            "  init p.1 = 0;\n"
            "bb0:\n"
            "  a.2 = phi(a.1 from bb5, a.4 from bb4);\n"
            "  b.2 = phi(b.1 from bb5, b.3 from bb4);\n"
            "  p.2 = phi(p.1 from bb5, p.3 from bb4);\n"
            "  a.3 = 3;\n"
            "bb1:\n"
            "  call twice(a.3 + 1);\n"
            "  b.3 = return(b.5);\n"
            "  p.3 = return(p.4);\n"
            "  a.4 = b.3 + p.3;\n"
            "bb4:\n"
            "  if ? goto bb0 else end;\n"
            "}\n"
            "proc twice(p) {\n"
            "  p.4 = param(a.3 + 1 from #main:bb1);\n"
            "  b.4 = param(b.2 from #main:bb1);\n"
            "  b.5 = p.4 * 2;\n"
            "}\n");
}

TEST_F(SSAConstruction, AnExitThatNeedsAPhiFunctionBecomesABlockBeforeANewExit) {
  std::string printed = transformed(
      "var bool c volatile;\n"
      "var int16 x = 0;\n"
      "proc #main {\n"
      "  call maybe();\n"
      "}\n"
      "proc maybe {\n"
      "  if c goto set else end;\n"
      "set:\n"
      "  x = 1;\n"
      "}\n");
  EXPECT_EQ(procedure(printed, "maybe"),
            "proc maybe {\n"
            "  c.2 = param(c.1 from #main:bb0);\n"
            "  x.4 = param(x.2 from #main:bb0);\n"
            "  if c.2 goto set else bb3;\n"
            "set:\n"
            "  x.5 = 1;\n"
            "  goto bb8;\n"
            "bb3:\n"
            "bb8:\n"
            "  x.6 = phi(x.5 from set, x.4 from bb3);\n"
            "}\n");
  EXPECT_NE(printed.find("  x.3 = return(x.6);\n"), std::string::npos);
  // The former exit keeps its in-edges and its place in the dominator tree; the new exit follows it.
  KvCControlFlowGraph& G = m_pProgram->graph();
  ssaopt::node exit = G.findProcedure("maybe")->getExitNode();
  ASSERT_EQ(G.indeg(exit), 1);
  ssaopt::node former = G.source(G.first_in_edge(exit));
  ASSERT_NE(G.getBasicBlock(former), nullptr);
  EXPECT_EQ(G.getBasicBlock(former)->getPhiFunctions().size(), 1u);
  EXPECT_EQ(G.inf(exit)->getIdom(), former);
  EXPECT_EQ(G.indeg(former), 2);
}

TEST_F(SSAConstruction, MutuallyRecursiveProceduresHaveTheSameParametersIncludingWhatTheyCall) {
  std::string printed = transformed(
      "var bool c volatile;\n"
      "var int16 x = 0;\n"
      "var int16 y = 0;\n"
      "var int16 z = 0;\n"
      "proc #main {\n"
      "  call even();\n"
      "}\n"
      "proc even {\n"
      "  x = y;\n"
      "  if c goto again else end;\n"
      "again:\n"
      "  call odd();\n"
      "}\n"
      "proc odd {\n"
      "  y = z;\n"
      "  call even();\n"
      "  call leaf();\n"
      "}\n"
      "proc leaf {\n"
      "  z = 1;\n"
      "}\n");
  EXPECT_EQ(parameters(procedure(printed, "even")), "c x y z");
  EXPECT_EQ(parameters(procedure(printed, "odd")), "c x y z");
  EXPECT_EQ(parameters(procedure(printed, "leaf")), "z");
  EXPECT_NE(procedure(printed, "odd")
                .find("  call even();\n  x.9 = return(x.7);\n  y.9 = return(y.6);\n"
                      "  z.8 = return(z.6);\n"),
            std::string::npos)
      << "the recursive call takes back what even leaves at its exit";
}

TEST_F(SSAConstruction, TheOutputsOfMainAreReadAtItsEndWhetherWrittenOrOnlyRead) {
  std::string printed = transformed(
      "var bool c volatile;\n"
      "var int16 shown output = 0;\n"
      "var int16 read output = 4;\n"
      "var int16 hidden = 0;\n"
      "proc #main {\n"
      "  hidden = read;\n"
      "  if c goto on else end;\n"
      "on:\n"
      "  shown = hidden;\n"
      "}\n");
  std::string main = procedure(printed, "#main");
  EXPECT_EQ(main.substr(main.find("bb3:\n")),
            "bb3:\n"
            "  shown.4 = phi(shown.3 from on, shown.2 from bb2);\n"
            "  if ? goto bb0 else bb5;\n"
            "bb5:\n"
            "  output shown.4;\n"
            "  output read.1;\n"
            "}\n");
}

}  // namespace
