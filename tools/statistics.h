// Counts for --stats.
#pragma once

#include <cstddef>
#include <ostream>

#include "ssaopt/cfg/control_flow_graph.h"

namespace ssaopt::tool {

struct GraphCounts {
  std::size_t procedures = 0;
  std::size_t blocks = 0;
  std::size_t statements = 0;
  std::size_t phiFunctions = 0;
  // Phi functions and statements that define a variable, and those whose variable is now constant.
  std::size_t definitions = 0;
  std::size_t constants = 0;
};

GraphCounts countGraph(const KvCControlFlowGraph& graph);

// What the passes removed along the way: a pass that leaves fewer blocks or definitions than it
// found removed the difference (dividing blocks adds blocks, so totals alone would hide removals).
struct RemovedCounts {
  std::size_t blocks = 0;
  std::size_t definitions = 0;

  void add(const GraphCounts& ahead, const GraphCounts& behind) {
    if (behind.blocks < ahead.blocks) blocks += ahead.blocks - behind.blocks;
    if (behind.definitions < ahead.definitions) definitions += ahead.definitions - behind.definitions;
  }
};

// Before and after the pipeline, with what the passes removed along the way.
void writeStatistics(std::ostream& out, const GraphCounts& before, const GraphCounts& after,
                     const RemovedCounts& removed);

}  // namespace ssaopt::tool
