// Minimum and maximum of an expression: interval arithmetic over the lattice. A bound is a lattice
// value of its own: constant when known, non-constant when no bound is known (the interval is open on
// that side), undetermined while what it depends on is not known yet, so that constant propagation
// can still be optimistic about it.
#include <algorithm>
#include <cmath>
#include <initializer_list>
#include <vector>

#include "ssaopt/client/expression.h"
#include "ssaopt/client/variable.h"
#include "ssaopt/values/arithmetic.h"

using ssaopt::client::TermOp;

namespace {

struct Interval {
  KvCCfgValue lo;
  KvCCfgValue hi;
};

const KvCCfgValue kUnbounded(eCfgNonConstant);

// The values of a 32-bit integer, which every integer operator gives.
constexpr double kInt32Lowest = -2147483648.0;
constexpr double kInt32Highest = 2147483647.0;

// The bound computed from `inputs`: non-constant if any is, undetermined if any is, else the number
// `compute` gives from them, where a NaN means that nothing is known.
template <class Compute>
KvCCfgValue boundFrom(std::initializer_list<KvCCfgValue> inputs, Compute compute) {
  bool undetermined = false;
  for (const KvCCfgValue& input : inputs) {
    if (input.isNonConstant()) return kUnbounded;
    undetermined = undetermined || input.isUndetermined();
  }
  if (undetermined) return KvCCfgValue();
  double number = compute();
  // -0 bounds as 0 does; adding 0 keeps the plain one.
  return std::isnan(number) ? kUnbounded : KvCCfgValue(number + 0.0);
}

Interval point(const KvCCfgValue& value) { return {value, value}; }

// A bound the variable's own range leaves open falls back on what its declaration guarantees.
KvCCfgValue orDeclared(const KvCCfgValue& bound, std::optional<double> declared) {
  return bound.isNonConstant() && declared ? KvCCfgValue(*declared) : bound;
}

KvCCfgValue declaredOnly(std::optional<double> declared) {
  return declared ? KvCCfgValue(*declared) : kUnbounded;
}

// Once propagation has ended, what it left undetermined is not known: such a bound is the declared one.
KvCCfgValue settledBound(const KvCCfgValue& bound, bool settled) {
  return settled && bound.isUndetermined() ? kUnbounded : bound;
}

Interval variableInterval(const KvCCfgVariable& variable, bool settled) {
  KvCCfgValue value = variable.getValue() ? *variable.getValue() : kUnbounded;
  if (value.isConstant()) return point(value);
  KvCCfgValue lo = settledBound(variable.getMinValue() ? *variable.getMinValue() : value, settled);
  KvCCfgValue hi = settledBound(variable.getMaxValue() ? *variable.getMaxValue() : value, settled);
  return {orDeclared(lo, ssaopt::client::declaredLowerBound(variable)),
          orDeclared(hi, ssaopt::client::declaredUpperBound(variable))};
}

Interval elementInterval(const KvCCfgVariable& array) {
  return {declaredOnly(ssaopt::client::declaredLowerBound(array)),
          declaredOnly(ssaopt::client::declaredUpperBound(array))};
}

// The least and greatest of the four products (or quotients) of the interval ends.
Interval cornerInterval(const Interval& a, const Interval& b, double (*combine)(double, double)) {
  auto corners = [&](bool least) {
    return boundFrom({a.lo, a.hi, b.lo, b.hi}, [&] {
      double values[] = {combine(a.lo.getValue(), b.lo.getValue()), combine(a.lo.getValue(), b.hi.getValue()),
                         combine(a.hi.getValue(), b.lo.getValue()),
                         combine(a.hi.getValue(), b.hi.getValue())};
      for (double v : values)
        if (std::isnan(v)) return v;
      return least ? *std::min_element(std::begin(values), std::end(values))
                   : *std::max_element(std::begin(values), std::end(values));
    });
  };
  return {corners(true), corners(false)};
}

// A divisor whose interval holds 0 (or may, while not known) leaves the quotient unbounded.
Interval quotientInterval(const Interval& a, const Interval& b) {
  bool excludesZero =
      (b.lo.isConstant() && b.lo.getValue() > 0) || (b.hi.isConstant() && b.hi.getValue() < 0);
  if (!excludesZero) return {kUnbounded, kUnbounded};
  return cornerInterval(a, b, [](double x, double y) { return x / y; });
}

Interval absInterval(const Interval& a) {
  KvCCfgValue lo = boundFrom({a.lo, a.hi}, [&] {
    double l = a.lo.getValue(), h = a.hi.getValue();
    return l >= 0 ? l : (h <= 0 ? -h : 0.0);
  });
  KvCCfgValue hi = boundFrom(
      {a.lo, a.hi}, [&] { return std::max(std::fabs(a.lo.getValue()), std::fabs(a.hi.getValue())); });
  return {lo, hi};
}

// sgn never leaves [-1, 1] and does not decrease, so each end follows its own end of the operand.
Interval signInterval(const Interval& a) {
  auto end = [](const KvCCfgValue& v, double open) {
    return v.isNonConstant() ? KvCCfgValue(open) : boundFrom({v}, [&] { return sgn(v).getValue(); });
  };
  return {end(a.lo, -1.0), end(a.hi, 1.0)};
}

Interval unaryInterval(TermOp op, const Interval& a) {
  switch (op) {
    case TermOp::Negate:
      return {boundFrom({a.hi}, [&] { return -a.hi.getValue(); }),
              boundFrom({a.lo}, [&] { return -a.lo.getValue(); })};
    case TermOp::Abs:
      return absInterval(a);
    case TermOp::Sgn:
      return signInterval(a);
    default:
      return {kUnbounded, kUnbounded};
  }
}

// Whether the end may be the infinity it leans to: open, or that infinity. An end not known yet is
// taken as a number, as optimistically as its other uses.
bool mayBeInfinite(const KvCCfgValue& end) {
  return end.isNonConstant() || (end.isConstant() && std::isinf(end.getValue()));
}

// Opposite infinities added give NaN, which lies in no interval: the sum is then bounded nowhere. The
// ends alone do not show it: [-inf, 0] + [0, inf] has the ends -inf and inf.
Interval sumInterval(const Interval& a, const Interval& b) {
  if ((mayBeInfinite(a.lo) && mayBeInfinite(b.hi)) || (mayBeInfinite(a.hi) && mayBeInfinite(b.lo)))
    return {kUnbounded, kUnbounded};
  return {boundFrom({a.lo, b.lo}, [&] { return a.lo.getValue() + b.lo.getValue(); }),
          boundFrom({a.hi, b.hi}, [&] { return a.hi.getValue() + b.hi.getValue(); })};
}

Interval binaryInterval(TermOp op, const Interval& a, const Interval& b) {
  switch (op) {
    case TermOp::Add:
      return sumInterval(a, b);
    case TermOp::Subtract:
      return sumInterval(a, {boundFrom({b.hi}, [&] { return -b.hi.getValue(); }),
                             boundFrom({b.lo}, [&] { return -b.lo.getValue(); })});
    case TermOp::Multiply:
      return cornerInterval(a, b, [](double x, double y) { return x * y; });
    case TermOp::Divide:
      return quotientInterval(a, b);
    default:
      return {kUnbounded, kUnbounded};
  }
}

bool isPoint(const Interval& a) {
  return a.lo.isConstant() && a.hi.isConstant() && a.lo.getValue() == a.hi.getValue();
}

// The integer operators have no exact interval rule: their result is a 32-bit integer, known exactly
// where every operand is.
Interval operatorInterval(TermOp op, const Interval* operands, int arity) {
  if (ssaopt::client::givesTruthValue(op)) return {KvCCfgValue(0.0), KvCCfgValue(1.0)};
  if (ssaopt::client::isIntegerOperator(op)) {
    bool exact = isPoint(operands[0]) && (arity == 1 || isPoint(operands[1]));
    if (!exact) return {KvCCfgValue(kInt32Lowest), KvCCfgValue(kInt32Highest)};
    return point(arity == 1 ? ssaopt::client::applyUnary(op, operands[0].lo)
                            : ssaopt::client::applyBinary(op, operands[0].lo, operands[1].lo));
  }
  return arity == 1 ? unaryInterval(op, operands[0]) : binaryInterval(op, operands[0], operands[1]);
}

}  // namespace

KvCCfgValue KvCCfgSFExpression::getMinimum() const { return bound(true); }

KvCCfgValue KvCCfgSFExpression::getMaximum() const { return bound(false); }

KvCCfgValue KvCCfgSFExpression::bound(bool lower) const {
  if (isMarkedAsEvalToNonConst()) return kUnbounded;
  KvCCfgValue value = evaluate();
  if (value.isConstant()) return value;
  std::vector<Bounds> terms = getTermBounds(false);
  if (terms.empty()) return kUnbounded;
  return lower ? terms.back().first : terms.back().second;
}

std::vector<KvCCfgSFExpression::Bounds> KvCCfgSFExpression::getTermBounds(bool settled) const {
  std::vector<Bounds> bounds;
  bounds.reserve(m_Terms.size());
  std::vector<Interval> stack;
  stack.reserve(m_Terms.size());
  for (const Term& term : m_Terms) {
    int arity = ssaopt::client::arityOf(term.op);
    Interval result;
    if (term.op == TermOp::Literal)
      result = point(KvCCfgValue(term.number));
    else if (term.op == TermOp::Variable)
      result = variableInterval(*term.pVariable, settled);
    else if (term.op == TermOp::ElementRead)
      result = elementInterval(*term.pVariable);
    else if (term.op == TermOp::ElementWrite)
      result = {kUnbounded, kUnbounded};
    else
      result =
          operatorInterval(term.op, stack.data() + (stack.size() - static_cast<std::size_t>(arity)), arity);
    stack.resize(stack.size() - static_cast<std::size_t>(arity));
    stack.push_back(result);
    bounds.emplace_back(result.lo, result.hi);
  }
  return bounds;
}
