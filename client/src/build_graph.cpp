// Builds the control-flow graph of checked procedures through the library's building operations.
#include <set>
#include <string>
#include <unordered_map>

#include "front_end_steps.h"
#include "ssaopt/client/statements.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/procedure.h"

namespace ssaopt::client::detail {

namespace {

using ssaopt::node;

// The nodes a block of the text became: calls stand in blocks of their own, so one block of the text
// may become a chain of nodes.
struct BuiltBlock {
  node first;
  node last;
};

class GraphBuilder {
public:
  explicit GraphBuilder(Program& program) : m_Program(program), m_Graph(program.graph()) {}

  void build(std::vector<ResolvedProcedure>& procedures) {
    for (const ResolvedProcedure& procedure : procedures)
      m_Graph.demandProcedureEntryNode(nameOf(procedure), m_pProcedure);
    m_Built.resize(procedures.size());
    for (std::size_t p = 0; p < procedures.size(); ++p) buildProcedure(procedures[p], m_Built[p]);
    outlineBlocks(procedures);
    m_Graph.placeExitNodes();
    m_Graph.placeLoopAroundMain();
    markStart();
  }

private:
  static BxCXString nameOf(const ResolvedProcedure& procedure) { return BxCXString(procedure.name.c_str()); }

  KvCBasicBlock& blockOf(node v) const { return *m_Graph.getBasicBlock(v); }

  node newBlockNode() {
    auto* pBlock = new KvCBasicBlock();
    pBlock->setProcedure(m_pProcedure);
    return m_Graph.new_node(pBlock);
  }

  // ---- Procedures and blocks -------------------------------------------------------------------

  void buildProcedure(ResolvedProcedure& procedure, std::vector<BuiltBlock>& built) {
    node entry = m_Graph.demandProcedureEntryNode(nameOf(procedure), m_pProcedure);
    built.resize(procedure.blocks.size());
    for (std::size_t i = 0; i < procedure.blocks.size(); ++i)
      if (procedure.blocks[i].reached) built[i] = buildBlock(procedure.blocks[i]);
    m_Graph.new_edge(entry, built[0].first, new KvCCfgEdgeInfo());
    for (std::size_t i = 0; i < procedure.blocks.size(); ++i)
      if (procedure.blocks[i].reached) connectSuccessors(procedure.blocks[i], built[i].last, built);
  }

  // Statements are appended one by one and split off at each call, so that every split searches
  // only the few statements since the last one: building stays linear in the size of the block.
  BuiltBlock buildBlock(ResolvedBlock& block) {
    node first = newBlockNode();
    if (!block.pSyntax->label.text.empty())
      m_Program.setBlockLabel(blockOf(first).getIndex(), std::string(block.pSyntax->label.text));
    node current = first;
    bool afterCall = false;
    for (std::unique_ptr<KvCCfgStatement>& pOwned : block.statements) {
      KvCCfgStatement* pStatement = pOwned.release();
      blockOf(current).append(pStatement);
      bool isCall = pStatement->isProcedureCall() != nullptr;
      if (isCall || afterCall) current = m_Graph.splitAtStatement(current, pStatement);
      if (isCall) passArguments(*pStatement->isSFProcedureCall());
      afterCall = isCall;
    }
    if (block.pCondition) {
      blockOf(current).appendBranch(block.pCondition);
      if (afterCall) current = m_Graph.splitAtCondition(current);
    }
    return BuiltBlock{first, current};
  }

  void passArguments(KvCCfgSFProcedureCall& call) {
    const std::vector<KvCCfgSFVariable*>& formals = m_Program.formalsOf(call.getName().cstring());
    if (formals.empty()) return;
    ssaopt::list<KvCCfgVariable*> formalList(formals.begin(), formals.end());
    ssaopt::list<KvCCfgExpression*> argumentList(call.getArguments().begin(), call.getArguments().end());
    m_Graph.setParametersOfCall(&call, formalList, argumentList);
  }

  void connectSuccessors(const ResolvedBlock& block, node last, const std::vector<BuiltBlock>& built) {
    if (!block.pCondition) {
      if (block.onTrue != kEnd)
        m_Graph.new_edge(last, built[static_cast<std::size_t>(block.onTrue)].first, new KvCCfgEdgeInfo());
      return;
    }
    m_Graph.new_edge(last, branchTarget(block.onTrue, built), new KvCCfgTrueBranch());
    m_Graph.new_edge(last, branchTarget(block.onFalse, built), new KvCCfgFalseBranch());
  }

  // A branch edge needs a node to go to: for the end of the procedure, an empty block of its own,
  // which placeExitNodes will lead on to the exit.
  node branchTarget(int target, const std::vector<BuiltBlock>& built) {
    return target == kEnd ? newBlockNode() : built[static_cast<std::size_t>(target)].first;
  }

  // ---- Outlining -------------------------------------------------------------------------------

  void outlineBlocks(const std::vector<ResolvedProcedure>& procedures) {
    bool outlined = false;
    for (std::size_t p = 0; p < procedures.size(); ++p)
      for (std::size_t i = 0; i < procedures[p].blocks.size(); ++i) {
        const ResolvedBlock& block = procedures[p].blocks[i];
        if (!block.pSyntax->outlinePos || !block.reached) continue;
        outline(m_Built[p][i].first, *block.pSyntax);
        outlined = true;
      }
    if (!outlined) return;
    isolateCalls();
    requireEveryProcedureToReachItsEnd(procedures);
  }

  void outline(node v, const SyntaxBlock& block) {
    std::set<std::string> before = procedureNames();
    delete m_Graph.makeProcedureAndCall(v);
    for (const std::string& name : procedureNames())
      if (!before.count(name)) m_OutlinedBy.emplace(name, &block);
  }

  std::set<std::string> procedureNames() const {
    std::set<std::string> names;
    for (const auto& entry : m_Graph.getProcedures()) names.insert(entry.first.cstring());
    return names;
  }

  // makeProcedureAndCall appends its calls to the blocks before the outlined one.
  void isolateCalls() {
    for (node v : m_Graph.all_nodes()) {
      KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
      if (pBlock && pBlock->getStatementSeq().size() > 1 &&
          pBlock->getStatementSeq().back()->isProcedureCall())
        m_Graph.splitAtStatement(v, pBlock->getStatementSeq().back());
    }
  }

  // Outlining a block that runs into a loop with no way out makes a procedure without an end.
  void requireEveryProcedureToReachItsEnd(const std::vector<ResolvedProcedure>& procedures) {
    ssaopt::node_array<bool> seen(m_Graph, false);
    for (const auto& entry : m_Graph.getProcedures()) {
      if (reachesDeadEnd(entry.second->getEntryNode(), seen)) continue;
      std::string name = entry.first.cstring();
      auto outlinedBy = m_OutlinedBy.find(name);
      if (outlinedBy != m_OutlinedBy.end())
        throw SourceError(*outlinedBy->second->outlinePos,
                          "outlining '" + std::string(outlinedBy->second->label.text) +
                              "' makes procedure '" + name + "', which never reaches its end");
      for (const ResolvedProcedure& procedure : procedures)
        if (procedure.name == name)
          throw SourceError(procedure.pSyntax->name.pos,
                            "after outlining, procedure '" + name + "' never reaches its end");
    }
  }

  // Whether a node without successors (which placeExitNodes will lead to the exit) can be reached.
  bool reachesDeadEnd(node entry, ssaopt::node_array<bool>& seen) const {
    std::vector<node> work{entry};
    seen[entry] = true;
    bool found = false;
    while (!work.empty()) {
      node v = work.back();
      work.pop_back();
      found = found || m_Graph.outdeg(v) == 0;
      for (ssaopt::edge e : m_Graph.out(v)) {
        node w = m_Graph.target(e);
        if (!seen[w]) {
          seen[w] = true;
          work.push_back(w);
        }
      }
    }
    return found;
  }

  // ---- The main loop ---------------------------------------------------------------------------

  void markStart() {
    KvCCfgProcedure* pMain = m_Graph.findProcedure(KvCControlFlowGraph::kMainProcedureName);
    m_Graph.setStartNode(pMain->getEntryNode());
    node loop = m_Graph.source(m_Graph.first_in_edge(pMain->getExitNode()));
    m_Program.setMainLoopCondition(blockOf(loop).getBranchCond());
  }

  Program& m_Program;
  KvCControlFlowGraph& m_Graph;
  KvCCfgProcedure* m_pProcedure = nullptr;  // the procedure being built
  std::vector<std::vector<BuiltBlock>> m_Built;
  std::unordered_map<std::string, const SyntaxBlock*> m_OutlinedBy;
};

}  // namespace

void buildGraph(std::vector<ResolvedProcedure>& procedures, Program& program) {
  GraphBuilder(program).build(procedures);
}

}  // namespace ssaopt::client::detail
