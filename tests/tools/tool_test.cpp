// The ssaopt tool as a user runs it: options, exit status, what goes to standard output and what to
// standard error.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace {

const char* const kExamples[] = {"typical_run", "controller", "procedures", "loop", "outline"};

struct ToolRun {
  int status;
  std::string out;
  std::string err;
};

std::string readFile(const std::string& path) {
  std::ifstream file(path);
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

// A file of the running test's own, so that tests may run in parallel.
std::string testFile(const std::string& name) {
  const ::testing::TestInfo* pTest = ::testing::UnitTest::GetInstance()->current_test_info();
  return ::testing::TempDir() + "ssaopt_" + pTest->test_suite_name() + "_" + pTest->name() + "_" + name;
}

std::string writeFile(const std::string& name, const std::string& text) {
  std::string path = testFile(name);
  std::ofstream(path) << text;
  return path;
}

std::string example(const char* name) { return std::string(SSAOPT_EXAMPLES_DIR) + "/" + name + ".ssa"; }

ToolRun runTool(const std::string& arguments) {
  std::string errPath = testFile("stderr");
  std::string command = std::string(SSAOPT_TOOL) + " " + arguments + " 2>'" + errPath + "'";
  ToolRun run{-1, "", ""};
  std::FILE* pPipe = popen(command.c_str(), "r");
  if (!pPipe) return run;
  char buffer[4096];
  for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, pPipe)) > 0;) run.out.append(buffer, n);
  int status = pclose(pPipe);
  run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  run.err = readFile(errPath);
  return run;
}

bool contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

const char* const kSmallProgram =
    "var int16 x;\n"
    "proc #main {\n"
    "  x = x+1 ;\n"
    "}\n";

// ---- Usage ---------------------------------------------------------------------------------------

TEST(ToolUsage, HelpShowsTheOptionsAndThePasses) {
  ToolRun run = runTool("--help");
  EXPECT_EQ(run.status, 0);
  for (const char* part :
       {"usage: ssaopt [options] FILE", "--passes=LIST", "--print-after-all", "--emit=text|dot", "-o FILE",
        "--verify", "--stats", "--time-passes", "--show-values", "--version", "divide"})
    EXPECT_TRUE(contains(run.out, part)) << part;
}

TEST(ToolUsage, VersionNamesTheTool) {
  ToolRun run = runTool("--version");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.out.rfind("ssaopt ", 0), 0u);
}

TEST(ToolUsage, AWrongCommandLineIsOneLineAndStatusTwo) {
  std::string directory = std::filesystem::temp_directory_path().string();
  for (const std::string& arguments : std::vector<std::string>{
           "--frobnicate x.ssa", std::string(""), example("loop") + " " + example("loop"), "--emit=pdf x.ssa",
           "x.ssa -o", "no/such/file.ssa", directory, "run no/such/file.ssa",
           "run " + example("loop") + " --inputs no/such/values", "check " + example("loop") + " --runs 1x",
           "generate --seed 99999999999999999999",
           // Passes whose needs are not met; constant propagation before the SSA form never ended.
           "--passes=sccp " + example("loop"), "--passes=ssa,inline " + example("loop"),
           "fuzz --passes=ssa,divide,propagate"}) {
    ToolRun run = runTool(arguments);
    EXPECT_EQ(run.status, 2) << arguments;
    EXPECT_EQ(run.err.rfind("ssaopt: ", 0), 0u) << run.err;
    EXPECT_EQ(std::count(run.err.begin(), run.err.end(), '\n'), 1) << run.err;
    EXPECT_EQ(run.out, "") << arguments;
  }
  EXPECT_EQ(runTool("--frobnicate x.ssa").err,
            "ssaopt: unknown option '--frobnicate' (ssaopt --help shows the usage)\n");
  EXPECT_EQ(
      runTool("no/such/file.ssa").err,
      "ssaopt: cannot read 'no/such/file.ssa': No such file or directory (ssaopt --help shows the usage)\n");
}

TEST(ToolUsage, AnUnknownPassIsNamedWithTheKnownOnes) {
  ToolRun run = runTool("--passes=divide,nosuch " + example("loop"));
  EXPECT_EQ(run.status, 2);
  EXPECT_EQ(run.err.rfind("ssaopt: unknown pass 'nosuch'; known passes: ", 0), 0u) << run.err;
  EXPECT_TRUE(contains(run.err, "divide"));
  EXPECT_EQ(run.out, "");
}

// ---- Input -----------------------------------------------------------------------------------------

TEST(ToolInput, ErrorsGiveFileLineAndColumnAndNoOutput) {
  std::string path = writeFile("error.ssa", "var int16 x;\nproc #main {\n  x = y;\n}\n");
  ToolRun run = runTool(path);
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.err, path + ":3:7: error: unknown variable 'y'\n");
  EXPECT_EQ(run.out, "");
}

TEST(ToolInput, WarningsDoNotStopTheRun) {
  std::string path = writeFile("warning.ssa", "proc #main {\n  goto end;\nlost:\n}\n");
  ToolRun run = runTool("--passes= " + path);
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(
      run.err,
      path + ":3:1: warning: block 'lost' cannot be reached from the start of '#main' and is dropped\n");
  EXPECT_EQ(run.out, "\nproc #main {\n}\n");
}

// A logical variable compared with a constant other than 0 and 1: the valid-condition pass decides the
// condition, and the tool says so at the condition.
TEST(ToolInput, AComparisonThatCannotHoldIsAWarningAtTheCondition) {
  std::string path = writeFile("decided.ssa",
                               "var bool b;\nvar int16 x output;\n"
                               "proc #main {\n  if b != 5 goto end else two;\ntwo:\n  x = 2;\n}\n");
  ToolRun run = runTool("--passes=valid-conditions " + path);
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, path + ":4:6: warning: 'b' is Boolean, so comparing it unequal to 5 is always true\n");
  EXPECT_TRUE(contains(run.out, "  if 1 goto end else two;\n")) << run.out;
}

// ---- Output ----------------------------------------------------------------------------------------

TEST(ToolOutput, WithoutPassesTheProgramIsPrintedAsRead) {
  ToolRun run = runTool("--passes= " + writeFile("small.ssa", kSmallProgram));
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.out, "var int16 x;\n\nproc #main {\n  x = x + 1;\n}\n");
  EXPECT_EQ(runTool("--passes= " + writeFile("again.ssa", run.out)).out, run.out);
}

TEST(ToolOutput, DotGoesToTheFileGivenAndGraphvizAcceptsItAfterThePipeline) {
  std::string path = testFile("out.dot");
  for (const char* name : kExamples) {
    ToolRun run = runTool("--emit=dot -o " + path + " " + example(name));
    EXPECT_EQ(run.status, 0) << name;
    EXPECT_EQ(run.out, "") << name;
    EXPECT_EQ(readFile(path).rfind("digraph program {", 0), 0u) << name;
    EXPECT_EQ(std::system(("dot -Tsvg " + path + " -o /dev/null").c_str()), 0) << name;
  }
}

TEST(ToolOutput, AnUnwritableOutputFails) {
  ToolRun run = runTool("-o /nonexistent/out.ssa " + example("loop"));
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.err, "ssaopt: cannot write '/nonexistent/out.ssa'\n");
}

TEST(ToolOutput, ShowValuesAddsValuesAndExecutableEdges) {
  ToolRun run = runTool(
      "--passes= --show-values " +
      writeFile("values.ssa", "var int16 x;\nproc #main {\n  x = 1;\n  if x goto end else end;\n}\n"));
  EXPECT_EQ(run.out,
            "var int16 x;\n\nproc #main {\n  x = 1;  // ?\n  if x goto end else end;\n"
            "  // to end: not executable, to end: not executable\n}\n");
}

// ---- Checking and measuring --------------------------------------------------------------------

TEST(ToolChecks, EveryExampleRunsThroughVerifyWithoutAReport) {
  for (const char* name : kExamples) {
    ToolRun run = runTool("--verify " + example(name));
    EXPECT_EQ(run.status, 0) << name << "\n" << run.err;
    EXPECT_EQ(run.err, "") << name;
  }
}

TEST(ToolChecks, PrintAfterAllShowsTheProgramAfterEveryPass) {
  ToolRun run = runTool("--passes=divide,divide --print-after-all " + writeFile("twice.ssa", kSmallProgram));
  EXPECT_EQ(run.status, 0);
  std::string after = "// ---- after divide ----\nvar int16 x;\n\nproc #main {\n  x = x + 1;\n}\n";
  EXPECT_EQ(run.err, after + after);
}

TEST(ToolChecks, StatsCountBeforeAndAfterThePipeline) {
  ToolRun run = runTool("--passes=divide --stats " + example("loop"));
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err,
            "statistics                  before     after\n"
            "  procedures                     1         1\n"
            "  blocks                         5         7\n"
            "  statements                     5         5\n"
            "  phi functions                  0         0\n"
            "  constants found                0         0\n"
            "  blocks removed                 0         0\n"
            "  definitions removed            0         0\n");
  // The typical run removes the false branch and the definitions nobody reads.
  ToolRun typical = runTool("--stats " + example("typical_run"));
  EXPECT_EQ(typical.status, 0);
  EXPECT_FALSE(contains(typical.err, "blocks removed                 0         0")) << typical.err;
  EXPECT_FALSE(contains(typical.err, "definitions removed            0         0")) << typical.err;
}

TEST(ToolChecks, TimePassesReportsEachPassTheTotalAndThePeakMemory) {
  ToolRun run = runTool("--passes=divide --time-passes " + example("loop"));
  EXPECT_EQ(run.status, 0);
  EXPECT_TRUE(contains(run.err, "time divide")) << run.err;
  EXPECT_TRUE(contains(run.err, "time total")) << run.err;
  EXPECT_TRUE(contains(run.err, "peak memory ")) << run.err;
  EXPECT_TRUE(contains(run.err, " KiB\n")) << run.err;
}

}  // namespace
