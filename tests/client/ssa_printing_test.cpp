// How the printer shows what the SSA transformation and the optimisations leave in a graph: versions,
// phi functions, interface statements, virtual assignments, propagated values and executable edges.
// The graph is decorated here by hand, as those passes would decorate it.
#include "client_testing.h"
#include "ssaopt/ir/expression.h"

namespace {

using ssaopt::node;

const char* const kProgram =
    "var int16 x = 0;\n"
    "var bool b volatile;\n"
    "var int16 p;\n"
    "\n"
    "proc f(p) {\n"
    "  x = p;\n"
    "}\n"
    "\n"
    "proc #main {\n"
    "  if b goto one else two;\n"
    "one:\n"
    "  x = 1;\n"
    "  goto join;\n"
    "two:\n"
    "  x = 2;\n"
    "join:\n"
    "  call f(x + 1);\n"
    "}\n";

class SSAPrinting : public clienttest::ClientTest {
protected:
  SSAPrinting() : m_Program(*load(kProgram)), m_Graph(m_Program.graph()) {
    for (node v : m_Graph.nodes())
      if (m_Graph.getBasicBlock(v)) m_Blocks.push_back(v);
  }

  KvCSSAVariable* version(const char* name) { return new KvCSSAVariable(m_Program.findVariable(name)); }
  KvCBasicBlock& block(std::size_t i) { return *m_Graph.getBasicBlock(m_Blocks.at(i)); }
  KvCCfgStatement* first(std::size_t i) { return block(i).getStatementSeq().front(); }

  static KvCCfgInitAssignment* initAssignment(KvCCfgVariable* pVariable, double value, bool isVirtual) {
    auto* pInit = new KvCCfgInitAssignment();
    pInit->setLHS(pVariable);
    pInit->setRHS(new KvCCfgValueExpression(KvCCfgValue(value)));
    pInit->setIsVirtual(isVirtual);
    return pInit;
  }

  // Blocks in node order: f's block, then #main's condition, one, two and join (the call).
  void decorateAsAfterRenaming() {
    KvCSSAVariable *x1 = version("x"), *x2 = version("x"), *x3 = version("x"), *x4 = version("x");
    KvCSSAVariable *x5 = version("x"), *x6 = version("x"), *p1 = version("p"), *b1 = version("b");
    KvCCfgSFAssignment* pInF = first(0)->isSFAssignment();
    pInF->setLHS(x6);
    pInF->getRHS()->replaceVariable(m_Program.findVariable("p"), p1);
    KvCCfgParamStatement* pParam = m_Graph.findProcedure("f")->getParamStatements().front();
    pParam->setVariable(p1);
    block(0).append(pParam);
    block(1).append(initAssignment(x1, 0, false));
    first(2)->isSFAssignment()->setLHS(x2);
    block(2).append(initAssignment(b1, 1, true));
    first(3)->isSFAssignment()->setLHS(x3);
    auto* pPhi = new KvCPhiFunction(x4, 2);
    pPhi->setReplacementVariable(0, x2);
    pPhi->setReplacementVariable(1, x3);
    block(4).append(pPhi);
    first(4)->isSFProcedureCall()->getArguments()[0]->replaceVariable(m_Program.findVariable("x"), x4);
    auto* pReturn = new KvCCfgValueReturnStatement(x5);
    pReturn->setExpression(m_Program.expressions().make({{ssaopt::client::TermOp::Variable, 0.0, x6}}, {}));
    block(4).append(pReturn);
    block(4).append(new KvCCfgOutputStatement(x5));
  }

  ssaopt::client::Program& m_Program;
  KvCControlFlowGraph& m_Graph;
  std::vector<node> m_Blocks;
};

TEST_F(SSAPrinting, ShowsVersionsPhiFunctionsAndInterfaceStatements) {
  decorateAsAfterRenaming();
  EXPECT_EQ(ssaopt::client::printProgram(m_Program),
            "var int16 x = 0;\n"
            "var bool b volatile;\n"
            "var int16 p;\n"
            "\n"
            "proc f(p) {\n"
            "  x.6 = p.1;\n"
            "  p.1 = param(x.4 + 1 from #main:join);\n"
            "}\n"
            "\n"
            "proc #main {\n"
            "  init x.1 = 0;\n"
            "  if b goto one else two;\n"
            "one:\n"
            "  x.2 = 1;\n"
            "  virtual b.1 = 1;\n"
            "  goto join;\n"
            "two:\n"
            "  x.3 = 2;\n"
            "join:\n"
            "  x.4 = phi(x.2 from one, x.3 from two);\n"
            "  call f(x.4 + 1);\n"
            "  x.5 = return(x.6);\n"
            "  output x.5;\n"
            "}\n");
}

TEST_F(SSAPrinting, ShowsPropagatedValuesAndExecutableEdgesOnRequest) {
  KvCSSAVariable* pVersion = version("x");
  first(2)->isSFAssignment()->setLHS(pVersion);
  KvCCfgValue unknown(eCfgNonConstant), one(1.0), two(2.0);
  pVersion->setVarValueAndAdjustCfgValue(unknown);
  pVersion->setMinValueAndDestroyOld(one);
  pVersion->setMaxValueAndDestroyOld(two);
  m_Graph.inf(m_Graph.first_adj_edge(m_Blocks[1]))->activateEdgeExecutable();
  std::string printed = ssaopt::client::printProgram(m_Program, ssaopt::client::PrintOptions{true});
  EXPECT_NE(printed.find("one:\n  x.1 = 1;  // * in [1, 2]\n  goto join;\ntwo:\n"), std::string::npos)
      << printed;
  EXPECT_NE(printed.find("  if b goto one else two;\n  // to one: executable, to two: not executable\n"),
            std::string::npos)
      << printed;
}

TEST_F(SSAPrinting, LabelsStayWithTheirStatementsWhenBlocksAreDivided) {
  m_Program.transformKeepingLabels([this] { m_Graph.divideBasicBlock(); });
  std::string printed = ssaopt::client::printProgram(m_Program);
  EXPECT_NE(printed.find("one:\n  x = 1;\n  goto join;\ntwo:\n  x = 2;\njoin:\n  call f(x + 1);\n"),
            std::string::npos)
      << printed;
}

}  // namespace
