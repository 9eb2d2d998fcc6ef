// Variables: adjusting values to what a variable can hold, SSA versions, aliases and uses.
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
