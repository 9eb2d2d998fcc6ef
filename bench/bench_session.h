// What every benchmark iteration needs: a pool controller installed for its whole life (whose peak is
// the memory figure), the module booted, and a program built through the client.
#pragma once

#include <time.h>

#include <cstddef>
#include <memory>
#include <string>

#include "program_shapes.h"
#include "ssaopt/client/program.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"

namespace ssaopt::bench {

// Seconds of CPU time of the calling thread. The machines this runs on are shared with builds: wall
// time would count the time spent waiting for a core.
inline double threadSeconds() {
  timespec now{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

// The program of a shape and size, made once per run of the benchmarks.
const std::string& programText(Shape shape, std::size_t statements);

class Session {
public:
  Session();
  ~Session();
  Session(const Session&) = delete;
  Session& operator=(const Session&) = delete;

  // Builds the graph of `text` through the client's front end; aborts if the front end rejects it.
  void load(const std::string& text);
  // Runs the steps of the library's typical run that come before step `name`.
  void runPipelineUpTo(const std::string& name);

  client::Program& program() { return *m_pProgram; }
  std::size_t peakBytes() const { return m_Pool.peakBytes(); }

private:
  PoolMemController m_Pool;
  PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
  std::unique_ptr<client::Program> m_pProgram;
};

}  // namespace ssaopt::bench

namespace ssaopt::bench {

// The sizes measured, with the iterations at each: enough for a stable figure at the small sizes,
// one at 10^6, so that the whole run takes a few minutes.
struct BenchSize {
  std::size_t statements;
  int iterations;
};
inline constexpr BenchSize kSizes[] = {{1000, 20}, {10000, 5}, {100000, 2}, {1000000, 1}};
inline constexpr Shape kShapes[] = {Shape::FewLargeProcedures, Shape::ManySmallProcedures};

// build/SHAPE/SIZE and pipeline/SHAPE/SIZE (pipeline_bench.cpp), idoms/SHAPE/SIZE
// (dominators_bench.cpp).
void registerPipelineBenchmarks();
void registerDominatorBenchmarks();

}  // namespace ssaopt::bench
