// Building the graph through the client, and the library's typical run with the time of each step.
#include <benchmark/benchmark.h>

#include <map>
#include <string>

#include "bench_session.h"
#include "ssaopt/client/pipeline.h"

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

// The client's part in every step, timed with the library's.
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
  }
  double seconds() const { return m_Seconds; }

private:
  std::map<std::string, double>& m_StepNanoseconds;
  double m_Seconds = 0;
};

// Counters: ns_per_stmt for the whole pipeline and STEP_ns_per_stmt for each step, and the peak of
// building and running the pipeline together, peak_bytes_per_stmt.
void runPipeline(benchmark::State& state, Shape shape, std::size_t statements) {
  const std::string& text = programText(shape, statements);
  std::map<std::string, double> stepNanoseconds;
  double nanoseconds = 0, peakBytes = 0;
  for (auto _ : state) {
    Session session;
    session.load(text);
    TimedSteps steps(session.program(), stepNanoseconds);
    runTypicalRun(session.program().graph(), steps);
    double seconds = steps.seconds();
    state.SetIterationTime(seconds);
    nanoseconds += seconds * kNanoseconds;
    peakBytes += static_cast<double>(session.peakBytes());
  }
  setPerStatement(state, "ns_per_stmt", nanoseconds, statements);
  setPerStatement(state, "peak_bytes_per_stmt", peakBytes, statements);
  for (const auto& [step, total] : stepNanoseconds)
    setPerStatement(state, step + "_ns_per_stmt", total, statements);
}

}  // namespace

void registerPipelineBenchmarks() {
  for (Shape shape : kShapes)
    for (const BenchSize& size : kSizes) {
      std::string suffix = std::string("/") + shapeName(shape) + "/" + std::to_string(size.statements);
      benchmark::RegisterBenchmark(("build" + suffix).c_str(), buildGraph, shape, size.statements)
          ->Iterations(size.iterations)
          ->UseManualTime()
          ->Unit(benchmark::kMillisecond);
      benchmark::RegisterBenchmark(("pipeline" + suffix).c_str(), runPipeline, shape, size.statements)
          ->Iterations(size.iterations)
          ->UseManualTime()
          ->Unit(benchmark::kMillisecond);
    }
}

}  // namespace ssaopt::bench
