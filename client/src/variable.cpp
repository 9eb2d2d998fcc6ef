#include "ssaopt/client/variable.h"

#include <algorithm>
#include <utility>

#include "ssaopt/client/data_types.h"

KvCCfgSFVariable::KvCCfgSFVariable(std::string name, const KV_DataType* pType, std::uint32_t declarationIndex,
                                   ssaopt::client::SourcePos pos)
    : m_Name(std::move(name)), m_pType(pType), m_DeclarationIndex(declarationIndex), m_Pos(pos) {}

void KvCCfgSFVariable::setInitValue(double value) {
  m_InitValue = KvCCfgValue(value);
  m_HasDeclaredInitValue = true;
}

void KvCCfgSFVariable::makeArray(std::uint32_t length) {
  m_ArrayLength = length;
  markAsArray();
}

namespace ssaopt::client {

KvCCfgVariable* originalOf(KvCCfgVariable* pVariable) {
  KvCSSAVariable* pVersion = pVariable ? pVariable->isSSAVariable() : nullptr;
  return pVersion ? pVersion->getOrigVar() : pVariable;
}

namespace {

// A scaled variable's stored integer stands for another number, so its type range says nothing about
// the value; neither does a float type.
bool typeBoundsTheValue(const KvCCfgVariable& variable) {
  const KV_DataType* pType = variable.getDataType();
  return pType && !variable.isScaled() && !isFloatType(pType);
}

}  // namespace

std::optional<double> declaredLowerBound(const KvCCfgVariable& variable) {
  std::optional<double> bound;
  if (typeBoundsTheValue(variable)) bound = typeMinimum(variable.getDataType());
  if (variable.isLowerBorderSaturated())
    bound = bound ? std::max(*bound, variable.getLowerLimit()) : variable.getLowerLimit();
  return bound;
}

std::optional<double> declaredUpperBound(const KvCCfgVariable& variable) {
  std::optional<double> bound;
  if (typeBoundsTheValue(variable)) bound = typeMaximum(variable.getDataType());
  if (variable.isUpperBorderSaturated())
    bound = bound ? std::min(*bound, variable.getUpperLimit()) : variable.getUpperLimit();
  return bound;
}

}  // namespace ssaopt::client
