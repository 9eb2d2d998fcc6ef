// The graph object and block surgery: the procedure table, the consistency check, and the operations
// that cut blocks apart while a client builds the graph (splits, findBranchNode) and after SSA
// construction (divideBasicBlock).
//
//   before:  B1 [a = 1; b = a + 1; if (b)]  -T-> B2, -F-> B3
//   splitAtStatement(B1, "b = a + 1"):
//            B1 [a = 1] -> B4 [b = a + 1; if (b)]  -T-> B2, -F-> B3
//   divideBasicBlock():
//            [a = 1] -> [b = a + 1] -> [if (b)]  -T-> B2, -F-> B3
//
// Needs: a payload on every node and edge.
#include <cstddef>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

using ssaopt::edge;
using ssaopt::list;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineSplitAtStatementNoPayload = 114;
constexpr int kLineSplitAtStatementNoBlock = 116;
constexpr int kLineSplitAtConditionNoPayload = 155;
constexpr int kLineSplitAtConditionNoBlock = 157;
constexpr int kLineFindBranchNoBlock = 210;
constexpr int kLineFindBranchNextNoBlock = 217;
constexpr int kLineFindBranchOtherCondition = 223;
constexpr int kLineFindBranchNotDeadEnd = 228;
constexpr int kLineFindBranchNoCall = 237;
// A dead end calling a procedure that is not in the table, or one without a first block.
constexpr int kLineFindBranchNoCallee = 240;
// The walk came back to a block it had passed: a cycle without a condition would never end.
constexpr int kLineFindBranchCycle = 244;
constexpr int kLineEntryHasInEdge = 3760;
constexpr int kLineNodeOfOtherProcedure = 3767;
constexpr int kLineSecondNodeWithoutInEdge = 3772;

// One new block per phi function, per statement and for the condition, in that order, each in the
// procedure of `block`.
list<KvCBasicBlock*> oneItemBlocks(const KvCBasicBlock& block) {
  list<KvCBasicBlock*> links;
  auto newLink = [&]() {
    KvCBasicBlock* pLink = new KvCBasicBlock();
    pLink->setProcedure(block.getProcedure());
    links.push_back(pLink);
    return pLink;
  };
  for (KvCPhiFunction* pPhi : block.getPhiFunctions()) newLink()->append(pPhi);
  for (KvCCfgStatement* pStatement : block.getStatementSeq()) newLink()->append(pStatement);
  if (KvCCfgExpression* pCond = block.getBranchCond()) newLink()->appendBranch(pCond);
  return links;
}

KvCCfgProcedureCall* lastCallOf(const KvCBasicBlock& block) {
  const list<KvCCfgStatement*>& statements = block.getStatementSeq();
  return statements.empty() ? nullptr : statements.back()->isProcedureCall();
}

}  // namespace

// ---- Shared mechanism ----------------------------------------------------------------------------

void KvCControlFlowGraph::reportInternalFault(int line) {
  KV_CONSISTENCY_CHECK(false, "0", kClassName, line);
  ssaopt::reportInternalError(kClassName, line);
}

KvCBasicBlock* KvCControlFlowGraph::requireBasicBlock(node v, int lineNoPayload, int lineNoBlock) const {
  KvCCfgNodeInfo* pInf = inf(v);
  if (!pInf) {
    reportInternalFault(lineNoPayload);
    return nullptr;
  }
  KvCBasicBlock* pBlock = pInf->isBasicBlock();
  if (!pBlock) reportInternalFault(lineNoBlock);
  return pBlock;
}

node KvCControlFlowGraph::firstBlockOf(const KvCCfgProcedure& procedure) const {
  node entry = procedure.getEntryNode();
  if (!entry || outdeg(entry) == 0) return nil;
  return target(first_adj_edge(entry));
}

node KvCControlFlowGraph::newBlockNode(KvCCfgProcedure* pProcedure) {
  KvCBasicBlock* pBlock = new KvCBasicBlock();
  pBlock->setProcedure(pProcedure);
  return new_node(pBlock);
}

edge KvCControlFlowGraph::newPlainEdge(node v, node w) { return new_edge(v, w, new KvCCfgEdgeInfo()); }

void KvCControlFlowGraph::deleteStatement(KvCBasicBlock& block, KvCCfgStatement* pStatement) {
  m_DeletedStatements.insert(pStatement);
  block.del(pStatement);
}

// Nothing is allocated between a deletion and this call, so no address in the set can name a new
// statement yet.
void KvCControlFlowGraph::forgetDeletedStatements() {
  if (m_DeletedStatements.empty()) return;
  for (const auto& entry : m_Procedures) entry.second->forgetStatements(m_DeletedStatements);
  m_DeletedStatements.clear();
}

// ---- The graph object ----------------------------------------------------------------------------

KvCCfgProcedure* KvCControlFlowGraph::findProcedure(const BxCXString& name) const {
  auto found = m_Procedures.find(name);
  return found == m_Procedures.end() ? nullptr : found->second;
}

KvCBasicBlock* KvCControlFlowGraph::getBasicBlock(node v) const {
  KvCCfgNodeInfo* pInf = inf(v);
  return pInf ? pInf->isBasicBlock() : nullptr;
}

// SSA edges link a definition to its uses in other procedures (through parameter and value-return
// statements); they are not control flow, so the components are those of the control-flow edges.
bool KvCControlFlowGraph::checkConsistency() const {
  node_array<int> component;
  int count = COMPONENTS(*this, component, [this](edge e) { return !inf(e) || !inf(e)->isSSAEdge(); });
  if (static_cast<std::size_t>(count) != m_Procedures.size()) return false;
  if (ShowInternalInfo()) reportProcedureComponentFaults(component, count);
  return true;
}

// Nodes are bucketed by component first, so each procedure looks at its own component only and the
// check stays linear however many procedures there are.
void KvCControlFlowGraph::reportProcedureComponentFaults(const node_array<int>& component, int count) const {
  ssaopt::array<ssaopt::array<node>> members(static_cast<std::size_t>(count));
  for (node v : nodes()) members[static_cast<std::size_t>(component[v])].push_back(v);
  for (const auto& named : m_Procedures) {
    const KvCCfgProcedure* pProcedure = named.second;
    node entry = pProcedure->getEntryNode();
    KV_CONSISTENCY_CHECK(indeg(entry) == 0, "indeg(EntryNode) == 0", kClassName, kLineEntryHasInEdge);
    for (node v : members[static_cast<std::size_t>(component[entry])]) {
      const KvCCfgNodeInfo* pInf = inf(v);
      KV_CONSISTENCY_CHECK(pInf && pInf->getProcedure() == pProcedure, "pInf->getProcedure() == pProcedure",
                           kClassName, kLineNodeOfOtherProcedure);
      if (indeg(v) == 0)
        KV_CONSISTENCY_CHECK(v == entry, "v == EntryNode", kClassName, kLineSecondNodeWithoutInEdge);
    }
  }
}

// ---- Block surgery -------------------------------------------------------------------------------

node KvCControlFlowGraph::splitAtStatement(node v, KvCCfgStatement* pStatement) {
  if (!beginStep(ssaopt::GraphOperation::SplitBlock)) return v;
  KvCBasicBlock* pBlock = requireBasicBlock(v, kLineSplitAtStatementNoPayload, kLineSplitAtStatementNoBlock);
  if (!pBlock) return v;
  return continueInNewNode(v, pBlock, pBlock->splitAtStatement(pStatement));
}

node KvCControlFlowGraph::splitAtCondition(node v) {
  if (!beginStep(ssaopt::GraphOperation::SplitBlock)) return v;
  KvCBasicBlock* pBlock = requireBasicBlock(v, kLineSplitAtConditionNoPayload, kLineSplitAtConditionNoBlock);
  if (!pBlock) return v;
  return continueInNewNode(v, pBlock, pBlock->splitAtCondition());
}

// `pTail` is what the block split off (the block itself when it did not split). Its node takes over
// the out-edges in their order, so true and false branches keep their payloads and places; `v`
// keeps its in-edges and continues into it.
node KvCControlFlowGraph::continueInNewNode(node v, KvCBasicBlock* pBlock, KvCBasicBlock* pTail) {
  endStep(ssaopt::GraphOperation::SplitBlock);
  if (pTail == pBlock) return v;
  node w = new_node(pTail);
  while (edge e = first_adj_edge(v)) move_edge(e, w, target(e));
  newPlainEdge(v, w);
  return w;
}

void KvCControlFlowGraph::divideBasicBlock() {
  if (!beginStep(ssaopt::GraphOperation::DivideBasicBlock)) return;
  for (node v : all_nodes())
    if (const KvCBasicBlock* pBlock = getBasicBlock(v)) replaceByChain(v, *pBlock);
  endStep(ssaopt::GraphOperation::DivideBasicBlock);
}

// The chain's first node takes the in-edges in their order, so that phi operands still match them;
// the last takes the out-edges. The old block object is left alone: its items live on in the chain.
// The links are recorded, so that dead-code elimination can tell a chain from the next block.
void KvCControlFlowGraph::replaceByChain(node v, const KvCBasicBlock& block) {
  list<KvCBasicBlock*> links = oneItemBlocks(block);
  if (links.empty()) return;
  node first = nil;
  node last = nil;
  for (KvCBasicBlock* pLink : links) {
    node w = new_node(pLink);
    if (last)
      m_DividedBlockLinks[newPlainEdge(last, w)] = true;
    else
      first = w;
    last = w;
  }
  while (edge e = first_in_edge(v)) move_edge(e, source(e), first);
  while (edge e = first_adj_edge(v)) move_edge(e, last, target(e));
  del_node(v);
}

// Every node is passed at most once: a cycle of blocks without a condition (or of procedures calling
// one another at their ends) would otherwise keep the walk going for ever. After a report the walk
// gives back where it started, the answer that misleads the caller least.
node KvCControlFlowGraph::findBranchNode(node start, KvCCfgExpression* pCond) const {
  ssaopt::set<node> passed;
  node v = start;
  int lineNoBlock = kLineFindBranchNoBlock;
  for (;;) {
    const KvCBasicBlock* pBlock = requireBasicBlock(v, lineNoBlock, lineNoBlock);
    if (!pBlock) return start;
    if (!passed.insert(v).second) {
      reportInternalFault(kLineFindBranchCycle);
      return start;
    }
    if (KvCCfgExpression* pFound = pBlock->getBranchCond()) {
      if (pFound != pCond) reportInternalFault(kLineFindBranchOtherCondition);
      return v;
    }
    if (outdeg(v) == 1) {
      v = target(first_adj_edge(v));
      lineNoBlock = kLineFindBranchNextNoBlock;
      continue;
    }
    v = firstBlockOfCallee(v, *pBlock);
    if (!v) return start;
    lineNoBlock = kLineFindBranchNoBlock;
  }
}

// A block split off by makeProcedureAndCall ends in the call of the rest and has no successor: the
// walk goes on at the first block of the called procedure.
node KvCControlFlowGraph::firstBlockOfCallee(node deadEnd, const KvCBasicBlock& block) const {
  if (outdeg(deadEnd) != 0) {
    reportInternalFault(kLineFindBranchNotDeadEnd);
    return nil;
  }
  const KvCCfgProcedureCall* pCall = lastCallOf(block);
  if (!pCall) {
    reportInternalFault(kLineFindBranchNoCall);
    return nil;
  }
  const KvCCfgProcedure* pCallee = findProcedure(pCall->getName());
  node first = pCallee ? firstBlockOf(*pCallee) : nil;
  if (!first) reportInternalFault(kLineFindBranchNoCallee);
  return first;
}
