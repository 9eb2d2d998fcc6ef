// What each public step of the graph needs of the graph's state and leaves behind. The graph checks
// these on entry to every step; the pipeline walks them to tell, before anything runs, whether an
// order of steps can run.
#include "ssaopt/cfg/graph_state.h"

#include <iterator>

namespace ssaopt {

namespace {

using Fact = GraphFact;
using Op = GraphOperation;

// ---- Why each step puts its conditions -----------------------------------------------------------

constexpr FactCondition kMakeProcedureAndCall[] = {
    {Fact::ExitsPlaced, false, "its region would take the exit node of the procedure it leaves"},
};
constexpr FactCondition kSetParametersOfCall[] = {
    {Fact::SSAForm, false, "parameter statements are placed by the SSA transformation"},
};
constexpr FactCondition kPlaceExitNodes[] = {
    {Fact::ExitsPlaced, false, "a second exit node would be a component without procedure"},
};
constexpr FactCondition kPlaceLoopAroundMain[] = {
    {Fact::ExitsPlaced, true, "the loop leads to the exit node of \"#main\""},
    {Fact::LoopAroundMain, false, "\"#main\" is closed into a loop once"},
    {Fact::SSAForm, false, "the loop would need phi functions that the SSA transformation placed before it"},
};
constexpr FactCondition kSplitBlock[] = {
    {Fact::SSAEdges, false, "the SSA edges of the block's definitions would move to the new block"},
};
constexpr FactCondition kDivideBasicBlock[] = {
    {Fact::SSAEdges, false, "dividing would leave every SSA edge of a block on the last block of its chain"},
};
constexpr FactCondition kInlineProcedures[] = {
    {Fact::ExitsPlaced, true, "the inlined body continues where the callee's exit node was entered"},
    {Fact::SSAForm, false, "an inlined body's versions and interface statements would be left in the caller"},
};
constexpr FactCondition kInsertValidConditionAssignments[] = {
    {Fact::SSAForm, false, "a virtual assignment after renaming would define a version a second time"},
};
constexpr FactCondition kCompleteCallLists[] = {
    {Fact::SSAForm, false, "the SSA transformation has read the call lists"},
};
constexpr FactCondition kTransformToSSAForm[] = {
    {Fact::ExitsPlaced, true,
     "output statements go before the exit of \"#main\", value returns read what callees leave at theirs"},
    {Fact::SSAForm, false, "a second run would give the versions versions of their own"},
};
constexpr FactCondition kPlacePhiFunction[] = {
    {Fact::SSAForm, false, "the phi functions are placed already"},
};
constexpr FactCondition kAddSSAEdges[] = {
    {Fact::SSAForm, true, "an SSA edge joins the one definition of a version to its uses"},
};
constexpr FactCondition kSparseConditionalConstant[] = {
    {Fact::SSAForm, true, "values are propagated between versions"},
    {Fact::Divided, true, "a visit takes one phi function, one statement or one condition per block"},
    {Fact::SSAEdges, true, "values travel along the SSA edges"},
};
constexpr FactCondition kRemoveUnusedVarDefs[] = {
    {Fact::SSAForm, true, "before it, what the arguments of calls read is read by no block"},
};
constexpr FactCondition kPropagateSparseConditionalConstant[] = {
    {Fact::SSAForm, true, "values are propagated between versions"},
    {Fact::Divided, true, "a visit takes one phi function, one statement or one condition per block"},
};

// ---- The contracts -------------------------------------------------------------------------------

template <std::size_t N>
constexpr StepContract contract(Op operation, const char* name, const FactCondition (&conditions)[N],
                                GraphState sets, GraphState clears) {
  return {operation, name, conditions, static_cast<int>(N), sets, clears};
}

constexpr StepContract unconditional(Op operation, const char* name, GraphState sets, GraphState clears) {
  return {operation, name, nullptr, 0, sets, clears};
}

// In the order of GraphOperation. A step that changes what statements read, or moves statements to
// other nodes, leaves the use sets behind; so does one that adds blocks holding several items, the
// divided shape.
const StepContract kContracts[] = {
    contract(Op::MakeProcedureAndCall, "makeProcedureAndCall", kMakeProcedureAndCall, {},
             {Fact::Divided, Fact::UseSets}),
    contract(Op::SetParametersOfCall, "setParametersOfCall", kSetParametersOfCall, {}, {}),
    contract(Op::PlaceExitNodes, "placeExitNodes", kPlaceExitNodes, {Fact::ExitsPlaced}, {}),
    contract(Op::PlaceLoopAroundMain, "placeLoopAroundMain", kPlaceLoopAroundMain, {Fact::LoopAroundMain},
             {}),
    contract(Op::SplitBlock, "splitAtStatement and splitAtCondition", kSplitBlock, {}, {Fact::UseSets}),
    contract(Op::DivideBasicBlock, "divideBasicBlock", kDivideBasicBlock, {Fact::Divided}, {Fact::UseSets}),
    contract(Op::InlineProcedures, "inlineProcedures", kInlineProcedures, {}, {Fact::Divided, Fact::UseSets}),
    contract(Op::InsertValidConditionAssignments, "insertValidConditionAssignments",
             kInsertValidConditionAssignments, {}, {Fact::UseSets}),
    contract(Op::CompleteCallLists, "completeCallLists", kCompleteCallLists, {}, {}),
    contract(Op::TransformToSSAForm, "transformToSSAForm", kTransformToSSAForm, {Fact::SSAForm},
             {Fact::Divided, Fact::UseSets}),
    contract(Op::PlacePhiFunction, "placePhiFunction", kPlacePhiFunction, {}, {Fact::Divided, Fact::UseSets}),
    contract(Op::AddSSAEdges, "addSSAEdges", kAddSSAEdges, {Fact::SSAEdges, Fact::UseSets}, {}),
    contract(Op::SparseConditionalConstant, "sparseConditionalConstant", kSparseConditionalConstant,
             {Fact::Propagated}, {}),
    contract(Op::PropagateSparseConditionalConstant, "propagateSparseConditionalConstant",
             kPropagateSparseConditionalConstant, {Fact::SSAEdges, Fact::UseSets, Fact::Propagated}, {}),
    unconditional(Op::ReplaceConstantVariables, "replaceConstantVariables", {}, {Fact::UseSets}),
    unconditional(Op::ReplaceConstantConditions, "replaceConstantConditions", {}, {Fact::UseSets}),
    unconditional(Op::FoldConstants, "foldConstants", {}, {Fact::UseSets}),
    contract(Op::RemoveUnusedVarDefs, "removeUnusedVarDefs", kRemoveUnusedVarDefs, {Fact::UseSets}, {}),
    unconditional(Op::HoistCodeOutOfIfElseBranches, "hoistCodeOutOfIfElseBranches", {},
                  {Fact::SSAEdges, Fact::UseSets}),
};

static_assert(std::size(kContracts) == static_cast<std::size_t>(Op::HoistCodeOutOfIfElseBranches) + 1,
              "one contract per operation, in the order of GraphOperation");

const char* const kFactTexts[kGraphFactCount][2] = {
    {"exit nodes are not placed", "exit nodes are placed"},
    {"\"#main\" is not closed into a loop", "\"#main\" is closed into a loop"},
    {"the graph is not in SSA form", "the graph is in SSA form"},
    {"blocks are not divided", "blocks are divided"},
    {"there are no SSA edges", "SSA edges are present"},
    {"use sets are not up to date", "use sets are up to date"},
    {"nothing is propagated", "propagation results are present"},
};

}  // namespace

const char* describeFact(GraphFact fact, bool holds) {
  return kFactTexts[static_cast<int>(fact)][holds ? 1 : 0];
}

const StepContract& contractOf(GraphOperation operation) { return kContracts[static_cast<int>(operation)]; }

const FactCondition* unmetCondition(GraphOperation operation, GraphState state) {
  const StepContract& contract = contractOf(operation);
  for (int i = 0; i < contract.conditionCount; ++i) {
    const FactCondition& condition = contract.conditions[i];
    if (state.has(condition.fact) != condition.mustHold) return &condition;
  }
  return nullptr;
}

GraphState stateAfter(GraphOperation operation, GraphState state) {
  const StepContract& contract = contractOf(operation);
  return state.without(contract.clears).with(contract.sets);
}

BxCXString describeRefusal(GraphOperation operation, GraphState state) {
  const FactCondition* pUnmet = unmetCondition(operation, state);
  if (!pUnmet) return BxCXString();
  return BxCXString(contractOf(operation).name) + ": " + describeFact(pUnmet->fact, !pUnmet->mustHold) +
         " (" + pUnmet->reason + ")";
}

}  // namespace ssaopt
