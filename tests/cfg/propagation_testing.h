// Building blocks for the tests of constant propagation, dead-code elimination and substitution:
// programs already in SSA form and divided, one phi function, statement or condition per block, and
// an expression that computes from the values and ranges of what it reads and remembers what it was
// asked.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "cfg/ssa_testing.h"
#include "values/value_testing.h"

namespace sccptest {

using cfgtest::Nodes;
using ssaopt::edge;
using ssaopt::node;
using ssatest::Assign;
using ssatest::Var;

// `constant` plus the values of the variables it reads; its bounds are `constant` plus their bounds
// (their values for variables without a range). It keeps the values it computed and counts the
// substitution and folding requests. Its containers live in the test's pool, like the expression.
class Sum : public KvCCfgExpression {
public:
  explicit Sum(double constant, const std::vector<KvCCfgVariable*>& reads = {})
      : m_Constant(constant), m_Reads(reads.begin(), reads.end()) {}

  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return {m_Reads.begin(), m_Reads.end()}; }
  void replaceVariable(KvCCfgVariable*, KvCCfgVariable*) override {}
  void replaceConditionWithConstant(double) override {}
  KvCCfgValue evaluate() const override {
    KvCCfgValue sum = total([](KvCCfgVariable* pRead) { return pRead->getValue(); });
    m_Evaluated.push_back(sum);
    return sum;
  }
  KvCCfgValue getMinimum() const override {
    return total([](KvCCfgVariable* pRead) { return boundOr(pRead->getMinValue(), pRead); });
  }
  KvCCfgValue getMaximum() const override {
    return total([](KvCCfgVariable* pRead) { return boundOr(pRead->getMaxValue(), pRead); });
  }
  void replaceConstantVariables() override { ++m_Replaced; }
  void replaceConstantCondition() override { ++m_ConditionReplaced; }
  void foldConstants() override { ++m_Folded; }
  void actOnComparisonOutsideBoolRange() override {}

  // Every value evaluate() gave, in order.
  const ssaopt::array<KvCCfgValue>& evaluated() const { return m_Evaluated; }
  int replaced() const { return m_Replaced; }
  int conditionReplaced() const { return m_ConditionReplaced; }
  int folded() const { return m_Folded; }

private:
  static KvCCfgValue* boundOr(KvCCfgValue* pBound, KvCCfgVariable* pRead) {
    return pBound ? pBound : pRead->getValue();
  }
  template <class Of>
  KvCCfgValue total(Of of) const {
    KvCCfgValue sum(m_Constant);
    for (KvCCfgVariable* pRead : m_Reads) sum = sum + *of(pRead);
    return sum;
  }

  double m_Constant;
  ssaopt::array<KvCCfgVariable*> m_Reads;
  mutable ssaopt::array<KvCCfgValue> m_Evaluated;
  int m_Replaced = 0, m_ConditionReplaced = 0, m_Folded = 0;
};

// A client assignment that counts the requests to fold it.
class FoldableAssign : public Assign {
public:
  using Assign::Assign;
  void foldConstants() override { ++m_Folded; }
  int folded() const { return m_Folded; }

private:
  int m_Folded = 0;
};

inline KvCPhiFunction* phiFunction(KvCCfgVariable* pVariable, const std::vector<KvCCfgVariable*>& operands) {
  auto* pPhi = new KvCPhiFunction(pVariable, static_cast<int>(operands.size()));
  for (std::size_t i = 0; i < operands.size(); ++i)
    pPhi->setReplacementVariable(static_cast<int>(i), operands[i]);
  return pPhi;
}

class PropagationTest : public cfgtest::CfgTest {
protected:
  // A new SSA version of `variable`.
  static KvCSSAVariable* version(KvCCfgVariable& variable) { return new KvCSSAVariable(&variable); }
  static Sum* sum(double constant, std::vector<KvCCfgVariable*> reads = {}) {
    return new Sum(constant, reads);
  }

  // A block of "#main" (or `pProcedure`) holding one item.
  node assign(KvCCfgVariable* pLHS, KvCCfgExpression* pRHS, KvCCfgProcedure* pProcedure = nullptr) {
    return holding(new Assign(pLHS, pRHS), pProcedure);
  }
  node holding(KvCCfgStatement* pStatement, KvCCfgProcedure* pProcedure = nullptr) {
    node v = block(pProcedure ? pProcedure : pMain);
    blockOf(v).append(pStatement);
    return v;
  }
  node phi(KvCCfgVariable* pVariable, std::vector<KvCCfgVariable*> operands,
           KvCCfgProcedure* pProcedure = nullptr) {
    node v = block(pProcedure ? pProcedure : pMain);
    blockOf(v).append(phiFunction(pVariable, operands));
    return v;
  }
  node branch(KvCCfgExpression* pCond, KvCCfgProcedure* pProcedure = nullptr) {
    node v = block(pProcedure ? pProcedure : pMain);
    blockOf(v).appendBranch(pCond);
    return v;
  }
  node empty(KvCCfgProcedure* pProcedure = nullptr) { return block(pProcedure ? pProcedure : pMain); }

  // Plain edges from each node to the next; the first is entered from its procedure's entry when it
  // is the procedure's first block.
  void path(std::initializer_list<node> nodes) {
    node previous = ssaopt::nil;
    for (node v : nodes) {
      if (previous) plain(previous, v);
      previous = v;
    }
  }
  void run(KvCCfgProcedure* pProcedure, std::initializer_list<node> nodes) {
    startWith(pProcedure, *nodes.begin());
    path(nodes);
  }

  bool executable(edge e) { return G.inf(e)->isEdgeExecutable(); }
  bool visited(node v) { return KvCControlFlowGraphTestAccess::isVisited(G, v); }
  bool alive(node v) {
    for (node w : G.nodes())
      if (w == v) return true;
    return false;
  }
  int ssaEdgeCount() {
    int count = 0;
    for (edge e : G.edges()) count += G.inf(e)->isSSAEdge() != nullptr;
    return count;
  }

  KvCCfgProcedure* pMain = procedure(KvCControlFlowGraph::kMainProcedureName);
  Var a{"a"}, b{"b"}, c{"c"}, x{"x"}, y{"y"}, z{"z"};
};

// "5 in [0, 100]": a variable's value and range.
inline std::string valueText(const KvCCfgValue* pValue) {
  if (!pValue) return "none";
  if (pValue->isUndetermined()) return "?";
  if (pValue->isNonConstant()) return "*";
  std::string number = std::to_string(pValue->getValue());
  number.erase(number.find_last_not_of('0') + 1);
  if (number.back() == '.') number.pop_back();
  return number;
}

inline std::string rangeText(const KvCCfgVariable* pVariable) {
  return valueText(pVariable->getValue()) + " in [" + valueText(pVariable->getMinValue()) + ", " +
         valueText(pVariable->getMaxValue()) + "]";
}

}  // namespace sccptest
