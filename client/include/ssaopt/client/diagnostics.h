// Positions in a program text and the messages the front end and the client give about it, printed
// the way compilers print them:
//
//   controller.ssa:3:7: error: unknown variable 'y'
//     x = y + 1;
//         ^
#pragma once

#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace ssaopt::client {

// Line and column, both counted from 1; a column counts bytes. Line 0: no position.
struct SourcePos {
  std::uint32_t line = 0;
  std::uint32_t column = 0;
};

enum class Severity { Error, Warning };

struct Diagnostic {
  Severity severity;
  SourcePos pos;
  std::string message;
  // The line of the text that `pos` points into, shown under the message with a caret; empty when
  // there is no position or no text at hand.
  std::string sourceLine = {};
};

// The name a diagnostic shows for a file: "<stdin>" for "-", which names standard input.
std::string displayName(const std::string& path);

// "file:line:column: error: message" (or "warning"), then, where the diagnostic has its source line,
// that line and a caret under the column; no newline at the end. Bytes of the message and the line
// that are not printable are shown as escapes (see escapedText), and a very long line is cut to the
// part around the column. While diagnostic colours are on, the parts are coloured as compilers
// colour them.
std::string formatDiagnostic(const std::string& fileName, const Diagnostic& diagnostic);

// Off until switched on; the tool switches them on for a terminal or when asked to.
void setDiagnosticColours(bool on);

// `text` with every byte outside printable ASCII written as \xNN (a tab too, unless `keepTabs`), so
// that no message can move the cursor or change the terminal.
std::string escapedText(std::string_view text, bool keepTabs = false);

// Fills in the source line of each diagnostic with a position inside `text`.
void attachSourceLines(std::vector<Diagnostic>& diagnostics, std::string_view text);

// Thrown inside the front end at an error; the front end records it and goes on with the next
// statement or declaration, so no caller of the client's public functions ever sees it.
class SourceError : public std::runtime_error {
public:
  SourceError(SourcePos pos, const std::string& message) : std::runtime_error(message), m_Pos(pos) {}
  SourcePos pos() const { return m_Pos; }

private:
  SourcePos m_Pos;
};

// Thrown by DiagnosticList when a text has more errors than it records: the front end stops there.
struct TooManyErrors {};

// The diagnostics of one program text as the front end finds them. It records up to kMaxErrors
// errors and then one more saying that it stops, throwing TooManyErrors; it records up to
// kMaxWarnings warnings and then one more counting those left out.
class DiagnosticList {
public:
  static constexpr std::size_t kMaxErrors = 20;
  static constexpr std::size_t kMaxWarnings = 20;

  void error(SourcePos pos, std::string message);
  void error(const SourceError& error) { this->error(error.pos(), error.what()); }
  void warning(SourcePos pos, std::string message);

  std::size_t errorCount() const { return m_Errors; }

  // Errors and warnings in the order of their positions (the stop or the count last), with their
  // source lines from `text`.
  std::vector<Diagnostic> take(std::string_view text);

private:
  std::vector<Diagnostic> m_Diagnostics;
  std::size_t m_Errors = 0;
  std::size_t m_Warnings = 0;
  SourcePos m_FirstWarningLeftOut;
};

}  // namespace ssaopt::client
