#include <memory>

#include "ssaopt/frame/types.h"
#include "value_testing.h"

namespace {

KvCCfgValue withNumber(KvECfgValueKind kind, double number) {
  KvCCfgValue value(kind);
  value.setValue(number);
  return value;
}

TEST(Value, CompareIsEqualityOfLatticeElements) {
  const struct {
    KvCCfgValue a, b;
    int expected;
  } cases[] = {
      {nonConstant, nonConstant, 0},
      {undetermined, nonConstant, 1},
      {constant(2), constant(2), 0},
      {constant(2), constant(3), 1},
      {constant(0), undetermined, 1},
      {constant(0.0), constant(-0.0), 0},
      // The number of a value that is not constant means nothing.
      {withNumber(eCfgUndetermined, 1), withNumber(eCfgUndetermined, 2), 0},
      {withNumber(eCfgNonConstant, 2), constant(2), 1},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.a) + " vs " + ::testing::PrintToString(c.b));
    EXPECT_EQ(c.a.compare(c.b), c.expected);
    EXPECT_EQ(c.b.compare(c.a), c.expected);
  }
}

TEST(Value, CloneIsIndependent) {
  const KvCCfgValue original(2.0);
  std::unique_ptr<KvCCfgValue> copy(original.clone());
  copy->setValue(5.0);
  EXPECT_VALUE(original, constant(2.0));
  EXPECT_VALUE(*copy, constant(5.0));
}

TEST(Value, RepresentedValueRoundsOrTruncatesOnlyTheNumber) {
  const KV_Scaling halves(0.5, 0.0);
  KvCCfgValue rounded(1.3), truncated(1.3), unscaled(1.3), varying = withNumber(eCfgNonConstant, 1.3);
  rounded.changeToRepresentedValue(&halves);
  truncated.changeToRepresentedValueDontRound(&halves);
  unscaled.changeToRepresentedValue(nullptr);
  unscaled.changeToRepresentedValueDontRound(nullptr);
  varying.changeToRepresentedValue(&halves);
  EXPECT_VALUE(rounded, constant(1.5));
  EXPECT_VALUE(truncated, constant(1.0));
  EXPECT_VALUE(unscaled, constant(1.3));
  EXPECT_VALUE(varying, withNumber(eCfgNonConstant, 1.5));
}

}  // namespace
