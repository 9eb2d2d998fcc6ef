// The reference client's statements: assignments (of a variable or of one array element), calls of
// procedures of the graph with arguments, and calls of external functions by name. They keep the
// promises the library relies on: a call defines nothing by itself (its values come back through the
// variables the called procedure defines), and an element write a[i] = e reports a, i and what e
// reads as used through its right-hand side, since the other elements of a live on.
#pragma once

#include "ssaopt/client/expression.h"
#include "ssaopt/frame/containers.h"
#include "ssaopt/ir/statement.h"

class KvCCfgSFAssignment : public KvCCfgAssignment {
public:
  KvCCfgSFAssignment(KvCCfgVariable* pLHS, KvCCfgSFExpression* pRHS);

  KvCCfgSFAssignment* isSFAssignment() override { return this; }
  // A copy with a copy of the right-hand side.
  KvCCfgStatement* clone() const override;
  void foldConstants() override;
  // The same C text: the same original left-hand variable and the same right-hand side, SSA versions
  // read as their variables.
  bool generatesSameCode(KvCCfgStatement* pOther) const override;
  // Agrees to move before its branch while the client's hoisting step listens (hoisting.h), unless it
  // has a side effect: reading a volatile variable, or writing one. It asks for no statement to be
  // passed over.
  bool hoistOutOfIfElseBranch(bool& skipNext) override;
  // Called on the twin of a hoisted statement, which the hoisting step then drops, and by
  // KvCBasicBlock::del, which needs nothing of it.
  void remove() override;

  // The right-hand side as the client's expression; null only if someone set another kind.
  KvCCfgSFExpression* getSFRHS() const;
};

class KvCCfgSFProcedureCall : public KvCCfgProcedureCall {
public:
  // One argument per formal parameter of the called procedure, in order.
  using Arguments = ssaopt::array<KvCCfgSFExpression*>;

  KvCCfgSFProcedureCall(const BxCXString& name, Arguments arguments);

  KvCCfgSFProcedureCall* isSFProcedureCall() override { return this; }
  // A call of the same procedure with copies of the arguments. The copy is not registered with the
  // procedure and passes nothing to its parameter statements: whoever places it does that.
  KvCCfgStatement* clone() const override;
  // The same procedure with the same arguments, SSA versions read as their variables. Calls are never
  // hoisted all the same (the base hook refuses): what a procedure does is more than its text shows.
  bool generatesSameCode(KvCCfgStatement* pOther) const override;

  const Arguments& getArguments() const { return m_Arguments; }

private:
  Arguments m_Arguments;
};

// A call of a function outside the graph, which keeps its name for printing.
class KvCCfgSFExternCall : public KvCCfgExternCall {
public:
  KvCCfgSFExternCall(const BxCXString& name, const ssaopt::list<KvCCfgVariable*>& modifiable);

  BxCXString getName() const { return m_Name; }

private:
  BxCXString m_Name;
};

namespace ssaopt::client {

// The name of an external call: its own when the client made it, else empty.
BxCXString externCallName(KvCCfgExternCall& call);

}  // namespace ssaopt::client
