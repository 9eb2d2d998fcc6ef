// Building blocks for the tests of SSA construction through small doubles, for what the textual
// format cannot express (calls inside a block, calls without arguments, virtual assignments, uses
// without definition, huge procedures): the private steps opened to the tests, named variables,
// assignments over them, and the text of a block before renaming.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "cfg/cfg_testing.h"
#include "ssaopt/ir/dominator_tree.h"
#include "ssaopt/ir/variable_expression.h"

class KvCControlFlowGraphSSATestAccess {
public:
  using Trees = ssaopt::array<KvCDominatorTree*>;
  static int buildDominatorTrees(KvCControlFlowGraph& G, Trees& trees) {
    return G.buildDominatorTrees(trees);
  }
  static void freeDominatorTrees(KvCControlFlowGraph& G, Trees& trees, int count) {
    G.freeDominatorTrees(trees, count);
  }
  static void collectVarDefsAndUses(KvCControlFlowGraph& G) { G.collectVarDefsAndUses(); }
  static void initVariablesAfterEntryNodes(KvCControlFlowGraph& G) { G.initVariablesAfterEntryNodes(); }
  static void placeValueReturnStatements(KvCControlFlowGraph& G) { G.placeValueReturnStatements(); }
  static void renameVariables(KvCControlFlowGraph& G, Trees& trees) { G.renameVariables(trees); }
};

namespace ssatest {

using Access = KvCControlFlowGraphSSATestAccess;
using Variables = ssaopt::set<KvCCfgVariable*>;
using cfgtest::Nodes;
using ssaopt::edge;
using ssaopt::node;

class Var : public irtest::TestVariable {
public:
  // The name is a literal: a variable lives in the test's pool and is never destroyed.
  explicit Var(const char* name) : m_Name(name) {}
  bool isOutput() const override { return false; }
  const char* name() const { return m_Name; }

private:
  const char* m_Name;
};

// A client assignment: clients supply clone and folding, which SSA construction never asks for.
class Assign : public KvCCfgAssignment {
public:
  Assign(KvCCfgVariable* pLHS, KvCCfgExpression* pRHS) {
    setLHS(pLHS);
    setRHS(pRHS);
  }
  KvCCfgStatement* clone() const override { return nullptr; }
  void foldConstants() override {}
};

inline KvCCfgVariableExpression* reads(std::initializer_list<KvCCfgVariable*> variables) {
  KvCCfgVariableExpression* pExpression = new KvCCfgVariableExpression();
  for (KvCCfgVariable* pVariable : variables) pExpression->addVariable(pVariable);
  return pExpression;
}

// The original variable of a version, or the variable itself.
inline KvCCfgVariable* original(KvCCfgVariable* pVariable) {
  KvCSSAVariable* pVersion = pVariable->isSSAVariable();
  return pVersion ? pVersion->getOrigVar() : pVariable;
}

class SSATest : public cfgtest::CfgTest {
protected:
  node code(KvCCfgProcedure* pProcedure, std::initializer_list<KvCCfgStatement*> statements,
            KvCCfgExpression* pCond = nullptr) {
    node v = block(pProcedure);
    for (KvCCfgStatement* pStatement : statements) blockOf(v).append(pStatement);
    if (pCond) blockOf(v).appendBranch(pCond);
    return v;
  }
  static Assign* assign(Var& lhs, std::initializer_list<KvCCfgVariable*> used) {
    return new Assign(&lhs, reads(used));
  }
  // A call of `pCallee`, registered with it as a client registers its calls.
  static KvCCfgProcedureCall* call(KvCCfgProcedure* pCallee) {
    KvCCfgProcedureCall* pCall = new KvCCfgProcedureCall(pCallee->getName());
    pCallee->appendCall(pCall);
    return pCall;
  }
  KvCCfgProcedure* mainProcedure() {
    KvCCfgProcedure* pMain = procedure(KvCControlFlowGraph::kMainProcedureName);
    G.setStartNode(pMain->getEntryNode());
    return pMain;
  }
  KvCCfgAssignment* assignment(node v, int i) { return statement(v, i)->isAssignment(); }

  // "init a; u = a b; call P; a = return(a); x = param(x | y); if (c)", before renaming.
  std::string text(node v) {
    std::string joined;
    auto add = [&joined](const std::string& item) { joined += (joined.empty() ? "" : "; ") + item; };
    for (KvCCfgStatement* pStatement : blockOf(v).getStatementSeq()) add(text(*pStatement));
    if (KvCCfgExpression* pCond = condition(v)) add("if (" + names(pCond->getUsedVariables()) + ")");
    return joined;
  }

  // Declared in name order, so that address order, which orders every set of variables, is name
  // order too.
  Var a{"a"}, b{"b"}, c{"c"}, f{"f"}, g{"g"}, u{"u"}, w{"w"}, x{"x"}, y{"y"}, z{"z"};

private:
  static std::string names(const Variables& variables) {
    std::string text;
    for (KvCCfgVariable* pVariable : variables)
      text += (text.empty() ? "" : " ") + std::string(name(pVariable));
    return text;
  }
  static const char* name(KvCCfgVariable* pVariable) { return static_cast<Var*>(pVariable)->name(); }

  static std::string text(KvCCfgStatement& statement) {
    if (KvCCfgAssignment* pAssignment = statement.isAssignment()) {
      if (dynamic_cast<KvCCfgInitAssignment*>(pAssignment))
        return "init " + std::string(name(pAssignment->getLHS()));
      return std::string(name(pAssignment->getLHS())) + " = " +
             names(pAssignment->getRHS()->getUsedVariables());
    }
    if (KvCCfgParamStatement* pParam = statement.isParamStatement()) {
      std::string arguments;
      for (const auto& passed : pParam->getArguments())
        arguments += (arguments.empty() ? "" : " | ") + names(passed.second->getUsedVariables());
      return std::string(name(pParam->getVariable())) + " = param(" + arguments + ")";
    }
    if (KvCCfgValueReturnStatement* pReturn = statement.isValueReturnStatement())
      return std::string(name(pReturn->getVariable())) + " = return(" + names(pReturn->getUsedVariables()) +
             ")";
    if (KvCCfgProcedureCall* pCall = statement.isProcedureCall())
      return "call " + std::string(pCall->getName().cstring());
    return "?";
  }
};

}  // namespace ssatest
