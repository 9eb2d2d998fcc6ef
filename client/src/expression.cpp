// The expression's questions (what it reads, what it is, what it computes) and its store.
#include "ssaopt/client/expression.h"

#include <cmath>
#include <sstream>
#include <utility>

#include "ssaopt/client/hoisting.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/client/variable.h"

using ssaopt::client::TermOp;

namespace {

bool sameNumber(double a, double b) { return a == b || (std::isnan(a) && std::isnan(b)); }

// The value a term reads: the variable's current value; non-constant while a variable has none.
KvCCfgValue currentValueOf(const KvCCfgVariable* pVariable) {
  const KvCCfgValue* pValue = pVariable->getValue();
  return pValue ? *pValue : KvCCfgValue(eCfgNonConstant);
}

}  // namespace

KvCCfgSFExpression::KvCCfgSFExpression(Terms terms, ssaopt::client::SourcePos pos,
                                       ssaopt::client::ExpressionStore* pStore)
    : m_Terms(std::move(terms)), m_Pos(pos), m_pStore(pStore) {}

ssaopt::set<KvCCfgVariable*> KvCCfgSFExpression::getUsedVariables() const {
  ssaopt::set<KvCCfgVariable*> used;
  for (const Term& term : m_Terms)
    if (ssaopt::client::namesVariable(term.op)) used.insert(term.pVariable);
  return used;
}

void KvCCfgSFExpression::replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) {
  for (Term& term : m_Terms)
    if (ssaopt::client::namesVariable(term.op) && term.pVariable == pOld) term.pVariable = pNew;
}

void KvCCfgSFExpression::replaceConditionWithConstant(double value) {
  m_Terms.assign(1, Term{TermOp::Literal, value, nullptr});
}

KvCCfgValue KvCCfgSFExpression::evaluate() const {
  if (isMarkedAsEvalToNonConst()) return KvCCfgValue(eCfgNonConstant);
  std::vector<KvCCfgValue> stack;
  stack.reserve(m_Terms.size());
  for (const Term& term : m_Terms) {
    int arity = ssaopt::client::arityOf(term.op);
    KvCCfgValue result;
    if (term.op == TermOp::Literal)
      result = KvCCfgValue(term.number);
    else if (term.op == TermOp::Variable)
      result = currentValueOf(term.pVariable);
    else if (term.op == TermOp::ElementRead || term.op == TermOp::ElementWrite)
      result = KvCCfgValue(eCfgNonConstant);
    else if (arity == 1)
      result = ssaopt::client::applyUnary(term.op, stack.back());
    else
      result = ssaopt::client::applyBinary(term.op, stack[stack.size() - 2], stack.back());
    stack.resize(stack.size() - static_cast<std::size_t>(arity));
    stack.push_back(result);
  }
  return stack.empty() ? KvCCfgValue(eCfgNonConstant) : stack.back();
}

KvCCfgVariable* KvCCfgSFExpression::isVariable(bool& negated) const {
  bool single = m_Terms.size() == 1 && m_Terms[0].op == TermOp::Variable;
  bool negation = m_Terms.size() == 2 && m_Terms[0].op == TermOp::Variable && m_Terms[1].op == TermOp::Not;
  if (!single && !negation) return nullptr;
  negated = negation;
  return m_Terms[0].pVariable;
}

bool KvCCfgSFExpression::isVariableEqualToConstant(KvCCfgVariable*& var, KvCCfgValue& value,
                                                   bool& inequality) const {
  if (m_Terms.size() != 3) return false;
  TermOp op = m_Terms[2].op;
  if (op != TermOp::Equal && op != TermOp::NotEqual) return false;
  const Term* pVariable = nullptr;
  const Term* pLiteral = nullptr;
  for (const Term* pTerm : {&m_Terms[0], &m_Terms[1]}) {
    if (pTerm->op == TermOp::Variable) pVariable = pTerm;
    if (pTerm->op == TermOp::Literal) pLiteral = pTerm;
  }
  if (!pVariable || !pLiteral) return false;
  var = pVariable->pVariable;
  value = KvCCfgValue(pLiteral->number);
  inequality = op == TermOp::NotEqual;
  return true;
}

bool KvCCfgSFExpression::hasSideEffects() const {
  for (const Term& term : m_Terms)
    if (ssaopt::client::namesVariable(term.op) && term.pVariable->isVolatile()) return true;
  return false;
}

void KvCCfgSFExpression::actOnComparisonOutsideBoolRange() {
  KvCCfgVariable* pVariable = nullptr;
  KvCCfgValue constant;
  bool inequality = false;
  if (!isVariableEqualToConstant(pVariable, constant, inequality)) return;
  KvCCfgSFVariable* pNamed = ssaopt::client::originalOf(pVariable)->isSFVariable();
  std::ostringstream message;
  message << "'" << (pNamed ? pNamed->getName() : std::string("?")) << "' is Boolean, so comparing it "
          << (inequality ? "unequal" : "equal") << " to " << ssaopt::client::formatNumber(constant.getValue())
          << " is always " << (inequality ? "true" : "false");
  m_pStore->note(m_Pos, message.str());
}

KvCCfgSFExpression* KvCCfgSFExpression::clone() const { return m_pStore->make(m_Terms, m_Pos); }

bool KvCCfgSFExpression::generatesSameCodeAs(const KvCCfgSFExpression& other) const {
  if (m_Terms.size() != other.m_Terms.size()) return false;
  for (std::size_t i = 0; i < m_Terms.size(); ++i) {
    const Term& mine = m_Terms[i];
    const Term& theirs = other.m_Terms[i];
    if (mine.op != theirs.op) return false;
    if (mine.op == TermOp::Literal && !sameNumber(mine.number, theirs.number)) return false;
    if (ssaopt::client::namesVariable(mine.op) &&
        ssaopt::client::versionReadAfterHoisting(mine.pVariable) !=
            ssaopt::client::versionReadAfterHoisting(theirs.pVariable))
      return false;
  }
  return true;
}

bool KvCCfgSFExpression::isElementWrite() const {
  return !m_Terms.empty() && m_Terms.back().op == TermOp::ElementWrite;
}

// The value of an element write is the complete sub-expression right before it; one that ends in a
// literal is that literal.
double* KvCCfgSFExpression::storedLiteral(Terms& terms) {
  bool elementWrite = !terms.empty() && terms.back().op == TermOp::ElementWrite;
  if (terms.size() != 1 && !(elementWrite && terms.size() >= 3)) return nullptr;
  Term& value = terms[elementWrite ? terms.size() - 2 : 0];
  return value.op == TermOp::Literal ? &value.number : nullptr;
}

namespace ssaopt::client {

ExpressionStore::~ExpressionStore() = default;

KvCCfgSFExpression* ExpressionStore::make(KvCCfgSFExpression::Terms terms, SourcePos pos) {
  m_Expressions.emplace_back(new KvCCfgSFExpression(std::move(terms), pos, this));
  return m_Expressions.back().get();
}

void ExpressionStore::note(SourcePos pos, std::string message) {
  m_Notices.push_back(Notice{pos, std::move(message)});
}

}  // namespace ssaopt::client
