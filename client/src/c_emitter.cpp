// The C emitter: a function per procedure, its blocks as labelled statements in the order the printer
// shows them, control flow as goto, and "#main" as a step function that the caller's loop calls once
// per pass.
#include "ssaopt/client/c_emitter.h"

#include <set>
#include <sstream>
#include <unordered_map>
#include <unordered_set>

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
  CEmitter(const Program& program, const EmitOptions& options)
      : m_Program(program),
        m_Graph(program.graph()),
        m_View(program),
        m_Variables(program),
        m_ArgumentsAtCalls(!detail::isInSSAForm(m_Graph)),
        // Ranges are those that propagation leaves in the SSA versions; a program as written has none.
        m_Statements(m_Variables, options.useRanges && !m_ArgumentsAtCalls) {}

  EmittedC emit() {
    findPlacedParameters();
    findBlocksByProcedure();
    findRedundantInitialStores();
    std::string code = proceduresText() + "\n" + stepFunctionsText() + outputsText();
    std::vector<detail::CHelper> variableHelpers = m_Variables.helpers();
    std::vector<const detail::CHelper*> helpers;
    for (const detail::CHelper& helper : detail::cRuntimeHelpers()) helpers.push_back(&helper);
    for (const detail::CHelper& helper : variableHelpers) helpers.push_back(&helper);
    std::string called = detail::calledHelpersText(helpers, code);
    EmittedC emitted;
    emitted.text = "/* Emitted by ssaopt: one pass of \"#main\" per call of ssaopt_step(). */\n" +
                   std::string(detail::cPreludeText()) + "\n" + m_Variables.declarations() + called +
                   (called.empty() ? "" : "\n") + code;
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

  // Until a variable is first written it holds its initial value, which its static initialiser gave
  // it. The first step runs the blocks from the start of "#main" that nothing else jumps to; there a
  // constant assignment that stores the initial value into a variable not yet written changes
  // nothing, and leaving it out lets the compiler see that a variable never written is a constant.
  void findRedundantInitialStores() {
    const ProcedureView* pMain = mainProcedure();
    std::set<const KvCCfgSFVariable*> written;
    for (node v = pMain ? firstBlock(*pMain) : ssaopt::nil; v != ssaopt::nil; v = onlyContinuation(v)) {
      for (KvCCfgStatement* pStatement : m_Graph.getBasicBlock(v)->getStatementSeq()) {
        if (pStatement->isProcedureCall() || pStatement->isExternCall()) return;
        KvCCfgAssignment* pAssignment = pStatement->isAssignment();
        if (!pAssignment || pAssignment->getIsVirtual() || !pAssignment->getLHS()) continue;
        CVariable* pVariable = m_Variables.find(pAssignment->getLHS());
        if (!pVariable) return;
        if (written.insert(pVariable->pVariable).second &&
            m_Statements.storesInitialValue(*pAssignment, *pVariable))
          m_RedundantStores.insert(pStatement);
      }
    }
  }

  const ProcedureView* mainProcedure() const {
    for (const ProcedureView& procedure : m_View.procedures())
      if (procedure.name == kMainName) return &procedure;
    return nullptr;
  }

  node firstBlock(const ProcedureView& procedure) const {
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(procedure.pProcedure->getEntryNode());
    return out.size() == 1 ? onlyReachedFrom(m_Graph.target(out.front())) : ssaopt::nil;
  }

  // The block that `v` always goes on to, where nothing else leads to it.
  node onlyContinuation(node v) const {
    ssaopt::array<edge> out = m_Graph.getControlFlowOutEdges(v);
    if (m_Graph.getBasicBlock(v)->getBranchCond() || out.size() != 1) return ssaopt::nil;
    return onlyReachedFrom(m_Graph.target(out.front()));
  }

  node onlyReachedFrom(node v) const {
    return m_Graph.getBasicBlock(v) && m_Graph.hasOneControlFlowInEdge(v) ? v : ssaopt::nil;
  }

  // ---- Functions ---------------------------------------------------------------------------------

  // The functions of "#main" and of the procedures it calls, directly or through others, in the
  // printer's order: a unit holds no function that nothing calls.
  std::string proceduresText() {
    const std::vector<ProcedureView>& procedures = m_View.procedures();
    std::unordered_map<std::string, std::size_t> byName;
    std::vector<std::size_t> pending;
    for (std::size_t i = 0; i < procedures.size(); ++i) {
      if (procedures[i].name == kMainName) pending.push_back(i);
      byName.emplace(CStatements::procedureName(procedures[i].name), i);
    }
    std::vector<std::string> functions(procedures.size());
    std::vector<bool> emitted(procedures.size(), false);
    while (!pending.empty()) {
      std::size_t i = pending.back();
      pending.pop_back();
      if (emitted[i]) continue;
      emitted[i] = true;
      functions[i] = functionText(procedures[i], procedures[i].name == kMainName);
      for (const std::string& name : detail::functionNamesIn(functions[i]))
        if (auto called = byName.find(name); called != byName.end()) pending.push_back(called->second);
    }
    std::string prototypes, definitions;
    for (std::size_t i = 0; i < procedures.size(); ++i) {
      if (!emitted[i]) continue;
      if (procedures[i].name != kMainName)
        prototypes += "static void " + CStatements::procedureName(procedures[i].name) + "(void);\n";
      definitions += "\n" + functions[i];
    }
    return prototypes + "static int ssa_main(int ssa_resume);\n" + definitions;
  }

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
      text << "static void " << CStatements::procedureName(procedure.name) << "(void) {\n";
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
    if (auto all = m_BlocksByProcedure.find(procedure.pProcedure); all != m_BlocksByProcedure.end())
      for (node v : all->second) place(v);
    return blocks;
  }

  // Every block of each procedure in node order, found in one pass over the graph.
  void findBlocksByProcedure() {
    for (node v : m_Graph.nodes())
      if (m_Graph.getBasicBlock(v)) m_BlocksByProcedure[m_Graph.inf(v)->getProcedure()].push_back(v);
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
      if (m_RedundantStores.count(pStatement)) continue;
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
  bool m_ArgumentsAtCalls;
  CStatements m_Statements;
  std::unordered_set<const KvCCfgStatement*> m_RedundantStores;
  std::unordered_map<const KvCCfgProcedure*, std::vector<node>> m_BlocksByProcedure;
};

}  // namespace

EmittedC emitC(const Program& program, const EmitOptions& options) {
  return CEmitter(program, options).emit();
}

}  // namespace ssaopt::client
