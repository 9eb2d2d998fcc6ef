// Procedure records.
#include "ssaopt/ir/procedure.h"

#include "address_order.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/ir/statement.h"

std::uint32_t KvCCfgProcedure::s_GlobIndexCnt = 0;

void KvCCfgProcedure::boot() { s_GlobIndexCnt = 0; }

KvCCfgProcedure::KvCCfgProcedure() : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)) {}

void KvCCfgProcedure::deleteInfoAboutVarDefAndUses() {
  m_DefinedVariables.clear();
  m_UsedVariables.clear();
}

namespace {

template <class Statement>
void dropGone(ssaopt::list<Statement*>& statements, const ssaopt::set<const KvCCfgStatement*>& gone) {
  statements.remove_if([&](Statement* p) { return gone.count(p) != 0; });
}

}  // namespace

void KvCCfgProcedure::forgetStatements(const ssaopt::set<const KvCCfgStatement*>& gone) {
  dropGone(m_Calls, gone);
  dropGone(m_ParamStatements, gone);
  dropGone(m_ValueReturnStatements, gone);
  for (KvCCfgParamStatement* pParam : m_ParamStatements) {
    ssaopt::array<KvCCfgProcedureCall*> goneCalls;
    for (const auto& argument : pParam->getArguments())
      if (gone.count(argument.first)) goneCalls.push_back(argument.first);
    for (KvCCfgProcedureCall* pCall : goneCalls) pParam->removeArgument(pCall);
  }
}

int compare(const KvCCfgProcedure* a, const KvCCfgProcedure* b) { return ssaopt::ir::compareAddresses(a, b); }
