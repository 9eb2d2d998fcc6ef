// Def/use summaries and interface statements where the textual format cannot go: calls that pass
// fewer formals or none, and nodes without payload. Summaries of whole programs are
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

TEST_F(Summaries, ReportANodeWithoutPayloadAndPassItBy) {
  startWith(pMain, code(pMain, {}));
  G.new_node();
  Access::placeValueReturnStatements(G);
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 1684));
}

}  // namespace
