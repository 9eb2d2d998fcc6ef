#include "ssaopt/client/variable.h"

#include <cmath>
#include <limits>
#include <utility>

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

// The bound of the range every value read keeps, where it has one. A read of a volatile variable is an
// input, always a number: what storing any number gives (a range bounded by the infinities). Anything
// else holds what was stored, which may be NaN (an open range).
std::optional<double> declaredBound(const KvCCfgVariable& variable, bool lower) {
  constexpr double kInfinity = std::numeric_limits<double>::infinity();
  KvCCfgValue minimum = variable.isVolatile() ? KvCCfgValue(-kInfinity) : KvCCfgValue(eCfgNonConstant);
  KvCCfgValue maximum = variable.isVolatile() ? KvCCfgValue(kInfinity) : KvCCfgValue(eCfgNonConstant);
  variable.fitRange(minimum, maximum);
  const KvCCfgValue& bound = lower ? minimum : maximum;
  bool bounds = bound.isConstant() && std::isfinite(bound.getValue());
  return bounds ? std::optional<double>(bound.getValue()) : std::nullopt;
}

}  // namespace

std::optional<double> declaredLowerBound(const KvCCfgVariable& variable) {
  return declaredBound(variable, true);
}

std::optional<double> declaredUpperBound(const KvCCfgVariable& variable) {
  return declaredBound(variable, false);
}

}  // namespace ssaopt::client
