// The expression of the interface statements: a set of variables.
#include "ssaopt/ir/variable_expression.h"

#include <algorithm>

#include "ssaopt/ir/variable.h"
#include "ssaopt/values/merge.h"

void KvCCfgVariableExpression::addVariable(KvCCfgVariable* pVariable) {
  ssaopt::set_order<KvCCfgVariable*> order;
  auto place = std::lower_bound(m_Variables.begin(), m_Variables.end(), pVariable, order);
  if (place == m_Variables.end() || *place != pVariable) m_Variables.insert(place, pVariable);
}

ssaopt::set<KvCCfgVariable*> KvCCfgVariableExpression::getUsedVariables() const {
  return ssaopt::set<KvCCfgVariable*>(m_Variables.begin(), m_Variables.end());
}

void KvCCfgVariableExpression::replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) {
  m_Variables.erase(std::remove(m_Variables.begin(), m_Variables.end(), pOld), m_Variables.end());
  addVariable(pNew);
}

// Made by the default constructor only, the expression is never marked as non-constant.
KvCCfgValue KvCCfgVariableExpression::evaluate() const {
  if (m_Variables.size() != 1) return KvCCfgValue();
  const KvCCfgValue* pValue = (*m_Variables.begin())->getValue();
  return pValue ? *pValue : KvCCfgValue();
}

KvCCfgValue KvCCfgVariableExpression::getMinimum() const { return foldMemberValues<ssaopt::ValueMinimum>(); }

KvCCfgValue KvCCfgVariableExpression::getMaximum() const { return foldMemberValues<ssaopt::ValueMaximum>(); }

// The members' values in ascending member order, as the list merges would take them.
template <class Fold>
KvCCfgValue KvCCfgVariableExpression::foldMemberValues() const {
  Fold fold;
  for (const KvCCfgVariable* pVariable : m_Variables) fold.add(*pVariable->getValue());
  return fold.result();
}
