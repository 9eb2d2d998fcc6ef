// What has happened to a control-flow graph, as far as its steps rely on it, and what each public
// step needs of that state and leaves behind.
//
// The graph keeps its state itself: the building steps (placeExitNodes, placeLoopAroundMain) and the
// transformations set and clear its facts as they run, and every public step checks on entry that
// the graph is ready for it. A step called where the graph is not ready reports the host's internal
// error with a message that names the step and what is missing, and changes nothing. A client that
// builds a graph in a later form by hand (already in SSA form, already divided) states so with
// KvCControlFlowGraph::setState.
#pragma once

#include <cstdint>
#include <initializer_list>

#include "ssaopt/frame/string.h"

namespace ssaopt {

// One fact about a graph.
enum class GraphFact : std::uint8_t {
  ExitsPlaced,     // every procedure has its exit node (placeExitNodes)
  LoopAroundMain,  // "#main" is closed into a loop (placeLoopAroundMain)
  SSAForm,         // transformToSSAForm has run: versions, phi functions, interface statements
  Divided,         // every block holds one phi function, one statement or its condition alone
  SSAEdges,        // the SSA def-use edges are in the graph
  UseSets,         // the use sets of the assigned variables name exactly the nodes that read them
  Propagated,      // variables hold the values and ranges of constant propagation
};

inline constexpr int kGraphFactCount = 7;

// "exit nodes are placed" / "exit nodes are not placed": what holds when the fact is true or false.
const char* describeFact(GraphFact fact, bool holds);

// A set of facts.
class GraphState {
public:
  constexpr GraphState() = default;
  constexpr GraphState(std::initializer_list<GraphFact> facts) {
    for (GraphFact fact : facts) m_Bits |= bit(fact);
  }

  constexpr bool has(GraphFact fact) const { return (m_Bits & bit(fact)) != 0; }
  constexpr bool empty() const { return m_Bits == 0; }
  constexpr GraphState with(GraphState other) const { return GraphState(m_Bits | other.m_Bits); }
  constexpr GraphState without(GraphState other) const {
    return GraphState(static_cast<std::uint8_t>(m_Bits & ~other.m_Bits));
  }
  constexpr GraphState common(GraphState other) const { return GraphState(m_Bits & other.m_Bits); }
  friend constexpr bool operator==(GraphState a, GraphState b) { return a.m_Bits == b.m_Bits; }
  friend constexpr bool operator!=(GraphState a, GraphState b) { return a.m_Bits != b.m_Bits; }

private:
  constexpr explicit GraphState(unsigned bits) : m_Bits(static_cast<std::uint8_t>(bits)) {}
  static constexpr std::uint8_t bit(GraphFact fact) {
    return static_cast<std::uint8_t>(1u << static_cast<unsigned>(fact));
  }

  std::uint8_t m_Bits = 0;
};

// The public steps of the graph whose entry is checked.
enum class GraphOperation : std::uint8_t {
  MakeProcedureAndCall,
  SetParametersOfCall,
  PlaceExitNodes,
  PlaceLoopAroundMain,
  SplitBlock,  // splitAtStatement and splitAtCondition
  DivideBasicBlock,
  InlineProcedures,
  InsertValidConditionAssignments,
  CompleteCallLists,
  TransformToSSAForm,
  PlacePhiFunction,
  AddSSAEdges,
  SparseConditionalConstant,
  PropagateSparseConditionalConstant,
  ReplaceConstantVariables,
  ReplaceConstantConditions,
  FoldConstants,
  RemoveUnusedVarDefs,
  HoistCodeOutOfIfElseBranches,
};

// One condition a step puts on a fact, with the reason the step has it.
struct FactCondition {
  GraphFact fact;
  bool mustHold;
  const char* reason;
};

// What a step needs and leaves.
struct StepContract {
  GraphOperation operation;
  const char* name;  // the graph's member function
  const FactCondition* conditions;
  int conditionCount;
  GraphState sets;    // facts that hold after the step
  GraphState clears;  // facts that no longer hold after it
};

const StepContract& contractOf(GraphOperation operation);

// The first condition of `operation` that `state` does not meet, or null when the step can run.
const FactCondition* unmetCondition(GraphOperation operation, GraphState state);

// The state after `operation` ran on a graph in `state`.
GraphState stateAfter(GraphOperation operation, GraphState state);

// "divideBasicBlock: SSA edges are present (dividing would leave ...)": why `operation` cannot run in
// `state`; empty when it can.
BxCXString describeRefusal(GraphOperation operation, GraphState state);

}  // namespace ssaopt
