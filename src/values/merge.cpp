// Merges of the values of a phi function's operands: the meet of their values (intersect) and the
// bounds of their value ranges (determineMinimum, determineMaximum). Constant propagation passes one
// value per operand, in the order of the block's control-flow in-edges.
#include <functional>

#include "ssaopt/values/arithmetic.h"

namespace {

// The best constant by `better`, the first of equal ones; the first value that is not a constant
// ends the walk and gives its kind instead, so that a range bound is only known when every
// operand's bound is.
template <class Better>
KvCCfgValue determineExtreme(const ssaopt::list<KvCCfgValue*>& values, Better better) {
  const KvCCfgValue* best = nullptr;
  for (const KvCCfgValue* value : values) {
    if (!value->isConstant()) return KvCCfgValue(value->getValueKind());
    if (!best || better(value->getValue(), best->getValue())) best = value;
  }
  return best ? *best : KvCCfgValue(eCfgUndetermined);
}

}  // namespace

KvCCfgValue intersect(const ssaopt::list<KvCCfgValue*>& values) {
  const KvCCfgValue* common = nullptr;
  bool waiting = false;  // an undetermined operand keeps the merge undetermined unless it turns non-constant
  for (const KvCCfgValue* value : values) {
    if (value->isNonConstant()) return KvCCfgValue(eCfgNonConstant);
    if (value->isUndetermined())
      waiting = true;
    else if (!common)
      common = value;
    else if (value->getValue() != common->getValue())
      return KvCCfgValue(eCfgNonConstant);
  }
  return waiting || !common ? KvCCfgValue(eCfgUndetermined) : *common;
}

KvCCfgValue determineMinimum(const ssaopt::list<KvCCfgValue*>& values) {
  return determineExtreme(values, std::less<double>());
}

KvCCfgValue determineMaximum(const ssaopt::list<KvCCfgValue*>& values) {
  return determineExtreme(values, std::greater<double>());
}
