// How a program is shown, computed once for the printer and the Graphviz writer alike, so that both
// give every block and every SSA version the same name:
//
// - Procedures in the order of their entry nodes, which is the order of the text for the program's
//   own procedures, followed by those that outlining made.
// - Blocks of a procedure: the graph's program order (KvCControlFlowGraph::getProgramOrder) of the
//   blocks shown, which keeps the order of the text for a program as read.
// - Labels: the block's label in the text where it had one, else "bb" and its index where a label is
//   needed (see needsLabel).
// - SSA versions: the variable's name and the version's rank among the versions of that variable by
//   creation (x.1, x.2, ...), which follows the renaming walk.
// - What the front end builds by itself is left out while it is as the front end left it: the block
//   that closes "#main" into a loop, and the empty blocks that only lead to a procedure's exit (the
//   branch targets "end"). Edges to them read "end".
#pragma once

#include <set>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::client::detail {

struct ProcedureView {
  KvCCfgProcedure* pProcedure;
  std::string name;
  std::vector<ssaopt::node> blocks;  // the shown blocks in the order they are printed
};

class ProgramView {
public:
  explicit ProgramView(const Program& program);

  const Program& program() const { return m_Program; }
  const KvCControlFlowGraph& graph() const { return m_Graph; }
  const std::vector<ProcedureView>& procedures() const { return m_Procedures; }

  // Exit nodes and the blocks left out: an edge to one of them ends the procedure.
  bool isEnd(ssaopt::node v) const;
  // The label a shown block is printed with; empty for a first block that needs none.
  const std::string& labelOf(ssaopt::node v) const;
  // "label", or "entry" for an entry node.
  std::string predecessorName(ssaopt::node v) const;
  // Where a call stands: "procedure:label"; "?" for a call no longer in the graph.
  std::string callSite(KvCCfgProcedureCall* pCall) const;

  // x, or x.3 for the third version of x.
  std::string nameOf(KvCCfgVariable* pVariable) const;
  // Declaration order, versions of one variable in their order.
  bool precedes(KvCCfgVariable* a, KvCCfgVariable* b) const;

  // The block that `v` falls into and that nothing else enters, or nil: blocks printed one after the
  // other as one piece of straight-line code.
  ssaopt::node continuationOf(ssaopt::node v) const;

private:
  void findHiddenBlocks();
  bool isUntouchedMainLoop(ssaopt::node v) const;
  bool onlyLeadsToTheEnd(ssaopt::node v) const;
  void layOutProcedures();
  bool isShownBlock(ssaopt::node v) const;
  void findNamedBlocksAndCalls();
  void assignLabels(const ProcedureView& procedure);
  bool needsLabel(ssaopt::node v, ssaopt::node previous) const;
  void recordCallSites(const ProcedureView& procedure);
  void numberVersions();

  const Program& m_Program;
  const KvCControlFlowGraph& m_Graph;
  std::vector<ProcedureView> m_Procedures;
  ssaopt::node_array<bool> m_Hidden;
  ssaopt::node_array<bool> m_NamedByPhis;
  std::unordered_set<KvCCfgProcedureCall*> m_CallsWithParameters;
  std::unordered_map<std::uint32_t, std::string> m_Labels;  // by node index
  std::unordered_map<KvCCfgProcedureCall*, std::string> m_CallSites;
  std::unordered_map<KvCCfgVariable*, std::uint32_t> m_VersionNumbers;
};

// "bb" and the block's index, with "_1", "_2", ... added until it is not in `used`; added to `used`.
std::string unusedBlockName(const KvCBasicBlock& block, std::set<std::string>& used);

// Whether the SSA transformation ran. Until it has placed the parameter statements, calls pass their
// arguments themselves.
bool isInSSAForm(const KvCControlFlowGraph& graph);

}  // namespace ssaopt::client::detail
