// Variables: adjusting values to what a variable can hold, SSA versions, aliases and uses.
#include <limits>
#include <string>
#include <type_traits>

#include "doubles.h"

using irtest::TestVariable;

static_assert(!std::is_copy_constructible_v<KvCSSAVariable> && !std::is_copy_assignable_v<KvCSSAVariable>,
              "a copied variable would share its value objects with the original");

namespace {

// Gives `x` the value `given` as constant propagation does, freeing the value it replaces; returns
// the stored value and leaves the adjusted argument in `given`.
KvCCfgValue store(KvCCfgVariable& x, KvCCfgValue& given) {
  KvCCfgValue* pOld = x.getValue();
  x.setVarValueAndAdjustCfgValue(given);
  delete pOld;
  return *x.getValue();
}

KvCCfgValue store(KvCCfgVariable& x, KvCCfgValue&& given) { return store(x, given); }

}  // namespace

TEST(VariableValue, SaturationComesFirstAndKeepsTheLimitExactly) {
  KV_Scaling identity(1.0, 0.0), coarse(0.3, 0.0), shifted(1.0, 3.0);  // 100 is not a multiple of 0.3
  EXPECT_FALSE(TestVariable(KV_DataType::int16(), &identity).isScaled());
  EXPECT_TRUE(TestVariable(KV_DataType::int16(), &shifted).isScaled());
  TestVariable scaled(KV_DataType::int16(), &coarse);
  scaled.saturate(-1e300, 100.0);
  EXPECT_VALUE(store(scaled, constant(150.0)), constant(100.0));
  EXPECT_VALUE(store(scaled, constant(100.0)), constant(KvCScaleTool::findRepresentedValue(100.0, &coarse)));
  EXPECT_NE(scaled.getValue()->getValue(), 100.0);

  TestVariable byte(KV_DataType::int8());
  byte.saturate(-300.0, 300.0);
  EXPECT_VALUE(store(byte, constant(400.0)), constant(300.0));  // clamped, so not cast
  EXPECT_VALUE(store(byte, constant(300.0)), constant(44.0));   // at the limit, so cast
  EXPECT_VALUE(store(byte, constant(-400.0)), constant(-300.0));
  KvCCfgValue unknown(eCfgUndetermined);
  unknown.setValue(400.0);
  EXPECT_EQ(store(byte, unknown).getValue(), 400.0);  // only constants are adjusted
}

TEST(VariableValue, BooleansNormaliseAndVolatileOrArrayVariablesGoNonConstant) {
  TestVariable flag(KV_DataType::boolean()), shared, table;
  KvCCfgValue five = constant(5.0);
  EXPECT_VALUE(store(flag, five), constant(1.0));
  EXPECT_VALUE(five, constant(1.0));

  shared.markAsVolatile();
  table.markAsArray();
  EXPECT_VALUE(*table.getValue(), nonConstant);  // marking drops the current value at once
  for (TestVariable* pVariable : {&shared, &table}) {
    KvCCfgValue three = constant(3.0);
    EXPECT_VALUE(store(*pVariable, three), nonConstant);
    EXPECT_VALUE(three, nonConstant);
  }
}

TEST(SSAVariable, AVersionOfAVersionLeadsToTheOriginalAndTakesTheMarksOfItsSource) {
  TestVariable x(KV_DataType::int8());
  x.saturate(-1e300, 300.0);
  KvCSSAVariable first(&x);
  first.markAsErasable();
  KvCSSAVariable second(&first);
  EXPECT_EQ(second.getOrigVar(), &x);
  EXPECT_TRUE(second.isErasable());
  EXPECT_FALSE(second.isOutput());
  EXPECT_EQ(second.getUpperLimit(), 300.0);
  EXPECT_EQ(x.topSSAReplacement(), nullptr);

  KvCCfgValue above = constant(400.0), fraction = constant(5.7);
  second.setMinValueAndDestroyOld(above);
  second.setMaxValueAndDestroyOld(fraction);
  EXPECT_VALUE(*second.getMinValue(), constant(300.0));
  EXPECT_VALUE(*second.getMaxValue(), constant(5.0));
  EXPECT_VALUE(above, constant(400.0));  // the bounds are adjusted copies
  first.markAsVolatile();
  KvCSSAVariable third(&first);
  third.setMaxValueAndDestroyOld(fraction);
  EXPECT_VALUE(*third.getMaxValue(), nonConstant);
}

namespace {

// The range `version` holds after values in [minimum, maximum] were assigned to it, as "[lo, hi]".
std::string fitted(KvCSSAVariable& version, const KvCCfgValue& minimum, const KvCCfgValue& maximum) {
  KvCCfgValue lower = minimum, upper = maximum;
  version.setVarRangeAndAdjust(lower, upper);
  return "[" + ::testing::PrintToString(*version.getMinValue()) + ", " +
         ::testing::PrintToString(*version.getMaxValue()) + "]";
}

std::string fitted(KvCSSAVariable& version, double minimum, double maximum) {
  return fitted(version, constant(minimum), constant(maximum));
}

}  // namespace

// Storing a value saturates it beyond a saturated border, else converts it, and an integer type
// wraps: the range held is what storing every value between the bounds gives, not the bounds stored.
TEST(SSAVariableRange, BothBoundsAreFittedTogetherAsStoringTheValuesBetweenThemGives) {
  TestVariable byte(KV_DataType::int8()), clipped(KV_DataType::int8()), wide(KV_DataType::int8());
  clipped.saturate(-1e300, 20.0);
  wide.saturate(-300.0, 300.0);
  KvCSSAVariable b(&byte), c(&clipped), w(&wide);
  EXPECT_EQ(fitted(b, 100, 200), "[constant -128, constant 127]");
  EXPECT_EQ(fitted(b, 200, 300), "[constant -56, constant 44]");
  EXPECT_EQ(fitted(b, nonConstant, constant(5)), "[constant -128, constant 127]");
  EXPECT_EQ(fitted(b, undetermined, constant(5)), "[undetermined, constant 127]");
  KvCCfgValue lower = constant(100), upper = constant(200);
  byte.fitRange(lower, upper);  // in place, storing nothing
  EXPECT_VALUE(lower, constant(-128));
  EXPECT_VALUE(upper, constant(127));
  EXPECT_EQ(fitted(c, 0, 200), "[constant 0, constant 20]");
  EXPECT_EQ(fitted(c, -200, -100), "[constant -128, constant 127]");  // wraps below the limit
  EXPECT_EQ(fitted(w, 0, 400), "[constant -128, constant 300]");      // the limit is kept exactly

  KV_Scaling coarse(0.3, 0.0);
  TestVariable scaled(KV_DataType::int16(), &coarse);
  scaled.saturate(-1e300, 100.1);
  KvCSSAVariable s(&scaled);
  double roundedUp = KvCScaleTool::findRepresentedValue(100.1, &coarse);  // 334 steps: above the limit
  EXPECT_GT(roundedUp, 100.1);
  fitted(s, 0, 200);
  EXPECT_VALUE(*s.getMaxValue(), constant(roundedUp));
  EXPECT_EQ(fitted(s, nonConstant, constant(200)).rfind("[non-constant, constant 100.2", 0), 0u);
  // Values bounded by a number on no side may be NaN, which the scaling keeps and saturation does not
  // clamp; an integer type stores NaN as 0.
  EXPECT_EQ(fitted(s, nonConstant, nonConstant), "[non-constant, non-constant]");
  const double nan = std::numeric_limits<double>::quiet_NaN();
  EXPECT_EQ(fitted(s, nan, nan), "[non-constant, non-constant]");
  EXPECT_EQ(fitted(s, undetermined, nonConstant), "[undetermined, non-constant]");
  EXPECT_EQ(fitted(b, nan, nan), "[constant -128, constant 127]");

  TestVariable real;
  KvCSSAVariable r(&real);
  const double infinity = std::numeric_limits<double>::infinity();
  EXPECT_EQ(fitted(r, nonConstant, constant(5)), "[non-constant, constant 5]");
  EXPECT_EQ(fitted(r, infinity, infinity), "[constant inf, constant inf]");  // a value, not an open end

  real.markAsVolatile();
  KvCSSAVariable input(&real);
  EXPECT_EQ(fitted(input, 0, 1), "[non-constant, non-constant]");
}

// A phi function's or value return's bounds are those of values the variable already holds; fitting
// them again would wrap the kept limit 300 of an int8.
TEST(SSAVariableRange, ARangeAlreadyHeldIsStoredAsItIs) {
  TestVariable wide(KV_DataType::int8());
  wide.saturate(-300.0, 300.0);
  KvCSSAVariable w(&wide);
  w.setVarRange(constant(-128), constant(300));
  EXPECT_VALUE(*w.getMinValue(), constant(-128));
  EXPECT_VALUE(*w.getMaxValue(), constant(300));
}

TEST(VariableUses, CountAllUsesCountsANodeSharedWithAnAliasTwice) {
  ssaopt::graph G;
  ssaopt::node a = G.new_node(), b = G.new_node(), c = G.new_node();
  TestVariable x, alias, aliasOfAlias;
  x.appendUse(a);
  x.appendUse(b);
  alias.appendUse(b);
  aliasOfAlias.appendUse(c);
  x.appendVirtualAlias(&alias);
  x.appendVirtualAlias(&alias);
  alias.appendVirtualAlias(&aliasOfAlias);  // not followed: one level only
  EXPECT_EQ(x.countAllUses(), 3);
  EXPECT_EQ(irtest::items(x.getAllUses()), (std::vector<ssaopt::node>{a, b}));

  ssaopt::ReportLog log;
  EXPECT_EQ(x.delUse(c), 2);
  EXPECT_TRUE(log.empty());
  irtest::InternalInfoOn on;
  EXPECT_EQ(x.delUse(c), 2);
  EXPECT_TRUE(log.hasConsistencyFailure("m_Uses.member(v)"));
}
