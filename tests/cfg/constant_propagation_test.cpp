// Sparse conditional constant propagation on small graphs in SSA form, one item per block, for what
// programs in the textual format cannot show: which edges every kind of condition value opens, how
// often blocks are visited and passes run, in which pass a call's argument reaches its callee, and
// that value objects are freed exactly once.
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
  // Gives a variable a value before the propagation starts from it.
  static void preset(KvCCfgVariable* pVariable, KvCCfgValue value) {
    KvCCfgValue* pOld = pVariable->getValue();
    pVariable->setVarValueAndAdjustCfgValue(value);
    delete pOld;
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

// ---- Visits and passes ---------------------------------------------------------------------------

// The join is reached through the else edge before `a` is defined two blocks down the then branch:
// the flow step visits it then, and the SSA edge from the definition of `a` visits it again, since
// an edge into it is executable by then.
TEST_F(ConstantPropagation, AJoinIsVisitedByTheFlowStepOnceAndAgainThroughAnSSAEdge) {
  KvCSSAVariable *a1 = version(a), *z1 = version(z);
  Sum* pRead = sum(0, {a1});
  Diamond d = diamond(new irtest::TestExpression({}, nonConstant));
  node later = empty(), define = assign(a1, sum(1));
  G.move_edge(G.first_adj_edge(d.left), d.left, later);
  path({later, define, d.join});
  blockOf(d.join).append(new Assign(z1, pRead));
  G.propagateSparseConditionalConstant(false);

  EXPECT_EQ(pRead->evaluated().size(), 3u) << "twice in the first pass, once in the second";
  EXPECT_VALUE(pRead->evaluated().at(0), undetermined);
  EXPECT_VALUE(pRead->evaluated().at(1), constant(1));
  EXPECT_VALUE(pRead->evaluated().at(2), constant(1));
  EXPECT_EQ(rangeText(z1), "1 in [1, 1]");
}

TEST_F(ConstantPropagation,
       AnAssignmentAsksForAnotherPassOnlyWhenItsVariableTurnsFromUndeterminedToConstant) {
  KvCSSAVariable *a1 = version(a), *b1 = version(b), *c1 = version(c);
  Sum *pFresh = sum(1), *pWasVarying = sum(2), *pWasOther = sum(3);
  run(pMain, {assign(a1, pFresh)});
  KvCCfgProcedure* pOther = procedure("other");
  run(pOther, {assign(b1, pWasVarying, pOther), assign(c1, pWasOther, pOther)});
  preset(b1, nonConstant);
  preset(c1, constant(7));
  G.propagateSparseConditionalConstant(false);
  EXPECT_EQ(pFresh->evaluated().size(), 2u);

  preset(a1, nonConstant);
  preset(b1, nonConstant);
  preset(c1, constant(7));
  G.sparseConditionalConstant(false);
  EXPECT_EQ(pFresh->evaluated().size(), 3u) << "one more pass only";
  EXPECT_EQ(rangeText(a1), "1 in [1, 1]");
  EXPECT_EQ(rangeText(b1), "2 in [2, 2]");
  EXPECT_EQ(rangeText(c1), "3 in [3, 3]");
}

TEST_F(ConstantPropagation, APhiFunctionTurningFromNonConstantToConstantAsksForAnotherPass) {
  KvCSSAVariable *a1 = version(a), *x1 = version(x);
  Sum* pCounter = sum(1);
  run(pMain, {assign(a1, pCounter), phi(x1, {a1})});
  preset(a1, constant(1));
  preset(x1, nonConstant);
  G.propagateSparseConditionalConstant(false);

  EXPECT_EQ(pCounter->evaluated().size(), 2u);
  EXPECT_EQ(rangeText(x1), "1 in [1, 1]");
}

// ---- Procedures ----------------------------------------------------------------------------------

class Calls : public ConstantPropagation {
protected:
  // `caller` sets a to 5 and calls `callee`, which adds 1 to its parameter p; the caller takes p
  // back into r.
  void build(const char* caller, const char* callee) {
    pCaller = procedure(caller);
    pCallee = procedure(callee);
    auto* pCall = new KvCCfgProcedureCall(pCallee->getName());
    auto* pParam = new KvCCfgParamStatement(p1);
    pParam->setArgument(pCall, ssatest::reads({a1}));
    auto* pReturn = new KvCCfgValueReturnStatement(r1);
    pReturn->setExpression(ssatest::reads({p2}));
    callerBlocks = {assign(a1, sum(5), pCaller), holding(pCall, pCaller), holding(pReturn, pCaller)};
    calleeBlocks = {holding(pParam, pCallee), assign(p2, pIncrement, pCallee)};
    run(pCaller, {callerBlocks[0], callerBlocks[1], callerBlocks[2]});
    run(pCallee, {calleeBlocks[0], calleeBlocks[1]});
  }
  bool allExecutable(const Nodes& blocks) {
    for (node v : blocks)
      for (edge e : G.in(v))
        if (!G.inf(e)->isSSAEdge() && !executable(e)) return false;
    return true;
  }
  bool noneExecutable(const Nodes& blocks) {
    for (node v : blocks)
      for (edge e : G.in(v))
        if (executable(e)) return false;
    return true;
  }

  KvCCfgProcedure *pCaller = nullptr, *pCallee = nullptr;
  Nodes callerBlocks, calleeBlocks;
  KvCSSAVariable *a1 = version(a), *p1 = version(b), *p2 = version(b), *r1 = version(c);
  Sum* pIncrement = sum(1, {p1});
};

TEST_F(Calls, ACalleeProcessedAfterItsCallerSeesTheArgumentInTheSamePass) {
  build("a caller", "b callee");
  G.propagateSparseConditionalConstant(false);

  ASSERT_EQ(pIncrement->evaluated().size(), 3u);
  EXPECT_VALUE(pIncrement->evaluated().at(0), constant(6));
  EXPECT_EQ(rangeText(r1), "6 in [6, 6]");
  EXPECT_TRUE(noneExecutable(callerBlocks)) << "the flags are those of the procedure processed last";
  EXPECT_TRUE(allExecutable(calleeBlocks));
  for (node v : callerBlocks) EXPECT_TRUE(visited(v));
}

TEST_F(Calls, ACalleeProcessedBeforeItsCallerSeesTheArgumentOnlyInTheNextPass) {
  build("b caller", "a callee");
  G.propagateSparseConditionalConstant(false);

  ASSERT_EQ(pIncrement->evaluated().size(), 3u);
  EXPECT_VALUE(pIncrement->evaluated().at(0), undetermined);
  EXPECT_VALUE(pIncrement->evaluated().at(1), constant(6));
  EXPECT_EQ(rangeText(p1), "5 in [5, 5]");
  EXPECT_EQ(rangeText(r1), "6 in [6, 6]");
  EXPECT_TRUE(allExecutable(callerBlocks));
  EXPECT_TRUE(noneExecutable(calleeBlocks));
  for (node v : calleeBlocks) EXPECT_TRUE(visited(v));
}

// ---- SSA edges -----------------------------------------------------------------------------------

TEST_F(ConstantPropagation, SSAEdgesRunFromEachDefinitionToEachUseAndEveryCallAddsAFullSet) {
  KvCSSAVariable *a1 = version(a), *b1 = version(b), *c1 = version(c);
  node both = holding(new irtest::TestStatement({a1, b1}));
  node reader = holding(new irtest::TestStatement({}, {a1, b1}));
  node own = holding(new irtest::TestStatement({c1}, {c1}));
  run(pMain, {both, reader, own});
  G.addSSAEdges();
  EXPECT_EQ(ssaEdgeCount(), 3);
  EXPECT_EQ(successors(both), (Nodes{reader, reader, reader})) << "the plain edge, then one per variable";
  EXPECT_EQ(successors(own), (Nodes{own}));

  G.propagateSparseConditionalConstant(false);
  EXPECT_EQ(ssaEdgeCount(), 6);
}

// ---- Ownership -----------------------------------------------------------------------------------

// Without a pool every object is the test's to delete, so the sanitizer sees a value object that the
// propagation leaks or frees twice.
TEST(ConstantPropagationOwnership, FreesEveryReplacedValueObjectExactlyOnce) {
  Var x("x");
  auto* pGraph = new KvCControlFlowGraph();
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
  EXPECT_EQ(rangeText(x2), "4 in [4, 4]");

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
