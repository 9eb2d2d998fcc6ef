#include "options.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <iomanip>
#include <sstream>
#include <utility>

#include "passes.h"
#include "ssaopt/client/generator.h"

namespace ssaopt::tool {

namespace {

// ---- Commands --------------------------------------------------------------------------------------

struct CommandName {
  Command command;
  const char* name;  // as given on the command line; empty for the main command
  const char* usage;
};

const CommandName kCommands[] = {
    {Command::Transform, "", "ssaopt [options] FILE"},
    {Command::Run, "run", "ssaopt run FILE [options]"},
    {Command::Check, "check", "ssaopt check FILE [options]"},
    {Command::CcCheck, "cc-check", "ssaopt cc-check FILE [options]"},
    {Command::Reduce, "reduce", "ssaopt reduce FILE [options] [-- COMMAND ARGUMENT...]"},
    {Command::Generate, "generate", "ssaopt generate [options]"},
    {Command::Fuzz, "fuzz", "ssaopt fuzz [options]"},
};

constexpr unsigned bit(Command command) { return 1u << static_cast<unsigned>(command); }

constexpr unsigned kMain = bit(Command::Transform);
constexpr unsigned kRun = bit(Command::Run);
constexpr unsigned kCheck = bit(Command::Check);
constexpr unsigned kCcCheck = bit(Command::CcCheck);
constexpr unsigned kReduce = bit(Command::Reduce);
constexpr unsigned kGenerate = bit(Command::Generate);
constexpr unsigned kFuzz = bit(Command::Fuzz);
constexpr unsigned kReadingAProgram = kMain | kRun | kCheck | kCcCheck | kReduce;
constexpr unsigned kAll = kReadingAProgram | kGenerate | kFuzz;

std::string nameOf(Command command) {
  for (const CommandName& entry : kCommands)
    if (entry.command == command) return *entry.name ? entry.name : "the main command";
  return "";
}

// "run, check and cc-check"
std::string namesOf(unsigned commands) {
  std::vector<std::string> names;
  for (const CommandName& entry : kCommands)
    if (commands & bit(entry.command)) names.push_back(nameOf(entry.command));
  std::string joined;
  for (std::size_t i = 0; i < names.size(); ++i)
    joined += (i == 0 ? "" : i + 1 == names.size() ? " and " : ", ") + names[i];
  return joined;
}

// ---- Values --------------------------------------------------------------------------------------

std::vector<std::string> splitAtCommas(const std::string& list) {
  std::vector<std::string> items;
  std::istringstream in(list);
  for (std::string item; std::getline(in, item, ',');)
    if (!item.empty()) items.push_back(item);
  return items;
}

// A whole number of at least `least`; an error or "".
std::string parseCount(const std::string& name, const std::string& text, std::uint64_t least,
                       std::optional<std::uint64_t>& count) {
  bool digits = !text.empty() && text.find_first_not_of("0123456789") == std::string::npos;
  errno = 0;
  std::uint64_t number = digits ? std::strtoull(text.c_str(), nullptr, 10) : 0;
  if (!digits || errno != 0) return name + " needs a whole number, not '" + text + "'";
  if (number < least) return name + " needs at least " + std::to_string(least);
  count = number;
  return "";
}

template <typename Choice>
std::string parseChoice(const std::string& name, const std::string& text,
                        const std::vector<std::pair<const char*, Choice>>& choices, Choice& chosen) {
  std::string known;
  for (const auto& choice : choices) {
    if (text == choice.first) {
      chosen = choice.second;
      return "";
    }
    known += (known.empty() ? "" : ", ") + std::string(choice.first);
  }
  return "unknown value '" + text + "' of " + name + "; use one of " + known;
}

// ---- The options -----------------------------------------------------------------------------------

// The help texts below name the defaults.
static_assert(kDefaultSteps == 10 && kDefaultRuns == 20 && kDefaultSeed == 1 && kDefaultPrograms == 100 &&
              client::kDefaultProgramSize == 10);

struct OptionSpec {
  const char* name;
  const char* value;  // what the value stands for in the usage; null for an option without value
  unsigned commands;  // the commands that take it
  const char* help;
  // Stores the value; returns an error or "".
  std::string (*apply)(Options& options, const std::string& value);
};

const OptionSpec kOptions[] = {
    {"--passes", "LIST", kMain | kRun | kCheck | kCcCheck | kReduce | kFuzz,
     "run these passes in order (comma-separated) instead of the default pipeline below; --passes= runs none "
     "(run: none unless given)",
     [](Options& options, const std::string& value) {
       options.passes = splitAtCommas(value);
       return std::string();
     }},
    {"--emit", "FORMAT", kMain,
     "write the result as program text (text, the default), as a Graphviz digraph (dot), as a C99 "
     "translation unit (c), or as an HTML report of every step (html)",
     [](Options& options, const std::string& value) {
       return parseChoice<Emit>(
           "--emit", value, {{"text", Emit::Text}, {"dot", Emit::Dot}, {"c", Emit::C}, {"html", Emit::Html}},
           options.emit);
     }},
    {"-o", "FILE", kMain | kReduce, "write the result to FILE instead of standard output (-o -)",
     [](Options& options, const std::string& value) {
       options.outputPath = value;
       return std::string();
     }},
    {"--show-values", nullptr, kMain,
     "in text, dot and html output, show propagated values, ranges and executable edges",
     [](Options& options, const std::string&) {
       options.showValues = true;
       return std::string();
     }},
    {"--print-after-all", nullptr, kMain, "print the program to standard error after every pass",
     [](Options& options, const std::string&) {
       options.printAfterAll = true;
       return std::string();
     }},
    {"--print-before", "PASSES", kMain, "print the program to standard error before each pass named",
     [](Options& options, const std::string& value) {
       options.printBefore = splitAtCommas(value);
       return std::string();
     }},
    {"--print-after", "PASSES", kMain, "print the program to standard error after each pass named",
     [](Options& options, const std::string& value) {
       options.printAfter = splitAtCommas(value);
       return std::string();
     }},
    {"--print-changed", nullptr, kMain,
     "print what each pass that changed the program changed, as a unified diff, to standard error",
     [](Options& options, const std::string&) {
       options.printChanged = true;
       return std::string();
     }},
    {"--filter-procedure", "NAME", kMain,
     "print only procedure NAME: in the output (text, dot, html) and in what the --print options print",
     [](Options& options, const std::string& value) {
       options.filterProcedure = value;
       return value.empty() ? std::string("--filter-procedure needs a procedure name") : std::string();
     }},
    {"--keep-checks", nullptr, kMain | kCcCheck,
     "in C output, keep each saturation, cast and index check that the propagated ranges show to be needless",
     [](Options& options, const std::string&) {
       options.keepChecks = true;
       return std::string();
     }},
    {"--verify", nullptr, kMain,
     "check the graph after every pass with internal checks on; report every internal error and consistency "
     "failure and exit with 1",
     [](Options& options, const std::string&) {
       options.verify = true;
       return std::string();
     }},
    {"--stats", nullptr, kMain,
     "count procedures, blocks, statements and phi functions before and after, constants found and "
     "definitions removed",
     [](Options& options, const std::string&) {
       options.stats = true;
       return std::string();
     }},
    {"--time-passes", nullptr, kMain, "report the time each pass took and the peak memory",
     [](Options& options, const std::string&) {
       options.timePasses = true;
       return std::string();
     }},
    {"--steps", "N", kRun | kCheck | kCcCheck | kReduce, "passes of #main per run (default 10)",
     [](Options& options, const std::string& value) {
       return parseCount("--steps", value, 1, options.steps);
     }},
    {"--runs", "R", kCheck | kCcCheck | kReduce, "runs, each on its own input streams (default 20)",
     [](Options& options, const std::string& value) { return parseCount("--runs", value, 1, options.runs); }},
    {"--seed", "S", kRun | kCheck | kCcCheck | kReduce | kGenerate | kFuzz,
     "seed of the input streams, run r using S + r (default 1); of generate and fuzz, the (first) program",
     [](Options& options, const std::string& value) { return parseCount("--seed", value, 0, options.seed); }},
    {"--inputs", "VALUES", kRun,
     "run on the values in file VALUES (- for standard input), a line NAME V1 V2 ... per input, instead of "
     "seeded streams",
     [](Options& options, const std::string& value) {
       options.inputsPath = value;
       return std::string();
     }},
    {"--match", "TEXT", kReduce,
     "count a failure as the same only when the command's output shows TEXT (instead of the first line of "
     "the original failure)",
     [](Options& options, const std::string& value) {
       options.match = value;
       return std::string();
     }},
    {"--size", "N", kGenerate | kFuzz, "statements per procedure, roughly (default 10)",
     [](Options& options, const std::string& value) { return parseCount("--size", value, 0, options.size); }},
    {"--programs", "P", kFuzz, "programs fuzz checks (default 100)",
     [](Options& options, const std::string& value) {
       return parseCount("--programs", value, 1, options.programs);
     }},
    {"--random-passes", nullptr, kFuzz,
     "take each program through a random order of passes that can run, drawn from its seed, instead of "
     "--passes or the default pipeline",
     [](Options& options, const std::string&) {
       options.randomPasses = true;
       return std::string();
     }},
    {"--color", "WHEN", kReadingAProgram,
     "colour diagnostics: auto (when standard error is a terminal, the default), always or never",
     [](Options& options, const std::string& value) {
       return parseChoice<ColourMode>(
           "--color", value,
           {{"auto", ColourMode::Auto}, {"always", ColourMode::Always}, {"never", ColourMode::Never}},
           options.colour);
     }},
    {"--help", nullptr, kAll, "show this text",
     [](Options& options, const std::string&) {
       options.help = true;
       return std::string();
     }},
    {"-h", nullptr, kAll, nullptr,
     [](Options& options, const std::string&) {
       options.help = true;
       return std::string();
     }},
    {"--version", nullptr, kAll, "show the version",
     [](Options& options, const std::string&) {
       options.version = true;
       return std::string();
     }},
};

const OptionSpec* findOption(const std::string& name) {
  for (const OptionSpec& option : kOptions)
    if (name == option.name) return &option;
  return nullptr;
}

bool startsWith(const std::string& text, const std::string& prefix) {
  return text.compare(0, prefix.size(), prefix) == 0;
}

// ---- Parsing ---------------------------------------------------------------------------------------

class Parser {
public:
  explicit Parser(const std::vector<std::string>& arguments) : m_Arguments(arguments) {}

  ParsedOptions parse() {
    std::size_t i = 0;
    if (!m_Arguments.empty())
      for (const CommandName& entry : kCommands)
        if (*entry.name && m_Arguments[0] == entry.name) {
          m_Parsed.options.command = entry.command;
          i = 1;
        }
    for (; i < m_Arguments.size() && m_Parsed.error.empty(); ++i) parseArgument(i);
    if (m_Parsed.error.empty()) m_Parsed.error = checkTogether(m_Parsed.options);
    return std::move(m_Parsed);
  }

private:
  void parseArgument(std::size_t& i) {
    const std::string& argument = m_Arguments[i];
    if (argument == "--") {
      endOfOptions(i);
    } else if (startsWith(argument, "-") && argument != "-") {
      parseOption(i);
    } else {
      setInput(argument);
    }
  }

  // Reduce takes the command after "--"; for the others the arguments after it are files only.
  void endOfOptions(std::size_t& i) {
    std::vector<std::string> rest(m_Arguments.begin() + static_cast<std::ptrdiff_t>(i) + 1,
                                  m_Arguments.end());
    i = m_Arguments.size();
    if (m_Parsed.options.command == Command::Reduce) {
      m_Parsed.options.reduceCommand = std::move(rest);
      if (m_Parsed.options.reduceCommand.empty()) m_Parsed.error = "-- needs a command to follow it";
      return;
    }
    for (const std::string& argument : rest)
      if (m_Parsed.error.empty()) setInput(argument);
  }

  void setInput(const std::string& argument) {
    if (!m_Parsed.options.inputPath.empty())
      m_Parsed.error = "only one input file can be given";
    else
      m_Parsed.options.inputPath = argument;
  }

  // "--name=value", "--name value", "-oFILE", "-o FILE", or an option without value.
  void parseOption(std::size_t& i) {
    const std::string& argument = m_Arguments[i];
    std::string name = argument;
    std::optional<std::string> value;
    if (startsWith(argument, "--") && argument.find('=') != std::string::npos) {
      name = argument.substr(0, argument.find('='));
      value = argument.substr(argument.find('=') + 1);
    } else if (startsWith(argument, "-o") && argument.size() > 2) {
      name = "-o";
      value = argument.substr(2);
    }
    const OptionSpec* pOption = findOption(name);
    std::string& error = m_Parsed.error;
    if (!pOption) {
      error = "unknown option '" + name + "'";
    } else if (!(pOption->commands & bit(m_Parsed.options.command))) {
      error = name + " is an option of " + namesOf(pOption->commands) + ", not of " +
              nameOf(m_Parsed.options.command);
    } else if (!pOption->value && value) {
      error = name + " takes no value";
    } else if (pOption->value && !value && i + 1 == m_Arguments.size()) {
      error = name + " needs a value";
    } else {
      if (pOption->value && !value) value = m_Arguments[++i];
      error = pOption->apply(m_Parsed.options, value.value_or(""));
    }
  }

  // What only the whole command line shows.
  static std::string checkTogether(const Options& options) {
    if (options.help || options.version) return "";
    bool readsFile = (bit(options.command) & kReadingAProgram) != 0;
    if (readsFile && options.inputPath.empty()) return "no input file";
    if (!readsFile && !options.inputPath.empty()) return nameOf(options.command) + " reads no file";
    if (options.inputPath == "-" && options.inputsPath == std::string("-"))
      return "standard input can give the program or the input values, not both";
    std::vector<std::string> pipeline = options.passes.value_or(defaultPipeline());
    if (options.randomPasses && options.passes) return "--random-passes and --passes exclude each other";
    if (options.passes) {
      std::string error = findPipelineError(*options.passes);
      if (!error.empty()) return error;
    }
    for (const auto& printed : {std::make_pair("--print-before", &options.printBefore),
                                std::make_pair("--print-after", &options.printAfter)}) {
      std::string error = checkPrintedPasses(printed.first, *printed.second, pipeline);
      if (!error.empty()) return error;
    }
    bool forTheDefaultCommands = options.passes || options.runs || options.steps || options.seed;
    if (options.command == Command::Reduce && !options.reduceCommand.empty() && forTheDefaultCommands)
      return "--passes, --runs, --steps and --seed of reduce go to check and cc-check, which the command "
             "after -- replaces";
    if (options.filterProcedure && options.emit == Emit::C)
      return "--filter-procedure does not apply to --emit=c, which needs the whole program";
    return "";
  }

  static std::string checkPrintedPasses(const std::string& option, const std::vector<std::string>& names,
                                        const std::vector<std::string>& pipeline) {
    std::string unknown = findUnknownPass(names);
    if (!unknown.empty()) return option + ": " + unknown;
    for (const std::string& name : names)
      if (std::find(pipeline.begin(), pipeline.end(), name) == pipeline.end())
        return option + " names '" + name + "', which the pipeline does not run";
    return "";
  }

  const std::vector<std::string>& m_Arguments;
  ParsedOptions m_Parsed;
};

// The option as the usage shows it, "--steps N" or "-o FILE".
std::string spelling(const OptionSpec& option) {
  if (!option.value) return option.name;
  return std::string(option.name) + (startsWith(option.name, "--") ? "=" : " ") + option.value;
}

// The option, then its help and the commands that take it, wrapped to the width of a terminal.
void writeOptionHelp(std::ostream& text, const OptionSpec& option) {
  constexpr std::size_t kIndent = 27, kWidth = 80;
  std::string help = option.help;
  if (option.commands != kAll) help += " (" + namesOf(option.commands) + ")";
  std::string line = "  " + spelling(option);
  line += std::string(line.size() < kIndent ? kIndent - line.size() : 1, ' ');
  std::istringstream words(help);
  bool first = true;
  for (std::string word; words >> word; first = false) {
    if (!first && line.size() + 1 + word.size() > kWidth) {
      text << line << "\n";
      line = std::string(kIndent, ' ');
    } else if (!first) {
      line += ' ';
    }
    line += word;
  }
  text << line << "\n";
}

}  // namespace

ParsedOptions parseOptions(const std::vector<std::string>& arguments) { return Parser(arguments).parse(); }

std::string usageText() {
  std::ostringstream text;
  for (std::size_t i = 0; i < std::size(kCommands); ++i)
    text << (i == 0 ? "usage: " : "       ") << kCommands[i].usage << "\n";
  text << "\n"
          "The main command reads a program in the textual format (FILE, or - for standard input),\n"
          "runs a pipeline of transformations on its control-flow graph and writes the result.\n"
          "run prints the trace of one run of the program as written (or after --passes): every\n"
          "external call with the values it uses, then the output variables. check runs the\n"
          "program before and after the pipeline on R seeded input streams and reports the first\n"
          "difference. cc-check compiles the C emitted before and after the pipeline ($CC, else cc)\n"
          "and compares both with the interpreter on the same streams. reduce shrinks the program\n"
          "while COMMAND (where {} stands for the program's file, else it comes last) fails the\n"
          "same way, by default check and, where check finds nothing, cc-check; it writes the\n"
          "smallest program found. generate writes a random valid program; the same seed gives the\n"
          "same program. fuzz checks P generated programs (seeds S, S + 1, ...): no internal report,\n"
          "a consistent graph after every pass, printed programs that read back, the same\n"
          "behaviour before and after the pipeline, and (every tenth program) the same result from\n"
          "another process; it writes each failing program to fuzz-SEED.ssa and a shrunk one to\n"
          "fuzz-SEED-shrunk.ssa.\n"
          "\n"
          "options (--name=value and --name value alike):\n";
  for (const OptionSpec& option : kOptions)
    if (option.help) writeOptionHelp(text, option);
  text << "\npasses:\n";
  for (const Pass& pass : passRegistry())
    text << "  " << std::left << std::setw(20) << pass.name << " " << pass.summary << whereThePassRuns(pass)
         << "\n";
  text << "\ndefault pipeline (the typical run):\n  " << joinedPassNames(defaultPipeline()) << "\n";
  text << "\nexit status: 0 on success; 1 when the program has errors, a check, fuzz or reduce finds a\n"
          "difference or failure (or reduce none to keep), --verify reports, or the result cannot be\n"
          "written; 2 when the command line is wrong (an unknown option, command or pass, an option\n"
          "of another command, a pass out of order, a bad number, a missing or unreadable file),\n"
          "with one line on standard error.\n";
  return text.str();
}

}  // namespace ssaopt::tool
