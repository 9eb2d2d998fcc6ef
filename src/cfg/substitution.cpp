// Turning the results of constant propagation into code: constants in place of constant variables,
// constant branch conditions, folded expressions, and no definition that nothing reads.
//
//   before:  c.1 = 1; y.1 = c.1 + 2; z.1 = y.1 * x.0; if (c.1 > 0) ...     (c.1 = 1, y.1 = 3)
//   replaceConstantVariables, foldConstants:
//            c.1 = 1; y.1 = 3; z.1 = 3 * x.0; if (1) ...
//   removeUnusedVarDefs (c.1 and y.1 erasable):
//            z.1 = 3 * x.0; if (1) ...
//
// Replacing needs the values of sparse conditional constant propagation to find anything. The removal
// needs SSA form (before it, what call arguments read is read by no block) and takes definitions only
// from blocks that hold them alone, as dividing leaves every block.
// What replacing and folding mean is the expressions' business; this file only decides which
// expressions are asked, and in which order.
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::node;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineRemoveUnusedNoPayload = 3306;
constexpr int kLineRemoveUnusedDefinesSeveral = 3323;

// Calls `onAssignment` for every assignment of every block, in node and statement order, and then
// `onCondition` for the block's condition. Neither may add or remove nodes or statements, so the
// live lists serve.
template <class OnAssignment, class OnCondition>
void forEachAssignmentAndCondition(const KvCControlFlowGraph& graph, OnAssignment onAssignment,
                                   OnCondition onCondition) {
  for (node v : graph.nodes()) {
    KvCBasicBlock* pBlock = graph.getBasicBlock(v);
    if (!pBlock) continue;
    for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
      if (KvCCfgAssignment* pAssignment = pStatement->isAssignment()) onAssignment(*pAssignment);
    if (KvCCfgExpression* pCond = pBlock->getBranchCond()) onCondition(*pCond);
  }
}

// The phi function or the statement that a divided block holds alone; null for any other block.
KvCCfgStatement* onlyDefinitionOf(const KvCBasicBlock& block) {
  if (KvCPhiFunction* pPhi = block.isPhiFunction()) return pPhi;
  return block.isStatement();
}

// A definition may go when nothing reads its variable, not even through the variable's virtual
// aliases, and the statement does nothing else: array elements live on in the other elements, and
// variables that are not erasable are the client's to keep.
bool isUnusedDefinition(KvCCfgStatement& statement, const KvCCfgVariable& variable) {
  return variable.isErasable() && !variable.isArray() && variable.countAllUses() == 0 &&
         !statement.hasSideEffects();
}

}  // namespace

// Phi functions and the interface statements hold no expression a constant could go into.
void KvCControlFlowGraph::replaceConstantVariables() {
  if (!beginStep(ssaopt::GraphOperation::ReplaceConstantVariables)) return;
  forEachAssignmentAndCondition(
      *this, [](KvCCfgAssignment& assignment) { assignment.getRHS()->replaceConstantVariables(); },
      [](KvCCfgExpression& cond) { cond.replaceConstantVariables(); });
  endStep(ssaopt::GraphOperation::ReplaceConstantVariables);
}

void KvCControlFlowGraph::replaceConstantConditions() {
  if (!beginStep(ssaopt::GraphOperation::ReplaceConstantConditions)) return;
  forEachAssignmentAndCondition(
      *this, [](KvCCfgAssignment&) {}, [](KvCCfgExpression& cond) { cond.replaceConstantCondition(); });
  endStep(ssaopt::GraphOperation::ReplaceConstantConditions);
}

void KvCControlFlowGraph::foldConstants() {
  if (!beginStep(ssaopt::GraphOperation::FoldConstants)) return;
  forEachAssignmentAndCondition(
      *this, [](KvCCfgAssignment& assignment) { assignment.foldConstants(); },
      [](KvCCfgExpression& cond) { cond.foldConstants(); });
  endStep(ssaopt::GraphOperation::FoldConstants);
}

// The use sets are rebuilt once and then kept by hand. A definition that loses the last use of a
// variable it reads lets that variable's definition go too: in the same pass when that comes later
// in node order, else in the next one.
void KvCControlFlowGraph::removeUnusedVarDefs() {
  if (!beginStep(ssaopt::GraphOperation::RemoveUnusedVarDefs)) return;
  buildVarUses();
  bool again = true;
  while (again) {
    again = false;
    for (node v : nodes()) removeDefinitionIfUnused(v, again);
  }
  forgetDeletedStatements();
  endStep(ssaopt::GraphOperation::RemoveUnusedVarDefs);
}

// The block stays, emptied of its statement.
void KvCControlFlowGraph::removeDefinitionIfUnused(node v, bool& again) {
  KvCCfgNodeInfo* pInf = inf(v);
  if (!pInf) {
    reportInternalFault(kLineRemoveUnusedNoPayload);
    return;
  }
  KvCBasicBlock* pBlock = pInf->isBasicBlock();
  KvCCfgStatement* pStatement = pBlock ? onlyDefinitionOf(*pBlock) : nullptr;
  if (!pStatement) return;
  ssaopt::set<KvCCfgVariable*> defined = pStatement->getDefinedVariables();
  KV_CONSISTENCY_CHECK(defined.size() <= 1, "DefinedVariables.size() <= 1", kClassName,
                       kLineRemoveUnusedDefinesSeveral);
  if (defined.size() != 1 || !isUnusedDefinition(*pStatement, **defined.begin())) return;
  for (KvCCfgVariable* pUsed : pStatement->getUsedVariables())
    if (pUsed->delUse(v) == 0) again = true;
  deleteStatement(*pBlock, pStatement);
}
