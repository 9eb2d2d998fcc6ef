// The run and check commands of the ssaopt tool as a user runs them: what they print, where, and
// their exit status.
#include <gtest/gtest.h>

#include <string>

#include "tools/tool_running.h"

namespace {

const char* const kExamples[] = {"typical_run", "controller", "procedures", "loop", "outline"};

using tooltest::example;
using tooltest::fileWith;
using tooltest::pathOf;
using tooltest::Result;
using tooltest::ssaopt;

// The trace without its last line, which counts the statements the run executed.
std::string eventsOf(const std::string& trace) {
  return trace.substr(0, trace.rfind('\n', trace.size() - 2) + 1);
}

TEST(ToolCheck, EveryExampleBehavesTheSameAfterTheDefaultPipeline) {
  for (const char* name : kExamples) {
    Result result = ssaopt("check " + example(name));
    EXPECT_EQ(result.status, 0) << name << "\n" << result.out << result.err;
    EXPECT_EQ(result.out, "same behaviour on 20 runs\npropagated values held on 20 runs\n") << name;
  }
}

TEST(ToolCheck, RunsThatHitAGuardAreListedAndCountForNothing) {
  std::string path = fileWith("spin.ssa",
                              "var int16 v volatile;\n"
                              "var int16 x = 0;\n"
                              "proc #main {\n"
                              "  x = v;\n"
                              "spin:\n"
                              "  if x >= -32768 goto spin else end;\n"
                              "}\n");
  Result result = ssaopt("check " + path + " --runs 2 --steps=3 --seed 5");
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(result.out,
            "input seed 5: the original program is inconclusive in step 1: more than 1000000 statements in "
            "one step\n"
            "input seed 6: the original program is inconclusive in step 1: more than 1000000 statements in "
            "one step\n"
            "same behaviour on 0 runs, 2 inconclusive\n"
            "propagated values held on 2 runs\n");
}

TEST(ToolRun, PrintsTheTraceOfTheProgramAsWritten) {
  std::string values = fileWith("values", "level 150 3  # too high, then low\n");
  Result result = ssaopt("run " + example("outline") + " --steps 2 --inputs " + values);
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(eventsOf(result.out),
            "step 1: extern log_event(alarm = 1, count = 1)\n"
            "step 2: extern log_event(alarm = 0, count = 2)\n"
            "output alarm = 0\n");
  EXPECT_EQ(result.out.substr(eventsOf(result.out).size()).rfind("completed 2 steps (", 0), 0u) << result.out;
  // Regression: an option after --inputs made the run fall back to seeded streams.
  for (const std::string& order :
       {"--inputs " + values + " --steps 2", "--inputs " + values + " --passes=ssa --steps 2"})
    EXPECT_EQ(eventsOf(ssaopt("run " + example("outline") + " " + order).out), eventsOf(result.out)) << order;
}

TEST(ToolRun, ASeedGivesOneTraceBeforeAndAfterThePipeline) {
  std::string asWritten = ssaopt("run " + example("procedures") + " --steps 4 --seed 9").out;
  EXPECT_EQ(eventsOf(ssaopt("run " + example("procedures") + " --steps 4 --seed 9").out),
            eventsOf(asWritten));
  EXPECT_EQ(
      eventsOf(
          ssaopt("run --passes=inline,ssa,divide,sccp " + example("procedures") + " --steps 4 --seed 9").out),
      eventsOf(asWritten));
  EXPECT_NE(eventsOf(ssaopt("run " + example("procedures") + " --steps 4 --seed 10").out),
            eventsOf(asWritten));
}

// 40 arrays of the largest length are 320 MB of numbers for the interpreter; with 200 MB of address
// space the run runs out of memory. The regression: an uncaught std::bad_alloc aborted the tool.
TEST(ToolRun, RunningOutOfMemoryIsOneLineAndStatusOne) {
#if defined(__SANITIZE_ADDRESS__)
  GTEST_SKIP() << "AddressSanitizer reserves more address space than the limit this test sets";
#endif
  std::string text;
  for (int i = 0; i < 40; ++i) text += "var int8 a" + std::to_string(i) + "[1048576];\n";
  std::string path = fileWith("big.ssa", text + "proc #main {}\n");
  std::string command = "(ulimit -v 200000; " + std::string(SSAOPT_TOOL) + " run " + path + ") >'" +
                        pathOf("out") + "' 2>'" + pathOf("err") + "'";
  int status = std::system(command.c_str());
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
  EXPECT_EQ(tooltest::contentsOf(pathOf("err")), "ssaopt: out of memory\n");
  EXPECT_EQ(tooltest::contentsOf(pathOf("out")), "");
}

TEST(ToolRun, MalformedInputValuesAreAnError) {
  std::string values = fileWith("values", "table 1 2\ntable three\n");
  Result malformed = ssaopt("run " + example("loop") + " --inputs " + values);
  EXPECT_EQ(malformed.status, 1);
  EXPECT_EQ(malformed.err, "ssaopt: " + values + ": line 2: expected a variable name and numbers\n");
  EXPECT_EQ(malformed.out, "");
}

TEST(ToolRun, InputValuesForWhatIsNotAnInputAreAnError) {
  std::string misspelt = fileWith("misspelt", "tabel 1 2\n");
  Result unknown = ssaopt("run " + example("loop") + " --inputs " + misspelt);
  EXPECT_EQ(unknown.status, 1);
  EXPECT_EQ(unknown.err, "ssaopt: " + misspelt + ": 'tabel' is not a variable of the program\n");
  EXPECT_EQ(unknown.out, "");
  std::string notInput = fileWith("total", "total 1 2\n");
  EXPECT_EQ(
      ssaopt("run " + example("loop") + " --inputs " + notInput).err,
      "ssaopt: " + notInput + ": 'total' is not an input of the program (neither volatile nor an array)\n");
}

TEST(ToolRun, InputValuesComeFromStandardInputToo) {
  std::string values = fileWith("values", "level 150 3\n");
  Result fromFile = ssaopt("run " + example("outline") + " --steps 2 --inputs " + values);
  Result fromInput = ssaopt("run " + example("outline") + " --steps 2 --inputs - <" + values);
  EXPECT_EQ(fromInput.status, 0) << fromInput.err;
  EXPECT_EQ(fromInput.out, fromFile.out);
}

TEST(ToolRun, AProgramWithErrorsIsReportedAsByTheTransformingTool) {
  std::string path = fileWith("error.ssa", "var int16 x;\nproc #main {\n  x = y;\n}\n");
  for (const char* command : {"run ", "check "}) {
    Result result = ssaopt(command + path);
    EXPECT_EQ(result.status, 1) << command;
    EXPECT_EQ(result.err, path + ":3:7: error: unknown variable 'y'\n  x = y;\n      ^\n") << command;
  }
}

TEST(ToolBehaviourUsage, OptionsOfTheCommandsBelongToThem) {
  struct Case {
    const char* arguments;
    const char* error;
  };
  const Case kCases[] = {
      {"x.ssa --steps 3", "--steps is an option of run, check, cc-check and reduce, not of the main command"},
      {"run x.ssa --runs 3", "--runs is an option of check, cc-check and reduce, not of run"},
      {"check x.ssa --inputs v.txt", "--inputs is an option of run, not of check"},
      {"check x.ssa --steps 0", "--steps needs at least 1"},
      {"check x.ssa --seed abc", "--seed needs a whole number, not 'abc'"},
      {"run x.ssa --steps", "--steps needs a value"},
      {"check", "no input file"},
  };
  for (const Case& wrong : kCases) {
    Result result = ssaopt(wrong.arguments);
    EXPECT_EQ(result.status, 2) << wrong.arguments;
    EXPECT_EQ(result.err.rfind(std::string("ssaopt: ") + wrong.error + " (", 0), 0u) << result.err;
  }
  Result unknownPass = ssaopt("check --passes=ssa,nosuch " + example("loop"));
  EXPECT_EQ(unknownPass.status, 2);
  EXPECT_EQ(unknownPass.err.rfind("ssaopt: unknown pass 'nosuch'; known passes: ", 0), 0u) << unknownPass.err;
}

}  // namespace
