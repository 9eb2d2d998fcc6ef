// Procedure bodies: names resolved to variables, procedures and blocks, and every check a single
// statement or condition allows.
#include <cmath>
#include <string>
#include <unordered_map>

#include "front_end_steps.h"
#include "ssaopt/client/data_types.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/client/statements.h"

namespace ssaopt::client::detail {

namespace {

std::string quoted(std::string_view text) { return "'" + std::string(text) + "'"; }

class BodyResolver {
public:
  BodyResolver(const Signatures& signatures, Program& program, CheckState& state)
      : m_Signatures(signatures), m_Program(program), m_State(state) {}

  ResolvedProcedure resolve(const SyntaxProcedure& syntax) {
    ResolvedProcedure procedure;
    procedure.pSyntax = &syntax;
    procedure.name = std::string(syntax.name.text);
    indexLabels(syntax);
    procedure.blocks.resize(syntax.blocks.size());
    for (std::size_t i = 0; i < syntax.blocks.size(); ++i) resolveBlock(syntax, i, procedure.blocks[i]);
    return procedure;
  }

private:
  // ---- Blocks ----------------------------------------------------------------------------------

  void indexLabels(const SyntaxProcedure& syntax) {
    m_Labels.clear();
    for (std::size_t i = 0; i < syntax.blocks.size(); ++i) {
      const SyntaxName& label = syntax.blocks[i].label;
      if (label.text.empty()) continue;
      auto inserted = m_Labels.emplace(label.text, static_cast<int>(i));
      if (!inserted.second)
        m_State.diagnostics.error(label.pos,
                                  "label " + quoted(label.text) + " is already used at line " +
                                      std::to_string(syntax.blocks[inserted.first->second].label.pos.line));
    }
  }

  void resolveBlock(const SyntaxProcedure& syntax, std::size_t i, ResolvedBlock& block) {
    const SyntaxBlock& written = syntax.blocks[i];
    block.pSyntax = &written;
    for (const SyntaxStatement& statement : written.statements)
      recovering([&] { block.statements.push_back(resolveStatement(statement)); });
    const SyntaxTerminator& terminator = written.terminator;
    switch (terminator.kind) {
      case SyntaxTerminator::Kind::FallThrough:
        block.onTrue = i + 1 < syntax.blocks.size() ? static_cast<int>(i + 1) : kEnd;
        break;
      case SyntaxTerminator::Kind::Goto:
        recovering([&] { block.onTrue = blockOf(terminator.onTrue, syntax); });
        break;
      case SyntaxTerminator::Kind::Branch:
        recovering([&] { block.pCondition = resolveExpression(terminator.condition); });
        recovering([&] { block.onTrue = blockOf(terminator.onTrue, syntax); });
        recovering([&] { block.onFalse = blockOf(terminator.onFalse, syntax); });
        break;
    }
  }

  // Runs one check, recording its error; what the check would have set keeps its default.
  template <typename Check>
  void recovering(const Check& check) {
    try {
      check();
    } catch (const SourceError& error) {
      m_State.diagnostics.error(error);
    } catch (const FollowUpError&) {
    }
  }

  int blockOf(const SyntaxTarget& target, const SyntaxProcedure& syntax) const {
    if (target.isEnd) return kEnd;
    auto found = m_Labels.find(target.label.text);
    if (found == m_Labels.end())
      throw SourceError(target.label.pos, "no block " + quoted(target.label.text) + " in procedure " +
                                              quoted(syntax.name.text));
    return found->second;
  }

  // ---- Statements ------------------------------------------------------------------------------

  std::unique_ptr<KvCCfgStatement> resolveStatement(const SyntaxStatement& statement) {
    switch (statement.kind) {
      case SyntaxStatement::Kind::Call:
        return resolveCall(statement);
      case SyntaxStatement::Kind::ExternCall:
        return resolveExternCall(statement);
      case SyntaxStatement::Kind::Assignment:
        break;
    }
    return resolveAssignment(statement);
  }

  std::unique_ptr<KvCCfgStatement> resolveAssignment(const SyntaxStatement& statement) {
    KvCCfgSFVariable* pTarget = variableNamed(statement.name);
    if (statement.index) return resolveElementWrite(statement, pTarget);
    if (pTarget->isArray())
      throw SourceError(statement.name.pos, quoted(statement.name.text) +
                                                " is an array; assign an element: " +
                                                std::string(statement.name.text) + "[i] = ...");
    checkLiteralFits(statement.value, *pTarget);
    return std::make_unique<KvCCfgSFAssignment>(pTarget, resolveExpression(statement.value));
  }

  // a[i] = e reads i and e, and a itself: its other elements live on.
  std::unique_ptr<KvCCfgStatement> resolveElementWrite(const SyntaxStatement& statement,
                                                       KvCCfgSFVariable* pArray) {
    requireArray(*pArray, statement.name);
    checkLiteralIndex(*statement.index, *pArray);
    checkLiteralFits(statement.value, *pArray);
    KvCCfgSFExpression::Terms terms = termsOf(*statement.index);
    KvCCfgSFExpression::Terms value = termsOf(statement.value);
    terms.insert(terms.end(), value.begin(), value.end());
    terms.push_back(KvCCfgSFExpression::Term{TermOp::ElementWrite, 0.0, pArray});
    return std::make_unique<KvCCfgSFAssignment>(
        pArray, m_Program.expressions().make(std::move(terms), statement.pos));
  }

  std::unique_ptr<KvCCfgStatement> resolveCall(const SyntaxStatement& statement) {
    const Signature& callee = signatureOf(statement.name);
    const std::vector<KvCCfgSFVariable*>& formals = callee.formals;
    if (statement.arguments.size() != formals.size())
      throw SourceError(statement.name.pos, quoted(statement.name.text) + " takes " +
                                                std::to_string(formals.size()) + " argument" +
                                                (formals.size() == 1 ? "" : "s") + ", " +
                                                std::to_string(statement.arguments.size()) + " given");
    KvCCfgSFProcedureCall::Arguments arguments;
    for (std::size_t i = 0; i < formals.size(); ++i) {
      checkReadsNoOtherFormal(statement.arguments[i], i, callee);
      checkLiteralFits(statement.arguments[i], *formals[i]);
      arguments.push_back(resolveExpression(statement.arguments[i]));
    }
    return std::make_unique<KvCCfgSFProcedureCall>(BxCXString(std::string(statement.name.text).c_str()),
                                                   std::move(arguments));
  }

  std::unique_ptr<KvCCfgStatement> resolveExternCall(const SyntaxStatement& statement) {
    ssaopt::list<KvCCfgVariable*> modifiable;
    for (const SyntaxName& name : statement.modifies) {
      KvCCfgSFVariable* pVariable = variableNamed(name);
      if (!pVariable->isVolatile() && !pVariable->isArray())
        throw SourceError(name.pos, quoted(name.text) + " may be modified by " + quoted(statement.name.text) +
                                        ", so it must be volatile or an array");
      modifiable.push_back(pVariable);
    }
    auto pCall = std::make_unique<KvCCfgSFExternCall>(BxCXString(std::string(statement.name.text).c_str()),
                                                      modifiable);
    for (const SyntaxName& name : statement.uses) pCall->appendUsedVariable(variableNamed(name));
    return pCall;
  }

  // The library evaluates a call's arguments together, while inlining assigns them one after the
  // other: an argument that read another formal would see it already changed.
  void checkReadsNoOtherFormal(const SyntaxExpression& argument, std::size_t position,
                               const Signature& callee) {
    for (const SyntaxTerm& term : argument.terms) {
      if (!namesVariable(term.op)) continue;
      for (std::size_t j = 0; j < callee.formals.size(); ++j)
        if (j != position && callee.formals[j]->getName() == term.name)
          throw SourceError(term.pos, "argument " + std::to_string(position + 1) + " reads " +
                                          quoted(term.name) + ", another parameter of " +
                                          quoted(callee.pSyntax->name.text));
    }
  }

  // ---- Expressions -----------------------------------------------------------------------------

  KvCCfgSFExpression* resolveExpression(const SyntaxExpression& expression) {
    return m_Program.expressions().make(termsOf(expression), expression.pos);
  }

  KvCCfgSFExpression::Terms termsOf(const SyntaxExpression& expression) {
    KvCCfgSFExpression::Terms terms;
    terms.reserve(expression.terms.size());
    for (std::size_t i = 0; i < expression.terms.size(); ++i) {
      const SyntaxTerm& term = expression.terms[i];
      KvCCfgSFExpression::Term resolved{term.op, term.number, nullptr};
      if (term.op == TermOp::Variable) resolved.pVariable = scalarNamed(term);
      if (term.op == TermOp::ElementRead)
        resolved.pVariable = arrayNamed(term, i ? &expression.terms[i - 1] : nullptr);
      terms.push_back(resolved);
    }
    return terms;
  }

  KvCCfgSFVariable* scalarNamed(const SyntaxTerm& term) {
    KvCCfgSFVariable* pVariable = variableNamed(SyntaxName{term.name, term.pos});
    if (pVariable->isArray())
      throw SourceError(
          term.pos, quoted(term.name) + " is an array; read an element: " + std::string(term.name) + "[i]");
    return pVariable;
  }

  // `pIndex` is the term before the element read: the whole index when it is a literal.
  KvCCfgSFVariable* arrayNamed(const SyntaxTerm& term, const SyntaxTerm* pIndex) {
    KvCCfgSFVariable* pArray = variableNamed(SyntaxName{term.name, term.pos});
    requireArray(*pArray, SyntaxName{term.name, term.pos});
    if (pIndex && pIndex->op == TermOp::Literal) checkIndexInRange(pIndex->number, pIndex->pos, *pArray);
    return pArray;
  }

  // ---- Names and literal checks ----------------------------------------------------------------

  KvCCfgSFVariable* variableNamed(const SyntaxName& name) const {
    KvCCfgSFVariable* pVariable = m_Program.findVariable(name.text);
    if (!pVariable && m_State.failedVariables.count(name.text)) throw FollowUpError();
    if (!pVariable) throw SourceError(name.pos, "unknown variable " + quoted(name.text));
    return pVariable;
  }

  const Signature& signatureOf(const SyntaxName& name) const {
    auto found = m_Signatures.find(name.text);
    if (found == m_Signatures.end()) throw SourceError(name.pos, "unknown procedure " + quoted(name.text));
    if (m_State.failedProcedures.count(name.text)) throw FollowUpError();
    if (name.text == KvCControlFlowGraph::kMainProcedureName)
      throw SourceError(name.pos, "'#main' cannot be called: it is where the program starts");
    return found->second;
  }

  static void requireArray(const KvCCfgSFVariable& variable, const SyntaxName& name) {
    if (!variable.isArray()) throw SourceError(name.pos, quoted(name.text) + " is not an array");
  }

  static void checkLiteralIndex(const SyntaxExpression& index, const KvCCfgSFVariable& array) {
    if (index.terms.size() == 1 && index.terms[0].op == TermOp::Literal)
      checkIndexInRange(index.terms[0].number, index.terms[0].pos, array);
  }

  static void checkIndexInRange(double index, SourcePos pos, const KvCCfgSFVariable& array) {
    if (!(index >= 0 && index < array.getArrayLength()) || index != std::trunc(index))
      throw SourceError(pos, "index " + formatNumber(index) + " is outside " + quoted(array.getName()) +
                                 ", which has " + std::to_string(array.getArrayLength()) + " elements");
  }

  // A literal that the variable cannot hold is a mistake in the program, not a value to convert.
  static void checkLiteralFits(const SyntaxExpression& value, const KvCCfgSFVariable& variable) {
    if (value.terms.size() != 1 || value.terms[0].op != TermOp::Literal) return;
    double number = value.terms[0].number;
    if (!variableHolds(variable, number))
      throw SourceError(value.terms[0].pos, "value " + formatNumber(number) + " does not fit " +
                                                quoted(variable.getName()) + " (" +
                                                nameOfDataType(variable.getDataType()) + ")");
  }

  const Signatures& m_Signatures;
  Program& m_Program;
  CheckState& m_State;
  std::unordered_map<std::string_view, int> m_Labels;
};

}  // namespace

ResolvedProcedure resolveProcedure(const SyntaxProcedure& syntax, const Signatures& signatures,
                                   Program& program, CheckState& state) {
  return BodyResolver(signatures, program, state).resolve(syntax);
}

}  // namespace ssaopt::client::detail
