// Variables: the current value with its adjustment to what a variable can hold, the SSA versions'
// value ranges, the replacement stack, aliases and use sets.
#include "ssaopt/ir/variable.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>

#include "ssaopt/frame/control.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/frame/types.h"
#include "ssaopt/values/arithmetic.h"

namespace {

// Source lines the reports below are filed under; the host turns them into error codes that logs
// and tests match, so they stay fixed whatever happens to this file.
constexpr int kLineDelUse = 212;  // where delUse checks that the node is a use

// The initial value of a variable whose class has none of its own; nobody may change it.
const KvCCfgValue kUndeterminedInitValue;

constexpr double kInfinity = std::numeric_limits<double>::infinity();

// A bound as a number: the constant, or the infinity `open` where it bounds nothing (yet).
double endOf(const KvCCfgValue& bound, double open) { return bound.isConstant() ? bound.getValue() : open; }

// The least interval holding every number added.
struct Hull {
  double lo = kInfinity;
  double hi = -kInfinity;

  void add(double number) {
    lo = std::min(lo, number);
    hi = std::max(hi, number);
  }
};

// An end that bounds with a number: a constant other than NaN.
bool boundsWithNumber(const KvCCfgValue& end) { return end.isConstant() && !std::isnan(end.getValue()); }

// An end that bounds nothing: undetermined stays undetermined, anything else becomes non-constant.
KvCCfgValue openEnd(const KvCCfgValue& given) {
  return given.isUndetermined() ? given : KvCCfgValue(eCfgNonConstant);
}

// What a fitted end says: an undetermined end still waits for what it depends on, and an infinite end
// bounds nothing unless the end it came from was a constant (an infinity the values may reach).
KvCCfgValue fittedEnd(const KvCCfgValue& given, double end) {
  if (given.isUndetermined()) return given;
  if (std::isinf(end) && !given.isConstant()) return KvCCfgValue(eCfgNonConstant);
  return KvCCfgValue(end);
}

}  // namespace

std::uint32_t KvCCfgVariable::s_GlobIndexCnt = 0;

void KvCCfgVariable::boot() { s_GlobIndexCnt = 0; }

KvCCfgVariable::KvCCfgVariable()
    : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)), m_pValue(new KvCCfgValue()), m_pNonVirtualAlias(this) {}

KvCCfgVariable::~KvCCfgVariable() { delete m_pValue; }

void KvCCfgVariable::setMinValueAndDestroyOld(KvCCfgValue&) {}

void KvCCfgVariable::setMaxValueAndDestroyOld(KvCCfgValue&) {}

KvCCfgValue* KvCCfgVariable::getMinValue() const { return nullptr; }

KvCCfgValue* KvCCfgVariable::getMaxValue() const { return nullptr; }

const KvCCfgValue* KvCCfgVariable::getInitValue() const { return &kUndeterminedInitValue; }

bool KvCCfgVariable::isOutput() const { return false; }

KvCCfgSFVariable* KvCCfgVariable::isSFVariable() { return nullptr; }

KvCSSAVariable* KvCCfgVariable::isSSAVariable() { return nullptr; }

// Array elements and volatile variables may change behind the analysis' back, so nothing about them
// is constant; the caller sees that through its argument as well.
void KvCCfgVariable::setVarValueAndAdjustCfgValue(KvCCfgValue& value) {
  adjustCfgValue(value);
  setVarValue(value);
}

void KvCCfgVariable::adjustCfgValue(KvCCfgValue& value) const {
  if (isNeverConstant())
    value = KvCCfgValue(eCfgNonConstant);
  else
    fitConstant(value);
}

void KvCCfgVariable::setVarValue(KvCCfgValue& value) {
  if (isNeverConstant()) value = KvCCfgValue(eCfgNonConstant);
  m_pValue = value.clone();
}

// A saturated constant keeps the limit exactly: the limit is already a value of the variable, and
// rounding it could move it past the border again.
void KvCCfgVariable::fitConstant(KvCCfgValue& value) const {
  if (!value.isConstant() || ConsiderSaturation(value)) return;
  if (isScaled())
    value.changeToRepresentedValue(getScaling());
  else
    cast(getDataType(), value, true);
}

void KvCCfgVariable::setVarRange(const KvCCfgValue& minimum, const KvCCfgValue& maximum) {
  KvCCfgValue lower = minimum, upper = maximum;
  setMinValueAndDestroyOld(lower);
  setMaxValueAndDestroyOld(upper);
}

void KvCCfgVariable::setVarRangeAndAdjust(KvCCfgValue& minimum, KvCCfgValue& maximum) {
  fitRange(minimum, maximum);
  setVarRange(minimum, maximum);
}

// Storing a value either saturates it, when it lies beyond a saturated border, or converts it; the
// values within the borders convert monotonically except where the type wraps, which castRange
// accounts for. The range held is the hull of the three parts.
void KvCCfgVariable::fitRange(KvCCfgValue& minimum, KvCCfgValue& maximum) const {
  if (!boundsWithNumber(minimum) && !boundsWithNumber(maximum) && storesNaN()) {
    // Values bounded by a number on no side may be NaN, which no saturation clamps and no bound holds.
    minimum = openEnd(minimum);
    maximum = openEnd(maximum);
    return;
  }
  double lo = endOf(minimum, -kInfinity), hi = endOf(maximum, kInfinity);
  if (!(lo <= hi)) {
    lo = -kInfinity;
    hi = kInfinity;
  }
  Hull held;
  if (isUpperBorderSaturated() && hi > getUpperLimit()) held.add(saturated(hi));
  if (isLowerBorderSaturated() && lo < getLowerLimit()) held.add(saturated(lo));
  double from = isLowerBorderSaturated() ? std::max(lo, getLowerLimit()) : lo;
  double to = isUpperBorderSaturated() ? std::min(hi, getUpperLimit()) : hi;
  if (from <= to) {
    convertRange(from, to);
    held.add(from);
    held.add(to);
  }
  minimum = fittedEnd(minimum, held.lo);
  maximum = fittedEnd(maximum, held.hi);
}

// A float or scaled variable keeps a NaN as it is; an integer type makes it 0, a Boolean 1.
bool KvCCfgVariable::storesNaN() const {
  KvCCfgValue value(std::numeric_limits<double>::quiet_NaN());
  fitConstant(value);
  return std::isnan(value.getValue());
}

double KvCCfgVariable::saturated(double number) const {
  KvCCfgValue value(number);
  ConsiderSaturation(value);
  return value.getValue();
}

// The represented value of a scaling is monotone in the value represented, whatever the sign of the
// LSB, so the ends of a range go to the ends.
void KvCCfgVariable::convertRange(double& from, double& to) const {
  if (!isScaled()) {
    castRange(getDataType(), from, to, true);
    return;
  }
  from = KvCScaleTool::findRepresentedValue(from, getScaling());
  to = KvCScaleTool::findRepresentedValue(to, getScaling());
}

bool KvCCfgVariable::ConsiderSaturation(KvCCfgValue& value) const {
  bool changed = false;
  if (isUpperBorderSaturated() && value.getValue() > getUpperLimit()) {
    value.setValue(getUpperLimit());
    changed = true;
  }
  if (isLowerBorderSaturated() && value.getValue() < getLowerLimit()) {
    value.setValue(getLowerLimit());
    changed = true;
  }
  return changed;
}

bool KvCCfgVariable::isScaled() const {
  const KV_Scaling* pScaling = getScaling();
  return pScaling && !(pScaling->getLSB() == 1.0 && pScaling->getOffset() == 0.0);
}

KvCCfgVariable* KvCCfgVariable::topSSAReplacement() const {
  return m_SSAReplacements.empty() ? nullptr : m_SSAReplacements.top();
}

void KvCCfgVariable::markAsArray() {
  m_IsArray = true;
  dropValueToNonConstant();
}

void KvCCfgVariable::markAsVolatile() {
  m_IsVolatile = true;
  dropValueToNonConstant();
}

void KvCCfgVariable::dropValueToNonConstant() {
  delete m_pValue;
  m_pValue = new KvCCfgValue(eCfgNonConstant);
}

int KvCCfgVariable::delUse(ssaopt::node v) {
  KV_CONSISTENCY_CHECK(m_Uses.count(v) != 0, "m_Uses.member(v)", "KvCCfgVariable", kLineDelUse);
  m_Uses.erase(v);
  return countUses();
}

ssaopt::set<ssaopt::node> KvCCfgVariable::getAllUses() const {
  ssaopt::set<ssaopt::node> uses = m_Uses;
  for (const KvCCfgVariable* pAlias : m_VirtualAliases) ssaopt::insertAll(uses, pAlias->m_Uses);
  return uses;
}

int KvCCfgVariable::countAllUses() const {
  int count = countUses();
  for (const KvCCfgVariable* pAlias : m_VirtualAliases) count += pAlias->countUses();
  return count;
}

KvCSSAVariable::KvCSSAVariable(KvCCfgVariable* var)
    : m_pMinValue(new KvCCfgValue()), m_pMaxValue(new KvCCfgValue()) {
  setOrigVar(var);
  if (var->isArray()) markAsArray();
  if (var->isErasable()) markAsErasable();
  if (var->isVolatile()) markAsVolatile();
}

KvCSSAVariable::~KvCSSAVariable() {
  delete m_pMinValue;
  delete m_pMaxValue;
}

void KvCSSAVariable::setOrigVar(KvCCfgVariable* var) {
  KvCSSAVariable* pVersion = var->isSSAVariable();
  m_pOrigVar = pVersion ? pVersion->getOrigVar() : var;
}

void KvCSSAVariable::setMinValueAndDestroyOld(KvCCfgValue& value) { replaceBound(m_pMinValue, value); }

void KvCSSAVariable::setMaxValueAndDestroyOld(KvCCfgValue& value) { replaceBound(m_pMaxValue, value); }

void KvCSSAVariable::setVarRange(const KvCCfgValue& minimum, const KvCCfgValue& maximum) {
  storeBound(m_pMinValue, minimum);
  storeBound(m_pMaxValue, maximum);
}

void KvCSSAVariable::replaceBound(KvCCfgValue*& pBound, const KvCCfgValue& value) {
  storeBound(pBound, value);
  fitConstant(*pBound);
}

void KvCSSAVariable::storeBound(KvCCfgValue*& pBound, const KvCCfgValue& value) {
  delete pBound;
  pBound = isNeverConstant() ? new KvCCfgValue(eCfgNonConstant) : value.clone();
}

const KV_DataType* KvCSSAVariable::getDataType() const { return m_pOrigVar->getDataType(); }

const KV_Scaling* KvCSSAVariable::getScaling() const { return m_pOrigVar->getScaling(); }

bool KvCSSAVariable::isUpperBorderSaturated() const { return m_pOrigVar->isUpperBorderSaturated(); }

bool KvCSSAVariable::isLowerBorderSaturated() const { return m_pOrigVar->isLowerBorderSaturated(); }

double KvCSSAVariable::getUpperLimit() const { return m_pOrigVar->getUpperLimit(); }

double KvCSSAVariable::getLowerLimit() const { return m_pOrigVar->getLowerLimit(); }

const KvCCfgValue* KvCSSAVariable::getInitValue() const { return m_pOrigVar->getInitValue(); }

// Null (an operand not set) comes first. Indexes repeat only after the counter is restarted or
// wraps; the address then keeps the order total.
bool ssaopt::set_order<KvCCfgVariable*>::operator()(const KvCCfgVariable* a, const KvCCfgVariable* b) const {
  if (!a || !b) return !a && b;
  if (a->getIndex() != b->getIndex()) return a->getIndex() < b->getIndex();
  return std::less<const KvCCfgVariable*>()(a, b);
}
