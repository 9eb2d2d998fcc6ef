// Pipelines: the graph's public steps by name, what each needs and leaves (the contract of its
// operation, graph_state.h), and the typical run of a front end as one call.
//
//   ssaopt::runTypicalRun(graph);   // inline, valid-conditions, ssa, divide, sccp, replace-constants,
//                                   // replace-conditions, fold, remove-unused, hoist
//
// A front end that has to take part in a step (keep its own records of blocks while a step replaces
// them, apply hoisting moves that its statements agreed to) derives from PipelineClient and does its
// part around the library's step. The individual steps stay public members of the graph.
#pragma once

#include <cstddef>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/cfg/graph_state.h"
#include "ssaopt/frame/containers.h"

namespace ssaopt {

// A named step: one public operation of the graph, with that operation's contract.
struct PipelineStep {
  const char* name;     // "sccp"
  const char* summary;  // what it does, in one line
  GraphOperation operation;
  void (*run)(KvCControlFlowGraph& graph);
};

struct PipelineSteps {
  const PipelineStep* first;
  const PipelineStep* last;
  const PipelineStep* begin() const { return first; }
  const PipelineStep* end() const { return last; }
};

using Pipeline = array<const PipelineStep*>;

// Every named step, in the order of the typical run where it takes part: inline, valid-conditions,
// ssa (completeCallLists, then transformToSSAForm), divide, sccp, sccp-keep-dead, ssa-edges, propagate,
// propagate-keep-dead, replace-constants, replace-conditions, fold, remove-unused, hoist.
PipelineSteps pipelineSteps();

// Null for a name that no step has.
const PipelineStep* findPipelineStep(const char* name);

// The typical run of a front end.
Pipeline typicalRun();

// What a graph that a front end has built completely is in: exit nodes placed, "#main" closed into a
// loop.
inline constexpr GraphState kBuiltGraph{GraphFact::ExitsPlaced, GraphFact::LoopAroundMain};

// Whether `step` can run on a graph in `state`.
bool canRun(const PipelineStep& step, GraphState state);

// Why the first step of `pipeline` that cannot run on a graph starting in `start` cannot, naming the
// step and the earlier step that took away (or never gave) what it needs: "pass 'divide' cannot run
// after 'ssa-edges': SSA edges are present (...)". Empty when every step can run.
BxCXString findPipelineProblem(const Pipeline& pipeline, GraphState start);

// "needs exit nodes; not in SSA form": where `step` can run; empty for a step that runs anywhere.
BxCXString describeWhereStepRuns(const PipelineStep& step);

// Takes part in the steps of a pipeline. A client overrides runStep, does its own part before and
// after, and calls PipelineClient::runStep in between for the library's.
class PipelineClient {
public:
  virtual ~PipelineClient() = default;
  virtual void runStep(const PipelineStep& step, KvCControlFlowGraph& graph) { step.run(graph); }
};

// Runs the steps in order, each through `client`. A step whose contract the graph's state does not
// meet is reported as an internal error that names it and what is missing, and the pipeline stops
// there with the graph as the steps before left it; the result is then false. (What a step needs
// beyond its contract, such as every call registered before the SSA transformation, the step itself
// checks and reports.)
bool runPipeline(KvCControlFlowGraph& graph, const Pipeline& pipeline, PipelineClient& client);
bool runPipeline(KvCControlFlowGraph& graph, const Pipeline& pipeline);

// The typical run on a graph that its front end has built completely.
bool runTypicalRun(KvCControlFlowGraph& graph, PipelineClient& client);
bool runTypicalRun(KvCControlFlowGraph& graph);

}  // namespace ssaopt
