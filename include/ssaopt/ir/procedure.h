// The record of a procedure: its name, entry and exit nodes, the calls of it, its def/use summary and
// its interface statements. It refers to nodes, calls and statements and owns none of them.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/string.h"
#include "ssaopt/ir/forward.h"

class KvCCfgProcedure {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgProcedure();
  // A copy keeps the index of its source.
  KvCCfgProcedure(const KvCCfgProcedure&) = default;
  KvCCfgProcedure& operator=(const KvCCfgProcedure&) = default;

  std::uint32_t getIndex() const { return m_Index; }
  static void boot();

  // The key of the graph's procedure table.
  BxCXString getName() const { return m_Name; }
  void setName(const BxCXString& name) { m_Name = name; }
  ssaopt::node getEntryNode() const { return m_EntryNode; }
  void setEntryNode(ssaopt::node v) { m_EntryNode = v; }
  ssaopt::node getExitNode() const { return m_ExitNode; }
  void setExitNode(ssaopt::node v) { m_ExitNode = v; }
  // The node that stands for this procedure in the function call graph.
  ssaopt::node getFcgNode() const { return m_FcgNode; }
  void setFcgNode(ssaopt::node v) { m_FcgNode = v; }

  // The calls of this procedure (not the calls made in it), in the order appended.
  ssaopt::list<KvCCfgProcedureCall*> getCalls() const { return m_Calls; }
  void appendCall(KvCCfgProcedureCall* pCall) { m_Calls.push_back(pCall); }
  // The summary: what the procedure and everything it calls define and use.
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const { return m_DefinedVariables; }
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const { return m_UsedVariables; }
  void appendDefinedVariable(KvCCfgVariable* v) { m_DefinedVariables.insert(v); }
  void appendUsedVariable(KvCCfgVariable* v) { m_UsedVariables.insert(v); }
  // Empties the summary only; calls and interface statements stay.
  void deleteInfoAboutVarDefAndUses();

  // Drops every call, parameter statement and value-return statement named in `gone` (statements
  // that a transformation deleted), and the arguments that the remaining parameter statements hold
  // for calls that are gone. The pointers in `gone` are only compared, never read.
  void forgetStatements(const ssaopt::set<const KvCCfgStatement*>& gone);
  // One per formal parameter, in parameter order.
  ssaopt::list<KvCCfgParamStatement*> getParamStatements() const { return m_ParamStatements; }
  void appendParamStatement(KvCCfgParamStatement* pStatement) { m_ParamStatements.push_back(pStatement); }
  // The value-return statements after every call of this procedure.
  ssaopt::list<KvCCfgValueReturnStatement*> getValueReturnStatements() const {
    return m_ValueReturnStatements;
  }
  void appendValueReturnStatement(KvCCfgValueReturnStatement* pStatement) {
    m_ValueReturnStatements.push_back(pStatement);
  }

private:
  static std::uint32_t s_GlobIndexCnt;

  std::uint32_t m_Index;
  BxCXString m_Name;
  ssaopt::node m_EntryNode;
  ssaopt::node m_ExitNode;
  ssaopt::node m_FcgNode;
  ssaopt::list<KvCCfgProcedureCall*> m_Calls;
  ssaopt::set<KvCCfgVariable*> m_DefinedVariables;
  ssaopt::set<KvCCfgVariable*> m_UsedVariables;
  ssaopt::list<KvCCfgParamStatement*> m_ParamStatements;
  ssaopt::list<KvCCfgValueReturnStatement*> m_ValueReturnStatements;
};

// Containers of procedures order them by address: -1, 0 or +1.
int compare(const KvCCfgProcedure* a, const KvCCfgProcedure* b);
