// The SSA driver, phi placement and renaming.
//
//   before:  E -> A [if (c)];  A -T-> B [x = 1];  A -F-> C [x = 2];  B, C -> D [y = x] -> X
//   after:   E -> [c1 = init; x1 = init; y1 = init] -> A [if (c1)]
//            B [x2 = 1];  C [x3 = 2];  D [x4 = phi(x2, x3); y2 = x4] -> [output y2] -> X
//   (y an output variable; operand i of a phi function belongs to the i-th in-edge of its block)
//
// Needs: one entry node per procedure, exit nodes placed, the start node set, every call registered
// with the procedure it calls (transformToSSAForm refuses a graph without them).
#include <cstddef>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/dominator_tree.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::list;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;

namespace {

// Source lines of the check points between the steps of transformToSSAForm.
constexpr int kLineCheckAfterEntryBlocks = 3083;
constexpr int kLineCheckAfterValueReturns = 3085;
constexpr int kLineCheckAfterOutputs = 3087;
constexpr int kLineCheckAfterPhiFunctions = 3092;
// An exit node that belongs to no procedure needs a phi function.
constexpr int kLineExitWithoutProcedure = 1811;

// What renaming cannot connect (a use or definition without reaching version) or does not know (a
// statement of another kind): the source line of its report, and whether the host's internal error
// follows the consistency report.
struct RenamingFault {
  int line;
  bool internalError;
};
constexpr RenamingFault kNoVersionForAssignmentUse{1904, true};
constexpr RenamingFault kNoVersionBeforeVirtualAssignment{1914, true};
constexpr RenamingFault kNoNonVirtualAlias{1916, true};
constexpr RenamingFault kNoVersionForCallArgument{1972, false};
constexpr RenamingFault kNoVersionForOutput{1985, true};
constexpr RenamingFault kNoVersionForExternCallUse{2005, false};
constexpr RenamingFault kStatementOfUnknownKind{2012, false};
constexpr RenamingFault kNoVersionForBranchCondition{2028, true};
constexpr RenamingFault kNoVersionForPhiOperand{2062, true};
constexpr RenamingFault kNoVersionForValueReturn{2087, false};

}  // namespace

// ---- The driver ----------------------------------------------------------------------------------

// The check points run only while internal information is shown; a failed one is reported and the
// transformation goes on.
void KvCControlFlowGraph::transformToSSAForm() {
  if (!beginStep(ssaopt::GraphOperation::TransformToSSAForm)) return;
  array<KvCDominatorTree*> trees;
  collectVarDefsAndUses();
  initVariablesAfterEntryNodes();
  KV_CONSISTENCY_CHECK(checkConsistency(), "checkConsistency()", kClassName, kLineCheckAfterEntryBlocks);
  placeValueReturnStatements();
  KV_CONSISTENCY_CHECK(checkConsistency(), "checkConsistency()", kClassName, kLineCheckAfterValueReturns);
  placeOutputStatements();
  KV_CONSISTENCY_CHECK(checkConsistency(), "checkConsistency()", kClassName, kLineCheckAfterOutputs);
  computeAllIdoms();
  int count = buildDominatorTrees(trees);
  computeDominanceFrontiers(trees);
  placePhiFunction();
  KV_CONSISTENCY_CHECK(checkConsistency(), "checkConsistency()", kClassName, kLineCheckAfterPhiFunctions);
  renameVariables(trees);
  freeDominatorTrees(trees, count);
  // Phi placement asked every block for the variables it assigns; renaming has since given each
  // definition its version, which the lists must name for the steps that build use sets from them.
  for (node v : nodes())
    if (KvCBasicBlock* pBlock = getBasicBlock(v)) pBlock->recomputeAssignedVariables();
  endStep(ssaopt::GraphOperation::TransformToSSAForm);
}

// ---- Phi placement -------------------------------------------------------------------------------

// Every block's list is recomputed first: one that a client asked for before the interface
// statements were added would hide their definitions, and the phi functions they need.
list<KvCCfgVariable*> KvCControlFlowGraph::getDefinedVariables(DefinitionSites& sites) {
  list<KvCCfgVariable*> variables;
  for (node v : nodes()) {
    KvCCfgNodeInfo* pInf = inf(v);
    if (!pInf) continue;
    if (KvCBasicBlock* pBlock = pInf->isBasicBlock()) pBlock->recomputeAssignedVariables();
    for (KvCCfgVariable* pVariable : pInf->getAssignedVariables()) {
      if (!sites.defined(pVariable)) variables.push_back(pVariable);
      sites[pVariable].push_back(v);
    }
  }
  return variables;
}

// Cytron et al.'s worklist over the iterated dominance frontier, with per-node stamps of the last
// variable that put the node on the worklist (work) and gave it a phi function (hasAlready), so that
// nothing is cleared between variables. The placement is minimal, not pruned: liveness is not asked.
void KvCControlFlowGraph::placePhiFunction() {
  if (!beginStep(ssaopt::GraphOperation::PlacePhiFunction)) return;
  node_array<int> work(*this, 0);
  node_array<int> hasAlready(*this, 0);
  DefinitionSites sites;
  list<KvCCfgVariable*> variables = getDefinedVariables(sites);
  int iteration = 0;
  list<node> worklist;
  for (KvCCfgVariable* pVariable : variables) {
    ++iteration;
    for (node x : sites[pVariable]) {
      work[x] = iteration;
      worklist.push_back(x);
    }
    for (; !worklist.empty(); worklist.pop_front()) {
      KvCCfgNodeInfo* pInf = inf(worklist.front());
      if (!pInf) continue;
      for (node y : *pInf->getDF()) {
        if (hasAlready[y] >= iteration) continue;
        if (KvCBasicBlock* pBlock = blockForPhiFunctions(y))
          pBlock->append(new KvCPhiFunction(pVariable, indeg(y)));
        hasAlready[y] = iteration;
        if (work[y] < iteration) {
          work[y] = iteration;
          worklist.push_back(y);
        }
      }
    }
  }
  endStep(ssaopt::GraphOperation::PlacePhiFunction);
}

// An exit node becomes a block the first time it needs a phi function; any other node of a frontier
// must be a block already (null otherwise, and the phi function is not placed).
KvCBasicBlock* KvCControlFlowGraph::blockForPhiFunctions(node y) {
  KvCCfgNodeInfo* pInf = inf(y);
  if (!pInf) return nullptr;
  if (pInf->isExitNode()) return turnExitIntoBlock(y);
  return pInf->isBasicBlock();
}

// The exit payload moves on to a new node behind y and stays the procedure's exit; y keeps its
// in-edges, on which the phi operands depend, and its place in the dominator tree. The new block
// takes over y's dominator information; the new exit node is dominated by y alone and has an empty
// frontier.
KvCBasicBlock* KvCControlFlowGraph::turnExitIntoBlock(node y) {
  KvCCfgExit* pExit = inf(y)->isExitNode();
  node exit = new_node(pExit);
  newPlainEdge(y, exit);
  KvCBasicBlock* pBlock = new KvCBasicBlock();
  pBlock->setIdom(pExit->getIdom());
  *pBlock->getDF() = *pExit->getDF();
  assign(y, pBlock);
  pExit->setIdom(y);
  pExit->getDF()->clear();
  KvCCfgProcedure* pProcedure = pExit->getProcedure();
  KV_CONSISTENCY_CHECK(pProcedure, "pProcedure", kClassName, kLineExitWithoutProcedure);
  pBlock->setProcedure(pProcedure);
  if (pProcedure) pProcedure->setExitNode(exit);
  return pBlock;
}

// ---- Renaming ------------------------------------------------------------------------------------

// The classic walk over each dominator tree with one stack of versions per variable (Cytron et al.):
// every definition gets a new version, pushed for the subtree it dominates; every use takes the top
// of its variable's stack. The walk keeps its own stack of tree nodes instead of recursing, since a
// tree is as deep as the longest straight line of blocks.
//
// A use that finds no version (which a graph with its interface statements in place never has) is
// reported and names the original variable, a phi operand included: that is never null, never
// dangling, and shows which variable lacked a definition. A virtual definition without a reaching
// version, or whose reaching version has no non-virtual alias, stands for itself as a non-virtual
// one does.
class KvCControlFlowGraph::SSARenamer {
public:
  explicit SSARenamer(KvCControlFlowGraph& G) : m_G(G), m_InPosition(G, 0) {
    for (node v : G.nodes()) {
      int position = 0;
      for (edge e : G.in(v)) m_InPosition[e] = position++;
    }
  }

  void traverseDominatorTree(node root, const KvCDominatorTree& tree) {
    enter(root, tree);
    while (!m_Visits.empty()) {
      Visit& visit = m_Visits.back();
      if (visit.nextChild) {
        node child = tree.target(visit.nextChild);
        visit.nextChild = tree.adj_succ(visit.nextChild);
        enter(child, tree);
      } else {
        leave(visit.firstPush);
        m_Visits.pop_back();
      }
    }
  }

private:
  struct Visit {
    edge nextChild;         // the next tree edge to a child, nil when all children are done
    std::size_t firstPush;  // where this visit's pushes begin in m_Pushed
  };

  void enter(node t, const KvCDominatorTree& tree) {
    std::size_t firstPush = m_Pushed.size();
    node x = tree.inf(t);
    if (KvCCfgNodeInfo* pInf = m_G.inf(x))
      if (KvCBasicBlock* pBlock = pInf->isBasicBlock()) renameBlock(*pBlock);
    for (edge e : m_G.out(x)) passVersionsAlong(e);
    m_Visits.push_back({tree.first_adj_edge(t), firstPush});
  }

  // Every version that the visit pushed leaves with it, in push order.
  void leave(std::size_t firstPush) {
    for (std::size_t i = firstPush; i < m_Pushed.size(); ++i) m_Pushed[i]->popSSAReplacement();
    m_Pushed.resize(firstPush);
  }

  void renameBlock(const KvCBasicBlock& block) {
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) defineVersion(*pPhi);
    for (KvCCfgStatement* pStatement : block.getStatementSeq()) renameStatement(*pStatement);
    if (KvCCfgExpression* pCond = block.getBranchCond()) renameUses(*pCond, kNoVersionForBranchCondition);
  }

  void renameStatement(KvCCfgStatement& statement) {
    if (KvCCfgAssignment* pAssignment = statement.isAssignment())
      renameAssignment(*pAssignment);
    else if (KvCCfgParamStatement* pParam = statement.isParamStatement())
      defineVersion(*pParam);
    else if (KvCCfgValueReturnStatement* pReturn = statement.isValueReturnStatement())
      defineVersion(*pReturn);
    else if (KvCCfgProcedureCall* pCall = statement.isProcedureCall())
      renameArguments(pCall);
    else if (KvCCfgOutputStatement* pOutput = statement.isOutputStatement())
      renameOutput(*pOutput);
    else if (KvCCfgExternCall* pExternCall = statement.isExternCall())
      renameUses(*pExternCall, kNoVersionForExternCallUse);
    else
      report(kStatementOfUnknownKind);
  }

  void renameAssignment(KvCCfgAssignment& assignment) {
    if (KvCCfgExpression* pRHS = assignment.getRHS()) renameUses(*pRHS, kNoVersionForAssignmentUse);
    KvCCfgVariable* pVariable = assignment.getLHS();
    if (!pVariable) return;
    KvCSSAVariable* pVersion = new KvCSSAVariable(pVariable);
    if (assignment.getIsVirtual()) linkToNonVirtualAlias(*pVersion, *pVariable);
    assignment.setLHS(pVersion);
    push(pVariable, pVersion);
  }

  // A virtual definition names the last non-virtual definition that reaches it.
  void linkToNonVirtualAlias(KvCSSAVariable& version, const KvCCfgVariable& variable) {
    KvCCfgVariable* pReaching = reachingVersion(variable, kNoVersionBeforeVirtualAssignment);
    if (!pReaching) return;
    KvCCfgVariable* pAlias = pReaching->getNonVirtualAlias();
    if (!pAlias) {
      report(kNoNonVirtualAlias);
      return;
    }
    version.setNonVirtualAlias(pAlias);
    pAlias->appendVirtualAlias(&version);
  }

  // Phi functions, parameter and value-return statements define the variable they name. A
  // parameter statement's arguments are renamed at the calls, a value-return statement's expression
  // at the callee's exit.
  template <class Definition>
  void defineVersion(Definition& definition) {
    KvCCfgVariable* pVariable = definition.getVariable();
    if (!pVariable) return;
    KvCSSAVariable* pVersion = new KvCSSAVariable(pVariable);
    definition.setVariable(pVersion);
    push(pVariable, pVersion);
  }

  // The call itself defines nothing; its arguments take the caller's versions. A call that passes
  // no argument for a formal (one placed without being registered) has nothing to rename.
  void renameArguments(KvCCfgProcedureCall* pCall) {
    const KvCCfgProcedure* pCallee = m_G.findProcedure(pCall->getName());
    if (!pCallee) return;
    for (const KvCCfgParamStatement* pParam : pCallee->getParamStatements())
      if (KvCCfgExpression* pArgument = pParam->getArgument(pCall))
        renameUses(*pArgument, kNoVersionForCallArgument);
  }

  void renameOutput(KvCCfgOutputStatement& output) {
    KvCCfgVariable* pVariable = output.getVariable();
    if (!pVariable) return;
    if (KvCCfgVariable* pVersion = reachingVersion(*pVariable, kNoVersionForOutput))
      output.setVariable(pVersion);
  }

  // An expression, or an external call, that reads variables and renames them on request.
  template <class Reader>
  void renameUses(Reader& reader, RenamingFault fault) {
    for (KvCCfgVariable* pVariable : reader.getUsedVariables())
      if (KvCCfgVariable* pVersion = reachingVersion(*pVariable, fault))
        reader.replaceVariable(pVariable, pVersion);
  }

  void passVersionsAlong(edge e) {
    KvCCfgNodeInfo* pTarget = m_G.inf(m_G.target(e));
    if (!pTarget) return;
    if (KvCBasicBlock* pBlock = pTarget->isBasicBlock())
      setPhiOperands(*pBlock, m_InPosition[e]);
    else if (KvCCfgExit* pExit = pTarget->isExitNode())
      renameValueReturns(pExit->getProcedure());
  }

  // A block visited before names versions in its phi functions already; their variables lead back
  // to the original.
  void setPhiOperands(const KvCBasicBlock& block, int position) {
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) {
      KvCCfgVariable* pVariable = pPhi->getVariable();
      if (KvCSSAVariable* pVersion = pVariable->isSSAVariable()) pVariable = pVersion->getOrigVar();
      KvCCfgVariable* pReaching = reachingVersion(*pVariable, kNoVersionForPhiOperand);
      pPhi->setReplacementVariable(position, pReaching ? pReaching : pVariable);
    }
  }

  // The callee's versions at its exit flow back to every call. An exit with several predecessors is
  // met once per predecessor; versions from the first are final, since the phi functions placed at
  // the exit leave all predecessors with the same reaching versions.
  void renameValueReturns(const KvCCfgProcedure* pProcedure) {
    if (!pProcedure) return;
    for (const KvCCfgValueReturnStatement* pReturn : pProcedure->getValueReturnStatements()) {
      KvCCfgExpression* pExpression = pReturn->getExpression();
      if (!pExpression) continue;
      for (KvCCfgVariable* pVariable : pExpression->getUsedVariables()) {
        if (pVariable->isSSAVariable()) continue;
        if (KvCCfgVariable* pVersion = reachingVersion(*pVariable, kNoVersionForValueReturn))
          pExpression->replaceVariable(pVariable, pVersion);
      }
    }
  }

  KvCCfgVariable* reachingVersion(const KvCCfgVariable& variable, RenamingFault fault) {
    KvCCfgVariable* pVersion = variable.topSSAReplacement();
    if (!pVersion) report(fault);
    return pVersion;
  }

  void push(KvCCfgVariable* pVariable, KvCSSAVariable* pVersion) {
    m_Pushed.push_back(pVariable);
    pVariable->pushSSAReplacement(pVersion);
  }

  static void report(RenamingFault fault) {
    KV_CONSISTENCY_CHECK(false, "0", kClassName, fault.line);
    if (fault.internalError) ssaopt::reportInternalError(kClassName, fault.line);
  }

  KvCControlFlowGraph& m_G;
  // Position of each edge among the in-edges of its target: the index of the phi operands it feeds.
  ssaopt::edge_array<int> m_InPosition;
  // Every variable a visit on the walk's current path has pushed a version for, in push order.
  array<KvCCfgVariable*> m_Pushed;
  array<Visit> m_Visits;
};

// The trees are renamed in component order; each walk pops what it pushes, so the stacks are empty
// between procedures and their order does not matter. A tree without entry is passed by.
void KvCControlFlowGraph::renameVariables(array<KvCDominatorTree*>& trees) {
  SSARenamer renamer(*this);
  for (const KvCDominatorTree* pTree : trees)
    if (pTree && pTree->getRoot()) renamer.traverseDominatorTree(pTree->getRoot(), *pTree);
}
