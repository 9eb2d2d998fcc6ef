// Dead-code elimination between the passes of sparse conditional constant propagation: the blocks
// that the pass did not reach go, and the phi functions of the reached blocks they led to lose the
// operand of the edge that came from them.
//
//   before (the pass reached B1 and J, not B2):  B1 -> J,  B2 -> J,  J: x.3 = phi(x.1, x.2)
//   after:                                        B1 -> J,            J: x.3 = phi(x.1)
//
// Needs divided blocks and the visited marks of the pass that has just ended.
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;

namespace {

// The variables at `positions` (ascending) of the operands `before` that no other operand names.
ssaopt::set<KvCCfgVariable*> operandsNoLongerRead(const ssaopt::array<KvCCfgVariable*>& before,
                                                  const ssaopt::array<int>& positions) {
  ssaopt::set<KvCCfgVariable*> removed;
  ssaopt::set<KvCCfgVariable*> kept;
  auto nextRemoved = positions.begin();
  for (std::size_t i = 0; i < before.size(); ++i) {
    bool isRemoved = nextRemoved != positions.end() && static_cast<std::size_t>(*nextRemoved) == i;
    (isRemoved ? removed : kept).insert(before[i]);
    if (isRemoved) ++nextRemoved;
  }
  for (KvCCfgVariable* pVariable : kept) removed.erase(pVariable);
  removed.erase(nullptr);
  return removed;
}

// A parameter statement reads what the arguments of all calls of its procedure read; when a dead
// block takes a call with it, the argument of that call goes (forgetDeletedStatements), and the use
// sets must no longer name the parameter's node for what only that argument read. So the nodes of
// the parameters of every procedure whose call dies are noted with what they read before.
class ParameterReads {
public:
  template <class IsDead>
  void noteCallsIn(const KvCControlFlowGraph& G, const KvCBasicBlock& block, IsDead isDead) {
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall())
        if (const KvCCfgProcedure* pCallee = G.findProcedure(pCall->getName()))
          if (m_Callees.insert(pCallee).second) noteParametersOf(G, *pCallee, isDead);
  }

  void dropGoneReads(const KvCControlFlowGraph& G) {
    for (auto& noted : m_ReadBefore) {
      ssaopt::set<KvCCfgVariable*> readNow = G.getBasicBlock(noted.first)->getUsedVariables();
      for (KvCCfgVariable* pVariable : noted.second)
        if (!readNow.count(pVariable)) pVariable->delUse(noted.first);
    }
  }

private:
  // The parameter statements stand in the blocks right after the entry, together or one per block
  // (some emptied by removeUnusedVarDefs). A dead node is not noted: its destruction takes it out of
  // every use set.
  template <class IsDead>
  void noteParametersOf(const KvCControlFlowGraph& G, const KvCCfgProcedure& callee, IsDead isDead) {
    node entry = callee.getEntryNode();
    node v = entry && G.outdeg(entry) == 1 ? G.target(G.first_adj_edge(entry)) : node(nil);
    while (v && holdsParametersOrNothing(G.getBasicBlock(v))) {
      if (!isDead(v)) m_ReadBefore[v] = G.getBasicBlock(v)->getUsedVariables();
      ssaopt::array<edge> out = G.getControlFlowOutEdges(v);
      v = out.size() == 1 ? G.target(out[0]) : node(nil);
    }
  }

  static bool holdsParametersOrNothing(const KvCBasicBlock* pBlock) {
    if (!pBlock || pBlock->getBranchCond() || !pBlock->getPhiFunctions().empty()) return false;
    for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
      if (!pStatement->isParamStatement()) return false;
    return true;
  }

  ssaopt::set<const KvCCfgProcedure*> m_Callees;
  ssaopt::map<node, ssaopt::set<KvCCfgVariable*>> m_ReadBefore;
};

}  // namespace

// Deleting the node in hand is all that happens to the node list, so the live view serves.
bool KvCControlFlowGraph::eliminateDeadCode() {
  keepExitsAttached();
  bool removedOperand = false;
  ParameterReads parameterReads;
  for (node n : nodes()) {
    if (!isDeadBlock(n)) continue;
    unsettleProceduresOfDeadBlock(n);
    while (node t = reachedPhiSuccessor(n)) {
      removeDeadOperands(t);
      removedOperand = true;
    }
    parameterReads.noteCallsIn(*this, *getBasicBlock(n), [this](node v) { return isDeadBlock(v); });
    destroyDeadBlock(n);
  }
  forgetDeletedStatements();
  parameterReads.dropGoneReads(*this);
  return removedOperand;
}

// Entry and exit nodes stay, reached or not.
bool KvCControlFlowGraph::isDeadBlock(node v) const { return !isVisited(v) && getBasicBlock(v); }

// A procedure that the constants never let end (a loop whose condition stays true) would lose every
// path to its exit node with the dead blocks, and the exit would stand apart from its procedure,
// which the graph's consistency forbids. One edge from a reached block into the dead ones, which no
// run takes, is bent to the exit instead: "if 1 goto spin else end". It keeps its place among the
// out-edges of its source, so its branch stays what it was.
void KvCControlFlowGraph::keepExitsAttached() {
  ssaopt::array<KvCCfgProcedure*> cutOff;
  for (const auto& named : m_Procedures)
    if (named.second->getExitNode() && losesEveryInEdge(named.second->getExitNode()))
      cutOff.push_back(named.second);
  if (cutOff.empty()) return;
  ssaopt::map<KvCCfgProcedure*, edge> intoDeadCode = firstEdgesIntoDeadCode();
  for (KvCCfgProcedure* pProcedure : cutOff)
    if (const edge* pEdge = intoDeadCode.lookup(pProcedure))
      move_edge(*pEdge, source(*pEdge), pProcedure->getExitNode());
}

bool KvCControlFlowGraph::losesEveryInEdge(node v) const {
  for (edge e : in(v))
    if (!inf(e)->isSSAEdge() && !isDeadBlock(source(e))) return false;
  return true;
}

// Per procedure, the first control-flow edge in node order that leads from a reached node to a dead
// block.
ssaopt::map<KvCCfgProcedure*, edge> KvCControlFlowGraph::firstEdgesIntoDeadCode() const {
  ssaopt::map<KvCCfgProcedure*, edge> first;
  for (node v : nodes()) {
    if (!isDeadBlock(v)) continue;
    KvCCfgProcedure* pProcedure = inf(v)->getProcedure();
    for (edge e : in(v))
      if (!inf(e)->isSSAEdge() && !isDeadBlock(source(e)) && !first.lookup(pProcedure)) first[pProcedure] = e;
  }
  return first;
}

// The first node of a chain may have lost its phi function to removeUnusedVarDefs while the later
// ones keep theirs, whose operands still follow its in-edges.
node KvCControlFlowGraph::reachedPhiSuccessor(node v) const {
  for (edge e = firstCfgOutEdge(v); e; e = nextCfgOutEdge(e)) {
    node t = target(e);
    if (!isVisited(t)) continue;
    for (node link = t; link; link = nextPhiChainLink(link))
      if (phiFunctionAt(link)) return t;
  }
  return nil;
}

KvCPhiFunction* KvCControlFlowGraph::phiFunctionAt(node v) const {
  KvCBasicBlock* pBlock = v ? getBasicBlock(v) : nullptr;
  return pBlock ? pBlock->isPhiFunction() : nullptr;
}

// The operands stand in the order of t's control-flow in-edges. One walk over them finds every edge
// from a dead block, so a phi node that many dead blocks lead to costs one walk, and a dead block with
// two edges into it loses both operands, not one operand of a live edge.
void KvCControlFlowGraph::removeDeadOperands(node t) {
  ssaopt::array<int> positions = removeDeadInEdges(t);
  for (node link = t; link; link = nextPhiChainLink(link))
    if (KvCPhiFunction* pPhi = phiFunctionAt(link)) removeOperands(link, *pPhi, positions);
}

// The positions, among t's control-flow in-edges, of those that come from dead blocks, in ascending
// order; the edges go.
ssaopt::array<int> KvCControlFlowGraph::removeDeadInEdges(node t) {
  ssaopt::array<int> positions;
  int position = 0;
  for (edge e : in(t)) {
    if (inf(e)->isSSAEdge()) continue;
    if (isDeadBlock(source(e))) {
      positions.push_back(position);
      del_edge(e);
    }
    ++position;
  }
  return positions;
}

// Every phi function of the block that divideBasicBlock cut into the chain starting at t has one
// operand per in-edge of t. The walk follows only the links it made: a block that held nothing but
// phi functions is followed by another join, whose phi functions belong to other edges. It passes
// links that removeUnusedVarDefs emptied.
node KvCControlFlowGraph::nextPhiChainLink(node link) const {
  edge next = firstCfgOutEdge(link);
  return next && isPhiChainLink(next) ? target(next) : nil;
}

// From the back, so that each position still names the operand it named before. A variable that no
// operand names any more is no longer used at `link`: its use set must say so, or a definition that
// only this operand read would never count as unused.
void KvCControlFlowGraph::removeOperands(node link, KvCPhiFunction& phi,
                                         const ssaopt::array<int>& positions) {
  ssaopt::array<KvCCfgVariable*> before = phi.getReplacementVariables();
  for (auto position = positions.rbegin(); position != positions.rend(); ++position)
    phi.delReplacement(*position);
  for (KvCCfgVariable* pVariable : operandsNoLongerRead(before, positions)) pVariable->delUse(link);
}

// No use set may keep the node, and no payload slot the block.
void KvCControlFlowGraph::destroyDeadBlock(node n) {
  KvCBasicBlock* pBlock = getBasicBlock(n);
  for (KvCCfgVariable* pVariable : pBlock->getUsedVariables()) pVariable->delUse(n);
  while (!pBlock->getPhiFunctions().empty()) deleteStatement(*pBlock, pBlock->getPhiFunctions().front());
  while (!pBlock->getStatementSeq().empty()) deleteStatement(*pBlock, pBlock->getStatementSeq().front());
  assign(n, nullptr);
  delete pBlock;
  del_node(n);
}

bool KvCControlFlowGraph::isDividedBlockLink(edge e) const { return m_DividedBlockLinks[e]; }
