// Building blocks for the tests of constant propagation, dead-code elimination and unused
// definitions: programs already in SSA form and divided, one phi function, statement or condition per
// block, and an expression that computes from the values and ranges of what it reads.
#pragma once

#include <gtest/gtest.h>

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
// (their values for variables without a range). Its containers live in the test's pool, like the
// expression.
class Sum : public KvCCfgExpression {
public:
  explicit Sum(double constant, const std::vector<KvCCfgVariable*>& reads = {})
      : m_Constant(constant), m_Reads(reads.begin(), reads.end()) {}

  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return {m_Reads.begin(), m_Reads.end()}; }
  void replaceVariable(KvCCfgVariable*, KvCCfgVariable*) override {}
  void replaceConditionWithConstant(double) override {}
  KvCCfgValue evaluate() const override {
    return total([](KvCCfgVariable* pRead) { return pRead->getValue(); });
  }
  KvCCfgValue getMinimum() const override {
    return total([](KvCCfgVariable* pRead) { return boundOr(pRead->getMinValue(), pRead); });
  }
  KvCCfgValue getMaximum() const override {
    return total([](KvCCfgVariable* pRead) { return boundOr(pRead->getMaxValue(), pRead); });
  }
  void replaceConstantVariables() override {}
  void replaceConstantCondition() override {}
  void foldConstants() override {}
  void actOnComparisonOutsideBoolRange() override {}

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
};

inline KvCPhiFunction* phiFunction(KvCCfgVariable* pVariable, const std::vector<KvCCfgVariable*>& operands) {
  auto* pPhi = new KvCPhiFunction(pVariable, static_cast<int>(operands.size()));
  for (std::size_t i = 0; i < operands.size(); ++i)
    pPhi->setReplacementVariable(static_cast<int>(i), operands[i]);
  return pPhi;
}

// The graphs are built in SSA form and divided by hand, and say so.
inline constexpr ssaopt::GraphState kBuiltInSSAForm{ssaopt::GraphFact::ExitsPlaced,
                                                    ssaopt::GraphFact::SSAForm, ssaopt::GraphFact::Divided};

class PropagationTest : public cfgtest::CfgTest {
protected:
  PropagationTest() { G.setState(kBuiltInSSAForm); }

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

  KvCCfgProcedure* pMain = procedure(KvCControlFlowGraph::kMainProcedureName);
  Var a{"a"}, b{"b"}, c{"c"}, x{"x"}, y{"y"}, z{"z"};
};

}  // namespace sccptest
