// The reference client's expression: literals, variables, array elements and the operators of the
// value arithmetic, held as terms in postfix order (operands before their operator). Every operation
// is one pass over the terms with an explicit stack, so neither deep nor long expressions recurse.
//
// Expressions are made by an ExpressionStore, which owns them: statements of the library and of the
// client only point to expressions, and the graph deletes none, so one owner outlives them all.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "ssaopt/client/diagnostics.h"
#include "ssaopt/client/operators.h"
#include "ssaopt/frame/containers.h"
#include "ssaopt/ir/expression.h"

namespace ssaopt::client {
class ExpressionStore;
}

class KvCCfgSFExpression : public KvCCfgExpression {
public:
  struct Term {
    ssaopt::client::TermOp op;
    double number = 0.0;                  // of a Literal
    KvCCfgVariable* pVariable = nullptr;  // of a Variable, ElementRead or ElementWrite
  };
  using Terms = ssaopt::array<Term>;

  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;
  void replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) override;
  void replaceConditionWithConstant(double value) override;
  // Computed as the value arithmetic computes, from the current values of the variables read. An
  // array element is never constant.
  KvCCfgValue evaluate() const override;
  // Sound bounds: exact intervals for + - * / (a divisor not straddling 0), negation, abs and sgn,
  // 0 and 1 for truth values, the declared bounds of variables whose range is unknown; non-constant
  // where no bound is known.
  KvCCfgValue getMinimum() const override;
  KvCCfgValue getMaximum() const override;
  // The minimum and maximum of the sub-expression that each term ends, by the same rules; a front end
  // reads them to leave out checks that the values cannot fail. Once propagation has `settled`, a
  // bound it left undetermined (code it never reached, a loop it left open) is not known, and the
  // declared bounds hold.
  using Bounds = std::pair<KvCCfgValue, KvCCfgValue>;
  std::vector<Bounds> getTermBounds(bool settled) const;
  // Reads of variables whose current value is constant become that constant.
  void replaceConstantVariables() override;
  // A condition whose value is constant, and that has no side effect to keep, becomes that constant.
  void replaceConstantCondition() override;
  // Sub-expressions that the value arithmetic decides without the variables they read (all-literal
  // ones, and those such as 0 * x) become literals, unless they read a volatile variable.
  void foldConstants() override;
  // The terms that foldConstants leaves, without changing the expression; setTerms puts them in.
  Terms foldedTerms() const;
  void setTerms(Terms terms) { m_Terms = std::move(terms); }
  // x, or !x with `negated` set.
  KvCCfgVariable* isVariable(bool& negated) const override;
  // x == c, c == x, x != c or c != x.
  bool isVariableEqualToConstant(KvCCfgVariable*& var, KvCCfgValue& value, bool& inequality) const override;
  // Reading (or writing an element of) a volatile variable.
  bool hasSideEffects() const override;
  KvCCfgSFExpression* isSFExpression() override { return this; }
  // Records a notice, for the tool to show, that the comparison's outcome is fixed.
  void actOnComparisonOutsideBoolRange() override;

  const Terms& getTerms() const { return m_Terms; }
  // A new expression with the same terms, owned by the same store.
  KvCCfgSFExpression* clone() const;
  // Would be emitted as the same C text and computes the same value: the same terms, reading the same
  // SSA versions (as hoisting will leave them, see versionReadAfterHoisting).
  bool generatesSameCodeAs(const KvCCfgSFExpression& other) const;
  // The element write a[i] = e, whose last term names the array.
  bool isElementWrite() const;
  // The number of the literal that the terms of an expression store, as a whole or as the value of an
  // element write; null where they store anything else.
  static double* storedLiteral(Terms& terms);

private:
  friend class ssaopt::client::ExpressionStore;
  KvCCfgSFExpression(Terms terms, ssaopt::client::SourcePos pos, ssaopt::client::ExpressionStore* pStore);

  KvCCfgValue bound(bool lower) const;

  Terms m_Terms;
  ssaopt::client::SourcePos m_Pos;
  ssaopt::client::ExpressionStore* m_pStore;
};

namespace ssaopt::client {

// Something the client noticed about the program while the library transformed it.
struct Notice {
  SourcePos pos;
  std::string message;
};

class ExpressionStore {
public:
  ExpressionStore() = default;
  ~ExpressionStore();
  ExpressionStore(const ExpressionStore&) = delete;
  ExpressionStore& operator=(const ExpressionStore&) = delete;

  // A new expression over `terms`, which must form one complete postfix expression.
  KvCCfgSFExpression* make(KvCCfgSFExpression::Terms terms, SourcePos pos);
  std::size_t size() const { return m_Expressions.size(); }

  void note(SourcePos pos, std::string message);
  const std::vector<Notice>& notices() const { return m_Notices; }

private:
  std::vector<std::unique_ptr<KvCCfgSFExpression>> m_Expressions;
  std::vector<Notice> m_Notices;
};

}  // namespace ssaopt::client
