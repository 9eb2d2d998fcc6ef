// Valid-condition assignments: what each form of branch condition tells its two branches.
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/statement.h"

using namespace cfgtest;

namespace {

// A condition that answers the two queries as the test sets it up, and records what it is told.
struct TestCondition : irtest::TestExpression {
  KvCCfgVariable* isVariable(bool& negated) const override {
    if (pVariable) negated = isNegated;
    return pVariable;
  }
  bool isVariableEqualToConstant(KvCCfgVariable*& var, KvCCfgValue& value, bool& inequality) const override {
    if (!pCompared) return false;
    var = pCompared;
    value = KvCCfgValue(c);
    inequality = isInequality;
    return true;
  }
  void actOnComparisonOutsideBoolRange() override { ++noticed; }
  void replaceConditionWithConstant(double value) override {
    replacedAfterNotice = noticed > 0;
    replacedBy.push_back(value);
  }

  KvCCfgVariable* pVariable = nullptr;
  bool isNegated = false;
  KvCCfgVariable* pCompared = nullptr;
  double c = 0.0;
  bool isInequality = false;
  // Plain fields: conditions come from the test's pool, which runs no destructor.
  int noticed = 0;
  bool replacedAfterNotice = false;
  ssaopt::array<double> replacedBy;
};

TestCondition* variable(KvCCfgVariable* x, bool negated = false) {
  TestCondition* pCond = new TestCondition();
  pCond->pVariable = x;
  pCond->isNegated = negated;
  return pCond;
}

TestCondition* comparison(KvCCfgVariable* x, double c, bool inequality) {
  TestCondition* pCond = new TestCondition();
  pCond->pCompared = x;
  pCond->c = c;
  pCond->isInequality = inequality;
  return pCond;
}

// b [if (cond)] -T-> onTrue,  b -F-> onFalse
struct Branch {
  node b, trueTarget, falseTarget;
  edge onTrue, onFalse;
};

// The virtual assignment that a branch edge now leads through: its variable and value.
struct Assigned {
  KvCCfgVariable* pVariable;
  KvCCfgValue value;
};

class ValidConditionTest : public CfgTest {
protected:
  Branch branchOn(KvCCfgExpression* pCond) {
    Branch branch;
    branch.b = startWith(pMain, block(pMain, 1));
    blockOf(branch.b).appendBranch(pCond);
    branch.trueTarget = block(pMain, 1);
    branch.falseTarget = block(pMain, 1);
    branch.onTrue = onTrue(branch.b, branch.trueTarget);
    branch.onFalse = onFalse(branch.b, branch.falseTarget);
    return branch;
  }

  // What the edge leads through before it reaches `target`, or nothing when it reaches it directly.
  std::optional<Assigned> assignedOn(edge e, node target) {
    node w = G.target(e);
    if (w == target) return std::nullopt;
    EXPECT_EQ(successors(w), Nodes{target});
    EXPECT_EQ(procedureOf(w), pMain);
    EXPECT_EQ(condition(w), nullptr);
    EXPECT_NE(G.inf(G.first_adj_edge(w)), nullptr);
    auto statements = irtest::items(blockOf(w).getStatementSeq());
    if (statements.size() != 1 || !statements[0]->isAssignment()) {
      ADD_FAILURE() << "not one assignment";
      return std::nullopt;
    }
    KvCCfgAssignment* pAssign = statements[0]->isAssignment();
    EXPECT_TRUE(pAssign->getIsVirtual());
    return Assigned{pAssign->getLHS(), pAssign->getRHS()->evaluate()};
  }
  std::optional<Assigned> onTrueBranch(const Branch& branch) {
    return assignedOn(branch.onTrue, branch.trueTarget);
  }
  std::optional<Assigned> onFalseBranch(const Branch& branch) {
    return assignedOn(branch.onFalse, branch.falseTarget);
  }

  void expectAssigned(const std::optional<Assigned>& assigned, KvCCfgVariable* pVariable, double value) {
    ASSERT_TRUE(assigned.has_value()) << "no assignment";
    EXPECT_EQ(assigned->pVariable, pVariable);
    EXPECT_VALUE(assigned->value, constant(value));
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  KvCCfgProcedure* pMain = procedure("#main");
  irtest::TestVariable logical{KV_DataType::boolean()};
  irtest::TestVariable integer{KV_DataType::int16()};
  irtest::TestVariable real{KV_DataType::float64()};
  irtest::TestVariable single{KV_DataType::float32()};
  irtest::TestVariable untyped{nullptr};
};

}  // namespace

using ValidConditions = ValidConditionTest;

// What programs cannot show (every form a client condition takes is a program in
// tests/tools/pipeline_test.cpp): a variable without data type, a condition that is neither form, and
// one that is both, which is not asked for the comparison as well: `integer`, which is not logical,
// tells nothing, although the comparison would have told the true branch something.
TEST_F(ValidConditions, EachFormOfConditionTellsItsBranchesWhatItImplies) {
  struct Known {
    KvCCfgVariable* pVariable;  // null: nothing is assigned on that branch
    double value;
  };
  TestCondition* pBoth = variable(&integer);
  pBoth->pCompared = &integer;
  pBoth->c = 7.0;
  const struct {
    const char* text;
    TestCondition* pCond;
    Known onTrue, onFalse;
  } rows[] = {
      {"logical", variable(&logical), {&logical, 1}, {&logical, 0}},
      {"integer, also == 7", pBoth, {}, {}},
      {"!untyped", variable(&untyped, true), {}, {}},
      {"neither form", new TestCondition(), {}, {}},
      {"untyped == 5", comparison(&untyped, 5, false), {&untyped, 5}, {}},
      {"logical != 0", comparison(&logical, 0, true), {&logical, 1}, {&logical, 0}},
  };
  std::vector<Branch> branches;
  for (const auto& row : rows) branches.push_back(branchOn(row.pCond));
  KvCCfgEdgeInfo* pTrue = G.inf(branches[0].onTrue);

  G.insertValidConditionAssignments();

  for (std::size_t i = 0; i < branches.size(); ++i) {
    SCOPED_TRACE(rows[i].text);
    for (auto [assigned, known] : {std::pair{onTrueBranch(branches[i]), rows[i].onTrue},
                                   std::pair{onFalseBranch(branches[i]), rows[i].onFalse}}) {
      if (known.pVariable)
        expectAssigned(assigned, known.pVariable, known.value);
      else
        EXPECT_FALSE(assigned.has_value());
    }
  }
  // The branch edges keep their payloads and sources; the assignment on the true edge comes first, a
  // plain edge behind it.
  EXPECT_EQ(G.inf(branches[0].onTrue), pTrue);
  EXPECT_EQ(G.source(branches[0].onTrue), branches[0].b);
  node onTrueBlock = G.target(branches[0].onTrue), onFalseBlock = G.target(branches[0].onFalse);
  EXPECT_LT(statement(onTrueBlock, 0)->getIndex(), statement(onFalseBlock, 0)->getIndex());
  EXPECT_EQ(G.inf(G.first_adj_edge(onTrueBlock))->isTrueBranch(), nullptr);
  EXPECT_TRUE(m_Log.empty());
}

// x == 0.0 also holds for x = -0.0: recording +0.0 let 1.0 / x fold to the wrong infinity.
TEST_F(ValidConditions, RegressionAFloatingPointVariableComparedWithZeroIsNotAssigned) {
  std::vector<Branch> branches{
      branchOn(comparison(&real, 0.0, false)), branchOn(comparison(&real, 0.0, true)),
      branchOn(comparison(&real, -0.0, false)), branchOn(comparison(&single, 0.0, false))};
  int built = G.number_of_nodes();

  G.insertValidConditionAssignments();

  EXPECT_EQ(G.number_of_nodes(), built);
}

using MalformedBranch = ValidConditionTest;

// An out-edge that is neither branch is reported and serves as the false edge; a missing one is
// reported and gets nothing.
TEST_F(MalformedBranch, IsReportedAndHandledAsFarAsItGoes) {
  node b = startWith(pMain, block(pMain, 1));
  blockOf(b).appendBranch(variable(&logical));
  node t = block(pMain, 1), s = block(pMain, 1);
  onTrue(b, t);
  edge ssa = G.new_edge(b, s, new KvCSSAEdge());
  node lonely = block(pMain, 1), f = block(pMain, 1);
  blockOf(lonely).appendBranch(variable(&logical));
  onFalse(lonely, f);

  G.insertValidConditionAssignments();

  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 3559));
  EXPECT_TRUE(m_Log.hasInternalError("KvCControlFlowGraph", 3571));
  EXPECT_TRUE(m_Log.hasConsistencyFailure("0"));
  expectAssigned(assignedOn(ssa, s), &logical, 0.0);
  EXPECT_EQ(successors(lonely).size(), 1u);
  expectAssigned(assignedOn(G.first_adj_edge(lonely), f), &logical, 0.0);
}
