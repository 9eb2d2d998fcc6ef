// Immediate dominators, dominator trees and dominance frontiers: a tree per procedure, components
// without a root, and the fast computation against a simple fixed point on random graphs (which bring
// loops, self-loops and irreducible regions).
#include <gtest/gtest.h>

#include <cstdint>
#include <random>
#include <utility>

#include "cfg/ssa_testing.h"
#include "ssaopt/frame/report.h"

using namespace ssatest;

namespace {

class Dominators : public cfgtest::CfgTest {
protected:
  ~Dominators() override { Access::freeDominatorTrees(G, m_Trees, m_Count); }

  // Immediate dominators, trees and frontiers, as the SSA driver computes them.
  void compute() {
    G.computeAllIdoms();
    m_Count = Access::buildDominatorTrees(G, m_Trees);
    G.computeDominanceFrontiers(m_Trees);
  }
  node idom(node v) { return G.inf(v)->getIdom(); }
  Nodes frontier(node v) { return Nodes(G.inf(v)->getDF()->begin(), G.inf(v)->getDF()->end()); }
  // The graph nodes that `v` immediately dominates, as its tree in tree `i` lists them.
  Nodes children(std::size_t i, node v) {
    const KvCDominatorTree& tree = *m_Trees.at(i);
    Nodes result;
    for (node t : tree.nodes())
      if (tree.inf(t) == v)
        for (edge e : tree.out(t)) result.push_back(tree.inf(tree.target(e)));
    return result;
  }
  node root(std::size_t i) {
    return m_Trees.at(i)->getRoot() ? m_Trees.at(i)->inf(m_Trees.at(i)->getRoot()) : node();
  }

  KvCCfgProcedure* pMain = procedure("#main");
  node entry = pMain->getEntryNode();
  Access::Trees m_Trees;
  int m_Count = 0;
};

// A procedure that never reaches its end leaves its exit node alone in a component; a cycle that
// nothing enters has no node without in-edges at all.
TEST_F(Dominators, OfComponentsWithoutRootOrEntryAreNoneAndTheirTreesHaveNoRoot) {
  irtest::InternalInfoOn info;
  ssaopt::ReportLog log;
  node spin = startWith(pMain, block(pMain));
  plain(spin, spin);
  node lonelyExit = G.new_node(new KvCCfgExit()), x = block(pMain), y = block(pMain);
  plain(x, y);
  plain(y, x);
  compute();
  EXPECT_TRUE(log.hasInternalError("KvCControlFlowGraph", 732));
  EXPECT_EQ(log.consistencyFailures().size(), 1u);
  for (node v : {lonelyExit, x, y}) {
    EXPECT_EQ(idom(v), ssaopt::nil);
    EXPECT_TRUE(frontier(v).empty());
  }
  ASSERT_EQ(m_Count, 3);
  EXPECT_EQ(root(1), ssaopt::nil);
  EXPECT_EQ(root(2), ssaopt::nil);
  EXPECT_EQ(m_Trees[2]->number_of_edges(), 0);
  EXPECT_EQ(frontier(spin), Nodes{spin});
}

// ---- Against a simple fixed point ----------------------------------------------------------------

// A random flow graph over nodes 0..n-1 with entry 0: a random tree from the entry (so everything is
// reachable) plus random edges anywhere but into the entry, self-loops and parallel edges included,
// added in random order so that adjacency orders vary too.
std::vector<std::pair<int, int>> randomFlowGraph(std::mt19937& random, int n) {
  std::vector<std::pair<int, int>> edges;
  auto below = [&random](int bound) { return std::uniform_int_distribution<int>(0, bound - 1)(random); };
  for (int v = 1; v < n; ++v) edges.emplace_back(below(v), v);
  for (int extra = below(2 * n + 1); extra > 0 && n > 1; --extra)
    edges.emplace_back(below(n), 1 + below(n - 1));
  std::shuffle(edges.begin(), edges.end(), random);
  return edges;
}

// dom(0) = {0}; dom(v) = {v} + the intersection of dom(p) over v's predecessors, until nothing moves.
std::vector<std::uint64_t> dominatorSets(const std::vector<std::pair<int, int>>& edges, int n) {
  std::vector<std::uint64_t> dom(static_cast<std::size_t>(n), ~std::uint64_t{0});
  dom[0] = 1;
  for (bool changed = true; changed;) {
    changed = false;
    for (int v = 1; v < n; ++v) {
      std::uint64_t meet = ~std::uint64_t{0};
      for (auto [from, to] : edges)
        if (to == v) meet &= dom[static_cast<std::size_t>(from)];
      std::uint64_t next = meet | std::uint64_t{1} << v;
      changed |= next != dom[static_cast<std::size_t>(v)];
      dom[static_cast<std::size_t>(v)] = next;
    }
  }
  return dom;
}

bool dominates(const std::vector<std::uint64_t>& dom, int a, int b) {
  return (dom[static_cast<std::size_t>(b)] >> a) & 1;
}

TEST_F(Dominators, AgreeWithAFixedPointOnRandomGraphs) {
  constexpr int kGraphs = 3000, kMaxNodes = 40;
  for (int seed = 0; seed < kGraphs; ++seed) {
    std::mt19937 random(static_cast<std::uint32_t>(seed));
    int n = 1 + static_cast<int>(random() % kMaxNodes);
    std::vector<std::pair<int, int>> edges = randomFlowGraph(random, n);
    KvCControlFlowGraph flow;
    KvCCfgProcedure* pProcedure = nullptr;
    Nodes nodes{flow.demandProcedureEntryNode("#main", pProcedure)};
    while (static_cast<int>(nodes.size()) < n) nodes.push_back(flow.new_node(new KvCBasicBlock()));
    for (auto [from, to] : edges)
      flow.new_edge(nodes[static_cast<std::size_t>(from)], nodes[static_cast<std::size_t>(to)],
                    new KvCCfgEdgeInfo());
    flow.computeAllIdoms();
    Access::Trees trees;
    int count = Access::buildDominatorTrees(flow, trees);
    flow.computeDominanceFrontiers(trees);
    Access::freeDominatorTrees(flow, trees, count);

    std::vector<std::uint64_t> dom = dominatorSets(edges, n);
    for (int v = 0; v < n; ++v) {
      int expectedIdom = -1;
      for (int d = 0; d < n; ++d)
        if (d != v && dominates(dom, d, v) && (expectedIdom < 0 || dominates(dom, expectedIdom, d)))
          expectedIdom = d;
      node got = flow.inf(nodes[static_cast<std::size_t>(v)])->getIdom();
      ASSERT_EQ(got, expectedIdom < 0 ? node() : nodes[static_cast<std::size_t>(expectedIdom)])
          << "seed " << seed << ", node " << v;

      // DF(v): the targets of edges out of what v dominates that v does not strictly dominate.
      Nodes expectedFrontier;
      for (int target = 0; target < n; ++target) {
        bool reached = false;
        for (auto [from, to] : edges) reached |= to == target && dominates(dom, v, from);
        if (reached && !(dominates(dom, v, target) && v != target))
          expectedFrontier.push_back(nodes[static_cast<std::size_t>(target)]);
      }
      const ssaopt::set<node>& frontier = *flow.inf(nodes[static_cast<std::size_t>(v)])->getDF();
      ASSERT_EQ(Nodes(frontier.begin(), frontier.end()), expectedFrontier)
          << "seed " << seed << ", node " << v;
    }
  }
}

}  // namespace
