// Lowers a program's graph into the interpreter's code: variables into slots of one memory (SSA
// versions into the slot of their variable), statements into operations, each node's control-flow
// out-edges into its successors. What cannot be run becomes a fault where it stands, so that only a
// run that gets there fails.
#include <algorithm>
#include <stdexcept>

#include "interpreter_code.h"
#include "program_view.h"
#include "ssaopt/client/statements.h"
#include "ssaopt/client/variable.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable_expression.h"

namespace ssaopt::client::detail {

namespace {

using ssaopt::edge;
using ssaopt::node;

// Something of the graph that the interpreter cannot run.
class Unrunnable : public std::runtime_error {
public:
  using std::runtime_error::runtime_error;
};

std::string variableName(KvCCfgVariable* pVariable) {
  KvCCfgSFVariable* pNamed = originalOf(pVariable)->isSFVariable();
  return pNamed ? "'" + pNamed->getName() + "'" : "a variable of no program";
}

class Lowering {
public:
  explicit Lowering(const Program& program) : m_Program(program), m_Graph(program.graph()) {}

  ProgramCode lower() {
    allocateSlots();
    m_Code.argumentsAtCalls = !isInSSAForm(m_Graph);
    m_Code.nodes.resize(static_cast<std::size_t>(m_Graph.max_node_index() + 1));
    for (node v : m_Graph.nodes()) m_Code.nodes[v.index()] = lowerNode(v);
    m_Code.start = startNode();
    return std::move(m_Code);
  }

private:
  // ---- Variables ---------------------------------------------------------------------------------

  void allocateSlots() {
    for (const std::unique_ptr<KvCCfgSFVariable>& pVariable : m_Program.variables()) {
      bool isArray = pVariable->isArray();
      Slot slot{pVariable.get(), m_Code.initialMemory.size(), isArray ? pVariable->getArrayLength() : 1,
                isArray, pVariable->isVolatile()};
      double initial = storedValue(*pVariable, pVariable->getInitValue()->getValue());
      m_Code.initialMemory.insert(m_Code.initialMemory.end(), slot.length, initial);
      std::uint32_t index = static_cast<std::uint32_t>(m_Code.slots.size());
      if (pVariable->isOutput()) m_Code.outputs.push_back(index);
      m_SlotOf.emplace(pVariable.get(), index);
      m_Code.slots.push_back(slot);
    }
  }

  std::uint32_t slotOf(KvCCfgVariable* pVariable) const {
    auto found = m_SlotOf.find(originalOf(pVariable));
    if (found == m_SlotOf.end()) throw Unrunnable("reads or writes " + variableName(pVariable));
    return found->second;
  }

  // ---- Expressions -------------------------------------------------------------------------------

  Code lowerExpression(KvCCfgExpression* pExpression) const {
    if (!pExpression) throw Unrunnable("an expression is missing");
    if (KvCCfgSFExpression* pTerms = pExpression->isSFExpression()) return lowerTerms(*pTerms);
    if (KvCCfgVariableExpression* pMembers = pExpression->isVariableExpression())
      return lowerMember(*pMembers);
    KvCCfgValue value = pExpression->evaluate();
    if (!dynamic_cast<KvCCfgValueExpression*>(pExpression) || !value.isConstant())
      throw Unrunnable("an expression has no value");
    return {Term{TermOp::Literal, value.getValue(), 0}};
  }

  Code lowerTerms(const KvCCfgSFExpression& expression) const {
    if (expression.getTerms().empty()) throw Unrunnable("an expression without terms");
    Code code;
    code.reserve(expression.getTerms().size());
    for (const KvCCfgSFExpression::Term& term : expression.getTerms()) {
      std::uint32_t slot = namesVariable(term.op) ? slotOf(term.pVariable) : 0;
      if (namesVariable(term.op) && m_Code.slots[slot].isArray != (term.op != TermOp::Variable))
        throw Unrunnable("uses " + variableName(term.pVariable) +
                         (m_Code.slots[slot].isArray ? " without" : " with") + " an index");
      code.push_back(Term{term.op, term.number, slot});
    }
    return code;
  }

  // The argument of an interface statement: one variable.
  Code lowerMember(const KvCCfgVariableExpression& expression) const {
    ssaopt::set<KvCCfgVariable*> members = expression.getUsedVariables();
    if (members.size() != 1)
      throw Unrunnable("a variable expression holds " + std::to_string(members.size()) + " variables");
    std::uint32_t slot = slotOf(*members.begin());
    if (m_Code.slots[slot].isArray)
      throw Unrunnable("passes the whole array " + variableName(*members.begin()));
    return {Term{TermOp::Variable, 0.0, slot}};
  }

  // The summaries' parameter statements pass each variable to itself: `formal` keeps its value.
  bool passesItself(std::uint32_t formal, KvCCfgExpression* pArgument) const {
    KvCCfgVariableExpression* pMembers = pArgument ? pArgument->isVariableExpression() : nullptr;
    if (!pMembers) return false;
    ssaopt::set<KvCCfgVariable*> members = pMembers->getUsedVariables();
    return members.size() == 1 && slotOf(*members.begin()) == formal;
  }

  // ---- Statements --------------------------------------------------------------------------------

  void lowerStatements(const KvCBasicBlock& block, NodeCode& code) const {
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) lowerInto(code, *pPhi);
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      if (!pStatement->isOutputStatement()) lowerInto(code, *pStatement);
  }

  void lowerInto(NodeCode& code, KvCCfgStatement& statement) const {
    try {
      Op op = lowerStatement(statement);
      const DefineOp* pDefinition = std::get_if<DefineOp>(&op);
      if (!pDefinition || pDefinition->pVersion) code.ops.push_back(std::move(op));
    } catch (const Unrunnable& problem) {
      code.ops.push_back(FaultOp{code.name + ": " + problem.what()});
    }
  }

  // Phi functions, value-return statements and virtual assignments generate no code: every version
  // already stands in its variable's slot.
  static bool computesNothing(KvCCfgStatement& statement) {
    return statement.getIsVirtual() || statement.isPhiFunction() || statement.isValueReturnStatement();
  }

  Op lowerStatement(KvCCfgStatement& statement) const {
    if (computesNothing(statement)) return lowerDefinition(statement);
    if (KvCCfgParamStatement* pParam = statement.isParamStatement()) return lowerParam(*pParam);
    if (KvCCfgAssignment* pAssignment = statement.isAssignment()) return lowerAssignment(*pAssignment);
    if (KvCCfgProcedureCall* pCall = statement.isProcedureCall()) return lowerCall(*pCall);
    if (KvCCfgExternCall* pExtern = statement.isExternCall()) return lowerExtern(*pExtern);
    throw Unrunnable("a statement of no known kind");
  }

  Op lowerAssignment(const KvCCfgAssignment& assignment) const {
    KvCCfgSFExpression* pTerms = assignment.getRHS() ? assignment.getRHS()->isSFExpression() : nullptr;
    if (pTerms && pTerms->isElementWrite()) return ElementStoreOp{lowerTerms(*pTerms)};
    if (!assignment.getLHS()) throw Unrunnable("an assignment without left-hand side");
    std::uint32_t slot = slotOf(assignment.getLHS());
    return StoreOp{slot, lowerExpression(assignment.getRHS()), observed(slot, assignment.getLHS())};
  }

  // Nothing to observe (a null version) where the statement defines no variable of the program.
  DefineOp lowerDefinition(KvCCfgStatement& statement) const {
    KvCCfgVariable* pDefined = definedVariable(statement);
    auto found = pDefined ? m_SlotOf.find(originalOf(pDefined)) : m_SlotOf.end();
    if (found == m_SlotOf.end()) return DefineOp{0, nullptr};
    return DefineOp{found->second, observed(found->second, pDefined)};
  }

  // The one variable each kind of statement that computes nothing defines.
  static KvCCfgVariable* definedVariable(KvCCfgStatement& statement) {
    if (KvCPhiFunction* pPhi = statement.isPhiFunction()) return pPhi->getVariable();
    if (KvCCfgValueReturnStatement* pReturn = statement.isValueReturnStatement())
      return pReturn->getVariable();
    KvCCfgAssignment* pAssignment = statement.isAssignment();
    return pAssignment ? pAssignment->getLHS() : nullptr;
  }

  // What the observer of a run is told of: SSA versions of plain scalars, whose values stay in their
  // slot until the next definition.
  Observed observed(std::uint32_t slot, KvCCfgVariable* pDefined) const {
    const Slot& variable = m_Code.slots[slot];
    bool plain = !variable.isArray && !variable.isVolatile;
    return plain && pDefined->isSSAVariable() ? pDefined : nullptr;
  }

  Op lowerCall(KvCCfgProcedureCall& call) const {
    KvCCfgProcedure* pCallee = m_Graph.findProcedure(call.getName());
    if (!pCallee)
      throw Unrunnable(std::string("calls '") + call.getName().cstring() + "', no procedure of the graph");
    CallOp op{&call, pCallee->getEntryNode().index(), {}};
    if (m_Code.argumentsAtCalls)
      for (KvCCfgParamStatement* pParam : pCallee->getParamStatements())
        op.arguments.push_back(Argument{slotOf(pParam->getVariable()), lowerArgument(*pParam, call)});
    return op;
  }

  Code lowerArgument(const KvCCfgParamStatement& param, KvCCfgProcedureCall& call) const {
    KvCCfgExpression* pArgument = param.getArgument(&call);
    if (!pArgument)
      throw Unrunnable(std::string("the call of '") + call.getName().cstring() + "' passes nothing for " +
                       variableName(param.getVariable()));
    return lowerExpression(pArgument);
  }

  Op lowerParam(const KvCCfgParamStatement& param) const {
    std::uint32_t formal = slotOf(param.getVariable());
    ParamOp op{formal, {}, variableName(param.getVariable()), observed(formal, param.getVariable())};
    for (const auto& [pCall, pArgument] : param.getArguments())
      op.arguments.emplace(pCall, passesItself(op.formal, pArgument)
                                      ? std::nullopt
                                      : std::optional<Code>(lowerExpression(pArgument)));
    return op;
  }

  Op lowerExtern(KvCCfgExternCall& call) const {
    ExternOp op{externCallName(call).cstring(), {}, {}};
    for (KvCCfgVariable* pUsed : call.getUsedVariables()) op.used.push_back(slotOf(pUsed));
    for (KvCCfgVariable* pModified : call.getModifiableVariables()) {
      std::uint32_t slot = slotOf(pModified);
      if (m_Code.slots[slot].isArray && !m_Code.slots[slot].isVolatile) op.refreshed.push_back(slot);
    }
    sortUnique(op.used);
    sortUnique(op.refreshed);
    return op;
  }

  static void sortUnique(std::vector<std::uint32_t>& slots) {
    std::sort(slots.begin(), slots.end());
    slots.erase(std::unique(slots.begin(), slots.end()), slots.end());
  }

  // ---- Nodes and control flow --------------------------------------------------------------------

  NodeCode lowerNode(node v) const {
    NodeCode code;
    code.origin = v;
    KvCCfgNodeInfo* pInfo = m_Graph.inf(v);
    if (!pInfo) {
      code.fault = "a node without payload";
      return code;
    }
    code.name = nodeName(*pInfo);
    if (pInfo->isExitNode()) {
      code.flow = Flow::Return;
    } else if (KvCBasicBlock* pBlock = pInfo->isBasicBlock()) {
      lowerStatements(*pBlock, code);
      lowerBranch(v, *pBlock, code);
    } else {
      jumpToOnlySuccessor(v, code);
    }
    return code;
  }

  static std::string nodeName(KvCCfgNodeInfo& info) {
    if (KvCBasicBlock* pBlock = info.isBasicBlock()) return "bb" + std::to_string(pBlock->getIndex());
    std::string procedure = info.getProcedure() ? info.getProcedure()->getName().cstring() : "?";
    return (info.isEntryNode() ? "the entry of " : "the exit of ") + procedure;
  }

  void lowerBranch(node v, const KvCBasicBlock& block, NodeCode& code) const {
    KvCCfgExpression* pCondition = block.getBranchCond();
    if (!pCondition) {
      jumpToOnlySuccessor(v, code);
      return;
    }
    for (edge e : m_Graph.getControlFlowOutEdges(v)) {
      KvCCfgEdgeInfo* pKind = m_Graph.inf(e);
      if (pKind && pKind->isTrueBranch() && code.next == kNoNode) code.next = m_Graph.target(e).index();
      if (pKind && pKind->isFalseBranch() && code.onFalse == kNoNode)
        code.onFalse = m_Graph.target(e).index();
    }
    if (pCondition == m_Program.mainLoopCondition()) {
      code.flow = Flow::MainLoop;
      return;
    }
    try {
      code.condition = lowerExpression(pCondition);
      code.flow = Flow::Branch;
    } catch (const Unrunnable& problem) {
      code.fault = code.name + ": the condition: " + problem.what();
    }
  }

  void jumpToOnlySuccessor(node v, NodeCode& code) const {
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(v);
    if (out.size() == 1) {
      code.flow = Flow::Jump;
      code.next = m_Graph.target(out.front()).index();
      return;
    }
    code.fault = code.name + " has " + std::to_string(out.size()) + " successors and no condition";
  }

  std::uint32_t startNode() const {
    if (m_Graph.getStartNode()) return m_Graph.getStartNode().index();
    KvCCfgProcedure* pMain = m_Graph.findProcedure(KvCControlFlowGraph::kMainProcedureName);
    return pMain ? pMain->getEntryNode().index() : kNoNode;
  }

  const Program& m_Program;
  const KvCControlFlowGraph& m_Graph;
  ProgramCode m_Code;
  std::unordered_map<const KvCCfgVariable*, std::uint32_t> m_SlotOf;
};

}  // namespace

ProgramCode lowerProgram(const Program& program) { return Lowering(program).lower(); }

}  // namespace ssaopt::client::detail
