// Building the graph through the client, and the default pipeline with the time of each step.
#include <benchmark/benchmark.h>

#include <map>
#include <string>

#include "bench_session.h"
#include "passes.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/ir/node_info.h"

namespace ssaopt::bench {

namespace {

constexpr double kNanoseconds = 1e9;

void setPerStatement(benchmark::State& state, const std::string& name, double total, std::size_t statements) {
  state.counters[name] = total / static_cast<double>(state.iterations()) / static_cast<double>(statements);
}

// Counters: ns_per_stmt, peak_bytes_per_stmt.
void buildGraph(benchmark::State& state, Shape shape, std::size_t statements) {
  const std::string& text = programText(shape, statements);
  double nanoseconds = 0, peakBytes = 0;
  for (auto _ : state) {
    Session session;
    double start = threadSeconds();
    session.load(text);
    double seconds = threadSeconds() - start;
    state.SetIterationTime(seconds);
    nanoseconds += seconds * kNanoseconds;
    peakBytes += static_cast<double>(session.peakBytes());
  }
  setPerStatement(state, "ns_per_stmt", nanoseconds, statements);
  setPerStatement(state, "peak_bytes_per_stmt", peakBytes, statements);
}

// The statements and phi functions of the graph's blocks.
std::size_t countStatements(const KvCControlFlowGraph& graph) {
  std::size_t count = 0;
  for (ssaopt::node v : graph.nodes())
    if (const KvCBasicBlock* pBlock = graph.getBasicBlock(v))
      count += pBlock->getStatementSeq().size() + pBlock->getPhiFunctions().size();
  return count;
}

// Counters: ns_per_stmt for the whole pipeline and STEP_ns_per_stmt for each step, and the peak of
// building and running the pipeline together, peak_bytes_per_stmt; ssa_stmts, the statements and phi
// functions right after SSA form, with ns_per_ssa_stmt and peak_bytes_per_ssa_stmt per each of them.
void runPipeline(benchmark::State& state, Shape shape, std::size_t statements) {
  const std::string& text = programText(shape, statements);
  std::map<std::string, double> stepNanoseconds;
  double nanoseconds = 0, peakBytes = 0;
  std::size_t ssaStatements = 0;
  for (auto _ : state) {
    Session session;
    session.load(text);
    double seconds = 0;
    for (const std::string& step : tool::defaultPipeline()) {
      double start = threadSeconds();
      tool::findPass(step)->run(session.program());
      double stepSeconds = threadSeconds() - start;
      stepNanoseconds[step] += stepSeconds * kNanoseconds;
      seconds += stepSeconds;
      if (step == "ssa") ssaStatements = countStatements(session.program().graph());
    }
    state.SetIterationTime(seconds);
    nanoseconds += seconds * kNanoseconds;
    peakBytes += static_cast<double>(session.peakBytes());
  }
  setPerStatement(state, "ns_per_stmt", nanoseconds, statements);
  setPerStatement(state, "peak_bytes_per_stmt", peakBytes, statements);
  state.counters["ssa_stmts"] = static_cast<double>(ssaStatements);
  setPerStatement(state, "ns_per_ssa_stmt", nanoseconds, ssaStatements);
  setPerStatement(state, "peak_bytes_per_ssa_stmt", peakBytes, ssaStatements);
  for (const auto& [step, total] : stepNanoseconds)
    setPerStatement(state, step + "_ns_per_stmt", total, statements);
}

}  // namespace

void registerPipelineBenchmarks() {
  for (Shape shape : kShapes)
    for (std::size_t statements : benchmarkSizes(shape)) {
      std::string suffix = std::string("/") + shapeName(shape) + "/" + std::to_string(statements);
      benchmark::RegisterBenchmark(("build" + suffix).c_str(), buildGraph, shape, statements)
          ->Iterations(iterationsAt(statements))
          ->UseManualTime()
          ->Unit(benchmark::kMillisecond);
      benchmark::RegisterBenchmark(("pipeline" + suffix).c_str(), runPipeline, shape, statements)
          ->Iterations(iterationsAt(statements))
          ->UseManualTime()
          ->Unit(benchmark::kMillisecond);
    }
}

}  // namespace ssaopt::bench
