#include "statement_text.h"

#include <algorithm>
#include <vector>

#include "infix_text.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/client/statements.h"

namespace ssaopt::client::detail {

namespace {

InfixText::Term literalTerm(double number) {
  std::string text = formatNumber(number);
  return InfixText::Term{text, "", "", text[0] == '-' ? kUnaryPrecedence : kAtomPrecedence};
}

InfixText::Term operatorTerm(TermOp op, const InfixText::Operand* operands) {
  std::string spelling = spellingOf(op);
  if (op == TermOp::Abs || op == TermOp::Sgn)
    return InfixText::Term{spelling + "(", "", ")", kAtomPrecedence};
  if (arityOf(op) == 1) {
    // "-(-x)" rather than "--x", which reads as C's decrement.
    bool needed =
        operands[0].precedence < kUnaryPrecedence || (op == TermOp::Negate && operands[0].first == '-');
    return InfixText::Term{spelling, "", "", kUnaryPrecedence, {needed, false}};
  }
  int precedence = precedenceOf(op);
  return InfixText::Term{"",
                         " " + spelling + " ",
                         "",
                         precedence,
                         {operands[0].precedence < precedence, operands[1].precedence <= precedence}};
}

// The pieces left after the first `count` terms: one for a complete expression, two (index and value)
// for an element write without its last term.
InfixText formatTerms(const ProgramView& view, const KvCCfgSFExpression::Terms& terms, std::size_t count) {
  InfixText text;
  for (std::size_t i = 0; i < count; ++i) {
    const KvCCfgSFExpression::Term& term = terms[i];
    std::size_t arity = static_cast<std::size_t>(arityOf(term.op));
    if (term.op == TermOp::Literal)
      text.push(0, literalTerm(term.number));
    else if (term.op == TermOp::Variable)
      text.push(0, InfixText::Term{view.nameOf(term.pVariable), "", "", kAtomPrecedence});
    else if (term.op == TermOp::ElementRead)
      text.push(1, InfixText::Term{view.nameOf(term.pVariable) + "[", "", "]", kAtomPrecedence});
    else if (term.op == TermOp::ElementWrite)
      text.push(2, InfixText::Term{view.nameOf(term.pVariable) + " with [", "] = ", "", 0});
    else
      text.push(arity, operatorTerm(term.op, text.operands(arity)));
  }
  return text;
}

std::string sfExpressionText(const ProgramView& view, const KvCCfgSFExpression& expression) {
  InfixText text = formatTerms(view, expression.getTerms(), expression.getTerms().size());
  return text.pieces() == 0 ? "?" : text.text(text.pieces() - 1);
}

std::string variableListText(const ProgramView& view, std::vector<KvCCfgVariable*> variables) {
  std::sort(variables.begin(), variables.end(),
            [&](KvCCfgVariable* a, KvCCfgVariable* b) { return view.precedes(a, b); });
  std::string text;
  for (KvCCfgVariable* pVariable : variables) text += (text.empty() ? "" : ", ") + view.nameOf(pVariable);
  return text;
}

// a[i] = e before renaming; once the array has versions, the one written and the one whose other
// elements it keeps.
std::string elementWriteText(const ProgramView& view, KvCCfgVariable* pLHS, const KvCCfgSFExpression& rhs) {
  const KvCCfgSFExpression::Terms& terms = rhs.getTerms();
  InfixText pieces = formatTerms(view, terms, terms.size() - 1);
  KvCCfgVariable* pKept = terms.back().pVariable;
  std::string written = "[" + pieces.text(0) + "] = " + pieces.text(1);
  if (pKept == pLHS) return view.nameOf(pLHS) + written;
  return view.nameOf(pLHS) + " = " + view.nameOf(pKept) + " with " + written;
}

std::string assignmentText(const ProgramView& view, KvCCfgAssignment& assignment) {
  std::string prefix = assignment.getIsVirtual() ? "virtual " : (assignment.isSFAssignment() ? "" : "init ");
  KvCCfgSFExpression* pRHS = assignment.getRHS() ? assignment.getRHS()->isSFExpression() : nullptr;
  if (pRHS && pRHS->isElementWrite()) return prefix + elementWriteText(view, assignment.getLHS(), *pRHS);
  return prefix + view.nameOf(assignment.getLHS()) + " = " + expressionText(view, assignment.getRHS());
}

std::string callText(const ProgramView& view, KvCCfgProcedureCall& call) {
  std::string text = std::string("call ") + call.getName().cstring() + "(";
  if (KvCCfgSFProcedureCall* pCall = call.isSFProcedureCall())
    for (std::size_t i = 0; i < pCall->getArguments().size(); ++i)
      text += (i ? ", " : "") + expressionText(view, pCall->getArguments()[i]);
  return text + ")";
}

std::string externCallText(const ProgramView& view, KvCCfgExternCall& call) {
  std::string text = std::string("extern ") + externCallName(call).cstring();
  ssaopt::set<KvCCfgVariable*> used = call.getUsedVariables();
  if (!used.empty()) text += " uses(" + variableListText(view, {used.begin(), used.end()}) + ")";
  ssaopt::list<KvCCfgVariable*> modifiable = call.getModifiableVariables();
  if (modifiable.empty()) return text;
  std::string names;
  for (KvCCfgVariable* pVariable : modifiable) names += (names.empty() ? "" : ", ") + view.nameOf(pVariable);
  return text + " modifies(" + names + ")";
}

std::string paramText(const ProgramView& view, KvCCfgParamStatement& param) {
  std::string arguments;
  for (const auto& entry : param.getArguments())
    arguments += (arguments.empty() ? "" : ", ") + expressionText(view, entry.second) + " from " +
                 view.callSite(entry.first);
  return view.nameOf(param.getVariable()) + " = param(" + arguments + ")";
}

}  // namespace

std::string valueText(const KvCCfgValue& value) {
  if (value.isConstant()) return formatNumber(value.getValue());
  return value.isUndetermined() ? "?" : "*";
}

std::string expressionText(const ProgramView& view, KvCCfgExpression* pExpression) {
  if (!pExpression) return "?";
  if (KvCCfgSFExpression* pSF = pExpression->isSFExpression()) return sfExpressionText(view, *pSF);
  // The library's own expressions: a fixed value, or a set of variables.
  ssaopt::set<KvCCfgVariable*> used = pExpression->getUsedVariables();
  if (used.empty()) return valueText(pExpression->evaluate());
  std::string list = variableListText(view, {used.begin(), used.end()});
  return used.size() == 1 ? list : "{" + list + "}";
}

std::string statementText(const ProgramView& view, KvCCfgStatement& statement) {
  if (KvCCfgAssignment* pAssignment = statement.isAssignment()) return assignmentText(view, *pAssignment);
  if (KvCCfgProcedureCall* pCall = statement.isProcedureCall()) return callText(view, *pCall);
  if (KvCCfgExternCall* pCall = statement.isExternCall()) return externCallText(view, *pCall);
  if (KvCCfgParamStatement* pParam = statement.isParamStatement()) return paramText(view, *pParam);
  if (KvCCfgValueReturnStatement* pReturn = statement.isValueReturnStatement())
    return view.nameOf(pReturn->getVariable()) + " = return(" +
           expressionText(view, pReturn->getExpression()) + ")";
  if (KvCCfgOutputStatement* pOutput = statement.isOutputStatement())
    return "output " + view.nameOf(pOutput->getVariable());
  return "?";
}

std::string phiText(const ProgramView& view, KvCPhiFunction& phi, ssaopt::node block) {
  ssaopt::array<KvCCfgVariable*> operands = phi.getReplacementVariables();
  ssaopt::array<ssaopt::edge> in = view.graph().getPhiOperandEdges(block);
  std::string text;
  for (std::size_t i = 0; i < operands.size(); ++i) {
    std::string from = i < in.size() ? view.predecessorName(view.graph().source(in[i])) : "?";
    text += (i ? ", " : "") + view.nameOf(operands[i]) + " from " + from;
  }
  return view.nameOf(phi.getVariable()) + " = phi(" + text + ")";
}

std::string propagatedText(KvCCfgVariable& variable) {
  std::string text = variable.getValue() ? valueText(*variable.getValue()) : "?";
  if (variable.getMinValue() && variable.getMaxValue())
    text += " in [" + valueText(*variable.getMinValue()) + ", " + valueText(*variable.getMaxValue()) + "]";
  return text;
}

KvCCfgVariable* definedVariable(KvCCfgStatement& statement) {
  ssaopt::set<KvCCfgVariable*> defined = statement.getDefinedVariables();
  return defined.empty() ? nullptr : *defined.begin();
}

}  // namespace ssaopt::client::detail
