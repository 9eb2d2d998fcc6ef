#include "ssaopt/client/statements.h"

#include <utility>

#include "front_end_steps.h"
#include "ssaopt/client/hoisting.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/variable.h"

KvCCfgSFAssignment::KvCCfgSFAssignment(KvCCfgVariable* pLHS, KvCCfgSFExpression* pRHS) {
  setLHS(pLHS);
  setRHS(pRHS);
}

KvCCfgSFExpression* KvCCfgSFAssignment::getSFRHS() const {
  return getRHS() ? getRHS()->isSFExpression() : nullptr;
}

KvCCfgStatement* KvCCfgSFAssignment::clone() const {
  KvCCfgSFExpression* pRHS = getSFRHS();
  return new KvCCfgSFAssignment(getLHS(), pRHS ? pRHS->clone() : nullptr);
}

namespace {

// Whether `folded` can stand in the text, where the front end rejects a stored literal that does not
// fit its variable. Such a literal becomes the value the store leaves, which stores the same, except
// where the cast wraps a value past a saturation limit (-1 into a uint32 saturated at 20 stores
// 4294967295, which stored again is 20): the assignment then keeps the computation unfolded.
bool fitsTheText(KvCCfgSFExpression::Terms& folded, KvCCfgSFVariable* pVariable) {
  double* pLiteral = KvCCfgSFExpression::storedLiteral(folded);
  if (!pLiteral || !pVariable || ssaopt::client::detail::variableHolds(*pVariable, *pLiteral)) return true;
  double stored = ssaopt::client::storedValue(*pVariable, *pLiteral);
  if (ssaopt::client::storedValue(*pVariable, stored) != stored) return false;
  *pLiteral = stored;
  return true;
}

}  // namespace

void KvCCfgSFAssignment::foldConstants() {
  KvCCfgSFExpression* pRHS = getSFRHS();
  if (!pRHS) return;
  KvCCfgSFExpression::Terms folded = pRHS->foldedTerms();
  KvCCfgSFVariable* pVariable = getLHS() ? ssaopt::client::originalOf(getLHS())->isSFVariable() : nullptr;
  if (fitsTheText(folded, pVariable)) pRHS->setTerms(std::move(folded));
}

bool KvCCfgSFAssignment::generatesSameCode(KvCCfgStatement* pOther) const {
  KvCCfgSFAssignment* pAssignment = pOther ? pOther->isSFAssignment() : nullptr;
  if (!pAssignment || pAssignment->getIsVirtual() || getIsVirtual()) return false;
  if (ssaopt::client::originalOf(getLHS()) != ssaopt::client::originalOf(pAssignment->getLHS())) return false;
  KvCCfgSFExpression* pMine = getSFRHS();
  KvCCfgSFExpression* pTheirs = pAssignment->getSFRHS();
  return pMine && pTheirs && pMine->generatesSameCodeAs(*pTheirs);
}

bool KvCCfgSFAssignment::hoistOutOfIfElseBranch(bool& skipNext) {
  skipNext = false;
  KvCCfgVariable* pWritten = getLHS() ? ssaopt::client::originalOf(getLHS()) : nullptr;
  if (!pWritten || pWritten->isVolatile() || hasSideEffects()) return false;
  return ssaopt::client::agreeToHoist(this);
}

void KvCCfgSFAssignment::remove() { ssaopt::client::noteDroppedTwin(this); }

KvCCfgSFProcedureCall::KvCCfgSFProcedureCall(const BxCXString& name, Arguments arguments)
    : KvCCfgProcedureCall(name), m_Arguments(std::move(arguments)) {}

KvCCfgStatement* KvCCfgSFProcedureCall::clone() const {
  Arguments copies;
  copies.reserve(m_Arguments.size());
  for (KvCCfgSFExpression* pArgument : m_Arguments) copies.push_back(pArgument->clone());
  return new KvCCfgSFProcedureCall(getName(), std::move(copies));
}

bool KvCCfgSFProcedureCall::generatesSameCode(KvCCfgStatement* pOther) const {
  KvCCfgSFProcedureCall* pCall = pOther ? pOther->isSFProcedureCall() : nullptr;
  if (!pCall || pCall->getName() != getName() || pCall->m_Arguments.size() != m_Arguments.size())
    return false;
  for (std::size_t i = 0; i < m_Arguments.size(); ++i)
    if (!m_Arguments[i]->generatesSameCodeAs(*pCall->m_Arguments[i])) return false;
  return true;
}

KvCCfgSFExternCall::KvCCfgSFExternCall(const BxCXString& name,
                                       const ssaopt::list<KvCCfgVariable*>& modifiable)
    : KvCCfgExternCall(&modifiable), m_Name(name) {}

namespace ssaopt::client {

// The library has no type query for external calls of clients, and only this client makes them.
BxCXString externCallName(KvCCfgExternCall& call) {
  auto* pNamed = dynamic_cast<KvCCfgSFExternCall*>(&call);
  return pNamed ? pNamed->getName() : BxCXString();
}

}  // namespace ssaopt::client
