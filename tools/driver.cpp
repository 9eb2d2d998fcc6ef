#include "driver.h"

#include <chrono>
#include <fstream>
#include <iomanip>
#include <memory>
#include <optional>
#include <sstream>

#include "exit_status.h"
#include "pass_printing.h"
#include "passes.h"
#include "report.h"
#include "ssaopt/client/c_emitter.h"
#include "ssaopt/client/dot.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/pipeline.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"
#include "statistics.h"
#include "verification.h"

namespace ssaopt::tool {

namespace {

using Clock = std::chrono::steady_clock;

class Run;

// The client's part in every step, then what the options ask for after it: counts, times, the program
// printed, the graph verified.
class ObservedSteps : public client::ProgramSteps {
public:
  ObservedSteps(client::Program& program, Run& run) : client::ProgramSteps(program), m_Run(run) {}
  void runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) override;

private:
  Run& m_Run;
};

class Run {
public:
  Run(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options), m_Out(out), m_Err(err), m_Printer(options, err) {}

  int execute() {
    std::vector<std::string> pipeline = m_Options.passes.value_or(defaultPipeline());
    m_Control.boot();
    if (m_Options.verify) m_Verification.emplace();
    if (m_Options.emit == Emit::Html) m_Report.emplace(m_Options);
    if (!load()) return kFailure;
    if (!findFilteredProcedure()) return kMisuse;
    if (m_Verification) m_Verification->checkGraph(m_pProgram->graph(), "the front end");
    GraphCounts before = m_Counting ? countGraph(m_pProgram->graph()) : GraphCounts();
    if (m_Report) m_Report->addStep("the front end", *m_pProgram, 0.0);
    ObservedSteps steps(*m_pProgram, *this);
    ssaopt::runPipeline(m_pProgram->graph(), client::pipelineNamed(pipeline), steps);
    writeNotices();
    std::string statistics = m_Counting ? statisticsText(before) : "", times = timesText();
    bool written = writeResult(statistics, times);
    if (m_Options.stats) m_Err << statistics;
    if (m_Options.timePasses) m_Err << times;
    bool verified = !m_Verification || m_Verification->writeReports(m_Err);
    m_Control.shutdown();
    return written && verified ? kSuccess : kFailure;
  }

private:
  bool load() {
    m_Source = client::readSourceText(m_Options.inputPath).value_or("");
    client::LoadResult loaded = client::loadProgram(m_Source);
    for (const client::Diagnostic& diagnostic : loaded.diagnostics)
      m_Err << client::formatDiagnostic(m_Options.inputPath, diagnostic) << "\n";
    m_pProgram = std::move(loaded.program);
    return m_pProgram != nullptr;
  }

  // A procedure to print alone must be in the program as read.
  bool findFilteredProcedure() {
    if (!m_Options.filterProcedure || m_pProgram->graph().findProcedure(m_Options.filterProcedure->c_str()))
      return true;
    m_Err << "ssaopt: --filter-procedure: no procedure '" << *m_Options.filterProcedure << "' in "
          << client::displayName(m_Options.inputPath) << "\n";
    return false;
  }

  // Runs `runClientStep` (the client's part and the library's step) and observes it.
  template <class RunStep>
  void observeStep(const ssaopt::PipelineStep& step, RunStep runClientStep) {
    GraphCounts ahead = m_Counting ? countGraph(m_pProgram->graph()) : GraphCounts();
    m_Printer.beforePass(step.name, *m_pProgram);
    Clock::time_point start = Clock::now();
    runClientStep();
    double milliseconds = std::chrono::duration<double, std::milli>(Clock::now() - start).count();
    m_Times.emplace_back(step.name, milliseconds);
    if (m_Counting) m_Removed.add(ahead, countGraph(m_pProgram->graph()));
    m_Printer.afterPass(step.name, *m_pProgram);
    if (m_Report) m_Report->addStep(step.name, *m_pProgram, milliseconds);
    if (m_Verification) m_Verification->checkGraph(m_pProgram->graph(), std::string("pass ") + step.name);
  }
  friend class ObservedSteps;

  // What the client's expressions noticed while the passes ran, shown at their place in the source.
  void writeNotices() {
    std::vector<client::Diagnostic> notices;
    for (const client::Notice& notice : m_pProgram->expressions().notices())
      notices.push_back({client::Severity::Warning, notice.pos, notice.message});
    client::attachSourceLines(notices, m_Source);
    for (const client::Diagnostic& notice : notices)
      m_Err << client::formatDiagnostic(m_Options.inputPath, notice) << "\n";
  }

  std::string result(const std::string& statistics, const std::string& times) const {
    std::string procedure = m_Options.filterProcedure.value_or("");
    switch (m_Options.emit) {
      case Emit::Dot:
        return client::writeDot(*m_pProgram, client::DotOptions{m_Options.showValues, procedure});
      case Emit::C:
        return client::emitC(*m_pProgram, client::EmitOptions{!m_Options.keepChecks}).text;
      case Emit::Html:
        return m_Report->page(statistics, times);
      case Emit::Text:
        break;
    }
    client::PrintOptions options;
    options.showValues = m_Options.showValues;
    options.procedure = procedure;
    return client::printProgram(*m_pProgram, options);
  }

  bool writeResult(const std::string& statistics, const std::string& times) {
    std::string text = result(statistics, times);
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

  std::string statisticsText(const GraphCounts& before) const {
    std::ostringstream text;
    writeStatistics(text, before, countGraph(m_pProgram->graph()), m_Removed);
    return text.str();
  }

  std::string timesText() const {
    std::ostringstream text;
    double total = 0;
    for (const auto& time : m_Times) {
      text << "time " << std::left << std::setw(20) << time.first << std::right << std::fixed
           << std::setprecision(3) << std::setw(12) << time.second << " ms\n";
      total += time.second;
    }
    text << "time " << std::left << std::setw(20) << "total" << std::right << std::fixed
         << std::setprecision(3) << std::setw(12) << total << " ms\n";
    // What the library held at most, from reading the program to the end of the last pass.
    text << "peak memory " << std::left << std::setw(14) << "" << std::right << std::setw(12)
         << std::setprecision(1) << static_cast<double>(m_Pool.peakBytes()) / 1024 << " KiB\n";
    return text.str();
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  // Counting the graph after every pass costs a walk over it, so only what shows the counts does.
  bool m_Counting = m_Options.stats || m_Options.emit == Emit::Html;
  // The pool takes back what the graph never deletes; it must outlive every object of the run, so it
  // comes first and the program last.
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
  std::optional<Verification> m_Verification;
  PassPrinter m_Printer;
  std::optional<Report> m_Report;
  std::string m_Source;
  std::unique_ptr<client::Program> m_pProgram;
  std::vector<std::pair<std::string, double>> m_Times;
  RemovedCounts m_Removed;
};

void ObservedSteps::runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) {
  m_Run.observeStep(step, [&] { client::ProgramSteps::runStep(step, graph); });
}

}  // namespace

int runTool(const Options& options, std::ostream& out, std::ostream& err) {
  return Run(options, out, err).execute();
}

}  // namespace ssaopt::tool
