#include "reference_dominators.h"

#include <utility>

namespace ssaopt::bench {

namespace {

void fillRows(int nodeCount, const std::vector<std::pair<int, int>>& edges, bool bySource,
              std::vector<int>& start, std::vector<int>& targets) {
  start.assign(static_cast<std::size_t>(nodeCount) + 1, 0);
  for (const auto& [from, to] : edges) ++start[static_cast<std::size_t>(bySource ? from : to) + 1];
  for (std::size_t v = 0; v < static_cast<std::size_t>(nodeCount); ++v) start[v + 1] += start[v];
  std::vector<int> next(start.begin(), start.end() - 1);
  targets.resize(edges.size());
  for (const auto& [from, to] : edges)
    targets[static_cast<std::size_t>(next[static_cast<std::size_t>(bySource ? from : to)]++)] =
        bySource ? to : from;
}

// Vertices are preorder numbers from 1; 0 is the empty vertex (semi 0, size 0, its own label).
class BalancedLengauerTarjan {
public:
  BalancedLengauerTarjan(const FlowGraph& graph, const std::vector<int>& roots)
      : m_G(graph), m_Roots(roots), m_Number(static_cast<std::size_t>(graph.nodeCount), 0) {
    grow(1);
  }

  std::vector<int> run() {
    number();
    int count = static_cast<int>(m_Vertex.size()) - 1;
    for (int w = count; w >= 2; --w) {
      if (at(m_Parent, w) == 1) at(m_Semi, w) = 1;  // a root, entered from the added root only
      for (int p : predecessors(w)) {
        int v = m_Number[static_cast<std::size_t>(p)];
        if (v == 0) continue;
        int u = eval(v);
        if (at(m_Semi, u) < at(m_Semi, w)) at(m_Semi, w) = at(m_Semi, u);
      }
      at(m_NextInBucket, w) = at(m_Bucket, at(m_Semi, w));
      at(m_Bucket, at(m_Semi, w)) = w;
      link(at(m_Parent, w), w);
      int parent = at(m_Parent, w);
      for (int v = at(m_Bucket, parent); v != 0; v = at(m_NextInBucket, v)) {
        int u = eval(v);
        at(m_Dom, v) = at(m_Semi, u) < at(m_Semi, v) ? u : parent;
      }
      at(m_Bucket, parent) = 0;
    }
    for (int w = 2; w <= count; ++w)
      if (at(m_Dom, w) != at(m_Semi, w)) at(m_Dom, w) = at(m_Dom, at(m_Dom, w));
    return idomsByNode(count);
  }

private:
  static constexpr int kVirtualRoot = -1;

  struct Range {
    const int* first;
    const int* last;
    const int* begin() const { return first; }
    const int* end() const { return last; }
  };

  static int& at(std::vector<int>& values, int i) { return values[static_cast<std::size_t>(i)]; }

  void grow(int vertices) {
    for (std::vector<int>* pValues : {&m_Semi, &m_Label, &m_Ancestor, &m_Child, &m_Size, &m_Parent, &m_Dom,
                                      &m_Bucket, &m_NextInBucket, &m_Vertex})
      pValues->resize(static_cast<std::size_t>(vertices), 0);
  }

  // The added root is vertex 1; its successors are the roots.
  Range successors(int node) const {
    if (node == kVirtualRoot) return {m_Roots.data(), m_Roots.data() + m_Roots.size()};
    return {m_G.succ.data() + m_G.succStart[static_cast<std::size_t>(node)],
            m_G.succ.data() + m_G.succStart[static_cast<std::size_t>(node) + 1]};
  }
  Range predecessors(int w) const {
    int node = m_Vertex[static_cast<std::size_t>(w)];
    return {m_G.pred.data() + m_G.predStart[static_cast<std::size_t>(node)],
            m_G.pred.data() + m_G.predStart[static_cast<std::size_t>(node) + 1]};
  }

  int visit(int node, int parent) {
    int n = static_cast<int>(m_Vertex.size());
    if (node != kVirtualRoot) m_Number[static_cast<std::size_t>(node)] = n;
    grow(n + 1);
    at(m_Vertex, n) = node;
    at(m_Semi, n) = at(m_Label, n) = n;
    at(m_Size, n) = 1;
    at(m_Parent, n) = parent;
    return n;
  }

  // Depth-first preorder along successors in order, with an explicit stack of (vertex, next edge).
  void number() {
    std::vector<std::pair<int, const int*>> stack;
    stack.emplace_back(visit(kVirtualRoot, 0), successors(kVirtualRoot).begin());
    while (!stack.empty()) {
      auto& [v, next] = stack.back();
      if (next == successors(m_Vertex[static_cast<std::size_t>(v)]).end()) {
        stack.pop_back();
        continue;
      }
      int w = *next++;
      if (m_Number[static_cast<std::size_t>(w)] != 0) continue;
      int number = visit(w, v);
      stack.emplace_back(number, successors(w).begin());
    }
  }

  int eval(int v) {
    if (at(m_Ancestor, v) == 0) return at(m_Label, v);
    compress(v);
    int a = at(m_Ancestor, v);
    return at(m_Semi, at(m_Label, a)) >= at(m_Semi, at(m_Label, v)) ? at(m_Label, v) : at(m_Label, a);
  }

  // The recursive compression, updating from the vertex nearest the forest root down to v.
  void compress(int v) {
    m_Path.clear();
    for (int x = v; at(m_Ancestor, at(m_Ancestor, x)) != 0; x = at(m_Ancestor, x)) m_Path.push_back(x);
    for (auto it = m_Path.rbegin(); it != m_Path.rend(); ++it) {
      int x = *it, a = at(m_Ancestor, x);
      if (at(m_Semi, at(m_Label, a)) < at(m_Semi, at(m_Label, x))) at(m_Label, x) = at(m_Label, a);
      at(m_Ancestor, x) = at(m_Ancestor, a);
    }
  }

  void link(int v, int w) {
    int s = w;
    while (at(m_Semi, at(m_Label, w)) < at(m_Semi, at(m_Label, at(m_Child, s)))) {
      int child = at(m_Child, s);
      if (at(m_Size, s) + at(m_Size, at(m_Child, child)) >= 2 * at(m_Size, child)) {
        at(m_Ancestor, child) = s;
        at(m_Child, s) = at(m_Child, child);
      } else {
        at(m_Size, child) = at(m_Size, s);
        s = at(m_Ancestor, s) = child;
      }
    }
    at(m_Label, s) = at(m_Label, w);
    at(m_Size, v) += at(m_Size, w);
    if (at(m_Size, v) < 2 * at(m_Size, w)) std::swap(s, at(m_Child, v));
    for (; s != 0; s = at(m_Child, s)) at(m_Ancestor, s) = v;
  }

  std::vector<int> idomsByNode(int count) {
    std::vector<int> idom(static_cast<std::size_t>(m_G.nodeCount), -1);
    for (int w = 2; w <= count; ++w)
      idom[static_cast<std::size_t>(at(m_Vertex, w))] = at(m_Vertex, at(m_Dom, w));
    return idom;
  }

  const FlowGraph& m_G;
  const std::vector<int>& m_Roots;
  std::vector<int> m_Number;  // preorder number by node, 0 before the search reaches it
  std::vector<int> m_Semi, m_Label, m_Ancestor, m_Child, m_Size, m_Parent, m_Dom, m_Bucket, m_NextInBucket;
  std::vector<int> m_Vertex;  // node by preorder number
  std::vector<int> m_Path;
};

}  // namespace

FlowGraph FlowGraph::fromEdges(int nodeCount, const std::vector<std::pair<int, int>>& edges) {
  FlowGraph graph;
  graph.nodeCount = nodeCount;
  fillRows(nodeCount, edges, true, graph.succStart, graph.succ);
  fillRows(nodeCount, edges, false, graph.predStart, graph.pred);
  return graph;
}

std::vector<int> referenceIdoms(const FlowGraph& graph, const std::vector<int>& roots) {
  return BalancedLengauerTarjan(graph, roots).run();
}

}  // namespace ssaopt::bench
