// Sparse conditional constant propagation on small graphs in SSA form, one item per block, for what
// programs in the textual format cannot show: which edges every kind of condition value opens, and that
// value objects are freed exactly once.
#include <gtest/gtest.h>

#include "cfg/propagation_testing.h"

using namespace sccptest;

namespace {

class ConstantPropagation : public PropagationTest {
protected:
  struct Diamond {
    node top, left, right, join;
    edge toLeft, toRight;
  };
  // if (cond) left else right, both joining.
  Diamond diamond(KvCCfgExpression* pCond) {
    Diamond d{branch(pCond), empty(), empty(), empty(), {}, {}};
    startWith(pMain, d.top);
    d.toLeft = onTrue(d.top, d.left);
    d.toRight = onFalse(d.top, d.right);
    path({d.left, d.join});
    path({d.right, d.join});
    return d;
  }
};

// ---- Conditions ----------------------------------------------------------------------------------

struct ConditionCase {
  const char* name;
  KvCCfgValue value;
  bool trueEdge, falseEdge;
};

class Conditions : public ConstantPropagation, public ::testing::WithParamInterface<ConditionCase> {};

TEST_P(Conditions, OpenOnlyTheEdgesTheirValueAllows) {
  const ConditionCase& expected = GetParam();
  Diamond d = diamond(new irtest::TestExpression({}, expected.value));
  G.propagateSparseConditionalConstant(false);

  EXPECT_EQ(executable(d.toLeft), expected.trueEdge);
  EXPECT_EQ(executable(d.toRight), expected.falseEdge);
  EXPECT_EQ(visited(d.left), expected.trueEdge);
  EXPECT_EQ(visited(d.right), expected.falseEdge);
  EXPECT_TRUE(visited(d.top) && visited(d.join));
  EXPECT_TRUE(alive(d.left) && alive(d.right)) << "nothing is removed unless asked";
}

INSTANTIATE_TEST_SUITE_P(, Conditions,
                         ::testing::Values(ConditionCase{"Zero", constant(0.0), false, true},
                                           ConditionCase{"NegativeZero", constant(-0.0), false, true},
                                           ConditionCase{"Five", constant(5.0), true, false},
                                           ConditionCase{"MinusOne", constant(-1.0), true, false},
                                           ConditionCase{"Undetermined", undetermined, true, true},
                                           ConditionCase{"NonConstant", nonConstant, true, true}),
                         [](const auto& tested) { return std::string(tested.param.name); });

// ---- Ownership -----------------------------------------------------------------------------------

// Without a pool every object is the test's to delete, so the sanitizer sees a value object that the
// propagation leaks or frees twice.
TEST(ConstantPropagationOwnership, FreesEveryReplacedValueObjectExactlyOnce) {
  Var x("x");
  auto* pGraph = new KvCControlFlowGraph();
  pGraph->setState(kBuiltInSSAForm);
  KvCCfgProcedure* pMain = nullptr;
  node entry = pGraph->demandProcedureEntryNode(KvCControlFlowGraph::kMainProcedureName, pMain);
  auto *x1 = new KvCSSAVariable(&x), *x2 = new KvCSSAVariable(&x);
  auto* pFour = new Sum(4);
  auto *pBlock1 = new KvCBasicBlock(), *pBlock2 = new KvCBasicBlock();
  pBlock1->append(new Assign(x1, pFour));
  pBlock2->append(phiFunction(x2, {x1}));
  node first = pGraph->new_node(pBlock1), second = pGraph->new_node(pBlock2);
  pGraph->new_edge(entry, first, new KvCCfgEdgeInfo());
  pGraph->new_edge(first, second, new KvCCfgEdgeInfo());
  pGraph->propagateSparseConditionalConstant(true);
  for (const KvCCfgValue* pValue : {x2->getValue(), x2->getMinValue(), x2->getMaxValue()})
    EXPECT_VALUE(*pValue, constant(4));

  for (edge e : pGraph->edges()) delete pGraph->inf(e);
  for (KvCBasicBlock* pBlock : {pBlock1, pBlock2}) {
    irtest::deleteContents(*pBlock);
    delete pBlock;
  }
  delete pGraph->inf(entry);
  delete pGraph;
  delete pMain;
  delete pFour;
  delete x1;
  delete x2;
}

}  // namespace
