// Sparse conditional constant propagation with value ranges (Wegman and Zadeck's algorithm over the
// three-level lattice): values flow along SSA def-use edges, and only along control-flow edges that
// the constants found so far leave executable.
//
//   before:  c.1 = 1; if (c.1) { x.1 = 2; } else { x.2 = 3; }  x.3 = phi(x.1, x.2); y.1 = x.3 + 1
//   after:   c.1 = 1 and x.1 = 2 in [2, 2]; only the true edge is executable. x.2 is never reached
//            and stays undetermined, and a phi function merges all its operands, so x.3 and y.1
//            stay undetermined as well.
//   with removeDeadCode, the else block goes after the first pass, x.3 = phi(x.1) keeps one operand,
//            and the next pass gives x.3 = 2 in [2, 2] and y.1 = 3.
//
// Needs SSA form and divided blocks (one phi function, one statement or the condition alone).
#include <cstring>

#include "graph_mechanism.h"
#include "phi_merge.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "ssaopt/values/arithmetic.h"
#include "variable_table.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::node;
using ssaopt::cfg::firstCfgOutEdge;
using ssaopt::cfg::nextCfgOutEdge;
using ssaopt::cfg::PhiMerge;

namespace {

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

// Calls `onUse` for every variable that the node reads, once or more often. A block's items are
// asked one by one: the union that the block's getUsedVariables() builds costs another set per node.
template <class OnUse>
void forEachUsedVariable(KvCCfgNodeInfo& payload, OnUse onUse) {
  KvCBasicBlock* pBlock = payload.isBasicBlock();
  if (!pBlock) {
    for (KvCCfgVariable* pVariable : payload.getUsedVariables()) onUse(pVariable);
    return;
  }
  for (const KvCPhiFunction* pPhi : pBlock->getPhiFunctions())
    for (KvCCfgVariable* pVariable : pPhi->getUsedVariables()) onUse(pVariable);
  for (const KvCCfgStatement* pStatement : pBlock->getStatementSeq())
    for (KvCCfgVariable* pVariable : pStatement->getUsedVariables()) onUse(pVariable);
  if (const KvCCfgExpression* pCond = pBlock->getBranchCond())
    for (KvCCfgVariable* pVariable : pCond->getUsedVariables()) onUse(pVariable);
}

}  // namespace

// ---- The run -------------------------------------------------------------------------------------

// A visit of a procedure is a function of the procedure's own values, ranges and blocks and of the
// values and ranges it reads through SSA edges from other procedures. So a procedure whose last visit
// changed none of its definitions, and none of whose inputs changed since, would repeat that visit
// exactly: a pass passes over it. Procedures are numbered by their position in the table.
//
// A phi node is visited on every edge into it that becomes executable and after every change of an
// operand. Its merge (PhiMerge) is made at its first visit and kept until dead-code elimination takes
// operands away; a merge of many operands reads again only the blocks of operands that changed,
// which every definition that changes tells it.
class KvCControlFlowGraph::PropagationRun {
public:
  explicit PropagationRun(KvCControlFlowGraph& G) : m_G(G) { m_G.m_pPropagation = this; }
  ~PropagationRun() { m_G.m_pPropagation = nullptr; }
  PropagationRun(const PropagationRun&) = delete;
  PropagationRun& operator=(const PropagationRun&) = delete;

  // Passes repeat while a pass made a variable constant or dead-code removal took a phi operand away,
  // for either can make a condition constant that was not before. The procedures are taken in the
  // table's order, ascending by name; a pass passes over those that would repeat their last visit
  // exactly, except the last one, whose executable flags are the ones that stay.
  void run(bool removeDeadCode) {
    numberProcedures();
    // What the first visit's start would do; every later visit then clears only what the visit
    // before it set, and dead-code elimination deletes no edge that carries the flag.
    m_G.clearAllVisited();
    if (m_Entries.empty()) return;
    deactivateAllEdges();
    std::size_t last = m_Entries.size() - 1;
    bool repeat = true;
    while (repeat) {
      bool changed = false;
      for (std::size_t procedure = 0; procedure <= last; ++procedure)
        if (m_Unsettled[procedure] || procedure == last) visitProcedure(procedure, changed);
      bool deleted = removeDeadCode && sweepDeadCode();
      repeat = changed || deleted;
    }
  }

  // ---- Executable edges ----

  void activate(edge e) {
    m_G.inf(e)->activateEdgeExecutable();
    m_ExecutableEdges.push_back(e);
    ++m_ExecutableInEdges[m_G.target(e)];
  }
  int executableInEdges(node v) const { return m_ExecutableInEdges[v]; }

  // Every procedure starts from no executable edge at all, so the flags left after a pass are those
  // of the procedure processed last. The pass cleared every flag before the first procedure; each
  // later one clears the flags its predecessors set, which is the same and costs what they reached.
  void deactivateExecutableEdges() {
    for (edge e : m_ExecutableEdges) {
      m_G.inf(e)->deactivateEdgeExecutable();
      --m_ExecutableInEdges[m_G.target(e)];
    }
    m_ExecutableEdges.clear();
  }

  // ---- Definitions ----

  // The shared visit of assignments, parameter and value-return statements: `definition` gives the
  // new value, minimum and maximum of `pVariable`. `stores` is false where no store happens (a
  // value-return statement takes back a value the variable already holds), so the value is not
  // adjusted to the variable a second time. The variable's previous value object is the visit's
  // once the new one is stored: it is compared with the new value and then freed. Only a value going
  // from undetermined to constant asks for another pass; any change wakes the uses.
  template <class Definition>
  void visitDefinition(KvCCfgVariable* pVariable, const Definition& definition, node v,
                       EdgeWorkList& cfgWorkList, EdgeWorkList& ssaWorkList, bool& changed, bool stores) {
    DefinitionSnapshot before(*pVariable);
    KvCCfgValue* pOld = pVariable->getValue();
    KvCCfgValue value = definition.evaluate();
    if (stores)
      pVariable->setVarValueAndAdjustCfgValue(value);
    else
      pVariable->setVarValue(value);
    recordRange(pVariable, definition, stores);
    if (!before.matches(*pVariable)) definitionChanged(v, *pVariable);
    if (pOld->compare(value) != 0) {
      if (pOld->isUndetermined() && value.isConstant()) changed = true;
      appendSSAOutEdges(v, ssaWorkList);
    }
    if (!value.isNonConstant()) appendCfgOutEdges(v, cfgWorkList);
    delete pOld;
  }

  // A definition at `v` now holds another value or range: its procedure and the procedures of its
  // uses are visited again in the next pass, and the merges that read it read it again.
  void definitionChanged(node v, const KvCCfgVariable& variable) {
    unsettleProcedureOf(v);
    for (edge e : m_G.out(v))
      if (m_G.inf(e)->isSSAEdge()) unsettleProcedureOf(m_G.target(e));
    m_Readers.forEach(variable,
                      [this](const Reader& reader) { m_Merges[reader.merge].invalidate(reader.block); });
  }

  void appendCfgOutEdges(node v, EdgeWorkList& workList) const {
    for (edge e = firstCfgOutEdge(m_G, v); e; e = nextCfgOutEdge(m_G, e)) workList.push_back(e);
  }

  void appendSSAOutEdges(node v, EdgeWorkList& workList) const {
    for (edge e : m_G.out(v))
      if (m_G.inf(e)->isSSAEdge()) workList.push_back(e);
  }

  // ---- Phi functions ----

  // The phi functions of two operands, the most common by far, are merged from scratch at every visit;
  // a merge is kept for the others, and one of many operands keeps partial results. Dead-code
  // elimination only ever takes operands away, so a kept merge is current while the phi function has
  // as many operands as when the merge was made.
  PhiMerge::Result mergeOperands(node v, const KvCPhiFunction& phi) {
    int kept = m_MergeAt[v];
    if (kept != kNone && m_MergedDimensions[static_cast<std::size_t>(kept)] == phi.getDimension())
      return m_Merges[static_cast<std::size_t>(kept)].merge();
    if (kept != kNone) forgetMerge(v);
    PhiMerge::distinctOperands(phi, m_Operands);
    if (m_Operands.size() <= kMergedFromScratch) return PhiMerge::mergeAll(m_Operands);
    m_MergeAt[v] = static_cast<int>(m_Merges.size());
    m_Merges.emplace_back(m_Operands);
    m_MergedDimensions.push_back(phi.getDimension());
    if (m_Merges.back().readsOnlyChangedBlocks()) registerOperands(m_Merges.size() - 1);
    return m_Merges.back().merge();
  }

private:
  static constexpr int kNone = -1;
  static constexpr std::size_t kMergedFromScratch = 2;

  // Where an incremental merge reads a variable: the merge, and the block of its operands.
  struct Reader {
    std::size_t merge;
    std::size_t block;
  };

  // Gives every node the number of the procedure whose entry reaches it along control-flow edges
  // (procedures are the components of those; -1 for a node that no entry reaches). Every procedure
  // is unsettled.
  void numberProcedures() {
    m_ProcedureOf.init(m_G, kNone);
    m_MergeAt.init(m_G, kNone);
    m_ExecutableInEdges.init(m_G, 0);
    array<node> stack;
    for (const auto& named : m_G.m_Procedures) {
      int procedure = static_cast<int>(m_Entries.size());
      node entry = named.second->getEntryNode();
      m_Entries.push_back(entry);
      m_ProcedureOf[entry] = procedure;
      stack.push_back(entry);
      while (!stack.empty()) {
        node v = stack.back();
        stack.pop_back();
        for (edge e = firstCfgOutEdge(m_G, v); e; e = nextCfgOutEdge(m_G, e)) {
          node w = m_G.target(e);
          if (m_ProcedureOf[w] != kNone) continue;
          m_ProcedureOf[w] = procedure;
          stack.push_back(w);
        }
      }
    }
    m_Unsettled.assign(m_Entries.size(), true);
    m_VisitedBy.assign(m_Entries.size(), {});
  }

  // The merge at `v` no longer matches its operands; its registrations are left to lead nowhere.
  void forgetMerge(node v) {
    m_Merges[static_cast<std::size_t>(m_MergeAt[v])] = PhiMerge();
    m_MergeAt[v] = kNone;
  }

  // Before dead-code elimination deletes the blocks that the pass did not reach, the procedures they
  // touch are unsettled: the blocks they lead to lose in-edges and phi operands, and a deleted call
  // takes its arguments out of the parameter statements of the procedure it calls. Entry and exit
  // nodes stay, reached or not.
  bool sweepDeadCode() {
    for (node n : m_G.nodes())
      if (!m_G.isVisited(n) && m_G.getBasicBlock(n)) unsettleProceduresOfDeadBlock(n);
    return m_G.eliminateDeadCode();
  }

  void unsettleProceduresOfDeadBlock(node n) {
    unsettleProcedureOf(n);
    for (edge e = firstCfgOutEdge(m_G, n); e; e = nextCfgOutEdge(m_G, e)) unsettleProcedureOf(m_G.target(e));
    for (KvCCfgStatement* pStatement : m_G.getBasicBlock(n)->getStatementSeq())
      if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall())
        if (KvCCfgProcedure* pCallee = m_G.findProcedure(pCall->getName()))
          unsettleProcedureOf(pCallee->getEntryNode());
  }

  void deactivateAllEdges() {
    for (edge e : m_G.edges()) m_G.inf(e)->deactivateEdgeExecutable();
    m_ExecutableEdges.clear();
  }

  // The visit starts from the marks of the procedure's last visit cleared, as a pass that clears all
  // marks would leave them; the marks of the procedures a pass passes over stay for dead-code
  // elimination.
  void visitProcedure(std::size_t procedure, bool& changed) {
    m_Unsettled[procedure] = false;
    for (node v : m_VisitedBy[procedure]) m_G.m_Visited[v] = false;
    m_VisitedBy[procedure].clear();
    m_Current = procedure;
    propagateFrom(m_Entries[procedure], changed);
  }

  // The two lists are served in turn, one edge each, until both are empty.
  void propagateFrom(node entry, bool& changed) {
    m_G.initSparseConditionalConstant(entry, m_CfgWorkList, m_SSAWorkList);
    while (!m_CfgWorkList.empty() || !m_SSAWorkList.empty()) {
      if (!m_CfgWorkList.empty()) flowStep(changed);
      if (!m_SSAWorkList.empty()) ssaStep(changed);
    }
  }

  // A phi node is visited on every edge into it that becomes executable; any other node only on the
  // first, later ones reach it through its SSA in-edges.
  void flowStep(bool& changed) {
    edge e = m_CfgWorkList.pop_front();
    if (m_G.inf(e)->isEdgeExecutable()) return;
    activate(e);
    node v = m_G.target(e);
    if (KvCBasicBlock* pBlock = m_G.getBasicBlock(v)) {
      markVisited(v);
      if (KvCPhiFunction* pPhi = pBlock->isPhiFunction())
        m_G.visitPhiFunction(pPhi, v, changed);
      else if (m_G.countExecutableInEdges(v) == 1)
        m_G.visitInstruction(pBlock, v, m_CfgWorkList, m_SSAWorkList, changed);
    }
    // A branch schedules its edges itself, when its condition is visited.
    if (m_G.countCfgOutEdges(v) == 1) appendCfgOutEdges(v, m_CfgWorkList);
  }

  // Sets no executable flag: a use is revisited only where control already reaches it, phi functions
  // excepted, which always merge all their operands.
  void ssaStep(bool& changed) {
    node v = m_G.target(m_SSAWorkList.pop_front());
    KvCBasicBlock* pBlock = m_G.getBasicBlock(v);
    if (!pBlock) return;
    if (KvCPhiFunction* pPhi = pBlock->isPhiFunction())
      m_G.visitPhiFunction(pPhi, v, changed);
    else if (m_G.countExecutableInEdges(v) >= 1)
      m_G.visitInstruction(pBlock, v, m_CfgWorkList, m_SSAWorkList, changed);
  }

  void markVisited(node v) {
    m_G.setVisited(v);
    m_VisitedBy[m_Current].push_back(v);
  }

  void unsettleProcedureOf(node v) {
    int procedure = m_ProcedureOf[v];
    if (procedure != kNone) m_Unsettled[static_cast<std::size_t>(procedure)] = true;
  }

  // The two bounds are fitted together: a type that wraps between them (an int8 in [0, 100] plus 100)
  // holds its whole range, not the wrapped ends. A value return passes on a range that its variable
  // already holds.
  template <class Definition>
  static void recordRange(KvCCfgVariable* pVariable, const Definition& definition, bool stores) {
    KvCCfgValue minimum = definition.getMinimum();
    KvCCfgValue maximum = definition.getMaximum();
    if (stores)
      pVariable->setVarRangeAndAdjust(minimum, maximum);
    else
      pVariable->setVarRange(minimum, maximum);
  }

  void registerOperands(std::size_t merge) {
    const PhiMerge& phiMerge = m_Merges[merge];
    for (std::size_t i = 0; i < phiMerge.operands().size(); ++i)
      m_Readers.insert(*phiMerge.operands()[i], {merge, phiMerge.blockOf(i)});
  }

  KvCControlFlowGraph& m_G;
  EdgeWorkList m_CfgWorkList;
  EdgeWorkList m_SSAWorkList;

  // The procedure record.
  ssaopt::node_array<int> m_ProcedureOf;
  array<node> m_Entries;           // per procedure
  array<bool> m_Unsettled;         // per procedure: to be visited in the next pass
  array<array<node>> m_VisitedBy;  // per procedure: the nodes its last visit marked visited
  std::size_t m_Current = 0;       // the procedure being visited

  // The edges whose executable flag the current pass set since the last clearing, so that the next
  // procedure clears only those instead of every edge of the graph; and per node how many in-edges
  // carry the flag, which the flow step asks at every edge that becomes executable (counting at a
  // join with many in-edges each time would be quadratic).
  array<edge> m_ExecutableEdges;
  ssaopt::node_array<int> m_ExecutableInEdges;

  // The merges kept for phi functions, by node, and where the incremental ones read each variable.
  ssaopt::node_array<int> m_MergeAt;
  array<PhiMerge> m_Merges;
  array<int> m_MergedDimensions;  // per merge: the operands of its phi function when it was made
  ssaopt::cfg::VariableTable<Reader> m_Readers;
  array<KvCCfgVariable*> m_Operands;  // scratch
};

// ---- The steps -----------------------------------------------------------------------------------

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
      for (node user : pVariable->uses()) new_edge(v, user, new KvCSSAEdge());
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
      forEachUsedVariable(*pInf, [v](KvCCfgVariable* pVariable) { pVariable->appendUse(v); });
}

void KvCControlFlowGraph::sparseConditionalConstant(bool removeDeadCode) {
  if (!beginStep(ssaopt::GraphOperation::SparseConditionalConstant)) return;
  PropagationRun(*this).run(removeDeadCode);
  endStep(ssaopt::GraphOperation::SparseConditionalConstant);
}

void KvCControlFlowGraph::initSparseConditionalConstant(node entry, EdgeWorkList& cfgWorkList,
                                                        EdgeWorkList& ssaWorkList) {
  cfgWorkList.clear();
  ssaWorkList.clear();
  for (edge e : out(entry)) cfgWorkList.push_back(e);
  m_pPropagation->deactivateExecutableEdges();
}

void KvCControlFlowGraph::visitInstruction(KvCBasicBlock* pBasicBlock, node v, EdgeWorkList& cfgWorkList,
                                           EdgeWorkList& ssaWorkList, bool& changed) {
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
    m_pPropagation->appendCfgOutEdges(v, cfgWorkList);
}

void KvCControlFlowGraph::visitAssignment(KvCCfgAssignment* pAssignment, node v, EdgeWorkList& cfgWorkList,
                                          EdgeWorkList& ssaWorkList, bool& changed) {
  m_pPropagation->visitDefinition(pAssignment->getLHS(), *pAssignment->getRHS(), v, cfgWorkList, ssaWorkList,
                                  changed, true);
}

// The statement combines the arguments of all calls of its procedure.
void KvCControlFlowGraph::visitParamStatement(KvCCfgParamStatement* pStatement, node v,
                                              EdgeWorkList& cfgWorkList, EdgeWorkList& ssaWorkList,
                                              bool& changed) {
  m_pPropagation->visitDefinition(pStatement->getVariable(), HeldByFormal{*pStatement}, v, cfgWorkList,
                                  ssaWorkList, changed, false);
}

void KvCControlFlowGraph::visitValueReturnStatement(KvCCfgValueReturnStatement* pStatement, node v,
                                                    EdgeWorkList& cfgWorkList, EdgeWorkList& ssaWorkList,
                                                    bool& changed) {
  m_pPropagation->visitDefinition(pStatement->getVariable(), *pStatement->getExpression(), v, cfgWorkList,
                                  ssaWorkList, changed, false);
}

// A constant comparing equal to 0.0 takes the false edge, every other constant the true edge;
// undetermined and non-constant conditions open both.
void KvCControlFlowGraph::visitBranchCondition(KvCCfgExpression* pCond, node v, EdgeWorkList& cfgWorkList) {
  KvCCfgValue condition = pCond->evaluate();
  if (!condition.isConstant()) {
    m_pPropagation->appendCfgOutEdges(v, cfgWorkList);
    return;
  }
  bool taken = condition.getValue() != 0.0;
  for (edge e = firstCfgOutEdge(*this, v); e; e = nextCfgOutEdge(*this, e)) {
    KvCCfgEdgeInfo* pInf = inf(e);
    if (taken ? pInf->isTrueBranch() != nullptr : pInf->isFalseBranch() != nullptr) cfgWorkList.push_back(e);
  }
}

// All operands take part, whether the edge they come by is executable or not: one that is still
// undetermined keeps the meet undetermined. Nothing is scheduled: the uses are reached by the flow
// step or in the next pass. Unlike an assignment, any change to a constant asks for another pass. The
// operands hold values and ranges their definitions already adjusted to the variable, so the meet and
// the hull are stored as they are. (Merging the bounds before the value is stored gives what merging
// them after would: only an operand without a range has its value for bounds, and storing the value
// of a phi function's own variable without a range stores no range either.)
void KvCControlFlowGraph::visitPhiFunction(KvCPhiFunction* pPhi, node v, bool& changed) {
  KvCCfgVariable* pVariable = pPhi->getVariable();
  DefinitionSnapshot before(*pVariable);
  KvCCfgValue* pOld = pVariable->getValue();
  PhiMerge::Result merged = m_pPropagation->mergeOperands(v, *pPhi);
  pVariable->setVarValue(merged.value);
  if (!pOld->isConstant() && merged.value.isConstant()) changed = true;
  pVariable->setVarRange(merged.minimum, merged.maximum);
  if (!before.matches(*pVariable)) m_pPropagation->definitionChanged(v, *pVariable);
  delete pOld;
}

int KvCControlFlowGraph::countExecutableInEdges(node v) const { return m_pPropagation->executableInEdges(v); }

int KvCControlFlowGraph::countCfgOutEdges(node v) const {
  int count = 0;
  for (edge e = firstCfgOutEdge(*this, v); e; e = nextCfgOutEdge(*this, e)) ++count;
  return count;
}
