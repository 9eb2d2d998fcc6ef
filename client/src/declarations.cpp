// Variables and procedures as declared: every check that needs nothing but the declarations.
#include <cmath>
#include <string>

#include "front_end_steps.h"
#include "ssaopt/client/data_types.h"
#include "ssaopt/client/numbers.h"

namespace ssaopt::client::detail {

namespace {

// The largest array a program may declare. Controller code holds tables of a few thousand entries;
// the interpreter and the emitted C keep every element (8 bytes in the interpreter), so a length up to
// the 32-bit index range would need 16 GB for one array.
constexpr double kMaxArrayLength = 1 << 20;

std::string quoted(std::string_view text) { return "'" + std::string(text) + "'"; }

std::string lineOf(SourcePos pos) { return "line " + std::to_string(pos.line); }

std::uint32_t checkedArrayLength(const SyntaxNumber& length) {
  if (length.value < 1 || length.value > kMaxArrayLength || length.value != std::trunc(length.value))
    throw SourceError(length.pos, "the length of an array must be a whole number from 1 to " +
                                      formatNumber(kMaxArrayLength));
  return static_cast<std::uint32_t>(length.value);
}

void applyScaling(const SyntaxDeclaration& declaration, KvCCfgSFVariable& variable) {
  if (!declaration.scaleLsb) return;
  if (!isIntegerType(variable.getDataType()))
    throw SourceError(declaration.scaleLsb->pos, "only integer variables can be scaled, and " +
                                                     quoted(variable.getName()) + " is " +
                                                     nameOfDataType(variable.getDataType()));
  double lsb = declaration.scaleLsb->value, offset = declaration.scaleOffset->value;
  if (!(lsb > 0) || !std::isfinite(lsb))
    throw SourceError(declaration.scaleLsb->pos, "the LSB of a scaling must be a positive number");
  if (!std::isfinite(offset))
    throw SourceError(declaration.scaleOffset->pos, "the offset of a scaling must be finite");
  variable.setScaling(lsb, offset);
}

void applySaturation(const SyntaxDeclaration& declaration, KvCCfgSFVariable& variable) {
  if (!declaration.lowerLimit && !declaration.upperLimit) return;
  if (variable.getDataType()->isBool())
    throw SourceError(declaration.saturatePos, "a bool variable cannot be saturated");
  if (declaration.lowerLimit && declaration.upperLimit &&
      declaration.lowerLimit->value > declaration.upperLimit->value)
    throw SourceError(declaration.saturatePos,
                      "the lower limit " + formatNumber(declaration.lowerLimit->value) +
                          " is above the upper limit " + formatNumber(declaration.upperLimit->value));
  for (const std::optional<SyntaxNumber>* pLimit : {&declaration.lowerLimit, &declaration.upperLimit})
    if (*pLimit && std::isnan((*pLimit)->value))
      throw SourceError((*pLimit)->pos, "a limit must be a number");
  if (declaration.lowerLimit) variable.saturateLowerBorder(declaration.lowerLimit->value);
  if (declaration.upperLimit) variable.saturateUpperBorder(declaration.upperLimit->value);
}

void applyMarks(const SyntaxDeclaration& declaration, KvCCfgSFVariable& variable) {
  if (declaration.isVolatile && declaration.erasablePos)
    throw SourceError(*declaration.erasablePos, "a volatile variable cannot be erasable");
  if (declaration.isOutput) variable.markAsOutput();
  if (declaration.isVolatile) variable.markAsVolatile();
  if (declaration.erasablePos) variable.markAsErasable();
}

void applyInitValue(const SyntaxDeclaration& declaration, KvCCfgSFVariable& variable) {
  if (!declaration.initValue) return;
  double value = declaration.initValue->value;
  if (!variableHolds(variable, value))
    throw SourceError(declaration.initValue->pos, "initial value " + formatNumber(value) + " does not fit " +
                                                      quoted(variable.getName()) + " (" +
                                                      nameOfDataType(variable.getDataType()) + ")");
  variable.setInitValue(value);
}

std::unique_ptr<KvCCfgSFVariable> declareVariable(const SyntaxDeclaration& declaration, std::uint32_t index) {
  const KV_DataType* pType = dataTypeNamed(declaration.type.text);
  if (!pType) throw SourceError(declaration.type.pos, "unknown data type " + quoted(declaration.type.text));
  auto pVariable = std::make_unique<KvCCfgSFVariable>(std::string(declaration.name.text), pType, index,
                                                      declaration.name.pos);
  if (declaration.arrayLength) pVariable->makeArray(checkedArrayLength(*declaration.arrayLength));
  applyScaling(declaration, *pVariable);
  applySaturation(declaration, *pVariable);
  applyMarks(declaration, *pVariable);
  applyInitValue(declaration, *pVariable);
  return pVariable;
}

bool isOutlined(const SyntaxProgram& syntax, SourcePos& where) {
  for (const SyntaxProcedure& procedure : syntax.procedures)
    for (const SyntaxBlock& block : procedure.blocks)
      if (block.outlinePos) {
        where = *block.outlinePos;
        return true;
      }
  return false;
}

// Outlining names its procedures "#block_" and a block index; one of the program's own with such a
// name would be taken for the new one.
void rejectOutliningNameClash(const SyntaxProgram& syntax) {
  SourcePos outline;
  if (!isOutlined(syntax, outline)) return;
  for (const SyntaxProcedure& procedure : syntax.procedures)
    if (procedure.name.text.substr(0, 7) == "#block_")
      throw SourceError(outline,
                        "a program that outlines blocks cannot have procedures named '#block_...', as " +
                            quoted(procedure.name.text) + " at " + lineOf(procedure.name.pos) +
                            "; outlining names its procedures so");
}

std::vector<KvCCfgSFVariable*> declareFormals(const SyntaxProcedure& procedure, const Program& program,
                                              const CheckState& state) {
  std::vector<KvCCfgSFVariable*> formals;
  if (!procedure.formals.empty() && procedure.name.text == KvCControlFlowGraph::kMainProcedureName)
    throw SourceError(procedure.formals.front().pos, "'#main' takes no parameters");
  for (const SyntaxName& formal : procedure.formals) {
    KvCCfgSFVariable* pVariable = program.findVariable(formal.text);
    if (!pVariable && state.failedVariables.count(formal.text)) throw FollowUpError();
    if (!pVariable) throw SourceError(formal.pos, "unknown variable " + quoted(formal.text));
    if (pVariable->isArray())
      throw SourceError(formal.pos, "the array " + quoted(formal.text) + " cannot be a parameter");
    for (KvCCfgSFVariable* pEarlier : formals)
      if (pEarlier == pVariable) throw SourceError(formal.pos, quoted(formal.text) + " is a parameter twice");
    formals.push_back(pVariable);
  }
  return formals;
}

}  // namespace

bool variableHolds(const KvCCfgSFVariable& variable, double value) {
  if (!variable.isScaled()) return typeHolds(variable.getDataType(), value);
  const KV_Scaling* pScaling = variable.getScaling();
  double stored = std::round((value - pScaling->getOffset()) / pScaling->getLSB());
  return typeHolds(variable.getDataType(), stored);
}

void declareVariables(const SyntaxProgram& syntax, Program& program, CheckState& state) {
  std::uint32_t index = 0;
  for (const SyntaxDeclaration& declaration : syntax.declarations) {
    try {
      if (KvCCfgSFVariable* pEarlier = program.findVariable(declaration.name.text))
        throw SourceError(declaration.name.pos, "variable " + quoted(declaration.name.text) +
                                                    " is already declared at " +
                                                    lineOf(pEarlier->getPosition()));
      program.addVariable(declareVariable(declaration, index++));
    } catch (const SourceError& error) {
      state.diagnostics.error(error);
      if (!program.findVariable(declaration.name.text)) state.failedVariables.insert(declaration.name.text);
    }
  }
}

Signatures declareProcedures(const SyntaxProgram& syntax, Program& program, CheckState& state) {
  Signatures signatures;
  for (const SyntaxProcedure& procedure : syntax.procedures) {
    auto found = signatures.find(procedure.name.text);
    if (found != signatures.end()) {
      state.diagnostics.error(procedure.name.pos, "procedure " + quoted(procedure.name.text) +
                                                      " is already declared at " +
                                                      lineOf(found->second.pSyntax->name.pos));
      continue;
    }
    Signature signature{&procedure, {}};
    try {
      signature.formals = declareFormals(procedure, program, state);
    } catch (const SourceError& error) {
      state.diagnostics.error(error);
      state.failedProcedures.insert(procedure.name.text);
    } catch (const FollowUpError&) {
      state.failedProcedures.insert(procedure.name.text);
    }
    program.setFormals(std::string(procedure.name.text), signature.formals);
    signatures.emplace(procedure.name.text, std::move(signature));
  }
  if (!signatures.count(KvCControlFlowGraph::kMainProcedureName))
    state.diagnostics.error(syntax.endOfInput, "the program has no procedure '#main'");
  try {
    rejectOutliningNameClash(syntax);
  } catch (const SourceError& error) {
    state.diagnostics.error(error);
  }
  return signatures;
}

}  // namespace ssaopt::client::detail
