// The default pipeline's printed result on every example and on the benchmark programs of 10^3 and
// 10^4 statements in both shapes must stay exactly what was recorded in expected/, and the library's
// verifier must pass after every step. Running the test with SSAOPT_UPDATE_GOLDEN=1 records the
// current results instead (for a deliberate change of them).
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <ostream>
#include <sstream>
#include <string>
#include <vector>

#include "program_shapes.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/pipeline.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

namespace {

namespace fs = std::filesystem;
using ssaopt::bench::Shape;

struct GoldenCase {
  std::string name;
  std::string program;
};

// Names the case in test listings instead of dumping its bytes.
void PrintTo(const GoldenCase& golden, std::ostream* out) { *out << golden.name; }

std::string readFile(const fs::path& path) {
  std::ifstream file(path, std::ios::binary);
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

std::vector<GoldenCase> goldenCases() {
  std::vector<GoldenCase> cases;
  std::vector<fs::path> examples;
  for (const fs::directory_entry& entry : fs::directory_iterator(SSAOPT_EXAMPLES_DIR))
    if (entry.path().extension() == ".ssa") examples.push_back(entry.path());
  std::sort(examples.begin(), examples.end());
  for (const fs::path& path : examples) cases.push_back({path.stem().string(), readFile(path)});
  for (Shape shape : {Shape::FewLargeProcedures, Shape::ManySmallProcedures})
    for (std::size_t statements : {1000, 10000})
      cases.push_back({std::string(ssaopt::bench::shapeName(shape)) + "_" + std::to_string(statements),
                       ssaopt::bench::makeControllerProgram(statements, shape)});
  return cases;
}

// The client's part in every step, and the library's verifier after it.
class VerifiedSteps : public ssaopt::client::ProgramSteps {
public:
  using ProgramSteps::ProgramSteps;
  void runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) override {
    ProgramSteps::runStep(step, graph);
    if (!graph.verify()) failedAfter += std::string(failedAfter.empty() ? "" : ", ") + step.name;
  }

  std::string failedAfter;
};

struct PipelineResult {
  std::string printed;
  std::string verifierFailedAfter;
  std::vector<std::string> reports;
};

// What `ssaopt FILE` prints: the program after the default pipeline.
PipelineResult runDefaultPipeline(const std::string& text) {
  // Numbered from 0, as in a run of the tool, so that block names match.
  ssaopt::client::restartObjectNumbering();
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope use(&pool);
  KvCSSAControl control;
  control.boot();
  PipelineResult result;
  {
    ssaopt::ReportLog log;
    ssaopt::client::LoadResult loaded = ssaopt::client::loadProgram(text);
    if (loaded.program) {
      VerifiedSteps steps(*loaded.program);
      ssaopt::runTypicalRun(loaded.program->graph(), steps);
      result.printed = ssaopt::client::printProgram(*loaded.program);
      result.verifierFailedAfter = steps.failedAfter;
    }
    result.reports = log.messages();
    for (const ssaopt::ReportLog::Consistency& failure : log.consistencyFailures())
      result.reports.push_back(failure.condition);
  }
  control.shutdown();
  return result;
}

class GoldenOutput : public testing::TestWithParam<GoldenCase> {};

TEST_P(GoldenOutput, PipelineResultIsUnchanged) {
  PipelineResult result = runDefaultPipeline(GetParam().program);
  const std::string& printed = result.printed;
  ASSERT_FALSE(printed.empty()) << "the front end rejected the program";
  EXPECT_EQ(result.verifierFailedAfter, "") << "the verifier failed after these steps";
  EXPECT_EQ(result.reports, std::vector<std::string>());
  fs::path expected = fs::path(SSAOPT_GOLDEN_DIR) / (GetParam().name + ".txt");
  const char* update = std::getenv("SSAOPT_UPDATE_GOLDEN");
  if (update && std::string(update) == "1") {
    std::ofstream(expected, std::ios::binary) << printed;
    return;
  }
  ASSERT_TRUE(fs::exists(expected)) << expected;
  // Compared line by line, so a difference names its first line instead of dumping two large texts.
  std::istringstream want(readFile(expected)), got(printed);
  std::string wantLine, gotLine;
  for (int line = 1; std::getline(want, wantLine); ++line) {
    ASSERT_TRUE(std::getline(got, gotLine)) << "output ends before line " << line;
    ASSERT_EQ(wantLine, gotLine) << "first difference at line " << line;
  }
  EXPECT_FALSE(std::getline(got, gotLine)) << "output goes on after the expected text";
}

INSTANTIATE_TEST_SUITE_P(ExamplesAndBenchmarkPrograms, GoldenOutput, testing::ValuesIn(goldenCases()),
                         [](const testing::TestParamInfo<GoldenCase>& test) { return test.param.name; });

}  // namespace
