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

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/dominator_tree.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;

namespace {

// Source line of the report for a component in which every node has an in-edge.
constexpr int kLineComponentWithoutRoot = 732;

// Preorder number 0 stands for no vertex: the empty vertex of the algorithm, and "not yet numbered".
constexpr int kNone = 0;

}  // namespace

// Lengauer and Tarjan, "A fast algorithm for finding dominators in a flowgraph" (TOPLAS 1979), in
// its balanced form: link by subtree size, path compression in eval, near-linear in the edges.
//
// Every working array is indexed by depth-first preorder number, so a component costs its own size
// and no hash map is involved. Number 0 is the empty vertex of the paper (semi 0, size 0, its own
// label and ancestor), which spares adding a sentinel node to the graph. The depth-first numbering
// and the path compression keep explicit stacks: their recursive forms go as deep as a straight
// line of blocks is long. Both visit, number and update in exactly the order of the recursive forms.
class KvCControlFlowGraph::LengauerTarjan {
public:
  LengauerTarjan(const KvCControlFlowGraph& G, node_array<int>& preorder) : m_G(G), m_Preorder(preorder) {}

  // Sets idom[v] for every node v that `root` reaches, except the root; nothing else is written.
  void run(node root, node_array<node>& idom) {
    reset();
    dfsDom(root);
    computeSemidominators();
    finishIdoms(idom);
  }

private:
  struct DfsFrame {
    node v;
    edge next;  // the out-edge to look at when the search comes back to v
  };

  void reset() {
    for (array<int>* pArray :
         {&m_Semi, &m_Label, &m_Ancestor, &m_Child, &m_Size, &m_Parent, &m_Dom, &m_Bucket, &m_NextInBucket})
      pArray->assign(1, kNone);
    m_Vertex.assign(1, nil);
  }

  int number(node v) {
    int n = static_cast<int>(m_Vertex.size());
    m_Preorder[v] = n;
    m_Vertex.push_back(v);
    m_Semi.push_back(n);
    m_Label.push_back(n);
    m_Size.push_back(1);
    for (array<int>* pArray : {&m_Ancestor, &m_Child, &m_Parent, &m_Dom, &m_Bucket, &m_NextInBucket})
      pArray->push_back(kNone);
    return n;
  }
  int count() const { return static_cast<int>(m_Vertex.size()) - 1; }

  // Preorder numbering along out-edges in adjacency order; a node is numbered when first reached.
  void dfsDom(node root) {
    m_DfsStack.clear();
    number(root);
    m_DfsStack.push_back({root, m_G.first_adj_edge(root)});
    while (!m_DfsStack.empty()) {
      DfsFrame& frame = m_DfsStack.back();
      if (!frame.next) {
        m_DfsStack.pop_back();
        continue;
      }
      node v = frame.v;
      edge e = frame.next;
      frame.next = m_G.adj_succ(e);
      node w = m_G.target(e);
      if (m_Preorder[w] != kNone || !m_G.isControlFlowEdge(e)) continue;
      m_Parent[static_cast<std::size_t>(number(w))] = m_Preorder[v];
      m_DfsStack.push_back({w, m_G.first_adj_edge(w)});
    }
  }

  // Steps 2 and 3 of the paper, vertices in decreasing preorder.
  void computeSemidominators() {
    for (int w = count(); w >= 2; --w) {
      lowerSemiFromPredecessors(w);
      addToBucket(at(m_Semi, w), w);
      link(at(m_Parent, w), w);
      settleBucket(at(m_Parent, w));
    }
  }

  // A predecessor that the root does not reach lies on no path from the root, so it cannot lower
  // the semidominator; it is left out (the algorithm assumes every node reachable).
  void lowerSemiFromPredecessors(int w) {
    for (edge e : m_G.in(vertex(w))) {
      int source = m_Preorder[m_G.source(e)];
      if (source == kNone || !m_G.isControlFlowEdge(e)) continue;
      int u = eval(source);
      if (at(m_Semi, u) < at(m_Semi, w)) at(m_Semi, w) = at(m_Semi, u);
    }
  }

  void addToBucket(int owner, int w) {
    at(m_NextInBucket, w) = at(m_Bucket, owner);
    at(m_Bucket, owner) = w;
  }

  // Empties the bucket of p, its members taken in ascending node order.
  void settleBucket(int p) {
    m_Settling.clear();
    for (int v = at(m_Bucket, p); v != kNone; v = at(m_NextInBucket, v)) m_Settling.push_back(v);
    at(m_Bucket, p) = kNone;
    std::sort(m_Settling.begin(), m_Settling.end(), [this](int a, int b) { return vertex(a) < vertex(b); });
    for (int v : m_Settling) {
      int u = eval(v);
      at(m_Dom, v) = at(m_Semi, u) < at(m_Semi, v) ? u : p;
    }
  }

  // Step 4 of the paper, vertices in increasing preorder.
  void finishIdoms(node_array<node>& idom) {
    for (int w = 2; w <= count(); ++w)
      if (at(m_Dom, w) != at(m_Semi, w)) at(m_Dom, w) = at(m_Dom, at(m_Dom, w));
    for (int w = 2; w <= count(); ++w) idom[vertex(w)] = vertex(at(m_Dom, w));
  }

  void link(int v, int w) {
    int s = w;
    while (semiOfLabel(w) < semiOfLabel(child(s))) {
      if (size(s) + size(child(child(s))) >= 2 * size(child(s))) {
        at(m_Ancestor, child(s)) = s;
        at(m_Child, s) = child(child(s));
      } else {
        at(m_Size, child(s)) = size(s);
        at(m_Ancestor, s) = child(s);
        s = child(s);
      }
    }
    at(m_Label, s) = at(m_Label, w);
    at(m_Size, v) += size(w);
    if (size(v) < 2 * size(w)) std::swap(s, at(m_Child, v));
    while (s != kNone) {
      at(m_Ancestor, s) = v;
      s = child(s);
    }
  }

  int eval(int v) {
    if (ancestor(v) == kNone) return at(m_Label, v);
    compress(v);
    return semiOfLabel(ancestor(v)) < semiOfLabel(v) ? at(m_Label, ancestor(v)) : at(m_Label, v);
  }

  // The recursive form compresses the ancestor first and then v; the path is collected upwards and
  // then handled from its top down, which is the order in which the recursion unwinds.
  void compress(int v) {
    m_Path.clear();
    for (int u = v; ancestor(ancestor(u)) != kNone; u = ancestor(u)) m_Path.push_back(u);
    while (!m_Path.empty()) {
      int u = m_Path.back();
      m_Path.pop_back();
      if (semiOfLabel(ancestor(u)) < semiOfLabel(u)) at(m_Label, u) = at(m_Label, ancestor(u));
      at(m_Ancestor, u) = ancestor(ancestor(u));
    }
  }

  static int& at(array<int>& values, int i) { return values[static_cast<std::size_t>(i)]; }
  node vertex(int i) const { return m_Vertex[static_cast<std::size_t>(i)]; }
  int ancestor(int v) { return at(m_Ancestor, v); }
  int child(int v) { return at(m_Child, v); }
  int size(int v) { return at(m_Size, v); }
  int semiOfLabel(int v) { return at(m_Semi, at(m_Label, v)); }

  const KvCControlFlowGraph& m_G;
  // Graph-wide, kNone for nodes not numbered yet. Components are disjoint, so one array serves all.
  node_array<int>& m_Preorder;
  array<node> m_Vertex;
  array<int> m_Semi, m_Label, m_Ancestor, m_Child, m_Size, m_Parent;
  // The immediate dominator once finishIdoms is done; the relative dominator before.
  array<int> m_Dom;
  // Buckets as singly linked lists: the first member per vertex, the next member per member.
  array<int> m_Bucket, m_NextInBucket;
  array<DfsFrame> m_DfsStack;
  array<int> m_Path;
  array<int> m_Settling;
};

// ---- Immediate dominators ------------------------------------------------------------------------

void KvCControlFlowGraph::computeAllIdoms() {
  node_array<node> idom(*this, nil);
  computeControlFlowIdoms(idom);
  for (node v : nodes())
    if (KvCCfgNodeInfo* pInf = inf(v)) pInf->setIdom(idom[v]);
}

void KvCControlFlowGraph::computeControlFlowIdoms(node_array<node>& idom) const {
  node_array<int> component;
  int count = COMPONENTS(*this, component, [this](edge e) { return isControlFlowEdge(e); });
  array<array<node>> members(static_cast<std::size_t>(count));
  for (node v : nodes()) members[static_cast<std::size_t>(component[v])].push_back(v);

  node_array<int> preorder(*this, kNone);
  LengauerTarjan dominators(*this, preorder);
  for (const array<node>& nodesOfComponent : members) computeIdomsFast(nodesOfComponent, dominators, idom);
}

// The root is the last node without in-edges. A component without one (a cycle that nothing
// enters) is reported and keeps nil as every node's immediate dominator. Having no entry node
// either, its dominator tree gets no root, and frontiers, phi placement and renaming pass it by.
void KvCControlFlowGraph::computeIdomsFast(const array<node>& nodes, LengauerTarjan& dominators,
                                           node_array<node>& idom) const {
  node root = nil;
  for (node v : nodes)
    if (indeg(v) == 0) root = v;
  if (!root) {
    reportInternalFault(kLineComponentWithoutRoot);
    return;
  }
  dominators.run(root, idom);
}

node KvCControlFlowGraph::idomOf(node v) const {
  const KvCCfgNodeInfo* pInf = inf(v);
  return pInf ? pInf->getIdom() : nil;
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
      else if (node dominator = idomOf(v))
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
      if (KvCCfgNodeInfo* pInf = inf(pTree->inf(t))) pInf->getDF()->clear();
    if (!pTree->getRoot()) continue;
    node_array<int> dist(*pTree, -1);
    ssaopt::list<node> order = BFS(*pTree, pTree->getRoot(), dist);
    for (; !order.empty(); order.pop_back()) fillFrontier(*pTree, order.back());
  }
}

void KvCControlFlowGraph::fillFrontier(const KvCDominatorTree& tree, node t) {
  node x = tree.inf(t);
  KvCCfgNodeInfo* pInf = inf(x);
  if (!pInf) return;
  ssaopt::set<node>& frontier = *pInf->getDF();
  for (edge e : out(x))
    if (idomOf(target(e)) != x) frontier.insert(target(e));
  for (edge treeEdge : tree.out(t)) {
    KvCCfgNodeInfo* pChild = inf(tree.inf(tree.target(treeEdge)));
    if (!pChild) continue;
    for (node y : *pChild->getDF())
      if (idomOf(y) != x) frontier.insert(y);
  }
}
