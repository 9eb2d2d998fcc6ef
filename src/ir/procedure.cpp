// Procedure records.
#include "ssaopt/ir/procedure.h"

#include "address_order.h"
#include "ssaopt/frame/control.h"

std::uint32_t KvCCfgProcedure::s_GlobIndexCnt = 0;

void KvCCfgProcedure::boot() { s_GlobIndexCnt = 0; }

KvCCfgProcedure::KvCCfgProcedure() : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)) {}

void KvCCfgProcedure::deleteInfoAboutVarDefAndUses() {
  m_DefinedVariables.clear();
  m_UsedVariables.clear();
}

int compare(const KvCCfgProcedure* a, const KvCCfgProcedure* b) { return ssaopt::ir::compareAddresses(a, b); }
