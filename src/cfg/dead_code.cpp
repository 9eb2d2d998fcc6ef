// Dead-code elimination between the passes of sparse conditional constant propagation: the blocks
// that the pass did not reach go, and the phi functions of the reached blocks they led to lose the
// operand of the edge that came from them.
//
//   before (the pass reached B1 and J, not B2):  B1 -> J,  B2 -> J,  J: x.3 = phi(x.1, x.2)
//   after:                                        B1 -> J,            J: x.3 = phi(x.1)
//
// Needs divided blocks and the visited marks of the pass that has just ended.
#include <algorithm>

#include "graph_mechanism.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::cfg::firstCfgOutEdge;
using ssaopt::cfg::nextCfgOutEdge;

namespace {

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

class KvCControlFlowGraph::DeadCodeSweep {
public:
  explicit DeadCodeSweep(KvCControlFlowGraph& G) : m_G(G) {}

  // Entry and exit nodes stay, reached or not.
  bool isDeadBlock(node v) const { return !m_G.isVisited(v) && m_G.getBasicBlock(v); }

  // A reached phi node that a control-flow edge of `v` leads to, or nil. The first node of a chain
  // may have lost its phi function to removeUnusedVarDefs while the later ones keep theirs, whose
  // operands still follow its in-edges.
  node reachedPhiSuccessor(node v) const {
    for (edge e = firstCfgOutEdge(m_G, v); e; e = nextCfgOutEdge(m_G, e)) {
      node t = m_G.target(e);
      if (!m_G.isVisited(t)) continue;
      for (node link = t; link; link = nextPhiChainLink(link))
        if (phiFunctionAt(link)) return t;
    }
    return nil;
  }

  // The operands stand in the order of t's control-flow in-edges. One walk over them finds every
  // edge from a dead block, so a phi node that many dead blocks lead to costs one walk, and a dead
  // block with two edges into it loses both operands, not one operand of a live edge.
  void removeDeadOperands(node t) {
    removeDeadInEdges(t);
    for (node link = t; link; link = nextPhiChainLink(link))
      if (KvCPhiFunction* pPhi = phiFunctionAt(link)) removeOperands(link, *pPhi);
  }

  // A procedure that the constants never let end (a loop whose condition stays true) would lose every
  // path to its exit node with the dead blocks, and the exit would stand apart from its procedure,
  // which the graph's consistency forbids. One edge from a reached block into the dead ones, which no
  // run takes, is bent to the exit instead: "if 1 goto spin else end". It keeps its place among the
  // out-edges of its source, so its branch stays what it was.
  void keepExitsAttached() {
    array<KvCCfgProcedure*> cutOff;
    for (const auto& named : m_G.m_Procedures)
      if (named.second->getExitNode() && losesEveryInEdge(named.second->getExitNode()))
        cutOff.push_back(named.second);
    if (cutOff.empty()) return;
    ssaopt::map<KvCCfgProcedure*, edge> intoDeadCode = firstEdgesIntoDeadCode();
    for (KvCCfgProcedure* pProcedure : cutOff)
      if (const edge* pEdge = intoDeadCode.lookup(pProcedure))
        m_G.move_edge(*pEdge, m_G.source(*pEdge), pProcedure->getExitNode());
  }

  // No use set may keep the node, and no payload slot the block.
  void destroyDeadBlock(node n) {
    KvCBasicBlock* pBlock = m_G.getBasicBlock(n);
    for (KvCCfgVariable* pVariable : pBlock->getUsedVariables()) pVariable->delUse(n);
    while (!pBlock->getPhiFunctions().empty())
      m_G.deleteStatement(*pBlock, pBlock->getPhiFunctions().front());
    while (!pBlock->getStatementSeq().empty())
      m_G.deleteStatement(*pBlock, pBlock->getStatementSeq().front());
    m_G.assign(n, nullptr);
    delete pBlock;
    m_G.del_node(n);
  }

private:
  bool losesEveryInEdge(node v) const {
    for (edge e : m_G.in(v))
      if (!m_G.inf(e)->isSSAEdge() && !isDeadBlock(m_G.source(e))) return false;
    return true;
  }

  // Per procedure, the first control-flow edge in node order that leads from a reached node to a dead
  // block.
  ssaopt::map<KvCCfgProcedure*, edge> firstEdgesIntoDeadCode() const {
    ssaopt::map<KvCCfgProcedure*, edge> first;
    for (node v : m_G.nodes()) {
      if (!isDeadBlock(v)) continue;
      KvCCfgProcedure* pProcedure = m_G.inf(v)->getProcedure();
      for (edge e : m_G.in(v))
        if (!m_G.inf(e)->isSSAEdge() && !isDeadBlock(m_G.source(e)) && !first.lookup(pProcedure))
          first[pProcedure] = e;
    }
    return first;
  }

  KvCPhiFunction* phiFunctionAt(node v) const {
    KvCBasicBlock* pBlock = v ? m_G.getBasicBlock(v) : nullptr;
    return pBlock ? pBlock->isPhiFunction() : nullptr;
  }

  // Notes the positions, among t's control-flow in-edges, of those that come from dead blocks, in
  // ascending order; the edges go.
  void removeDeadInEdges(node t) {
    m_Positions.clear();
    int position = 0;
    for (edge e : m_G.in(t)) {
      if (m_G.inf(e)->isSSAEdge()) continue;
      if (isDeadBlock(m_G.source(e))) {
        m_Positions.push_back(position);
        m_G.del_edge(e);
      }
      ++position;
    }
  }

  // Every phi function of the block that divideBasicBlock cut into the chain starting at t has one
  // operand per in-edge of t. The walk follows only the links it made: a block that held nothing but
  // phi functions is followed by another join, whose phi functions belong to other edges. It passes
  // links that removeUnusedVarDefs emptied.
  node nextPhiChainLink(node link) const {
    edge next = firstCfgOutEdge(m_G, link);
    return next && m_G.isPhiChainLink(next) ? m_G.target(next) : nil;
  }

  // In one sweep: the operands that stay move to the front in their order, and the last places go,
  // each in constant time. A variable that no operand names any more is no longer used at `link`: its
  // use set must say so, or a definition that only this operand read would never count as unused.
  void removeOperands(node link, KvCPhiFunction& phi) {
    m_Kept.clear();
    m_Removed.clear();
    const array<KvCCfgVariable*>& operands = phi.replacementVariables();
    auto nextRemoved = m_Positions.begin();
    for (std::size_t i = 0; i < operands.size(); ++i) {
      bool removed = nextRemoved != m_Positions.end() && static_cast<std::size_t>(*nextRemoved) == i;
      (removed ? m_Removed : m_Kept).push_back(operands[i]);
      if (removed) ++nextRemoved;
    }
    for (std::size_t i = 0; i < m_Kept.size(); ++i)
      phi.setReplacementVariable(static_cast<int>(i), m_Kept[i]);
    for (std::size_t i = 0; i < m_Removed.size(); ++i) phi.delReplacement(phi.getDimension() - 1);
    dropUsesNoLongerRead(link);
  }

  void dropUsesNoLongerRead(node link) {
    ssaopt::set_order<KvCCfgVariable*> order;
    std::sort(m_Kept.begin(), m_Kept.end(), order);
    std::sort(m_Removed.begin(), m_Removed.end(), order);
    m_Removed.erase(std::unique(m_Removed.begin(), m_Removed.end()), m_Removed.end());
    for (KvCCfgVariable* pVariable : m_Removed)
      if (pVariable && !std::binary_search(m_Kept.begin(), m_Kept.end(), pVariable, order))
        pVariable->delUse(link);
  }

  KvCControlFlowGraph& m_G;
  array<int> m_Positions;
  array<KvCCfgVariable*> m_Kept, m_Removed;
};

// Deleting the node in hand is all that happens to the node list, so the live view serves.
bool KvCControlFlowGraph::eliminateDeadCode() {
  DeadCodeSweep sweep(*this);
  sweep.keepExitsAttached();
  bool removedOperand = false;
  ParameterReads parameterReads;
  for (node n : nodes()) {
    if (!sweep.isDeadBlock(n)) continue;
    while (node t = sweep.reachedPhiSuccessor(n)) {
      sweep.removeDeadOperands(t);
      removedOperand = true;
    }
    parameterReads.noteCallsIn(*this, *getBasicBlock(n), [&sweep](node v) { return sweep.isDeadBlock(v); });
    sweep.destroyDeadBlock(n);
  }
  forgetDeletedStatements();
  parameterReads.dropGoneReads(*this);
  return removedOperand;
}
