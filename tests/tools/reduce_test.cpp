// The reduce command as a user runs it on a program that makes a command fail: the program shrinks
// while the command keeps failing the same way.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <string>

#include "tools/tool_running.h"

namespace {

using tooltest::fileWith;
using tooltest::Result;
using tooltest::ssaopt;

// A tool with two faults: its fold "crashes" on a multiplication by 2 and its division pass on a
// division by 4. Both are in the program, and the fold's crash shows first.
const char* const kSabotagedTool =
    "#!/bin/sh\n"
    "grep -q '\\* 2' \"$1\" && { echo 'fold: crashed at a multiplication' >&2; exit 3; }\n"
    "grep -q '/ 4' \"$1\" && { echo 'divide: crashed at a division' >&2; exit 3; }\n"
    "exit 0\n";

const char* const kProgram =
    "var int16 in volatile;\n"
    "var int16 a = 0;\n"
    "var int16 b = 0;\n"
    "var int16 x output = 0;\n"
    "proc #main {\n"
    "  a = in + 1; b = a / 4;\n"
    "  if a > b goto high else low;\n"
    "high:\n"
    "  call scale();\n"
    "  goto end;\n"
    "low:\n"
    "  x = b - a;\n"
    "}\n"
    "proc scale {\n"
    "  x = a * 2;\n"
    "}\n";

std::string executable(const std::string& name, const std::string& text) {
  std::string path = fileWith(name, text);
  chmod(path.c_str(), 0700);
  return path;
}

TEST(ToolReduce, ShrinksWhileTheCommandFailsTheSameWay) {
  std::string tool = executable("tool.sh", kSabotagedTool);
  std::string out = tooltest::pathOf("reduced.ssa");
  Result result = ssaopt("reduce " + fileWith("program.ssa", kProgram) + " -o " + out + " -- " + tool);
  EXPECT_EQ(result.status, 0) << result.err;
  // The multiplication and what it needs to load stay; the division, whose crash would be another
  // failure, goes with everything else. The statements come one per line, as the printer writes them.
  EXPECT_EQ(tooltest::contentsOf(out),
            "var int16 a = 0;\n"
            "var int16 x output = 0;\n"
            "proc #main {\n"
            "}\n"
            "proc scale {\n"
            "  x = a * 2;\n"
            "}\n");
  EXPECT_NE(result.err.find("fails with status 3: fold: crashed at a multiplication\n"), std::string::npos)
      << result.err;
  EXPECT_NE(result.err.find("ssaopt: reduce: 7 of 16 lines left after "), std::string::npos) << result.err;
}

TEST(ToolReduce, MatchKeepsTheFailuresThatShowTheText) {
  std::string tool = executable("tool.sh", kSabotagedTool);
  Result result =
      ssaopt("reduce " + fileWith("program.ssa", kProgram) + " --match=crashed -- " + tool + " {}");
  EXPECT_EQ(result.status, 0) << result.err;
  // Either crash counts, so the smallest program keeps only one of them.
  EXPECT_LE(std::count(result.out.begin(), result.out.end(), '\n'), 6) << result.out;
}

TEST(ToolReduce, ACommandThatDoesNotFailLeavesNothingToReduce) {
  Result result = ssaopt("reduce " + fileWith("program.ssa", kProgram) + " -- true");
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ssaopt: reduce: 'true' does not fail on " + tooltest::pathOf("program.ssa") + "\n");
  EXPECT_EQ(result.out, "");
}

TEST(ToolReduce, AProgramWithErrorsIsNotReduced) {
  Result result = ssaopt("reduce " + fileWith("program.ssa", "proc #main {\n  x = 1;\n}\n") + " -- false");
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.err.find("error: unknown variable 'x'"), std::string::npos) << result.err;
}

// By default reduce keeps what check or else cc-check finds: here a compiler whose multiplications in
// the original program give one more (as in cc_check_test.cpp). The program shrinks to what shows it.
TEST(ToolReduce, ByDefaultCcCheckFailsOnASabotagedCompiler) {
  if (std::system("command -v cc >/dev/null 2>&1") != 0) GTEST_SKIP() << "no C compiler (cc) installed";
  std::string compiler =
      executable("cc",
                 "#!/bin/sh\n"
                 "for a; do case $a in *original.c) sed -i 's/: a \\* b;/: a * b + 1.0;/' $a;; esac; done\n"
                 "exec cc \"$@\"\n");
  std::string program = fileWith("program.ssa",
                                 "var int16 in volatile;\n"
                                 "var int16 a = 0;\n"
                                 "var int16 x output = 0;\n"
                                 "proc #main {\n"
                                 "  a = in + 1;\n"
                                 "  x = a * 2;\n"
                                 "  extern show uses(a);\n"
                                 "}\n");
  Result result = ssaopt("reduce " + program + " --runs 1 --steps 1", "CC=" + compiler);
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_NE(result.err.find("ssaopt cc-check fails with status 1: different behaviour"), std::string::npos)
      << result.err;
  EXPECT_NE(result.out.find("x = a * 2;"), std::string::npos) << result.out;
  EXPECT_EQ(result.out.find("extern"), std::string::npos) << result.out;
}

}  // namespace
