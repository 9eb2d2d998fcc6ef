// Code hoisting of the reference client: listens to the assignments' hooks while the library's pass
// runs, then moves the blocks that they agreed to move (see hoisting.h).
#include "ssaopt/client/hoisting.h"

#include <cstdint>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "ssaopt/client/statements.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::client {

namespace {

using ssaopt::edge;
using ssaopt::nil;
using ssaopt::node;

// A statement that moves before its branch and the twin that goes with it.
struct AgreedHoist {
  KvCCfgSFAssignment* pHoisted;
  KvCCfgSFAssignment* pTwin;
};
using Agreements = std::vector<AgreedHoist>;

// A twin's SSA version -> the hoisted statement's version.
using Renaming = std::unordered_map<KvCCfgVariable*, KvCCfgVariable*>;

// What the running step has heard, in the order the library asked, and the versions that the moves
// agreed so far will rename; null while no step listens. The library is driven from one thread, and a
// step listens only while the library's pass runs, so no other removal (KvCBasicBlock::del) is taken
// for a dropped twin.
struct Heard {
  Agreements agreements;
  Renaming twinVersions;
};
Heard* s_pHeard = nullptr;

class Listening {
public:
  explicit Listening(Heard& heard) { s_pHeard = &heard; }
  ~Listening() { s_pHeard = nullptr; }
  Listening(const Listening&) = delete;
  Listening& operator=(const Listening&) = delete;
};

KvCCfgVariable* renamed(KvCCfgVariable* pVariable, const Renaming& renaming) {
  auto found = renaming.find(pVariable);
  return found == renaming.end() ? pVariable : found->second;
}

void renameIn(KvCCfgExpression* pExpression, const Renaming& renaming) {
  if (!pExpression) return;
  for (KvCCfgVariable* pRead : pExpression->getUsedVariables())
    if (renamed(pRead, renaming) != pRead) pExpression->replaceVariable(pRead, renamed(pRead, renaming));
}

// Every kind of statement that reads a version: the reads of a twin's version may stand in the same
// procedure (assignments, calls' arguments, phi operands, output statements, external calls) or, at
// the exit of a procedure, in the value-return statements after its calls.
void renameReadsOf(KvCCfgStatement& statement, const Renaming& renaming) {
  if (KvCCfgAssignment* pAssignment = statement.isAssignment()) {
    renameIn(pAssignment->getRHS(), renaming);
  } else if (KvCCfgSFProcedureCall* pCall = statement.isSFProcedureCall()) {
    for (KvCCfgSFExpression* pArgument : pCall->getArguments()) renameIn(pArgument, renaming);
  } else if (KvCCfgParamStatement* pParam = statement.isParamStatement()) {
    for (const auto& argument : pParam->getArguments()) renameIn(argument.second, renaming);
  } else if (KvCCfgValueReturnStatement* pReturn = statement.isValueReturnStatement()) {
    renameIn(pReturn->getExpression(), renaming);
  } else if (KvCCfgOutputStatement* pOutput = statement.isOutputStatement()) {
    pOutput->setVariable(renamed(pOutput->getVariable(), renaming));
  } else if (KvCCfgExternCall* pExtern = statement.isExternCall()) {
    for (KvCCfgVariable* pRead : pExtern->getUsedVariables())
      if (renamed(pRead, renaming) != pRead) pExtern->replaceVariable(pRead, renamed(pRead, renaming));
  }
}

void renameOperands(KvCPhiFunction& phi, const Renaming& renaming) {
  ssaopt::array<KvCCfgVariable*> operands = phi.getReplacementVariables();
  for (std::size_t i = 0; i < operands.size(); ++i)
    if (operands[i]) phi.setReplacementVariable(static_cast<int>(i), renamed(operands[i], renaming));
}

// Applies the agreements in the order the library made them, each one completely or not at all.
class HoistApplier {
public:
  explicit HoistApplier(Program& program) : m_Program(program), m_Graph(program.graph()) {}

  void apply(const Agreements& agreements) {
    findNodesOf(agreements);
    for (const AgreedHoist& agreed : agreements)
      if (agreed.pTwin && !applyOne(agreed)) abandonBranchOf(agreed);
    if (!m_Renaming.empty()) renameReads();
  }

private:
  void findNodesOf(const Agreements& agreements) {
    for (const AgreedHoist& agreed : agreements) {
      m_NodeOf[agreed.pHoisted] = nil;
      if (agreed.pTwin) m_NodeOf[agreed.pTwin] = nil;
    }
    for (node v : m_Graph.nodes())
      if (KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v))
        for (KvCCfgStatement* pStatement : pBlock->getStatementSeq()) {
          auto found = m_NodeOf.find(pStatement);
          if (found != m_NodeOf.end()) found->second = v;
        }
  }

  // The library compared a pair with the versions that the pairs agreed before it at the same branch
  // would leave, so a pair moves only while those before it did.
  bool applyOne(const AgreedHoist& agreed) {
    node hoisted = linkHolding(agreed.pHoisted);
    node twin = linkHolding(agreed.pTwin);
    node branch = hoisted && twin ? branchAbove(hoisted) : nil;
    if (!branch || branchAbove(twin) != branch || m_Abandoned.count(branch.index())) return false;
    node condition = conditionAlone(branch);
    if (!condition) return false;
    if (agreed.pTwin->getLHS() != agreed.pHoisted->getLHS())
      m_Renaming[agreed.pTwin->getLHS()] = agreed.pHoisted->getLHS();
    cutOut(twin);
    m_Graph.getBasicBlock(twin)->del(agreed.pTwin);
    m_Graph.del_node(twin);
    cutOut(hoisted);
    insertBefore(condition, hoisted);
    return true;
  }

  void abandonBranchOf(const AgreedHoist& agreed) {
    node hoisted = m_NodeOf.at(agreed.pHoisted);
    node branch = hoisted ? branchAbove(hoisted) : nil;
    if (branch) m_Abandoned.insert(branch.index());
  }

  // The library agrees on blocks that hold the statement alone on a branch: one way in, one way on.
  node linkHolding(KvCCfgStatement* pStatement) const {
    node w = m_NodeOf.at(pStatement);
    KvCBasicBlock* pBlock = w ? m_Graph.getBasicBlock(w) : nullptr;
    bool isLink =
        pBlock && pBlock->isStatement() == pStatement && m_Graph.indeg(w) == 1 && m_Graph.outdeg(w) == 1;
    return isLink ? w : nil;
  }

  // The block whose condition decides the branch that `w` lies on, back along the single in-edges
  // that the library's walk came down.
  node branchAbove(node w) const {
    for (node v = w; m_Graph.indeg(v) == 1;) {
      v = m_Graph.source(m_Graph.first_in_edge(v));
      KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
      if (!pBlock) return nil;
      if (pBlock->getBranchCond()) return v;
    }
    return nil;
  }

  // The node that holds the branch's condition alone, after everything else of its block. The library
  // splits the condition off a block with statements; one of phi functions and the condition cannot
  // be split, and nothing can go between its phi functions and its condition (nil).
  node conditionAlone(node v) {
    const KvCBasicBlock& block = *m_Graph.getBasicBlock(v);
    if (!block.getStatementSeq().empty()) return m_Graph.splitAtCondition(v);
    return block.getPhiFunctions().empty() ? v : node(nil);
  }

  // p -in-> w -out-> s becomes p -out-> s. `out` keeps its place among the in-edges of s, which the
  // phi operands of s follow, and takes the payload of `in`, which may be a branch of p. The label
  // that named w names the block that now stands in its place.
  void cutOut(node w) {
    edge in = m_Graph.first_in_edge(w);
    edge out = m_Graph.first_adj_edge(w);
    passLabel(w, m_Graph.target(out));
    m_Graph.assign(out, m_Graph.inf(in));
    m_Graph.move_edge(out, m_Graph.source(in), m_Graph.target(out));
    m_Graph.del_edge(in);
  }

  // What entered `condition` enters `w`, which continues into it; so does its label.
  void insertBefore(node condition, node w) {
    while (edge e = m_Graph.first_in_edge(condition)) m_Graph.move_edge(e, m_Graph.source(e), w);
    m_Graph.new_edge(w, condition, new KvCCfgEdgeInfo());
    passLabel(condition, w);
  }

  // Where no block takes the place (the exit follows), the place is the procedure's end, which needs
  // no label.
  void passLabel(node from, node to) {
    std::uint32_t fromIndex = m_Graph.getBasicBlock(from)->getIndex();
    if (KvCBasicBlock* pTo = m_Graph.getBasicBlock(to))
      m_Program.passBlockLabel(fromIndex, pTo->getIndex());
    else
      m_Program.dropBlockLabel(fromIndex);
  }

  void renameReads() {
    for (node v : m_Graph.nodes()) {
      KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
      if (!pBlock) continue;
      for (KvCPhiFunction* pPhi : pBlock->getPhiFunctions()) renameOperands(*pPhi, m_Renaming);
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq()) renameReadsOf(*pStatement, m_Renaming);
      renameIn(pBlock->getBranchCond(), m_Renaming);
    }
  }

  Program& m_Program;
  KvCControlFlowGraph& m_Graph;
  std::unordered_map<KvCCfgStatement*, node> m_NodeOf;
  Renaming m_Renaming;
  std::unordered_set<std::uint32_t> m_Abandoned;  // branch nodes whose later pairs stay
};

}  // namespace

void hoistAsAgreed(Program& program, const std::function<void()>& hoistStep) {
  Heard heard;
  {
    Listening listening(heard);
    hoistStep();
  }
  HoistApplier(program).apply(heard.agreements);
}

bool agreeToHoist(KvCCfgSFAssignment* pHoisted) {
  if (!s_pHeard) return false;
  s_pHeard->agreements.push_back(AgreedHoist{pHoisted, nullptr});
  return true;
}

void noteDroppedTwin(KvCCfgSFAssignment* pTwin) {
  if (!s_pHeard || s_pHeard->agreements.empty() || s_pHeard->agreements.back().pTwin) return;
  AgreedHoist& agreed = s_pHeard->agreements.back();
  agreed.pTwin = pTwin;
  if (pTwin->getLHS() != agreed.pHoisted->getLHS())
    s_pHeard->twinVersions[pTwin->getLHS()] = agreed.pHoisted->getLHS();
}

KvCCfgVariable* versionReadAfterHoisting(KvCCfgVariable* pVariable) {
  return s_pHeard ? renamed(pVariable, s_pHeard->twinVersions) : pVariable;
}

}  // namespace ssaopt::client
