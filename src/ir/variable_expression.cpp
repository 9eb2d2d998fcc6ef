// The expression of the interface statements: a set of variables.
#include "ssaopt/ir/variable_expression.h"

#include "ssaopt/ir/variable.h"
#include "ssaopt/values/arithmetic.h"

void KvCCfgVariableExpression::replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) {
  m_Variables.erase(pOld);
  m_Variables.insert(pNew);
}

// Made by the default constructor only, the expression is never marked as non-constant.
KvCCfgValue KvCCfgVariableExpression::evaluate() const {
  if (m_Variables.size() != 1) return KvCCfgValue();
  const KvCCfgValue* pValue = (*m_Variables.begin())->getValue();
  return pValue ? *pValue : KvCCfgValue();
}

KvCCfgValue KvCCfgVariableExpression::getMinimum() const { return determineMinimum(memberValues()); }

KvCCfgValue KvCCfgVariableExpression::getMaximum() const { return determineMaximum(memberValues()); }

// The list functions only read the values, so the members' own values serve without copies.
ssaopt::list<KvCCfgValue*> KvCCfgVariableExpression::memberValues() const {
  ssaopt::list<KvCCfgValue*> values;
  for (const KvCCfgVariable* pVariable : m_Variables) values.push_back(pVariable->getValue());
  return values;
}
