// How a client variable stores a value (saturation first, else the scaling's represented value, else
// the data type's value) and what its declaration guarantees about every value it holds.
#include "client_testing.h"
#include "ssaopt/client/numbers.h"

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

TEST_F(Variables, SaturationComesFirstAndKeepsTheLimitExactly) {
  KvCCfgSFVariable& speed = *declare("int16 speed scale(0.3) saturate(..100)");
  EXPECT_EQ(stored(speed, 150), "100");
  EXPECT_EQ(stored(speed, 50), "50.1");  // 167 steps of 0.3
}

TEST_F(Variables, ScaledValuesBecomeTheValueTheirStoredIntegerStandsFor) {
  KvCCfgSFVariable& temperature = *declare("int16 temperature scale(0.5, -40)");
  EXPECT_EQ(stored(temperature, 21.3), "21.5");
  EXPECT_EQ(stored(temperature, -40.2), "-40");
}

TEST_F(Variables, UnscaledValuesAreCastToTheDataType) {
  EXPECT_EQ(stored(*declare("bool b"), 5), "1");
  EXPECT_EQ(stored(*declare("int8 c"), 300), "44");
  EXPECT_EQ(stored(*declare("uint8 u"), -1), "255");
  EXPECT_EQ(stored(*declare("int16 i"), 2.7), "2");
  EXPECT_EQ(stored(*declare("float32 f"), 0.1), "0.10000000149011612");
}

TEST_F(Variables, VolatileAndArrayVariablesNeverHoldAConstant) {
  EXPECT_EQ(stored(*declare("int16 v volatile"), 3), "*");
  EXPECT_EQ(stored(*declare("int16 a[2]"), 3), "*");
}

TEST_F(Variables, TheInitialValueIsZeroUnlessDeclared) {
  EXPECT_EQ(declare("int16 x")->getInitValue()->getValue(), 0.0);
  EXPECT_TRUE(declare("int16 x")->getInitValue()->isConstant());
  EXPECT_EQ(declare("int16 x = -7")->getInitValue()->getValue(), -7.0);
}

TEST_F(Variables, OnlyBooleansAreLogical) {
  EXPECT_TRUE(declare("bool b")->getDataType()->isLogicalType());
  EXPECT_FALSE(declare("uint8 u")->getDataType()->isLogicalType());
}

TEST_F(Variables, DeclaredBoundsComeFromTheTypeAndTheSaturation) {
  EXPECT_EQ(bounds(*declare("int8 c")), "[-128, 127]");
  EXPECT_EQ(bounds(*declare("bool b")), "[0, 1]");
  EXPECT_EQ(bounds(*declare("int16 x saturate(0..10)")), "[0, 10]");
  EXPECT_EQ(bounds(*declare("int8 x saturate(-1000..1000)")), "[-128, 127]");
  EXPECT_EQ(bounds(*declare("int16 x scale(0.5)")), "[none, none]");
  EXPECT_EQ(bounds(*declare("int16 x scale(0.5) saturate(..3)")), "[none, 3]");
  EXPECT_EQ(bounds(*declare("float64 f")), "[none, none]");
}

}  // namespace
