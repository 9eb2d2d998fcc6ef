// Dominator trees: a copy has new nodes carrying the same control-flow nodes, and its root is the
// copy of the source's root.
#include "ssaopt/ir/dominator_tree.h"

KvCDominatorTree::KvCDominatorTree(const KvCDominatorTree& other) : GRAPH() { copyFrom(other); }

KvCDominatorTree& KvCDominatorTree::operator=(const KvCDominatorTree& other) {
  if (this != &other) {
    clear();
    copyFrom(other);
  }
  return *this;
}

void KvCDominatorTree::copyFrom(const KvCDominatorTree& other) {
  ssaopt::node_array<ssaopt::node> copyOf(other, ssaopt::node());
  for (ssaopt::node v : other.nodes()) copyOf[v] = new_node(other.inf(v));
  for (ssaopt::edge e : other.edges()) new_edge(copyOf[other.source(e)], copyOf[other.target(e)]);
  m_Root = other.m_Root == ssaopt::nil ? ssaopt::node() : copyOf[other.m_Root];
}
