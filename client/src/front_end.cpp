#include "ssaopt/client/front_end.h"

#include <fstream>
#include <sstream>
#include <utility>

#include "front_end_steps.h"
#include "ssaopt/client/parser.h"
#include "ssaopt/ir/procedure.h"

namespace ssaopt::client {

namespace {

std::unique_ptr<Program> checkAndBuild(const SyntaxProgram& syntax, std::vector<Diagnostic>& warnings) {
  auto pProgram = std::make_unique<Program>();
  detail::declareVariables(syntax, *pProgram);
  detail::Signatures signatures = detail::declareProcedures(syntax, *pProgram);
  std::vector<detail::ResolvedProcedure> procedures;
  for (const SyntaxProcedure& procedure : syntax.procedures) {
    procedures.push_back(detail::resolveProcedure(procedure, signatures, *pProgram));
    detail::markReachedBlocks(procedures.back(), warnings);
  }
  detail::buildGraph(procedures, *pProgram);
  return pProgram;
}

}  // namespace

LoadResult loadProgram(std::string text) {
  LoadResult result;
  try {
    SyntaxProgram syntax = parseProgram(std::move(text));
    result.program = checkAndBuild(syntax, result.diagnostics);
  } catch (const SourceError& error) {
    result.program.reset();
    result.diagnostics.push_back(Diagnostic{Severity::Error, error.pos(), error.what()});
  }
  return result;
}

LoadResult loadProgramFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    LoadResult result;
    result.diagnostics.push_back(Diagnostic{Severity::Error, SourcePos{0, 0}, "cannot read the file"});
    return result;
  }
  std::ostringstream text;
  text << file.rdbuf();
  return loadProgram(text.str());
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
