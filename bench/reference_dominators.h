// The yardstick for the library's dominator computation: Lengauer and Tarjan's balanced algorithm
// over plain arrays (successors and predecessors in compressed rows), with nothing but integers.
#pragma once

#include <vector>

namespace ssaopt::bench {

// Nodes 0 .. nodeCount - 1; the successors of v are succ[succStart[v] .. succStart[v + 1]), in order.
struct FlowGraph {
  int nodeCount = 0;
  std::vector<int> succStart, succ;
  std::vector<int> predStart, pred;

  // From edges (source, target) listed in adjacency order per source.
  static FlowGraph fromEdges(int nodeCount, const std::vector<std::pair<int, int>>& edges);
};

// The immediate dominator of every node that some root reaches (searching from the roots in order),
// -1 for the roots and for the nodes no root reaches. Roots are taken as the children of one added
// root, which leaves the dominators within each root's part of a forest as they are.
std::vector<int> referenceIdoms(const FlowGraph& graph, const std::vector<int>& roots);

}  // namespace ssaopt::bench
