// Graph algorithms over ssaopt::graph. All of them are iterative: their stack use does not grow with
// the graph, so generated programs with a million nodes in a chain are no problem.
#pragma once

#include <functional>

#include "ssaopt/frame/graph.h"

namespace ssaopt {

// Connected components with edge directions ignored. compnum[v] is 0..k-1, numbered in the order in
// which the node order (creation order) first meets the components. Returns k.
int COMPONENTS(const graph& G, node_array<int>& compnum);
// The same with only the edges that `follow` accepts; the others count as absent.
int COMPONENTS(const graph& G, node_array<int>& compnum, const std::function<bool(edge)>& follow);

// Strongly connected components, compnum[v] in 0..k-1. Numbering: depth-first searches start from the
// nodes in creation order and follow out-edges in adjacency order; a component is numbered when its
// search finishes it, so every component is numbered before any component that reaches it (sinks
// first). Returns k.
int STRONG_COMPONENTS(const graph& G, node_array<int>& compnum);

// Breadth-first search from s along out-edges in adjacency order. A node whose dist is not -1 on entry
// counts as visited; s itself is always visited and gets distance 0. Returns the reached nodes in
// visiting order; dist holds their distances from s.
list<node> BFS(const graph& G, node s, node_array<int>& dist);

// Depth-first search from s along out-edges in adjacency order. Nodes already marked in `reached`
// count as visited. Returns the newly reached nodes in the order of first visit and marks them.
list<node> DFS(const graph& G, node s, node_array<bool>& reached);

}  // namespace ssaopt
