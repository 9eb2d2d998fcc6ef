// The merge that constant propagation stores at a phi function: the meet of its operands' values,
// the least of their minimums and the greatest of their maximums, over its distinct operands in
// creation order, exactly as intersect, determineMinimum and determineMaximum give them for that
// sequence (NaN and signed zeros included).
//
// A join of thousands of edges is visited on every edge into it that becomes executable and after
// every operand that changes, so merging all operands at every visit would cost the square of their
// number. A merge of many operands therefore keeps partial results: one per block of kBlockSize
// operands, and above the blocks a segment tree, whose nodes combine their children in order. A visit
// after a few operands changed folds their blocks again and the paths above them. The partial results
// combine associatively, so any grouping gives what the sequential merges give; phi_merge_test.cpp
// holds the merge against the list functions.
#pragma once

#include <cstddef>

#include "ssaopt/frame/containers.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/values/value.h"

namespace ssaopt::cfg {

class PhiMerge {
public:
  static constexpr std::size_t kBlockSize = 32;

  struct Result {
    KvCCfgValue value;
    KvCCfgValue minimum;
    KvCCfgValue maximum;
  };

  PhiMerge() = default;
  // `operands`: distinct, none null, in the order the merges take them.
  explicit PhiMerge(array<KvCCfgVariable*> operands);

  const array<KvCCfgVariable*>& operands() const { return m_Operands; }
  // A merge of one block reads every operand at every merge; a larger one only the blocks that
  // changed, which invalidate() names.
  bool readsOnlyChangedBlocks() const { return m_BlockCount > 1; }
  std::size_t blockOf(std::size_t operand) const { return operand / kBlockSize; }
  // An operand of `block` holds another value, minimum or maximum than at the last merge.
  void invalidate(std::size_t block);
  Result merge();
  // The merges of `operands` (distinct, none null, in order) read from scratch, with nothing kept.
  static Result mergeAll(const array<KvCCfgVariable*>& operands);

  // The operands of `phi` once each, in creation order (that of its getUsedVariables()), into
  // `operands`.
  static void distinctOperands(const KvCPhiFunction& phi, array<KvCCfgVariable*>& operands);

  // What the meet knows of a run of operands.
  struct Meet {
    bool nonConstant = false;  // an operand is non-constant, or two constants differ
    bool undetermined = false;
    bool hasFirst = false;
    KvCCfgValue first;  // the first constant
  };
  // What the merge of one bound knows of a run of operands.
  struct Bound {
    bool empty = true;
    KvECfgValueKind stop = eCfgConstant;  // the kind of the first bound that is no constant, if any
    KvCCfgValue lead;                     // the first bound: a NaN there is the result
    bool hasBest = false;
    KvCCfgValue best;  // the extreme of the bounds that are numbers, the first of equal ones
  };
  struct Part {
    Meet meet;
    Bound minimum;
    Bound maximum;
  };

  // The part of one operand, and of two runs of operands one after the other.
  static Part partOf(const KvCCfgVariable& operand);
  static Part combine(const Part& left, const Part& right);
  static Result resultOf(const Part& whole);

private:
  static Part fold(KvCCfgVariable* const* first, KvCCfgVariable* const* last);
  Part foldBlock(std::size_t block) const;
  void update(std::size_t block);

  array<KvCCfgVariable*> m_Operands;
  std::size_t m_BlockCount = 0;
  // The segment tree: node 1 is the root, node i has the children 2i and 2i + 1, and the leaves,
  // one per block (padded to a power of two with empty parts), start at m_Leaves.
  std::size_t m_Leaves = 0;
  array<Part> m_Tree;
  array<std::size_t> m_Invalid;  // blocks named by invalidate() since the last merge, each once
  array<bool> m_IsInvalid;
};

}  // namespace ssaopt::cfg
