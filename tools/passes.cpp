#include "passes.h"

#include "ssaopt/client/front_end.h"
#include "ssaopt/client/pipeline.h"

namespace ssaopt::tool {

ssaopt::PipelineSteps passRegistry() { return ssaopt::pipelineSteps(); }

const Pass* findPass(std::string_view name) {
  for (const Pass& pass : passRegistry())
    if (name == pass.name) return &pass;
  return nullptr;
}

std::vector<std::string> defaultPipeline() { return client::namesOf(ssaopt::typicalRun()); }

std::string joinedPassNames(const std::vector<std::string>& names) {
  std::string joined;
  for (const std::string& name : names) joined += (joined.empty() ? "" : ", ") + name;
  return joined;
}

std::string findUnknownPass(const std::vector<std::string>& pipeline) {
  for (const std::string& name : pipeline) {
    if (findPass(name)) continue;
    std::vector<std::string> known;
    for (const Pass& pass : passRegistry()) known.push_back(pass.name);
    return "unknown pass '" + name + "'; known passes: " + joinedPassNames(known);
  }
  return "";
}

std::string findPipelineError(const std::vector<std::string>& pipeline) {
  std::string unknown = findUnknownPass(pipeline);
  if (!unknown.empty()) return unknown;
  return ssaopt::findPipelineProblem(client::pipelineNamed(pipeline), client::kLoadedProgramState).cstring();
}

std::string whereThePassRuns(const Pass& pass) {
  std::string where = ssaopt::describeWhereStepRuns(pass).cstring();
  return where.empty() ? "" : " (" + where + ")";
}

namespace {

// splitmix64: a good spread from consecutive seeds.
std::uint64_t nextRandom(std::uint64_t& state) {
  std::uint64_t z = (state += 0x9e3779b97f4a7c15ULL);
  z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ULL;
  z = (z ^ (z >> 27)) * 0x94d049bb133111ebULL;
  return z ^ (z >> 31);
}

}  // namespace

std::vector<std::string> randomLegalPipeline(std::uint64_t seed, std::size_t maxLength) {
  std::uint64_t state = seed;
  std::size_t length = 1 + nextRandom(state) % maxLength;
  std::vector<std::string> pipeline;
  ssaopt::GraphState graphState = client::kLoadedProgramState;
  for (std::size_t i = 0; i < length; ++i) {
    std::vector<const Pass*> candidates;
    for (const Pass& pass : passRegistry())
      if (ssaopt::canRun(pass, graphState)) candidates.push_back(&pass);
    const Pass* pChosen = candidates[nextRandom(state) % candidates.size()];
    pipeline.push_back(pChosen->name);
    graphState = ssaopt::stateAfter(pChosen->operation, graphState);
  }
  return pipeline;
}

void runPipeline(const std::vector<std::string>& pipeline, client::Program& program) {
  client::runPipeline(program, pipeline);
}

std::unique_ptr<client::Program> loadProgramAndRunPipeline(const std::string& path,
                                                           const std::vector<std::string>& pipeline,
                                                           bool showWarnings, std::ostream& err) {
  client::LoadResult loaded = client::loadProgramFile(path);
  for (const client::Diagnostic& diagnostic : loaded.diagnostics)
    if (showWarnings || !loaded.program) err << client::formatDiagnostic(path, diagnostic) << "\n";
  if (loaded.program) runPipeline(pipeline, *loaded.program);
  return std::move(loaded.program);
}

}  // namespace ssaopt::tool
