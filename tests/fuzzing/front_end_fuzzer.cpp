// Coverage-guided fuzzing of the front end: every input must give a program or errors, each with a
// position inside the text, and a program must print as text that reads back as the same program.
// Crashes, hangs, leaks and sanitizer reports are findings too. As in the tool, the pool memory
// controller takes back what the graph never deletes, so a leak report is about the client's own
// memory.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>

#include "ssaopt/client/front_end.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/pool.h"

namespace {

bool positionInside(const ssaopt::client::SourcePos& pos, const std::string& text) {
  return pos.line >= 1 &&
         pos.line <= 1 + static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope scope(&pool);
  std::string text(reinterpret_cast<const char*>(data), size);
  ssaopt::client::LoadResult loaded = ssaopt::client::loadProgram(text);
  bool hasError = false;
  for (const ssaopt::client::Diagnostic& diagnostic : loaded.diagnostics) {
    hasError = hasError || diagnostic.severity == ssaopt::client::Severity::Error;
    if (!positionInside(diagnostic.pos, text)) __builtin_trap();
    // Showing the message with its line and caret runs under the sanitizers too.
    static_cast<void>(ssaopt::client::formatDiagnostic("fuzz.ssa", diagnostic));
  }
  if (hasError == (loaded.program != nullptr)) __builtin_trap();
  if (!loaded.program) return 0;
  std::string printed = ssaopt::client::printProgram(*loaded.program);
  ssaopt::client::LoadResult reloaded = ssaopt::client::loadProgram(printed);
  if (!reloaded.program || ssaopt::client::printProgram(*reloaded.program) != printed) __builtin_trap();
  return 0;
}
