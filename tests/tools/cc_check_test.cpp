// The cc-check command as a user runs it: the C emitted for every example and for a batch of generated
// programs compiles without a warning, runs clean under the undefined-behaviour sanitizer and gives
// the interpreter's trace, as written and after the default pipeline.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <string>

#include "tools/tool_running.h"

namespace {

using tooltest::example;
using tooltest::fileWith;
using tooltest::pathOf;
using tooltest::Result;
using tooltest::ssaopt;

const char* const kExamples[] = {"typical_run", "controller", "procedures", "loop", "outline"};

bool hasCommand(const std::string& name) {
  return std::system(("command -v " + name + " >/dev/null 2>&1").c_str()) == 0;
}

// Runs cc-check with `compiler` as $CC.
Result ccCheckWith(const std::string& compiler, const std::string& arguments) {
  const char* pSaved = std::getenv("CC");
  std::string saved = pSaved ? pSaved : "";
  setenv("CC", compiler.c_str(), 1);
  Result result = ssaopt("cc-check " + arguments);
  pSaved ? setenv("CC", saved.c_str(), 1) : unsetenv("CC");
  return result;
}

// The tests that compile need the system's C compiler; without one they are skipped, saying so.
class ToolCcCheck : public ::testing::Test {
protected:
  void SetUp() override {
    const char* pCompiler = std::getenv("CC");
    std::string compiler = pCompiler && *pCompiler ? pCompiler : "cc";
    if (std::system(("command -v '" + compiler + "' >/dev/null 2>&1").c_str()) != 0)
      GTEST_SKIP() << "no C compiler ('" << compiler << "'): set CC or install cc";
  }
};

TEST(ToolCcCheckWithEachCompiler, EveryExampleCompilesAndBehavesAsInterpreted) {
  int compilers = 0;
  for (const char* compiler : {"gcc", "clang"}) {
    if (!hasCommand(compiler)) continue;
    ++compilers;
    for (const char* name : kExamples) {
      Result result = ccCheckWith(compiler, example(name) + " --runs 3");
      EXPECT_EQ(result.status, 0) << compiler << " " << name << "\n" << result.out << result.err;
      EXPECT_EQ(result.out, "same behaviour on 3 runs (interpreter and compiled C)\n")
          << compiler << " " << name;
    }
  }
  if (compilers == 0) GTEST_SKIP() << "neither gcc nor clang is installed";
}

TEST_F(ToolCcCheck, GeneratedProgramsCompileAndBehaveAsInterpreted) {
  for (int seed = 1; seed <= 8; ++seed) {
    Result generated = ssaopt("generate --seed " + std::to_string(seed));
    ASSERT_EQ(generated.status, 0) << generated.err;
    std::string path = fileWith("generated.ssa", generated.out);
    Result result = ssaopt("cc-check " + path + " --runs 3 --steps 5");
    EXPECT_EQ(result.status, 0) << "seed " << seed << "\n" << result.out << result.err;
  }
}

TEST_F(ToolCcCheck, RegressionABooleanHoldsPlusZero) {
  // A Boolean assigned -0.0 held -0.0, so the folded 1 / b was -inf where the compiled C gives inf.
  std::string program = fileWith("zero.ssa",
                                 "var bool b = 0;\n"
                                 "var float64 in volatile;\n"
                                 "var float64 r output = 0;\n"
                                 "proc #main {\n"
                                 "  b = -(in * 0);\n"
                                 "  r = 1 / b;\n"
                                 "}\n");
  Result result = ssaopt("cc-check " + program + " --runs 3");
  EXPECT_EQ(result.status, 0) << result.out << result.err;
}

TEST_F(ToolCcCheck, ReportsWhereACompiledProgramComputesDifferently) {
  // A compiler that makes every product of the original program one too large.
  std::string compiler =
      fileWith("cc",
               "#!/bin/sh\n"
               "for a; do case $a in *original.c) sed -i 's/: a \\* b;/: a * b + 1.0;/' $a;; esac; done\n"
               "exec cc \"$@\"\n");
  chmod(compiler.c_str(), 0700);
  std::string program = fileWith("times.ssa",
                                 "var int16 x output = 0;\n"
                                 "proc #main {\n"
                                 "  x = x * 2 + 3;\n"
                                 "}\n");
  Result result = ccCheckWith(compiler, program + " --steps 2");
  EXPECT_EQ(result.status, 1) << result.err;
  EXPECT_EQ(result.out,
            "different behaviour with input seed 1:\n"
            "  interpreter: output x = 9\n"
            "  compiled original: output x = 10\n");
}

TEST_F(ToolCcCheck, SplitsTheCompilerCommandAsAShellWould) {
  std::string arguments = pathOf("arguments");
  std::string compiler =
      fileWith("cc", "#!/bin/sh\nprintf '%s\\n' \"$@\" >> " + arguments + "\nexec cc \"$@\"\n");
  chmod(compiler.c_str(), 0700);
  Result result = ccCheckWith(compiler + " -DLABEL='one two' \"-DQUOTED=\\\"x\\\"\" -Wno-unused-function",
                              example("loop") + " --runs 1");
  EXPECT_EQ(result.status, 0) << result.out << result.err;
  std::string passed = tooltest::contentsOf(arguments);
  EXPECT_NE(passed.find("\n-DLABEL=one two\n-DQUOTED=\"x\"\n-Wno-unused-function\n-std=c99\n"),
            std::string::npos)
      << passed;
}

TEST(ToolCcCheckWithoutCompiler, SaysSoWhenThereIsNoCompiler) {
  Result result = ccCheckWith("/nonexistent/cc", example("loop"));
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ssaopt: no C compiler '/nonexistent/cc': set CC or install cc\n");
}

TEST(ToolEmitC, NoCompilerFusesTheRoundedProductsOfScaledStores) {
  // ssa_round(...) * lsb + offset fused into one multiply-add rounds once instead of twice: 4.16e-17
  // where the interpreter gives 0. Whether a compiler fuses shows in the code for a machine with
  // fused multiply-add, in the ISO and the GNU dialect alike.
  std::string program = fileWith("scaled.ssa",
                                 "var int16 in volatile;\n"
                                 "var int16 t scale(0.1, 0.3) = 0;\n"
                                 "var float64 r output = 0;\n"
                                 "proc #main {\n"
                                 "  t = in * 0.7;\n"
                                 "  r = t * 3 + 1;\n"
                                 "}\n");
  Result emitted = ssaopt("--emit=c -o " + pathOf("scaled.c") + " " + program);
  ASSERT_EQ(emitted.status, 0) << emitted.err;
  int compiled = 0;
  for (const char* compiler : {"gcc", "clang"})
    for (const char* dialect : {"-std=c99", "-std=gnu99"}) {
      std::string assembly = pathOf("scaled.s");
      std::string command = std::string(compiler) + " " + dialect + " -O2 -mfma -S -o " + assembly + " " +
                            pathOf("scaled.c") + " 2>/dev/null";
      if (!hasCommand(compiler) || std::system(command.c_str()) != 0) continue;  // not a compiler for x86
      ++compiled;
      EXPECT_EQ(tooltest::contentsOf(assembly).find("vfmadd"), std::string::npos)
          << compiler << " " << dialect;
    }
  if (compiled == 0) GTEST_SKIP() << "no compiler for x86 with fused multiply-add";
}

TEST(ToolEmitC, WritesTheCOfTheOptimisedProgram) {
  Result result = ssaopt("--emit=c " + example("typical_run"));
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_NE(result.out.find("  command = (int16_t)SSA_RANGE(ssa_input_speed(), -32768.0, 32767.0);\n"),
            std::string::npos)
      << result.out;
  Result checked = ssaopt("--emit=c --keep-checks " + example("typical_run"));
  EXPECT_NE(checked.out.find("  command = ssa_to_int16(ssa_int(ssa_input_speed()));\n"), std::string::npos)
      << checked.out;
  EXPECT_EQ(result.out.find("limitCommand"), std::string::npos) << "inlined, so gone";
}

}  // namespace
