// Statements: the instructions of a basic block. Every statement tells which variables it defines and
// which it uses; type queries tell its kind. Clients derive their own assignments and calls from
// these classes; the library supplies the statements it creates itself (initialisations, phi
// functions and the interface statements between procedures).
//
// Statements hold plain pointers to variables and expressions and delete neither; a statement belongs
// to the block that holds it, and KvCBasicBlock::del deletes it.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/string.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/values/value.h"

class KvCCfgStatement {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgStatement();
  // A copy keeps the index of its source.
  KvCCfgStatement(const KvCCfgStatement&) = default;
  KvCCfgStatement& operator=(const KvCCfgStatement&) = default;

  // Virtual operations, in slot order. Each type query gives the statement as that class, or null.
  virtual ~KvCCfgStatement() = default;
  virtual KvCCfgAssignment* isAssignment() { return nullptr; }
  virtual KvCCfgSFAssignment* isSFAssignment() { return nullptr; }
  virtual KvCCfgProcedureCall* isProcedureCall() { return nullptr; }
  virtual KvCCfgSFProcedureCall* isSFProcedureCall() { return nullptr; }
  virtual KvCCfgParamStatement* isParamStatement() { return nullptr; }
  virtual KvCCfgValueReturnStatement* isValueReturnStatement() { return nullptr; }
  virtual KvCCfgOutputStatement* isOutputStatement() { return nullptr; }
  virtual KvCCfgExternCall* isExternCall() { return nullptr; }
  virtual KvCPhiFunction* isPhiFunction() { return nullptr; }
  // Called by KvCBasicBlock::del just before the statement is deleted.
  virtual void remove() {}
  // Hooks of code hoisting; both refuse unless a client statement agrees.
  virtual bool hoistOutOfIfElseBranch(bool& flag);
  virtual bool hasSideEffects() const { return false; }
  virtual bool generatesSameCode(KvCCfgStatement* /*other*/) const { return false; }
  // A new, independent statement. Of the library's own statements only phi functions clone; the
  // others give null.
  virtual KvCCfgStatement* clone() const = 0;
  virtual ssaopt::set<KvCCfgVariable*> getDefinedVariables() const = 0;
  virtual ssaopt::set<KvCCfgVariable*> getUsedVariables() const = 0;

  // Virtual assignments record what a branch condition implies; they generate no code.
  bool getIsVirtual() const { return m_IsVirtual; }
  void setIsVirtual(bool isVirtual) { m_IsVirtual = isVirtual; }
  std::uint32_t getIndex() const { return m_Index; }
  static void boot();

private:
  static std::uint32_t s_GlobIndexCnt;

  std::uint32_t m_Index;
  bool m_IsVirtual = false;
};

// LHS := RHS. Client assignments keep their sides here, where renaming and the optimisations find
// them.
class KvCCfgAssignment : public KvCCfgStatement {
public:
  KvCCfgAssignment* isAssignment() override { return this; }
  bool hasSideEffects() const override;
  // {LHS}, or nothing while it is null.
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override;
  // What the right-hand side reads; the left-hand variable is not among them.
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;
  virtual void foldConstants() = 0;

  KvCCfgVariable* getLHS() const { return m_pLHS; }
  void setLHS(KvCCfgVariable* pLHS) { m_pLHS = pLHS; }
  KvCCfgExpression* getRHS() const { return m_pRHS; }
  void setRHS(KvCCfgExpression* pRHS) { m_pRHS = pRHS; }

private:
  KvCCfgVariable* m_pLHS = nullptr;
  KvCCfgExpression* m_pRHS = nullptr;
};

// Assignment of a variable's initial value.
class KvCCfgInitAssignment : public KvCCfgAssignment {
public:
  KvCCfgStatement* clone() const override { return nullptr; }
  void foldConstants() override {}
};

// Call of a procedure of the graph, which it names; nothing else links a call to its procedure. What
// a call defines and uses comes from the called procedure's record, so this class reports nothing.
class KvCCfgProcedureCall : public KvCCfgStatement {
public:
  KvCCfgProcedureCall() = default;
  explicit KvCCfgProcedureCall(const BxCXString& name) : m_Name(name) {}

  KvCCfgProcedureCall* isProcedureCall() override { return this; }
  KvCCfgStatement* clone() const override { return nullptr; }
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {}; }
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return {}; }
  virtual ssaopt::set<KvCCfgVariable*> getVarsDefinedByFctReturn() const { return {}; }

  BxCXString getName() const { return m_Name; }
  void setName(const BxCXString& name) { m_Name = name; }

private:
  BxCXString m_Name;
};

// Call of a function outside the graph. It defines nothing as far as the library is concerned: the
// variables it may change are kept for the client only.
class KvCCfgExternCall : public KvCCfgStatement {
public:
  // Copies the list; a null list gives none.
  explicit KvCCfgExternCall(const ssaopt::list<KvCCfgVariable*>* pList);

  KvCCfgExternCall* isExternCall() override { return this; }
  KvCCfgStatement* clone() const override { return nullptr; }
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {}; }
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return m_UsedVariables; }

  ssaopt::list<KvCCfgVariable*> getModifiableVariables() const { return m_ModifiableVariables; }
  void appendUsedVariable(KvCCfgVariable* v) { m_UsedVariables.insert(v); }
  // Renaming: `pNew` is used in place of `pOld`, and in any case from now on.
  void replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew);

private:
  ssaopt::list<KvCCfgVariable*> m_ModifiableVariables;
  ssaopt::set<KvCCfgVariable*> m_UsedVariables;
};

// v := phi(operand 0, ..., operand n-1) on entry to a block; operand i belongs to the block's i-th
// control-flow in-edge, so the dimension n follows the block's in-degree.
class KvCPhiFunction : public KvCCfgStatement {
public:
  KvCPhiFunction(KvCCfgVariable* pVariable, int dimension);

  KvCPhiFunction* isPhiFunction() override { return this; }
  // Same variable and dimension, no operands yet, a new index.
  KvCPhiFunction* clone() const override;
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {m_pVariable}; }
  // The operands; each should be set by now (renaming sets them). Unset ones are reported and left
  // out, so that no caller meets a null variable.
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;

  KvCCfgVariable* getVariable() const { return m_pVariable; }
  void setVariable(KvCCfgVariable* pVariable) { m_pVariable = pVariable; }
  int getDimension() const { return static_cast<int>(m_pReplacementVariable.size()); }
  // An index outside 0..dimension-1 is reported and writes nothing.
  void setReplacementVariable(int i, KvCCfgVariable* v);
  ssaopt::array<KvCCfgVariable*> getReplacementVariables() const { return m_pReplacementVariable; }
  // Removes operand i, keeping the order of the others, when in-edge i of the block goes. An index
  // outside the operands is reported and changes nothing.
  void delReplacement(int i);

private:
  bool isOperandIndex(int i) const { return i >= 0 && i < getDimension(); }

  KvCCfgVariable* m_pVariable;
  ssaopt::array<KvCCfgVariable*> m_pReplacementVariable;
};

// Defines a formal parameter of a procedure from the argument that each call passes for it.
class KvCCfgParamStatement : public KvCCfgStatement {
public:
  using Arguments = ssaopt::map<KvCCfgProcedureCall*, KvCCfgExpression*>;

  explicit KvCCfgParamStatement(KvCCfgVariable* pFormal) : m_pVariable(pFormal) {}

  KvCCfgParamStatement* isParamStatement() override { return this; }
  KvCCfgStatement* clone() const override { return nullptr; }
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {m_pVariable}; }
  // What all arguments read.
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;
  // A call evaluates the arguments it passes: when one has side effects (reads a volatile input), so
  // has the statement, which must then stay even when nothing reads the formal.
  bool hasSideEffects() const override;

  KvCCfgVariable* getVariable() const { return m_pVariable; }
  void setVariable(KvCCfgVariable* pVariable) { m_pVariable = pVariable; }
  // A later argument for the same call replaces the earlier one.
  void setArgument(KvCCfgProcedureCall* pCall, KvCCfgExpression* pArg) { m_Arguments[pCall] = pArg; }
  // Forgets the argument of a call that no longer exists; the key is only compared, never read.
  void removeArgument(KvCCfgProcedureCall* pCall) { m_Arguments.undefine(pCall); }
  // The argument that `pCall` passes, or null when it passes none; adds no entry.
  KvCCfgExpression* getArgument(KvCCfgProcedureCall* pCall) const;
  // Every argument in the order the calls were first given one. Entries may hold null.
  const Arguments& getArguments() const { return m_Arguments; }

  // The meet, the least minimum and the greatest maximum over the arguments that are there; with no
  // argument, undetermined.
  KvCCfgValue evaluate() const;
  KvCCfgValue getMinimum() const;
  KvCCfgValue getMaximum() const;
  // The same over what the formal holds once the statement ran for each call, which constant
  // propagation records: an argument stored as an assignment stores it (its value adjusted, its range
  // fitted to the formal), except that a variable expression of the formal's own variable passes on a
  // value the variable already holds and stores nothing. Adjusting the meet of such a value again is
  // wrong where storing is not idempotent: a uint16 saturated at 20 holds 65534 after storing -2,
  // which a second store saturates to 20.
  KvCCfgValue evaluateHeld() const;
  KvCCfgValue getHeldMinimum() const;
  KvCCfgValue getHeldMaximum() const;

private:
  KvCCfgVariable* m_pVariable;
  Arguments m_Arguments;
};

// After a call: takes back the value of a variable that the called procedure defines.
class KvCCfgValueReturnStatement : public KvCCfgStatement {
public:
  explicit KvCCfgValueReturnStatement(KvCCfgVariable* pVariable) : m_pVariable(pVariable) {}

  KvCCfgValueReturnStatement* isValueReturnStatement() override { return this; }
  KvCCfgStatement* clone() const override { return nullptr; }
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {m_pVariable}; }
  // What the expression reads; nothing while it is not set.
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;

  KvCCfgVariable* getVariable() const { return m_pVariable; }
  void setVariable(KvCCfgVariable* pVariable) { m_pVariable = pVariable; }
  KvCCfgExpression* getExpression() const { return m_pExpression; }
  void setExpression(KvCCfgExpression* pExpression) { m_pExpression = pExpression; }

private:
  KvCCfgVariable* m_pVariable;
  KvCCfgExpression* m_pExpression = nullptr;
};

// Reads an output variable before the end of the main procedure, so that its last definition stays
// alive.
class KvCCfgOutputStatement : public KvCCfgStatement {
public:
  explicit KvCCfgOutputStatement(KvCCfgVariable* pVariable) : m_pVariable(pVariable) {}

  KvCCfgOutputStatement* isOutputStatement() override { return this; }
  KvCCfgStatement* clone() const override { return nullptr; }
  ssaopt::set<KvCCfgVariable*> getDefinedVariables() const override { return {}; }
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override { return {m_pVariable}; }

  KvCCfgVariable* getVariable() const { return m_pVariable; }
  void setVariable(KvCCfgVariable* pVariable) { m_pVariable = pVariable; }

private:
  KvCCfgVariable* m_pVariable;
};

// Containers of statements order them by address: -1, 0 or +1.
int compare(KvCCfgStatement* const& a, KvCCfgStatement* const& b);
// Equality only (0 when equal, else 1), for searching lists of phi functions.
int compare(KvCPhiFunction* const& a, KvCPhiFunction* const& b);
