// Merges of the values of a phi function's operands: the meet of their values (intersect) and the
// bounds of their value ranges (determineMinimum, determineMaximum). Constant propagation passes one
// value per operand, in the order of the block's control-flow in-edges.
#include "ssaopt/values/merge.h"

#include "ssaopt/values/arithmetic.h"

namespace {

template <class Fold>
KvCCfgValue foldList(const ssaopt::list<KvCCfgValue*>& values) {
  Fold fold;
  for (const KvCCfgValue* pValue : values) fold.add(*pValue);
  return fold.result();
}

}  // namespace

KvCCfgValue intersect(const ssaopt::list<KvCCfgValue*>& values) {
  return foldList<ssaopt::ValueMeet>(values);
}

KvCCfgValue determineMinimum(const ssaopt::list<KvCCfgValue*>& values) {
  return foldList<ssaopt::ValueMinimum>(values);
}

KvCCfgValue determineMaximum(const ssaopt::list<KvCCfgValue*>& values) {
  return foldList<ssaopt::ValueMaximum>(values);
}
