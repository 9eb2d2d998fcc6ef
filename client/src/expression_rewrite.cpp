// The rewriting operations of an expression: constants in place of variables and conditions, and
// folding.
#include <utility>
#include <vector>

#include "ssaopt/client/expression.h"
#include "ssaopt/ir/variable.h"

using ssaopt::client::TermOp;

void KvCCfgSFExpression::replaceConstantVariables() {
  for (Term& term : m_Terms) {
    if (term.op != TermOp::Variable) continue;
    const KvCCfgValue* pValue = term.pVariable->getValue();
    if (pValue && pValue->isConstant()) term = Term{TermOp::Literal, pValue->getValue(), nullptr};
  }
}

void KvCCfgSFExpression::replaceConstantCondition() {
  if (hasSideEffects()) return;
  KvCCfgValue value = evaluate();
  if (value.isConstant()) replaceConditionWithConstant(value.getValue());
}

namespace {

// A complete sub-expression of the folded terms: where it starts, what the value arithmetic says of
// it with every variable unknown, and whether it reads a volatile variable.
struct Folded {
  std::size_t start;
  KvCCfgValue value;
  bool sideEffects;
};

KvCCfgValue valueWithVariablesUnknown(const KvCCfgSFExpression::Term& term, const Folded* operands,
                                      int arity) {
  if (term.op == TermOp::Literal) return KvCCfgValue(term.number);
  if (ssaopt::client::namesVariable(term.op)) return KvCCfgValue(eCfgNonConstant);
  if (arity == 1) return ssaopt::client::applyUnary(term.op, operands[0].value);
  return ssaopt::client::applyBinary(term.op, operands[0].value, operands[1].value);
}

}  // namespace

// The folded terms grow like a stack: a sub-expression that turns out constant is cut off the end and
// replaced by its literal, so the pass is linear.
KvCCfgSFExpression::Terms KvCCfgSFExpression::foldedTerms() const {
  Terms folded;
  folded.reserve(m_Terms.size());
  std::vector<Folded> stack;
  for (const Term& term : m_Terms) {
    int arity = ssaopt::client::arityOf(term.op);
    const Folded* operands = stack.data() + (stack.size() - static_cast<std::size_t>(arity));
    Folded result{arity ? operands[0].start : folded.size(), valueWithVariablesUnknown(term, operands, arity),
                  ssaopt::client::namesVariable(term.op) && term.pVariable->isVolatile()};
    for (int i = 0; i < arity; ++i) result.sideEffects = result.sideEffects || operands[i].sideEffects;
    stack.resize(stack.size() - static_cast<std::size_t>(arity));
    if (arity > 0 && result.value.isConstant() && !result.sideEffects) {
      folded.resize(result.start);
      folded.push_back(Term{TermOp::Literal, result.value.getValue(), nullptr});
    } else {
      folded.push_back(term);
    }
    stack.push_back(result);
  }
  return folded;
}

void KvCCfgSFExpression::foldConstants() { m_Terms = foldedTerms(); }
