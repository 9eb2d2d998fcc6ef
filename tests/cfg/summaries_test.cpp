// Def/use summaries and interface statements where the textual format cannot go: calls that pass
// fewer formals or none, calls inside a block, nodes without payload. Summaries of whole programs are
// tested as program texts with the client (ssa_construction_test.cpp).
#include <gtest/gtest.h>

#include <utility>

#include "cfg/ssa_testing.h"
#include "ssaopt/frame/report.h"

using namespace ssatest;

namespace {

class Summaries : public SSATest {
protected:
  void placeInterfaceStatements() {
    G.placeExitNodes();
    Access::collectVarDefsAndUses(G);
    Access::initVariablesAfterEntryNodes(G);
    Access::placeValueReturnStatements(G);
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  KvCCfgProcedure* pMain = mainProcedure();
};

TEST_F(Summaries, GiveEveryRegisteredCallAnArgumentForEveryParameter) {
  KvCCfgProcedure* pP = procedure("P");
  KvCCfgProcedureCall *pFirst = call(pP), *pSecond = call(pP), *pThird = call(pP);
  startWith(pMain, code(pMain, {pFirst, pSecond, pThird}));
  startWith(pP, code(pP, {assign(x, {&g})}));
  auto pass = [this](KvCCfgProcedureCall* pCall, ssaopt::list<KvCCfgVariable*> formals,
                     ssaopt::list<KvCCfgExpression*> arguments) {
    G.setParametersOfCall(pCall, formals, arguments);
  };
  // The second call passes fewer formals than the first; the third passes none.
  pass(pFirst, {&f, &g}, {reads({&a}), reads({&b})});
  pass(pSecond, {&f}, {reads({&c})});
  placeInterfaceStatements();

  EXPECT_EQ(text(firstBlock(pP)), "f = param(a | c | f); g = param(b | g | g); x = param(x | x | x)")
      << "a call without an argument passes the formal itself";
  EXPECT_EQ(pP->getDefinedVariables(), (Variables{&f, &g, &x})) << "every call writes the formals it passes";
  EXPECT_EQ(text(firstBlock(pMain)), "init a; init b; init c; init f; init g; init x");
  EXPECT_TRUE(m_Log.empty());
}

TEST_F(Summaries, BringBackWhatACalleeDefinesRightAfterTheCall) {
  KvCCfgProcedure *pP = procedure("P"), *pQ = procedure("Q");
  node caller = startWith(
      pMain, code(pMain, {assign(y, {&x}), call(pP), call(pQ), assign(u, {&a}), call(pP)}, reads({&c})));
  node next = block(pMain);
  onTrue(caller, next);
  onFalse(caller, next);
  startWith(pP, code(pP, {assign(a, {}), assign(b, {})}));
  startWith(pQ, code(pQ, {assign(w, {&b})}));
  placeInterfaceStatements();

  Nodes chain{caller};
  while (chain.size() < 3) chain.push_back(successors(chain.back()).at(0));
  EXPECT_EQ(text(chain[0]), "y = x; call P; a = return(a); b = return(b)");
  EXPECT_EQ(text(chain[1]), "call Q; w = return(w)");
  EXPECT_EQ(text(chain[2]), "u = a; call P; a = return(a); b = return(b); if (c)");
  EXPECT_EQ(successors(chain[2]), (Nodes{next, next}));
  EXPECT_EQ(pP->getValueReturnStatements().size(), 4u);
  EXPECT_EQ(pQ->getValueReturnStatements().size(), 1u);
  EXPECT_TRUE(m_Log.empty());
}

TEST_F(Summaries, ReportANodeWithoutPayloadAndPassItBy) {
  startWith(pMain, code(pMain, {}));
  G.new_node();
  Access::placeValueReturnStatements(G);
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 1684));
}

// The expression of parameter and value-return statements stands for its variables.
TEST(InterfaceExpression, RenamesItsMembersAndTakesItsValueAndRangeFromThem) {
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope scope(&pool);
  Var three("three"), five("five"), version("version");
  for (auto [pVariable, number] : {std::pair{&three, 3.0}, std::pair{&five, 5.0}}) {
    KvCCfgValue value(number);
    pVariable->setVarValueAndAdjustCfgValue(value);
  }
  KvCCfgVariableExpression expression;
  expression.addVariable(&three);
  EXPECT_EQ(expression.evaluate().getValue(), 3.0);
  expression.addVariable(&five);
  EXPECT_TRUE(expression.evaluate().isUndetermined()) << "several members have no one value";
  EXPECT_EQ(expression.getMinimum().getValue(), 3.0);
  EXPECT_EQ(expression.getMaximum().getValue(), 5.0);
  expression.replaceVariable(&three, &version);
  EXPECT_EQ(expression.getUsedVariables(), (Variables{&five, &version}));
}

}  // namespace
