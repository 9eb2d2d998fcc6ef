#include "ssaopt/frame/graph_algorithms.h"

#include <gtest/gtest.h>

#include <vector>

using namespace ssaopt;

namespace {

std::vector<node> makeNodes(graph& G, int count) {
  std::vector<node> nodes;
  for (int i = 0; i < count; ++i) nodes.push_back(G.new_node());
  return nodes;
}

std::vector<node> asVector(const list<node>& nodes) { return std::vector<node>(nodes.begin(), nodes.end()); }

}  // namespace

TEST(Components, NumberedInTheOrderTheNodeOrderMeetsThem) {
  graph G;
  auto n = makeNodes(G, 6);
  G.new_edge(n[3], n[0]);  // {0, 3}: reached against the edge direction
  G.new_edge(n[1], n[4]);  // {1, 4}
  G.new_edge(n[5], n[4]);  // {1, 4, 5}
  node_array<int> comp;
  EXPECT_EQ(COMPONENTS(G, comp), 3);
  EXPECT_EQ((std::vector<int>{comp[n[0]], comp[n[1]], comp[n[2]], comp[n[3]], comp[n[4]], comp[n[5]]}),
            (std::vector<int>{0, 1, 2, 0, 1, 1}));
}

TEST(StrongComponents, CyclesSelfLoopsAndSinksFirst) {
  graph G;
  auto n = makeNodes(G, 5);
  G.new_edge(n[0], n[1]);
  G.new_edge(n[1], n[2]);
  G.new_edge(n[2], n[1]);  // {1, 2} is a cycle
  G.new_edge(n[2], n[3]);
  G.new_edge(n[3], n[3]);  // a self-loop alone
  G.new_edge(n[4], n[0]);
  node_array<int> comp;
  EXPECT_EQ(STRONG_COMPONENTS(G, comp), 4);
  EXPECT_EQ(comp[n[1]], comp[n[2]]);
  // Every component is numbered before the components that reach it.
  EXPECT_EQ(comp[n[3]], 0);
  EXPECT_EQ(comp[n[1]], 1);
  EXPECT_EQ(comp[n[0]], 2);
  EXPECT_EQ(comp[n[4]], 3);
}

TEST(BreadthFirstSearch, VisitsInAdjacencyOrderAndRespectsPresetDistances) {
  graph G;
  auto n = makeNodes(G, 5);
  G.new_edge(n[0], n[2]);
  G.new_edge(n[0], n[1]);
  G.new_edge(n[1], n[3]);
  G.new_edge(n[2], n[4]);
  G.new_edge(n[4], n[3]);
  node_array<int> dist(G, -1);
  EXPECT_EQ(asVector(BFS(G, n[0], dist)), (std::vector<node>{n[0], n[2], n[1], n[4], n[3]}));
  EXPECT_EQ(dist[n[3]], 2);
  EXPECT_EQ(dist[n[4]], 2);

  node_array<int> blocked(G, -1);
  blocked[n[1]] = 7;  // counts as visited: the search neither enters it nor changes it
  EXPECT_EQ(asVector(BFS(G, n[0], blocked)), (std::vector<node>{n[0], n[2], n[4], n[3]}));
  EXPECT_EQ(blocked[n[1]], 7);
  EXPECT_EQ(blocked[n[3]], 3);
}

TEST(DepthFirstSearch, OrderOfFirstVisitAsTheRecursiveSearchWouldGive) {
  graph G;
  auto n = makeNodes(G, 6);
  G.new_edge(n[0], n[1]);
  G.new_edge(n[0], n[4]);
  G.new_edge(n[1], n[2]);
  G.new_edge(n[2], n[0]);
  G.new_edge(n[1], n[3]);
  G.new_edge(n[4], n[3]);
  node_array<bool> reached(G, false);
  EXPECT_EQ(asVector(DFS(G, n[0], reached)), (std::vector<node>{n[0], n[1], n[2], n[3], n[4]}));
  EXPECT_FALSE(reached[n[5]]);
  EXPECT_TRUE(reached[n[4]]);
  EXPECT_TRUE(DFS(G, n[1], reached).empty());  // everything from there is reached already
}

// A million-node chain must go through every algorithm without exhausting the stack.
TEST(GraphAlgorithms, MillionNodeChainNeedsNoDeepStack) {
  constexpr int kLength = 1000000;
  graph G;
  node first = G.new_node(), previous = first;
  for (int i = 1; i < kLength; ++i) {
    node next = G.new_node();
    G.new_edge(previous, next);
    previous = next;
  }
  node_array<int> comp;
  EXPECT_EQ(COMPONENTS(G, comp), 1);
  EXPECT_EQ(STRONG_COMPONENTS(G, comp), kLength);
  node_array<int> dist(G, -1);
  EXPECT_EQ(BFS(G, first, dist).size(), static_cast<std::size_t>(kLength));
  EXPECT_EQ(dist[previous], kLength - 1);
  node_array<bool> reached(G, false);
  list<node> order = DFS(G, first, reached);
  EXPECT_EQ(order.size(), static_cast<std::size_t>(kLength));
  EXPECT_EQ(order.back(), previous);
}
