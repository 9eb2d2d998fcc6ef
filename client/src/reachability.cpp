// Which blocks of a procedure run at all: the library's dominator and consistency algorithms need
// every node reachable from its procedure's entry, and every procedure to reach its end.
#include <string>
#include <vector>

#include "front_end_steps.h"

namespace ssaopt::client::detail {

void markReachedBlocks(ResolvedProcedure& procedure, DiagnosticList& diagnostics) {
  std::vector<int> work{0};
  procedure.blocks[0].reached = true;
  bool reachesEnd = false;
  while (!work.empty()) {
    const ResolvedBlock& block = procedure.blocks[static_cast<std::size_t>(work.back())];
    work.pop_back();
    int successors[] = {block.onTrue, block.pCondition ? block.onFalse : block.onTrue};
    for (int successor : successors) {
      if (successor == kEnd) {
        reachesEnd = true;
        continue;
      }
      ResolvedBlock& next = procedure.blocks[static_cast<std::size_t>(successor)];
      if (!next.reached) {
        next.reached = true;
        work.push_back(successor);
      }
    }
  }
  const SyntaxName& name = procedure.pSyntax->name;
  if (!reachesEnd)
    diagnostics.error(name.pos, "procedure '" + std::string(name.text) + "' never reaches its end");
  // Only the first block can be without a label, and it is always reached.
  for (const ResolvedBlock& block : procedure.blocks)
    if (!block.reached)
      diagnostics.warning(block.pSyntax->label.pos, "block '" + std::string(block.pSyntax->label.text) +
                                                        "' cannot be reached from the start of '" +
                                                        std::string(name.text) + "' and is dropped");
}

}  // namespace ssaopt::client::detail
