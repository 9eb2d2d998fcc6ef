// The ssaopt tool as a user runs it: the command line, exit status, what goes to standard output and
// what to standard error. What it prints for programs is in tests/filetests.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "tools/tool_running.h"

namespace {

using tooltest::contentsOf;
using tooltest::example;
using tooltest::fileWith;
using tooltest::pathOf;
using tooltest::Result;
using tooltest::ssaopt;

const char* const kExamples[] = {"typical_run", "controller", "procedures", "loop", "outline"};

bool contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

bool installed(const std::string& program) {
  return std::system(("command -v " + program + " >/dev/null 2>&1").c_str()) == 0;
}

// A command-line error: status 2, one line on standard error, nothing on standard output.
void expectMisuse(const std::string& arguments) {
  Result result = ssaopt(arguments);
  EXPECT_EQ(result.status, 2) << arguments << "\n" << result.err;
  EXPECT_EQ(result.err.rfind("ssaopt: ", 0), 0u) << arguments << "\n" << result.err;
  EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1) << arguments << "\n" << result.err;
  EXPECT_EQ(result.out, "") << arguments;
}

// ---- Usage ---------------------------------------------------------------------------------------

TEST(ToolUsage, HelpShowsEveryCommandOptionAndPass) {
  Result run = ssaopt("--help");
  EXPECT_EQ(run.status, 0);
  for (const char* part : {"usage: ssaopt [options] FILE",
                           "ssaopt run FILE",
                           "ssaopt check FILE",
                           "ssaopt cc-check FILE",
                           "ssaopt reduce FILE [options] [-- COMMAND ARGUMENT...]",
                           "ssaopt generate",
                           "ssaopt fuzz",
                           "--passes=LIST",
                           "--emit=FORMAT",
                           "-o FILE",
                           "--show-values",
                           "--print-after-all",
                           "--print-before=PASSES",
                           "--print-after=PASSES",
                           "--print-changed",
                           "--filter-procedure=NAME",
                           "--verify",
                           "--stats",
                           "--time-passes",
                           "--steps=N",
                           "--runs=R",
                           "--seed=S",
                           "--inputs=VALUES",
                           "--match=TEXT",
                           "--size=N",
                           "--programs=P",
                           "--color=WHEN",
                           "--help",
                           "--version",
                           "divide",
                           "hoist"})
    EXPECT_TRUE(contains(run.out, part)) << part;
}

TEST(ToolUsage, VersionIsTheProjectsWithTheCheckoutsDescription) {
  Result run = ssaopt("--version");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.out.rfind("ssaopt " SSAOPT_VERSION, 0), 0u) << run.out;
  std::filesystem::path checkout = std::filesystem::path(SSAOPT_EXAMPLES_DIR).parent_path() / ".git";
  if (std::filesystem::exists(checkout) && installed("git")) {
    EXPECT_TRUE(contains(run.out, " (git ")) << run.out;
  }
}

TEST(ToolUsage, AWrongCommandLineIsOneLineAndStatusTwo) {
  std::string loop = example("loop");
  for (const std::string& arguments : std::vector<std::string>{
           "--frobnicate x.ssa", "", loop + " " + loop, "--emit=pdf x.ssa", "x.ssa -o", "--verify=yes x.ssa",
           "no/such/file.ssa", std::filesystem::temp_directory_path().string(), "run no/such/file.ssa",
           "run " + loop + " --inputs no/such/values", "check " + loop + " --runs 1x",
           "generate --seed 99999999999999999999", "check " + loop + " --steps 0", "check",
           "--color=blue " + loop, "run - --inputs -",
           // Passes whose needs are not met; constant propagation before the SSA form never ended.
           "--passes=sccp " + loop, "--passes=ssa,inline " + loop, "fuzz --passes=ssa,divide,propagate",
           // Printing around a pass that does not run, or does not exist.
           "--passes=ssa --print-after=divide " + loop, "--print-before=nosuch " + loop,
           "--emit=c --filter-procedure=#main " + loop, "reduce " + loop + " --",
           "reduce " + loop + " --runs=3 -- false"})
    expectMisuse(arguments);
  EXPECT_EQ(ssaopt("--frobnicate x.ssa").err,
            "ssaopt: unknown option '--frobnicate' (ssaopt --help shows the usage)\n");
  EXPECT_EQ(
      ssaopt("no/such/file.ssa").err,
      "ssaopt: cannot read 'no/such/file.ssa': No such file or directory (ssaopt --help shows the usage)\n");
}

// Each option is refused, in one line, by every command that does not take it.
TEST(ToolUsage, AnOptionOfAnotherCommandIsRefused) {
  struct Option {
    const char* spelling;
    std::vector<std::string> commands;  // "" for the main command
  };
  const Option kOptions[] = {
      {"--passes=ssa", {"", "run", "check", "cc-check", "reduce", "fuzz"}},
      {"--emit=dot", {""}},
      {"-o out.ssa", {"", "reduce"}},
      {"--show-values", {""}},
      {"--print-after-all", {""}},
      {"--print-before=ssa", {""}},
      {"--print-after=ssa", {""}},
      {"--print-changed", {""}},
      {"--filter-procedure=#main", {""}},
      {"--verify", {""}},
      {"--stats", {""}},
      {"--time-passes", {""}},
      {"--steps=3", {"run", "check", "cc-check", "reduce"}},
      {"--runs 3", {"check", "cc-check", "reduce"}},
      {"--seed=3", {"run", "check", "cc-check", "reduce", "generate", "fuzz"}},
      {"--inputs=values", {"run"}},
      {"--match=text", {"reduce"}},
      {"--size=3", {"generate", "fuzz"}},
      {"--programs=3", {"fuzz"}},
      {"--color=never", {"", "run", "check", "cc-check", "reduce"}},
  };
  for (const Option& option : kOptions)
    for (std::string command : {"", "run", "check", "cc-check", "reduce", "generate", "fuzz"}) {
      if (std::find(option.commands.begin(), option.commands.end(), command) != option.commands.end())
        continue;
      bool readsFile = command != "generate" && command != "fuzz";
      std::string arguments = command + " " + (readsFile ? example("loop") + " " : "") + option.spelling;
      expectMisuse(arguments);
      EXPECT_TRUE(contains(ssaopt(arguments).err, " is an option of ")) << arguments;
    }
  EXPECT_EQ(
      ssaopt("run " + example("loop") + " -o out").err,
      "ssaopt: -o is an option of the main command and reduce, not of run (ssaopt --help shows the usage)\n");
}

TEST(ToolUsage, AValueFollowsItsOptionAfterAnEqualsSignOrAsTheNextArgument) {
  std::string loop = example("loop");
  for (const char* command : {"check", "run"}) {
    std::string options = std::string(command) == "check" ? "--runs=2 --steps=3 --seed=4 --passes=ssa"
                                                          : "--steps=3 --seed=4 --passes=ssa";
    Result joined = ssaopt(std::string(command) + " " + loop + " " + options);
    std::replace(options.begin(), options.end(), '=', ' ');
    Result separate = ssaopt(std::string(command) + " " + loop + " " + options);
    EXPECT_EQ(joined.status, 0) << joined.err;
    EXPECT_EQ(separate.out, joined.out) << command;
  }
  EXPECT_EQ(ssaopt("generate --seed 5 --size 3").out, ssaopt("generate --seed=5 --size=3").out);
}

TEST(ToolUsage, AnUnknownPassIsNamedWithTheKnownOnes) {
  Result run = ssaopt("--passes=divide,nosuch " + example("loop"));
  EXPECT_EQ(run.status, 2);
  EXPECT_EQ(run.err.rfind("ssaopt: unknown pass 'nosuch'; known passes: ", 0), 0u) << run.err;
  EXPECT_TRUE(contains(run.err, "divide"));
  EXPECT_EQ(run.out, "");
}

// ---- Output --------------------------------------------------------------------------------------

TEST(ToolOutput, DotGoesToTheFileGivenAndGraphvizAcceptsItAfterThePipeline) {
  std::string path = pathOf("out.dot");
  bool haveDot = installed("dot");
  for (const char* name : kExamples) {
    Result run = ssaopt("--emit=dot -o " + path + " " + example(name));
    EXPECT_EQ(run.status, 0) << name;
    EXPECT_EQ(run.out, "") << name;
    EXPECT_EQ(contentsOf(path).rfind("digraph program {", 0), 0u) << name;
    if (haveDot) {
      EXPECT_EQ(std::system(("dot -Tsvg " + path + " -o /dev/null").c_str()), 0) << name;
    }
  }
  if (!haveDot) GTEST_SKIP() << "Graphviz (dot) is not installed: the pictures were not rendered";
}

TEST(ToolOutput, AnUnwritableOutputFails) {
  Result run = ssaopt("-o /nonexistent/out.ssa " + example("loop"));
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.err, "ssaopt: cannot write '/nonexistent/out.ssa'\n");
}

// ---- The HTML report -----------------------------------------------------------------------------

class ToolReport : public ::testing::Test {
protected:
  void SetUp() override {
    m_Path = pathOf("report.html");
    Result run = ssaopt("--emit=html -o " + m_Path + " " + example("typical_run"));
    ASSERT_EQ(run.status, 0) << run.err;
    m_Page = contentsOf(m_Path);
  }

  std::string m_Path;
  std::string m_Page;
};

TEST_F(ToolReport, ShowsEveryStepBesideTheOneBeforeWithItsPictureAndTheFigures) {
  EXPECT_EQ(m_Page.rfind("<!DOCTYPE html>", 0), 0u);
  for (const char* step :
       {"the front end", "inline", "valid-conditions", "ssa", "divide", "sccp", "remove-unused", "hoist"})
    EXPECT_TRUE(contains(m_Page, std::string(". ") + step + "<") ||
                contains(m_Page, std::string(". ") + step + " <"))
        << step;
  EXPECT_TRUE(contains(m_Page, "<th colspan=\"2\">before inline</th><th colspan=\"2\">after inline</th>"));
  EXPECT_TRUE(contains(m_Page, "<td class=\"removed\">  call limitCommand();</td>"));
  EXPECT_TRUE(contains(m_Page, "<td class=\"added\">  if 1 goto bb26 else removed;</td>"));
  EXPECT_TRUE(contains(m_Page, "fold</a> (no change)"));
  EXPECT_TRUE(contains(m_Page, "blocks removed"));
  EXPECT_TRUE(contains(m_Page, "time total"));
  EXPECT_TRUE(contains(m_Page, "peak memory"));
  EXPECT_FALSE(contains(m_Page, "src=")) << "the page stands alone";
  if (!installed("dot")) {
    EXPECT_TRUE(contains(m_Page, "no pictures: Graphviz's dot is not installed"));
    GTEST_SKIP() << "Graphviz (dot) is not installed: the report has no pictures";
  }
  // One picture for each step that changed the program: all but three.
  std::size_t pictures = 0;
  for (std::size_t at = m_Page.find("<svg"); at != std::string::npos; at = m_Page.find("<svg", at + 1))
    ++pictures;
  EXPECT_EQ(pictures, 8u);
}

// Loads the page in a headless browser: it must render and its script run to its end without errors.
TEST_F(ToolReport, RendersInABrowserWithoutScriptErrors) {
  std::string browser = installed("chromium")           ? "chromium"
                        : installed("chromium-browser") ? "chromium-browser"
                                                        : "";
  if (browser.empty()) GTEST_SKIP() << "Chromium is not installed";
  std::string profile = pathOf("profile");
  std::filesystem::remove_all(profile);
  std::string command =
      browser +
      " --headless --no-sandbox --disable-gpu --no-first-run --disable-background-networking"
      " --disable-component-update --disable-sync --user-data-dir='" +
      profile + "' --enable-logging=stderr --v=0 --dump-dom 'file://" + m_Path + "' >'" + pathOf("dom") +
      "' 2>'" + pathOf("console") + "'";
  ASSERT_EQ(std::system(command.c_str()), 0) << contentsOf(pathOf("console"));
  std::string dom = contentsOf(pathOf("dom")), console = contentsOf(pathOf("console"));
  std::filesystem::remove_all(profile);
  EXPECT_TRUE(contains(dom, "data-ready=\"yes\"")) << console;
  EXPECT_TRUE(contains(dom, "<section class=\"step\" id=\"step-1\">"));
  EXPECT_FALSE(contains(console, "Uncaught")) << console;
  EXPECT_FALSE(contains(console, "CONSOLE")) << console;
}

// ---- Checking and measuring --------------------------------------------------------------------

TEST(ToolChecks, EveryExampleRunsThroughVerifyWithoutAReport) {
  for (const char* name : kExamples) {
    Result run = ssaopt("--verify " + example(name));
    EXPECT_EQ(run.status, 0) << name << "\n" << run.err;
    EXPECT_EQ(run.err, "") << name;
  }
}

TEST(ToolChecks, StatsCountBeforeAndAfterThePipeline) {
  Result run = ssaopt("--passes=divide --stats " + example("loop"));
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
  Result typical = ssaopt("--stats " + example("typical_run"));
  EXPECT_EQ(typical.status, 0);
  EXPECT_FALSE(contains(typical.err, "blocks removed                 0         0")) << typical.err;
  EXPECT_FALSE(contains(typical.err, "definitions removed            0         0")) << typical.err;
}

TEST(ToolChecks, TimePassesReportsEachPassTheTotalAndThePeakMemory) {
  Result run = ssaopt("--passes=divide --time-passes " + example("loop"));
  EXPECT_EQ(run.status, 0);
  EXPECT_TRUE(contains(run.err, "time divide")) << run.err;
  EXPECT_TRUE(contains(run.err, "time total")) << run.err;
  EXPECT_TRUE(contains(run.err, "peak memory ")) << run.err;
  EXPECT_TRUE(contains(run.err, " KiB\n")) << run.err;
}

}  // namespace
