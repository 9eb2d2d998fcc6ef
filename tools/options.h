// The command line of the ssaopt tool.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ssaopt::tool {

enum class Emit { Text, Dot, C };

// What the tool does with the program: transform and write it, run it and print its trace
// ("ssaopt run"), run it before and after the pipeline and compare ("ssaopt check"), write a random
// program ("ssaopt generate"), check the pipeline on many random programs ("ssaopt fuzz"), or compile
// the C emitted before and after the pipeline and compare it with the interpreter ("ssaopt cc-check").
enum class Command { Transform, Run, Check, Generate, Fuzz, CcCheck };

// Of run and check, where not given.
inline constexpr std::uint64_t kDefaultSteps = 10;
inline constexpr std::uint64_t kDefaultRuns = 20;
inline constexpr std::uint64_t kDefaultSeed = 1;
// Of fuzz, where not given.
inline constexpr std::uint64_t kDefaultPrograms = 100;

struct Options {
  Command command = Command::Transform;
  std::string inputPath;
  std::optional<std::vector<std::string>> passes;  // empty when not given: the default pipeline
  bool printAfterAll = false;
  Emit emit = Emit::Text;
  std::string outputPath;  // empty: standard output
  bool verify = false;
  bool stats = false;
  bool timePasses = false;
  bool showValues = false;
  bool keepChecks = false;  // in C: also the checks that propagated ranges make needless
  bool help = false;
  bool version = false;
  // Of run and check: passes of "#main" per run, runs, the seed (of the first run), and a file of
  // input values to run on instead of seeded streams.
  std::optional<std::uint64_t> steps;
  std::optional<std::uint64_t> runs;
  std::optional<std::uint64_t> seed;
  std::optional<std::string> inputsPath;
  // Of generate and fuzz: the size of each program, and how many programs fuzz checks.
  std::optional<std::uint64_t> size;
  std::optional<std::uint64_t> programs;
};

struct ParsedOptions {
  Options options;
  std::string error;  // non-empty when the command line is wrong
};

ParsedOptions parseOptions(const std::vector<std::string>& arguments);

std::string usageText();

}  // namespace ssaopt::tool
