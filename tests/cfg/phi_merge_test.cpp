// The incremental merge of a phi function's operands against the list functions it stands in for:
// the same value, minimum and maximum, bit for bit, for every mix of undetermined, non-constant and
// constant operands (NaN and signed zeros among them), however many operands, after any changes.
#include "cfg/phi_merge.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstring>
#include <deque>
#include <limits>
#include <memory>
#include <vector>

#include "ir/doubles.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/values/arithmetic.h"

namespace {

using ssaopt::cfg::PhiMerge;

const KvCCfgValue kPalette[] = {KvCCfgValue(),     KvCCfgValue(eCfgNonConstant),
                                KvCCfgValue(0.0),  KvCCfgValue(-0.0),
                                KvCCfgValue(1.0),  KvCCfgValue(2.0),
                                KvCCfgValue(-3.0), KvCCfgValue(std::numeric_limits<double>::quiet_NaN())};

bool sameBits(const KvCCfgValue& a, const KvCCfgValue& b) {
  double x = a.getValue(), y = b.getValue();
  return a.getValueKind() == b.getValueKind() && std::memcmp(&x, &y, sizeof x) == 0;
}

class PhiMergeTest : public ::testing::Test {
protected:
  // Operands with ranges (SSA versions) and without (their original variables): a bound of the
  // latter is its value. Undetermined and non-constant values are drawn rarely, so that long runs of
  // constants occur.
  KvCCfgVariable* operand(std::size_t i) {
    if (i % 5 == 4) return &m_Originals.emplace_back();
    m_Versions.push_back(std::make_unique<KvCSSAVariable>(&m_Originals.emplace_back()));
    return m_Versions.back().get();
  }

  void draw(KvCCfgVariable& variable) {
    KvCCfgValue value = pick(), minimum = pick(), maximum = pick();
    variable.setVarValue(value);
    variable.setMinValueAndDestroyOld(minimum);
    variable.setMaxValueAndDestroyOld(maximum);
  }

  KvCCfgValue pick() {
    std::size_t i = next() % 24;
    return kPalette[i < 2 ? i : 2 + i % 6];
  }

  std::uint64_t next() {
    m_State = m_State * 6364136223846793005ULL + 1442695040888963407ULL;
    return m_State >> 33;
  }

  static void expectSameAsLists(const std::vector<KvCCfgVariable*>& operands,
                                const PhiMerge::Result& merged) {
    ssaopt::list<KvCCfgValue*> values, minimums, maximums;
    for (KvCCfgVariable* pOperand : operands) {
      values.push_back(pOperand->getValue());
      minimums.push_back(pOperand->getMinValue() ? pOperand->getMinValue() : pOperand->getValue());
      maximums.push_back(pOperand->getMaxValue() ? pOperand->getMaxValue() : pOperand->getValue());
    }
    EXPECT_TRUE(sameBits(merged.value, intersect(values)));
    EXPECT_TRUE(sameBits(merged.minimum, determineMinimum(minimums)));
    EXPECT_TRUE(sameBits(merged.maximum, determineMaximum(maximums)));
  }

  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_Use{&m_Pool};
  std::deque<irtest::TestVariable> m_Originals;
  std::vector<std::unique_ptr<KvCSSAVariable>> m_Versions;
  std::uint64_t m_State = 12345;
};

TEST_F(PhiMergeTest, GivesWhatTheListFunctionsGiveForEveryMix) {
  for (std::size_t count : {0, 1, 2, 3, 7, 31, 32, 33, 64, 65, 100, 257}) {
    for (int round = 0; round < 40; ++round) {
      std::vector<KvCCfgVariable*> operands;
      for (std::size_t i = 0; i < count; ++i) {
        operands.push_back(operand(i));
        draw(*operands.back());
      }
      PhiMerge merge(ssaopt::array<KvCCfgVariable*>(operands.begin(), operands.end()));
      expectSameAsLists(operands, merge.merge());
    }
  }
}

// Only the blocks named invalid are read again; the others keep their partial results.
TEST_F(PhiMergeTest, FollowsChangesOfOperandsInTheBlocksNamedInvalid) {
  std::vector<KvCCfgVariable*> operands;
  for (std::size_t i = 0; i < 300; ++i) {
    operands.push_back(operand(i));
    draw(*operands.back());
  }
  PhiMerge merge(ssaopt::array<KvCCfgVariable*>(operands.begin(), operands.end()));
  ASSERT_TRUE(merge.readsOnlyChangedBlocks());
  for (int round = 0; round < 500; ++round) {
    for (int change = 0; change < 1 + round % 4; ++change) {
      std::size_t i = next() % operands.size();
      draw(*operands[i]);
      merge.invalidate(merge.blockOf(i));
    }
    expectSameAsLists(operands, merge.merge());
  }
}

// Several phi operands may name one version, and the order of the merges is that of creation.
TEST_F(PhiMergeTest, TakesEveryOperandOnceInCreationOrder) {
  irtest::TestVariable a, b, c;
  KvCPhiFunction phi(&a, 5);
  phi.setReplacementVariable(0, &c);
  phi.setReplacementVariable(1, &a);
  phi.setReplacementVariable(2, &c);
  phi.setReplacementVariable(4, &b);
  ssaopt::array<KvCCfgVariable*> operands;
  PhiMerge::distinctOperands(phi, operands);  // operand 3 is not set and stays out
  EXPECT_EQ(operands, (ssaopt::array<KvCCfgVariable*>{&a, &b, &c}));
}

}  // namespace
