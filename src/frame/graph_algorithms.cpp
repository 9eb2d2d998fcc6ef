#include "ssaopt/frame/graph_algorithms.h"

#include <algorithm>
#include <deque>

namespace ssaopt {

namespace {

// One frame of an iterative depth-first search: a node and the next out-edge to look at.
struct DfsFrame {
  node v;
  edge next;
};

void numberComponentOf(const graph& G, node start, int number, node_array<int>& compnum, array<node>& work,
                       const std::function<bool(edge)>& follow) {
  compnum[start] = number;
  work.assign(1, start);
  while (!work.empty()) {
    node v = work.back();
    work.pop_back();
    auto visit = [&](node w) {
      if (compnum[w] != -1) return;
      compnum[w] = number;
      work.push_back(w);
    };
    for (edge e : G.out(v))
      if (follow(e)) visit(G.target(e));
    for (edge e : G.in(v))
      if (follow(e)) visit(G.source(e));
  }
}

}  // namespace

int COMPONENTS(const graph& G, node_array<int>& compnum) {
  return COMPONENTS(G, compnum, [](edge) { return true; });
}

int COMPONENTS(const graph& G, node_array<int>& compnum, const std::function<bool(edge)>& follow) {
  compnum.init(G, -1);
  array<node> work;
  int count = 0;
  for (node v : G.nodes())
    if (compnum[v] == -1) numberComponentOf(G, v, count++, compnum, work, follow);
  return count;
}

// Tarjan's algorithm with an explicit call stack.
int STRONG_COMPONENTS(const graph& G, node_array<int>& compnum) {
  constexpr int kUnvisited = -1;
  compnum.init(G, -1);
  node_array<int> order(G, kUnvisited);  // discovery number
  node_array<int> low(G, 0);
  node_array<bool> onStack(G, false);
  array<node> open;  // Tarjan's stack of nodes not yet assigned to a component
  array<DfsFrame> calls;
  int discovered = 0;
  int count = 0;

  auto enter = [&](node v) {
    order[v] = low[v] = discovered++;
    open.push_back(v);
    onStack[v] = true;
    calls.push_back({v, G.first_adj_edge(v)});
  };

  for (node root : G.nodes()) {
    if (order[root] != kUnvisited) continue;
    enter(root);
    while (!calls.empty()) {
      DfsFrame& frame = calls.back();
      if (frame.next != nil) {
        node w = G.target(frame.next);
        frame.next = G.adj_succ(frame.next);
        if (order[w] == kUnvisited)
          enter(w);
        else if (onStack[w])
          low[frame.v] = std::min(low[frame.v], order[w]);
        continue;
      }
      node v = frame.v;
      calls.pop_back();
      if (!calls.empty()) low[calls.back().v] = std::min(low[calls.back().v], low[v]);
      if (low[v] != order[v]) continue;
      node w;
      do {
        w = open.back();
        open.pop_back();
        onStack[w] = false;
        compnum[w] = count;
      } while (w != v);
      ++count;
    }
  }
  return count;
}

list<node> BFS(const graph& G, node s, node_array<int>& dist) {
  list<node> visited;
  std::deque<node, ModuleAllocator<node>> queue;
  dist[s] = 0;
  queue.push_back(s);
  while (!queue.empty()) {
    node v = queue.front();
    queue.pop_front();
    visited.push_back(v);
    for (edge e : G.out(v)) {
      node w = G.target(e);
      if (dist[w] != -1) continue;
      dist[w] = dist[v] + 1;
      queue.push_back(w);
    }
  }
  return visited;
}

list<node> DFS(const graph& G, node s, node_array<bool>& reached) {
  list<node> visited;
  if (reached[s]) return visited;
  array<DfsFrame> calls;
  auto enter = [&](node v) {
    reached[v] = true;
    visited.push_back(v);
    calls.push_back({v, G.first_adj_edge(v)});
  };
  enter(s);
  while (!calls.empty()) {
    DfsFrame& frame = calls.back();
    if (frame.next == nil) {
      calls.pop_back();
      continue;
    }
    node w = G.target(frame.next);
    frame.next = G.adj_succ(frame.next);
    if (!reached[w]) enter(w);
  }
  return visited;
}

}  // namespace ssaopt
