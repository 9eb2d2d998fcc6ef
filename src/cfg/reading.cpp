// Reading the graph back, as a client does to print or emit it: control-flow edges apart from the SSA
// edges, the in-edges that phi operands belong to once blocks are divided, and the blocks of every
// procedure in program order.
//
//   divided:  A -> [x.3 = phi(x.1, x.2)] -> [y.3 = phi(y.1, y.2)] -> [z = x.3 + y.3]
//             B ->
//   getPhiOperandEdges(the node of y.3) = the in-edges from A and B, those of the chain's first node
//
// Needs nothing of the graph's state.
#include <algorithm>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;

array<edge> KvCControlFlowGraph::getControlFlowOutEdges(node v) const {
  array<edge> edges;
  for (edge e : out(v))
    if (isControlFlowEdge(e)) edges.push_back(e);
  return edges;
}

array<edge> KvCControlFlowGraph::getControlFlowInEdges(node v) const {
  array<edge> edges;
  for (edge e : in(v))
    if (isControlFlowEdge(e)) edges.push_back(e);
  return edges;
}

bool KvCControlFlowGraph::hasOneControlFlowInEdge(node v) const {
  std::size_t count = 0;
  for (edge e : in(v))
    if (isControlFlowEdge(e) && ++count > 1) return false;
  return count == 1;
}

// ---- Chains of phi functions ---------------------------------------------------------------------

// Dividing puts a block's phi functions first, one per block, so a link into a block that holds a phi
// function or nothing comes from another piece of the same chain.
bool KvCControlFlowGraph::holdsPhiFunctionOrNothing(node v) const {
  const KvCBasicBlock* pBlock = getBasicBlock(v);
  return pBlock && pBlock->getStatementSeq().empty() && !pBlock->getBranchCond();
}

bool KvCControlFlowGraph::isPhiChainLink(edge e) const {
  return m_DividedBlockLinks[e] && holdsPhiFunctionOrNothing(source(e)) &&
         holdsPhiFunctionOrNothing(target(e));
}

// A piece after the first has the link from the piece before as its only control-flow in-edge.
node KvCControlFlowGraph::getPhiChainHead(node v) const {
  for (;;) {
    edge only = nil;
    int count = 0;
    for (edge e : in(v))
      if (isControlFlowEdge(e) && ++count == 1) only = e;
    if (count != 1 || !isPhiChainLink(only)) return v;
    v = source(only);
  }
}

array<edge> KvCControlFlowGraph::getPhiOperandEdges(node v) const {
  return getControlFlowInEdges(getPhiChainHead(v));
}

// ---- Program order -------------------------------------------------------------------------------

namespace {

// Lays out the blocks of one procedure after another; `isShown` is never empty here.
class ProgramOrder {
public:
  ProgramOrder(const KvCControlFlowGraph& G, const std::function<bool(node)>& isShown)
      : m_G(G), m_IsShown(isShown), m_Placed(G, false) {}

  void layOut(ssaopt::ProcedureBlocks& procedure, const array<node>& blocks) {
    node entry = procedure.pProcedure->getEntryNode();
    if (m_G.outdeg(entry) > 0) placeChainFrom(m_G.target(m_G.first_adj_edge(entry)), procedure.blocks);
    for (node start : blocks) placeChainFrom(start, procedure.blocks);
  }

private:
  bool isShown(node v) const { return m_G.getBasicBlock(v) && m_IsShown(v); }

  void placeChainFrom(node start, array<node>& into) {
    for (node v = start; v && isShown(v) && !m_Placed[v]; v = continuationOf(v)) {
      m_Placed[v] = true;
      into.push_back(v);
    }
  }

  // The block that `v` falls into and that nothing else enters, or nil.
  node continuationOf(node v) const {
    if (m_G.getBasicBlock(v)->getBranchCond()) return nil;
    array<edge> out = m_G.getControlFlowOutEdges(v);
    if (out.size() != 1) return nil;
    node next = m_G.target(out[0]);
    return isShown(next) && m_G.hasOneControlFlowInEdge(next) ? next : node(nil);
  }

  const KvCControlFlowGraph& m_G;
  const std::function<bool(node)>& m_IsShown;
  ssaopt::node_array<bool> m_Placed;
};

}  // namespace

// The blocks are bucketed by procedure first, so the whole layout is linear in the graph.
array<ssaopt::ProcedureBlocks> KvCControlFlowGraph::getProgramOrder(
    const std::function<bool(node)>& isShown) const {
  array<ssaopt::ProcedureBlocks> procedures;
  for (const auto& named : m_Procedures) procedures.push_back({named.second, {}});
  std::sort(procedures.begin(), procedures.end(), [](const auto& a, const auto& b) {
    return a.pProcedure->getEntryNode().index() < b.pProcedure->getEntryNode().index();
  });
  ssaopt::map<const KvCCfgProcedure*, std::size_t> position;
  for (std::size_t i = 0; i < procedures.size(); ++i) position[procedures[i].pProcedure] = i;

  const std::function<bool(node)> all = [](node) { return true; };
  const std::function<bool(node)>& shown = isShown ? isShown : all;
  array<array<node>> blocksOf(procedures.size());
  for (node v : nodes()) {
    KvCBasicBlock* pBlock = getBasicBlock(v);
    const std::size_t* pPosition = pBlock ? position.lookup(pBlock->getProcedure()) : nullptr;
    if (pPosition && shown(v)) blocksOf[*pPosition].push_back(v);
  }
  ProgramOrder order(*this, shown);
  for (std::size_t i = 0; i < procedures.size(); ++i) order.layOut(procedures[i], blocksOf[i]);
  return procedures;
}
