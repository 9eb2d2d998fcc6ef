#include "fuzz.h"

#include <chrono>
#include <iomanip>
#include <memory>
#include <sstream>

#include "passes.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/generator.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"
#include "verification.h"

namespace ssaopt::tool {

namespace {

constexpr int kFailure = 1;
constexpr int kUnknownPass = 2;
// Input streams each program runs on before and after the pipeline: a few, so that a thousand
// programs take seconds, while the many programs make up for the few streams.
constexpr std::uint64_t kRunsPerProgram = 5;
constexpr std::uint64_t kProgressInterval = 100;

using Clock = std::chrono::steady_clock;

class GeneratorCommand {
public:
  GeneratorCommand(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options),
        m_Out(out),
        m_Err(err),
        m_FirstSeed(options.seed.value_or(kDefaultSeed)),
        m_Size(options.size.value_or(client::kDefaultProgramSize)),
        m_Pipeline(options.passes.value_or(defaultPipeline())) {}

  int execute() {
    if (m_Options.command == Command::Generate) {
      m_Out << client::generateProgram(m_FirstSeed, m_Size);
      return 0;
    }
    std::string unknown = findUnknownPass(m_Pipeline);
    if (!unknown.empty()) {
      m_Err << "ssaopt: " << unknown << "\n";
      return kUnknownPass;
    }
    m_Control.boot();
    fuzz();
    m_Control.shutdown();
    return m_Failures ? kFailure : 0;
  }

private:
  void fuzz() {
    std::uint64_t programs = m_Options.programs.value_or(kDefaultPrograms);
    for (std::uint64_t done = 0; done < programs;) {
      checkProgram(m_FirstSeed + done);
      if (++done % kProgressInterval == 0 || done == programs) writeProgress(done);
    }
  }

  void checkProgram(std::uint64_t seed) {
    std::string problem = findProblem(client::generateProgram(seed, m_Size));
    if (problem.empty()) return;
    ++m_Failures;
    m_Err << "failure in the program of seed " << seed << ":\n" << problem;
    m_Err << "  reproduce: ssaopt generate --seed " << seed << " --size " << m_Size
          << " > f.ssa; ssaopt check f.ssa";
    if (m_Options.passes) m_Err << " '--passes=" << commaSeparated(m_Pipeline) << "'";
    m_Err << "\n";
  }

  static std::string commaSeparated(const std::vector<std::string>& names) {
    std::string list;
    for (const std::string& name : names) list += (list.empty() ? "" : ",") + name;
    return list;
  }

  // What went wrong with the program, one line or more; empty when nothing did.
  std::string findProblem(const std::string& text) {
    client::LoadResult original = client::loadProgram(text);
    if (!original.program)
      return client::formatDiagnostic("generated.ssa", original.diagnostics.back()) + "\n";
    std::ostringstream reports;
    std::unique_ptr<client::Program> pTransformed = transform(text, reports);
    if (!reports.str().empty()) return reports.str();
    client::CheckSettings settings;
    settings.runs = kRunsPerProgram;
    client::CheckReport report = client::checkBehaviour(*original.program, *pTransformed, settings);
    return report.difference ? client::formatReport(report) : "";
  }

  // The program after the pipeline, with the internal checks on and the graph checked after every
  // pass; what they report goes to `reports`.
  std::unique_ptr<client::Program> transform(const std::string& text, std::ostream& reports) {
    Verification verification;
    std::unique_ptr<client::Program> pProgram = client::loadProgram(text).program;
    verification.checkGraph(pProgram->graph(), "the front end");
    for (const std::string& name : m_Pipeline) {
      runPipeline({name}, *pProgram);
      verification.checkGraph(pProgram->graph(), "pass " + name);
    }
    verification.writeReports(reports);
    return pProgram;
  }

  void writeProgress(std::uint64_t done) {
    double seconds = std::chrono::duration<double>(Clock::now() - m_Start).count();
    m_Out << "fuzz: " << done << " programs, " << m_Failures << " failures, " << std::fixed
          << std::setprecision(1) << done / seconds << " programs/s" << std::endl;
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  std::uint64_t m_FirstSeed;
  std::uint64_t m_Size;
  std::vector<std::string> m_Pipeline;
  std::uint64_t m_Failures = 0;
  Clock::time_point m_Start = Clock::now();
  // The pool takes back what the graph never deletes; every program lives inside findProblem().
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
};

}  // namespace

int runGeneratorCommand(const Options& options, std::ostream& out, std::ostream& err) {
  return GeneratorCommand(options, out, err).execute();
}

}  // namespace ssaopt::tool
