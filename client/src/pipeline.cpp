#include "ssaopt/client/pipeline.h"

#include "ssaopt/client/hoisting.h"
#include "ssaopt/client/inlining.h"

namespace ssaopt::client {

void ProgramSteps::runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) {
  auto libraryStep = [&] { PipelineClient::runStep(step, graph); };
  switch (step.operation) {
    case ssaopt::GraphOperation::InlineProcedures:
      inlineKeepingLabels(m_Program, libraryStep);
      break;
    case ssaopt::GraphOperation::DivideBasicBlock:
      m_Program.transformKeepingLabels(libraryStep);
      break;
    case ssaopt::GraphOperation::HoistCodeOutOfIfElseBranches:
      hoistAsAgreed(m_Program, libraryStep);
      break;
    default:
      libraryStep();
  }
}

ssaopt::Pipeline pipelineNamed(const std::vector<std::string>& names) {
  ssaopt::Pipeline pipeline;
  for (const std::string& name : names) pipeline.push_back(ssaopt::findPipelineStep(name.c_str()));
  return pipeline;
}

std::vector<std::string> namesOf(const ssaopt::Pipeline& pipeline) {
  std::vector<std::string> names;
  for (const ssaopt::PipelineStep* pStep : pipeline) names.push_back(pStep->name);
  return names;
}

bool runPipeline(Program& program, const ssaopt::Pipeline& pipeline) {
  ProgramSteps steps(program);
  return ssaopt::runPipeline(program.graph(), pipeline, steps);
}

bool runPipeline(Program& program, const std::vector<std::string>& names) {
  return runPipeline(program, pipelineNamed(names));
}

bool runTypicalRun(Program& program) { return runPipeline(program, ssaopt::typicalRun()); }

}  // namespace ssaopt::client
