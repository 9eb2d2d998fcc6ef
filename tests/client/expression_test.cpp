// The client expression's operations as the library uses them: substitution, folding, conditions,
// values and bounds, side effects.
#include <cmath>

#include "client_testing.h"
#include "ssaopt/client/numbers.h"

namespace {

using ssaopt::client::formatNumber;

const char* const kDeclarations =
    "var int16 x; var int16 y; var uint8 u; var int8 s; var bool b; var float32 f;\n"
    "var int16 v volatile; var int16 t[4]; var int16 sat saturate(0..10); var int32 r;\n";

std::string shown(const KvCCfgValue& value) {
  if (value.isConstant()) return formatNumber(value.getValue());
  return value.isUndetermined() ? "?" : "*";
}

class Expressions : public clienttest::ClientTest {
protected:
  // The program "r = <rhs>;" over kDeclarations; its right-hand side.
  KvCCfgSFExpression* expression(const std::string& rhs) {
    m_pProgram = load(std::string(kDeclarations) + "proc #main {\n  r = " + rhs + ";\n}\n");
    return m_pProgram ? firstAssignment(*m_pProgram)->getSFRHS() : nullptr;
  }

  KvCCfgSFVariable* variable(const char* name) { return m_pProgram->findVariable(name); }

  void setValue(const char* name, KvCCfgValue value) { variable(name)->setVarValueAndAdjustCfgValue(value); }

  void setAllNonConstant() {
    for (const auto& pVariable : m_pProgram->variables()) {
      KvCCfgValue unknown(eCfgNonConstant);
      pVariable->setVarValueAndAdjustCfgValue(unknown);
    }
  }

  // The right-hand side as the printer writes it.
  std::string text() {
    std::string printed = ssaopt::client::printProgram(*m_pProgram);
    std::size_t start = printed.find("  r = ") + 6;
    return printed.substr(start, printed.find(";\n", start) - start);
  }

  std::string folded(const std::string& rhs) {
    expression(rhs)->foldConstants();
    return text();
  }

  std::string bounds(const std::string& rhs) {
    KvCCfgSFExpression* pExpression = expression(rhs);
    setAllNonConstant();
    return "[" + shown(pExpression->getMinimum()) + ", " + shown(pExpression->getMaximum()) + "]";
  }

  ssaopt::client::Program* m_pProgram = nullptr;
};

// ---- Folding and substitution ------------------------------------------------------------------

TEST_F(Expressions, FoldingReplacesWhatTheArithmeticDecidesByLiterals) {
  EXPECT_EQ(folded("x + 2 * 3"), "x + 6");
  EXPECT_EQ(folded("(1 + 2) * x - 4 / 2"), "3 * x - 2");
  EXPECT_EQ(folded("-(3) + abs(-2) + sgn(x)"), "-1 + sgn(x)");
  EXPECT_EQ(folded("t[1 + 1] + (~5 & 255)"), "t[2] + 250");
  EXPECT_EQ(folded("1 / 0"), "inf");
}

TEST_F(Expressions, FoldingDropsOperandsThatDoNotMatterUnlessTheyAreVolatile) {
  EXPECT_EQ(folded("0 * x + y"), "0 + y");
  EXPECT_EQ(folded("(0 && x) + (1 || y)"), "1");
  EXPECT_EQ(folded("0 * v"), "0 * v");
}

TEST_F(Expressions, FoldingLeavesWhatHasNoValue) {
  EXPECT_EQ(folded("7 % 0"), "7 % 0");
  EXPECT_EQ(folded("x + 1 + 2"), "x + 1 + 2");
}

TEST_F(Expressions, ConstantVariablesAreReplacedByTheirValue) {
  KvCCfgSFExpression* pExpression = expression("x + y * t[x] + v");
  setValue("x", KvCCfgValue(5.0));
  setValue("v", KvCCfgValue(1.0));
  pExpression->replaceConstantVariables();
  EXPECT_EQ(text(), "5 + y * t[5] + v");
  setValue("y", KvCCfgValue(2.0));
  pExpression->replaceConstantVariables();
  pExpression->foldConstants();
  EXPECT_EQ(text(), "5 + 2 * t[5] + v");
}

TEST_F(Expressions, AConditionBecomesItsConstantUnlessItReadsAVolatile) {
  KvCCfgSFExpression* pExpression = expression("x > 3 && y < 2");
  setValue("x", KvCCfgValue(5.0));
  pExpression->replaceConstantCondition();
  EXPECT_EQ(text(), "x > 3 && y < 2");  // y is not known yet
  setValue("y", KvCCfgValue(0.0));
  pExpression->replaceConstantCondition();
  EXPECT_EQ(text(), "1");

  pExpression = expression("v * 0 == 0");
  ASSERT_TRUE(pExpression->evaluate().isConstant());
  pExpression->replaceConstantCondition();
  EXPECT_EQ(text(), "v * 0 == 0");
}

TEST_F(Expressions, ReplacingAConditionWithAConstant) {
  expression("b && x > 1")->replaceConditionWithConstant(0.0);
  EXPECT_EQ(text(), "0");
}

// ---- Conditions the valid-condition step asks about --------------------------------------------

TEST_F(Expressions, IsVariableKnowsAVariableAndItsNegation) {
  bool negated = true;
  KvCCfgVariable* pFound = expression("b")->isVariable(negated);
  EXPECT_EQ(pFound, variable("b"));
  EXPECT_FALSE(negated);
  pFound = expression("!b")->isVariable(negated);
  EXPECT_EQ(pFound, variable("b"));
  EXPECT_TRUE(negated);
  for (const char* other : {"!!b", "b == 1", "-b", "t[0]"})
    EXPECT_EQ(expression(other)->isVariable(negated), nullptr) << other;
}

TEST_F(Expressions, IsVariableEqualToConstantKnowsAllFourForms) {
  struct Form {
    const char* text;
    bool inequality;
  };
  for (Form form :
       {Form{"x == 3", false}, Form{"3 == x", false}, Form{"x != 3", true}, Form{"3 != x", true}}) {
    KvCCfgVariable* pVariable = nullptr;
    KvCCfgValue value;
    bool inequality = !form.inequality;
    ASSERT_TRUE(expression(form.text)->isVariableEqualToConstant(pVariable, value, inequality)) << form.text;
    EXPECT_EQ(pVariable, variable("x")) << form.text;
    EXPECT_EQ(shown(value), "3") << form.text;
    EXPECT_EQ(inequality, form.inequality) << form.text;
  }
  for (const char* other : {"x == y", "x + 0 == 3", "x < 3", "3 == 3", "t[0] == 3"}) {
    KvCCfgVariable* pVariable = nullptr;
    KvCCfgValue value;
    bool inequality = false;
    EXPECT_FALSE(expression(other)->isVariableEqualToConstant(pVariable, value, inequality)) << other;
    EXPECT_EQ(pVariable, nullptr) << other;
  }
}

TEST_F(Expressions, AComparisonOutsideTheBooleanRangeIsNoticed) {
  KvCCfgSFExpression* pExpression = expression("b != 5");
  pExpression->actOnComparisonOutsideBoolRange();
  const std::vector<ssaopt::client::Notice>& notices = m_pProgram->expressions().notices();
  ASSERT_EQ(notices.size(), 1u);
  EXPECT_EQ(notices[0].message, "'b' is Boolean, so comparing it unequal to 5 is always true");
  EXPECT_EQ(notices[0].pos.line, 4u);
  EXPECT_EQ(notices[0].pos.column, 7u);
}

// ---- Values and bounds -------------------------------------------------------------------------

TEST_F(Expressions, EvaluationFollowsTheValueArithmetic) {
  KvCCfgSFExpression* pExpression = expression("x + 1");
  EXPECT_EQ(shown(pExpression->evaluate()), "?");
  setValue("x", KvCCfgValue(5.0));
  EXPECT_EQ(shown(pExpression->evaluate()), "6");
  EXPECT_EQ(shown(expression("0 * x")->evaluate()), "0");
  EXPECT_EQ(shown(expression("v + 1")->evaluate()), "*");
  EXPECT_EQ(shown(expression("t[0]")->evaluate()), "*");
  EXPECT_EQ(shown(expression("1 << 33")->evaluate()), "2");
  EXPECT_EQ(shown(expression("-7 % 3")->evaluate()), "-1");
}

TEST_F(Expressions, BoundsAreExactIntervalsWhereIntervalsAreExact) {
  EXPECT_EQ(bounds("s + 1"), "[-127, 128]");
  EXPECT_EQ(bounds("u - s"), "[-127, 383]");
  EXPECT_EQ(bounds("s * -2"), "[-254, 256]");
  EXPECT_EQ(bounds("-u"), "[-255, 0]");
  EXPECT_EQ(bounds("abs(s)"), "[0, 128]");
  EXPECT_EQ(bounds("sgn(u)"), "[0, 1]");
  EXPECT_EQ(bounds("u / 4"), "[0, 63.75]");
  EXPECT_EQ(bounds("sat * 2"), "[0, 20]");
  EXPECT_EQ(bounds("t[x] + 1"), "[-32767, 32768]");
  EXPECT_EQ(bounds("x > y"), "[0, 1]");
}

TEST_F(Expressions, BoundsAreOpenWhereNothingIsKnown) {
  EXPECT_EQ(bounds("u / s"), "[*, *]");  // the divisor can be 0
  EXPECT_EQ(bounds("u & 3"), "[*, *]");
  EXPECT_EQ(bounds("f + 1"), "[*, *]");
}

TEST_F(Expressions, BoundsFollowTheRangeOfAnSSAVersion) {
  KvCCfgSFExpression* pExpression = expression("x + 1");
  auto* pVersion = new KvCSSAVariable(variable("x"));  // the pool takes it back
  KvCCfgValue unknown(eCfgNonConstant), two(2.0), seven(7.0);
  pVersion->setVarValueAndAdjustCfgValue(unknown);
  pVersion->setMinValueAndDestroyOld(two);
  pVersion->setMaxValueAndDestroyOld(seven);
  pExpression->replaceVariable(variable("x"), pVersion);
  EXPECT_EQ(shown(pExpression->getMinimum()), "3");
  EXPECT_EQ(shown(pExpression->getMaximum()), "8");
}

TEST_F(Expressions, BoundsWaitForUndeterminedOperandsAndTakeConstantsExactly) {
  KvCCfgSFExpression* pExpression = expression("x * 2");
  EXPECT_EQ(shown(pExpression->getMinimum()), "?");
  setValue("x", KvCCfgValue(5.0));
  EXPECT_EQ(shown(pExpression->getMinimum()), "10");
  EXPECT_EQ(shown(pExpression->getMaximum()), "10");
}

// ---- Variables read, side effects, copies ------------------------------------------------------

TEST_F(Expressions, ReadingAVolatileVariableIsASideEffect) {
  EXPECT_TRUE(expression("v + 1")->hasSideEffects());
  EXPECT_FALSE(expression("x + t[1]")->hasSideEffects());
}

TEST_F(Expressions, ACloneIsIndependentAndOwnedByTheSameStore) {
  KvCCfgSFExpression* pExpression = expression("x + 1");
  std::size_t before = m_pProgram->expressions().size();
  KvCCfgSFExpression* pClone = pExpression->clone();
  EXPECT_EQ(m_pProgram->expressions().size(), before + 1);
  pClone->replaceConditionWithConstant(1.0);
  EXPECT_EQ(text(), "x + 1");
  EXPECT_TRUE(pClone->generatesSameCodeAs(*pClone));
  EXPECT_FALSE(pClone->generatesSameCodeAs(*pExpression));
}

}  // namespace
