#include "options.h"

#include <cerrno>
#include <cstdlib>
#include <iomanip>
#include <sstream>
#include <utility>

#include "passes.h"
#include "ssaopt/client/generator.h"

namespace ssaopt::tool {

namespace {

std::vector<std::string> splitAtCommas(const std::string& list) {
  std::vector<std::string> items;
  std::istringstream in(list);
  for (std::string item; std::getline(in, item, ',');)
    if (!item.empty()) items.push_back(item);
  return items;
}

bool isGeneratorCommand(Command command) { return command == Command::Generate || command == Command::Fuzz; }

// The command a first argument names; Transform for any other argument.
Command commandNamed(const std::string& argument) {
  static const std::pair<const char*, Command> kCommands[] = {{"run", Command::Run},
                                                              {"check", Command::Check},
                                                              {"generate", Command::Generate},
                                                              {"fuzz", Command::Fuzz},
                                                              {"cc-check", Command::CcCheck}};
  for (const auto& command : kCommands)
    if (argument == command.first) return command.second;
  return Command::Transform;
}

bool startsWith(const std::string& text, const std::string& prefix) {
  return text.compare(0, prefix.size(), prefix) == 0;
}

// Sets the flag an option without value names; false for any other argument.
bool parseFlag(const std::string& argument, Options& options) {
  struct Flag {
    const char* name;
    bool Options::*field;
  };
  static const Flag kFlags[] = {
      {"--print-after-all", &Options::printAfterAll},
      {"--verify", &Options::verify},
      {"--stats", &Options::stats},
      {"--time-passes", &Options::timePasses},
      {"--show-values", &Options::showValues},
      {"--keep-checks", &Options::keepChecks},
      {"--help", &Options::help},
      {"-h", &Options::help},
      {"--version", &Options::version},
  };
  for (const Flag& flag : kFlags)
    if (argument == flag.name) {
      options.*flag.field = true;
      return true;
    }
  return false;
}

// The value of "NAME VALUE" or "NAME=VALUE" at argument i, moving i past it; empty for any other
// argument.
std::optional<std::string> optionValue(const std::vector<std::string>& arguments, std::size_t& i,
                                       const std::string& name, std::string& error) {
  const std::string& argument = arguments[i];
  if (startsWith(argument, name + "=")) return argument.substr(name.size() + 1);
  if (argument != name) return std::nullopt;
  if (i + 1 == arguments.size()) {
    error = name + " needs a value";
    return "";
  }
  return arguments[++i];
}

bool parseCount(const std::string& text, std::uint64_t& count) {
  if (text.empty() || text.find_first_not_of("0123456789") != std::string::npos) return false;
  errno = 0;
  count = std::strtoull(text.c_str(), nullptr, 10);
  return errno == 0;
}

// The options of run and check; false for any other argument.
bool parseBehaviourOption(const std::vector<std::string>& arguments, std::size_t& i, Options& options,
                          std::string& error) {
  struct Count {
    const char* name;
    std::optional<std::uint64_t> Options::*field;
  };
  static const Count kCounts[] = {{"--steps", &Options::steps},
                                  {"--runs", &Options::runs},
                                  {"--seed", &Options::seed},
                                  {"--size", &Options::size},
                                  {"--programs", &Options::programs}};
  for (const Count& count : kCounts) {
    std::optional<std::string> value = optionValue(arguments, i, count.name, error);
    if (!value) continue;
    std::uint64_t number = 0;
    if (error.empty() && !parseCount(*value, number))
      error = std::string(count.name) + " needs a whole number, not '" + *value + "'";
    options.*count.field = number;
    return true;
  }
  std::optional<std::string> inputs = optionValue(arguments, i, "--inputs", error);
  if (!inputs) return false;
  options.inputsPath = inputs;
  return true;
}

// Each command's own options, and none of another's.
std::string checkCommandOptions(const Options& options) {
  bool behaviourOptions = options.steps || options.runs || options.inputsPath;
  bool generatorOptions = options.size || options.programs;
  bool generates = isGeneratorCommand(options.command);
  if (options.command == Command::Transform && (behaviourOptions || options.seed))
    return "--steps, --runs, --seed and --inputs belong to the run and check commands";
  if (options.command == Command::Run && options.runs) return "--runs belongs to the check command";
  if ((options.command == Command::Check || options.command == Command::CcCheck) && options.inputsPath)
    return "--inputs belongs to the run command";
  if (generates && behaviourOptions)
    return "--steps, --runs and --inputs belong to the run and check commands";
  if (!generates && generatorOptions) return "--size and --programs belong to the generate and fuzz commands";
  if (options.command == Command::Generate && options.programs)
    return "--programs belongs to the fuzz command";
  if (options.steps == 0u || options.runs == 0u) return "--steps and --runs need at least 1";
  if (options.programs == 0u) return "--programs needs at least 1";
  if (options.passes) return findPipelineError(*options.passes);
  return "";
}

// Parses one argument, taking the next one too for "-o FILE"; returns an error or "".
std::string parseArgument(const std::vector<std::string>& arguments, std::size_t& i, Options& options) {
  const std::string& argument = arguments[i];
  if (parseFlag(argument, options)) return "";
  std::string error;
  if (parseBehaviourOption(arguments, i, options, error)) return error;
  if (startsWith(argument, "--passes=")) {
    options.passes = splitAtCommas(argument.substr(9));
  } else if (argument == "--emit=text") {
    options.emit = Emit::Text;
  } else if (argument == "--emit=dot") {
    options.emit = Emit::Dot;
  } else if (argument == "--emit=c") {
    options.emit = Emit::C;
  } else if (startsWith(argument, "--emit=")) {
    return "unknown output format '" + argument.substr(7) + "'; use --emit=text, --emit=dot or --emit=c";
  } else if (argument == "-o") {
    if (++i == arguments.size()) return "-o needs a file name";
    options.outputPath = arguments[i];
  } else if (startsWith(argument, "-") && argument != "-") {
    return "unknown option '" + argument + "'";
  } else if (!options.inputPath.empty()) {
    return "only one input file can be given";
  } else {
    options.inputPath = argument;
  }
  return "";
}

// " (after ssa, divide)", " (before ssa)" or " (once)" for a pass that can run only there.
std::string whereThePassRuns(const Pass& pass) {
  std::string after;
  for (std::string_view need : pass.needs) after += (after.empty() ? "after " : ", ") + std::string(need);
  if (!after.empty()) return " (" + after + ")";
  if (!pass.beforeSSAOnly) return "";
  return std::string_view(pass.name) == "ssa" ? " (once)" : " (before ssa)";
}

}  // namespace

ParsedOptions parseOptions(const std::vector<std::string>& arguments) {
  ParsedOptions parsed;
  std::size_t first = 0;
  if (!arguments.empty()) parsed.options.command = commandNamed(arguments[0]);
  if (parsed.options.command != Command::Transform) first = 1;
  for (std::size_t i = first; i < arguments.size() && parsed.error.empty(); ++i)
    parsed.error = parseArgument(arguments, i, parsed.options);
  const Options& options = parsed.options;
  if (parsed.error.empty()) parsed.error = checkCommandOptions(options);
  bool readsFile = !isGeneratorCommand(options.command);
  if (parsed.error.empty() && !options.help && !options.version && readsFile && options.inputPath.empty())
    parsed.error = "no input file";
  if (parsed.error.empty() && !readsFile && !options.inputPath.empty())
    parsed.error = "generate and fuzz read no file";
  return parsed;
}

std::string usageText() {
  std::ostringstream text;
  text << "usage: ssaopt [options] FILE\n"
          "       ssaopt run FILE [--passes=LIST] [--steps N] [--seed S] [--inputs VALUES]\n"
          "       ssaopt check FILE [--passes=LIST] [--runs R] [--steps N] [--seed S]\n"
          "       ssaopt cc-check FILE [--passes=LIST] [--runs R] [--steps N] [--seed S] [--keep-checks]\n"
          "       ssaopt generate [--seed S] [--size N]\n"
          "       ssaopt fuzz [--programs P] [--seed S] [--size N] [--passes=LIST]\n"
          "\n"
          "Reads a program in the textual format, runs a pipeline of transformations on its\n"
          "control-flow graph and writes the result.\n"
          "\n"
          "run prints the trace of one run of the program as written (or after --passes=LIST):\n"
          "every external call with the values it uses, then the output variables. check runs\n"
          "the program before and after the pipeline on R seeded input streams and reports the\n"
          "first difference; it exits with 1 when there is one. cc-check compiles the C emitted\n"
          "before and after the pipeline ($CC, else cc) and compares both with the interpreter\n"
          "on the same R streams.\n"
          "  --steps N          passes of #main per run (default "
       << kDefaultSteps
       << ")\n"
          "  --seed S           seed of the input streams; check's run r uses S + r (default "
       << kDefaultSeed
       << ")\n"
          "  --runs R           runs of check (default "
       << kDefaultRuns
       << ")\n"
          "  --inputs VALUES    run on the values in file VALUES, a line NAME V1 V2 ... per\n"
          "                     volatile variable, instead of seeded streams\n"
          "\n"
          "generate writes a random valid program; the same seed gives the same program. fuzz\n"
          "checks P generated programs (seeds S, S + 1, ...): no internal report, a consistent\n"
          "graph after every pass, printed programs that read back, the same behaviour before\n"
          "and after the pipeline, and (every tenth program) the same result from another\n"
          "process. It writes each failing program to fuzz-SEED.ssa and a shrunk one to\n"
          "fuzz-SEED-shrunk.ssa, with the command that shows the failure, and exits with 1.\n"
          "  --size N           statements per procedure, roughly (default "
       << client::kDefaultProgramSize
       << ")\n"
          "  --programs P       programs fuzz checks (default "
       << kDefaultPrograms
       << ")\n"
          "\n"
          "options:\n"
          "  --passes=LIST      run these passes in order (comma-separated) instead of the\n"
          "                     default pipeline below; --passes= runs none\n"
          "  --print-after-all  print the program to standard error after every pass\n"
          "  --emit=text|dot|c  write the result as program text (default), as Graphviz or as C\n"
          "  -o FILE            write the result to FILE instead of standard output\n"
          "  --show-values      in text output, show propagated values, ranges and executable edges\n"
          "  --keep-checks      in C output (and cc-check), keep each saturation, cast and index\n"
          "                     check that the propagated ranges show to be needless\n"
          "  --verify           check the graph after every pass with internal checks on; report\n"
          "                     every internal error and consistency failure and exit with 1\n"
          "  --stats            count procedures, blocks, statements and phi functions before\n"
          "                     and after, constants found and definitions removed\n"
          "  --time-passes      report the time each pass took\n"
          "  --help, -h         show this text\n"
          "  --version          show the version\n"
          "\n"
          "passes:\n";
  for (const Pass& pass : passRegistry())
    text << "  " << std::left << std::setw(20) << pass.name << " " << pass.summary << whereThePassRuns(pass)
         << "\n";
  text << "\ndefault pipeline (the typical run):\n  " << joinedPassNames(defaultPipeline()) << "\n";
  text << "\nexit status: 0 on success; 1 when the program has errors, a check or fuzz finds a\n"
          "difference or failure, --verify reports, or the result cannot be written; 2 when the\n"
          "command line is wrong (an unknown option or pass, a pass out of order, a bad number,\n"
          "a missing or unreadable file), with one line on standard error.\n";
  return text.str();
}

}  // namespace ssaopt::tool
