// The merges of intersect, determineMinimum and determineMaximum (arithmetic.h) as folds that take one
// value at a time, in order, and keep a copy of what they need rather than a pointer. The list
// functions are these folds over their lists; a caller that computes its values one by one (the
// arguments of a parameter statement, the members of a variable expression) merges them without
// building a list.
#pragma once

#include <functional>

#include "ssaopt/values/value.h"

namespace ssaopt {

// Non-constant once a value is non-constant or two constants differ; else undetermined once a value
// is undetermined; else the first constant. Nothing taken gives undetermined.
class ValueMeet {
public:
  void add(const KvCCfgValue& value) {
    if (m_NonConstant) return;
    if (value.isNonConstant()) {
      m_NonConstant = true;
    } else if (value.isUndetermined()) {
      m_Waiting = true;
    } else if (!m_HasCommon) {
      m_Common = value;
      m_HasCommon = true;
    } else if (value.getValue() != m_Common.getValue()) {
      m_NonConstant = true;
    }
  }

  KvCCfgValue result() const {
    if (m_NonConstant) return KvCCfgValue(eCfgNonConstant);
    return m_Waiting || !m_HasCommon ? KvCCfgValue(eCfgUndetermined) : m_Common;
  }

private:
  bool m_NonConstant = false;
  bool m_Waiting = false;  // an undetermined value keeps the merge undetermined unless it turns non-constant
  bool m_HasCommon = false;
  KvCCfgValue m_Common;
};

// The best constant by `Better`, the first of equal ones; the first value that is not a constant ends
// the fold and gives its kind instead, so that a range bound is only known when every bound is.
// Nothing taken gives undetermined.
template <class Better>
class ValueExtreme {
public:
  void add(const KvCCfgValue& value) {
    if (m_Stopped) return;
    if (!value.isConstant()) {
      m_Best = KvCCfgValue(value.getValueKind());
      m_Stopped = true;
    } else if (!m_HasBest || Better()(value.getValue(), m_Best.getValue())) {
      m_Best = value;
      m_HasBest = true;
    }
  }

  KvCCfgValue result() const { return m_Stopped || m_HasBest ? m_Best : KvCCfgValue(eCfgUndetermined); }

private:
  bool m_Stopped = false;
  bool m_HasBest = false;
  KvCCfgValue m_Best;
};

using ValueMinimum = ValueExtreme<std::less<double>>;
using ValueMaximum = ValueExtreme<std::greater<double>>;

}  // namespace ssaopt
