#include "ssaopt/client/program.h"

#include <utility>

#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::client {

Program::Program() : m_pGraph(new KvCControlFlowGraph()) {}

Program::~Program() = default;

KvCCfgSFVariable* Program::addVariable(std::unique_ptr<KvCCfgSFVariable> pVariable) {
  m_Variables.push_back(std::move(pVariable));
  KvCCfgSFVariable* pAdded = m_Variables.back().get();
  m_VariablesByName.emplace(pAdded->getName(), pAdded);
  return pAdded;
}

KvCCfgSFVariable* Program::findVariable(std::string_view name) const {
  auto found = m_VariablesByName.find(name);
  return found == m_VariablesByName.end() ? nullptr : found->second;
}

void Program::setFormals(const std::string& procedure, std::vector<KvCCfgSFVariable*> formals) {
  m_Formals[procedure] = std::move(formals);
}

const std::vector<KvCCfgSFVariable*>& Program::formalsOf(const std::string& procedure) const {
  static const std::vector<KvCCfgSFVariable*> kNone;
  auto found = m_Formals.find(procedure);
  return found == m_Formals.end() ? kNone : found->second;
}

void Program::setBlockLabel(std::uint32_t blockIndex, std::string label) {
  m_BlockLabels[blockIndex] = std::move(label);
}

const std::string* Program::blockLabel(std::uint32_t blockIndex) const {
  auto found = m_BlockLabels.find(blockIndex);
  return found == m_BlockLabels.end() ? nullptr : &found->second;
}

void Program::passBlockLabel(std::uint32_t from, std::uint32_t to) {
  auto found = m_BlockLabels.find(from);
  if (found == m_BlockLabels.end()) return;
  m_BlockLabels.emplace(to, std::move(found->second));
  m_BlockLabels.erase(from);
}

namespace {

// What a block starts with: its first phi function, else its first statement, else its condition.
const void* firstContentOf(const KvCBasicBlock& block) {
  if (!block.getPhiFunctions().empty()) return block.getPhiFunctions().front();
  if (!block.getStatementSeq().empty()) return block.getStatementSeq().front();
  return block.getBranchCond();
}

}  // namespace

void Program::transformKeepingLabels(const std::function<void()>& transform) {
  std::unordered_map<const void*, std::string> labelsByContent;
  for (ssaopt::node v : m_pGraph->nodes()) {
    KvCBasicBlock* pBlock = m_pGraph->getBasicBlock(v);
    const std::string* pLabel = pBlock ? blockLabel(pBlock->getIndex()) : nullptr;
    if (pLabel && firstContentOf(*pBlock)) labelsByContent.emplace(firstContentOf(*pBlock), *pLabel);
  }
  transform();
  for (ssaopt::node v : m_pGraph->nodes()) {
    KvCBasicBlock* pBlock = m_pGraph->getBasicBlock(v);
    auto found = pBlock ? labelsByContent.find(firstContentOf(*pBlock)) : labelsByContent.end();
    if (found != labelsByContent.end()) setBlockLabel(pBlock->getIndex(), found->second);
  }
}

}  // namespace ssaopt::client
