#include "passes.h"

#include <algorithm>

#include "ssaopt/client/front_end.h"
#include "ssaopt/client/hoisting.h"
#include "ssaopt/client/inlining.h"

namespace ssaopt::tool {

namespace {

// A transformation joins the tool with one line here, and the default pipeline too when it is named
// in kTypicalRun.
const std::vector<Pass> kPasses = {
    {"inline",
     "put the body of each procedure called from one place in place of its call",
     [](client::Program& program) { client::inlineProcedures(program); },
     {},
     true},
    {"valid-conditions", "record on each branch what its condition implies (virtual assignments)",
     [](client::Program& program) { program.graph().insertValidConditionAssignments(); }},
    {"ssa",
     "transform to SSA form (registering every call not yet registered first)",
     [](client::Program& program) {
       program.completeCallLists();
       program.graph().transformToSSAForm();
     },
     {},
     true},
    {"divide", "give every block one phi function, one statement or its condition alone",
     [](client::Program& program) {
       program.transformKeepingLabels([&program] { program.graph().divideBasicBlock(); });
     }},
    {"sccp",
     "sparse conditional constant propagation, removing unreachable code",
     [](client::Program& program) { program.graph().propagateSparseConditionalConstant(true); },
     {"ssa", "divide"},
     false,
     {"ssa-edges"}},
    {"sccp-keep-dead",
     "sparse conditional constant propagation, keeping unreachable code",
     [](client::Program& program) { program.graph().propagateSparseConditionalConstant(false); },
     {"ssa", "divide"},
     false,
     {"ssa-edges"}},
    {"ssa-edges", "add the SSA def-use edges",
     [](client::Program& program) { program.graph().addSSAEdges(); }},
    {"propagate",
     "propagate constants over the SSA edges present, removing unreachable code",
     [](client::Program& program) { program.graph().sparseConditionalConstant(true); },
     {"ssa", "divide", "ssa-edges"}},
    {"propagate-keep-dead",
     "propagate constants over the SSA edges present, keeping unreachable code",
     [](client::Program& program) { program.graph().sparseConditionalConstant(false); },
     {"ssa", "divide", "ssa-edges"}},
    {"replace-constants", "put constants in place of reads of constant variables",
     [](client::Program& program) { program.graph().replaceConstantVariables(); }},
    {"replace-conditions", "put constants in place of constant branch conditions",
     [](client::Program& program) { program.graph().replaceConstantConditions(); }},
    {"fold", "fold constant sub-expressions",
     [](client::Program& program) { program.graph().foldConstants(); }},
    {"remove-unused", "remove definitions of erasable variables that nothing uses",
     [](client::Program& program) { program.graph().removeUnusedVarDefs(); }},
    {"hoist", "move statements that both branches of an if/else begin with before the branch",
     [](client::Program& program) { client::hoistCodeOutOfIfElseBranches(program); }},
};

const char* const kTypicalRun[] = {
    "inline", "valid-conditions", "ssa",  "divide", "sccp", "replace-constants", "replace-conditions",
    "fold",   "remove-unused",    "hoist"};

}  // namespace

const std::vector<Pass>& passRegistry() { return kPasses; }

const Pass* findPass(std::string_view name) {
  for (const Pass& pass : kPasses)
    if (name == pass.name) return &pass;
  return nullptr;
}

std::vector<std::string> defaultPipeline() {
  std::vector<std::string> pipeline;
  for (const char* name : kTypicalRun)
    if (findPass(name)) pipeline.push_back(name);
  return pipeline;
}

std::string joinedPassNames(const std::vector<std::string>& names) {
  std::string joined;
  for (const std::string& name : names) joined += (joined.empty() ? "" : ", ") + name;
  return joined;
}

std::string findUnknownPass(const std::vector<std::string>& pipeline) {
  for (const std::string& name : pipeline) {
    if (findPass(name)) continue;
    std::vector<std::string> known;
    for (const Pass& pass : kPasses) known.push_back(pass.name);
    return "unknown pass '" + name + "'; known passes: " + joinedPassNames(known);
  }
  return "";
}

namespace {

// Whether a pass before `at` did the work of pass `name`.
bool ranEarlier(std::string_view name, const std::vector<std::string>& pipeline,
                std::vector<std::string>::const_iterator at) {
  return std::any_of(pipeline.begin(), at, [name](const std::string& earlier) {
    const std::vector<std::string_view>& includes = findPass(earlier)->includes;
    return earlier == name || std::find(includes.begin(), includes.end(), name) != includes.end();
  });
}

}  // namespace

std::string findPipelineError(const std::vector<std::string>& pipeline) {
  std::string unknown = findUnknownPass(pipeline);
  if (!unknown.empty()) return unknown;
  for (auto at = pipeline.begin(); at != pipeline.end(); ++at) {
    const Pass& pass = *findPass(*at);
    if (pass.beforeSSAOnly && ranEarlier("ssa", pipeline, at))
      return *at == "ssa" ? "pass 'ssa' can run only once" : "pass '" + *at + "' must come before 'ssa'";
    for (std::string_view need : pass.needs)
      if (!ranEarlier(need, pipeline, at))
        return "pass '" + *at + "' needs '" + std::string(need) + "' earlier in the pipeline";
  }
  return "";
}

void runPipeline(const std::vector<std::string>& pipeline, client::Program& program) {
  for (const std::string& name : pipeline) findPass(name)->run(program);
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
