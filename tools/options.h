// The command line of the ssaopt tool.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ssaopt::tool {

enum class Emit { Text, Dot, C, Html };

// What the tool does with the program: transform and write it (the main command), run it and print
// its trace ("ssaopt run"), run it before and after the pipeline and compare ("ssaopt check"), write a
// random program ("ssaopt generate"), check the pipeline on many random programs ("ssaopt fuzz"),
// compile the C emitted before and after the pipeline and compare it with the interpreter ("ssaopt
// cc-check"), or shrink a program while a command keeps failing on it ("ssaopt reduce").
enum class Command { Transform, Run, Check, Generate, Fuzz, CcCheck, Reduce };

// Whether diagnostics are coloured: when standard error is a terminal, always, or never.
enum class ColourMode { Auto, Always, Never };

// Of run and check, where not given.
inline constexpr std::uint64_t kDefaultSteps = 10;
inline constexpr std::uint64_t kDefaultRuns = 20;
inline constexpr std::uint64_t kDefaultSeed = 1;
// Of fuzz, where not given.
inline constexpr std::uint64_t kDefaultPrograms = 100;

struct Options {
  Command command = Command::Transform;
  std::string inputPath;                           // "-": standard input
  std::optional<std::vector<std::string>> passes;  // empty when not given: the default pipeline
  Emit emit = Emit::Text;
  std::string outputPath;  // empty or "-": standard output
  bool showValues = false;
  bool keepChecks = false;  // in C: also the checks that propagated ranges make needless
  bool verify = false;
  bool stats = false;
  bool timePasses = false;
  ColourMode colour = ColourMode::Auto;
  bool help = false;
  bool version = false;
  // Printing along the pipeline, to standard error: after every pass, before or after the passes
  // named, the changes of every pass that made any, and only the procedure named.
  bool printAfterAll = false;
  std::vector<std::string> printBefore;
  std::vector<std::string> printAfter;
  bool printChanged = false;
  std::optional<std::string> filterProcedure;
  // Of run, check and cc-check: passes of "#main" per run, runs, the seed (of the first run), and (run)
  // a file of input values to run on instead of seeded streams.
  std::optional<std::uint64_t> steps;
  std::optional<std::uint64_t> runs;
  std::optional<std::uint64_t> seed;
  std::optional<std::string> inputsPath;
  // Of generate and fuzz: the size of each program, and how many programs fuzz checks.
  std::optional<std::uint64_t> size;
  std::optional<std::uint64_t> programs;
  // Of fuzz: each program goes through a random pipeline that can run, drawn from its seed.
  bool randomPasses = false;
  // Of reduce: the command that must keep failing (empty: check, else cc-check, on the program), and
  // a text its output must show for the failure to count as the same.
  std::vector<std::string> reduceCommand;
  std::optional<std::string> match;
};

struct ParsedOptions {
  Options options;
  std::string error;  // non-empty when the command line is wrong
};

ParsedOptions parseOptions(const std::vector<std::string>& arguments);

std::string usageText();

}  // namespace ssaopt::tool
