#include "ssaopt/client/variable.h"

#include <algorithm>
#include <utility>

#include "ssaopt/client/data_types.h"
#include "ssaopt/values/arithmetic.h"

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

namespace {

// A value at the limit as a store that does not saturate leaves it: on the scaling's grid, or a value
// of the type (truncated, or rounded to float32), which may lie past the limit.
double storedAtLimit(const KvCCfgVariable& variable, double limit) {
  KvCCfgValue value(limit);
  if (variable.isScaled())
    value.changeToRepresentedValue(variable.getScaling());
  else
    cast(variable.getDataType(), value, true);
  return value.getValue();
}

// A store gives a saturation limit, or the value converted. An integer type wraps the converted value
// anywhere within the type unless the value lies within limits inside the type on both sides.
bool limitsHold(const KvCCfgVariable& variable) {
  if (!typeBoundsTheValue(variable)) return true;
  const KV_DataType* pType = variable.getDataType();
  return variable.isLowerBorderSaturated() && variable.isUpperBorderSaturated() &&
         variable.getLowerLimit() >= *typeMinimum(pType) && variable.getUpperLimit() <= *typeMaximum(pType);
}

std::optional<double> declaredBound(const KvCCfgVariable& variable, bool upper) {
  auto farther = [upper](double a, double b) { return upper ? std::max(a, b) : std::min(a, b); };
  bool saturated = upper ? variable.isUpperBorderSaturated() : variable.isLowerBorderSaturated();
  if (limitsHold(variable)) {
    if (!saturated) return std::nullopt;
    double limit = upper ? variable.getUpperLimit() : variable.getLowerLimit();
    return farther(limit, storedAtLimit(variable, limit));
  }
  const KV_DataType* pType = variable.getDataType();
  double bound = upper ? *typeMaximum(pType) : *typeMinimum(pType);
  if (variable.isLowerBorderSaturated()) bound = farther(bound, variable.getLowerLimit());
  if (variable.isUpperBorderSaturated()) bound = farther(bound, variable.getUpperLimit());
  return bound;
}

}  // namespace

std::optional<double> declaredLowerBound(const KvCCfgVariable& variable) {
  return declaredBound(variable, false);
}

std::optional<double> declaredUpperBound(const KvCCfgVariable& variable) {
  return declaredBound(variable, true);
}

}  // namespace ssaopt::client
