// The C emitter: a function per procedure, its blocks as labelled statements in the order the printer
// shows them, control flow as goto, and "#main" as a step function that the caller's loop calls once
// per pass.
#include "ssaopt/client/c_emitter.h"

#include <set>
#include <sstream>
#include <unordered_map>

#include "c_emitter_code.h"
#include "program_view.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::client {

namespace {

using detail::CStatements;
using detail::CVariable;
using detail::ProcedureView;
using detail::Unemittable;
using ssaopt::edge;
using ssaopt::node;

constexpr const char* kIndent = "  ";
constexpr const char* kMainName = "#main";

// How "#main" is entered: at its start, at the head of its loop, or where the loop is left.
constexpr const char* kResumeAtHead = "1";
constexpr const char* kResumeLeaving = "2";

std::string cString(const std::string& text) {
  std::string quoted = "\"";
  for (char c : text) quoted += c == '"' || c == '\\' ? std::string("\\") + c : std::string(1, c);
  return quoted + "\"";
}

class CEmitter {
public:
  explicit CEmitter(const Program& program)
      : m_Program(program),
        m_Graph(program.graph()),
        m_View(program),
        m_Variables(program),
        m_Statements(m_Variables),
        m_ArgumentsAtCalls(!detail::isInSSAForm(m_Graph)) {}

  EmittedC emit() {
    findPlacedParameters();
    std::ostringstream procedures, prototypes;
    // The front end makes sure that there is a "#main", and no step of the pipeline removes it.
    for (const ProcedureView& procedure : m_View.procedures()) {
      bool isMain = procedure.name == kMainName;
      if (!isMain) prototypes << "void " << CStatements::procedureName(procedure.name) << "(void);\n";
      procedures << "\n" << functionText(procedure, isMain);
    }
    std::string outputs = outputsText();
    EmittedC emitted;
    emitted.text = "/* Emitted by ssaopt: one pass of \"#main\" per call of ssaopt_step(). */\n" +
                   std::string(detail::cRuntimeText()) + "\n" + m_Variables.declarations() +
                   prototypes.str() + "static int ssa_main(int ssa_resume);\n" + procedures.str() + "\n" +
                   stepFunctionsText() + outputs;
    for (const CVariable& variable : m_Variables.all())
      if (detail::CVariables::hasInputHook(variable))
        emitted.inputs.push_back(
            EmittedInput{variable.pVariable->getName(), m_Variables.inputHook(variable)});
    return emitted;
  }

private:
  void findPlacedParameters() {
    for (node v : m_Graph.nodes())
      if (KvCBasicBlock* pBlock = m_Graph.getBasicBlock(v))
        for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
          if (KvCCfgParamStatement* pParam = pStatement->isParamStatement())
            m_Statements.placeParameter(pParam);
  }

  // ---- Functions ---------------------------------------------------------------------------------

  struct Function {
    bool isMain;
    std::vector<node> blocks;
    std::unordered_map<std::uint32_t, std::string> labels;  // by node index
    std::set<std::uint32_t> jumpedTo;
    node loop;  // the block closing "#main" into a loop, if any
  };

  std::string functionText(const ProcedureView& procedure, bool isMain) {
    Function function{isMain, blocksOf(procedure), {}, {}, ssaopt::nil};
    assignLabels(function);
    std::vector<std::vector<std::string>> bodies;
    for (std::size_t i = 0; i < function.blocks.size(); ++i)
      bodies.push_back(blockLines(function, function.blocks[i],
                                  i + 1 < function.blocks.size() ? function.blocks[i + 1] : ssaopt::nil));
    std::ostringstream text;
    if (isMain)
      text << "/* \"#main\": from its start (0), from the head of its loop (1), or where it leaves "
              "the\n"
              "   loop (2); returns 1 at the end of a pass, 0 once \"#main\" has ended. */\n"
              "static int ssa_main(int ssa_resume) {\n"
           << resumeLines(function);
    else
      text << "void " << CStatements::procedureName(procedure.name) << "(void) {\n";
    for (std::size_t i = 0; i < function.blocks.size(); ++i) {
      if (function.jumpedTo.count(function.blocks[i].index()))
        text << function.labels[function.blocks[i].index()] << ":\n";
      for (const std::string& line : bodies[i]) text << kIndent << line << "\n";
    }
    return text.str() + "}\n";
  }

  // The printer's order, the blocks it leaves out after them.
  std::vector<node> blocksOf(const ProcedureView& procedure) const {
    std::vector<node> blocks;
    std::set<std::uint32_t> placed;
    auto place = [&](node v) {
      if (v != ssaopt::nil && m_Graph.getBasicBlock(v) && placed.insert(v.index()).second)
        blocks.push_back(v);
    };
    node entry = procedure.pProcedure->getEntryNode();
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(entry);
    if (out.size() == 1) place(m_Graph.target(out.front()));
    for (node v : procedure.blocks) place(v);
    for (node v : m_Graph.nodes())
      if (m_Graph.getBasicBlock(v) && m_Graph.inf(v)->getProcedure() == procedure.pProcedure) place(v);
    return blocks;
  }

  void assignLabels(Function& function) const {
    std::set<std::string> used;
    std::vector<node> unnamed;
    for (node v : function.blocks) {
      const std::string& label = m_View.labelOf(v);
      if (!label.empty() && detail::isFreeCIdentifier(label) && used.insert(label).second)
        function.labels[v.index()] = label;
      else
        unnamed.push_back(v);
    }
    for (node v : unnamed)
      function.labels[v.index()] = detail::unusedBlockName(*m_Graph.getBasicBlock(v), used);
  }

  // ---- Blocks and control flow -------------------------------------------------------------------

  static std::string blockName(const KvCBasicBlock& block) { return "bb" + std::to_string(block.getIndex()); }

  static std::string faultLine(const Function& function, const std::string& message) {
    return "ssa_fault(" + cString(message) + ");" + (function.isMain ? " return 0;" : " return;");
  }

  std::vector<std::string> blockLines(Function& function, node v, node next) {
    KvCBasicBlock& block = *m_Graph.getBasicBlock(v);
    std::vector<std::string> lines;
    for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
      try {
        std::vector<std::string> code = m_Statements.statement(*pStatement, m_Graph, m_ArgumentsAtCalls);
        lines.insert(lines.end(), code.begin(), code.end());
      } catch (const Unemittable& problem) {
        lines.push_back(faultLine(function, blockName(block) + ": " + problem.message));
        return lines;
      }
    }
    std::vector<std::string> jump = terminatorLines(function, v, block, next);
    lines.insert(lines.end(), jump.begin(), jump.end());
    return lines;
  }

  std::vector<std::string> terminatorLines(Function& function, node v, const KvCBasicBlock& block,
                                           node next) {
    KvCCfgExpression* pCondition = block.getBranchCond();
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(v);
    if (!pCondition) {
      if (out.size() != 1)
        return {faultLine(function, blockName(block) + " has " + std::to_string(out.size()) +
                                        " successors and no condition")};
      node target = m_Graph.target(out.front());
      if (target == next) return {};
      return {jumpText(function, target, "")};
    }
    node onTrue = branchTarget(out, true), onFalse = branchTarget(out, false);
    if (function.isMain && pCondition == m_Program.mainLoopCondition()) {
      if (function.loop == ssaopt::nil) function.loop = v;
      return {"return 1; /* the end of a pass: the caller's loop runs the next one */"};
    }
    std::vector<std::string> lines;
    try {
      lines = m_Statements.branch(pCondition, jumpText(function, onTrue, blockName(block) + " goes true"));
    } catch (const Unemittable& problem) {
      return {faultLine(function, blockName(block) + ": the condition: " + problem.message)};
    }
    if (onFalse == ssaopt::nil || onFalse != next)
      lines.push_back(jumpText(function, onFalse, blockName(block) + " goes false"));
    return lines;
  }

  // A goto, a return at the procedure's exit, or the fault of an edge the graph no longer has.
  std::string jumpText(Function& function, node target, const std::string& branch) {
    if (target == ssaopt::nil) return "{ " + faultLine(function, branch + " but has no such edge") + " }";
    if (m_Graph.inf(target)->isExitNode()) return function.isMain ? "return 0;" : "return;";
    if (!m_Graph.getBasicBlock(target))
      return "{ " + faultLine(function, "a jump to a node without block") + " }";
    function.jumpedTo.insert(target.index());
    return "goto " + function.labels[target.index()] + ";";
  }

  std::string resumeLines(Function& function) {
    if (function.loop == ssaopt::nil) return "  (void)ssa_resume;\n";
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(function.loop);
    std::string loopName = blockName(*m_Graph.getBasicBlock(function.loop));
    return std::string(kIndent) + "if (ssa_resume == " + kResumeAtHead + ") " +
           jumpText(function, branchTarget(out, true), loopName + " goes true") + "\n" + kIndent +
           "if (ssa_resume == " + kResumeLeaving + ") " +
           jumpText(function, branchTarget(out, false), loopName + " goes false") + "\n";
  }

  node branchTarget(const ssaopt::array<edge>& out, bool onTrue) const {
    for (edge e : out) {
      KvCCfgEdgeInfo* pKind = m_Graph.inf(e);
      if (pKind && (onTrue ? pKind->isTrueBranch() != nullptr : pKind->isFalseBranch() != nullptr))
        return m_Graph.target(e);
    }
    return ssaopt::nil;
  }

  // ---- The interface of the unit -----------------------------------------------------------------

  static std::string stepFunctionsText() {
    return std::string(
               "/* One pass of \"#main\": the first from its start, the later ones from the head of its "
               "loop.\n"
               "   Returns 0 once \"#main\" has ended instead. */\n"
               "int ssaopt_step(void) {\n"
               "  static int ssa_started;\n"
               "  int ssa_resume = ssa_started ? ") +
           kResumeAtHead +
           " : 0;\n"
           "  ssa_started = 1;\n"
           "  return ssa_main(ssa_resume);\n"
           "}\n\n"
           "/* Leaves the loop around \"#main\": runs what follows it up to the end. */\n"
           "void ssaopt_finish(void) { (void)ssa_main(" +
           kResumeLeaving + "); }\n\n";
  }

  std::string outputsText() {
    std::string text =
        "/* Reports the output variables through the trace hooks. */\nvoid ssaopt_outputs(void) {\n";
    for (CVariable& output : m_Variables.all()) {
      if (!output.pVariable->isOutput()) continue;
      text += std::string(kIndent) + "ssa_output_begin();\n" + kIndent;
      text += output.pVariable->isArray() ? "ssa_observe_" + output.name + "();\n"
                                          : "ssa_value(" + cString(output.pVariable->getName()) + ", " +
                                                m_Variables.readText(output) + ");\n";
      text += std::string(kIndent) + "ssa_output_end();\n";
    }
    return text + "}\n";
  }

  const Program& m_Program;
  const KvCControlFlowGraph& m_Graph;
  detail::ProgramView m_View;
  detail::CVariables m_Variables;
  CStatements m_Statements;
  bool m_ArgumentsAtCalls;
};

}  // namespace

EmittedC emitC(const Program& program) { return CEmitter(program).emit(); }

}  // namespace ssaopt::client
