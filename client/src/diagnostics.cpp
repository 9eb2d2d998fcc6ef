#include "ssaopt/client/diagnostics.h"

namespace ssaopt::client {

std::string formatDiagnostic(const std::string& fileName, const Diagnostic& diagnostic) {
  std::string text = fileName + ":";
  if (diagnostic.pos.line > 0)
    text += std::to_string(diagnostic.pos.line) + ":" + std::to_string(diagnostic.pos.column) + ":";
  text += diagnostic.severity == Severity::Error ? " error: " : " warning: ";
  return text + diagnostic.message;
}

}  // namespace ssaopt::client
