// The graph layer's ordering guarantees, which phi operand order and every deterministic walk of the
// library rest on.
#include "ssaopt/frame/graph.h"

#include <gtest/gtest.h>

#include <vector>

using namespace ssaopt;

namespace {

template <class Range>
std::vector<std::uint32_t> indexes(const Range& range) {
  std::vector<std::uint32_t> result;
  for (auto h : range) result.push_back(h.index());
  return result;
}

std::vector<node> targets(const graph& G, node v) {
  std::vector<node> result;
  for (edge e : G.out(v)) result.push_back(G.target(e));
  return result;
}

std::vector<node> sources(const graph& G, node v) {
  std::vector<node> result;
  for (edge e : G.in(v)) result.push_back(G.source(e));
  return result;
}

}  // namespace

TEST(Graph, NodesAndEdgesIterateInCreationOrderAfterDeletions) {
  graph G;
  node a = G.new_node(), b = G.new_node(), c = G.new_node(), d = G.new_node();
  edge ab = G.new_edge(a, b), bc = G.new_edge(b, c), cd = G.new_edge(c, d);
  G.new_edge(d, a);
  G.del_node(b);  // takes ab and bc with it
  node e = G.new_node();
  G.new_edge(e, a);

  EXPECT_EQ(indexes(G.nodes()), (std::vector<std::uint32_t>{0, 2, 3, 4}));
  EXPECT_EQ(indexes(G.edges()), (std::vector<std::uint32_t>{2, 3, 4}));
  EXPECT_EQ(G.number_of_nodes(), 4);
  EXPECT_EQ(G.number_of_edges(), 3);
  EXPECT_EQ(G.first_node(), a);
  EXPECT_EQ(G.next_node(a), c);
  EXPECT_EQ(G.last_node(), e);
  EXPECT_EQ(G.max_node_index(), 4);
  EXPECT_EQ(G.indeg(c), 0);
  EXPECT_EQ(G.outdeg(c), 1);
  EXPECT_EQ(G.first_adj_edge(c), cd);
  (void)ab;
  (void)bc;
}

TEST(Graph, MoveEdgeKeepsThePositionOfTheEndThatStays) {
  graph G;
  node p1 = G.new_node(), p2 = G.new_node(), p3 = G.new_node(), join = G.new_node(), fresh = G.new_node();
  node other = G.new_node();
  G.new_edge(p1, join);
  edge middle = G.new_edge(p2, join);
  G.new_edge(p3, join);
  G.new_edge(p2, other);

  // A new source for the middle in-edge: join's in-edge order must not change.
  G.move_edge(middle, fresh, join);
  EXPECT_EQ(sources(G, join), (std::vector<node>{p1, fresh, p3}));
  EXPECT_EQ(G.in_position(middle), 1);
  EXPECT_EQ(targets(G, fresh), (std::vector<node>{join}));
  EXPECT_EQ(targets(G, p2), (std::vector<node>{other}));

  // A new target: the edge goes to the end of the new target's in-edges, the source order stays.
  edge first = G.first_adj_edge(p1);
  G.new_edge(p1, other);
  G.move_edge(first, p1, other);
  EXPECT_EQ(targets(G, p1), (std::vector<node>{other, other}));
  EXPECT_EQ(sources(G, other), (std::vector<node>{p2, p1, p1}));
  EXPECT_EQ(sources(G, join), (std::vector<node>{fresh, p3}));
  EXPECT_EQ(G.indeg(join), 2);
  EXPECT_EQ(G.outdeg(fresh), 1);
}

TEST(Graph, LiveRangesAllowDeletingTheCurrentElement) {
  graph G;
  node v = G.new_node();
  for (int i = 0; i < 5; ++i) G.new_edge(v, G.new_node());
  for (edge e : G.out(v)) G.del_edge(e);
  EXPECT_EQ(G.outdeg(v), 0);
  for (node w : G.nodes()) G.del_node(w);
  EXPECT_TRUE(G.empty());
  EXPECT_EQ(G.first_node(), nil);
}

TEST(Graph, SetOfNodesIsOrderedByCreationAndSurvivesDeletion) {
  graph G;
  std::vector<node> made;
  for (int i = 0; i < 6; ++i) made.push_back(G.new_node());
  set<node> uses{made[4], made[1], made[5], made[0]};
  G.del_node(made[1]);  // the set still names it, and must still order and find it
  G.del_node(made[4]);
  node later = G.new_node();
  uses.insert(later);
  EXPECT_EQ(indexes(uses), (std::vector<std::uint32_t>{0, 1, 4, 5, 6}));
  EXPECT_EQ(uses.count(made[1]), 1u);
  EXPECT_EQ(uses.count(later), 1u);
  uses.erase(made[4]);
  EXPECT_EQ(indexes(uses), (std::vector<std::uint32_t>{0, 1, 5, 6}));
}

TEST(Graph, PayloadGraphKeepsPayloadsAndCopiesShape) {
  GRAPH<int*, const char*> G;
  int one = 1, two = 2;
  node a = G.new_node(&one), b = G.new_node(&two);
  edge e = G.new_edge(a, b, "ab");
  G.del_node(G.new_node(&one));
  EXPECT_EQ(G.inf(a), &one);
  EXPECT_STREQ(G.inf(e), "ab");

  GRAPH<int*, const char*> copy(G);
  ASSERT_EQ(copy.number_of_nodes(), 2);
  node ca = copy.first_node(), cb = copy.next_node(ca);
  EXPECT_EQ(copy.inf(ca), &one);
  EXPECT_EQ(copy.inf(cb), &two);
  EXPECT_STREQ(copy.inf(copy.first_adj_edge(ca)), "ab");
  EXPECT_EQ(copy.target(copy.first_adj_edge(ca)), cb);
  G.clear();
  EXPECT_EQ(copy.number_of_edges(), 1);

  GRAPH<int*, const char*> assigned;
  assigned.new_node(&two);
  assigned = copy;
  ASSERT_EQ(assigned.number_of_nodes(), 2);
  EXPECT_EQ(assigned.inf(assigned.first_node()), &one);
  EXPECT_STREQ(assigned.inf(assigned.first_edge()), "ab");
}
