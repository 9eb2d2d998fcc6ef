// SSA construction where the printed program cannot show it: the graph around a new exit. What the
// transformation prints is in tests/filetests/ssa.
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

  ssaopt::ReportLog m_Log;
};

// An exit that needs a phi function becomes a block before a new exit (tests/filetests/ssa/exit-phi.ssa
// shows the phi function). The former exit keeps its in-edges and its place in the dominator tree;
// the new exit follows it.
TEST_F(SSAConstruction, TheFormerExitKeepsItsInEdgesAndDominatesTheNewExit) {
  ssaopt::client::Program* pProgram = load(
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
  ASSERT_NE(pProgram, nullptr);
  pProgram->graph().completeCallLists();
  KvCControlFlowGraph& G = pProgram->graph();
  G.transformToSSAForm();
  ssaopt::node exit = G.findProcedure("maybe")->getExitNode();
  ASSERT_EQ(G.indeg(exit), 1);
  ssaopt::node former = G.source(G.first_in_edge(exit));
  ASSERT_NE(G.getBasicBlock(former), nullptr);
  EXPECT_EQ(G.getBasicBlock(former)->getPhiFunctions().size(), 1u);
  EXPECT_EQ(G.inf(exit)->getIdom(), former);
  EXPECT_EQ(G.indeg(former), 2);
}

}  // namespace
