// The benchmarks of the graph's construction, the default pipeline and the dominator computation on
// controller-like programs of 10^3 to 10^6 statements. Counters give times per statement (or per
// node) and the pool controller's peak bytes per statement; --benchmark_out=FILE
// --benchmark_out_format=json writes what scripts/plot-benchmarks.sh plots, with the processor and
// the build type in its context for the plot's title and the steps in the order they run for its key.
#include <benchmark/benchmark.h>

#include <fstream>
#include <string>

#include "bench_session.h"
#include "ssaopt/cfg/pipeline.h"

namespace {

// The processor's model as the kernel names it, or "unknown processor" where it does not.
std::string processorModel() {
  std::ifstream cpuinfo("/proc/cpuinfo");
  const std::string key = "model name";
  for (std::string line; std::getline(cpuinfo, line);) {
    std::string::size_type colon = line.find(':');
    if (line.compare(0, key.size(), key) == 0 && colon != std::string::npos)
      return line.substr(line.find_first_not_of(' ', colon + 1));
  }
  return "unknown processor";
}

}  // namespace

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
  benchmark::AddCustomContext("ssaopt_build_type", SSAOPT_BUILD_TYPE);
  benchmark::AddCustomContext("processor", processorModel());
  std::string steps;
  for (const ssaopt::PipelineStep* pStep : ssaopt::typicalRun())
    steps += (steps.empty() ? "" : " ") + std::string(pStep->name);
  benchmark::AddCustomContext("pipeline_steps", steps);
  ssaopt::bench::registerPipelineBenchmarks();
  ssaopt::bench::registerDominatorBenchmarks();
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
