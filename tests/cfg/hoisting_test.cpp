// Code hoisting: which pairs of statements the library offers the statement classes to hoist, in what
// order, and where the walk down the branches stops.
#include <gtest/gtest.h>

#include <initializer_list>
#include <string>
#include <vector>

#include "cfg/cfg_testing.h"
#include "ssaopt/ir/statement.h"

using namespace cfgtest;
using Log = std::vector<std::string>;

namespace {

// A statement that generates the same code as another with the same `code`, and writes what it is
// asked to do into the log under its label ("a@T").
class HoistableStatement : public irtest::TestStatement {
public:
  HoistableStatement(std::string code, std::string label, Log* pLog, irtest::Variables defined = {})
      : TestStatement(std::move(defined)), m_Code(std::move(code)), m_Label(std::move(label)), m_pLog(pLog) {}

  bool generatesSameCode(KvCCfgStatement* pOther) const override {
    auto* pHoistable = dynamic_cast<HoistableStatement*>(pOther);
    return pHoistable && pHoistable->m_Code == m_Code;
  }
  bool hoistOutOfIfElseBranch(bool& skipNext) override {
    m_pLog->push_back("hoist " + m_Label);
    skipNext = m_AsksToSkipNext;
    return m_Agrees;
  }
  void remove() override { m_pLog->push_back("remove " + m_Label); }

  bool m_Agrees = true;
  bool m_AsksToSkipNext = false;

private:
  std::string m_Code, m_Label;
  Log* m_pLog;
};

// A call that generates the same code as any call of the same procedure.
class HoistableCall : public KvCCfgProcedureCall {
public:
  HoistableCall(const char* name, Log* pLog, irtest::Variables returned = {})
      : KvCCfgProcedureCall(name), m_pLog(pLog), m_Returned(std::move(returned)) {}

  bool generatesSameCode(KvCCfgStatement* pOther) const override {
    return pOther->isProcedureCall() && pOther->isProcedureCall()->getName() == getName();
  }
  bool hoistOutOfIfElseBranch(bool& skipNext) override {
    m_pLog->push_back("hoist call " + std::string(getName().cstring()));
    skipNext = false;
    return true;
  }
  irtest::Variables getVarsDefinedByFctReturn() const override { return m_Returned; }

private:
  Log* m_pLog;
  irtest::Variables m_Returned;
};

struct SideEffectCondition : irtest::TestExpression {
  bool hasSideEffects() const override { return true; }
};

class HoistingTest : public CfgTest {
protected:
  // v [if (pCond)] -T-> ... -> join,  v -F-> ... -> join; the branches are filled with `onTrue` and
  // `onFalse`.
  node branchOn(KvCCfgExpression* pCond = new irtest::TestExpression()) {
    node v = startWith(pMain, block(pMain));
    blockOf(v).appendBranch(pCond);
    return v;
  }
  // A chain of the given blocks from `v` along a new true (or false) edge to `join`.
  void branch(node v, bool isTrue, std::initializer_list<node> blocks, node join) {
    node last = v;
    for (node w : blocks) {
      if (last == v)
        isTrue ? onTrue(v, w) : onFalse(v, w);
      else
        plain(last, w);
      last = w;
    }
    if (last == v)
      isTrue ? onTrue(v, join) : onFalse(v, join);
    else
      plain(last, join);
  }
  // A block holding one hoistable statement.
  node holding(const char* code, const char* side, irtest::Variables defined = {}) {
    return holding(new HoistableStatement(code, std::string(code) + "@" + side, &m_Log, std::move(defined)));
  }
  node holding(KvCCfgStatement* pStatement) {
    node w = block(pMain);
    blockOf(w).append(pStatement);
    return w;
  }
  HoistableStatement* hoistable(node w) { return dynamic_cast<HoistableStatement*>(statement(w, 0)); }

  // A branch on `pCond` whose branches hold one statement each; whether the pair is offered.
  void expectHoistedOnlyIf(bool hoisted, KvCCfgExpression* pCond, KvCCfgStatement* pTrue,
                           KvCCfgStatement* pFalse) {
    node v = branchOn(pCond), join = block(pMain, 1);
    branch(v, true, {holding(pTrue)}, join);
    branch(v, false, {holding(pFalse)}, join);
    G.hoistCodeOutOfIfElseBranches();
    EXPECT_EQ(m_Log.empty(), !hoisted) << ::testing::PrintToString(m_Log);
  }

  Log m_Log;
  KvCCfgProcedure* pMain = procedure("#main");
};

}  // namespace

using Hoisting = HoistingTest;

TEST_F(Hoisting, MatchingHeadsAreHoistedPairAfterPairUntilTheyDiffer) {
  node v = branchOn(), join = block(pMain, 1);
  branch(v, true, {holding("a", "T"), holding("b", "T"), holding("c", "T"), holding("d", "T")}, join);
  branch(v, false, {holding("a", "F"), holding("b", "F"), holding("x", "F"), holding("d", "F")}, join);
  int edges = G.number_of_edges();

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_EQ(m_Log, (Log{"hoist a@F", "remove a@T", "hoist b@F", "remove b@T"}));
  EXPECT_EQ(G.number_of_edges(), edges) << "the library itself changes no control flow";
}

TEST_F(Hoisting, ARefusingStatementEndsTheHoistingAtItsBranch) {
  node v = branchOn(), join = block(pMain, 1);
  node refusing = holding("a", "F");
  hoistable(refusing)->m_Agrees = false;
  branch(v, true, {holding("a", "T"), holding("b", "T")}, join);
  branch(v, false, {refusing, holding("b", "F")}, join);

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_EQ(m_Log, (Log{"hoist a@F"}));
}

// The statement that was hoisted asks that the next statement of each branch be passed over once.
TEST_F(Hoisting, SkipNextPassesOverOneStatementInEachBranch) {
  node v = branchOn(), join = block(pMain, 1);
  node first = holding("a", "F");
  hoistable(first)->m_AsksToSkipNext = true;
  branch(v, true, {holding("a", "T"), holding("x", "T"), holding("b", "T")}, join);
  branch(v, false, {first, holding("y", "F"), holding("b", "F")}, join);

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_EQ(m_Log, (Log{"hoist a@F", "remove a@T", "hoist b@F", "remove b@T"}));
}

// Virtual assignments generate no code, value-return statements only link procedures, and blocks
// holding one phi function or nothing hold no statement: the walk passes them all.
TEST_F(Hoisting, TheWalkPassesWhatGeneratesNoCode) {
  irtest::TestVariable x;
  node v = branchOn(), join = block(pMain, 1);
  node virtualA = holding("a", "T");
  statement(virtualA, 0)->setIsVirtual(true);
  auto* pReturn = new KvCCfgValueReturnStatement(&x);
  pReturn->setExpression(new irtest::TestExpression());
  node phi = block(pMain);
  blockOf(phi).append(new KvCPhiFunction(&x, 1));
  branch(v, true, {virtualA, holding(pReturn), phi, block(pMain), holding("b", "T")}, join);
  branch(v, false, {holding("b", "F")}, join);

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_EQ(m_Log, (Log{"hoist b@F", "remove b@T"}));
}

// A block of several statements, or of a statement and a phi function, yielded no statement and was
// passed over: the statement behind it moved above code it may depend on.
TEST_F(Hoisting, RegressionTheWalkStopsAtABlockHoldingMoreThanOneItem) {
  irtest::TestVariable x;
  node v = branchOn(), join = block(pMain, 1);
  node twoStatements = block(pMain, 2);
  branch(v, true, {twoStatements, holding("a", "T")}, join);
  branch(v, false, {holding("a", "F")}, join);
  node w = branchOn(), join2 = block(pMain, 1);
  node phiAndStatement = block(pMain, 1);
  blockOf(phiAndStatement).append(new KvCPhiFunction(&x, 1));
  branch(w, true, {holding("b", "T")}, join2);
  branch(w, false, {phiAndStatement, holding("b", "F")}, join2);
  node u = branchOn(), join3 = block(pMain, 1);
  node twoPhis = block(pMain);
  blockOf(twoPhis).append(new KvCPhiFunction(&x, 1));
  blockOf(twoPhis).append(new KvCPhiFunction(&x, 1));
  branch(u, true, {twoPhis, holding("c", "T")}, join3);
  branch(u, false, {holding("c", "F")}, join3);

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_TRUE(m_Log.empty()) << ::testing::PrintToString(m_Log);
}

// The walk stays on its branch: it stops where another path joins and at the next branch.
TEST_F(Hoisting, NothingIsHoistedPastAJoinOrAnotherBranch) {
  node v = branchOn(), join = holding("a", "T");
  branch(v, true, {}, join);
  branch(v, false, {holding("a", "F")}, join);
  node w = branchOn(), join2 = block(pMain, 1), inner = block(pMain, 0, true);
  onTrue(w, inner);
  onTrue(inner, holding("b", "T"));
  onFalse(inner, join2);
  branch(w, false, {holding("b", "F")}, join2);

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_TRUE(m_Log.empty()) << ::testing::PrintToString(m_Log);
}

TEST_F(Hoisting, AConditionWithSideEffectsHoistsNothing) {
  expectHoistedOnlyIf(false, new SideEffectCondition(), new HoistableStatement("a", "a@T", &m_Log),
                      new HoistableStatement("a", "a@F", &m_Log));
}

TEST_F(Hoisting, BaseClassStatementsNeverGenerateTheSameCode) {
  irtest::Fate fate;
  expectHoistedOnlyIf(false, new irtest::TestExpression(), new irtest::TestStatement({}, {}, &fate),
                      new irtest::TestStatement({}, {}, &fate));
  EXPECT_EQ(fate.removed, 0);
}

using HoistingDependences = HoistingTest;

TEST_F(HoistingDependences, AStatementDefiningWhatTheConditionReadsStays) {
  irtest::TestVariable x;
  expectHoistedOnlyIf(false, new irtest::TestExpression({&x}),
                      new HoistableStatement("a", "a@T", &m_Log, {&x}),
                      new HoistableStatement("a", "a@F", &m_Log, {&x}));
}

TEST_F(HoistingDependences, SSAVersionsCountAsTheirVariable) {
  irtest::TestVariable x;
  KvCSSAVariable read(&x), writtenT(&x), writtenF(&x);
  expectHoistedOnlyIf(false, new irtest::TestExpression({&read}),
                      new HoistableStatement("a", "a@T", &m_Log, {&writtenT}),
                      new HoistableStatement("a", "a@F", &m_Log, {&writtenF}));
}

TEST_F(HoistingDependences, AStatementDefiningSomethingElseMoves) {
  irtest::TestVariable x, y;
  KvCSSAVariable read(&x);
  expectHoistedOnlyIf(true, new irtest::TestExpression({&read}),
                      new HoistableStatement("a", "a@T", &m_Log, {&y}),
                      new HoistableStatement("a", "a@F", &m_Log, {&y}));
}

// A call defines what its procedure defines (with all that it calls) and what its function return
// defines.
TEST_F(HoistingDependences, ACallWhoseProcedureDefinesWhatTheConditionReadsStays) {
  irtest::TestVariable x;
  procedure("p")->appendDefinedVariable(&x);
  expectHoistedOnlyIf(false, new irtest::TestExpression({&x}), new HoistableCall("p", &m_Log),
                      new HoistableCall("p", &m_Log));
}

TEST_F(HoistingDependences, ACallWhoseReturnDefinesWhatTheConditionReadsStays) {
  irtest::TestVariable x, y;
  procedure("p")->appendDefinedVariable(&x);
  expectHoistedOnlyIf(false, new irtest::TestExpression({&y}), new HoistableCall("p", &m_Log, {&y}),
                      new HoistableCall("p", &m_Log, {&y}));
}

TEST_F(HoistingDependences, ACallDefiningSomethingElseMoves) {
  irtest::TestVariable x, y;
  procedure("p")->appendDefinedVariable(&x);
  expectHoistedOnlyIf(true, new irtest::TestExpression({&y}), new HoistableCall("p", &m_Log),
                      new HoistableCall("p", &m_Log));
}

TEST_F(Hoisting, TheSSAEdgesAreDeletedFirst) {
  node v = branchOn(), join = block(pMain, 1);
  node a = holding("a", "T"), b = holding("a", "F");
  branch(v, true, {a}, join);
  branch(v, false, {b}, join);
  int controlFlow = G.number_of_edges();
  G.new_edge(v, a, new KvCSSAEdge());
  G.new_edge(a, join, new KvCSSAEdge());
  G.new_edge(b, join, new KvCSSAEdge());

  G.hoistCodeOutOfIfElseBranches();

  EXPECT_EQ(G.number_of_edges(), controlFlow);
  for (edge e : G.edges()) EXPECT_EQ(G.inf(e)->isSSAEdge(), nullptr);
  EXPECT_EQ(m_Log, (Log{"hoist a@F", "remove a@T"})) << "the extra in-edges were SSA edges only";
}
