#include "ssaopt/client/dot.h"

#include <sstream>
#include <unordered_map>

#include "program_view.h"
#include "statement_text.h"

namespace ssaopt::client {

namespace {

using detail::ProgramView;
using ssaopt::edge;
using ssaopt::node;

// Characters that structure a record label, and those that end or escape a quoted string.
std::string escapedForRecord(const std::string& text) {
  std::string escaped;
  for (char c : text) {
    if (c == '{' || c == '}' || c == '|' || c == '<' || c == '>' || c == '"' || c == '\\') escaped += '\\';
    escaped += c;
  }
  return escaped;
}

std::string escapedForString(const std::string& text) {
  std::string escaped;
  for (char c : text) {
    if (c == '"' || c == '\\') escaped += '\\';
    escaped += c;
  }
  return escaped;
}

std::string nodeId(node v) { return "n" + std::to_string(v.index()); }

class DotWriter {
public:
  explicit DotWriter(const Program& program) : m_View(program), m_Graph(program.graph()) {}

  std::string write() {
    m_Out << "digraph program {\n  node [shape=record, fontname=\"monospace\", fontsize=10];\n";
    groupNodesByProcedure();
    for (std::size_t i = 0; i < m_View.procedures().size(); ++i) writeCluster(i);
    for (node v : m_Unclustered) writeNode(v);
    for (edge e : m_Graph.edges()) writeEdge(e);
    m_Out << "}\n";
    return m_Out.str();
  }

private:
  void groupNodesByProcedure() {
    std::unordered_map<KvCCfgProcedure*, std::size_t> clusterOf;
    for (std::size_t i = 0; i < m_View.procedures().size(); ++i)
      clusterOf[m_View.procedures()[i].pProcedure] = i;
    m_Members.resize(m_View.procedures().size());
    for (node v : m_Graph.nodes()) {
      auto found = clusterOf.find(m_Graph.inf(v) ? m_Graph.inf(v)->getProcedure() : nullptr);
      if (found == clusterOf.end())
        m_Unclustered.push_back(v);
      else
        m_Members[found->second].push_back(v);
    }
  }

  void writeCluster(std::size_t i) {
    m_Out << "  subgraph cluster_" << i << " {\n    label=\"" << escapedForString(m_View.procedures()[i].name)
          << "\";\n";
    for (node v : m_Members[i]) {
      m_Out << "  ";
      writeNode(v);
    }
    m_Out << "  }\n";
  }

  void writeNode(node v) {
    KvCCfgNodeInfo* pInfo = m_Graph.inf(v);
    KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v);
    m_Out << "  " << nodeId(v);
    if (!pBlock)
      m_Out << " [shape=ellipse, label=\"" << (pInfo && pInfo->isEntryNode() ? "entry" : "exit") << "\"];\n";
    else
      m_Out << " [label=\"{" << escapedForRecord(titleOf(v, *pBlock)) << contentsOf(v, *pBlock) << "}\"];\n";
  }

  std::string titleOf(node v, const KvCBasicBlock& block) const {
    const std::string& label = m_View.labelOf(v);
    return label.empty() ? "bb" + std::to_string(block.getIndex()) : label;
  }

  // One left-justified line per phi function, statement and condition.
  std::string contentsOf(node v, const KvCBasicBlock& block) const {
    std::string lines;
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) lines += line(detail::phiText(m_View, *pPhi, v));
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      lines += line(detail::statementText(m_View, *pStatement));
    if (block.getBranchCond()) lines += line("if " + detail::expressionText(m_View, block.getBranchCond()));
    return lines.empty() ? "" : "|" + lines;
  }

  static std::string line(const std::string& text) { return escapedForRecord(text) + "\\l"; }

  void writeEdge(edge e) {
    KvCCfgEdgeInfo* pInfo = m_Graph.inf(e);
    m_Out << "  " << nodeId(m_Graph.source(e)) << " -> " << nodeId(m_Graph.target(e));
    if (pInfo && pInfo->isSSAEdge())
      m_Out << " [style=dashed, color=gray50, constraint=false]";
    else if (pInfo && pInfo->isTrueBranch())
      m_Out << " [label=\"T\"]";
    else if (pInfo && pInfo->isFalseBranch())
      m_Out << " [label=\"F\"]";
    m_Out << ";\n";
  }

  ProgramView m_View;
  const KvCControlFlowGraph& m_Graph;
  std::vector<std::vector<node>> m_Members;
  std::vector<node> m_Unclustered;
  std::ostringstream m_Out;
};

}  // namespace

std::string writeDot(const Program& program) { return DotWriter(program).write(); }

}  // namespace ssaopt::client
