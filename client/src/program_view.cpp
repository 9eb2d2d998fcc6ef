#include "program_view.h"

#include <algorithm>
#include <map>
#include <set>
#include <tuple>

#include "ssaopt/client/statements.h"
#include "ssaopt/ir/procedure.h"

namespace ssaopt::client::detail {

using ssaopt::edge;
using ssaopt::node;

namespace {

const std::string kNoLabel;

bool isEmptyBlock(const KvCBasicBlock& block) {
  return block.getPhiFunctions().empty() && block.getStatementSeq().empty() && !block.getBranchCond();
}

// Every variable a statement names, whatever its kind.
void collectVariables(KvCCfgStatement& statement, std::vector<KvCCfgVariable*>& into) {
  for (KvCCfgVariable* pVariable : statement.getDefinedVariables()) into.push_back(pVariable);
  for (KvCCfgVariable* pVariable : statement.getUsedVariables()) into.push_back(pVariable);
  if (KvCCfgSFProcedureCall* pCall = statement.isSFProcedureCall())
    for (KvCCfgSFExpression* pArgument : pCall->getArguments())
      for (KvCCfgVariable* pVariable : pArgument->getUsedVariables()) into.push_back(pVariable);
}

void collectVariables(const KvCBasicBlock& block, std::vector<KvCCfgVariable*>& into) {
  for (KvCPhiFunction* pPhi : block.getPhiFunctions()) {
    into.push_back(pPhi->getVariable());
    for (KvCCfgVariable* pOperand : pPhi->getReplacementVariables())
      if (pOperand) into.push_back(pOperand);
  }
  for (KvCCfgStatement* pStatement : block.getStatementSeq()) collectVariables(*pStatement, into);
  if (block.getBranchCond())
    for (KvCCfgVariable* pVariable : block.getBranchCond()->getUsedVariables()) into.push_back(pVariable);
}

}  // namespace

ProgramView::ProgramView(const Program& program)
    : m_Program(program),
      m_Graph(program.graph()),
      m_Hidden(program.graph(), false),
      m_NamedByPhis(program.graph(), false) {
  findHiddenBlocks();
  findNamedBlocksAndCalls();
  layOutProcedures();
  for (const ProcedureView& procedure : m_Procedures) {
    assignLabels(procedure);
    recordCallSites(procedure);
  }
  numberVersions();
}

// ---- Blocks left out --------------------------------------------------------------------------------

// Backwards from the ends, so that a chain of empty blocks before the end is left out as a whole:
// read back, each of them would again end the procedure.
void ProgramView::findHiddenBlocks() {
  std::vector<node> work;
  for (node v : m_Graph.nodes()) {
    if (isUntouchedMainLoop(v)) m_Hidden[v] = true;
    if (isEnd(v)) work.push_back(v);
  }
  while (!work.empty()) {
    node end = work.back();
    work.pop_back();
    for (edge e : m_Graph.getControlFlowInEdges(end)) {
      node v = m_Graph.source(e);
      if (!m_Hidden[v] && onlyLeadsToTheEnd(v)) {
        m_Hidden[v] = true;
        work.push_back(v);
      }
    }
  }
}

// As placeLoopAroundMain leaves it: only the loop condition, back to the first block of "#main" or
// out to its exit.
bool ProgramView::isUntouchedMainLoop(node v) const {
  KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
  if (!pBlock || !m_Program.mainLoopCondition() || pBlock->getBranchCond() != m_Program.mainLoopCondition() ||
      !pBlock->getPhiFunctions().empty() || !pBlock->getStatementSeq().empty())
    return false;
  node mainEntry = pBlock->getProcedure()->getEntryNode();
  if (m_Graph.outdeg(mainEntry) == 0) return false;
  node firstOfMain = m_Graph.target(m_Graph.first_adj_edge(mainEntry));
  for (edge e : m_Graph.getControlFlowOutEdges(v)) {
    KvCCfgEdgeInfo* pInfo = m_Graph.inf(e);
    node target = m_Graph.target(e);
    if (pInfo->isTrueBranch() && target != firstOfMain) return false;
    if (pInfo->isFalseBranch() && !m_Graph.inf(target)->isExitNode()) return false;
  }
  return true;
}

bool ProgramView::onlyLeadsToTheEnd(node v) const {
  KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
  if (!pBlock || !isEmptyBlock(*pBlock)) return false;
  ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(v);
  return out.size() == 1 && isEnd(m_Graph.target(out[0]));
}

bool ProgramView::isEnd(node v) const { return m_Hidden[v] || m_Graph.inf(v)->isExitNode(); }

bool ProgramView::isShownBlock(node v) const { return m_Graph.getBasicBlock(v) && !m_Hidden[v]; }

// ---- Layout -----------------------------------------------------------------------------------------

// Read back, a printed program has its nodes in the printed order, so the same order gives the same
// text.
void ProgramView::layOutProcedures() {
  for (const ssaopt::ProcedureBlocks& laidOut :
       m_Graph.getProgramOrder([this](node v) { return !m_Hidden[v]; }))
    m_Procedures.push_back(ProcedureView{laidOut.pProcedure,
                                         laidOut.pProcedure->getName().cstring(),
                                         {laidOut.blocks.begin(), laidOut.blocks.end()}});
}

// The block that `v` falls into and that nothing else enters, or nil: where the program order puts
// the next block of a chain.
node ProgramView::continuationOf(node v) const {
  ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(v);
  if (out.size() != 1 || m_Graph.getBasicBlock(v)->getBranchCond()) return ssaopt::nil;
  node next = m_Graph.target(out[0]);
  return isShownBlock(next) && m_Graph.hasOneControlFlowInEdge(next) ? next : ssaopt::nil;
}

// ---- Labels -----------------------------------------------------------------------------------------

// A block is labelled where control reaches it other than by falling in from the block printed before
// it, and where something names it: phi operands, or a parameter statement naming the call it holds. Every
// other block continues the one before it; read back, a block without label joins the block before it, and
// the front end splits it off again where it holds a call.
bool ProgramView::needsLabel(node v, node previous) const {
  ssaopt::array<edge> in = m_Graph.getControlFlowInEdges(v);
  bool continues = in.size() == 1 && m_Graph.source(in[0]) == previous && continuationOf(previous) == v;
  if (previous != ssaopt::nil && !continues) return true;
  if (previous == ssaopt::nil)
    for (edge e : in)
      if (isShownBlock(m_Graph.source(e))) return true;
  if (m_NamedByPhis[v]) return true;
  for (KvCCfgStatement* pStatement : m_Graph.getBasicBlock(v)->getStatementSeq())
    if (pStatement->isProcedureCall() && m_CallsWithParameters.count(pStatement->isProcedureCall()))
      return true;
  return false;
}

// Labels of the text win, first come first served (inlining can bring two alike into a procedure);
// the other blocks that need one are named after their index, never clashing with a kept label.
void ProgramView::assignLabels(const ProcedureView& procedure) {
  std::set<std::string> used;
  std::vector<node> unnamed;
  for (std::size_t i = 0; i < procedure.blocks.size(); ++i) {
    node v = procedure.blocks[i];
    const std::string* pLabel = m_Program.blockLabel(m_Graph.getBasicBlock(v)->getIndex());
    if (pLabel && used.insert(*pLabel).second)
      m_Labels[v.index()] = *pLabel;
    else if (needsLabel(v, i == 0 ? node() : procedure.blocks[i - 1]))
      unnamed.push_back(v);
  }
  for (node v : unnamed) m_Labels[v.index()] = unusedBlockName(*m_Graph.getBasicBlock(v), used);
}

// What phi operands and parameter statements name: predecessors and the blocks holding calls.
void ProgramView::findNamedBlocksAndCalls() {
  for (node v : m_Graph.nodes()) {
    KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
    if (!pBlock) continue;
    if (!pBlock->getPhiFunctions().empty())
      for (edge e : m_Graph.getPhiOperandEdges(v)) m_NamedByPhis[m_Graph.source(e)] = true;
    for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
      if (KvCCfgParamStatement* pParam = pStatement->isParamStatement())
        for (const auto& argument : pParam->getArguments()) m_CallsWithParameters.insert(argument.first);
  }
}

const std::string& ProgramView::labelOf(node v) const {
  auto found = m_Labels.find(v.index());
  return found == m_Labels.end() ? kNoLabel : found->second;
}

std::string ProgramView::predecessorName(node v) const {
  if (m_Graph.inf(v)->isEntryNode()) return "entry";
  const std::string& label = labelOf(v);
  return label.empty() ? "?" : label;
}

void ProgramView::recordCallSites(const ProcedureView& procedure) {
  for (node v : procedure.blocks)
    for (KvCCfgStatement* pStatement : m_Graph.getBasicBlock(v)->getStatementSeq())
      if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall())
        m_CallSites[pCall] = procedure.name + ":" + predecessorName(v);
}

std::string ProgramView::callSite(KvCCfgProcedureCall* pCall) const {
  auto found = m_CallSites.find(pCall);
  return found == m_CallSites.end() ? "?" : found->second;
}

// ---- Variables --------------------------------------------------------------------------------------

void ProgramView::numberVersions() {
  std::vector<KvCCfgVariable*> named;
  for (node v : m_Graph.nodes())
    if (KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v)) collectVariables(*pBlock, named);
  std::map<KvCCfgVariable*, std::set<std::pair<std::uint32_t, KvCCfgVariable*>>> versionsOf;
  for (KvCCfgVariable* pVariable : named)
    if (KvCSSAVariable* pVersion = pVariable->isSSAVariable())
      versionsOf[pVersion->getOrigVar()].emplace(pVersion->getIndex(), pVersion);
  for (const auto& entry : versionsOf) {
    std::uint32_t number = 0;
    for (const auto& version : entry.second) m_VersionNumbers[version.second] = ++number;
  }
}

std::string ProgramView::nameOf(KvCCfgVariable* pVariable) const {
  if (!pVariable) return "?";
  KvCCfgVariable* pOriginal = originalOf(pVariable);
  KvCCfgSFVariable* pNamed = pOriginal->isSFVariable();
  std::string name = pNamed ? pNamed->getName() : "v" + std::to_string(pOriginal->getIndex());
  if (pOriginal == pVariable) return name;
  auto found = m_VersionNumbers.find(pVariable);
  return name + "." + (found == m_VersionNumbers.end() ? "?" : std::to_string(found->second));
}

bool ProgramView::precedes(KvCCfgVariable* a, KvCCfgVariable* b) const {
  auto key = [this](KvCCfgVariable* pVariable) {
    KvCCfgVariable* pOriginal = originalOf(pVariable);
    KvCCfgSFVariable* pNamed = pOriginal->isSFVariable();
    auto found = m_VersionNumbers.find(pVariable);
    return std::make_tuple(pNamed ? pNamed->getDeclarationIndex() : UINT32_MAX, pOriginal->getIndex(),
                           found == m_VersionNumbers.end() ? 0u : found->second, pVariable->getIndex());
  };
  return key(a) < key(b);
}

// ---- Shared with the printer and the C emitter -----------------------------------------------------

bool isInSSAForm(const KvCControlFlowGraph& graph) {
  return graph.getState().has(ssaopt::GraphFact::SSAForm);
}

std::string unusedBlockName(const KvCBasicBlock& block, std::set<std::string>& used) {
  std::string name = "bb" + std::to_string(block.getIndex());
  std::string candidate = name;
  for (int suffix = 1; !used.insert(candidate).second; ++suffix)
    candidate = name + "_" + std::to_string(suffix);
  return candidate;
}

}  // namespace ssaopt::client::detail
