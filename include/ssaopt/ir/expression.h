// Expressions: right-hand sides, call arguments and branch conditions. The library does not know the
// operators of the generated code; it asks an expression through this interface for the variables it
// reads and for its lattice value and range, and tells it to rename, substitute and fold. Clients
// implement it for their expression trees; the library brings KvCCfgValueExpression, a fixed value.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/values/value.h"

class KvCCfgExpression {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgExpression();
  // An expression marked so is treated as non-constant whatever its operands.
  explicit KvCCfgExpression(bool evalToNonConst);
  // A copy keeps the index of its source.
  KvCCfgExpression(const KvCCfgExpression&) = default;
  KvCCfgExpression& operator=(const KvCCfgExpression&) = default;

  // Virtual operations, in slot order.
  virtual ~KvCCfgExpression() = default;
  virtual ssaopt::set<KvCCfgVariable*> getUsedVariables() const = 0;
  virtual void replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) = 0;
  virtual void replaceConditionWithConstant(double value) = 0;
  // From the current values of the variables read; non-constant when marked so.
  virtual KvCCfgValue evaluate() const = 0;
  virtual KvCCfgValue getMinimum() const = 0;
  virtual KvCCfgValue getMaximum() const = 0;
  virtual void replaceConstantVariables() = 0;
  virtual void replaceConstantCondition() = 0;
  virtual void foldConstants() = 0;
  // The variable when the expression is one variable, with `negated` set for its logical negation.
  virtual KvCCfgVariable* isVariable(bool& negated) const;
  // True, with the out-parameters set, when the expression compares one variable with one constant
  // for equality (or inequality); the base leaves them untouched.
  virtual bool isVariableEqualToConstant(KvCCfgVariable*& var, KvCCfgValue& value, bool& inequality) const;
  virtual bool hasSideEffects() const;
  virtual KvCCfgSFExpression* isSFExpression();
  // The library's own expression over a set of variables (an interface statement's), or null.
  virtual KvCCfgVariableExpression* isVariableExpression();
  // Notice that the expression compares a Boolean with a constant other than 0 and 1.
  virtual void actOnComparisonOutsideBoolRange() = 0;

  bool isMarkedAsEvalToNonConst() const { return m_EvalToNonConst; }
  std::uint32_t getIndex() const { return m_Index; }
  static void boot();

private:
  static std::uint32_t s_GlobIndexCnt;

  std::uint32_t m_Index;
  bool m_EvalToNonConst;
};

// A fixed lattice value: initial values, valid-condition values, undetermined loop conditions. Its
// range is its value.
class KvCCfgValueExpression : public KvCCfgExpression {
public:
  KvCCfgValueExpression() = default;
  explicit KvCCfgValueExpression(const KvCCfgValue& value) : m_Value(value) {}
  explicit KvCCfgValueExpression(bool evalToNonConst) : KvCCfgExpression(evalToNonConst) {}
  KvCCfgValueExpression(const KvCCfgValue& value, bool evalToNonConst)
      : KvCCfgExpression(evalToNonConst), m_Value(value) {}
  // A bare number would convert to bool and pick the non-constant mark; wrap it in a KvCCfgValue.
  template <class Number>
  explicit KvCCfgValueExpression(Number) = delete;
  KvCCfgValueExpression(const KvCCfgValueExpression&) = default;
  KvCCfgValueExpression& operator=(const KvCCfgValueExpression&) = default;

  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return {}; }
  // A fixed value reads no variable and has nothing to substitute or fold.
  void replaceVariable(KvCCfgVariable*, KvCCfgVariable*) override {}
  void replaceConditionWithConstant(double) override {}
  KvCCfgValue evaluate() const override;
  KvCCfgValue getMinimum() const override { return evaluate(); }
  KvCCfgValue getMaximum() const override { return evaluate(); }
  void replaceConstantVariables() override {}
  void replaceConstantCondition() override {}
  void foldConstants() override {}
  void actOnComparisonOutsideBoolRange() override {}

private:
  KvCCfgValue m_Value;
};
