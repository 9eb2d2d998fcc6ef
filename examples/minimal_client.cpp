// A complete front end against the installed headers alone, which docs/embedding.md walks through: its
// own variable, expression and assignment classes, a program of two procedures, the typical run, and
// the result in program order with the value or range of each definition. With `speed` an input
// between 0 and 50 and `command` saturated to -100..100 (both int16, scaled by 0.5), the program is
//
//   #main:            enabled = 1; if enabled: call limit(speed + 20) else: call limit(0)
//   limit(request):   command = request + 40.2
//
// `own-controller` installs a pool of its own; else the module's pool serves. The output is the same.
#include <ssaopt/ssaopt.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace {

using ssaopt::node;

// A variable of the generated code, scaled when `lsb` is not 0, initially 0 (as a C variable of static
// storage). Its name is a string literal.
class Variable : public KvCCfgVariable {
public:
  Variable(const char* name, const KV_DataType* pType, double lsb) : m_Name(name), m_pType(pType) {
    if (lsb != 0.0) m_Scaling.emplace(lsb, 0.0);
  }

  const KV_DataType* getDataType() const override { return m_pType; }
  const KV_Scaling* getScaling() const override { return m_Scaling ? &*m_Scaling : nullptr; }
  bool isUpperBorderSaturated() const override { return m_Limits.has_value(); }
  bool isLowerBorderSaturated() const override { return m_Limits.has_value(); }
  double getUpperLimit() const override { return m_Limits ? m_Limits->second : 0.0; }
  double getLowerLimit() const override { return m_Limits ? m_Limits->first : 0.0; }
  const KvCCfgValue* getInitValue() const override { return &m_InitValue; }
  bool isOutput() const override { return m_IsOutput; }
  const char* name() const { return m_Name; }
  void saturate(double lower, double upper) { m_Limits.emplace(lower, upper); }
  void markAsOutput() { m_IsOutput = true; }

private:
  const char* m_Name;
  const KV_DataType* m_pType;
  std::optional<KV_Scaling> m_Scaling;
  std::optional<std::pair<double, double>> m_Limits;
  KvCCfgValue m_InitValue{0.0};
  bool m_IsOutput = false;
};

std::string numberText(double value) {
  char text[32];
  std::snprintf(text, sizeof text, "%g", value);
  return text;
}

// An operand: a variable, or a constant where the variable is null.
struct Operand {
  KvCCfgVariable* pVariable;
  double constant;
};
Operand read(Variable& variable) { return {&variable, 0.0}; }
Operand number(double constant) { return {nullptr, constant}; }

enum class Op { Copy, Add };

// `a` or `a + b` (the `b` of a copy names no variable): three-address form, as a code generator
// lowers its expressions, so that no operation recurses.
class Expression : public KvCCfgExpression {
public:
  Expression(Op op, Operand a, Operand b = number(0.0)) : m_Op(op), m_Operands{a, b} {}

  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override {
    ssaopt::set<KvCCfgVariable*> used;
    for (const Operand& operand : m_Operands)
      if (operand.pVariable) used.insert(operand.pVariable);
    return used;
  }
  void replaceVariable(KvCCfgVariable* pOld, KvCCfgVariable* pNew) override {
    for (Operand& operand : m_Operands)
      if (operand.pVariable == pOld) operand.pVariable = pNew;
  }
  void replaceConditionWithConstant(double value) override { becomeConstant(value); }
  KvCCfgValue evaluate() const override {
    if (isMarkedAsEvalToNonConst()) return KvCCfgValue(eCfgNonConstant);
    KvCCfgValue a = valueOf(m_Operands[0]), b = valueOf(m_Operands[1]);
    return m_Op == Op::Add ? a + b : a;
  }
  KvCCfgValue getMinimum() const override { return bound(true); }
  KvCCfgValue getMaximum() const override { return bound(false); }
  void replaceConstantVariables() override {
    for (Operand& operand : m_Operands) {
      const KvCCfgValue* pValue = operand.pVariable ? operand.pVariable->getValue() : nullptr;
      if (pValue && pValue->isConstant() && !operand.pVariable->isVolatile())
        operand = number(pValue->getValue());
    }
  }
  void replaceConstantCondition() override {
    if (evaluate().isConstant() && !hasSideEffects()) becomeConstant(evaluate().getValue());
  }
  void foldConstants() override {
    if (getUsedVariables().empty() && evaluate().isConstant()) becomeConstant(evaluate().getValue());
  }
  // Reading a volatile input is an effect: such code is neither removed nor moved.
  bool hasSideEffects() const override {
    for (KvCCfgVariable* pVariable : getUsedVariables())
      if (pVariable->isVolatile()) return true;
    return false;
  }
  void actOnComparisonOutsideBoolRange() override {}

  std::string text(std::string (*nameOf)(KvCCfgVariable*)) const {
    auto side = [&](const Operand& o) { return o.pVariable ? nameOf(o.pVariable) : numberText(o.constant); };
    return m_Op == Op::Copy ? side(m_Operands[0]) : side(m_Operands[0]) + " + " + side(m_Operands[1]);
  }

private:
  void becomeConstant(double value) {
    m_Op = Op::Copy;
    m_Operands[0] = m_Operands[1] = number(value);
  }
  static KvCCfgValue valueOf(const Operand& operand) {
    if (!operand.pVariable) return KvCCfgValue(operand.constant);
    const KvCCfgValue* pValue = operand.pVariable->getValue();
    return pValue ? *pValue : KvCCfgValue(eCfgNonConstant);
  }
  // The operand's propagated range where it has one, else its saturation limit.
  static KvCCfgValue boundOf(const Operand& operand, bool lower) {
    KvCCfgVariable* pVariable = operand.pVariable;
    if (!pVariable) return KvCCfgValue(operand.constant);
    const KvCCfgValue* pBound = lower ? pVariable->getMinValue() : pVariable->getMaxValue();
    if (pBound && pBound->isConstant()) return *pBound;
    if (lower ? pVariable->isLowerBorderSaturated() : pVariable->isUpperBorderSaturated())
      return KvCCfgValue(lower ? pVariable->getLowerLimit() : pVariable->getUpperLimit());
    return pBound ? *pBound : KvCCfgValue(eCfgNonConstant);
  }
  // Interval arithmetic: the bounds of a sum are the sums of its operands' bounds.
  KvCCfgValue bound(bool lower) const {
    if (isMarkedAsEvalToNonConst()) return KvCCfgValue(eCfgNonConstant);
    KvCCfgValue a = boundOf(m_Operands[0], lower);
    return m_Op == Op::Add ? a + boundOf(m_Operands[1], lower) : a;
  }

  Op m_Op;
  Operand m_Operands[2];
};

// LHS := RHS. A block owns its statements, and the pool may release them without running their
// destructors: an assignment holds nothing but the two pointers of its base.
class Assignment : public KvCCfgAssignment {
public:
  Assignment(Variable& lhs, Expression* pRHS) {
    setLHS(&lhs);
    setRHS(pRHS);
  }
  // Only KvCBasicBlock::clone clones a statement, and neither the library's steps nor this front end call it.
  KvCCfgStatement* clone() const override { return nullptr; }
  void foldConstants() override { getRHS()->foldConstants(); }
};

// What the front end owns; the graph, declared last, goes first, as it points to the rest.
struct Program {
  Program() {
    speed.saturate(0.0, 50.0);
    speed.markAsVolatile();
    enabled.markAsErasable();
    command.saturate(-100.0, 100.0);
    command.markAsOutput();
  }

  Variable speed{"speed", KV_DataType::int16(), 0.5}, enabled{"enabled", KV_DataType::boolean(), 0.0};
  Variable request{"request", KV_DataType::int16(), 0.5}, command{"command", KV_DataType::int16(), 0.5};
  Expression one{Op::Copy, number(1.0)}, isEnabled{Op::Copy, read(enabled)};
  Expression sum{Op::Add, read(request), number(40.2)};
  Expression fastArgument{Op::Add, read(speed), number(20.0)}, idleArgument{Op::Copy, number(0.0)};
  KvCControlFlowGraph graph;
};

node newBlock(KvCControlFlowGraph& graph, KvCCfgProcedure* pProcedure,
              std::initializer_list<KvCCfgStatement*> statements, KvCCfgExpression* pCondition = nullptr) {
  auto* pBlock = new KvCBasicBlock();
  pBlock->setProcedure(pProcedure);
  for (KvCCfgStatement* pStatement : statements) pBlock->append(pStatement);
  pBlock->appendBranch(pCondition);
  return graph.new_node(pBlock);
}

void build(Program& p) {
  KvCControlFlowGraph& g = p.graph;
  // Every procedure's entry first, so that calls find the procedure they name.
  KvCCfgProcedure *pLimit = nullptr, *pMain = nullptr;
  node limitEntry = g.demandProcedureEntryNode("limit", pLimit);
  node mainEntry = g.demandProcedureEntryNode(KvCControlFlowGraph::kMainProcedureName, pMain);

  node limitBody = newBlock(g, pLimit, {new Assignment(p.command, &p.sum)});
  g.new_edge(limitEntry, limitBody, new KvCCfgEdgeInfo());

  // A call stands alone in its block, with one successor.
  auto* pFast = new KvCCfgProcedureCall("limit");
  auto* pIdle = new KvCCfgProcedureCall("limit");
  node decide = newBlock(g, pMain, {new Assignment(p.enabled, &p.one)}, &p.isEnabled);
  node fast = newBlock(g, pMain, {pFast}), idle = newBlock(g, pMain, {pIdle}), join = newBlock(g, pMain, {});
  g.new_edge(mainEntry, decide, new KvCCfgEdgeInfo());
  g.new_edge(decide, fast, new KvCCfgTrueBranch());
  g.new_edge(decide, idle, new KvCCfgFalseBranch());
  g.new_edge(fast, join, new KvCCfgEdgeInfo());
  g.new_edge(idle, join, new KvCCfgEdgeInfo());
  for (auto [pCall, pArgument] : {std::pair(pFast, &p.fastArgument), std::pair(pIdle, &p.idleArgument)}) {
    ssaopt::list<KvCCfgVariable*> formals{&p.request};
    ssaopt::list<KvCCfgExpression*> arguments{pArgument};
    g.setParametersOfCall(pCall, formals, arguments);
  }

  g.placeExitNodes();
  g.placeLoopAroundMain();
  g.setStartNode(mainEntry);
}

// Every variable that is not an SSA version is one of the front end's. A version is named by its
// variable and its index: command.57.
std::string nameOf(KvCCfgVariable* pVariable) {
  KvCSSAVariable* pVersion = pVariable->isSSAVariable();
  std::string name = static_cast<Variable*>(pVersion ? pVersion->getOrigVar() : pVariable)->name();
  return pVersion ? name + "." + std::to_string(pVersion->getIndex()) : name;
}

// The library's own expressions (initial values, the loop condition) are not the front end's.
std::string textOf(KvCCfgExpression* pExpression) {
  if (auto* pMine = dynamic_cast<Expression*>(pExpression)) return pMine->text(nameOf);
  KvCCfgValue value = pExpression->evaluate();
  return value.isConstant() ? numberText(value.getValue()) : "?";
}

std::string textOf(KvCCfgStatement& statement) {
  if (auto* p = statement.isAssignment()) return nameOf(p->getLHS()) + " = " + textOf(p->getRHS());
  if (auto* p = statement.isProcedureCall()) return std::string("call ") + p->getName().cstring();
  if (auto* p = statement.isParamStatement()) return nameOf(p->getVariable()) + " = parameter";
  if (auto* p = statement.isValueReturnStatement()) return nameOf(p->getVariable()) + " = returned";
  if (auto* p = statement.isOutputStatement()) return "output " + nameOf(p->getVariable());
  return "?";
}

// What a statement does, with the value or range of the version it defines.
void printLine(const std::string& text, const ssaopt::set<KvCCfgVariable*>& defined) {
  KvCCfgVariable* pDefined = defined.empty() ? nullptr : *defined.begin();
  const KvCCfgValue* pValue = pDefined ? pDefined->getValue() : nullptr;
  const KvCCfgValue* pMin = pDefined ? pDefined->getMinValue() : nullptr;
  const KvCCfgValue* pMax = pDefined ? pDefined->getMaxValue() : nullptr;
  std::string result;
  if (pValue && pValue->isConstant())
    result = "  // value " + numberText(pValue->getValue());
  else if (pMin && pMax && pMin->isConstant() && pMax->isConstant())
    result = "  // range " + numberText(pMin->getValue()) + " .. " + numberText(pMax->getValue());
  std::printf("  %s%s\n", text.c_str(), result.c_str());
}

// The blocks in program order; one that does nothing any more prints nothing.
void printProgram(const KvCControlFlowGraph& graph) {
  for (const ssaopt::ProcedureBlocks& procedure : graph.getProgramOrder()) {
    std::printf("procedure %s\n", procedure.pProcedure->getName().cstring());
    for (node v : procedure.blocks) {
      KvCBasicBlock& block = *graph.getBasicBlock(v);
      for (KvCPhiFunction* pPhi : block.getPhiFunctions()) {
        std::string operands;
        for (KvCCfgVariable* pOperand : pPhi->getReplacementVariables()) operands += " " + nameOf(pOperand);
        printLine(nameOf(pPhi->getVariable()) + " = phi" + operands, pPhi->getDefinedVariables());
      }
      for (KvCCfgStatement* pStatement : block.getStatementSeq())
        printLine(textOf(*pStatement), pStatement->getDefinedVariables());
      if (KvCCfgExpression* pCondition = block.getBranchCond()) printLine("if " + textOf(pCondition), {});
    }
  }
}

bool buildTransformAndPrint() {
  Program program;
  build(program);
  bool ran = ssaopt::runTypicalRun(program.graph);
  bool sound = program.graph.verify();
  printProgram(program.graph);
  return ran && sound;
}

}  // namespace

int main(int argc, char** argv) {
  // A pool of the host's own, installed before the first library object and removed after the last.
  std::unique_ptr<ssaopt::PoolMemController> pPool;
  if (argc > 1 && std::strcmp(argv[1], "own-controller") == 0) pPool.reset(new ssaopt::PoolMemController);
  ssaopt::PoolMemController::Scope usePool(pPool.get());
  ssaopt::setShowInternalInfo(true);  // consistency checks in every step, as in a front end's tests
  KvCSSAControl control;
  control.boot();
  bool ok = buildTransformAndPrint();
  control.shutdown();
  return ok ? 0 : 1;
}
