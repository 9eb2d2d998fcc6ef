// An expression over a set of variables, with no operator between them. The interface statements
// that link procedures use it: a parameter statement takes, per call, the variables the call passes,
// and a value-return statement takes the callee's variable at its exit. Renaming turns each member
// into the version that reaches the statement; constant propagation reads a single member's value.
#pragma once

#include "ssaopt/frame/containers.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/forward.h"

class KvCCfgVariableExpression : public KvCCfgExpression {
public:
  KvCCfgVariableExpression() = default;
  KvCCfgVariableExpression(const KvCCfgVariableExpression&) = default;
  KvCCfgVariableExpression& operator=(const KvCCfgVariableExpression&) = default;

  void addVariable(KvCCfgVariable* pVariable) { m_Variables.insert(pVariable); }

  ~KvCCfgVariableExpression() override = default;
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return m_Variables; }
  // `pNew` is a member afterwards even when `pOld` was not one.
  void replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) override;
  void replaceConditionWithConstant(double) override {}
  // The value of the only member; undetermined for none or several.
  KvCCfgValue evaluate() const override;
  // The least (greatest) of the members' values, taken in ascending member order.
  KvCCfgValue getMinimum() const override;
  KvCCfgValue getMaximum() const override;
  // Members are variables only: there is no constant to put in and nothing to fold.
  void replaceConstantVariables() override {}
  void replaceConstantCondition() override {}
  void foldConstants() override {}
  void actOnComparisonOutsideBoolRange() override {}
  KvCCfgVariableExpression* isVariableExpression() override { return this; }

private:
  ssaopt::list<KvCCfgValue*> memberValues() const;

  ssaopt::set<KvCCfgVariable*> m_Variables;
};
