#include "ssaopt/client/front_end.h"

#include <fstream>
#include <iostream>
#include <sstream>
#include <utility>

#include "front_end_steps.h"
#include "ssaopt/client/parser.h"
#include "ssaopt/ir/procedure.h"

namespace ssaopt::client {

namespace {

// Syntax errors leave a tree with gaps, so the checks run only on a text without them; they record
// what they find and go on, and the graph is built only when nothing was found.
std::unique_ptr<Program> checkAndBuild(const SyntaxProgram& syntax, DiagnosticList& diagnostics) {
  auto pProgram = std::make_unique<Program>();
  detail::CheckState state(diagnostics);
  detail::declareVariables(syntax, *pProgram, state);
  detail::Signatures signatures = detail::declareProcedures(syntax, *pProgram, state);
  std::vector<detail::ResolvedProcedure> procedures;
  for (const SyntaxProcedure& procedure : syntax.procedures) {
    if (signatures.at(procedure.name.text).pSyntax != &procedure) continue;  // declared twice
    std::size_t errorsBefore = diagnostics.errorCount();
    procedures.push_back(detail::resolveProcedure(procedure, signatures, *pProgram, state));
    // Where the body has errors, its blocks are not all linked as written.
    if (diagnostics.errorCount() == errorsBefore) detail::markReachedBlocks(procedures.back(), diagnostics);
  }
  if (diagnostics.errorCount() > 0) return nullptr;
  try {
    detail::buildGraph(procedures, *pProgram);
  } catch (const SourceError& error) {
    diagnostics.error(error);
    return nullptr;
  }
  return pProgram;
}

}  // namespace

LoadResult loadProgram(std::string text) {
  LoadResult result;
  DiagnosticList diagnostics;
  SyntaxProgram syntax = parseProgram(std::move(text), diagnostics);
  if (diagnostics.errorCount() == 0) {
    try {
      result.program = checkAndBuild(syntax, diagnostics);
    } catch (const TooManyErrors&) {
    }
  }
  if (diagnostics.errorCount() > 0) result.program.reset();
  result.diagnostics = diagnostics.take(*syntax.text);
  return result;
}

std::optional<std::string> readSourceText(const std::string& path) {
  if (path == "-") {
    static const std::string standardInput = [] {
      std::ostringstream text;
      text << std::cin.rdbuf();
      return text.str();
    }();
    return standardInput;
  }
  std::ifstream file(path, std::ios::binary);
  if (!file) return std::nullopt;
  std::ostringstream text;
  text << file.rdbuf();
  if (file.bad()) return std::nullopt;
  return text.str();
}

LoadResult loadProgramFile(const std::string& path) {
  std::optional<std::string> text = readSourceText(path);
  if (!text) {
    LoadResult result;
    result.diagnostics.push_back(Diagnostic{Severity::Error, SourcePos{0, 0}, "cannot read the file"});
    return result;
  }
  return loadProgram(std::move(*text));
}

void restartObjectNumbering() {
  KvCBasicBlock::boot();
  KvCCfgEdgeInfo::boot();
  KvCCfgExpression::boot();
  KvCCfgProcedure::boot();
  KvCCfgStatement::boot();
  KvCCfgVariable::boot();
}

}  // namespace ssaopt::client
