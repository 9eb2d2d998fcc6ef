#include "ssaopt/client/dot.h"

#include <sstream>
#include <unordered_map>

#include "program_view.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "statement_text.h"

namespace ssaopt::client {

namespace {

using detail::ProcedureView;
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

constexpr const char* kNotExecutable = "color=red, fontcolor=red, style=dashed";
constexpr const char* kCall = "style=dashed, color=blue, arrowhead=open";

class DotWriter {
public:
  DotWriter(const Program& program, const DotOptions& options)
      : m_View(program), m_Graph(program.graph()), m_Options(options) {}

  std::string write() {
    m_Out << "digraph program {\n"
             "  graph [fontname=\"monospace\", fontsize=12];\n"
             "  node [shape=record, fontname=\"monospace\", fontsize=10];\n"
             "  edge [fontname=\"monospace\", fontsize=9];\n";
    for (std::size_t i = 0; i < m_View.procedures().size(); ++i)
      if (isShown(m_View.procedures()[i])) writeCluster(i);
    m_Out << m_Edges.str() << "}\n";
    return m_Out.str();
  }

private:
  bool isShown(const ProcedureView& procedure) const {
    return m_Options.procedure.empty() || procedure.name == m_Options.procedure;
  }

  void writeCluster(std::size_t i) {
    const ProcedureView& procedure = m_View.procedures()[i];
    m_Out << "  subgraph cluster_" << i << " {\n    label=\"" << escapedForString(procedure.name) << "\";\n";
    node entry = procedure.pProcedure->getEntryNode();
    m_Exit = procedure.pProcedure->getExitNode();
    m_Out << "    " << nodeId(entry) << " [shape=ellipse, label=\"entry\"];\n";
    if (m_Exit != ssaopt::nil) m_Out << "    " << nodeId(m_Exit) << " [shape=ellipse, label=\"end\"];\n";
    std::vector<std::vector<node>> boxes = boxesOf(procedure);
    for (const std::vector<node>& box : boxes) writeBox(box);
    writeControlEdges(entry, entry);
    for (const std::vector<node>& box : boxes) {
      writeControlEdges(box.front(), box.back());
      writeCallEdges(box);
    }
    m_Out << "  }\n";
  }

  // The shown blocks in print order, each run of blocks that fall into one another as one box.
  std::vector<std::vector<node>> boxesOf(const ProcedureView& procedure) {
    std::vector<std::vector<node>> boxes;
    for (node v : procedure.blocks) {
      if (boxes.empty() || m_View.continuationOf(boxes.back().back()) != v)
        boxes.push_back({v});
      else
        boxes.back().push_back(v);
      m_BoxOf[v.index()] = boxes.back().front();
    }
    return boxes;
  }

  // The box a block stands in, or the end.
  std::string idOf(node v) const {
    if (m_View.isEnd(v) && m_Exit != ssaopt::nil) return nodeId(m_Exit);
    auto found = m_BoxOf.find(v.index());
    return nodeId(found == m_BoxOf.end() ? v : found->second);
  }

  void writeBox(const std::vector<node>& box) {
    std::string title = escapedForRecord(m_View.labelOf(box.front()));
    std::string lines;
    for (std::size_t i = 0; i < box.size(); ++i) {
      if (i > 0 && !m_View.labelOf(box[i]).empty()) lines += line(m_View.labelOf(box[i]) + ":");
      lines += contentsOf(box[i]);
    }
    std::string label = title.empty() || lines.empty() ? title + lines : title + "|" + lines;
    m_Out << "    " << nodeId(box.front()) << " [label=\"{" << (label.empty() ? " " : label) << "}\"];\n";
  }

  // One left-justified line per phi function, statement and condition.
  std::string contentsOf(node v) const {
    const KvCBasicBlock& block = *m_Graph.getBasicBlock(v);
    std::string lines;
    for (KvCPhiFunction* pPhi : block.getPhiFunctions())
      lines += line(detail::phiText(m_View, *pPhi, v), pPhi->getVariable());
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      lines += line(detail::statementText(m_View, *pStatement), detail::definedVariable(*pStatement));
    if (block.getBranchCond()) lines += line("if " + detail::expressionText(m_View, block.getBranchCond()));
    return lines;
  }

  std::string line(const std::string& text, KvCCfgVariable* pDefined = nullptr) const {
    std::string shown = text;
    if (m_Options.showValues && pDefined) shown += "  // " + detail::propagatedText(*pDefined);
    return escapedForRecord(shown) + "\\l";
  }

  // From the box that ends with block `last` (or from an entry node): to the boxes it leads to, or to
  // the end, and to "removed" for a branch that dead-code elimination took away.
  void writeControlEdges(node box, node last) {
    KvCBasicBlock* pBlock = m_Graph.getBasicBlock(last);
    bool onTrue = false, onFalse = false;
    for (edge e : m_Graph.getControlFlowOutEdges(last)) {
      KvCCfgEdgeInfo* pInfo = m_Graph.inf(e);
      std::vector<std::string> attributes;
      if (pInfo->isTrueBranch()) attributes.push_back("label=\"T\""), onTrue = true;
      if (pInfo->isFalseBranch()) attributes.push_back("label=\"F\""), onFalse = true;
      if (m_Options.showValues && pBlock && !pInfo->isEdgeExecutable()) attributes.push_back(kNotExecutable);
      writeEdge(box, idOf(m_Graph.target(e)), attributes);
    }
    if (pBlock && pBlock->getBranchCond() && !(onTrue && onFalse))
      writeRemovedBranch(box, onTrue ? "F" : "T");
  }

  void writeRemovedBranch(node box, const char* branch) {
    std::string colour = m_Options.showValues ? "red" : "gray50";
    std::string id = "removed" + std::to_string(box.index());
    m_Out << "    " << id << " [shape=plaintext, label=\"removed\", fontcolor=" << colour << "];\n";
    writeEdge(box, id, {"label=\"" + std::string(branch) + "\"", "style=dotted, color=" + colour});
  }

  void writeCallEdges(const std::vector<node>& box) {
    for (node v : box)
      for (KvCCfgStatement* pStatement : m_Graph.getBasicBlock(v)->getStatementSeq()) {
        KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
        KvCCfgProcedure* pCallee = pCall ? m_Graph.findProcedure(pCall->getName()) : nullptr;
        if (pCallee && (m_Options.procedure.empty() || m_Options.procedure == pCallee->getName().cstring()))
          writeEdge(box.front(), nodeId(pCallee->getEntryNode()), {kCall});
      }
  }

  void writeEdge(node from, const std::string& to, const std::vector<std::string>& attributes) {
    m_Edges << "  " << nodeId(from) << " -> " << to;
    for (std::size_t i = 0; i < attributes.size(); ++i) m_Edges << (i ? ", " : " [") << attributes[i];
    m_Edges << (attributes.empty() ? ";\n" : "];\n");
  }

  ProgramView m_View;
  const KvCControlFlowGraph& m_Graph;
  const DotOptions& m_Options;
  std::ostringstream m_Out;
  std::ostringstream m_Edges;
  node m_Exit;                                      // of the procedure being written
  std::unordered_map<std::uint32_t, node> m_BoxOf;  // by node index: the first block of its box
};

}  // namespace

std::string writeDot(const Program& program, const DotOptions& options) {
  return DotWriter(program, options).write();
}

}  // namespace ssaopt::client
