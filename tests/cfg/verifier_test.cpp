// The verifier on graphs broken on purpose, one per check, each of which it must find; and on sound
// graphs, which it must pass quietly. Whole programs after every step are checked by the golden test
// and the fuzz command.
#include <gtest/gtest.h>

#include <string>

#include "cfg/propagation_testing.h"
#include "ssaopt/frame/report.h"

using namespace sccptest;
using ssaopt::GraphFact;
using ssaopt::GraphState;

namespace {

// The "source line" of each check in the verifier's reports.
enum Check : int {
  kPayloads = 5000,
  kComponents = 5001,
  kEntryAlone = 5002,
  kProcedureOfNode = 5003,
  kEntryEdge = 5004,
  kBranchEdges = 5005,
  kCallsApart = 5006,
  kExits = 5007,
  kSSAEdgeOrder = 5008,
  kOneDefinition = 5009,
  kPhiOperands = 5010,
  kDominance = 5011,
  kUseSets = 5012,
};

class Verifier : public PropagationTest {
protected:
  Verifier() { G.setState({}); }

  // Runs the verifier; the checks it reported.
  std::vector<int> violations() {
    m_Log.clear();
    m_Passed = G.verify();
    std::vector<int> checks;
    for (const ssaopt::ReportLog::Consistency& failure : m_Log.consistencyFailures()) {
      EXPECT_EQ(failure.file, "KvCControlFlowGraph");
      checks.push_back(failure.line);
    }
    EXPECT_EQ(m_Passed, checks.empty());
    return checks;
  }
  testing::AssertionResult finds(Check check) {
    std::vector<int> found = violations();
    for (int line : found)
      if (line == check) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "check " << check << " not reported; " << found.size() << " others";
  }
  // What the reports say, for the tests that check the wording.
  std::string text() const {
    std::string all;
    for (const ssaopt::ReportLog::Consistency& failure : m_Log.consistencyFailures())
      all += failure.condition + "\n";
    return all;
  }

  void inSSAForm(GraphState more = {}) { G.setState(GraphState{GraphFact::SSAForm}.with(more)); }
  // The node whose block holds the phi function of `pVersion` alone.
  node definitionOf(KvCCfgVariable* pVersion) {
    for (node v : G.nodes())
      if (KvCBasicBlock* pBlock = G.getBasicBlock(v);
          pBlock && pBlock->isPhiFunction() && pBlock->isPhiFunction()->getVariable() == pVersion)
        return v;
    return ssaopt::nil;
  }
  node phiAt(KvCPhiFunction* pPhi) {
    node v = block(pMain);
    blockOf(v).append(pPhi);
    return v;
  }
  KvCCfgStatement* defining(std::initializer_list<KvCCfgVariable*> defined,
                            std::initializer_list<KvCCfgVariable*> used = {}) {
    return new irtest::TestStatement(defined, used);
  }

  ssaopt::ReportLog m_Log;
  bool m_Passed = false;
};

// ---- Sound graphs ------------------------------------------------------------------------------

// if (c) { x.1 = 1 } else { x.2 = 2 }  x.3 = phi(x.1, x.2); use x.3 - in SSA form, divided, with SSA
// edges and up-to-date use sets, exits placed.
TEST_F(Verifier, PassesASoundGraphInEveryForm) {
  KvCSSAVariable *c1 = version(c), *x1 = version(x), *x2 = version(x), *x3 = version(x);
  node init = holding(defining({c1}));
  node top = branch(new irtest::TestExpression({c1}));
  node left = holding(defining({x1})), right = holding(defining({x2}));
  node join = phiAt(phiFunction(x3, {x1, x2}));
  node use = holding(defining({}, {x3}));
  run(pMain, {init, top});
  onTrue(top, left);
  onFalse(top, right);
  path({left, join});
  path({right, join, use});
  EXPECT_TRUE(violations().empty()) << text();
  G.placeExitNodes();
  inSSAForm({GraphFact::ExitsPlaced, GraphFact::Divided});
  EXPECT_TRUE(violations().empty()) << text();
  G.addSSAEdges();
  EXPECT_EQ(G.getState(), GraphState({GraphFact::ExitsPlaced, GraphFact::SSAForm, GraphFact::Divided,
                                      GraphFact::SSAEdges, GraphFact::UseSets}));
  EXPECT_TRUE(violations().empty()) << text();
}

// ---- Invariants 1 to 6 and the exits -------------------------------------------------------------

TEST_F(Verifier, FindsANodeWithoutPayload) {
  run(pMain, {empty()});
  plain(firstBlock(pMain), G.new_node());
  EXPECT_TRUE(finds(kPayloads));
}

TEST_F(Verifier, FindsTwoProceduresInOneComponent) {
  KvCCfgProcedure* pOther = procedure("f");
  node mine = startWith(pMain, empty()), theirs = startWith(pOther, empty(pOther));
  plain(mine, theirs);
  EXPECT_TRUE(finds(kComponents));
  EXPECT_NE(text().find("'#main' and 'f' are connected"), std::string::npos) << text();
}

TEST_F(Verifier, FindsAComponentWithoutProcedure) {
  run(pMain, {empty()});
  empty();
  EXPECT_TRUE(finds(kComponents));
}

TEST_F(Verifier, FindsASecondNodeWithoutInEdges) {
  node first = empty(), stray = empty();
  run(pMain, {first});
  plain(stray, first);
  EXPECT_TRUE(finds(kEntryAlone));
}

TEST_F(Verifier, FindsANodeOfAnotherProcedure) {
  KvCCfgProcedure* pOther = procedure("f");
  startWith(pOther, empty(pOther));
  node first = empty(), foreign = empty(pOther);
  run(pMain, {first, foreign});
  EXPECT_TRUE(finds(kProcedureOfNode));
}

TEST_F(Verifier, FindsAnEntryWithTwoOutEdges) {
  node first = empty(), second = empty();
  run(pMain, {first});
  plain(pMain->getEntryNode(), second);
  plain(second, first);
  EXPECT_TRUE(finds(kEntryEdge));
}

// Dead-code elimination may take one branch of a condition away, and only then.
TEST_F(Verifier, FindsABranchWithoutItsFalseEdgeBeforePropagation) {
  node top = branch(new irtest::TestExpression()), then = empty();
  run(pMain, {top});
  onTrue(top, then);
  EXPECT_TRUE(finds(kBranchEdges));
  G.setState({GraphFact::SSAForm, GraphFact::Propagated});
  EXPECT_TRUE(violations().empty()) << text();
}

TEST_F(Verifier, FindsABranchEdgeOutOfABlockWithoutCondition) {
  node first = empty(), second = empty();
  run(pMain, {first});
  onTrue(first, second);
  EXPECT_TRUE(finds(kBranchEdges));
}

TEST_F(Verifier, FindsACallOfNoProcedure) {
  run(pMain, {holding(new KvCCfgProcedureCall("nowhere"))});
  EXPECT_TRUE(finds(kCallsApart));
}

TEST_F(Verifier, FindsADeadEndOnceExitsArePlaced) {
  run(pMain, {empty(), empty()});
  G.placeExitNodes();
  EXPECT_TRUE(violations().empty()) << text();
  G.del_edge(G.first_in_edge(pMain->getExitNode()));
  EXPECT_TRUE(finds(kExits));
}

TEST_F(Verifier, FindsASSAEdgeBeforeAControlFlowEdge) {
  KvCSSAVariable* x1 = version(x);
  node def = holding(defining({x1})), use = holding(defining({}, {x1}));
  startWith(pMain, def);
  G.new_edge(def, use, new KvCSSAEdge());
  plain(def, use);
  EXPECT_TRUE(finds(kSSAEdgeOrder));
}

// ---- SSA form -----------------------------------------------------------------------------------

TEST_F(Verifier, FindsAVersionDefinedTwice) {
  KvCSSAVariable* x1 = version(x);
  run(pMain, {holding(defining({x1})), holding(defining({x1}))});
  inSSAForm();
  EXPECT_TRUE(finds(kOneDefinition));
}

TEST_F(Verifier, FindsADefinitionOfAVariableWithoutVersion) {
  run(pMain, {holding(defining({&x}))});
  EXPECT_TRUE(violations().empty()) << "before SSA form, variables are defined themselves";
  inSSAForm();
  EXPECT_TRUE(finds(kOneDefinition));
}

TEST_F(Verifier, FindsAPhiFunctionWithAnOperandMissing) {
  KvCSSAVariable *x1 = version(x), *x2 = version(x);
  node top = branch(new irtest::TestExpression()), left = holding(defining({x1})), right = empty();
  node join = phiAt(phiFunction(x2, {x1}));
  run(pMain, {top});
  onTrue(top, left);
  onFalse(top, right);
  path({left, join});
  path({right, join});
  inSSAForm();
  EXPECT_TRUE(finds(kPhiOperands));
}

// After dividing, every phi function of a chain has one operand per in-edge of the chain's first
// block, also when removeUnusedVarDefs has emptied that block.
TEST_F(Verifier, CountsPhiOperandsAlongADividedChain) {
  KvCSSAVariable *x0 = version(x), *x1 = version(x), *x2 = version(x);
  KvCSSAVariable *y0 = version(y), *y1 = version(y), *y2 = version(y);
  node top = branch(new irtest::TestExpression()), left = holding(defining({x1, y1})), right = empty();
  node join = block(pMain);
  blockOf(join).append(phiFunction(x2, {x1, x0}));
  blockOf(join).append(phiFunction(y2, {y1, y0}));
  blockOf(join).append(defining({}, {y2}));
  run(pMain, {holding(defining({x0, y0})), top});
  onTrue(top, left);
  onFalse(top, right);
  path({left, join});
  path({right, join});
  inSSAForm();
  G.divideBasicBlock();
  EXPECT_TRUE(violations().empty()) << text();

  node head = definitionOf(x2), second = definitionOf(y2);
  blockOf(head).del(blockOf(head).isPhiFunction());
  EXPECT_TRUE(violations().empty()) << text();
  EXPECT_EQ(G.getPhiChainHead(second), head);
  blockOf(second).isPhiFunction()->delReplacement(0);
  EXPECT_TRUE(finds(kPhiOperands));
}

TEST_F(Verifier, FindsAUseThatItsDefinitionDoesNotDominate) {
  KvCSSAVariable* x1 = version(x);
  node top = branch(new irtest::TestExpression()), left = holding(defining({x1}));
  node right = holding(defining({}, {x1})), join = empty();
  run(pMain, {top});
  onTrue(top, left);
  onFalse(top, right);
  path({left, join});
  path({right, join});
  inSSAForm();
  EXPECT_TRUE(finds(kDominance));
  EXPECT_NE(text().find("which does not dominate it"), std::string::npos) << text();
}

// Before dividing, a block holds definitions and uses in order.
TEST_F(Verifier, FindsAUseBeforeItsDefinitionInOneBlock) {
  KvCSSAVariable* x1 = version(x);
  node both = block(pMain);
  blockOf(both).append(defining({}, {x1}));
  blockOf(both).append(defining({x1}));
  run(pMain, {both});
  inSSAForm();
  EXPECT_TRUE(finds(kDominance));
}

TEST_F(Verifier, FindsAUseOfAVersionThatNothingDefines) {
  run(pMain, {holding(defining({}, {version(x)}))});
  inSSAForm();
  EXPECT_TRUE(finds(kDominance));
}

// An argument is read at its call, in the caller: a version of the callee is not there.
TEST_F(Verifier, FindsAnArgumentReadingAVersionOfTheCallee) {
  KvCCfgProcedure* pCallee = procedure("f");
  KvCSSAVariable *a1 = version(a), *x1 = version(x);
  auto* pCall = new KvCCfgProcedureCall("f");
  pCallee->appendCall(pCall);
  auto* pParam = new KvCCfgParamStatement(a1);
  pParam->setArgument(pCall, new irtest::TestExpression({x1}));
  pCallee->appendParamStatement(pParam);
  run(pMain, {holding(pCall)});
  run(pCallee, {holding(pParam), holding(defining({x1}))});
  inSSAForm();
  EXPECT_TRUE(finds(kDominance));
  EXPECT_NE(text().find("of '#main' reads"), std::string::npos) << text();
}

TEST_F(Verifier, FindsAUseSetNamingANodeThatDoesNotRead) {
  KvCSSAVariable* x1 = version(x);
  node def = holding(defining({x1})), use = holding(defining({}, {x1})), other = empty();
  run(pMain, {def, use, other});
  inSSAForm({GraphFact::Divided});
  G.addSSAEdges();
  EXPECT_TRUE(violations().empty()) << text();
  x1->appendUse(other);
  EXPECT_TRUE(finds(kUseSets));
  x1->clearUses();
  EXPECT_TRUE(finds(kUseSets)) << "a reader missing from the set";
}

// A broken graph breaks everywhere: the reports stop at a hundred, and the rest are counted.
TEST_F(Verifier, CountsWhatItDoesNotShow) {
  node last = startWith(pMain, empty());
  for (int i = 0; i < 150; ++i) {
    node next = empty();
    onTrue(last, next);
    last = next;
  }
  EXPECT_FALSE(violations().empty());
  EXPECT_EQ(m_Log.consistencyFailures().size(), 101u);
  EXPECT_NE(text().find("further violations not shown"), std::string::npos);
}

}  // namespace
