// Positions in a program text and the messages the front end and the client give about it, printed
// the way compilers print them: "file:line:column: error: message".
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

namespace ssaopt::client {

// Line and column, both counted from 1; a column counts bytes.
struct SourcePos {
  std::uint32_t line = 0;
  std::uint32_t column = 0;
};

enum class Severity { Error, Warning };

struct Diagnostic {
  Severity severity;
  SourcePos pos;
  std::string message;
};

// "file:line:column: error: message" (or "warning").
std::string formatDiagnostic(const std::string& fileName, const Diagnostic& diagnostic);

// Thrown inside the front end at the first error; the front end turns it into a Diagnostic, so no
// caller of the client's public functions ever sees it.
class SourceError : public std::runtime_error {
public:
  SourceError(SourcePos pos, const std::string& message) : std::runtime_error(message), m_Pos(pos) {}
  SourcePos pos() const { return m_Pos; }

private:
  SourcePos m_Pos;
};

}  // namespace ssaopt::client
