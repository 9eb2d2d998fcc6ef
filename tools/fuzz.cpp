#include "fuzz.h"

#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <iomanip>
#include <iterator>
#include <vector>

#include "exit_status.h"
#include "passes.h"
#include "process.h"
#include "program_check.h"
#include "shrink.h"
#include "ssaopt/client/generator.h"
#include "ssaopt/frame/control.h"

namespace ssaopt::tool {

namespace {

// A progress line at most this often, and one at the end.
constexpr std::chrono::seconds kProgressInterval(1);
// Every this many programs, another process optimises the program too and must print the same.
constexpr std::uint64_t kDeterminismInterval = 10;
// A random pipeline has at most this many passes: enough to reach propagation after SSA and dividing
// most of the time, and to repeat steps after it.
constexpr std::size_t kMaxRandomPasses = 16;

using Clock = std::chrono::steady_clock;

// ---- Crashes -------------------------------------------------------------------------------------

// What to say if checking a program crashes the process: prepared before each program, because a
// signal handler may only write what is already there.
char g_CrashMessage[512];
std::size_t g_CrashMessageLength = 0;

constexpr int kCrashSignals[] = {SIGSEGV, SIGABRT, SIGFPE, SIGBUS, SIGILL};
struct sigaction g_PreviousActions[std::size(kCrashSignals)];

// Says which program crashed, then puts back the handler that was there before (a sanitizer's, or
// the default) and returns: a fault happens again at once and reaches that handler with its own
// details; abort() raises its signal again itself.
extern "C" void reportCrash(int signal) {
  ssize_t written = write(STDERR_FILENO, g_CrashMessage, g_CrashMessageLength);
  (void)written;
  for (std::size_t i = 0; i < std::size(kCrashSignals); ++i)
    if (kCrashSignals[i] == signal) sigaction(signal, &g_PreviousActions[i], nullptr);
}

void installCrashReport() {
  struct sigaction action {};
  action.sa_handler = reportCrash;
  sigemptyset(&action.sa_mask);
  for (std::size_t i = 0; i < std::size(kCrashSignals); ++i)
    sigaction(kCrashSignals[i], &action, &g_PreviousActions[i]);
}

class GeneratorCommand {
public:
  GeneratorCommand(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options),
        m_Out(out),
        m_Err(err),
        m_FirstSeed(options.seed.value_or(kDefaultSeed)),
        m_Size(options.size.value_or(client::kDefaultProgramSize)),
        m_Tool(ownExecutable()) {}

  int execute() {
    if (m_Options.command == Command::Generate) {
      m_Out << client::generateProgram(m_FirstSeed, m_Size);
      return kSuccess;
    }
    m_Control.boot();
    installCrashReport();
    fuzz();
    m_Control.shutdown();
    return m_Failures ? kFailure : kSuccess;
  }

private:
  void fuzz() {
    std::uint64_t programs = m_Options.programs.value_or(kDefaultPrograms);
    Clock::time_point lastProgress = m_Start;
    for (std::uint64_t done = 0; done < programs;) {
      checkProgram(m_FirstSeed + done);
      Clock::time_point now = Clock::now();
      if (++done == programs || now - lastProgress >= kProgressInterval) {
        writeProgress(done, now);
        lastProgress = now;
      }
    }
  }

  void checkProgram(std::uint64_t seed) {
    ProgramCheck check(pipelineFor(seed), m_Tool);
    prepareCrashMessage(seed, check);
    std::string text = client::generateProgram(seed, m_Size);
    bool checkDeterminism = seed % kDeterminismInterval == 0;
    Problem problem = check.findProblem(text, checkDeterminism);
    if (!problem) return;
    ++m_Failures;
    m_Err << "failure in the program of seed " << seed << check.passesOption() << ":\n" << problem.detail;
    std::string path = "fuzz-" + std::to_string(seed) + ".ssa";
    writeProgram(path, text, problem.kind, check);
    if (problem.kind == ProblemKind::Invalid) return;
    std::string shrunk = shrinkProgram(text, [&](const std::string& candidate) {
      return check.findProblem(candidate, checkDeterminism).kind == problem.kind;
    });
    writeProgram("fuzz-" + std::to_string(seed) + "-shrunk.ssa", shrunk, problem.kind, check);
  }

  // The pipeline of --passes, a random one drawn from the program's seed, or the default one. The
  // random one depends on the seed alone, so a failure reproduces with the same seed.
  std::vector<std::string> pipelineFor(std::uint64_t seed) const {
    if (m_Options.randomPasses) return randomLegalPipeline(seed, kMaxRandomPasses);
    return m_Options.passes.value_or(defaultPipeline());
  }

  void writeProgram(const std::string& path, const std::string& text, ProblemKind kind,
                    const ProgramCheck& check) {
    std::ofstream(path, std::ios::binary) << text;
    m_Err << "  wrote " << path << "; reproduce: " << check.reproduceCommand(kind, path) << "\n";
  }

  void prepareCrashMessage(std::uint64_t seed, const ProgramCheck& check) {
    std::string message = "ssaopt: fuzz: crashed on the program of seed " + std::to_string(seed) +
                          "; reproduce: ssaopt fuzz --programs 1 --seed " + std::to_string(seed) +
                          " --size " + std::to_string(m_Size) + check.passesOption() + "\n";
    g_CrashMessageLength = message.copy(g_CrashMessage, sizeof g_CrashMessage);
  }

  void writeProgress(std::uint64_t done, Clock::time_point now) {
    double seconds = std::chrono::duration<double>(now - m_Start).count();
    m_Out << "fuzz: " << done << " programs, " << m_Failures << " failures, " << std::fixed
          << std::setprecision(1) << done / seconds << " programs/s" << std::endl;
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  std::uint64_t m_FirstSeed;
  std::uint64_t m_Size;
  std::string m_Tool;
  std::uint64_t m_Failures = 0;
  Clock::time_point m_Start = Clock::now();
  KvCSSAControl m_Control;
};

}  // namespace

int runGeneratorCommand(const Options& options, std::ostream& out, std::ostream& err) {
  return GeneratorCommand(options, out, err).execute();
}

}  // namespace ssaopt::tool
