// The one-line check that a pipeline keeps what a program does:
//
//   EXPECT_TRUE(behaviourtest::sameBehaviour(text, {"inline", "ssa", "divide", "sccp"}));
//
// loads the program twice, runs the pipeline (pass names as the tool knows them) on the second copy,
// and runs both on the same seeded input streams (ssaopt/client/interpreter.h). A difference fails
// with where it is and the transformed program; so does a check in which no run was conclusive.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "passes.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/pool.h"

namespace behaviourtest {

struct Runs {
  std::uint64_t runs = 20;
  std::uint64_t steps = 5;
  std::uint64_t firstSeed = 1;
};

inline ::testing::AssertionResult sameBehaviour(const std::string& text,
                                                const std::vector<std::string>& pipeline,
                                                const Runs& runs = {}) {
  std::string unknown = ssaopt::tool::findUnknownPass(pipeline);
  if (!unknown.empty()) return ::testing::AssertionFailure() << unknown;
  // Programs go while the pool that made them is still installed.
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope scope(&pool);
  ssaopt::client::LoadResult original = ssaopt::client::loadProgram(text);
  ssaopt::client::LoadResult transformed = ssaopt::client::loadProgram(text);
  if (!original.program)
    return ::testing::AssertionFailure()
           << "the program does not load: "
           << ssaopt::client::formatDiagnostic("t.ssa", original.diagnostics.back());
  ssaopt::tool::runPipeline(pipeline, *transformed.program);
  ssaopt::client::CheckSettings settings;
  settings.runs = runs.runs;
  settings.firstSeed = runs.firstSeed;
  settings.limits.steps = runs.steps;
  ssaopt::client::CheckReport report =
      ssaopt::client::checkBehaviour(*original.program, *transformed.program, settings);
  std::string shown = ssaopt::client::formatReport(report);
  if (report.difference)
    return ::testing::AssertionFailure()
           << shown << "after " << ssaopt::tool::joinedPassNames(pipeline) << ":\n"
           << ssaopt::client::printProgram(*transformed.program);
  if (report.sameRuns == 0) return ::testing::AssertionFailure() << shown << "no run was conclusive";
  return ::testing::AssertionSuccess() << shown;
}

}  // namespace behaviourtest
