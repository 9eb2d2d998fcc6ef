#include "cc_check.h"

#include <unistd.h>

#include <cctype>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <optional>
#include <sstream>

#include "exit_status.h"
#include "passes.h"
#include "process.h"
#include "ssaopt/client/c_emitter.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"

namespace ssaopt::tool {

namespace {

namespace fs = std::filesystem;

constexpr std::chrono::seconds kCompileTimeout{300};
constexpr std::chrono::seconds kRunTimeout{20};
constexpr int kCommandNotFound = 127;

// The main function and trace hooks around an emitted unit: it reads each input stream's values from
// standard input (a line "NAME COUNT V1 V2 ..." per stream), runs the steps its argument asks for and
// prints the trace as the interpreter formats it, ending with "completed N steps".
const char* const kHarness = R"(#include <stdio.h>
#include <stdlib.h>
#include <string.h>

int ssaopt_step(void);
void ssaopt_finish(void);
void ssaopt_outputs(void);

static double *ssa_values[SSA_STREAMS + 1];
static long ssa_lengths[SSA_STREAMS + 1], ssa_read[SSA_STREAMS + 1];
static unsigned long ssa_step;
static int ssa_first;

/* As the interpreter formats numbers: whole numbers in full, others in the fewest digits that read
   back exactly. */
static void ssa_print_number(double x) {
  char text[40];
  int digits;
  if (x != x) {
    fputs("nan", stdout);
    return;
  }
  if (x > 1.7976931348623157e308 || x < -1.7976931348623157e308) {
    fputs(x < 0 ? "-inf" : "inf", stdout);
    return;
  }
  if (x > -1e15 && x < 1e15 && x == (double)(long long)x) {
    printf("%.0f", x);
    return;
  }
  for (digits = 1; digits <= 17; ++digits) {
    snprintf(text, sizeof text, "%.*g", digits, x);
    if (strtod(text, NULL) == x) break;
  }
  fputs(text, stdout);
}

static void ssa_separate(void) {
  if (!ssa_first) fputs(", ", stdout);
  ssa_first = 0;
}

double ssa_next_input(int stream) {
  if (ssa_read[stream] >= ssa_lengths[stream]) {
    printf("inconclusive in step %lu: no more input for '%s'\n", ssa_step, ssa_stream_names[stream]);
    exit(0);
  }
  return ssa_values[stream][ssa_read[stream]++];
}

void ssa_extern_begin(const char *function) {
  printf("step %lu: extern %s(", ssa_step, function);
  ssa_first = 1;
}
void ssa_extern_end(void) { fputs(")\n", stdout); }
void ssa_output_begin(void) {
  fputs("output ", stdout);
  ssa_first = 1;
}
void ssa_output_end(void) { fputs("\n", stdout); }
void ssa_value(const char *variable, double value) {
  ssa_separate();
  printf("%s = ", variable);
  ssa_print_number(value);
}
void ssa_array_begin(const char *variable) {
  ssa_separate();
  printf("%s = [", variable);
  ssa_first = 1;
}
void ssa_element(double value) {
  ssa_separate();
  ssa_print_number(value);
}
void ssa_array_end(void) { fputs("]", stdout); }
void ssa_fault(const char *message) {
  printf("fault in step %lu: %s\n", ssa_step, message);
  exit(0);
}

/* Streams the program does not read go to the spare slot at the end. */
static void ssa_read_inputs(void) {
  char name[256];
  long count, i;
  int stream;
  while (scanf("%255s %ld", name, &count) == 2 && count > 0) {
    for (stream = 0; stream < SSA_STREAMS && strcmp(name, ssa_stream_names[stream]) != 0; ++stream) {
    }
    free(ssa_values[stream]);
    ssa_values[stream] = malloc((size_t)count * sizeof(double));
    ssa_lengths[stream] = count;
    for (i = 0; i < count; ++i)
      if (ssa_values[stream] == NULL || scanf("%lf", &ssa_values[stream][i]) != 1) exit(2);
  }
}

int main(int argc, char **argv) {
  unsigned long steps = argc > 1 ? strtoul(argv[1], NULL, 10) : 1, done = 0;
  ssa_read_inputs();
  for (;;) {
    ssa_step = done + 1;
    if (done == steps) {
      ssaopt_finish();
      break;
    }
    if (!ssaopt_step()) break;
    ++done;
  }
  ssaopt_outputs();
  printf("completed %lu step%s\n", done, done == 1 ? "" : "s");
  return 0;
}
)";

std::string quotedC(const std::string& text) { return "\"" + text + "\""; }

std::string harnessText(const client::EmittedC& emitted) {
  std::string names, hooks;
  for (std::size_t i = 0; i < emitted.inputs.size(); ++i) {
    names += (i ? ", " : "") + quotedC(emitted.inputs[i].variable);
    hooks +=
        "double " + emitted.inputs[i].hook + "(void) { return ssa_next_input(" + std::to_string(i) + "); }\n";
  }
  std::string text = kHarness;
  std::string declarations = "#define SSA_STREAMS " + std::to_string(emitted.inputs.size()) +
                             "\nstatic const char *const ssa_stream_names[] = {" +
                             (names.empty() ? quotedC("") : names) + "};\n";
  text.insert(text.find("int ssaopt_step"), declarations + "\n");
  return text + "\n" + hooks;
}

// The words of a command line as a shell splits it: blanks separate words, single quotes keep
// everything, double quotes keep everything but a backslash before \\, ", $ or `, and a backslash
// outside quotes keeps the next character.
std::vector<std::string> shellWords(const std::string& line) {
  std::vector<std::string> words;
  std::optional<std::string> word;  // the word being read
  char quote = 0;
  for (std::size_t i = 0; i < line.size(); ++i) {
    char c = line[i];
    if (!quote && std::isspace(static_cast<unsigned char>(c))) {
      if (word) words.push_back(*word);
      word.reset();
      continue;
    }
    if (!word) word.emplace();
    bool escapes = c == '\\' && i + 1 < line.size() &&
                   (quote == 0 || (quote == '"' && std::strchr("\\\"$`", line[i + 1])));
    if (escapes)
      *word += line[++i];
    else if (c == quote)
      quote = 0;
    else if (!quote && (c == '\'' || c == '"'))
      quote = c;
    else
      *word += c;
  }
  if (word) words.push_back(*word);
  return words;
}

// ---- Traces -----------------------------------------------------------------------------------------

// The interpreter's trace as the compiled program prints it: without the statement count.
std::string printedTrace(const client::Trace& trace) {
  std::string text;
  for (const client::Event& event : trace.events) text += client::formatEvent(event) + "\n";
  return text + client::formatEnding(trace) + "\n";
}

std::vector<std::string> tokensOf(const std::string& line) {
  std::vector<std::string> tokens;
  std::string token;
  for (char c : line) {
    if (std::string(" ,()[]").find(c) == std::string::npos) {
      token += c;
      continue;
    }
    if (!token.empty()) tokens.push_back(token);
    tokens.push_back(std::string(1, c));
    token.clear();
  }
  if (!token.empty()) tokens.push_back(token);
  return tokens;
}

bool sameToken(const std::string& a, const std::string& b) {
  if (a == b) return true;
  char *pEndA = nullptr, *pEndB = nullptr;
  double x = std::strtod(a.c_str(), &pEndA), y = std::strtod(b.c_str(), &pEndB);
  bool numbers = !a.empty() && !b.empty() && *pEndA == '\0' && *pEndB == '\0';
  return numbers && (x == y || (std::isnan(x) && std::isnan(y)));
}

// Lines compare as traces do: exactly, except that +0 equals -0 and NaN equals NaN.
bool sameLine(const std::string& a, const std::string& b) {
  std::vector<std::string> x = tokensOf(a), y = tokensOf(b);
  if (x.size() != y.size()) return false;
  for (std::size_t i = 0; i < x.size(); ++i)
    if (!sameToken(x[i], y[i])) return false;
  return true;
}

std::vector<std::string> linesOf(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

// The first pair of lines that differ; nothing when the texts agree.
std::optional<std::pair<std::string, std::string>> firstDifference(const std::string& expected,
                                                                   const std::string& actual) {
  std::vector<std::string> a = linesOf(expected), b = linesOf(actual);
  for (std::size_t i = 0; i < std::max(a.size(), b.size()); ++i) {
    std::string x = i < a.size() ? a[i] : "(nothing)", y = i < b.size() ? b[i] : "(nothing)";
    if (!sameLine(x, y)) return std::make_pair(x, y);
  }
  return std::nullopt;
}

// Seeded streams that count how many values each variable read, so that the compiled programs can be
// given the same values.
class CountingInputs : public client::InputStreams {
public:
  explicit CountingInputs(std::uint64_t seed) : m_Inputs(seed) {}
  std::optional<double> next(const KvCCfgSFVariable& variable) override {
    ++m_Reads[variable.getName()];
    return m_Inputs.next(variable);
  }
  const std::map<std::string, std::uint64_t>& reads() const { return m_Reads; }

private:
  client::SeededInputs m_Inputs;
  std::map<std::string, std::uint64_t> m_Reads;
};

// ---- The command -------------------------------------------------------------------------------------

struct Binary {
  std::string name;  // "compiled original", ...
  fs::path path;
};

class CcCheck {
public:
  CcCheck(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options), m_Out(out), m_Err(err) {}

  int execute() {
    m_Control.boot();
    int status = check();
    m_Control.shutdown();
    return status;
  }

private:
  int check() {
    std::unique_ptr<client::Program> pOriginal = load({}, true);
    if (!pOriginal) return kFailure;
    std::unique_ptr<client::Program> pOptimised = load(m_Options.passes.value_or(defaultPipeline()), false);
    if (m_Directory.path().empty()) {
      m_Err << "ssaopt: cannot make a temporary directory\n";
      return kFailure;
    }
    if (!build(*pOriginal, "original", {}) || !build(*pOptimised, "optimised", {}) ||
        !build(*pOptimised, "optimised",
               {"-fsanitize=undefined", "-fno-sanitize-recover=undefined", "-DSSA_CHECK_RANGES"}))
      return kFailure;
    return compareRuns(*pOriginal, *pOptimised);
  }

  std::unique_ptr<client::Program> load(const std::vector<std::string>& pipeline, bool showWarnings) {
    return loadProgramAndRunPipeline(m_Options.inputPath, pipeline, showWarnings, m_Err);
  }

  // $CC, which may carry flags ("clang -m32"), else cc.
  static std::string compiler() {
    const char* pCompiler = std::getenv("CC");
    return pCompiler && !shellWords(pCompiler).empty() ? pCompiler : "cc";
  }

  // Emits and compiles the program; false after saying why it failed.
  bool build(const client::Program& program, const std::string& name, const std::vector<std::string>& flags) {
    std::string stem = name + (flags.empty() ? "" : "_sanitized");
    client::EmittedC emitted = client::emitC(program, client::EmitOptions{!m_Options.keepChecks});
    fs::path source = m_Directory.path() / (stem + ".c"), harness = m_Directory.path() / (stem + "_main.c");
    std::ofstream(source) << emitted.text;
    std::ofstream(harness) << harnessText(emitted);
    Binary binary{"compiled " + name + (flags.empty() ? "" : " (-fsanitize=undefined -DSSA_CHECK_RANGES)"),
                  m_Directory.path() / stem};
    std::vector<std::string> command = shellWords(compiler());
    command.insert(command.end(), {"-std=c99", "-O2", "-Wall", "-Wextra", "-Werror"});
    command.insert(command.end(), flags.begin(), flags.end());
    command.insert(command.end(), {source.string(), harness.string(), "-o", binary.path.string()});
    Outcome outcome = runProcess(command, "", m_Directory.path(), kCompileTimeout);
    if (!outcome.started || outcome.status == kCommandNotFound) {
      m_Err << "ssaopt: no C compiler '" << compiler() << "': set CC or install cc\n";
      return false;
    }
    if (outcome.status != 0 || outcome.timedOut) {
      m_Out << "the C compiler rejected the emitted C of the " << binary.name << " program:\n"
            << outcome.out << outcome.err;
      return false;
    }
    m_Binaries.push_back(binary);
    return true;
  }

  int compareRuns(const client::Program& original, const client::Program& optimised) {
    client::Interpreter before(original), after(optimised);
    client::CheckSettings settings;
    settings.runs = m_Options.runs.value_or(kDefaultRuns);
    settings.firstSeed = m_Options.seed.value_or(kDefaultSeed);
    settings.limits.steps = m_Options.steps.value_or(kDefaultSteps);
    client::CheckReport report;
    for (std::uint64_t run = 0; run < settings.runs; ++run) {
      std::uint64_t seed = settings.firstSeed + run;
      CountingInputs originalInputs(seed), optimisedInputs(seed);
      client::Trace expected = before.run(settings.limits, originalInputs);
      client::Trace actual = after.run(settings.limits, optimisedInputs);
      if (!client::isConclusive(expected) || !client::isConclusive(actual)) {
        bool inOriginal = !client::isConclusive(expected);
        report.inconclusive.push_back(
            client::InconclusiveRun{seed, inOriginal, inOriginal ? expected : actual});
        continue;
      }
      if (std::optional<client::TraceDifference> where = client::compareTraces(expected, actual)) {
        report.difference = client::BehaviourDifference{seed, *where};
        m_Out << client::formatReport(report);
        return kFailure;
      }
      writeInputs(original, seed, {&originalInputs, &optimisedInputs});
      if (!compiledProgramsAgree(seed, settings.limits.steps, printedTrace(expected))) return kFailure;
      ++report.sameRuns;
    }
    std::string summary = client::formatReport(report);
    m_Out << summary.substr(0, summary.size() - 1) << " (interpreter and compiled C)\n";
    return kSuccess;
  }

  // Each stream gets as many values as the run that read most of it took.
  void writeInputs(const client::Program& program, std::uint64_t seed,
                   const std::vector<const CountingInputs*>& runs) {
    std::map<std::string, std::uint64_t> counts;
    for (const CountingInputs* pRun : runs)
      for (const auto& [name, reads] : pRun->reads()) counts[name] = std::max(counts[name], reads);
    client::SeededInputs inputs(seed);
    std::ofstream file(m_Directory.path() / "inputs");
    for (const auto& [name, count] : counts) {
      const KvCCfgSFVariable& variable = *program.findVariable(name);
      file << name << " " << count;
      char text[64];
      for (std::uint64_t i = 0; i < count; ++i) {
        std::snprintf(text, sizeof text, " %a", *inputs.next(variable));
        file << text;
      }
      file << "\n";
    }
  }

  bool compiledProgramsAgree(std::uint64_t seed, std::uint64_t steps, const std::string& expected) {
    for (const Binary& binary : m_Binaries) {
      Outcome outcome = runProcess({binary.path.string(), std::to_string(steps)},
                                   m_Directory.path() / "inputs", m_Directory.path(), kRunTimeout);
      std::string where = " with input seed " + std::to_string(seed);
      if (outcome.timedOut || outcome.status != 0 || !outcome.err.empty()) {
        m_Out << "the " << binary.name << " program "
              << (outcome.timedOut ? "did not finish"
                                   : "failed (exit status " + std::to_string(outcome.status) + ")")
              << where << ":\n"
              << outcome.err;
        return false;
      }
      if (auto difference = firstDifference(expected, outcome.out)) {
        m_Out << "different behaviour" << where << ":\n  interpreter: " << difference->first << "\n  "
              << binary.name << ": " << difference->second << "\n";
        return false;
      }
    }
    return true;
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  // The pool takes back what the graph never deletes; the programs live inside check().
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
  TemporaryDirectory m_Directory{"ssaopt-cc"};
  std::vector<Binary> m_Binaries;
};

}  // namespace

int runCcCheckCommand(const Options& options, std::ostream& out, std::ostream& err) {
  return CcCheck(options, out, err).execute();
}

}  // namespace ssaopt::tool
