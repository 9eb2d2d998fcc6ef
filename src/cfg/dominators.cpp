// Dominators: the immediate dominator of every node, one dominator tree per component (one per
// procedure), and the dominance frontier of every node.
//
//   graph:     E -> A;  A -> B;  A -> C;  B -> D;  C -> D
//   idoms:     A: E   B: A   C: A   D: A
//   tree:      E -> A -> {B, C, D}
//   frontiers: DF(B) = DF(C) = {D}, all others empty
//
// Needs: per component one node without in-edges, its entry node, that reaches every other node.
// Dominance is a matter of control flow: SSA edges, where there are any, take no part.
#include <algorithm>
#include <cstddef>

#include "graph_mechanism.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/dominator_tree.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;
using ssaopt::cfg::reportInternalFault;

namespace {

// Source line of the report for a component in which every node has an in-edge.
constexpr int kLineComponentWithoutRoot = 732;

node idomOf(const KvCControlFlowGraph& G, node v) {
  const KvCCfgNodeInfo* pInf = G.inf(v);
  return pInf ? pInf->getIdom() : nil;
}

// The local rule over the node's successors, then the up rule over its children's frontiers.
void fillFrontier(const KvCControlFlowGraph& G, const KvCDominatorTree& tree, node t) {
  node x = tree.inf(t);
  KvCCfgNodeInfo* pInf = G.inf(x);
  if (!pInf) return;
  for (edge e : G.out(x))
    if (idomOf(G, G.target(e)) != x) pInf->getDF()->insert(G.target(e));
  for (edge treeEdge : tree.out(t)) {
    KvCCfgNodeInfo* pChild = G.inf(tree.inf(tree.target(treeEdge)));
    const ssaopt::set<node>* pChildFrontier = pChild ? pChild->frontierIfAny() : nullptr;
    if (!pChildFrontier) continue;
    for (node y : *pChildFrontier)
      if (idomOf(G, y) != x) pInf->getDF()->insert(y);
  }
}

}  // namespace

// Lengauer and Tarjan, "A fast algorithm for finding dominators in a flowgraph" (TOPLAS 1979), in
// its balanced form: link by subtree size, path compression in eval, near-linear in the edges.
//
// The graph is read once into arrays indexed by creation number: each node's successors in adjacency
// order and its predecessors lie in one array each, the connected components come from a union-find
// over the edges. The working arrays are indexed by depth-first preorder number, numbered on across
// the components (each component's search starts where the last one ended), so no array is cleared
// between components. Number 0 is the empty vertex of the paper (semi 0, size 0, its own label and
// ancestor), which spares a sentinel node. The depth-first numbering and the path compression keep
// explicit stacks: their recursive forms go as deep as a straight line of blocks is long. Both visit,
// number and update in exactly the order of the recursive forms.
class KvCControlFlowGraph::LengauerTarjan {
public:
  explicit LengauerTarjan(const KvCControlFlowGraph& G)
      : m_Nodes(static_cast<std::size_t>(G.max_node_index() + 1)) {
    readAdjacency(G);
    std::size_t vertices = m_Nodes + 1;
    for (array<std::uint32_t>* pArray : {&m_Semi, &m_Label, &m_Ancestor, &m_Child, &m_Size, &m_Parent, &m_Dom,
                                         &m_Bucket, &m_NextInBucket, &m_Vertex})
      pArray->assign(vertices, kNone);
    m_Preorder.assign(m_Nodes, kNone);
    m_Idom.assign(m_Nodes, kNoNode);
    m_Count = 0;
  }

  // The connected components, edge directions ignored, numbered in the order in which the node order
  // first meets them; per component, the last node without in-edges in node order (kNoNode when it
  // has none).
  array<std::uint32_t> rootsOfComponents(const KvCControlFlowGraph& G) {
    array<std::uint32_t> representative(m_Nodes);
    for (std::uint32_t v = 0; v < m_Nodes; ++v) representative[v] = v;
    for (std::uint32_t v = 0; v < m_Nodes; ++v)
      for (std::uint32_t i = m_SuccStart[v]; i < m_SuccStart[v + 1]; ++i) unite(representative, v, m_Succ[i]);
    array<std::uint32_t> componentOf(m_Nodes, kNoNode), roots;
    for (node v : G.nodes()) {
      std::uint32_t r = find(representative, v.index());
      if (componentOf[r] == kNoNode) {
        componentOf[r] = static_cast<std::uint32_t>(roots.size());
        roots.push_back(kNoNode);
      }
      if (G.indeg(v) == 0) roots[componentOf[r]] = v.index();
    }
    return roots;
  }

  // Sets the immediate dominator of every node that `root` reaches, except the root.
  void run(std::uint32_t root) {
    std::uint32_t first = m_Count + 1;
    dfsDom(root);
    computeSemidominators(first);
    finishIdoms(first);
  }

  // The immediate dominator of `v`, nil for a root and for a node that no root reaches.
  node idomOf(node v) const { return ssaopt::graph::handleOf<node>(m_Idom[v.index()]); }

  static constexpr std::uint32_t kNoNode = ssaopt::detail::kNoRecord;

private:
  // Preorder number 0 stands for no vertex: the empty vertex of the algorithm, and "not yet numbered".
  static constexpr std::uint32_t kNone = 0;

  struct DfsFrame {
    std::uint32_t v;     // preorder number
    std::uint32_t next;  // position in m_Succ of the successor to look at when the search comes back
  };

  void readAdjacency(const KvCControlFlowGraph& G) {
    m_SuccStart.assign(m_Nodes + 1, 0);
    m_PredStart.assign(m_Nodes + 1, 0);
    for (node v : G.nodes()) {
      for (edge e : G.out(v))
        if (G.isControlFlowEdge(e)) ++m_SuccStart[v.index() + 1];
      for (edge e : G.in(v))
        if (G.isControlFlowEdge(e)) ++m_PredStart[v.index() + 1];
    }
    for (std::size_t v = 0; v < m_Nodes; ++v) {
      m_SuccStart[v + 1] += m_SuccStart[v];
      m_PredStart[v + 1] += m_PredStart[v];
    }
    m_Succ.resize(m_SuccStart[m_Nodes]);
    m_Pred.resize(m_PredStart[m_Nodes]);
    for (node v : G.nodes()) {
      std::uint32_t i = m_SuccStart[v.index()];
      for (edge e : G.out(v))
        if (G.isControlFlowEdge(e)) m_Succ[i++] = G.target(e).index();
      i = m_PredStart[v.index()];
      for (edge e : G.in(v))
        if (G.isControlFlowEdge(e)) m_Pred[i++] = G.source(e).index();
    }
  }

  static std::uint32_t find(array<std::uint32_t>& representative, std::uint32_t v) {
    while (representative[v] != v) v = representative[v] = representative[representative[v]];
    return v;
  }
  static void unite(array<std::uint32_t>& representative, std::uint32_t v, std::uint32_t w) {
    v = find(representative, v);
    w = find(representative, w);
    if (v != w) representative[std::max(v, w)] = std::min(v, w);
  }

  std::uint32_t number(std::uint32_t v, std::uint32_t parent) {
    std::uint32_t n = ++m_Count;
    m_Preorder[v] = n;
    m_Vertex[n] = v;
    m_Semi[n] = m_Label[n] = n;
    m_Size[n] = 1;
    m_Parent[n] = parent;
    m_Ancestor[n] = m_Child[n] = m_Dom[n] = m_Bucket[n] = m_NextInBucket[n] = kNone;
    return n;
  }

  // Preorder numbering along out-edges in adjacency order; a node is numbered when first reached.
  void dfsDom(std::uint32_t root) {
    m_DfsStack.clear();
    m_DfsStack.push_back({number(root, kNone), m_SuccStart[root]});
    while (!m_DfsStack.empty()) {
      DfsFrame& frame = m_DfsStack.back();
      std::uint32_t v = m_Vertex[frame.v];
      if (frame.next == m_SuccStart[v + 1]) {
        m_DfsStack.pop_back();
        continue;
      }
      std::uint32_t w = m_Succ[frame.next++];
      if (m_Preorder[w] != kNone) continue;
      std::uint32_t n = number(w, frame.v);
      m_DfsStack.push_back({n, m_SuccStart[w]});
    }
  }

  // Steps 2 and 3 of the paper, vertices in decreasing preorder. The members of a bucket may be
  // settled in any order: eval's answers do not depend on the compressions that other evals did.
  void computeSemidominators(std::uint32_t first) {
    for (std::uint32_t w = m_Count; w > first; --w) {
      lowerSemiFromPredecessors(w);
      m_NextInBucket[w] = m_Bucket[m_Semi[w]];
      m_Bucket[m_Semi[w]] = w;
      std::uint32_t p = m_Parent[w];
      link(p, w);
      for (std::uint32_t v = m_Bucket[p]; v != kNone; v = m_NextInBucket[v]) {
        std::uint32_t u = eval(v);
        m_Dom[v] = m_Semi[u] < m_Semi[v] ? u : p;
      }
      m_Bucket[p] = kNone;
    }
  }

  // A predecessor that the root does not reach lies on no path from the root, so it cannot lower
  // the semidominator; it is left out (the algorithm assumes every node reachable).
  void lowerSemiFromPredecessors(std::uint32_t w) {
    std::uint32_t v = m_Vertex[w];
    for (std::uint32_t i = m_PredStart[v]; i < m_PredStart[v + 1]; ++i) {
      std::uint32_t source = m_Preorder[m_Pred[i]];
      if (source == kNone) continue;
      std::uint32_t u = eval(source);
      if (m_Semi[u] < m_Semi[w]) m_Semi[w] = m_Semi[u];
    }
  }

  // Step 4 of the paper, vertices in increasing preorder.
  void finishIdoms(std::uint32_t first) {
    for (std::uint32_t w = first + 1; w <= m_Count; ++w)
      if (m_Dom[w] != m_Semi[w]) m_Dom[w] = m_Dom[m_Dom[w]];
    for (std::uint32_t w = first + 1; w <= m_Count; ++w) m_Idom[m_Vertex[w]] = m_Vertex[m_Dom[w]];
  }

  void link(std::uint32_t v, std::uint32_t w) {
    std::uint32_t s = w;
    while (semiOfLabel(w) < semiOfLabel(m_Child[s])) {
      std::uint32_t child = m_Child[s];
      if (m_Size[s] + m_Size[m_Child[child]] >= 2 * m_Size[child]) {
        m_Ancestor[child] = s;
        m_Child[s] = m_Child[child];
      } else {
        m_Size[child] = m_Size[s];
        m_Ancestor[s] = child;
        s = child;
      }
    }
    m_Label[s] = m_Label[w];
    m_Size[v] += m_Size[w];
    if (m_Size[v] < 2 * m_Size[w]) std::swap(s, m_Child[v]);
    for (; s != kNone; s = m_Child[s]) m_Ancestor[s] = v;
  }

  std::uint32_t eval(std::uint32_t v) {
    if (m_Ancestor[v] == kNone) return m_Label[v];
    compress(v);
    std::uint32_t a = m_Ancestor[v];
    return semiOfLabel(a) < semiOfLabel(v) ? m_Label[a] : m_Label[v];
  }

  // The recursive form compresses the ancestor first and then v; the path is collected upwards and
  // then handled from its top down, which is the order in which the recursion unwinds.
  void compress(std::uint32_t v) {
    m_Path.clear();
    for (std::uint32_t u = v; m_Ancestor[m_Ancestor[u]] != kNone; u = m_Ancestor[u]) m_Path.push_back(u);
    for (auto it = m_Path.rbegin(); it != m_Path.rend(); ++it) {
      std::uint32_t u = *it, a = m_Ancestor[u];
      if (semiOfLabel(a) < semiOfLabel(u)) m_Label[u] = m_Label[a];
      m_Ancestor[u] = m_Ancestor[a];
    }
  }

  std::uint32_t semiOfLabel(std::uint32_t v) const { return m_Semi[m_Label[v]]; }

  std::size_t m_Nodes;  // creation numbers, deleted nodes' included
  array<std::uint32_t> m_SuccStart, m_Succ, m_PredStart, m_Pred;
  array<std::uint32_t> m_Preorder;  // by node number, kNone before the search reaches it
  array<std::uint32_t> m_Idom;      // by node number
  std::uint32_t m_Count = 0;        // the vertices numbered so far
  // By preorder number.
  array<std::uint32_t> m_Vertex, m_Semi, m_Label, m_Ancestor, m_Child, m_Size, m_Parent;
  // The immediate dominator once finishIdoms is done; the relative dominator before.
  array<std::uint32_t> m_Dom;
  // Buckets as singly linked lists: the first member per vertex, the next member per member.
  array<std::uint32_t> m_Bucket, m_NextInBucket;
  array<DfsFrame> m_DfsStack;
  array<std::uint32_t> m_Path;
};

// ---- Immediate dominators ------------------------------------------------------------------------

void KvCControlFlowGraph::computeAllIdoms() {
  LengauerTarjan dominators(*this);
  for (std::uint32_t root : dominators.rootsOfComponents(*this)) computeIdomsFast(root, dominators);
  for (node v : nodes())
    if (KvCCfgNodeInfo* pInf = inf(v)) pInf->setIdom(dominators.idomOf(v));
}

void KvCControlFlowGraph::computeControlFlowIdoms(node_array<node>& idom) const {
  LengauerTarjan dominators(*this);
  for (std::uint32_t root : dominators.rootsOfComponents(*this)) computeIdomsFast(root, dominators);
  for (node v : nodes()) idom[v] = dominators.idomOf(v);
}

// A component without a node free of in-edges (a cycle that nothing enters) is reported and keeps
// nil as every node's immediate dominator. Having no entry node either, its dominator tree gets no
// root, and frontiers, phi placement and renaming pass it by.
void KvCControlFlowGraph::computeIdomsFast(std::uint32_t root, LengauerTarjan& dominators) const {
  if (root == LengauerTarjan::kNoNode) {
    reportInternalFault(kLineComponentWithoutRoot);
    return;
  }
  dominators.run(root);
}

// ---- Dominator trees -----------------------------------------------------------------------------

// Tree nodes are made in node order, so every node's children hang in node order. A node without
// immediate dominator that is not an entry (one that the entry does not reach, or any node of a
// component without entry) stays a tree node without edges; a tree without entry keeps a nil root.
int KvCControlFlowGraph::buildDominatorTrees(array<KvCDominatorTree*>& trees) {
  node_array<int> component;
  int count = COMPONENTS(*this, component);
  trees.resize(static_cast<std::size_t>(count));
  for (KvCDominatorTree*& pTree : trees) pTree = new KvCDominatorTree();

  array<array<node>> treeNodes(static_cast<std::size_t>(count));
  node_array<node> image(*this, nil);
  for (node v : nodes()) {
    std::size_t i = static_cast<std::size_t>(component[v]);
    node t = trees[i]->new_node(v);
    treeNodes[i].push_back(t);
    image[v] = t;
  }
  for (std::size_t i = 0; i < treeNodes.size(); ++i) {
    KvCDominatorTree& tree = *trees[i];
    for (node t : treeNodes[i]) {
      node v = tree.inf(t);
      KvCCfgNodeInfo* pInf = inf(v);
      if (pInf && pInf->isEntryNode())
        tree.setRoot(t);
      else if (node dominator = idomOf(*this, v))
        tree.new_edge(image[dominator], t);
    }
  }
  return count;
}

void KvCControlFlowGraph::freeDominatorTrees(array<KvCDominatorTree*>& trees, int count) {
  for (int i = 0; i < count; ++i) delete trees[static_cast<std::size_t>(i)];
}

// ---- Dominance frontiers -------------------------------------------------------------------------

// Cytron, Ferrante, Rosen, Wegman and Zadeck (TOPLAS 1991): bottom-up over each tree, the local
// rule over a node's successors, then the up rule over its children's frontiers. Taking the
// breadth-first order from its back handles every node after all of its children, without
// recursion. Every frontier of a tree is cleared first, so that nodes the walk does not reach keep
// none from an earlier run either.
void KvCControlFlowGraph::computeDominanceFrontiers(array<KvCDominatorTree*>& trees) {
  for (KvCDominatorTree* pTree : trees) {
    if (!pTree) continue;
    for (node t : pTree->nodes())
      if (KvCCfgNodeInfo* pInf = inf(pTree->inf(t))) pInf->clearDF();
    if (!pTree->getRoot()) continue;
    node_array<int> dist(*pTree, -1);
    ssaopt::list<node> order = BFS(*pTree, pTree->getRoot(), dist);
    for (; !order.empty(); order.pop_back()) fillFrontier(*this, *pTree, order.back());
  }
}
