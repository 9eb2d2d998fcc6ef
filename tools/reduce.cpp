#include "reduce.h"

#include <algorithm>
#include <cctype>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <optional>
#include <sstream>

#include "exit_status.h"
#include "passes.h"
#include "process.h"
#include "shrink.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"
#include "text.h"

namespace ssaopt::tool {

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

// A candidate may run this many times as long as the command took on the whole program, and never less
// than kShortestTimeout, before it counts as hanging (and so as not failing the same way). The whole
// program itself may take kFirstTimeout.
constexpr int kSlowdownAllowed = 5;
constexpr std::chrono::milliseconds kShortestTimeout{std::chrono::seconds(10)};
constexpr std::chrono::milliseconds kFirstTimeout{std::chrono::minutes(30)};
// Candidates the shrinker may try: enough for programs of a few hundred lines.
constexpr std::size_t kAttempts = 4000;

// The commands tried in turn when none is given: the first that fails on the program is kept.
const char* const kDefaultCommands[] = {"check", "cc-check"};

// `text` with every run of digits (and every 0x... number) as N: seeds, steps, line numbers and
// addresses in a message change as the program shrinks, while what the message says does not.
std::string withNumbersMasked(const std::string& text) {
  std::string masked;
  for (std::size_t i = 0; i < text.size();) {
    if (!std::isdigit(static_cast<unsigned char>(text[i]))) {
      masked += text[i++];
      continue;
    }
    bool hex = text.compare(i, 2, "0x") == 0;
    i += hex ? 2 : 0;
    while (i < text.size() && (hex ? std::isxdigit(static_cast<unsigned char>(text[i]))
                                   : std::isdigit(static_cast<unsigned char>(text[i]))))
      ++i;
    masked += 'N';
  }
  return masked;
}

std::size_t lineCount(const std::string& text) {
  return static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

// How a run of the command failed: its exit status and the first line of its output that tells what
// went wrong (lines about inconclusive runs only say what was not compared), with the program's file
// and the numbers masked.
struct Failure {
  int status = 0;
  std::string line;

  bool operator==(const Failure& other) const { return status == other.status && line == other.line; }
};

Failure failureOf(const Outcome& outcome, const std::string& file) {
  Failure failure{outcome.status, ""};
  std::istringstream lines(outcome.out + outcome.err);
  for (std::string line; std::getline(lines, line);)
    if (!line.empty() && line.find("inconclusive") == std::string::npos) {
      failure.line = withNumbersMasked(replacedAll(line, file, "FILE"));
      break;
    }
  return failure;
}

class ReduceCommand {
public:
  ReduceCommand(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options), m_Out(out), m_Err(err) {}

  int execute() {
    m_Control.boot();
    int status = reduce(client::readSourceText(m_Options.inputPath).value_or(""));
    m_Control.shutdown();
    return status;
  }

private:
  int reduce(const std::string& text) {
    if (!loads(text, true)) return kFailure;
    if (m_Directory.path().empty()) {
      m_Err << "ssaopt: reduce: cannot make a temporary directory\n";
      return kFailure;
    }
    m_Candidate = (m_Directory.path() / candidateName()).string();
    if (!findFailure(text)) return kFailure;
    std::string smallest = shrinkProgram(
        startingPoint(text), [this](const std::string& candidate) { return failsTheSameWay(candidate); },
        kAttempts);
    m_Err << "ssaopt: reduce: " << lineCount(smallest) << " of " << lineCount(text) << " lines left after "
          << m_Runs << " runs of " << m_CommandName << "\n";
    return write(smallest) ? kSuccess : kFailure;
  }

  // ---- The command -----------------------------------------------------------------------------

  // Finds the command that fails on the whole program and how; false, said why, when none does.
  bool findFailure(const std::string& text) {
    if (!m_Options.reduceCommand.empty()) {
      m_Command = m_Options.reduceCommand;
      m_CommandName = "'" + m_Command.front() + "'";
      if (recordFailure(text)) return true;
      m_Err << "ssaopt: reduce: " << m_CommandName << " does not fail on "
            << client::displayName(m_Options.inputPath) << "\n";
      return false;
    }
    for (const char* name : kDefaultCommands) {
      m_Command = defaultCommand(name);
      m_CommandName = std::string("ssaopt ") + name;
      if (recordFailure(text)) return true;
    }
    m_Err << "ssaopt: reduce: check and cc-check find nothing wrong with "
          << client::displayName(m_Options.inputPath) << "; name a command after --\n";
    return false;
  }

  std::vector<std::string> defaultCommand(const char* name) const {
    std::vector<std::string> command{ownExecutable(), name, "{}", "--color=never"};
    if (m_Options.passes) command.push_back("--passes=" + joinedWithCommas(*m_Options.passes));
    if (m_Options.runs) command.push_back("--runs=" + std::to_string(*m_Options.runs));
    if (m_Options.steps) command.push_back("--steps=" + std::to_string(*m_Options.steps));
    if (m_Options.seed) command.push_back("--seed=" + std::to_string(*m_Options.seed));
    return command;
  }

  static std::string joinedWithCommas(const std::vector<std::string>& names) {
    std::string joined;
    for (const std::string& name : names) joined += (joined.empty() ? "" : ",") + name;
    return joined;
  }

  // Runs the command on the whole program; true, with how it failed recorded, when it fails.
  bool recordFailure(const std::string& text) {
    Clock::time_point start = Clock::now();
    Outcome outcome = run(text, kFirstTimeout);
    if (!outcome.started || outcome.timedOut || outcome.status == 0) return false;
    auto took = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start);
    m_Timeout = std::max(kShortestTimeout, took * kSlowdownAllowed);
    m_Failure = failureOf(outcome, m_Candidate);
    m_Err << "ssaopt: reduce: " << m_CommandName << " fails with status " << outcome.status
          << (m_Failure.line.empty() ? "" : ": " + m_Failure.line) << "\n";
    return true;
  }

  // The command's arguments with {} standing for the candidate's file, or the file last.
  Outcome run(const std::string& text, std::chrono::milliseconds timeout) {
    std::ofstream(m_Candidate, std::ios::binary) << text;
    std::vector<std::string> arguments;
    bool named = false;
    for (const std::string& argument : m_Command) {
      named = named || argument.find("{}") != std::string::npos;
      arguments.push_back(replacedAll(argument, "{}", m_Candidate));
    }
    if (!named) arguments.push_back(m_Candidate);
    ++m_Runs;
    return runProcess(arguments, "", m_Directory.path(), timeout);
  }

  // ---- Candidates ------------------------------------------------------------------------------

  // Only programs the front end accepts count, so that a command which fails on errors in the program
  // does not lead the shrinking away from the failure.
  bool failsTheSameWay(const std::string& candidate) {
    if (!loads(candidate, false)) return false;
    Outcome outcome = run(candidate, m_Timeout);
    if (!outcome.started || outcome.timedOut) return false;
    if (m_Options.match)
      return outcome.status == m_Failure.status &&
             (outcome.out + outcome.err).find(*m_Options.match) != std::string::npos;
    return failureOf(outcome, m_Candidate) == m_Failure;
  }

  // The program as the printer writes it, a statement per line, where that fails the same way: the
  // shrinker drops lines.
  std::string startingPoint(const std::string& text) {
    ssaopt::PoolMemController pool;
    ssaopt::PoolMemController::Scope scope(&pool);
    std::string printed = client::printProgram(*client::loadProgram(text).program);
    return printed != text && failsTheSameWay(printed) ? printed : text;
  }

  bool loads(const std::string& text, bool showErrors) {
    ssaopt::PoolMemController pool;
    ssaopt::PoolMemController::Scope scope(&pool);
    client::LoadResult loaded = client::loadProgram(text);
    if (showErrors && !loaded.program)
      for (const client::Diagnostic& diagnostic : loaded.diagnostics)
        m_Err << client::formatDiagnostic(m_Options.inputPath, diagnostic) << "\n";
    return loaded.program != nullptr;
  }

  std::string candidateName() const {
    return m_Options.inputPath == "-" ? "stdin.ssa" : fs::path(m_Options.inputPath).filename().string();
  }

  bool write(const std::string& text) {
    if (m_Options.outputPath.empty() || m_Options.outputPath == "-") {
      m_Out << text;
      return true;
    }
    std::ofstream file(m_Options.outputPath, std::ios::binary);
    file << text;
    if (file.flush()) return true;
    m_Err << "ssaopt: cannot write '" << m_Options.outputPath << "'\n";
    return false;
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  KvCSSAControl m_Control;
  TemporaryDirectory m_Directory{"ssaopt-reduce"};
  std::string m_Candidate;
  std::vector<std::string> m_Command;
  std::string m_CommandName;
  Failure m_Failure;
  std::chrono::milliseconds m_Timeout = kShortestTimeout;
  std::size_t m_Runs = 0;
};

}  // namespace

int runReduceCommand(const Options& options, std::ostream& out, std::ostream& err) {
  return ReduceCommand(options, out, err).execute();
}

}  // namespace ssaopt::tool
