#include "statistics.h"

#include <iomanip>

#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

namespace ssaopt::tool {

namespace {

void countDefinition(KvCCfgVariable* pVariable, GraphCounts& counts) {
  ++counts.definitions;
  if (pVariable->getValue() && pVariable->getValue()->isConstant()) ++counts.constants;
}

void countBlock(const KvCBasicBlock& block, GraphCounts& counts) {
  ++counts.blocks;
  counts.phiFunctions += block.getPhiFunctions().size();
  counts.statements += block.getStatementSeq().size();
  for (KvCPhiFunction* pPhi : block.getPhiFunctions()) countDefinition(pPhi->getVariable(), counts);
  for (KvCCfgStatement* pStatement : block.getStatementSeq())
    for (KvCCfgVariable* pVariable : pStatement->getDefinedVariables()) countDefinition(pVariable, counts);
}

void writeRow(std::ostream& out, const char* what, std::size_t before, std::size_t after) {
  out << "  " << std::left << std::setw(22) << what << std::right << std::setw(10) << before << std::setw(10)
      << after << "\n";
}

}  // namespace

GraphCounts countGraph(const KvCControlFlowGraph& graph) {
  GraphCounts counts;
  counts.procedures = graph.getProcedures().size();
  for (ssaopt::node v : graph.nodes())
    if (KvCBasicBlock* pBlock = graph.getBasicBlock(v)) countBlock(*pBlock, counts);
  return counts;
}

void writeStatistics(std::ostream& out, const GraphCounts& before, const GraphCounts& after,
                     const RemovedCounts& removed) {
  out << "statistics" << std::string(14, ' ') << std::setw(10) << "before" << std::setw(10) << "after"
      << "\n";
  writeRow(out, "procedures", before.procedures, after.procedures);
  writeRow(out, "blocks", before.blocks, after.blocks);
  writeRow(out, "statements", before.statements, after.statements);
  writeRow(out, "phi functions", before.phiFunctions, after.phiFunctions);
  writeRow(out, "constants found", before.constants, after.constants);
  writeRow(out, "blocks removed", 0, removed.blocks);
  writeRow(out, "definitions removed", 0, removed.definitions);
}

}  // namespace ssaopt::tool
