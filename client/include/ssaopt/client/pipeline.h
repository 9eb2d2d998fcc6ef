// The library's pipeline run on a program of the reference client, with the client's part in the steps:
// block labels kept through inlining and dividing, and the hoisting moves its assignments agreed to.
#pragma once

#include <string>
#include <vector>

#include "ssaopt/cfg/pipeline.h"
#include "ssaopt/client/program.h"

namespace ssaopt::client {

// What a program's graph is in when the front end has built it.
inline constexpr ssaopt::GraphState kLoadedProgramState = ssaopt::kBuiltGraph;

class ProgramSteps : public ssaopt::PipelineClient {
public:
  explicit ProgramSteps(Program& program) : m_Program(program) {}
  void runStep(const ssaopt::PipelineStep& step, KvCControlFlowGraph& graph) override;

private:
  Program& m_Program;
};

// The steps of these names, in order; every name must be a step's.
ssaopt::Pipeline pipelineNamed(const std::vector<std::string>& names);
std::vector<std::string> namesOf(const ssaopt::Pipeline& pipeline);

// Runs the steps on the program, with the client's part in them; false when one could not run (it
// was reported).
bool runPipeline(Program& program, const ssaopt::Pipeline& pipeline);
bool runPipeline(Program& program, const std::vector<std::string>& names);
bool runTypicalRun(Program& program);

}  // namespace ssaopt::client
