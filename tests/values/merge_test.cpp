#include <initializer_list>
#include <vector>

#include "value_testing.h"

namespace {

using Merge = KvCCfgValue (*)(const ssaopt::list<KvCCfgValue*>&);

// Runs `merge` over pointers to copies of `values`, as constant propagation passes a phi's operands.
KvCCfgValue mergeOf(Merge merge, std::initializer_list<KvCCfgValue> values) {
  std::vector<KvCCfgValue> operands(values);
  ssaopt::list<KvCCfgValue*> pointers;
  for (KvCCfgValue& operand : operands) pointers.push_back(&operand);
  return merge(pointers);
}

TEST(Intersect, MeetsTheOperandValues) {
  EXPECT_VALUE(mergeOf(intersect, {constant(3), constant(3), constant(3)}), constant(3));
  EXPECT_VALUE(mergeOf(intersect, {constant(3), undetermined, constant(3)}), undetermined);
  EXPECT_VALUE(mergeOf(intersect, {undetermined, constant(5)}), undetermined);
  EXPECT_VALUE(mergeOf(intersect, {constant(3), constant(4), undetermined}), nonConstant);
  EXPECT_VALUE(mergeOf(intersect, {undetermined, constant(3), constant(4)}), nonConstant);
  EXPECT_VALUE(mergeOf(intersect, {constant(3), nonConstant, undetermined}), nonConstant);
  // Equal numbers merge into the first of them.
  EXPECT_VALUE(mergeOf(intersect, {constant(-0.0), constant(0.0)}), constant(-0.0));
}

TEST(RangeBounds, TakeTheExtremeConstantFirstOfEqualOnes) {
  EXPECT_VALUE(mergeOf(determineMinimum, {constant(4), constant(2), constant(2), constant(7)}), constant(2));
  EXPECT_VALUE(mergeOf(determineMaximum, {constant(4), constant(7), constant(2)}), constant(7));
  EXPECT_VALUE(mergeOf(determineMinimum, {constant(0.0), constant(-0.0)}), constant(0.0));
  EXPECT_VALUE(mergeOf(determineMaximum, {constant(-0.0), constant(0.0)}), constant(-0.0));
}

TEST(RangeBounds, TheFirstOperandThatIsNotConstantDecides) {
  for (Merge bound : {determineMinimum, determineMaximum}) {
    EXPECT_VALUE(mergeOf(bound, {constant(4), undetermined, nonConstant}), undetermined);
    EXPECT_VALUE(mergeOf(bound, {nonConstant, undetermined}), nonConstant);
    EXPECT_VALUE(mergeOf(bound, {nonConstant, constant(1)}), nonConstant);
  }
}

TEST(AllMerges, OfNoOperandsAreUndetermined) {
  for (Merge merge : {intersect, determineMinimum, determineMaximum})
    EXPECT_VALUE(mergeOf(merge, {}), undetermined);
}

}  // namespace
