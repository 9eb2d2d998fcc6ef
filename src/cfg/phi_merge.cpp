#include "phi_merge.h"

#include <algorithm>
#include <cmath>
#include <functional>

#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

namespace ssaopt::cfg {

namespace {

// A range bound of an operand. Only SSA versions keep a range; any other variable's bounds are its
// value, which is as much as anybody knows of it.
const KvCCfgValue& boundOf(const KvCCfgValue* pBound, const KvCCfgVariable& variable) {
  return pBound ? *pBound : *variable.getValue();
}

PhiMerge::Meet meetOf(const KvCCfgValue& value) {
  PhiMerge::Meet meet;
  meet.nonConstant = value.isNonConstant();
  meet.undetermined = value.isUndetermined();
  meet.hasFirst = value.isConstant();
  if (meet.hasFirst) meet.first = value;
  return meet;
}

// Two constants that differ make the meet non-constant, wherever they stand. Comparing the first
// constants of the two runs suffices: within a run that is not non-constant already, every constant
// equals the run's first (a NaN differs from everything, so a run holds at most one, alone).
PhiMerge::Meet combineMeets(const PhiMerge::Meet& left, const PhiMerge::Meet& right) {
  PhiMerge::Meet meet;
  meet.nonConstant = left.nonConstant || right.nonConstant ||
                     (left.hasFirst && right.hasFirst && right.first.getValue() != left.first.getValue());
  meet.undetermined = left.undetermined || right.undetermined;
  meet.hasFirst = left.hasFirst || right.hasFirst;
  meet.first = left.hasFirst ? left.first : right.first;
  return meet;
}

KvCCfgValue resultOfMeet(const PhiMerge::Meet& meet) {
  if (meet.nonConstant) return KvCCfgValue(eCfgNonConstant);
  if (meet.undetermined || !meet.hasFirst) return KvCCfgValue(eCfgUndetermined);
  return meet.first;
}

PhiMerge::Bound boundPartOf(const KvCCfgValue& bound) {
  PhiMerge::Bound part;
  part.empty = false;
  part.lead = bound;
  if (!bound.isConstant()) {
    part.stop = bound.getValueKind();
  } else if (!std::isnan(bound.getValue())) {
    part.hasBest = true;
    part.best = bound;
  }
  return part;
}

// The sequential merge keeps its first bound as long as no later one is better, and nothing is
// better than a NaN, nor is a NaN better than anything: so a NaN decides only as the first bound, and
// otherwise the best of the numbers does, the first of equal ones.
template <class Better>
PhiMerge::Bound combineBounds(const PhiMerge::Bound& left, const PhiMerge::Bound& right, Better better) {
  if (left.empty) return right;
  if (right.empty) return left;
  PhiMerge::Bound part = left;
  if (left.stop == eCfgConstant) part.stop = right.stop;
  if (right.hasBest && (!left.hasBest || better(right.best.getValue(), left.best.getValue()))) {
    part.hasBest = true;
    part.best = right.best;
  }
  return part;
}

KvCCfgValue resultOfBound(const PhiMerge::Bound& part) {
  if (part.empty) return KvCCfgValue(eCfgUndetermined);
  if (part.stop != eCfgConstant) return KvCCfgValue(part.stop);
  if (std::isnan(part.lead.getValue())) return part.lead;
  return part.best;
}

}  // namespace

PhiMerge::PhiMerge(array<KvCCfgVariable*> operands)
    : m_Operands(std::move(operands)), m_BlockCount((m_Operands.size() + kBlockSize - 1) / kBlockSize) {
  if (!readsOnlyChangedBlocks()) return;
  m_Leaves = 1;
  while (m_Leaves < m_BlockCount) m_Leaves *= 2;
  m_Tree.resize(2 * m_Leaves);
  for (std::size_t block = 0; block < m_BlockCount; ++block) m_Tree[m_Leaves + block] = foldBlock(block);
  for (std::size_t i = m_Leaves - 1; i >= 1; --i) m_Tree[i] = combine(m_Tree[2 * i], m_Tree[2 * i + 1]);
  m_IsInvalid.assign(m_BlockCount, false);
}

void PhiMerge::invalidate(std::size_t block) {
  if (!readsOnlyChangedBlocks() || m_IsInvalid[block]) return;
  m_IsInvalid[block] = true;
  m_Invalid.push_back(block);
}

PhiMerge::Result PhiMerge::merge() {
  if (!readsOnlyChangedBlocks()) return mergeAll(m_Operands);
  for (std::size_t block : m_Invalid) {
    m_IsInvalid[block] = false;
    update(block);
  }
  m_Invalid.clear();
  return resultOf(m_Tree[1]);
}

void PhiMerge::update(std::size_t block) {
  std::size_t i = m_Leaves + block;
  m_Tree[i] = foldBlock(block);
  for (i /= 2; i >= 1; i /= 2) m_Tree[i] = combine(m_Tree[2 * i], m_Tree[2 * i + 1]);
}

PhiMerge::Result PhiMerge::mergeAll(const array<KvCCfgVariable*>& operands) {
  return resultOf(fold(operands.data(), operands.data() + operands.size()));
}

PhiMerge::Part PhiMerge::fold(KvCCfgVariable* const* first, KvCCfgVariable* const* last) {
  Part part;
  for (; first != last; ++first) part = combine(part, partOf(**first));
  return part;
}

PhiMerge::Part PhiMerge::foldBlock(std::size_t block) const {
  std::size_t first = block * kBlockSize;
  std::size_t last = std::min(first + kBlockSize, m_Operands.size());
  return fold(m_Operands.data() + first, m_Operands.data() + last);
}

PhiMerge::Part PhiMerge::partOf(const KvCCfgVariable& operand) {
  return {meetOf(*operand.getValue()), boundPartOf(boundOf(operand.getMinValue(), operand)),
          boundPartOf(boundOf(operand.getMaxValue(), operand))};
}

PhiMerge::Part PhiMerge::combine(const Part& left, const Part& right) {
  return {combineMeets(left.meet, right.meet),
          combineBounds(left.minimum, right.minimum, std::less<double>()),
          combineBounds(left.maximum, right.maximum, std::greater<double>())};
}

PhiMerge::Result PhiMerge::resultOf(const Part& whole) {
  return {resultOfMeet(whole.meet), resultOfBound(whole.minimum), resultOfBound(whole.maximum)};
}

// The bounds merge takes the first operand without a known bound, so the order matters; an order by
// address would make the result depend on the allocator.
void PhiMerge::distinctOperands(const KvCPhiFunction& phi, array<KvCCfgVariable*>& operands) {
  const array<KvCCfgVariable*>& all = phi.replacementVariables();
  operands.assign(all.begin(), all.end());
  operands.erase(std::remove(operands.begin(), operands.end(), nullptr), operands.end());
  std::sort(operands.begin(), operands.end(), set_order<KvCCfgVariable*>());
  operands.erase(std::unique(operands.begin(), operands.end()), operands.end());
}

}  // namespace ssaopt::cfg
