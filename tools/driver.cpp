#include "driver.h"

#include <chrono>
#include <fstream>
#include <iomanip>
#include <memory>
#include <optional>

#include "exit_status.h"
#include "passes.h"
#include "ssaopt/client/c_emitter.h"
#include "ssaopt/client/dot.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"
#include "statistics.h"
#include "verification.h"

namespace ssaopt::tool {

namespace {

using Clock = std::chrono::steady_clock;

class Run {
public:
  Run(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options), m_Out(out), m_Err(err) {}

  int execute() {
    std::vector<std::string> pipeline = m_Options.passes.value_or(defaultPipeline());
    m_Control.boot();
    if (m_Options.verify) m_Verification.emplace();
    if (!load()) return kFailure;
    if (m_Verification) m_Verification->checkGraph(m_pProgram->graph(), "the front end");
    GraphCounts before = countGraph(m_pProgram->graph());
    for (const std::string& name : pipeline) runPass(*findPass(name));
    writeNotices();
    bool written = writeResult();
    if (m_Options.stats) writeStatistics(m_Err, before, countGraph(m_pProgram->graph()), m_Removed);
    if (m_Options.timePasses) writeTimes();
    bool verified = !m_Verification || m_Verification->writeReports(m_Err);
    m_Control.shutdown();
    return written && verified ? kSuccess : kFailure;
  }

private:
  bool load() {
    client::LoadResult loaded = client::loadProgramFile(m_Options.inputPath);
    for (const client::Diagnostic& diagnostic : loaded.diagnostics)
      m_Err << client::formatDiagnostic(m_Options.inputPath, diagnostic) << "\n";
    m_pProgram = std::move(loaded.program);
    return m_pProgram != nullptr;
  }

  void runPass(const Pass& pass) {
    GraphCounts ahead = m_Options.stats ? countGraph(m_pProgram->graph()) : GraphCounts();
    Clock::time_point start = Clock::now();
    pass.run(*m_pProgram);
    m_Times.emplace_back(pass.name, std::chrono::duration<double, std::milli>(Clock::now() - start).count());
    if (m_Options.stats) m_Removed.add(ahead, countGraph(m_pProgram->graph()));
    if (m_Options.printAfterAll)
      m_Err << "// ---- after " << pass.name << " ----\n" << client::printProgram(*m_pProgram);
    if (m_Verification) m_Verification->checkGraph(m_pProgram->graph(), std::string("pass ") + pass.name);
  }

  // What the client's expressions noticed while the passes ran.
  void writeNotices() {
    for (const client::Notice& notice : m_pProgram->expressions().notices())
      m_Err << client::formatDiagnostic(m_Options.inputPath,
                                        {client::Severity::Warning, notice.pos, notice.message})
            << "\n";
  }

  bool writeResult() {
    std::string result = m_Options.emit == Emit::Dot ? client::writeDot(*m_pProgram)
                         : m_Options.emit == Emit::C
                             ? client::emitC(*m_pProgram, client::EmitOptions{!m_Options.keepChecks}).text
                             : client::printProgram(*m_pProgram, client::PrintOptions{m_Options.showValues});
    if (m_Options.outputPath.empty()) {
      m_Out << result;
      return true;
    }
    std::ofstream file(m_Options.outputPath, std::ios::binary);
    file << result;
    if (file.flush()) return true;
    m_Err << "ssaopt: cannot write '" << m_Options.outputPath << "'\n";
    return false;
  }

  void writeTimes() {
    double total = 0;
    for (const auto& time : m_Times) {
      m_Err << "time " << std::left << std::setw(20) << time.first << std::right << std::fixed
            << std::setprecision(3) << std::setw(12) << time.second << " ms\n";
      total += time.second;
    }
    m_Err << "time " << std::left << std::setw(20) << "total" << std::right << std::setw(12) << total
          << " ms\n";
    // What the library held at most, from reading the program to the end of the last pass.
    m_Err << "peak memory " << std::left << std::setw(14) << "" << std::right << std::setw(12)
          << std::setprecision(1) << static_cast<double>(m_Pool.peakBytes()) / 1024 << " KiB\n";
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  // The pool takes back what the graph never deletes; it must outlive every object of the run, so it
  // comes first and the program last.
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
  std::optional<Verification> m_Verification;
  std::unique_ptr<client::Program> m_pProgram;
  std::vector<std::pair<std::string, double>> m_Times;
  RemovedCounts m_Removed;
};

}  // namespace

int runTool(const Options& options, std::ostream& out, std::ostream& err) {
  return Run(options, out, err).execute();
}

}  // namespace ssaopt::tool
