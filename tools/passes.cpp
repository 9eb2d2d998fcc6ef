#include "passes.h"

#include "ssaopt/client/hoisting.h"
#include "ssaopt/client/inlining.h"

namespace ssaopt::tool {

namespace {

// A transformation joins the tool with one line here, and the default pipeline too when it is named
// in kTypicalRun.
const std::vector<Pass> kPasses = {
    {"inline", "put the body of each procedure called from one place in place of its call",
     [](client::Program& program) { client::inlineProcedures(program); }},
    {"valid-conditions", "record on each branch what its condition implies (virtual assignments)",
     [](client::Program& program) { program.graph().insertValidConditionAssignments(); }},
    {"ssa", "transform to SSA form (registering every call not yet registered first)",
     [](client::Program& program) {
       program.completeCallLists();
       program.graph().transformToSSAForm();
     }},
    {"divide", "give every block one phi function, one statement or its condition alone",
     [](client::Program& program) {
       program.transformKeepingLabels([&program] { program.graph().divideBasicBlock(); });
     }},
    {"sccp", "sparse conditional constant propagation, removing unreachable code",
     [](client::Program& program) { program.graph().propagateSparseConditionalConstant(true); }},
    {"sccp-keep-dead", "sparse conditional constant propagation, keeping unreachable code",
     [](client::Program& program) { program.graph().propagateSparseConditionalConstant(false); }},
    {"ssa-edges", "add the SSA def-use edges",
     [](client::Program& program) { program.graph().addSSAEdges(); }},
    {"propagate", "propagate constants over the SSA edges present, removing unreachable code",
     [](client::Program& program) { program.graph().sparseConditionalConstant(true); }},
    {"propagate-keep-dead", "propagate constants over the SSA edges present, keeping unreachable code",
     [](client::Program& program) { program.graph().sparseConditionalConstant(false); }},
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

void runPipeline(const std::vector<std::string>& pipeline, client::Program& program) {
  for (const std::string& name : pipeline) findPass(name)->run(program);
}

}  // namespace ssaopt::tool
