// The library's computeAllIdoms against the array-based reference on the same graph: the graph that
// constant propagation receives, where every statement is a node of its own.
#include <benchmark/benchmark.h>

#include <string>
#include <utility>
#include <vector>

#include "bench_session.h"
#include "reference_dominators.h"
#include "ssaopt/cfg/control_flow_graph.h"

namespace ssaopt::bench {

namespace {

struct IndexedGraph {
  FlowGraph flow;
  std::vector<int> roots;  // the nodes without in-edges, where each procedure's search starts
};

// Nodes by creation number; numbers of deleted nodes stay unused.
IndexedGraph indexGraph(const KvCControlFlowGraph& graph) {
  IndexedGraph indexed;
  std::vector<std::pair<int, int>> edges;
  for (ssaopt::node v : graph.nodes()) {
    if (graph.indeg(v) == 0) indexed.roots.push_back(static_cast<int>(v.index()));
    for (ssaopt::edge e : graph.out(v))
      edges.emplace_back(static_cast<int>(v.index()), static_cast<int>(graph.target(e).index()));
  }
  indexed.flow = FlowGraph::fromEdges(graph.max_node_index() + 1, edges);
  return indexed;
}

bool sameIdoms(const KvCControlFlowGraph& graph, const std::vector<int>& reference) {
  for (ssaopt::node v : graph.nodes()) {
    ssaopt::node idom = graph.inf(v)->getIdom();
    int expected = reference[v.index()];
    if (idom ? static_cast<int>(idom.index()) != expected : expected != -1) return false;
  }
  return true;
}

// Counters: lib_ns_per_node, ref_ns_per_node, ratio (library / reference), nodes, edges_per_node.
void computeIdoms(benchmark::State& state, Shape shape, std::size_t statements) {
  Session session;
  session.load(programText(shape, statements));
  session.runPipelineUpTo("sccp");
  KvCControlFlowGraph& graph = session.program().graph();
  IndexedGraph indexed = indexGraph(graph);
  double librarySeconds = 0, referenceSeconds = 0;
  for (auto _ : state) {
    double start = threadSeconds();
    graph.computeAllIdoms();
    double seconds = threadSeconds() - start;
    state.SetIterationTime(seconds);
    librarySeconds += seconds;
    start = threadSeconds();
    std::vector<int> reference = referenceIdoms(indexed.flow, indexed.roots);
    referenceSeconds += threadSeconds() - start;
    if (!sameIdoms(graph, reference)) state.SkipWithError("computeAllIdoms and the reference differ");
  }
  double nodes = graph.number_of_nodes(), iterations = static_cast<double>(state.iterations());
  state.counters["lib_ns_per_node"] = librarySeconds * 1e9 / iterations / nodes;
  state.counters["ref_ns_per_node"] = referenceSeconds * 1e9 / iterations / nodes;
  state.counters["ratio"] = librarySeconds / referenceSeconds;
  state.counters["nodes"] = nodes;
  state.counters["edges_per_node"] = graph.number_of_edges() / nodes;
}

}  // namespace

void registerDominatorBenchmarks() {
  for (Shape shape : kShapes)
    for (std::size_t statements : benchmarkSizes(shape))
      benchmark::RegisterBenchmark(
          (std::string("idoms/") + shapeName(shape) + "/" + std::to_string(statements)).c_str(), computeIdoms,
          shape, statements)
          ->Iterations(iterationsAt(statements) * 3)
          ->UseManualTime()
          ->Unit(benchmark::kMillisecond);
}

}  // namespace ssaopt::bench
