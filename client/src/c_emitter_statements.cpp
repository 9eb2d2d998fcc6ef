// The C text of expressions and statements. Operators other than + and - go through the helpers of
// the runtime text, which compute as the value arithmetic does. C leaves the order in which operands
// are evaluated open, so an expression that reads inputs more than once reads them first, into
// temporaries in the interpreter's (postfix) order.
#include <algorithm>
#include <cmath>
#include <optional>
#include <utility>

#include "c_emitter_code.h"
#include "infix_text.h"
#include "ssaopt/client/data_types.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/client/statements.h"
#include "ssaopt/client/variable.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable_expression.h"

namespace ssaopt::client::detail {

namespace {

constexpr int kInfixAdditive = 70;
constexpr int kInfixComparison = 50;

// The runtime helper of each operator that C's own operators would not compute alike.
const char* helperOf(TermOp op) {
  static const std::pair<TermOp, const char*> kHelpers[] = {
      {TermOp::Not, "ssa_not"},         {TermOp::Complement, "ssa_compl"}, {TermOp::Abs, "ssa_abs"},
      {TermOp::Sgn, "ssa_sgn"},         {TermOp::Multiply, "ssa_mul"},     {TermOp::Divide, "ssa_div"},
      {TermOp::Remainder, "ssa_rem"},   {TermOp::ShiftLeft, "ssa_shl"},    {TermOp::ShiftRight, "ssa_shr"},
      {TermOp::Less, "ssa_lt"},         {TermOp::LessEqual, "ssa_le"},     {TermOp::Greater, "ssa_gt"},
      {TermOp::GreaterEqual, "ssa_ge"}, {TermOp::Equal, "ssa_eq"},         {TermOp::NotEqual, "ssa_ne"},
      {TermOp::BitAnd, "ssa_bitand"},   {TermOp::BitXor, "ssa_bitxor"},    {TermOp::BitOr, "ssa_bitor"},
      {TermOp::LogicalAnd, "ssa_and"},  {TermOp::LogicalOr, "ssa_or"}};
  for (const auto& [helped, name] : kHelpers)
    if (helped == op) return name;
  return "";
}

bool isComparison(TermOp op) {
  return op == TermOp::Less || op == TermOp::LessEqual || op == TermOp::Greater ||
         op == TermOp::GreaterEqual || op == TermOp::Equal || op == TermOp::NotEqual;
}

InfixText::Term literalTerm(double number) {
  std::string text;
  if (std::isnan(number))
    text = "SSA_NAN";
  else if (std::isinf(number))
    text = number < 0 ? "-SSA_INF" : "SSA_INF";
  else
    text = formatNumber(number);
  if (text.find_first_of(".eAN") == std::string::npos) text += ".0";
  return InfixText::Term{text, "", "", text[0] == '-' ? kUnaryPrecedence : kAtomPrecedence};
}

InfixText::Term operatorTerm(TermOp op, const InfixText::Operand* operands, bool topComparison) {
  if (op == TermOp::Negate)
    return InfixText::Term{"-",
                           "",
                           "",
                           kUnaryPrecedence,
                           {operands[0].precedence < kUnaryPrecedence || operands[0].first == '-'}};
  if (op == TermOp::Add || op == TermOp::Subtract || topComparison) {
    int precedence = topComparison ? kInfixComparison : kInfixAdditive;
    return InfixText::Term{"",
                           std::string(" ") + spellingOf(op) + " ",
                           "",
                           precedence,
                           {operands[0].precedence < precedence, operands[1].precedence <= precedence}};
  }
  return InfixText::Term{std::string(helperOf(op)) + "(", arityOf(op) == 2 ? ", " : "", ")", kAtomPrecedence};
}

// The text around an integer operand that gives its integer view, or in its place the literal it is.
std::pair<std::string, std::string> integerView(const IntegerOperand& operand) {
  if (operand.literal) return {formatNumber(*operand.literal), ""};
  return integerViewAround(operand.range);
}

// An integer operator's helper takes the integer views of its operands.
InfixText::Term integerOperatorTerm(TermOp op, const IntegerOperand* operands) {
  std::pair<std::string, std::string> first = integerView(operands[0]);
  std::string before = std::string(helperOf(op)) + "(" + first.first;
  bool hidden[2] = {operands[0].literal.has_value(), false};
  if (arityOf(op) == 1)
    return InfixText::Term{before, "", first.second + ")", kAtomPrecedence, {}, {hidden[0]}};
  std::pair<std::string, std::string> second = integerView(operands[1]);
  hidden[1] = operands[1].literal.has_value();
  return InfixText::Term{before,
                         first.second + ", " + second.first,
                         second.second + ")",
                         kAtomPrecedence,
                         {},
                         {hidden[0], hidden[1]}};
}

// A literal whose integer view is itself, which C reads as an int.
std::optional<double> integerLiteral(const KvCCfgSFExpression::Term& term) {
  if (term.op != TermOp::Literal || term.number != std::trunc(term.number) || term.number <= INT32_MIN ||
      term.number > INT32_MAX)
    return std::nullopt;
  return term.number;
}

// Reading a variable of a float type or a scaled one may give NaN: nothing in storing converts it.
bool holdsNaN(KvCCfgVariable* pVariable) {
  const KvCCfgVariable& original = *originalOf(pVariable);
  return isFloatType(original.getDataType()) || original.isScaled();
}

// Whether the sub-expression that `term` ends may be NaN: where it reads one, or where a sum, a
// difference or a quotient of operands that may be infinite (their range unknown) may give one. The
// integer view, truth values and sgn give no NaN, and products through ssa_mul none of their own.
template <class RangeAt>
bool givesNaN(const KvCCfgSFExpression::Term& term, const std::size_t* operandEnds,
              const std::vector<bool>& mayBeNaN, RangeAt rangeAt) {
  if (term.op == TermOp::Literal) return std::isnan(term.number);
  if (term.op == TermOp::Variable || term.op == TermOp::ElementRead) return holdsNaN(term.pVariable);
  if (term.op == TermOp::ElementWrite || givesTruthValue(term.op) || isIntegerOperator(term.op) ||
      term.op == TermOp::Sgn)
    return false;
  std::size_t arity = static_cast<std::size_t>(arityOf(term.op));
  bool makesNaN = term.op == TermOp::Add || term.op == TermOp::Subtract || term.op == TermOp::Divide;
  for (std::size_t i = 0; i < arity; ++i) {
    std::optional<ValueRange> operand = rangeAt(operandEnds[i]);
    if (mayBeNaN[operandEnds[i]] ||
        (makesNaN && (!operand || !std::isfinite(operand->lo) || !std::isfinite(operand->hi))))
      return true;
  }
  return false;
}

bool readsInput(const KvCCfgSFExpression::Term& term) {
  return (term.op == TermOp::Variable || term.op == TermOp::ElementRead) && term.pVariable->isVolatile();
}

// The number an expression of a single literal stands for, which a store can convert in advance.
std::optional<double> constantOf(KvCCfgExpression* pExpression) {
  KvCCfgSFExpression* pTerms = pExpression ? pExpression->isSFExpression() : nullptr;
  if (pTerms && pTerms->getTerms().size() == 1 && pTerms->getTerms()[0].op == TermOp::Literal)
    return pTerms->getTerms()[0].number;
  KvCCfgValue value = pExpression && !pTerms ? pExpression->evaluate() : KvCCfgValue();
  if (dynamic_cast<KvCCfgValueExpression*>(pExpression) && value.isConstant()) return value.getValue();
  return std::nullopt;
}

std::string quoted(const std::string& name) { return "'" + name + "'"; }

std::string nameOf(KvCCfgVariable* pVariable) {
  KvCCfgSFVariable* pNamed = originalOf(pVariable)->isSFVariable();
  return pNamed ? quoted(pNamed->getName()) : "a variable of no program";
}

}  // namespace

std::vector<std::string> scoped(std::vector<std::string> prelude, const std::vector<std::string>& lines) {
  if (prelude.empty()) return lines;
  std::vector<std::string> block{"{"};
  for (std::string& line : prelude) block.push_back("  " + line);
  for (const std::string& line : lines) block.push_back("  " + line);
  block.push_back("}");
  return block;
}

std::string CStatements::procedureName(const std::string& name) {
  return name.rfind('#', 0) == 0 ? "sys_" + name.substr(1) : "proc_" + name;
}

std::string CStatements::temporary(const std::string& kind) {
  return "ssa_" + kind + std::to_string(++m_Temporaries);
}

std::optional<ValueRange> CStatements::rangeOf(const KvCCfgValue& lo, const KvCCfgValue& hi,
                                               bool mayBeNaN) const {
  if (!m_UseRanges || !lo.isConstant() || !hi.isConstant() || !(lo.getValue() <= hi.getValue()))
    return std::nullopt;
  return ValueRange{lo.getValue(), hi.getValue(), mayBeNaN};
}

CStatements::Code CStatements::expression(KvCCfgExpression* pExpression, bool condition) {
  if (!pExpression) throw Unemittable{"an expression is missing"};
  if (KvCCfgSFExpression* pTerms = pExpression->isSFExpression()) return terms(*pTerms, condition);
  Code code = libraryExpression(pExpression);
  KvCCfgVariable* pRead = onlyVariableOf(pExpression);
  bool mayBeNaN = pRead ? holdsNaN(pRead) : std::isnan(pExpression->evaluate().getValue());
  code.range = rangeOf(pExpression->getMinimum(), pExpression->getMaximum(), mayBeNaN);
  return code;
}

// The library's own expressions: a set of variables, or a fixed value.
CStatements::Code CStatements::libraryExpression(KvCCfgExpression* pExpression) {
  if (auto* pMembers = dynamic_cast<KvCCfgVariableExpression*>(pExpression)) {
    ssaopt::set<KvCCfgVariable*> members = pMembers->getUsedVariables();
    if (members.size() != 1)
      throw Unemittable{"a variable expression holds " + std::to_string(members.size()) + " variables"};
    CVariable& variable = m_Variables.of(*members.begin());
    if (variable.pVariable->isArray())
      throw Unemittable{"passes the whole array " + quoted(variable.pVariable->getName())};
    if (variable.pVariable->isVolatile()) return Code{{}, m_Variables.inputText(variable), std::nullopt};
    return Code{{}, m_Variables.readText(variable), std::nullopt};
  }
  KvCCfgValue value = pExpression->evaluate();
  if (!dynamic_cast<KvCCfgValueExpression*>(pExpression) || !value.isConstant())
    throw Unemittable{"an expression has no value"};
  return Code{{}, literalTerm(value.getValue()).before, std::nullopt};
}

// One expression as it is written term by term: for each term the range and whether it may be NaN of
// the sub-expression it ends, and for each piece on the stack the term that ends it and whether it
// reads an input that was read first into a temporary.
struct CStatements::Terms {
  const KvCCfgSFExpression::Terms& terms;
  const CStatements& statements;
  bool condition;
  bool readsFirst;  // the expression reads inputs more than once: each goes into a temporary first
  std::vector<KvCCfgSFExpression::Bounds> bounds = {};
  std::vector<bool> mayBeNaN = {};
  std::vector<std::size_t> ends = {};
  std::vector<bool> readsTemporary = {};
  InfixText text = {};
  Code code = {};

  std::optional<ValueRange> rangeAt(std::size_t term) const {
    return term < bounds.size() ? statements.rangeOf(bounds[term].first, bounds[term].second, mayBeNaN[term])
                                : std::nullopt;
  }
  // The term that ends operand `k` of the term about to be written, which has `arity` operands.
  std::size_t operandEnd(std::size_t arity, std::size_t k) const { return ends[ends.size() - arity + k]; }
  IntegerOperand integerOperand(std::size_t arity, std::size_t k) const {
    std::size_t end = operandEnd(arity, k);
    return IntegerOperand{integerLiteral(terms[end]), rangeAt(end)};
  }
  bool operandsReadTemporary(std::size_t arity) const {
    return std::any_of(readsTemporary.end() - static_cast<std::ptrdiff_t>(arity), readsTemporary.end(),
                       [](bool reads) { return reads; });
  }
};

CStatements::Code CStatements::terms(const KvCCfgSFExpression& expression, bool condition) {
  const KvCCfgSFExpression::Terms& terms = expression.getTerms();
  if (terms.empty()) throw Unemittable{"an expression without terms"};
  Terms progress{terms, *this, condition, std::count_if(terms.begin(), terms.end(), readsInput) > 1};
  if (m_UseRanges && !expression.isMarkedAsEvalToNonConst()) progress.bounds = expression.getTermBounds(true);
  for (std::size_t i = 0; i < terms.size(); ++i) {
    std::size_t arity = static_cast<std::size_t>(arityOf(terms[i].op));
    const std::size_t* operandEnds = progress.ends.data() + (progress.ends.size() - arity);
    progress.mayBeNaN.push_back(givesNaN(terms[i], operandEnds, progress.mayBeNaN,
                                         [&](std::size_t end) { return progress.rangeAt(end); }));
    bool readsTemporary = progress.operandsReadTemporary(arity) && !readsInput(terms[i]);
    InfixText::Term text = termText(progress, i, readsTemporary);
    progress.text.push(arity, text);
    progress.readsTemporary.resize(progress.readsTemporary.size() - arity);
    progress.readsTemporary.push_back(readsTemporary);
    progress.ends.resize(progress.ends.size() - arity);
    progress.ends.push_back(i);
  }
  progress.code.text = progress.text.text(progress.text.pieces() - 1);
  progress.code.range = progress.rangeAt(terms.size() - 1);
  return progress.code;
}

InfixText::Term CStatements::termText(Terms& progress, std::size_t i, bool& readsTemporary) {
  const KvCCfgSFExpression::Term& term = progress.terms[i];
  std::size_t arity = static_cast<std::size_t>(arityOf(term.op));
  if (term.op == TermOp::Literal) return literalTerm(term.number);
  if (namesVariable(term.op)) return variableTerm(progress, i, readsTemporary);
  if (isIntegerOperator(term.op)) {
    IntegerOperand operands[2] = {progress.integerOperand(arity, 0),
                                  arity > 1 ? progress.integerOperand(arity, 1) : IntegerOperand{}};
    return integerOperatorTerm(term.op, operands);
  }
  bool topComparison = progress.condition && i + 1 == progress.terms.size() && isComparison(term.op);
  return operatorTerm(term.op, progress.text.operands(arity), topComparison);
}

// A variable read, an input read (into a temporary where the expression reads several), or an element
// read or write.
InfixText::Term CStatements::variableTerm(Terms& progress, std::size_t i, bool& readsTemporary) {
  const KvCCfgSFExpression::Term& term = progress.terms[i];
  std::size_t arity = static_cast<std::size_t>(arityOf(term.op));
  CVariable& variable = m_Variables.of(term.pVariable);
  if (variable.pVariable->isArray() != (term.op != TermOp::Variable))
    throw Unemittable{"uses " + nameOf(term.pVariable) +
                      (variable.pVariable->isArray() ? " without" : " with") + " an index"};
  if (readsInput(term)) {
    std::string input = m_Variables.inputText(variable);
    if (progress.readsFirst) {
      std::string name = temporary("in");
      progress.code.prelude.push_back("double " + name + " = " + input + ";");
      input = name;
      readsTemporary = true;
    }
    // An element of an input array reads the stream whatever its index, which is only computed where
    // it reads temporaries, so that each is used.
    if (term.op == TermOp::ElementRead && progress.operandsReadTemporary(arity))
      return InfixText::Term{"((void)(", "", "), " + input + ")", kAtomPrecedence};
    return InfixText::Term{input, "", "", kAtomPrecedence, {false}, {term.op == TermOp::ElementRead}};
  }
  if (term.op == TermOp::Variable) {
    std::string read = m_Variables.readText(variable);
    return InfixText::Term{read, "", "", read[0] == '(' ? kUnaryPrecedence : kAtomPrecedence};
  }
  if (term.op == TermOp::ElementRead) return elementReadTerm(variable, progress.integerOperand(arity, 0));
  return elementWriteTerm(variable, progress.integerOperand(arity, 0),
                          progress.rangeAt(progress.operandEnd(arity, 1)));
}

// The text around the index that names the element directly, where the index lies within the array
// (as a literal, or as its range shows); nothing where it may not.
std::optional<std::pair<std::string, std::string>> CStatements::directElement(CVariable& array,
                                                                              const IntegerOperand& index) {
  array.stored = true;
  double length = static_cast<double>(array.pVariable->getArrayLength());
  if (index.literal && *index.literal >= 0.0 && *index.literal < length)
    return std::make_pair(array.name + "[" + formatNumber(*index.literal), std::string("]"));
  if (!index.literal && index.range && CVariables::withinArray(array, *index.range))
    return m_Variables.elementAround(array, *index.range);
  return std::nullopt;
}

// An element read directly, or through the helper that checks its index.
InfixText::Term CStatements::elementReadTerm(CVariable& array, const IntegerOperand& index) {
  bool hidden = index.literal.has_value();
  std::optional<std::pair<std::string, std::string>> element = directElement(array, index);
  if (!element) {
    std::pair<std::string, std::string> view = integerView(index);
    return InfixText::Term{
        "ssa_read_" + array.name + "(" + view.first, "", view.second + ")", kAtomPrecedence, {}, {hidden}};
  }
  if (array.heldAsDouble)
    return InfixText::Term{element->first, "", element->second, kAtomPrecedence, {}, {hidden}};
  return InfixText::Term{"(double)" + element->first, "", element->second, kUnaryPrecedence, {}, {hidden}};
}

// An element write as an assignment, or through the helper that checks its index and stores.
InfixText::Term CStatements::elementWriteTerm(CVariable& array, const IntegerOperand& index,
                                              const std::optional<ValueRange>& value) {
  bool hidden = index.literal.has_value();
  std::optional<std::pair<std::string, std::string>> element = directElement(array, index);
  if (!element) {
    std::pair<std::string, std::string> view = integerView(index);
    return InfixText::Term{
        "ssa_write_" + array.name + "(" + view.first, view.second + ", ", ")", 0, {}, {hidden}};
  }
  std::pair<std::string, std::string> store = m_Variables.storeAround(array, value);
  return InfixText::Term{element->first, element->second + " = " + store.first, store.second, 0, {},
                         {hidden}};
}

std::vector<std::string> CStatements::statement(KvCCfgStatement& statement, const KvCControlFlowGraph& graph,
                                                bool argumentsAtCalls) {
  m_Temporaries = 0;
  if (statement.getIsVirtual() || statement.isPhiFunction() || statement.isValueReturnStatement() ||
      statement.isOutputStatement() || statement.isParamStatement())
    return {};
  if (KvCCfgAssignment* pAssignment = statement.isAssignment()) return assignment(*pAssignment);
  if (KvCCfgProcedureCall* pCall = statement.isProcedureCall()) return call(*pCall, graph, argumentsAtCalls);
  if (KvCCfgExternCall* pExtern = statement.isExternCall()) return externCall(*pExtern);
  throw Unemittable{"a statement of no known kind"};
}

std::vector<std::string> CStatements::branch(KvCCfgExpression* pCondition, const std::string& jump) {
  m_Temporaries = 0;
  // A constant condition as C's truth value: "if (-2.0)" draws a warning of a changed value.
  if (std::optional<double> number = constantOf(pCondition))
    return {"if (" + std::string(*number != 0.0 ? "1" : "0") + ") " + jump};
  Code condition = expression(pCondition, true);
  return scoped(condition.prelude, {"if (" + condition.text + ") " + jump});
}

bool CStatements::storesInitialValue(KvCCfgAssignment& assignment, const CVariable& variable) {
  std::optional<double> number = constantOf(assignment.getRHS());
  return number && CVariables::storesInitialValue(variable, *number);
}

// The variable that an expression only reads, where it is a single variable.
KvCCfgVariable* CStatements::onlyVariableOf(KvCCfgExpression* pExpression) {
  if (KvCCfgSFExpression* pTerms = pExpression ? pExpression->isSFExpression() : nullptr)
    return pTerms->getTerms().size() == 1 && pTerms->getTerms()[0].op == TermOp::Variable
               ? pTerms->getTerms()[0].pVariable
               : nullptr;
  auto* pMembers = dynamic_cast<KvCCfgVariableExpression*>(pExpression);
  return pMembers && pMembers->getUsedVariables().size() == 1 ? *pMembers->getUsedVariables().begin()
                                                              : nullptr;
}

std::vector<std::string> CStatements::assignment(KvCCfgAssignment& assignment) {
  KvCCfgSFExpression* pTerms = assignment.getRHS() ? assignment.getRHS()->isSFExpression() : nullptr;
  if (pTerms && pTerms->isElementWrite()) {
    Code write = terms(*pTerms, false);
    return scoped(write.prelude, {write.text + ";"});
  }
  if (!assignment.getLHS()) throw Unemittable{"an assignment without left-hand side"};
  CVariable& variable = m_Variables.of(assignment.getLHS());
  // A copy between versions of one variable stores a value that the variable holds already, which
  // its store leaves as it is.
  KvCCfgVariable* pCopied = onlyVariableOf(assignment.getRHS());
  if (pCopied && m_Variables.find(pCopied) == &variable && !variable.pVariable->isVolatile()) return {};
  if (std::optional<double> number = constantOf(assignment.getRHS());
      number && !variable.pVariable->isArray())
    return {variable.name + " = " + m_Variables.storedConstant(variable, *number) + ";"};
  Code value = expression(assignment.getRHS(), false);
  if (variable.pVariable->isArray()) {
    variable.stored = true;
    return scoped(value.prelude, {"ssa_fill_" + variable.name + "(" + value.text + ");"});
  }
  return scoped(value.prelude,
                {variable.name + " = " + m_Variables.storeText(variable, value.text, value.range) + ";"});
}

// The arguments go to the formal parameters, all evaluated before any is stored, then the procedure
// runs. Before the SSA transformation the call holds them; afterwards the parameter statements that
// stand in the procedure's blocks do, and one passing a variable to itself changes nothing.
std::vector<std::string> CStatements::call(KvCCfgProcedureCall& call, const KvCControlFlowGraph& graph,
                                           bool argumentsAtCalls) {
  KvCCfgProcedure* pCallee = graph.findProcedure(call.getName());
  std::string callee = call.getName().cstring();
  if (!pCallee) throw Unemittable{"calls '" + callee + "', no procedure of the graph"};
  std::vector<std::pair<CVariable*, Code>> arguments;
  for (KvCCfgParamStatement* pParam : pCallee->getParamStatements()) {
    if (!argumentsAtCalls && !m_PlacedParameters.count(pParam)) continue;
    KvCCfgExpression* pArgument = pParam->getArgument(&call);
    if (!pArgument && argumentsAtCalls)
      throw Unemittable{"the call of '" + callee + "' passes nothing for " + nameOf(pParam->getVariable())};
    if (!pArgument)
      return {"ssa_fault(\"the parameter statement of " + nameOf(pParam->getVariable()) +
              " has no argument for the call that runs it\");"};
    CVariable& formal = m_Variables.of(pParam->getVariable());
    auto* pMembers = dynamic_cast<KvCCfgVariableExpression*>(pArgument);
    if (!argumentsAtCalls && pMembers && pMembers->getUsedVariables().size() == 1 &&
        m_Variables.find(*pMembers->getUsedVariables().begin()) == &formal)
      continue;
    arguments.emplace_back(&formal, expression(pArgument, false));
  }
  std::vector<std::string> prelude, lines;
  for (auto& [pFormal, value] : arguments) {
    prelude.insert(prelude.end(), value.prelude.begin(), value.prelude.end());
    std::string text = value.text;
    if (arguments.size() > 1) {
      text = temporary("arg");
      prelude.push_back("double " + text + " = " + value.text + ";");
    }
    lines.push_back(pFormal->name + " = " + m_Variables.storeText(*pFormal, text, value.range) + ";");
  }
  lines.push_back(procedureName(callee) + "();");
  return scoped(prelude, lines);
}

std::vector<std::string> CStatements::externCall(KvCCfgExternCall& call) {
  auto inDeclarationOrder = [this](const auto& variables) {
    std::vector<CVariable*> sorted;
    for (KvCCfgVariable* pVariable : variables) sorted.push_back(&m_Variables.of(pVariable));
    std::sort(sorted.begin(), sorted.end());
    sorted.erase(std::unique(sorted.begin(), sorted.end()), sorted.end());
    return sorted;
  };
  std::vector<std::string> lines{"ssa_extern_begin(\"" + std::string(externCallName(call).cstring()) +
                                 "\");"};
  for (CVariable* pUsed : inDeclarationOrder(call.getUsedVariables())) {
    pUsed->stored = true;
    lines.push_back(pUsed->pVariable->isArray() ? "ssa_observe_" + pUsed->name + "();"
                                                : "ssa_value(\"" + pUsed->pVariable->getName() + "\", " +
                                                      m_Variables.readText(*pUsed) + ");");
  }
  lines.push_back("ssa_extern_end();");
  for (CVariable* pModified : inDeclarationOrder(call.getModifiableVariables()))
    if (pModified->pVariable->isArray() && !pModified->pVariable->isVolatile()) {
      pModified->refilled = true;
      pModified->stored = true;
      lines.push_back("ssa_refill_" + pModified->name + "();");
    }
  return lines;
}

}  // namespace ssaopt::client::detail
