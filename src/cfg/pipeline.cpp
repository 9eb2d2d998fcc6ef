// The named steps of a pipeline and the typical run. Whether an order of steps can run is decided by
// walking the steps' contracts (graph_state.cpp) from the state the graph starts in, before anything
// runs; while the steps run, the graph checks each on entry again.
#include "ssaopt/cfg/pipeline.h"

#include <cstring>
#include <iterator>

#include "ssaopt/frame/report.h"

namespace ssaopt {

namespace {

using Op = GraphOperation;

// Source line of the report of a pipeline that stopped at a step the graph was not ready for.
constexpr int kLinePipelineStopped = 4001;
constexpr const char* kReportingClass = "ssaopt::runPipeline";

const PipelineStep kSteps[] = {
    {"inline", "put the body of each procedure called from one place in place of its call",
     Op::InlineProcedures, [](KvCControlFlowGraph& G) { G.inlineProcedures(); }},
    {"valid-conditions", "record on each branch what its condition implies (virtual assignments)",
     Op::InsertValidConditionAssignments,
     [](KvCControlFlowGraph& G) { G.insertValidConditionAssignments(); }},
    {"ssa", "transform to SSA form (registering every call not yet registered first)", Op::TransformToSSAForm,
     [](KvCControlFlowGraph& G) {
       G.completeCallLists();
       G.transformToSSAForm();
     }},
    {"divide", "give every block one phi function, one statement or its condition alone",
     Op::DivideBasicBlock, [](KvCControlFlowGraph& G) { G.divideBasicBlock(); }},
    {"sccp", "sparse conditional constant propagation, removing unreachable code",
     Op::PropagateSparseConditionalConstant,
     [](KvCControlFlowGraph& G) { G.propagateSparseConditionalConstant(true); }},
    {"sccp-keep-dead", "sparse conditional constant propagation, keeping unreachable code",
     Op::PropagateSparseConditionalConstant,
     [](KvCControlFlowGraph& G) { G.propagateSparseConditionalConstant(false); }},
    {"ssa-edges", "add the SSA def-use edges", Op::AddSSAEdges,
     [](KvCControlFlowGraph& G) { G.addSSAEdges(); }},
    {"propagate", "propagate constants over the SSA edges present, removing unreachable code",
     Op::SparseConditionalConstant, [](KvCControlFlowGraph& G) { G.sparseConditionalConstant(true); }},
    {"propagate-keep-dead", "propagate constants over the SSA edges present, keeping unreachable code",
     Op::SparseConditionalConstant, [](KvCControlFlowGraph& G) { G.sparseConditionalConstant(false); }},
    {"replace-constants", "put constants in place of reads of constant variables",
     Op::ReplaceConstantVariables, [](KvCControlFlowGraph& G) { G.replaceConstantVariables(); }},
    {"replace-conditions", "put constants in place of constant branch conditions",
     Op::ReplaceConstantConditions, [](KvCControlFlowGraph& G) { G.replaceConstantConditions(); }},
    {"fold", "fold constant sub-expressions", Op::FoldConstants,
     [](KvCControlFlowGraph& G) { G.foldConstants(); }},
    {"remove-unused", "remove definitions of erasable variables that nothing uses", Op::RemoveUnusedVarDefs,
     [](KvCControlFlowGraph& G) { G.removeUnusedVarDefs(); }},
    {"hoist", "move statements that both branches of an if/else begin with before the branch",
     Op::HoistCodeOutOfIfElseBranches, [](KvCControlFlowGraph& G) { G.hoistCodeOutOfIfElseBranches(); }},
};

const char* const kTypicalRun[] = {
    "inline", "valid-conditions", "ssa",  "divide", "sccp", "replace-constants", "replace-conditions",
    "fold",   "remove-unused",    "hoist"};

// Short names of the facts, for texts that list several, and how a step is refused on one: "not in SSA
// form", "not with SSA edges".
const char* const kFactNames[kGraphFactCount][2] = {
    {"exit nodes", "with"},
    {"the loop around \"#main\"", "with"},
    {"SSA form", "in"},
    {"divided blocks", "with"},
    {"SSA edges", "with"},
    {"up-to-date use sets", "with"},
    {"propagation results", "with"},
};

const char* factName(GraphFact fact) { return kFactNames[static_cast<int>(fact)][0]; }
const char* refusedPreposition(GraphFact fact) { return kFactNames[static_cast<int>(fact)][1]; }

BxCXString quoted(const char* name) { return BxCXString("'") + name + "'"; }

// "'divide'" or "one of 'sccp', 'sccp-keep-dead', 'ssa-edges'": the steps that make `fact` hold.
BxCXString stepsThatSet(GraphFact fact) {
  BxCXString names;
  int count = 0;
  for (const PipelineStep& step : pipelineSteps()) {
    if (!contractOf(step.operation).sets.has(fact)) continue;
    names = names + (count++ ? ", " : "") + quoted(step.name);
  }
  return count > 1 ? BxCXString("one of ") + names : names;
}

// The step that last changed each fact while a pipeline is walked; null where none did.
struct FactHistory {
  const PipelineStep* changedBy[kGraphFactCount] = {};

  void record(const PipelineStep& step, GraphState before, GraphState after) {
    for (int i = 0; i < kGraphFactCount; ++i) {
      GraphFact fact = static_cast<GraphFact>(i);
      if (before.has(fact) != after.has(fact)) changedBy[i] = &step;
    }
  }
  const PipelineStep* lastChange(GraphFact fact) const { return changedBy[static_cast<int>(fact)]; }
};

BxCXString explainUnmet(const PipelineStep& step, const FactCondition& unmet, const FactHistory& history) {
  BxCXString what = BxCXString(describeFact(unmet.fact, !unmet.mustHold)) + " (" + unmet.reason + ")";
  const PipelineStep* pChanger = history.lastChange(unmet.fact);
  BxCXString pass = BxCXString("pass ") + quoted(step.name);
  if (unmet.mustHold && stepsThatSet(unmet.fact).empty()) return pass + " cannot run on this graph: " + what;
  if (unmet.mustHold && !pChanger)
    return pass + " needs " + stepsThatSet(unmet.fact) + " earlier in the pipeline: " + what;
  if (unmet.mustHold)
    return pass + " needs " + stepsThatSet(unmet.fact) + " again after " + quoted(pChanger->name) + ": " +
           what;
  if (pChanger) return pass + " cannot run after " + quoted(pChanger->name) + ": " + what;
  return pass + " cannot run on this graph: " + what;
}

void reportStop(const PipelineStep& step, const BxCXString& why) {
  BxCXString text = BxCXString("pipeline stopped before ") + quoted(step.name) + ": " + why;
  reportInternalError(kReportingClass, kLinePipelineStopped, text.cstring());
}

}  // namespace

PipelineSteps pipelineSteps() { return {std::begin(kSteps), std::end(kSteps)}; }

const PipelineStep* findPipelineStep(const char* name) {
  for (const PipelineStep& step : kSteps)
    if (std::strcmp(step.name, name) == 0) return &step;
  return nullptr;
}

Pipeline typicalRun() {
  Pipeline pipeline;
  for (const char* name : kTypicalRun) pipeline.push_back(findPipelineStep(name));
  return pipeline;
}

bool canRun(const PipelineStep& step, GraphState state) { return !unmetCondition(step.operation, state); }

BxCXString findPipelineProblem(const Pipeline& pipeline, GraphState start) {
  GraphState state = start;
  FactHistory history;
  for (const PipelineStep* pStep : pipeline) {
    if (const FactCondition* pUnmet = unmetCondition(pStep->operation, state))
      return explainUnmet(*pStep, *pUnmet, history);
    GraphState after = stateAfter(pStep->operation, state);
    history.record(*pStep, state, after);
    state = after;
  }
  return BxCXString();
}

BxCXString describeWhereStepRuns(const PipelineStep& step) {
  BxCXString needs;
  BxCXString refuses;
  const StepContract& contract = contractOf(step.operation);
  for (int i = 0; i < contract.conditionCount; ++i) {
    const FactCondition& condition = contract.conditions[i];
    if (condition.mustHold)
      needs = needs + (needs.empty() ? "needs " : ", ") + factName(condition.fact);
    else
      refuses = refuses + (refuses.empty() ? "" : ", ") + "not " + refusedPreposition(condition.fact) + " " +
                factName(condition.fact);
  }
  return needs + (needs.empty() || refuses.empty() ? "" : "; ") + refuses;
}

bool runPipeline(KvCControlFlowGraph& graph, const Pipeline& pipeline, PipelineClient& client) {
  for (const PipelineStep* pStep : pipeline) {
    BxCXString refusal = describeRefusal(pStep->operation, graph.getState());
    if (!refusal.empty()) {
      reportStop(*pStep, refusal);
      return false;
    }
    client.runStep(*pStep, graph);
  }
  return true;
}

bool runPipeline(KvCControlFlowGraph& graph, const Pipeline& pipeline) {
  PipelineClient libraryAlone;
  return runPipeline(graph, pipeline, libraryAlone);
}

bool runTypicalRun(KvCControlFlowGraph& graph, PipelineClient& client) {
  return runPipeline(graph, typicalRun(), client);
}

bool runTypicalRun(KvCControlFlowGraph& graph) { return runPipeline(graph, typicalRun()); }

}  // namespace ssaopt
