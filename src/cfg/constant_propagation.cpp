// Sparse conditional constant propagation with value ranges (Wegman and Zadeck's algorithm over the
// three-level lattice): values flow along SSA def-use edges, and only along control-flow edges that
// the constants found so far leave executable.
//
//   before:  c.1 = 1; if (c.1) { x.1 = 2; } else { x.2 = 3; }  x.3 = phi(x.1, x.2); y.1 = x.3 + 1
//   after:   c.1 = 1, x.1 = 2 in [2, 2], x.3 = 2, y.1 = 3; x.2 is never reached and stays
//            undetermined, which leaves the meet at x.3 alone; only the true edge is executable.
//            With removeDeadCode the else block and the x.2 operand go, and x.3 gets [2, 2].
//
// Needs SSA form and divided blocks (one phi function, one statement or the condition alone).
#include <algorithm>
#include <cstring>
#include <functional>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "ssaopt/values/arithmetic.h"

using ssaopt::edge;
using ssaopt::list;
using ssaopt::node;

namespace {

edge popFront(list<edge>& workList) {
  edge e = workList.front();
  workList.pop_front();
  return e;
}

// A range bound of an operand. Only SSA versions keep a range; any other variable's bounds are its
// value, which is as much as anybody knows of it.
KvCCfgValue* boundOf(KvCCfgValue* pBound, const KvCCfgVariable& variable) {
  return pBound ? pBound : variable.getValue();
}

// The operands of `phi` once each, in the order of its getUsedVariables() (creation order of the
// variables), without building a set. The bounds merge takes the first operand without a known bound,
// so the order matters, and an order by address would make the result depend on the allocator.
ssaopt::array<KvCCfgVariable*> distinctOperands(const KvCPhiFunction& phi) {
  ssaopt::array<KvCCfgVariable*> operands = phi.getReplacementVariables();
  operands.erase(std::remove(operands.begin(), operands.end(), nullptr), operands.end());
  std::sort(operands.begin(), operands.end(), ssaopt::set_order<KvCCfgVariable*>());
  operands.erase(std::unique(operands.begin(), operands.end()), operands.end());
  return operands;
}

// Overwrites the elements of `values`, one per operand, with what `of` gives for each operand.
template <class Of>
void fillWith(list<KvCCfgValue*>& values, const ssaopt::array<KvCCfgVariable*>& operands, Of of) {
  auto slot = values.begin();
  for (KvCCfgVariable* pOperand : operands) *slot++ = of(pOperand);
}

// A parameter statement as its formal holds it once it ran for some call: each argument already
// stored as the call stores it (KvCCfgParamStatement::evaluateHeld), so the visit stores the result as
// it is.
struct HeldByFormal {
  const KvCCfgParamStatement& statement;

  KvCCfgValue evaluate() const { return statement.evaluateHeld(); }
  KvCCfgValue getMinimum() const { return statement.getHeldMinimum(); }
  KvCCfgValue getMaximum() const { return statement.getHeldMaximum(); }
};

// The value and range of a variable before a visit, to tell whether the visit changed any of them. Bit
// for bit: -0.0 after +0.0 compares equal as a value of the lattice, yet prints differently.
class DefinitionSnapshot {
public:
  explicit DefinitionSnapshot(const KvCCfgVariable& variable)
      : m_Value(variable.getValue()), m_Min(variable.getMinValue()), m_Max(variable.getMaxValue()) {}

  bool matches(const KvCCfgVariable& variable) const {
    return m_Value.matches(variable.getValue()) && m_Min.matches(variable.getMinValue()) &&
           m_Max.matches(variable.getMaxValue());
  }

private:
  // A copy of a value object, or of its absence.
  struct Copy {
    explicit Copy(const KvCCfgValue* pValue)
        : present(pValue != nullptr), value(pValue ? *pValue : KvCCfgValue()) {}

    bool matches(const KvCCfgValue* pValue) const {
      if (!present || !pValue) return present == (pValue != nullptr);
      double before = value.getValue(), after = pValue->getValue();
      return value.getValueKind() == pValue->getValueKind() &&
             std::memcmp(&before, &after, sizeof before) == 0;
    }

    bool present;
    KvCCfgValue value;
  };

  Copy m_Value, m_Min, m_Max;
};

}  // namespace

void KvCControlFlowGraph::propagateSparseConditionalConstant(bool removeDeadCode) {
  if (!beginStep(ssaopt::GraphOperation::PropagateSparseConditionalConstant)) return;
  addSSAEdges();
  sparseConditionalConstant(removeDeadCode);
  endStep(ssaopt::GraphOperation::PropagateSparseConditionalConstant);
}

// Adding edges leaves the node list alone, so the live view serves.
void KvCControlFlowGraph::addSSAEdges() {
  if (!beginStep(ssaopt::GraphOperation::AddSSAEdges)) return;
  buildVarUses();
  for (node v : nodes()) {
    KvCCfgNodeInfo* pInf = inf(v);
    if (!pInf) continue;
    for (KvCCfgVariable* pVariable : pInf->getAssignedVariables())
      for (node user : pVariable->getUses()) new_edge(v, user, new KvCSSAEdge());
  }
  endStep(ssaopt::GraphOperation::AddSSAEdges);
}

// Only assigned variables are cleared: a variable that nothing assigns keeps the uses it had.
void KvCControlFlowGraph::buildVarUses() {
  for (node v : nodes())
    if (KvCCfgNodeInfo* pInf = inf(v))
      for (KvCCfgVariable* pVariable : pInf->getAssignedVariables()) pVariable->clearUses();
  for (node v : nodes())
    if (KvCCfgNodeInfo* pInf = inf(v))
      for (KvCCfgVariable* pVariable : pInf->getUsedVariables()) pVariable->appendUse(v);
}

// Passes repeat while a pass made a variable constant or dead-code removal took a phi operand away,
// for either can make a condition constant that was not before. The procedures are taken in the
// table's order, ascending by name; a pass passes over those that would repeat their last visit
// exactly (see PropagationRecord), except the last one, whose executable flags are the ones that
// stay.
void KvCControlFlowGraph::sparseConditionalConstant(bool removeDeadCode) {
  if (!beginStep(ssaopt::GraphOperation::SparseConditionalConstant)) return;
  list<edge> cfgWorkList;
  list<edge> ssaWorkList;
  startPropagationRecord();
  // What the first visit's start would do; every later visit then clears only what the visit before
  // it set, and dead-code elimination deletes no edge that carries the flag.
  clearAllVisited();
  if (!m_Procedures.empty()) deactivateAllEdges();
  int last = static_cast<int>(m_Procedures.size()) - 1;
  bool repeat = true;
  while (repeat) {
    bool changed = false;
    for (int procedure = 0; procedure <= last; ++procedure)
      if (m_Propagation.unsettled[static_cast<std::size_t>(procedure)] || procedure == last)
        visitProcedure(procedure, cfgWorkList, ssaWorkList, changed);
    bool deleted = removeDeadCode && eliminateDeadCode();
    repeat = changed || deleted;
  }
  // The flags stay as the last procedure left them; the record of them must not outlive the edges.
  m_ExecutableEdges.clear();
  m_Propagation = PropagationRecord();
  endStep(ssaopt::GraphOperation::SparseConditionalConstant);
}

// Numbers the procedures and gives every node the number of the procedure whose entry reaches it
// along control-flow edges (procedures are the components of those). Every procedure is unsettled.
void KvCControlFlowGraph::startPropagationRecord() {
  std::size_t count = m_Procedures.size();
  m_Propagation.procedureOf.init(*this, -1);
  m_Propagation.unsettled.assign(count, true);
  m_Propagation.visitedBy.assign(count, {});
  m_Propagation.entries.clear();
  ssaopt::array<node> stack;
  for (const auto& named : m_Procedures) {
    int procedure = static_cast<int>(m_Propagation.entries.size());
    node entry = named.second->getEntryNode();
    m_Propagation.entries.push_back(entry);
    m_Propagation.procedureOf[entry] = procedure;
    stack.push_back(entry);
    while (!stack.empty()) {
      node v = stack.back();
      stack.pop_back();
      for (edge e = firstCfgOutEdge(v); e; e = nextCfgOutEdge(e)) {
        node w = target(e);
        if (m_Propagation.procedureOf[w] != -1) continue;
        m_Propagation.procedureOf[w] = procedure;
        stack.push_back(w);
      }
    }
  }
}

// The visit starts from the marks of the procedure's last visit cleared, as a pass that clears all
// marks would leave them.
void KvCControlFlowGraph::visitProcedure(int procedure, list<edge>& cfgWorkList, list<edge>& ssaWorkList,
                                         bool& changed) {
  std::size_t i = static_cast<std::size_t>(procedure);
  m_Propagation.unsettled[i] = false;
  for (node v : m_Propagation.visitedBy[i]) m_Visited[v] = false;
  m_Propagation.visitedBy[i].clear();
  m_Propagation.current = procedure;
  propagateFrom(m_Propagation.entries[i], cfgWorkList, ssaWorkList, changed);
}

void KvCControlFlowGraph::unsettleDefinitionAt(node v) {
  unsettleProcedureOf(v);
  for (edge e : out(v))
    if (inf(e)->isSSAEdge()) unsettleProcedureOf(target(e));
}

void KvCControlFlowGraph::unsettleProcedureOf(node v) {
  int procedure = m_Propagation.procedureOf[v];
  if (procedure >= 0) m_Propagation.unsettled[static_cast<std::size_t>(procedure)] = true;
}

// The blocks it leads to lose in-edges and phi operands; a deleted call takes its arguments out of the
// parameter statements of the procedure it calls.
void KvCControlFlowGraph::unsettleProceduresOfDeadBlock(node n) {
  unsettleProcedureOf(n);
  for (edge e = firstCfgOutEdge(n); e; e = nextCfgOutEdge(e)) unsettleProcedureOf(target(e));
  for (KvCCfgStatement* pStatement : getBasicBlock(n)->getStatementSeq())
    if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall())
      if (KvCCfgProcedure* pCallee = findProcedure(pCall->getName()))
        unsettleProcedureOf(pCallee->getEntryNode());
}

// The two lists are served in turn, one edge each, until both are empty.
void KvCControlFlowGraph::propagateFrom(node entry, list<edge>& cfgWorkList, list<edge>& ssaWorkList,
                                        bool& changed) {
  initSparseConditionalConstant(entry, cfgWorkList, ssaWorkList);
  while (!cfgWorkList.empty() || !ssaWorkList.empty()) {
    if (!cfgWorkList.empty()) flowStep(cfgWorkList, ssaWorkList, changed);
    if (!ssaWorkList.empty()) ssaStep(cfgWorkList, ssaWorkList, changed);
  }
}

// Every procedure starts from no executable edge at all, so the flags left after a pass are those of
// the procedure processed last. The pass cleared every flag before the first procedure; each later
// one clears the flags its predecessors set, which is the same and costs what they reached.
void KvCControlFlowGraph::initSparseConditionalConstant(node entry, list<edge>& cfgWorkList,
                                                        list<edge>& ssaWorkList) {
  cfgWorkList.clear();
  ssaWorkList.clear();
  for (edge e : out(entry)) cfgWorkList.push_back(e);
  deactivateExecutableEdges();
}

void KvCControlFlowGraph::deactivateAllEdges() {
  for (edge e : edges()) inf(e)->deactivateEdgeExecutable();
  m_ExecutableEdges.clear();
  m_ExecutableInEdges.fill(0);
}

void KvCControlFlowGraph::deactivateExecutableEdges() {
  for (edge e : m_ExecutableEdges) {
    inf(e)->deactivateEdgeExecutable();
    --m_ExecutableInEdges[target(e)];
  }
  m_ExecutableEdges.clear();
}

void KvCControlFlowGraph::activateEdge(edge e) {
  inf(e)->activateEdgeExecutable();
  m_ExecutableEdges.push_back(e);
  ++m_ExecutableInEdges[target(e)];
}

// A phi node is visited on every edge into it that becomes executable; any other node only on the
// first, later ones reach it through its SSA in-edges.
void KvCControlFlowGraph::flowStep(list<edge>& cfgWorkList, list<edge>& ssaWorkList, bool& changed) {
  edge e = popFront(cfgWorkList);
  if (inf(e)->isEdgeExecutable()) return;
  activateEdge(e);
  node v = target(e);
  if (KvCBasicBlock* pBlock = getBasicBlock(v)) {
    setVisited(v);
    m_Propagation.visitedBy[static_cast<std::size_t>(m_Propagation.current)].push_back(v);
    if (KvCPhiFunction* pPhi = pBlock->isPhiFunction())
      visitPhiFunction(pPhi, v, changed);
    else if (countExecutableInEdges(v) == 1)
      visitInstruction(pBlock, v, cfgWorkList, ssaWorkList, changed);
  }
  // A branch schedules its edges itself, when its condition is visited.
  if (countCfgOutEdges(v) == 1) appendCfgOutEdges(v, cfgWorkList);
}

// Sets no executable flag: a use is revisited only where control already reaches it, phi functions
// excepted, which always merge all their operands.
void KvCControlFlowGraph::ssaStep(list<edge>& cfgWorkList, list<edge>& ssaWorkList, bool& changed) {
  node v = target(popFront(ssaWorkList));
  KvCBasicBlock* pBlock = getBasicBlock(v);
  if (!pBlock) return;
  if (KvCPhiFunction* pPhi = pBlock->isPhiFunction())
    visitPhiFunction(pPhi, v, changed);
  else if (countExecutableInEdges(v) >= 1)
    visitInstruction(pBlock, v, cfgWorkList, ssaWorkList, changed);
}

void KvCControlFlowGraph::visitInstruction(KvCBasicBlock* pBasicBlock, node v, list<edge>& cfgWorkList,
                                           list<edge>& ssaWorkList, bool& changed) {
  KvCCfgExpression* pCond = pBasicBlock->getBranchCond();
  KvCCfgStatement* pStatement = pBasicBlock->isStatement();
  KvCCfgAssignment* pAssignment = pStatement ? pStatement->isAssignment() : nullptr;
  KvCCfgParamStatement* pParam = pStatement ? pStatement->isParamStatement() : nullptr;
  KvCCfgValueReturnStatement* pReturn = pStatement ? pStatement->isValueReturnStatement() : nullptr;
  if (pAssignment)
    visitAssignment(pAssignment, v, cfgWorkList, ssaWorkList, changed);
  else if (pCond)
    visitBranchCondition(pCond, v, cfgWorkList);
  else if (pParam)
    visitParamStatement(pParam, v, cfgWorkList, ssaWorkList, changed);
  else if (pReturn)
    visitValueReturnStatement(pReturn, v, cfgWorkList, ssaWorkList, changed);
  else
    appendCfgOutEdges(v, cfgWorkList);
}

void KvCControlFlowGraph::visitAssignment(KvCCfgAssignment* pAssignment, node v, list<edge>& cfgWorkList,
                                          list<edge>& ssaWorkList, bool& changed) {
  visitDefinition(pAssignment->getLHS(), *pAssignment->getRHS(), v, cfgWorkList, ssaWorkList, changed, true);
}

// The statement combines the arguments of all calls of its procedure.
void KvCControlFlowGraph::visitParamStatement(KvCCfgParamStatement* pStatement, node v,
                                              list<edge>& cfgWorkList, list<edge>& ssaWorkList,
                                              bool& changed) {
  visitDefinition(pStatement->getVariable(), HeldByFormal{*pStatement}, v, cfgWorkList, ssaWorkList, changed,
                  false);
}

void KvCControlFlowGraph::visitValueReturnStatement(KvCCfgValueReturnStatement* pStatement, node v,
                                                    list<edge>& cfgWorkList, list<edge>& ssaWorkList,
                                                    bool& changed) {
  visitDefinition(pStatement->getVariable(), *pStatement->getExpression(), v, cfgWorkList, ssaWorkList,
                  changed, false);
}

// The variable's previous value object is the caller's once the new one is stored: it is compared
// with the new value and then freed. Only a value going from undetermined to constant asks for
// another pass; any change wakes the uses.
template <class Definition>
void KvCControlFlowGraph::visitDefinition(KvCCfgVariable* pVariable, const Definition& definition, node v,
                                          list<edge>& cfgWorkList, list<edge>& ssaWorkList, bool& changed,
                                          bool stores) {
  DefinitionSnapshot before(*pVariable);
  KvCCfgValue* pOld = pVariable->getValue();
  KvCCfgValue value = definition.evaluate();
  if (stores)
    pVariable->setVarValueAndAdjustCfgValue(value);
  else
    pVariable->setVarValue(value);
  recordRange(pVariable, definition, stores);
  if (!before.matches(*pVariable)) unsettleDefinitionAt(v);
  if (pOld->compare(value) != 0) {
    if (pOld->isUndetermined() && value.isConstant()) changed = true;
    appendSSAOutEdges(v, ssaWorkList);
  }
  if (!value.isNonConstant()) appendCfgOutEdges(v, cfgWorkList);
  delete pOld;
}

// The two bounds are fitted together: a type that wraps between them (an int8 in [0, 100] plus 100)
// holds its whole range, not the wrapped ends. A value return passes on a range that its variable
// already holds.
template <class Definition>
void KvCControlFlowGraph::recordRange(KvCCfgVariable* pVariable, const Definition& definition, bool stores) {
  KvCCfgValue minimum = definition.getMinimum();
  KvCCfgValue maximum = definition.getMaximum();
  if (stores)
    pVariable->setVarRangeAndAdjust(minimum, maximum);
  else
    pVariable->setVarRange(minimum, maximum);
}

// A constant comparing equal to 0.0 takes the false edge, every other constant the true edge;
// undetermined and non-constant conditions open both.
void KvCControlFlowGraph::visitBranchCondition(KvCCfgExpression* pCond, node v, list<edge>& cfgWorkList) {
  KvCCfgValue condition = pCond->evaluate();
  if (!condition.isConstant()) {
    appendCfgOutEdges(v, cfgWorkList);
    return;
  }
  bool taken = condition.getValue() != 0.0;
  for (edge e = firstCfgOutEdge(v); e; e = nextCfgOutEdge(e)) {
    KvCCfgEdgeInfo* pInf = inf(e);
    if (taken ? pInf->isTrueBranch() != nullptr : pInf->isFalseBranch() != nullptr) cfgWorkList.push_back(e);
  }
}

// All operands take part, whether the edge they come by is executable or not: an operand that is
// still undetermined leaves the meet alone. Nothing is scheduled: the uses are reached by the flow
// step or in the next pass. Unlike an assignment, any change to a constant asks for another pass.
// A join of thousands of edges is merged again on every one of them that becomes executable, so the
// merge reuses one list for the values and the two bounds. The operands hold values and ranges
// their definitions already adjusted to the variable, so the meet and the hull are stored as they are.
void KvCControlFlowGraph::visitPhiFunction(KvCPhiFunction* pPhi, node v, bool& changed) {
  KvCCfgVariable* pVariable = pPhi->getVariable();
  DefinitionSnapshot before(*pVariable);
  KvCCfgValue* pOld = pVariable->getValue();
  ssaopt::array<KvCCfgVariable*> operands = distinctOperands(*pPhi);
  list<KvCCfgValue*> merged(operands.size());
  fillWith(merged, operands, [](KvCCfgVariable* pOperand) { return pOperand->getValue(); });
  KvCCfgValue value = intersect(merged);
  pVariable->setVarValue(value);
  if (!pOld->isConstant() && value.isConstant()) changed = true;
  fillWith(merged, operands,
           [](KvCCfgVariable* pOperand) { return boundOf(pOperand->getMinValue(), *pOperand); });
  KvCCfgValue minimum = determineMinimum(merged);
  fillWith(merged, operands,
           [](KvCCfgVariable* pOperand) { return boundOf(pOperand->getMaxValue(), *pOperand); });
  KvCCfgValue maximum = determineMaximum(merged);
  pVariable->setVarRange(minimum, maximum);
  if (!before.matches(*pVariable)) unsettleDefinitionAt(v);
  delete pOld;
}

int KvCControlFlowGraph::countExecutableInEdges(node v) const { return m_ExecutableInEdges[v]; }

int KvCControlFlowGraph::countCfgOutEdges(node v) const {
  int count = 0;
  for (edge e = firstCfgOutEdge(v); e; e = nextCfgOutEdge(e)) ++count;
  return count;
}

void KvCControlFlowGraph::appendCfgOutEdges(node v, list<edge>& workList) const {
  for (edge e = firstCfgOutEdge(v); e; e = nextCfgOutEdge(e)) workList.push_back(e);
}

void KvCControlFlowGraph::appendSSAOutEdges(node v, list<edge>& workList) const {
  for (edge e : out(v))
    if (inf(e)->isSSAEdge()) workList.push_back(e);
}

// addSSAEdges adds a node's SSA out-edges after its control-flow out-edges, so the control-flow
// edges end at the first SSA edge: a definition with thousands of uses costs a flow step no more
// than a jump does.
edge KvCControlFlowGraph::firstCfgOutEdge(node v) const { return controlFlowOrNil(first_adj_edge(v)); }

edge KvCControlFlowGraph::nextCfgOutEdge(edge e) const { return controlFlowOrNil(adj_succ(e)); }

edge KvCControlFlowGraph::controlFlowOrNil(edge e) const {
  return e && !inf(e)->isSSAEdge() ? e : edge(ssaopt::nil);
}
