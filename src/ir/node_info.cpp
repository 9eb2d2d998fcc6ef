// Node payloads: basic blocks with their statement surgery (delete, split, clone) and their def/use
// summaries, and the entry and exit nodes of procedures.
#include "ssaopt/ir/node_info.h"

#include <algorithm>

#include "ssaopt/frame/control.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/statement.h"

namespace {

// Source lines the reports below are filed under; the host turns them into error codes that logs
// and tests match, so they stay fixed whatever happens to this file.
constexpr int kLineDelPhiNotFound = 284;
constexpr int kLineDelStatementNotFound = 298;
constexpr int kLineSplitNotFound = 338;
constexpr int kLineSplitHeadDetached = 349;

constexpr const char* kBasicBlock = "KvCBasicBlock";

// Removes `pItem` from `items`; false when it is not there.
template <class Item>
bool eraseFirst(ssaopt::list<Item*>& items, KvCCfgStatement* pItem) {
  auto found = std::find(items.begin(), items.end(), pItem);
  if (found == items.end()) return false;
  items.erase(found);
  return true;
}

// A new block around a cloned statement or phi function; none when the clone failed, for a block
// holding a null statement would break every reader of the block.
template <class Item>
KvCBasicBlock* blockHolding(Item* pCopy) {
  if (!pCopy) return nullptr;
  KvCBasicBlock* pBlock = new KvCBasicBlock();
  pBlock->append(pCopy);
  return pBlock;
}

}  // namespace

KvCCfgNodeInfo::~KvCCfgNodeInfo() = default;

const ssaopt::list<KvCCfgVariable*>& KvCCfgNodeInfo::getAssignedVariables() {
  static const ssaopt::list<KvCCfgVariable*> kNone;
  return kNone;
}

std::uint32_t KvCBasicBlock::s_GlobIndexCnt = 0;

void KvCBasicBlock::boot() { s_GlobIndexCnt = 0; }

KvCBasicBlock::KvCBasicBlock() : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)) {}

const ssaopt::list<KvCPhiFunction*>& KvCBasicBlock::getPhiFunctions() const {
  static const ssaopt::list<KvCPhiFunction*> kNone;
  const ssaopt::list<KvCPhiFunction*>* pPhis = m_PhiFunctions.find();
  return pPhis ? *pPhis : kNone;
}

void KvCBasicBlock::append(const ssaopt::list<KvCCfgStatement*>& statements) {
  m_StatementSeq.insert(m_StatementSeq.end(), statements.begin(), statements.end());
}

void KvCBasicBlock::append(const ssaopt::list<KvCPhiFunction*>& phiFunctions) {
  if (phiFunctions.empty()) return;
  ssaopt::list<KvCPhiFunction*>& phis = m_PhiFunctions.get();
  phis.insert(phis.end(), phiFunctions.begin(), phiFunctions.end());
}

// The cache is filled by the first request that finds it empty and is not refreshed by itself: a
// caller that changes the block's definitions after asking calls recomputeAssignedVariables().
const ssaopt::list<KvCCfgVariable*>& KvCBasicBlock::getAssignedVariables() {
  if (m_AssignedVariables.empty()) recomputeAssignedVariables();
  return m_AssignedVariables;
}

void KvCBasicBlock::recomputeAssignedVariables() {
  m_AssignedVariables.clear();
  for (const KvCPhiFunction* pPhi : getPhiFunctions())
    if (pPhi) m_AssignedVariables.push_back(pPhi->getVariable());
  for (const KvCCfgStatement* pStatement : m_StatementSeq) {
    ssaopt::set<KvCCfgVariable*> defined = pStatement->getDefinedVariables();
    m_AssignedVariables.insert(m_AssignedVariables.end(), defined.begin(), defined.end());
  }
}

ssaopt::set<KvCCfgVariable*> KvCBasicBlock::getUsedVariables() const {
  ssaopt::set<KvCCfgVariable*> used;
  for (const KvCPhiFunction* pPhi : getPhiFunctions()) ssaopt::insertAll(used, pPhi->getUsedVariables());
  for (const KvCCfgStatement* pStatement : m_StatementSeq)
    ssaopt::insertAll(used, pStatement->getUsedVariables());
  if (m_pBranchCond) ssaopt::insertAll(used, m_pBranchCond->getUsedVariables());
  return used;
}

void KvCBasicBlock::del(KvCCfgStatement* pStatement) {
  if (pStatement->isPhiFunction()) {
    if (!m_PhiFunctions.find() || !eraseFirst(m_PhiFunctions.get(), pStatement)) {
      KV_CONSISTENCY_CHECK(false, "0", kBasicBlock, kLineDelPhiNotFound);
      return;
    }
  } else if (!eraseFirst(m_StatementSeq, pStatement)) {
    KV_CONSISTENCY_CHECK(false, "0", kBasicBlock, kLineDelStatementNotFound);
    return;
  }
  pStatement->remove();
  delete pStatement;
}

KvCCfgStatement* KvCBasicBlock::isStatement() const {
  bool onlyOneStatement = m_StatementSeq.size() == 1 && getPhiFunctions().empty() && !m_pBranchCond;
  return onlyOneStatement ? m_StatementSeq.front() : nullptr;
}

KvCPhiFunction* KvCBasicBlock::isPhiFunction() const {
  const ssaopt::list<KvCPhiFunction*>& phis = getPhiFunctions();
  bool onlyOnePhi = phis.size() == 1 && m_StatementSeq.empty() && !m_pBranchCond;
  return onlyOnePhi ? phis.front() : nullptr;
}

KvCBasicBlock* KvCBasicBlock::splitAtStatement(KvCCfgStatement* pStatement) {
  if (!m_StatementSeq.empty() && m_StatementSeq.front() == pStatement) return this;
  auto splitPoint = std::find(m_StatementSeq.begin(), m_StatementSeq.end(), pStatement);
  if (splitPoint == m_StatementSeq.end()) {
    KV_CONSISTENCY_CHECK(false, "0", kBasicBlock, kLineSplitNotFound);
    ssaopt::reportInternalError(kBasicBlock, kLineSplitNotFound);
    return this;
  }
  KvCBasicBlock* pTail = newBlockWithCondition();
  ssaopt::list<KvCCfgStatement*> head;
  head.splice(head.end(), m_StatementSeq, m_StatementSeq.begin(), splitPoint);
  pTail->m_StatementSeq.splice(pTail->m_StatementSeq.end(), m_StatementSeq);
  KV_CONSISTENCY_CHECK(m_StatementSeq.empty(), "m_StatementSeq.empty()", kBasicBlock, kLineSplitHeadDetached);
  m_StatementSeq.swap(head);
  return pTail;
}

KvCBasicBlock* KvCBasicBlock::splitAtCondition() {
  if (m_StatementSeq.empty()) return this;
  return newBlockWithCondition();
}

// The new block continues this one: same procedure, and the condition moves over to it.
KvCBasicBlock* KvCBasicBlock::newBlockWithCondition() {
  KvCBasicBlock* pNext = new KvCBasicBlock();
  pNext->setProcedure(getProcedure());
  pNext->m_pBranchCond = m_pBranchCond;
  m_pBranchCond = nullptr;
  return pNext;
}

KvCBasicBlock* KvCBasicBlock::clone() const {
  if (KvCCfgStatement* pStatement = isStatement()) return blockHolding(pStatement->clone());
  if (KvCPhiFunction* pPhi = isPhiFunction()) return blockHolding(pPhi->clone());
  return nullptr;
}
