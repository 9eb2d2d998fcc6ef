// The expression interface's defaults and the fixed-value expression.
#include "ssaopt/ir/expression.h"

#include "ssaopt/frame/control.h"

std::uint32_t KvCCfgExpression::s_GlobIndexCnt = 0;

void KvCCfgExpression::boot() { s_GlobIndexCnt = 0; }

KvCCfgExpression::KvCCfgExpression() : KvCCfgExpression(false) {}

KvCCfgExpression::KvCCfgExpression(bool evalToNonConst)
    : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)), m_EvalToNonConst(evalToNonConst) {}

KvCCfgVariable* KvCCfgExpression::isVariable(bool&) const { return nullptr; }

bool KvCCfgExpression::isVariableEqualToConstant(KvCCfgVariable*&, KvCCfgValue&, bool&) const {
  return false;
}

bool KvCCfgExpression::hasSideEffects() const { return false; }

KvCCfgSFExpression* KvCCfgExpression::isSFExpression() { return nullptr; }

KvCCfgVariableExpression* KvCCfgExpression::isVariableExpression() { return nullptr; }

KvCCfgValue KvCCfgValueExpression::evaluate() const {
  return isMarkedAsEvalToNonConst() ? KvCCfgValue(eCfgNonConstant) : m_Value;
}
