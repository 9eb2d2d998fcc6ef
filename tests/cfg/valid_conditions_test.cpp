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

using BranchOnAVariable = ValidConditionTest;

TEST_F(BranchOnAVariable, ALogicalVariableIsOneOnTheTrueBranchAndZeroOnTheFalse) {
  Branch plainBranch = branchOn(variable(&logical));
  Branch negatedBranch = branchOn(variable(&logical, true));
  KvCCfgEdgeInfo* pTrue = G.inf(plainBranch.onTrue);

  G.insertValidConditionAssignments();

  expectAssigned(onTrueBranch(plainBranch), &logical, 1.0);
  expectAssigned(onFalseBranch(plainBranch), &logical, 0.0);
  expectAssigned(onTrueBranch(negatedBranch), &logical, 0.0);
  expectAssigned(onFalseBranch(negatedBranch), &logical, 1.0);
  EXPECT_EQ(G.inf(plainBranch.onTrue), pTrue);
  EXPECT_EQ(G.source(plainBranch.onTrue), plainBranch.b);
  node onTrueBlock = G.target(plainBranch.onTrue), onFalseBlock = G.target(plainBranch.onFalse);
  EXPECT_LT(statement(onTrueBlock, 0)->getIndex(), statement(onFalseBlock, 0)->getIndex()) << "true first";
  EXPECT_EQ(G.inf(G.first_adj_edge(onTrueBlock))->isTrueBranch(), nullptr) << "a plain edge behind";
  EXPECT_TRUE(m_Log.empty());
}

// A condition that is a variable is not asked for a comparison as well: `integer`, which is not
// logical, tells nothing, although the comparison would have told the true branch something.
TEST_F(BranchOnAVariable, OtherVariablesAndOtherConditionsTellNothing) {
  TestCondition* pBoth = variable(&integer);
  pBoth->pCompared = &integer;
  pBoth->c = 7.0;
  Branch onBoth = branchOn(pBoth);
  Branch onUntyped = branchOn(variable(&untyped, true));
  Branch onNeither = branchOn(new TestCondition());
  int built = G.number_of_nodes();

  G.insertValidConditionAssignments();

  EXPECT_EQ(G.number_of_nodes(), built);
  for (const Branch& branch : {onBoth, onUntyped, onNeither}) {
    EXPECT_FALSE(onTrueBranch(branch).has_value());
    EXPECT_FALSE(onFalseBranch(branch).has_value());
  }
}

TEST_F(BranchOnAVariable, ASecondRunAddsASecondLayer) {
  Branch branch = branchOn(variable(&logical));
  G.insertValidConditionAssignments();
  node firstLayer = G.target(branch.onTrue);

  G.insertValidConditionAssignments();

  node secondLayer = G.target(branch.onTrue);
  EXPECT_NE(secondLayer, firstLayer);
  EXPECT_EQ(successors(secondLayer), Nodes{firstLayer});
  EXPECT_EQ(successors(firstLayer), Nodes{branch.trueTarget});
  expectAssigned(assignedOn(branch.onTrue, firstLayer), &logical, 1.0);
}

using BranchOnAComparison = ValidConditionTest;

// x == c and x != c for a logical x and c in the Boolean range: c on one branch, !c on the other.
TEST_F(BranchOnAComparison, ALogicalVariableAgainstZeroOrOneIsKnownOnBothBranches) {
  struct Row {
    double c;
    bool inequality;
    double onTrue, onFalse;
  };
  const Row rows[] = {
      {1.0, false, 1.0, 0.0}, {0.0, false, 0.0, 1.0}, {1.0, true, 0.0, 1.0}, {0.0, true, 1.0, 0.0}};
  std::vector<Branch> branches;
  for (const Row& row : rows) branches.push_back(branchOn(comparison(&logical, row.c, row.inequality)));

  G.insertValidConditionAssignments();

  for (std::size_t i = 0; i < branches.size(); ++i) {
    SCOPED_TRACE(std::string("x ") + (rows[i].inequality ? "!=" : "==") + " " + std::to_string(rows[i].c));
    expectAssigned(onTrueBranch(branches[i]), &logical, rows[i].onTrue);
    expectAssigned(onFalseBranch(branches[i]), &logical, rows[i].onFalse);
  }
}

// x == 5 is never true and x != 5 always for a logical x: the condition hears so and becomes
// constant, and both branches stay as they were.
TEST_F(BranchOnAComparison, ALogicalVariableAgainstAnotherConstantDecidesTheCondition) {
  TestCondition *pEqual = comparison(&logical, 5.0, false), *pUnequal = comparison(&logical, 5.0, true),
                *pNegative = comparison(&logical, -1.0, false), *pHalf = comparison(&logical, 0.5, true);
  std::vector<Branch> branches{branchOn(pEqual), branchOn(pUnequal), branchOn(pNegative), branchOn(pHalf)};
  int built = G.number_of_nodes();

  G.insertValidConditionAssignments();

  EXPECT_EQ(G.number_of_nodes(), built);
  for (auto [pCond, value] : {std::pair{pEqual, 0.0}, {pUnequal, 1.0}, {pNegative, 0.0}, {pHalf, 1.0}}) {
    EXPECT_EQ(pCond->noticed, 1);
    EXPECT_TRUE(pCond->replacedAfterNotice);
    EXPECT_EQ(irtest::items(pCond->replacedBy), std::vector<double>{value});
  }
  EXPECT_EQ(condition(branches[0].b), pEqual) << "the condition changes itself in place";
  EXPECT_EQ(successors(branches[0].b), (Nodes{branches[0].trueTarget, branches[0].falseTarget}));
}

// Any other variable is known only on the branch where it equals the constant.
TEST_F(BranchOnAComparison, OtherVariablesAreKnownWhereTheyEqualTheConstant) {
  Branch equal = branchOn(comparison(&integer, 7.0, false)),
         unequal = branchOn(comparison(&integer, 7.0, true));
  Branch untypedEqual = branchOn(comparison(&untyped, 5.0, false));
  Branch integerZero = branchOn(comparison(&integer, 0.0, true));
  Branch realNonZero = branchOn(comparison(&real, 2.5, false));

  G.insertValidConditionAssignments();

  expectAssigned(onTrueBranch(equal), &integer, 7.0);
  EXPECT_FALSE(onFalseBranch(equal).has_value());
  EXPECT_FALSE(onTrueBranch(unequal).has_value());
  expectAssigned(onFalseBranch(unequal), &integer, 7.0);
  expectAssigned(onTrueBranch(untypedEqual), &untyped, 5.0);
  expectAssigned(onFalseBranch(integerZero), &integer, 0.0);
  expectAssigned(onTrueBranch(realNonZero), &real, 2.5);
}

// x == 0.0 also holds for x = -0.0: recording +0.0 let 1.0 / x fold to the wrong infinity.
TEST_F(BranchOnAComparison, RegressionAFloatingPointVariableComparedWithZeroIsNotAssigned) {
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
