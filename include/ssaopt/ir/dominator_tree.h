// A dominator tree over one component of the control-flow graph: each tree node carries a node of the
// control-flow graph, and an edge runs from a node to each node that it immediately dominates.
#pragma once

#include "ssaopt/frame/graph.h"

class KvCDominatorTree : public ssaopt::GRAPH<ssaopt::node, ssaopt::no_payload> {
public:
  KvCDominatorTree() = default;
  // The copy's root is the copy's node that corresponds to the source's root.
  KvCDominatorTree(const KvCDominatorTree& other);
  KvCDominatorTree& operator=(const KvCDominatorTree& other);
  ~KvCDominatorTree() override = default;

  // A node of the tree (not of the control-flow graph); nil until set.
  ssaopt::node getRoot() const { return m_Root; }
  void setRoot(ssaopt::node root) { m_Root = root; }

private:
  // Adds a copy of `other`'s nodes, payloads and edges, and takes the copy of its root.
  void copyFrom(const KvCDominatorTree& other);

  ssaopt::node m_Root;
};
