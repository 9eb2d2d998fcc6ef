// The statement classes: definitions and uses of each kind, phi operand removal and the combined
// value of a parameter statement's arguments.
#include "ssaopt/ir/statement.h"

#include <algorithm>

#include "address_order.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/variable.h"
#include "ssaopt/ir/variable_expression.h"
#include "ssaopt/values/arithmetic.h"

namespace {

// Source lines the reports below are filed under; the host turns them into error codes that logs
// and tests match, so they stay fixed whatever happens to this file.
constexpr int kLineDelReplacement = 93;       // operand index beyond the dimension
constexpr int kLineDelReplacementLast = 100;  // the removed operand did not end up last
constexpr int kLineUnsetOperand = 155;        // a phi operand asked for before renaming set it
constexpr int kLineSetReplacement = 72;       // operand index outside the dimension when setting

constexpr const char* kPhiFunction = "KvCPhiFunction";

// What an expression reads, or nothing for a missing one.
ssaopt::set<KvCCfgVariable*> usedVariablesOf(const KvCCfgExpression* pExpression) {
  return pExpression ? pExpression->getUsedVariables() : ssaopt::set<KvCCfgVariable*>();
}

// Asks every argument that is there what `ask` gives for it and combines the answers with one of the
// list merges. No argument at all gives the merge of an empty list, which is undetermined.
template <class Ask, class Combine>
KvCCfgValue combineArguments(const KvCCfgParamStatement::Arguments& arguments, Ask ask, Combine combine) {
  ssaopt::array<KvCCfgValue> values;
  values.reserve(arguments.size());
  for (const auto& entry : arguments)
    if (entry.second) values.push_back(ask(*entry.second));
  ssaopt::list<KvCCfgValue*> pointers;
  for (KvCCfgValue& value : values) pointers.push_back(&value);
  return combine(pointers);
}

template <KvCCfgValue (KvCCfgExpression::*question)() const>
KvCCfgValue asked(KvCCfgExpression& argument) {
  return (argument.*question)();
}

KvCCfgVariable* originalOf(KvCCfgVariable* pVariable) {
  KvCSSAVariable* pVersion = pVariable->isSSAVariable();
  return pVersion ? pVersion->getOrigVar() : pVariable;
}

// The summaries pass a variable that a procedure reads on to it as the variable itself: the call
// stores nothing, and the formal keeps the value it holds.
bool passesHeldValue(KvCCfgExpression& argument, KvCCfgVariable& formal) {
  KvCCfgVariableExpression* pMembers = argument.isVariableExpression();
  if (!pMembers) return false;
  for (KvCCfgVariable* pMember : pMembers->getUsedVariables())
    if (originalOf(pMember) != originalOf(&formal)) return false;
  return true;
}

// One bound of the range the formal holds after `argument`: the argument's range fitted to the formal
// as a pair, unless the formal already holds it.
KvCCfgValue heldBound(KvCCfgExpression& argument, KvCCfgVariable& formal, bool lower) {
  KvCCfgValue minimum = argument.getMinimum(), maximum = argument.getMaximum();
  if (!passesHeldValue(argument, formal)) formal.fitRange(minimum, maximum);
  return lower ? minimum : maximum;
}

}  // namespace

std::uint32_t KvCCfgStatement::s_GlobIndexCnt = 0;

void KvCCfgStatement::boot() { s_GlobIndexCnt = 0; }

KvCCfgStatement::KvCCfgStatement() : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)) {}

bool KvCCfgStatement::hoistOutOfIfElseBranch(bool& flag) {
  flag = false;
  return false;
}

bool KvCCfgAssignment::hasSideEffects() const { return m_pRHS && m_pRHS->hasSideEffects(); }

ssaopt::set<KvCCfgVariable*> KvCCfgAssignment::getDefinedVariables() const {
  return m_pLHS ? ssaopt::set<KvCCfgVariable*>{m_pLHS} : ssaopt::set<KvCCfgVariable*>();
}

ssaopt::set<KvCCfgVariable*> KvCCfgAssignment::getUsedVariables() const { return usedVariablesOf(m_pRHS); }

KvCCfgExternCall::KvCCfgExternCall(const ssaopt::list<KvCCfgVariable*>* pList) {
  if (pList) m_ModifiableVariables = *pList;
}

void KvCCfgExternCall::replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) {
  m_UsedVariables.erase(pOld);
  m_UsedVariables.insert(pNew);
}

KvCPhiFunction::KvCPhiFunction(KvCCfgVariable* pVariable, int dimension)
    : m_pVariable(pVariable),
      m_pReplacementVariable(static_cast<std::size_t>(std::max(dimension, 0)), nullptr) {}

KvCPhiFunction* KvCPhiFunction::clone() const { return new KvCPhiFunction(m_pVariable, getDimension()); }

ssaopt::set<KvCCfgVariable*> KvCPhiFunction::getUsedVariables() const {
  ssaopt::set<KvCCfgVariable*> used;
  for (KvCCfgVariable* pVariable : m_pReplacementVariable) {
    KV_CONSISTENCY_CHECK(pVariable, "pVariable", kPhiFunction, kLineUnsetOperand);
    if (pVariable) used.insert(pVariable);
  }
  return used;
}

void KvCPhiFunction::setReplacementVariable(int i, KvCCfgVariable* v) {
  KV_CONSISTENCY_CHECK(isOperandIndex(i), "0 <= i && i < Dim", kPhiFunction, kLineSetReplacement);
  if (isOperandIndex(i)) m_pReplacementVariable[static_cast<std::size_t>(i)] = v;
}

// The removed slot travels to the end, so the operands behind it move down one place in order and
// stay paired with the in-edges that move down with them.
void KvCPhiFunction::delReplacement(int i) {
  if (!isOperandIndex(i)) {
    KV_CONSISTENCY_CHECK(false, "0", kPhiFunction, kLineDelReplacement);
    ssaopt::reportInternalError(kPhiFunction, kLineDelReplacement);
    return;
  }
  auto removed = m_pReplacementVariable.begin() + i;
  *removed = nullptr;
  std::rotate(removed, removed + 1, m_pReplacementVariable.end());
  KV_CONSISTENCY_CHECK(m_pReplacementVariable.back() == nullptr, "m_pReplacementVariable[Dim - 1] == 0",
                       kPhiFunction, kLineDelReplacementLast);
  m_pReplacementVariable.pop_back();
}

ssaopt::set<KvCCfgVariable*> KvCCfgParamStatement::getUsedVariables() const {
  ssaopt::set<KvCCfgVariable*> used;
  for (const auto& entry : m_Arguments) ssaopt::insertAll(used, usedVariablesOf(entry.second));
  return used;
}

bool KvCCfgParamStatement::hasSideEffects() const {
  for (const auto& entry : m_Arguments)
    if (entry.second && entry.second->hasSideEffects()) return true;
  return false;
}

KvCCfgExpression* KvCCfgParamStatement::getArgument(KvCCfgProcedureCall* pCall) const {
  KvCCfgExpression* const* ppArgument = m_Arguments.lookup(pCall);
  return ppArgument ? *ppArgument : nullptr;
}

KvCCfgValue KvCCfgParamStatement::evaluate() const {
  return combineArguments(m_Arguments, asked<&KvCCfgExpression::evaluate>, intersect);
}

KvCCfgValue KvCCfgParamStatement::getMinimum() const {
  return combineArguments(m_Arguments, asked<&KvCCfgExpression::getMinimum>, determineMinimum);
}

KvCCfgValue KvCCfgParamStatement::getMaximum() const {
  return combineArguments(m_Arguments, asked<&KvCCfgExpression::getMaximum>, determineMaximum);
}

KvCCfgValue KvCCfgParamStatement::evaluateHeld() const {
  KvCCfgVariable& formal = *m_pVariable;
  auto held = [&formal](KvCCfgExpression& argument) {
    KvCCfgValue value = argument.evaluate();
    if (!passesHeldValue(argument, formal)) formal.adjustCfgValue(value);
    return value;
  };
  return combineArguments(m_Arguments, held, intersect);
}

KvCCfgValue KvCCfgParamStatement::getHeldMinimum() const {
  KvCCfgVariable& formal = *m_pVariable;
  auto held = [&formal](KvCCfgExpression& argument) { return heldBound(argument, formal, true); };
  return combineArguments(m_Arguments, held, determineMinimum);
}

KvCCfgValue KvCCfgParamStatement::getHeldMaximum() const {
  KvCCfgVariable& formal = *m_pVariable;
  auto held = [&formal](KvCCfgExpression& argument) { return heldBound(argument, formal, false); };
  return combineArguments(m_Arguments, held, determineMaximum);
}

ssaopt::set<KvCCfgVariable*> KvCCfgValueReturnStatement::getUsedVariables() const {
  return usedVariablesOf(m_pExpression);
}

int compare(KvCCfgStatement* const& a, KvCCfgStatement* const& b) {
  return ssaopt::ir::compareAddresses(a, b);
}

int compare(KvCPhiFunction* const& a, KvCPhiFunction* const& b) { return a == b ? 0 : 1; }
