// Payloads of the control-flow graph's nodes: basic blocks, procedure entries and procedure exits.
// The graph stores payload pointers and never deletes them. A block's destructor releases only its
// own containers: statements leave a block through del(), which deletes them.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/ir/forward.h"

class KvCCfgNodeInfo {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgNodeInfo() = default;
  KvCCfgNodeInfo(const KvCCfgNodeInfo&) = default;
  KvCCfgNodeInfo& operator=(const KvCCfgNodeInfo&) = default;

  // Virtual operations, in slot order. Pure, so that only the three kinds of payload exist.
  virtual ~KvCCfgNodeInfo() = 0;
  virtual KvCCfgEntry* isEntryNode() { return nullptr; }
  virtual KvCCfgExit* isExitNode() { return nullptr; }
  // The variables that the node defines, in definition order; none unless it is a block.
  virtual const ssaopt::list<KvCCfgVariable*>& getAssignedVariables();
  virtual ssaopt::set<KvCCfgVariable*> getUsedVariables() const { return {}; }
  virtual KvCBasicBlock* isBasicBlock() { return nullptr; }

  ssaopt::node getIdom() const { return m_Idom; }
  void setIdom(ssaopt::node idom) { m_Idom = idom; }
  KvCCfgProcedure* getProcedure() const { return m_pProcedure; }
  void setProcedure(KvCCfgProcedure* pProcedure) { m_pProcedure = pProcedure; }
  // The dominance frontier, for the dominator computation to fill and read. Most nodes have an empty
  // one, which costs nothing until getDF() is first called.
  ssaopt::set<ssaopt::node>* getDF() { return &m_DF.get(); }
  // The frontier without making one: null while it was never asked for or has been cleared.
  const ssaopt::set<ssaopt::node>* frontierIfAny() const { return m_DF.find(); }
  void clearDF() { m_DF.reset(); }

private:
  KvCCfgProcedure* m_pProcedure = nullptr;
  ssaopt::on_demand<ssaopt::set<ssaopt::node>> m_DF;
  // Last, so that a derived class may put a member of four bytes beside it.
  ssaopt::node m_Idom;
};

// Phi functions, then statements in execution order, then optionally a two-way branch condition.
class KvCBasicBlock : public KvCCfgNodeInfo {
public:
  KvCBasicBlock();
  // A copy points to the same statements and keeps the index of its source.
  KvCBasicBlock(const KvCBasicBlock&) = default;
  KvCBasicBlock& operator=(const KvCBasicBlock&) = default;

  ~KvCBasicBlock() override = default;
  // Computed at the first request that finds the list empty and kept from then on, even when the
  // block's definitions change; recomputeAssignedVariables() brings it up to date.
  const ssaopt::list<KvCCfgVariable*>& getAssignedVariables() override;
  // What the phi functions, the statements and the condition read, including variables that the block
  // defines first.
  ssaopt::set<KvCCfgVariable*> getUsedVariables() const override;
  KvCBasicBlock* isBasicBlock() override { return this; }

  std::uint32_t getIndex() const { return m_Index; }
  static void boot();

  const ssaopt::list<KvCCfgStatement*>& getStatementSeq() const { return m_StatementSeq; }
  const ssaopt::list<KvCPhiFunction*>& getPhiFunctions() const;
  KvCCfgExpression* getBranchCond() const { return m_pBranchCond; }

  void append(KvCCfgStatement* pStatement) { m_StatementSeq.push_back(pStatement); }
  void append(KvCPhiFunction* pPhi) { m_PhiFunctions.get().push_back(pPhi); }
  void append(const ssaopt::list<KvCCfgStatement*>& statements);
  void append(const ssaopt::list<KvCPhiFunction*>& phiFunctions);
  // Replaces any previous condition.
  void appendBranch(KvCCfgExpression* pCond) { m_pBranchCond = pCond; }

  // Removes the statement (or phi function) from the block and deletes it; one that is not in the
  // block is reported and left alone.
  void del(KvCCfgStatement* pStatement);

  // The only content of a block that holds exactly one statement, or one phi function, and nothing
  // else; null otherwise.
  KvCCfgStatement* isStatement() const;
  KvCPhiFunction* isPhiFunction() const;

  // Moves `pStatement` and the statements after it, with the condition, into a new block of the same
  // procedure and returns it. The phi functions stay: they run on entry to this block, which keeps
  // the in-edges. At the first statement, or for a statement not in the block (reported), nothing
  // changes and the block itself is returned.
  KvCBasicBlock* splitAtStatement(KvCCfgStatement* pStatement);
  // Moves the condition into a new block of the same procedure and returns it; a block without
  // statements is returned itself, unchanged.
  KvCBasicBlock* splitAtCondition();
  // A new block (no procedure) holding a clone of the only statement or phi function; null for any
  // other block, or when the content does not clone.
  KvCBasicBlock* clone() const;

  void recomputeAssignedVariables();

private:
  KvCBasicBlock* newBlockWithCondition();

  static std::uint32_t s_GlobIndexCnt;

  // First, beside the base's last member.
  std::uint32_t m_Index;
  ssaopt::list<KvCCfgStatement*> m_StatementSeq;
  // Only blocks at joins hold phi functions: the list is made with the first.
  ssaopt::on_demand<ssaopt::list<KvCPhiFunction*>> m_PhiFunctions;
  KvCCfgExpression* m_pBranchCond = nullptr;
  ssaopt::list<KvCCfgVariable*> m_AssignedVariables;
};

// The entry node of a procedure. It holds no statements of the program; the assignments that a client
// gives it are kept for the client and never read by the library.
class KvCCfgEntry : public KvCCfgNodeInfo {
public:
  KvCCfgEntry() = default;
  KvCCfgEntry(const KvCCfgEntry&) = default;
  KvCCfgEntry& operator=(const KvCCfgEntry&) = default;

  ~KvCCfgEntry() override = default;
  KvCCfgEntry* isEntryNode() override { return this; }

  void append(KvCCfgAssignment* pAssignment) { m_Assignments.push_back(pAssignment); }
  ssaopt::list<KvCCfgAssignment*> getAssignments() const { return m_Assignments; }

private:
  ssaopt::list<KvCCfgAssignment*> m_Assignments;
};

// The exit node of a procedure; it holds nothing.
class KvCCfgExit : public KvCCfgNodeInfo {
public:
  KvCCfgExit() = default;

  ~KvCCfgExit() override = default;
  KvCCfgExit* isExitNode() override { return this; }
};
