// Constant propagation, dead-code elimination, substitution, folding and the removal of unused
// definitions where the printed program cannot show it: what the procedure records keep. What the
// passes print is in tests/filetests/propagation. Every internal check of the library is on and must
// stay silent.
#include <set>

#include "client_testing.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/statement.h"

namespace {

// From propagation to the removal of unused definitions, as the typical run does.
void optimise(KvCControlFlowGraph& G) {
  G.propagateSparseConditionalConstant(true);
  G.replaceConstantVariables();
  G.foldConstants();
  G.removeUnusedVarDefs();
}

class Optimisation : public clienttest::ClientTest {
protected:
  Optimisation() { ssaopt::setShowInternalInfo(true); }
  ~Optimisation() override { ssaopt::setShowInternalInfo(false); }
  void TearDown() override {
    EXPECT_TRUE(m_Log.empty()) << "the library reported " << m_Log.count() << " fault(s)";
  }

  static void toDividedSSA(ssaopt::client::Program& program) {
    program.graph().completeCallLists();
    program.graph().transformToSSAForm();
    program.transformKeepingLabels([&program] { program.graph().divideBasicBlock(); });
  }

  ssaopt::ReportLog m_Log;
};

// Every call, parameter statement and value-return statement that a procedure record lists, and every
// call a parameter statement holds an argument for, still stands in a block.
void expectRecordsNameOnlyLiveStatements(KvCControlFlowGraph& G) {
  std::set<const KvCCfgStatement*> live;
  for (ssaopt::node v : G.nodes())
    if (KvCBasicBlock* pBlock = G.getBasicBlock(v)) {
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq()) live.insert(pStatement);
      for (KvCPhiFunction* pPhi : pBlock->getPhiFunctions()) live.insert(pPhi);
    }
  for (const auto& entry : G.getProcedures()) {
    KvCCfgProcedure& procedure = *entry.second;
    for (KvCCfgProcedureCall* pCall : procedure.getCalls())
      EXPECT_TRUE(live.count(pCall)) << entry.first.cstring();
    for (KvCCfgValueReturnStatement* pReturn : procedure.getValueReturnStatements())
      EXPECT_TRUE(live.count(pReturn)) << entry.first.cstring();
    for (KvCCfgParamStatement* pParam : procedure.getParamStatements()) {
      EXPECT_TRUE(live.count(pParam)) << entry.first.cstring();
      for (const auto& argument : pParam->getArguments()) EXPECT_TRUE(live.count(argument.first));
    }
  }
}

// A call that dead-code elimination deleted with its block, and the interface statements that it or
// the removal of unused definitions deleted, stayed listed in the procedure records.
TEST_F(Optimisation, RegressionProcedureRecordsForgetDeletedStatements) {
  ssaopt::client::Program* pProgram = load(
      "var int16 x erasable = 0;\n"
      "var int16 p erasable;\n"
      "var int16 t erasable;\n"
      "var int16 y output = 0;\n"
      "proc #main {\n"
      "  x = 0;\n"
      "  if x goto dead else live;\n"
      "dead:\n"
      "  call f(1);\n"
      "  goto end;\n"
      "live:\n"
      "  call f(2);\n"
      "}\n"
      "proc f(p) { t = p; y = t; }\n");
  ASSERT_NE(pProgram, nullptr);
  toDividedSSA(*pProgram);
  KvCControlFlowGraph& G = pProgram->graph();
  KvCCfgProcedure* pF = G.findProcedure("f");
  ASSERT_NE(pF, nullptr);
  ASSERT_EQ(pF->getCalls().size(), 2u);
  std::size_t returnsBefore = pF->getValueReturnStatements().size();
  optimise(G);
  EXPECT_EQ(pF->getCalls().size(), 1u);
  EXPECT_LT(pF->getValueReturnStatements().size(), returnsBefore);
  for (KvCCfgParamStatement* pParam : pF->getParamStatements()) EXPECT_EQ(pParam->getArguments().size(), 1u);
  expectRecordsNameOnlyLiveStatements(G);
}

}  // namespace
