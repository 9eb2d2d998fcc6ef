// Minimal client classes for testing the program representation: a variable whose type, scaling and
// saturation the test chooses, an expression with fixed reads and values, and a statement with fixed
// definitions and uses that counts its removal and destruction.
#pragma once

#include <gtest/gtest.h>

#include <utility>
#include <vector>

#include "ssaopt/frame/report.h"
#include "ssaopt/frame/types.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "values/value_testing.h"

namespace irtest {

using Variables = ssaopt::set<KvCCfgVariable*>;

class TestVariable : public KvCCfgVariable {
public:
  explicit TestVariable(const KV_DataType* type = KV_DataType::float64(), const KV_Scaling* scaling = nullptr)
      : m_pType(type), m_pScaling(scaling) {}

  // Saturates both borders; an infinite limit leaves that border open.
  void saturate(double lower, double upper) {
    m_Lower = lower;
    m_Upper = upper;
  }

  const KV_DataType* getDataType() const override { return m_pType; }
  const KV_Scaling* getScaling() const override { return m_pScaling; }
  bool isUpperBorderSaturated() const override { return m_Upper != kOpen; }
  bool isLowerBorderSaturated() const override { return m_Lower != -kOpen; }
  double getUpperLimit() const override { return m_Upper; }
  double getLowerLimit() const override { return m_Lower; }
  bool isOutput() const override { return true; }

private:
  static constexpr double kOpen = 1e300;
  const KV_DataType* m_pType;
  const KV_Scaling* m_pScaling;
  double m_Lower = -kOpen, m_Upper = kOpen;
};

// Reads `used`; evaluates to `value`, with the range [minimum, maximum].
class TestExpression : public KvCCfgExpression {
public:
  explicit TestExpression(Variables used = {}, KvCCfgValue value = KvCCfgValue(), KvCCfgValue minimum = {},
                          KvCCfgValue maximum = {})
      : m_Used(std::move(used)), m_Value(value), m_Minimum(minimum), m_Maximum(maximum) {}

  Variables getUsedVariables() const override { return m_Used; }
  void replaceVariable(KvCCfgVariable*, KvCCfgVariable*) override {}
  void replaceConditionWithConstant(double) override {}
  KvCCfgValue evaluate() const override { return m_Value; }
  KvCCfgValue getMinimum() const override { return m_Minimum; }
  KvCCfgValue getMaximum() const override { return m_Maximum; }
  void replaceConstantVariables() override {}
  void replaceConstantCondition() override {}
  void foldConstants() override {}
  void actOnComparisonOutsideBoolRange() override {}

private:
  Variables m_Used;
  KvCCfgValue m_Value, m_Minimum, m_Maximum;
};

// What happened to a statement after the test handed it over.
struct Fate {
  int removed = 0;
  int destroyed = 0;
};

// Defines and uses fixed variables; clones into a new equal statement unless it is unclonable.
class TestStatement : public KvCCfgStatement {
public:
  explicit TestStatement(Variables defined = {}, Variables used = {}, Fate* pFate = nullptr,
                         bool clonable = true)
      : m_Defined(std::move(defined)), m_Used(std::move(used)), m_pFate(pFate), m_Clonable(clonable) {}
  ~TestStatement() override {
    if (m_pFate) ++m_pFate->destroyed;
  }

  void remove() override {
    if (m_pFate) ++m_pFate->removed;
  }
  KvCCfgStatement* clone() const override {
    return m_Clonable ? new TestStatement(m_Defined, m_Used) : nullptr;
  }
  Variables getDefinedVariables() const override { return m_Defined; }
  Variables getUsedVariables() const override { return m_Used; }

private:
  Variables m_Defined, m_Used;
  Fate* m_pFate;
  bool m_Clonable;
};

// Turns the internal consistency checks on for one scope.
struct InternalInfoOn {
  InternalInfoOn() { ssaopt::setShowInternalInfo(true); }
  ~InternalInfoOn() { ssaopt::setShowInternalInfo(false); }
};

// Blocks do not own their statements: a test deletes what it put in.
inline void deleteContents(const KvCBasicBlock& block) {
  for (KvCCfgStatement* pStatement : block.getStatementSeq()) delete pStatement;
  for (KvCPhiFunction* pPhi : block.getPhiFunctions()) delete pPhi;
}

template <class Container>
std::vector<typename Container::value_type> items(const Container& container) {
  return {container.begin(), container.end()};
}

}  // namespace irtest
