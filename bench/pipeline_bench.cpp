// Building the graph through the client, and the library's typical run with the time of each step.
#include <benchmark/benchmark.h>

#include <map>
#include <string>

#include "bench_session.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/client/pipeline.h"
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

// The client's part in every step, timed with the library's; the statements and phi functions right
// after SSA form are counted (outside the time).
class TimedSteps : public client::ProgramSteps {
public:
  TimedSteps(client::Program& program, std::map<std::string, double>& stepNanoseconds)
      : client::ProgramSteps(program), m_StepNanoseconds(stepNanoseconds) {}

  void runStep(const PipelineStep& step, KvCControlFlowGraph& graph) override {
    double start = threadSeconds();
    client::ProgramSteps::runStep(step, graph);
    double stepSeconds = threadSeconds() - start;
    m_StepNanoseconds[step.name] += stepSeconds * kNanoseconds;
    m_Seconds += stepSeconds;
    if (step.operation == GraphOperation::TransformToSSAForm) m_SSAStatements = countStatements(graph);
  }
  double seconds() const { return m_Seconds; }
  std::size_t ssaStatements() const { return m_SSAStatements; }

private:
  std::map<std::string, double>& m_StepNanoseconds;
  double m_Seconds = 0;
  std::size_t m_SSAStatements = 0;
};

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
    TimedSteps steps(session.program(), stepNanoseconds);
    runTypicalRun(session.program().graph(), steps);
    double seconds = steps.seconds();
    ssaStatements = steps.ssaStatements();
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
