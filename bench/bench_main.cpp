// The benchmarks of the graph's construction, the default pipeline and the dominator computation on
// controller-like programs of 10^3 to 10^6 statements. Counters give times per statement (or per
// node) and the pool controller's peak bytes per statement; --benchmark_out=FILE
// --benchmark_out_format=json writes what scripts/plot-benchmarks.sh plots.
#include <benchmark/benchmark.h>

#include "bench_session.h"

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
  ssaopt::bench::registerPipelineBenchmarks();
  ssaopt::bench::registerDominatorBenchmarks();
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
