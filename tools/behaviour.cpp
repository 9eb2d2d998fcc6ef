#include "behaviour.h"

#include <memory>
#include <optional>

#include "exit_status.h"
#include "passes.h"
#include "program_check.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/pool.h"

namespace ssaopt::tool {

namespace {

class BehaviourCommand {
public:
  BehaviourCommand(const Options& options, std::ostream& out, std::ostream& err)
      : m_Options(options), m_Out(out), m_Err(err) {}

  int execute() {
    // run shows the program as written unless told otherwise; check is about the pipeline.
    std::vector<std::string> pipeline = m_Options.passes.value_or(
        m_Options.command == Command::Run ? std::vector<std::string>() : defaultPipeline());
    m_Control.boot();
    int status = m_Options.command == Command::Run ? run(pipeline) : check(pipeline);
    m_Control.shutdown();
    return status;
  }

private:
  int run(const std::vector<std::string>& pipeline) {
    std::unique_ptr<client::Program> pProgram = load(pipeline, true);
    if (!pProgram) return kFailure;
    std::unique_ptr<client::InputStreams> pInputs = openInputs(*pProgram);
    if (!pInputs) return kFailure;
    client::RunLimits limits;
    limits.steps = m_Options.steps.value_or(kDefaultSteps);
    m_Out << client::formatTrace(client::Interpreter(*pProgram).run(limits, *pInputs));
    return kSuccess;
  }

  // The behaviour before and after the pipeline, and what each constant propagation of the pipeline
  // claims, checked on the same runs right after it.
  int check(const std::vector<std::string>& pipeline) {
    std::unique_ptr<client::Program> pOriginal = load({}, true);
    if (!pOriginal) return kFailure;
    std::unique_ptr<client::Program> pTransformed = load({}, false);
    client::CheckSettings settings;
    settings.runs = m_Options.runs.value_or(kDefaultRuns);
    settings.firstSeed = m_Options.seed.value_or(kDefaultSeed);
    settings.limits.steps = m_Options.steps.value_or(kDefaultSteps);
    std::string propagation;  // the last propagation's report, or the first contradiction
    bool contradicted = false;
    for (const std::string& name : pipeline) {
      runPipeline({name}, *pTransformed);
      if (contradicted || !propagatesConstants(name)) continue;
      client::PropagationReport oracle = client::checkPropagation(*pTransformed, settings);
      contradicted = oracle.violation.has_value();
      propagation =
          (contradicted ? "after pass " + name + ", " : "") + client::formatPropagationReport(oracle);
    }
    client::CheckReport report = client::checkBehaviour(*pOriginal, *pTransformed, settings);
    m_Out << client::formatReport(report) << propagation;
    return report.difference || contradicted ? kFailure : kSuccess;
  }

  std::unique_ptr<client::Program> load(const std::vector<std::string>& pipeline, bool showWarnings) {
    return loadProgramAndRunPipeline(m_Options.inputPath, pipeline, showWarnings, m_Err);
  }

  // Seeded streams, or the values of the --inputs file ("-": standard input), which may name only
  // the program's inputs.
  std::unique_ptr<client::InputStreams> openInputs(const client::Program& program) {
    if (!m_Options.inputsPath)
      return std::make_unique<client::SeededInputs>(m_Options.seed.value_or(kDefaultSeed));
    std::optional<std::string> text = client::readSourceText(*m_Options.inputsPath);
    std::string error = text ? "" : "cannot read the file";
    std::optional<client::ListedInputs> inputs;
    if (error.empty()) inputs = client::ListedInputs::parse(*text, error);
    if (inputs) error = unknownInput(*inputs, program);
    if (!error.empty()) {
      m_Err << "ssaopt: " << client::displayName(*m_Options.inputsPath) << ": " << error << "\n";
      return nullptr;
    }
    return std::make_unique<client::ListedInputs>(std::move(*inputs));
  }

  // Values only a volatile variable or an array can take: a misspelt name would leave its variable
  // without them unnoticed.
  static std::string unknownInput(const client::ListedInputs& inputs, const client::Program& program) {
    for (const std::string& name : inputs.variableNames()) {
      const KvCCfgSFVariable* pVariable = program.findVariable(name);
      if (!pVariable) return "'" + name + "' is not a variable of the program";
      if (!pVariable->isVolatile() && !pVariable->isArray())
        return "'" + name + "' is not an input of the program (neither volatile nor an array)";
    }
    return "";
  }

  const Options& m_Options;
  std::ostream& m_Out;
  std::ostream& m_Err;
  // The pool takes back what the graph never deletes; the programs live inside run() and check().
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_PoolScope{&m_Pool};
  KvCSSAControl m_Control;
};

}  // namespace

int runBehaviourCommand(const Options& options, std::ostream& out, std::ostream& err) {
  return BehaviourCommand(options, out, err).execute();
}

}  // namespace ssaopt::tool
