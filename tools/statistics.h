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

// Before and after the pipeline, with the definitions that passes removed along the way.
void writeStatistics(std::ostream& out, const GraphCounts& before, const GraphCounts& after,
                     std::size_t definitionsRemoved);

}  // namespace ssaopt::tool
