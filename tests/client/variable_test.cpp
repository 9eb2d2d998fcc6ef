// How a client variable stores a value (saturation first, else the scaling's represented value, else
// the data type's value) and what its declaration guarantees about every value it holds.
#include "client_testing.h"
#include "ssaopt/client/numbers.h"
#include "values/value_testing.h"

namespace {

class Variables : public clienttest::ClientTest {
protected:
  KvCCfgSFVariable* declare(const std::string& declaration) {
    ssaopt::client::Program* pProgram = load("var " + declaration + ";\nproc #main {}\n");
    return pProgram ? pProgram->variables().front().get() : nullptr;
  }

  // What the variable holds after being given `number`.
  static std::string stored(KvCCfgSFVariable& variable, double number) {
    KvCCfgValue value(number);
    variable.setVarValueAndAdjustCfgValue(value);
    const KvCCfgValue& held = *variable.getValue();
    return held.isConstant() ? ssaopt::client::formatNumber(held.getValue()) : "*";
  }

  static std::string bounds(const KvCCfgSFVariable& variable) {
    auto text = [](std::optional<double> bound) {
      return bound ? ssaopt::client::formatNumber(*bound) : "none";
    };
    return "[" + text(ssaopt::client::declaredLowerBound(variable)) + ", " +
           text(ssaopt::client::declaredUpperBound(variable)) + "]";
  }
};

TEST_F(Variables, StoreSaturatedElseRepresentedElseCastValuesAndNoConstantInVolatilesOrArrays) {
  const struct {
    const char* declaration;
    double given;
    const char* held;
  } cases[] = {
      {"int16 speed scale(0.3) saturate(..100)", 150, "100"},  // the limit exactly
      {"int16 speed scale(0.3) saturate(..100)", 50, "50.1"},  // 167 steps of 0.3
      {"int16 temperature scale(0.5, -40)", 21.3, "21.5"},
      {"int16 temperature scale(0.5, -40)", -40.2, "-40"},
      {"bool b", 5, "1"},
      {"int8 c", 300, "44"},
      {"uint8 u", -1, "255"},
      {"int16 i", 2.7, "2"},
      {"float32 f", 0.1, "0.10000000149011612"},
      {"int16 v volatile", 3, "*"},
      {"int16 a[2]", 3, "*"},
  };
  for (const auto& c : cases) EXPECT_EQ(stored(*declare(c.declaration), c.given), c.held) << c.declaration;
}

TEST_F(Variables, TheInitialValueIsZeroUnlessDeclaredAndOnlyBooleansAreLogical) {
  EXPECT_VALUE(*declare("int16 x")->getInitValue(), constant(0.0));
  EXPECT_VALUE(*declare("int16 x = -7")->getInitValue(), constant(-7.0));
  EXPECT_TRUE(declare("bool b")->getDataType()->isLogicalType());
  EXPECT_FALSE(declare("uint8 u")->getDataType()->isLogicalType());
}

// Saturation narrows the type's range only where the values within the limits cannot wrap past them:
// an int8 saturated at 20 above only still holds 127, which storing -129 gives; and a limit beyond the
// type is held exactly.
TEST_F(Variables, DeclaredBoundsHoldEveryValueTheVariableCanStore) {
  EXPECT_EQ(bounds(*declare("int8 c")), "[-128, 127]");
  EXPECT_EQ(bounds(*declare("bool b")), "[0, 1]");
  EXPECT_EQ(bounds(*declare("int16 x saturate(0..10)")), "[0, 10]");
  EXPECT_EQ(bounds(*declare("int8 x saturate(..20)")), "[-128, 127]");
  EXPECT_EQ(bounds(*declare("int8 x saturate(-1000..1000)")), "[-1000, 1000]");
  EXPECT_EQ(bounds(*declare("int16 x scale(0.5)")), "[none, none]");
  // A scaled or float variable may hold NaN, which saturation leaves alone; what a volatile one reads
  // is an input, a number.
  EXPECT_EQ(bounds(*declare("int16 x scale(0.5) saturate(..3)")), "[none, none]");
  EXPECT_EQ(bounds(*declare("int16 x scale(0.5) saturate(..3) volatile")), "[none, 3]");
  EXPECT_EQ(bounds(*declare("float32 f saturate(0..1)")), "[none, none]");
  EXPECT_EQ(bounds(*declare("float32 f saturate(0..1) volatile")), "[0, 1]");
  EXPECT_EQ(bounds(*declare("float64 f saturate(0..inf) volatile")), "[0, none]");
  EXPECT_EQ(bounds(*declare("float64 f")), "[none, none]");
}

}  // namespace
