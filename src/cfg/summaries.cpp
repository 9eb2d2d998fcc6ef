// Def/use summaries and the interface statements that make the data flow between procedures
// explicit: variables are global, so a procedure passes values to another through the variables that
// the callee reads and writes.
//
//   before:  #main: E -> [x = y + 1; call P] -> X             P: E' -> [y = 2] -> X'
//   after:   #main: E -> [x = init; y = init] -> [x = y + 1; call P; y = return P.y] -> [output x] -> X
//            P:     E' -> [y = param (from the call in #main: y)] -> [y = 2] -> X'
//   (x an output variable; the summaries are #main: defines {x, y}, uses {y}; P: defines {y})
//
// Needs: exit nodes placed; every call of a procedure registered with it.
#include <cstddef>
#include <iterator>

#include "graph_mechanism.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "ssaopt/ir/variable_expression.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::list;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;
using ssaopt::cfg::kGraphClass;
using ssaopt::cfg::newBlockNode;
using ssaopt::cfg::newPlainEdge;
using ssaopt::cfg::reportInternalFault;
using Variables = ssaopt::set<KvCCfgVariable*>;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineUnknownStatementInSummary = 1547;
constexpr int kLineInitBlockNotABlock = 1618;
constexpr int kLineParamBlockNotABlock = 1641;
constexpr int kLineNodeWithoutPayload = 1684;

// The variables that `pCall` passes for the formal of `param`. A call without an argument passes the
// formal itself, as the parameter statements that the summaries add do.
Variables passedVariables(const KvCCfgParamStatement& param, KvCCfgProcedureCall* pCall) {
  if (const KvCCfgExpression* pArgument = param.getArgument(pCall)) return pArgument->getUsedVariables();
  return {param.getVariable()};
}

KvCCfgVariableExpression* expressionOf(KvCCfgVariable* pVariable) {
  KvCCfgVariableExpression* pExpression = new KvCCfgVariableExpression();
  pExpression->addVariable(pVariable);
  return pExpression;
}

// A variable without initial value starts undetermined, which is what no assignment would give.
KvCCfgValue initialValueOf(const KvCCfgVariable& variable) {
  const KvCCfgValue* pValue = variable.getInitValue();
  return pValue ? *pValue : KvCCfgValue();
}

// Bottom-up over the function call graph, each recursive group collapsed into one node, so that
// every procedure's summary takes in everything it calls directly or indirectly.
class CalleeSummaries {
public:
  CalleeSummaries(ssaopt::graph& fcg, const ssaopt::map<node, KvCCfgProcedure*>& procedures)
      : m_Fcg(fcg), m_ProcedureOf(procedures) {
    std::size_t count = static_cast<std::size_t>(STRONG_COMPONENTS(m_Fcg, m_Component));
    m_Defs.resize(count);
    m_Uses.resize(count);
    m_Members.resize(count);
    for (node n : m_Fcg.nodes()) {
      if (const KvCCfgProcedure* pProcedure = procedureOf(n)) {
        ssaopt::insertAll(defs(n), pProcedure->getDefinedVariables());
        ssaopt::insertAll(uses(n), pProcedure->getUsedVariables());
      }
      m_Members[componentOf(n)].insert(n);
    }
  }

  // Every group of mutually recursive procedures becomes one new node without procedure, which
  // takes over all edges of the group; the edges within the group become self-loops and go.
  void collapseRecursion() {
    for (std::size_t c = 0; c < m_Members.size(); ++c)
      if (m_Members[c].size() > 1) collapse(c);
    for (edge e : m_Fcg.all_edges())
      if (m_Fcg.source(e) == m_Fcg.target(e)) m_Fcg.del_edge(e);
  }

  // A node is handled once all its callees are: it hands its summary to each caller. The count of
  // callees not yet handled stands in for looking at all of a caller's callees again per edge.
  void propagateToCallers() {
    node_array<bool> done(m_Fcg, false);
    node_array<int> calleesLeft(m_Fcg, 0);
    list<node> ready;
    for (node n : m_Fcg.nodes()) {
      calleesLeft[n] = m_Fcg.outdeg(n);
      if (calleesLeft[n] == 0) ready.push_back(n);
    }
    for (; !ready.empty(); ready.pop_front()) {
      node n = ready.front();
      if (done[n]) continue;
      done[n] = true;
      for (edge e : m_Fcg.in(n)) --calleesLeft[m_Fcg.source(e)];
      for (edge e : m_Fcg.in(n)) {
        node caller = m_Fcg.source(e);
        handOver(n, caller);
        if (calleesLeft[caller] == 0) ready.push_back(caller);
      }
    }
  }

  void storeInProcedures() const {
    for (std::size_t c = 0; c < m_Members.size(); ++c)
      for (node m : m_Members[c])
        if (KvCCfgProcedure* pProcedure = procedureOf(m)) {
          for (KvCCfgVariable* pVariable : m_Defs[c]) pProcedure->appendDefinedVariable(pVariable);
          for (KvCCfgVariable* pVariable : m_Uses[c]) pProcedure->appendUsedVariable(pVariable);
        }
  }

private:
  void collapse(std::size_t c) {
    node group = m_Fcg.new_node();
    m_Component[group] = static_cast<int>(c);
    for (node m : m_Members[c]) {
      for (edge e : m_Fcg.in_edges(m)) m_Fcg.move_edge(e, m_Fcg.source(e), group);
      for (edge e : m_Fcg.out_edges(m)) m_Fcg.move_edge(e, group, m_Fcg.target(e));
    }
  }

  void handOver(node callee, node caller) {
    if (componentOf(callee) == componentOf(caller)) return;
    ssaopt::insertAll(defs(caller), defs(callee));
    ssaopt::insertAll(uses(caller), uses(callee));
  }

  // The collapsed nodes have no procedure.
  KvCCfgProcedure* procedureOf(node n) const {
    KvCCfgProcedure* const* ppProcedure = m_ProcedureOf.lookup(n);
    return ppProcedure ? *ppProcedure : nullptr;
  }
  std::size_t componentOf(node n) const { return static_cast<std::size_t>(m_Component[n]); }
  Variables& defs(node n) { return m_Defs[componentOf(n)]; }
  Variables& uses(node n) { return m_Uses[componentOf(n)]; }

  ssaopt::graph& m_Fcg;
  const ssaopt::map<node, KvCCfgProcedure*>& m_ProcedureOf;
  node_array<int> m_Component;
  array<Variables> m_Defs, m_Uses;
  array<ssaopt::set<node>> m_Members;
};

void addUses(KvCCfgProcedure& procedure, const Variables& variables) {
  for (KvCCfgVariable* pVariable : variables) procedure.appendUsedVariable(pVariable);
}

// The call reads what its arguments read; what the callee defines reaches the caller through the
// call graph. A call of a name that is not in the table reads nothing.
void addArgumentUses(const KvCControlFlowGraph& G, KvCCfgProcedure& caller, KvCCfgProcedureCall* pCall) {
  const KvCCfgProcedure* pCallee = G.findProcedure(pCall->getName());
  if (!pCallee) return;
  for (const KvCCfgParamStatement* pParam : pCallee->getParamStatements())
    addUses(caller, passedVariables(*pParam, pCall));
}

void addDefsAndUsesOfBlock(const KvCControlFlowGraph& G, const KvCBasicBlock& block,
                           KvCCfgProcedure& procedure) {
  for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
    if (KvCCfgAssignment* pAssignment = pStatement->isAssignment()) {
      if (const KvCCfgExpression* pRHS = pAssignment->getRHS()) addUses(procedure, pRHS->getUsedVariables());
      if (KvCCfgVariable* pLHS = pAssignment->getLHS()) procedure.appendDefinedVariable(pLHS);
    } else if (KvCCfgExternCall* pExternCall = pStatement->isExternCall()) {
      addUses(procedure, pExternCall->getUsedVariables());
    } else if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall()) {
      addArgumentUses(G, procedure, pCall);
    } else {
      KV_CONSISTENCY_CHECK(false, "0", kGraphClass, kLineUnknownStatementInSummary);
    }
  }
  if (const KvCCfgExpression* pCond = block.getBranchCond()) addUses(procedure, pCond->getUsedVariables());
}

// Every call writes the formals that it passes before the callee runs, whether or not the callee's
// body assigns them: a caller that reads a formal after the call must see that write.
void addFormalsToDefinedVariables(const KvCControlFlowGraph& G) {
  for (const auto& named : G.getProcedures())
    for (const KvCCfgParamStatement* pParam : named.second->getParamStatements())
      named.second->appendDefinedVariable(pParam->getVariable());
}

// A call that passed fewer formals than the first, or that was placed without arguments, passes the
// formal's own value at the call, so that every call has an argument for renaming to update.
void passFormalWhereArgumentMissing(KvCCfgParamStatement& param, const list<KvCCfgProcedureCall*>& calls) {
  for (KvCCfgProcedureCall* pCall : calls)
    if (!param.getArgument(pCall)) param.setArgument(pCall, expressionOf(param.getVariable()));
}

}  // namespace

// ---- Def/use summaries ---------------------------------------------------------------------------

// A node belongs to the procedure whose entry lies in its component; nodes of a component without
// entry (an exit that nothing reaches) belong to none and count for nobody.
void KvCControlFlowGraph::collectVarDefsAndUses() {
  node_array<int> component;
  int count = COMPONENTS(*this, component);
  array<KvCCfgProcedure*> owner(static_cast<std::size_t>(count), nullptr);
  for (const auto& named : m_Procedures)
    owner[static_cast<std::size_t>(component[named.second->getEntryNode()])] = named.second;
  for (node v : nodes()) {
    KvCCfgProcedure* pProcedure = owner[static_cast<std::size_t>(component[v])];
    const KvCBasicBlock* pBlock = getBasicBlock(v);
    if (pProcedure && pBlock) addDefsAndUsesOfBlock(*this, *pBlock, *pProcedure);
  }
  addFormalsToDefinedVariables(*this);
  addVarDefsAndUsesOfCalledProcs();
}

void KvCControlFlowGraph::addVarDefsAndUsesOfCalledProcs() {
  ssaopt::graph fcg;
  ssaopt::map<node, KvCCfgProcedure*> procedureOf;
  buildFunctionCallGraph(fcg, procedureOf);
  CalleeSummaries summaries(fcg, procedureOf);
  summaries.collapseRecursion();
  summaries.propagateToCallers();
  summaries.storeInProcedures();
}

void KvCControlFlowGraph::deleteVarDefsAndUsesStoredAtProcedures() {
  for (const auto& named : m_Procedures) named.second->deleteInfoAboutVarDefAndUses();
}

// ---- Interface statements ------------------------------------------------------------------------

// Each procedure starts with a new block that defines every variable of its summary: the start
// procedure from the initial values, every other procedure from what its calls pass.
void KvCControlFlowGraph::initVariablesAfterEntryNodes() {
  for (const auto& named : m_Procedures) {
    KvCCfgProcedure* pProcedure = named.second;
    node entry = pProcedure->getEntryNode();
    if (!entry) continue;
    node first = newBlockNode(*this, pProcedure);
    for (edge e : out_edges(entry)) move_edge(e, first, target(e));
    newPlainEdge(*this, entry, first);
    Variables variables = pProcedure->getDefinedVariables();
    ssaopt::insertAll(variables, pProcedure->getUsedVariables());
    if (entry == getStartNode())
      addVarInits(first, variables);
    else
      addParamStatements(first, variables, pProcedure);
  }
}

void KvCControlFlowGraph::addVarInits(node v, Variables variables) {
  KvCBasicBlock* pBlock = getBasicBlock(v);
  KV_CONSISTENCY_CHECK(pBlock, "pBasicBlock", kGraphClass, kLineInitBlockNotABlock);
  if (!pBlock) return;
  for (KvCCfgVariable* pVariable : variables) {
    KvCCfgInitAssignment* pInit = new KvCCfgInitAssignment();
    pInit->setLHS(pVariable);
    pInit->setRHS(new KvCCfgValueExpression(initialValueOf(*pVariable)));
    pBlock->append(pInit);
  }
}

// The formals of setParametersOfCall come first, in parameter order; then one parameter statement
// for every other variable of the summary, each call passing the variable itself.
void KvCControlFlowGraph::addParamStatements(node v, Variables variables, KvCCfgProcedure* pProcedure) {
  KvCBasicBlock* pBlock = getBasicBlock(v);
  KV_CONSISTENCY_CHECK(pBlock, "pBasicBlock", kGraphClass, kLineParamBlockNotABlock);
  if (!pBlock) return;
  list<KvCCfgProcedureCall*> calls = pProcedure->getCalls();
  for (KvCCfgParamStatement* pParam : pProcedure->getParamStatements()) {
    passFormalWhereArgumentMissing(*pParam, calls);
    pBlock->append(pParam);
    variables.erase(pParam->getVariable());
  }
  for (KvCCfgVariable* pVariable : variables) {
    KvCCfgParamStatement* pParam = new KvCCfgParamStatement(pVariable);
    for (KvCCfgProcedureCall* pCall : calls) pParam->setArgument(pCall, expressionOf(pVariable));
    pBlock->append(pParam);
    pProcedure->appendParamStatement(pParam);
  }
}

// Nodes split off behind a call are met by the inner loop, not by the walk over the nodes that were
// there at the start. A node without payload is reported and passed by.
//
// The values a call brings back must be there before the next statement reads them, so the group of
// a call that does not end its block is placed right after it: the statements behind the call move
// into a new block, whose calls are handled next. A call that ends its block, or whose callee defines
// nothing, changes no block's shape.
void KvCControlFlowGraph::placeValueReturnStatements() {
  // Places the group of the first call of `v` that brings values back; the node holding the
  // statements behind it, or nil when none is left.
  auto placeAfterFirstCall = [this](node v) -> node {
    KvCBasicBlock* pBlock = getBasicBlock(v);
    if (!pBlock) return nil;
    const list<KvCCfgStatement*>& statements = pBlock->getStatementSeq();
    for (auto it = statements.begin(); it != statements.end(); ++it) {
      KvCCfgProcedureCall* pCall = (*it)->isProcedureCall();
      KvCCfgProcedure* pCallee = pCall ? findProcedure(pCall->getName()) : nullptr;
      if (!pCallee || pCallee->getDefinedVariables().empty()) continue;
      auto next = std::next(it);
      node rest = next == statements.end() ? nil : splitAtStatement(v, *next);
      addValueReturnStatements(pBlock, pCallee->getDefinedVariables(), pCallee);
      return rest;
    }
    return nil;
  };
  for (node v : all_nodes()) {
    if (!inf(v)) {
      reportInternalFault(kLineNodeWithoutPayload);
      continue;
    }
    for (node rest = v; rest;) rest = placeAfterFirstCall(rest);
  }
}

void KvCControlFlowGraph::addValueReturnStatements(KvCBasicBlock* pBlock, Variables variables,
                                                   KvCCfgProcedure* pProcedure) {
  for (KvCCfgVariable* pVariable : variables) {
    KvCCfgValueReturnStatement* pReturn = new KvCCfgValueReturnStatement(pVariable);
    pReturn->setExpression(expressionOf(pVariable));
    pBlock->append(pReturn);
    pProcedure->appendValueReturnStatement(pReturn);
  }
}

// Without "#main" or its exit there is no end of the program to keep outputs alive to.
void KvCControlFlowGraph::placeOutputStatements() {
  KvCCfgProcedure* pMain = findProcedure(kMainProcedureName);
  node exit = pMain ? pMain->getExitNode() : nil;
  if (!exit) return;
  node last = newBlockNode(*this, pMain);
  while (edge e = first_in_edge(exit)) move_edge(e, source(e), last);
  newPlainEdge(*this, last, exit);
  Variables outputs;
  for (const Variables& variables : {pMain->getDefinedVariables(), pMain->getUsedVariables()})
    for (KvCCfgVariable* pVariable : variables)
      if (pVariable->isOutput()) outputs.insert(pVariable);
  for (KvCCfgVariable* pVariable : outputs) getBasicBlock(last)->append(new KvCCfgOutputStatement(pVariable));
}
