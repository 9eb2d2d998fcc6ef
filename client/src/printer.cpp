#include "ssaopt/client/printer.h"

#include <sstream>

#include "program_view.h"
#include "ssaopt/client/data_types.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/ir/statement.h"
#include "statement_text.h"

namespace ssaopt::client {

namespace {

using detail::ProcedureView;
using detail::ProgramView;
using ssaopt::edge;
using ssaopt::node;

constexpr const char* kIndent = "  ";

std::string declarationText(const KvCCfgSFVariable& variable) {
  std::string text = std::string("var ") + nameOfDataType(variable.getDataType()) + " " + variable.getName();
  if (variable.isArray()) text += "[" + std::to_string(variable.getArrayLength()) + "]";
  if (const KV_Scaling* pScaling = variable.getScaling()) {
    text += " scale(" + formatNumber(pScaling->getLSB());
    if (pScaling->getOffset() != 0.0) text += ", " + formatNumber(pScaling->getOffset());
    text += ")";
  }
  if (variable.isLowerBorderSaturated() || variable.isUpperBorderSaturated())
    text += " saturate(" + (variable.isLowerBorderSaturated() ? formatNumber(variable.getLowerLimit()) : "") +
            ".." + (variable.isUpperBorderSaturated() ? formatNumber(variable.getUpperLimit()) : "") + ")";
  if (variable.isOutput()) text += " output";
  if (variable.isVolatile()) text += " volatile";
  if (variable.isErasable()) text += " erasable";
  if (variable.hasDeclaredInitValue()) text += " = " + formatNumber(variable.getInitValue()->getValue());
  return text + ";";
}

class Printer {
public:
  Printer(const Program& program, const PrintOptions& options) : m_View(program), m_Options(options) {}

  std::string print() {
    bool whole = m_Options.procedure.empty();
    if (whole)
      for (const auto& pVariable : m_View.program().variables()) m_Out << declarationText(*pVariable) << "\n";
    for (const ProcedureView& procedure : m_View.procedures())
      if (whole || procedure.name == m_Options.procedure) printProcedure(procedure);
    // A procedure alone goes without the empty line that separates it from what comes before.
    std::string text = m_Out.str();
    return whole || text.empty() ? text : text.substr(1);
  }

private:
  void printProcedure(const ProcedureView& procedure) {
    m_Out << "\nproc " << procedure.name;
    const std::vector<KvCCfgSFVariable*>& formals = m_View.program().formalsOf(procedure.name);
    if (!formals.empty()) {
      m_Out << "(";
      for (std::size_t i = 0; i < formals.size(); ++i) m_Out << (i ? ", " : "") << formals[i]->getName();
      m_Out << ")";
    }
    m_Out << " {\n";
    for (std::size_t i = 0; i < procedure.blocks.size(); ++i)
      printBlock(procedure.blocks[i],
                 i + 1 < procedure.blocks.size() ? procedure.blocks[i + 1] : ssaopt::nil);
    m_Out << "}\n";
  }

  void printBlock(node v, node next) {
    const std::string& label = m_View.labelOf(v);
    if (!label.empty()) m_Out << label << ":\n";
    KvCBasicBlock& block = *m_View.graph().getBasicBlock(v);
    for (KvCPhiFunction* pPhi : block.getPhiFunctions())
      printLine(detail::phiText(m_View, *pPhi, v), pPhi->getVariable());
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      printLine(detail::statementText(m_View, *pStatement), detail::definedVariable(*pStatement));
    printTerminator(v, block, next);
    if (m_Options.showValues) printExecutableEdges(v);
  }

  void printLine(const std::string& text, KvCCfgVariable* pDefined) {
    m_Out << kIndent << text << ";";
    if (m_Options.showValues && pDefined) m_Out << "  // " << detail::propagatedText(*pDefined);
    m_Out << "\n";
  }

  std::string targetName(node target) const { return m_View.isEnd(target) ? "end" : m_View.labelOf(target); }

  // A single successor is left implicit where the text falls through to it: the next block, or the
  // end after the last block.
  void printTerminator(node v, const KvCBasicBlock& block, node next) {
    ssaopt::array<edge> out = m_View.graph().getControlFlowOutEdges(v);
    if (block.getBranchCond()) {
      m_Out << kIndent << "if " << detail::expressionText(m_View, block.getBranchCond()) << " goto "
            << branchTarget(out, true) << " else " << branchTarget(out, false) << ";\n";
      return;
    }
    node target = out.empty() ? ssaopt::nil : m_View.graph().target(out.front());
    bool fallsThrough = target == ssaopt::nil
                            ? next == ssaopt::nil
                            : (target == next || (m_View.isEnd(target) && next == ssaopt::nil));
    if (!fallsThrough)
      m_Out << kIndent << "goto " << (target == ssaopt::nil ? "end" : targetName(target)) << ";\n";
  }

  std::string branchTarget(const ssaopt::array<edge>& out, bool onTrue) const {
    for (edge e : out) {
      KvCCfgEdgeInfo* pInfo = m_View.graph().inf(e);
      if (onTrue ? pInfo->isTrueBranch() != nullptr : pInfo->isFalseBranch() != nullptr)
        return targetName(m_View.graph().target(e));
    }
    return "removed";  // dead-code elimination took the branch with the block it led to
  }

  // Where constant propagation decided something: which edges out of a branch it found executable.
  void printExecutableEdges(node v) {
    ssaopt::array<edge> out = m_View.graph().getControlFlowOutEdges(v);
    if (!m_View.graph().getBasicBlock(v)->getBranchCond() || out.empty()) return;
    m_Out << kIndent << "//";
    for (std::size_t i = 0; i < out.size(); ++i)
      m_Out << (i ? "," : "") << " to " << targetName(m_View.graph().target(out[i])) << ": "
            << (m_View.graph().inf(out[i])->isEdgeExecutable() ? "executable" : "not executable");
    m_Out << "\n";
  }

  ProgramView m_View;
  const PrintOptions& m_Options;
  std::ostringstream m_Out;
};

}  // namespace

std::string printProgram(const Program& program, const PrintOptions& options) {
  return Printer(program, options).print();
}

}  // namespace ssaopt::client
